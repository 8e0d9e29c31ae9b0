#include "runtime/text/page_table.h"

#include <unicode/uchar.h>
#include <unicode/unorm2.h>

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstring>
#include <memory>
#include <new>

#if defined(__x86_64__)
#include <immintrin.h>
#endif

namespace zq {

namespace {

using TSingles = std::array<char16_t, 256>;

#if defined(__x86_64__)

// AUnitAt tells the unit for each of eight bytes.
template <class TUnitAt>
void PutEight(char16_t* ADest, TUnitAt AUnitAt) noexcept {
  __m128i Units = _mm_cvtsi32_si128(AUnitAt(0));
  Units = _mm_insert_epi16(Units, AUnitAt(1), 1);
  Units = _mm_insert_epi16(Units, AUnitAt(2), 2);
  Units = _mm_insert_epi16(Units, AUnitAt(3), 3);
  Units = _mm_insert_epi16(Units, AUnitAt(4), 4);
  Units = _mm_insert_epi16(Units, AUnitAt(5), 5);
  Units = _mm_insert_epi16(Units, AUnitAt(6), 6);
  Units = _mm_insert_epi16(Units, AUnitAt(7), 7);
  _mm_storeu_si128(reinterpret_cast<__m128i*>(ADest), Units);
}

constexpr std::size_t cBlock = 32;

bool HasAvx512() noexcept { return __builtin_cpu_supports("avx512bw") != 0; }

[[gnu::target("avx512bw")]] inline __m512i Load32(const char16_t* AFrom) noexcept { return _mm512_loadu_si512(AFrom); }

// Each index's unit out of the 128 in four vectors. A look-up goes by six bits of an index.
[[gnu::target("avx512bw")]] inline __m512i LookUp(const __m512i* AUnits, __m512i AIndexes) noexcept {
  return _mm512_mask_blend_epi16(_mm512_test_epi16_mask(AIndexes, _mm512_set1_epi16(0x40)),
      _mm512_permutex2var_epi16(AUnits[0], AIndexes, AUnits[1]),
      _mm512_permutex2var_epi16(AUnits[2], AIndexes, AUnits[3]));
}

// Whether one of at least cBlock bytes is unassigned. What is left behind the last whole block is done with a block
// that overlaps the one before.
[[gnu::target("avx512bw")]] bool DecodeBlocks(
    const TSingles& ASingles, const Byte* ASource, std::size_t ABytes, char16_t* ADest) noexcept {
  const char16_t* const From = ASingles.data();
  const __m512i Low[] = {Load32(From), Load32(From + 32), Load32(From + 64), Load32(From + 96)};
  const __m512i High[] = {Load32(From + 128), Load32(From + 160), Load32(From + 192), Load32(From + 224)};
  const __m512i Unassigned = _mm512_set1_epi16(static_cast<short>(TCharacterSource::cUnassigned));
  __mmask32 Wrong = 0;
  for (std::size_t i = 0; i < ABytes; i += cBlock) {
    const std::size_t At = std::min(i, ABytes - cBlock);
    const __m512i Bytes = _mm512_cvtepu8_epi16(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(ASource + At)));
    const __mmask32 IsHigh = _mm512_test_epi16_mask(Bytes, _mm512_set1_epi16(0x80));
    const __m512i Units = _mm512_mask_blend_epi16(IsHigh, LookUp(Low, Bytes), LookUp(High, Bytes));
    Wrong |= _mm512_cmpeq_epi16_mask(Units, Unassigned);
    if (ADest != nullptr) _mm512_storeu_si512(ADest + At, Units);
  }
  return Wrong != 0;
}

#else

template <class TUnitAt>
void PutEight(char16_t* ADest, TUnitAt AUnitAt) noexcept {
  for (unsigned i = 0; i < 8; ++i) ADest[i] = AUnitAt(i);
}

#endif

// Eight at a time: with a load and a store for each character apart this takes half as long again. Half of the bytes
// come by loads of their own and half by shifts, so that neither keeps the other waiting.
void DecodeEights(const TSingles& ASingles, const Byte* ASource, std::size_t ABytes, char16_t* ADest) noexcept {
  constexpr bool cLittle = std::endian::native == std::endian::little;
  std::size_t i = 0;
  for (; i + 8 <= ABytes; i += 8) {
    std::uint32_t Last = 0;
    std::memcpy(&Last, ASource + i + 4, sizeof Last);
    const auto UnitAt = [&](unsigned k) {
      return ASingles[k < 4 ? ASource[i + k] : Last >> (8 * (cLittle ? k - 4 : 7 - k)) & 0xFFU];
    };
    PutEight(ADest + i, UnitAt);
  }
  for (; i < ABytes; ++i) ADest[i] = ASingles[ASource[i]];
}

constexpr bool IsPair(char16_t AFirst, const char16_t* AAt, const char16_t* AEnd) noexcept {
  return (AFirst & 0xFC00U) == 0xD800U && AAt != AEnd && (*AAt & 0xFC00U) == 0xDC00U;
}

}  // namespace

