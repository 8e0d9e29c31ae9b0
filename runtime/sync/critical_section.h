#pragma once

#include <atomic>
#include <cstdint>

#include "runtime/core/api.h"
#include "runtime/core/types.h"

namespace zq {

/// The system's number of the calling thread; never 0.
[[nodiscard]] ZQ_API Cardinal GetCurrentThreadId() noexcept;
[[nodiscard]] ZQ_API Cardinal GetCurrentProcessId() noexcept;

/// Lock that its owner may take again, and must then leave as often.
///
/// Taking a free lock is one atomic exchange, leaving it one store: there is no system call unless threads meet.
/// Then a thread spins for a while, goes to sleep, and spins again once it is woken. Not fair: a thread that comes by
/// may take the lock before one that waits for it.
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
    if (FSleepers.load(std::memory_order_relaxed) == 0) FOwner.store(0, std::memory_order_release);
    else LeaveAndWake();
  }
  void Acquire() noexcept { Enter(); }
  void Release() noexcept { Leave(); }
  [[nodiscard]] bool IsOwned() const noexcept { return FOwner.load(std::memory_order_relaxed) == GetCurrentThreadId(); }

 private:
  static constexpr Cardinal cForEver = 0xFFFFFFFF;

  bool Take(std::uint32_t AThread) noexcept;
  bool Spin() noexcept;
  bool Wait(Cardinal AMilliseconds) noexcept;
  void LeaveAndWake() noexcept;

  std::atomic<std::uint32_t> FOwner = 0;  // thread id, and the word that sleepers wait on; 0 when free
  std::atomic<std::uint32_t> FSleepers = 0;
  std::atomic<bool> FWaking = false;  // a sleeper has been woken and hasn't run yet
  std::uint32_t FDepth = 0;           // the owner's alone
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
