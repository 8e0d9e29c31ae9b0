#pragma once

#include <concepts>
#include <type_traits>

#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/text/format_settings.h"

namespace zq {

enum class TFloatFormat : std::uint8_t { ffGeneral, ffExponent, ffFixed, ffNumber, ffCurrency };
using enum TFloatFormat;

namespace detail {
[[nodiscard]] ZQ_API UnicodeString SignedToStr(Int64 AValue);
[[nodiscard]] ZQ_API UnicodeString UnsignedToStr(UInt64 AValue);
[[nodiscard]] ZQ_API UnicodeString UnsignedToHex(UInt64 AValue, Integer ADigits);
}  // namespace detail

template <std::integral T>
[[nodiscard]] UnicodeString IntToStr(T AValue) {
  if constexpr (std::signed_integral<T>) return detail::SignedToStr(AValue);
  else return detail::UnsignedToStr(AValue);
}
/// At least ADigits upper-case digits; a negative value as the two's complement of its own type.
template <std::integral T>
[[nodiscard]] UnicodeString IntToHex(T AValue, Integer ADigits = static_cast<Integer>(2 * sizeof(T))) {
  return detail::UnsignedToHex(static_cast<std::make_unsigned_t<T>>(AValue), ADigits);
}

// Integers are read from blanks, a sign, and decimal digits or hexadecimal ones behind "$", "0x" or "x". Hexadecimal
// digits may fill the whole width: "$FFFFFFFF" is the Integer -1. StrTo... raise EConvertError, out of range too.

[[nodiscard]] ZQ_API Integer StrToInt(std::u16string_view AText);
[[nodiscard]] ZQ_API Int64 StrToInt64(std::u16string_view AText);
[[nodiscard]] ZQ_API Integer StrToIntDef(std::u16string_view AText, Integer ADefault) noexcept;
[[nodiscard]] ZQ_API Int64 StrToInt64Def(std::u16string_view AText, Int64 ADefault) noexcept;
/// False, and AValue as it was, for what is no integer or out of range.
ZQ_API bool TryStrToInt(std::u16string_view AText, Integer& AValue) noexcept;
ZQ_API bool TryStrToInt64(std::u16string_view AText, Int64& AValue) noexcept;

// Floats are read from blanks, a sign, digits with one DecimalSeparator, an exponent, and blanks. ThousandSeparator may
// stand between groups of three digits, but only where a DecimalSeparator follows: "1,234" alone could mean either.
// Without settings these go by FormatSettings().

/// Raises EConvertError.
[[nodiscard]] ZQ_API Extended StrToFloat(std::u16string_view AText);
[[nodiscard]] ZQ_API Extended StrToFloat(std::u16string_view AText, const TFormatSettings& ASettings);
/// False, and AValue as it was, for what is no number.
[[nodiscard]] ZQ_API bool TryStrToFloat(std::u16string_view AText, Extended& AValue);
[[nodiscard]] ZQ_API bool TryStrToFloat(std::u16string_view AText, Extended& AValue, const TFormatSettings& ASettings);

/// Up to 15 significant digits, no trailing zeros: "0.3", "1E20", "INF", "-INF", "NAN".
[[nodiscard]] ZQ_API UnicodeString FloatToStr(Extended AValue);
[[nodiscard]] ZQ_API UnicodeString FloatToStr(Extended AValue, const TFormatSettings& ASettings);
/// APrecision: significant digits, 1 to 18. ADigits: decimals, 0 to 18; with ffGeneral and ffExponent the least digits
/// of the exponent, 0 to 4. Rounds once, halves away from zero. A value of 10 to the power APrecision or more has an
/// exponent in every format; ffNumber and ffCurrency group by ThousandSeparator.
[[nodiscard]] ZQ_API UnicodeString FloatToStrF(
    Extended AValue, TFloatFormat AFormat, Integer APrecision, Integer ADigits);
[[nodiscard]] ZQ_API UnicodeString FloatToStrF(
    Extended AValue, TFloatFormat AFormat, Integer APrecision, Integer ADigits, const TFormatSettings& ASettings);

/// "-1" and "0", or "True" and "False".
[[nodiscard]] ZQ_API UnicodeString BoolToStr(bool AValue, bool AUseWords = false);

}  // namespace zq
