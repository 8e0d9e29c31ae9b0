#include "runtime/sync/critical_section.h"

#include <linux/futex.h>
#include <pthread.h>
#include <sys/single_threaded.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <mutex>

#include "runtime/sync/pause.h"

namespace zq {

namespace {

constexpr std::int64_t cSlice = 1'000'000;  // ns; see Wait
constexpr std::int64_t cLongestSlice = 16 * cSlice;
constexpr std::uint32_t cFewSleepers = 3;
constexpr int cSpins = 2000;  // pauses in all, some 20 to 90 us
constexpr int cLongestPause = 512;

// Initial-exec: one load relative to the thread pointer, where a shared library would otherwise make a call.
__attribute__((tls_model("initial-exec"))) constinit thread_local std::uint32_t ThreadId = 0;

std::uint32_t LearnThreadId() noexcept {
  static std::once_flag Once;
  std::call_once(Once, [] { pthread_atfork(nullptr, nullptr, [] { ThreadId = 0; }); });
  ThreadId = static_cast<std::uint32_t>(::syscall(SYS_gettid));
  return ThreadId;
}

std::uint32_t MyThreadId() noexcept {
  const std::uint32_t Known = ThreadId;
  return Known != 0 ? Known : LearnThreadId();
}

std::int64_t Nanoseconds() noexcept {
  timespec Time{};
  ::clock_gettime(CLOCK_MONOTONIC, &Time);
  return std::int64_t{Time.tv_sec} * 1'000'000'000 + Time.tv_nsec;
}

// False when the time was over.
bool Futex(std::atomic<std::uint32_t>& AWord, int AOperation, std::uint32_t AValue, const timespec* ATimeout) noexcept {
  return ::syscall(SYS_futex, &AWord, AOperation | FUTEX_PRIVATE_FLAG, AValue, ATimeout, nullptr, 0) >= 0 ||
         errno != ETIMEDOUT;
}

}  // namespace

ZQ_HOT Cardinal GetCurrentThreadId() noexcept { return MyThreadId(); }

Cardinal GetCurrentProcessId() noexcept { return static_cast<Cardinal>(::getpid()); }

// As long as the process has one thread, which the system's library knows, a plain store does what else takes an atomic
// exchange.
ZQ_HOT bool TCriticalSection::Take(std::uint32_t AThread) noexcept {
  std::uint32_t Free = 0;
  if (FOwner.load(std::memory_order_relaxed) != 0) return false;
  if (!__libc_single_threaded)
    return FOwner.compare_exchange_strong(Free, AThread, std::memory_order_acquire, std::memory_order_relaxed);
  FOwner.store(AThread, std::memory_order_relaxed);
  return true;
}

ZQ_HOT bool TCriticalSection::TryEnter() noexcept {
  const std::uint32_t Me = MyThreadId();
  if (FOwner.load(std::memory_order_relaxed) != Me && !Take(Me)) return false;
  ++FDepth;
  return true;
}

// The pauses between two looks grow, so that the owner can take the lock several times in a row before it changes cores
// with all that it guards.
bool TCriticalSection::Spin() noexcept {
  for (int Pauses = 1, Left = cSpins; Left > 0; Left -= Pauses) {
    Pauses = std::min(2 * Pauses, cLongestPause);
    for (int i = 0; i < Pauses; ++i) SpinPause();
    if (TryEnter()) return true;
  }
  return false;
}

// Leave reads FSleepers and stores without a full barrier about them, which keeps leaving cheap: a wake-up can be
// missed when a thread lies down at that very moment. Sleeping in slices bounds what that costs. Where more
// than a few sleep, the slices grow, and who wakes by itself looks but once: they must not take the processors from the
// one that they wait for.
[[gnu::noinline]] bool TCriticalSection::Wait(Cardinal AMilliseconds) noexcept {
  const std::int64_t Deadline = AMilliseconds == cForEver ? 0 : Nanoseconds() + std::int64_t{AMilliseconds} * 1'000'000;
  if (Spin()) return true;
  FSleepers.fetch_add(1);
  bool Taken = false;
  for (std::int64_t Slice = cSlice, Left = Slice; !Taken && Left > 0;) {
    Left = Deadline == 0 ? Slice : std::min(Slice, Deadline - Nanoseconds());
    const std::uint32_t Owner = FOwner.load(std::memory_order_relaxed);
    bool Woken = true;
    if (Owner != 0 && Left > 0) {
      const timespec Timeout{0, static_cast<long>(Left)};
      const bool Few = FSleepers.load(std::memory_order_relaxed) <= cFewSleepers;
      Woken = Futex(FOwner, FUTEX_WAIT, Owner, &Timeout) || Few;
      FWaking.store(false, std::memory_order_relaxed);
      if (!Woken) Slice = std::min(2 * Slice, cLongestSlice);
    }
    Taken = Woken ? Spin() : TryEnter();
  }
  FSleepers.fetch_sub(1);
  return Taken;
}

void TCriticalSection::LeaveAndWake() noexcept {
  const bool Wakes = !FWaking.load(std::memory_order_relaxed);
  if (Wakes) FWaking.store(true, std::memory_order_relaxed);
  FOwner.store(0, std::memory_order_release);
  if (Wakes) Futex(FOwner, FUTEX_WAKE, 1, nullptr);
}

}  // namespace zq
