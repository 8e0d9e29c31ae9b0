#include "common/uZqSessionEvents.h"

#include <iterator>
#include <utility>

#include "runtime/containers/lists.h"
#include "runtime/core/start_count.h"
#include "runtime/platform/session_service.h"
#include "runtime/sync/critical_section.h"
#include "runtime/sync/message_window.h"
#include "runtime/values/typeinfo.h"

namespace zq {

namespace uZqSessionEvents {

namespace {
constinit TStartCount Starts;
}

void Start() {
  if (!Starts.Begins()) return;
  constexpr const char16_t* cUnit = u"uZqSessionEvents";
  DescribeType<TZqNotificationScope>(cUnit).EnumNames({u"nsThisSession", u"nsAllSessions"});
  DescribeType<TZqSessionEventType>(cUnit).EnumNames(
      {u"seConnect", u"seDisconnect", u"seRemoteConnect", u"seRemoteDisconnect", u"seSessionLogon", u"seSessionLogoff",
          u"seSessionLock", u"seSessionUnlock", u"seSessionRemoteControl", u"seSessionCreate", u"seSessionTerminate"});
  DescribeType<TZqPowerEventType>(cUnit).EnumNames(
      {u"peSuspend", u"peResumeAutomatic", u"peResumeSuspend", u"pePowerStatusChange", u"pePowerSettingChange"});
  DescribeType<TZqEndSessionType>(cUnit).EnumNames({u"esCloseApp", u"esCritical", u"esLogoff"});
  DescribeType<TZqEndSessionTypes>(cUnit, u"TZqEndSessionTypes");
  using T = TZqSessionEvents;
  DescribeType<T>(cUnit)
      .Property(u"Scope", &T::Scope, &T::SetScope)
      .Property(u"OnConsoleConnect", &T::OnConsoleConnect, &T::SetOnConsoleConnect)
      .Property(u"OnConsoleDisconnect", &T::OnConsoleDisconnect, &T::SetOnConsoleDisconnect)
      .Property(u"OnRemoteConnect", &T::OnRemoteConnect, &T::SetOnRemoteConnect)
      .Property(u"OnRemoteDisconnect", &T::OnRemoteDisconnect, &T::SetOnRemoteDisconnect)
      .Property(u"OnSessionLogon", &T::OnSessionLogon, &T::SetOnSessionLogon)
      .Property(u"OnSessionLogoff", &T::OnSessionLogoff, &T::SetOnSessionLogoff)
      .Property(u"OnSessionLock", &T::OnSessionLock, &T::SetOnSessionLock)
      .Property(u"OnSessionUnlock", &T::OnSessionUnlock, &T::SetOnSessionUnlock)
      .Property(u"OnSessionRemoteControl", &T::OnSessionRemoteControl, &T::SetOnSessionRemoteControl)
      .Property(u"OnSessionCreate", &T::OnSessionCreate, &T::SetOnSessionCreate)
      .Property(u"OnSessionTerminate", &T::OnSessionTerminate, &T::SetOnSessionTerminate)
      .Property(u"OnPowerStatusChange", &T::OnPowerStatusChange, &T::SetOnPowerStatusChange)
      .Property(u"OnResumeAutomatic", &T::OnResumeAutomatic, &T::SetOnResumeAutomatic)
      .Property(u"OnResumeSuspend", &T::OnResumeSuspend, &T::SetOnResumeSuspend)
      .Property(u"OnSuspend", &T::OnSuspend, &T::SetOnSuspend)
      .Property(u"OnPowerSettingChange", &T::OnPowerSettingChange, &T::SetOnPowerSettingChange)
      .Property(u"OnQueryEndSession", &T::OnQueryEndSession, &T::SetOnQueryEndSession)
      .Property(u"OnEndSession", &T::OnEndSession, &T::SetOnEndSession);
}

void Stop() { Starts.Ends(); }

}  // namespace uZqSessionEvents

// ---- What the parameters mean --------------------------------------------------------------------------------------

std::optional<TZqSessionEventType> TranslateSessionEvent(NativeUInt AParam) noexcept {
  if (AParam < WTS_CONSOLE_CONNECT || AParam > WTS_SESSION_TERMINATE) return std::nullopt;
  return static_cast<TZqSessionEventType>(AParam - WTS_CONSOLE_CONNECT);
}

std::optional<TZqPowerEventType> TranslatePowerEvent(NativeUInt AParam) noexcept {
  switch (AParam) {
    case PBT_APMSUSPEND: return peSuspend;
    case PBT_APMRESUMESUSPEND: return peResumeSuspend;
    case PBT_APMPOWERSTATUSCHANGE: return pePowerStatusChange;
    case PBT_APMRESUMEAUTOMATIC: return peResumeAutomatic;
    case PBT_POWERSETTINGCHANGE: return pePowerSettingChange;
    default: return std::nullopt;
  }
}

TZqEndSessionTypes TranslateEndTypes(NativeInt AParam) noexcept {
  TZqEndSessionTypes Result;
  if ((AParam & ENDSESSION_CLOSEAPP) != 0) Result.Include(esCloseApp);
  if ((AParam & ENDSESSION_CRITICAL) != 0) Result.Include(esCritical);
  if ((AParam & ENDSESSION_LOGOFF) != 0) Result.Include(esLogoff);
  return Result;
}

// ---- Registration --------------------------------------------------------------------------------------------------

namespace {

class TSessionLibrary {
 public:
  TSessionLibrary() = default;
  TSessionLibrary(const TSessionLibrary&) = delete;
  TSessionLibrary& operator=(const TSessionLibrary&) = delete;
  ~TSessionLibrary() {
    if (FLoaded) FSystem.FreeLibrary();
  }
  explicit operator bool() const noexcept { return FLoaded; }
  [[nodiscard]] bool Has(const char16_t* AFunction) const { return FSystem.GetProcAddress(AFunction); }
  TSessionService* operator->() const noexcept { return &FSystem; }

