#include "runtime/text/datetime.h"

#include <algorithm>
#include <chrono>
#include <optional>

#include "runtime/text/casing.h"
#include "runtime/text/local_time.h"

namespace zq {

// --------------------------------------------------------------------------------------------- calendar

namespace {

constexpr double cFirstDay = -693593;  // 0001-01-01
constexpr double cLastDay = 2958465;   // 9999-12-31

// Whole days and the milliseconds of the day; nothing for a moment outside of the calendar.
struct TMoment {
  std::chrono::sys_days Day;
  Integer Milliseconds;
};

std::optional<TMoment> MomentOf(TDateTime AValue) noexcept {
  if (!(AValue.Value > cFirstDay - 1 && AValue.Value < cLastDay + 1)) return std::nullopt;
  const std::chrono::sys_time<std::chrono::milliseconds> Time(
      std::chrono::milliseconds(DateTimeToUnixMilliseconds(AValue)));
  const auto Date = std::chrono::floor<std::chrono::days>(Time);
  if (Date > std::chrono::sys_days(std::chrono::days(static_cast<int>(cLastDay) - cUnixDateDelta))) return std::nullopt;
  return TMoment{Date, static_cast<Integer>((Time - Date).count())};
}

void SplitTime(Integer AMilliseconds, TSystemTime& AParts) noexcept {
  AParts.Milliseconds = static_cast<Word>(AMilliseconds % 1000);
  AParts.Second = static_cast<Word>(AMilliseconds / 1000 % 60);
  AParts.Minute = static_cast<Word>(AMilliseconds / 60000 % 60);
  AParts.Hour = static_cast<Word>(AMilliseconds / 3600000);
}

std::optional<TSystemTime> PartsOf(TDateTime AValue) noexcept {
  const auto Moment = MomentOf(AValue);
  if (!Moment) return std::nullopt;
  const std::chrono::year_month_day Date(Moment->Day);
  TSystemTime Result;
  Result.Year = static_cast<Word>(static_cast<int>(Date.year()));
  Result.Month = static_cast<Word>(static_cast<unsigned>(Date.month()));
  Result.Day = static_cast<Word>(static_cast<unsigned>(Date.day()));
  Result.DayOfWeek = static_cast<Word>(std::chrono::weekday(Moment->Day).c_encoding());
  SplitTime(Moment->Milliseconds, Result);
  return Result;
}

}  // namespace

bool TryEncodeDate(Word AYear, Word AMonth, Word ADay, TDateTime& AResult) noexcept {
  if (AYear < 1 || AYear > 9999 || AMonth < 1 || AMonth > 12 || ADay < 1) return false;
  if (ADay > MonthDays[IsLeapYear(AYear)][AMonth - 1U]) return false;
  const std::chrono::sys_days Day = std::chrono::year(AYear) / AMonth / ADay;
  AResult = static_cast<double>(Day.time_since_epoch().count() + cUnixDateDelta);
  return true;
}

bool TryEncodeTime(Word AHour, Word AMinute, Word ASecond, Word AMilliseconds, TDateTime& AResult) noexcept {
  if (AHour > 23 || AMinute > 59 || ASecond > 59 || AMilliseconds > 999) return false;
  const Integer Total = ((AHour * 60 + AMinute) * 60 + ASecond) * 1000 + AMilliseconds;
  AResult = static_cast<double>(Total) / cMSecsPerDay;
  return true;
}

TDateTime EncodeDate(Word AYear, Word AMonth, Word ADay) {
  TDateTime Result;
  if (!TryEncodeDate(AYear, AMonth, ADay, Result)) throw EConvertError(u"Invalid argument to date encode");
  return Result;
}

TDateTime EncodeTime(Word AHour, Word AMinute, Word ASecond, Word AMilliseconds) {
  TDateTime Result;
  if (!TryEncodeTime(AHour, AMinute, ASecond, AMilliseconds, Result))
    throw EConvertError(u"Invalid argument to time encode");
  return Result;
}

void DecodeDate(TDateTime AValue, Word& AYear, Word& AMonth, Word& ADay) noexcept {
  const TSystemTime Parts = PartsOf(AValue).value_or(TSystemTime{});
  AYear = Parts.Year;
  AMonth = Parts.Month;
  ADay = Parts.Day;
}

void DecodeTime(TDateTime AValue, Word& AHour, Word& AMinute, Word& ASecond, Word& AMilliseconds) noexcept {
  const TSystemTime Parts = PartsOf(AValue).value_or(TSystemTime{});
  AHour = Parts.Hour;
  AMinute = Parts.Minute;
  ASecond = Parts.Second;
  AMilliseconds = Parts.Milliseconds;
}

Word DayOfWeek(TDateTime AValue) noexcept {
  const TSystemTime Parts = PartsOf(AValue).value_or(TSystemTime{});
  return static_cast<Word>(Parts.DayOfWeek + 1);
}

TSystemTime DateTimeToSystemTime(TDateTime AValue) {
  if (const auto Parts = PartsOf(AValue)) return *Parts;
  throw EConvertError(u"The moment lies outside of the years 1 to 9999");
}

TDateTime SystemTimeToDateTime(const TSystemTime& AValue) {
  return JoinDateTime(EncodeDate(AValue.Year, AValue.Month, AValue.Day),
      EncodeTime(AValue.Hour, AValue.Minute, AValue.Second, AValue.Milliseconds));
}

TDateTime JoinDateTime(TDateTime ADate, TDateTime ATime) noexcept {
  return ADate.Value < 0 ? ADate.Value - ATime.Value : ADate.Value + ATime.Value;
}

TDateTime ShiftDateTime(TDateTime AValue, double ADays) noexcept {
  // Below 0 day and fraction have one sign, though the fraction counts forward; between, the number just grows.
  const double Grows = AValue < 0 ? 2 * std::trunc(AValue) - AValue.Value : AValue.Value;
  const double Sum = Grows + ADays;
  return Sum < 0 ? 2 * std::floor(Sum) - Sum : Sum;
}

TDateTime FileDateToDateTime(Integer AFileDate) {
  const auto Bits = static_cast<Cardinal>(AFileDate);
  const auto Field = [Bits](unsigned AShift, unsigned AMask) { return static_cast<Word>(Bits >> AShift & AMask); };
  return EncodeDate(static_cast<Word>(1980 + Field(25, 127)), Field(21, 15), Field(16, 31)) +
         EncodeTime(Field(11, 31), Field(5, 63), static_cast<Word>(Field(0, 31) * 2), 0);
}

Integer DateTimeToFileDate(TDateTime AValue) {
  const TSystemTime Parts = DateTimeToSystemTime(AValue);
  if (Parts.Year < 1980 || Parts.Year > 2107) throw EConvertError(u"The moment lies outside of the years 1980 to 2107");
  const Cardinal Date = (Parts.Year - 1980U) << 9U | static_cast<Cardinal>(Parts.Month << 5U) | Parts.Day;
  const Cardinal Time =
      static_cast<Cardinal>(Parts.Hour << 11U) | static_cast<Cardinal>(Parts.Minute << 5U) | Parts.Second / 2U;
  return static_cast<Integer>(Date << 16U | Time);
}

// --------------------------------------------------------------------------------------------- dates to text

namespace {

constexpr char16_t Lower(char16_t AChar) noexcept {
  return AChar >= u'A' && AChar <= u'Z' ? static_cast<char16_t>(AChar + 32) : AChar;
}

// Writes one moment by patterns. Patterns of the settings nest, but no deeper than they can without a circle.
class TDateWriter {
 public:
  TDateWriter(TDateTime AValue, const TFormatSettings& ASettings)
      : FParts(DateTimeToSystemTime(AValue)), FSettings(ASettings) {
    FText.Str().reserve(32);
  }

