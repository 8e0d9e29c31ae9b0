#pragma once

#include <array>
#include <memory>
#include <utility>

#include "common/uZqClasses/characters.h"
#include "common/uZqClasses/streams.h"
#include "runtime/core/delegates.h"

namespace zq {

/// A move or a look behind the end of the text, also into a character that the end cuts. Silent by default handlers.
struct ZQ_API EZqTextParserEOF : EAbort {
  EZqTextParserEOF() : EAbort(uZqClasses::_SUnexpectedEOF) {}
};

/// What a character of the text takes.
enum class TZqCharacterSetType : Byte {
  SBCS,  ///< one byte of the parser's code page
  DBCS,  ///< one UTF-16 unit, the low byte first
  MBCS,  ///< UTF-8
};
using enum TZqCharacterSetType;

enum class TZqTextParserPosType : Byte {
  tpPrevPos,
  tpCurPos,
  tpPeekPos,
  tpMarkPos1,
  tpMarkPos2,
  tpMarkPos3,
};
using enum TZqTextParserPosType;
/// tpMarkPos1 to tpMarkPos3.
using TZqTextParserMarkPosType = TZqTextParserPosType;

/// Skip as long as the current character compares so, by code value, with the one given, or stands so to the set.
enum class TZqTextParserSkipOp : Byte { sopEq, sopLt, sopGt, sopUnEq, sopLtEq, sopGtEq, sopIn, sopNotIn };
using enum TZqTextParserSkipOp;
/// sopIn and sopNotIn.
using TZqTextParserSkipSetOp = TZqTextParserSkipOp;

using TZqTextParserCharSet = TSet<AnsiChar>;

/// What a look-ahead saves. Those that a move changes together don't stand side by side: as one access of twice the
/// width they would wait for each other's way through memory.
struct TZqTextParserState {
  const Byte* CurPos = nullptr;
  const Byte* PrevPos = nullptr;  // nil before the first move
  Integer ColNr = 0;
  Integer LineNr = 1;
  Integer CharsRead = 0;
  Boolean Eof = false;
  Integer Position = 0;
};

using TZqTextParserReadFunc = TMethod<const WideChar*()>;
using TZqTextParserReadFuncW = TMethod<const WideChar*()>;
using TZqTextParserReadFuncA = TMethod<const AnsiChar*()>;
using TZqTextParserNextFunc = TMethod<void()>;
using TZqTextParserPeekFuncA = TMethod<AnsiString(Integer)>;
using TZqTextParserPeekFuncW = TMethod<UnicodeString(Integer)>;
using TZqTextParserSkipFuncA = TMethod<void(TZqTextParserSkipOp, AnsiChar)>;
using TZqTextParserSkipFuncW = TMethod<void(TZqTextParserSkipOp, Char)>;
using TZqTextParserSkipSetFunc = TMethod<void(TZqTextParserSkipSetOp, const TZqTextParserCharSet&)>;

class TZqTextParser;

/// A callback field of the parser. Until another callback is assigned to it, it runs the parser's own operation in
/// place rather than calling it, which is most of what a step through a text costs.
template <class TCallback, class TOwn>
class TZqTextParserCallback {
 public:
  explicit TZqTextParserCallback(TZqTextParser* AParser) noexcept : FParser(AParser) {}
  TZqTextParserCallback(const TZqTextParserCallback&) = delete;
  TZqTextParserCallback& operator=(const TZqTextParserCallback&) = delete;
  ~TZqTextParserCallback() = default;
  TZqTextParserCallback& operator=(TCallback ACallback) noexcept {
    FCallback = std::move(ACallback);
    FIsOwn = false;
    return *this;
  }
  /// What it leads to, to be kept or called by another.
  [[nodiscard]] const TCallback& Callback() const noexcept ZQ_LIFETIMEBOUND { return FCallback; }
  decltype(auto) operator()() const { return FIsOwn ? TOwn::Run(*FParser) : FCallback(); }

 private:
  friend TZqTextParser;
  void SetOwn(TCallback ACallback) noexcept {
    FCallback = std::move(ACallback);
    FIsOwn = true;
  }

