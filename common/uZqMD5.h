#pragma once

#include <array>
#include <string_view>

#include "runtime/core/api.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

/// MD5 (RFC 1321) of blocks and texts, or piece by piece. From any thread, a context on one at a time.
///
/// No text is converted: bytes are hashed as they are, wide text as its UTF-16 units, two bytes each, the low one
/// first. A negative size is EAssertionFailed, and so is null with bytes to it.
///
/// Against attack MD5 protects nothing any more: it tells versions and copies apart.
namespace zq {

using TMD5Digest = std::array<Byte, 16>;
using TMD5State = std::array<Cardinal, 4>;
using TMD5Count = std::array<Cardinal, 2>;
using TMD5Block = std::array<Cardinal, 16>;
using TMD5CBits = std::array<Byte, 8>;
using TMD5Buffer = std::array<Byte, 64>;

/// A digest under way, from MD5Init to MD5Final. It may be copied, to go on in two ways.
struct TMD5Context {
  TMD5State State{};
  TMD5Count Count{};    ///< bits, the low word first
  TMD5Buffer Buffer{};  ///< begins with the bytes of a block that isn't full
};

ZQ_API void MD5Init(TMD5Context& AContext) noexcept;
ZQ_API void MD5Update(TMD5Context& AContext, const void* AInput, NativeInt ALength);
inline void MD5Update(TMD5Context& AContext, std::string_view AInput) {
  MD5Update(AContext, AInput.data(), static_cast<NativeInt>(AInput.size()));
}
/// Leaves zeros in the context: MD5Init begins the next digest.
ZQ_API void MD5Final(TMD5Context& AContext, TMD5Digest& ADigest) noexcept;

[[nodiscard]] ZQ_API TMD5Digest MD5Hash(const void* ABuf, NativeInt ASize);
/// 32 upper-case hexadecimal digits.
[[nodiscard]] ZQ_API AnsiString MD5Hash(std::string_view AValue);
[[nodiscard]] ZQ_API AnsiString MD5Hash(std::u16string_view AValue);

}  // namespace zq
