#include "runtime/sync/parker.h"

#include <sys/epoll.h>
#include <unistd.h>

#include "runtime/sync/futex.h"
#include "runtime/sync/pause.h"

namespace zq {

void Signal(int AEvent) noexcept {
  const std::uint64_t One = 1;
  static_cast<void>(!::write(AEvent, &One, sizeof One));
}

void TParker::Wake() noexcept {
  const std::uint32_t Before = FState.exchange(cWoken, std::memory_order_acq_rel);
  if (Before == cAsleep) futex::WakeOne(&FState);
  if (Before == cPolling) Signal(FEvent.load(std::memory_order_relaxed));
}

bool TParker::TakeWakeUp() noexcept {
  return FState.load(std::memory_order_relaxed) == cWoken &&
         FState.exchange(cAwake, std::memory_order_acquire) == cWoken;
}

bool TParker::Spin(int ARounds) noexcept {
  for (int i = 0; i < ARounds; ++i) {
    if (TakeWakeUp()) return true;
    SpinPause();
  }
  return false;
}

void TParker::Sleep(const TDeadline& ADeadline) noexcept {
  std::uint32_t Awake = cAwake;
  if (FState.compare_exchange_strong(Awake, cAsleep)) futex::Wait(&FState, cAsleep, ADeadline);
  FState.exchange(cAwake, std::memory_order_acquire);
}

void TParker::SleepOn(int AEpoll, int AEvent, const TDeadline& ADeadline) noexcept {
  FEvent.store(AEvent, std::memory_order_relaxed);
  std::uint32_t Awake = cAwake;
  epoll_event Event{};
  if (FState.compare_exchange_strong(Awake, cPolling)) ::epoll_wait(AEpoll, &Event, 1, ADeadline.Milliseconds());
  FState.exchange(cAwake, std::memory_order_acquire);
}

}  // namespace zq
