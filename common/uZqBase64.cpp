#include "common/uZqBase64.h"

#if defined(__x86_64__)
#include <immintrin.h>
#endif

#include <memory>
#include <span>
#include <string>

#include "common/uZqBase64/portable.h"
#include "common/uZqClasses/streams.h"
#include "common/uZqTypes.h"
#include "runtime/core/objects.h"
#include "runtime/io/streams.h"

namespace zq {

// ------------------------------------------------------------------------------------------- codec between buffers

namespace {

#if defined(__x86_64__)

bool HasAvx2() noexcept { return __builtin_cpu_supports("avx2") != 0; }

__m128i Load16(const void* AFrom) noexcept { return _mm_loadu_si128(static_cast<const __m128i*>(AFrom)); }

// The table of 16 bytes in both halves, as the look-up by bytes wants it.
[[gnu::target("avx2")]] __m256i Twice(__m128i ATable) noexcept { return _mm256_broadcastsi128_si256(ATable); }

// Four values of 6 bits from each 3 bytes; the first 12 bytes of each half.
[[gnu::target("avx2")]] inline __m256i Split(__m256i ABytes) noexcept {
  // Of the bytes a, b, c each 32 bits get b, a, c, b: the words a:b and b:c, each with two values in one piece.
  const __m256i Words =
      _mm256_shuffle_epi8(ABytes, Twice(_mm_setr_epi8(1, 0, 2, 1, 4, 3, 5, 4, 7, 6, 8, 7, 10, 9, 11, 10)));
  // A product shifts each word its own way: the even values right by 10 and 6, the odd ones left by 4 and 8.
  const __m256i Even =
      _mm256_mulhi_epu16(_mm256_and_si256(Words, _mm256_set1_epi32(0x0FC0FC00)), _mm256_set1_epi32(0x04000040));
  const __m256i Odd =
      _mm256_mullo_epi16(_mm256_and_si256(Words, _mm256_set1_epi32(0x003F03F0)), _mm256_set1_epi32(0x01000010));
  return _mm256_or_si256(Even, Odd);
}

// The characters of the values: what to add is found by the range that a value lies in, which is 13 for the capitals, 0
// for the small letters, 1 to 10 for the digits, 11 and 12 for the signs.
[[gnu::target("avx2")]] inline __m256i ToCharacters(__m256i AValues) noexcept {
  constexpr char cDigit = '0' - 52;
  const __m256i Distances = Twice(_mm_setr_epi8('a' - 26, cDigit, cDigit, cDigit, cDigit, cDigit, cDigit, cDigit,
      cDigit, cDigit, cDigit, '+' - 62, '/' - 63, 'A', 0, 0));
  const __m256i Capitals = _mm256_cmpgt_epi8(_mm256_set1_epi8(26), AValues);
  const __m256i Ranges = _mm256_or_si256(
      _mm256_subs_epu8(AValues, _mm256_set1_epi8(51)), _mm256_and_si256(Capitals, _mm256_set1_epi8(13)));
  return _mm256_add_epi8(AValues, _mm256_shuffle_epi8(Distances, Ranges));
}

// 24 bytes at a time, as long as there are the 28 that are read for them.
[[gnu::target("avx2")]] base64::TEncoder EncodeRunAvx2(base64::TEncoder AEncoder) noexcept {
  for (; AEncoder.Left() >= 28; AEncoder.From += 24, AEncoder.To += 32) {
    const __m256i Bytes =
        _mm256_inserti128_si256(_mm256_castsi128_si256(Load16(AEncoder.From)), Load16(AEncoder.From + 12), 1);
    _mm256_storeu_si256(reinterpret_cast<__m256i*>(AEncoder.To), ToCharacters(Split(Bytes)));
  }
  return AEncoder;
}

// A character is in the alphabet when its high and its low half agree. Each high half is of a class, a bit:
//   1: 0x2. ("+" and "/")   2: 0x3. (digits)   4: 0x4. and 0x6. (all but 0)   8: 0x5. and 0x7. (0 to A)   16: none
// and each low half names the classes that have no such character.
[[gnu::target("avx2")]] inline bool AllInAlphabet(__m256i AHighHalves, __m256i ALowHalves) noexcept {
  const __m256i Classes = Twice(_mm_setr_epi8(16, 16, 1, 2, 4, 8, 4, 8, 16, 16, 16, 16, 16, 16, 16, 16));
  const __m256i Without = Twice(_mm_setr_epi8(21, 17, 17, 17, 17, 17, 17, 17, 17, 17, 19, 26, 27, 27, 27, 26));
  return _mm256_testz_si256(_mm256_shuffle_epi8(Classes, AHighHalves), _mm256_shuffle_epi8(Without, ALowHalves)) != 0;
}

// 32 characters at a time, as long as all of them are in the alphabet and the 32 bytes that are written for them fit.
[[gnu::target("avx2")]] base64::TDecoder DecodeRunAvx2(base64::TDecoder ADecoder) noexcept {
  constexpr char cCapital = -'A';
  constexpr char cSmall = 26 - 'a';
  // By the high half, one less for "/".
  const __m256i Distances =
      Twice(_mm_setr_epi8(0, 63 - '/', 62 - '+', 52 - '0', cCapital, cCapital, cSmall, cSmall, 0, 0, 0, 0, 0, 0, 0, 0));
  const __m256i Halves = _mm256_set1_epi8(0x0F);
  for (; ADecoder.Left() >= 44; ADecoder.From += 32, ADecoder.To += 24) {
    const __m256i Text = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(ADecoder.From));
    const __m256i High = _mm256_and_si256(_mm256_srli_epi32(Text, 4), Halves);
    if (!AllInAlphabet(High, _mm256_and_si256(Text, Halves))) break;
    const __m256i Slash = _mm256_cmpeq_epi8(Text, _mm256_set1_epi8('/'));
    const __m256i Values = _mm256_add_epi8(Text, _mm256_shuffle_epi8(Distances, _mm256_add_epi8(High, Slash)));
    // Two values to 12 bits, two of these to 24, whose bytes are turned round and pushed together.
    const __m256i Pairs = _mm256_maddubs_epi16(Values, _mm256_set1_epi32(0x01400140));
    const __m256i Groups = _mm256_madd_epi16(Pairs, _mm256_set1_epi32(0x00011000));
    const __m256i Bytes =
        _mm256_shuffle_epi8(Groups, Twice(_mm_setr_epi8(2, 1, 0, 6, 5, 4, 10, 9, 8, 14, 13, 12, -1, -1, -1, -1)));
    _mm256_storeu_si256(reinterpret_cast<__m256i*>(ADecoder.To),
        _mm256_permutevar8x32_epi32(Bytes, _mm256_setr_epi32(0, 1, 2, 4, 5, 6, 7, 7)));
  }
  return ADecoder;
}

std::size_t Encode(std::span<const Byte> ASource, char* ADest) noexcept {
  base64::TEncoder Encoder{ASource.data(), ASource.data() + ASource.size(), ADest};
  if (HasAvx2()) Encoder = EncodeRunAvx2(Encoder);
  const auto Rest = static_cast<std::size_t>(Encoder.Left());
  return static_cast<std::size_t>(Encoder.To - ADest) + base64::Encode(Encoder.From, Rest, Encoder.To);
}

std::size_t Decode(std::string_view AText, Byte* ADest) noexcept {
  if (!HasAvx2()) return base64::Decode(AText, ADest);
  return base64::Decode(
      AText, ADest, [](const base64::TDecoder& ADecoder) { return base64::DecodeRun(DecodeRunAvx2(ADecoder)); });
}

#else

std::size_t Encode(std::span<const Byte> ASource, char* ADest) noexcept {
  return base64::Encode(ASource.data(), ASource.size(), ADest);
}
std::size_t Decode(std::string_view AText, Byte* ADest) noexcept { return base64::Decode(AText, ADest); }

#endif

// ------------------------------------------------------------------------------------------------------- streams

std::string_view TextOf(const TZqReadBuf& ABuf) noexcept {
  return {static_cast<const char*>(ABuf.Data()), ABuf.Size()};
}

// Has AFill, which returns their number, make at most ACapacity bytes for ADest: in its own block, and the position
// stays, or in one that is written to it.
template <class TFill>
void WriteTo(TStream* ADest, std::size_t ACapacity, TFill AFill) {
  void* Room = nullptr;
  const bool Owned = ZqStreamToWriteBuf(ADest, Room, ACapacity);
  const std::unique_ptr<void, decltype(&FreeMem)> Block(Owned ? Room : nullptr, &FreeMem);
  const std::size_t Count = AFill(static_cast<Byte*>(Room));
  Assert(Count <= ACapacity);
  if (Owned) ADest->WriteBuffer(Room, static_cast<Int64>(Count));
  else ADest->SetSize(ADest->Position() + static_cast<Int64>(Count));
}

void TestLength(std::string_view AText) {
  if (AText.size() % 4 != 0) throw Exception(uZqBase64::_SInvalidBase64Data);
}

}  // namespace

