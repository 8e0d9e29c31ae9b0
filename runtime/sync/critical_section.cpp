#include "runtime/sync/critical_section.h"

#include <linux/membarrier.h>
#include <pthread.h>
#include <sys/single_threaded.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <mutex>

#include "runtime/sync/futex.h"
#include "runtime/sync/pause.h"

namespace zq {

namespace {

constexpr int cSpins = 2000;  // pauses in all, some 20 to 90 us
constexpr int cLongestPause = 512;
constexpr Cardinal cSlice = 10;  // milliseconds between two looks where a wake-up may be missed

// Initial-exec: one load relative to the thread pointer, where a shared library would otherwise make a call.
__attribute__((tls_model("initial-exec"))) constinit thread_local std::uint32_t ThreadId = 0;

// For a while at most: a sandbox that was put up since has taken the barrier away.
bool WaitASlice(void* AWord, std::uint32_t AValue, const TDeadline& ADeadline) noexcept {
  const TDeadline Soon = TDeadline::In(cSlice);
  return futex::Wait(AWord, AValue, Soon < ADeadline ? Soon : ADeadline) || Soon < ADeadline;
}

}  // namespace

constinit std::atomic<std::uint32_t> TCriticalSection::ParkedCounts[cParkedCounts] = {};

// Before the first lock of any thread, and anew in a forked child, whose other threads are gone. Where the system
// can't put a barrier into other threads, every Leave that finds nobody asleep makes its own.
void TCriticalSection::PrepareCounts() noexcept {
  const bool Barriers = ::syscall(SYS_membarrier, MEMBARRIER_CMD_REGISTER_PRIVATE_EXPEDITED, 0, 0) == 0;
  for (TCount& Count : ParkedCounts) Count.store(Barriers ? 0 : cFenced, std::memory_order_relaxed);
}

std::uint32_t TCriticalSection::LearnThreadId() noexcept {
  static std::once_flag Once;
  std::call_once(Once, [] {
    PrepareCounts();
    pthread_atfork(nullptr, nullptr, [] {
      ThreadId = 0;
      PrepareCounts();
    });
  });
  ThreadId = static_cast<std::uint32_t>(::syscall(SYS_gettid));
  return ThreadId;
}

ZQ_HOT Cardinal GetCurrentThreadId() noexcept {
  const std::uint32_t Known = ThreadId;
  return Known != 0 ? Known : TCriticalSection::LearnThreadId();
}

Cardinal GetCurrentProcessId() noexcept { return static_cast<Cardinal>(::getpid()); }

// As long as the process has one thread, which the system's library knows, a plain store does what else takes an atomic
// exchange. A wake-up that is under way stays so: it is another thread's.
ZQ_HOT bool TCriticalSection::Take(std::uint32_t AThread) noexcept {
  std::uint32_t Free = FOwner.load(std::memory_order_relaxed);
  while (OwnerIn(Free) == 0) {
    const std::uint32_t Taken = AThread | Free;
    if (!__libc_single_threaded) {
      if (FOwner.compare_exchange_weak(Free, Taken, std::memory_order_acquire, std::memory_order_relaxed)) return true;
    } else {
      FOwner.store(Taken, std::memory_order_relaxed);
      return true;
    }
  }
  return false;
}

ZQ_HOT bool TCriticalSection::TryEnter() noexcept {
  const std::uint32_t Me = GetCurrentThreadId();
  if (OwnerIn(FOwner.load(std::memory_order_relaxed)) != Me && !Take(Me)) return false;
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

// Leave stores and then reads the count without a barrier between them, which keeps leaving cheap. The barrier that a
// sleeper puts into every thread between its counting and its look at FOwner stands in for that: whoever misses the
// count has freed the lock in the sleeper's sight.
[[gnu::noinline]] bool TCriticalSection::Wait(Cardinal AMilliseconds) noexcept {
  const TDeadline Deadline = TDeadline::In(AMilliseconds);
  if (Spin()) return true;
  FSleepers.fetch_add(1);
  ParkedAt(this).fetch_add(1);
  const bool Ordered = ::syscall(SYS_membarrier, MEMBARRIER_CMD_PRIVATE_EXPEDITED, 0, 0) == 0 ||
                       (ParkedAt(this).load(std::memory_order_relaxed) & cFenced) != 0;
  const bool Taken = Sleep(Deadline, Ordered);
  if (Taken) FOwner.fetch_and(~cWaking, std::memory_order_relaxed);  // who leaves wakes the next one
  ParkedAt(this).fetch_sub(1);
  FSleepers.fetch_sub(1);
  return Taken;
}

// While cWaking is set nobody wakes a second thread. So who isn't to come back takes it away, and who goes to sleep
// takes it away before its last look; only more wake-ups than needed can come of that.
bool TCriticalSection::Sleep(const TDeadline& ADeadline, bool AOrdered) noexcept {
  for (bool InTime = true;;) {
    const std::uint32_t Owner = OwnerIn(FOwner.fetch_and(~cWaking));
    if (Owner == 0) {
      if (TryEnter()) return true;
    } else if (!InTime) {
      return false;
    } else {
      InTime = AOrdered ? futex::Wait(&FOwner, Owner, ADeadline) : WaitASlice(&FOwner, Owner, ADeadline);
      if (InTime && Spin()) return true;
    }
  }
}

// By exchange: a thread that has taken cWaking away and lies down again must not be taken for one that still looks.
void TCriticalSection::LeaveAndWake() noexcept {
  if ((FOwner.exchange(cWaking, std::memory_order_release) & cWaking) == 0) futex::WakeOne(&FOwner);
}

// For who found nobody asleep, or nobody in time.
void TCriticalSection::WakeParked(void* ALock) noexcept {
  TCount& Parked = ParkedAt(ALock);
  if ((Parked.load(std::memory_order_relaxed) & cFenced) != 0 && Parked.fetch_add(0) == cFenced) return;
  futex::WakeOne(ALock);
}

}  // namespace zq
