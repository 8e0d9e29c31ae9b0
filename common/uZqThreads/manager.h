#pragma once

#include <concepts>

#include "common/uZqThreads/managed.h"
#include "runtime/component/component.h"
#include "runtime/containers/lists.h"

namespace zq {

/// Plain and object-bound work of a thread: AThreadAction decides what comes next, and taTerminate, as which it comes,
/// ends the thread.
using TZqThreadProc = void (*)(TZqThread* ASender, TZqThreadAction& AThreadAction, Pointer AData);
using TZqThreadMethod = TMethod<void(TZqThread* ASender, TZqThreadAction& AThreadAction, Pointer AData)>;

/// The manager of ownerless threads: the first one living that has no owner, made where there is none, and then alive
/// until somebody frees it or the module stops. It is best made first on the main thread, whose loop then has its
/// callbacks.
[[nodiscard]] ZQ_API TZqThreadManager* ZqThreadManager();

/// The component around a group of threads: keeps their list, ends them, and carries their callbacks and the system's
/// events.
///
/// The six callbacks run on the thread that made the manager, while the thread that raises them waits; so that thread
/// has to be in its loop (RunMessageLoop, ProcessMessages) or in a WaitFor. With MultiThreadedEvents they run at once
/// where they are raised. What they raise comes out there as the same object. They are to be set before threads run,
/// and to be exchanged by the manager's thread only. A callback must not wait for a thread that needs the list, as the
/// end of each does, where it is called under the lock of that, by TerminateThread and its kin.
///
/// Session, power and end-of-session events reach the threads on the manager's thread, under the lock of the list, with
/// SessionEvents for those of sessions.
///
/// Its end terminates its threads, waits for all and frees them: it belongs on the manager's thread. On another one it
/// waits until that serves it. Managers are made and freed by one thread at a time.
class ZQ_API TZqThreadManager : public TComponent {
 public:
  explicit TZqThreadManager(TComponent* AOwner);

  [[nodiscard]] Integer ThreadCount() const;
  /// In the order of their making. Raises EListError.
  [[nodiscard]] TZqThread* GetThread(Integer AIndex) const;

  /// Runs AProc on a thread of its own, again and again as it asks for it. The thread frees itself: the result may be
  /// used only while it is certain to be alive. Raises EZqThread where the system has no thread to give.
  TZqThread* RunThreaded(TZqThreadProc AProc, Pointer AData);
  TZqThread* RunThreaded(TZqThreadMethod AProc, Pointer AData);
  template <class T>
    requires(std::convertible_to<T, TZqThreadProc> && !std::same_as<T, TZqThreadProc>)
  TZqThread* RunThreaded(T AProc, Pointer AData) { return RunThreaded(static_cast<TZqThreadProc>(AProc), AData); }

  /// Terminates a thread of this manager. With waiting it is freed when this returns, else it frees itself, whatever
  /// its FreeOnTerminate was. Raises EZqThread where AThread isn't in the list, and for waiting on AThread itself.
  void TerminateThread(TZqThread* AThread, bool AWaitForTermination);
  /// The same with all. There is no limit to the wait.
  void TerminateAllThreads(bool AWaitForTermination);
  /// Stops a thread that doesn't return, without its cooperation, and frees it; see TNativeThread::Kill for what is
  /// left locked and lost then. Raises EZqThread where it can't be stopped; it goes on, and is the caller's to free
  /// then.
  void KillUnresponsiveThread(TZqThread* AThread);

  [[nodiscard]] bool SessionEvents() const noexcept { return FSessionEvents; }
  /// By the manager's thread. Raises as WTSRegisterSessionNotification, and stays as it was then.
  void SetSessionEvents(bool AValue);
  [[nodiscard]] bool MultiThreadedEvents() const noexcept { return FMultiThreadedEvents; }
  void SetMultiThreadedEvents(bool AValue) noexcept { FMultiThreadedEvents = AValue; }