  /// In a pattern of the settings "/" and ":" stand for their separators.
  void Write(std::u16string_view APattern, bool AOfSettings) {
    const bool Halves = HasHalves(APattern);
    bool BehindHour = false;
    for (std::size_t i = 0; i < APattern.size();) {
      const char16_t c = Lower(APattern[i]);
      std::size_t Used = QuotedLength(APattern.substr(i));
      if (Used != 0) {
        FText += Inside(APattern.substr(i, Used));
      } else if ((Used = HalfLength(APattern.substr(i))) != 0) {
        WriteHalf(APattern.substr(i, Used));
      } else if (std::u16string_view(u"dmyhnsztc").find(c) != std::u16string_view::npos) {
        Used = RunLength(APattern.substr(i), c);
        WriteField(c == u'm' && BehindHour && Used <= 2 ? u'n' : c, Used, Halves);
        BehindHour = c == u'h';
      } else {
        FText += AOfSettings ? Separator(c, APattern[i]) : APattern[i];
        Used = 1;
      }
      i += Used;
    }
  }
  void WriteDate() { Write(FSettings.ShortDateFormat, true); }
  void WriteTime() { Write(FSettings.LongTimeFormat, true); }
  void WriteBoth() {
    WriteDate();
    if ((FParts.Hour | FParts.Minute | FParts.Second | FParts.Milliseconds) == 0) return;
    FText += u' ';
    WriteTime();
  }
  [[nodiscard]] UnicodeString Take() { return std::move(FText); }

