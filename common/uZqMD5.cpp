#include "common/uZqMD5.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <utility>

#include "common/uZqClasses/hex.h"

namespace zq {

// --------------------------------------------------------------------------------------------------------- blocks

namespace {

constexpr std::size_t cBlockSize = sizeof(TMD5Buffer);
constexpr std::array<Cardinal, 64> cSines{// 2 to the 32nd times |sin(1)|, |sin(2)| and so on
    0xD76AA478, 0xE8C7B756, 0x242070DB, 0xC1BDCEEE, 0xF57C0FAF, 0x4787C62A, 0xA8304613, 0xFD469501,  //
    0x698098D8, 0x8B44F7AF, 0xFFFF5BB1, 0x895CD7BE, 0x6B901122, 0xFD987193, 0xA679438E, 0x49B40821,  //
    0xF61E2562, 0xC040B340, 0x265E5A51, 0xE9B6C7AA, 0xD62F105D, 0x02441453, 0xD8A1E681, 0xE7D3FBC8,  //
    0x21E1CDE6, 0xC33707D6, 0xF4D50D87, 0x455A14ED, 0xA9E3E905, 0xFCEFA3F8, 0x676F02D9, 0x8D2A4C8A,  //
    0xFFFA3942, 0x8771F681, 0x6D9D6122, 0xFDE5380C, 0xA4BEEA44, 0x4BDECFA9, 0xF6BB4B60, 0xBEBFBC70,  //
    0x289B7EC6, 0xEAA127FA, 0xD4EF3085, 0x04881D05, 0xD9D4D039, 0xE6DB99E5, 0x1FA27CF8, 0xC4AC5665,  //
    0xF4292244, 0x432AFF97, 0xAB9423A7, 0xFC93A039, 0x655B59C3, 0x8F0CCC92, 0xFFEFF47D, 0x85845DD1,  //
    0x6FA87E4F, 0xFE2CE6E0, 0xA3014314, 0x4E0811A1, 0xF7537E82, 0xBD3AF235, 0x2AD7D2BB, 0xEB86D391};
constexpr int cShifts[4][4] = {{7, 12, 17, 22}, {5, 9, 14, 20}, {4, 11, 16, 23}, {6, 10, 15, 21}};

// The first byte of a word is the lowest.
constexpr Cardinal LittleEndian(Cardinal AValue) noexcept {
  return std::endian::native == std::endian::little ? AValue : __builtin_bswap32(AValue);
}
Cardinal LoadWord(const Byte* AFrom) noexcept {
  Cardinal Result = 0;
  std::memcpy(&Result, AFrom, sizeof Result);
  return LittleEndian(Result);
}
template <std::size_t ACount>
std::array<Byte, 4 * ACount> ToBytes(std::array<Cardinal, ACount> AWords) noexcept {
  for (Cardinal& Word : AWords) Word = LittleEndian(Word);
  return std::bit_cast<std::array<Byte, 4 * ACount>>(AWords);
}

// Each step waits for the B of the one before it, and for nothing else: what doesn't hang on that is summed up first.
// The compiler would put the constant, or a part of G, behind it again, if it saw through the sum.
[[gnu::always_inline]] inline void SumUp(Cardinal& ASum) noexcept { asm("" : "+r"(ASum)); }

// The step leaves its result in A's place, which is B's in the next one. The last one's, which the next block waits
// for, gets AOldB on the way.
template <std::size_t AIndex>
[[gnu::always_inline]] inline void Step(TMD5State& AState, const Byte* ABlock, Cardinal AOldB) noexcept {
  constexpr std::size_t cRound = AIndex / 16;
  constexpr std::size_t cWords[4] = {AIndex % 16, (5 * AIndex + 1) % 16, (3 * AIndex + 5) % 16, 7 * AIndex % 16};
  constexpr std::size_t cA = (64 - AIndex) % 4;
  const Cardinal B = AState[(cA + 1) % 4], C = AState[(cA + 2) % 4], D = AState[(cA + 3) % 4];
  Cardinal Sum = AState[cA] + cSines[AIndex] + LoadWord(ABlock + 4 * cWords[cRound]);
  if constexpr (cRound == 1) Sum += C & ~D;  // the two parts have no bit in common
  SumUp(Sum);
  if constexpr (cRound == 0) Sum += D ^ (B & (C ^ D));
  else if constexpr (cRound == 1) Sum += B & D;
  else if constexpr (cRound == 2) Sum += (C ^ D) ^ B;
  else Sum += C ^ (B | ~D);
  Cardinal Before = B;
  if constexpr (AIndex == 63) SumUp(Before += AOldB);
  AState[cA] = std::rotl(Sum, cShifts[cRound][AIndex % 4]) + Before;
}

template <std::size_t... AIndex>
[[gnu::always_inline]] inline void Steps(
    std::index_sequence<AIndex...>, TMD5State& AState, const Byte* ABlock, Cardinal AOldB) noexcept {
  (Step<AIndex>(AState, ABlock, AOldB), ...);
}

void AddBlocks(TMD5State& AState, const Byte* ABlocks, std::size_t ACount) noexcept {
  TMD5State State = AState;
  for (; ACount > 0; --ACount, ABlocks += cBlockSize) {
    const TMD5State Old = State;
    Steps(std::make_index_sequence<64>(), State, ABlocks, Old[1]);
    for (const std::size_t i : {0U, 2U, 3U}) State[i] += Old[i];
  }
  AState = State;
}

// The digest of a message of which ARest, less than a block, is not yet in the state.
TMD5Digest Finish(TMD5State AState, const Byte* ARest, std::size_t ALeft, const TMD5Count& ACount) noexcept {
  const TMD5CBits Bits = ToBytes(ACount);
  std::array<Byte, 2 * cBlockSize> End{};
  std::copy_n(ARest, ALeft, End.data());
  End[ALeft] = 0x80;
  const std::size_t Blocks = ALeft + 1 + Bits.size() <= cBlockSize ? 1 : 2;
  std::copy_n(Bits.data(), Bits.size(), End.data() + Blocks * cBlockSize - Bits.size());
  AddBlocks(AState, End.data(), Blocks);
  return ToBytes(AState);
}

constexpr TMD5State cStart{0x67452301, 0xEFCDAB89, 0x98BADCFE, 0x10325476};

// Bits beyond 64 are lost, as the standard has it.
UInt64 BytesIn(const TMD5Context& AContext) noexcept {
  return (UInt64{AContext.Count[1]} << 32U | AContext.Count[0]) / 8;
}
TMD5Count BitsOf(UInt64 ABytes) noexcept {
  return {static_cast<Cardinal>(ABytes << 3U), static_cast<Cardinal>(ABytes >> 29U)};
}

}  // namespace

// ------------------------------------------------------------------------------------------------ piece by piece

void MD5Init(TMD5Context& AContext) noexcept { AContext = {.State = cStart}; }

void MD5Update(TMD5Context& AContext, const void* AInput, NativeInt ALength) {
  Assert(ALength >= 0 && (AInput != nullptr || ALength == 0));
  const auto* From = static_cast<const Byte*>(AInput);
  auto Left = static_cast<std::size_t>(ALength);
  const UInt64 Before = BytesIn(AContext);
  AContext.Count = BitsOf(Before + Left);
  if (const std::size_t Held = Before % cBlockSize; Held > 0) {
    const std::size_t Count = std::min(Left, cBlockSize - Held);
    std::copy_n(From, Count, AContext.Buffer.data() + Held);
    if (Held + Count < cBlockSize) return;
    AddBlocks(AContext.State, AContext.Buffer.data(), 1);
    From += Count;
    Left -= Count;
  }
  AddBlocks(AContext.State, From, Left / cBlockSize);
  std::copy_n(From + (Left - Left % cBlockSize), Left % cBlockSize, AContext.Buffer.data());
}

void MD5Final(TMD5Context& AContext, TMD5Digest& ADigest) noexcept {
  ADigest = Finish(AContext.State, AContext.Buffer.data(), BytesIn(AContext) % cBlockSize, AContext.Count);
  AContext = {};
}

// --------------------------------------------------------------------------------------------------- in one call

TMD5Digest MD5Hash(const void* ABuf, NativeInt ASize) {
  Assert(ASize >= 0 && (ABuf != nullptr || ASize == 0));
  const auto* const Bytes = static_cast<const Byte*>(ABuf);
  const auto Size = static_cast<std::size_t>(ASize);
  const std::size_t Left = Size % cBlockSize;
  TMD5State State = cStart;
  AddBlocks(State, Bytes, Size / cBlockSize);
  return Finish(State, Bytes + (Size - Left), Left, BitsOf(Size));
}

namespace {

template <class TChar>
AnsiString HexOf(std::basic_string_view<TChar> AText) {
  const TMD5Digest Digest = MD5Hash(AText.data(), static_cast<NativeInt>(AText.size() * sizeof(TChar)));
  return ZqBufToHex(Digest.data(), Digest.size());
}

}  // namespace

AnsiString MD5Hash(std::string_view AValue) { return HexOf(AValue); }

AnsiString MD5Hash(std::u16string_view AValue) { return HexOf(AValue); }

}  // namespace zq
