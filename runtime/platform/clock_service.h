#pragma once

#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

/// The system's clock and time zone. Called from any thread, the clock on every log line.
class ZQ_API TClockService {
 public:
  static TServiceSlot<TClockService> Slot;

  /// Since 1970-01-01 00:00 UTC.
  virtual Int64 UtcMicroseconds() = 0;
  /// What the local clock showed more than UTC at that moment, in seconds; AUtcSeconds since 1970-01-01.
  virtual Integer UtcOffsetSeconds(Int64 AUtcSeconds) = 0;
  /// The environment names another zone: whatever is kept of the former one goes.
  virtual void ForgetZone() noexcept {}

 protected:
  ~TClockService() = default;
};

}  // namespace zq
