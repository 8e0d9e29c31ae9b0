#include "common/uZqLogLayouts/time_text.h"

#include <chrono>
#include <cstdio>

namespace zq {

void TZqSecondText::Renew(Int64 AMoment) {
  const Int64 Second = AMoment - (AMoment % 1000 + 1000) % 1000;
  FText = FMake(Second);
  FSecond = Second;
}

std::string ZqCalendarText(Int64 AMilliseconds) {
  const auto Moment = std::chrono::floor<std::chrono::seconds>(
      std::chrono::sys_time<std::chrono::milliseconds>(std::chrono::milliseconds(AMilliseconds)));
  const auto Day = std::chrono::floor<std::chrono::days>(Moment);
  const std::chrono::year_month_day Date(Day);
  const std::chrono::hh_mm_ss Time(Moment - Day);
  char Text[40];
  const int Length = std::snprintf(Text, sizeof Text, "%04d-%02u-%02u %02d:%02d:%02d", static_cast<int>(Date.year()),
      static_cast<unsigned>(Date.month()), static_cast<unsigned>(Date.day()), static_cast<int>(Time.hours().count()),
      static_cast<int>(Time.minutes().count()), static_cast<int>(Time.seconds().count()));
  return {Text, static_cast<std::size_t>(Length)};
}

}  // namespace zq
