#include "runtime/core/utf8.h"

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstring>
#include <utility>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif

namespace zq::utf8 {

namespace {

static_assert(std::endian::native == std::endian::little, "the first byte of a sequence is the lowest of its word");

constexpr char16_t cReplacement = 0xFFFD;

bool IsSurrogate(std::uint32_t c) noexcept { return (c & 0xF800U) == 0xD800U; }
bool IsHighSurrogate(std::uint32_t c) noexcept { return (c & 0xFC00U) == 0xD800U; }
bool IsLowSurrogate(std::uint32_t c) noexcept { return (c & 0xFC00U) == 0xDC00U; }

// Most text beyond ASCII is runs of well-formed sequences of one length. These look at four bytes at a time.

std::uint32_t LoadFour(const unsigned char* ASource) noexcept {
  std::uint32_t Four = 0;
  std::memcpy(&Four, ASource, 4);
  return Four;
}

bool IsPair(std::uint32_t AFour) noexcept { return (AFour & 0xC0FFU) - 0x80C2U <= 0x1DU; }
char16_t UnitOfPair(std::uint32_t AFour) noexcept {
  return static_cast<char16_t>((AFour & 0x1FU) << 6U | (AFour >> 8U & 0x3FU));
}

bool IsTriple(std::uint32_t AFour, std::uint32_t AUnit) noexcept {
  return (AFour & 0xC0C0F0U) == 0x8080E0 && AUnit >= 0x800 && !IsSurrogate(AUnit);
}
std::uint32_t UnitOfTriple(std::uint32_t AFour) noexcept {
  return (AFour & 0x0FU) << 12U | (AFour >> 2U & 0xFC0U) | (AFour >> 16U & 0x3FU);
}

bool IsQuad(std::uint32_t AFour, std::uint32_t ACodePoint) noexcept {
  return (AFour & 0xC0C0C0F8U) == 0x808080F0 && ACodePoint - 0x10000U < 0x100000U;
}
std::uint32_t CodePointOfQuad(std::uint32_t AFour) noexcept {
  return (AFour & 0x07U) << 18U | (AFour << 4U & 0x3F000U) | (AFour >> 10U & 0xFC0U) | (AFour >> 24U & 0x3FU);
}

// One sequence of two to four bytes. Follows table 3-7 of the Unicode standard: the range of the second byte depends on
// the first. Length is that of the sequence, or of the longest broken piece when Valid is false.
struct TSequence {
  std::uint32_t CodePoint;
  std::uint32_t Length;
  bool Valid;
};

TSequence ReadSequence(const unsigned char* p, std::size_t ALeft) noexcept {
  const std::uint32_t First = p[0];
  std::uint32_t Trail = 0;
  std::uint32_t Low = 0x80;
  std::uint32_t High = 0xBF;
  std::uint32_t CodePoint = 0;
  if (First >= 0xC2 && First <= 0xDF) {
    Trail = 1;
    CodePoint = First & 0x1FU;
  } else if (First >= 0xE0 && First <= 0xEF) {
    Trail = 2;
    CodePoint = First & 0x0FU;
    if (First == 0xE0) Low = 0xA0;
    if (First == 0xED) High = 0x9F;
  } else if (First >= 0xF0 && First <= 0xF4) {
    Trail = 3;
    CodePoint = First & 0x07U;
    if (First == 0xF0) Low = 0x90;
    if (First == 0xF4) High = 0x8F;
  } else {
    return {0, 1, false};
  }
  for (std::uint32_t i = 1; i <= Trail; ++i) {
    if (i >= ALeft || p[i] < Low || p[i] > High) return {0, i, false};
    CodePoint = CodePoint << 6U | (p[i] & 0x3FU);
    Low = 0x80;
    High = 0xBF;
  }
  return {CodePoint, Trail + 1, true};
}

std::uint64_t LoadBlock(const void* ASource) noexcept {
  std::uint64_t Block = 0;
  std::memcpy(&Block, ASource, 8);
  return Block;
}

// Whether the first eight bytes or units are ASCII: below that a run is over before vectors are worth their set-up.
bool StartsAscii(const char* ASource) noexcept { return (LoadBlock(ASource) & 0x8080808080808080U) == 0; }
bool StartsAscii(const char16_t* ASource) noexcept {
  return ((LoadBlock(ASource) | LoadBlock(ASource + 4)) & 0xFF80FF80FF80FF80U) == 0;
}

// Copies the ASCII run at the front and returns its length. What is left behind the last whole block is done with a
// block that overlaps the one before.
std::size_t WidenAscii(const char* ASource, std::size_t ALength, char16_t* ADest) noexcept {
  std::size_t i = 0;
#if defined(__SSE2__)
  const __m128i Zero = _mm_setzero_si128();
  while (i < ALength && ALength >= 16) {
    const std::size_t At = std::min(i, ALength - 16);
    const __m128i Block = _mm_loadu_si128(reinterpret_cast<const __m128i*>(ASource + At));
    if (_mm_movemask_epi8(Block) != 0) break;
    _mm_storeu_si128(reinterpret_cast<__m128i*>(ADest + At), _mm_unpacklo_epi8(Block, Zero));
    _mm_storeu_si128(reinterpret_cast<__m128i*>(ADest + At + 8), _mm_unpackhi_epi8(Block, Zero));
    i = At + 16;
  }
#endif
  for (; i < ALength && static_cast<unsigned char>(ASource[i]) < 0x80; ++i)
    ADest[i] = static_cast<unsigned char>(ASource[i]);
  return i;
}

// The same where nothing is written.
std::size_t WidenAscii(const char* ASource, std::size_t ALength, std::size_t) noexcept {
  return AsciiRun(ASource, ALength);
}

// The same the other way, of at least eight units.
std::size_t NarrowAscii(const char16_t* ASource, std::size_t ALength, char* ADest) noexcept {
  std::size_t i = 0;
#if defined(__SSE2__)
  const __m128i High = _mm_set1_epi16(static_cast<short>(0xFF80));
  const auto IsAscii = [&](__m128i ABlock) {
    return _mm_movemask_epi8(_mm_cmpeq_epi8(_mm_and_si128(ABlock, High), _mm_setzero_si128())) == 0xFFFF;
  };
  const auto Load = [&](std::size_t AAt) { return _mm_loadu_si128(reinterpret_cast<const __m128i*>(ASource + AAt)); };
  for (; i + 16 <= ALength; i += 16) {
    const __m128i Low8 = Load(i);
    const __m128i High8 = Load(i + 8);
    if (!IsAscii(_mm_or_si128(Low8, High8))) break;
    _mm_storeu_si128(reinterpret_cast<__m128i*>(ADest + i), _mm_packus_epi16(Low8, High8));
  }
  while (i < ALength) {
    const std::size_t At = std::min(i, ALength - 8);
    const __m128i Block = Load(At);
    if (!IsAscii(Block)) break;
    _mm_storel_epi64(reinterpret_cast<__m128i*>(ADest + At), _mm_packus_epi16(Block, Block));
    i = At + 8;
  }
#endif
  for (; i < ALength && ASource[i] < 0x80; ++i) ADest[i] = static_cast<char>(ASource[i]);
  return i;
}

// What the Put functions return is the place behind what they wrote.

char* PutDouble(char* ADest, std::uint32_t c) noexcept {
  const auto Pair = static_cast<std::uint16_t>(0x80C0U | c >> 6U | (c & 0x3FU) << 8U);
  std::memcpy(ADest, &Pair, 2);
  return ADest + 2;
}

char* PutTriple(char* ADest, std::uint32_t c) noexcept {
  ADest[0] = static_cast<char>(0xE0U | c >> 12U);
  ADest[1] = static_cast<char>(0x80U | (c >> 6U & 0x3FU));
  ADest[2] = static_cast<char>(0x80U | (c & 0x3FU));
  return ADest + 3;
}

char* PutQuad(char* ADest, std::uint32_t AHigh, std::uint32_t ALow) noexcept {
  const std::uint32_t c = 0x10000U + ((AHigh & 0x3FFU) << 10U | (ALow & 0x3FFU));
  const std::uint32_t Quad =
      0x808080F0U | c >> 18U | (c >> 4U & 0x3F00U) | (c << 10U & 0x3F0000U) | (c << 24U & 0x3F000000U);
  std::memcpy(ADest, &Quad, 4);
  return ADest + 4;
}

// Units go to a place or, where only their number is asked for, to a count.

void Put(char16_t*& ADest, std::uint32_t AUnit) noexcept { *ADest++ = static_cast<char16_t>(AUnit); }
void Put(std::size_t& ACount, std::uint32_t) noexcept { ++ACount; }

template <class TDest>
void PutSurrogates(TDest& ADest, std::uint32_t ACodePoint) noexcept {
  Put(ADest, 0xD7C0U + (ACodePoint >> 10U));
  Put(ADest, 0xDC00U | (ACodePoint & 0x3FFU));
}

// The run that ASource begins with; a sequence may begin before AStop, behind which seven bytes can be read. False
// where there is none.

template <class TDest>
[[gnu::always_inline]] inline bool DecodePairs(
    const unsigned char*& ASource, const unsigned char* AStop, TDest& ADest) noexcept {
  std::uint32_t Four = LoadFour(ASource);
  if (!IsPair(Four)) return false;
  do {
    Put(ADest, UnitOfPair(Four));
    ASource += 2;
    Four = LoadFour(ASource);
  } while (IsPair(Four) && ASource < AStop);
  return true;
}

template <class TDest>
[[gnu::always_inline]] inline bool DecodeTriples(
    const unsigned char*& ASource, const unsigned char* AStop, TDest& ADest) noexcept {
  std::uint32_t Four = LoadFour(ASource), Unit = UnitOfTriple(Four);
  if (!IsTriple(Four, Unit)) return false;
  do {
    Put(ADest, Unit);
    ASource += 3;
    Four = LoadFour(ASource);
    Unit = UnitOfTriple(Four);
  } while (ASource < AStop && IsTriple(Four, Unit));
  return true;
}

template <class TDest>
[[gnu::always_inline]] inline bool DecodeQuads(
    const unsigned char*& ASource, const unsigned char* AStop, TDest& ADest) noexcept {
  std::uint32_t Four = LoadFour(ASource), CodePoint = CodePointOfQuad(Four);
  if (!IsQuad(Four, CodePoint)) return false;
  do {
    PutSurrogates(ADest, CodePoint);
    ASource += 4;
    Four = LoadFour(ASource);
    CodePoint = CodePointOfQuad(Four);
  } while (ASource < AStop && IsQuad(Four, CodePoint));
  return true;
}

// What no run takes: a broken sequence, or one of two or three bytes at the very end. Inline, as the runs are, so that
// the caller's places stay in registers.
template <class TDest>
[[gnu::always_inline]] inline void DecodeOne(
    const unsigned char*& ASource, const unsigned char* AEnd, TDest& ADest, TMalformed AMalformed) noexcept {
  const TSequence Sequence = ReadSequence(ASource, static_cast<std::size_t>(AEnd - ASource));
  if (Sequence.Valid || AMalformed == TMalformed::Replace) {
    Put(ADest, Sequence.Valid ? Sequence.CodePoint : cReplacement);
  } else {
    for (std::uint32_t k = 0; k < Sequence.Length; ++k) Put(ADest, 0xDC00U | ASource[k]);
  }
  ASource += Sequence.Length;
}

// Step by step: returns the place behind what it wrote.
template <class TDest>
[[gnu::always_inline]] inline TDest DecodeRest(
    const unsigned char* ASource, const unsigned char* AEnd, TDest ADest, TMalformed AMalformed) noexcept {
  while (ASource < AEnd) {
    if (*ASource < 0x80) {
      Put(ADest, *ASource++);
      continue;
    }
    const std::uint32_t Four = AEnd - ASource >= 4 ? LoadFour(ASource) : 0;
    const std::uint32_t Unit = UnitOfTriple(Four), CodePoint = CodePointOfQuad(Four);
    if (IsPair(Four)) Put(ADest, UnitOfPair(Four)), ASource += 2;
    else if (IsTriple(Four, Unit)) Put(ADest, Unit), ASource += 3;
    else if (IsQuad(Four, CodePoint)) PutSurrogates(ADest, CodePoint), ASource += 4;
    else DecodeOne(ASource, AEnd, ADest, AMalformed);
  }
  return ADest;
}

// Goes by eight bytes as long as there are that many, and step by step behind. Returns the units written or counted.
template <class TDest>
[[gnu::always_inline]] inline std::size_t DecodeAll(
    const char* ASource, std::size_t ALength, TDest ADest, TMalformed AMalformed) noexcept {
  const auto* Source = reinterpret_cast<const unsigned char*>(ASource);
  const auto* const End = Source + ALength;
  const auto* const Stop = ALength < 8 ? Source : End - 7;
  TDest Dest = ADest;
  while (Source < Stop) {
    if (*Source < 0x80) {
      const auto* const Text = reinterpret_cast<const char*>(Source);
      if (StartsAscii(Text)) {
        const std::size_t Run = WidenAscii(Text, static_cast<std::size_t>(End - Source), Dest);
        Source += Run;
        Dest += Run;
      } else {
        do Put(Dest, *Source++);
        while (*Source < 0x80);
      }
      if (Source >= Stop) break;
    }
    if (DecodePairs(Source, Stop, Dest) || DecodeTriples(Source, Stop, Dest) || DecodeQuads(Source, Stop, Dest)) {
      if (*Source < 0x80) Put(Dest, *Source++);  // the blank between two words
    } else {
      DecodeOne(Source, End, Dest, AMalformed);
    }
  }
  return static_cast<std::size_t>(DecodeRest(Source, End, Dest, AMalformed) - ADest);
}

// The run of characters of one length at the front, none of which begins behind AStop. False where there is none.

[[gnu::always_inline]] inline bool EncodeDoubles(
    const char16_t*& ASource, const char16_t* AStop, char*& ADest) noexcept {
  std::uint32_t c = *ASource;
  if (c >= 0x800) return false;
  do {
    ADest = PutDouble(ADest, c);
    c = *++ASource;
  } while (c - 0x80U < 0x780U && ASource < AStop);
  return true;
}

[[gnu::always_inline]] inline bool EncodeTriples(
    const char16_t*& ASource, const char16_t* AStop, char*& ADest) noexcept {
  std::uint32_t c = *ASource;
  if (IsSurrogate(c)) return false;
  do {
    ADest = PutTriple(ADest, c);
    c = *++ASource;
  } while (c >= 0x800 && !IsSurrogate(c) && ASource < AStop);
  return true;
}

[[gnu::always_inline]] inline bool EncodeQuads(const char16_t*& ASource, const char16_t* AStop, char*& ADest) noexcept {
  if (!IsHighSurrogate(ASource[0]) || !IsLowSurrogate(ASource[1])) return false;
  do {
    ADest = PutQuad(ADest, ASource[0], ASource[1]);
    ASource += 2;
  } while (IsHighSurrogate(ASource[0]) && IsLowSurrogate(ASource[1]) && ASource < AStop);
  return true;
}

// A surrogate without its partner.
char* EncodeLone(std::uint32_t c, char* ADest, TMalformed AMalformed) noexcept {
  if (AMalformed == TMalformed::Replace || c < 0xDC80 || c > 0xDCFF) return PutTriple(ADest, cReplacement);
  *ADest = static_cast<char>(c);
  return ADest + 1;
}

// One character beyond ASCII; ASource moves along. Returns the place behind its bytes.
[[gnu::always_inline]] inline char* EncodeOne(
    const char16_t*& ASource, const char16_t* AEnd, char* ADest, TMalformed AMalformed) noexcept {
  const std::uint32_t c = *ASource++;
  if (c < 0x800) return PutDouble(ADest, c);
  if (!IsSurrogate(c)) return PutTriple(ADest, c);
  if (IsHighSurrogate(c) && ASource < AEnd && IsLowSurrogate(*ASource)) return PutQuad(ADest, c, *ASource++);
  return EncodeLone(c, ADest, AMalformed);
}

// Step by step: returns the place behind what it wrote.
ZQ_HOT [[gnu::aligned(64)]] char* EncodeRest(
    const char16_t* ASource, const char16_t* AEnd, char* ADest, TMalformed AMalformed) noexcept {
  while (ASource < AEnd) {
    if (*ASource < 0x80) *ADest++ = static_cast<char>(*ASource++);
    else ADest = EncodeOne(ASource, AEnd, ADest, AMalformed);
  }
  return ADest;
}

// At least eight units, at a time as long as there are that many, and step by step behind. This one, EncodeRest and the
// two that decode begin on a cache line: with some compilers that is a quarter of their speed.
[[gnu::noinline, gnu::aligned(64)]] char* EncodeMixed(
    const char16_t* ASource, const char16_t* AEnd, char* ADest, TMalformed AMalformed) noexcept {
  const char16_t* const Stop = AEnd - 7;
  while (ASource < Stop) {
    if (*ASource < 0x80) {
      if (StartsAscii(ASource)) {
        const std::size_t Run = NarrowAscii(ASource, static_cast<std::size_t>(AEnd - ASource), ADest);
        ASource += Run;
        ADest += Run;
      } else {
        do *ADest++ = static_cast<char>(*ASource++);
        while (*ASource < 0x80);
      }
      if (ASource >= Stop) break;
    }
    if (EncodeDoubles(ASource, Stop, ADest) || EncodeTriples(ASource, Stop, ADest) ||
        EncodeQuads(ASource, Stop, ADest)) {
      if (*ASource < 0x80) *ADest++ = static_cast<char>(*ASource++);  // the blank between two words
    } else {
      ADest = EncodeLone(*ASource++, ADest, AMalformed);
    }
  }
  return EncodeRest(ASource, AEnd, ADest, AMalformed);
}

}  // namespace

std::size_t AsciiRun(const char* ASource, std::size_t ALength) noexcept {
  std::size_t i = 0;
  while (i + 8 <= ALength && StartsAscii(ASource + i)) i += 8;
  while (i < ALength && static_cast<unsigned char>(ASource[i]) < 0x80) ++i;
  return i;
}

std::size_t AsciiRun(const char16_t* ASource, std::size_t ALength) noexcept {
  std::size_t i = 0;
  while (i + 8 <= ALength && StartsAscii(ASource + i)) i += 8;
  while (i < ALength && ASource[i] < 0x80) ++i;
  return i;
}

[[gnu::aligned(64)]] std::size_t Decode(
    const char* ASource, std::size_t ALength, char16_t* ADest, TMalformed AMalformed) noexcept {
  return DecodeAll(ASource, ALength, ADest, AMalformed);
}

[[gnu::aligned(64)]] std::size_t DecodedLength(const char* ASource, std::size_t ALength) noexcept {
  return DecodeAll(ASource, ALength, std::size_t{0}, TMalformed::Replace);
}

ZQ_HOT std::size_t Encode(const char16_t* ASource, std::size_t ALength, char* ADest, TMalformed AMalformed) noexcept {
  const char16_t* const End = ASource + ALength;
  if (ALength < 8) return static_cast<std::size_t>(EncodeRest(ASource, End, ADest, AMalformed) - ADest);
  const std::size_t Run = StartsAscii(ASource) ? NarrowAscii(ASource, ALength, ADest) : 0;
  if (Run == ALength) return Run;
  const auto Encoding = ALength - Run < 8 ? EncodeRest : EncodeMixed;
  return static_cast<std::size_t>(Encoding(ASource + Run, End, ADest + Run, AMalformed) - ADest);
}

std::size_t EncodedLength(const char16_t* ASource, std::size_t ALength) noexcept {
  std::size_t Result = 0;
  for (std::size_t i = 0; i < ALength; ++i) {
    const char16_t c = ASource[i];
    if (IsHighSurrogate(c) && i + 1 < ALength && IsLowSurrogate(ASource[i + 1])) {
      Result += 4;
      ++i;
    } else {
      Result += c < 0x80 ? 1 : c < 0x800 ? 2 : 3;
    }
  }
  return Result;
}

std::u16string Decode(std::string_view ASource, TMalformed AMalformed) {
  std::u16string Result(ASource.size(), u'\0');
  Result.resize(Decode(ASource.data(), ASource.size(), Result.data(), AMalformed));
  return Result;
}

std::string Encode(std::u16string_view ASource, TMalformed AMalformed) {
  std::string Result(ASource.size() * 3, '\0');
  Result.resize(Encode(ASource.data(), ASource.size(), Result.data(), AMalformed));
  return Result;
}

void TBuffer::Grow(std::size_t ABytes) {
  const std::size_t Room = std::max(FSize + ABytes, 2 * FRoom);
  auto Bytes = std::make_unique_for_overwrite<char[]>(Room);
  if (FSize != 0) std::memcpy(Bytes.get(), FBytes.get(), FSize);
  FBytes = std::move(Bytes);
  FRoom = Room;
}

}  // namespace zq::utf8
