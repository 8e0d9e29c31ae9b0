#include "common/uZqClasses/parser.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <new>
#include <string_view>

#include "common/uZqClasses/text_streams.h"
#include "common/uZqTypes.h"

namespace zq {

/// Puts the cursor back at the end of its scope, also where the text has moved to another buffer since.
class TZqTextParser::TLookAhead {
 public:
  /// Raises EZqTextParserEOF behind the end, as a move there does.
  explicit TLookAhead(TZqTextParser& AParser) : Saved(AParser.FState), FParser(AParser) {
    if (AParser.FState.Eof) AParser.Move();
    AParser.FPeekPos = AParser.FState.CurPos;
    AParser.FLookAhead = this;
  }
  TLookAhead(const TLookAhead&) = delete;
  TLookAhead& operator=(const TLookAhead&) = delete;
  ~TLookAhead() {
    FParser.FState = Saved;
    FParser.FPeekPos = nullptr;
    FParser.FLookAhead = nullptr;
  }

  TZqTextParserState Saved;

 private:
  TZqTextParser& FParser;
};

// ---- Construction ---------------------------------------------------------------------------------------------------

namespace {

constexpr Word cUtf16LE = 1200;
constexpr Word cUtf16BE = 1201;
constexpr Word cUtf32LE = 12000;
constexpr Word cUtf32BE = 12001;
constexpr Word cUtf8 = 65001;

[[noreturn]] void RefuseEncoding() { throw Exception(uZqClasses::_SEncodingNotSupported); }

void CheckSize(bool AHasText) { Assert(AHasText, u"It is not possible to parse empty streams!"); }

TZqCharacterSetType CharacterSetOf(Word ACodePage) {
  switch (ACodePage) {
    case cUtf16LE: return DBCS;
    case cUtf8: return MBCS;
    case cUtf16BE:
    case cUtf32LE:
    case cUtf32BE: RefuseEncoding();
    default: return SBCS;
  }
}

}  // namespace

TZqTextParser::TZqTextParser(TStream* ASourceStream, Boolean AStreamOwner, Word AStreamCodePage)
    : TZqTextParser(ASourceStream, AStreamOwner, AStreamCodePage, cChunkSize) {}

TZqTextParser::TZqTextParser(TStream* ASourceStream, Boolean AStreamOwner, Word AStreamCodePage, NativeUInt AChunkSize)
    : FStream(ASourceStream), FOwnStream(AStreamOwner ? ASourceStream : nullptr), FChunkSize(AChunkSize) {
  CheckSize(FStream->Size() > 0);
  FFirstPos = static_cast<NativeUInt>(FStream->Position());
  Begin(AStreamCodePage);
}

TZqTextParser::TZqTextParser(TWrapped, const void* ABuffer, NativeUInt ABufSize, Word ACodePage)
    : FBufStart(static_cast<const Byte*>(ABuffer)), FBufEnd(FBufStart + ABufSize), FChunkSize(ABufSize) {
  CheckSize(ABufSize != 0);
  Begin(ACodePage);
}

TZqTextParser::~TZqTextParser() = default;

void TZqTextParser::Begin(Word ACodePage) {
  FContentCodePage = ACodePage;
  TZqTextParser::SetCharacterSetType(CharacterSetOf(ACodePage));
  First();
}

void TZqTextParser::SetCharacterSetType(TZqCharacterSetType AValue) {
  FCharacterSetType = AValue;
  FSingles.fill(cUnknown);
  FnReadCharA = Bind<&TZqTextParser::SrcReadCharA>(this);
  FnReadCharW = Bind<&TZqTextParser::SrcReadCharW>(this);
  FnPrevCharA = Bind<&TZqTextParser::SrcPrevCharA>(this);
  FnPrevCharW = Bind<&TZqTextParser::SrcPrevCharW>(this);
  FnCurrCharA = Bind<&TZqTextParser::SrcCurrCharA>(this);
  FnCurrCharW = Bind<&TZqTextParser::SrcCurrCharW>(this);
  FnPeekCharA = Bind<&TZqTextParser::SrcPeekCharA>(this);
  FnPeekCharW = Bind<&TZqTextParser::SrcPeekCharW>(this);
  FnPeekStringA = Bind<&TZqTextParser::SrcPeekStringA>(this);
  FnPeekStringW = Bind<&TZqTextParser::SrcPeekStringW>(this);
  switch (AValue) {
    case SBCS:
      Next.SetOwn(Bind<&TZqTextParser::SrcANext>(this));
      FnSkipWhileA = Bind<&TZqTextParser::SrcASkipWhileA>(this);
      FnSkipWhileW = Bind<&TZqTextParser::SrcASkipWhileW>(this);
      SkipWhileInSet = Bind<&TZqTextParser::SrcASkipWhileIn>(this);
      break;
    case DBCS:
      Next.SetOwn(Bind<&TZqTextParser::SrcWNext>(this));
      FnSkipWhileA = Bind<&TZqTextParser::SrcWSkipWhileA>(this);
      FnSkipWhileW = Bind<&TZqTextParser::SrcWSkipWhileW>(this);
      SkipWhileInSet = Bind<&TZqTextParser::SrcWSkipWhileIn>(this);
      break;
    case MBCS:
      Next.SetOwn(Bind<&TZqTextParser::SrcUNext>(this));
      FnSkipWhileA = Bind<&TZqTextParser::SrcUSkipWhileA>(this);
      FnSkipWhileW = Bind<&TZqTextParser::SrcUSkipWhileW>(this);
      SkipWhileInSet = Bind<&TZqTextParser::SrcUSkipWhileIn>(this);
      break;
  }
  CurrChar.SetOwn(FnCurrCharW);
  ReadChar = FnReadCharW;
  PrevChar = FnPrevCharW;
  PeekChar = FnPeekCharW;
}

void TZqTextParser::SetContentCodePage(Word AValue) {
  if ((AValue == cUtf8) != (FCharacterSetType == MBCS) || (AValue == cUtf16LE && FCharacterSetType != DBCS))
    RefuseEncoding();
  FContentCodePage = AValue;
  FSingles.fill(cUnknown);
}

// ---- Chunks ---------------------------------------------------------------------------------------------------------

namespace {

// The content of a stream whose text is walked in place; an empty view without a block for any other.
std::string_view ContentOf(TStream* AStream) {
  if (const auto* const Memory = dynamic_cast<TZqMemoryStream*>(AStream)) return Memory->View();
  if (const auto* const Memory = dynamic_cast<TMemoryStream*>(AStream))
    return {static_cast<const char*>(Memory->Memory()), static_cast<std::size_t>(AStream->Size())};
  return {};
}

}  // namespace

void TZqTextParser::First() {
  if (FStream == nullptr) return StartAt(FBufStart, FChunkSize);
  if (const std::string_view Content = ContentOf(FStream); Content.data() != nullptr) {
    const auto From = std::min(FFirstPos, Content.size());
    StartAt(reinterpret_cast<const Byte*>(Content.data()) + From, Content.size() - From);
    FStream->Seek(0, soEnd);
  } else if (FChunk == 1) {
    StartAt(FBufStart, static_cast<NativeUInt>(FBufEnd - FBufStart));
  } else {
    ReadFirstChunk();
  }
}

void TZqTextParser::StartAt(const Byte* AText, NativeUInt ASize) noexcept {
  FBufStart = AText;
  FBufEnd = AText + ASize;
  FBufOffset = 0;
  FState = {};
  FState.CurPos = AText;
  FState.Eof = ASize == 0;
  FPeekPos = FMarkPos1 = FMarkPos2 = FMarkPos3 = nullptr;
}

void TZqTextParser::ReadFirstChunk() {
  StartAt(nullptr, 0);  // where something fails, the parser is empty
  FChunk = 0;
  FOwnBuffer.reset();
  FStream->SetPosition(static_cast<Int64>(FFirstPos));
  const Int64 Size = FStream->Size() - static_cast<Int64>(FFirstPos);
  if (Size <= 0) return;
  const auto Count = std::min(FChunkSize, static_cast<NativeUInt>(Size));
  FOwnBuffer.reset(static_cast<Byte*>(GetMem(Count)));
  FBufEnd = FBufStart = FOwnBuffer.get();
  ReadBytes(Count);
  FChunk = 1;
  FChunked = static_cast<NativeUInt>(Size) > Count;
  FLastChunk = !FChunked;
  StartAt(FBufStart, static_cast<NativeUInt>(FBufEnd - FBufStart));
}

// To FBufEnd, which moves on with what has come: nothing that was read is lost where the next Read raises.
void TZqTextParser::ReadBytes(NativeUInt ACount) {
  while (ACount > 0) {
    const Integer Came = FStream->Read(const_cast<Byte*>(FBufEnd), static_cast<Integer>(ACount));
    if (Came <= 0) break;
    FBufEnd += Came;
    ACount -= static_cast<NativeUInt>(Came);
  }
  if (ACount > 0) FStream->RequireEnd();  // a stream may have become shorter
}

void TZqTextParser::GetNextChunk() {
  Assert(FStream != nullptr);
  Assert(FChunked && !FLastChunk);
  const Byte* Oldest = FState.CurPos;
  for (const Byte** const Position : Positions())
    if (*Position != nullptr) Oldest = std::min(Oldest, *Position);
  MoveText(Oldest, FChunkSize);
  ReadBytes(FChunkSize);
  ++FChunk;
  FLastChunk = FStream->Position() >= FStream->Size();
}

// Those that lead into the buffer; nil, or twice the same, where one isn't in use.
std::array<const Byte**, 8> TZqTextParser::Positions() noexcept {
  TZqTextParserState& Saved = FLookAhead == nullptr ? FState : FLookAhead->Saved;
  return {
      &FState.CurPos, &FState.PrevPos, &FMarkPos1, &FMarkPos2, &FMarkPos3, &FPeekPos, &Saved.CurPos, &Saved.PrevPos};
}

// What stands from AFrom on to the front of the buffer, with room for ARoom bytes behind it.
void TZqTextParser::MoveText(const Byte* AFrom, NativeUInt ARoom) {
  const auto Used = Positions();
  std::array<std::ptrdiff_t, 8> Distances{};
  for (std::size_t i = 0; i < Used.size(); ++i) Distances[i] = *Used[i] == nullptr ? -1 : *Used[i] - AFrom;
  const auto Kept = static_cast<NativeUInt>(FBufEnd - AFrom);
  FBufOffset += AFrom - FBufStart;
  std::memmove(FOwnBuffer.get(), AFrom, Kept);
  auto* const Resized = static_cast<Byte*>(std::realloc(FOwnBuffer.get(), Kept + ARoom));
  if (Resized != nullptr) {
    static_cast<void>(FOwnBuffer.release());
    FOwnBuffer.reset(Resized);
  }
  FBufStart = FOwnBuffer.get();
  FBufEnd = FBufStart + Kept;
  for (std::size_t i = 0; i < Used.size(); ++i)
    if (Distances[i] >= 0) *Used[i] = FBufStart + Distances[i];
  if (Resized == nullptr) throw std::bad_alloc();
}

NativeUInt TZqTextParser::AvailableInChunks(const Byte* const& APos, NativeUInt ACount) {
  while (static_cast<NativeUInt>(FBufEnd - APos) < ACount && !FLastChunk) GetNextChunk();
  return static_cast<NativeUInt>(FBufEnd - APos);
}

// ---- Cursor ---------------------------------------------------------------------------------------------------------

namespace {

Char UnitAt(const Byte* APos) noexcept {  // which needn't be aligned
  Char Result = 0;
  std::memcpy(&Result, APos, sizeof(Result));
  return Result;
}

// Eight at a time: a byte becomes 0 where it is one, and its highest bit is what is counted.
NativeUInt CountLineFeeds(const Byte* AFrom, const Byte* ATill) noexcept {
  constexpr std::uint64_t cOnes = 0x0101010101010101;
  NativeUInt Result = 0;
  for (; ATill - AFrom >= 8; AFrom += 8) {
    std::uint64_t Bytes = 0;
    std::memcpy(&Bytes, AFrom, sizeof(Bytes));
    Bytes ^= cOnes * Byte{cZqLFA};
    const std::uint64_t Others = ((Bytes & (cOnes * 0x7F)) + cOnes * 0x7F) | Bytes;
    Result += ((~Others >> 7U & cOnes) * cOnes) >> 56U;
  }
  return Result + static_cast<NativeUInt>(std::count(AFrom, ATill, Byte{cZqLFA}));
}

}  // namespace

// The slow half of a move: near the end of the buffer. The chunk behind it is looked for before anything moves, so that
// nothing has changed where it can't be had.
void TZqTextParser::Prepare(NativeUInt ALength, NativeUInt AWanted) {
  CheckEOF();
  const NativeUInt Left = Available(FState.CurPos, AWanted);
  if (Left >= ALength) return;
  FState.CurPos = FBufEnd;
  FState.Eof = true;
  Add(FState.Position, Left);
  throw EZqTextParserEOF();
}

void TZqTextParser::SrcWNext() {
  FState.PrevPos = FState.CurPos;
  if (Left() < 4) [[unlikely]]
    Prepare(2, 4);
  Step(2, 2);
  if (Left() == 0) FState.Eof = true;
  else if (Left() > 1 && UnitAt(FState.CurPos) == cZqLFW) NewLine(1);
}

// Moves from a byte in front of ATill onto ATill, which stands in the buffer.
void TZqTextParser::PassSingles(const Byte* ATill) noexcept {
  const Byte* const From = FState.CurPos;
  const auto Count = static_cast<NativeUInt>(ATill - From);
  if (Count == 0) return;
  if (const NativeUInt Lines = CountLineFeeds(From + 1, ATill + 1); Lines > 0) {
    Add(FState.LineNr, Lines);
    const auto* const Last = static_cast<const Byte*>(::memrchr(From + 1, cZqLFA, Count));
    FState.ColNr = 0;
    Add(FState.ColNr, static_cast<NativeUInt>(ATill - Last) + 1);
  } else {
    Add(FState.ColNr, Count);
  }
  Add(FState.CharsRead, Count);
  Add(FState.Position, Count);
  FState.PrevPos = ATill - 1;
  FState.CurPos = ATill;
}

void TZqTextParser::Last() {
  do {
    FState.CurPos = FBufEnd;
    FState.Eof = FLastChunk;
    if (!FLastChunk) GetNextChunk();
  } while (!FState.Eof);
}

Boolean TZqTextParser::GetEOF() { return Available(FState.CurPos, 1) == 0; }

const Byte* TZqTextParser::GetPos(TZqTextParserPosType APos) const {
  switch (APos) {
    case tpPrevPos: return FState.PrevPos;
    case tpCurPos: return FState.CurPos;
    case tpPeekPos: return FPeekPos;
    case tpMarkPos1: return FMarkPos1;
    case tpMarkPos2: return FMarkPos2;
    case tpMarkPos3: return FMarkPos3;
  }
  throw Exception(u"Invalid TillPos specified!");
}

const Byte*& TZqTextParser::MarkOf(TZqTextParserMarkPosType AMarkType) {
  switch (AMarkType) {
    case tpMarkPos1: return FMarkPos1;
    case tpMarkPos2: return FMarkPos2;
    case tpMarkPos3: return FMarkPos3;
    default: throw Exception(u"Invalid MarkType specified!");
  }
}

void TZqTextParser::SetMark(TZqTextParserMarkPosType AMarkType) { MarkOf(AMarkType) = FState.CurPos; }

void TZqTextParser::ClearMark(TZqTextParserMarkPosType AMarkType) { MarkOf(AMarkType) = nullptr; }

namespace {

constexpr Char cReplacement = u'\uFFFD';

Integer CountOf(NativeUInt ABytes) {
  Assert(ABytes <= static_cast<NativeUInt>(std::numeric_limits<Integer>::max()));
  return static_cast<Integer>(ABytes);
}

AnsiString BytesOf(const Byte* AFrom, NativeUInt ABytes) {
  return AnsiString(std::string_view(reinterpret_cast<const char*>(AFrom), ABytes));
}

AnsiString ToAnsi(const UnicodeString& AText) { return AnsiString(TZqEncoding::ConvertW(AText, 0)); }

}  // namespace

// ---- Character at a position ----------------------------------------------------------------------------------------

// The character that a byte is, alone: any in SBCS, those of ASCII in MBCS. Each is converted once.
const WideChar* TZqTextParser::Learn(Byte AByte) {
  Char& Result = FSingles[AByte];
  if (TZqEncoding::ConvertA(&AByte, 1, FContentCodePage, &Result, 1) != 1) Result = cReplacement;
  return &Result;
}

const WideChar* TZqTextParser::Deliver(Char AChar) noexcept {
  FWideChar = AChar;
  return &FWideChar;
}

const WideChar* TZqTextParser::WideAt(const Byte* const& APos) {
  if (APos == nullptr) return Deliver(cZqEOFW);
  const NativeUInt Left = Available(APos, FCharacterSetType == DBCS ? sizeof(Char) : 1);
  switch (FCharacterSetType) {
    case SBCS: return Left == 0 ? Deliver(cZqEOFW) : Learn(*APos);
    case DBCS:
      if (Left == 0) return Deliver(cZqEOFW);
      if (Left < sizeof(Char)) throw EZqTextParserEOF();
      if (reinterpret_cast<std::uintptr_t>(APos) % alignof(Char) == 0) return reinterpret_cast<const Char*>(APos);
      return Deliver(UnitAt(APos));
    case MBCS:
      if (Left == 0) throw EZqTextParserEOF();
      return *APos < 0x80 ? Learn(*APos) : Deliver(Utf8CharAt(APos));
  }
  return nullptr;
}

const AnsiChar* TZqTextParser::NarrowAt(const Byte* const& APos) {
  if (FCharacterSetType == SBCS && APos != nullptr && Available(APos, 1) > 0)
    return reinterpret_cast<const AnsiChar*>(APos);
  const Char Wide = *WideAt(APos);
  Byte Narrow = 0;
  if (FCharacterSetType != DBCS && Wide < 0x80) FAnsiChar = static_cast<AnsiChar>(Wide);
  else FAnsiChar = TZqEncoding::ConvertW(&Wide, 1, &Narrow, 1, 0) == 1 ? static_cast<AnsiChar>(Narrow) : cZqQuestA;
  return &FAnsiChar;
}

const AnsiChar* TZqTextParser::SrcCurrCharA() { return NarrowAt(FState.CurPos); }
const AnsiChar* TZqTextParser::SrcPrevCharA() { return NarrowAt(FState.PrevPos); }
const WideChar* TZqTextParser::SrcPrevCharW() { return WideAt(FState.PrevPos); }

UnicodeString TZqTextParser::WideText(const Byte* AText, Integer ACount) const {
  if (FCharacterSetType != DBCS)
    return TZqEncoding::ConvertA(AText, ACount, FCharacterSetType == MBCS ? cUtf8 : FContentCodePage);
  return TZqEncoding::ConvertB(AText, static_cast<NativeUInt>(ACount), cUtf16LE);
}

Char TZqTextParser::Utf8CharAt(const Byte* const& APos) {
  const NativeUInt Length = Utf8Length(*APos);
  if (Available(APos, Length) < Length) throw EZqTextParserEOF();
  std::array<Char, 4> Units{};
  const Integer Count = TZqEncoding::ConvertA(APos, static_cast<Integer>(Length), cUtf8, Units.data(), 4);
  return Count == 1 ? Units[0] : cReplacement;
}

// By way of a cell, since the move may release the buffer.
const AnsiChar* TZqTextParser::SrcReadCharA() {
  const AnsiChar Result = *SrcCurrCharA();
  Next();
  FAnsiChar = Result;
  return &FAnsiChar;
}

const WideChar* TZqTextParser::SrcReadCharW() {
  const Char Result = *SrcCurrCharW();
  Next();
  FWideChar = Result;
  return &FWideChar;
}

// ---- Looking ahead --------------------------------------------------------------------------------------------------

// Whether a look-ahead for one character ends here.
bool TZqTextParser::IsPeeked() {
  if (FCharacterSetType == DBCS)
    return Available(FState.CurPos, sizeof(Char)) < sizeof(Char) || UnitAt(FState.CurPos) >= cZqSpaceW;
  if (GetEOF()) return true;
  const Byte First = *FState.CurPos;
  return First >= Byte{cZqSpaceA} && (FCharacterSetType == SBCS || First < 0x80);
}

const AnsiChar* TZqTextParser::SrcPeekCharA() {
  const TLookAhead Ahead(*this);
  do Move();
  while (!IsPeeked());
  return SrcCurrCharA();
}

const WideChar* TZqTextParser::SrcPeekCharW() {
  const TLookAhead Ahead(*this);
  do Move();
  while (!IsPeeked());
  return SrcCurrCharW();
}

AnsiString TZqTextParser::SrcPeekStringA(Integer ACharCnt) {
  if (FCharacterSetType != SBCS) return ToAnsi(SrcPeekStringW(ACharCnt));
  const auto Wanted = static_cast<NativeUInt>(std::max(ACharCnt, 0));
  const NativeUInt Left = Available(FState.CurPos, Wanted);
  return BytesOf(FState.CurPos, std::min(Wanted, Left));
}

UnicodeString TZqTextParser::SrcPeekStringW(Integer ACharCnt) {
  if (ACharCnt <= 0) return {};
  if (FCharacterSetType == MBCS) {
    const TLookAhead Ahead(*this);
    do SrcUNext();
    while (--ACharCnt > 0 && !FState.Eof);
    return WideText(FPeekPos, CountOf(static_cast<NativeUInt>(FState.CurPos - FPeekPos)));
  }
  const auto Wanted = static_cast<NativeUInt>(ACharCnt) * (FCharacterSetType == DBCS ? sizeof(Char) : 1);
  const NativeUInt Left = Available(FState.CurPos, Wanted);
  return WideText(FState.CurPos, CountOf(std::min(Wanted, Left)));
}

const Byte* TZqTextParser::SrcPeekNext(Integer ACharCnt) {
  Assert(ACharCnt >= 0);
  const TLookAhead Ahead(*this);
  const auto IsControl = [this] {
    const NativeUInt Unit = FCharacterSetType == DBCS ? sizeof(Char) : 1;
    if (Available(FState.CurPos, Unit) < Unit) throw EZqTextParserEOF();
    return FCharacterSetType == DBCS ? UnitAt(FState.CurPos) < cZqSpaceW : *FState.CurPos < Byte{cZqSpaceA};
  };
  for (; ACharCnt > 0; --ACharCnt) Move();
  while (IsControl()) Move();
  return FState.CurPos;
}

// ---- Skipping -------------------------------------------------------------------------------------------------------

void TZqTextParser::NextChar() {
  do Next();
  while (!FState.Eof && *CurrChar() < cZqSpaceW);
}

void TZqTextParser::SkipChars(Integer ACharCnt) {
  for (; ACharCnt > 0; --ACharCnt) NextChar();
}

namespace {

template <class TValue>
bool Holds(TZqTextParserSkipOp AOperator, TValue AValue, TValue AChar) noexcept {
  switch (AOperator) {
    case sopEq: return AValue == AChar;
    case sopLt: return AValue < AChar;
    case sopGt: return AValue > AChar;
    case sopUnEq: return AValue != AChar;
    case sopLtEq: return AValue <= AChar;
    case sopGtEq: return AValue >= AChar;
    default: return false;
  }
}

Byte CodeOf(AnsiChar AChar) noexcept { return static_cast<Byte>(AChar); }

}  // namespace

// AFind gives the first byte of a stretch that stays, or the stretch's end.
template <class TFind>
void TZqTextParser::SkipSingles(TFind AFind) {
  while (!FState.Eof && Available(FState.CurPos, 1) > 0) {
    const Byte* const Stop = AFind(FState.CurPos, FBufEnd);
    const bool IsFound = Stop != FBufEnd;
    PassSingles(IsFound ? Stop : Stop - 1);
    if (IsFound) return;
    SrcANext();
  }
}

template <class TTest>
void TZqTextParser::SkipEach(TTest ATest) {
  while (!FState.Eof && ATest()) Move();
}

void TZqTextParser::SrcASkipWhileA(TZqTextParserSkipOp AOperator, AnsiChar AChar) {
  const Byte Code = CodeOf(AChar);
  if (AOperator == sopUnEq)
    return SkipSingles([Code](const Byte* AFrom, const Byte* AEnd) {
      const void* const Found = std::memchr(AFrom, Code, static_cast<std::size_t>(AEnd - AFrom));
      return Found == nullptr ? AEnd : static_cast<const Byte*>(Found);
    });
  SkipSingles([AOperator, Code](const Byte* AFrom, const Byte* AEnd) {
    return std::find_if_not(AFrom, AEnd, [=](Byte AByte) { return Holds(AOperator, AByte, Code); });
  });
}

void TZqTextParser::SrcASkipWhileW(TZqTextParserSkipOp AOperator, Char AChar) {
  SkipEach([=, this] { return Holds(AOperator, *SrcCurrCharW(), AChar); });
}

void TZqTextParser::SrcWSkipWhileA(TZqTextParserSkipOp AOperator, AnsiChar AChar) {
  SkipEach([=, this] { return Holds(AOperator, CodeOf(*SrcCurrCharA()), CodeOf(AChar)); });
}

void TZqTextParser::SrcWSkipWhileW(TZqTextParserSkipOp AOperator, Char AChar) {
  SkipEach([=, this] { return Holds(AOperator, *SrcCurrCharW(), AChar); });
}

void TZqTextParser::SrcUSkipWhileA(TZqTextParserSkipOp AOperator, AnsiChar AChar) {
  if (CodeOf(AChar) < 0x80)
    return SkipEach([=, this] { return Holds(AOperator, CodeOf(*SrcCurrCharA()), CodeOf(AChar)); });
  const Byte Narrow = CodeOf(AChar);
  Char Wide = cReplacement;
  static_cast<void>(TZqEncoding::ConvertA(&Narrow, 1, 0, &Wide, 1));
  SrcUSkipWhileW(AOperator, Wide);
}

void TZqTextParser::SrcUSkipWhileW(TZqTextParserSkipOp AOperator, Char AChar) {
  SkipEach([=, this] { return Holds(AOperator, *SrcCurrCharW(), AChar); });
}

void TZqTextParser::SrcASkipWhileIn(TZqTextParserSkipSetOp AOperator, const TZqTextParserCharSet& ACharSet) {
  SkipSingles([&, WhileIn = AOperator == sopIn](const Byte* AFrom, const Byte* AEnd) {
    return std::find_if_not(
        AFrom, AEnd, [&](Byte AByte) { return ACharSet.Contains(static_cast<AnsiChar>(AByte)) == WhileIn; });
  });
}

void TZqTextParser::SrcWSkipWhileIn(TZqTextParserSkipSetOp AOperator, const TZqTextParserCharSet& ACharSet) {
  SkipEach([&, WhileIn = AOperator == sopIn] {
    const Char Unit = *SrcCurrCharW();
    return Unit > 0xFF || ACharSet.Contains(static_cast<AnsiChar>(Unit)) == WhileIn;
  });
}

void TZqTextParser::SrcUSkipWhileIn(TZqTextParserSkipSetOp AOperator, const TZqTextParserCharSet& ACharSet) {
  SkipEach([&, WhileIn = AOperator == sopIn] {
    return !GetEOF() && ACharSet.Contains(static_cast<AnsiChar>(*FState.CurPos)) == WhileIn;
  });
}

// ---- Selection ------------------------------------------------------------------------------------------------------

// In the text, since a look-ahead may move that to another buffer.
Int64 TZqTextParser::OffsetOf(TZqTextParserPosType APos) const {
  const Byte* const Position = GetPos(APos);
  Assert(Position != nullptr);
  return FBufOffset + (Position - FBufStart);
}

Integer TZqTextParser::SelectedCnt(TZqTextParserPosType AFromPos, TZqTextParserPosType ATillPos) {
  const Int64 From = OffsetOf(AFromPos);
  Int64 Till = 0;
  if (ATillPos == tpPeekPos) {
    const TLookAhead Ahead(*this);
    Move();
    Till = ByteOffset();
  } else {
    Till = OffsetOf(ATillPos);
  }
  const auto Result = static_cast<Integer>(Till - From);
  Assert(Result == Till - From);
  return Result;
}

template <class TConvert>
auto TZqTextParser::Selection(
    TZqTextParserPosType AFromPos, TZqTextParserPosType ATillPos, Boolean AClearMark, TConvert AConvert) {
  const Integer Count = SelectedCnt(AFromPos, ATillPos);
  Assert(Count >= 0);
  auto Result = AConvert(GetPos(AFromPos), Count);
  if (AClearMark)
    for (const TZqTextParserPosType Position : {AFromPos, ATillPos})
      if (Position >= tpMarkPos1) ClearMark(Position);
  return Result;
}

AnsiString TZqTextParser::SelectedA(TZqTextParserPosType AFromPos, TZqTextParserPosType ATillPos, Boolean AClearMark) {
  return Selection(AFromPos, ATillPos, AClearMark, [this](const Byte* AText, Integer ACount) {
    if (FCharacterSetType == SBCS) return BytesOf(AText, static_cast<NativeUInt>(ACount));
    return ToAnsi(WideText(AText, ACount));
  });
}

UnicodeString TZqTextParser::SelectedW(
    TZqTextParserPosType AFromPos, TZqTextParserPosType ATillPos, Boolean AClearMark) {
  return Selection(
      AFromPos, ATillPos, AClearMark, [this](const Byte* AText, Integer ACount) { return WideText(AText, ACount); });
}

}  // namespace zq
