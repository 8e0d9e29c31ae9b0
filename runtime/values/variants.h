#pragma once

#include <compare>
#include <concepts>
#include <cstddef>
#include <initializer_list>
#include <span>
#include <string_view>
#include <type_traits>
#include <utility>

#include "runtime/core/exceptions.h"
#include "runtime/core/interfaces.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

namespace zq {

/// What a variant holds; an array bears varArray and the type of its elements.
using TVarType = Word;
inline constexpr TVarType varEmpty = 0;
inline constexpr TVarType varNull = 1;
inline constexpr TVarType varSmallint = 2;
inline constexpr TVarType varInteger = 3;
inline constexpr TVarType varSingle = 4;
inline constexpr TVarType varDouble = 5;
inline constexpr TVarType varCurrency = 6;
inline constexpr TVarType varDate = 7;
inline constexpr TVarType varOleStr = 8;
inline constexpr TVarType varDispatch = 9;
inline constexpr TVarType varError = 10;
inline constexpr TVarType varBoolean = 11;
inline constexpr TVarType varVariant = 12;  // only as the type of an array's elements
inline constexpr TVarType varUnknown = 13;
inline constexpr TVarType varDecimal = 14;  // no variant holds one
inline constexpr TVarType varShortInt = 16;
inline constexpr TVarType varByte = 17;
inline constexpr TVarType varWord = 18;
inline constexpr TVarType varLongWord = 19;
inline constexpr TVarType varInt64 = 20;
inline constexpr TVarType varUInt64 = 21;
inline constexpr TVarType varRecord = 36;  // no variant holds one
inline constexpr TVarType varStrArg = 72;  // no variant holds one
inline constexpr TVarType varObject = 73;
inline constexpr TVarType varString = 256;
inline constexpr TVarType varAny = 257;  // no variant holds one
inline constexpr TVarType varUString = 258;
inline constexpr TVarType varTypeMask = 0x0FFF;
inline constexpr TVarType varArray = 0x2000;

/// The value's kind can't be read as the kind that was asked for.
struct ZQ_API EVariantTypeCast : EVariantError {
  using EVariantError::EVariantError;
};
/// The number doesn't fit the type that was asked for.
struct ZQ_API EVariantOverflow : EVariantError {
  using EVariantError::EVariantError;
};
/// An index, a dimension or bounds that an array doesn't have.
struct ZQ_API EVariantBadIndex : EVariantError {
  using EVariantError::EVariantError;
};

/// Fixed-point number with four decimals.
struct Currency {
  Int64 Scaled = 0;  // ten-thousandths
  friend constexpr auto operator<=>(Currency, Currency) noexcept = default;
};

namespace detail {
template <class T, class... TOthers>
concept TOneOf = (std::same_as<T, TOthers> || ...);
template <class T>
concept TWholeNumber = std::integral<T> && !TOneOf<T, char, wchar_t, char8_t, char16_t, char32_t>;
template <class T>
concept TWideText = std::convertible_to<const T&, std::u16string_view>;
template <class T>
concept TByteText = std::convertible_to<const T&, std::string_view>;

inline constexpr TGUID DispatchIID = "{00020400-0000-0000-C000-000000000046}"_guid;
template <class I>
constexpr bool IsDispatch() noexcept {
  if constexpr (requires { typename I::Parent; }) return I::IID == DispatchIID || IsDispatch<typename I::Parent>();
  else return I::IID == DispatchIID;
}

template <class T>
constexpr TVarType VarTypeOf() noexcept {
  constexpr TVarType Signed[] = {varShortInt, varSmallint, varInteger, varInt64};
  constexpr TVarType Unsigned[] = {varByte, varWord, varLongWord, varUInt64};
  constexpr std::size_t Width = sizeof(T) == 1 ? 0 : sizeof(T) == 2 ? 1 : sizeof(T) == 4 ? 2 : 3;
  if constexpr (std::same_as<T, bool>) return varBoolean;
  else return std::signed_integral<T> ? Signed[Width] : Unsigned[Width];
}
struct TVarArrayData;
struct TVarAccess;

template <TByteText T>
RawByteString TaggedBytes(const T& ABytes) {
  if constexpr (std::derived_from<T, RawByteString>) return ABytes;
  else return AnsiString(ABytes);
}
}  // namespace detail

/// Tagged value. Copies are deep, of interfaces they count; an object is only pointed at and stays its owner's.
///
/// Equality and order never raise. Numbers, dates and Booleans (True is -1) compare by number, text by code unit, text
/// against a number by the number that it tells. Objects and interfaces compare by identity, arrays by bounds and
/// elements. Null equals Null alone, Empty Empty alone; whatever else differs in kind is unequal and unordered.
class ZQ_API Variant {
 public:
  Variant() noexcept = default;
  template <detail::TWholeNumber T>
  Variant(T AValue) noexcept : FType(detail::VarTypeOf<T>()) {
    if constexpr (std::same_as<T, bool>) FData.Int = AValue ? -1 : 0;
    else FData.Int = static_cast<Int64>(AValue);  // NOLINT(bugprone-signed-char-misuse): ShortInt is a number
  }
  template <std::floating_point T>
  Variant(T AValue) noexcept
      : Variant(std::same_as<T, float> ? varSingle : varDouble, TData{.Real = static_cast<double>(AValue)}) {}
  template <detail::TOneOf<TDateTime, TDate, TTime> T>
  Variant(T AValue) noexcept : Variant(varDate, TData{.Real = AValue.Value}) {}
  template <std::same_as<Currency> T>
  Variant(T AValue) noexcept : Variant(varCurrency, TData{.Int = AValue.Scaled}) {}
  template <std::same_as<WordBool> T>
  Variant(T AValue) noexcept : Variant(static_cast<bool>(AValue)) {}
  template <std::same_as<char16_t> T>
  Variant(T AValue) : Variant(UnicodeString(AValue)) {}
  template <std::same_as<char> T>
  Variant(T AValue) : Variant(std::string_view(&AValue, 1)) {}
  /// varOleStr from a WideString, varUString from any other.
  template <detail::TWideText T>
  Variant(const T& AText) : Variant(std::derived_from<T, WideString> ? varOleStr : varUString, UnicodeString(AText)) {}
  Variant(UnicodeString&& AText) : Variant(varUString, std::move(AText)) {}
  /// Keeps the code page that the bytes are tagged with; bytes without a tag are in the process's.
  template <detail::TByteText T>
  Variant(const T& ABytes) : Variant(varString, detail::TaggedBytes(ABytes)) {}
  /// varDispatch where I is or extends the dispatch interface, varUnknown otherwise.
  template <class I>
  Variant(IntfRef<I> AIntf)
      : Variant(detail::IsDispatch<I>() ? varDispatch : varUnknown, IntfRef<IInterface>(std::move(AIntf))) {}
  template <std::derived_from<TObject> T>
  Variant(T* AObject) noexcept : Variant(varObject, TData{.Object = AObject}) {}