  TZqTextParser* FParser;
  TCallback FCallback;
  bool FIsOwn = true;
};

/// Forward cursor over a text, for hand-written parsers. The text stays in its own encoding; what is looked at is
/// converted, character by character. Forms with A give bytes in code page 0, those with W and those without UTF-16.
///
/// A text in memory is walked in place. Any other stream is read in chunks of ChunkSize bytes, and what stands behind
/// the oldest position in use, a mark say, stays in memory: clear a mark that is no longer needed. A pointer into the
/// text, or to a character, is valid until the next operation on the parser.
///
/// A line ends with a line feed and nothing else. It counts when the cursor reaches it (SBCS, DBCS) or leaves it
/// (MBCS); columns count characters. A byte order mark is a character like any other.
///
/// Moving onto the end sets Eof, the next move raises EZqTextParserEOF; so does a move from a character that the end
/// cuts, which leaves the cursor at the end. Behind the end and before the first move, CurrChar and PrevChar give the
/// character 0; CurrChar in MBCS raises EZqTextParserEOF there. A character that one UTF-16 unit can't hold, and one
/// that is malformed, looks like U+FFFD, and like "?" as a byte where code page 0 has no single one for it; Selected
/// and PeekString give it whole.
///
/// A stream that fails raises what it raises, or EReadError where bytes are missing; no move has been made then, and
/// another one tries again. One thread at a time.
class ZQ_API TZqTextParser : public TObject {
  struct TOwnCurrChar {
    static const WideChar* Run(TZqTextParser& AParser) { return AParser.SrcCurrCharW(); }
  };
  struct TOwnNext {
    static void Run(TZqTextParser& AParser) { AParser.Move(); }
  };

 public:
  /// From the position of ASourceStream on, which must be able to seek; a memory stream must not be resized while the
  /// parser is in use. With AStreamOwner the end deletes it, as does a failure here. Code page 1200 is DBCS, 65001
  /// MBCS, any other SBCS, also 0. Raises EAssertionFailed for an empty stream, Exception for 1201, 12000 and 12001.
  TZqTextParser(TStream* ASourceStream, Boolean AStreamOwner, Word AStreamCodePage);
  /// Over ABuffer, which stays the caller's and must outlive the parser. Raises as above.
  [[nodiscard]] static TZqTextParser WrapMem(const void* ABuffer, NativeUInt ABufSize, Word ACodePage) {
    return TZqTextParser(TWrapped{}, ABuffer, ABufSize, ACodePage);
  }
  ~TZqTextParser() override;

  // What an inner loop calls. The pointers lead to one character.
  TZqTextParserCallback<TZqTextParserReadFunc, TOwnCurrChar> CurrChar{this};  ///< no move
  TZqTextParserReadFunc ReadChar;                                             ///< the current character, then a move
  TZqTextParserReadFunc PrevChar;                                             ///< that which the last move started from
  TZqTextParserReadFunc PeekChar;  ///< the next that is no control character; in MBCS the next of ASCII; no move
  TZqTextParserCallback<TZqTextParserNextFunc, TOwnNext> Next{this};  ///< one move
  /// Ends quietly at the end of the text. A UTF-16 unit above 0xFF is always passed; in MBCS the first byte of a
  /// character is tested.
  TZqTextParserSkipSetFunc SkipWhileInSet;

  /// Back to the start; clears the marks.
  void First();
  /// To the end; line, column, characters and position stay as they were.
  void Last();
  /// One move, then further ones as long as the cursor stands on a control character.
  void NextChar();
  /// NextChar, ACharCnt times.
  void SkipChars(Integer ACharCnt);
  /// Ends quietly at the end of the text. Nothing for sopIn and sopNotIn. In place for a byte in SBCS and a wide
  /// character in DBCS.
  void SkipWhile(TZqTextParserSkipOp AOperator, AnsiChar AChar) { FnSkipWhileA(AOperator, AChar); }
  void SkipWhile(TZqTextParserSkipOp AOperator, Char AChar) { FnSkipWhileW(AOperator, AChar); }

