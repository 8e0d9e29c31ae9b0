#pragma once

#include <algorithm>
#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <utility>

#include "runtime/core/types.h"

/// SHA-1 in plain C++. For the module, its tests and its benchmark alone.
namespace zq::sha1 {

using TState = std::array<std::uint32_t, 5>;
inline constexpr TState cStart{0x67452301, 0xEFCDAB89, 0x98BADCFE, 0x10325476, 0xC3D2E1F0};
inline constexpr std::size_t cBlockSize = 64;

/// The first byte of a word is the highest.
template <class T>
[[nodiscard]] constexpr T BigEndian(T AValue) noexcept {
  if constexpr (std::endian::native == std::endian::big) return AValue;
  else if constexpr (sizeof(T) == 8) return __builtin_bswap64(AValue);
  else return __builtin_bswap32(AValue);
}
inline std::uint32_t LoadWord(const Byte* AFrom) noexcept {
  std::uint32_t Result = 0;
  std::memcpy(&Result, AFrom, sizeof Result);
  return BigEndian(Result);
}

/// Of the 80 words of a block the last 16.
using TSchedule = std::array<std::uint32_t, 16>;

template <std::size_t AIndex>
[[gnu::always_inline]] inline std::uint32_t Word(TSchedule& AWords, const Byte* ABlock) noexcept {
  std::uint32_t& Result = AWords[AIndex % 16];
  if constexpr (AIndex < 16) Result = LoadWord(ABlock + 4 * AIndex);
  else
    Result = std::rotl(AWords[(AIndex + 13) % 16] ^ AWords[(AIndex + 8) % 16] ^ AWords[(AIndex + 2) % 16] ^ Result, 1);
  return Result;
}

/// The step leaves its result in E's place, which is A's in the next one.
template <std::size_t AIndex>
[[gnu::always_inline]] inline void Step(TState& AState, TSchedule& AWords, const Byte* ABlock) noexcept {
  constexpr std::array<std::uint32_t, 4> cSums{0x5A827999, 0x6ED9EBA1, 0x8F1BBCDC, 0xCA62C1D6};
  constexpr std::size_t cA = (80 - AIndex) % 5;
  const std::uint32_t C = AState[(cA + 2) % 5], D = AState[(cA + 3) % 5];
  std::uint32_t& B = AState[(cA + 1) % 5];
  std::uint32_t& E = AState[(cA + 4) % 5];
  E += cSums[AIndex / 20] + Word<AIndex>(AWords, ABlock);
  if constexpr (AIndex < 20) E += D ^ (B & (C ^ D));
  else if constexpr (AIndex >= 40 && AIndex < 60) E += (C & D) + (B & (C ^ D));
  else E += B ^ C ^ D;
  E += std::rotl(AState[cA], 5);
  B = std::rotl(B, 30);
}

template <std::size_t... AIndex>
[[gnu::always_inline]] inline void Steps(
    std::index_sequence<AIndex...>, TState& AState, TSchedule& AWords, const Byte* ABlock) noexcept {
  (Step<AIndex>(AState, AWords, ABlock), ...);
}

inline void AddBlocks(TState& AState, const Byte* ABlocks, std::size_t ACount) noexcept {
  TSchedule Words;
  for (; ACount > 0; --ACount, ABlocks += cBlockSize) {
    TState Work = AState;
    Steps(std::make_index_sequence<80>(), Work, Words, ABlocks);
    for (std::size_t i = 0; i < Work.size(); ++i) AState[i] += Work[i];
  }
}

/// The digest of a message, whose whole blocks, and those that end it, AAdd works into the state.
template <class TAdd>
[[nodiscard]] std::array<Byte, 20> Hash(const Byte* AMessage, std::size_t ASize, TAdd AAdd) noexcept {
  TState State = cStart;
  AAdd(State, AMessage, ASize / cBlockSize);
  const std::size_t Left = ASize % cBlockSize;
  std::array<Byte, 2 * cBlockSize> End{};
  std::copy_n(AMessage + (ASize - Left), Left, End.data());
  End[Left] = 0x80;
  const std::uint64_t Bits = BigEndian(std::uint64_t{ASize} * 8);
  const std::size_t Blocks = Left + 1 + sizeof Bits <= cBlockSize ? 1 : 2;
  std::memcpy(End.data() + Blocks * cBlockSize - sizeof Bits, &Bits, sizeof Bits);
  AAdd(State, End.data(), Blocks);
  for (std::uint32_t& Word : State) Word = BigEndian(Word);
  return std::bit_cast<std::array<Byte, 20>>(State);
}

}  // namespace zq::sha1
