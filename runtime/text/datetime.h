#pragma once

#include <array>
#include <cmath>

#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/text/format_settings.h"

namespace zq {

// The calendar is the Gregorian one, also before it was made, from year 1 to 9999. A moment before 1899-12-30 is a
// negative number of days whose fraction still counts forward: -1.25 is 1899-12-29 06:00.

inline constexpr Integer cHoursPerDay = 24;
inline constexpr Integer cMinsPerDay = 24 * 60;
inline constexpr Integer cSecsPerDay = 24 * 60 * 60;
inline constexpr Integer cMSecsPerDay = cSecsPerDay * 1000;
/// 1970-01-01.
inline constexpr Integer cUnixDateDelta = 25569;

using TDayTable = std::array<Word, 12>;
/// Days of each month, by leap year: MonthDays[IsLeapYear(y)][m - 1].
inline constexpr std::array<TDayTable, 2> MonthDays = {
    {{31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31}, {31, 29, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31}}};

/// A moment in its parts. DayOfWeek: 0 is Sunday.
struct TSystemTime {
  Word Year = 0;
  Word Month = 0;
  Word DayOfWeek = 0;
  Word Day = 0;
  Word Hour = 0;
  Word Minute = 0;
  Word Second = 0;
  Word Milliseconds = 0;
  friend bool operator==(const TSystemTime&, const TSystemTime&) = default;
};

[[nodiscard]] constexpr bool IsLeapYear(Word AYear) noexcept {
  return AYear % 4 == 0 && (AYear % 100 != 0 || AYear % 400 == 0);
}
/// Towards zero.
[[nodiscard]] constexpr Int64 Trunc(Extended AValue) noexcept { return static_cast<Int64>(AValue); }
[[nodiscard]] inline Extended Frac(Extended AValue) noexcept { return AValue - std::trunc(AValue); }
/// Halves to even.
[[nodiscard]] inline Int64 Round(Extended AValue) noexcept { return std::llrint(AValue); }

/// These raise EConvertError for what is no date or no time of day; Try... give false and leave AResult as it was.
[[nodiscard]] ZQ_API TDateTime EncodeDate(Word AYear, Word AMonth, Word ADay);
[[nodiscard]] ZQ_API TDateTime EncodeTime(Word AHour, Word AMinute, Word ASecond, Word AMilliseconds);
[[nodiscard]] ZQ_API bool TryEncodeDate(Word AYear, Word AMonth, Word ADay, TDateTime& AResult) noexcept;
[[nodiscard]] ZQ_API bool TryEncodeTime(
    Word AHour, Word AMinute, Word ASecond, Word AMilliseconds, TDateTime& AResult) noexcept;
/// All 0 for a moment before year 1 or behind 9999.
ZQ_API void DecodeDate(TDateTime AValue, Word& AYear, Word& AMonth, Word& ADay) noexcept;
/// To the nearest millisecond. One that would be midnight is 00:00, and DecodeDate of the same value gives the next
/// day.
ZQ_API void DecodeTime(TDateTime AValue, Word& AHour, Word& AMinute, Word& ASecond, Word& AMilliseconds) noexcept;
/// 1 is Sunday, 7 Saturday. 1 for a moment before year 1 or behind 9999.
[[nodiscard]] ZQ_API Word DayOfWeek(TDateTime AValue) noexcept;

/// Raises EConvertError for a moment outside of the years 1 to 9999.
[[nodiscard]] ZQ_API TSystemTime DateTimeToSystemTime(TDateTime AValue);
/// DayOfWeek plays no part. Raises EConvertError.
[[nodiscard]] ZQ_API TDateTime SystemTimeToDateTime(const TSystemTime& AValue);
/// ADate at ATime, a time of day from 0 on. Their sum is that only from 1899-12-30 on.
[[nodiscard]] ZQ_API TDateTime JoinDateTime(TDateTime ADate, TDateTime ATime) noexcept;
/// The moment so many days later, also across 1899-12-30, where the sum of the numbers is another moment.
[[nodiscard]] ZQ_API TDateTime ShiftDateTime(TDateTime AValue, double ADays) noexcept;
/// The date of a file as two packed words: year since 1980, month, day; hour, minute, seconds by two. Raises
/// EConvertError.
[[nodiscard]] ZQ_API TDateTime FileDateToDateTime(Integer AFileDate);
/// Raises EConvertError outside of the years 1980 to 2107.
[[nodiscard]] ZQ_API Integer DateTimeToFileDate(TDateTime AValue);

/// Writes AValue by a pattern; letters count in either case.
///
///   d dd ddd dddd        day, two digits, short and long name of the day of the week
///   m mm mmm mmmm        month likewise; m and mm behind an h or hh are minutes
///   yy yyyy              year in two and four digits
///   h hh n nn s ss       hour (1 to 12 where the pattern has am/pm, a/p or ampm), minute, second
///   z zzz                milliseconds
///   am/pm a/p ampm       marker of the half of the day, in the case of the pattern; ampm: that of the settings
///   t tt c ddddd dddddd  short time, long time, date with the time if there is one, short date, long date
///   "text" 'text'        as it is
///
/// Every other character is copied, ":" and "/" too. A letter of the table that is to stand for itself goes into
/// quotes: yyyy-mm-dd"T"hh:nn:ss, where an unquoted T would write the short time. Without settings these go by
/// FormatSettings(). They and the next ones raise EConvertError for a moment before year 1 or behind 9999.
[[nodiscard]] ZQ_API UnicodeString FormatDateTime(const UnicodeString& APattern, TDateTime AValue);
[[nodiscard]] ZQ_API UnicodeString FormatDateTime(
    const UnicodeString& APattern, TDateTime AValue, const TFormatSettings& ASettings);
/// The short date, and behind a blank the long time unless it is midnight.
[[nodiscard]] ZQ_API UnicodeString DateTimeToStr(TDateTime AValue);
[[nodiscard]] ZQ_API UnicodeString DateTimeToStr(TDateTime AValue, const TFormatSettings& ASettings);
[[nodiscard]] ZQ_API UnicodeString DateToStr(TDateTime AValue);
[[nodiscard]] ZQ_API UnicodeString DateToStr(TDateTime AValue, const TFormatSettings& ASettings);
[[nodiscard]] ZQ_API UnicodeString TimeToStr(TDateTime AValue);
[[nodiscard]] ZQ_API UnicodeString TimeToStr(TDateTime AValue, const TFormatSettings& ASettings);

// Dates are read as numbers in the order of ShortDateFormat, with DateSeparator between them. Two numbers are day and
// month of this year. A year of one or two digits lies in the hundred years around now: from 50 years ago on. Times are
// one to four numbers, hour first, with TimeSeparator between them and DecimalSeparator or "." before the milliseconds;
// the settings' or the plain AM or PM may follow. Blanks around and between are skipped. These raise EConvertError.

[[nodiscard]] ZQ_API TDateTime StrToDate(const UnicodeString& AText);
[[nodiscard]] ZQ_API TDateTime StrToDate(const UnicodeString& AText, const TFormatSettings& ASettings);
[[nodiscard]] ZQ_API TDateTime StrToTime(const UnicodeString& AText);
[[nodiscard]] ZQ_API TDateTime StrToTime(const UnicodeString& AText, const TFormatSettings& ASettings);
/// A date, a time, or a date, a blank and a time.
[[nodiscard]] ZQ_API TDateTime StrToDateTime(const UnicodeString& AText);
[[nodiscard]] ZQ_API TDateTime StrToDateTime(const UnicodeString& AText, const TFormatSettings& ASettings);
[[nodiscard]] ZQ_API bool TryStrToDate(
    const UnicodeString& AText, TDateTime& AResult, const TFormatSettings& ASettings);
[[nodiscard]] ZQ_API bool TryStrToTime(
    const UnicodeString& AText, TDateTime& AResult, const TFormatSettings& ASettings);
[[nodiscard]] ZQ_API bool TryStrToDateTime(
    const UnicodeString& AText, TDateTime& AResult, const TFormatSettings& ASettings);

}  // namespace zq
