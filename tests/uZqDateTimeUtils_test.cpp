#include "common/uZqDateTimeUtils.h"

#include <gtest/gtest.h>

#include <limits>

#include "common/uZqSysUtils.h"
#include "runtime/io/files.h"
#include "runtime/text/datetime.h"
#include "runtime/text/format_settings.h"
#include "runtime/text/local_time.h"
#include "runtime/text/numbers.h"
#include "tests/fakes/clock.h"
#include "tests/support/support.h"

namespace zq {
namespace {

constexpr double cMillisecond = 1.0 / cMSecsPerDay;
constexpr const char* cBerlin = "CET-1CEST,M3.5.0,M10.5.0/3";

TDateTime At(const char16_t* AText) { return StrToDateTime(AText, TFormatSettings()); }

UnicodeString Shown(TDateTime AValue) {
  const UnicodeString Text = FormatDateTime(u"yyyy-mm-dd hh:nn:ss.zzz", AValue);
  return StringReplace(StringReplace(Text, u".000", u"", {}), u" 00:00:00", u"", {});
}

/// Settings of all threads for a scope.
struct TSettingsScope {
  explicit TSettingsScope(const TFormatSettings& ASettings) { SetFormatSettings(ASettings); }
  ~TSettingsScope() { SetFormatSettings(Saved); }
  const TFormatSettings Saved = FormatSettings();
};

// ---- Calendar ------------------------------------------------------------------------------------------------------

TEST(DatePeriods, BeginAndEndWhereTheCalendarSays) {
  const TDateTime Leap = At(u"2020-02-29 10:30"), Sunday = At(u"2021-01-03 06:00"), Last = At(u"2021-12-31 23:00");
  const std::pair<TDateTime, const char16_t*> cCases[] = {{ZqBOMonth(2021, 12), u"2021-12-01"},
      {ZqBOMonth(Leap), u"2020-02-01"}, {ZqEOMonth(Leap), u"2020-02-29"}, {ZqEOMonth(1900, 2), u"1900-02-28"},
      {ZqEOMonth(Last), u"2021-12-31"}, {ZqBOYear(2021), u"2021-01-01"}, {ZqEOYear(2021), u"2021-12-31"},
      {ZqBOYear(Last + 1), u"2022-01-01"}, {ZqEOYear(TDate(Last)), u"2021-12-31"}, {ZqEOYear(Leap), u"2020-12-31"},
      {ZqBOWeek(Sunday, 2), u"2020-12-28 06:00:00"}, {ZqBOWeek(Sunday, 1), u"2021-01-03 06:00:00"},
      {ZqBOWeek(Sunday, 7), u"2021-01-02 06:00:00"}, {ZqBOWeek(At(u"1900-01-01 18:00"), 7), u"1899-12-30 18:00:00"},
      {ZqBOWeek(At(u"1900-01-01 18:00"), 6), u"1899-12-29 18:00:00"}, {ZqEOWeek(Sunday), u"2021-01-09 06:00:00"},
      {ZqEOWeek(Sunday - 1), u"2021-01-02 06:00:00"}, {ZqEOWeek(2021, 1), u"2021-01-10"}};
  for (const auto& [Value, Want] : cCases) EXPECT_EQ(Shown(Value), Want);
  for (const Integer FirstDay : {0, 8}) EXPECT_THROW((void)ZqBOWeek(Sunday, FirstDay), EAssertionFailed);
}

TEST(DateArithmetic, KeepsToTheLengthOfMonthsAndCountsAcrossTheBaseDate) {
  const TDateTime Leap = At(u"2020-02-29 10:30"), March = At(u"2021-03-31 10:30"), Early = At(u"1899-12-29 06:00");
  const std::pair<TDateTime, const char16_t*> cCases[] = {{ZqAddYears(Leap, 1), u"2021-02-28 10:30:00"},
      {ZqAddYears(Leap, -4), u"2016-02-29 10:30:00"}, {ZqAddYears(Leap, -120), u"1900-02-28 10:30:00"},
      {ZqAddYears(Leap, -124), u"1896-02-29 10:30:00"}, {ZqAddYears(Early, 1), u"1900-12-29 06:00:00"},
      {ZqAddYears(At(u"2020-12-31 23:59:59") + 0.9996 / cSecsPerDay, 1), u"2022-01-01"},
      {ZqAddMonths(March, -1), u"2021-02-28"}, {ZqAddMonths(March, 0), u"2021-03-31"},
      {ZqAddMonths(March, 9), u"2021-12-31"}, {ZqAddMonths(March, 10), u"2022-01-31"},
      {ZqAddMonths(At(u"2021-01-15"), -1), u"2020-12-15"}, {ZqAddMonths(At(u"2021-01-15"), -13), u"2019-12-15"},
      {ZqAddMonths(At(u"2021-01-15"), -12), u"2020-01-15"}, {ZqAddQuarters(At(u"2021-11-30"), 1), u"2022-02-28"},
      {ZqAddWeeks(March, -1), u"2021-03-24 10:30:00"}, {ZqAddDays(March, 1), u"2021-04-01 10:30:00"},
      {ZqAddHrs(March, 14), u"2021-04-01 00:30:00"}, {ZqAddMins(March, -631), u"2021-03-30 23:59:00"},
      {ZqAddSecs(March, 86399), u"2021-04-01 10:29:59"}, {ZqAddHrs(Early, 1), u"1899-12-29 07:00:00"},
      {ZqAddHrs(Early, 18), u"1899-12-30"}, {ZqAddHrs(Early, -7), u"1899-12-28 23:00:00"},
      {ZqAddDays(Early, 2), u"1899-12-31 06:00:00"}, {ZqAddMins(At(u"1900-01-01"), -2881), u"1899-12-29 23:59:00"}};
  for (const auto& [Value, Want] : cCases) EXPECT_EQ(Shown(Value), Want);
  EXPECT_EQ(ZqAddHrs(March, 5).Value, March + 5 / 24.0);
}

TEST(DateArithmetic, RefusesWhatLeavesTheCalendar) {
  constexpr Integer cMax = std::numeric_limits<Integer>::max();
  const TDateTime Day = At(u"2021-03-31"), Outside = 1e9;
  const std::function<void()> cCases[] = {[=] { (void)ZqAddYears(Day, 7979); }, [=] { (void)ZqAddYears(Day, -2021); },
      [=] { (void)ZqAddYears(Day, cMax); }, [=] { (void)ZqAddYears(Day, 65536); },
      [=] { (void)ZqAddMonths(Day, cMax); }, [=] { (void)ZqAddQuarters(Day, cMax); },
      [=] { (void)ZqAddMonths(Day, -2021 * 12); }, [=] { (void)ZqAddMonths(Day, -65536 * 12); },
      [] { (void)ZqEOMonth(2021, 13); }, [] { (void)ZqBOMonth(0, 1); }, [] { (void)ZqBOYear(10000); },
      [] { (void)ZqDaysInMonth(2021, 0); }, [=] { (void)ZqDayOfYear(Outside); },
      [=] { (void)ZqDateCompare(Day, Outside); }, [=] { (void)ZqBOWeek(Outside, 1); }};
  for (std::size_t i = 0; i < std::size(cCases); ++i) EXPECT_THROW(cCases[i](), EConvertError) << i;
  EXPECT_EQ(Shown(ZqAddMonths(Day, -2020 * 12)) + Shown(ZqAddYears(Day, 7978)), u"0001-03-319999-03-31");
}

TEST(DateQueries, CountDaysAndWeeks) {
  const TDateTime Leap = At(u"2020-12-31 23:00");
  EXPECT_EQ(ZqDaysInMonth(Leap) + ZqDaysInMonth(2020, 2) + ZqDaysInMonth(2021, 2), 31 + 29 + 28);
  EXPECT_EQ(ZqDaysInYear(Leap) + ZqDaysInYear(1900) + ZqDaysInYear(Leap + 1), 366 + 365 + 365);
  EXPECT_EQ(ZqDayOfYear(Leap) + ZqDayOfYear(At(u"1899-12-29 18:00")) + ZqDayOfYear(Leap + 0.5), 366 + 363 + 1);
  EXPECT_TRUE(ZqDecodeDate(Leap, dtYear) == 2020 && ZqDecodeDate(Leap, dtMonth) == 12 &&
              ZqDecodeDate(Leap, dtDayOfYear) == 366 && ZqDecodeDate(Leap, dtDayOfMonth) == 31);
  const std::pair<Word, const char16_t*> cThursdays[] = {{2017, u"2017-01-05"}, {2018, u"2018-01-04"},
      {2019, u"2019-01-03"}, {2020, u"2020-01-02"}, {2015, u"2015-01-01"}, {2021, u"2021-01-07"},
      {2022, u"2022-01-06"}};
  for (const auto& [Year, Want] : cThursdays) {
    EXPECT_EQ(Shown(ZqFirstThursdayOfYear(Year)), Want);
    EXPECT_EQ(Shown(ZqFirstThursdayOfYear(ZqEOYear(Year))), Want);
  }
  EXPECT_EQ(Shown(ZqWeekToDate(2021, 1)) + Shown(ZqWeekToDate(2020, 53)), u"2021-01-042020-12-28");
  const std::tuple<const char16_t*, Word, const char16_t*> cWeeks[] = {{u"2021-01-04", 1, u"202101"},
      {u"2021-01-01", 1, u"202101"}, {u"2021-01-10 23:59", 1, u"202101"}, {u"2021-01-11", 2, u"202102"},
      {u"2018-12-31", 53, u"201853"}, {u"2020-12-31", 53, u"202053"}, {u"0009-12-23", 52, u"000952"}};
  for (const auto& [Date, Week, Text] : cWeeks) {
    EXPECT_EQ(ZqWeekOfYear(At(Date)), Week) << ToUTF8(Date);
    EXPECT_EQ(ZqWeekOfYear(At(Date), true), Text);
    EXPECT_EQ(ZqWeekOfYear(At(Date), false), UnicodeString(Text).Copy(5, 2));
  }
}

TEST(DateQueries, CompareAndMoveDays) {
  const TDateTime Friday = At(u"2021-12-24 10:00");
  EXPECT_EQ(ZqDateCompare(Friday, Friday + 0.5), 0);
  EXPECT_EQ(ZqDateCompare(Friday, Friday + 0.6) - ZqDateCompare(Friday + 3, Friday), -4);
  constexpr Integer cMoves[][2] = {{0, 0}, {-1, 2}, {-2, 1}, {0, 0}};  // from Friday to Monday
  for (Integer i = 0; i < 4; ++i) {
    EXPECT_EQ(ZqClosestWeekDay(Friday + i, wdLast).Value, Friday + i + cMoves[i][0]);
    EXPECT_EQ(ZqClosestWeekDay(Friday + i, wdNext).Value, Friday + i + cMoves[i][1]);
  }
  EXPECT_EQ(ZqClosestWeekDay(0.0, wdNext).Value, 0) << "a Saturday";
  const TScriptedClock Clock;  // 2021-12-23
  EXPECT_EQ(ZqCalculateAge(At(u"1980-12-23")) - ZqCalculateAge(At(u"1980-12-24")), 1);
  EXPECT_EQ(ZqCalculateAge(0.0) + ZqCalculateAge(At(u"2001-11-30")), 20);
}

TEST(DateQueries, RoundTimesUpToAnInterval) {
  const std::tuple<const char16_t*, Integer, const char16_t*> cCases[] = {
      {u"2021-12-23 10:47:30", 15, u"2021-12-23 11:00:00"}, {u"2021-12-23 10:45:30", 15, u"2021-12-23 10:45:00"},
      {u"2021-12-23 10:46", 15, u"2021-12-23 11:00:00"}, {u"2021-12-23 10:01", 7, u"2021-12-23 10:07:00"},
      {u"1899-12-29 18:44:00", 15, u"1899-12-29 18:45:00"}, {u"2021-12-23 23:45", 15, u"2021-12-23 23:45:00"}};
  for (const auto& [Time, Interval, Want] : cCases) EXPECT_EQ(Shown(ZqRoundTime(At(Time), Interval)), Want);
  const std::pair<const char16_t*, Integer> cRefused[] = {
      {u"23:50", 15}, {u"10:57", 7}, {u"10:01", std::numeric_limits<Integer>::max()}, {u"10:01", 65536}};
  for (const auto& [Time, Interval] : cRefused) EXPECT_THROW((void)ZqRoundTime(At(Time), Interval), EConvertError);
  EXPECT_THROW((void)ZqRoundTime(0.0, 0), EAssertionFailed);
}

// ---- Durations -----------------------------------------------------------------------------------------------------

TEST(Durations, AreShown) {
  const std::tuple<double, bool, const char16_t*> cCases[] = {{3661, true, u"1:01:01"}, {-90, false, u"-0:01"},
      {1.5, true, u"0:00:02"}, {2.5, true, u"0:00:02"}, {90000, false, u"25:00"}, {-0.25, true, u"-0:00:00"},
      {3599.5, true, u"1:00:00"}, {1e10, true, u"2777777:46:40"}};
  for (const auto& [Seconds, WithSeconds, Want] : cCases) EXPECT_EQ(ZqTimeToStr(Seconds, WithSeconds), Want);
  for (const double Value : {1e19, std::numeric_limits<double>::quiet_NaN()})
    EXPECT_THROW((void)ZqTimeToStr(Value, true), EConvertError);
  TFormatSettings Dots;
  Dots.TimeSeparator = u'.';
  const TSettingsScope Scope(Dots);
  EXPECT_EQ(ZqTimeToStr(3661, true), u"1.01.01");
  EXPECT_EQ(ZqStrToTimeToInt(u"1.30", false, trDuration, tfHourMin, 0) +
                ZqStrToTimeToInt(u"1.30.", false, trPointOfTime, tfNone, 0),
      10800);
}

struct TTimeCase {
  const char16_t* Text;
  bool WithSeconds;
  TZqTimeRange Range;
  TZqTimeFormat Format;
  UnicodeString Want;
};

TEST(Durations, AreReadOrRefused) {
  const UnicodeString NoTime = u"Exception: An error has occurred while decoding a time parameter",
                      Minutes = u"Exception: Invalid time passed.\r\nThere are not more than 60 seconds in a minute.",
                      Range = u"EConvertError: An error has occurred while converting a string to a time format.",
                      NoNumber = u"EConvertError: 'x' is not a valid integer value";
  const TTimeCase cCases[] = {{u"24:00", false, trEndTime, tfNone, u"86400"},
      {u"-24", false, trEndTime, tfNone, u"-86400"}, {u"24:00", false, trPointOfTime, tfNone, NoTime},
      {u"1:02:03", true, trEndTime, tfNone, u"3723"}, {u"1:02:03", false, trPointOfTime, tfNone, u"3720"},
      {u"", true, trPointOfTime, tfNone, u"0"}, {u"7:30:", true, trPointOfTime, tfNone, u"27000"},
      {u"7:30::", true, trPointOfTime, tfNone, NoTime}, {u"-", true, trDuration, tfHourMin, u"0"},
      {u"8", false, trDuration, tfHourMin, u"28800"}, {u"-1:30", false, trDuration, tfHourMin, u"-5400"},
      {u":45", false, trDuration, tfHourMin, u"2700"}, {u"1:", false, trDuration, tfHourMin, u"3600"},
      {u"1:59:x", true, trDuration, tfHourMin, u"7140"}, {u"1:60", false, trDuration, tfHourMin, Minutes},
      {u"x:60", false, trDuration, tfHourMin, Minutes}, {u"x", false, trDuration, tfHourMin, NoNumber},
      {u"600000", false, trDuration, tfHourMin, Range}, {u"1:02:03", true, trDuration, tfHourMinSec, u"3723"},
      {u"23::59:x", true, trDuration, tfHourMinSec, u"82859"}, {u"", true, trDuration, tfHourMinSec, u"0"},
      {u"24:00:00", true, trDuration, tfHourMinSec, Range}, {u"1:60", true, trDuration, tfHourMinSec, Range},
      {u"1:-1", true, trDuration, tfHourMinSec, Range}, {u"1:0:60", true, trDuration, tfHourMinSec, Range},
      {u"1:0:-1", true, trDuration, tfHourMinSec, Range}, {u"24:x", true, trDuration, tfHourMinSec, NoNumber},
      {u"x", true, trDuration, tfDecHourM2, u"0"}, {u"--2147483648", true, trDuration, tfHourMinSec, Range}};
  for (const TTimeCase& Case : cCases) {
    UnicodeString Got;
    const UnicodeString Raised = RaisedBy(
        [&] { Got = IntToStr(ZqStrToTimeToInt(Case.Text, Case.WithSeconds, Case.Range, Case.Format, 86400)); });
    EXPECT_EQ(Got.IsEmpty() ? Raised : Got, Case.Want) << ToUTF8(Case.Text);
  }
}

// ---- Dates as text -------------------------------------------------------------------------------------------------

TEST(LuoDates, GoBothWays) {
  const std::pair<const char16_t*, const char16_t*> cCases[] = {
      {u"2021-12-03 09:05:07.045", u"DEC  3 2021  9:05:07:045AM"}, {u"2021-01-31 00:30", u"JAN 31 2021 12:30:00:000AM"},
      {u"2021-06-10 12:00", u"JUN 10 2021 12:00:00:000PM"}, {u"0476-09-04 23:59:59", u"SEP  4  476 11:59:59:000PM"},
      {u"1899-12-29 18:00", u"DEC 29 1899  6:00:00:000PM"}};
  for (const auto& [Date, Text] : cCases) {
    EXPECT_EQ(ConvertDateTimeToLUO(At(Date)), Text);
    EXPECT_EQ(ConvertLUOToDateTime(Text).Value, At(Date).Value);
  }
  EXPECT_EQ(Shown(ConvertLUOToDateTime(u"Dec 3 2021 12:00:00:000am")), u"2021-12-03");
  const std::pair<const char16_t*, ExceptionClass> cRefused[] = {
      {u"DEC 3 2021 9:05:07", ExceptionClass::Of<EListError>()},
      {u"XYZ 3 2021 9:05:07:045AM", ExceptionClass::Of<EConvertError>()},
      {u"DEC 3 67557 9:05:07:045AM", ExceptionClass::Of<EConvertError>()},
      {u"DEC 3 2021 13:05:07:045PM", ExceptionClass::Of<EConvertError>()},
      {u"DEC 3 2021 9:05:07:45AM", ExceptionClass::Of<EConvertError>()}};
  for (const auto& [Text, Class] : cRefused)
    EXPECT_TRUE(RaisedBy([&] { (void)ConvertLUOToDateTime(Text); }).View().starts_with(Class.ClassName() + u":"));
}

TEST(DayFirstDates, AreReadUnderEveryLocale) {
  for (const char* const Locale : {"C.UTF-8", "fi_FI.UTF-8", "en_US.UTF-8"}) {
    const TEnvironmentScope Scope("LC_ALL", Locale);
    EXPECT_EQ(Shown(ZqStrToDateTime(u"23-12-2021 10:30")) + Shown(ZqStrToDateTime(u"3-2-2021")),
        u"2021-12-23 10:30:002021-02-03");
    for (const char16_t* const Text : {u"nonsense", u"", u"2021-12-23", u"31-02-2021"})
      EXPECT_EQ(ZqStrToDateTime(Text).Value, 0) << ToUTF8(Text);
  }
}

TEST(LocaleFacts, NameTheZoneAndTheYear) {
  const std::pair<Integer, const char16_t*> cZones[] = {
      {0, u"GMT 0"}, {3600, u"GMT 1"}, {-18000, u"GMT -5"}, {19800, u"GMT 5"}, {-12600, u"GMT -3"}};
  for (const auto& [Offset, Want] : cZones) {
    const TScriptedClock Clock(0, Offset);
    EXPECT_EQ(ZqGetTimeZone(), Want);
  }
  TFormatSettings Settings;
  for (const auto& [Short, Long] : {std::pair(u"d/M/yy", u"d/M/yyyy"), {u"YY.d", u"yyYY.d"}, {u"d.M", u"yyyyd.M"},
           {u"dd-yyyy", u"dd-yyyy"}, {u"yyyyy", u"yyyyy"}}) {
    Settings.ShortDateFormat = Short;
    const TSettingsScope Scope(Settings);
    EXPECT_EQ(ZqShortDateFormatY2k(), Long);
  }
}

TEST(IsoDates, AreWritten) {
  const TDateTime Moment = At(u"2021-12-23 10:53:18.045");
  EXPECT_EQ(ZqDateToISOStr(Moment), u"2021-12-23");
  EXPECT_EQ(ZqDateTimeToISOStr(Moment), u"2021-12-23T10:53:18.045");
  EXPECT_EQ(ZqTimeToISOStr(Moment), u"1899-12-30T10:53:18.045");
  EXPECT_EQ(ZqTimeToISOStr(1 - 0.4 * cMillisecond), u"1899-12-30T00:00:00.000");
  EXPECT_EQ(ZqDateTimeToISOStr(At(u"0009-01-02 03:04:05.006")), u"0009-01-02T03:04:05.006");
  EXPECT_EQ(ZqDateTimeToISOStr(At(u"1899-12-29 18:00")), u"1899-12-29T18:00:00.000");
  EXPECT_THROW((void)ZqDateToISOStr(2958466.0), EConvertError);
}

TEST(IsoDates, AreReadWithTheZoneOfTheSystem) {
  const TZoneScope Zone(cBerlin);
  const std::pair<const char16_t*, const char16_t*> cCases[] = {{u"", u"1899-12-30"}, {u"0", u"1899-12-30"},
      {u"2021-12-23", u"2021-12-23"}, {u"20211223", u"2021-12-23"}, {u"2021-12-23 rest", u"2021-12-23"},
      {u"2021-12-23Z", u"2021-12-23 01:00:00"}, {u"2021-12-23T", u"2021-12-23"},
      {u"2021-12-23T10:53:18", u"2021-12-23 10:53:18"}, {u"2021-12-23T10:53:18.045", u"2021-12-23 10:53:18.045"},
      {u"20211223T10-53-18", u"?"}, {u"2021-12-23T10:53:18.5Z", u"2021-12-23 11:53:18.005"},
      {u"2021-12-23T10:53:18Z", u"2021-12-23 11:53:18"}, {u"2021-12-23T10:53:18+01:00", u"2021-12-23 10:53:18"},
      {u"2021-12-23T10:53:18.045-05:30", u"2021-12-23 17:23:18.045"},
      {u"2021-12-31T23:59:59.999Z", u"2022-01-01 00:59:59.999"}, {u"1899-12-29T18:00:00", u"1899-12-29 18:00:00"},
      {u"1899-12-30T01:00:00+02:30", u"1899-12-29 23:30:00"}, {u"1969-01-20T20:17:40Z", u"1969-01-20 21:17:40"},
      {u"2024-03-31T00:59:59Z", u"2024-03-31 01:59:59"}, {u"2024-03-31T01:00:00Z", u"2024-03-31 03:00:00"},
      {u"2024-10-27T00:30:00Z", u"2024-10-27 02:30:00"}, {u"2024-10-27T01:30:00Z", u"2024-10-27 02:30:00"}};
  for (const auto& [Text, Want] : cCases) {
    UnicodeString Got = u"?";
    (void)RaisedBy([&] { Got = Shown(ZqISOStrToDateTime(Text)); });
    EXPECT_EQ(Got, Want) << ToUTF8(Text);
  }
  EXPECT_EQ(Shown(ZqLocalToUTC(At(u"2024-10-27 02:30"))), u"2024-10-27 01:30:00");
  EXPECT_EQ(Shown(ZqLocalToUTC(At(u"2024-03-31 02:30"))), u"2024-03-31 01:30:00");
  const TZoneScope HalfHour("<-0330>3:30");
  EXPECT_EQ(Shown(ZqISOStrToDateTime(u"2021-12-23T00:00:00Z")), u"2021-12-22 20:30:00");
  EXPECT_EQ(Shown(ZqLocalToUTC(At(u"1899-12-29 22:00"))), u"1899-12-30 01:30:00");
  if (!FileExists(u"/usr/share/zoneinfo/America/New_York")) return;  // rules in a string reach back to 1970 only
  const TZoneScope NewYork("America/New_York");
  EXPECT_EQ(Shown(ZqISOStrToDateTime(u"1969-07-20T20:17:40Z")), u"1969-07-20 16:17:40");
  EXPECT_EQ(Shown(ZqISOStrToDateTime(u"1918-10-27T06:00:00Z")), u"1918-10-27 01:00:00") << "the hour that came twice";
  EXPECT_EQ(Shown(ZqLocalToUTC(At(u"1918-10-27 01:00"))), u"1918-10-27 06:00:00");
}

TEST(IsoDates, AreReadByPlacesAndRefusedOtherwise) {
  const TZoneScope Zone("<+0530>-5:30");
  EXPECT_EQ(ZqISOStrToDate(u"0000-00-00").Value + ZqISOStrToDate(u"").Value + ZqISOStrToTime(u"").Value, 0);
  EXPECT_EQ(ZqISOStrToTime(u"10:53:18.045+01:00").Value, EncodeTime(10, 53, 18, 45).Value);
  EXPECT_EQ(ZqISOStrToTime(u"2021-12-23T10.53.18").Value, EncodeTime(10, 53, 18, 0).Value);
  EXPECT_EQ(ZqISOStrToTime(u"10:00:00Z").Value, EncodeTime(15, 30, 0, 0).Value);
  for (const char16_t* const Text : {u"2021-02-30", u"2021-1x-01", u"2021-12", u"2021-1-1", u"-", u" 2021-12-23",
           u"+021-12-23", u"$021-12-23", u"0000-00-01", u"Z"})
    EXPECT_THROW((void)ZqISOStrToDate(Text), EConvertError) << ToUTF8(Text);
  for (const char16_t* const Text : {u"10:53", u"10:53:", u"24:00:00", u"10:60:00", u"10:00:60", u"1:00:00", u"T",
           u"10:00:00.", u"10:00:00.0045", u"10:00:00.123Z", u"10:00:00.99999999999"})
    EXPECT_THROW((void)ZqISOStrToTime(Text), EConvertError) << ToUTF8(Text);
  for (const char16_t* const Text : {u"T10:00:00+1:00", u"T10:00:00+0100", u"T10:00:00+24:00", u"T10:00:00-00:60",
           u"T10:00:00+", u"T10:00:00+01:00-01:00", u"TT10:00:00", u"T10:00Z"})
    EXPECT_THROW((void)ZqISOStrToDateTime(UnicodeString(u"2021-12-23") + Text), EConvertError) << ToUTF8(Text);
}

}  // namespace
}  // namespace zq
