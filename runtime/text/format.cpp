#include "runtime/text/format.h"

#include <algorithm>
#include <bit>
#include <optional>

#include "runtime/core/exceptions.h"
#include "runtime/text/datetime.h"
#include "runtime/text/encoding.h"
#include "runtime/text/local_time.h"
#include "runtime/text/numbers.h"

namespace zq {

namespace {

constexpr Integer cMostWidth = 0xFFFF;

UnicodeString BytesToText(std::string_view ABytes, Word ACodePage) {
  return TEncoding(ACodePage).GetString(ABytes.data(), ABytes.size());
}

std::optional<UnicodeString> TextOf(const TVarRec& AValue) {
  if (AValue.Enum != nullptr) return detail::EnumText(*AValue.Enum, AValue.VInteger);
  switch (AValue.Kind) {
    case TVarRec::vtWideText: return UnicodeString(AValue.VWideText);
    case TVarRec::vtAnsiText: return BytesToText(AValue.VAnsiText, AValue.CodePage);
    case TVarRec::vtWideChar: return UnicodeString(AValue.VWideChar);
    case TVarRec::vtAnsiChar: return BytesToText({&AValue.VAnsiChar, 1}, 0);
    case TVarRec::vtOther: return AValue.VOther.ToText(AValue.VOther.Value);
    case TVarRec::vtClass: return AValue.VClass.ClassName();
    case TVarRec::vtObject: return AValue.VObject == nullptr ? UnicodeString() : AValue.VObject->ToString();
    default: return std::nullopt;
  }
}

std::optional<UInt64> AddressOf(const TVarRec& AValue) {
  if (AValue.Kind == TVarRec::vtPointer) return std::bit_cast<std::uintptr_t>(AValue.VPointer);
  if (AValue.Kind == TVarRec::vtObject) return std::bit_cast<std::uintptr_t>(AValue.VObject);
  return std::nullopt;
}

// The integer's bits, no wider than its own type, or than an Integer where that is wider.
UInt64 BitsOf(const TVarRec& AValue) {
  if (AValue.Kind == TVarRec::vtUInt64) return AValue.VUInt64;
  const auto Bits = static_cast<UInt64>(AValue.VInteger);
  return AValue.Width > sizeof(Integer) ? Bits : Bits & 0xFFFFFFFFU;
}

class TFormatter {
 public:
  TFormatter(std::u16string_view AFormat, std::span<const TVarRec> AArgs, const TFormatSettings* ASettings)
      : FFormat(AFormat), FRest(AFormat), FArgs(AArgs), FSettings(ASettings) {}

  UnicodeString Run() {
    for (;;) {
      const auto Percent = FRest.find(u'%');
      FResult += FRest.substr(0, Percent);
      if (Percent == std::u16string_view::npos) return std::move(FResult);
      FRest.remove_prefix(Percent + 1);
      if (Skip(u'%')) FResult += u'%';
      else WritePlaceholder();
    }
  }

