#include "common/uZqThreads/managed.h"

#include <cxxabi.h>

#include "common/uZqThreads/manager.h"
#include "runtime/io/files.h"

namespace zq {

namespace {

constexpr Cardinal cSuspendTime = 0x7FFFFFFF;  // milliseconds

constexpr bool IsEnd(TZqThreadState AState) noexcept { return AState >= tsTerminated; }

}  // namespace

void CheckThreadError(Integer AErrCode) {
  if (AErrCode != 0) throw EZqThread(u"Thread Error: %s (%d)", {SysErrorMessage(AErrCode), AErrCode});
}

void CheckThreadError(bool ASuccess) {
  if (!ASuccess) CheckThreadError(static_cast<Integer>(GetLastError()));
}

// ---------------------------------------------------------------------------------------- Life

TZqThread::TZqThread(bool ACreateSuspended) : TZqThread(ZqThreadManager(), ACreateSuspended) {}

TZqThread::TZqThread(TZqThreadManager* AThreadManager, bool ACreateSuspended)
    : FThreadManager(AThreadManager), FSuspendRequested(ACreateSuspended) {
  Assert(AThreadManager != nullptr, u"The TZqThread needs a Thread Manager!");
  if (!ACreateSuspended) FSuspendEvent.SetEvent();
  try {
    FHandle = BeginThread([this, MayRun = FMayRun] { return MayRun->load() ? Run() : 0; }, true);
  } catch (const EThread& e) {
    throw EZqThread(e.Message());
  }
}

void TZqThread::AfterConstruction() {
  TObject::AfterConstruction();
  Assert(FThreadManager != nullptr);
  FThreadManager->AddThread(this);
  FMayRun->store(true);
  FHandle->Resume();  // from here on the object may be gone
}

// What the thread runs are overrides, so that it has to end here.
void TZqThread::BeforeDestruction() {
  if (IsOwn() && !IsEnd(ThreadState())) throw EZqThread(u"A thread can't free itself while it executes");
  FThreadManager->DoThreadDestroyed(this);
  if (!IsOwn()) {
    if (!Terminated()) Terminate(true);
    FHandle->WaitFor();
  }
  TObject::BeforeDestruction();
  FThreadManager->RemoveThread(this);
}

TZqThread::~TZqThread() {
  if (FHandle == nullptr || FMayRun->load()) return;
  FHandle->Resume();  // its construction has failed: it leaves without having run
  FHandle->Ended().WaitFor();
}

Integer TZqThread::Run() {
  try {
    RunGuarded();
  } catch (const TThreadExit& e) {
    FReturnValue = e.Code;
  } catch (const abi::__forced_unwind&) {
    Close();
    throw;
  } catch (...) {  // none of the Exception family, or raised by OnThreadError: nobody is told
  }
  return Close();
}

void TZqThread::RunGuarded() {
  if (ThreadState() != tsCreated) return;  // terminated before it began
  try {
    _Execute();
  } catch (const Exception&) {
    KeepFatal(ExceptionRef::Current());
    DoThreadError();
  }
}

// Each of the closing steps comes, whatever the one before has raised.
Integer TZqThread::Close() {
  const auto Quietly = [](auto AStep) {
    try {
      AStep();
    } catch (const abi::__forced_unwind&) {
      throw;
    } catch (...) {  // the thread ends all the same
    }
  };
  const Integer Result = FReturnValue;
  Quietly([this] {
    const TZqThreadState State = ThreadState();
    SetThreadState(State == tsRunning ? tsFinished : State == tsTerminating ? tsTerminated : tsError);
  });
  Quietly([this] { DoThreadDone(); });
  Assert(IsEnd(ThreadState()), u"An invalid threadstate was detected!");
  if (!FThreadManager->BeginsToFreeItself(this)) return Result;
  try {
    Free();
  } catch (const Exception&) {  // OnThreadDestroyed refuses: it is the manager's to free
    FThreadManager->StaysAfterAll(this);
  }
  return Result;
}

void TZqThread::_Execute() {
  SetThreadState(tsRunning);
  Initialize();
  try {
    RunSteps();
  } catch (...) {
    Finalize();
    throw;
  }
  Finalize();
}

void TZqThread::RunSteps() {
  TZqThreadAction Action = taTerminate;
  do {
    FThreadManager->DoThreadRunning(this);
    if (ThreadState() == tsRunning) CheckSuspended();
    if (ThreadState() == tsRunning) Execute(Action);
    if (Action == taSuspend && ThreadState() == tsRunning) Suspend();
  } while (ThreadState() != tsTerminating && ThreadState() != tsError && Action != taTerminate);
}

// ---------------------------------------------------------------------------------------- States

void TZqThread::SetThreadState(TZqThreadState AState) {
  TZqThreadState Present = FThreadState.load();
  do {
    if (AState == Present || (Present >= tsTerminating && !IsEnd(AState))) return;
  } while (!FThreadState.compare_exchange_weak(Present, AState));
  try {
    FThreadManager->DoThreadStateChanged(this);
  } catch (const Exception&) {
    FThreadState = tsError;
    KeepFatal(ExceptionRef::Current());
  }
}

void TZqThread::KeepFatal(ExceptionRef AException) {
  const std::lock_guard Guard(FLock);
  std::swap(FFatalException, AException);
}

ExceptionRef TZqThread::FatalException() const {
  const std::lock_guard Guard(FLock);
  return FFatalException;
}

void TZqThread::DoThreadError() {
  FReturnValue = -1;
  SetThreadState(tsError);
  FThreadManager->DoThreadError(this);
}

void TZqThread::DoThreadDone() { FThreadManager->DoThreadDone(this); }

// ---------------------------------------------------------------------------------------- Suspending, sleeping, ending

// Under the lock, so that a wake-up comes before or behind what the thread decides there about its wait.
void TZqThread::Wake(bool AResume) {
  const std::lock_guard Guard(FLock);
  if (AResume) {
    FSuspendRequested = false;
    ++FResumes;
  }
  FSuspendEvent.SetEvent();
}

void TZqThread::Terminate(bool AResumeWhenSuspended) {
  if (!IsEnd(ThreadState())) SetThreadState(tsTerminating);
  Wake(false);
  if (AResumeWhenSuspended && Suspended()) Resume();
}

void TZqThread::Suspend() { FSuspendRequested = true; }

void TZqThread::Resume() { Wake(true); }

void TZqThread::CheckSuspended() {
  if (!Suspended()) return;
  SetThreadState(tsSuspended);
  FThreadManager->DoThreadSuspended(this);
  {
    const std::lock_guard Guard(FLock);
    if (Suspended() && ThreadState() == tsSuspended) FSuspendEvent.ResetEvent();
  }
  FSuspendEvent.WaitFor(cSuspendTime);
  if (ThreadState() == tsSuspended) SetThreadState(tsRunning);
}

void TZqThread::Sleep(Integer AMilliseconds) {
  const UInt64 Resumes = [this] {
    const std::lock_guard Guard(FLock);
    return FResumes;
  }();
  if (Terminated()) return;
  SetThreadState(tsSleeping);
  {
    const std::lock_guard Guard(FLock);
    if (ThreadState() == tsSleeping && Resumes == FResumes) FSuspendEvent.ResetEvent();
  }
  FSuspendEvent.WaitFor(static_cast<Cardinal>(AMilliseconds));
  FSuspendEvent.SetEvent();
  SetThreadState(tsRunning);
}

Cardinal TZqThread::WaitFor() {
  const TThreadHandle Handle = FHandle;
  const TZqThreadState State = ThreadState();
  if (State == tsCreated || IsEnd(State)) return static_cast<Cardinal>(FReturnValue.load());
  if (Handle->ThreadID() == GetCurrentThreadId()) throw EZqThread(u"A thread can't wait for itself");
  return static_cast<Cardinal>(Handle->WaitFor());
}

void TZqThread::SetPriority(TThreadPriority AValue) { CheckThreadError(FHandle->SetPriority(AValue)); }

void TZqThread::Synchronize(const TZqSyncMethod& AMethod, Pointer AData) {
  FThreadManager->SyncCall([&] { AMethod(AData); });
}

}  // namespace zq
