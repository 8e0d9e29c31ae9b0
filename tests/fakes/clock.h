#pragma once

#include <atomic>

#include "runtime/platform/clock_service.h"

namespace zq {

/// In its seam as long as it lives. Stands at 2021-12-23 10:53:18.123 UTC, which is local time too, unless told
/// otherwise, until the test moves it. In the zone of the environment where the test says so.
class TScriptedClock final : public TClockService {
 public:
  explicit TScriptedClock(Int64 AMicroseconds = 1640256798123000, Integer AOffset = 0)
      : Microseconds(AMicroseconds), Offset(AOffset) {}
  Int64 UtcMicroseconds() override { return Microseconds; }
  Integer UtcOffsetSeconds(Int64 AUtcSeconds) override { return OfZone ? FReal.UtcOffsetSeconds(AUtcSeconds) : Offset; }
  void ForgetZone() noexcept override { FReal.ForgetZone(); }
  std::atomic<Int64> Microseconds;
  const Integer Offset;
  bool OfZone = false;

 private:
  TClockService& FReal = Service<TClockService>();
  const TPlatformOverride<TClockService> FSeat{*this};
};

}  // namespace zq
