#include "runtime/platform/clock.h"

#include <algorithm>
#include <cmath>
#include <ctime>
#include <limits>
#include <mutex>

namespace zq {

namespace {

constexpr Int64 cDay = 86400;
constexpr Int64 cMillisecondsPerDay = cDay * 1000;
constexpr Int64 cUnixEpoch = 25569;  // as a TDateTime

constexpr Int64 FloorDiv(Int64 AValue, Int64 ABy) noexcept { return AValue / ABy - (AValue % ABy < 0 ? 1 : 0); }

// Rises when the zone may have changed.
constinit std::atomic<unsigned> ZoneGeneration{0};
constinit std::mutex ZoneLock;  // localtime_r reads what tzset writes

Integer SystemOffset(Int64 AUtcSeconds) noexcept {
  const auto Moment = static_cast<std::time_t>(AUtcSeconds);
  std::tm Local{};
  return localtime_r(&Moment, &Local) == nullptr ? 0 : static_cast<Integer>(Local.tm_gmtoff);
}

// Zones change their offset at most once in a quarter of an hour, mostly at its start. So a thread remembers the offset
// of one that begins and ends alike, and asks the system only on leaving it.
class TLinuxClock final : public TClockService {
 public:
  Int64 UtcMicroseconds() override {
    timespec Time{};
    clock_gettime(CLOCK_REALTIME, &Time);
    return Time.tv_sec * 1000000LL + Time.tv_nsec / 1000;
  }
  Integer UtcOffsetSeconds(Int64 AUtcSeconds) override {
    // Initial-exec: no call where a shared library would otherwise make one.
    __attribute__((tls_model("initial-exec"))) thread_local constinit TQuarter Known;
    const Int64 Quarter = FloorDiv(AUtcSeconds, cQuarter);
    const unsigned Generation = ZoneGeneration.load(std::memory_order_relaxed);
    if (Known.Number == Quarter && Known.Generation == Generation) return Known.Offset;
    const std::lock_guard Guard(ZoneLock);
    tzset();
    const Integer First = SystemOffset(Quarter * cQuarter);
    if (First != SystemOffset(Quarter * cQuarter + cQuarter - 1)) return SystemOffset(AUtcSeconds);
    Known = {Quarter, Generation, First};
    return First;
  }

 private:
  static constexpr Int64 cQuarter = 900;
  struct TQuarter {
    Int64 Number = std::numeric_limits<Int64>::min();
    unsigned Generation = 0;
    Integer Offset = 0;
  };
};

constinit TLinuxClock LinuxClock;
constinit std::atomic<TClockService*> Slot = &LinuxClock;

}  // namespace

std::atomic<TClockService*>& ServiceSlot(const TClockService*) { return Slot; }

// The call to the system's own clock, whose class is final, is direct.
ZQ_HOT Int64 UtcMilliseconds() {
  TClockService* const Clock = Slot.load(std::memory_order_acquire);
  return FloorDiv(Clock == &LinuxClock ? LinuxClock.UtcMicroseconds() : Clock->UtcMicroseconds(), 1000);
}

Int64 LocalMilliseconds(Int64 AUtc) {
  return AUtc + Int64{1000} * Platform().Clock().UtcOffsetSeconds(FloorDiv(AUtc, 1000));
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
  const double Day = std::trunc(Value);
  const double Fraction = std::fabs(Value - Day);
  return (static_cast<Int64>(Day) - cUnixEpoch) * cMillisecondsPerDay +
         std::llround(Fraction * static_cast<double>(cMillisecondsPerDay));
}

const TTimeZone& TTimeZone::Local() noexcept {
  static constexpr TTimeZone Zone;
  return Zone;
}

void TTimeZone::Refresh() noexcept { ZoneGeneration.fetch_add(1, std::memory_order_relaxed); }

Integer TTimeZone::UtcOffset(TDateTime ALocal, bool AForceDaylight) const {
  TClockService& Clock = Platform().Clock();
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
