#pragma once

#include <atomic>

#include "runtime/core/api.h"

namespace zq {

class TClockService;
class TDesktopService;
class TEnvironmentService;
class TFileService;
class TProcessFacts;
class TRegistryService;
class TResourceService;
class TShellService;
class TUserService;
class TVersionService;

/// Where the current service of a seam is kept. Each stands in the .cpp of its seam and begins with the Linux feeder,
/// which lives to the end of the process.
ZQ_API std::atomic<TClockService*>& ServiceSlot(const TClockService*);
ZQ_API std::atomic<TDesktopService*>& ServiceSlot(const TDesktopService*);
ZQ_API std::atomic<TEnvironmentService*>& ServiceSlot(const TEnvironmentService*);
ZQ_API std::atomic<TFileService*>& ServiceSlot(const TFileService*);
ZQ_API std::atomic<TProcessFacts*>& ServiceSlot(const TProcessFacts*);
ZQ_API std::atomic<TRegistryService*>& ServiceSlot(const TRegistryService*);
ZQ_API std::atomic<TResourceService*>& ServiceSlot(const TResourceService*);
ZQ_API std::atomic<TShellService*>& ServiceSlot(const TShellService*);
ZQ_API std::atomic<TUserService*>& ServiceSlot(const TUserService*);
ZQ_API std::atomic<TVersionService*>& ServiceSlot(const TVersionService*);

/// The services of the system: the Linux ones, unless a TPlatformOverride has put another in. Any thread.
class TPlatform {
 public:
  [[nodiscard]] TClockService& Clock() const noexcept { return Current<TClockService>(); }
  [[nodiscard]] TDesktopService& Desktop() const noexcept { return Current<TDesktopService>(); }
  [[nodiscard]] TEnvironmentService& Environment() const noexcept { return Current<TEnvironmentService>(); }
  [[nodiscard]] TFileService& Files() const noexcept { return Current<TFileService>(); }
  [[nodiscard]] TProcessFacts& ProcessFacts() const noexcept { return Current<TProcessFacts>(); }
  [[nodiscard]] TRegistryService& Registry() const noexcept { return Current<TRegistryService>(); }
  [[nodiscard]] TResourceService& Resources() const noexcept { return Current<TResourceService>(); }
  [[nodiscard]] TShellService& Shell() const noexcept { return Current<TShellService>(); }
  [[nodiscard]] TUserService& Users() const noexcept { return Current<TUserService>(); }
  [[nodiscard]] TVersionService& Version() const noexcept { return Current<TVersionService>(); }

 private:
  template <class TService>
  static TService& Current() noexcept {
    return *ServiceSlot(static_cast<const TService*>(nullptr)).load(std::memory_order_acquire);
  }
};

[[nodiscard]] inline TPlatform Platform() noexcept { return {}; }

/// Puts a service in its seam for a scope, for all threads. Overrides nest; AService stays the caller's and must
/// outlive every call that a thread is still making through it.
template <class TService>
class [[nodiscard]] TPlatformOverride {
 public:
  explicit TPlatformOverride(TService& AService) noexcept : FSaved(Slot().exchange(&AService)) {}
  TPlatformOverride(const TPlatformOverride&) = delete;
  TPlatformOverride& operator=(const TPlatformOverride&) = delete;
  ~TPlatformOverride() { Slot().store(FSaved); }

 private:
  static std::atomic<TService*>& Slot() noexcept { return ServiceSlot(static_cast<const TService*>(nullptr)); }
  TService* FSaved;
};

}  // namespace zq