 private:
  static std::size_t RunLength(std::u16string_view AText, char16_t ALetter) {
    std::size_t i = 0;
    while (i < AText.size() && Lower(AText[i]) == ALetter) ++i;
    return i;
  }
  // With both quotes; one that isn't closed goes on to the end.
  static std::size_t QuotedLength(std::u16string_view AText) {
    if (AText[0] != u'"' && AText[0] != u'\'') return 0;
    const auto End = AText.find(AText[0], 1);
    return End == std::u16string_view::npos ? AText.size() : End + 1;
  }
  static std::u16string_view Inside(std::u16string_view AQuoted) {
    const bool Closed = AQuoted.size() > 1 && AQuoted.back() == AQuoted.front();
    return AQuoted.substr(1, AQuoted.size() - (Closed ? 2 : 1));
  }
  static std::size_t HalfLength(std::u16string_view AText) {
    if (Lower(AText[0]) != u'a') return 0;
    for (const std::u16string_view Marker : {u"am/pm", u"ampm", u"a/p"})
      if (SameText(AText.substr(0, Marker.size()), Marker)) return Marker.size();
    return 0;
  }
  static bool HasHalves(std::u16string_view APattern) {
    for (std::size_t i = 0; i < APattern.size();) {
      if (HalfLength(APattern.substr(i)) != 0) return true;
      i += std::max<std::size_t>(QuotedLength(APattern.substr(i)), 1);
    }
    return false;
  }

  [[nodiscard]] char16_t Separator(char16_t ALetter, char16_t ACopied) const {
    return ALetter == u'/' ? FSettings.DateSeparator : ALetter == u':' ? FSettings.TimeSeparator : ACopied;
  }
  void WriteHalf(std::u16string_view AMarker) {
    const bool Morning = FParts.Hour < 12;
    if (AMarker.size() == 4) FText += Morning ? FSettings.TimeAMString : FSettings.TimePMString;
    else FText += Morning ? AMarker.substr(0, AMarker.size() / 2) : AMarker.substr(AMarker.size() / 2 + 1);
  }
  void WriteNumber(unsigned AValue, std::size_t ADigits) {
    std::array<char16_t, 4> Buffer;
    std::size_t At = Buffer.size();
    for (; AValue != 0 || Buffer.size() - At < ADigits; AValue /= 10)
      Buffer[--At] = static_cast<char16_t>(u'0' + AValue % 10);
    FText += std::u16string_view(&Buffer[At], Buffer.size() - At);
  }
  void WriteSettings(const UnicodeString& APattern) {
    if (++FDepth < 3) Write(APattern, true);
    --FDepth;
  }
  void WriteDay(std::size_t ACount) {
    switch (ACount) {
      case 1:
      case 2: return WriteNumber(FParts.Day, ACount);
      case 3: FText += FSettings.ShortDayNames[FParts.DayOfWeek]; return;
      case 4: FText += FSettings.LongDayNames[FParts.DayOfWeek]; return;
      case 5: return WriteSettings(FSettings.ShortDateFormat);
      default: return WriteSettings(FSettings.LongDateFormat);
    }
  }
  void WriteMonth(std::size_t ACount) {
    if (ACount <= 2) WriteNumber(FParts.Month, ACount);
    else FText += (ACount == 3 ? FSettings.ShortMonthNames : FSettings.LongMonthNames)[FParts.Month - 1U];
  }
  void WriteField(char16_t ALetter, std::size_t ACount, bool AHalves) {
    const std::size_t Two = std::min<std::size_t>(ACount, 2);
    const unsigned Hour = AHalves ? (FParts.Hour + 11U) % 12U + 1U : FParts.Hour;
    switch (ALetter) {
      case u'd': return WriteDay(ACount);
      case u'm': return WriteMonth(ACount);
      case u'y': return ACount <= 2 ? WriteNumber(FParts.Year % 100U, 2) : WriteNumber(FParts.Year, 4);
      case u'h': return WriteNumber(Hour, Two);
      case u'n': return WriteNumber(FParts.Minute, Two);
      case u's': return WriteNumber(FParts.Second, Two);
      case u'z': return WriteNumber(FParts.Milliseconds, ACount == 1 ? 1 : 3);
      case u't': return WriteSettings(ACount == 1 ? FSettings.ShortTimeFormat : FSettings.LongTimeFormat);
      default:
        if (++FDepth < 3) WriteBoth();
        --FDepth;
    }
  }

