#include "common/uZqDateTimeUtils.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <string_view>
#include <utility>

#include "common/uZqSysUtils.h"
#include "runtime/core/start_count.h"
#include "runtime/io/string_list.h"
#include "runtime/text/datetime.h"
#include "runtime/text/format_settings.h"
#include "runtime/text/local_time.h"
#include "runtime/text/numbers.h"
#include "runtime/values/typeinfo.h"

namespace zq {

namespace uZqDateTimeUtils {

namespace {
constinit TStartCount Starts;
}

void Start() {
  if (!Starts.Begins()) return;
  constexpr const char16_t* cUnit = u"uZqDateTimeUtils";
  DescribeType<TZqWeekFormat>(cUnit).EnumNames({u"wfYearWeek", u"wfWeek"});
  DescribeType<TZqDatePeriod>(cUnit).EnumNames(
      {u"dpNone", u"dpYear", u"dpHalfYear", u"dpQuarter", u"dpFourWeeks", u"dpMonth", u"dpWeek", u"dpDay"});
  DescribeType<TZqWorkDayAdjustment>(cUnit).EnumNames({u"wdLast", u"wdNext"});
  DescribeType<TZqDecodeType>(cUnit).EnumNames({u"dtYear", u"dtMonth", u"dtDayOfYear", u"dtDayOfMonth"});
  DescribeType<TZqTimeRange>(cUnit).EnumNames({u"trDuration", u"trPointOfTime", u"trEndTime"});
  DescribeType<TZqTimeFormat>(cUnit).EnumNames(
      {u"tfNone", u"tfHourMin", u"tfHourMinSec", u"tfDecHourM2", u"tfDecHourM3", u"tfDecMinM2"});
}

void Stop() { Starts.Ends(); }

}  // namespace uZqDateTimeUtils

using namespace uZqDateTimeUtils;

// ---- Start and end of a period -------------------------------------------------------------------------------------

namespace {

constexpr Word cNoField = std::numeric_limits<Word>::max();  // no field of a date or time takes it

Word AsField(Int64 AValue) noexcept { return AValue < 0 || AValue > cNoField ? cNoField : static_cast<Word>(AValue); }

Word YearOf(TDateTime ADate) { return DateTimeToSystemTime(ADate).Year; }

TDateTime DayOf(const TSystemTime& AParts) { return EncodeDate(AParts.Year, AParts.Month, AParts.Day); }

Integer WeekDayOf(TDateTime ADate) { return DateTimeToSystemTime(ADate).DayOfWeek + 1; }

}  // namespace

TDateTime ZqBOMonth(Word AYear, Word AMonth) { return EncodeDate(AYear, AMonth, 1); }

TDateTime ZqBOMonth(TDateTime ADate) {
  const TSystemTime Parts = DateTimeToSystemTime(ADate);
  return ZqBOMonth(Parts.Year, Parts.Month);
}

TDateTime ZqEOMonth(Word AYear, Word AMonth) { return EncodeDate(AYear, AMonth, ZqDaysInMonth(AYear, AMonth)); }

TDateTime ZqEOMonth(TDateTime ADate) {
  const TSystemTime Parts = DateTimeToSystemTime(ADate);
  return ZqEOMonth(Parts.Year, Parts.Month);
}

TDateTime ZqBOYear(Word AYear) { return EncodeDate(AYear, 1, 1); }
TDateTime ZqBOYear(TDateTime ADate) { return ZqBOYear(YearOf(ADate)); }
TDateTime ZqEOYear(Word AYear) { return EncodeDate(AYear, 12, 31); }
TDateTime ZqEOYear(TDateTime ADate) { return ZqEOYear(YearOf(ADate)); }

TDateTime ZqBOWeek(TDateTime ADate, Integer AFirstDay) {
  Assert(AFirstDay >= 1 && AFirstDay <= 7);
  return ZqAddDays(ADate, -((WeekDayOf(ADate) - AFirstDay + 7) % 7));
}

TDateTime ZqEOWeek(TDateTime ADate) { return ZqAddDays(ZqBOWeek(ADate, 1), 6); }
TDateTime ZqEOWeek(Word AYear, Word AWeek) { return ZqWeekToDate(AYear, AWeek) + 6; }

// ---- Arithmetic ----------------------------------------------------------------------------------------------------

namespace {

TDateTime AddMonths(TDateTime ADate, Int64 AMonths) {
  const TSystemTime Parts = DateTimeToSystemTime(ADate);
  const Int64 Months = Int64{Parts.Year} * 12 + Parts.Month - 1 + AMonths;  // since January of the year 0
  const Word Year = AsField(Months / 12);
  const Word Month = AsField(Months % 12 + 1);
  TDateTime Result;
  return TryEncodeDate(Year, Month, Parts.Day, Result) ? Result : ZqEOMonth(Year, Month);
}

}  // namespace

TDateTime ZqAddYears(TDateTime ADate, Integer AYears) {
  TSystemTime Parts = DateTimeToSystemTime(std::trunc(ADate));
  Parts.Year = AsField(Int64{Parts.Year} + AYears);
  if (Parts.Month == 2 && Parts.Day == 29 && !IsLeapYear(Parts.Year)) Parts.Day = 28;
  return JoinDateTime(DayOf(Parts), std::fabs(ADate - std::trunc(ADate)));
}

TDateTime ZqAddQuarters(TDateTime ADate, Integer AQuarters) { return AddMonths(ADate, Int64{3} * AQuarters); }
TDateTime ZqAddMonths(TDateTime ADate, Integer AMonths) { return AddMonths(ADate, AMonths); }
TDateTime ZqAddWeeks(TDateTime ADate, Integer AWeeks) { return ShiftDateTime(ADate, 7.0 * AWeeks); }
TDateTime ZqAddDays(TDateTime ADate, Integer ADays) { return ShiftDateTime(ADate, ADays); }
TDateTime ZqAddHrs(TDateTime ADate, Integer AHours) { return ShiftDateTime(ADate, 1.0 * AHours / cHoursPerDay); }
TDateTime ZqAddMins(TDateTime ADate, Integer AMinutes) { return ShiftDateTime(ADate, 1.0 * AMinutes / cMinsPerDay); }
TDateTime ZqAddSecs(TDateTime ADate, Integer ASeconds) { return ShiftDateTime(ADate, 1.0 * ASeconds / cSecsPerDay); }

// ---- Queries -------------------------------------------------------------------------------------------------------

Word ZqDaysInMonth(Word AYear, Word AMonth) {
  (void)EncodeDate(AYear, AMonth, 1);  // refuses what is no month
  return MonthDays[IsLeapYear(AYear)][AMonth - 1U];
}

Word ZqDaysInMonth(TDateTime ADate) {
  const TSystemTime Parts = DateTimeToSystemTime(ADate);
  return ZqDaysInMonth(Parts.Year, Parts.Month);
}

Word ZqDaysInYear(Word AYear) { return IsLeapYear(AYear) ? 366 : 365; }
Word ZqDaysInYear(TDateTime ADate) { return ZqDaysInYear(YearOf(ADate)); }

Word ZqDecodeDate(TDateTime ADate, TZqDecodeType AType) {
  switch (AType) {
    case dtYear: return YearOf(ADate);
    case dtMonth: return DateTimeToSystemTime(ADate).Month;
    case dtDayOfYear: return ZqDayOfYear(ADate);
    case dtDayOfMonth: return ZqDayOfMonth(ADate);
  }
  return 0;
}

Word ZqDayOfMonth(TDateTime ADate) { return DateTimeToSystemTime(ADate).Day; }

Word ZqDayOfYear(TDateTime ADate) {
  const TSystemTime Parts = DateTimeToSystemTime(ADate);
  return static_cast<Word>(DayOf(Parts) - ZqBOYear(Parts.Year) + 1);
}

TDateTime ZqFirstThursdayOfYear(Word AYear) {
  const TDateTime First = ZqBOYear(AYear);
  constexpr Integer cThursday = 5;
  return First + (cThursday - WeekDayOf(First) + 7) % 7;
}

TDateTime ZqFirstThursdayOfYear(TDateTime ADate) { return ZqFirstThursdayOfYear(YearOf(ADate)); }

TDateTime ZqWeekToDate(Word AYear, Word AWeek) { return ZqFirstThursdayOfYear(AYear) - 3 + (AWeek - 1) * 7; }

Word ZqWeekOfYear(TDateTime ADate) {
  const TSystemTime Parts = DateTimeToSystemTime(ADate);
  return static_cast<Word>(Trunc(DayOf(Parts) - ZqWeekToDate(Parts.Year, 1)) / 7 + 1);
}

UnicodeString ZqWeekOfYear(TDateTime ADate, Boolean AWithYear) {
  const UnicodeString Week = ZqPadLeft(Integer{ZqWeekOfYear(ADate)}, 2, u'0');
  return AWithYear ? ZqPadLeft(Integer{YearOf(ADate)}, 4, u'0') + Week : Week;
}

TDateTime ZqClosestWeekDay(TDateTime ADate, TZqWorkDayAdjustment AAdjust) {
  if (ADate <= 0) return ADate;
  constexpr Integer cSunday = 1;
  constexpr Integer cSaturday = 7;
  const Integer WeekDay = WeekDayOf(ADate);
  if (WeekDay != cSunday && WeekDay != cSaturday) return ADate;
  const Integer Friday = WeekDay == cSunday ? -2 : -1;
  return ZqAddDays(ADate, AAdjust == wdLast ? Friday : Friday + 3);
}

Integer ZqDateCompare(TDateTime A, TDateTime B) {
  for (const TDateTime Date : {A, B}) (void)DateTimeToSystemTime(Date);  // refuses what no Integer may hold
  return static_cast<Integer>(std::trunc(A) - std::trunc(B));
}

Integer ZqCalculateAge(TDateTime ADate) { return ZqAge(ADate); }

TDateTime ZqRoundTime(TDateTime ADate, Integer AInterval) {
  Assert(AInterval > 0);
  TSystemTime Parts = DateTimeToSystemTime(ADate);
  const Int64 Minute = (Int64{Parts.Minute} + AInterval - 1) / AInterval * AInterval;
  Parts.Hour = static_cast<Word>(Parts.Hour + (Minute == 60 ? 1 : 0));
  Parts.Minute = Minute == 60 ? Word{0} : AsField(Minute);
  Parts.Second = 0;
  Parts.Milliseconds = 0;
  return SystemTimeToDateTime(Parts);
}

TDateTime ZqUTCToLocal(TDateTime ADate) { return TTimeZone::Local().ToLocalTime(ADate); }
TDateTime ZqLocalToUTC(TDateTime ADate) { return TTimeZone::Local().ToUniversalTime(ADate, false); }

// ---- Durations -----------------------------------------------------------------------------------------------------

namespace {

constexpr Integer cSecsPerHour = 3600;

// The text up to the next separator or the end, which goes from ARest with the separator.
std::u16string_view TakeField(std::u16string_view& ARest, Char ASeparator) noexcept {
  const std::size_t End = std::min(ARest.find(ASeparator), ARest.size());
  const std::u16string_view Field = ARest.substr(0, End);
  ARest.remove_prefix(std::min(End + 1, ARest.size()));
  return Field;
}

Int64 ValueOf(std::u16string_view AField) { return AField.empty() ? 0 : StrToInt(AField); }

Integer SecondsOf(Int64 AHours, Int64 AMinutes, Int64 ASeconds) {
  const Int64 Result = AHours * cSecsPerHour + AMinutes * 60 + ASeconds;
  if (Result != static_cast<Integer>(Result)) throw EConvertError(_STimeConvertError);
  return static_cast<Integer>(Result);
}

Integer ReadClock(std::u16string_view AText, bool AWithSeconds, const TFormatSettings& ASettings) {
  if (AText.ends_with(ASettings.TimeSeparator)) AText.remove_suffix(1);
  TDateTime Time;
  if (!TryStrToTime(AText.empty() ? u"0" : AText, Time, ASettings)) throw Exception(_STimeDecodeError);
  const TSystemTime Parts = DateTimeToSystemTime(Time);
  return SecondsOf(Parts.Hour, Parts.Minute, AWithSeconds ? Parts.Second : 0);
}

Integer ReadHourMin(std::u16string_view AText, Char ASeparator) {
  const std::u16string_view Hours = TakeField(AText, ASeparator);
  const Int64 Minutes = ValueOf(TakeField(AText, ASeparator));
  if (Minutes > 59) throw Exception(_SInvalidTime);
  return SecondsOf(ValueOf(Hours), Minutes, 0);
}

Integer ReadHourMinSec(std::u16string_view AText, Char ASeparator, Integer AMaxSeconds) {
  const Int64 Hours = ValueOf(TakeField(AText, ASeparator));
  const Int64 Minutes = ValueOf(TakeField(AText, ASeparator));
  const Int64 Seconds = ValueOf(TakeField(AText, ASeparator));
  if (Hours > AMaxSeconds / cSecsPerHour - 1 || Minutes < 0 || Minutes > 59 || Seconds < 0 || Seconds > 59)
    throw EConvertError(_STimeConvertError);
  return SecondsOf(Hours, Minutes, Seconds);
}

}  // namespace

UnicodeString ZqTimeToStr(double ASeconds, Boolean AWithSeconds) {
  constexpr double cLimit = 0x1p63;
  if (!(std::fabs(ASeconds) < cLimit)) throw EConvertError(_STimeDecodeError);
  const Int64 Total = Round(std::fabs(ASeconds));
  const UnicodeString Separator(SharedFormatSettings()->TimeSeparator);
  UnicodeString Result = ASeconds < 0 ? u"-" : u"";
  Result += IntToStr(Total / cSecsPerHour) + Separator + ZqPadLeft(Total % cSecsPerHour / 60, 2, u'0');
  if (AWithSeconds) Result += Separator + ZqPadLeft(Total % 60, 2, u'0');
  return Result;
}

Integer ZqStrToTimeToInt(
    const UnicodeString& AText, Boolean AWithSeconds, TZqTimeRange ARange, TZqTimeFormat AFormat, Integer AMaxSeconds) {
  std::u16string_view Text = AText;
  const bool Negative = Text.starts_with(u'-');
  if (Negative) Text.remove_prefix(1);
  const auto Settings = SharedFormatSettings();
  Integer Result = 0;
  if (ARange == trEndTime && Text.starts_with(u"24")) Result = cSecsPerDay;
  else if (ARange != trDuration) Result = ReadClock(Text, AWithSeconds, *Settings);
  else if (AFormat == tfHourMin) Result = ReadHourMin(Text, Settings->TimeSeparator);
  else if (AFormat == tfHourMinSec && !Text.empty())
    Result = ReadHourMinSec(Text, Settings->TimeSeparator, AMaxSeconds);
  return Negative ? -Result : Result;
}

// ---- Dates as text -------------------------------------------------------------------------------------------------

namespace {

constexpr std::size_t cISOLength = 23;
constexpr std::u16string_view cMonths = u"JANFEBMARAPRMAYJUNJULAUGSEPOCTNOVDEC";

// A text of fields with fixed widths, written where it stays.
class TFieldWriter {
 public:
  explicit TFieldWriter(std::size_t ALength) : FText(ALength, u' '), FNext(FText.data()) {}

