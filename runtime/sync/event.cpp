#include "runtime/sync/event.h"

#include <algorithm>
#include <chrono>
#include <optional>

#include "runtime/sync/pause.h"

namespace zq {

namespace {

using TClock = std::chrono::steady_clock;

// A wake-up costs tens of microseconds: a signal that comes within the first few is met awake.
constexpr int cSpins = 200;

// When a wait is over; never for INFINITE.
std::optional<TClock::time_point> Deadline(Cardinal ATimeout) {
  if (ATimeout == INFINITE) return std::nullopt;
  return TClock::now() + std::chrono::milliseconds(ATimeout);
}

// False when the time was over before AReady.
template <class TReady>
bool WaitUntil(std::condition_variable& AChanged, std::unique_lock<std::mutex>& ALock,
    const std::optional<TClock::time_point>& ADeadline, TReady AReady) {
  if (ADeadline) return AChanged.wait_until(ALock, *ADeadline, AReady);
  AChanged.wait(ALock, AReady);
  return true;
}

}  // namespace

// What WaitForAny sleeps on.
struct TEvent::TWaiter {
  void Wake() {
    const std::lock_guard Guard(Lock);
    Woken = true;
    Changed.notify_one();
  }
  std::mutex Lock;
  std::condition_variable Changed;
  bool Woken = false;
};

void TEvent::SetEvent() {
  const std::lock_guard Guard(FLock);  // held to the end: who passes then may destroy the event
  FSignaled.store(true, std::memory_order_relaxed);
  if (FManualReset) FChanged.notify_all();
  else FChanged.notify_one();
  for (TWaiter* const Waiter : FWaiters) Waiter->Wake();
}

void TEvent::ResetEvent() {
  const std::lock_guard Guard(FLock);
  FSignaled.store(false, std::memory_order_relaxed);
}

TWaitResult TEvent::WaitFor(Cardinal ATimeout) {
  const auto IsSet = [this] { return FSignaled.load(std::memory_order_relaxed); };
  for (int i = 0; ATimeout != 0 && i < cSpins && !IsSet(); ++i) SpinPause();
  std::unique_lock Guard(FLock);
  if (!IsSet() && (ATimeout == 0 || !WaitUntil(FChanged, Guard, Deadline(ATimeout), IsSet))) return wrTimeout;
  if (!FManualReset) FSignaled.store(false, std::memory_order_relaxed);
  return wrSignaled;
}

void TEvent::Enlist(TWaiter* AWaiter) {
  const std::lock_guard Guard(FLock);
  FWaiters.push_back(AWaiter);
}

void TEvent::Delist(TWaiter* AWaiter) {
  const std::lock_guard Guard(FLock);
  std::erase(FWaiters, AWaiter);
}

Integer TEvent::WaitForAny(std::span<TEvent* const> AEvents, Cardinal ATimeout) {
  TWaiter Waiter;
  const auto FirstSet = [&] {
    const auto Found =
        std::find_if(AEvents.begin(), AEvents.end(), [](auto* Event) { return Event->WaitFor(0) == wrSignaled; });
    return Found == AEvents.end() ? -1 : static_cast<Integer>(Found - AEvents.begin());
  };
  const auto Until = Deadline(ATimeout);
  struct TListed {
    ~TListed() {
      for (TEvent* const Event : Events) Event->Delist(&Listed);
    }
    std::span<TEvent* const> Events;
    TWaiter& Listed;
  } const Listed{AEvents, Waiter};  // a thread that is cancelled in its wait leaves nothing behind
  for (TEvent* const Event : AEvents) Event->Enlist(&Waiter);
  Integer Result = FirstSet();
  while (Result < 0) {
    std::unique_lock Guard(Waiter.Lock);
    if (!WaitUntil(Waiter.Changed, Guard, Until, [&] { return Waiter.Woken; })) break;
    Waiter.Woken = false;
    Guard.unlock();
    Result = FirstSet();
  }
  return Result;
}

}  // namespace zq
