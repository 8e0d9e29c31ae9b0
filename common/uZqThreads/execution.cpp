#include "common/uZqThreads/execution.h"

#include <utility>

#include "runtime/sync/thread.h"

namespace zq {

// ---------------------------------------------------------------------------------------- TZqExecThread

TZqExecThread::TZqExecThread(TZqEventProc AProc, IntfRef<IZqSimpleEvent> AEvent)
    : TZqThread(false), FEvent(std::move(AEvent)), FExecuteAnonymous(std::move(AProc)) {}

TZqExecThread::TZqExecThread(TZqThreadProc AProc, Pointer AData) : TZqExecThread(ZqThreadManager(), AProc, AData) {}

TZqExecThread::TZqExecThread(TZqThreadMethod AProc, Pointer AData)
    : TZqExecThread(ZqThreadManager(), std::move(AProc), AData) {}

TZqExecThread::TZqExecThread(TZqThreadManager* AThreadManager, TZqThreadProc AProc, Pointer AData)
    : TZqThread(AThreadManager, false), FExecuteProc(AProc), FData(AData) {}

TZqExecThread::TZqExecThread(TZqThreadManager* AThreadManager, TZqThreadMethod AProc, Pointer AData)
    : TZqThread(AThreadManager, false), FExecuteMethod(std::move(AProc)), FData(AData) {}

void TZqExecThread::Execute(TZqThreadAction& AThreadAction) {
  if (FExecuteAnonymous) FExecuteAnonymous(FEvent);
  else if (FExecuteProc != nullptr) FExecuteProc(this, AThreadAction, FData);
  else if (FExecuteMethod) FExecuteMethod(this, AThreadAction, FData);
  if (FEvent) FEvent->SetEvent();
}

TZqThread* TZqThreadManager::RunThreaded(TZqThreadProc AProc, Pointer AData) {
  return New<TZqExecThread>(this, AProc, AData);
}

TZqThread* TZqThreadManager::RunThreaded(TZqThreadMethod AProc, Pointer AData) {
  return New<TZqExecThread>(this, std::move(AProc), AData);
}

// ---------------------------------------------------------------------------------------- Functions

TZqThread* ZqRunThreaded(TZqThreadProc AProc, Pointer AData) { return ZqThreadManager()->RunThreaded(AProc, AData); }

TZqThread* ZqRunThreaded(TZqThreadMethod AProc, Pointer AData) {
  return ZqThreadManager()->RunThreaded(std::move(AProc), AData);
}

IntfRef<IZqSimpleEvent> ZqRunThreaded(TZqEventProc AProc) {
  IntfRef<IZqSimpleEvent> Result(New<TZqSimpleEvent>());
  static_cast<void>(New<TZqExecThread>(std::move(AProc), Result));
  return Result;
}

IntfRef<IZqSimpleEvent> ZqQueue(TZqEventProc AProc) {
  IntfRef<IZqSimpleEvent> Result(New<TZqSimpleEvent>());
  TThread::Queue(nullptr, [Result, Proc = std::move(AProc)] {
    struct TSet {
      ~TSet() { Event->SetEvent(); }
      const IntfRef<IZqSimpleEvent>& Event;
    } const Set{Result};
    Proc(Result);
  });
  return Result;
}

void ZqSetThreadName(const UnicodeString& AName) { SetThreadName(AName); }

PROCESS_INFORMATION ZqCreateProcess(const UnicodeString& ACommand) {
  PROCESS_INFORMATION Result;
  Result.hProcess = Service<TProcessService>().CreateFreeProcess(ACommand);
  if (Result.hProcess != nullptr) Result.dwProcessId = Result.hProcess->GetProcessId();
  return Result;
}

}  // namespace zq