  TFieldWriter& Number(unsigned AValue, std::ptrdiff_t AWidth, char16_t APad = u'0') noexcept {
    char16_t* const First = FNext;
    FNext += AWidth;
    char16_t* Place = FNext;
    *--Place = static_cast<char16_t>(u'0' + AValue % 10);
    while (Place != First) {
      AValue /= 10;
      *--Place = AValue == 0 ? APad : static_cast<char16_t>(u'0' + AValue % 10);
    }
    return *this;
  }
  TFieldWriter& Text(std::u16string_view AText) noexcept {
    FNext += AText.copy(FNext, AText.size());
    return *this;
  }
  TFieldWriter& Date(const TSystemTime& AParts) noexcept {
    return Two(AParts.Year / 100U).Two(AParts.Year % 100U).Mark(u'-').Two(AParts.Month).Mark(u'-').Two(AParts.Day);
  }
  TFieldWriter& Time(const TSystemTime& AParts) noexcept {
    Mark(u'T').Two(AParts.Hour).Mark(u':').Two(AParts.Minute).Mark(u':').Two(AParts.Second).Mark(u'.');
    return Digit(AParts.Milliseconds / 100U).Two(AParts.Milliseconds % 100U);
  }
  [[nodiscard]] UnicodeString Take() noexcept { return std::move(FText); }

