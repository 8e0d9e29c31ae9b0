#pragma once

#include <string_view>

#include "runtime/core/api.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

/// Base64 as of RFC 4648: the standard alphabet, padded with "=", no line breaks.
///
/// Streams stay the caller's. Their forms begin at the position, and raise what the streams raise, EWriteError among
/// it. Two streams of one call are not the same (EAssertionFailed), and none is null. From any thread.
///
/// A TZqMemoryStream is worked on in place: as a source it stays where it is, and what is put into one ends it and
/// leaves its position in front.
namespace zq {

class TStream;

namespace uZqBase64 {
inline constexpr TResStringRec _SInvalidBase64Data{65513, u"Invalid Base64 data!"};
}

/// The text goes to ADest, which is left behind it.
ZQ_API void ZqEncodeBase64(TStream* ASource, TStream* ADest);
[[nodiscard]] ZQ_API AnsiString ZqEncodeBase64(TStream* ASource);
/// The bytes as they are, in whatever code page.
[[nodiscard]] ZQ_API AnsiString ZqEncodeBase64(std::string_view AValue);
/// The UTF-16 units, two bytes each, the low one first.
[[nodiscard]] ZQ_API AnsiString ZqEncodeBase64(const WideString& AValue);
[[nodiscard]] ZQ_API AnsiString ZqEncodeBase64(const TBytes& AValue);
[[nodiscard]] ZQ_API AnsiString ZqEncodeBase64(const void* ABuf, NativeUInt ASize);

// Decoding raises Exception (_SInvalidBase64Data) for a text whose length, with all that stands in it, is not a
// multiple of 4. Characters that are not in the alphabet are skipped, wherever they stand; "=" is one of them and ends
// nothing. Of an incomplete last group come the whole bytes that it has.

[[nodiscard]] ZQ_API TBytes ZqDecodeBase64(std::string_view AValue);
/// The text is taken to code page 0 first.
[[nodiscard]] ZQ_API TBytes ZqDecodeBase64(const WideString& AValue);
/// A new block of ASize bytes for the caller to free with FreeMem; null where there are none.
[[nodiscard]] ZQ_API void* ZqDecodeBase64(std::string_view AValue, NativeUInt& ASize);
/// The bytes go to AStream, which is left behind them.
ZQ_API void ZqDecodeBase64(std::string_view AValue, TStream* AStream);
ZQ_API void ZqDecodeBase64(TStream* ASource, TStream* ADest);

}  // namespace zq
