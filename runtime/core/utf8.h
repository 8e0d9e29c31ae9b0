#pragma once

#include <cstddef>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include "runtime/core/api.h"

namespace zq::utf8 {

/// What becomes of bytes that are no UTF-8.
enum class TMalformed {
  Replace,  ///< each longest piece of a broken sequence becomes one U+FFFD
  Escape,   ///< each byte becomes U+DC80..U+DCFF: how file names keep bytes that are no text
};

/// Decodes ALength bytes to ADest, which has room for DecodedLength units (with Escape, and in any case, ALength are
/// enough); returns the units written.
ZQ_API std::size_t Decode(
    const char* ASource, std::size_t ALength, char16_t* ADest, TMalformed AMalformed = TMalformed::Replace) noexcept;
/// Encodes ALength units to ADest, which has room for EncodedLength bytes (3 * ALength are always enough); returns the
/// bytes written. A surrogate without its partner becomes U+FFFD; with Escape U+DC80..U+DCFF become the byte that they
/// stand for.
ZQ_API std::size_t Encode(
    const char16_t* ASource, std::size_t ALength, char* ADest, TMalformed AMalformed = TMalformed::Replace) noexcept;
/// Units that Decode writes with Replace.
ZQ_API std::size_t DecodedLength(const char* ASource, std::size_t ALength) noexcept;
/// Bytes that Encode writes with Replace.
ZQ_API std::size_t EncodedLength(const char16_t* ASource, std::size_t ALength) noexcept;
/// Length of the ASCII run that ASource begins with.
ZQ_API std::size_t AsciiRun(const char* ASource, std::size_t ALength) noexcept;
ZQ_API std::size_t AsciiRun(const char16_t* ASource, std::size_t ALength) noexcept;

ZQ_API std::u16string Decode(std::string_view ASource, TMalformed AMalformed = TMalformed::Replace);
ZQ_API std::string Encode(std::u16string_view ASource, TMalformed AMalformed = TMalformed::Replace);

/// Bytes that grow at the end and keep their room, so that one buffer serves for many texts.
class TBuffer {
 public:
  TBuffer() noexcept = default;
  TBuffer(TBuffer&& AOther) noexcept { Swap(AOther); }
  TBuffer& operator=(TBuffer&& AOther) noexcept {
    TBuffer Taken(std::move(AOther));
    Swap(Taken);
    return *this;
  }

  void Clear() noexcept { FSize = 0; }
  /// AText in UTF-8.
  void Append(std::u16string_view AText) {
    if (FRoom - FSize < 3 * AText.size()) Grow(3 * AText.size());
    FSize += Encode(AText.data(), AText.size(), FBytes.get() + FSize);
  }
  /// Bytes as they are.
  void AppendBytes(std::string_view ABytes) {
    if (ABytes.empty()) return;
    if (FRoom - FSize < ABytes.size()) Grow(ABytes.size());
    std::memcpy(FBytes.get() + FSize, ABytes.data(), ABytes.size());
    FSize += ABytes.size();
  }
  [[nodiscard]] std::string_view View() const noexcept ZQ_LIFETIMEBOUND { return {FBytes.get(), FSize}; }
  [[nodiscard]] bool IsEmpty() const noexcept { return FSize == 0; }
  [[nodiscard]] std::size_t Room() const noexcept { return FRoom; }

 private:
  ZQ_API void Grow(std::size_t ABytes);
  void Swap(TBuffer& AOther) noexcept {
    std::swap(FBytes, AOther.FBytes);
    std::swap(FSize, AOther.FSize);
    std::swap(FRoom, AOther.FRoom);
  }

  std::unique_ptr<char[]> FBytes;
  std::size_t FSize = 0;
  std::size_t FRoom = 0;
};

}  // namespace zq::utf8
