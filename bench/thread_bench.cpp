// What threads cost beside the system's: a call from a worker to the thread of its manager and back, work on a thread
// of its own, a pass of a worker. The figures to quote are ratios in one run.

#include <benchmark/benchmark.h>
#include <malloc.h>

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <mutex>
#include <thread>
#include <vector>

#include "common/uZqThreads.h"

namespace {

using namespace zq;
using TClock = std::chrono::steady_clock;

template <class TAction>
double Seconds(TAction AAction) {
  const auto Start = TClock::now();
  AAction();
  return std::chrono::duration<double>(TClock::now() - Start).count();
}

double Median(std::vector<double> AValues) {
  const auto Middle = AValues.begin() + static_cast<std::ptrdiff_t>(AValues.size() / 2);
  std::ranges::nth_element(AValues, Middle);
  return *Middle;
}

void StayBusy(std::chrono::microseconds ATime) {
  for (const auto Until = TClock::now() + ATime; TClock::now() < Until;) continue;
}

// Seconds that one of ACalls takes, where the caller does something else between two.
template <class TCall>
double PerCall(int ACalls, std::chrono::microseconds AIdle, TCall ACall) {
  const auto Calls = [&](auto ABefore) {
    for (int i = 0; i < ACalls; ++i) {
      ABefore();
      ACall();
    }
  };
  if (AIdle.count() == 0) return Seconds([&] { Calls([] {}); }) / ACalls;
  const std::chrono::duration<double> Idle = AIdle;
  return Seconds([&] { Calls([&] { StayBusy(AIdle); }); }) / ACalls - Idle.count();
}

// A request and its answer by a mutex and condition variables.
double PerPair(int ACalls, std::chrono::microseconds AIdle) {
  enum class TState { Idle, Asked, Answered, Ended };
  std::mutex Lock;
  std::condition_variable Changed;
  TState State = TState::Idle;
  const auto Await = [&](std::unique_lock<std::mutex>& AGuard, auto AReady) { Changed.wait(AGuard, AReady); };
  std::thread Server([&] {
    for (std::unique_lock Guard(Lock);;) {
      Await(Guard, [&] { return State == TState::Asked || State == TState::Ended; });
      if (State == TState::Ended) return;
      State = TState::Answered;
      Changed.notify_one();
    }
  });
  const double Result = PerCall(ACalls, AIdle, [&] {
    std::unique_lock Guard(Lock);
    State = TState::Asked;
    Changed.notify_one();
    Await(Guard, [&] { return State == TState::Answered; });
  });
  {
    const std::lock_guard Guard(Lock);
    State = TState::Ended;
    Changed.notify_one();
  }
  Server.join();
  return Result;
}

class TCaller : public TZqThread {
 public:
  TCaller(TZqThreadManager* AManager, int ACalls, std::chrono::microseconds AIdle)
      : TZqThread(AManager, true), FCalls(ACalls), FIdle(AIdle) {
    SetFreeOnTerminate(false);
  }
  double Result = 0;

 protected:
  ~TCaller() override = default;
  void Execute(TZqThreadAction&) override {
    const TZqSyncMethod Nothing = [](Pointer) {};
    Result = PerCall(FCalls, FIdle, [&] { Synchronize(Nothing, nullptr); });
  }

