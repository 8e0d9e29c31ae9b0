#pragma once

#include <array>
#include <string_view>
#include <type_traits>

#include "common/uZqTypes/kinds.h"
#include "runtime/core/api.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/text/code_pages.h"
#include "runtime/text/encoding.h"
#include "runtime/values/typeinfo.h"
#include "runtime/values/values.h"
#include "runtime/values/variants.h"

namespace zq {

class TStream;

namespace uZqTypes {
inline constexpr TResStringRec _SCantLoadNormalizDll{65527, u"Failed to load normaliz.dll!"};
inline constexpr TResStringRec _SCantFindNormalizeString{65528, u"Failed to find the \"NormalizeString\" function!"};
inline constexpr TResStringRec _SNormalizeFailure{65529, u"Failed to normalize the given value"};
inline constexpr TResStringRec _SEncodingNotSupported{65530, u"The specified encoding is not supported!"};

ZQ_API void Start();
ZQ_API void Stop();
}  // namespace uZqTypes

// ---- Encodings and code pages ---------------------------------------------------------------------------------------
// A code page is a plain number. Given to a conversion, 0 is the process's ANSI code page.

inline constexpr std::array<Byte, 3> cZqUTF8 = cUTF8Mark;
inline constexpr std::array<Byte, 2> cZqUTF16BE = cUTF16BEMark;
inline constexpr std::array<Byte, 2> cZqUTF16LE = cUTF16LEMark;
inline constexpr std::array<Byte, 4> cZqUTF32BE = cUTF32BEMark;
inline constexpr std::array<Byte, 4> cZqUTF32LE = cUTF32LEMark;

/// Conversions between bytes of a code page and UTF-16, for any number of threads.
///
/// Those that give a string raise EOSError where the source is no text of the code page or the code page has no
/// converter; 65001, and 0 where it stands for that, replaces malformed pieces by U+FFFD instead. To a code page, what
/// it doesn't have becomes a similar character or "?" without a raise. Those into a caller's buffer never raise.
class ZQ_API TZqEncoding : public TEncoding {
 public:
  TZqEncoding() = delete;

  /// From code page 0.
  [[nodiscard]] static UnicodeString ConvertA(const AnsiString& ASource);
  /// From ASourceCodePage, whatever tag the string bears.
  [[nodiscard]] static UnicodeString ConvertA(const RawByteString& ASource, Word ASourceCodePage);
  /// A count of -1: up to the terminating zero byte.
  [[nodiscard]] static UnicodeString ConvertA(const Byte* ASource, Integer ASourceByteCnt, Word ASourceCodePage);
  /// By way of UTF-16.
  [[nodiscard]] static RawByteString ConvertA(
      const Byte* ASource, Integer ASourceByteCnt, Word ASourceCodePage, Word ADestCodePage);
  /// Into the caller's buffer. Returns the characters written, 0 on failure (also when they don't fit) and for an empty
  /// source; with a null ADest and a count of 0 the characters needed.
  static Integer ConvertA(
      const Byte* ASource, Integer ASourceByteCnt, Word ASourceCodePage, WideChar* ADest, Integer ADestCharCnt);

  [[nodiscard]] static RawByteString ConvertW(const UnicodeString& ASource, Word ADestCodePage);
  /// The result bears ADestCodePage. A count of -1 takes the source up to and with its terminator.
  [[nodiscard]] static RawByteString ConvertW(const WideChar* ASource, Integer ASourceCharCnt, Word ADestCodePage);
  /// Into the caller's buffer. Returns the bytes written, 0 on failure (also when they don't fit); with a null ADest
  /// and a count of 0 the bytes needed.
  static Integer ConvertW(
      const WideChar* ASource, Integer ASourceCharCnt, Byte* ADest, Integer ADestByteCnt, Word ADestCodePage);

