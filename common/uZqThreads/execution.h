#pragma once

#include <concepts>
#include <functional>
#include <memory>

#include "common/uZqThreads/locks.h"
#include "common/uZqThreads/manager.h"
#include "runtime/core/interfaces.h"
#include "runtime/platform/process_service.h"

namespace zq {

/// Work that gets the event which its end sets: it may set it before, or reset it.
using TZqEventProc = std::function<void(const IntfRef<IZqSimpleEvent>& AEvent)>;

/// A thread for one callable. It frees itself.
class ZQ_API TZqExecThread : public TZqThread {
 public:
  /// Runs AProc once. AEvent, which may be empty, is set behind it, but not where it raises. On the default manager, as
  /// all without one.
  TZqExecThread(TZqEventProc AProc, IntfRef<IZqSimpleEvent> AEvent);
  /// AData is given to AProc, and the thread doesn't look at it.
  TZqExecThread(TZqThreadProc AProc, Pointer AData);
  TZqExecThread(TZqThreadMethod AProc, Pointer AData);
  TZqExecThread(TZqThreadManager* AThreadManager, TZqThreadProc AProc, Pointer AData);
  TZqExecThread(TZqThreadManager* AThreadManager, TZqThreadMethod AProc, Pointer AData);

 protected:
  ~TZqExecThread() override = default;
  void Execute(TZqThreadAction& AThreadAction) override;

 private:
  const IntfRef<IZqSimpleEvent> FEvent;
  // One of the three:
  const TZqEventProc FExecuteAnonymous;
  const TZqThreadProc FExecuteProc = nullptr;
  const TZqThreadMethod FExecuteMethod;
  Pointer FData = nullptr;
};

/// TZqThreadManager::RunThreaded of the default manager.
ZQ_API TZqThread* ZqRunThreaded(TZqThreadProc AProc, Pointer AData);
ZQ_API TZqThread* ZqRunThreaded(TZqThreadMethod AProc, Pointer AData);
template <class T>
  requires(std::convertible_to<T, TZqThreadProc> && !std::same_as<T, TZqThreadProc>)
TZqThread* ZqRunThreaded(T AProc, Pointer AData) { return ZqRunThreaded(static_cast<TZqThreadProc>(AProc), AData); }
/// Runs AProc once on a thread of the default manager. The result is set when it has returned, and never where it
/// raises: OnThreadError of the manager hears of that.
ZQ_API IntfRef<IZqSimpleEvent> ZqRunThreaded(TZqEventProc AProc);

/// Has the main thread run AProc in its loop, a WaitFor or a CheckSynchronize; at once where that is the caller. The
/// result is set behind it, also where it raises, which comes out where it was run.
ZQ_API IntfRef<IZqSimpleEvent> ZqQueue(TZqEventProc AProc);

/// Names the calling thread for debuggers. A name that is too long is cut; nothing fails.
ZQ_API void ZqSetThreadName(const UnicodeString& AName);

/// A process that was started.
struct PROCESS_INFORMATION {
  std::shared_ptr<TChildProcess> hProcess;  ///< empty where the system has refused
  Cardinal dwProcessId = 0;
};
/// Starts a command line, with this process's input and outputs, and doesn't wait for it. What fails shows in the
/// result, and the reason in GetLastError.
ZQ_API PROCESS_INFORMATION ZqCreateProcess(const UnicodeString& ACommand);

}  // namespace zq