 private:
  TFieldWriter& Digit(unsigned AValue) noexcept { return Mark(static_cast<char16_t>(u'0' + AValue)); }
  TFieldWriter& Two(unsigned AValue) noexcept { return Digit(AValue / 10).Digit(AValue % 10); }
  TFieldWriter& Mark(char16_t AChar) noexcept {
    *FNext++ = AChar;
    return *this;
  }

  UnicodeString FText;
  char16_t* FNext;  // in FText
};

// The twelve-hour clock's hour as one of the day.
Word HourOfDay(Word AHour, const UnicodeString& AHalf) {
  if (AHalf.Pos(u"PM") != 0 && AHour != 12) return AsField(Int64{AHour} + 12);
  return AHalf.Pos(u"PM") == 0 && AHalf.Pos(u"AM") != 0 && AHour == 12 ? Word{0} : AHour;
}

}  // namespace

TDateTime ConvertLUOToDateTime(const UnicodeString& AText) {
  TStringList Tokens;
  ZqTokenize(AText, &Tokens);
  const auto Field = [&Tokens](Integer AIndex) { return AsField(StrToInt(Tokens[AIndex])); };
  const UnicodeString Last = UpperCase(Tokens[6]);
  const Integer Month = (Pos(UpperCase(Tokens[0]), cMonths) + 2) / 3;
  TSystemTime Parts;
  Parts.Year = Field(2);
  Parts.Month = AsField(Month);
  Parts.Day = Field(1);
  Parts.Hour = HourOfDay(Field(3), Last);
  Parts.Minute = Field(4);
  Parts.Second = Field(5);
  Parts.Milliseconds = AsField(StrToInt(Last.Copy(1, 3)));
  return SystemTimeToDateTime(Parts);
}

UnicodeString ConvertDateTimeToLUO(TDateTime ADate) {
  const TSystemTime Parts = DateTimeToSystemTime(ADate);
  const unsigned Hour = Parts.Hour % 12U;
  TFieldWriter Writer(26);
  Writer.Text(cMonths.substr(std::size_t{3} * (Parts.Month - 1U), 3)).Text(u" ").Number(Parts.Day, 2, u' ').Text(u" ");
  Writer.Number(Parts.Year, 4, u' ').Text(u" ").Number(Hour == 0 ? 12 : Hour, 2, u' ').Text(u":");
  Writer.Number(Parts.Minute, 2).Text(u":").Number(Parts.Second, 2).Text(u":").Number(Parts.Milliseconds, 3);
  return Writer.Text(Parts.Hour < 12 ? u"AM" : u"PM").Take();
}

TDateTime ZqStrToDateTime(const UnicodeString& AText) {
  TFormatSettings Settings = GetLocaleFormatSettings();
  Settings.DateSeparator = u'-';
  Settings.ShortDateFormat = u"dd-MM-yyyy";
  TDateTime Result;
  if (TryStrToDateTime(AText, Result, Settings)) return Result;
  Settings.TimeSeparator = u':';  // understood under every locale
  return TryStrToDateTime(AText, Result, Settings) ? Result : TDateTime();
}

UnicodeString ZqGetTimeZone() {
  constexpr Int64 cMSecsPerHour = 3600000;
  const Int64 Utc = UtcMilliseconds();
  return u"GMT " + IntToStr((LocalMilliseconds(Utc) - Utc) / cMSecsPerHour);
}

UnicodeString ZqShortDateFormatY2k() {
  std::u16string Result = SharedFormatSettings()->ShortDateFormat.Str();
  for (;;) {
    const UnicodeString Lower = LowerCase(Result);
    if (Lower.Pos(u"yyyy") != 0) return Result;
    const Integer First = std::max(Lower.Pos(u"y"), 1);
    Result.insert(static_cast<std::size_t>(First - 1), 1, u'y');
  }
}

UnicodeString ZqDateToISOStr(TDateTime ADate) { return TFieldWriter(10).Date(DateTimeToSystemTime(ADate)).Take(); }

UnicodeString ZqTimeToISOStr(TDateTime ADate) {
  static constexpr TSystemTime cBaseDate{.Year = 1899, .Month = 12, .Day = 30};
  return TFieldWriter(cISOLength).Date(cBaseDate).Time(DateTimeToSystemTime(ADate)).Take();
}

UnicodeString ZqDateTimeToISOStr(TDateTime ADate) {
  const TSystemTime Parts = DateTimeToSystemTime(ADate);
  return TFieldWriter(cISOLength).Date(Parts).Time(Parts).Take();
}

namespace {

// ACount characters from AFrom on, or those that there are.
std::u16string_view FieldAt(std::u16string_view AText, std::size_t AFrom, std::size_t ACount) noexcept {
  return AText.substr(std::min(AFrom, AText.size()), ACount);
}

// StrToInt says which field is no number; a sign, a blank or hexadecimal digits don't make one here, either.
[[noreturn]] void Refuse(std::u16string_view AField) {
  (void)StrToInt(AField);
  throw EConvertError(_STimeConvertError);
}

Word DigitsOf(std::u16string_view AField) {
  unsigned Result = 0;
  for (const char16_t c : AField) {
    if (c < u'0' || c > u'9') Refuse(AField);
    Result = std::min(Result * 10 + (c - u'0'), unsigned{cNoField});
  }
  if (AField.empty()) Refuse(AField);
  return static_cast<Word>(Result);
}

// The number in AWidth characters from AFrom on, or in those that there are.
template <std::size_t AWidth>
Word NumberAt(std::u16string_view AText, std::size_t AFrom) {
  if (AText.size() < AFrom + AWidth) return DigitsOf(FieldAt(AText, AFrom, AWidth));
  unsigned Result = 0;
  bool Refused = false;
  for (std::size_t i = AFrom; i < AFrom + AWidth; ++i) {  // in plain steps: no call, no early end
    const unsigned Digit = static_cast<unsigned>(AText[i]) - u'0';
    Refused |= Digit > 9;
    Result = Result * 10 + Digit;
  }
  if (Refused) Refuse(AText.substr(AFrom, AWidth));
  return static_cast<Word>(Result);
}

TDateTime ReadDate(std::u16string_view AText) {
  std::array<char16_t, 8> Room{};
  std::size_t Count = 0;
  for (std::size_t i = 0; i < AText.size() && Count < Room.size(); ++i)
    if (AText[i] != u'-') Room[Count++] = AText[i];
  const std::u16string_view Digits(Room.data(), Count);
  const Word Year = NumberAt<4>(Digits, 0);
  const Word Month = NumberAt<2>(Digits, 4);
  const Word Day = NumberAt<2>(Digits, 6);
  return (Year | Month | Day) == 0 ? TDateTime() : EncodeDate(Year, Month, Day);
}

// Where an offset from UTC begins, or the end.
std::size_t SignIn(std::u16string_view AText) noexcept {
  std::size_t Result = 0;
  while (Result < AText.size() && AText[Result] != u'+' && AText[Result] != u'-') ++Result;
  return Result;
}

// A count of milliseconds, with or without an offset behind it.
Word ReadFraction(std::u16string_view AText) {
  const std::u16string_view Digits = AText.substr(0, SignIn(AText));
  const Word Result = DigitsOf(Digits);
  return Digits.size() > 3 ? cNoField : Result;
}

TDateTime ReadTime(std::u16string_view AText) {
  const Word Hour = NumberAt<2>(AText, 0);
  const Word Minute = NumberAt<2>(AText, 3);
  const Word Second = NumberAt<2>(AText, 6);
  const bool Fraction = AText.size() > 8 && AText[8] == u'.';
  return EncodeTime(Hour, Minute, Second, Fraction ? ReadFraction(AText.substr(9)) : Word{0});
}

// What local time is ahead of UTC, in days, by "+hh:mm" or "-hh:mm".
double ReadZone(std::u16string_view AText) {
  if (AText.size() != 6 || AText[3] != u':') throw EConvertError(_STimeConvertError);
  const double Offset = EncodeTime(NumberAt<2>(AText, 1), NumberAt<2>(AText, 4), 0, 0);
  return AText[0] == u'+' ? Offset : -Offset;
}

TDateTime ReadDateAndTime(std::u16string_view ADate, std::u16string_view ATime) {
  const TDateTime Date = ADate.empty() ? TDateTime() : ReadDate(ADate);
  return ATime.empty() ? Date : JoinDateTime(Date, ReadTime(ATime));
}

}  // namespace

TDateTime ZqISOStrToDate(const UnicodeString& AText) { return AText.IsEmpty() ? TDateTime() : ReadDate(AText); }

TDateTime ZqISOStrToTime(const UnicodeString& AText) {
  if (AText.IsEmpty()) return {};
  const std::u16string_view Text = AText;
  const TDateTime Time = ReadTime(Text.substr(Text.find(u'T') + 1));  // from the front where there is none
  return Text.back() == u'Z' ? ZqUTCToLocal(Time) : Time;
}

TDateTime ZqISOStrToDateTime(const UnicodeString& AText) {
  std::u16string_view Text = AText;
  if (Text.empty() || Text == u"0") return {};
  const bool Utc = Text.back() == u'Z';
  if (Utc) Text.remove_suffix(1);
  const std::size_t Mark = Text.find(u'T');
  const std::u16string_view Date = Text.substr(0, Mark);
  if (Mark == Text.npos) return Utc ? ZqUTCToLocal(ReadDate(Date)) : ReadDate(Date);
  const std::u16string_view Time = Text.substr(Mark + 1);
  if (Utc) return ZqUTCToLocal(ReadDateAndTime(Date, Time));
  const std::size_t Sign = SignIn(Time);
  const TDateTime Moment = ReadDateAndTime(Date, Time.substr(0, Sign));
  return Sign == Time.size() ? Moment : ZqUTCToLocal(ShiftDateTime(Moment, -ReadZone(Time.substr(Sign))));
}

}  // namespace zq
