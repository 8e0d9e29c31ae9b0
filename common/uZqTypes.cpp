#include "common/uZqTypes.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <optional>
#include <span>
#include <string>

#include "runtime/core/start_count.h"
#include "runtime/core/utf8.h"
#include "runtime/io/streams.h"
#include "runtime/text/datetime.h"
#include "runtime/text/format.h"
#include "runtime/text/format_settings.h"
#include "runtime/text/numbers.h"
#include "runtime/values/typeinfo.h"

namespace zq {

// ---- Encodings and code pages ---------------------------------------------------------------------------------------

namespace {

constexpr Word cUtf16LE = 1200;
constexpr Word cUtf8 = 65001;

struct TFlags {
  Cardinal ToUnicode;
  Cardinal FromUnicode;
};

// Code page 0 goes by the page that it stands for: the page decides which flags it bears. UTF-8 would take some, but is
// given none.
TFlags FlagsOf(Word ACodePage) noexcept {
  const TCodePage* const Page = FindCodePage(ActualCodePage(ACodePage));
  if (Page != nullptr && (Page->TakesNoFlags() || Page->Kind == TPageKind::Utf8)) return {0, 0};
  return {MB_ERR_INVALID_CHARS, WC_COMPOSITECHECK | WC_DEFAULTCHAR | WC_SEPCHARS | WC_DISCARDNS};
}

const Byte* BytesOf(const RawByteString& AText) noexcept { return reinterpret_cast<const Byte*>(AText.data()); }
Byte* BytesOf(RawByteString& AText) noexcept { return reinterpret_cast<Byte*>(AText.data()); }

Integer Checked(Integer ACount) {
  if (ACount == 0) RaiseLastOSError();
  return ACount;
}

}  // namespace

UnicodeString TZqEncoding::ConvertA(const AnsiString& ASource) { return ConvertA(ASource, 0); }

UnicodeString TZqEncoding::ConvertA(const RawByteString& ASource, Word ASourceCodePage) {
  return ConvertA(BytesOf(ASource), ASource.Length(), ASourceCodePage);
}

UnicodeString TZqEncoding::ConvertA(const Byte* ASource, Integer ASourceByteCnt, Word ASourceCodePage) {
  UnicodeString Result;
  if (ASource == nullptr || ASourceByteCnt == 0) return Result;
  const Integer Needed = Checked(ConvertA(ASource, ASourceByteCnt, ASourceCodePage, nullptr, 0));
  Result.SetLength(Needed);
  Checked(ConvertA(ASource, ASourceByteCnt, ASourceCodePage, Result.data(), Needed));
  if (ASourceByteCnt == -1) Result.SetLength(Needed - 1);
  return Result;
}

RawByteString TZqEncoding::ConvertA(
    const Byte* ASource, Integer ASourceByteCnt, Word ASourceCodePage, Word ADestCodePage) {
  return ConvertW(ConvertA(ASource, ASourceByteCnt, ASourceCodePage), ADestCodePage);
}

Integer TZqEncoding::ConvertA(
    const Byte* ASource, Integer ASourceByteCnt, Word ASourceCodePage, WideChar* ADest, Integer ADestCharCnt) {
  if (ASource == nullptr || ASourceByteCnt == 0) return 0;
  const auto* const Source = reinterpret_cast<const char*>(ASource);
  // The service's set-up would cost more than a short text, so UTF-8 that is sure to fit goes straight to the codec.
  if (ASourceCodePage == cUtf8 && ADest != nullptr && ASourceByteCnt > 0 && ADestCharCnt >= ASourceByteCnt)
    return static_cast<Integer>(utf8::Decode(Source, static_cast<std::size_t>(ASourceByteCnt), ADest));
  return MultiByteToWideChar(
      ASourceCodePage, FlagsOf(ASourceCodePage).ToUnicode, Source, ASourceByteCnt, ADest, ADestCharCnt);
}

RawByteString TZqEncoding::ConvertW(const UnicodeString& ASource, Word ADestCodePage) {
  return ConvertW(ASource.data(), ASource.Length(), ADestCodePage);
}

RawByteString TZqEncoding::ConvertW(const WideChar* ASource, Integer ASourceCharCnt, Word ADestCodePage) {
  RawByteString Result;
  if (ASourceCharCnt == 0) return Result;
  const Integer Needed = Checked(ConvertW(ASource, ASourceCharCnt, nullptr, 0, ADestCodePage));
  Result.SetLength(Needed);
  Checked(ConvertW(ASource, ASourceCharCnt, BytesOf(Result), Needed, ADestCodePage));
  SetCodePage(Result, ADestCodePage, false);
  return Result;
}

Integer TZqEncoding::ConvertW(
    const WideChar* ASource, Integer ASourceCharCnt, Byte* ADest, Integer ADestByteCnt, Word ADestCodePage) {
  auto* const Dest = reinterpret_cast<char*>(ADest);
  if (ADestCodePage == cUtf8 && ASource != nullptr && ADest != nullptr && ASourceCharCnt > 0 &&
      ADestByteCnt / 3 >= ASourceCharCnt)
    return static_cast<Integer>(utf8::Encode(ASource, static_cast<std::size_t>(ASourceCharCnt), Dest));
  return WideCharToMultiByte(
      ADestCodePage, FlagsOf(ADestCodePage).FromUnicode, ASource, ASourceCharCnt, Dest, ADestByteCnt);
}

namespace {

Integer BufferCount(NativeUInt ASize) {
  Assert(ASize <= static_cast<NativeUInt>(std::numeric_limits<Integer>::max()));
  return static_cast<Integer>(ASize);
}

RawByteString FromUtf16(const UnicodeString& AText, Word ACodePage) {
  RawByteString Result;
  Result.SetLength(TZqEncoding::ConvertW(AText.data(), AText.Length(), nullptr, 0, ACodePage));
  Result.SetLength(TZqEncoding::ConvertW(AText.data(), AText.Length(), BytesOf(Result), Result.Length(), ACodePage));
  return Result;
}

}  // namespace

RawByteString TZqEncoding::ConvertB(const void* ABuffer, NativeUInt ABufSize, Word ABufCodePage, Word AResultCodePage) {
  const TCodePage* const ResultPage = FindCodePage(AResultCodePage);
  Assert(ResultPage == nullptr || ResultPage->UnitSize() == 1);
  RawByteString Result;
  if (ABufCodePage == AResultCodePage) {
    Result.Str().assign(static_cast<const char*>(ABuffer), ABufSize);
  } else if (ABufCodePage == cUtf16LE) {
    if (ABufSize / 2 <= static_cast<NativeUInt>(std::numeric_limits<Integer>::max()))
      Result = FromUtf16(ConvertB(ABuffer, ABufSize, ABufCodePage), AResultCodePage);
  } else {
    Result = ConvertA(static_cast<const Byte*>(ABuffer), BufferCount(ABufSize), ABufCodePage, AResultCodePage);
  }
  SetCodePage(Result, AResultCodePage, false);
  return Result;
}

UnicodeString TZqEncoding::ConvertB(const void* ABuffer, NativeUInt ABufSize, Word ABufCodePage) {
  if (ABufCodePage != cUtf16LE) return ConvertA(static_cast<const Byte*>(ABuffer), BufferCount(ABufSize), ABufCodePage);
  UnicodeString Result;
  Result.SetLength(BufferCount(ABufSize / 2));
  if (!Result.IsEmpty()) std::memcpy(Result.data(), ABuffer, Result.size() * 2);  // the buffer needn't be aligned
  return Result;
}

Word ZqCodePage(const UnicodeString& AName) {
  if (AName.IsEmpty()) return 0;
  if (const TCodePage* const Page = FindCodePage(AName)) return Page->Number;
  throw Exception(u"No CodePage ID found for %s!", {AName});
}

UnicodeString ZqCodePage(Word ACodePage) {
  const TCodePage* const Page = FindCodePage(ACodePage);
  if (Page == nullptr || Page->Name().empty()) throw Exception(u"No CodePage Name found for %d!", {ACodePage});
  return Page->Name();
}

namespace {

struct TDetected {
  Word CodePage;
  Integer MarkSize;
};

TDetected Detect(std::span<const Byte> ABytes) noexcept {
  if (const TCodePage* const Page = FindCodePageByMark(ABytes))
    return {Page->Number, static_cast<Integer>(Page->Mark.size())};
  if (ABytes.size() >= 3 && ABytes[0] != 0 && ABytes[1] == 0) return {cUtf16LE, 0};
  return {0, 0};
}

}  // namespace

Word ZqGetCodePage(const void* ABuffer, Integer ASize) {
  return Detect({static_cast<const Byte*>(ABuffer), static_cast<std::size_t>(std::max(ASize, 0))}).CodePage;
}

Word ZqGetCodePage(TStream* AStream) {
  Assert(AStream != nullptr);
  const Int64 Start = AStream->Position();
  Byte Head[4];
  const auto Count = static_cast<std::size_t>(AStream->Read(Head, sizeof(Head)));
  const TDetected Detected = Detect(std::span(Head).first(Count));
  AStream->SetPosition(Start + Detected.MarkSize);
  return Detected.CodePage;
}

namespace {

// The byte of code page 0 that AChar has there, AChar if it has none.
WideChar AnsiByteOf(WideChar AChar) noexcept {
  char Ansi = 0;
  const Integer Count = LocaleCharsFromUnicode(0, WC_NO_BEST_FIT_CHARS, &AChar, 1, &Ansi, 1, "", nullptr);
  return Count == 1 && Ansi != 0 ? static_cast<Byte>(Ansi) : AChar;
}

}  // namespace

WideString ZqNormalizeString(const WideString& AValue, TNorm_Form AForm) {
  const auto Normalized = [&](WideChar* ADest, Integer ACount) {
    const Integer Written = NormalizeString(static_cast<int>(AForm), AValue.data(), AValue.Length(), ADest, ACount);
    if (Written < 1) throw Exception(uZqTypes::_SNormalizeFailure);
    return Written;
  };
  WideString Result;
  Result.SetLength(Normalized(nullptr, 0));
  Result.SetLength(Normalized(Result.data(), Result.Length()));
  if (AForm == nfD)
    for (WideChar& Unit : Result)
      if (Unit > 127) Unit = AnsiByteOf(Unit);
  return Result;
}

WideString ZqSimplifyString(const WideString& AValue) {
  WideString Result;
  for (const WideChar Unit : AValue) Result += ZqNormalizeString(WideString(1, Unit), nfD)[1];
  return Result;
}

namespace {

template <class TChar>
TChar* NewCopy(std::basic_string_view<TChar> AText) {
  const std::size_t Size = AText.size() * sizeof(TChar);
  auto* const Result = static_cast<TChar*>(GetMem(Size + sizeof(TChar)));
  std::memcpy(Result, AText.data(), Size);
  Result[AText.size()] = TChar();
  return Result;
}

}  // namespace

AnsiChar* ZqStrNew(const AnsiString& AValue) { return NewCopy(AValue.View()); }
WideChar* ZqStrNew(const WideString& AValue) { return AValue.IsEmpty() ? nullptr : NewCopy(AValue.View()); }
AnsiChar* ZqStrNewA(const AnsiString& AValue) { return ZqStrNew(AValue); }
AnsiChar* ZqStrNewA(const WideString& AValue) { return ZqStrNew(AnsiString(TZqEncoding::ConvertW(AValue, 0))); }
WideChar* ZqStrNewW(const AnsiString& AValue) { return ZqStrNew(WideString(TZqEncoding::ConvertA(AValue))); }
WideChar* ZqStrNewW(const WideString& AValue) { return ZqStrNew(AValue); }
void ZqStrDispose(AnsiChar* AValue) noexcept { FreeMem(AValue); }
void ZqStrDispose(WideChar* AValue) noexcept { FreeMem(AValue); }

// ---- Type kinds -----------------------------------------------------------------------------------------------------

namespace {

constexpr TVarType cNoVarType = 0xFFFF;

struct TKindFacts {
  TZqMainTypeKind Main;
  TVarType VarType;
};

constexpr TEnumTable<TZqTypeKind, TKindFacts, 36> cKindFacts{{
    {mtkUnknown, varEmpty},      // rtkUnknown
    {mtkInteger, varByte},       // rtkByte
    {mtkInteger, varWord},       // rtkWord
    {mtkInteger, varLongWord},   // rtkLongWord
    {mtkInteger, varUInt64},     // rtkUInt64
    {mtkInteger, varShortInt},   // rtkShortInt
    {mtkInteger, varSmallint},   // rtkSmallInt
    {mtkInteger, varInteger},    // rtkLongInt
    {mtkInteger, varInt64},      // rtkInt64
    {mtkFloat, varSingle},       // rtkSingle
    {mtkFloat, varDouble},       // rtkDouble
    {mtkFloat, varCurrency},     // rtkExtended
    {mtkString, varString},      // rtkChar
    {mtkString, varString},      // rtkAChar
    {mtkString, varUString},     // rtkWChar
    {mtkString, varString},      // rtkString
    {mtkString, varString},      // rtkAString
    {mtkString, varUString},     // rtkWString
    {mtkBoolean, varBoolean},    // rtkBoolean
    {mtkInteger, varInteger},    // rtkEnumeration
    {mtkInteger, varDate},       // rtkSet
    {mtkDateTime, varDate},      // rtkDate
    {mtkDateTime, varDate},      // rtkTime
    {mtkDateTime, varDate},      // rtkDatetime
    {mtkOther, varVariant},      // rtkVariant
    {mtkArray, cNoVarType},      // rtkArray
    {mtkArray, cNoVarType},      // rtkDynArray
    {mtkStructure, cNoVarType},  // rtkRecord
    {mtkStructure, varObject},   // rtkObject
    {mtkOther, varUnknown},      // rtkInterface
    {mtkOther, cNoVarType},      // rtkPointer
    {mtkOther, cNoVarType},      // rtkMethod
    {mtkOther, cNoVarType},      // rtkProcedure
    {mtkOther, cNoVarType},      // rtkException
    {mtkOther, cNoVarType},      // rtkClass
    {mtkOther, cNoVarType},      // rtkClassRef
}};

// Of a number that is no kind, too: it came from a cast, or from a newer module.
constexpr TKindFacts FactsOf(TZqTypeKind AKind) noexcept {
  return AKind <= rtkClassRef ? cKindFacts[AKind] : TKindFacts{mtkUnknown, cNoVarType};
}

struct TVarTypeKind {
  TVarType VarType;
  TZqTypeKind Kind;
};

constexpr TVarTypeKind cVarTypeKinds[] = {
    {varSmallint, rtkSmallInt},
    {varInteger, rtkLongInt},
    {varSingle, rtkSingle},
    {varDouble, rtkDouble},
    {varCurrency, rtkExtended},
    {varDate, rtkDatetime},
    {varOleStr, rtkWString},
    {varDispatch, rtkInterface},
    {varBoolean, rtkBoolean},
    {varVariant, rtkVariant},
    {varUnknown, rtkInterface},
    {varDecimal, rtkDouble},
    {varShortInt, rtkShortInt},
    {varByte, rtkByte},
    {varWord, rtkWord},
    {varLongWord, rtkLongWord},
    {varInt64, rtkInt64},
    {varUInt64, rtkUInt64},
    {varStrArg, rtkWString},
    {varString, rtkString},
    {varAny, rtkVariant},
    {varUString, rtkWString},
};

// By the number of the variant type; rtkUnknown where none is listed.
constexpr auto cKindsByVarType = [] {
  std::array<TZqTypeKind, varUString + 1> Result{};
  for (const TVarTypeKind& Row : cVarTypeKinds) Result[Row.VarType] = Row.Kind;
  return Result;
}();

constexpr std::array<TZqTypeKind, 22> cKindsByTypeKind{
    rtkUnknown,      // tkUnknown
    rtkLongInt,      // tkInteger
    rtkChar,         // tkChar
    rtkEnumeration,  // tkEnumeration
    rtkExtended,     // tkFloat
    rtkString,       // tkString
    rtkSet,          // tkSet
    rtkClass,        // tkClass
    rtkMethod,       // tkMethod
    rtkWChar,        // tkWChar
    rtkAString,      // tkLString
    rtkWString,      // tkWString
    rtkVariant,      // tkVariant
    rtkArray,        // tkArray
    rtkRecord,       // tkRecord
    rtkInterface,    // tkInterface
    rtkInt64,        // tkInt64
    rtkDynArray,     // tkDynArray
    rtkWString,      // tkUString
    rtkClassRef,     // tkClassRef
    rtkPointer,      // tkPointer
    rtkProcedure,    // tkProcedure
};

}  // namespace

TZqMainTypeKind ZqMainTypeKind(TVarType AVarType) noexcept {
  const TZqTypeKind Kind = ZqTypeKind(AVarType);
  return Kind == rtkVariant ? mtkUnknown : ZqMainTypeKind(Kind);
}

TZqMainTypeKind ZqMainTypeKind(TZqTypeKind AKind) noexcept { return FactsOf(AKind).Main; }

TZqTypeKind ZqTypeKind(TVarType AVarType) noexcept {
  if ((AVarType & varArray) != 0) return rtkDynArray;
  return AVarType < cKindsByVarType.size() ? cKindsByVarType[AVarType] : rtkUnknown;
}

TZqTypeKind ZqTypeKind(TTypeKind AKind) {
  const auto Ordinal = static_cast<std::size_t>(AKind);
  if (Ordinal < cKindsByTypeKind.size()) return cKindsByTypeKind[Ordinal];
  const UnicodeString Name = GetEnumName(TypeInfo<TTypeKind>(), static_cast<Integer>(Ordinal));
  AssertionFailed(Format(u"The type %s cannot be converted to a TZqTypeKind!", {Name}));
}

TVarType ZqTypeKindToVarType(TZqTypeKind AKind) {
  const TVarType Result = FactsOf(AKind).VarType;
  if (Result == cNoVarType) throw Exception(u"The given datatype cannot be converted to a Variant Type!");
  return Result;
}

bool ZqIsSimpleTypeKind(TTypeKind AKind) noexcept {
  constexpr TSet<TTypeKind> cSimple{tkInteger, tkChar, tkEnumeration, tkFloat, tkString, tkSet, tkWChar, tkLString,
      tkWString, tkVariant, tkInt64, tkUString};
  return cSimple.Contains(AKind);
}

bool ZqIsSimpleTypeKind(TZqTypeKind AKind) noexcept { return TZqSimpleTypeKind::Contains(AKind); }

bool ZqIsSimpleTypeKind(TZqMainTypeKind AKind) noexcept { return TSubrange<mtkInteger, mtkDateTime>::Contains(AKind); }

// ---- Variants, strictly ---------------------------------------------------------------------------------------------

namespace {

using TKinds = TSet<TZqTypeKind>;
constexpr TKinds cByteKinds{rtkByte, rtkShortInt};
constexpr TKinds cWordKinds = cByteKinds + TKinds{rtkWord, rtkSmallInt};
constexpr TKinds cLongKinds = cWordKinds + TKinds{rtkLongWord, rtkLongInt};
constexpr TKinds cSingleKinds = cLongKinds + TKinds{rtkSingle};
constexpr TKinds cDoubleKinds = cSingleKinds + TKinds{rtkDouble};

[[noreturn]] void RaiseInvalid(const char16_t* AType) {
  throw EConvertError(UnicodeString(u"The given value is not a valid ") + AType + u" value!");
}

// What AValue's type is accepted for, by whichever kind tells: ADefValue for an unknown one.
template <class TResult, class TKind, class TDefault, class TRead>
TResult Strict(const Variant& AValue, TKind AKind, const TSet<TKind>& AAccepted, const TDefault& ADefValue,
    const char16_t* AType, TRead ARead) {
  if (AKind == TKind()) return static_cast<TResult>(ADefValue);
  if (!AAccepted.Contains(AKind)) RaiseInvalid(AType);
  return static_cast<TResult>(ARead(AValue));
}

template <class TResult, class TDefault, class TRead>
TResult StrictNumber(
    const Variant& AValue, TDefault ADefValue, const TKinds& AAccepted, const char16_t* AType, TRead ARead) {
  return Strict<TResult>(AValue, ZqTypeKind(VarType(AValue)), AAccepted, ADefValue, AType, ARead);
}

template <class TText, class TRead>
TText StrictText(const Variant& AValue, const TText& ADefValue, TRead ARead) {
  const TSet<TZqMainTypeKind> cText{mtkString};
  return Strict<TText>(AValue, ZqMainTypeKind(VarType(AValue)), cText, ADefValue, u"string", ARead);
}

AnsiString ToAnsi(const UnicodeString& AText) { return AnsiString(TZqEncoding::ConvertW(AText, 0)); }

Double VarToDouble(const Variant& AValue) { return static_cast<Double>(VarToReal(AValue)); }

}  // namespace

ShortInt ZqVarShortint(const Variant& AValue, Integer ADefValue) {
  return StrictNumber<ShortInt>(AValue, ADefValue, cByteKinds, u"shortint", VarToInteger);
}

SmallInt ZqVarSmallint(const Variant& AValue, Integer ADefValue) {
  const bool Fits = ZqTypeKind(VarType(AValue)) == rtkLongInt && VarToInteger(AValue) <= 32767;
  const TKinds Accepted = Fits ? cWordKinds + TKinds{rtkLongInt} : cWordKinds;
  return StrictNumber<SmallInt>(AValue, ADefValue, Accepted, u"smallint", VarToInteger);
}

Integer ZqVarLongInt(const Variant& AValue, Integer ADefValue) {
  return StrictNumber<Integer>(AValue, ADefValue, cLongKinds, u"longword", VarToInteger);
}

Integer ZqVarInt(const Variant& AValue, Integer ADefValue) { return ZqVarLongInt(AValue, ADefValue); }

Int64 ZqVarInt64(const Variant& AValue, Integer ADefValue) {
  return StrictNumber<Int64>(AValue, ADefValue, cLongKinds + TKinds{rtkInt64}, u"int64", VarToInt64);
}

Byte ZqVarByte(const Variant& AValue, Integer ADefValue) {
  return StrictNumber<Byte>(AValue, ADefValue, cByteKinds, u"byte", VarToInteger);
}

Word ZqVarWord(const Variant& AValue, Integer ADefValue) {
  return StrictNumber<Word>(AValue, ADefValue, cWordKinds, u"word", VarToInteger);
}

Cardinal ZqVarLongword(const Variant& AValue, Integer ADefValue) {
  return StrictNumber<Cardinal>(AValue, ADefValue, cLongKinds, u"longword", VarToInt64);
}

Single ZqVarSingle(const Variant& AValue, Single ADefValue) {
  return StrictNumber<Single>(AValue, ADefValue, cSingleKinds, u"single", VarToReal);
}

Double ZqVarDouble(const Variant& AValue, Double ADefValue) {
  return StrictNumber<Double>(AValue, ADefValue, cDoubleKinds, u"double", VarToReal);
}

Extended ZqVarExtended(const Variant& AValue, Double ADefValue) {
  return StrictNumber<Extended>(AValue, ADefValue, cDoubleKinds + TKinds{rtkExtended}, u"extended", VarToReal);
}

TDateTime ZqVarDate(const Variant& AValue, TDateTime ADefValue) {
  constexpr TKinds cDates = cDoubleKinds + TKinds{rtkDate, rtkTime, rtkDatetime};
  return StrictNumber<TDateTime>(AValue, ADefValue, cDates, u"datetime", VarToDouble);
}

UnicodeString ZqVarStr(const Variant& AValue, const UnicodeString& ADefValue) {
  return StrictText(AValue, ADefValue, VarToUStr);
}

AnsiString ZqVarStrA(const Variant& AValue, const AnsiString& ADefValue) {
  return StrictText(AValue, ADefValue, [](const Variant& AText) { return ToAnsi(VarToUStr(AText)); });
}

WideString ZqVarStrW(const Variant& AValue, const WideString& ADefValue) {
  return StrictText(AValue, ADefValue, VarToWStr);
}

Boolean ZqVarBool(const Variant& AValue, Boolean ADefValue) {
  switch (ZqMainTypeKind(VarType(AValue))) {
    case mtkUnknown: return ADefValue;
    case mtkInteger: return AValue != Variant(0);
    case mtkString: return ZqStrToBool(VarToUStr(AValue));
    case mtkBoolean: return VarToBool(AValue);
    default: RaiseInvalid(u"boolean");
  }
}

// ---- Variants, converted --------------------------------------------------------------------------------------------

namespace {

// AConvert gives what AValue is by its main kind, nothing where that can't be converted.
template <class TResult, class TDefault, class TConvert>
TResult Converted(
    const Variant& AValue, const TDefault& ADefValue, bool ARaiseError, const char16_t* AType, TConvert AConvert) {
  try {
    const TZqMainTypeKind Kind = ZqMainTypeKind(VarType(AValue));
    if (Kind != mtkUnknown) {
      if (std::optional<TResult> Result = AConvert(Kind)) return *std::move(Result);
      if (ARaiseError) RaiseInvalid(AType);
    }
  } catch (const Exception&) {
    if (ARaiseError) throw;
  }
  return static_cast<TResult>(ADefValue);
}

template <class TResult, class TRead, class TParse>
TResult ToOrdinal(
    const Variant& AValue, Integer ADefValue, bool ARaiseError, const char16_t* AType, TRead ARead, TParse AParse) {
  const auto Convert = [&](TZqMainTypeKind AKind) -> std::optional<TResult> {
    switch (AKind) {
      case mtkInteger: return static_cast<TResult>(ARead(AValue));
      case mtkString: return static_cast<TResult>(AParse(VarToUStr(AValue)));
      case mtkBoolean: return static_cast<TResult>(ZqVarBool(AValue, false));
      default: return std::nullopt;
    }
  };
  return Converted<TResult>(AValue, ADefValue, ARaiseError, AType, Convert);
}

enum class TDates : bool { Invalid, Number };

template <class TResult, class TParse>
TResult ToReal(const Variant& AValue, const auto& ADefValue, bool ARaiseError, const char16_t* AType, TDates ADates,
    TParse AParse) {
  const auto Convert = [&](TZqMainTypeKind AKind) -> std::optional<TResult> {
    if (AKind == mtkString) return static_cast<TResult>(AParse(VarToUStr(AValue)));
    if (AKind == mtkInteger || AKind == mtkFloat || (AKind == mtkDateTime && ADates == TDates::Number))
      return static_cast<TResult>(VarToReal(AValue));
    return std::nullopt;
  };
  return Converted<TResult>(AValue, ADefValue, ARaiseError, AType, Convert);
}

TDateTime ParseDate(const UnicodeString& AText) {
  if (AText.Length() < 10 || AText[5] != u'-' || AText[8] != u'-') return StrToDate(AText);
  TFormatSettings Settings = GetLocaleFormatSettings();
  Settings.ShortDateFormat = u"yyyy-mm-dd";
  Settings.DateSeparator = u'-';
  return StrToDate(AText, Settings);
}

// Text of what is neither text nor an array.
std::optional<UnicodeString> PlainText(const Variant& AValue, TZqMainTypeKind AKind) {
  switch (AKind) {
    case mtkInteger: return IntToStr(VarToInt64(AValue));
    case mtkFloat: return FloatToStr(VarToReal(AValue));
    case mtkBoolean: return BoolToStr(VarToBool(AValue), true);
    case mtkDateTime: return DateTimeToStr(VarToDouble(AValue));
    default: return std::nullopt;
  }
}

UnicodeString ArrayText(const Variant& AArray, const UnicodeString& ADefValue, bool ARaiseError) {
  if (VarArrayDimCount(AArray) != 1) {
    if (ARaiseError) throw EConvertError(u"The given array is not a to-string convertable value!");
    return ADefValue;
  }
  UnicodeString Result;
  const Integer High = VarArrayHighBound(AArray, 1);
  for (Int64 i = VarArrayLowBound(AArray, 1); i <= High; ++i)
    Result += ZqVarToStr(AArray[static_cast<Integer>(i)], ADefValue, ARaiseError) + u"\r\n";
  return Result;
}

}  // namespace

ShortInt ZqVarToShortint(const Variant& AValue, Integer ADefValue, Boolean ARaiseError) {
  return ToOrdinal<ShortInt>(AValue, ADefValue, ARaiseError, u"shortint", VarToInteger, StrToInt);
}

SmallInt ZqVarToSmallint(const Variant& AValue, Integer ADefValue, Boolean ARaiseError) {
  return ToOrdinal<SmallInt>(AValue, ADefValue, ARaiseError, u"smalling", VarToInteger, StrToInt);
}

Integer ZqVarToLongInt(const Variant& AValue, Integer ADefValue, Boolean ARaiseError) {
  return ToOrdinal<Integer>(AValue, ADefValue, ARaiseError, u"LongInt", VarToInteger, StrToInt);
}

Integer ZqVarToInt(const Variant& AValue, Integer ADefValue, Boolean ARaiseError) {
  return ZqVarToLongInt(AValue, ADefValue, ARaiseError);
}

Int64 ZqVarToInt64(const Variant& AValue, Integer ADefValue, Boolean ARaiseError) {
  return ToOrdinal<Int64>(AValue, ADefValue, ARaiseError, u"Int64", VarToInt64, StrToInt64);
}

Byte ZqVarToByte(const Variant& AValue, Integer ADefValue, Boolean ARaiseError) {
  return ToOrdinal<Byte>(AValue, ADefValue, ARaiseError, u"Byte", VarToInteger, StrToInt);
}

Word ZqVarToWord(const Variant& AValue, Integer ADefValue, Boolean ARaiseError) {
  return ToOrdinal<Word>(AValue, ADefValue, ARaiseError, u"Word", VarToInteger, StrToInt);
}

Cardinal ZqVarToLongword(const Variant& AValue, Integer ADefValue, Boolean ARaiseError) {
  return ToOrdinal<Cardinal>(AValue, ADefValue, ARaiseError, u"LongWord", VarToInt64, StrToInt);
}

Single ZqVarToSingle(const Variant& AValue, Single ADefValue, Boolean ARaiseError) {
  return ToReal<Single>(AValue, ADefValue, ARaiseError, u"Single", TDates::Invalid, ZqStrToFloat);
}

Double ZqVarToDouble(const Variant& AValue, Double ADefValue, Boolean ARaiseError) {
  return ToReal<Double>(AValue, ADefValue, ARaiseError, u"Double", TDates::Number, ZqStrToFloat);
}

Extended ZqVarToExtended(const Variant& AValue, Double ADefValue, Boolean ARaiseError) {
  const auto Parse = [](const UnicodeString& AText) { return StrToFloat(AText); };
  return ToReal<Extended>(AValue, ADefValue, ARaiseError, u"Extended", TDates::Number, Parse);
}

TDateTime ZqVarToDate(const Variant& AValue, TDateTime ADefValue, Boolean ARaiseError) {
  return ToReal<Double>(AValue, ADefValue, ARaiseError, u"Date", TDates::Number, ParseDate);
}

Boolean ZqVarToBool(const Variant& AValue, Boolean ADefValue, Boolean ARaiseError) {
  const auto Convert = [&](TZqMainTypeKind AKind) -> std::optional<Boolean> {
    switch (AKind) {
      case mtkInteger: return (VarToInteger(AValue) & 0xFF) != 0;
      case mtkString: return ZqStrToBool(VarToUStr(AValue));
      case mtkBoolean: return VarToBool(AValue);
      default: return std::nullopt;
    }
  };
  return Converted<Boolean>(AValue, ADefValue, ARaiseError, u"Boolean", Convert);
}

UnicodeString ZqVarToStr(const Variant& AValue, const UnicodeString& ADefValue, Boolean ARaiseError) {
  const auto Convert = [&](TZqMainTypeKind AKind) -> std::optional<UnicodeString> {
    if (AKind == mtkString) return VarToUStr(AValue);
    if (AKind == mtkArray) return ArrayText(AValue, ADefValue, ARaiseError);
    return PlainText(AValue, AKind);
  };
  return Converted<UnicodeString>(AValue, ADefValue, ARaiseError, u"String", Convert);
}

AnsiString ZqVarToAStr(const Variant& AValue, const AnsiString& ADefValue, Boolean ARaiseError) {
  const auto Convert = [&](TZqMainTypeKind AKind) -> std::optional<AnsiString> {
    if (AKind == mtkString) return VarToLStr(AValue);
    if (const auto Text = PlainText(AValue, AKind)) return ToAnsi(*Text);
    return std::nullopt;
  };
  return Converted<AnsiString>(AValue, ADefValue, ARaiseError, u"AnsiString", Convert);
}

WideString ZqVarToWStr(const Variant& AValue, const WideString& ADefValue, Boolean ARaiseError) {
  const auto Convert = [&](TZqMainTypeKind AKind) -> std::optional<WideString> {
    if (AKind == mtkString) return VarToWStr(AValue);
    return PlainText(AValue, AKind);
  };
  return Converted<WideString>(AValue, ADefValue, ARaiseError, u"WideString", Convert);
}

Boolean ZqVarIsEmpty(const Variant& AValue) {
  switch (ZqMainTypeKind(VarType(AValue))) {
    case mtkInteger:
    case mtkFloat:
    case mtkDateTime: return AValue == Variant(0);
    case mtkString: return Trim(VarToUStr(AValue)).IsEmpty();
    case mtkBoolean: return false;
    case mtkArray: return VarArrayHighBound(AValue, 1) == -1;
    default: return VarIsEmpty(AValue) || VarIsNull(AValue);
  }
}

Integer ZqVarArrayCount(const Variant& AValue) {
  if (!VarIsArray(AValue)) return 0;
  const Integer High = VarArrayHighBound(AValue, 1);
  return High == std::numeric_limits<Integer>::max() ? High : High + 1;
}

TZqNullableBool ZqNullableBool(const Variant& AValue) {
  if (ZqMainTypeKind(VarType(AValue)) != mtkBoolean) return nbNull;
  return VarToBool(AValue) ? nbYes : nbNo;
}

// ---- Text of Booleans and numbers -----------------------------------------------------------------------------------

namespace {

// The locale's, but with the other decimal separator.
TFormatSettings SwappedSettings() {
  TFormatSettings Result = GetLocaleFormatSettings();
  const bool Point = Result.DecimalSeparator == u'.';
  Result.DecimalSeparator = Point ? u',' : u'.';
  Result.ThousandSeparator = Point ? u'.' : u',';
  return Result;
}

}  // namespace

Boolean ZqStrToBool(const UnicodeString& AValue) noexcept {
  return !AValue.IsEmpty() && CharInSet(AValue[1], TZqAnsiCharSet{'1', 'T', 't', 'Y', 'y'});
}

UnicodeString ZqBoolToStr(Boolean AValue, const UnicodeString& ATrue, const UnicodeString& AFalse) {
  return AValue ? ATrue : AFalse;
}

Extended ZqStrToFloat(const UnicodeString& AValue) {
  Extended Result = 0;
  return TryStrToFloat(AValue, Result) ? Result : StrToFloat(AValue, SwappedSettings());
}

Extended ZqStrToFloatDef(const UnicodeString& AValue, Extended ADefValue) {
  Extended Result = 0;
  if (TryStrToFloat(AValue, Result) || TryStrToFloat(AValue, Result, SwappedSettings())) return Result;
  return ADefValue;
}

namespace {
constinit TStartCount Starts;
}

void uZqTypes::Start() {
  if (!Starts.Begins()) return;
  DescribeType<TZqMainTypeKind>(u"uZqTypes")
      .EnumNames({u"mtkUnknown", u"mtkInteger", u"mtkFloat", u"mtkString", u"mtkBoolean", u"mtkDateTime", u"mtkArray",
          u"mtkStructure", u"mtkOther"});
  DescribeType<TZqTypeKind>(u"uZqTypes")
      .EnumNames({u"rtkUnknown", u"rtkByte", u"rtkWord", u"rtkLongWord", u"rtkUInt64", u"rtkShortInt", u"rtkSmallInt",
          u"rtkLongInt", u"rtkInt64", u"rtkSingle", u"rtkDouble", u"rtkExtended", u"rtkChar", u"rtkAChar", u"rtkWChar",
          u"rtkString", u"rtkAString", u"rtkWString", u"rtkBoolean", u"rtkEnumeration", u"rtkSet", u"rtkDate",
          u"rtkTime", u"rtkDatetime", u"rtkVariant", u"rtkArray", u"rtkDynArray", u"rtkRecord", u"rtkObject",
          u"rtkInterface", u"rtkPointer", u"rtkMethod", u"rtkProcedure", u"rtkException", u"rtkClass", u"rtkClassRef"});
  DescribeType<TZqNullableBool>(u"uZqTypes").EnumNames({u"nbNull", u"nbYes", u"nbNo"});
}

void uZqTypes::Stop() { Starts.Ends(); }

}  // namespace zq
