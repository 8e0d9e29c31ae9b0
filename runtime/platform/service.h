#pragma once

#include <atomic>

#include "runtime/core/api.h"

namespace zq {

template <class TService>
class TPlatformOverride;

/// Where the current service of a seam lies. Each seam declares one as its member Slot; the file of its feeder defines
/// it and puts the feeder in, which lives to the end of the process.
template <class TService>
class TServiceSlot {
 public:
  constexpr explicit TServiceSlot(TService& AFeeder) noexcept : FCurrent(&AFeeder) {}
  [[nodiscard]] TService& Current() const noexcept { return *FCurrent.load(std::memory_order_acquire); }

 private:
  friend class TPlatformOverride<TService>;
  std::atomic<TService*> FCurrent;
};

/// The service of the system behind a seam: the feeder, unless a TPlatformOverride has put another in. Any thread.
template <class TService>
[[nodiscard]] TService& Service() noexcept {
  return TService::Slot.Current();
}

/// Puts a service in its seam for a scope, for all threads. Overrides nest; AService stays the caller's and must
/// outlive every call that a thread is still making through it.
template <class TService>
class [[nodiscard]] TPlatformOverride {
 public:
  explicit TPlatformOverride(TService& AService) noexcept : FSaved(TService::Slot.FCurrent.exchange(&AService)) {}
  TPlatformOverride(const TPlatformOverride&) = delete;
  TPlatformOverride& operator=(const TPlatformOverride&) = delete;
  ~TPlatformOverride() { TService::Slot.FCurrent.store(FSaved); }

 private:
  TService* FSaved;
};

}  // namespace zq
