#include "runtime/sync/thread.h"

#include <cxxabi.h>
#include <pthread.h>
#include <sched.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <mutex>
#include <thread>
#include <utility>

#include "runtime/io/files.h"
#include "runtime/sync/keyed_locks.h"

namespace zq {

void Sleep(Cardinal AMilliseconds) {
  if (AMilliseconds == 0) ::sched_yield();
  else std::this_thread::sleep_for(std::chrono::milliseconds(AMilliseconds));
}

bool IsMainThread() noexcept { return GetCurrentThreadId() == GetCurrentProcessId(); }

// ---- Native threads ------------------------------------------------------------------------------------------------

namespace {

constinit thread_local bool Begun = false;  // the calling thread is BeginThread's

}  // namespace

TNativeThread::TNativeThread(std::function<Integer()> AFunc, bool ASuspended)
    : FFunc(std::move(AFunc)), FResumed(true, !ASuspended) {}

void* TNativeThread::Main(void* AThread) {
  const TThreadHandle Self = static_cast<TNativeThread*>(AThread)->FSelf;
  Self->Run();
  ::pthread_detach(::pthread_self());
  return nullptr;
}

void TNativeThread::Run() {
  FThreadID = GetCurrentThreadId();
  FQueue = TThreadQueue::Current();
  FStarted.SetEvent();
  struct TEnd {  // also where the thread is cancelled
    ~TEnd() {
      if (Thread.BeginEnd()) Thread.End(Code);
    }
    TNativeThread& Thread;
    Integer Code = 0;
  } End{*this};
  Begun = true;
  FResumed.WaitFor();
  try {
    End.Code = FFunc();
  } catch (const TThreadExit& e) {
    End.Code = e.Code;
  } catch (const abi::__forced_unwind&) {
    throw;
  } catch (...) {
    End.Code = -1;
  }
}

// True for the first who ends it.
bool TNativeThread::BeginEnd() {
  const std::lock_guard Guard(FEndLock);
  return !std::exchange(FEnds, true);
}

void TNativeThread::End(Integer ACode) {
  FFunc = nullptr;
  FQueue->End();
  FExitCode.store(ACode, std::memory_order_release);
  const TThreadHandle Self = std::move(FSelf);
  FEnded.SetEvent();
}

Cardinal TNativeThread::ThreadID() {
  FStarted.WaitFor();
  return FThreadID;
}

const TThreadQueueRef& TNativeThread::Queue() {
  FStarted.WaitFor();
  return FQueue;
}

// The thread's number isn't waited for: who begins many threads needn't meet each of them.
void TNativeThread::Begin() {
  ::pthread_t Native{};
  const int Error = ::pthread_create(&Native, nullptr, Main, this);
  if (Error != 0) throw EThread(u"Thread creation error: " + SysErrorMessage(Error));
  FNative = Native;
}

TThreadHandle BeginThread(std::function<Integer()> AFunc, bool ASuspended) {
  auto Result = std::make_shared<TNativeThread>(std::move(AFunc), ASuspended);
  Result->FSelf = Result;
  try {
    Result->Begin();
  } catch (...) {
    Result->FSelf = nullptr;
    throw;
  }
  return Result;
}

void EndThread(Integer AExitCode) {
  Assert(Begun, u"EndThread ends threads that BeginThread began");
  throw TThreadExit{AExitCode};
}

Integer TNativeThread::WaitFor() {
  const TThreadQueueRef Own = TThreadQueue::Current();
  if (Own == Queue()) throw EThread(u"A thread can't wait for itself");
  const TThreadQueue::TEndWait Wait(*Own, FQueue);
  const std::array<TEvent*, 2> Events{&FEnded, &Own->SyncEvent()};
  while (Own->WaitForAny(Events, INFINITE) != 0) CheckSynchronize();
  return ExitCode();
}

void SetThreadName(const UnicodeString& AName) noexcept {
  constexpr std::size_t cMost = 15;
  try {
    std::string Name = AName.ToUTF8();
    std::size_t Length = std::min(Name.size(), cMost);
    while (Length < Name.size() && (static_cast<Byte>(Name[Length]) & 0xC0) == 0x80) --Length;
    Name.resize(Length);
    ::pthread_setname_np(::pthread_self(), Name.c_str());
  } catch (...) {  // no memory: it keeps its name
  }
}

Integer TNativeThread::SetPriority(TThreadPriority APriority) {
  constexpr int cNice[] = {19, 10, 5, 0, -5, -10, -20};
  if (FEnded.WaitFor(0) == wrSignaled) return ESRCH;  // its number may be another's by now
  FPriority.store(APriority, std::memory_order_relaxed);
  const int Normal = ::getpriority(PRIO_PROCESS, GetCurrentProcessId());
  const int Nice = std::clamp(Normal + cNice[static_cast<std::size_t>(APriority)], -20, 19);
  if (::setpriority(PRIO_PROCESS, ThreadID(), Nice) == 0 || errno == EACCES || errno == EPERM) return 0;
  return errno;
}

// ---- Stopping by force

namespace {

constexpr Cardinal cStopTime = 2000;  // milliseconds

// A signal that the host has left alone, for a scope in which it stops the thread that it reaches.
class TStopSignal {
 public:
  TStopSignal() {
    struct sigaction Stop {};
    Stop.sa_handler = [](int) {
      Arrived.store(true, std::memory_order_release);
      ::syscall(SYS_exit, 0);
    };
    Arrived.store(false, std::memory_order_relaxed);
    for (FNumber = SIGRTMAX; FNumber >= SIGRTMIN; --FNumber)
      if (::sigaction(FNumber, nullptr, &FFormer) == 0 && FFormer.sa_handler == SIG_DFL &&
          ::sigaction(FNumber, &Stop, nullptr) == 0)
        return;
  }
  TStopSignal(const TStopSignal&) = delete;
  TStopSignal& operator=(const TStopSignal&) = delete;
  ~TStopSignal() {
    if (IsThere()) ::sigaction(FNumber, &FFormer, nullptr);
  }
  [[nodiscard]] bool IsThere() const noexcept { return FNumber >= SIGRTMIN; }
  [[nodiscard]] int Number() const noexcept { return FNumber; }
  // What the thread did before is seen by who saw this.
  [[nodiscard]] static bool HasArrived() noexcept { return Arrived.load(std::memory_order_acquire); }

