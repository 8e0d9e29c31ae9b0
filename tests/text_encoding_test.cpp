
#include <thread>

#include "runtime/text/code_pages.h"
#include "runtime/text/encoding.h"
#include "runtime/text/format.h"
#include "tests/support/support.h"

namespace zq {
namespace {

// Conversions through blocks of exactly the size told, so that a sanitizer sees each byte beyond.
template <class TResult>
TResult Converted(auto* ACall, Word ACodePage, Cardinal AFlags, auto AText) {
  const std::vector Source(AText.begin(), AText.end());
  const auto Count = static_cast<int>(Source.size());
  const int Size = ACall(ACodePage, AFlags, Source.data(), Count, nullptr, 0);
  std::vector<typename TResult::value_type> Result(static_cast<std::size_t>(Size));
  if (Size == 0) return {};
  EXPECT_EQ(ACall(ACodePage, AFlags, Source.data(), Count, Result.data(), Size), Size) << ACodePage;
  return {Result.begin(), Result.end()};
}

std::u16string Decoded(Word ACodePage, std::string_view ABytes, Cardinal AFlags = 0) {
  return Converted<std::u16string>(MultiByteToWideChar, ACodePage, AFlags, ABytes);
}

std::string Encoded(Word ACodePage, std::u16string_view AText, Cardinal AFlags = 0) {
  return Converted<std::string>(WideCharToMultiByte, ACodePage, AFlags, AText);
}

TEST(TextEncoding, ExactlyThesePagesHaveNoCharacterData) {
  const std::vector<Word> cWithout = {42, 709, 710, 10001, 10002, 10003, 10004, 10005, 10008, 10021, 20000, 20001,
      20002, 20003, 20004, 20005, 20924, 29001, 50229};
  std::vector<Word> Refused;
  for (const TCodePage& Page : CodePages()) {
    const Word Number = Page.Number;
    SetLastError(0);
    if (MultiByteToWideChar(Number, 0, "A\0\0\0", 4, nullptr, 0) != 0) continue;
    EXPECT_EQ(GetLastError(), ERROR_INVALID_PARAMETER) << Number;
    EXPECT_THROW((void)TEncoding::GetEncoding(Number), EEncodingError) << Number;
    Refused.push_back(Number);
  }
  EXPECT_EQ(Refused, cWithout);
}

// A unit that takes as many bytes as any; the last such, which is none of ASCII.
std::u16string LongestUnit(Word ACodePage, int& ALength) {
  std::u16string Result;
  ALength = 0;
  for (unsigned i = 1; i <= 0xFFFF; ++i) {
    const auto Unit = static_cast<char16_t>(i);
    const int Length = WideCharToMultiByte(ACodePage, 0, &Unit, 1, nullptr, 0);
    if (Length >= ALength) Result = Unit, ALength = Length;
  }
  return Result;
}

// The converters' own answers: a foreign front keeps the rest from the short way that ASCII takes.
void CheckAscii(const TCodePage& APage, const std::string& AForeign, const std::u16string& AForeignText) {
  std::string Ascii;
  for (char c = 0x10; c != '\x80'; ++c) Ascii += c;
  const bool Kept = Encoded(APage.Number, std::u16string(Ascii.begin(), Ascii.end())) == Ascii;
  EXPECT_EQ(Kept, APage.Ascii < TAsciiUse::Guarded);
  if (APage.Ascii == TAsciiUse::Foreign) return;
  if (APage.Ascii == TAsciiUse::Guarded) Ascii = " AZaz09,.-()/:?";
  const std::u16string Text(Ascii.begin(), Ascii.end());
  const std::string Front = APage.Kind == TPageKind::SingleByte ? "\xFF" : AForeign;
  EXPECT_TRUE(Encoded(APage.Number, AForeignText + Text).ends_with(Ascii));
  EXPECT_TRUE(Decoded(APage.Number, Front + Ascii).ends_with(Text));
}

TEST(TextEncoding, EachRowTellsOfItsPageWhatTheConversionsDo) {
  using enum TPageKind;
  for (const TCodePage& Page : CodePages()) {
    if (!Page.IsServed()) continue;
    SCOPED_TRACE(Page.Number);
    const bool Shifts = Page.Kind >= Hz && Page.Kind <= Utf7;
    int Length = 0;
    const std::u16string Unit = LongestUnit(Page.Number, Length);
    const std::string Once = Encoded(Page.Number, Unit);
    EXPECT_EQ(Page.BytesPerUnit, Length);
    EXPECT_LE(Encoded(Page.Number, u"😀").size(), 2 * Once.size());
    EXPECT_EQ(Page.Kind == SingleByte, Length == 1);
    EXPECT_EQ(Shifts, Encoded(Page.Number, Unit + Unit).size() < 2 * Once.size());
    EXPECT_EQ(Page.UnitSize(), Page.Kind < Utf16 ? 1 : Once.size());
    const std::u16string_view All = u"é漢😀\uE000क\xFFFD";
    EXPECT_EQ(Page.IsUnicode(), Decoded(Page.Number, Encoded(Page.Number, All)) == All);
    EXPECT_EQ(std::string(Page.Mark.begin(), Page.Mark.end()), Page.Kind < Utf8 ? "" : Encoded(Page.Number, u"\uFEFF"));
    CheckAscii(Page, Once, Unit);
  }
}

TEST(TextEncoding, ExactlyThesePagesTakeNoFlags) {
  std::vector<Word> Refusing;
  for (const TCodePage& Page : CodePages()) {
    const bool Taken = WideCharToMultiByte(Page.Number, WC_DEFAULTCHAR, u"a", 1, nullptr, 0) != 0;
    EXPECT_TRUE(Taken || !Page.IsServed() || GetLastError() == ERROR_INVALID_FLAGS) << Page.Number;
    if (Page.IsServed() ? !Taken : Page.TakesNoFlags()) Refusing.push_back(Page.Number);
  }
  EXPECT_EQ(Refusing, (std::vector<Word>{42, 50220, 50221, 50222, 50225, 50227, 50229, 57002, 57003, 57004, 57005,
                          57006, 57007, 57008, 57009, 57010, 57011, 65000, 65001}));
}

TEST(TextEncoding, EveryPageWritesAndReadsItsScript) {
  const std::map<std::u16string, std::vector<Word>> cTexts = {
      {u"Straße Ñandú", {437, 850, 858, 1252, 1254, 10000, 28591, 28605, 37, 500, 1047, 1140, 1148, 20273, 20284}},
      {u"Příliš žluťoučký", {852, 1250, 10029, 28592, 870}},
      {u"Привет", {855, 866, 1251, 10007, 10017, 20866, 21866, 28595, 21025}},
      {u"Καλημέρα", {737, 869, 1253, 10006, 28597, 875}}, {u"שלום", {862, 1255, 28598, 38598, 20424}},
      {u"سلام", {708, 720, 1256, 28596}}, {u"Ğışç", {857, 1254, 1026, 28599, 10081}}, {u"Žąsų", {775, 1257, 28603}},
      {u"สวัสดี", {874, 20838}}, {u"日本語テスト", {932, 20932, 51932, 50220, 50221, 50222}},
      {u"ｱｲｳ", {932, 20932, 50221, 50222}}, {u"中文测试", {936, 20936, 51936, 50227, 52936, 54936}},
      {u"中文測試", {950, 936}}, {u"한국어", {949, 20949, 51949, 50225}}, {u"कखग", {57002}}, {u"কখগ", {57003, 57006}},
      {u"தமிழ்", {57004}}, {u"తెలుగు", {57005}}, {u"ಕನ್ನಡ", {57008}}, {u"മലയ", {57009}}, {u"ગુજર", {57010}},
      {u"ਪਜਬ", {57011}}, {u"ଓଡିଆ", {57007}}, {u"ế\u0301", {54936}},
      {u"a€ü漢😀\u0301", {1200, 1201, 12000, 12001, 65000, 65001, 54936}}};
  for (const auto& [Text, Pages] : cTexts)
    for (const Word Page : Pages) {
      std::u16string Framed;  // longer than any buffer on the way
      while (Framed.size() < 2000) Framed += u"A~+b1\r\n" + Text + u" x\\\x7F\x1A\x1C" + Text;
      EXPECT_EQ(UnicodeString(Decoded(Page, Encoded(Page, Framed))), UnicodeString(Framed)) << Page;
    }
}

TEST(TextEncoding, MapsAsThePagesOfThePlatformDo) {
  const std::tuple<Word, std::string_view, std::u16string_view> cCases[] = {
      {1252, "\x80\x81\x8D\x8F\x90\x9D", u"\u20AC\x81\x8D\x8F\x90\x9D"}, {932, "\x81\x60", u"\uFF5E"},
      {932, "\xF0\x40\\~", u"\uE000\\~"}, {936, "\x80", u"\u20AC"}, {950, "\x81\x40", u"\uEEB8"},
      {949, "\xB0\xA1", u"가"}, {28591, "\x80\xFF", u"\x80\xFF"},
      {437, "\x1A\x7F\x1C\x80\x1A\x7F\x1C", u"\x1A\x7F\x1C\u00C7\x1A\x7F\x1C"}, {37, "\xC1\x4A", u"A\u00A2"},
      {1201, {"\0A\x20\xAC", 4}, u"A€"}, {12000, {"A\0\0\0\0\xF6\x01\0", 8}, u"A😀"},
      {65001, "\xE2\x82\xAC\xF0\x9F\x98\x80", u"€😀"}, {65000, "a+IKw-", u"a€"},
      {65000, "+AH4AXAAh- +2D3eAA-/+-+ECA-+-", u"~\\! 😀/+\u1020+"}, {52936, "ab~{VP~}", u"ab中"},
      {52936, "~~~{VPVP~}~~\n~{VP~}", u"~中中~\n中"},
      {50221, "a\x1B(I1\x1B(Bb\x1B$B4A\x1B(I1\x1B$B4A\x1B(B", u"aｱb漢ｱ漢"}, {50220, "\x1B$B$\"\x1B(B", u"あ"},
      {50225, "\x1B$)CA", u"A"}, {54936, "\x81\x30\x81\x30", u"\x80"}};
  for (const auto& [Page, Bytes, Text] : cCases) {
    EXPECT_EQ(UnicodeString(Decoded(Page, Bytes)), Text) << Page;
    EXPECT_EQ(Encoded(Page, Text), Bytes) << Page;
  }
}

// Where the tables at hand differ, from each other or from the platform's.
TEST(TextEncoding, DecidesBetweenTablesAsThePlatformDoes) {
  const std::tuple<std::vector<Word>, std::string_view, std::u16string_view> cCases[] = {
      {{437, 860, 861, 862, 863, 865}, "\xE6", u"\u00B5"}, {{852}, "\xAA", u"\u00AC"},
      {{1026}, "\x9A\x9D\xBC", u"\u00AA\u00B8\u00AF"}, {{869}, "\x88\xEF", u"\u00B7\u0384"},
      {{864}, "%\xD7\xD8\xF1", u"%\uFEC1\uFEC5\u0651"}, {{870}, "\xB0", u"\u02D9"},
      {{20936, 51936}, "\xA3\xA7", u"\uFF07"},
      {{720}, "\x80\x81\x84\x86\x8D\x8E\x8F\x90", u"\x80\x81\x84\x86\x8D\x8E\x8F\x90"},
      {{932}, "\x80\xA0\xFD\xFE\xFF", u"\x80\uF8F0\uF8F1\uF8F2\uF8F3"},
      {{936}, "\xFF\xA1\xA4\xA1\xAA", u"\uF8F5\u00B7\u2014"}, {{949}, "\x80\xFF\xC9\xA1", u"\x80\uF8F7\uE000"},
      {{950}, "\xFF\xC6\xA1\xF9\xFE", u"\uF8F8\uF6B1\u2593"}, {{874}, "\x81\xDB\xFF", u"\x81\uF8C1\uF8C8"},
      {{875}, "\x6A\x74\xDD", u"|\u00A0\u0387"}, {{1361}, "\\\xD9\xE6\x88\x61", u"\\\u20AC\uAC00"},
      {{10000}, "\xC6\xDB\xF0", u"\u2206\u20AC\uF8FF"}, {{10007}, "\xA2\xB6\xFF", u"\u00A2\u2202\u00A4"},
      {{10017}, "\xA2\xB6\xFF", u"\u0490\u0491\u00A4"}, {{10010}, "\xAE\xAF\xDE\xDF", u"ĂŞŢţ"},
      {{10079}, "\xA0\xDC\xDF\xE0", u"ÝÐþý"}, {{10082}, "\xA9\xD0\xF0\xFE", u"ŠĐđæ"}, {{20106}, "@[~", u"§Äß"},
      {{20107}, "$@`~", u"¤Ééü"}, {{20108}, "[\\]~", u"ÆØÅ\u203E"}, {{20105}, "$~", u"$~"},
      {{20261, 20269}, "a\xC2\x65", u"aé"}, {{20278}, "\x71\xE0", u"\\É"}, {{20285}, "\xA1", u"\u00AF"},
      {{20290}, "\x41\x62", u"\uFF61a"}, {{20423}, "\x41", u"Α"}, {{20424}, "\x78\xB3\xBC", u"\u2017\u2022\u203E"},
      {{20833}, "\x0E\x0F\x42\xE0", u"\x0E\x0F\uFFA0\u20A9"}, {{20871}, "\x4A\xC0", u"Þþ"}, {{20880}, "\x42", u"ђ"},
      {{20905}, "\x4A", u"Ç"}};
  for (const auto& [Pages, Bytes, Text] : cCases)
    for (const Word Page : Pages) {
      EXPECT_EQ(UnicodeString(Decoded(Page, Bytes, MB_ERR_INVALID_CHARS)), Text) << Page;
      EXPECT_EQ(Encoded(Page, Text, WC_NO_BEST_FIT_CHARS), Bytes) << Page;
    }
  // One way only.
  EXPECT_EQ(Decoded(875, "\xDC\x3F"), u"\x1A\x1A");
  EXPECT_EQ(Encoded(875, u"\x1A"), "\x3F");
  EXPECT_EQ(Encoded(932, u"\u00A2\u00A3\u00AC"), "\x81\x91\x81\x92\x81\xCA");
  EXPECT_EQ(Encoded(932, u"\u00A2\u00A3\u00AC", WC_NO_BEST_FIT_CHARS), "???");
  EXPECT_EQ(Encoded(437, u"\u03BC\u2192\u221F"), "\xE6\x1A\x1C");
  EXPECT_EQ(Encoded(1361, u"\u327E\xFFFD"), "??");
  EXPECT_EQ(Decoded(65000, "~\\+IKw!+IK-\xE9+"), u"~\\€!\xFFFD\xFFFD\xFFFD");
  EXPECT_EQ(Decoded(52936, "~x~~~{VP~~~}~\nd~{V\nd"), u"~x~中\uE4C5d\xFFFD\nd");
}

TEST(TextEncoding, WhatAPageDoesNotHaveIsReplaced) {
  // 0x270 is what callers pass: a letter and its mark meet, where the page has them as one.
  const std::tuple<Word, std::u16string_view, Cardinal, std::string_view> cCases[] = {
      {1252, u"a漢😀b\xD800", 0, "a??b?"}, {37, u"漢", 0, "\x6F"}, {65001, u"\xD800x", 0, "\xEF\xBF\xBDx"},
      {1252, u"Ａ", WC_NO_BEST_FIT_CHARS, "?"}, {1252, u"Ａ", 0, "A"},
      {1252, u"cafe\u0301 o\u0304", 0x270, "caf\xE9 o?"}, {1252, u"e\u0301", 0, "e?"},
      {949, u"\uF900", 0x270, "\xCB\xD0"}, {65001, u"a\xD83D", WC_ERR_INVALID_CHARS, ""}};
  for (const auto& [Page, Text, Flags, Want] : cCases) EXPECT_EQ(Encoded(Page, Text, Flags), Want) << Page;
  EXPECT_EQ(Encoded(54936, u"\xDC00"), Encoded(54936, u"\xFFFD"));
}

TEST(TextEncoding, RefusesByItsContract) {
  char Bytes[8];
  char16_t Chars[8];
  const auto Refused = [](int ACount) {
    const auto Error = GetLastError();
    SetLastError(0);
    return ACount == 0 ? Error : 0;
  };
  for (const auto& Error : {Refused(MultiByteToWideChar(1252, 0, nullptr, 1, nullptr, 0)),
           Refused(MultiByteToWideChar(1252, 0, "", 0, nullptr, 0)),
           Refused(WideCharToMultiByte(1252, 0, u"a", -2, nullptr, 0)),
           Refused(WideCharToMultiByte(1252, 0, u"a", 1, nullptr, 5)),
           Refused(MultiByteToWideChar(1252, 0, "a", 1, Chars, -1)),
           Refused(WideCharToMultiByte(4711, 0, u"a", 1, nullptr, 0))})
    EXPECT_EQ(Error, ERROR_INVALID_PARAMETER);
  EXPECT_EQ(Refused(WideCharToMultiByte(65001, 0x270, u"a", 1, Bytes, 8)), ERROR_INVALID_FLAGS);
  EXPECT_EQ(Refused(MultiByteToWideChar(57002, MB_ERR_INVALID_CHARS, "a", 1, Chars, 8)), ERROR_INVALID_FLAGS);
  EXPECT_EQ(Refused(NormalizeString(2, u"é", 1, Chars, 1)), ERROR_INSUFFICIENT_BUFFER);
  EXPECT_EQ(MultiByteToWideChar(65001, 0, "abc", -1, nullptr, 0), 4);
  EXPECT_EQ(MultiByteToWideChar(1200, 0, "a\0b\0\0", -1, nullptr, 0), 3);
  EXPECT_EQ(WideCharToMultiByte(932, 0, u"日", -1, Bytes, 8), 3);
}

TEST(TextEncoding, MalformedInputFailsOnlyWhenAsked) {
  const std::tuple<Word, std::string_view, std::u16string_view> cCases[] = {{65001, "a\xC3", u"a\uFFFD"},
      {65001, "\xED\xA0\x80", u"\uFFFD\uFFFD\uFFFD"}, {65001, "\xF0\x9F\x98", u"\uFFFD"}, {932, "a\x81", u"a\uFFFD"},
      {936, "\x81", u"\uFFFD"}, {54936, "\x81\x30\x81", u"\uFFFD"}, {1200, {"a\0b", 3}, u"a\uFFFD"},
      {1253, "\xD2", u"\uFFFD"}, {20127, "a\x80", u"a\uFFFD"}};
  for (const auto& [Page, Bytes, Lenient] : cCases) {
    EXPECT_EQ(UnicodeString(Decoded(Page, Bytes)), Lenient) << Page;
    EXPECT_EQ(Decoded(Page, Bytes, MB_ERR_INVALID_CHARS), u"") << Page;
    EXPECT_EQ(GetLastError(), ERROR_NO_UNICODE_TRANSLATION) << Page;
  }
  EXPECT_EQ(Decoded(65001, "€😀", MB_ERR_INVALID_CHARS), u"€😀");
}

// Long stretches go by blocks: wherever one starts and ends it must read as its bytes do one by one, and touch no more.
TEST(TextEncoding, AnyStretchOfSingleBytesReadsAsItsBytesDo) {
  for (const TCodePage& Page : CodePages()) {
    if (Page.Kind != TPageKind::SingleByte || !Page.IsServed()) continue;
    std::string Bytes;
    std::u16string Units;
    for (unsigned i = 0; i < 512; ++i) {
      Bytes += static_cast<char>(i * 37);
      Units += Decoded(Page.Number, Bytes.substr(i));
    }
    for (std::size_t At = 0; At < 256; At += 11)
      for (std::size_t Count = 1; Count <= 130; ++Count) {
        const char* const From = Bytes.data() + At;
        const auto Size = static_cast<int>(Count);
        std::u16string Room(Units.size(), u'.');
        std::u16string Expected = Room;
        Expected.replace(At, Count, Units, At, Count);
        const int Strict = Expected.find(u'\xFFFD') == Expected.npos ? Size : 0;
        ASSERT_EQ(MultiByteToWideChar(Page.Number, 0, From, Size, Room.data() + At, Size), Size);
        ASSERT_EQ(UnicodeString(Room), UnicodeString(Expected)) << Page.Number;
        for (const int Capacity : {0, Size})
          ASSERT_EQ(MultiByteToWideChar(Page.Number, MB_ERR_INVALID_CHARS, From, Size, Room.data(), Capacity), Strict);
      }
  }
}

// Every text, cut at every length and into every room: the size told first is what is written, and nothing beyond.
TEST(TextEncoding, NoCutReadsOrWritesBeyondABuffer) {
  std::string Noise;
  for (unsigned i = 0, x = 1; i < 48; ++i, x = x * 1103515245 + 12345) Noise += static_cast<char>(x >> 16U);
  for (const TCodePage& Row : CodePages())
    for (const Word Page = Row.Number;
         const std::string& Source : {Encoded(Page, u"Aé日ш😀\u0301ä한中~+"), Noise, "\x1B$B" + Noise, "~{\x0E" + Noise})
      for (std::size_t Cut = 1; Cut <= Source.size(); Cut += Cut < 12 ? 1 : 5) {
        const std::vector<char> Bytes(Source.begin(), Source.begin() + static_cast<std::ptrdiff_t>(Cut));
        const auto Count = static_cast<int>(Cut);
        const std::u16string Whole = Decoded(Page, {Bytes.data(), Cut});
        for (int Room = 1; Room < static_cast<int>(Whole.size()); Room += 3) {
          std::vector<char16_t> Chars(static_cast<std::size_t>(Room));
          ASSERT_EQ(MultiByteToWideChar(Page, 0, Bytes.data(), Count, Chars.data(), Room), 0) << Page;
          ASSERT_EQ(GetLastError(), ERROR_INSUFFICIENT_BUFFER) << Page;
        }
        (void)Encoded(Page, Whole);
      }
}

TEST(TextEncoding, TheAnsiPageFollowsItsScopeAndTheEnvironment) {
  const Word Before = GetACP();
  {
    const TAnsiCodePageScope Outer(1252);
    EXPECT_EQ(Encoded(0, u"é"), "\xE9");
    const TAnsiCodePageScope Inner(932);
    EXPECT_EQ(Decoded(0, "\x81\x60"), u"\uFF5E");
    Word Elsewhere = 0;
    std::thread([&] { Elsewhere = GetACP(); }).join();
    EXPECT_EQ(Elsewhere, 932);
    EXPECT_EQ(TEncoding::Default().GetCodePage(), 932);
  }
  EXPECT_EQ(GetACP(), Before);
  const std::pair<const char*, Word> cCharsets[] = {{"UTF-8", 65001}, {"ANSI_X3.4-1968", 65001}, {"ISO-8859-1", 28591},
      {"ISO-8859-15", 28605}, {"CP1251", 1251}, {"CP1252", 1252}, {"KOI8-R", 20866}, {"EUC-JP", 20932},
      {"SHIFT_JIS", 932}, {"BIG5", 950}, {"GBK", 936}, {"GB18030", 54936}, {"TIS-620", 874}, {"nonsense", 65001}};
  for (const auto& [Charset, Page] : cCharsets) EXPECT_EQ(CodePageOfCharset(Charset), Page) << Charset;
}

TEST(TextEncoding, SetCodePageConvertsOrNames) {
  RawByteString Text("\xE9", 1252);
  SetCodePage(Text, 65001);
  EXPECT_EQ(Text, "\xC3\xA9");
  SetCodePage(Text, 28591, false);
  EXPECT_THROW(SetCodePage(Text, 709), EOSError);
  EXPECT_TRUE(Text == "\xC3\xA9" && Text.CodePage() == 28591);
}

TEST(TextEncoding, EncodingObjectsKnowNameMarkAndText) {
  const std::tuple<Word, const char16_t*, TBytes> cCases[] = {{65001, u"UTF-8", {0xEF, 0xBB, 0xBF}},
      {1200, u"UTF-16LE", {0xFF, 0xFE}}, {1201, u"UTF-16BE", {0xFE, 0xFF}}, {932, u"Shift_JIS", {}},
      {1252, u"windows-1252", {}}, {12001, u"UTF-32BE", {0, 0, 0xFE, 0xFF}}};
  for (const auto& [Page, Mime, Preamble] : cCases) {
    const auto Encoding = TEncoding::GetEncoding(Page)->Clone();
    EXPECT_EQ(Encoding->GetEncodingName(), Format(u"%d (%s)", {Page, Mime}));
    EXPECT_EQ(Encoding->GetMIMEName(), Mime);
    EXPECT_EQ(Encoding->GetPreamble(), Preamble);
    EXPECT_EQ(Encoding->GetString(Encoding->GetBytes(u"añ")), Page == 932 ? u"a?" : u"añ");
    EXPECT_TRUE(Encoding->GetBytes(u"").empty());
  }
}

TEST(TextEncoding, OneCharacterIntoOneByte) {
  const std::tuple<Word, char16_t, int, char> cCases[] = {
      {1252, u'€', 1, '\x80'}, {1252, u'\u0301', 1, '\0'}, {65001, u'é', 0, '\xAA'}};
  for (const auto& [Page, Char, Count, Want] : cCases) {
    char Byte = '\xAA';
    EXPECT_EQ(LocaleCharsFromUnicode(Page, 0, &Char, 1, &Byte, 1, "", nullptr), Count) << Page;
    EXPECT_EQ(Byte, Want) << Page;
  }
  bool Used = false;
  char Bytes[4];
  EXPECT_EQ(LocaleCharsFromUnicode(1252, 0, u"a日", 2, Bytes, 4, "##", &Used), 3);
  EXPECT_TRUE(std::string_view(Bytes, 3) == "a##" && Used);
  EXPECT_EQ(LocaleCharsFromUnicode(437, 0, u"日", 1, Bytes, 4, "\x1A", nullptr), 1);
  EXPECT_EQ(Bytes[0], '\x1A');
}

TEST(TextEncoding, ThreadsLearnAPageTogether) {
  std::vector<std::string> Results(4);
  std::vector<std::thread> Threads;
  for (std::string& Result : Results)
    Threads.emplace_back([&Result] {
      std::u16string All;
      for (char16_t c = 1; c < 0x3100; ++c) All += c;
      for (const Word Page : {Word{1361}, Word{20269}, Word{10081}})
        Result += Encoded(Page, Decoded(Page, Encoded(Page, All)));
    });
  for (std::thread& Thread : Threads) Thread.join();
  for (const std::string& Result : Results) EXPECT_EQ(Result, Results[0]);
  EXPECT_EQ(Encoded(10081, u"Ğ"), "\xDA");
}

struct TLateConversion {
  ~TLateConversion() { EXPECT_EQ(Encoded(1252, u"é"), "\xE9"); }
};

TEST(TextEncoding, ServesWhatEndsAfterTheThreadsConverters) {
  std::thread([] {
    thread_local const TLateConversion Late;
    EXPECT_EQ(Encoded(1252, u"é"), "\xE9");
    (void)&Late;
  }).join();
}

}  // namespace
}  // namespace zq
