

#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"
#include "tests/fakes/clock.h"
#include "tests/support/support.h"

namespace zq {
namespace {

constexpr double cMillisecond = 1.0 / cMSecsPerDay;

TFormatSettings Settings(const char16_t* AShortDate, Char ADate, Char ATime = u':') {
  TFormatSettings Result;
  Result.ShortDateFormat = AShortDate;
  Result.DateSeparator = ADate;
  Result.TimeSeparator = ATime;
  return Result;
}

UnicodeString Shown(TDateTime AValue) { return FormatDateTime(u"yyyy-mm-dd hh:mm:ss:zzz", AValue); }

TEST(TextCalendar, EncodesEveryEndOfTheCalendar) {
  const std::tuple<Word, Word, Word, double, Word> cCases[] = {{1899, 12, 30, 0, 7}, {1899, 12, 29, -1, 6},
      {1900, 1, 1, 2, 2}, {1900, 3, 1, 61, 5}, {1970, 1, 1, cUnixDateDelta, 5}, {2000, 2, 29, 36585, 3},
      {2021, 12, 23, 44553, 5}, {9999, 12, 31, 2958465, 6}, {1, 1, 1, -693593, 2}};
  for (const auto& [Year, Month, Day, Value, WeekDay] : cCases) {
    Word Decoded[3] = {};
    DecodeDate(Value, Decoded[0], Decoded[1], Decoded[2]);
    EXPECT_TRUE(Decoded[0] == Year && Decoded[1] == Month && Decoded[2] == Day) << Value;
    EXPECT_EQ(EncodeDate(Year, Month, Day).Value, Value);
    EXPECT_EQ(DayOfWeek(Value), WeekDay) << Value;
  }
}

TEST(TextCalendar, RefusesWhatIsNoDateOrTime) {
  const Word cDates[][3] = {
      {0, 1, 1}, {10000, 1, 1}, {2021, 0, 1}, {2021, 13, 1}, {2021, 1, 0}, {2021, 2, 29}, {1900, 2, 29}, {2021, 4, 31}};
  const Word cTimes[][4] = {{24, 0, 0, 0}, {0, 60, 0, 0}, {0, 0, 60, 0}, {0, 0, 0, 1000}};
  const UnicodeString Invalid = u"EConvertError: Invalid argument to ";
  for (const auto& D : cDates)
    EXPECT_EQ(RaisedBy([&] { (void)EncodeDate(D[0], D[1], D[2]); }), Invalid + u"date encode");
  for (const auto& T : cTimes)
    EXPECT_EQ(RaisedBy([&] { (void)EncodeTime(T[0], T[1], T[2], T[3]); }), Invalid + u"time encode");
  for (const double Value :
      {2958466.0, -693594.0, 2958465.999999999999, 1e300, std::numeric_limits<double>::quiet_NaN()}) {
    Word Year = 1, Month = 1, Day = 1;
    DecodeDate(Value, Year, Month, Day);
    EXPECT_EQ(Year + Month + Day, 0) << Value;
    EXPECT_THROW((void)FormatDateTime(u"yyyy", Value), EConvertError) << Value;
  }
}

TEST(TextCalendar, EveryMillisecondComesBack) {
  for (const double Day : {44553.0, -36522.0, 0.0, -1.0, 2958465.0})
    for (Integer i = 0; i < cMSecsPerDay; i += 86399 * 7 + 1) {
      const TDateTime Value = Day + (Day < 0 ? -1 : 1) * (static_cast<double>(i) / cMSecsPerDay);
      Word Hour = 0, Minute = 0, Second = 0, Milliseconds = 0;
      DecodeTime(Value, Hour, Minute, Second, Milliseconds);
      ASSERT_EQ(((Hour * 60 + Minute) * 60 + Second) * 1000 + Milliseconds, i) << Day;
      ASSERT_EQ(SystemTimeToDateTime(DateTimeToSystemTime(Value)).Value, Value.Value) << Day;
    }
}

TEST(TextDateFormat, RoundsToMillisecondsAndCarries) {
  const double Day = EncodeDate(2021, 12, 31);
  const std::pair<double, const char16_t*> cCases[] = {{Day + EncodeTime(10, 53, 18, 123), u"2021-12-31 10:53:18:123"},
      {Day + 1 - 0.4 * cMillisecond, u"2022-01-01 00:00:00:000"},
      {Day + 1 - 0.6 * cMillisecond, u"2021-12-31 23:59:59:999"},
      {Day + EncodeTime(10, 59, 59, 999) + 0.6 * cMillisecond, u"2021-12-31 11:00:00:000"},
      {-1.25, u"1899-12-29 06:00:00:000"}, {-0.25, u"1899-12-30 06:00:00:000"},
      {-1.9999999999, u"1899-12-30 00:00:00:000"}, {0, u"1899-12-30 00:00:00:000"}};
  for (const auto& [Value, Text] : cCases) EXPECT_EQ(Shown(Value), Text);
}

TEST(TextDateFormat, WritesEveryLetterAndCopiesTheRest) {
  const TDateTime Evening = EncodeDate(2005, 3, 6) + EncodeTime(19, 4, 9, 7);
  TFormatSettings S = Settings(u"d/m/yy", u'.', u'_');
  const std::pair<const char16_t*, const char16_t*> cCases[] = {{u"d dd ddd dddd", u"6 06 Sun Sunday"},
      {u"m mm mmm mmmm", u"3 03 Mar March"}, {u"yy yyyy", u"05 2005"}, {u"YYYY-MM-DD HH:MM", u"2005-03-06 19:04"},
      {u"mm hh-mm mm", u"03 19-04 03"}, {u"h m mmm", u"19 4 Mar"}, {u"n nn s ss z zzz", u"4 04 9 09 7 007"},
      {u"hh:mm am/pm h A/P hh ampm", u"07:04 pm 7 P 07 PM"}, {u"dd/mm.yyyy hh:nn", u"06/03.2005 19:04"},
      {u"\"day\" d 'm' \"open d", u"day 6 m open d"}, {u"ddddd", u"6.3.05"}, {u"t|tt", u"19_04|19_04_09"},
      {u"c", u"6.3.05 19_04_09"}, {u"jäöüß [x]", u"jäöüß [x]"}, {u"", u""}};
  for (const auto& [Pattern, Text] : cCases) EXPECT_EQ(FormatDateTime(Pattern, Evening, S), Text);
  EXPECT_EQ(FormatDateTime(u"h am/pm", 0.0, S) + FormatDateTime(u" h am/pm", 0.5, S), u"12 am 12 pm");
  EXPECT_EQ(DateTimeToStr(Evening, S) + u"|" + DateTimeToStr(EncodeDate(2005, 3, 6), S), u"6.3.05 19_04_09|6.3.05");
  EXPECT_EQ(DateToStr(Evening, S) + u"|" + TimeToStr(Evening, S), u"6.3.05|19_04_09");
  S.ShortDateFormat = u"c ddddd";  // a circle
  EXPECT_LT(DateToStr(Evening, S).Length(), 100);
}

TEST(TextDateParse, ReadsInTheOrderOfTheShortDate) {
  const TScriptedClock In2021;
  const std::tuple<const char16_t*, Char, const char16_t*, const char16_t*> cCases[] = {
      {u"yyyy-mm-dd", u'-', u"2021-12-23", u"2021-12-23"}, {u"dd-MM-yyyy", u'-', u"23-12-2021", u"2021-12-23"},
      {u"d/M/yy", u'/', u" 3/2/21 ", u"2021-02-03"}, {u"M/d/yyyy", u'/', u"2 / 3 / 2021", u"2021-02-03"},
      {u"d.m.y", u'.', u"3.2", u"2021-02-03"}, {u"yyyy-mm-dd", u'-', u"2-3", u"2021-02-03"},
      {u"d.m.y", u'.', u"1.1.70", u"2070-01-01"}, {u"d.m.y", u'.', u"1.1.71", u"1971-01-01"},
      {u"d.m.y", u'.', u"1.1.800", u"0800-01-01"}, {u"", u'-', u"2021-1-2", u"2021-01-02"},
      {u"d m y", u' ', u"1 2 2003", u"2003-02-01"}};
  for (const auto& [Order, Separator, Text, Date] : cCases)
    EXPECT_EQ(FormatDateTime(u"yyyy-mm-dd", StrToDate(Text, Settings(Order, Separator))), Date);
}

TEST(TextDateParse, ReadsTimesAndBoth) {
  const TFormatSettings S = Settings(u"dd-mm-yyyy", u'-');
  const std::pair<const char16_t*, const char16_t*> cCases[] = {{u"0", u"1899-12-30 00:00:00:000"},
      {u"10:30", u"1899-12-30 10:30:00:000"}, {u"1:2:3", u"1899-12-30 01:02:03:000"},
      {u"1:2:3.5", u"1899-12-30 01:02:03:500"}, {u"10:53:18:045", u"1899-12-30 10:53:18:045"},
      {u"12:00 am", u"1899-12-30 00:00:00:000"}, {u"12:30PM", u"1899-12-30 12:30:00:000"},
      {u"7 pm", u"1899-12-30 19:00:00:000"}, {u"23-12-2021 10:30", u"2021-12-23 10:30:00:000"},
      {u"23-12-2021", u"2021-12-23 00:00:00:000"}, {u"29-12-1899 18:00", u"1899-12-29 18:00:00:000"}};
  for (const auto& [Text, Value] : cCases) EXPECT_EQ(Shown(StrToDateTime(Text, S)), Value);
  EXPECT_EQ(StrToTime(u"6:00", S).Value, 0.25);
}

TEST(TextDateParse, RefusesTheRest) {
  const TFormatSettings S = Settings(u"yyyy-mm-dd", u'-');
  using TParse = TDateTime (*)(const UnicodeString&, const TFormatSettings&);
  const auto Refusal = [&](TParse AParse, const UnicodeString& AText) {
    return StringReplace(
        RaisedBy([&] { (void)AParse(AText, S); }), u"EConvertError: '" + AText + u"' is not a valid ", u"", {});
  };
  for (const char16_t* const Text : {u"", u"nonsense", u"2021", u"2021-02-30", u"2021-12-23x", u"2021-12-23-1",
           u"2021/12/23", u"20211-1-1", u"2021-12-", u"10:30"})
    EXPECT_EQ(Refusal(StrToDate, Text), u"date");
  for (const char16_t* const Text :
      {u"", u"24:00", u"10:60", u"10:00:60", u"10:", u"13:00 pm", u"0:00 am", u"1:2:3.1234", u"1:2:3:4:5", u"x"})
    EXPECT_EQ(Refusal(StrToTime, Text), u"time");
  for (const char16_t* const Text :
      {u"", u"2021-12-23T10:30", u"2021-12-23 24:00", u"10:30 2021-12-23", u"2021-13-01 10:30"})
    EXPECT_EQ(Refusal(StrToDateTime, Text), u"date and time");
}

// ---------------------------------------------------------------------------------------------------- Local time

TEST(TextLocalTime, NowIsTheLocalTimeCutToMilliseconds) {
  const std::tuple<Int64, Integer, const char16_t*> Cases[] = {
      {1709251199999999, 0, u"2024-02-29 23:59:59:999"},     // never shown as the next day
      {1709251199999999, 3600, u"2024-03-01 00:59:59:999"},  // the local date decides
      {1709251200000000, -18000, u"2024-02-29 19:00:00:000"}, {-1, 0, u"1969-12-31 23:59:59:999"}};
  for (const auto& [Microseconds, Offset, Want] : Cases) {
    const TScriptedClock Clock(Microseconds, Offset);
    EXPECT_EQ(Shown(Now()), Want);
    EXPECT_EQ(Shown(Date().Value + Time().Value), Want);
  }
}

TEST(TextLocalTime, MillisecondsSurviveTheDouble) {
  EXPECT_EQ(UnixMillisecondsToDateTime(0).Value, 25569.0);
  EXPECT_EQ(UnixMillisecondsToDateTime(-2209161600000 + 21600000).Value, 0.25);
  EXPECT_EQ(UnixMillisecondsToDateTime(-2209161600000 - 64800000).Value, -1.25);  // 1899-12-29 06:00
  for (const Int64 Value : {Int64{1}, Int64{-1}, Int64{1709251199999}, Int64{-2209161600001}, Int64{-5000000000123}})
    EXPECT_EQ(DateTimeToUnixMilliseconds(UnixMillisecondsToDateTime(Value)), Value);
}

TDateTime At(Word AMonth, Word ADay, Word AHour, Word AMinute) {
  return EncodeDate(2024, AMonth, ADay) + EncodeTime(AHour, AMinute, 0, 0);
}

TEST(TextLocalTime, UniversalTimeOfEveryHourOfTheClock) {
  const TZoneScope Zone("CET-1CEST,M3.5.0,M10.5.0/3");
  const TTimeZone& Local = TTimeZone::Local();
  const std::tuple<TDateTime, bool, const char16_t*> Cases[] = {{At(7, 1, 12, 0), false, u"2024-07-01 10:00:00:000"},
      {At(1, 1, 0, 30), true, u"2023-12-31 23:30:00:000"},
      {At(10, 27, 2, 30), false, u"2024-10-27 01:30:00:000"},  // shown twice
      {At(10, 27, 2, 30), true, u"2024-10-27 00:30:00:000"}, {At(10, 27, 20, 0), false, u"2024-10-27 19:00:00:000"},
      {At(3, 31, 2, 30), false, u"2024-03-31 01:30:00:000"},  // left out
      {At(3, 31, 20, 0), false, u"2024-03-31 18:00:00:000"}};
  for (const auto& [Moment, ForceDaylight, Utc] : Cases) {
    EXPECT_EQ(Shown(Local.ToUniversalTime(Moment, ForceDaylight)), Utc);
    EXPECT_EQ(Shown(Local.ToLocalTime(Local.ToUniversalTime(Moment, ForceDaylight))),
        Shown(Moment == At(3, 31, 2, 30) ? At(3, 31, 3, 30) : Moment));
  }
  EXPECT_EQ(Local.UtcOffset(At(7, 1, 12, 0)), 7200);
}

}  // namespace
}  // namespace zq
