#include <unistd.h>

#include <cstring>
#include <new>

#include "common/uZqClasses/parser.h"
#include "common/uZqClasses/streams.h"
#include "runtime/text/encoding.h"
#include "tests/support/support.h"

namespace zq {
namespace {

// Bytes that are no memory stream, given out at most FMost at a time, and not at all from FFailsAt on.
class TTold : public TStream {
 public:
  explicit TTold(std::string ABytes, Integer AMost = 1 << 30) : FBytes(std::move(ABytes)), FMost(AMost) { ++Alive; }
  ~TTold() override { --Alive; }
  using TStream::Seek;
  Integer Read(void* ABuffer, Integer ACount) override {
    if (Raises && FPosition >= FFailsAt) throw EStreamError(u"no more");
    const auto Left = static_cast<std::size_t>(std::max(Int64{0}, std::min(Size(), FFailsAt) - FPosition));
    const auto Count = std::min({static_cast<std::size_t>(ACount), static_cast<std::size_t>(FMost), Left});
    std::memcpy(ABuffer, FBytes.data() + FPosition, Count);
    FPosition += static_cast<Int64>(Count);
    return static_cast<Integer>(Count);
  }
  Integer Write(const void*, Integer) override { return 0; }
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override {
    return FPosition = AOffset + (AOrigin == soEnd ? Size() : AOrigin == soCurrent ? FPosition : 0);
  }
  Int64 GetSize() override { return static_cast<Int64>(FBytes.size()); }

  static inline int Alive = 0;
  bool Raises = false;
  Int64 FFailsAt = 1 << 30;

