#include "common/uZqUUCode.h"

#include "runtime/io/streams.h"
#include "runtime/text/encoding.h"
#include "runtime/text/numbers.h"
#include "tests/support/support.h"

namespace zq {
namespace {

using namespace std::string_literals;

struct TDecoded {
  UnicodeString Outcome;  // mode and name, or what was raised
  std::string Bytes;
  friend bool operator==(const TDecoded&, const TDecoded&) = default;
};
void PrintTo(const TDecoded& AValue, std::ostream* AStream) {
  *AStream << AValue.Outcome.ToUTF8() << " and " << testing::PrintToString(AValue.Bytes);
}

TDecoded Decode(std::string_view AText, const UnicodeString& AFileName = {}) {
  TMemoryStream Dest;
  TZqUUData Data;
  TDecoded Result{RaisedBy([&] { Data = ZqUUDecode(AText, AFileName, &Dest); }), {}};
  if (Result.Outcome == u"nothing") Result.Outcome = IntToStr(Data.Mode) + u" " + Data.FileName;
  Result.Bytes.assign(static_cast<const char*>(Dest.Memory()), static_cast<std::size_t>(Dest.Size()));
  return Result;
}

const UnicodeString cEnd = u"Exception: Unexpected EOF", cInvalid = u"Exception: Invalid UUData";

TEST(UUCode, WritesTheTextOfTheFormat) {
  const std::pair<std::string, std::string> Cases[] = {{"", ""}, {"Cat", "#0V%T\r\n"}, {"\0\0\0"s, "#    \r\n"},
      {"\xFF", "!_P  \r\n"}, {"\x00\x0F\xF0"s, "#  _P\r\n"},
      {std::string(45, '\xFF'), "M" + std::string(60, '_') + "\r\n"},
      {std::string(46, '\0'), "M" + std::string(60, ' ') + "\r\n!    \r\n"}};
  for (const auto& [Plain, Lines] : Cases)
    EXPECT_EQ(ZqUUEncode(Plain, u"a b.txt", 644), "begin 644 a b.txt\r\n" + Lines + "`\r\nend");
}

// Gives a few bytes at a time, and none from ABreak on.
struct TDribble : TStringStream {
  TDribble(std::string ABytes, Int64 ABreak) : TStringStream(RawByteString(std::move(ABytes))), Break(ABreak) {}
  Integer Read(void* ABuffer, Integer ACount) override {
    return Position() >= Break ? 0 : TStringStream::Read(ABuffer, std::min(ACount, 7));
  }
  Int64 Break;
};

TEST(UUCode, EveryLengthComesBackWhateverStepsItIsReadIn) {
  std::vector<std::size_t> Lengths{11519, 11520, 11521, 11566, 50000};
  for (std::size_t i = 0; i <= 137; ++i) Lengths.push_back(i);
  for (const std::size_t Length : Lengths) {
    std::string Plain;
    while (Plain.size() < Length) Plain += static_cast<char>(Plain.size() * 151 >> 3);
    TDribble Source(Plain, std::numeric_limits<Int64>::max());
    const AnsiString Text = ZqUUEncode(&Source, u"a.txt", 644);
    EXPECT_EQ(Text, ZqUUEncode(Plain, u"a.txt", 644));
    EXPECT_EQ(Decode(Text), (TDecoded{u"644 a.txt", Plain})) << Length;
  }
}

TEST(UUCode, TakesHeadersAsTheyCome) {
  const std::pair<std::string, UnicodeString> Cases[] = {{"BEGIN 0644  a b ", u"644  a b "}, {"begin 1 ", u"1 "},
      {"begin 644", u"644 "}, {"begin 65535 x", u"65535 x"}, {"begin 65536 x", cInvalid}, {"begin 0 x", cInvalid},
      {"begin -1 x", cInvalid}, {"begin  644 x", cInvalid}, {"begin rw x", cInvalid}, {"begin", cInvalid},
      {" begin 644 x", cInvalid}, {"text\nbegin 644 x", cInvalid}, {"", cInvalid}};
  for (const auto& [Header, Outcome] : Cases)
    EXPECT_EQ(Decode(Header + "\n#0V%T\n`\nEnd\nbehind"), (TDecoded{Outcome, Outcome.Pos(u":") > 0 ? "" : "Cat"}))
        << Header;
}

TEST(UUCode, FindsTheBlockOfAName) {
  const std::string Mail = "Hi,\n\nbegin 600 one.txt\n#0V%T\n`\nend\nbegin 644 Two.txt\n#1&]G\n`\nend\n";
  EXPECT_EQ(Decode(Mail, u"tWO.TXT"), (TDecoded{u"644 Two.txt", "Dog"}));
  EXPECT_EQ(Decode(Mail, u"three"), (TDecoded{cEnd, ""}));
  EXPECT_EQ(Decode(""), (TDecoded{cEnd, ""}));
  EXPECT_EQ(Decode("See one.txt:\n" + Mail, u"one.txt"), (TDecoded{cInvalid, ""})) << "the first line that holds it";
}

TEST(UUCode, WhatABrokenBlockHeldIsWrittenBeforeItRaises) {
  const std::pair<std::string, TDecoded> Cases[] = {{"", {cEnd, ""}}, {"#0V%T", {cEnd, "Cat"}},
      {"#0V%T\n`", {cEnd, "Cat"}}, {"`\nend", {u"644 x", ""}}, {"#0V%T\n`\n`\nend", {u"644 x", "Cat"}},
      {"#0V%T\n\n`\nend", {cInvalid, "Cat"}}, {"#0V%T\n \nend", {cEnd, "Cat"}},
      {"#0V%T\n \nend\nregards\nfrom me", {cEnd, "Cat"}}, {"#0V%T\n` \nend\n\n", {cEnd, "Cat"}},
      {"#0V%T\nend\n1\n2", {cEnd, "Cat"}}};
  for (const auto& [Lines, Expected] : Cases) EXPECT_EQ(Decode("begin 644 x\n" + Lines), Expected) << Lines;
}

TEST(UUCode, ShortLinesEndInBlanksAndLongOnesAreCut) {
  const std::pair<std::string, std::string> Cases[] = {{"#0V%", "Ca@"}, {"!0P", "C"}, {"\"0V$", "Ca"}, {"!", "\0"s},
      {"M", std::string(45, '\0')}, {"_" + std::string(84, '_'), std::string(63, '\xFF')}, {"$0V%T0V%Tmore", "CatC"},
      {"#0V%Ti", "Cat"}, {"#````", "\0\0\0"s}, {"\xE2\x80", "\x80\0"s}};
  const TAnsiCodePageScope Western(1252);
  for (const auto& [Line, Bytes] : Cases)
    EXPECT_EQ(Decode("begin 644 x\n" + Line + "\n`\nend"), (TDecoded{u"644 x", Bytes})) << Line;
}

TEST(UUCode, NamesGoThroughTheCodePageAndNeverBreakTheHeader) {
  const TAnsiCodePageScope Western(1252);
  EXPECT_EQ(ZqUUEncode("", u"é\u0416", 1), "begin 1 \xE9?\r\n`\r\nend");
  EXPECT_EQ(Decode("begin 1 \xC9.TXT\n`\nend", u"é.txt").Outcome, u"1 É.TXT");
  for (const char16_t* const Name : {u"a\nb", u"\rb"}) {
    TMemoryStream Source, Dest;
    EXPECT_EQ(RaisedBy([&] { ZqUUEncode(&Source, &Dest, Name, 644); }),
        u"Exception: A file name with a line end doesn't fit into the header of uuencode");
    EXPECT_EQ(Dest.Size(), 0);
  }
}

TEST(UUCode, StreamsThatFailAreTold) {
  TDribble Source(std::string(100, 'x'), 50);
  TMemoryStream Dest;
  EXPECT_EQ(RaisedBy([&] { ZqUUEncode(&Source, &Dest, u"x", 644); }), u"EReadError: Stream read error");
  EXPECT_EQ(RaisedBy([&] { ZqUUEncode(&Dest, &Dest, u"x", 644); }).Pos(u"EAssertionFailed"), 1);
  TFileStream Full(u"/dev/full", fmOpenWrite);
  TStringStream Text{RawByteString("begin 644 x\n#0V%T\n`\n")};
  EXPECT_THROW(ZqUUEncode(&Dest, &Full, u"x", 644), EWriteError);
  EXPECT_THROW(ZqUUDecode(&Text, &Full), EWriteError);
}

}  // namespace
}  // namespace zq
