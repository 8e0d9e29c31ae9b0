#pragma once

#include <string_view>

#include "runtime/core/api.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

/// uuencode: a header with a mode and a file name, lines of up to 45 bytes, "`", "end".
///
/// Text is in code page 0. Streams stay the caller's and are taken from the position on; their forms raise what the
/// streams raise, EReadError and EWriteError among it. From any thread.
namespace zq {

class TStream;
class TStrings;

/// What the header of a block says.
struct TZqUUData {
  UnicodeString FileName;
  Word Mode = 0;
};

// A value of 0 is written as a blank, and lines end by CR LF, the last one by nothing. AMode goes into the header as a
// decimal number: 644 for what other tools call the octal mode 644. ZqUUDecode refuses a mode of 0.
// Characters of AFileName that code page 0 hasn't got become "?"; one with a line end in it raises Exception, and
// nothing has been written then.

/// ASource and ADest are not the same (EAssertionFailed).
ZQ_API void ZqUUEncode(TStream* ASource, TStream* ADest, const UnicodeString& AFileName, Word AMode);
[[nodiscard]] ZQ_API AnsiString ZqUUEncode(TStream* ASource, const UnicodeString& AFileName, Word AMode);
/// The bytes as they are, in whatever code page.
[[nodiscard]] ZQ_API AnsiString ZqUUEncode(std::string_view AValue, const UnicodeString& AFileName, Word AMode);

// The bytes of a block go to ADest. Its header is the first line, or, with an AFileName that isn't empty, the first one
// that holds this name, in any case; what stands behind the block is not looked at.
//
// Raises Exception, and what was decoded before that has been written:
//   "Unexpected EOF"  no line holds AFileName, or the lines end before "`" and "end". A block that ends in a blank line
//                     of count 0 instead of "`" is such a one, all of its bytes being written.
//   "Invalid UUData"  the header is none, its mode is no decimal number from 1 to 65535, or a line of data is empty.
// Characters that a line lacks at its end read as blanks, because mailers strip those; more than it needs are ignored.

ZQ_API TZqUUData ZqUUDecode(const TStrings& ALines, const UnicodeString& AFileName, TStream* ADest);
ZQ_API TZqUUData ZqUUDecode(const TStrings& ALines, TStream* ADest);
/// A byte order mark tells the text's encoding.
ZQ_API TZqUUData ZqUUDecode(TStream* ASource, TStream* ADest);
ZQ_API TZqUUData ZqUUDecode(std::string_view AValue, TStream* ADest);
ZQ_API TZqUUData ZqUUDecode(std::string_view AValue, const UnicodeString& AFileName, TStream* ADest);

}  // namespace zq