  Variant(const Variant& AOther) : FType(AOther.FType), FData(AOther.FData) {
    if (Owns()) Clone();
  }
  Variant(Variant&& AOther) noexcept : FType(std::exchange(AOther.FType, varEmpty)), FData(AOther.FData) {}
  Variant& operator=(Variant AOther) noexcept {
    std::swap(FType, AOther.FType);
    std::swap(FData, AOther.FData);
    return *this;
  }
  ~Variant() {
    if (Owns()) Drop();
  }

  [[nodiscard]] TVarType Type() const noexcept { return FType; }
  /// Element of an array with one dimension, by its index; valid as long as the array. Raises EVariantTypeCast for what
  /// is no array, EVariantBadIndex.
  [[nodiscard]] const Variant& operator[](Integer AIndex) const ZQ_LIFETIMEBOUND;

  friend ZQ_API std::partial_ordering operator<=>(const Variant& A, const Variant& B);
  friend bool operator==(const Variant& A, const Variant& B) { return std::is_eq(A <=> B); }

 private:
  friend struct detail::TVarAccess;
  union TData {
    Int64 Int;  // every integer, 0 or -1 of a Boolean, the code of an error, ten-thousandths of a Currency
    double Real;
    UnicodeString* Text;
    RawByteString* Bytes;
    IInterface* Intf;
    TObject* Object;
    detail::TVarArrayData* Array;
  };

  Variant(TVarType AType, TData AData) noexcept : FType(AType), FData(AData) {}
  Variant(TVarType AType, UnicodeString&& AText) : Variant(AType, TData{.Text = new UnicodeString(std::move(AText))}) {}
  Variant(TVarType AType, RawByteString&& ABytes)
      : Variant(AType, TData{.Bytes = new RawByteString(std::move(ABytes))}) {}
  Variant(TVarType AType, const IntfRef<IInterface>& AIntf) noexcept;

  [[nodiscard]] bool Owns() const noexcept {
    return FType >= varString || FType == varOleStr || FType == varUnknown || FType == varDispatch;
  }
  void Clone();  // of a bitwise copy makes one of its own
  void Drop() noexcept;

