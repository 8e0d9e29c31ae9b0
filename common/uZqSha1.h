#pragma once

#include <array>
#include <string_view>

#include "common/uZqClasses/hex.h"
#include "runtime/core/api.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

/// SHA-1 (FIPS 180-1) of blocks, texts, streams and files. From any thread.
///
/// Empty input has no digest: 20 bytes of zero stand for it, and an empty text where blocks and texts are hashed to
/// text. No text is converted: bytes are hashed as they are, wide text as its UTF-16 units, two bytes each, the low one
/// first, so one text has different digests in the two forms. A negative size is EAssertionFailed, and so is null with
/// bytes to it.
///
/// Against attack SHA-1 protects nothing any more: it tells versions and copies apart.
namespace zq {

class TStream;

using TSHA1Digest = std::array<Byte, 20>;

[[nodiscard]] ZQ_API TSHA1Digest ZqHashBuffer(const void* ABuf, NativeInt ASize);
[[nodiscard]] ZQ_API AnsiString ZqHashBuffer(const void* ABuf, NativeInt ASize, TZqBinEncoding AEncoding);
ZQ_API void ZqHashString(std::u16string_view AValue, TSHA1Digest& ADigest);
[[nodiscard]] ZQ_API AnsiString ZqHashString(std::u16string_view AValue, TZqBinEncoding AEncoding);
[[nodiscard]] ZQ_API AnsiString ZqHashStringW(std::u16string_view AValue, TZqBinEncoding AEncoding);
[[nodiscard]] ZQ_API AnsiString ZqHashStringA(std::string_view AValue, TZqBinEncoding AEncoding);

// What is read stands in one block of the stream's size, filled by one Read. Only where that gave less than the size
// had promised, or the size promised nothing, as that of a pipe or of a file of /proc does, reading goes on to the end.
// EReadError says why the system refuses to read on, std::bad_alloc that there is no memory for the block, or that more
// than 1 GiB came out of what told no size. For nothing stand the zeros.

/// In Base64, of what stands behind the position, or of all. The stream stays the caller's, is left behind what was
/// read, and is not null (EAssertionFailed).
[[nodiscard]] ZQ_API AnsiString ZqHashStream(TStream* AStream, Boolean AFromStart);
/// Others may write to the file meanwhile. Raises EFOpenError, for a folder too.
[[nodiscard]] ZQ_API AnsiString ZqHashFile(const UnicodeString& AFilename, TZqBinEncoding AEncoding);

}  // namespace zq
