#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>

#include "runtime/core/api.h"
#include "runtime/core/types.h"

namespace zq {

class TDeadline;

/// The system's number of the calling thread; never 0.
[[nodiscard]] ZQ_API Cardinal GetCurrentThreadId() noexcept;
[[nodiscard]] ZQ_API Cardinal GetCurrentProcessId() noexcept;

/// Lock that its owner may take again, and must then leave as often.
///
/// Taking a free lock is one atomic exchange, leaving it one store: there is no system call unless threads meet.
/// Then a thread spins for a while and sleeps until somebody wakes it. Not fair: a thread that comes by may take the
/// lock before one that waits for it.
class ZQ_API TCriticalSection {
 public:
  TCriticalSection() noexcept = default;
  TCriticalSection(const TCriticalSection&) = delete;
  TCriticalSection& operator=(const TCriticalSection&) = delete;
  ~TCriticalSection() = default;

  void Enter() noexcept {
    if (!TryEnter()) [[unlikely]]
      Wait(cForEver);
  }
  /// Never waits.
  [[nodiscard]] bool TryEnter() noexcept;
  /// Waits for at most that many milliseconds; 0xFFFFFFFF is for ever.
  [[nodiscard]] bool TryEnterFor(Cardinal AMilliseconds) noexcept {
    return TryEnter() || (AMilliseconds != 0 && Wait(AMilliseconds));
  }
  /// By the owner only.
  ZQ_HOT void Leave() noexcept {
    // Nothing of the lock is touched once it is free: whoever takes it next may destroy it.
    if (--FDepth != 0) return;
    if (FSleepers.load(std::memory_order_relaxed) != 0) [[unlikely]] {
      LeaveAndWake();
      return;
    }
    const TCount& Parked = ParkedAt(this);
    FOwner.store(0, std::memory_order_release);
    std::atomic_signal_fence(std::memory_order_seq_cst);  // for the processor's order pays who goes to sleep
    if (Parked.load(std::memory_order_relaxed) != 0) [[unlikely]]
      WakeParked(this);
  }
  void Acquire() noexcept { Enter(); }
  void Release() noexcept { Leave(); }
  [[nodiscard]] bool IsOwned() const noexcept {
    return OwnerIn(FOwner.load(std::memory_order_relaxed)) == GetCurrentThreadId();
  }

 private:
  using TCount = std::atomic<std::uint32_t>;
  friend Cardinal GetCurrentThreadId() noexcept;

  static constexpr Cardinal cForEver = 0xFFFFFFFF;
  static constexpr std::uint32_t cWaking = 1U << 31;  // in FOwner: a sleeper has been woken and looks before it sleeps
  static constexpr std::uint32_t cFenced = 1U << 31;  // in ParkedCounts: a plain load of the count isn't enough
  static constexpr std::size_t cParkedCounts = 1024;

  static std::uint32_t OwnerIn(std::uint32_t AOwner) noexcept { return AOwner & ~cWaking; }
  static TCount& ParkedAt(const void* ALock) noexcept {
    return ParkedCounts[(reinterpret_cast<std::uintptr_t>(ALock) >> 4) % cParkedCounts];
  }
  static std::uint32_t LearnThreadId() noexcept;
  static void PrepareCounts() noexcept;
  static void WakeParked(void* ALock) noexcept;
  bool Take(std::uint32_t AThread) noexcept;
  bool Spin() noexcept;
  bool Wait(Cardinal AMilliseconds) noexcept;
  bool Sleep(const TDeadline& ADeadline, bool AOrdered) noexcept;
  void LeaveAndWake() noexcept;

  static TCount ParkedCounts[cParkedCounts];  // sleepers on all locks of one hash; outlives every lock

  TCount FOwner = 0;         // thread id, and the word that sleepers wait on; 0 when free; beside it cWaking
  TCount FSleepers = 0;      // threads in Sleep
  std::uint32_t FDepth = 0;  // the owner's alone
};

/// Holds ALock, anything with Enter and Leave, for a scope.
template <class TLock>
class [[nodiscard]] TLockScope {
 public:
  explicit TLockScope(TLock& ALock) : FLock(ALock) { FLock.Enter(); }
  TLockScope(const TLockScope&) = delete;
  TLockScope& operator=(const TLockScope&) = delete;
  ~TLockScope() { FLock.Leave(); }

 private:
  TLock& FLock;
};

}  // namespace zq
