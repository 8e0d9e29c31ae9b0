#include "runtime/text/local_time.h"

#include <algorithm>
#include <cmath>

#include "runtime/platform/clock_service.h"

namespace zq {

namespace {

constexpr Int64 cDay = 86400;
constexpr Int64 cMillisecondsPerDay = cDay * 1000;
constexpr Int64 cUnixEpoch = 25569;  // as a TDateTime

constexpr Int64 FloorDiv(Int64 AValue, Int64 ABy) noexcept { return AValue / ABy - (AValue % ABy < 0 ? 1 : 0); }

}  // namespace

ZQ_HOT Int64 UtcMilliseconds() { return FloorDiv(Service<TClockService>().UtcMicroseconds(), 1000); }

Int64 LocalMilliseconds(Int64 AUtc) {
  return AUtc + Int64{1000} * Service<TClockService>().UtcOffsetSeconds(FloorDiv(AUtc, 1000));
}

TDateTime Now() { return UnixMillisecondsToDateTime(LocalMilliseconds(UtcMilliseconds())); }

TDate Date() { return TDate(std::trunc(Now().Value)); }

TTime Time() {
  const double Value = Now();
  return TTime(Value - std::trunc(Value));
}

TDateTime UnixMillisecondsToDateTime(Int64 AMilliseconds) noexcept {
  const Int64 UnixDay = FloorDiv(AMilliseconds, cMillisecondsPerDay);
  const auto Day = static_cast<double>(UnixDay + cUnixEpoch);
  const double Fraction =
      static_cast<double>(AMilliseconds - UnixDay * cMillisecondsPerDay) / static_cast<double>(cMillisecondsPerDay);
  return Day < 0 ? Day - Fraction : Day + Fraction;
}

Int64 DateTimeToUnixMilliseconds(TDateTime AValue) noexcept {
  constexpr double MaxDay = 1e9;  // what doesn't fit is cut; no calendar goes so far
  const double Value = std::isnan(AValue.Value) ? 0 : std::clamp(AValue.Value, -MaxDay, MaxDay);
  const auto Day = static_cast<Int64>(Value);
  const double Fraction = std::fabs(Value - static_cast<double>(Day));
  return (Day - cUnixEpoch) * cMillisecondsPerDay + std::llround(Fraction * static_cast<double>(cMillisecondsPerDay));
}

const TTimeZone& TTimeZone::Local() noexcept {
  static constexpr TTimeZone Zone;
  return Zone;
}

void TTimeZone::Refresh() noexcept { Service<TClockService>().ForgetZone(); }

Integer TTimeZone::UtcOffset(TDateTime ALocal, bool AForceDaylight) const {
  TClockService& Clock = Service<TClockService>();
  const Int64 Local = FloorDiv(DateTimeToUnixMilliseconds(ALocal), 1000);
  // No zone is a day away from UTC: these two lie before and behind whatever change the clock makes about ALocal.
  const Integer Before = Clock.UtcOffsetSeconds(Local - cDay);
  const Integer After = Clock.UtcOffsetSeconds(Local + cDay);
  const bool FitsBefore = Clock.UtcOffsetSeconds(Local - Before) == Before;
  const bool FitsAfter = Clock.UtcOffsetSeconds(Local - After) == After;
  if (FitsBefore && FitsAfter) return AForceDaylight ? std::max(Before, After) : std::min(Before, After);
  return FitsAfter ? After : Before;
}

TDateTime TTimeZone::ToLocalTime(TDateTime AUtc) const {
  return UnixMillisecondsToDateTime(LocalMilliseconds(DateTimeToUnixMilliseconds(AUtc)));
}

TDateTime TTimeZone::ToUniversalTime(TDateTime ALocal, bool AForceDaylight) const {
  return UnixMillisecondsToDateTime(
      DateTimeToUnixMilliseconds(ALocal) - Int64{1000} * UtcOffset(ALocal, AForceDaylight));
}

}  // namespace zq
