#include "common/uZqDateTimeUtils.h"

#include "common/uZqSysUtils.h"
#include "runtime/io/files.h"
#include "runtime/io/string_list.h"
#include "runtime/text/datetime.h"
#include "runtime/text/format_settings.h"
#include "runtime/text/numbers.h"
#include "tests/fakes/clock.h"
#include "tests/support/support.h"

namespace zq {
namespace {

TDateTime At(const UnicodeString& AText) { return StrToDateTime(AText, TFormatSettings()); }

UnicodeString Shown(TDateTime AValue) {
  const UnicodeString Text = FormatDateTime(u"yyyy-mm-dd hh:nn:ss.zzz", AValue);
  return StringReplace(StringReplace(Text, u":00.000", u"", {}), u" 00:00", u"", {});
}
UnicodeString Shown(const UnicodeString& AText) { return AText; }
UnicodeString Shown(Integer AValue) { return IntToStr(AValue); }

// ARows: "text > result" with "; " between them. The result may be what is raised, in full, or "!" for an
// EConvertError.
template <class TFunction>
void Check(TFunction AFunction, const UnicodeString& ARows) {
  TStringList Rows;
  ZqStringToList(ARows, u"; ", &Rows);
  for (const UnicodeString& Row : Rows) {
    const Integer Mark = Row.Pos(u" > ");
    const UnicodeString Want = Row.Copy(Mark + 3, Row.Length());
    UnicodeString Got;
    const UnicodeString Raised = RaisedBy([&] { Got = Shown(AFunction(Row.Copy(1, Mark - 1))); });
    if (Raised != u"nothing") Got = Want == u"!" ? Raised.Copy(1, Raised.Pos(u":") - 1) : Raised;
    EXPECT_EQ(Got, Want == u"!" ? u"EConvertError" : Want) << Row.ToUTF8();
  }
}

// Takes "date number".
auto OfDateAndNumber(TDateTime (*AFunction)(TDateTime, Integer)) {
  return [=](const UnicodeString& AText) {
    const Integer Gap = ZqLastPos(AText, u' ');
    return AFunction(At(AText.Copy(1, Gap)), StrToInt(AText.Copy(Gap + 1, 11)));
  };
}

auto OfDate(auto AFunction) {
  return [=](const UnicodeString& AText) { return AFunction(At(AText)); };
}

/// Settings of all threads for a scope.
struct TSettingsScope {
  explicit TSettingsScope(const TFormatSettings& ASettings) { SetFormatSettings(ASettings); }
  ~TSettingsScope() { SetFormatSettings(Saved); }
  const TFormatSettings Saved = FormatSettings();
};

TEST(Calendar, PeriodsBeginAndEndWhereItSays) {
  Check(OfDateAndNumber(ZqBOWeek),
      u"2021-01-03 06:00 2 > 2020-12-28 06:00; 2021-01-03 06:00 1 > 2021-01-03 06:00; "
      u"2021-01-03 06:00 7 > 2021-01-02 06:00; 1900-01-01 18:00 6 > 1899-12-29 18:00");
  for (const Integer FirstDay : {0, 8}) EXPECT_THROW((void)ZqBOWeek(1.0, FirstDay), EAssertionFailed);
  const TDateTime Leap = At(u"2020-02-29 10:30"), Saturday = At(u"2021-01-02 06:00"), Last = At(u"2021-12-31 13:00");
  const std::pair<TDateTime, const char16_t*> cCases[] = {{ZqEOWeek(Saturday), u"2021-01-02 06:00"},
      {ZqEOWeek(Saturday + 1), u"2021-01-09 06:00"}, {ZqEOWeek(2021, 1), u"2021-01-10"},
      {ZqBOMonth(Leap), u"2020-02-01"}, {ZqEOMonth(Leap), u"2020-02-29"}, {ZqEOMonth(1900, 2), u"1900-02-28"},
      {ZqEOMonth(Last), u"2021-12-31"}, {ZqBOYear(2021), u"2021-01-01"}, {ZqBOYear(Last + 0.5), u"2022-01-01"},
      {ZqEOYear(TDate(Last)), u"2021-12-31"}};
  for (const auto& [Date, Want] : cCases) EXPECT_EQ(Shown(Date), Want);
  EXPECT_THROW((void)ZqEOMonth(2021, 13), EConvertError);
  EXPECT_THROW((void)ZqDaysInMonth(2021, 0), EConvertError);
}

TEST(Calendar, ArithmeticKeepsToMonthsAndCrossesTheBaseDate) {
  Check(OfDateAndNumber(ZqAddYears),
      u"2020-02-29 10:30 1 > 2021-02-28 10:30; 2020-02-29 10:30 -4 > 2016-02-29 10:30; "
      u"1899-12-29 06:00 1 > 1900-12-29 06:00; 2021-03-31 7978 > 9999-03-31; 2021-03-31 7979 > !; "
      u"2021-03-31 -2021 > !; 2021-03-31 65536 > !");
  EXPECT_EQ(Shown(ZqAddYears(At(u"2020-12-31 23:59:59") + 0.9996 / cSecsPerDay, 1)), u"2022-01-01");
  Check(OfDateAndNumber(ZqAddMonths),
      u"2021-03-31 10:30 -1 > 2021-02-28; 2021-03-31 9 > 2021-12-31; 2021-03-31 10 > 2022-01-31; "
      u"2021-01-15 -1 > 2020-12-15; 2021-01-15 -13 > 2019-12-15; 2021-03-31 -24240 > 0001-03-31; "
      u"2021-03-31 -24252 > !");
  Check(OfDateAndNumber(ZqAddQuarters), u"2021-11-30 1 > 2022-02-28; 2021-11-30 2147483647 > !");
  Check(OfDateAndNumber(ZqAddWeeks), u"2021-03-31 10:30 -1 > 2021-03-24 10:30");
  Check(OfDateAndNumber(ZqAddDays), u"1899-12-29 06:00 2 > 1899-12-31 06:00");
  Check(OfDateAndNumber(ZqAddHrs),
      u"2021-03-31 10:30 14 > 2021-04-01 00:30; 1899-12-29 06:00 18 > 1899-12-30; "
      u"1899-12-29 06:00 -7 > 1899-12-28 23:00");
  Check(OfDateAndNumber(ZqAddMins), u"1900-01-01 -2881 > 1899-12-29 23:59");
  Check(OfDateAndNumber(ZqAddSecs), u"2021-03-31 10:30 86400 > 2021-04-01 10:30");
}

TEST(Calendar, CountsDaysAndWeeks) {
  const TDateTime Leap = At(u"2020-12-31 23:00");
  EXPECT_EQ(ZqDaysInMonth(Leap) + ZqDaysInMonth(2020, 2), 31 + 29);
  EXPECT_EQ(ZqDaysInYear(Leap) + ZqDaysInYear(1900) + ZqDaysInYear(Leap + 1), 366 + 365 + 365);
  Check(OfDate(ZqDayOfYear), u"1899-12-29 18:00 > 363; 2020-12-31 23:00 > 366");
  EXPECT_TRUE(ZqDecodeDate(Leap, dtYear) == 2020 && ZqDecodeDate(Leap, dtMonth) == 12 &&
              ZqDecodeDate(Leap, dtDayOfYear) == 366 && ZqDecodeDate(Leap, dtDayOfMonth) == 31);
  Check(OfDate([](double ADate) { return ZqFirstThursdayOfYear(ADate); }),
      u"2017-12-31 > 2017-01-05; 2018-12-31 > 2018-01-04; 2019-12-31 > 2019-01-03; 2020-12-31 > 2020-01-02; "
      u"2015-12-31 > 2015-01-01; 2021-12-31 > 2021-01-07; 2022-12-31 > 2022-01-06");
  EXPECT_EQ(Shown(ZqWeekToDate(2021, 1)) + Shown(ZqWeekToDate(2020, 53)), u"2021-01-042020-12-28");
  Check(OfDate([](TDateTime ADate) { return ZqWeekOfYear(ADate, true); }),
      u"2021-01-04 > 202101; 2021-01-01 > 202101; 2021-01-10 23:59 > 202101; 2021-01-11 > 202102; "
      u"2018-12-31 > 201853; 0009-12-23 > 000952");
  EXPECT_EQ(ZqWeekOfYear(At(u"2021-02-01"), false), u"05");
}

TEST(Calendar, ComparesMovesAndRounds) {
  const TDateTime Friday = At(u"2021-12-24 10:00");
  EXPECT_EQ(ZqDateCompare(Friday, Friday + 0.5), 0);
  EXPECT_EQ(ZqDateCompare(Friday, Friday + 0.6) - ZqDateCompare(Friday + 3, Friday), -4);
  EXPECT_THROW((void)ZqDateCompare(Friday, 1e9), EConvertError);
  constexpr Integer cMoves[][2] = {{0, 0}, {-1, 2}, {-2, 1}, {0, 0}};  // from Friday to Monday
  for (Integer i = 0; i < 4; ++i) {
    EXPECT_EQ(ZqClosestWeekDay(Friday + i, wdLast).Value, Friday + i + cMoves[i][0]);
    EXPECT_EQ(ZqClosestWeekDay(Friday + i, wdNext).Value, Friday + i + cMoves[i][1]);
  }
  EXPECT_EQ(ZqClosestWeekDay(0.0, wdNext).Value, 0) << "a Saturday";
  const TScriptedClock Clock;  // 2021-12-23
  Check(OfDate(ZqCalculateAge), u"1980-12-23 > 41; 1980-12-24 > 40; 1899-12-30 > 0");
  Check(OfDateAndNumber(ZqRoundTime),
      u"2021-12-23 10:47:30 15 > 2021-12-23 11:00; 2021-12-23 10:45:30 15 > 2021-12-23 10:45; "
      u"1899-12-29 18:31 15 > 1899-12-29 18:45; 23:45 15 > 1899-12-30 23:45; 23:46 15 > !; 10:57 7 > !; "
      u"10:01 65536 > !; 10:59 2147483647 > !");
  EXPECT_THROW((void)ZqRoundTime(0.0, 0), EAssertionFailed);
}

TEST(Durations, AreShownAndReadOrRefused) {
  const auto As = [](TZqTimeRange ARange, TZqTimeFormat AFormat, bool AWithSeconds = true) {
    return [=](const UnicodeString& AText) { return ZqStrToTimeToInt(AText, AWithSeconds, ARange, AFormat, 86400); };
  };
  Check([](const UnicodeString& AText) { return ZqTimeToStr(static_cast<double>(StrToFloat(AText)), true); },
      u"3661 > 1:01:01; -90 > -0:01:30; 1.5 > 0:00:02; 2.5 > 0:00:02; 90000 > 25:00:00; 3599.5 > 1:00:00; 1e19 > !");
  Check(As(trEndTime, tfNone), u"24:00 > 86400; -24 > -86400; 1:02:03 > 3723");
  Check(As(trPointOfTime, tfNone, false),
      u"1:02:03 > 3720;  > 0; 7:30: > 27000; "
      u"24:00 > Exception: An error has occurred while decoding a time parameter");
  Check(As(trDuration, tfHourMin),
      u"- > 0; 8 > 28800; -1:30 > -5400; :45 > 2700; 1: > 3600; 1:59:x > 7140; x > !; 600000 > !; "
      u"x:60 > Exception: Invalid time passed.\r\nThere are not more than 60 seconds in a minute.");
  Check(As(trDuration, tfHourMinSec),
      u"1:02:03 > 3723; 23::59:x > 82859;  > 0; 1:60 > !; 1:-1 > !; 1:0:60 > !; 1:0:-1 > !; --2000000 > !; "
      u"24:x > EConvertError: 'x' is not a valid integer value; "
      u"24:00:00 > EConvertError: An error has occurred while converting a string to a time format.");
  Check(As(trDuration, tfDecHourM2), u"x > 0");
  TFormatSettings Dots;
  Dots.TimeSeparator = u'.';
  const TSettingsScope Scope(Dots);
  EXPECT_EQ(ZqTimeToStr(3661, false), u"1.01");
  Check(As(trDuration, tfHourMin), u"1.30 > 5400");
  Check(As(trPointOfTime, tfNone), u"1.30. > 5400");
}

TEST(DateTexts, OfFixedColumnsGoBothWays) {
  for (const auto& [Date, Text] : {std::pair(u"2021-12-03 09:05:07.045", u"DEC  3 2021  9:05:07:045AM"),
           {u"2021-01-31 00:30", u"JAN 31 2021 12:30:00:000AM"}, {u"2021-06-10 12:01", u"JUN 10 2021 12:01:00:000PM"},
           {u"1899-12-29 18:00", u"DEC 29 1899  6:00:00:000PM"}, {u"0476-09-04", u"SEP  4  476 12:00:00:000AM"}}) {
    EXPECT_EQ(ConvertDateTimeToLUO(At(Date)), Text);
    EXPECT_EQ(Shown(ConvertLUOToDateTime(Text)), Date);
  }
  Check(ConvertLUOToDateTime,
      u"Dec 3 2021 12:00:00:000am > 2021-12-03; XYZ 3 2021 9:05:07:045AM > !; DEC 3 67557 9:05:07:045AM > !; "
      u"DEC 3 2021 13:05:07:045PM > !; DEC 3 2021 9:05:07:45AM > !");
  EXPECT_THROW((void)ConvertLUOToDateTime(u"DEC 3 2021 9:05:07"), EListError);
}

TEST(DateTexts, OfTheLocale) {
  for (const char* const Locale : {"C.UTF-8", "fi_FI.UTF-8"}) {  // with ":" and with "." in times
    const TEnvironmentScope Scope("LC_ALL", Locale);
    Check(ZqStrToDateTime,
        u"23-12-2021 10:30 > 2021-12-23 10:30; 3-2-2021 > 2021-02-03; nonsense > 1899-12-30; 2021-12-23 > 1899-12-30");
  }
  const auto Zone = [](const UnicodeString& AMinutes) {
    const TScriptedClock Clock(0, StrToInt(AMinutes) * 60);
    return ZqGetTimeZone();
  };
  Check(Zone, u"0 > GMT 0; -300 > GMT -5; 330 > GMT 5; -210 > GMT -3");
  const auto Y2k = [](const UnicodeString& AText) {
    TFormatSettings Settings;
    Settings.ShortDateFormat = AText;
    const TSettingsScope Scope(Settings);
    return ZqShortDateFormatY2k();
  };
  Check(Y2k, u"d/M/yy > d/M/yyyy; YY.d > yyYY.d; d.M > yyyyd.M; dd-yyyyy > dd-yyyyy");
}

TEST(IsoTexts, AreWritten) {
  Check(OfDate(ZqDateTimeToISOStr),
      u"0009-01-02 03:04:05.006 > 0009-01-02T03:04:05.006; 1899-12-29 18:00 > 1899-12-29T18:00:00.000");
  Check(OfDate(ZqTimeToISOStr), u"2021-12-23 10:53:18.045 > 1899-12-30T10:53:18.045");
  EXPECT_EQ(ZqTimeToISOStr(1 - 0.4 / cMSecsPerDay) + ZqDateToISOStr(44553.75), u"1899-12-30T00:00:00.0002021-12-23");
  EXPECT_THROW((void)ZqDateToISOStr(2958466.0), EConvertError);
}

TEST(IsoTexts, AreReadWithTheZoneOfTheSystem) {
  const TZoneScope Berlin("CET-1CEST,M3.5.0,M10.5.0/3");
  Check(ZqISOStrToDateTime,
      u" > 1899-12-30; 0 > 1899-12-30; 2021-12-23 rest > 2021-12-23; 20211223 > 2021-12-23; "
      u"2021-12-23T > 2021-12-23; 2021-12-23Z > 2021-12-23 01:00; "
      u"2021-12-23T10:53:18.045 > 2021-12-23 10:53:18.045; 2021-12-23T10:53:18.5Z > 2021-12-23 11:53:18.005; "
      u"2021-12-31T23:59:00Z > 2022-01-01 00:59; 2021-12-23T10:53:00+01:00 > 2021-12-23 10:53; "
      u"2021-12-23T10:53:00-05:30 > 2021-12-23 17:23; 1899-12-29T18:00:00 > 1899-12-29 18:00; "
      u"1899-12-30T01:00:00+02:30 > 1899-12-29 23:30; 2024-03-31T00:59:00Z > 2024-03-31 01:59; "
      u"2024-03-31T01:00:00Z > 2024-03-31 03:00; 2024-10-27T00:30:00Z > 2024-10-27 02:30; "
      u"2024-10-27T01:30:00Z > 2024-10-27 02:30; 2021-12-23TT10:00:00 > !; 2021-12-23T10:00Z > !; "
      u"2021-12-23T10:00:00+1:00 > !; 2021-12-23T10:00:00+0100 > !; 2021-12-23T10:00:00+24:00 > !; "
      u"2021-12-23T10:00:00-00:60 > !; 2021-12-23T10:00:00+ > !; 2021-12-23T10:00:00+01:00-01:00 > !");
  Check(OfDate(ZqLocalToUTC), u"2024-10-27 02:30 > 2024-10-27 01:30; 2024-03-31 02:30 > 2024-03-31 01:30");
  const TZoneScope HalfHour("<-0330>3:30");
  Check(OfDate(ZqLocalToUTC), u"1899-12-29 21:00 > 1899-12-30 00:30");
  if (!FileExists(u"/usr/share/zoneinfo/America/New_York")) return;  // rules in a string reach back to 1970 only
  const TZoneScope NewYork("America/New_York");
  Check(OfDate(ZqUTCToLocal), u"1969-07-20 20:17 > 1969-07-20 16:17; 1918-10-27 06:00 > 1918-10-27 01:00");
  Check(OfDate(ZqLocalToUTC), u"1918-10-27 01:00 > 1918-10-27 06:00");
}

TEST(IsoTexts, AreReadByPlacesAndRefusedOtherwise) {
  const TZoneScope Zone("<+0530>-5:30");
  Check(ZqISOStrToDate,
      u" > 1899-12-30; 0000-00-00 > 1899-12-30; 2021-02-30 > !; 2021-1x-01 > !; 2021-12 > !; 2021-1-1 > !; - > !; "
      u" 2021-12-23 > !; +021-12-23 > !; $021-12-23 > !; 0000-00-01 > !; Z > !");
  Check(ZqISOStrToTime,
      u" > 1899-12-30; 10:53:18.045+01:00 > 1899-12-30 10:53:18.045; 2021-12-23T10.53.00 > 1899-12-30 10:53; "
      u"10:00:00Z > 1899-12-30 15:30; 10:53 > !; 10:53: > !; 24:00:00 > !; 10:60:00 > !; 1:00:00 > !; T > !; "
      u"10:00:00. > !; 10:00:00.0045 > !; 10:00:00.123Z > !; 10:00:00.99999999999 > !");
}

}  // namespace
}  // namespace zq
