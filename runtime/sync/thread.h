#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <mutex>

#include "runtime/core/exceptions.h"
#include "runtime/sync/critical_section.h"
#include "runtime/sync/event.h"
#include "runtime/sync/thread_queue.h"

namespace zq {

/// Milliseconds; 0 gives way to other threads.
ZQ_API void Sleep(Cardinal AMilliseconds);

/// True on the thread that the process began with.
[[nodiscard]] ZQ_API bool IsMainThread() noexcept;

/// What EndThread raises to leave the thread's function; a handler for everything lets it pass on. None of the
/// Exception family.
struct TThreadExit {
  Integer Code;
};

/// How willingly the system gives a thread its time.
enum class TThreadPriority : Byte { tpIdle, tpLowest, tpLower, tpNormal, tpHigher, tpHighest, tpTimeCritical };
using enum TThreadPriority;

class TNativeThread;
using TThreadHandle = std::shared_ptr<TNativeThread>;

/// A thread of the system, shared by the thread itself and by whoever holds its handle. Any thread may call.
class ZQ_API TNativeThread {
 public:
  TNativeThread(std::function<Integer()> AFunc, bool ASuspended);
  TNativeThread(const TNativeThread&) = delete;
  TNativeThread& operator=(const TNativeThread&) = delete;

  /// The system's number. Waits for a thread that is just beginning.
  [[nodiscard]] Cardinal ThreadID();
  /// What waits for the thread. Waits for a thread that is just beginning.
  [[nodiscard]] const TThreadQueueRef& Queue();
  /// The thread library's handle (pthread_t).
  [[nodiscard]] unsigned long NativeHandle() const noexcept { return FNative; }
  /// Lets a thread go that was begun suspended.
  void Resume() { FResumed.SetEvent(); }
  /// Set when the thread's function has returned or was left, and its captures are gone.
  [[nodiscard]] TEvent& Ended() noexcept { return FEnded; }
  /// Waits for the end and returns the exit code. Serves meanwhile what is sent to the caller and, on the main thread,
  /// what CheckSynchronize serves, and lets out what that raises. Raises EThread on the thread itself, and where the
  /// threads would wait for each other.
  Integer WaitFor();
  /// 0 until the thread has ended.
  [[nodiscard]] Integer ExitCode() const noexcept { return FExitCode.load(std::memory_order_acquire); }

  /// The priority as a nice value relative to the main thread's: 19, 10, 5, 0, -5, -10, -20. Where the process may not
  /// set that one, which needs a right for all above the present one, the thread keeps what it has. Returns 0, or the
  /// system's error for a thread that has ended.
  Integer SetPriority(TThreadPriority APriority);
  /// What was set last; tpNormal at first.
  [[nodiscard]] TThreadPriority Priority() const noexcept { return FPriority.load(std::memory_order_relaxed); }

  /// Stops the thread wherever it is, with exit code 0: the last resort. Nothing of it is cleaned up: its scopes are
  /// not left, what it had locked stays locked (a lock of the allocator or of a stream among them), what it owned is
  /// lost, its stack included. Calls that wait for it are refused. False where it could not be stopped within two
  /// seconds: it has blocked all signals, or is in a system call that can't be left.
  [[nodiscard]] bool Kill();

 private:
  friend ZQ_API TThreadHandle BeginThread(std::function<Integer()> AFunc, bool ASuspended);
  static void* Main(void* AThread);
  void Begin();
  void Run();
  bool BeginEnd();
  void End(Integer ACode);
  bool Stop();

  std::function<Integer()> FFunc;
  TThreadHandle FSelf;  // until the end
  TEvent FResumed;
  TSimpleEvent FStarted;
  TSimpleEvent FEnded;
  std::atomic<Integer> FExitCode = 0;
  std::atomic<TThreadPriority> FPriority = tpNormal;
  unsigned long FNative = 0;
  std::mutex FEndLock;  // held while the thread is stopped by force: it can't end by itself then
  bool FEnds = false;   // guarded by it
  // Set before FStarted:
  Cardinal FThreadID = 0;
  TThreadQueueRef FQueue;
};

/// Begins a thread that runs AFunc; its result is the exit code. An exception that leaves AFunc ends the thread, and
/// nothing else, with the code -1. Raises EThread where the system has no thread to give. ASuspended holds AFunc back
/// until Resume.
[[nodiscard]] ZQ_API TThreadHandle BeginThread(std::function<Integer()> AFunc, bool ASuspended = false);
/// Ends the calling thread, one that BeginThread began, with that exit code; scopes are left on the way.
[[noreturn]] ZQ_API void EndThread(Integer AExitCode);
/// Names the calling thread for debuggers and lists of threads: the first 15 bytes, whole characters of UTF-8. Never
/// fails.
ZQ_API void SetThreadName(const UnicodeString& AName) noexcept;

/// Runs what waits for the main thread and returns whether there was anything; with an empty queue waits for at most
/// ATimeout milliseconds. On the main thread only: raises EThread elsewhere. A queued call that raises lets its
/// exception out here; what stands behind it stays queued.
ZQ_API bool CheckSynchronize(Cardinal ATimeout = 0);
/// Set while calls wait for the main thread; CheckSynchronize resets it.
[[nodiscard]] ZQ_API TEvent& SyncEvent();

using TThreadProcedure = std::function<void()>;

/// A thread as an object. Made by New; begins to run in AfterConstruction unless made suspended, else in Start.
///
/// Free terminates and waits for a thread that runs; with FreeOnTerminate it frees itself, and nobody else may touch it
/// once it can have ended. Once it is started any thread may call.
class ZQ_API TThread : public TObject {
 public:
  explicit TThread(bool ACreateSuspended = false) noexcept : FCreateSuspended(ACreateSuspended) {}

