#pragma once

#include <array>
#include <compare>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <string_view>
#include <type_traits>
#include <vector>

#include "runtime/core/api.h"

namespace zq {

using Integer = int;
using Cardinal = unsigned int;
using Int64 = long long;
using UInt64 = unsigned long long;
/// Pointer width. Other types than Int64 and UInt64, though as wide: the type registry tells types apart by identity.
using NativeInt = long;
using NativeUInt = unsigned long;
using ShortInt = signed char;
using SmallInt = short;
using Byte = unsigned char;
using Word = unsigned short;
using Boolean = bool;
using Single = float;
using Double = double;
using Extended = long double;  // 80 bit on x86; 128 on 64-bit ARM
using Char = char16_t;
using WideChar = char16_t;
using AnsiChar = char;
using Pointer = void*;
using HWND = NativeUInt;  ///< a window of the message layer; 0 is none

/// Dynamic array: a value; copies are copies.
template <class T>
using TArray = std::vector<T>;
using TBytes = TArray<Byte>;

/// A moment, a date or a time of day: days since 1899-12-30, the fraction is the time of day. Distinct types, so that
/// overloads and the type registry tell them apart; each converts to and from its double, and they to each other with
/// the whole of it.
struct TDate;
struct TTime;
struct TDateTime {
  double Value = 0;
  constexpr TDateTime() noexcept = default;
  constexpr TDateTime(double AValue) noexcept : Value(AValue) {}
  template <class T>
    requires(std::same_as<T, TDate> || std::same_as<T, TTime>)
  constexpr TDateTime(T AValue) noexcept : Value(AValue.Value) {}
  constexpr operator double() const noexcept { return Value; }
};
struct TDate {
  double Value = 0;
  constexpr TDate() noexcept = default;
  constexpr TDate(double AValue) noexcept : Value(AValue) {}
  constexpr TDate(TDateTime AValue) noexcept : Value(AValue.Value) {}
  constexpr operator double() const noexcept { return Value; }
};
struct TTime {
  double Value = 0;
  constexpr TTime() noexcept = default;
  constexpr TTime(double AValue) noexcept : Value(AValue) {}
  constexpr TTime(TDateTime AValue) noexcept : Value(AValue.Value) {}
  constexpr operator double() const noexcept { return Value; }
};

/// Truth value of COM: two bytes, -1 for True.
struct WordBool {
  std::int16_t Value = 0;
  constexpr WordBool() noexcept = default;
  constexpr WordBool(bool AValue) noexcept : Value(AValue ? -1 : 0) {}
  constexpr operator bool() const noexcept { return Value != 0; }
};

/// 128-bit identifier. Text form: "{01234567-89AB-CDEF-0123-456789ABCDEF}".
struct TGUID {
  std::uint32_t D1 = 0;
  std::uint16_t D2 = 0;
  std::uint16_t D3 = 0;
  std::array<std::uint8_t, 8> D4{};
  friend constexpr bool operator==(const TGUID&, const TGUID&) = default;
};

namespace detail {
constexpr std::uint64_t GuidHex(std::string_view AText, std::size_t AFrom, std::size_t ACount) {
  std::uint64_t Result = 0;
  for (const char c : AText.substr(AFrom, ACount)) {
    const int Digit = c >= '0' && c <= '9'   ? c - '0'
                      : c >= 'A' && c <= 'F' ? c - 'A' + 10
                      : c >= 'a' && c <= 'f' ? c - 'a' + 10
                                             : -1;
    if (Digit < 0) throw "no hexadecimal digit in a GUID";
    Result = Result << 4U | static_cast<std::uint64_t>(Digit);
  }
  return Result;
}
}  // namespace detail

/// "{...}"_guid, checked at compile time.
consteval TGUID operator""_guid(const char* AText, std::size_t ALength) {
  const std::string_view Text(AText, ALength);
  if (ALength != 38 || Text.front() != '{' || Text.back() != '}') throw "a GUID has the form {8-4-4-4-12}";
  for (const std::size_t Dash : {9U, 14U, 19U, 24U})
    if (Text[Dash] != '-') throw "a GUID has the form {8-4-4-4-12}";
  TGUID Result;
  Result.D1 = static_cast<std::uint32_t>(detail::GuidHex(Text, 1, 8));
  Result.D2 = static_cast<std::uint16_t>(detail::GuidHex(Text, 10, 4));
  Result.D3 = static_cast<std::uint16_t>(detail::GuidHex(Text, 15, 4));
  for (std::size_t i = 0; i < 8; ++i)
    Result.D4[i] = static_cast<std::uint8_t>(detail::GuidHex(Text, i < 2 ? 20 + 2 * i : 21 + 2 * i, 2));
  return Result;
}

/// Set over an enumeration or AnsiChar with ordinals 0 to 255: one bit each.
template <class TElement>
class TSet {
 public:
  constexpr TSet() noexcept = default;
  constexpr TSet(std::initializer_list<TElement> AElements) noexcept {
    for (const TElement Element : AElements) Include(Element);
  }
  constexpr TSet& Include(TElement AElement) noexcept {
    FBits[Slot(AElement)] |= Mask(AElement);
    return *this;
  }
  constexpr TSet& Exclude(TElement AElement) noexcept {
    FBits[Slot(AElement)] &= ~Mask(AElement);
    return *this;
  }
  [[nodiscard]] constexpr bool Contains(TElement AElement) const noexcept {
    return (FBits[Slot(AElement)] & Mask(AElement)) != 0;
  }
  [[nodiscard]] constexpr bool IsEmpty() const noexcept { return *this == TSet(); }
  /// The lowest 32 elements as bits, which is how type information and log values carry a set.
  [[nodiscard]] constexpr Integer ToInteger() const noexcept { return static_cast<Integer>(FBits[0] & 0xFFFFFFFFU); }
  friend constexpr TSet operator+(TSet A, const TSet& B) noexcept {
    for (std::size_t i = 0; i < A.FBits.size(); ++i) A.FBits[i] |= B.FBits[i];
    return A;
  }
  friend constexpr TSet operator-(TSet A, const TSet& B) noexcept {
    for (std::size_t i = 0; i < A.FBits.size(); ++i) A.FBits[i] &= ~B.FBits[i];
    return A;
  }
  friend constexpr bool operator==(const TSet&, const TSet&) noexcept = default;

 private:
  static constexpr std::size_t Slot(TElement AElement) noexcept { return static_cast<std::uint8_t>(AElement) / 64U; }
  static constexpr std::uint64_t Mask(TElement AElement) noexcept {
    return std::uint64_t{1} << (static_cast<std::uint8_t>(AElement) % 64U);
  }
  std::array<std::uint64_t, 4> FBits{};
};

using TZqSetOfAnsiChar = TSet<AnsiChar>;

/// Result code of a COM operation: negative for failure.
using HRESULT = std::int32_t;
inline constexpr HRESULT S_OK = 0;
inline constexpr HRESULT S_FALSE = 1;
inline constexpr HRESULT E_NOTIMPL = static_cast<HRESULT>(0x80004001U);
inline constexpr HRESULT E_NOINTERFACE = static_cast<HRESULT>(0x80004002U);
inline constexpr HRESULT E_POINTER = static_cast<HRESULT>(0x80004003U);
inline constexpr HRESULT E_FAIL = static_cast<HRESULT>(0x80004005U);
inline constexpr HRESULT E_UNEXPECTED = static_cast<HRESULT>(0x8000FFFFU);

}  // namespace zq