 private:
  const int FCalls;
  const std::chrono::microseconds FIdle;
};

// A synchronised call from a worker to its manager's thread, which waits for it, against such a pair.
void PairToSynchronize(benchmark::State& AState) {
  const std::chrono::microseconds Idle(AState.range(0));
  const int Calls = Idle.count() == 0 ? 5000 : 500;
  std::vector<double> Ratios, Pairs;
  for (auto _ : AState) {
    const double Pair = PerPair(Calls, Idle);
    Pairs.push_back(Pair);
    const TOwned<TZqThreadManager> Manager(New<TZqThreadManager>(nullptr));
    const TOwned<TCaller> Caller(New<TCaller>(Manager.get(), Calls, Idle));
    while (Caller->ThreadState() == tsCreated) std::this_thread::yield();
    Caller->Resume();
    Caller->WaitFor();
    Ratios.push_back(Pair / Caller->Result);
  }
  AState.counters["ratio"] = Median(Ratios);
  AState.counters["pair_us"] = 1e6 * Median(Pairs);
}
BENCHMARK(PairToSynchronize)->Arg(0)->Arg(200)->Unit(benchmark::kMillisecond)->Iterations(15);

// A closure on a thread of its own and the wait for its event, against std::thread and its join.
void RunThreadedToStdThread(benchmark::State& AState) {
  constexpr int cThreads = 200;
  std::vector<double> Ratios;
  for (auto _ : AState) {
    const double Plain = Seconds([&] {
      for (int i = 0; i < cThreads; ++i) std::thread([] {}).join();
    });
    const double Own = Seconds([&] {
      for (int i = 0; i < cThreads; ++i) ZqRunThreaded([](const auto&) {})->WaitFor();
    });
    Ratios.push_back(Own / Plain);
  }
  AState.counters["ratio"] = Median(Ratios);
}
BENCHMARK(RunThreadedToStdThread)->Unit(benchmark::kMillisecond)->Iterations(25);

class TRunner : public TZqThread {
 public:
  TRunner(TZqThreadManager* AManager, int APasses) : TZqThread(AManager, true), FPasses(APasses) {
    SetFreeOnTerminate(false);
  }
  double Result = 0;

 protected:
  ~TRunner() override = default;
  void Execute(TZqThreadAction& AAction) override {
    if (FPass == 0) FStart = TClock::now();
    AAction = ++FPass > FPasses ? taTerminate : taRunAgain;
    if (AAction == taTerminate) Result = std::chrono::duration<double>(TClock::now() - FStart).count() / FPasses;
  }

 private:
  const int FPasses;
  int FPass = 0;
  TClock::time_point FStart;
};

// A pass of a worker without callbacks against four pairs of an uncontended std::recursive_mutex.
void PassToFourLockPairs(benchmark::State& AState) {
  constexpr int cPasses = 200'000;
  std::vector<double> Ratios;
  for (auto _ : AState) {
    const TOwned<TZqThreadManager> Manager(New<TZqThreadManager>(nullptr));
    const TOwned<TRunner> Runner(New<TRunner>(Manager.get(), cPasses));
    while (Runner->ThreadState() == tsCreated) std::this_thread::yield();
    Runner->Resume();
    Runner->WaitFor();
    std::recursive_mutex Lock;
    std::thread Locker;
    double Pairs = 0;
    Locker = std::thread([&] {
      Pairs = Seconds([&] {
        for (int i = 0; i < 4 * cPasses; ++i) {
          const std::lock_guard Guard(Lock);
          benchmark::ClobberMemory();
        }
      });
    });
    Locker.join();
    Ratios.push_back(Runner->Result * cPasses / Pairs);
  }
  AState.counters["ratio"] = Median(Ratios);
}
BENCHMARK(PassToFourLockPairs)->Unit(benchmark::kMillisecond)->Iterations(15);

// Heap in use after 1,000 and after 3,000 managed threads, each made, run and waited for: the two are to be equal.
void HeapOfManyThreads(benchmark::State& AState) {
  const TOwned<TZqThreadManager> Manager(New<TZqThreadManager>(nullptr));
  const auto HeapAfter = [&](int AThreads) {
    for (int i = 0; i < AThreads; ++i) {
      const TOwned<TRunner> Runner(New<TRunner>(Manager.get(), 1));
      Runner->Resume();
    }
    return static_cast<double>(::mallinfo2().uordblks);
  };
  for (auto _ : AState) {
    AState.counters["heap1k"] = HeapAfter(1000);
    AState.counters["heap3k"] = HeapAfter(2000);
  }
}
BENCHMARK(HeapOfManyThreads)->Unit(benchmark::kMillisecond)->Iterations(1);

}  // namespace