TPageTable* TPageTable::Of(const TCodePage& APage) {
  static std::array<std::atomic<TPageTable*>, 256> Tables;
  std::atomic<TPageTable*>& Table = Tables[static_cast<std::size_t>(&APage - CodePages().data())];
  TPageTable* const Known = Table.load(std::memory_order_acquire);
  return Known != nullptr ? Known : Make(APage, Table);
}

TPageTable* TPageTable::Make(const TCodePage& APage, std::atomic<TPageTable*>& ATable) {
  std::unique_ptr<TCharacterSource> Source = TCharacterSource::Open(APage.Data);
  if (Source == nullptr) return nullptr;
  auto Made = std::make_unique<TPageTable>(APage, std::move(Source));
  TPageTable* Expected = nullptr;
  return ATable.compare_exchange_strong(Expected, Made.get()) ? Made.release() : Expected;
}

TPageTable::TPageTable(const TCodePage& APage, std::unique_ptr<TCharacterSource> ASource)
    : FPage(APage), FSource(std::move(ASource)) {
  if (!FPairs.IsMade() || !FCodes.IsMade() || !FSimilar.IsMade()) throw std::bad_alloc();
  for (unsigned i = 0; i < FSingles.size(); ++i) FSingles[i] = Read(static_cast<Word>(i));
  if (APage.Kind == TPageKind::SingleByte)
    std::ranges::replace(FSingles, TCharacterSource::cLead, TCharacterSource::cUnassigned);
  FHasPairs = std::ranges::count(FSingles, TCharacterSource::cLead) != 0;
  FIsWhole = std::ranges::count(FSingles, TCharacterSource::cUnassigned) == 0;
}

template <class TAsk>
Word TPageTable::Recall(TMemo& AMemo, Word AIndex, TAsk AAsk) {
  if (const Word Known = AMemo[AIndex]; Known != 0) return Known;
  const std::scoped_lock Lock(FLock);
  const Word Result = AAsk();
  AMemo.Learn(AIndex, Result);
  return Result;
}

// Some data has 1A, 1C and 7F the way that old hosts had them: 7F, 1A, 1C.
bool TPageTable::IsAscii(unsigned AValue) const noexcept { return AValue < 0x80 && FPage.Ascii == TAsciiUse::Plain; }

// --------------------------------------------------------------------------------------------- to UTF-16

char16_t TPageTable::Read(Word ACode) const {
  if (IsAscii(ACode)) return ACode;
  for (const TMapping& Mapping : FPage.Differences)
    if (Mapping.Way != TMapping::OnlyEncodes && Mapping.Code == ACode) return Mapping.Char;
  const char Bytes[] = {static_cast<char>(ACode >> 8U), static_cast<char>(ACode)};
  if (ACode <= 0xFF) return FSource->Read({Bytes + 1, 1});
  const char16_t Result = FSource->Read({Bytes, 2});
  return Result == TCharacterSource::cLead ? TCharacterSource::cUnassigned : Result;
}

char16_t TPageTable::CharOf(Word ACode) {
  if (ACode <= 0xFF) return FSingles[ACode];
  return Recall(FPairs, ACode, [&] { return Read(ACode); });
}

// Where a conversion puts what it makes. By value: a reference would be read anew behind each byte written.
struct TPageTable::TUnitWriter {
  char16_t* To;
  bool Malformed = false;
  void operator()(char16_t AUnit) noexcept {
    *To++ = AUnit;
    Malformed |= AUnit == TCharacterSource::cUnassigned;
  }
};

struct TPageTable::TUnitCounter {
  std::size_t Count = 0;
  bool Malformed = false;
  void operator()(char16_t AUnit) noexcept {
    ++Count;
    Malformed |= AUnit == TCharacterSource::cUnassigned;
  }
};

template <class TPut>
TPut TPageTable::DecodeEach(const Byte* AAt, const Byte* AEnd, TPut APut) {
  while (AAt != AEnd) {
    char16_t Unit = FSingles[*AAt++];
    if (Unit == TCharacterSource::cLead) {
      Unit = AAt == AEnd ? TCharacterSource::cLone : CharOf(static_cast<Word>(AAt[-1] << 8U | *AAt));
      if (Unit == TCharacterSource::cLone) Unit = TCharacterSource::cUnassigned;
      else ++AAt;
    }
    APut(Unit);
  }
  return APut;
}

bool TPageTable::DecodeSingles(const Byte* ASource, std::size_t ABytes, char16_t* ADest) const noexcept {
  if (ADest == nullptr && FIsWhole) return false;
#if defined(__x86_64__)
  if (ABytes >= cBlock && HasAvx512()) return DecodeBlocks(FSingles, ASource, ABytes, ADest);
#endif
  if (ADest != nullptr) DecodeEights(FSingles, ASource, ABytes, ADest);
  const auto IsWrong = [this](Byte b) { return FSingles[b] == TCharacterSource::cUnassigned; };
  return !FIsWhole && std::any_of(ASource, ASource + ABytes, IsWrong);
}

