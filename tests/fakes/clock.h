#pragma once

#include <atomic>

#include "runtime/platform/clock_service.h"

namespace zq {

/// In its seam as long as it lives. Stands at 2021-12-23 10:53:18.123 UTC, which is local time too, unless told
/// otherwise, until the test moves it.
class TScriptedClock final : public TClockService {
 public:
  explicit TScriptedClock(Int64 AMicroseconds = 1640256798123000, Integer AOffset = 0)
      : Microseconds(AMicroseconds), Offset(AOffset) {}
  Int64 UtcMicroseconds() override { return Microseconds; }
  Integer UtcOffsetSeconds(Int64) override { return Offset; }
  std::atomic<Int64> Microseconds;
  const Integer Offset;

 private:
  const TPlatformOverride<TClockService> FSeat{*this};
};

}  // namespace zq