  [[nodiscard]] AnsiChar CurrCharA() { return *FnCurrCharA(); }
  [[nodiscard]] Char CurrCharW() { return *FnCurrCharW(); }
  [[nodiscard]] AnsiChar PrevCharA() { return *FnPrevCharA(); }
  [[nodiscard]] Char PrevCharW() { return *FnPrevCharW(); }
  AnsiChar ReadCharA() { return *FnReadCharA(); }
  Char ReadCharW() { return *FnReadCharW(); }
  [[nodiscard]] AnsiChar PeekCharA() { return *FnPeekCharA(); }
  [[nodiscard]] Char PeekCharW() { return *FnPeekCharW(); }
  /// Up to ACharCnt characters from the current one on; at the end none, or EZqTextParserEOF in MBCS.
  [[nodiscard]] UnicodeString PeekString(Integer ACharCnt) { return FnPeekStringW(ACharCnt); }
  [[nodiscard]] UnicodeString PeekStringW(Integer ACharCnt) { return FnPeekStringW(ACharCnt); }
  [[nodiscard]] AnsiString PeekStringA(Integer ACharCnt) { return FnPeekStringA(ACharCnt); }

  // Text from one position up to another, without the character there; tpPeekPos as the second takes the current
  // character in and raises EZqTextParserEOF behind the end. A position that isn't set, or lies before the first,
  // raises EAssertionFailed, and so does a text that an Integer can't count.
  /// In bytes; negative where ATillPos lies before AFromPos.
  [[nodiscard]] Integer SelectedCnt(TZqTextParserPosType AFromPos, TZqTextParserPosType ATillPos);
  /// The bytes as they are in SBCS, else in code page 0. AClearMark clears those of the positions that are marks.
  AnsiString SelectedA(TZqTextParserPosType AFromPos, TZqTextParserPosType ATillPos, Boolean AClearMark);
  UnicodeString SelectedW(TZqTextParserPosType AFromPos, TZqTextParserPosType ATillPos, Boolean AClearMark);
  UnicodeString Selected(TZqTextParserPosType AFromPos, TZqTextParserPosType ATillPos, Boolean AClearMark) {
    return SelectedW(AFromPos, ATillPos, AClearMark);
  }

  /// nil for one that isn't set; raises Exception for a value beyond the enumeration.
  [[nodiscard]] const Byte* GetPos(TZqTextParserPosType APos) const;
  /// At the current position. Raises Exception for what is no mark.
  void SetMark(TZqTextParserMarkPosType AMarkType);
  void ClearMark(TZqTextParserMarkPosType AMarkType);
  [[nodiscard]] const Byte* CurPos() const noexcept { return FState.CurPos; }
  [[nodiscard]] const Byte* MarkPos1() const noexcept { return FMarkPos1; }
  [[nodiscard]] const Byte* MarkPos2() const noexcept { return FMarkPos2; }
  [[nodiscard]] const Byte* MarkPos3() const noexcept { return FMarkPos3; }

  /// Whether a move has reached the end. Reads nothing.
  [[nodiscard]] Boolean Eof() const noexcept { return FState.Eof; }
  /// Whether the cursor stands at the end; reads the next chunk to know.
  [[nodiscard]] Boolean GetEOF();
  void CheckEOF() const {
    if (FState.Eof) [[unlikely]]
      throw EZqTextParserEOF();
  }
  [[nodiscard]] Integer LineNr() const noexcept { return FState.LineNr; }  ///< from 1
  [[nodiscard]] Integer ColNr() const noexcept { return FState.ColNr; }    ///< from 0 on the first line
  /// Of UTF-16 twice the units.
  [[nodiscard]] Integer CharsRead() const noexcept { return FState.CharsRead; }
  /// Bytes from the start of the text, as far as an Integer counts.
  [[nodiscard]] Integer Position() const noexcept { return FState.Position; }
  /// The same in texts of any size, also behind Last.
  [[nodiscard]] Int64 ByteOffset() const noexcept { return FBufOffset + (FState.CurPos - FBufStart); }

  /// In bytes; of a block its size.
  [[nodiscard]] NativeUInt ChunkSize() const noexcept { return FChunkSize; }
  [[nodiscard]] Word CodePage() const noexcept { return FContentCodePage; }
  /// Raises Exception for one that needs another CharacterSetType than the parser's.
  void SetContentCodePage(Word AValue);
  [[nodiscard]] TZqCharacterSetType CharacterSetType() const noexcept { return FCharacterSetType; }
  /// From the current position on, which stays. A constructor can't reach an override: a descendant that has one calls
  /// it from its own.
  virtual void SetCharacterSetType(TZqCharacterSetType AValue);

  /// Reads the next chunk. There must be one: a stream, and not all of it read (EAssertionFailed).
  void GetNextChunk();

