#pragma once

#include <atomic>
#include <mutex>
#include <span>

#include "runtime/core/objects.h"
#include "runtime/sync/deadline.h"

namespace zq {

class TParker;

enum class TWaitResult : std::uint8_t { wrSignaled, wrTimeout, wrAbandoned, wrError };
using enum TWaitResult;

/// What a thread can wait for.
class ZQ_API TSynchroObject : public TObject {
 public:
  ~TSynchroObject() override = default;
  /// For at most ATimeout milliseconds, on a clock that nobody sets.
  virtual TWaitResult WaitFor(Cardinal ATimeout = INFINITE) = 0;
};

/// A flag to wait for. Any thread may call; a wait ends at the signal.
///
/// A manual-reset event lets every waiter pass until ResetEvent; an automatic one lets one pass and is reset by that.
/// Once a waiter has passed, the event may be destroyed: SetEvent doesn't touch it any more.
class ZQ_API TEvent : public TSynchroObject {
 public:
  explicit TEvent(bool AManualReset = true, bool AInitialState = false) noexcept
      : FManualReset(AManualReset), FSignaled(AInitialState) {}
  ~TEvent() override = default;

  void SetEvent();
  void ResetEvent();
  TWaitResult WaitFor(Cardinal ATimeout = INFINITE) override;

  /// Waits for the first of several and returns its index; -1 when the time is over. Of those that are set the
  /// foremost passes. All must outlive the call.
  static Integer WaitForAny(std::span<TEvent* const> AEvents, Cardinal ATimeout = INFINITE);

 private:
  friend class TThreadQueue;
  class TWatch;
  // Passes if the event is set.
  bool TryPass() noexcept;

  std::mutex FLock;
  TWatch* FWatches = nullptr;  // of the threads that wait
  const bool FManualReset;
  std::atomic<bool> FSignaled;  // written under FLock
};

/// Manual-reset, not set at first.
class ZQ_API TSimpleEvent : public TEvent {
 public:
  TSimpleEvent() noexcept : TEvent(true, false) {}
};

}  // namespace zq
