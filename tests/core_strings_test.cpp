

#include "runtime/core/guid.h"
#include "runtime/core/strings.h"
#include "runtime/core/utf8.h"
#include "tests/support/support.h"

namespace zq {
namespace {

// ---- UTF-8 ---------------------------------------------------------------------------------------------------------

struct TUtf8Case {
  const char* Name;
  std::string_view Bytes;
  std::u16string_view Text;
};
class Utf8Decode : public testing::TestWithParam<TUtf8Case> {};

TEST_P(Utf8Decode, ReplacesEachLongestBrokenPieceOnce) {
  const auto& [Name, Bytes, Text] = GetParam();
  EXPECT_EQ(UnicodeString(utf8::Decode(Bytes)), Text);
  EXPECT_EQ(utf8::DecodedLength(Bytes.data(), Bytes.size()), Text.size());
  // Behind a run that the wide steps take, and before one.
  const std::string Run(37, 'r');
  const UnicodeString WideRun(37, u'r');
  EXPECT_EQ(UnicodeString::FromUTF8(Run + std::string(Bytes) + Run), WideRun + Text + WideRun);
  // As the bytes of a file name nothing is lost.
  EXPECT_EQ(utf8::Encode(utf8::Decode(Bytes, utf8::TMalformed::Escape), utf8::TMalformed::Escape), Bytes);
}

INSTANTIATE_TEST_SUITE_P(Table, Utf8Decode,
    testing::Values(TUtf8Case{"Edges", "\x7F\xC2\x80\xDF\xBF\xE0\xA0\x80\xEF\xBF\xBF", u"\x7F\x80\u07FF\u0800\uFFFF"},
        TUtf8Case{"EdgesOfPairs", "\xF0\x90\x80\x80\xF4\x8F\xBF\xBF", u"\U00010000\U0010FFFF"},
        TUtf8Case{"AroundTheSurrogates", "\xED\x9F\xBF\xEE\x80\x80", u"\uD7FF\uE000"},
        TUtf8Case{"OverlongOfTwo", "\xC0\x80\xC1\xBF", u"\uFFFD\uFFFD\uFFFD\uFFFD"},
        TUtf8Case{"OverlongOfThree", "\xE0\x9F\xBF", u"\uFFFD\uFFFD\uFFFD"},
        TUtf8Case{"OverlongOfFour", "\xF0\x8F\xBF\xBF", u"\uFFFD\uFFFD\uFFFD\uFFFD"},
        TUtf8Case{"Surrogate", "\xED\xA0\x80\xED\xB0\x80", u"\uFFFD\uFFFD\uFFFD\uFFFD\uFFFD\uFFFD"},
        TUtf8Case{"BeyondTheLastPlane", "\xF4\x90\x80\x80\xF5", u"\uFFFD\uFFFD\uFFFD\uFFFD\uFFFD"},
        TUtf8Case{"NoLead", "\xF8\x90\x80\x80", u"\uFFFD\uFFFD\uFFFD\uFFFD"},
        TUtf8Case{"CutAtTwo", "\xE2\x82", u"\uFFFD"}, TUtf8Case{"BrokenThird", "\xF0\x9Fz\x80", u"\uFFFDz\uFFFD"},
        TUtf8Case{"CutAtThree", "\xF0\x9F\x98", u"\uFFFD"},
        TUtf8Case{"CutByASequence", "\xF0\x9F\x98z\xE2\x82\xE2\x82\xAC", u"\uFFFDz\uFFFD\u20AC"},
        TUtf8Case{"TheStandardsExample", "a\xF1\x80\x80\xE1\x80\xC2\x62\x80\x63\x80\xBF\x64",
            u"a\uFFFD\uFFFD\uFFFDb\uFFFDc\uFFFD\uFFFDd"}),
    [](const auto& AInfo) { return std::string(AInfo.param.Name); });

TEST(Utf8Escape, CarriesEveryByteAloneAndInPairs) {
  for (int First = 0; First < 256; ++First)
    for (int Second = 0; Second < 256; ++Second) {
      const std::string Bytes{static_cast<char>(First), static_cast<char>(Second)};
      const std::u16string Text = utf8::Decode(Bytes, utf8::TMalformed::Escape);
      ASSERT_EQ(utf8::Encode(Text, utf8::TMalformed::Escape), Bytes) << First << ", " << Second;
      ASSERT_TRUE(First < 0x80 || Second >= 0x80 || Text[0] == 0xDC00 + First) << First;
    }
}

TEST(Utf8Encode, GivesEveryCodePointTheBytesThatDecodeToIt) {
  for (char32_t Code = 1; Code <= 0x10FFFF; Code += Code < 0x3000 ? 1 : 61) {
    const auto Unit = [](char32_t AUnit) { return static_cast<char16_t>(AUnit); };
    UnicodeString Text(Unit(Code));
    if (Code > 0xFFFF) Text = std::u16string{Unit(0xD7C0 + (Code >> 10)), Unit(0xDC00 | (Code & 0x3FF))};
    const std::string Bytes = Text.ToUTF8();
    ASSERT_EQ(Bytes.size(), Code < 0x80 ? 1U : Code < 0x800 ? 2U : Code < 0x10000 ? 3U : 4U);
    ASSERT_EQ(FromUTF8(Bytes) == Text, Code < 0xD800 || Code > 0xDFFF) << std::hex << static_cast<unsigned>(Code);
  }
}

TEST(Utf8Encode, ReplacesSurrogatesWithoutPartner) {
  for (const std::u16string Lone : {u"\xDBFFx", u"\xDC80", u"\xDFFF", u"\xDC00\xD800", u"\xD800\xD83D\xDE00\xD83D"}) {
    const std::string Bytes = utf8::Encode(Lone);
    EXPECT_EQ(Bytes.rfind("\xEF\xBF\xBD", 0), 0U);
    EXPECT_EQ(Bytes.find("\xED"), std::string::npos);
    EXPECT_EQ(utf8::EncodedLength(Lone.data(), Lone.size()), Bytes.size());
    EXPECT_EQ(utf8::Encode(Lone + std::u16string(9, u'r')), Bytes + std::string(9, 'r'));
  }
  EXPECT_EQ(utf8::Encode(u"\xD83D\xDE00", utf8::TMalformed::Escape), "\xF0\x9F\x98\x80");
  EXPECT_EQ(utf8::Encode(u"\xDC7F\xDC80", utf8::TMalformed::Escape), "\xEF\xBF\xBD\x80");
}

TEST(Utf8Runs, OfOneLengthEndWhereverTheTextDoes) {
  for (const std::u16string One : {u"\u00E9", u"\u4E16", u"\U0001F600"}) {
    std::u16string Run = One;
    for (std::size_t Count = 1; Count < 24; ++Count, Run += One) {
      std::string Bytes = utf8::Encode(Run);
      ASSERT_EQ(utf8::Decode(Bytes.substr(0, Bytes.size() - 1)), Run.substr(One.size()) + u'\xFFFD') << Count;
      Bytes.append(Count % 4, 'a');
      const std::vector<char> Source(Bytes.begin(), Bytes.end());  // no byte and no unit more than the text
      std::vector<char16_t> Room(utf8::DecodedLength(Source.data(), Source.size()));
      ASSERT_EQ(utf8::Decode(Source.data(), Source.size(), Room.data()), Room.size());
      ASSERT_EQ(std::u16string(Room.begin(), Room.end()), Run + std::u16string(Count % 4, u'a'));
    }
  }
}

TEST(Utf8Ascii, RunEndsAtTheFirstOtherCharacterWhereverItStands) {
  for (std::size_t Place = 0; Place < 70; ++Place) {
    std::u16string Text(70, u'a');
    Text[Place] = u'\x0100';  // no bit of its low byte says that it is beyond ASCII
    const std::string Bytes = utf8::Encode(Text);
    ASSERT_EQ(utf8::AsciiRun(Bytes.data(), Bytes.size()), Place);
    ASSERT_EQ(utf8::AsciiRun(Text.data(), Text.size()), Place);
    ASSERT_EQ(utf8::Decode(Bytes), Text);
  }
}

// ---- Operations ----------------------------------------------------------------------------------------------------

TEST(Strings, CopyClipsAtBothEnds) {
  const struct {
    Integer Index, Count;
    const char16_t* Want;
  } cCases[] = {{1, 3, u"abc"}, {2, 1, u"b"}, {3, 9, u"c"}, {4, 1, u""}, {99, 1, u""}, {0, 2, u"ab"}, {-5, 2, u"ab"},
      {1, 0, u""}, {1, -1, u""}, {2, 0x7FFFFFFF, u"bc"}};
  for (const auto& [Index, Count, Want] : cCases) {
    EXPECT_EQ(UnicodeString(u"abc").Copy(Index, Count), Want) << Index << ", " << Count;
    EXPECT_EQ(Copy(AnsiString("abc"), Index, Count), UnicodeString(Want).ToUTF8()) << Index << ", " << Count;
  }
}

TEST(Strings, PosCountsFromOneAndFindsNoEmptyText) {
  EXPECT_EQ(Pos(u"b", u"abab"), 2);
  EXPECT_EQ(Pos(u"B", u"abab") + Pos(u"", u"abab") + Pos(u"ababa", u"abab"), 0);
}

TEST(Strings, ReplaceGoesOnBehindWhatItPutIn) {
  EXPECT_EQ(StringReplace(u"aaa", u"a", u"aa", {rfReplaceAll}), u"aaaaaa");
  EXPECT_EQ(StringReplace(u"aaa", u"aa", u"b", {rfReplaceAll}), u"ba");
  EXPECT_EQ(StringReplace(u"xAxa", u"a", u"-", {}), u"xAx-");
  EXPECT_EQ(StringReplace(u"xAxa", u"a", u"-", {rfIgnoreCase}), u"x-xa");
  EXPECT_EQ(StringReplace(u"abc", u"", u"-", {rfReplaceAll}), u"abc");
  EXPECT_EQ(StringReplace(u"ab", u"abc", u"-", {rfReplaceAll, rfIgnoreCase}), u"ab");
}

TEST(Strings, CaseIsThatOfAscii) {
  EXPECT_EQ(LowerCase(u"AZ@[\u00C4"), u"az@[\u00C4");
  EXPECT_EQ(UpperCase(u"az`{\u00E4"), u"AZ`{\u00E4");
  EXPECT_TRUE(SameText(u"aZ", u"Az"));
  EXPECT_FALSE(SameText(u"@", u"`") || SameText(u"\u00C4", u"\u00E4") || SameText(u"a", u"ab"));
  EXPECT_GT(CompareText(u"a_", u"Ab"), 0) << "letters compare as capitals, which lie below the underscore";
}

TEST(Strings, TrimTakesControlsAndZerosButNoOtherSpaces) {
  EXPECT_EQ(Trim(UnicodeString(u"\0 \u00A0\x1F", 4)), u"\u00A0");
  EXPECT_EQ(Trim(u"\r\n"), u"");
}

TEST(Guids, AreNewEachTimeAndHaveTheirText) {
  const TGUID Made = CreateGUID();
  EXPECT_FALSE(IsEqualGUID(Made, CreateGUID()));
  EXPECT_EQ(GUIDToString(Made)[16], u'4') << "the version";
  EXPECT_EQ(GUIDToString("{0D3C1F10-ABCD-4000-8000-0000000000ff}"_guid), u"{0D3C1F10-ABCD-4000-8000-0000000000FF}");
}

}  // namespace
}  // namespace zq