 private:
  [[noreturn]] void Fail(const UnicodeString& AWhy) const {
    throw EConvertError(u"Format '" + UnicodeString(FFormat) + u"' " + AWhy);
  }
  bool Skip(char16_t AChar) {
    if (!FRest.starts_with(AChar)) return false;
    FRest.remove_prefix(1);
    return true;
  }
  const TVarRec& NextArgument() {
    if (FNext >= FArgs.size()) Fail(u"has no argument " + IntToStr(FNext));
    return FArgs[FNext++];
  }
  // Digits or "*"; nothing where there is neither.
  std::optional<Integer> ReadNumber() {
    Int64 Result = 0;
    if (Skip(u'*')) {
      const TVarRec& Argument = NextArgument();
      if (Argument.Kind == TVarRec::vtUInt64)
        Result = static_cast<Int64>(std::min<UInt64>(Argument.VUInt64, cMostWidth + 1U));
      else if (Argument.Kind == TVarRec::vtInteger) Result = Argument.VInteger;
      else Fail(u"takes an integer for *");
    } else {
      const auto Digits = std::min(FRest.find_first_not_of(u"0123456789"), FRest.size());
      if (Digits == 0) return std::nullopt;
      if (!TryStrToInt64(FRest.substr(0, Digits), Result)) Result = -1;
      FRest.remove_prefix(Digits);
    }
    if (Result < 0 || Result > cMostWidth) Fail(u"has a number out of range");
    return static_cast<Integer>(Result);
  }
  void WritePlaceholder() {
    bool Left = Skip(u'-');
    auto Width = ReadNumber();
    if (Width && !Left && Skip(u':')) {
      FNext = static_cast<std::size_t>(*Width);
      Left = Skip(u'-');
      Width = ReadNumber();
    }
    std::optional<Integer> Precision;
    if (Skip(u'.') && !(Precision = ReadNumber())) Fail(u"has a point without a precision");
    if (FRest.empty()) Fail(u"ends in a placeholder");
    const char16_t Letter = FRest.front();
    FRest.remove_prefix(1);
    const UnicodeString Text = TextFor(Letter, Precision);
    const UnicodeString Blanks = StringOfChar(u' ', Width.value_or(0) - Text.Length());
    FResult += Left ? Text + Blanks : Blanks + Text;
  }
  UnicodeString TextFor(char16_t ALetter, std::optional<Integer> APrecision) {
    const char16_t Letter = ALetter < 0x80 ? static_cast<char16_t>(ALetter | 0x20) : ALetter;
    if (std::u16string_view(u"duxfnmegsp").find(Letter) == std::u16string_view::npos)
      Fail(u"has an unknown placeholder '" + UnicodeString(ALetter) + u"'");
    const TVarRec& Argument = NextArgument();
    std::optional<UnicodeString> Text;
    if (Letter == u's') Text = Shortened(TextOf(Argument), APrecision);
    else if (Letter == u'd' || Letter == u'u' || Letter == u'x') Text = Whole(Letter, Argument, APrecision.value_or(0));
    else if (Letter != u'p') Text = Real(Letter, Argument, APrecision);
    else if (const auto Address = AddressOf(Argument)) Text = IntToHex(*Address, 8);
    if (!Text) Fail(u"doesn't fit argument " + IntToStr(FNext - 1) + u": %" + ALetter);
    return *std::move(Text);
  }
  static std::optional<UnicodeString> Shortened(std::optional<UnicodeString> AText, std::optional<Integer> AMost) {
    if (AText && AMost && AText->Length() > *AMost) AText->SetLength(*AMost);
    return AText;
  }
  static std::optional<UnicodeString> Whole(char16_t ALetter, const TVarRec& AValue, Integer ADigits) {
    if (AValue.Kind != TVarRec::vtInteger && AValue.Kind != TVarRec::vtUInt64) return std::nullopt;
    const UInt64 Bits = BitsOf(AValue);
    if (ALetter == u'x') return IntToHex(Bits, ADigits);
    const bool Negative = ALetter == u'd' && AValue.Kind == TVarRec::vtInteger && AValue.VInteger < 0;
    const UnicodeString Digits = IntToStr(Negative ? UInt64{0} - static_cast<UInt64>(AValue.VInteger) : Bits);
    return (Negative ? u"-" : u"") + StringOfChar(u'0', ADigits - Digits.Length()) + Digits;
  }
  std::optional<UnicodeString> Real(char16_t ALetter, const TVarRec& AValue, std::optional<Integer> APrecision) {
    constexpr Integer cAllDigits = 18;
    if (AValue.Kind != TVarRec::vtExtended) return std::nullopt;
    const TFormatSettings& S = Settings();
    switch (ALetter) {
      case u'e': return FloatToStrF(AValue.VExtended, ffExponent, APrecision.value_or(15), 3, S);
      case u'g': return FloatToStrF(AValue.VExtended, ffGeneral, APrecision.value_or(15), 0, S);
      case u'n': return FloatToStrF(AValue.VExtended, ffNumber, cAllDigits, APrecision.value_or(2), S);
      case u'm':
        return FloatToStrF(AValue.VExtended, ffCurrency, cAllDigits, APrecision.value_or(S.CurrencyDecimals), S);
      default: return FloatToStrF(AValue.VExtended, ffFixed, cAllDigits, APrecision.value_or(2), S);
    }
  }
  // Most formats have no float: the process's settings are fetched for the first one.
  const TFormatSettings& Settings() {
    if (FSettings == nullptr) FSettings = (FShared = SharedFormatSettings()).get();
    return *FSettings;
  }

  std::u16string_view FFormat;
  std::u16string_view FRest;
  std::span<const TVarRec> FArgs;
  std::size_t FNext = 0;
  const TFormatSettings* FSettings;
  std::shared_ptr<const TFormatSettings> FShared;
  UnicodeString FResult;
};

}  // namespace

UnicodeString VarRecText(const TVarRec& AValue) {
  if (auto Text = TextOf(AValue)) return *std::move(Text);
  switch (AValue.Kind) {
    case TVarRec::vtInteger: return IntToStr(AValue.VInteger);
    case TVarRec::vtUInt64: return IntToStr(AValue.VUInt64);
    case TVarRec::vtBoolean: return BoolToStr(AValue.VBoolean, true);
    case TVarRec::vtExtended: return FloatToStr(AValue.VExtended);
    default: return IntToHex(AddressOf(AValue).value_or(0), 8);
  }
}

UnicodeString detail::MomentText(Int64 AUtcMilliseconds) {
  return FormatDateTime(u"yyyy-mm-dd hh:mm:ss:zzz", UnixMillisecondsToDateTime(LocalMilliseconds(AUtcMilliseconds)));
}

UnicodeString detail::ExceptionText(const void* AExceptionPtr) {
  return ExceptionRef(*static_cast<const std::exception_ptr*>(AExceptionPtr)).Message();
}

UnicodeString Format(const UnicodeString& AFormat, std::span<const TVarRec> AArgs, const TFormatSettings& ASettings) {
  return TFormatter(AFormat, AArgs, &ASettings).Run();
}

UnicodeString Format(const UnicodeString& AFormat, std::span<const TVarRec> AArgs) {
  return TFormatter(AFormat, AArgs, nullptr).Run();
}

UnicodeString Format(const UnicodeString& AFormat, TVarArgs AArgs) {
  return Format(AFormat, std::span<const TVarRec>(AArgs.begin(), AArgs.size()));
}

Exception::Exception(const UnicodeString& AFormat, TVarArgs AArgs) : Exception(Format(AFormat, AArgs)) {}

}  // namespace zq
