#pragma once

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>

#include "runtime/core/types.h"

/// Base64 between a caller's buffers, in plain C++. For the module, its tests and its benchmark alone.
namespace zq::base64 {

inline constexpr std::string_view cAlphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
inline constexpr Byte cNoValue = 255;

/// The value of each character, cNoValue for what is not in the alphabet.
inline constexpr std::array<Byte, 256> cValues = [] {
  std::array<Byte, 256> Result;
  Result.fill(cNoValue);
  for (std::size_t i = 0; i < cAlphabet.size(); ++i) Result[static_cast<Byte>(cAlphabet[i])] = static_cast<Byte>(i);
  return Result;
}();

/// The two characters of each 12 bits.
inline constexpr std::array<std::array<char, 2>, 4096> cPairs = [] {
  std::array<std::array<char, 2>, 4096> Result{};
  for (std::size_t i = 0; i < Result.size(); ++i) Result[i] = {cAlphabet[i / 64], cAlphabet[i % 64]};
  return Result;
}();

/// The first byte is the highest.
inline std::uint64_t LoadBigEndian(const Byte* AFrom) noexcept {
  std::uint64_t Result = 0;
  std::memcpy(&Result, AFrom, sizeof Result);
  return std::endian::native == std::endian::little ? __builtin_bswap64(Result) : Result;
}
inline void StoreBigEndian(Byte* ATo, std::uint64_t AValue) noexcept {
  if constexpr (std::endian::native == std::endian::little) AValue = __builtin_bswap64(AValue);
  std::memcpy(ATo, &AValue, sizeof AValue);
}

// ---- Encoding -------------------------------------------------------------------------------------------------------

[[nodiscard]] constexpr std::size_t EncodedSize(std::size_t ASize) noexcept { return (ASize + 2) / 3 * 4; }

// Steps take where they stand and return it: behind a reference it would be fetched again after each character written.

/// Where an encoder stands. To has room for the EncodedSize of what is left.
struct TEncoder {
  const Byte* From;
  const Byte* End;
  char* To;

  [[nodiscard]] std::ptrdiff_t Left() const noexcept { return End - From; }
};

/// Six bytes at a time, as long as there are the eight that are read for them.
[[nodiscard]] inline TEncoder EncodeRun(TEncoder AEncoder) noexcept {
  for (; AEncoder.Left() >= 8; AEncoder.From += 6, AEncoder.To += 8) {
    const std::uint64_t Bits = LoadBigEndian(AEncoder.From);
    const auto Pair = [&](std::size_t AIndex) {
      std::memcpy(AEncoder.To + 2 * AIndex, &cPairs[Bits >> (52 - 12 * AIndex) & 0xFFFU], 2);
    };
    Pair(0), Pair(1), Pair(2), Pair(3);
  }
  return AEncoder;
}

/// One, two or three bytes, the last of a text padded.
[[nodiscard]] inline TEncoder EncodeGroup(TEncoder AEncoder) noexcept {
  const std::size_t Count = AEncoder.Left() < 3 ? static_cast<std::size_t>(AEncoder.Left()) : 3;
  std::uint32_t Bits = 0;
  for (std::size_t i = 0; i < 3; ++i) Bits = Bits << 8U | (i < Count ? AEncoder.From[i] : 0U);
  for (std::size_t i = 0; i < 4; ++i) AEncoder.To[i] = i <= Count ? cAlphabet[Bits >> (18 - 6 * i) & 63U] : '=';
  AEncoder.From += Count;
  AEncoder.To += 4;
  return AEncoder;
}

/// Returns the characters written, which are EncodedSize(ASize).
inline std::size_t Encode(const Byte* ASource, std::size_t ASize, char* ADest) noexcept {
  TEncoder Encoder = EncodeRun({ASource, ASource + ASize, ADest});
  while (Encoder.Left() > 0) Encoder = EncodeGroup(Encoder);
  return static_cast<std::size_t>(Encoder.To - ADest);
}

// ---- Decoding -------------------------------------------------------------------------------------------------------

[[nodiscard]] constexpr std::size_t DecodedCapacity(std::size_t ALength) noexcept { return ALength / 4 * 3; }

/// Where a decoder stands, between two groups. The text is a multiple of 4 characters long and To began with its
/// DecodedCapacity: four characters make three bytes at most, so a quarter less than what is left fits behind To.
struct TDecoder {
  const char* From;
  const char* End;
  Byte* To;

  [[nodiscard]] std::ptrdiff_t Left() const noexcept { return End - From; }
};

/// The bits of each character at each of the four places of a group; all 32 of them where it has no value.
inline constexpr std::array<std::array<std::uint32_t, 256>, 4> cPlaced = [] {
  std::array<std::array<std::uint32_t, 256>, 4> Result{};
  for (std::size_t Place = 0; Place < 4; ++Place)
    for (std::size_t i = 0; i < 256; ++i)
      Result[Place][i] = cValues[i] == cNoValue ? ~std::uint32_t{0} : std::uint32_t{cValues[i]} << (18 - 6 * Place);
  return Result;
}();

/// The 24 bits of four characters; more where one of them is not in the alphabet.
inline std::uint32_t GroupBits(const char* AFrom) noexcept {
  const auto Placed = [AFrom](std::size_t APlace) { return cPlaced[APlace][static_cast<Byte>(AFrom[APlace])]; };
  return Placed(0) | Placed(1) | Placed(2) | Placed(3);
}

/// Eight characters at a time, as long as all of them are in the alphabet and the eight bytes that are written for them
/// fit.
[[nodiscard]] inline TDecoder DecodeRun(TDecoder ADecoder) noexcept {
  for (; ADecoder.Left() >= 12; ADecoder.From += 8, ADecoder.To += 6) {
    const std::uint32_t High = GroupBits(ADecoder.From);
    const std::uint32_t Low = GroupBits(ADecoder.From + 4);
    if ((High | Low) >> 24U != 0) break;
    StoreBigEndian(ADecoder.To, std::uint64_t{High} << 40U | std::uint64_t{Low} << 16U);
  }
  return ADecoder;
}

/// The next four characters of the alphabet, or as many as there are, past all that is not in it.
[[nodiscard]] inline TDecoder DecodeGroup(TDecoder ADecoder) noexcept {
  std::uint32_t Bits = 0;
  unsigned Count = 0;
  for (; ADecoder.Left() > 0 && Count < 4; ++ADecoder.From) {
    const Byte Value = cValues[static_cast<Byte>(*ADecoder.From)];
    if (Value == cNoValue) continue;
    Bits |= std::uint32_t{Value} << (18 - 6 * Count);
    ++Count;
  }
  for (unsigned i = 0; i < Count * 6 / 8; ++i) *ADecoder.To++ = static_cast<Byte>(Bits >> (16 - 8 * i));
  return ADecoder;
}

/// Decodes a text whose length is a multiple of 4 into the room of its DecodedCapacity, and returns the bytes written.
/// ARun does what it can at once, from where it stands on, and may stop anywhere between two groups.
template <class TRun>
std::size_t Decode(std::string_view AText, Byte* ADest, TRun ARun) noexcept {
  TDecoder Decoder{AText.data(), AText.data() + AText.size(), ADest};
  while (Decoder.Left() > 0) Decoder = DecodeGroup(ARun(Decoder));
  return static_cast<std::size_t>(Decoder.To - ADest);
}
inline std::size_t Decode(std::string_view AText, Byte* ADest) noexcept { return Decode(AText, ADest, DecodeRun); }

}  // namespace zq::base64
