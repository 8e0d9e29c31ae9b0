#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <string_view>

#include "common/uZqSessionEvents.h"
#include "runtime/core/delegates.h"
#include "runtime/sync/event.h"
#include "runtime/sync/thread.h"

/// Threads as repeated steps in a visible state machine, each with a manager.
namespace zq {

class TZqThread;
class TZqThreadManager;

struct ZQ_API EZqThread : Exception {
  using Exception::Exception;
};
// For hosts; nothing here raises them.
struct ZQ_API EZqThreadAborted : EZqThread {
  using EZqThread::EZqThread;
};
struct ZQ_API EZqThreadInUse : EZqThread {
  using EZqThread::EZqThread;
};

/// What a step asks for next.
enum class TZqThreadAction : std::uint8_t { taRunAgain, taSuspend, taTerminate };
using enum TZqThreadAction;

enum class TZqThreadState : std::uint8_t {
  tsCreated,      ///< made; its run has not begun
  tsRunning,      ///< in the loop of its steps
  tsSuspended,    ///< waits for Resume
  tsSleeping,     ///< in Sleep
  tsTerminating,  ///< told to stop, and not ended yet
  tsTerminated,   ///< ended after it was told to stop
  tsFinished,     ///< ended by itself
  tsError         ///< ended by an exception, or in a state that is no proper end
};
using enum TZqThreadState;

/// The states' names.
struct TZqThreadStateTexts {
  char16_t Texts[8][12];
  [[nodiscard]] constexpr std::u16string_view operator[](TZqThreadState AState) const noexcept {
    return Texts[static_cast<Byte>(AState)];
  }
};
inline constexpr TZqThreadStateTexts ZqThreadStates{
    {u"Created", u"Running", u"Suspended", u"Sleeping", u"Terminating", u"Terminated", u"Finished", u"Error"}};

using TZqThreadEvent = TMethod<void(TZqThread* ASender)>;
using TZqSyncMethod = TMethod<void(Pointer AData)>;

/// Raises EZqThread with the system's text for a code that isn't 0.
ZQ_API void CheckThreadError(Integer AErrCode);
/// The same for the last error where ASuccess is false.
ZQ_API void CheckThreadError(bool ASuccess);

/// A worker: its run is Initialize, then Execute again and again as that asks for it, then Finalize.
///
/// Made by New, which has it run when all its constructors have finished. It frees itself at its end, unless
/// FreeOnTerminate is cleared before it can end: nobody else may touch it then once it can have ended. An owner who
/// frees it has it terminated and waits for its end, in every state.
///
/// What Execute raises ends the thread in tsError, with FatalException. A thread stops only by itself: Terminate
/// changes the state and wakes it, a long step has to look at Terminated. Any thread may call what is public;
/// Initialize, Execute and Finalize run on the thread, the four operations of system events on the manager's thread and
/// under the lock of its list.
class ZQ_API TZqThread : public TObject {
 public:
  /// On the default manager, see ZqThreadManager.
  explicit TZqThread(bool ACreateSuspended);
  /// ACreateSuspended has it initialize and then wait for Resume. AThreadManager must outlive it, which a manager's end
  /// sees to. Raises EZqThread where the system has no thread to give.
  TZqThread(TZqThreadManager* AThreadManager, bool ACreateSuspended);

  /// Waits for the end and returns the exit code: 0, or 4294967295 after an error. At once in tsCreated and where the
  /// thread has ended. Serves meanwhile what is sent to the caller, such as the callbacks of a manager that it made.
  /// Raises EZqThread on the thread itself, and EThread where threads would wait for each other without end.
  Cardinal WaitFor();
  /// Tells it to stop and ends its Sleep or suspension. AResumeWhenSuspended also takes back what Suspend has asked
  /// for.
  virtual void Terminate(bool AResumeWhenSuspended);
  /// Has it wait for Resume when its present step has returned.
  virtual void Suspend();
  /// Ends a suspension or a Sleep, also one that is just about to begin.
  virtual void Resume();