  // What the callbacks lead to.
  const AnsiChar* SrcCurrCharA();
  const WideChar* SrcCurrCharW();
  const AnsiChar* SrcPrevCharA();
  const WideChar* SrcPrevCharW();
  const AnsiChar* SrcReadCharA();
  const WideChar* SrcReadCharW();
  const AnsiChar* SrcPeekCharA();
  const WideChar* SrcPeekCharW();
  AnsiString SrcPeekStringA(Integer ACharCnt);
  UnicodeString SrcPeekStringW(Integer ACharCnt);
  /// The first character that is no control character, ACharCnt characters ahead or behind that. Raises
  /// EZqTextParserEOF where there is none. No move.
  const Byte* SrcPeekNext(Integer ACharCnt);
  void SrcANext();
  void SrcWNext();
  void SrcUNext();
  void SrcASkipWhileA(TZqTextParserSkipOp AOperator, AnsiChar AChar);
  void SrcASkipWhileW(TZqTextParserSkipOp AOperator, Char AChar);
  void SrcWSkipWhileA(TZqTextParserSkipOp AOperator, AnsiChar AChar);
  void SrcWSkipWhileW(TZqTextParserSkipOp AOperator, Char AChar);
  void SrcUSkipWhileA(TZqTextParserSkipOp AOperator, AnsiChar AChar);
  void SrcUSkipWhileW(TZqTextParserSkipOp AOperator, Char AChar);
  void SrcASkipWhileIn(TZqTextParserSkipSetOp AOperator, const TZqTextParserCharSet& ACharSet);
  void SrcWSkipWhileIn(TZqTextParserSkipSetOp AOperator, const TZqTextParserCharSet& ACharSet);
  void SrcUSkipWhileIn(TZqTextParserSkipSetOp AOperator, const TZqTextParserCharSet& ACharSet);

 protected:
  static constexpr NativeUInt cChunkSize = 0x2000000;
  /// In chunks of another size.
  TZqTextParser(TStream* ASourceStream, Boolean AStreamOwner, Word AStreamCodePage, NativeUInt AChunkSize);

  TZqTextParserReadFuncA FnReadCharA, FnPrevCharA, FnCurrCharA, FnPeekCharA;
  TZqTextParserReadFuncW FnReadCharW, FnPrevCharW, FnCurrCharW, FnPeekCharW;
  TZqTextParserPeekFuncA FnPeekStringA;
  TZqTextParserPeekFuncW FnPeekStringW;
  TZqTextParserSkipFuncA FnSkipWhileA;
  TZqTextParserSkipFuncW FnSkipWhileW;

 private:
  struct TWrapped {};
  struct TFree {
    void operator()(Byte* ABlock) const noexcept { FreeMem(ABlock); }
  };
  class TLookAhead;

  TZqTextParser(TWrapped, const void* ABuffer, NativeUInt ABufSize, Word ACodePage);
  void Begin(Word ACodePage);
  void StartAt(const Byte* AText, NativeUInt ASize) noexcept;
  void ReadFirstChunk();
  void ReadBytes(NativeUInt ACount);
  [[nodiscard]] std::array<const Byte**, 8> Positions() noexcept;
  void MoveText(const Byte* AFrom, NativeUInt ARoom);
  const Byte*& MarkOf(TZqTextParserMarkPosType AMarkType);

  [[nodiscard]] NativeUInt Available(const Byte* const& APos, NativeUInt ACount) {
    const auto Left = static_cast<NativeUInt>(FBufEnd - APos);
    return Left >= ACount ? Left : AvailableInChunks(APos, ACount);
  }
  NativeUInt AvailableInChunks(const Byte* const& APos, NativeUInt ACount);
  // A counter runs through: a text may have more bytes than an Integer counts.
  static void Add(Integer& ACounter, NativeUInt ABy) noexcept {
    ACounter = static_cast<Integer>(static_cast<Cardinal>(ACounter) + static_cast<Cardinal>(ABy));
  }
  // Bytes of the character that begins with AFirst, by that alone.
  static NativeUInt Utf8Length(Byte AFirst) noexcept {
    if (AFirst < 0xC0) return 1;
    if (AFirst < 0xE0) return 2;
    return AFirst < 0xF0 ? 3 : 4;
  }
  [[nodiscard]] NativeUInt Left() const noexcept { return static_cast<NativeUInt>(FBufEnd - FState.CurPos); }
  void Prepare(NativeUInt ALength, NativeUInt AWanted);
  void Step(NativeUInt ALength, NativeUInt ACharacters) noexcept;
  void NewLine(Integer AColNr) noexcept;
  void Move();
  void PassSingles(const Byte* ATill) noexcept;