  [[nodiscard]] const TZqThreadEvent& OnThreadError() const noexcept { return FOnThreadError; }
  [[nodiscard]] const TZqThreadEvent& OnThreadRunning() const noexcept { return FOnThreadRunning; }
  [[nodiscard]] const TZqThreadEvent& OnThreadSuspended() const noexcept { return FOnThreadSuspended; }
  [[nodiscard]] const TZqThreadEvent& OnThreadDone() const noexcept { return FOnThreadDone; }
  [[nodiscard]] const TZqThreadEvent& OnThreadDestroyed() const noexcept { return FOnThreadDestroyed; }
  [[nodiscard]] const TZqThreadEvent& OnThreadStateChanged() const noexcept { return FOnThreadStateChanged; }
  /// With the exception in FatalException.
  void SetOnThreadError(TZqThreadEvent AValue) noexcept { FOnThreadError = std::move(AValue); }
  /// Before each step.
  void SetOnThreadRunning(TZqThreadEvent AValue) noexcept { FOnThreadRunning = std::move(AValue); }
  void SetOnThreadSuspended(TZqThreadEvent AValue) noexcept { FOnThreadSuspended = std::move(AValue); }
  /// The last of the thread's run. What it raises goes no further.
  void SetOnThreadDone(TZqThreadEvent AValue) noexcept { FOnThreadDone = std::move(AValue); }
  /// Before the object goes, on the thread that frees it.
  void SetOnThreadDestroyed(TZqThreadEvent AValue) noexcept { FOnThreadDestroyed = std::move(AValue); }
  void SetOnThreadStateChanged(TZqThreadEvent AValue) noexcept { FOnThreadStateChanged = std::move(AValue); }

 protected:
  ~TZqThreadManager() override;
  void AfterConstruction() override;
  void BeforeDestruction() override;
  void EndRefused() noexcept override;

 private:
  friend class TZqThread;
  using TField = TZqThreadEvent TZqThreadManager::*;
  using TList = TThreadListOf<TZqThread*>;

  void AddThread(TZqThread* AThread) { FThreads.Add(AThread); }
  void RemoveThread(TZqThread* AThread) { FThreads.Remove(AThread); }
  bool BeginsToFreeItself(TZqThread* AThread);
  void StaysAfterAll(TZqThread* AThread);
  void DoThreadError(TZqThread* AThread) { Fire(&TZqThreadManager::FOnThreadError, AThread); }
  void DoThreadRunning(TZqThread* AThread) { Fire(&TZqThreadManager::FOnThreadRunning, AThread); }
  void DoThreadSuspended(TZqThread* AThread) { Fire(&TZqThreadManager::FOnThreadSuspended, AThread); }
  void DoThreadDone(TZqThread* AThread) { Fire(&TZqThreadManager::FOnThreadDone, AThread); }
  void DoThreadDestroyed(TZqThread* AThread) { Fire(&TZqThreadManager::FOnThreadDestroyed, AThread); }
  void DoThreadStateChanged(TZqThread* AThread) { Fire(&TZqThreadManager::FOnThreadStateChanged, AThread); }
  void Fire(TField AField, TZqThread* AThread) {
    if (this->*AField) Call(AField, AThread);
  }
  void Call(TField AField, TZqThread* AThread);
  void SyncEvent(Integer AMessage, TZqThread* AThread);
  void SyncCall(TCallRef ACall);
  NativeInt WindowProc(Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam);
  NativeInt SystemMessage(Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam);
  void DoSessionEvent(TZqSessionEventType AEventType, Cardinal ASessionID);
  void DoPowerEvent(TZqPowerEventType AEventType);
  void DoQueryEndSession(const TZqEndSessionTypes& AEndTypes, bool& ACanEnd);
  void DoEndSession(bool AEnding, const TZqEndSessionTypes& AEndTypes);
  template <class TCall>
  void TellThreads(TCall ACall);
  struct TEnding {
    TThreadHandle Handle;
    TZqThread* Owned;  // to be freed then; null for one that frees itself
  };
  TZqThread* Listed(TList::TScope& AList, TZqThread* AThread);
  TEnding Tell(TZqThread* AThread, bool AWait);
  static void End(const TEnding& AEnding);
  void CloseWindow();
  static const TField (&Callbacks())[6];

  HWND FHWND = 0;
  mutable TList FThreads;
  bool FMultiThreadedEvents = false;
  TZqThreadEvent FOnThreadError, FOnThreadRunning, FOnThreadSuspended, FOnThreadDone, FOnThreadDestroyed,
      FOnThreadStateChanged;
  bool FSessionEvents = false;
  bool FSessionEventsRegistered = false;
};

namespace uZqThreads {
void StartManagers();
void StopManagers();
}  // namespace uZqThreads

}  // namespace zq
