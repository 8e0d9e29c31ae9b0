#pragma once

#include <concepts>

#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

/// Calendar arithmetic and the text forms of dates, times and durations.
///
/// Any thread. The calendar is that of the years 1 to 9999: a date outside of it, or one that doesn't exist, raises
/// EConvertError. Times of day are seen to the nearest millisecond. Dates before 1899-12-30 are as good as later ones.
namespace zq {

namespace uZqDateTimeUtils {

inline constexpr TResStringRec _SInvalidTime{
    65523, u"Invalid time passed.\r\nThere are not more than 60 seconds in a minute."};
inline constexpr TResStringRec _SBetween0and59{65524, u"The string '%s' must contain a value between 0 and 59"};
inline constexpr TResStringRec _STimeConvertError{
    65525, u"An error has occurred while converting a string to a time format."};
inline constexpr TResStringRec _STimeDecodeError{65526, u"An error has occurred while decoding a time parameter"};

ZQ_API void Start();
ZQ_API void Stop();

}  // namespace uZqDateTimeUtils

enum class TZqWeekFormat : Byte { wfYearWeek, wfWeek };
using enum TZqWeekFormat;
enum class TZqDatePeriod : Byte { dpNone, dpYear, dpHalfYear, dpQuarter, dpFourWeeks, dpMonth, dpWeek, dpDay };
using enum TZqDatePeriod;
enum class TZqWorkDayAdjustment : Byte { wdLast, wdNext };
using enum TZqWorkDayAdjustment;
enum class TZqDecodeType : Byte { dtYear, dtMonth, dtDayOfYear, dtDayOfMonth };
using enum TZqDecodeType;

// Days of the week are numbered from Sunday, 1, to Saturday, 7.

// ---- Start and end of a period -------------------------------------------------------------------------------------

/// What is a date beside a TDateTime. The functions that take a year or a date have a form for it, because a double, or
/// the sum of a TDateTime and a number, would otherwise be taken for a year.
template <class T>
concept TZqDateValue = std::floating_point<T> || std::same_as<T, TDate>;

// Dates without time of day, but for the two weeks that begin with a date.

[[nodiscard]] ZQ_API TDateTime ZqBOMonth(Word AYear, Word AMonth);
[[nodiscard]] ZQ_API TDateTime ZqBOMonth(TDateTime ADate);
[[nodiscard]] ZQ_API TDateTime ZqEOMonth(Word AYear, Word AMonth);
[[nodiscard]] ZQ_API TDateTime ZqEOMonth(TDateTime ADate);
[[nodiscard]] ZQ_API TDateTime ZqBOYear(Word AYear);
[[nodiscard]] ZQ_API TDateTime ZqBOYear(TDateTime ADate);
[[nodiscard]] TDateTime ZqBOYear(TZqDateValue auto ADate) { return ZqBOYear(TDateTime(ADate)); }
[[nodiscard]] ZQ_API TDateTime ZqEOYear(Word AYear);
[[nodiscard]] ZQ_API TDateTime ZqEOYear(TDateTime ADate);
[[nodiscard]] TDateTime ZqEOYear(TZqDateValue auto ADate) { return ZqEOYear(TDateTime(ADate)); }
/// The last day not behind ADate that falls on AFirstDay, 1 to 7 (asserted); the time of day stays.
[[nodiscard]] ZQ_API TDateTime ZqBOWeek(TDateTime ADate, Integer AFirstDay);
/// The Saturday of a week that begins on Sunday; the time of day stays.
[[nodiscard]] ZQ_API TDateTime ZqEOWeek(TDateTime ADate);
/// The Sunday of that ISO week.
[[nodiscard]] ZQ_API TDateTime ZqEOWeek(Word AYear, Word AWeek);

// ---- Arithmetic ----------------------------------------------------------------------------------------------------

/// 29 February becomes the 28th in a year that has none. The time of day stays.
[[nodiscard]] ZQ_API TDateTime ZqAddYears(TDateTime ADate, Integer AYears);
/// These two: the same day, or the last one of a shorter month. Without the time of day.
[[nodiscard]] ZQ_API TDateTime ZqAddQuarters(TDateTime ADate, Integer AQuarters);
[[nodiscard]] ZQ_API TDateTime ZqAddMonths(TDateTime ADate, Integer AMonths);
[[nodiscard]] ZQ_API TDateTime ZqAddWeeks(TDateTime ADate, Integer AWeeks);
[[nodiscard]] ZQ_API TDateTime ZqAddDays(TDateTime ADate, Integer ADays);
// By the clock without changes of time zone: where local time has a change between, go by UTC.
[[nodiscard]] ZQ_API TDateTime ZqAddHrs(TDateTime ADate, Integer AHours);
[[nodiscard]] ZQ_API TDateTime ZqAddMins(TDateTime ADate, Integer AMinutes);
[[nodiscard]] ZQ_API TDateTime ZqAddSecs(TDateTime ADate, Integer ASeconds);

// ---- Queries -------------------------------------------------------------------------------------------------------

[[nodiscard]] ZQ_API Word ZqDaysInMonth(Word AYear, Word AMonth);
[[nodiscard]] ZQ_API Word ZqDaysInMonth(TDateTime ADate);
[[nodiscard]] ZQ_API Word ZqDaysInYear(Word AYear);
[[nodiscard]] ZQ_API Word ZqDaysInYear(TDateTime ADate);
[[nodiscard]] Word ZqDaysInYear(TZqDateValue auto ADate) { return ZqDaysInYear(TDateTime(ADate)); }
[[nodiscard]] ZQ_API Word ZqDecodeDate(TDateTime ADate, TZqDecodeType AType);
[[nodiscard]] ZQ_API Word ZqDayOfMonth(TDateTime ADate);
/// From 1.
[[nodiscard]] ZQ_API Word ZqDayOfYear(TDateTime ADate);
[[nodiscard]] ZQ_API TDateTime ZqFirstThursdayOfYear(Word AYear);
[[nodiscard]] ZQ_API TDateTime ZqFirstThursdayOfYear(TDateTime ADate);
[[nodiscard]] TDateTime ZqFirstThursdayOfYear(TZqDateValue auto ADate) {
  return ZqFirstThursdayOfYear(TDateTime(ADate));
}
/// The Monday of that ISO week; week 1 is that of the year's first Thursday.
[[nodiscard]] ZQ_API TDateTime ZqWeekToDate(Word AYear, Word AWeek);
/// The week counted from week 1 of the date's own calendar year, 1 to 53. It isn't the ISO week at the turn of the
/// year: days before week 1 count to it, and the last days may lie in a week 53 that ISO calls 1 of the next year.
[[nodiscard]] ZQ_API Word ZqWeekOfYear(TDateTime ADate);
/// The same in two digits, behind the year in four if AWithYear: "202151".
[[nodiscard]] ZQ_API UnicodeString ZqWeekOfYear(TDateTime ADate, Boolean AWithYear);
/// A Saturday or Sunday becomes the Friday before it (wdLast) or the Monday behind it; the time of day stays. A date of
/// 0 or below comes back as it is.
[[nodiscard]] ZQ_API TDateTime ZqClosestWeekDay(TDateTime ADate, TZqWorkDayAdjustment AAdjust);
/// The days from B to A: negative if A's day is the earlier one. The time of day plays no part.
[[nodiscard]] ZQ_API Integer ZqDateCompare(TDateTime A, TDateTime B);
/// Whole years from that date until now; 0 for a date of 0 or below.
[[nodiscard]] ZQ_API Integer ZqCalculateAge(TDateTime ADate);
/// Up to the next multiple of AInterval minutes (above 0, asserted) in the hour; seconds are dropped, not rounded up.
/// Raises EConvertError where that would be midnight, or past minute 60.
[[nodiscard]] ZQ_API TDateTime ZqRoundTime(TDateTime ADate, Integer AInterval);
/// By the zone of the system with the rules of that date. To the millisecond.
[[nodiscard]] ZQ_API TDateTime ZqUTCToLocal(TDateTime ADate);
/// An hour that the clock shows twice is taken as standard time; one that it leaves out counts on from the time before.
[[nodiscard]] ZQ_API TDateTime ZqLocalToUTC(TDateTime ADate);

// ---- Durations -----------------------------------------------------------------------------------------------------

// The separator is the TimeSeparator of FormatSettings().

enum class TZqTimeRange : Byte {
  trDuration,
  trPointOfTime,  ///< time of day
  trEndTime       ///< time of day, or 24 for the end of the day
};
using enum TZqTimeRange;
enum class TZqTimeFormat : Byte { tfNone, tfHourMin, tfHourMinSec, tfDecHourM2, tfDecHourM3, tfDecMinM2 };
using enum TZqTimeFormat;

/// Hours without padding or limit, minutes and, if AWithSeconds, seconds: "25:00". Halves of a second go to the even
/// one. Raises EConvertError (_STimeDecodeError) for what no Int64 holds.
[[nodiscard]] ZQ_API UnicodeString ZqTimeToStr(double ASeconds, Boolean AWithSeconds);
/// The seconds that AText tells; a "-" in front makes them negative.
///
/// Of a time of day, seconds count only if AWithSeconds; raises Exception (_STimeDecodeError) for what is none. A
/// duration is read in AFormat: tfHourMin, where more than 59 minutes raise Exception (_SInvalidTime), or tfHourMinSec,
/// where minutes and seconds outside of 0 to 59, and hours that don't stay a full hour below AMaxSeconds, raise
/// EConvertError (_STimeConvertError). Fields may be missing or empty; one that is no number raises EConvertError. The
/// other formats read nothing: 0.
[[nodiscard]] ZQ_API Integer ZqStrToTimeToInt(
    const UnicodeString& AText, Boolean AWithSeconds, TZqTimeRange ARange, TZqTimeFormat AFormat, Integer AMaxSeconds);

// ---- Dates as text -------------------------------------------------------------------------------------------------

/// The form "DEC  3 2021  9:05:07:045AM" of 26 characters; read without regard to case or to the number of blanks.
/// Raises EListError where fields are missing, EConvertError for what is no number or no date.
[[nodiscard]] ZQ_API TDateTime ConvertLUOToDateTime(const UnicodeString& AText);
[[nodiscard]] ZQ_API UnicodeString ConvertDateTimeToLUO(TDateTime ADate);
/// Day, month and year with "-" between them, a time or both, whatever the locale's order. 0 for anything else.
[[nodiscard]] ZQ_API TDateTime ZqStrToDateTime(const UnicodeString& AText);
/// What local time is ahead of UTC now, in whole hours: "GMT 1", "GMT -5".
[[nodiscard]] ZQ_API UnicodeString ZqGetTimeZone();
/// The ShortDateFormat of FormatSettings() with a year of four digits.
[[nodiscard]] ZQ_API UnicodeString ZqShortDateFormatY2k();

// ISO 8601 by fixed places. Written as they are, without a zone. Empty texts are 0; what is no date raises
// EConvertError. A field takes digits alone.

/// "2021-12-23".
[[nodiscard]] ZQ_API UnicodeString ZqDateToISOStr(TDateTime ADate);
/// The time of day on the base date: "1899-12-30T10:53:18.045".
[[nodiscard]] ZQ_API UnicodeString ZqTimeToISOStr(TDateTime ADate);
/// "2021-12-23T10:53:18.045".
[[nodiscard]] ZQ_API UnicodeString ZqDateTimeToISOStr(TDateTime ADate);
/// "2021-12-23" or "20211223"; text behind it plays no part. 0 for "0000-00-00".
[[nodiscard]] ZQ_API TDateTime ZqISOStrToDate(const UnicodeString& AText);
/// "10:53:18", maybe behind a date and a "T" and with "." and milliseconds behind it: one to three digits, a count, so
/// that ".5" is five of them. A "Z" behind the seconds makes it UTC of the base date, which comes back as local time.
[[nodiscard]] ZQ_API TDateTime ZqISOStrToTime(const UnicodeString& AText);
/// A date, or a date, "T" and a time. With "Z", or with a time and "+hh:mm" or "-hh:mm" behind it, the moment in local
/// time; without, as it is. 0 for "0".
[[nodiscard]] ZQ_API TDateTime ZqISOStrToDateTime(const UnicodeString& AText);

}  // namespace zq
