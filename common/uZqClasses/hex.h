#pragma once

#include <string_view>

#include "runtime/core/api.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

namespace zq {

class TStream;

/// How bytes stand in a text.
enum class TZqBinEncoding : Byte { beBase64, beHexEncoded };
using enum TZqBinEncoding;

// Hexadecimal, for short values: byte by byte. Streams stay the caller's and are not null (EAssertionFailed). A stream
// begins at its position and is left at its end, or behind what was written.

/// Two upper-case digits a byte, the first byte first.
[[nodiscard]] ZQ_API AnsiString ZqBufToHex(const void* ABuf, NativeUInt ASize);
[[nodiscard]] ZQ_API AnsiString ZqBufToHex(const TBytes& AValue);
[[nodiscard]] ZQ_API AnsiString ZqBufToHex(TStream* AStream);

// Digits of either case, two a byte; an odd last character is left out. What is no digit raises EConvertError.

[[nodiscard]] ZQ_API TBytes ZqHexToBuf(std::string_view AValue);
/// A new block of ASize bytes for the caller to free with FreeMem; null where there are none.
[[nodiscard]] ZQ_API void* ZqHexToBuf(std::string_view AValue, NativeUInt& ASize);
/// The bytes ahead of what is no digit have been written.
ZQ_API void ZqHexToBuf(std::string_view AValue, TStream* AStream);

// Either form: hexadecimal as above, Base64 as by ZqEncodeBase64 and ZqDecodeBase64.

[[nodiscard]] ZQ_API AnsiString ZqBufToString(const void* ABuf, NativeUInt ASize, TZqBinEncoding AEncoding);
[[nodiscard]] ZQ_API AnsiString ZqBufToString(const TBytes& AValue, TZqBinEncoding AEncoding);
[[nodiscard]] ZQ_API AnsiString ZqBufToString(TStream* AStream, TZqBinEncoding AEncoding);
[[nodiscard]] ZQ_API TBytes ZqStringToBuf(std::string_view AValue, TZqBinEncoding AEncoding);
[[nodiscard]] ZQ_API void* ZqStringToBuf(std::string_view AValue, TZqBinEncoding AEncoding, NativeUInt& ASize);
ZQ_API void ZqStringToBuf(std::string_view AValue, TZqBinEncoding AEncoding, TStream* AStream);

}  // namespace zq