  TSystemTime FParts;
  const TFormatSettings& FSettings;
  UnicodeString FText;
  int FDepth = 0;
};

}  // namespace

UnicodeString FormatDateTime(const UnicodeString& APattern, TDateTime AValue, const TFormatSettings& ASettings) {
  TDateWriter Writer(AValue, ASettings);
  Writer.Write(APattern, false);
  return Writer.Take();
}

UnicodeString FormatDateTime(const UnicodeString& APattern, TDateTime AValue) {
  return FormatDateTime(APattern, AValue, *SharedFormatSettings());
}

UnicodeString DateTimeToStr(TDateTime AValue, const TFormatSettings& ASettings) {
  TDateWriter Writer(AValue, ASettings);
  Writer.WriteBoth();
  return Writer.Take();
}

UnicodeString DateToStr(TDateTime AValue, const TFormatSettings& ASettings) {
  TDateWriter Writer(AValue, ASettings);
  Writer.WriteDate();
  return Writer.Take();
}

UnicodeString TimeToStr(TDateTime AValue, const TFormatSettings& ASettings) {
  TDateWriter Writer(AValue, ASettings);
  Writer.WriteTime();
  return Writer.Take();
}

UnicodeString DateTimeToStr(TDateTime AValue) { return DateTimeToStr(AValue, *SharedFormatSettings()); }
UnicodeString DateToStr(TDateTime AValue) { return DateToStr(AValue, *SharedFormatSettings()); }
UnicodeString TimeToStr(TDateTime AValue) { return TimeToStr(AValue, *SharedFormatSettings()); }

// --------------------------------------------------------------------------------------------- dates from text

namespace {

Word CurrentYear() {
  Word Year = 0;
  Word Month = 0;
  Word Day = 0;
  DecodeDate(Date().Value, Year, Month, Day);
  return Year;
}

// Reads dates and times off the front of a text. A read that fails leaves its place undefined.
class TDateReader {
 public:
  TDateReader(std::u16string_view AText, const TFormatSettings& ASettings) : FRest(AText), FSettings(ASettings) {}

  bool ReadDate(TDateTime& AResult) {
    std::array<TNumber, 3> Found{};
    std::size_t Count = 0;
    do {
      if (!ReadNumber(Found[Count])) return false;
    } while (++Count < Found.size() && Skip(FSettings.DateSeparator));
    if (Count < 2) return false;
    TNumber Year{CurrentYear(), 4};
    TNumber Month;
    TNumber Day;
    std::size_t Next = 0;
    for (const char16_t Letter : Order())
      if (Count == 3 || Letter != u'y') (Letter == u'y' ? Year : Letter == u'm' ? Month : Day) = Found[Next++];
    return TryEncodeDate(FullYear(Year), Month.Value, Day.Value, AResult);
  }
  bool ReadTime(TDateTime& AResult) {
    TNumber Parts[3];
    Word Milliseconds = 0;
    if (!ReadNumber(Parts[0])) return false;
    if (Skip(FSettings.TimeSeparator) && !ReadNumber(Parts[1])) return false;
    if (Parts[1].Digits != 0 && Skip(FSettings.TimeSeparator) && !ReadNumber(Parts[2])) return false;
    if (Parts[2].Digits != 0 && !ReadMilliseconds(Milliseconds)) return false;
    return ReadHalf(Parts[0].Value) &&
           TryEncodeTime(Parts[0].Value, Parts[1].Value, Parts[2].Value, Milliseconds, AResult);
  }
  bool AtEnd() {
    SkipBlanks();
    return FRest.empty();
  }

 private:
  struct TNumber {
    Word Value = 0;
    Word Digits = 0;
  };

