#include "runtime/text/numbers.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <clocale>
#include <cmath>
#include <cstdlib>
#include <limits>
#include <string>

namespace zq {

namespace {

UnicodeString Widen(std::string_view AAscii) { return std::u16string(AAscii.begin(), AAscii.end()); }

UnicodeString Quoted(std::u16string_view AText, const char16_t* AComplaint) {
  return u"'" + UnicodeString(AText) + u"' " + AComplaint;
}

void SkipBlanks(std::u16string_view& AText) noexcept {
  while (!AText.empty() && AText.front() <= u' ') AText.remove_prefix(1);
}

bool Skip(std::u16string_view& AText, char16_t AChar) noexcept {
  if (AText.empty() || AText.front() != AChar) return false;
  AText.remove_prefix(1);
  return true;
}

bool SkipMinus(std::u16string_view& AText) noexcept {
  if (Skip(AText, u'+')) return false;
  return Skip(AText, u'-');
}

constexpr unsigned DigitOf(char16_t AChar) noexcept {
  if (AChar >= u'0' && AChar <= u'9') return AChar - u'0';
  const auto Letter = static_cast<unsigned>(AChar | 0x20) - u'a';
  return AChar < 0x80 && Letter < 6 ? Letter + 10 : 99;
}

bool SkipHexPrefix(std::u16string_view& AText) noexcept {
  if (Skip(AText, u'$') || Skip(AText, u'x') || Skip(AText, u'X')) return true;
  if (!AText.starts_with(u"0x") && !AText.starts_with(u"0X")) return false;
  AText.remove_prefix(2);
  return true;
}

// Reads an integer of T's width; hexadecimal digits may fill it, decimal ones stay in T's range.
template <std::signed_integral T>
bool TryRead(std::u16string_view AText, T& AValue) noexcept {
  using TUnsigned = std::make_unsigned_t<T>;
  SkipBlanks(AText);
  const bool Negative = SkipMinus(AText);
  const bool Hex = SkipHexPrefix(AText);
  const unsigned Base = Hex ? 16 : 10;
  const TUnsigned Limit = Hex ? std::numeric_limits<TUnsigned>::max()
                              : static_cast<TUnsigned>(std::numeric_limits<T>::max()) + (Negative ? 1U : 0U);
  TUnsigned Sum = 0;
  for (const char16_t c : AText) {
    const unsigned Digit = DigitOf(c);
    if (Digit >= Base || Sum > (Limit - Digit) / Base) return false;
    Sum = static_cast<TUnsigned>(Sum * Base + Digit);
  }
  if (AText.empty()) return false;
  AValue = static_cast<T>(Negative ? TUnsigned{0} - Sum : Sum);
  return true;
}

template <std::signed_integral T>
T Read(std::u16string_view AText) {
  T Result = 0;
  if (!TryRead(AText, Result)) throw EConvertError(Quoted(AText, u"is not a valid integer value"));
  return Result;
}

}  // namespace

UnicodeString detail::SignedToStr(Int64 AValue) {
  std::array<char, 24> Buffer;
  return Widen({Buffer.data(), std::to_chars(Buffer.begin(), Buffer.end(), AValue).ptr});
}

UnicodeString detail::UnsignedToStr(UInt64 AValue) {
  std::array<char, 24> Buffer;
  return Widen({Buffer.data(), std::to_chars(Buffer.begin(), Buffer.end(), AValue).ptr});
}

UnicodeString detail::UnsignedToHex(UInt64 AValue, Integer ADigits) {
  std::u16string Result;
  for (; AValue != 0 || Result.empty(); AValue >>= 4U) Result += u"0123456789ABCDEF"[AValue & 15U];
  if (static_cast<Integer>(Result.size()) < ADigits) Result.resize(static_cast<std::size_t>(ADigits), u'0');
  std::reverse(Result.begin(), Result.end());
  return Result;
}

Integer StrToInt(std::u16string_view AText) { return Read<Integer>(AText); }
Int64 StrToInt64(std::u16string_view AText) { return Read<Int64>(AText); }
bool TryStrToInt(std::u16string_view AText, Integer& AValue) noexcept { return TryRead(AText, AValue); }
bool TryStrToInt64(std::u16string_view AText, Int64& AValue) noexcept { return TryRead(AText, AValue); }

Integer StrToIntDef(std::u16string_view AText, Integer ADefault) noexcept {
  TryRead(AText, ADefault);
  return ADefault;
}

Int64 StrToInt64Def(std::u16string_view AText, Int64 ADefault) noexcept {
  TryRead(AText, ADefault);
  return ADefault;
}

// --------------------------------------------------------------------------------------------- floats from text

namespace {

// Turns the text of a float, piece by piece, into the form that std::from_chars reads.
class TFloatReader {
 public:
  TFloatReader(std::u16string_view AText, const TFormatSettings& ASettings) : FRest(AText), FSettings(ASettings) {}

