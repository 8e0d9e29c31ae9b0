#include "common/uZqUUCode.h"

#include <algorithm>
#include <array>
#include <utility>

#include "common/uZqClasses/text_streams.h"
#include "common/uZqTypes.h"
#include "runtime/io/streams.h"
#include "runtime/io/string_list.h"
#include "runtime/text/casing.h"
#include "runtime/text/numbers.h"

namespace zq {

// ------------------------------------------------------------------------------------------------------- encoding

namespace {

constexpr std::size_t cLineBytes = 45;
constexpr std::size_t cLinesAtOnce = 256;

AnsiString HeaderFor(const UnicodeString& AFileName, Word AMode) {
  AnsiString Result(TZqEncoding::ConvertW(u"begin " + IntToStr(AMode) + u" " + AFileName, 0));
  if (Result.View().find_first_of("\r\n") != std::string_view::npos)
    throw Exception(u"A file name with a line end doesn't fit into the header of uuencode");
  return Result += "\r\n";
}

// ACount bytes, fewer only at the end, whatever steps the stream gives them in.
std::size_t ReadBlock(TStream& ASource, Byte* ABuffer, std::size_t ACount) {
  std::size_t Result = 0;
  while (Result < ACount) {
    const Integer Got = ASource.Read(ABuffer + Result, static_cast<Integer>(ACount - Result));
    if (Got <= 0) break;
    Result += static_cast<std::size_t>(Got);
  }
  if (Result < ACount) ASource.RequireEnd();
  return Result;
}

constexpr char CharacterOf(std::size_t AValue) noexcept { return static_cast<char>((AValue & 63U) + 32U); }

// ACount is rounded up to a multiple of 3 for reading: what is behind the bytes has to be zero.
char* EncodeLine(const Byte* AFrom, std::size_t ACount, char* ATo) noexcept {
  *ATo++ = CharacterOf(ACount);
  for (const Byte* const End = AFrom + ACount; AFrom < End; AFrom += 3) {
    const unsigned Group = unsigned{AFrom[0]} << 16U | unsigned{AFrom[1]} << 8U | AFrom[2];
    for (const unsigned Shift : {18U, 12U, 6U, 0U}) *ATo++ = CharacterOf(Group >> Shift);
  }
  *ATo++ = '\r';
  *ATo++ = '\n';
  return ATo;
}

void WriteText(TStream& ADest, std::string_view AText) {
  ADest.WriteBuffer(AText.data(), static_cast<Int64>(AText.size()));
}

void EncodeLines(TStream& ASource, TStream& ADest) {
  constexpr std::size_t cBytes = cLinesAtOnce * cLineBytes;
  std::array<Byte, cBytes + 2> Bytes;  // a group that isn't full is followed by zeros
  std::array<char, cLinesAtOnce*(1 + cLineBytes / 3 * 4 + 2)> Text;
  for (std::size_t Count = cBytes; Count == cBytes;) {
    Count = ReadBlock(ASource, Bytes.data(), cBytes);
    Bytes[Count] = Bytes[Count + 1] = 0;
    char* End = Text.data();
    for (std::size_t At = 0; At < Count; At += cLineBytes)
      End = EncodeLine(Bytes.data() + At, std::min(cLineBytes, Count - At), End);
    WriteText(ADest, {Text.data(), End});
  }
}

}  // namespace

void ZqUUEncode(TStream* ASource, TStream* ADest, const UnicodeString& AFileName, Word AMode) {
  Assert(ASource != ADest);
  WriteText(*ADest, HeaderFor(AFileName, AMode));
  EncodeLines(*ASource, *ADest);
  WriteText(*ADest, "`\r\nend");
}

AnsiString ZqUUEncode(TStream* ASource, const UnicodeString& AFileName, Word AMode) {
  TZqStringStream Result;
  ZqUUEncode(ASource, &Result, AFileName, AMode);
  return Result.AsAnsiString();
}

AnsiString ZqUUEncode(std::string_view AValue, const UnicodeString& AFileName, Word AMode) {
  TStringStream Source{AnsiString(AValue)};
  return ZqUUEncode(&Source, AFileName, AMode);
}

// ------------------------------------------------------------------------------------------------------- decoding

namespace {

[[noreturn]] void RaiseEnd() { throw Exception(u"Unexpected EOF"); }
[[noreturn]] void RaiseInvalid() { throw Exception(u"Invalid UUData"); }

// The lines one after the other, as bytes of code page 0.
class TLineReader {
 public:
  explicit TLineReader(const TStrings& ALines) noexcept : FLines(ALines) {}

  RawByteString Next() {
    if (Left() < 1) RaiseEnd();
    return TZqEncoding::ConvertW(FLines[FNext++], 0);
  }
  [[nodiscard]] Integer Left() const noexcept { return FLines.Count() - FNext; }
  [[nodiscard]] bool AtTerminator() const {
    return Left() >= 2 && FLines[FNext] == u"`" && SameText(FLines[FNext + 1], u"end");
  }

