#include "runtime/text/page_table.h"

#include <unicode/uchar.h>
#include <unicode/unorm2.h>

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstring>
#include <memory>
#include <new>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif

namespace zq {

namespace {

// AUnitAt tells the unit for each byte of a word, from the one with the lowest value on.
#if defined(__SSE2__)
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
#else
template <class TUnitAt>
void PutEight(char16_t* ADest, TUnitAt AUnitAt) noexcept {
  constexpr bool cLittle = std::endian::native == std::endian::little;
  for (unsigned i = 0; i < 8; ++i) ADest[i] = AUnitAt(cLittle ? i : 7 - i);
}
#endif

constexpr bool IsPair(char16_t AFirst, const char16_t* AAt, const char16_t* AEnd) noexcept {
  return (AFirst & 0xFC00U) == 0xD800U && AAt != AEnd && (*AAt & 0xFC00U) == 0xDC00U;
}

}  // namespace

TPageTable* TPageTable::Of(const TCodePage& APage) {
  static std::array<std::atomic<TPageTable*>, 256> Tables;
  std::atomic<TPageTable*>& Table = Tables[static_cast<std::size_t>(&APage - CodePages().data())];
  if (TPageTable* const Known = Table.load(std::memory_order_acquire); Known != nullptr) return Known;
  std::unique_ptr<TCharacterSource> Source = TCharacterSource::Open(APage.Data);
  if (Source == nullptr) return nullptr;
  auto Made = std::make_unique<TPageTable>(APage, std::move(Source));
  TPageTable* Expected = nullptr;
  return Table.compare_exchange_strong(Expected, Made.get()) ? Made.release() : Expected;
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

// Eight at a time: with a load and a store for each character apart this takes half as long again.
void TPageTable::DecodeSingles(const Byte* ASource, std::size_t ABytes, char16_t* ADest) const noexcept {
  std::size_t i = 0;
  for (; i + 8 <= ABytes; i += 8) {
    std::uint64_t Bytes = 0;
    std::memcpy(&Bytes, ASource + i, sizeof Bytes);
    const auto UnitAt = [&](unsigned AIndex) { return FSingles[Bytes >> (8 * AIndex) & 0xFFU]; };
    PutEight(ADest + i, UnitAt);
  }
  for (; i < ABytes; ++i) ADest[i] = FSingles[ASource[i]];
}

std::size_t TPageTable::Decode(const char* ASource, std::size_t ABytes, char16_t* ADest, bool& AMalformed) {
  const Byte* const At = reinterpret_cast<const Byte*>(ASource);
  if (!FHasPairs) {
    const auto IsWrong = [this](Byte b) { return FSingles[b] == TCharacterSource::cUnassigned; };
    if (ADest != nullptr) DecodeSingles(At, ABytes, ADest);
    AMalformed |= !FIsWhole && std::any_of(At, At + ABytes, IsWrong);
    return ABytes;
  }
  if (ADest == nullptr) {
    const auto [Count, Malformed] = DecodeEach(At, At + ABytes, TUnitCounter{});
    AMalformed |= Malformed;
    return Count;
  }
  const auto [End, Malformed] = DecodeEach(At, At + ABytes, TUnitWriter{ADest});
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