  void SkipBlanks() {
    while (!FRest.empty() && FRest.front() <= u' ') FRest.remove_prefix(1);
  }
  bool Skip(char16_t AChar) {
    const auto Before = FRest;
    if (AChar > u' ') SkipBlanks();
    if (!FRest.empty() && FRest.front() == AChar) {
      FRest.remove_prefix(1);
      return true;
    }
    FRest = Before;
    return false;
  }
  bool ReadNumber(TNumber& ANumber) {
    SkipBlanks();
    for (; !FRest.empty() && FRest.front() >= u'0' && FRest.front() <= u'9'; FRest.remove_prefix(1)) {
      if (++ANumber.Digits > 4) return false;
      ANumber.Value = static_cast<Word>(ANumber.Value * 10 + (FRest.front() - u'0'));
    }
    return ANumber.Digits != 0;
  }
  bool ReadMilliseconds(Word& AMilliseconds) {
    constexpr std::array<Word, 4> cScale = {0, 100, 10, 1};
    const bool Counted = Skip(FSettings.TimeSeparator);
    if (!Counted && !Skip(FSettings.DecimalSeparator) && !Skip(u'.')) return true;
    TNumber Number;
    if (!ReadNumber(Number) || Number.Digits > 3) return false;
    AMilliseconds = static_cast<Word>(Counted ? Number.Value : Number.Value * cScale[Number.Digits]);
    return true;
  }
  // A marker of the half of the day, if there is one, and the hour that it makes of AHour.
  bool ReadHalf(Word& AHour) {
    SkipBlanks();
    const bool Morning = SkipText(FSettings.TimeAMString) || SkipText(u"AM");
    if (!Morning && !SkipText(FSettings.TimePMString) && !SkipText(u"PM")) return true;
    if (AHour < 1 || AHour > 12) return false;
    AHour = static_cast<Word>(AHour % 12 + (Morning ? 0 : 12));
    return true;
  }
  bool SkipText(const UnicodeString& AText) {
    if (AText.IsEmpty() || !AnsiSameText(FRest.substr(0, AText.size()), AText)) return false;
    FRest.remove_prefix(AText.size());
    return true;
  }
  // The letters d, m and y in the order of the short date, completed to all three.
  [[nodiscard]] UnicodeString Order() const {
    UnicodeString Result;
    for (const char16_t c : LowerCase(FSettings.ShortDateFormat + u"ymd"))
      if ((c == u'd' || c == u'm' || c == u'y') && Result.Pos({&c, 1}) == 0) Result += c;
    return Result;
  }
  static Word FullYear(const TNumber& AYear) {
    if (AYear.Digits > 2) return AYear.Value;
    const int First = CurrentYear() - 50;
    const int Result = First - First % 100 + AYear.Value;
    return static_cast<Word>(Result < First ? Result + 100 : Result);
  }

  std::u16string_view FRest;
  const TFormatSettings& FSettings;
};

UnicodeString Invalid(const UnicodeString& AText, const char16_t* AKind) {
  return u"'" + AText + u"' is not a valid " + AKind;
}

}  // namespace

bool TryStrToDate(const UnicodeString& AText, TDateTime& AResult, const TFormatSettings& ASettings) {
  TDateReader Reader(AText, ASettings);
  TDateTime Date;
  if (!Reader.ReadDate(Date) || !Reader.AtEnd()) return false;
  AResult = Date;
  return true;
}

bool TryStrToTime(const UnicodeString& AText, TDateTime& AResult, const TFormatSettings& ASettings) {
  TDateReader Reader(AText, ASettings);
  TDateTime Time;
  if (!Reader.ReadTime(Time) || !Reader.AtEnd()) return false;
  AResult = Time;
  return true;
}

bool TryStrToDateTime(const UnicodeString& AText, TDateTime& AResult, const TFormatSettings& ASettings) {
  if (TryStrToDate(AText, AResult, ASettings) || TryStrToTime(AText, AResult, ASettings)) return true;
  TDateReader Reader(AText, ASettings);
  TDateTime Date;
  TDateTime Time;
  if (!Reader.ReadDate(Date) || !Reader.ReadTime(Time) || !Reader.AtEnd()) return false;
  AResult = JoinDateTime(Date, Time);
  return true;
}

TDateTime StrToDate(const UnicodeString& AText, const TFormatSettings& ASettings) {
  TDateTime Result;
  if (!TryStrToDate(AText, Result, ASettings)) throw EConvertError(Invalid(AText, u"date"));
  return Result;
}

TDateTime StrToTime(const UnicodeString& AText, const TFormatSettings& ASettings) {
  TDateTime Result;
  if (!TryStrToTime(AText, Result, ASettings)) throw EConvertError(Invalid(AText, u"time"));
  return Result;
}

TDateTime StrToDateTime(const UnicodeString& AText, const TFormatSettings& ASettings) {
  TDateTime Result;
  if (!TryStrToDateTime(AText, Result, ASettings)) throw EConvertError(Invalid(AText, u"date and time"));
  return Result;
}

TDateTime StrToDate(const UnicodeString& AText) { return StrToDate(AText, *SharedFormatSettings()); }
TDateTime StrToTime(const UnicodeString& AText) { return StrToTime(AText, *SharedFormatSettings()); }
TDateTime StrToDateTime(const UnicodeString& AText) { return StrToDateTime(AText, *SharedFormatSettings()); }

}  // namespace zq
