#pragma once

#include <span>

#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/varrec.h"
#include "runtime/text/format_settings.h"

namespace zq {

// Placeholders: "%", [index ":"], ["-"], [width], ["." precision], letter; "%%" is a percent sign. Width, precision and
// index are digits or "*", which takes the next argument. An index is where that and the following placeholders go on,
// from 0.
//
//   d u x   integer; the precision is the least number of digits. x: upper-case hexadecimal
//   f n m   decimals, 2 by default (m: CurrencyDecimals); n and m group thousands, m adds CurrencyString
//   e g     exponent form and shortest form, 15 significant digits by default
//   s       text, a character, a class, an object's ToString, a Variant's text; the precision is the most characters
//   p       pointer or object, eight upper-case hexadecimal digits and more where it needs them
//
// Letters count in either case. A format that is malformed or doesn't fit its arguments raises EConvertError with the
// format in the text; arguments that no placeholder takes are ignored. Byte text is read by its code page.

[[nodiscard]] ZQ_API UnicodeString Format(const UnicodeString& AFormat, TVarArgs AArgs);
[[nodiscard]] ZQ_API UnicodeString Format(const UnicodeString& AFormat, std::span<const TVarRec> AArgs);
[[nodiscard]] ZQ_API UnicodeString Format(
    const UnicodeString& AFormat, std::span<const TVarRec> AArgs, const TFormatSettings& ASettings);
[[nodiscard]] inline UnicodeString Format(
    const UnicodeString& AFormat, TVarArgs AArgs, const TFormatSettings& ASettings) {
  return Format(AFormat, std::span(AArgs.begin(), AArgs.size()), ASettings);
}
[[nodiscard]] inline UnicodeString Format(const TResStringRec& AFormat, TVarArgs AArgs) {
  return Format(LoadResString(AFormat), AArgs);
}

}  // namespace zq