  bool Read(Extended& AValue) {
    SkipBlanks(FRest);
    if (SkipMinus(FRest)) FPlain += '-';
    const std::size_t Before = FPlain.size();
    if (!ReadWhole()) return false;
    if (Skip(FRest, FSettings.DecimalSeparator)) {
      FPlain += '.';
      ReadDigits();
    }
    if (FPlain.size() - Before < 1 || FPlain.substr(Before) == ".") return false;
    if (!ReadExponent()) return false;
    SkipBlanks(FRest);
    if (!FRest.empty()) return false;
    Extended Result = 0;
    const auto Failure = std::from_chars(FPlain.data(), FPlain.data() + FPlain.size(), Result).ec;
    if (Failure == std::errc::result_out_of_range && !ReadNearZero(Result)) return false;
    if (Failure != std::errc() && Failure != std::errc::result_out_of_range) return false;
    AValue = Result;
    return true;
  }

 private:
  // A number too small for a normal float is one still, which from_chars doesn't tell from one that is too large.
  bool ReadNearZero(Extended& AValue) const {
    static const locale_t Plain = ::newlocale(LC_ALL_MASK, "C", nullptr);
    AValue = ::strtold_l(FPlain.c_str(), nullptr, Plain);
    return std::fabs(AValue) < 1;
  }
  std::size_t ReadDigits() {
    std::size_t Count = 0;
    for (; !FRest.empty() && DigitOf(FRest.front()) < 10; ++Count) {
      FPlain += static_cast<char>(FRest.front());
      FRest.remove_prefix(1);
    }
    return Count;
  }
  bool ReadWhole() {
    std::size_t Group = ReadDigits();
    if (FSettings.ThousandSeparator == FSettings.DecimalSeparator || Group == 0 || Group > 3) return true;
    bool Grouped = false;
    while (Skip(FRest, FSettings.ThousandSeparator)) {
      Grouped = true;
      if ((Group = ReadDigits()) != 3) return false;
    }
    return !Grouped || FRest.starts_with(FSettings.DecimalSeparator);
  }
  bool ReadExponent() {
    if (!Skip(FRest, u'E') && !Skip(FRest, u'e')) return true;
    FPlain += 'e';
    if (SkipMinus(FRest)) FPlain += '-';
    return ReadDigits() != 0;
  }

  std::u16string_view FRest;
  const TFormatSettings& FSettings;
  std::string FPlain;
};

}  // namespace

bool TryStrToFloat(std::u16string_view AText, Extended& AValue, const TFormatSettings& ASettings) {
  return TFloatReader(AText, ASettings).Read(AValue);
}

bool TryStrToFloat(std::u16string_view AText, Extended& AValue) {
  return TryStrToFloat(AText, AValue, *SharedFormatSettings());
}

Extended StrToFloat(std::u16string_view AText, const TFormatSettings& ASettings) {
  Extended Result = 0;
  if (!TryStrToFloat(AText, Result, ASettings))
    throw EConvertError(Quoted(AText, u"is not a valid floating point value"));
  return Result;
}

Extended StrToFloat(std::u16string_view AText) { return StrToFloat(AText, *SharedFormatSettings()); }

// --------------------------------------------------------------------------------------------- text from floats

namespace {

// A finite number as decimal digits: 0.Digits times 10 to the power Point. Zero has no digits.
//
// 60 digits tell a value from a half that it merely comes near; so rounding looks at decimal digits and happens once.
class TDecimal {
 public:
  explicit TDecimal(Extended AValue) : FNegative(AValue < 0) {
    std::array<char, 80> Buffer;
    const auto End = std::to_chars(Buffer.begin(), Buffer.end(), std::fabs(AValue), std::chars_format::scientific, 59);
    const std::string_view Text(Buffer.data(), End.ptr);
    const auto Mark = Text.find('e');
    FDigits = std::string(1, Text.front()) + std::string(Text.substr(2, Mark - 2));
    const auto Sign = Mark + (Text[Mark + 1] == '+' ? 2U : 1U);
    std::from_chars(Text.data() + Sign, End.ptr, FPoint);
    ++FPoint;
    Strip();
  }

  [[nodiscard]] bool IsNegative() const noexcept { return FNegative && !FDigits.empty(); }
  [[nodiscard]] int Point() const noexcept { return FDigits.empty() ? 1 : FPoint; }
  [[nodiscard]] int Count() const noexcept { return static_cast<int>(FDigits.size()); }
  /// The digit at APlace, from 0; 0 outside of the digits.
  [[nodiscard]] char16_t Digit(int APlace) const noexcept {
    return static_cast<char16_t>(APlace >= 0 && APlace < Count() ? FDigits[static_cast<std::size_t>(APlace)] : '0');
  }
  /// Keeps that many digits, halves away from zero. A negative number of digits leaves nothing.
  void Round(int AKeep) {
    if (AKeep >= Count()) return;
    const bool Up = AKeep >= 0 && Digit(AKeep) >= u'5';
    FDigits.resize(static_cast<std::size_t>(std::max(AKeep, 0)));
    if (Up) Increment();
    Strip();
  }

