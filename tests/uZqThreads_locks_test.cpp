#include <array>

#include "common/uZqThreads.h"
#include "runtime/sync/keyed_locks.h"
#include "runtime/sync/thread.h"
#include "tests/support/support.h"

namespace zq {
namespace {

// The main thread has the lock for so long, or until the wait ends. Clocks show whole milliseconds.
TEST(LockTimeOut, EndsAtTheLockOrWhenMoreThanTheTimeIsOver) {
  const struct {
    Cardinal TimeOut, HeldFor;
    Int64 AtLeast;
  } cCases[] = {{0, 10'000, 0}, {1, 10'000, 2}, {50, 10'000, 51}, {10'000, 50, 0}, {INFINITE, 50, 0}};
  for (const auto& Case : cCases) {
    TZqCriticalSection Section;
    Section.Enter();
    const auto Waiter = BeginThread([&] {
      const bool Taken = Case.HeldFor < Case.TimeOut;
      bool Unlock = !Taken;
      const Int64 Start = TDeadline::Now() / 1'000'000;
      for (int i = Case.TimeOut == 0 ? 1000 : 1; i > 0; --i) EXPECT_EQ(Section.Lock(Unlock, Case.TimeOut), Taken);
      const Int64 Waited = TDeadline::Now() / 1'000'000 - Start;
      EXPECT_TRUE(Unlock == Taken && Waited >= Case.AtLeast && Waited < Case.AtLeast + 500) << Case.TimeOut;
      if (Taken) Section.Enter();
      for (int i = 0; i < 2; ++i) Section.Unlock(Unlock);
      EXPECT_EQ(Section.IsOwned(), Taken) << "one level is given back, once";
      return 0;
    });
    Waiter->Ended().WaitFor(Case.HeldFor);
    EXPECT_TRUE(Section.IsOwned()) << "nothing is given back that wasn't taken";
    Section.Leave();
    Waiter->WaitFor();
  }
}

TEST(LockExecute, CallsOneOfTheTwoAndGivesTheLockBack) {
  TZqCriticalSection Section;
  const auto Success = [&] { throw EAbort(Section.IsOwned() ? u"held" : u"free"); };
  const auto Failure = [&] { throw EConvertError(Section.IsOwned() ? u"held" : u"free"); };
  const auto Limited = [&] { Section.Execute(1, Success, Failure); };
  EXPECT_EQ(RaisedBy([&] { Section.Execute(Success); }), u"EAbort: held");
  EXPECT_EQ(RaisedBy(Limited), u"EAbort: held");
  EXPECT_FALSE(Section.IsOwned());
  Section.Execute([&] { OnThreads(1, [&](int) { EXPECT_EQ(RaisedBy(Limited), u"EConvertError: free"); }); });
}

TEST(LockByPointer, LivesAsLongAsSomebodyHoldsOrWantsIt) {
  const auto& Locks = uZqThreads::DataLocks();
  const auto Raised = [](const void* AKey) { return RaisedBy([&] { ZqThreadUnlock(AKey); }); };
  for (const void* const Key : {static_cast<const void*>(nullptr), static_cast<const void*>(&Locks)}) {
    for (int i = 0; i < 2; ++i) ZqThreadLock(Key);
    const auto Waiter = BeginThread([&] {
      EXPECT_EQ(Raised(Key).Pos(u"EAssertionFailed: The lock is another thread's (common/uZqThreads, line "), 1);
      const TZqThreadLockScope Other(&Raised), Wanted(Key);  // the first one waits for nobody
      return Locks.Count(Key) == 1 && Locks.Keys() == 2;
    });
    while (Locks.Count(Key) < 3) Sleep(1);
    for (int i = 0; i < 2; ++i) ZqThreadUnlock(Key);
    EXPECT_TRUE(Waiter->WaitFor() == 1 && Locks.Keys() == 0);
    EXPECT_EQ(Raised(Key).Pos(u"EAssertionFailed: Assertion failure (common/uZqThreads, line "), 1);
  }
}

TEST(LockByPointer, KeepsThreadsApartWhileLocksComeAndGo) {
  std::array<std::size_t, 7> Guarded{};
  OnThreads(4, [&](int AThread) {
    for (std::size_t i = 0; i < 35'000; ++i) {
      std::size_t& Mine = Guarded[i * (static_cast<std::size_t>(AThread) + 1) % 7];
      const TZqThreadLockScope Scope(&Mine);
      ++Mine;
    }
  });
  for (const std::size_t Count : Guarded) EXPECT_EQ(Count, 20'000U);
  EXPECT_EQ(uZqThreads::DataLocks().Keys(), 0U);
}

}  // namespace
}  // namespace zq
