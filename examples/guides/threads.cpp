#include "common/uZqThreads.h"
#include "runtime/sync/thread.h"

using namespace zq;

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

  return Signaled && Worker->WaitFor() == 0 && Stock == 8 && !Taken ? 0 : 1;
}