 private:
  std::string FBytes;
  Integer FMost;
  Int64 FPosition = 0;
};

class TChunked : public TZqTextParser {
 public:
  TChunked(TStream* AStream, Word APage, NativeUInt AChunk) : TZqTextParser(AStream, true, APage, AChunk) {}
};

std::string Wide(const char16_t* AText) {
  const UnicodeString Text(AText);
  return {reinterpret_cast<const char*>(Text.data()), Text.size() * 2};
}

std::string Counters(const TZqTextParser& AParser) {
  return std::to_string(AParser.LineNr()) + ':' + std::to_string(AParser.ColNr()) + ':' +
         std::to_string(AParser.CharsRead()) + ':' + std::to_string(AParser.Position());
}

// What AWalk tells is the same from memory, at an even and an odd address, and in chunks of any size.
void ExpectWalk(const std::string& AText, Word APage, const std::function<std::string(TZqTextParser&)>& AWalk,
    const std::string& AExpected) {
  SCOPED_TRACE(testing::PrintToString(AText) + " in " + std::to_string(APage));
  for (const std::size_t Shift : {0U, 1U}) {
    const std::string Shifted = std::string(Shift, ' ') + AText;
    TZqTextParser Parser = TZqTextParser::WrapMem(Shifted.data() + Shift, AText.size(), APage);
    EXPECT_EQ(AWalk(Parser), AExpected) << "at " << Shift;
  }
  for (NativeUInt Chunk = 1; Chunk <= AText.size() + 1; ++Chunk) {
    TChunked Parser(new TTold(AText, Chunk % 3 == 0 ? 1 : 5), APage, Chunk);
    EXPECT_EQ(AWalk(Parser), AExpected) << "in chunks of " << Chunk;
    Parser.First();
    EXPECT_EQ(AWalk(Parser), AExpected) << "again in chunks of " << Chunk;
  }
  EXPECT_EQ(TTold::Alive, 0);
}

std::string Characters(TZqTextParser& AParser) {
  std::string Result;
  for (; !AParser.Eof(); AParser.Next()) {
    char Code[8];
    std::snprintf(Code, sizeof(Code), "%X", static_cast<unsigned>(*AParser.CurrChar()));
    Result += std::string(Code) + '@' + Counters(AParser) + ' ';
  }
  return Result + Counters(AParser);
}

TEST(TextParser, CountsLinesColumnsCharactersAndBytes) {
  const std::tuple<std::string, Word, std::string> Cases[] = {{"a\nb", 1252, "61@1:0:0:0 A@2:1:1:1 62@2:2:2:2 2:3:3:3"},
      {"a\nb", 65001, "61@1:0:0:0 A@1:1:1:1 62@2:1:2:2 2:2:3:3"},
      {Wide(u"a\nb"), 1200, "61@1:0:0:0 A@2:1:2:2 62@2:2:4:4 2:3:6:6"},
      {"\nx\n", 1252, "A@1:0:0:0 78@1:1:1:1 A@2:1:2:2 2:2:3:3"},
      {"\nx\n", 65001, "A@1:0:0:0 78@2:1:1:1 A@2:2:2:2 3:1:3:3"},
      {"a\r\nb\rc", 0, "61@1:0:0:0 D@1:1:1:1 A@2:1:2:2 62@2:2:3:3 D@2:3:4:4 63@2:4:5:5 2:5:6:6"},
      {"\xE9\x80\xFF", 1252, "E9@1:0:0:0 20AC@1:1:1:1 FF@1:2:2:2 1:3:3:3"},
      {"\xEF\xBB\xBF\xC3\xA9\xE2\x82\xAC", 65001, "FEFF@1:0:0:0 E9@1:1:1:3 20AC@1:2:2:5 1:3:3:8"},
      {"\xF0\x9F\x98\x80\xC0\xBF\xBFz", 65001, "FFFD@1:0:0:0 FFFD@1:1:1:4 FFFD@1:2:2:6 7A@1:3:3:7 1:4:4:8"},
      {Wide(u"\xE9\xD83D"), 1200, "E9@1:0:0:0 D83D@1:1:2:2 1:2:4:4"}};
  for (const auto& [Text, Page, Expected] : Cases) ExpectWalk(Text, Page, Characters, Expected);
}

TEST(TextParser, EndsWhereTheTextDoes) {
  const auto Ends = [](TZqTextParser& AParser) {
    std::string Result;
    while (Result.size() < 99 && RaisedBy([&] { AParser.Next(); }) == u"nothing") Result += AParser.Eof() ? 'e' : '.';
    EXPECT_EQ(RaisedBy([&] { AParser.Next(); }), u"EZqTextParserEOF: Unexpected EOF");
    EXPECT_EQ(RaisedBy([&] { AParser.CheckEOF(); }), u"EZqTextParserEOF: Unexpected EOF");
    EXPECT_TRUE(AParser.Eof() && AParser.GetEOF() && AParser.GetPos(tpPrevPos) == AParser.CurPos());
    const bool Raises = RaisedBy([&] { static_cast<void>(AParser.CurrChar()); }) != u"nothing";
    EXPECT_TRUE(Raises == (AParser.CharacterSetType() == MBCS) && (Raises || AParser.CurrCharA() == cZqEOFA));
    return Result + std::to_string(AParser.Position());
  };
  ExpectWalk("a", 1252, Ends, "e1");
  ExpectWalk("a\xC3\xA9", 65001, Ends, ".e3");
  ExpectWalk("a\xC3", 65001, Ends, ".2");
  ExpectWalk("\xE2\x82", 65001, Ends, "2");
  ExpectWalk("a\xF0\x9F\x98", 65001, Ends, ".4");
  ExpectWalk(Wide(u"ab") + '\n', 1200, Ends, "..5");
  TZqTextParser Parser = TZqTextParser::WrapMem("ab\nc", 4, 1252);
  EXPECT_TRUE(Parser.PrevCharA() == 0 && Parser.PrevCharW() == 0 && Parser.GetPos(tpPrevPos) == nullptr);
  Parser.Next(), Parser.SetMark(tpMarkPos2), Parser.Last();
  EXPECT_TRUE(Parser.Eof() && Parser.ByteOffset() == 4 && Counters(Parser) == "1:1:1:1" && Parser.PrevCharA() == 'a');
  Parser.First();
  EXPECT_TRUE(Counters(Parser) == "1:0:0:0" && Parser.MarkPos2() == nullptr && !Parser.Eof());
}

TEST(TextParser, LooksAheadWithoutAMove) {
  const TAnsiCodePageScope Ansi(1252);
  const auto Looks = [](TZqTextParser& AParser) {
    AParser.ReadCharA(), AParser.SetMark(tpMarkPos1);
    const std::string Before = Counters(AParser);
    std::string Result;
    for (const Integer Count : {0, 1, 3, 99}) Result += ToUTF8(AParser.PeekString(Count)) + '|';
    Result +=
        AParser.PeekStringA(2).Str() + '|' + AParser.PeekCharA() + ToUTF8(UnicodeString(1, AParser.PeekCharW())) + '|';
    const auto* const Ahead = AParser.SrcPeekNext(2);
    Result +=
        std::to_string(Ahead - AParser.CurPos()) + '|' + std::to_string(AParser.SelectedCnt(tpMarkPos1, tpPeekPos));
    EXPECT_TRUE(Counters(AParser) == Before && AParser.PrevCharA() == 'a' && AParser.GetPos(tpPeekPos) == nullptr);
    EXPECT_TRUE(AParser.SrcPeekNext(0) == AParser.CurPos() && *AParser.SrcPeekNext(4) == ' ');
    EXPECT_EQ(RaisedBy([&] { AParser.SrcPeekNext(6); }), u"EZqTextParserEOF: Unexpected EOF");
    EXPECT_EQ(Counters(AParser), Before);
    return Result;
  };
  ExpectWalk("a\xE9\r\n\xE8 b", 1252, Looks, "|é|é\r\n|é\r\nè b|\xE9\r|\xE8è|3|1");
  ExpectWalk(Wide(u"aé\r\nè b"), 1200, Looks, "|é|é\r\n|é\r\nè b|\xE9\r|\xE8è|6|2");
  ExpectWalk("a\xC3\xA9\r\n\xC3\xA8 b", 65001, Looks, "|é|é\r\n|é\r\nè b|\xE9\r|  |4|2");
}

TEST(TextParser, LooksOntoTheEnd) {
  const std::tuple<std::string, Word, UnicodeString> Cases[] = {
      {"a", 1252, u"nothing"}, {Wide(u"a"), 1200, u"nothing"}, {"a", 65001, u"EZqTextParserEOF: Unexpected EOF"}};
  for (const auto& [Text, Page, Raised] : Cases)
    ExpectWalk(
        Text, Page,
        [&Raised = Raised](TZqTextParser& AParser) {
          EXPECT_EQ(AParser.PeekStringW(2), u"a");
          EXPECT_EQ(RaisedBy([&] { EXPECT_EQ(AParser.PeekCharW(), 0); }), Raised);
          EXPECT_TRUE(!AParser.Eof() && AParser.Position() == 0 && AParser.ReadCharW() == u'a' && AParser.Eof());
          EXPECT_EQ(RaisedBy([&] { EXPECT_EQ(AParser.PeekStringW(1), u""); }), Raised);
          EXPECT_EQ(RaisedBy([&] { AParser.PeekChar(); }), u"EZqTextParserEOF: Unexpected EOF");
          EXPECT_EQ(RaisedBy([&] { AParser.ReadChar(); }), u"EZqTextParserEOF: Unexpected EOF");
          return std::string();
        },
        "");
}

TEST(TextParser, SkipsAsLongAsItIsTold) {
  struct TCase {
    TZqTextParserSkipOp Operator;
    char16_t Character;
    int Stops;  // in "bbacéb", characters
  };
  const TCase Cases[] = {{sopEq, 'b', 2}, {sopEq, 'a', 0}, {sopUnEq, 'a', 2}, {sopUnEq, 'x', 6}, {sopLt, 'b', 0},
      {sopLt, 'c', 3}, {sopLtEq, 'b', 3}, {sopLtEq, 'a', 0}, {sopGt, 'a', 2}, {sopGtEq, 'a', 6}, {sopGtEq, 'b', 2},
      {sopUnEq, u'é', 4}, {sopLt, u'é', 4}, {sopLtEq, u'é', 6}, {sopIn, 'b', 0}, {sopNotIn, 'b', 0}};
  const TAnsiCodePageScope Ansi(1252);
  for (const auto& [Text, Page, Unit] : {std::tuple<std::string, Word, int>{"bbac\xE9"
                                                                            "b",
                                             1252, 1},
           {Wide(u"bbacéb"), 1200, 2},
           {"bbac\xC3\xA9"
            "b",
               65001, 1}})
    for (const TCase& Case : Cases) {
      const auto Stops = std::to_string(Case.Stops * Unit);
      const auto Skip = [&Case](TZqTextParser& AParser, bool AWide) {
        if (AWide) AParser.SkipWhile(Case.Operator, Case.Character);
        else AParser.SkipWhile(Case.Operator, static_cast<AnsiChar>(Case.Character));
        return std::to_string(AParser.CharsRead());
      };
      SCOPED_TRACE(testing::Message() << "operator " << int(Case.Operator) << ' ' << int(Case.Character));
      ExpectWalk(
          Text, Page, [&](TZqTextParser& AParser) { return Skip(AParser, true); }, Stops);
      ExpectWalk(
          Text, Page, [&](TZqTextParser& AParser) { return Skip(AParser, false); }, Stops);
    }
}

TEST(TextParser, SkipsWhileInASet) {
  const TZqTextParserCharSet Set{'a', 'b', '\xE9'};
  const auto Skip = [&](TZqTextParser& AParser) {
    AParser.SkipWhileInSet(sopIn, Set);
    const std::string First = std::to_string(AParser.Position());
    AParser.SkipWhileInSet(sopNotIn, Set);
    return First + ' ' + std::to_string(AParser.Position()) + (AParser.Eof() ? " end" : "");
  };
  ExpectWalk("ab\xE9xyb", 1252, Skip, "3 5");
  ExpectWalk("xy", 1252, Skip, "0 2 end");
  ExpectWalk(Wide(u"aé\u0161xy\u0161"), 1200, Skip, "6 12 end");
  ExpectWalk("a\xC3\xA9\xE9\x80\x80x", 65001, Skip, "1 3");
}

// The fast way over bytes keeps the same counters as single steps, whatever its blocks are.
TEST(TextParser, SkipsWithTheCountersOfSingleSteps) {
  const std::string Piece = "\n12345\n\n890123456789\n2345678901<";
  for (std::size_t From = 0; From < Piece.size(); ++From) {
    const std::string Text = Piece.substr(From) + Piece;
    TZqTextParser Steps = TZqTextParser::WrapMem(Text.data(), Text.size(), 1252);
    while (!Steps.Eof() && *Steps.CurrChar() != '<') Steps.SrcANext();
    ExpectWalk(
        Text, 1252,
        [&](TZqTextParser& AParser) {
          AParser.SkipWhile(sopUnEq, '<');
          return Counters(AParser) + AParser.PrevCharA();
        },
        Counters(Steps) + Steps.PrevCharA());
  }
}

TEST(TextParser, SelectsWhatLiesBetweenPositions) {
  const TAnsiCodePageScope Ansi(1252);
  const auto Select = [](TZqTextParser& AParser) {
    AParser.SetMark(tpMarkPos1), AParser.SkipChars(2), AParser.SetMark(tpMarkPos3);
    EXPECT_EQ(AParser.SelectedCnt(tpMarkPos1, tpMarkPos1), 0);
    EXPECT_LT(AParser.SelectedCnt(tpCurPos, tpMarkPos1), 0);
    EXPECT_EQ(RaisedBy([&] { AParser.SelectedA(tpCurPos, tpMarkPos1, false); }).Copy(1, 16), u"EAssertionFailed");
    std::string Result = ToUTF8(AParser.SelectedW(tpMarkPos1, tpCurPos, false)) + '|' +
                         AParser.SelectedA(tpMarkPos1, tpPeekPos, false).Str() + '|' +
                         ToUTF8(AParser.Selected(tpPrevPos, tpPeekPos, false)) + '|' +
                         std::to_string(AParser.SelectedCnt(tpMarkPos1, tpPeekPos)) + '|';
    Result += ToUTF8(AParser.Selected(tpMarkPos1, tpMarkPos3, true));
    EXPECT_TRUE(AParser.MarkPos1() == nullptr && AParser.MarkPos3() == nullptr);
    EXPECT_EQ(RaisedBy([&] { AParser.Selected(tpMarkPos1, tpCurPos, false); }).Copy(1, 35),
        u"EAssertionFailed: Assertion failure");
    return Result;
  };
  ExpectWalk("\xE9\tb\xE8!", 1252, Select, "é\tb|\xE9\tb\xE8|bè|4|é\tb");
  ExpectWalk(Wide(u"é\tbè!"), 1200, Select, "é\tb|\xE9\tb\xE8|bè|8|é\tb");
  ExpectWalk("\xC3\xA9\tb\xC3\xA8!", 65001, Select, "é\tb|\xE9\tb\xE8|bè|6|é\tb");
  ExpectWalk("x\ty\xF0\x9F\x98\x80", 65001, Select, "x\ty|x\ty?|y😀|7|x\ty");
}

TEST(TextParser, RefusesWhatItCantParse) {
  const char Text[] = "text";
  for (const Word Page : std::initializer_list<Word>{1201, 12000, 12001})
    EXPECT_EQ(RaisedBy([&] { static_cast<void>(TZqTextParser::WrapMem(Text, 4, Page)); }),
        u"Exception: The specified encoding is not supported!");
  EXPECT_EQ(RaisedBy([] { TZqTextParser(new TTold(""), true, 0); }).Copy(1, 60),
      u"EAssertionFailed: It is not possible to parse empty streams!");
  EXPECT_EQ(RaisedBy([] { TZqTextParser(new TTold("x"), true, 1201); }).Copy(1, 9), u"Exception");
  EXPECT_EQ(TTold::Alive, 0);
  TZqTextParser Parser = TZqTextParser::WrapMem(Text, 4, 1252);
  EXPECT_EQ(RaisedBy([&] { Parser.GetNextChunk(); }).Copy(1, 35), u"EAssertionFailed: Assertion failure");
  EXPECT_EQ(RaisedBy([&] { Parser.SetMark(tpCurPos); }), u"Exception: Invalid MarkType specified!");
  EXPECT_EQ(RaisedBy([&] { Parser.ClearMark(tpPeekPos); }), u"Exception: Invalid MarkType specified!");
  const auto Beyond = static_cast<TZqTextParserPosType>(6);
  EXPECT_EQ(RaisedBy([&] { static_cast<void>(Parser.GetPos(Beyond)); }), u"Exception: Invalid TillPos specified!");
  const std::tuple<TZqCharacterSetType, Word, bool> Pages[] = {{SBCS, 65001, false}, {SBCS, 1200, false},
      {SBCS, 437, true}, {MBCS, 65001, true}, {MBCS, 1252, false}, {DBCS, 1200, true}, {DBCS, 65001, false},
      {DBCS, 1252, true}};
  for (const auto& [Set, Page, IsTaken] : Pages) {
    Parser.SetCharacterSetType(Set);
    EXPECT_EQ(RaisedBy([&, Number = Page] { Parser.SetContentCodePage(Number); }) == u"nothing", IsTaken) << Page;
  }
}

// A stream that fails gives its failure, and the walk goes on where it was once the stream does.
TEST(TextParser, GoesOnBehindAFailureOfTheStream) {
  const std::string Text =
      "ab\xC3\xA9\nc\xE2\x82\xAC"
      "def";
  for (const bool Raises : {false, true}) {
    const UnicodeString Told = Raises ? u"EStreamError: no more" : u"EReadError: Stream read error";
    for (NativeUInt Chunk = 1; Chunk < Text.size(); ++Chunk)
      for (auto At = static_cast<Int64>(Chunk); At < static_cast<Int64>(Text.size()); ++At) {
        auto* const Stream = new TTold(Text, 2);
        TChunked Parser(Stream, 65001, Chunk);
        Stream->Raises = Raises, Stream->FFailsAt = At;
        Parser.SetMark(tpMarkPos1);
        std::string Before;  // bytes that came with a failure are there for the next move
        for (UnicodeString Raised, Last; Raised != Told || Last != Told; Last = Raised) {
          Before = Counters(Parser);
          Raised = RaisedBy([&] { Parser.Next(); });
          ASSERT_TRUE(!Parser.Eof() && (Raised == u"nothing" || Raised == Told)) << Before;
        }
        EXPECT_EQ(Counters(Parser), Before);
        Stream->FFailsAt = 1 << 30;
        while (!Parser.Eof()) Parser.Next();
        EXPECT_EQ(ToUTF8(Parser.Selected(tpMarkPos1, tpCurPos, true)), Text);
        EXPECT_EQ(Counters(Parser), "2:6:9:12");
      }
  }
}

TEST(TextParser, WalksMemoryInPlaceAndFilesFromTheirPosition) {
  const TTempFolder Folder;
  Folder.Write("text", "0123456789abc");
  TFileStream File(Folder.File("text"), fmOpenRead);
  File.SetPosition(10);
  TZqTextParser Parser(&File, false, 65001);
  EXPECT_TRUE(Parser.ReadCharW() == 'a' && Parser.Position() == 1 && Parser.ChunkSize() == 32 << 20);
  Parser.First();
  EXPECT_EQ(Parser.PeekString(9), u"abc");
  TMemoryStream Memory;
  Memory.WriteBuffer("xyz", 3), Memory.SetPosition(1);
  TZqMemoryStream Other(16);
  Other.Write("xyz", 3), Other.SetPosition(1);
  TZqTextParser InMemory(&Memory, false, 1252), InOther(&Other, false, 1252);
  EXPECT_TRUE(InMemory.CurPos() == static_cast<Byte*>(Memory.Memory()) + 1 && Memory.Position() == 3);
  EXPECT_TRUE(InOther.CurPos() == static_cast<Byte*>(Other.Buffer()) + 1 && Other.Position() == 3);
  TZqTextParser AtTheEnd(&Memory, false, 1252);
  EXPECT_TRUE(AtTheEnd.Eof() && AtTheEnd.GetEOF());
}

TEST(TextParser, GivesBytesOfSingleByteTextAsTheyAre) {
  const TAnsiCodePageScope Ansi(1252);
  TZqTextParser Parser = TZqTextParser::WrapMem("\x82\x82", 2, 437);
  EXPECT_TRUE(Parser.CurrCharA() == '\x82' && Parser.CurrCharW() == u'é' && Parser.PeekCharA() == '\x82');
  EXPECT_EQ(Parser.PeekStringA(1) + Parser.SelectedA(tpCurPos, tpPeekPos, false), "\x82\x82");
  Parser.SetContentCodePage(1252);
  EXPECT_EQ(Parser.ReadCharW(), u'\u201A');
}

TEST(TextParser, CallsWhatIsAssignedToItsFields) {
  TZqTextParser Parser = TZqTextParser::WrapMem("a\tbc", 4, 1252);
  int Moves = 0;
  const TZqTextParserNextFunc Own = Parser.Next.Callback();
  Parser.Next = [&] { ++Moves, Own(); };
  Parser.NextChar();
  EXPECT_TRUE(Moves == 2 && *Parser.CurrChar() == 'b');
  Parser.SetCharacterSetType(SBCS), Parser.Next();
  EXPECT_TRUE(Moves == 2 && Parser.Position() == 3);
}

// 5 GiB of lines of 63 letters, without being anywhere as a whole.
class TEndless : public TTold {
 public:
  TEndless() : TTold("") {}
  Integer Read(void* ABuffer, Integer ACount) override {
    const auto Count = static_cast<Integer>(std::min<Int64>(ACount, cSize - At));
    std::memset(ABuffer, 'x', static_cast<std::size_t>(Count));
    for (Integer i = 63; i < Count; i += 64) static_cast<char*>(ABuffer)[i] = '\n';
    if (Integer Pages = 0, Resident = 0;
        std::sscanf(ReadFile("/proc/self/statm").c_str(), "%d %d", &Pages, &Resident) == 2)
      Most = std::max(Most, Int64{Resident} * ::getpagesize());
    At += Count;
    return Count;
  }
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override {
    return AOrigin == soEnd ? cSize : AOrigin == soBeginning ? At = AOffset : At;
  }
  Int64 GetSize() override { return cSize; }

  static constexpr Int64 cSize = Int64{5} << 30;
  Int64 At = 0;
  Int64 Most = 0;
};

TEST(TextParser, WalksGigabytesInTheMemoryOfAChunk) {
  TEndless Stream;
  TZqTextParser Parser(&Stream, false, 1252);
  Parser.SkipWhile(sopUnEq, '<');
  EXPECT_TRUE(Parser.Eof() && Parser.ByteOffset() == Stream.cSize && Parser.Position() == 1 << 30);
  EXPECT_EQ(Parser.LineNr(), (80 << 20) + 1);
#ifndef __SANITIZE_ADDRESS__
  const Int64 Before = Stream.Most;
  Parser.First(), Parser.SetMark(tpMarkPos1);
  while (Parser.ByteOffset() < 100 << 20) Parser.SkipWhile(sopUnEq, '\n'), Parser.Next();
  EXPECT_LT(Stream.Most - Before, Int64{100} << 20);
#endif
}

}  // namespace
}  // namespace zq