// ------------------------------------------------------------------------------------------------------- encoding

void ZqEncodeBase64(TStream* ASource, TStream* ADest) {
  Assert(ASource != ADest);
  const TZqReadBuf Source(ASource);
  WriteTo(ADest, base64::EncodedSize(Source.Size()), [&](Byte* ARoom) {
    return Encode({static_cast<const Byte*>(Source.Data()), Source.Size()}, reinterpret_cast<char*>(ARoom));
  });
}

AnsiString ZqEncodeBase64(TStream* ASource) {
  const TZqReadBuf Source(ASource);
  return ZqEncodeBase64(Source.Data(), Source.Size());
}

AnsiString ZqEncodeBase64(std::string_view AValue) { return ZqEncodeBase64(AValue.data(), AValue.size()); }

AnsiString ZqEncodeBase64(const WideString& AValue) {
  return ZqEncodeBase64(AValue.data(), AValue.size() * sizeof(WideChar));
}

AnsiString ZqEncodeBase64(const TBytes& AValue) { return ZqEncodeBase64(AValue.data(), AValue.size()); }

AnsiString ZqEncodeBase64(const void* ABuf, NativeUInt ASize) {
  std::string Result(base64::EncodedSize(ASize), '\0');
  Assert(Encode({static_cast<const Byte*>(ABuf), ASize}, Result.data()) == Result.size());
  return Result;
}