 private:
  static inline constinit std::atomic<bool> Arrived = false;
  int FNumber = 0;
  struct sigaction FFormer {};
};

bool Signals(Cardinal AThread, int ASignal) {
  return ::syscall(SYS_tgkill, GetCurrentProcessId(), AThread, ASignal) == 0;
}

constinit std::mutex StopLock;  // one signal at a time

}  // namespace

// With both locks held the thread neither ends by itself nor dies with its queue locked.
bool TNativeThread::Stop() {
  const std::lock_guard QueueGuard(FQueue->FLock);
  const TStopSignal Signal;
  if (!Signal.IsThere() || !Signals(FThreadID, Signal.Number())) return false;
  for (const auto Deadline = TDeadline::In(cStopTime); !TStopSignal::HasArrived() || Signals(FThreadID, 0); Sleep(1))
    if (Deadline.IsOver()) return false;
  return true;
}

bool TNativeThread::Kill() {
  if (ThreadID() == GetCurrentThreadId()) return false;
  bool Stopped = false;
  {
    const std::lock_guard OneAtATime(StopLock);
    const std::lock_guard EndGuard(FEndLock);
    if (!FEnds && !Stop()) return false;
    Stopped = !std::exchange(FEnds, true);
  }
  if (!Stopped) return FEnded.WaitFor(cStopTime) == wrSignaled;  // it was about to end
  FQueue->Abandon();
  End(0);
  return true;  // its stack is never joined: the next thread on it would find what this one's libraries kept there
}

// ---- The main thread's queue ---------------------------------------------------------------------------------------

TEvent& SyncEvent() { return TThreadQueue::Main()->SyncEvent(); }

bool CheckSynchronize(Cardinal ATimeout) {
  if (!IsMainThread()) throw EThread(u"CheckSynchronize was called on another thread than the main thread");
  return SyncEvent().WaitFor(ATimeout) == wrSignaled &&
         TThreadQueue::Current()->RunCalls(TThreadQueue::TKind::Synchronized);
}

void TThread::Synchronize(const TThread* AThread, const TThreadProcedure& AProcedure) {
  TThreadQueue::Main()->Send(AProcedure, AThread, TThreadQueue::TKind::Synchronized);
}

void TThread::Queue(const TThread* AThread, TThreadProcedure AProcedure) {
  if (IsMainThread()) AProcedure();
  else ForceQueue(AThread, std::move(AProcedure));
}

void TThread::ForceQueue(const TThread* AThread, TThreadProcedure AProcedure) {
  TThreadQueue::Main()->Post(std::move(AProcedure), AThread, TThreadQueue::TKind::Synchronized);
}

void TThread::RemoveQueuedEvents(const TThread* AThread) { TThreadQueue::Main()->DropPosted(AThread); }

// ---- TThread -------------------------------------------------------------------------------------------------------

TThread::~TThread() { RemoveQueuedEvents(this); }

void TThread::AfterConstruction() {
  TObject::AfterConstruction();
  if (!FCreateSuspended) Start();
}

void TThread::BeforeDestruction() {
  if (FHandle != nullptr && ThreadID() != GetCurrentThreadId()) {
    Terminate();
    WaitFor();
  } else if (FHandle != nullptr && !Finished()) {
    throw EThread(u"A thread can't free itself while it executes");
  }
  TObject::BeforeDestruction();
}

void TThread::Start() {
  if (FHandle != nullptr) throw EThread(u"The thread has been started already");
  const TThreadHandle Handle = BeginThread([this] { return Run(); }, true);
  FHandle = Handle;
  Handle->Resume();  // from here on the object may be gone
}

void TThread::Terminate() {
  if (!FTerminated.exchange(true, std::memory_order_acq_rel)) TerminatedSet();
}

Integer TThread::WaitFor() {
  const TThreadHandle Handle = FHandle;
  if (Handle == nullptr) throw EThread(u"A thread that was not started can't be waited for");
  return Handle->WaitFor();
}

Cardinal TThread::ThreadID() const noexcept { return FHandle == nullptr ? 0 : FHandle->ThreadID(); }

Integer TThread::Run() {
  try {
    if (!Terminated()) Execute();
  } catch (const TThreadExit& e) {
    SetReturnValue(e.Code);
  } catch (const abi::__forced_unwind&) {
    throw;
  } catch (...) {
    FFatalException = ExceptionRef::Current();
  }
  const Integer Result = ReturnValue();
  FFinished.store(true, std::memory_order_release);
  if (FreeOnTerminate()) Free();
  return Result;
}

// ---- TMonitor ------------------------------------------------------------------------------------------------------

namespace {

TKeyedLocks& ObjectLocks() {
  static TKeyedLocks& Result = *new TKeyedLocks;
  return Result;
}

}  // namespace

void TMonitor::Enter(const TObject* AObject) { ObjectLocks().Enter(AObject); }

bool TMonitor::Enter(const TObject* AObject, Cardinal ATimeout) { return ObjectLocks().Enter(AObject, ATimeout); }

void TMonitor::Exit(const TObject* AObject) {
  if (ObjectLocks().Leave(AObject) != TKeyedLocks::TLeft::Done) throw EThread(u"The object's lock is not held");
}

}  // namespace zq
