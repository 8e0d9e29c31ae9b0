#include "common/uZqTypes.h"

#include <iterator>

#include "runtime/io/streams.h"
#include "runtime/text/datetime.h"
#include "runtime/text/format_settings.h"
#include "tests/support/support.h"

namespace zq {
namespace {

using namespace std::string_literals;

const Byte* Bytes(std::string_view AText) { return reinterpret_cast<const Byte*>(AText.data()); }

// What ABack makes another number of, among the ACount numbers up to ALast that it doesn't refuse.
std::map<int, int> Changed(int ALast, std::size_t ACount, const std::function<int(int)>& ABack) {
  std::map<int, int> Result;
  for (int i = 0; i <= ALast; ++i) (void)RaisedBy([&] { Result.emplace(i, ABack(i)); });
  EXPECT_EQ(Result.size(), ACount);
  std::erase_if(Result, [](const auto& AItem) { return AItem.first == AItem.second; });
  return Result;
}

// ---- Names ----------------------------------------------------------------------------------------------------------

TEST(CodePageNames, EachNumberComesBackFromItsNameButForTheTwoThatShareOne) {
  const auto Back = [](int APage) { return ZqCodePage(UpperCase(ZqCodePage(static_cast<Word>(APage)))); };
  EXPECT_EQ(Changed(0xFFFF, 142, Back), (std::map<int, int>{{50222, 50220}, {51932, 20932}}));
}

TEST(CodePageNames, FurtherNamesLookalikesAndStrangers) {
  const std::pair<const char16_t*, Word> cNumbers[] = {{u"ibm866", 866}, {u"UTF-8", 65001}, {u"ms_kanji ", 932},
      {u"X-EUC-JP", 932}, {u"csgb2312 ", 936}, {u"ks_c_5601-1987", 949}, {u"ks-c-5601", 949}, {u"x-x-big5", 950},
      {u"ucs-2", 1200}, {u"ascii", 1252}, {u"us", 1252}, {u"us-ascii", 20127}, {u"iso8859-1", 1252},
      {u"ISO-8859-1", 28591}, {u"iso_8859-8", 1255}, {u"iso-8859-8", 28598}, {u"cskoi8r", 20866}, {u"l2", 28592},
      {u"csiso2022kr", 50225}, {u"", 0}};
  for (const auto& [Name, Number] : cNumbers) EXPECT_EQ(ZqCodePage(Name), Number) << ToUTF8(Name);
  EXPECT_EQ(
      ZqCodePage(Word{1201}) + ZqCodePage(Word{20002}) + ZqCodePage(Word{65001}), u"unicodeFFFEx_Chinese-Etenutf-8");
  EXPECT_EQ(RaisedBy([] { (void)ZqCodePage(u"MS_Kanji"); }), u"Exception: No CodePage ID found for MS_Kanji!");
  EXPECT_EQ(RaisedBy([] { (void)ZqCodePage(Word{50229}); }), u"Exception: No CodePage Name found for 50229!");
}

// ---- Detection ------------------------------------------------------------------------------------------------------

TEST(CodePageDetection, GoesByTheMarkAndLeavesTheStreamBehindIt) {
  const std::tuple<std::string, Word, Integer> cCases[] = {{"\0\0\xFE\xFF"s, 12001, 4}, {"\xFF\xFE\0\0"s, 12000, 4},
      {"\xFF\xFE\0"s, 1200, 2}, {"\xEF\xBB\xBFx"s, 65001, 3}, {"\xEF\xBB\xBF"s, 65001, 3}, {"\xEF\xBB"s, 0, 0},
      {"\xFE\xFF"s, 1201, 2}, {"\xFF\xFEx\0"s, 1200, 2}, {"A\0B"s, 1200, 0}, {"A\0"s, 0, 0}, {"\0A\0B"s, 0, 0},
      {"\xFF"s, 0, 0}, {"abcd"s, 0, 0}, {""s, 0, 0}};
  for (const auto& [Head, CodePage, MarkSize] : cCases) {
    SCOPED_TRACE(testing::PrintToString(Head));
    EXPECT_EQ(ZqGetCodePage(Head.data(), static_cast<Integer>(Head.size())), CodePage);
    TMemoryStream Stream;
    Stream.WriteBuffer(("##" + Head).data(), static_cast<Int64>(Head.size()) + 2);
    Stream.SetPosition(2);
    EXPECT_EQ(ZqGetCodePage(&Stream), CodePage);
    EXPECT_EQ(Stream.Position(), 2 + MarkSize);
  }
  EXPECT_THROW((void)ZqGetCodePage(nullptr), EAssertionFailed);
}

// ---- Conversions ----------------------------------------------------------------------------------------------------

// The pages that take no flags would fail outright if they were given some, also by way of code page 0.
TEST(EncodingConversions, GoBothWaysOnPagesOfEveryShape) {
  const std::tuple<Word, std::string, std::u16string> cCases[] = {{1252, "\x80 caf\xE9", u"€ café"},
      {932, "\x93\xFA\x96{", u"日本"}, {850, "\x82", u"é"}, {65001, "\xF0\x9F\x98\x80z\xC3\xA9", u"😀zé"},
      {1200, "A\0\xAC\x20"s, u"A€"}, {1201, "\0A\x20\xAC"s, u"A€"}, {12000, "A\0\0\0"s, u"A"},
      {54936, "\x81\x30\x84\x36", u"¥"}, {50220, "\x1B$BF|K\\\x1B(B", u"日本"}, {57002, "\xEF\x42\xB3", u"क"},
      {65000, "+IKw-", u"€"}, {20866, "\xC1", u"а"}};
  for (const auto& [CodePage, Source, Text] : cCases) {
    SCOPED_TRACE(CodePage);
    const auto Size = static_cast<Integer>(Source.size());
    EXPECT_EQ(TZqEncoding::ConvertA(Bytes(Source), Size, CodePage), Text);
    EXPECT_EQ(TZqEncoding::ConvertW(Text, CodePage), Source);
    EXPECT_EQ(TZqEncoding::ConvertA(Bytes(Source), Size, CodePage, 65001), UnicodeString(Text).ToUTF8());
    const TAnsiCodePageScope Scope(CodePage);
    EXPECT_EQ(TZqEncoding::ConvertA(AnsiString(Source)), Text);
    EXPECT_EQ(TZqEncoding::ConvertW(Text, 0), Source);
  }
}

TEST(EncodingConversions, CountsOfNothingAndOfMinusOne) {
  EXPECT_EQ(TZqEncoding::ConvertA(nullptr, 5, 1252) + TZqEncoding::ConvertA(Bytes("abc"), 0, 1), u"");
  EXPECT_EQ(TZqEncoding::ConvertA(Bytes("abc"), -1, 1252), u"abc");
  EXPECT_EQ(TZqEncoding::ConvertA(nullptr, -1, 1252, nullptr, 0), 0);
  EXPECT_EQ(TZqEncoding::ConvertW(nullptr, 0, 1252), "");
  EXPECT_EQ(TZqEncoding::ConvertW(u"abc", -1, 1252), "abc\0"s);
}

TEST(EncodingConversions, IntoABufferNeverWriteBeyondItNorRaise) {
  WideChar Wide[3] = {u'#', u'#', u'#'};
  EXPECT_EQ(TZqEncoding::ConvertA(Bytes("\xF0\x9F\x98\x80"), 4, 65001, Wide, 1), 0);  // needs a pair
  EXPECT_EQ(Wide[1], u'#');
  EXPECT_EQ(TZqEncoding::ConvertA(Bytes("\xC3\xA9"), 2, 65001, Wide, 1), 1);
  EXPECT_EQ(std::u16string_view(Wide, 2), u"é#");
  EXPECT_EQ(TZqEncoding::ConvertA(Bytes("\x81"), 1, 932, Wide, 3), 0);
  Byte Narrow[4] = {'#', '#', '#', '#'};
  EXPECT_EQ(TZqEncoding::ConvertW(u"日本", 2, Narrow, 3, 932), 0);
  EXPECT_EQ(Narrow[3], '#');
  EXPECT_EQ(TZqEncoding::ConvertW(u"日本", 2, nullptr, 0, 932), 4);
}

TEST(EncodingConversions, RaiseWhereTheyFailReplaceInUtf8AndComposeWideText) {
  EXPECT_THROW((void)TZqEncoding::ConvertA(Bytes("a\x81"), 2, 932), EOSError);
  EXPECT_EQ(GetLastError(), ERROR_NO_UNICODE_TRANSLATION);
  EXPECT_THROW((void)TZqEncoding::ConvertW(u"a", 99), EOSError);
  EXPECT_EQ(TZqEncoding::ConvertA(Bytes("a\x81"), 2, 65001), u"a\uFFFD");
  const RawByteString Result = TZqEncoding::ConvertW(u"e\u0301 \u65E5", 1252);
  EXPECT_TRUE(Result == "\xE9 ?" && Result.CodePage() == 1252);
  EXPECT_EQ(TZqEncoding::ConvertA(RawByteString("\xE9", 65001), 1252), u"é");
}

TEST(EncodingConversions, BuffersKeepTheirBytesWhereTheCodePagesAreEqual) {
  const std::string Broken = "\xC3(\x81";
  const RawByteString Same = TZqEncoding::ConvertB(Broken.data(), Broken.size(), 65001, 65001);
  EXPECT_TRUE(Same == Broken && Same.CodePage() == 65001);
  EXPECT_EQ(TZqEncoding::ConvertB("\xE9", 1, 1252, 65001), "é");
  EXPECT_THROW((void)TZqEncoding::ConvertB(Broken.data(), Broken.size(), 99, 65001), EOSError);
  for (const Word Page : std::initializer_list<Word>{1200, 1201, 12000, 12001})
    EXPECT_THROW((void)TZqEncoding::ConvertB("", 0, 1252, Page), EAssertionFailed);
}

TEST(EncodingConversions, BuffersOfUtf16AreTakenAtAnyAddressAndNeverRaise) {
  const std::string Odd = "#\xE9\0\x3D\xD8\x41"s;  // behind "#": é, half a pair and half a unit
  const void* Unaligned = Odd.data() + 1;
  EXPECT_EQ(TZqEncoding::ConvertB(Unaligned, 5, 1200), (std::u16string{u'é', char16_t{0xD83D}}));
  EXPECT_EQ(TZqEncoding::ConvertB(Unaligned, 3, 1200, 1252), "\xE9");
  const RawByteString Failed = TZqEncoding::ConvertB(Unaligned, 4, 1200, 99);
  EXPECT_TRUE(Failed.IsEmpty() && Failed.CodePage() == 99);
}

// ---- Normalisation and copies ---------------------------------------------------------------------------------------

template <class TChar>
auto Taken(TChar* ACopy) {
  const std::basic_string<TChar> Result = ACopy;
  ZqStrDispose(ACopy);
  return Result;
}

struct AnsiPage1252 : testing::Test {
  const TAnsiCodePageScope Scope{1252};
};

TEST_F(AnsiPage1252, NormalizationDecomposesAndFoldsWhatThePageHas) {
  const std::tuple<const char16_t*, TNorm_Form, const char16_t*> cForms[] = {
      {u"e\u0301€", nfC, u"é€"}, {u"é€", nfD, u"e\u0301\u0080"}, {u"ﬁ", nfKC, u"fi"}, {u"ﬁ\u0301", nfKD, u"fi\u0301"}};
  for (const auto& [Text, Form, Normal] : cForms) EXPECT_EQ(ZqNormalizeString(Text, Form), Normal);
  EXPECT_EQ(ZqSimplifyString(u"Crème brûlée ÅÉ ł 日😀"), u"Creme brulee AE ł 日😀");
  EXPECT_EQ(ZqSimplifyString(u""), u"");
  EXPECT_EQ(
      RaisedBy([] { (void)ZqNormalizeString(u"a", nfOther); }), u"Exception: Failed to normalize the given value");
}

TEST_F(AnsiPage1252, CopiesEndInAZeroAndCrossWidths) {
  EXPECT_EQ(Taken(ZqStrNew("\xE9x")) + Taken(ZqStrNewA(u"éx")) + Taken(ZqStrNewA("")), "\xE9x\xE9x");
  EXPECT_EQ(Taken(ZqStrNewW("\xE9x")), u"éx");
  EXPECT_EQ(ZqStrNewW(u""), nullptr);
}

// ---- Kinds ----------------------------------------------------------------------------------------------------------

TEST(TypeKinds, AndVariantTypesComeBackFromEachOtherButForThoseThatShareOne) {
  const auto KindBack = [](int A) {
    return static_cast<int>(ZqTypeKind(ZqTypeKindToVarType(static_cast<TZqTypeKind>(A))));
  };
  EXPECT_EQ(Changed(35, 27, KindBack),
      (std::map<int, int>{{12, 15}, {13, 15}, {14, 17}, {16, 15}, {19, 7}, {20, 23}, {21, 23}, {22, 23}, {28, 0}}));
  const auto TypeBack = [](int A) {
    const TZqTypeKind Kind = ZqTypeKind(static_cast<TVarType>(A));
    return Kind == rtkUnknown ? throw EAbort(u"unknown") : ZqTypeKindToVarType(Kind);
  };
  EXPECT_EQ(Changed(0x1FFF, 22, TypeBack), (std::map<int, int>{{8, 258}, {9, 13}, {14, 5}, {72, 258}, {257, 12}}));
  const std::string_view cMain = "011111111222333333411555866778888888";
  for (std::size_t i = 0; i < cMain.size(); ++i) {
    const auto Kind = static_cast<TZqTypeKind>(i);
    EXPECT_EQ(static_cast<int>(ZqMainTypeKind(Kind)), cMain[i] - '0') << i;
    EXPECT_EQ(ZqIsSimpleTypeKind(Kind), i >= 1 && i <= 24) << i;
  }
  EXPECT_EQ(ZqTypeKindToVarType(rtkObject), varObject);
  for (const auto Beyond : {static_cast<TZqTypeKind>(36), static_cast<TZqTypeKind>(255)}) {
    EXPECT_EQ(ZqMainTypeKind(Beyond), mtkUnknown);
    EXPECT_THROW((void)ZqTypeKindToVarType(Beyond), Exception);
  }
  EXPECT_TRUE(ZqMainTypeKind(varAny) == mtkUnknown && ZqTypeKind(TVarType{0x4003}) == rtkUnknown);
  EXPECT_TRUE(ZqTypeKind(TVarType{0xFFFF}) == rtkDynArray && ZqMainTypeKind(TVarType{0x200C}) == mtkArray);
}

TEST(TypeKinds, OfTheRuntimesKinds) {
  const Byte cKinds[] = {0, 7, 12, 19, 11, 15, 20, 34, 31, 14, 16, 17, 24, 25, 27, 29, 8, 26, 17, 35, 30, 32};
  for (std::size_t i = 0; i < std::size(cKinds); ++i) {
    const auto Kind = static_cast<TTypeKind>(i);
    EXPECT_EQ(static_cast<Byte>(ZqTypeKind(Kind)), cKinds[i]) << i;
    EXPECT_EQ(ZqIsSimpleTypeKind(Kind), ZqIsSimpleTypeKind(ZqTypeKind(Kind))) << i;
  }
  EXPECT_THROW((void)ZqTypeKind(static_cast<TTypeKind>(22)), EAssertionFailed);
  EXPECT_FALSE(ZqIsSimpleTypeKind(mtkUnknown) || ZqIsSimpleTypeKind(mtkArray));
}

// ---- Variants -------------------------------------------------------------------------------------------------------

// One of each type a variant holds, all of them 1.
const Variant cOnes[] = {ShortInt{1}, Byte{1}, SmallInt{1}, Word{1}, Integer{1}, Cardinal{1}, Int64{1}, UInt64{1},
    Single{1}, Double{1}, Currency{10000}, TDateTime{1}, true, UnicodeString(u"1"), VarArrayOf({})};

UnicodeString Invalid(const UnicodeString& AType) {
  return u"EConvertError: The given value is not a valid " + AType + u" value!";
}

#define STRICT(AName) [](const Variant& V) -> Extended { return ZqVar##AName(V, 7); }
#define LOOSE(AName) [](const Variant& V) -> Extended { return ZqVarTo##AName(V, 7, true); }

TEST(VariantReading, MembersTakeTheirTypesAndRefuseTheOthers) {
  const std::string cOrdinal = "11111111....11";
  // By cOnes: 1 accepted, anything else refused.
  const std::tuple<const char16_t*, std::string, Extended (*)(const Variant&)> cMembers[] = {
      {u"shortint", "11", STRICT(Shortint)}, {u"smallint", "11111", STRICT(Smallint)},
      {u"longword", "111111", STRICT(Int)}, {u"int64", "1111111", STRICT(Int64)}, {u"byte", "11", STRICT(Byte)},
      {u"word", "1111", STRICT(Word)}, {u"longword", "111111", STRICT(Longword)},
      {u"single", "111111..1", STRICT(Single)}, {u"double", "111111..11", STRICT(Double)},
      {u"extended", "111111..111", STRICT(Extended)}, {u"datetime", "111111..11.1", STRICT(Date)},
      {u"shortint", cOrdinal, LOOSE(Shortint)}, {u"smalling", cOrdinal, LOOSE(Smallint)},
      {u"LongInt", cOrdinal, LOOSE(Int)}, {u"Int64", cOrdinal, LOOSE(Int64)}, {u"Byte", cOrdinal, LOOSE(Byte)},
      {u"Word", cOrdinal, LOOSE(Word)}, {u"LongWord", cOrdinal, LOOSE(Longword)},
      {u"Single", "11111111111..1", LOOSE(Single)}, {u"Double", "111111111111.1", LOOSE(Double)},
      {u"Extended", "111111111111.1", LOOSE(Extended)}};
  for (const auto& Member : cMembers) {
    const auto& [Type, Accepts, Read] = Member;
    SCOPED_TRACE(&Member - cMembers);
    for (std::size_t i = 0; i < std::size(cOnes); ++i) {
      const bool Accepted = i < Accepts.size() && Accepts[i] == '1';
      EXPECT_EQ(RaisedBy([&, Call = Read] { EXPECT_EQ(Call(cOnes[i]), 1); }), Accepted ? u"nothing" : Invalid(Type))
          << i;
    }
    EXPECT_EQ(Read(Null()), 7);
  }
}

TEST(VariantReading, CutsWhatDoesNotFitOrGivesTheDefaultInSilenceWhereItMayNotRaise) {
  const std::pair<Extended, Extended> cReads[] = {{ZqVarByte(Byte{200}, 0), 200}, {ZqVarShortint(Byte{200}, 0), -56},
      {ZqVarSmallint(-40000, 0), 25536}, {ZqVarLongword(-1, 0), 0xFFFFFFFF}, {ZqVarToByte(u"300", 0, true), 44},
      {ZqVarToInt64(u"5000000000", 0, true), 5000000000}, {ZqVarToInt(u"12", 7, false), 12},
      {ZqVarToInt(u"abc", 7, false), 7}, {ZqVarToInt(Int64{5000000000}, 7, false), 7},
      {ZqVarToLongword(u"5000000000", 7, false), 7}, {ZqVarToDate(u"someday", 7, false), 7}};
  for (const auto& [Read, Expected] : cReads) EXPECT_EQ(Read, Expected) << "row " << Expected;
  EXPECT_THROW((void)ZqVarSmallint(32768, 0), EConvertError);
  EXPECT_THROW((void)ZqVarToInt(u"abc", 7, true), EConvertError);
}

TEST(VariantReading, Booleans) {
  for (const char16_t* Yes : {u"Yes", u"true", u"1234", u"T"}) EXPECT_TRUE(ZqStrToBool(Yes));
  for (const char16_t* No : {u"0", u"no", u"", u" 1", u"\u0154"}) EXPECT_FALSE(ZqStrToBool(No));
  EXPECT_TRUE(
      ZqVarBool(256, false) && !ZqVarBool(u"", true) && ZqVarBool(u"Y", false) && ZqVarToBool(u"Y", false, true));
  EXPECT_FALSE(ZqVarToBool(256, true, true));  // by the low byte
  EXPECT_EQ(RaisedBy([] { (void)ZqVarBool(1.0, true); }), Invalid(u"boolean"));
  EXPECT_EQ(RaisedBy([] { (void)ZqVarToBool(1.0, true, true); }), Invalid(u"Boolean"));
  EXPECT_TRUE(ZqNullableBool(true) == nbYes && ZqNullableBool(false) == nbNo && ZqNullableBool(u"True") == nbNull);
  EXPECT_EQ(ZqNullableBool(Null()), nbNull);
}

TEST_F(AnsiPage1252, TextOfVariants) {
  const Variant Array = VarArrayOf({1}), Table = VarArrayCreate({0, 1, 0, 1}, varInteger);
  const std::pair<Variant, UnicodeString> cTexts[] = {{Int64{-5000000000}, u"-5000000000"}, {1.5, u"1.5"},
      {true, u"True"}, {TDateTime(44553.5), DateTimeToStr(TDateTime(44553.5))}, {VarArrayOf({1, 2}), u"1\r\n2\r\n"},
      {VarArrayOf({Null(), VarArrayOf({u"x"})}), u"-\r\nx\r\n\r\n"}, {VarArrayOf({}), u""},
      {VarArrayCreate({3, 4}, varInteger), u"0\r\n0\r\n"}};
  for (const auto& [Value, Text] : cTexts) EXPECT_EQ(ZqVarToStr(Value, u"-", true), Text);
  EXPECT_EQ(ZqVarStr(u"é", u"-") + ZqVarToWStr(false, u"", true), u"éFalse");
  EXPECT_EQ(ZqVarStrA(u"é", "-") + ZqVarToAStr(u"é", "", true), "\xE9\xE9");
  EXPECT_EQ(RaisedBy([] { (void)ZqVarStr(1, u""); }), Invalid(u"string"));
  EXPECT_EQ(RaisedBy([&] { (void)ZqVarToAStr(Array, "", true); }), Invalid(u"AnsiString"));
  EXPECT_EQ(RaisedBy([&] { (void)ZqVarToWStr(Array, u"", true); }), Invalid(u"WideString"));
  EXPECT_EQ(ZqVarToStr(Table, u"-", false), u"-");
  EXPECT_EQ(RaisedBy([&] { (void)ZqVarToStr(Table, u"-", true); }),
      u"EConvertError: The given array is not a to-string convertable value!");
  EXPECT_EQ(ZqVarArrayCount(VarArrayCreate({3, 4}, varInteger)) + ZqVarArrayCount(u"ab") + ZqVarArrayCount(Null()), 5);
}

TEST(VariantReading, EmptinessIsZeroBlanksOrNothing) {
  const Variant cEmpty[] = {0, UInt64{0}, 0.0, TDateTime(0), u"  ", u"", Variant(), Null(), VarArrayOf({})};
  const Variant cFull[] = {1, 0.5, u" x ", false, VarArrayOf({Null()}), VarArrayCreate({3, 2}, varInteger)};
  for (const Variant& Value : cEmpty) EXPECT_TRUE(ZqVarIsEmpty(Value)) << VarType(Value);
  for (const Variant& Value : cFull) EXPECT_FALSE(ZqVarIsEmpty(Value)) << VarType(Value);
}

// ---- Numbers and dates by any settings ------------------------------------------------------------------------------

struct OtherSettings : testing::Test {
  ~OtherSettings() override { SetFormatSettings(Saved); }
  void Use(Char ADecimal, Char AThousand) const {
    TFormatSettings Settings = Saved;
    Settings.DecimalSeparator = ADecimal;
    Settings.ThousandSeparator = AThousand;
    Settings.ShortDateFormat = u"d/m/yyyy";
    Settings.DateSeparator = u'.';
    SetFormatSettings(Settings);
  }
  const TFormatSettings Saved = FormatSettings();
};

TEST_F(OtherSettings, DatesAreIsoToo) {
  Use(u',', u'.');
  for (const char16_t* Text : {u"2021-12-23", u"23.12.2021"}) EXPECT_EQ(ZqVarToDate(Text, 0, true), 44553);
  EXPECT_EQ(RaisedBy([] { (void)ZqVarToDate(true, 0, true); }), Invalid(u"Date"));
}

TEST_F(OtherSettings, FloatsMayHaveTheSeparatorThatTheLocaleLacks) {
  Use(u'.', u',');
  const std::pair<Extended, Extended> cReads[] = {{ZqStrToFloat(u"1.5"), 1.5L}, {ZqStrToFloatDef(u"x", 7), 7},
      {ZqStrToFloatDef(u"1.234,5", 0), 1234.5L}, {ZqVarToDouble(u"1,5", 0, true), 1.5L},
      {ZqVarToExtended(u"1,5", 7, false), 7}};
  for (const auto& [Read, Expected] : cReads) EXPECT_EQ(Read, Expected);
  EXPECT_THROW((void)ZqStrToFloat(u"x"), EConvertError);
  Use(u',', u'.');
  EXPECT_EQ(ZqStrToFloat(u"1,5"), 1.5L);
  EXPECT_EQ(ZqStrToFloatDef(u"1.5", 7), 7);  // the second try swaps the locale's separator, not the current one
}

}  // namespace
}  // namespace zq