// ------------------------------------------------------------------------------------------------------- decoding

TBytes ZqDecodeBase64(std::string_view AValue) {
  TestLength(AValue);
  TBytes Result(base64::DecodedCapacity(AValue.size()));
  Result.resize(Decode(AValue, Result.data()));
  return Result;
}

TBytes ZqDecodeBase64(const WideString& AValue) { return ZqDecodeBase64(TZqEncoding::ConvertW(AValue, 0).View()); }

void* ZqDecodeBase64(std::string_view AValue, NativeUInt& ASize) {
  ASize = 0;
  TestLength(AValue);
  std::unique_ptr<void, decltype(&FreeMem)> Block(GetMem(base64::DecodedCapacity(AValue.size())), &FreeMem);
  ASize = Decode(AValue, static_cast<Byte*>(Block.get()));
  return ASize == 0 ? nullptr : Block.release();
}

void ZqDecodeBase64(std::string_view AValue, TStream* AStream) {
  Assert(AStream != nullptr);
  TestLength(AValue);
  if (AValue.empty()) return;
  WriteTo(AStream, base64::DecodedCapacity(AValue.size()), [&](Byte* ARoom) { return Decode(AValue, ARoom); });
}

void ZqDecodeBase64(TStream* ASource, TStream* ADest) {
  Assert(ASource != ADest);
  const TZqReadBuf Source(ASource);
  ZqDecodeBase64(TextOf(Source), ADest);
}

}  // namespace zq
