#pragma once

#include <limits>
#include <string>
#include <string_view>

#include "runtime/core/api.h"
#include "runtime/core/types.h"

/// The time in a line of a log, for layouts. Moments are milliseconds since 1970-01-01 00:00 UTC.
namespace zq {

/// Whether AMoment lies in the second that begins at ASecond.
[[nodiscard]] inline bool ZqIsInSecond(Int64 AMoment, Int64 ASecond) noexcept {
  return AMoment >= ASecond && AMoment <= ASecond + 999;
}

/// Text of a moment, made anew only when the second has changed. One thread at a time.
class ZQ_API TZqSecondText {
 public:
  /// AMake makes the text of a whole second.
  explicit TZqSecondText(std::string (*AMake)(Int64 ASecond)) noexcept : FMake(AMake) {}
  const std::string& At(Int64 AMoment) ZQ_LIFETIMEBOUND {
    if (!ZqIsInSecond(AMoment, FSecond)) [[unlikely]]
      Renew(AMoment);
    return FText;
  }
  /// The last one.
  [[nodiscard]] const std::string& Text() const noexcept ZQ_LIFETIMEBOUND { return FText; }
  /// When it began.
  [[nodiscard]] Int64 Second() const noexcept { return FSecond; }

 private:
  void Renew(Int64 AMoment);

  std::string FText;
  Int64 FSecond = std::numeric_limits<Int64>::min();
  std::string (*FMake)(Int64 ASecond);
};

/// "yyyy-mm-dd hh:mm:ss" of AMilliseconds since 1970-01-01 00:00, without a change of time zone. A log goes on where
/// the calendar of the runtime ends: the years behind 9999 have five digits.
[[nodiscard]] ZQ_API std::string ZqCalendarText(Int64 AMilliseconds);

}  // namespace zq
