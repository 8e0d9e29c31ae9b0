#include <atomic>
#include <cstdio>

#include "common/uZqThreads.h"
#include "runtime/sync/message_window.h"

using namespace zq;

namespace {

class TCounter : public TZqThread {
 public:
  TCounter() : TZqThread(false) { SetFreeOnTerminate(false); }
  std::atomic<int> Count = 0;

 protected:
  ~TCounter() override = default;
  void Execute(TZqThreadAction& AAction) override {
    AAction = ++Count < 3 ? taRunAgain : taTerminate;
    Sleep(1);
  }
};

}  // namespace

int main() {
  TZqCriticalSection Section;
  Integer Stock = 0;
  Section.Execute([&] { Stock = 7; });
  Section.Execute(
      50, [&] { --Stock; }, [] { /* busy for more than 50 ms */ });

  bool Taken = false;
  if (Section.Lock(Taken, 50)) ++Stock;
  Section.Unlock(Taken);

  {
    const TZqThreadLockScope Scope(&Stock);
    ++Stock;
  }

  const IntfRef<IZqSimpleEvent> Done = New<TZqSimpleEvent>();
  const TThreadHandle Worker = BeginThread([Done] {
    Done->SetEvent();
    return 0;
  });
  const bool Signaled = Done->WaitFor(10000) == wrSignaled;

  TZqThreadManager* const Manager = ZqThreadManager();
  Manager->SetOnThreadError(
      [](TZqThread* AThread) { std::printf("%s\n", AThread->FatalException().Message().ToUTF8().c_str()); });
  const TOwned<TCounter> Counter(New<TCounter>());
  while (!Counter->Terminated()) ProcessMessages(10);
  Counter->WaitFor();

  std::atomic<bool> Made = false;
  const IntfRef<IZqSimpleEvent> Ready = ZqRunThreaded([&](const auto&) { Made = true; });
  Ready->WaitFor();

  const auto Step = [](TZqThread*, TZqThreadAction& AAction, Pointer AData) {
    AAction = ++*static_cast<Integer*>(AData) < 10 ? taRunAgain : taTerminate;
  };
  ZqRunThreaded(Step, &Stock);
  Manager->TerminateAllThreads(false);
  while (Manager->ThreadCount() > 1) ProcessMessages(10);

  const bool Counted = Counter->Count == 3 && Made;
  return Signaled && Worker->WaitFor() == 0 && Stock >= 8 && !Taken && Counted ? 0 : 1;
}
