#include "runtime/sync/thread.h"

#include <cxxabi.h>
#include <sched.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <mutex>
#include <system_error>
#include <thread>
#include <unordered_map>

namespace zq {

void Sleep(Cardinal AMilliseconds) {
  if (AMilliseconds == 0) ::sched_yield();
  else std::this_thread::sleep_for(std::chrono::milliseconds(AMilliseconds));
}

bool IsMainThread() noexcept { return GetCurrentThreadId() == GetCurrentProcessId(); }

// ---- Native threads ------------------------------------------------------------------------------------------------

namespace {

// Unwinds a thread that calls EndThread; none of the Exception family, so that no handler of that takes it.
struct TThreadExit {
  Integer Code;
};

constinit thread_local bool Begun = false;  // the calling thread is BeginThread's

}  // namespace

TNativeThread::TNativeThread(std::function<Integer()> AFunc, bool ASuspended)
    : FFunc(std::move(AFunc)), FResumed(true, !ASuspended) {}

void TNativeThread::Run() {
  FQueue = TThreadQueue::Current();
  struct TEnd {  // runs too where the thread is cancelled
    ~TEnd() {
      Thread.FFunc = nullptr;
      Thread.FQueue->End();
      Thread.FExitCode.store(Code, std::memory_order_release);
      Thread.FEnded.SetEvent();
    }
    TNativeThread& Thread;
    Integer Code = 0;
  } End{*this};
  Begun = true;
  FThreadID.store(GetCurrentThreadId(), std::memory_order_release);
  FStarted.SetEvent();
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

TThreadHandle BeginThread(std::function<Integer()> AFunc, bool ASuspended) {
  auto Result = std::make_shared<TNativeThread>(std::move(AFunc), ASuspended);
  try {
    std::thread Native([Result] { Result->Run(); });
    Result->FNative = Native.native_handle();
    Native.detach();
  } catch (const std::system_error& e) {
    throw EThread(u"Thread creation error: " + FromUTF8(e.what()));
  }
  Result->FStarted.WaitFor();
  return Result;
}

void EndThread(Integer AExitCode) {
  Assert(Begun, u"EndThread ends threads that BeginThread began");
  throw TThreadExit{AExitCode};
}

Integer TNativeThread::WaitFor() {
  const TThreadQueueRef Own = TThreadQueue::Current();
  if (Own == FQueue) throw EThread(u"A thread can't wait for itself");
  const TThreadQueue::TEndWait Wait(*Own, FQueue);
  const std::array<TEvent*, 2> Events{&FEnded, &Own->SyncEvent()};
  while (Own->WaitForAny(Events, INFINITE) != 0) CheckSynchronize();
  return ExitCode();
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

struct TMonitorEntry {
  TCriticalSection Section;
  Integer Users = 0;  // calls of Enter that no Exit has matched, waiting ones included
};

struct TMonitorTable {
  static TMonitorTable& Get() {
    static TMonitorTable& Result = *new TMonitorTable;
    return Result;
  }
  std::mutex Lock;  // never held while an entry is waited for
  std::unordered_map<const TObject*, TMonitorEntry> Entries;
};

void DropUser(TMonitorTable& ATable, const TObject* AObject) {
  const auto Found = ATable.Entries.find(AObject);
  if (--Found->second.Users == 0) ATable.Entries.erase(Found);
}

}  // namespace

void TMonitor::Enter(const TObject* AObject) { static_cast<void>(Enter(AObject, INFINITE)); }

bool TMonitor::Enter(const TObject* AObject, Cardinal ATimeout) {
  TMonitorTable& Table = TMonitorTable::Get();
  std::unique_lock Guard(Table.Lock);
  TMonitorEntry& Entry = Table.Entries[AObject];
  ++Entry.Users;
  Guard.unlock();
  if (ATimeout == INFINITE) Entry.Section.Enter();
  else if (!Entry.Section.TryEnterFor(ATimeout)) {
    Guard.lock();
    DropUser(Table, AObject);
    return false;
  }
  return true;
}

void TMonitor::Exit(const TObject* AObject) {
  TMonitorTable& Table = TMonitorTable::Get();
  const std::lock_guard Guard(Table.Lock);
  const auto Found = Table.Entries.find(AObject);
  if (Found == Table.Entries.end() || !Found->second.Section.IsOwned()) throw EThread(u"The object's lock is not held");
  Found->second.Section.Leave();
  DropUser(Table, AObject);
}

}  // namespace zq