  TVarType FType = varEmpty;
  TData FData{.Int = 0};
};

[[nodiscard]] inline TVarType VarType(const Variant& AValue) noexcept { return AValue.Type(); }
[[nodiscard]] inline bool VarIsNull(const Variant& AValue) noexcept { return AValue.Type() == varNull; }
[[nodiscard]] inline bool VarIsEmpty(const Variant& AValue) noexcept { return AValue.Type() == varEmpty; }
[[nodiscard]] inline bool VarIsArray(const Variant& AValue) noexcept { return (AValue.Type() & varArray) != 0; }
[[nodiscard]] inline bool VarIsStr(const Variant& AValue) noexcept {
  return AValue.Type() == varOleStr || AValue.Type() == varString || AValue.Type() == varUString;
}
[[nodiscard]] ZQ_API Variant Null() noexcept;
/// A result code as varError.
[[nodiscard]] ZQ_API Variant VarAsError(HRESULT ACode) noexcept;
[[nodiscard]] inline bool VarSameValue(const Variant& A, const Variant& B) { return A == B; }

// The value read as another kind, by the process's format settings where text is involved. Empty reads as 0, False and
// "", a Boolean as -1 or 0. These raise EVariantTypeCast for Null, for text that tells no such value, and for objects,
// interfaces, errors and arrays; EVariantOverflow for a number that doesn't fit.

/// To the nearest, halves to even.
[[nodiscard]] ZQ_API Integer VarToInteger(const Variant& AValue);
[[nodiscard]] ZQ_API Int64 VarToInt64(const Variant& AValue);
[[nodiscard]] ZQ_API UInt64 VarToUInt64(const Variant& AValue);
[[nodiscard]] ZQ_API Extended VarToReal(const Variant& AValue);
/// Text is "True", "False" or a number.
[[nodiscard]] ZQ_API bool VarToBool(const Variant& AValue);
[[nodiscard]] ZQ_API Currency VarToCurrency(const Variant& AValue);
/// Text is a number of days, a date, a time, or both.
[[nodiscard]] ZQ_API TDateTime VarToDateTime(const Variant& AValue);
[[nodiscard]] ZQ_API UnicodeString VarToUStr(const Variant& AValue);
[[nodiscard]] ZQ_API WideString VarToWStr(const Variant& AValue);
/// A byte string as it is, anything else as text in the process's ANSI code page.
[[nodiscard]] ZQ_API RawByteString VarToBytes(const Variant& AValue);
/// In the process's ANSI code page.
[[nodiscard]] ZQ_API AnsiString VarToLStr(const Variant& AValue);
/// As VarToUStr, with ADefault for Null.
[[nodiscard]] ZQ_API UnicodeString VarToStrDef(const Variant& AValue, const UnicodeString& ADefault);
[[nodiscard]] inline UnicodeString VarToStr(const Variant& AValue) { return VarToStrDef(AValue, {}); }
/// nullptr for Empty and Null; raises EVariantTypeCast for anything but an object.
[[nodiscard]] ZQ_API TObject* VarToObject(const Variant& AValue);
/// Empty for Empty and Null; an object is asked for it. Raises EVariantTypeCast for anything else.
[[nodiscard]] ZQ_API IntfRef<IInterface> VarToIntf(const Variant& AValue);
/// The value as a variant of AType, which is a type that variants hold and no array; varVariant leaves it as it is.
[[nodiscard]] ZQ_API Variant VarAsType(const Variant& AValue, TVarType AType);

/// Array of variants with one dimension, from 0.
[[nodiscard]] ZQ_API Variant VarArrayOf(TArray<Variant> AItems);
/// Array of empty elements, or of zeros of AElementType. ABounds holds low and high bound of each dimension in turn; a
/// high bound one below the low one makes no elements. Raises EVariantBadIndex for other bounds and for more elements
/// than memory can hold, EVariantTypeCast for a type that no element can have.
[[nodiscard]] ZQ_API Variant VarArrayCreate(std::span<const Integer> ABounds, TVarType AElementType);
[[nodiscard]] inline Variant VarArrayCreate(std::initializer_list<Integer> ABounds, TVarType AElementType) {
  return VarArrayCreate(std::span(ABounds.begin(), ABounds.size()), AElementType);
}
/// 0 for what is no array.
[[nodiscard]] ZQ_API Integer VarArrayDimCount(const Variant& AArray) noexcept;
// Dimensions count from 1. Raise EVariantTypeCast for what is no array, EVariantBadIndex for a dimension that it
// hasn't.
[[nodiscard]] ZQ_API Integer VarArrayLowBound(const Variant& AArray, Integer ADimension);
[[nodiscard]] ZQ_API Integer VarArrayHighBound(const Variant& AArray, Integer ADimension);
/// One index for each dimension. Raises as the bounds do.
[[nodiscard]] ZQ_API const Variant& VarArrayGet(
    const Variant& AArray ZQ_LIFETIMEBOUND, std::initializer_list<Integer> AIndices);
/// Stores AValue as the array's element type.
ZQ_API void VarArrayPut(Variant& AArray, const Variant& AValue, std::initializer_list<Integer> AIndices);

}  // namespace zq