  /// From one code page to another; equal ones copy the bytes unchecked. AResultCodePage is none of UTF-16 and UTF-32,
  /// and from other pages than 1200 ABufSize fits an Integer (EAssertionFailed). From 1200 nothing raises: what can't
  /// be converted gives an empty result.
  [[nodiscard]] static RawByteString ConvertB(
      const void* ABuffer, NativeUInt ABufSize, Word ABufCodePage, Word AResultCodePage);
  /// From 1200 the units are copied unchecked; an odd last byte is dropped. Bytes, or units of 1200, that an Integer
  /// can't count raise EAssertionFailed.
  [[nodiscard]] static UnicodeString ConvertB(const void* ABuffer, NativeUInt ABufSize, Word ABufCodePage);
};

/// Number of a charset name without regard to case; 0 for an empty name. Raises Exception for a name that is unknown.
[[nodiscard]] ZQ_API Word ZqCodePage(const UnicodeString& AName);
/// Name of a code page number. Raises Exception for a number that is unknown.
[[nodiscard]] ZQ_API UnicodeString ZqCodePage(Word ACodePage);

/// Code page that the byte order mark at the head of ABuffer tells, or UTF-16 told by the zero byte of its first
/// character; 0 where there is neither. ASize in bytes.
[[nodiscard]] ZQ_API Word ZqGetCodePage(const void* ABuffer, Integer ASize);
/// The same at the stream's position; leaves the stream behind the mark, or where it was if there is none.
[[nodiscard]] ZQ_API Word ZqGetCodePage(TStream* AStream);

/// Form of Unicode normalisation.
enum class TNorm_Form : Byte { nfOther = 0, nfC = 1, nfD = 2, nfKC = 5, nfKD = 6 };
using enum TNorm_Form;

/// Raises Exception (_SNormalizeFailure) where the value can't be normalised, or is empty. In form nfD a character
/// beyond ASCII that has a byte in code page 0 comes back as the value of that byte.
[[nodiscard]] ZQ_API WideString ZqNormalizeString(const WideString& AValue, TNorm_Form AForm);
/// Without accents: of each UTF-16 unit the first character of its decomposition.
[[nodiscard]] ZQ_API WideString ZqSimplifyString(const WideString& AValue);

// Zero-terminated copies; the caller owns them and hands them to the ZqStrDispose of their width. The suffix tells the
// width of the result, which goes through code page 0 where it is not that of the value. A wide copy of nothing is
// null.
[[nodiscard]] ZQ_API AnsiChar* ZqStrNew(const AnsiString& AValue);
[[nodiscard]] ZQ_API WideChar* ZqStrNew(const WideString& AValue);
[[nodiscard]] ZQ_API AnsiChar* ZqStrNewA(const AnsiString& AValue);
[[nodiscard]] ZQ_API AnsiChar* ZqStrNewA(const WideString& AValue);
[[nodiscard]] ZQ_API WideChar* ZqStrNewW(const AnsiString& AValue);
[[nodiscard]] ZQ_API WideChar* ZqStrNewW(const WideString& AValue);
ZQ_API void ZqStrDispose(AnsiChar* AValue) noexcept;
ZQ_API void ZqStrDispose(WideChar* AValue) noexcept;

// ---- Types ----------------------------------------------------------------------------------------------------------

/// Text that is XML.
class ZQ_API ZqXMLString : public UnicodeString {
 public:
  using UnicodeString::UnicodeString;
  ZqXMLString() noexcept = default;
  ZqXMLString(UnicodeString AText) noexcept : UnicodeString(std::move(AText)) {}
};
/// Text that is JSON.
class ZQ_API ZqJSONString : public UnicodeString {
 public:
  using UnicodeString::UnicodeString;
  ZqJSONString() noexcept = default;
  ZqJSONString(UnicodeString AText) noexcept : UnicodeString(std::move(AText)) {}
};
using PZqXMLChar = WideChar*;
using PZqJSONChar = WideChar*;

using TZqAnsiCharSet = TSet<AnsiChar>;
using TDateTimeDynArray = TArray<TDateTime>;
using TValArray = TArray<TValue>;
using PValue = TValue*;
using PZqIntPtr = NativeInt*;
using PZqUIntPtr = NativeUInt*;

/// The values of an enumeration from ALow to AHigh.
template <auto ALow, auto AHigh>
struct TSubrange {
  using TElement = decltype(ALow);
  static constexpr TElement Low = ALow;
  static constexpr TElement High = AHigh;
  [[nodiscard]] static constexpr bool Contains(TElement AValue) noexcept { return AValue >= Low && AValue <= High; }
};

/// One T per value of an enumeration from its first on.
template <class TEnum, class T, std::size_t ACount>
struct TEnumTable {
  T Items[ACount];
  [[nodiscard]] constexpr const T& operator[](TEnum AValue) const noexcept {
    return Items[static_cast<std::size_t>(AValue)];
  }
};

enum class TZqJSONValueType : Byte { jsNull, jsString, jsNumber, jsBool, jsObject, jsArray };
using enum TZqJSONValueType;
using TZqJSONSimpleValueType = TSubrange<jsNull, jsBool>;
inline constexpr TEnumTable<TZqJSONValueType, const WideChar*, 6> ZqJSONValueTypes{
    {u"jsNull", u"jsString", u"jsNumber", u"jsBool", u"jsObject", u"jsArray"}};

enum class TZqNullableBool : Byte { nbNull, nbYes, nbNo };
using enum TZqNullableBool;

// ---- Type kinds -----------------------------------------------------------------------------------------------------

using TZqSimpleTypeKind = TSubrange<rtkByte, rtkVariant>;
using TZqCompoundTypeKind = TSubrange<rtkArray, rtkObject>;
using TZqOtherTypeKind = TSubrange<rtkInterface, rtkClassRef>;
using TZqVariantTypeKind = TSubrange<rtkUnknown, rtkInterface>;

/// Of a variant type; any array is mtkArray.
[[nodiscard]] ZQ_API TZqMainTypeKind ZqMainTypeKind(TVarType AVarType) noexcept;
/// mtkUnknown for a number beyond the kinds.
[[nodiscard]] ZQ_API TZqMainTypeKind ZqMainTypeKind(TZqTypeKind AKind) noexcept;
/// Of a variant type; any array is rtkDynArray, a type that is not listed rtkUnknown.
[[nodiscard]] ZQ_API TZqTypeKind ZqTypeKind(TVarType AVarType) noexcept;
/// Raises EAssertionFailed for an ordinal beyond the enumeration.
[[nodiscard]] ZQ_API TZqTypeKind ZqTypeKind(TTypeKind AKind);
/// Raises Exception for a kind that no variant holds, and for a number beyond the kinds.
[[nodiscard]] ZQ_API TVarType ZqTypeKindToVarType(TZqTypeKind AKind);
[[nodiscard]] ZQ_API bool ZqIsSimpleTypeKind(TTypeKind AKind) noexcept;
[[nodiscard]] ZQ_API bool ZqIsSimpleTypeKind(TZqTypeKind AKind) noexcept;
[[nodiscard]] ZQ_API bool ZqIsSimpleTypeKind(TZqMainTypeKind AKind) noexcept;

// ---- Variants, strictly ---------------------------------------------------------------------------------------------
// ADefValue for Null, Empty and a type that is not known, the value for a compatible type; any other raises
// EConvertError. The members of up to 32 bits, but ZqVarLongword, read an Integer, the others an Int64: what doesn't
// fit that raises EVariantOverflow, what doesn't fit the result is cut to its width.

[[nodiscard]] ZQ_API ShortInt ZqVarShortint(const Variant& AValue, Integer ADefValue);
[[nodiscard]] ZQ_API SmallInt ZqVarSmallint(const Variant& AValue, Integer ADefValue);
[[nodiscard]] ZQ_API Integer ZqVarLongInt(const Variant& AValue, Integer ADefValue);
[[nodiscard]] ZQ_API Integer ZqVarInt(const Variant& AValue, Integer ADefValue);
[[nodiscard]] ZQ_API Int64 ZqVarInt64(const Variant& AValue, Integer ADefValue);
[[nodiscard]] ZQ_API Byte ZqVarByte(const Variant& AValue, Integer ADefValue);
[[nodiscard]] ZQ_API Word ZqVarWord(const Variant& AValue, Integer ADefValue);
[[nodiscard]] ZQ_API Cardinal ZqVarLongword(const Variant& AValue, Integer ADefValue);
[[nodiscard]] ZQ_API Single ZqVarSingle(const Variant& AValue, Single ADefValue);
[[nodiscard]] ZQ_API Double ZqVarDouble(const Variant& AValue, Double ADefValue);
[[nodiscard]] ZQ_API Extended ZqVarExtended(const Variant& AValue, Double ADefValue);
[[nodiscard]] ZQ_API TDateTime ZqVarDate(const Variant& AValue, TDateTime ADefValue);
[[nodiscard]] ZQ_API UnicodeString ZqVarStr(const Variant& AValue, const UnicodeString& ADefValue);
/// Text in code page 0.
[[nodiscard]] ZQ_API AnsiString ZqVarStrA(const Variant& AValue, const AnsiString& ADefValue);
[[nodiscard]] ZQ_API WideString ZqVarStrW(const Variant& AValue, const WideString& ADefValue);
/// An integer is true when it is not 0, a text as by ZqStrToBool.
[[nodiscard]] ZQ_API Boolean ZqVarBool(const Variant& AValue, Boolean ADefValue);

// ---- Variants, converted --------------------------------------------------------------------------------------------
// ADefValue for Null, Empty and a type that is not known. Text is parsed. What can't be converted raises with
// ARaiseError and gives ADefValue without it; nothing raises then. Neither can an integer be converted that doesn't fit
// the Integer, or the Int64, that is read; what doesn't fit the result is cut to its width.

[[nodiscard]] ZQ_API ShortInt ZqVarToShortint(const Variant& AValue, Integer ADefValue, Boolean ARaiseError);
[[nodiscard]] ZQ_API SmallInt ZqVarToSmallint(const Variant& AValue, Integer ADefValue, Boolean ARaiseError);
[[nodiscard]] ZQ_API Integer ZqVarToLongInt(const Variant& AValue, Integer ADefValue, Boolean ARaiseError);
[[nodiscard]] ZQ_API Integer ZqVarToInt(const Variant& AValue, Integer ADefValue, Boolean ARaiseError);
[[nodiscard]] ZQ_API Int64 ZqVarToInt64(const Variant& AValue, Integer ADefValue, Boolean ARaiseError);
[[nodiscard]] ZQ_API Byte ZqVarToByte(const Variant& AValue, Integer ADefValue, Boolean ARaiseError);
[[nodiscard]] ZQ_API Word ZqVarToWord(const Variant& AValue, Integer ADefValue, Boolean ARaiseError);
/// Text is read as a signed number of 32 bits.
[[nodiscard]] ZQ_API Cardinal ZqVarToLongword(const Variant& AValue, Integer ADefValue, Boolean ARaiseError);
[[nodiscard]] ZQ_API Single ZqVarToSingle(const Variant& AValue, Single ADefValue, Boolean ARaiseError);
[[nodiscard]] ZQ_API Double ZqVarToDouble(const Variant& AValue, Double ADefValue, Boolean ARaiseError);
/// Text must bear the current decimal separator; the other members go by ZqStrToFloat.
[[nodiscard]] ZQ_API Extended ZqVarToExtended(const Variant& AValue, Double ADefValue, Boolean ARaiseError);
/// Text is a date as yyyy-mm-dd, on any locale, or in the current format settings.
[[nodiscard]] ZQ_API TDateTime ZqVarToDate(const Variant& AValue, TDateTime ADefValue, Boolean ARaiseError);
/// An integer goes by its low byte, a text as by ZqStrToBool.
[[nodiscard]] ZQ_API Boolean ZqVarToBool(const Variant& AValue, Boolean ADefValue, Boolean ARaiseError);
/// Of an array with one dimension the text of each element, a "\r\n" behind each.
[[nodiscard]] ZQ_API UnicodeString ZqVarToStr(
    const Variant& AValue, const UnicodeString& ADefValue, Boolean ARaiseError);
/// Text in code page 0.
[[nodiscard]] ZQ_API AnsiString ZqVarToAStr(const Variant& AValue, const AnsiString& ADefValue, Boolean ARaiseError);
[[nodiscard]] ZQ_API WideString ZqVarToWStr(const Variant& AValue, const WideString& ADefValue, Boolean ARaiseError);

/// True for Null, Empty, a number or date of 0, a text of blanks and an array whose first dimension ends at -1;
/// never for a Boolean.
[[nodiscard]] ZQ_API Boolean ZqVarIsEmpty(const Variant& AValue);
/// Elements of the first dimension, which is taken to start at 0; 0 for what is no array.
[[nodiscard]] ZQ_API Integer ZqVarArrayCount(const Variant& AValue);
/// nbNull for what is no Boolean.
[[nodiscard]] ZQ_API TZqNullableBool ZqNullableBool(const Variant& AValue);

// ---- Text of Booleans and numbers -----------------------------------------------------------------------------------

/// By the first character alone: true for "1", "T", "t", "Y" and "y".
[[nodiscard]] ZQ_API Boolean ZqStrToBool(const UnicodeString& AValue) noexcept;
[[nodiscard]] ZQ_API UnicodeString ZqBoolToStr(Boolean AValue, const UnicodeString& ATrue, const UnicodeString& AFalse);
/// By the current format settings, and then with the decimal separator that the locale doesn't have. Raises
/// EConvertError when neither fits.
[[nodiscard]] ZQ_API Extended ZqStrToFloat(const UnicodeString& AValue);
[[nodiscard]] ZQ_API Extended ZqStrToFloatDef(const UnicodeString& AValue, Extended ADefValue);

}  // namespace zq
