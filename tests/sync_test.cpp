#include <pthread.h>
#include <sys/resource.h>

#include <array>
#include <atomic>
#include <csignal>
#include <iostream>
#include <thread>

#include "runtime/sync/event.h"
#include "runtime/sync/thread.h"
#include "tests/support/support.h"

namespace zq {
namespace {

constexpr Cardinal cLong = 30'000;  // ms that no passing test waits for

// ---- Events --------------------------------------------------------------------------------------------------------

TEST(Event, AWaitEndsAtTheSignalOrWhenItsTimeIsOver) {
  TSimpleEvent Event;
  const auto Start = std::chrono::steady_clock::now();
  EXPECT_EQ(Event.WaitFor(30), wrTimeout);
  EXPECT_GE(std::chrono::steady_clock::now() - Start, std::chrono::milliseconds(30));
  const std::jthread Setter([&] {
    Sleep(20);
    Event.SetEvent();
  });
  EXPECT_EQ(Event.WaitFor(cLong), wrSignaled);
  EXPECT_LT(std::chrono::steady_clock::now() - Start, std::chrono::milliseconds(cLong));
}

TEST(Event, EachSignalOfAnAutomaticOneReleasesExactlyOneWaiter) {
  TEvent Event(false);
  std::atomic<int> Passed = 0;
  std::vector<std::jthread> Waiters;
  for (int i = 0; i < 4; ++i)
    Waiters.emplace_back([&] {
      Event.WaitFor();
      ++Passed;
    });
  for (int Signals = 1; Signals <= 4; ++Signals) {
    Event.SetEvent();
    while (Passed < Signals) Sleep(1);
    EXPECT_EQ(Event.WaitFor(5), wrTimeout);
    EXPECT_EQ(Passed, Signals);
  }
}

TEST(Event, WaitForAnyTakesTheForemostAndWakesForEach) {
  TEvent Automatic(false), Manual(true);
  const std::array Events{&Automatic, &Manual};
  EXPECT_EQ(TEvent::WaitForAny(Events, 10), -1);
  Manual.SetEvent();
  Automatic.SetEvent();
  for (const Integer Passing : {0, 1, 1}) EXPECT_EQ(TEvent::WaitForAny(Events, cLong), Passing);
  Manual.ResetEvent();
  for (const std::size_t i : {0U, 1U}) {
    const std::jthread Setter([&] {
      Sleep(5);
      Events[i]->SetEvent();
    });
    EXPECT_EQ(TEvent::WaitForAny(Events), static_cast<Integer>(i));
  }
}

// ---- Native threads ------------------------------------------------------------------------------------------------

TEST(ThreadNative, ExitCodeComesFromTheResultFromEndThreadOrFromARaise) {
  const std::pair<Integer, std::function<Integer()>> Cases[] = {
      {7, [] { return 7; }}, {9, []() -> Integer { EndThread(9); }}, {-1, []() -> Integer { throw 1; }}};
  for (const auto& [Code, Func] : Cases) {
    const auto Thread = BeginThread(Func);
    EXPECT_EQ(Thread->Ended().WaitFor(cLong), wrSignaled);
    EXPECT_EQ(Thread->ExitCode(), Code);
  }
  EXPECT_THROW(EndThread(1), EAssertionFailed) << "the main thread is nobody's to end";
}

// Wherever a thread stands: what it waits for may be used and freed then, and who waits for it is let go.
TEST(ThreadNative, OneThatNeverReturnsIsStopped) {
  if (cThreadsCantBeStopped) GTEST_SKIP();
  for (const int Case : {0, 1, 2, 3}) {
    TSimpleEvent Event, Running;
    std::atomic<bool> Go = true;
    const auto Queue = TThreadQueue::Current();
    const auto Thread = BeginThread([&, Case] {
      Running.SetEvent();
      if (Case == 1) Event.WaitFor();
      if (Case == 2) Queue->Send([] {});
      if (Case == 3) return TThreadQueue::Current()->Run();
      while (Go) continue;
      return 5;
    });
    EXPECT_FALSE(TThreadHandle(Thread)->Ended().WaitFor(1) == wrSignaled);
    Running.WaitFor();
    Sleep(20);
    std::jthread Sender;
    if (Case == 1) Sender = std::jthread([&] { EXPECT_THROW(Thread->Queue()->Send([] {}), ECallRefused); });
    if (Case == 1) Sleep(20);
    EXPECT_TRUE(Thread->Kill());
    Event.SetEvent();
    EXPECT_FALSE(Queue->RunOnce()) << "its call is taken back";
    EXPECT_EQ(Thread->WaitFor(), 0);
    EXPECT_TRUE(Thread->Kill()) << "once more";
  }
  const auto Deaf = BeginThread([] {
    sigset_t All;
    ::sigfillset(&All);
    ::pthread_sigmask(SIG_SETMASK, &All, nullptr);
    Sleep(4000);
    return 6;
  });
  Sleep(20);
  EXPECT_FALSE(Deaf->Kill()) << "it hears no signal";
  EXPECT_EQ(Deaf->WaitFor(), 6);
}

TEST(ThreadNative, PrioritiesReadBackAsTheyWereSetAndNamesAreCut) {
  TSimpleEvent Go;
  const auto Thread = BeginThread([&] {
    Go.WaitFor();
    SetThreadName(u"a name of \u00e4\u00e4\u00e4\u00e4");
    char Name[16] = {};
    ::pthread_getname_np(::pthread_self(), Name, sizeof Name);
    EXPECT_STREQ(Name, "a name of \u00e4\u00e4") << "no half character";
    return 0;
  });
  const int Own = ::getpriority(PRIO_PROCESS, 0);
  for (int Priority = 6; Priority >= 0; --Priority) {
    EXPECT_EQ(Thread->SetPriority(static_cast<TThreadPriority>(Priority)), 0);
    EXPECT_EQ(Thread->Priority(), static_cast<TThreadPriority>(Priority));
  }
  EXPECT_EQ(::getpriority(PRIO_PROCESS, Thread->ThreadID()), std::min(Own + 19, 19)) << "idle";
  EXPECT_EQ(::getpriority(PRIO_PROCESS, 0), Own);
  Go.SetEvent();
  Thread->WaitFor();
  EXPECT_NE(Thread->SetPriority(tpNormal), 0);
}

// ---- Threads and the main thread's queue ---------------------------------------------------------------------------

struct TLambdaThread : TThread {
  using TBody = std::function<void(TLambdaThread&)>;
  explicit TLambdaThread(TBody ABody, bool ASuspended = false) : TThread(ASuspended), Body(std::move(ABody)) {}
  using TThread::Queue;
  using TThread::Synchronize;
  void Execute() override { Body(*this); }
  TBody Body;
};

TEST(Thread, FreeTerminatesAndWaits) {
  std::atomic<bool> Left = false;
  TSimpleEvent Running;
  const auto Body = [&](TLambdaThread& AThread) {
    EXPECT_THROW(AThread.WaitFor(), EThread) << "nobody can wait for himself";
    Running.SetEvent();
    while (!AThread.Terminated()) Sleep(1);
    Sleep(20);
    Left = true;
    throw EConvertError(u"lost");
  };
  TOwned<TLambdaThread> Thread(New<TLambdaThread>(Body));
  Running.WaitFor();
  Thread.reset();
  EXPECT_TRUE(Left.exchange(false));
  Thread.reset(New<TLambdaThread>(Body, true));
  EXPECT_THROW(Thread->WaitFor(), EThread);
  Thread->Terminate();
  Thread->Start();
  EXPECT_THROW(Thread->Start(), EThread);
  Thread->WaitFor();
  EXPECT_FALSE(Left) << "a terminated thread has nothing to begin";
  Thread.reset(New<TLambdaThread>([](TLambdaThread&) { throw EConvertError(u"lost"); }));
  Thread->WaitFor();
  EXPECT_EQ(Thread->FatalException().Message(), u"lost");
}

TEST(SyncQueue, SynchronizeRunsOnTheMainThreadAndBringsTheSameExceptionBack) {
  const void *Raised = nullptr, *Caught = &Raised;
  const TOwned<TLambdaThread> Thread(New<TLambdaThread>([&](TLambdaThread& AThread) {
    try {
      AThread.Synchronize([&] {
        EXPECT_TRUE(IsMainThread());
        const auto Kept = ExceptionRef::Of<EConvertError>(u"from the main thread");
        Raised = Kept.Get();
        Kept.Raise();
      });
    } catch (const EConvertError& e) {
      Caught = &e;
    }
  }));
  Thread->WaitFor();  // serves the queue
  EXPECT_EQ(Raised, Caught);
}

TEST(SyncQueue, QueuedCallsRunInOrderAndARaiseLeavesTheRest) {
  std::vector<int> Ran;
  const TOwned<TLambdaThread> Gone(New<TLambdaThread>([](TLambdaThread&) {}, true));
  TThread::ForceQueue(Gone.get(), [&Ran] { Ran.push_back(-1); });
  const auto Thread = BeginThread([&Ran] {
    for (int i = 0; i < 3; ++i)
      TThread::Queue(nullptr, [&Ran, i] {
        Ran.push_back(i);
        if (i == 0) throw EAbort(u"stop");
        TThread::ForceQueue(nullptr, [&Ran] { Ran.push_back(9); });
      });
    EXPECT_THROW(CheckSynchronize(), EThread);
    return 0;
  });
  Thread->Ended().WaitFor();
  TThread::RemoveQueuedEvents(Gone.get());
  EXPECT_EQ(SyncEvent().WaitFor(0), wrSignaled);
  EXPECT_THROW(CheckSynchronize(cLong), EAbort);
  EXPECT_TRUE(CheckSynchronize());
  EXPECT_EQ(Ran, (std::vector{0, 1, 2})) << "what a call queues comes the next time";
  EXPECT_TRUE(CheckSynchronize());
  EXPECT_EQ(SyncEvent().WaitFor(0), wrTimeout);
  EXPECT_FALSE(CheckSynchronize(5));
}

// ---- Interlocked numbers and monitors ------------------------------------------------------------------------------

TEST(LockMonitor, KeepsThreadsApartAndNests) {
  const TSimpleEvent Object, Other;
  Integer Guarded = 0, Interlocked = 0;
  TMonitor::Enter(&Object);
  OnThreads(4, [&](int) {
    EXPECT_FALSE(TMonitor::Enter(&Object, 5));
    EXPECT_THROW(TMonitor::Exit(&Object), EThread);
    for (Cardinal i = 0; i < 5000; ++i) {
      if (i % 2 == 0) TMonitor::Enter(&Other);
      while (i % 2 != 0 && !TMonitor::Enter(&Other, i % 3)) {
      }
      EXPECT_TRUE(TMonitor::TryEnter(&Other));
      ++Guarded;
      TMonitor::Exit(&Other);
      TMonitor::Exit(&Other);
      TInterlocked::Increment(Interlocked);
    }
  });
  TMonitor::Exit(&Object);
  EXPECT_EQ(std::pair(Guarded, Interlocked), std::pair(20000, 20000));
}

// ---- Waits for a lock ----------------------------------------------------------------------------------------------

TEST(LockWaiting, WhoWaitsSleepsUntilHeIsWoken) {
  for (const int Waiters : {1, 2}) {
    TCriticalSection Lock;
    Lock.Enter();
    std::atomic<long> WakeUps = 0;
    std::jthread Holder([&] {
      OnThreads(Waiters, [&](int) {
        Lock.Enter();
        Lock.Leave();
        rusage Usage{};
        ::getrusage(RUSAGE_THREAD, &Usage);
        WakeUps += Usage.ru_nvcsw;
        for (const timeval& Busy : {Usage.ru_utime, Usage.ru_stime})
          EXPECT_LT(Busy.tv_sec * 1'000'000 + Busy.tv_usec, 10'000) << "of 1 s";
      });
    });
    Sleep(1000);
    Lock.Leave();
    Holder.join();
    EXPECT_LT(WakeUps, 20);
  }
}

TEST(LockWaiting, ATryEndsWhenItsTimeIsOver) {
  TCriticalSection Lock;
  Lock.Enter();
  OnThreads(2, [&](int) {
    for (const Cardinal Time : {1U, 30U, 1030U}) {
      const auto Start = std::chrono::steady_clock::now();
      EXPECT_FALSE(Lock.TryEnterFor(Time));
      const auto Waited = std::chrono::steady_clock::now() - Start;
      EXPECT_GE(Waited, std::chrono::milliseconds(Time));
      EXPECT_LT(Waited, std::chrono::milliseconds(Time + 500));
    }
    EXPECT_FALSE(Lock.TryEnterFor(0));
  });
  Lock.Leave();
  EXPECT_TRUE(Lock.TryEnterFor(0));
  Lock.Leave();
}

// The owner keeps each lock about as long as the next one spins for it: that one lies down while the lock becomes free.
TEST(LockWaiting, NoWakeUpIsMissedAndWhoTakesItLastMayFreeTheLock) {
  struct TShared {
    TCriticalSection Lock;
    int Users;
  };
  using TTake = void (*)(TCriticalSection&);
  constexpr TTake cTakes[] = {[](auto& Lock) { Lock.Enter(); },
      [](auto& Lock) { EXPECT_TRUE(Lock.TryEnterFor(cLong)); },
      [](auto& Lock) {
        while (!Lock.TryEnterFor(1)) {
        }
      }};
  const auto Start = std::chrono::steady_clock::now();
  std::size_t Rounds = 0;
  while (std::chrono::steady_clock::now() - Start < std::chrono::seconds(2)) {
    for (const int Threads : {2, 4}) {
      std::vector<TShared*> Locks(500);
      for (TShared*& Lock : Locks) Lock = new TShared{{}, Threads};
      OnThreads(Threads, [&](int AThread) {
        for (std::size_t i = 0; i < Locks.size(); ++i) {
          TShared* const Shared = Locks[i];
          cTakes[(i + static_cast<std::size_t>(AThread)) % 3](Shared->Lock);
          const auto Until = std::chrono::steady_clock::now() + std::chrono::microseconds(i % 120);
          while (std::chrono::steady_clock::now() < Until) {
          }
          const bool Last = --Shared->Users == 0;
          Shared->Lock.Leave();
          if (Last) delete Shared;
        }
      });
      Rounds += Locks.size();
    }
  }
  EXPECT_LT(std::chrono::steady_clock::now() - Start, std::chrono::milliseconds(cLong)) << "a thread slept on";
  std::cout << Rounds << " locks\n";
}

}  // namespace
}  // namespace zq
