#include <array>
#include <atomic>
#include <numeric>

#include "common/uZqThreads.h"
#include "runtime/sync/keyed_locks.h"
#include "runtime/sync/thread.h"
#include "tests/support/support.h"

namespace zq {
namespace {

constexpr Cardinal cLong = 30'000;  // ms that no passing test waits for

Int64 Milliseconds() { return TDeadline::Now() / 1'000'000; }

// ---- TZqCriticalSection --------------------------------------------------------------------------------------------

// Another thread has it for AHeld milliseconds.
struct TWaitCase {
  const char* Name;
  Cardinal TimeOut, Held;
  bool Taken;
  Int64 AtLeast;
};
class LockTimeOut : public testing::TestWithParam<TWaitCase> {};

TEST_P(LockTimeOut, EndsAtTheLockOrWhenMoreThanTheTimeIsOver) {
  TZqCriticalSection Section;
  TSimpleEvent Held, Over;
  const auto Holder = BeginThread([&] {
    Section.Execute([&] {
      Held.SetEvent();
      Over.WaitFor(GetParam().Held);
    });
    return 0;
  });
  Held.WaitFor();
  for (const bool ByLock : {false, true}) {
    bool Unlock = !GetParam().Taken;
    const Int64 Start = Milliseconds();
    EXPECT_EQ(
        ByLock ? Section.Lock(Unlock, GetParam().TimeOut) : Section.TryEnter(GetParam().TimeOut), GetParam().Taken);
    const Int64 Waited = Milliseconds() - Start;
    if (!GetParam().Taken || !ByLock) {
      EXPECT_GE(Waited, GetParam().AtLeast);
    }
    EXPECT_LT(Waited, GetParam().AtLeast + 500);
    if (ByLock) {
      EXPECT_EQ(Unlock, GetParam().Taken);
      Section.Unlock(Unlock);
      EXPECT_FALSE(Unlock);
      Section.Unlock(Unlock);
    }
    EXPECT_EQ(Section.IsOwned(), GetParam().Taken) << "Unlock gives back one level, and once";
  }
  if (GetParam().Taken) Section.Leave();
  Over.SetEvent();
  Holder->WaitFor();
}
INSTANTIATE_TEST_SUITE_P(Section, LockTimeOut,
    testing::Values(TWaitCase{"TriesOnce", 0, cLong, false, 0}, TWaitCase{"WaitsForOne", 1, cLong, false, 2},
        TWaitCase{"WaitsLonger", 50, cLong, false, 51}, TWaitCase{"TakesItWhenItIsFree", cLong, 50, true, 48},
        TWaitCase{"HasNoLimit", INFINITE, 50, true, 48}),
    [](const auto& AInfo) { return std::string(AInfo.param.Name); });

TEST(LockExecute, RunsOneOfTheTwoAndGivesTheLockBack) {
  TZqCriticalSection Section;
  int Runs = 0;
  const auto Success = [&] {
    EXPECT_TRUE(Section.IsOwned());
    if (++Runs % 2 == 0) throw EAbort(u"lost");
  };
  const auto Failure = [&] {
    EXPECT_FALSE(Section.IsOwned());
    throw EConvertError(u"busy");
  };
  for (const char16_t* Raised : {u"nothing", u"EAbort: lost"}) {
    EXPECT_EQ(RaisedBy([&] { Section.Execute(Success); }), Raised);
    EXPECT_FALSE(Section.IsOwned());
  }
  for (const char16_t* Raised : {u"nothing", u"EAbort: lost"}) {
    EXPECT_EQ(RaisedBy([&] { Section.Execute(0, Success, Failure); }), Raised);
    EXPECT_FALSE(Section.IsOwned());
  }
  Section.Execute([&] {
    OnThreads(1, [&](int) {
      EXPECT_EQ(RaisedBy([&] { Section.Execute(1, Success, Failure); }), u"EConvertError: busy");
      const Int64 Start = Milliseconds();
      for (int i = 0; i < 200; ++i) EXPECT_FALSE(Section.TryEnter(0));
      EXPECT_LT(Milliseconds() - Start, 200) << "0 doesn't wait";
    });
  });
  EXPECT_EQ(Runs, 4);
}

// ---- Locks of pointers ---------------------------------------------------------------------------------------------

Integer Count(const void* AKey) { return uZqThreads::DataLocks().Count(AKey); }
std::size_t Keys() { return uZqThreads::DataLocks().Keys(); }

TEST(LockByPointer, LivesFromTheFirstLockToTheLastUnlock) {
  const int Key = 0, Other = 0;
  const void* const cKeys[] = {nullptr, &Key};
  for (const void* const Locked : cKeys) {
    for (const Integer Depth : {1, 2}) {
      ZqThreadLock(Locked);
      EXPECT_EQ(Count(Locked), Depth);
    }
    OnThreads(1, [&](int) {
      EXPECT_TRUE(RaisedBy([&] { ZqThreadUnlock(Locked); })
                      .View()
                      .starts_with(u"EAssertionFailed: The lock is another thread's (common/uZqThreads, line "));
      ZqThreadLock(&Other);  // waits for nobody
      EXPECT_EQ(Keys(), 2U);
      ZqThreadUnlock(&Other);
    });
    for (const Integer Depth : {1, 0}) {
      ZqThreadUnlock(Locked);
      EXPECT_EQ(Count(Locked), Depth);
    }
    EXPECT_EQ(Keys(), 0U);
    EXPECT_TRUE(RaisedBy([&] { ZqThreadUnlock(Locked); })
                    .View()
                    .starts_with(u"EAssertionFailed: Assertion failure (common/uZqThreads, line "));
  }
}

TEST(LockByPointer, WhoWaitsKeepsTheLockAlive) {
  const int Key = 0;
  std::atomic<bool> Given = false;
  ZqThreadLock(&Key);
  const auto Waiter = BeginThread([&] {
    ZqThreadLock(&Key);
    EXPECT_TRUE(Given);
    EXPECT_EQ(Count(&Key), 1);
    ZqThreadUnlock(&Key);
    return 0;
  });
  while (Count(&Key) < 2) Sleep(1);
  Given = true;
  ZqThreadUnlock(&Key);
  Waiter->WaitFor();
  EXPECT_EQ(Keys(), 0U);
}

TEST(LockByPointer, KeepsThreadsApartWhileLocksComeAndGo) {
  constexpr std::size_t cKeys = 7;
  std::array<int, cKeys> Guarded{};
  OnThreads(4, [&](int AThread) {
    for (std::size_t i = 0; i < 35'000; ++i) {
      int& Mine = Guarded[(i * (static_cast<std::size_t>(AThread) + 1)) % cKeys];
      int& First = Guarded[0];  // the order of locks is that of the keys
      if (i % 5 == 0) ZqThreadLock(&First);
      ZqThreadLock(&Mine);
      ++Mine;
      ZqThreadUnlock(&Mine);
      if (i % 5 == 0) ZqThreadUnlock(&First);
    }
  });
  EXPECT_EQ(std::accumulate(Guarded.begin(), Guarded.end(), 0), 140'000);
  EXPECT_EQ(Keys(), 0U);
}

TEST(LockByPointer, TheTableIsThereFromTheFirstStartToTheLastStop) {
  uZqThreads::Start();
  ZqThreadLock(nullptr);
  uZqThreads::Stop();
  EXPECT_EQ(Count(nullptr), 1) << "one start was the library's";
  uZqThreads::Stop();
  EXPECT_THROW(ZqThreadLock(nullptr), EAssertionFailed);
  uZqThreads::Start();
  EXPECT_EQ(Keys(), 0U);
}

// ---- TZqSimpleEvent ------------------------------------------------------------------------------------------------

TEST(LockSimpleEvent, StaysSetUntilItIsReset) {
  const IntfRef<IInterface> Kept = New<TZqSimpleEvent>();
  const auto Event = Kept.As<IZqSimpleEvent>();
  EXPECT_EQ(Event->WaitFor(0), wrTimeout);
  const auto Waiter =
      BeginThread([Event] { return Event->WaitFor() == wrSignaled && Event->WaitFor(0) == wrSignaled; });
  Event->SetEvent();
  EXPECT_EQ(Waiter->WaitFor(), 1);
  EXPECT_EQ(Event->WaitFor(cLong), wrSignaled);
  Event->ResetEvent();
  EXPECT_EQ(Event->WaitFor(1), wrTimeout);
}

}  // namespace
}  // namespace zq