  const AnsiChar* NarrowAt(const Byte* const& APos);
  const WideChar* WideAt(const Byte* const& APos);
  [[nodiscard]] UnicodeString WideText(const Byte* AText, Integer ACount) const;
  const WideChar* Learn(Byte AByte);
  const WideChar* Deliver(Char AChar) noexcept;
  Char Utf8CharAt(const Byte* const& APos);
  bool IsPeeked();
  template <class TFind>
  void SkipSingles(TFind AFind);
  template <class TTest>
  void SkipEach(TTest ATest);
  [[nodiscard]] Int64 OffsetOf(TZqTextParserPosType APos) const;
  template <class TConvert>
  auto Selection(TZqTextParserPosType AFromPos, TZqTextParserPosType ATillPos, Boolean AClearMark, TConvert AConvert);

  TStream* FStream = nullptr;
  std::unique_ptr<TStream> FOwnStream;
  TZqCharacterSetType FCharacterSetType = SBCS;
  Word FContentCodePage = 0;
  NativeUInt FFirstPos = 0;
  const Byte* FBufStart = nullptr;
  const Byte* FBufEnd = nullptr;
  Int64 FBufOffset = 0;                     // of FBufStart in the text
  std::unique_ptr<Byte, TFree> FOwnBuffer;  // FBufStart, where the parser owns it
  Boolean FChunked = false;
  Integer FChunk = 0;
  NativeUInt FChunkSize;
  Boolean FLastChunk = true;
  TZqTextParserState FState;
  const Byte* FPeekPos = nullptr;  // within a look-ahead
  TLookAhead* FLookAhead = nullptr;
  const Byte* FMarkPos1 = nullptr;
  const Byte* FMarkPos2 = nullptr;
  const Byte* FMarkPos3 = nullptr;
  AnsiChar FAnsiChar = cZqEOFA;
  Char FWideChar = cZqEOFW;
  static constexpr Char cUnknown = u'\uFFFF';
  std::array<Char, 256> FSingles;  // the characters of single bytes, cUnknown until they are asked for
};

// ---- What an inner loop runs through
// ----------------------------------------------------------------------------------

inline void TZqTextParser::Step(NativeUInt ALength, NativeUInt ACharacters) noexcept {
  FState.CurPos += ALength;
  Add(FState.Position, ALength);
  Add(FState.CharsRead, ACharacters);
  Add(FState.ColNr, 1);
}

inline void TZqTextParser::NewLine(Integer AColNr) noexcept {
  Add(FState.LineNr, 1);
  FState.ColNr = AColNr;
}

inline void TZqTextParser::SrcANext() {
  FState.PrevPos = FState.CurPos;
  if (Left() < 2) [[unlikely]]
    Prepare(1, 2);
  Step(1, 1);
  if (Left() == 0) FState.Eof = true;
  else if (*FState.CurPos == Byte{cZqLFA}) NewLine(1);
}

inline void TZqTextParser::SrcUNext() {
  FState.PrevPos = FState.CurPos;
  if (Left() == 0) [[unlikely]]
    Prepare(1, 1);
  const NativeUInt Length = Utf8Length(*FState.CurPos);
  if (Left() <= Length) [[unlikely]]
    Prepare(Length, Length + 1);
  if (*FState.CurPos == Byte{cZqLFA}) NewLine(0);
  Step(Length, 1);
  if (Left() == 0) FState.Eof = true;
}

inline void TZqTextParser::Move() {
  switch (FCharacterSetType) {
    case SBCS: return SrcANext();
    case DBCS: return SrcWNext();
    case MBCS: return SrcUNext();
  }
}

inline const WideChar* TZqTextParser::SrcCurrCharW() {
  if (Left() > 0) {
    const Char& Known = FSingles[*FState.CurPos];
    if (Known != cUnknown) return &Known;
  }
  return WideAt(FState.CurPos);
}

}  // namespace zq