  [[nodiscard]] ExceptionRef FatalException() const;
  /// The thread library's (pthread_t).
  [[nodiscard]] NativeUInt Handle() const noexcept { return FHandle->NativeHandle(); }
  [[nodiscard]] Cardinal ThreadID() const { return FHandle->ThreadID(); }
  [[nodiscard]] TZqThreadState ThreadState() const noexcept { return FThreadState.load(); }
  [[nodiscard]] bool FreeOnTerminate() const noexcept { return FFreeOnTerminate.load(); }
  void SetFreeOnTerminate(bool AValue) noexcept { FFreeOnTerminate.store(AValue); }
  /// In one of the last four states.
  [[nodiscard]] bool Terminated() const noexcept { return ThreadState() >= tsTerminating; }
  /// Whether somebody wants it suspended, whatever its state.
  [[nodiscard]] bool Suspended() const noexcept { return FSuspendRequested.load(); }
  [[nodiscard]] TThreadPriority Priority() const noexcept { return FHandle->Priority(); }
  /// See TNativeThread::SetPriority. Raises EZqThread where the thread has ended.
  void SetPriority(TThreadPriority AValue);
  [[nodiscard]] TZqThreadManager* ThreadManager() const noexcept { return FThreadManager; }

 protected:
  ~TZqThread() override;
  void AfterConstruction() override;
  void BeforeDestruction() override;

  virtual void _Execute();
  /// Refuses to go back from one of the last four states. Tells the manager; what its callback raises makes the state
  /// tsError and stays in FatalException.
  virtual void SetThreadState(TZqThreadState AState);
  virtual void Initialize() {}
  /// One step. AThreadAction comes as taTerminate at first, and then as the step before has left it.
  virtual void Execute(TZqThreadAction&) {}
  virtual void Finalize() {}
  virtual void DoThreadDone();
  virtual void DoThreadError();
  virtual void DoSessionEvent(TZqSessionEventType, Cardinal) {}
  virtual void DoPowerEvent(TZqPowerEventType) {}
  virtual void DoQueryEndSession(const TZqEndSessionTypes&, bool&) {}
  virtual void DoEndSession(bool, const TZqEndSessionTypes&) {}
  /// By the thread itself: waits for so many milliseconds, or until Terminate or Resume.
  virtual void Sleep(Integer AMilliseconds);
  /// By the thread itself: waits while a suspension is asked for.
  void CheckSuspended();
  /// Runs AMethod(AData) on the manager's thread and returns when it is done. What it raises is raised here, as the
  /// same object. Raises ECallRefused where that thread has ended.
  void Synchronize(const TZqSyncMethod& AMethod, Pointer AData);

 private:
  friend class TZqThreadManager;
  Integer Run();
  void RunGuarded();
  void RunSteps();
  Integer Close();
  void KeepFatal(ExceptionRef AException);
  void Wake(bool AResume);
  [[nodiscard]] bool IsOwn() const { return FHandle->ThreadID() == GetCurrentThreadId(); }

  TZqThreadManager* const FThreadManager;
  std::atomic<bool> FFreeOnTerminate = true;
  bool FFreesItself = false;  // guarded by the manager's list: it is about to
  const std::shared_ptr<std::atomic<bool>> FMayRun = std::make_shared<std::atomic<bool>>(false);
  TThreadHandle FHandle;
  std::atomic<bool> FSuspendRequested;
  std::atomic<Integer> FReturnValue = 0;
  std::atomic<TZqThreadState> FThreadState = tsCreated;
  mutable std::mutex FLock;
  // Guarded by FLock:
  TSimpleEvent FSuspendEvent;  // set but in a suspension or a Sleep
  UInt64 FResumes = 0;
  ExceptionRef FFatalException;
};

}  // namespace zq
