// What a lock costs beside the system's: alone, nested, and going from thread to thread. The figures to quote are
// ratios of the two in one run.

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <mutex>
#include <thread>
#include <vector>

#include "common/uZqThreads.h"
#include "runtime/sync/critical_section.h"

namespace {

using namespace zq;

struct TOwnLock {
  void lock() { Lock.Enter(); }
  void unlock() { Lock.Leave(); }
  TZqCriticalSection Lock;
};

// Pairs of one thread, ADepth deep. The other thread, which sleeps, makes the process one that needs atomic operations.
template <class TLock, bool AThreads>
void Pairs(benchmark::State& AState) {
  std::timed_mutex Held;
  Held.lock();
  std::thread Other;
  if (AThreads) Other = std::thread([&] { const std::lock_guard Guard(Held); });
  TLock Lock;
  const auto Depth = AState.range(0);
  for (auto _ : AState) {
    for (auto i = Depth; i > 0; --i) Lock.lock();
    benchmark::ClobberMemory();
    for (auto i = Depth; i > 0; --i) Lock.unlock();
  }
  Held.unlock();
  if (AThreads) Other.join();
}
BENCHMARK_TEMPLATE(Pairs, std::recursive_mutex, false)->Arg(1)->Arg(3)->Repetitions(5)->ReportAggregatesOnly();
BENCHMARK_TEMPLATE(Pairs, TOwnLock, false)->Arg(1)->Arg(3)->Repetitions(5)->ReportAggregatesOnly();
BENCHMARK_TEMPLATE(Pairs, std::recursive_mutex, true)->Arg(1)->Arg(3)->Repetitions(5)->ReportAggregatesOnly();
BENCHMARK_TEMPLATE(Pairs, TOwnLock, true)->Arg(1)->Arg(3)->Repetitions(5)->ReportAggregatesOnly();

// Pairs of one pointer after the other, of which so many are locked all the time; the figure to quote is the ratio of
// many to one. The pair of a pointer whose lock it makes and ends stands beside it.
template <bool AMakes>
void PointerPairs(benchmark::State& AState) {
  std::vector<int> Keys(static_cast<std::size_t>(AState.range(0)));
  for (int& Key : Keys) ZqThreadLock(&Key);
  std::size_t i = 0;
  for (auto _ : AState) {
    const void* const Key = AMakes ? nullptr : &Keys[i];
    ZqThreadLock(Key);
    ZqThreadUnlock(Key);
    if (++i == Keys.size()) i = 0;
  }
  for (int& Key : Keys) ZqThreadUnlock(&Key);
}
BENCHMARK_TEMPLATE(PointerPairs, false)->Arg(1)->Arg(1000);
BENCHMARK_TEMPLATE(PointerPairs, true)->Arg(1)->Arg(1000);

// Seconds that AThreads threads need for their pairs of one lock, each with some work in it.
template <class TLock>
double HandOvers(std::size_t AThreads) {
  constexpr int cPairs = 20000;
  TLock Lock;
  unsigned Guarded = 0;
  const auto Run = [&] {
    for (int i = 0; i < cPairs; ++i) {
      const std::lock_guard Guard(Lock);
      for (int k = 0; k < 200; ++k) benchmark::DoNotOptimize(Guarded += 3);
    }
  };
  const auto Start = std::chrono::steady_clock::now();
  std::vector<std::thread> Threads;
  for (std::size_t t = 0; t < AThreads; ++t) Threads.emplace_back(Run);
  for (std::thread& Thread : Threads) Thread.join();
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - Start).count();
}

// Time to time; the counter is the median of the rounds, in which both take turns.
void HandOverToMutex(benchmark::State& AState) {
  const auto Threads = static_cast<std::size_t>(AState.range(0));
  std::vector<double> Ratios;
  for (auto _ : AState) {
    const double Plain = HandOvers<std::mutex>(Threads);
    Ratios.push_back(HandOvers<TOwnLock>(Threads) / Plain);
  }
  const auto Middle = Ratios.begin() + static_cast<std::ptrdiff_t>(Ratios.size() / 2);
  std::nth_element(Ratios.begin(), Middle, Ratios.end());
  AState.counters["ratio"] = *Middle;
}
BENCHMARK(HandOverToMutex)->Arg(2)->Arg(4)->Unit(benchmark::kMillisecond)->UseRealTime()->Iterations(31);

}  // namespace