 private:
  TSessionService& FSystem = Service<TSessionService>();
  bool FLoaded = FSystem.LoadLibrary();
};

}  // namespace

void WTSRegisterSessionNotification(HWND AWindow, TZqNotificationScope AScope) {
  const TSessionLibrary Library;
  if (!Library) throw Exception(u"Failed to load the Wtsapi32.dll!");
  if (!Library.Has(u"WTSRegisterSessionNotification"))
    throw Exception(u"Failed to locate the WTSRegisterSessionNotification function!");
  const Cardinal Scope = AScope == nsThisSession ? NOTIFY_FOR_THIS_SESSION : NOTIFY_FOR_ALL_SESSIONS;
  if (!Library->WTSRegisterSessionNotification(AWindow, Scope)) RaiseLastOSError();
}

void WTSUnRegisterSessionNotification(HWND AWindow) {
  const TSessionLibrary Library;
  if (Library && Library.Has(u"WTSUnRegisterSessionNotification")) Library->WTSUnRegisterSessionNotification(AWindow);
}

Cardinal GetCurrentSessionID() {
  return Service<TSessionService>().ProcessIdToSessionId(GetCurrentProcessId()).value_or(0);
}

// ---- TZqSessionEvents ----------------------------------------------------------------------------------------------

namespace {

TList* Instances = nullptr;  // all that live, and none while there are none

}  // namespace

TZqSessionEvents::TZqSessionEvents(TComponent* AOwner) : TComponent(AOwner) {}

TZqSessionEvents::~TZqSessionEvents() {
  if (Instances != nullptr && Instances->Count() == 0) delete std::exchange(Instances, nullptr);
}

void TZqSessionEvents::AfterConstruction() {
  TComponent::AfterConstruction();
  if (Instances == nullptr) Instances = new TList;
  Instances->Add(this);
}

void TZqSessionEvents::BeforeDestruction() {
  SetActive(false);
  Instances->Remove(this);
  TComponent::BeforeDestruction();
}

void TZqSessionEvents::EndRefused() noexcept {
  if (Instances->IndexOf(this) < 0) Instances->Add(this);
  TComponent::EndRefused();
}

void TZqSessionEvents::SetActive(bool AValue) {
  if (AValue == FActive) return;
  if (!AValue) {
    if (FHandle != 0) zq::WTSUnRegisterSessionNotification(FHandle);
    CloseHandle();
    FActive = false;
    return;
  }
  FHandle = AllocateHWnd(&WindowProc);
  try {
    Service<TSessionService>().StartSystemMessages(FHandle);
    zq::WTSRegisterSessionNotification(FHandle, FScope);
  } catch (...) {
    CloseHandle();
    throw;
  }
  FActive = true;
}

void TZqSessionEvents::CloseHandle() {
  if (FHandle == 0) return;
  Service<TSessionService>().StopSystemMessages(FHandle);
  DestroyWindow(std::exchange(FHandle, 0));
}

TZqSessionEvents* TZqSessionEvents::Find(HWND AHandle) noexcept {
  if (Instances == nullptr) return nullptr;
  for (Integer i = Instances->Count() - 1; i >= 0; --i) {
    auto* const Each = static_cast<TZqSessionEvents*>(Instances->Items(i));
    if (Each->FHandle == AHandle) return Each;
  }
  return nullptr;
}

NativeInt TZqSessionEvents::WindowProc(HWND AHandle, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam) {
  TZqSessionEvents* const Self = Find(AHandle);
  switch (AMessage) {
    case WM_WTSSESSION_CHANGE:
      if (Self != nullptr) Self->TriggerWtsEvent(static_cast<Integer>(AWParam), static_cast<Cardinal>(ALParam));
      return 1;
    case WM_POWERBROADCAST:
      if (Self != nullptr) Self->TriggerPwrEvent(static_cast<Integer>(AWParam));
      return 1;
    case WM_QUERYENDSESSION: {
      bool CanEnd = true;
      if (Self != nullptr) Self->TriggerQesEvent(TranslateEndTypes(ALParam), CanEnd);
      return CanEnd ? 1 : 0;
    }
    case WM_ENDSESSION:
      if (Self != nullptr) Self->TriggerEndSessionEvent(AWParam != 0, TranslateEndTypes(ALParam));
      return 0;
    default: return 0;
  }
}

void TZqSessionEvents::TriggerWtsEvent(Integer AEvent, Cardinal ASessionID) {
  using T = TZqSessionEvents;
  static constexpr TZqSessionEvent T::*cCallbacks[] = {&T::FOnConsoleConnect, &T::FOnConsoleDisconnect,
      &T::FOnRemoteConnect, &T::FOnRemoteDisconnect, &T::FOnSessionLogon, &T::FOnSessionLogoff, &T::FOnSessionLock,
      &T::FOnSessionUnlock, &T::FOnSessionRemoteControl, &T::FOnSessionCreate, &T::FOnSessionTerminate};
  const auto Type = TranslateSessionEvent(static_cast<NativeUInt>(AEvent));
  if (!Type) return;
  const TZqSessionEvent& Callback = this->*cCallbacks[static_cast<std::size_t>(*Type)];
  if (Callback) Callback(this, ASessionID);
}

void TZqSessionEvents::TriggerPwrEvent(Integer AEvent) {
  using T = TZqSessionEvents;
  static constexpr TNotifyEvent T::*cCallbacks[] = {&T::FOnSuspend, &T::FOnResumeAutomatic, &T::FOnResumeSuspend,
      &T::FOnPowerStatusChange, &T::FOnPowerSettingChange};
  const auto Type = TranslatePowerEvent(static_cast<NativeUInt>(AEvent));
  if (!Type) return;
  const TNotifyEvent& Callback = this->*cCallbacks[static_cast<std::size_t>(*Type)];
  if (Callback) Callback(this);
}

void TZqSessionEvents::TriggerQesEvent(const TZqEndSessionTypes& AEndTypes, bool& ACanEnd) {
  if (FOnQueryEndSession) FOnQueryEndSession(this, AEndTypes, ACanEnd);
}

void TZqSessionEvents::TriggerEndSessionEvent(bool AEnding, const TZqEndSessionTypes& AEndTypes) {
  if (FOnEndSession) FOnEndSession(this, AEnding, AEndTypes);
}

}  // namespace zq
