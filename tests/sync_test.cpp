#include <gtest/gtest.h>

#include <array>
#include <chrono>
#include <memory>
#include <thread>
#include <vector>

#include "runtime/sync/event.h"
#include "runtime/sync/thread.h"

namespace zq {
namespace {

using TClock = std::chrono::steady_clock;
constexpr Cardinal cLong = 30'000;  // ms that no passing test waits for

long long MillisecondsSince(TClock::time_point AStart) {
  return std::chrono::duration_cast<std::chrono::milliseconds>(TClock::now() - AStart).count();
}

// ---- Events
// ----------------------------------------------------------------------------------------------------------

TEST(Event, AWaitEndsAtTheSignalOrWhenItsTimeIsOver) {
  TSimpleEvent Event;
  auto Start = TClock::now();
  EXPECT_EQ(Event.WaitFor(30), wrTimeout);
  EXPECT_GE(MillisecondsSince(Start), 30);
  Start = TClock::now();
  std::thread Setter([&] {
    Sleep(20);
    Event.SetEvent();
  });
  EXPECT_EQ(Event.WaitFor(cLong), wrSignaled);
  EXPECT_LT(MillisecondsSince(Start), 5'000);
  Setter.join();
}

TEST(Event, EachSignalOfAnAutomaticOneReleasesExactlyOneWaiter) {
  TEvent Event(false);
  std::atomic<int> Passed = 0;
  std::vector<std::thread> Waiters;
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
  for (auto& Waiter : Waiters) Waiter.join();
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
    std::thread Setter([&] {
      Sleep(5);
      Events[i]->SetEvent();
    });
    EXPECT_EQ(TEvent::WaitForAny(Events), static_cast<Integer>(i));
    Setter.join();
  }
}

// ---- Native threads
// --------------------------------------------------------------------------------------------------

TEST(ThreadNative, ExitCodeComesFromTheResultFromEndThreadOrFromARaise) {
  struct TCase {
    Integer Code;
    std::function<Integer()> Func;
  };
  for (const auto& Case : {TCase{7, [] { return 7; }}, TCase{9, []() -> Integer { EndThread(9); }},
           TCase{-1, []() -> Integer { throw 1; }}}) {
    const auto Thread = BeginThread(Case.Func);
    EXPECT_EQ(Thread->Ended().WaitFor(cLong), wrSignaled);
    EXPECT_EQ(Thread->ExitCode(), Case.Code);
  }
  EXPECT_THROW(EndThread(1), EAssertionFailed) << "the main thread is nobody's to end";
}

// ---- Threads and the main thread's queue
// -----------------------------------------------------------------------------

class TLambdaThread : public TThread {
 public:
  using TBody = std::function<void(TLambdaThread&)>;
  explicit TLambdaThread(TBody ABody, bool ASuspended = false) : TThread(ASuspended), FBody(std::move(ABody)) {}
  using TThread::Queue;
  using TThread::Synchronize;
  std::shared_ptr<int> Life;

 protected:
  void Execute() override { FBody(*this); }

 private:
  TBody FBody;
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

TEST(Thread, FreesItselfWhenToldTo) {
  auto Life = std::make_shared<int>();
  const std::weak_ptr<int> Watch = Life;
  auto* const Thread = New<TLambdaThread>([](TLambdaThread&) {}, true);
  Thread->Life = std::move(Life);
  Thread->SetFreeOnTerminate(true);
  Thread->Start();
  for (const auto Start = TClock::now(); !Watch.expired() && MillisecondsSince(Start) < cLong;) Sleep(1);
  EXPECT_TRUE(Watch.expired());
}

TEST(SyncQueue, SynchronizeRunsOnTheMainThreadAndBringsTheSameExceptionBack) {
  const void* Raised = nullptr;
  const void* Caught = nullptr;
  const TOwned<TLambdaThread> Thread(New<TLambdaThread>([&](TLambdaThread& AThread) {
    try {
      AThread.Synchronize([&] {
        EXPECT_TRUE(IsMainThread());
        try {
          throw EConvertError(u"from the main thread");
        } catch (const Exception& e) {
          Raised = &e;
          throw;
        }
      });
    } catch (const EConvertError& e) {
      Caught = &e;
    }
  }));
  Thread->WaitFor();  // serves the queue
  EXPECT_NE(Raised, nullptr);
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

// ---- Interlocked numbers and monitors
// --------------------------------------------------------------------------------

TEST(LockMonitor, KeepsThreadsApartAndNests) {
  const TSimpleEvent Object, Other;
  Integer Guarded = 0, Interlocked = 0;
  std::vector<TThreadHandle> Threads;
  TMonitor::Enter(&Object);
  for (int t = 0; t < 4; ++t)
    Threads.push_back(BeginThread([&] {
      EXPECT_FALSE(TMonitor::Enter(&Object, 5));
      EXPECT_THROW(TMonitor::Exit(&Object), EThread);
      for (int i = 0; i < 500; ++i) {
        TMonitor::Enter(&Other);
        EXPECT_TRUE(TMonitor::TryEnter(&Other));
        ++Guarded;
        TMonitor::Exit(&Other);
        TMonitor::Exit(&Other);
        TInterlocked::Increment(Interlocked);
      }
      return 0;
    }));
  for (const auto& Thread : Threads) Thread->Ended().WaitFor();
  TMonitor::Exit(&Object);
  EXPECT_THROW(TMonitor::Exit(&Object), EThread);
  EXPECT_EQ(Guarded, 2000);
  EXPECT_EQ(Interlocked, 2000);
}

}  // namespace
}  // namespace zq