std::size_t TPageTable::Decode(const char* ASource, std::size_t ABytes, char16_t* ADest, bool& AMalformed) {
  const Byte* const At = reinterpret_cast<const Byte*>(ASource);
  if (FHasPairs) return DecodePairs(At, At + ABytes, ADest, AMalformed);
  AMalformed |= DecodeSingles(At, ABytes, ADest);
  return ABytes;
}

std::size_t TPageTable::DecodePairs(const Byte* AAt, const Byte* AEnd, char16_t* ADest, bool& AMalformed) {
  if (ADest == nullptr) {
    const auto [Count, Malformed] = DecodeEach(AAt, AEnd, TUnitCounter{});
    AMalformed |= Malformed;
    return Count;
  }
  const auto [End, Malformed] = DecodeEach(AAt, AEnd, TUnitWriter{ADest});
  AMalformed |= Malformed;
  return static_cast<std::size_t>(End - ADest);
}

// --------------------------------------------------------------------------------------------- from UTF-16

// A code counts where it leads back to its character; similar ones don't, nor what the data has and the page has not.
Word TPageTable::Write(char16_t AChar, bool ABestFit) const {
  if (IsAscii(AChar)) return AChar;
  for (const TMapping& Mapping : FPage.Differences)
    if (Mapping.Char == AChar && Mapping.Way != TMapping::OnlyDecodes && (ABestFit || Mapping.Way == TMapping::Both))
      return Mapping.Code;
  const Word Code = FSource->Write(AChar, ABestFit);
  const char16_t Back = Code == 0 ? TCharacterSource::cUnassigned : Read(Code);
  return Back == AChar || (ABestFit && Back != TCharacterSource::cUnassigned) ? Code : cNone;
}

Word TPageTable::CodeOf(char16_t AChar, bool ABestFit) {
  if (AChar == 0) return 0;
  Word Result = Recall(FCodes, AChar, [&] { return MayMeet(AChar) ? cMeets : Write(AChar, false); });
  if (Result == cMeets || (Result == cNone && ABestFit)) {
    Result = Recall(FSimilar, AChar, [&] { return Write(AChar, true); });
    if (!ABestFit && Result != cNone && CharOf(Result) != AChar) Result = cNone;
  }
  return Result == cNone ? Word{0} : Result;
}

bool TPageTable::MayMeet(char16_t AChar) noexcept {
  return AChar >= 0x300 && u_getIntPropertyValue(AChar, UCHAR_NFC_QUICK_CHECK) == UNORM_MAYBE;
}

struct TPageTable::TByteWriter {
  char* To;
  void operator()(Word ACode) noexcept {
    *To = static_cast<char>(ACode >> 8U);
    To += ACode > 0xFF ? 1 : 0;
    *To++ = static_cast<char>(ACode);
  }
  void operator()(std::string_view ABytes) noexcept { To = std::ranges::copy(ABytes, To).out; }
};

struct TPageTable::TSingleWriter {
  char* To;
  void operator()(Word ACode) noexcept { *To++ = static_cast<char>(ACode); }
  void operator()(std::string_view ABytes) noexcept { To = std::ranges::copy(ABytes, To).out; }
};

struct TPageTable::TByteCounter {
  std::size_t Count = 0;
  void operator()(Word ACode) noexcept { Count += ACode > 0xFF ? 2 : 1; }
  void operator()(std::string_view ABytes) noexcept { Count += ABytes.size(); }
};

// The loop that counts, alone: with the rare cases in it it takes half as long again.
template <class TPut>
const char16_t* TPageTable::EncodeKnown(const char16_t* AAt, const char16_t* AEnd, TPut& APut) const noexcept {
  TPut Put = APut;
  for (; AAt != AEnd; ++AAt) {
    const Word Code = FCodes[*AAt];
    if (Code - 1U >= cMeets - 1U) break;
    Put(Code);
  }
  APut = Put;
  return AAt;
}

template <class TPut>
TPut TPageTable::EncodeEach(const char16_t* AAt, const char16_t* AEnd, TMissing& AMissing, TPut APut) {
  while ((AAt = EncodeKnown(AAt, AEnd, APut)) != AEnd) {
    const char16_t Unit = *AAt++;
    if (AMissing.Composes && MayMeet(Unit)) {
      AMissing.Meets = true;
      break;
    }
    if (const Word Code = CodeOf(Unit, AMissing.BestFit); Code != 0 || Unit == 0) {
      APut(Code);
      continue;
    }
    if (IsPair(Unit, AAt, AEnd)) ++AAt;
    AMissing.Found = true;
    if (AMissing.Bytes.empty()) APut(CodeOf(u'?', false));
    else APut(AMissing.Bytes);
  }
  return APut;
}

std::size_t TPageTable::Encode(const char16_t* ASource, std::size_t AChars, char* ADest, TMissing& AMissing) {
  const char16_t* const End = ASource + AChars;
  if (ADest == nullptr) return EncodeEach(ASource, End, AMissing, TByteCounter{}).Count;
  char* const Written = FHasPairs ? EncodeEach(ASource, End, AMissing, TByteWriter{ADest}).To
                                  : EncodeEach(ASource, End, AMissing, TSingleWriter{ADest}).To;
  return static_cast<std::size_t>(Written - ADest);
}

}  // namespace zq
