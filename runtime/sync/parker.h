#pragma once

#include <atomic>
#include <cstdint>

#include "runtime/sync/deadline.h"

namespace zq {

/// Adds to AEvent, an eventfd. It can fail only where that is full, and so signalled.
void Signal(int AEvent) noexcept;

/// What one thread sleeps on until others wake it.
///
/// A wake-up that comes before the sleep ends that at once: who looks for what it waits for, and sleeps if it isn't
/// there, misses nothing. A sleep may end without reason, so it stands in a loop around that look.
class TParker {
 public:
  /// Any thread.
  void Wake() noexcept;
  /// By the thread itself: stays awake for a moment, for a wake-up that comes soon; false if none has come.
  bool Spin(int ARounds) noexcept;
  void Sleep(const TDeadline& ADeadline) noexcept;
  /// The same on AEpoll, which AEvent, an eventfd, is among: Wake writes into that.
  void SleepOn(int AEpoll, int AEvent, const TDeadline& ADeadline) noexcept;

 private:
  static constexpr std::uint32_t cAwake = 0, cWoken = 1, cAsleep = 2, cPolling = 3;
  bool TakeWakeUp() noexcept;

  std::atomic<std::uint32_t> FState = cAwake;
  std::atomic<int> FEvent = -1;  // set before cPolling
};

}  // namespace zq
