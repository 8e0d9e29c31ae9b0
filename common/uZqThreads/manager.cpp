#include "common/uZqThreads/manager.h"

#include <algorithm>
#include <iterator>
#include <optional>
#include <utility>

#include "runtime/platform/session_service.h"
#include "runtime/sync/message_window.h"
#include "runtime/values/typeinfo.h"

namespace zq {

namespace {

// Messages of the hidden window; for those of callbacks the first parameter is the thread.
constexpr Cardinal cClose = 1024, cSynchronize = 1025, cFirstCallback = 1026;

// Those living, in the order of their making. Null: none was made yet.
constinit TListOf<TZqThreadManager*>* Managers = nullptr;

bool IsRegistered(const TZqThreadManager* AManager) {
  return Managers != nullptr && Managers->IndexOf(const_cast<TZqThreadManager*>(AManager)) >= 0;
}

}  // namespace

TZqThreadManager* ZqThreadManager() {
  if (Managers != nullptr)
    for (TZqThreadManager* const Each : *Managers)
      if (Each->Owner() == nullptr) return Each;
  return New<TZqThreadManager>(nullptr);
}

// ---------------------------------------------------------------------------------------- Life

TZqThreadManager::TZqThreadManager(TComponent* AOwner) : TComponent(AOwner) {
  if (Managers == nullptr) Managers = new TListOf<TZqThreadManager*>;
  FHWND = AllocateHWnd([this](HWND, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam) {
    return WindowProc(AMessage, AWParam, ALParam);
  });
  try {
    Service<TSessionService>().StartSystemMessages(FHWND);
  } catch (...) {
    DestroyWindow(FHWND);  // it knows this object
    throw;
  }
}

TZqThreadManager::~TZqThreadManager() { CloseWindow(); }

void TZqThreadManager::AfterConstruction() {
  TComponent::AfterConstruction();
  Managers->Add(this);
}

// The threads' ends are told, so that they come while the manager is whole, and the window goes behind the last of
// them.
void TZqThreadManager::BeforeDestruction() {
  SetSessionEvents(false);
  Managers->Remove(this);
  TerminateAllThreads(true);
  TComponent::BeforeDestruction();
  CloseWindow();
  if (Managers->Count() == 0) delete std::exchange(Managers, nullptr);
}

void TZqThreadManager::EndRefused() noexcept {
  TComponent::EndRefused();
  if (!IsRegistered(this)) Managers->Add(this);
}

void TZqThreadManager::CloseWindow() {
  if (FHWND == 0) return;
  Service<TSessionService>().StopSystemMessages(FHWND);
  const HWND Window = std::exchange(FHWND, 0);
  try {
    if (!DestroyWindow(Window)) SendMessage(Window, cClose, Window, 0);
  } catch (const Exception&) {  // its thread has ended, and the window with it
  }
}

void uZqThreads::StartManagers() {
  Managers = nullptr;
  DescribeType<TZqThreadAction>(u"uZqThreads").EnumNames({u"taRunAgain", u"taSuspend", u"taTerminate"});
  DescribeType<TZqThreadState>(u"uZqThreads")
      .EnumNames({u"tsCreated", u"tsRunning", u"tsSuspended", u"tsSleeping", u"tsTerminating", u"tsTerminated",
          u"tsFinished", u"tsError"});
}

void uZqThreads::StopManagers() {
  while (Managers != nullptr && Managers->Count() != 0) Managers->Items(Managers->Count() - 1)->Free();
  delete std::exchange(Managers, nullptr);
}

// ---------------------------------------------------------------------------------------- The list

Integer TZqThreadManager::ThreadCount() const { return FThreads.Locked()->Count(); }

TZqThread* TZqThreadManager::GetThread(Integer AIndex) const { return FThreads.Locked()->Items(AIndex); }

namespace {

[[noreturn]] void RaiseUnknown() {
  throw EZqThread(u"The specified thread is not managed by this ThreadManager or has already been destroyed!");
}

}  // namespace

TZqThread* TZqThreadManager::Listed(TList::TScope& AList, TZqThread* AThread) {
  if (AList->IndexOf(AThread) < 0) RaiseUnknown();
  return AThread;
}

// Whether a thread frees itself is settled under the lock: who terminates it has made it its own before, or finds it
// so.
bool TZqThreadManager::BeginsToFreeItself(TZqThread* AThread) {
  const TList::TScope List(FThreads);
  return AThread->FFreesItself = AThread->FreeOnTerminate();
}

void TZqThreadManager::StaysAfterAll(TZqThread* AThread) {
  const TList::TScope List(FThreads);
  AThread->FFreesItself = false;
  AThread->SetFreeOnTerminate(false);
}

// Under the lock. AWait makes it the caller's, and returns what it then waits for.
TZqThreadManager::TEnding TZqThreadManager::Tell(TZqThread* AThread, bool AWait) {
  if (!AThread->FFreesItself) AThread->SetFreeOnTerminate(!AWait);
  AThread->Terminate(true);
  return {AThread->FHandle, AThread->FFreesItself ? nullptr : AThread};
}

void TZqThreadManager::End(const TEnding& AEnding) {
  AEnding.Handle->WaitFor();
  if (AEnding.Owned != nullptr) AEnding.Owned->Free();
}

void TZqThreadManager::TerminateThread(TZqThread* AThread, bool AWaitForTermination) {
  const TEnding Ending = [&] {
    TList::TScope List(FThreads);
    if (Listed(List, AThread)->IsOwn() && AWaitForTermination) throw EZqThread(u"A thread can't wait for itself");
    return Tell(AThread, AWaitForTermination);
  }();
  if (AWaitForTermination) End(Ending);
}

void TZqThreadManager::TerminateAllThreads(bool AWaitForTermination) {
  {
    const TList::TScope List(FThreads);
    if (AWaitForTermination && std::ranges::any_of(*List, [](TZqThread* AThread) { return AThread->IsOwn(); }))
      throw EZqThread(u"A thread can't wait for itself");
    for (Integer i = List->Count() - 1; i >= 0; --i) Tell(List->Items(i), AWaitForTermination);
  }
  while (AWaitForTermination) {
    const auto Ending = [&]() -> std::optional<TEnding> {
      const TList::TScope List(FThreads);
      if (List->Count() == 0) return {};
      return Tell(List->Items(0), true);  // again: it may have come since
    }();
    if (!Ending) return;
    End(*Ending);
  }
}

void TZqThreadManager::KillUnresponsiveThread(TZqThread* AThread) {
  const TThreadHandle Handle = [&] {
    TList::TScope List(FThreads);
    if (Listed(List, AThread)->FFreesItself) RaiseUnknown();  // it is on its way out
    AThread->SetFreeOnTerminate(false);
    return AThread->FHandle;
  }();
  if (!Handle->Kill()) throw EZqThread(u"The thread %d can't be stopped", {Handle->ThreadID()});
  AThread->Free();
}

// ---------------------------------------------------------------------------------------- Callbacks

const TZqThreadManager::TField (&TZqThreadManager::Callbacks())[6] {
  static constexpr TField cResult[] = {&TZqThreadManager::FOnThreadError, &TZqThreadManager::FOnThreadRunning,
      &TZqThreadManager::FOnThreadSuspended, &TZqThreadManager::FOnThreadDone, &TZqThreadManager::FOnThreadDestroyed,
      &TZqThreadManager::FOnThreadStateChanged};
  return cResult;
}

// What the callback raises comes back by the call itself.
void TZqThreadManager::Call(TField AField, TZqThread* AThread) {
  if (FMultiThreadedEvents) return (this->*AField)(AThread);
  const auto Number = std::ranges::find(Callbacks(), AField) - std::begin(Callbacks());
  SyncEvent(static_cast<Integer>(cFirstCallback + Number), AThread);
}

void TZqThreadManager::SyncEvent(Integer AMessage, TZqThread* AThread) {
  SendMessage(FHWND, static_cast<Cardinal>(AMessage), reinterpret_cast<NativeUInt>(AThread), 0);
}

void TZqThreadManager::SyncCall(TCallRef ACall) {
  SendMessage(FHWND, cSynchronize, reinterpret_cast<NativeUInt>(&ACall), 0);
}

NativeInt TZqThreadManager::WindowProc(Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam) {
  if (AMessage == cClose) return DestroyWindow(AWParam) ? 1 : 0;
  if (AMessage == cSynchronize) {
    (*reinterpret_cast<const TCallRef*>(AWParam))();
    return 1;
  }
  if (AMessage < cFirstCallback || AMessage >= cFirstCallback + std::size(Callbacks()))
    return SystemMessage(AMessage, AWParam, ALParam);
  const TZqThreadEvent Callback = this->*Callbacks()[AMessage - cFirstCallback];
  if (Callback) Callback(reinterpret_cast<TZqThread*>(AWParam));
  return 1;
}

// ---------------------------------------------------------------------------------------- The system's events

NativeInt TZqThreadManager::SystemMessage(Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam) {
  const bool PassesOn = IsRegistered(this);
  const auto Session = TranslateSessionEvent(AWParam);
  const auto Power = TranslatePowerEvent(AWParam);
  bool CanEnd = true;
  switch (AMessage) {
    case WM_WTSSESSION_CHANGE:
      if (PassesOn && Session) DoSessionEvent(*Session, static_cast<Cardinal>(ALParam));
      return 1;
    case WM_POWERBROADCAST:
      if (PassesOn && Power) DoPowerEvent(*Power);
      return 1;
    case WM_QUERYENDSESSION:
      if (PassesOn) DoQueryEndSession(TranslateEndTypes(ALParam), CanEnd);
      return CanEnd ? 1 : 0;
    case WM_ENDSESSION:
      if (PassesOn) DoEndSession(AWParam != 0, TranslateEndTypes(ALParam));
      return 0;
    default: return 0;
  }
}

template <class TCall>
void TZqThreadManager::TellThreads(TCall ACall) {
  const TList::TScope List(FThreads);
  for (Integer i = 0; i < List->Count(); ++i) ACall(*List->Items(i));
}

void TZqThreadManager::DoSessionEvent(TZqSessionEventType AEventType, Cardinal ASessionID) {
  TellThreads([&](TZqThread& AThread) { AThread.DoSessionEvent(AEventType, ASessionID); });
}

void TZqThreadManager::DoPowerEvent(TZqPowerEventType AEventType) {
  TellThreads([&](TZqThread& AThread) { AThread.DoPowerEvent(AEventType); });
}

void TZqThreadManager::DoQueryEndSession(const TZqEndSessionTypes& AEndTypes, bool& ACanEnd) {
  TellThreads([&](TZqThread& AThread) { AThread.DoQueryEndSession(AEndTypes, ACanEnd); });
}

void TZqThreadManager::DoEndSession(bool AEnding, const TZqEndSessionTypes& AEndTypes) {
  TellThreads([&](TZqThread& AThread) { AThread.DoEndSession(AEnding, AEndTypes); });
  if (AEnding) TerminateAllThreads(true);
}

void TZqThreadManager::SetSessionEvents(bool AValue) {
  if (AValue && !FSessionEvents) {
    WTSRegisterSessionNotification(FHWND, nsThisSession);
    FSessionEventsRegistered = true;
  }
  if (!AValue && FSessionEvents && std::exchange(FSessionEventsRegistered, false))
    WTSUnRegisterSessionNotification(FHWND);
  FSessionEvents = AValue;
}

}  // namespace zq