 private:
  void Strip() {
    while (!FDigits.empty() && FDigits.back() == '0') FDigits.pop_back();
  }
  void Increment() {
    while (!FDigits.empty() && FDigits.back() == '9') FDigits.pop_back();
    if (!FDigits.empty()) {
      ++FDigits.back();
    } else {
      FDigits = "1";
      ++FPoint;
    }
  }

  bool FNegative;
  int FPoint = 0;
  std::string FDigits;
};

struct TFloatStyle {
  int Precision;
  int Digits;
  const TFormatSettings& Settings;
};

// ADecimals of -1: as many as there are.
UnicodeString Plain(const TDecimal& AValue, int ADecimals, bool AGroup, const TFormatSettings& ASettings) {
  UnicodeString Result;
  const int Whole = std::max(AValue.Point(), 1);
  const int Lead = AValue.Point() - Whole;  // zeros in front of the digits, negated
  for (int i = 0; i < Whole; ++i) {
    if (AGroup && i > 0 && (Whole - i) % 3 == 0) Result += ASettings.ThousandSeparator;
    Result += AValue.Digit(Lead + i);
  }
  const int Decimals = ADecimals < 0 ? std::max(AValue.Count() - AValue.Point(), 0) : ADecimals;
  if (Decimals > 0) Result += ASettings.DecimalSeparator;
  for (int i = 0; i < Decimals; ++i) Result += AValue.Digit(Lead + Whole + i);
  return Result;
}

UnicodeString Scientific(const TDecimal& AValue, int ACount, const char16_t* APlus, const TFloatStyle& AStyle) {
  UnicodeString Result(AValue.Digit(0));
  if (ACount > 1) Result += AStyle.Settings.DecimalSeparator;
  for (int i = 1; i < ACount; ++i) Result += AValue.Digit(i);
  const int Exponent = AValue.Point() - 1;
  const UnicodeString Text = IntToStr(std::abs(Exponent));
  Result += Exponent < 0 ? u"E-" : APlus;
  return Result + StringOfChar(u'0', std::clamp(AStyle.Digits, 0, 4) - Text.Length()) + Text;
}

UnicodeString General(TDecimal AValue, const TFloatStyle& AStyle) {
  AValue.Round(AStyle.Precision);
  if (AValue.Point() > AStyle.Precision || AValue.Point() < -3) return Scientific(AValue, AValue.Count(), u"E", AStyle);
  return Plain(AValue, -1, false, AStyle.Settings);
}

UnicodeString Fixed(TDecimal& AValue, bool AGroup, const TFloatStyle& AStyle) {
  const int Decimals = std::clamp(AStyle.Digits, 0, 18);
  if (AValue.Point() > AStyle.Precision) return General(AValue, {AStyle.Precision, 0, AStyle.Settings});
  AValue.Round(std::min(AValue.Point() + Decimals, AStyle.Precision));
  return Plain(AValue, Decimals, AGroup, AStyle.Settings);
}

UnicodeString Unsigned(TDecimal& AValue, TFloatFormat AFormat, const TFloatStyle& AStyle) {
  switch (AFormat) {
    case ffExponent: AValue.Round(AStyle.Precision); return Scientific(AValue, AStyle.Precision, u"E+", AStyle);
    case ffFixed: return Fixed(AValue, false, AStyle);
    case ffNumber: return Fixed(AValue, true, AStyle);
    case ffCurrency: return AStyle.Settings.CurrencyString + Fixed(AValue, true, AStyle);
    case ffGeneral: break;
  }
  return General(AValue, AStyle);
}

}  // namespace

UnicodeString FloatToStrF(
    Extended AValue, TFloatFormat AFormat, Integer APrecision, Integer ADigits, const TFormatSettings& ASettings) {
  if (std::isnan(AValue)) return u"NAN";
  if (std::isinf(AValue)) return AValue < 0 ? u"-INF" : u"INF";
  TDecimal Decimal(AValue);
  UnicodeString Result = Unsigned(Decimal, AFormat, {std::clamp(APrecision, 1, 18), ADigits, ASettings});
  return Decimal.IsNegative() ? u'-' + Result : Result;
}

UnicodeString FloatToStrF(Extended AValue, TFloatFormat AFormat, Integer APrecision, Integer ADigits) {
  return FloatToStrF(AValue, AFormat, APrecision, ADigits, *SharedFormatSettings());
}

UnicodeString FloatToStr(Extended AValue, const TFormatSettings& ASettings) {
  return FloatToStrF(AValue, ffGeneral, 15, 0, ASettings);
}

UnicodeString FloatToStr(Extended AValue) { return FloatToStr(AValue, *SharedFormatSettings()); }

UnicodeString BoolToStr(bool AValue, bool AUseWords) {
  if (AUseWords) return AValue ? u"True" : u"False";
  return AValue ? u"-1" : u"0";
}

}  // namespace zq
