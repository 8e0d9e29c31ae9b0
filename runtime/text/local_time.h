#pragma once

#include "runtime/core/api.h"
#include "runtime/core/types.h"

/// The time of day and the rules of the time zone, over the current clock service. Any thread.
namespace zq {

/// The local time of day in whole milliseconds: what a log line shows never lies in the future.
[[nodiscard]] ZQ_API TDateTime Now();
/// The same moment for who needs no TDateTime: milliseconds since 1970-01-01 00:00 UTC.
[[nodiscard]] ZQ_API Int64 UtcMilliseconds();
/// A moment since 1970-01-01 00:00 UTC as one since 1970-01-01 00:00 local time. The two differ by whole seconds.
[[nodiscard]] ZQ_API Int64 LocalMilliseconds(Int64 AUtc);
[[nodiscard]] ZQ_API TDate Date();
[[nodiscard]] ZQ_API TTime Time();

/// Milliseconds since 1970-01-01 00:00, without a change of time zone; exact both ways for whole milliseconds. Before
/// 1899-12-30 the fraction of a TDateTime counts forward from its day, though the days are negative.
[[nodiscard]] ZQ_API TDateTime UnixMillisecondsToDateTime(Int64 AMilliseconds) noexcept;
[[nodiscard]] ZQ_API Int64 DateTimeToUnixMilliseconds(TDateTime AValue) noexcept;

/// The time zone of the current clock service. Values come back in whole milliseconds.
class ZQ_API TTimeZone {
 public:
  [[nodiscard]] static const TTimeZone& Local() noexcept;
  /// Takes up a change of TZ at once; otherwise it is noticed within a quarter of an hour.
  static void Refresh() noexcept;

  /// Local time minus UTC, in seconds, when the local clock shows ALocal.
  [[nodiscard]] Integer UtcOffset(TDateTime ALocal, bool AForceDaylight = false) const;
  [[nodiscard]] TDateTime ToLocalTime(TDateTime AUtc) const;
  /// An hour that the clock shows twice is taken as standard time, or with AForceDaylight as daylight time. An hour
  /// that it leaves out counts on from the time before it.
  [[nodiscard]] TDateTime ToUniversalTime(TDateTime ALocal, bool AForceDaylight = false) const;
};

}  // namespace zq