  /// Raises EThread on a thread that was started.
  void Start();
  /// Asks Execute to return; nothing is forced. Before Execute was entered it keeps it from being so.
  void Terminate();
  /// Waits for the end and returns ReturnValue. On the main thread it runs meanwhile what is queued for that, and lets
  /// out what that raises. Raises EThread on the thread itself and on one that was not started.
  Integer WaitFor();

  [[nodiscard]] bool Terminated() const noexcept { return FTerminated.load(std::memory_order_acquire); }
  /// Execute has returned.
  [[nodiscard]] bool Finished() const noexcept { return FFinished.load(std::memory_order_acquire); }
  [[nodiscard]] bool FreeOnTerminate() const noexcept { return FFreeOnTerminate.load(std::memory_order_acquire); }
  void SetFreeOnTerminate(bool AValue) noexcept { FFreeOnTerminate.store(AValue, std::memory_order_release); }
  [[nodiscard]] Integer ReturnValue() const noexcept { return FReturnValue.load(std::memory_order_acquire); }
  void SetReturnValue(Integer AValue) noexcept { FReturnValue.store(AValue, std::memory_order_release); }
  /// 0 before the start.
  [[nodiscard]] Cardinal ThreadID() const noexcept;
  /// What ended Execute; to be read when the thread has finished.
  [[nodiscard]] const ExceptionRef& FatalException() const noexcept { return FFatalException; }

  /// Runs AProcedure on the main thread, in its next CheckSynchronize or WaitFor, and waits for that, for ever if there
  /// is none; at once where the caller is the main thread. What it raises is raised here, as the same object. AThread,
  /// which may be null, is whose RemoveQueuedEvents drops a queued call.
  static void Synchronize(const TThread* AThread, const TThreadProcedure& AProcedure);
  /// The same without waiting; on the main thread at once.
  static void Queue(const TThread* AThread, TThreadProcedure AProcedure);
  /// As Queue, but never at once.
  static void ForceQueue(const TThread* AThread, TThreadProcedure AProcedure);
  /// Drops what was queued for AThread; its own end does that too.
  static void RemoveQueuedEvents(const TThread* AThread);

 protected:
  ~TThread() override;
  void AfterConstruction() override;
  void BeforeDestruction() override;
  virtual void Execute() = 0;
  /// Called by Terminate, on its thread.
  virtual void TerminatedSet() {}
  void Synchronize(const TThreadProcedure& AProcedure) { Synchronize(this, AProcedure); }
  void Queue(TThreadProcedure AProcedure) { Queue(this, std::move(AProcedure)); }

 private:
  Integer Run();

  const bool FCreateSuspended;
  TThreadHandle FHandle;
  ExceptionRef FFatalException;
  std::atomic<bool> FTerminated = false;
  std::atomic<bool> FFinished = false;
  std::atomic<bool> FFreeOnTerminate = false;
  std::atomic<Integer> FReturnValue = 0;
};

/// Atomic steps on plain numbers; each returns the new value, Exchange and CompareExchange the old one.
struct TInterlocked {
  template <class T>
  static T Add(T& ATarget, std::type_identity_t<T> ABy) noexcept {
    const T Former = std::atomic_ref<T>(ATarget).fetch_add(ABy);
    if constexpr (std::floating_point<T>) return Former + ABy;
    else return static_cast<T>(static_cast<UInt64>(Former) + static_cast<UInt64>(ABy));  // wraps as the atomic sum does
  }
  template <class T>
  static T Increment(T& ATarget) noexcept {
    return Add(ATarget, T{1});
  }
  template <class T>
  static T Decrement(T& ATarget) noexcept {
    return Add(ATarget, static_cast<T>(-1));
  }
  template <class T>
  static T Exchange(T& ATarget, std::type_identity_t<T> AValue) noexcept {
    return std::atomic_ref<T>(ATarget).exchange(AValue);
  }
  template <class T>
  static T CompareExchange(T& ATarget, std::type_identity_t<T> AValue, std::type_identity_t<T> AComparand) noexcept {
    std::atomic_ref<T>(ATarget).compare_exchange_strong(AComparand, AValue);
    return AComparand;
  }
};

/// A re-entrant lock for each object, which exists only while somebody holds or wants it.
struct ZQ_API TMonitor {
  static void Enter(const TObject* AObject);
  /// Waits for at most ATimeout milliseconds.
  [[nodiscard]] static bool Enter(const TObject* AObject, Cardinal ATimeout);
  [[nodiscard]] static bool TryEnter(const TObject* AObject) { return Enter(AObject, 0); }
  /// Raises EThread where the caller doesn't hold the lock.
  static void Exit(const TObject* AObject);
};

}  // namespace zq