 private:
  const TStrings& FLines;
  Integer FNext = 0;
};

UnicodeString FindHeader(TLineReader& ALines, const UnicodeString& AFileName) {
  const UnicodeString Wanted = AnsiLowerCase(AFileName);
  for (;;) {
    UnicodeString Line = TZqEncoding::ConvertA(ALines.Next(), 0);
    if (Wanted.IsEmpty() || AnsiLowerCase(Line).Pos(Wanted) != 0) return Line;
  }
}

TZqUUData ParseHeader(const UnicodeString& ALine) {
  constexpr std::u16string_view cBegin = u"begin ";
  if (!SameText(ALine.View().substr(0, cBegin.size()), cBegin)) RaiseInvalid();
  const std::u16string_view Rest = ALine.View().substr(cBegin.size());
  const std::size_t Blank = std::min(Rest.find(u' '), Rest.size());
  const Integer Mode = StrToIntDef(Rest.substr(0, Blank), 0);
  if (Mode < 1 || Mode > 0xFFFF) RaiseInvalid();
  return {Rest.substr(std::min(Blank + 1, Rest.size())), static_cast<Word>(Mode)};
}

// Collects what is decoded, for few writes. Flush before anything else is to see the stream.
class TByteWriter {
 public:
  explicit TByteWriter(TStream& ADest) noexcept : FDest(ADest) {}

  /// At most 3.
  void Write(std::array<Byte, 3> ABytes, std::size_t ACount) {
    if (FBytes.size() - FCount < ABytes.size()) Flush();
    std::copy_n(ABytes.data(), ACount, FBytes.data() + FCount);
    FCount += ACount;
  }
  void Flush() { FDest.WriteBuffer(FBytes.data(), static_cast<Int64>(std::exchange(FCount, 0))); }

 private:
  TStream& FDest;
  std::array<Byte, 0x2000> FBytes;
  std::size_t FCount = 0;
};

constexpr unsigned ValueOf(char ACharacter) noexcept { return (static_cast<unsigned char>(ACharacter) - 32U) & 63U; }

void DecodeLine(std::string_view ALine, TByteWriter& AOut) {
  std::array<char, 84> Text;  // for 63 bytes, the most that a line can count
  Text.fill(' ');
  ALine.copy(Text.data(), Text.size(), 1);
  std::size_t Count = ValueOf(ALine.front());
  for (const char* From = Text.data(); Count > 0; From += 4) {
    const unsigned Group =
        ValueOf(From[0]) << 18U | ValueOf(From[1]) << 12U | ValueOf(From[2]) << 6U | ValueOf(From[3]);
    const std::size_t Step = std::min<std::size_t>(Count, 3);
    AOut.Write({static_cast<Byte>(Group >> 16U), static_cast<Byte>(Group >> 8U), static_cast<Byte>(Group)}, Step);
    Count -= Step;
  }
}

void DecodeLines(TLineReader& ALines, TByteWriter& AOut) {
  while (!ALines.AtTerminator()) {
    const RawByteString Line = ALines.Next();
    if (Line.IsEmpty()) RaiseInvalid();
    if (Line == "end") RaiseEnd();  // no count is written as a small letter: this block had another terminator, or none
    DecodeLine(Line, AOut);
    if (ALines.Left() < 2) RaiseEnd();
  }
}

}  // namespace

TZqUUData ZqUUDecode(const TStrings& ALines, const UnicodeString& AFileName, TStream* ADest) {
  TLineReader Lines(ALines);
  TZqUUData Result = ParseHeader(FindHeader(Lines, AFileName));
  TByteWriter Out(*ADest);
  try {
    DecodeLines(Lines, Out);
  } catch (...) {
    Out.Flush();
    throw;
  }
  Out.Flush();
  return Result;
}

TZqUUData ZqUUDecode(const TStrings& ALines, TStream* ADest) { return ZqUUDecode(ALines, {}, ADest); }

TZqUUData ZqUUDecode(TStream* ASource, TStream* ADest) {
  TStringList Lines;
  Lines.LoadFromStream(*ASource);
  return ZqUUDecode(Lines, ADest);
}

TZqUUData ZqUUDecode(std::string_view AValue, TStream* ADest) { return ZqUUDecode(AValue, {}, ADest); }

TZqUUData ZqUUDecode(std::string_view AValue, const UnicodeString& AFileName, TStream* ADest) {
  TStringList Lines;
  Lines.SetText(TZqEncoding::ConvertA(AnsiString(AValue)));
  return ZqUUDecode(Lines, AFileName, ADest);
}

}  // namespace zq
