#include "runtime/sync/event.h"

#include <algorithm>

#include "runtime/sync/event_watch.h"
#include "runtime/sync/pause.h"
#include "runtime/sync/thread_queue.h"

namespace zq {

namespace {

// A wake-up costs tens of microseconds: a signal that comes within the first few is met awake.
constexpr int cSpins = 200;

}  // namespace

TEvent::TWatch::TWatch(TEvent& AEvent, TParker& AParker) : FEvent(AEvent), FParker(AParker) {
  const std::lock_guard Guard(FEvent.FLock);
  FNext = FEvent.FWatches;
  if (FNext != nullptr) FNext->FLink = &FNext;
  FEvent.FWatches = this;
  FLink = &FEvent.FWatches;
}

TEvent::TWatch::~TWatch() {
  const std::lock_guard Guard(FEvent.FLock);
  *FLink = FNext;
  if (FNext != nullptr) FNext->FLink = FLink;
}

// Each waiter is woken, also for an automatic event: one that just leaves its wait would else keep the signal from
// the next.
void TEvent::SetEvent() {
  const std::lock_guard Guard(FLock);  // held to the end: who passes then may destroy the event
  FSignaled.store(true, std::memory_order_relaxed);
  for (TWatch* Watch = FWatches; Watch != nullptr; Watch = Watch->FNext) Watch->FParker.Wake();
}

void TEvent::ResetEvent() {
  const std::lock_guard Guard(FLock);
  FSignaled.store(false, std::memory_order_relaxed);
}

bool TEvent::TryPass() noexcept {
  const std::lock_guard Guard(FLock);
  const bool Result = FSignaled.load(std::memory_order_relaxed);
  if (!FManualReset) FSignaled.store(false, std::memory_order_relaxed);
  return Result;
}

TWaitResult TEvent::WaitFor(Cardinal ATimeout) {
  for (int i = 0; ATimeout != 0 && i < cSpins && !FSignaled.load(std::memory_order_relaxed); ++i) SpinPause();
  if (TryPass()) return wrSignaled;
  if (ATimeout == 0) return wrTimeout;
  TEvent* const This = this;
  return WaitForAny({&This, 1}, ATimeout) == 0 ? wrSignaled : wrTimeout;
}

Integer TEvent::WaitForAny(std::span<TEvent* const> AEvents, Cardinal ATimeout) {
  return TThreadQueue::Current()->WaitForAny(AEvents, ATimeout, TThreadQueue::TServe::Nothing);
}

}  // namespace zq
