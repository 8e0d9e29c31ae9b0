#include "common/uZqTypes.h"

#include <gtest/gtest.h>

#include <iterator>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "runtime/io/streams.h"
#include "runtime/text/datetime.h"
#include "runtime/text/format_settings.h"
#include "tests/support/support.h"

namespace zq {
namespace {

using namespace std::string_literals;

const Byte* Bytes(std::string_view AText) { return reinterpret_cast<const Byte*>(AText.data()); }

template <class TRaised = Exception, class TCall>
std::string Raised(TCall ACall) {
  try {
    ACall();
  } catch (const TRaised& Error) {
    return Error.what();
  }
  return "nothing";
}

// ---- Names ----------------------------------------------------------------------------------------------------------

TEST(CodePageNames, EachNumberComesBackFromItsNameButForTheTwoThatShareOne) {
  std::map<Word, Word> Changed;
  Integer Named = 0;
  for (Integer Number = 0; Number <= 0xFFFF; ++Number) try {
      const auto Page = static_cast<Word>(Number);
      const Word Back = ZqCodePage(UpperCase(ZqCodePage(Page)));
      ++Named;
      if (Back != Page) Changed[Page] = Back;
    } catch (const Exception&) {
    }
  EXPECT_EQ(Named, 142);
  EXPECT_EQ(Changed, (std::map<Word, Word>{{50222, 50220}, {51932, 20932}}));
}

TEST(CodePageNames, TheFurtherNamesLeadToTheirNumbers) {
  const std::multimap<Word, std::vector<const char16_t*>> cFurther = {{866, {u"ibm866"}},
      {932, {u"cseucpkdfmtjapanese", u"csshiftjis", u"extended_unix_code_packed_format_for_japanese", u"ms_kanji ",
                u"shift-jis", u"x-euc", u"x-euc-jp", u"x-sjis"}},
      {936, {u"chinese", u"csgb2312 ", u"csiso58gb231280", u"gb_2312-80", u"iso-ir-58"}},
      {949, {u"cseuckr", u"csksc56011987", u"iso-ir-149", u"korean", u"ks-c-5601", u"ks-c-5601-1987", u"ks_c_5601",
                u"ks_c_5601-1989", u"ksc-5601", u"ksc5601", u"ksc_5601"}},
      {950, {u"csbig5", u"x-x-big5"}}, {1200, {u"ucs-2", u"iso-10646-ucs-2"}}, {1250, {u"x-cp1250"}},
      {1251, {u"x-cp1251"}},
      {1252, {u"ansi_x3.4-1968", u"ansi_x3.4-1986", u"ascii", u"cp367", u"cp819", u"csascii", u"ibm367", u"ibm819",
                 u"iso-ir-100", u"iso-ir-6", u"iso646-us", u"iso8859-1", u"iso_646.irv:1991", u"iso_8859-1",
                 u"iso_8859-1:1987", u"latin1", u"us"}},
      {1255, {u"csisolatinhebrew", u"hebrew", u"iso-ir-138", u"iso_8859-8", u"iso_8859-8:1988"}}, {20866, {u"cskoi8r"}},
      {28592, {u"csisolatin2", u"iso-ir-101", u"iso8859-2", u"iso_8859-2", u"iso_8859-2:1987", u"l2", u"latin2"}},
      {50225, {u"csiso2022kr"}}};
  for (const auto& [Page, Names] : cFurther)
    for (const char16_t* Name : Names) EXPECT_EQ(ZqCodePage(Name), Page) << ToUTF8(Name);
}

TEST(CodePageNames, LookalikesDifferAndStrangersRaise) {
  EXPECT_EQ(
      ZqCodePage(Word{1201}) + ZqCodePage(Word{20002}) + ZqCodePage(Word{932}), u"unicodeFFFEx_Chinese-Etenshift_jis");
  EXPECT_EQ(ZqCodePage(u"ISO-8859-1"), 28591);
  EXPECT_EQ(ZqCodePage(u"us-ascii"), 20127);
  EXPECT_EQ(ZqCodePage(u"iso-8859-8"), 28598);
  EXPECT_EQ(ZqCodePage(u""), 0);
  EXPECT_EQ(Raised([] { (void)ZqCodePage(u"MS_Kanji"); }), "No CodePage ID found for MS_Kanji!");
  EXPECT_EQ(Raised([] { (void)ZqCodePage(Word{50229}); }), "No CodePage Name found for 50229!");
}

// ---- Detection ------------------------------------------------------------------------------------------------------

TEST(CodePageDetection, GoesByTheMarkAndLeavesTheStreamBehindIt) {
  const struct {
    std::string Head;
    Word CodePage;
    Integer MarkSize;
  } cCases[] = {{"\0\0\xFE\xFF"s, 12001, 4}, {"\xFF\xFE\0\0"s, 12000, 4}, {"\xFF\xFE\0"s, 1200, 2},
      {"\xEF\xBB\xBFx"s, 65001, 3}, {"\xEF\xBB\xBF"s, 65001, 3}, {"\xEF\xBB"s, 0, 0}, {"\xFE\xFF"s, 1201, 2},
      {"\xFF\xFEx\0"s, 1200, 2}, {"A\0B"s, 1200, 0}, {"A\0"s, 0, 0}, {"\0A\0B"s, 0, 0}, {"\xFF"s, 0, 0},
      {"abcd"s, 0, 0}, {""s, 0, 0}};
  for (const auto& Case : cCases) {
    SCOPED_TRACE(testing::PrintToString(Case.Head));
    EXPECT_EQ(ZqGetCodePage(Case.Head.data(), static_cast<Integer>(Case.Head.size())), Case.CodePage);
    TMemoryStream Stream;
    Stream.WriteBuffer(("##" + Case.Head).data(), static_cast<Int64>(Case.Head.size()) + 2);
    Stream.SetPosition(2);
    EXPECT_EQ(ZqGetCodePage(&Stream), Case.CodePage);
    EXPECT_EQ(Stream.Position(), 2 + Case.MarkSize);
  }
  EXPECT_THROW((void)ZqGetCodePage(nullptr), EAssertionFailed);
}

// ---- Conversions ----------------------------------------------------------------------------------------------------

struct TPageCase {
  Word CodePage;
  std::string Bytes;
  std::u16string Text;
};

// The pages that take no flags would fail outright if they were given some.
TEST(EncodingConversions, GoBothWaysOnPagesOfEveryShape) {
  const TPageCase cCases[] = {{1252, "\x80 caf\xE9", u"€ café"}, {932, "\x93\xFA\x96{", u"日本"},
      {65001, "\xF0\x9F\x98\x80z\xC3\xA9", u"😀zé"}, {1200, "A\0\xAC\x20"s, u"A€"}, {1201, "\0A\x20\xAC"s, u"A€"},
      {12000, "A\0\0\0"s, u"A"}, {54936, "\x81\x30\x84\x36", u"¥"}, {50220, "\x1B$BF|K\\\x1B(B", u"日本"},
      {57002, "\xEF\x42\xB3", u"क"}, {65000, "+IKw-", u"€"}, {20866, "\xC1", u"а"}};
  for (const auto& [CodePage, Source, Text] : cCases) {
    SCOPED_TRACE(CodePage);
    const auto Size = static_cast<Integer>(Source.size());
    EXPECT_EQ(TZqEncoding::ConvertA(Bytes(Source), Size, CodePage), Text);
    EXPECT_EQ(TZqEncoding::ConvertW(Text, CodePage), Source);
    EXPECT_EQ(TZqEncoding::ConvertA(Bytes(Source), Size, CodePage, 65001), UnicodeString(Text).ToUTF8());
  }
}

TEST(EncodingConversions, CodePage0IsTheProcesssWithTheFlagsOfThatPage) {
  for (const auto& [CodePage, Source, Text] :
      {TPageCase{1252, "\xE9", u"é"}, {65001, "\xC3\xA9", u"é"}, {850, "\x82", u"é"}}) {
    const TAnsiCodePageScope Scope(CodePage);
    EXPECT_EQ(TZqEncoding::ConvertA(AnsiString(Source)), Text) << CodePage;
    EXPECT_EQ(TZqEncoding::ConvertW(Text, 0), Source) << CodePage;
  }
}

TEST(EncodingConversions, CountsOfNothingAndOfMinusOne) {
  EXPECT_EQ(TZqEncoding::ConvertA(nullptr, 5, 1252), u"");
  EXPECT_EQ(TZqEncoding::ConvertA(Bytes("abc"), 0, 1), u"");
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

TEST(EncodingConversions, FailuresRaiseTheReasonButUtf8Replaces) {
  EXPECT_THROW((void)TZqEncoding::ConvertA(Bytes("a\x81"), 2, 932), EOSError);
  EXPECT_EQ(GetLastError(), ERROR_NO_UNICODE_TRANSLATION);
  EXPECT_THROW((void)TZqEncoding::ConvertW(u"a", 99), EOSError);
  EXPECT_EQ(TZqEncoding::ConvertA(Bytes("a\x81"), 2, 65001), u"a\uFFFD");
}

TEST(EncodingConversions, WideTextIsComposedOnTheWayAndTheResultTagged) {
  const RawByteString Result = TZqEncoding::ConvertW(u"e\u0301 \u65E5", 1252);
  EXPECT_EQ(Result, "\xE9 ?");
  EXPECT_EQ(Result.CodePage(), 1252);
  EXPECT_EQ(TZqEncoding::ConvertA(RawByteString("\xE9", 65001), 1252), u"é");
}

TEST(EncodingConversions, BuffersKeepTheirBytesWhereTheCodePagesAreEqual) {
  const std::string Broken = "\xC3(\x81";
  const RawByteString Same = TZqEncoding::ConvertB(Broken.data(), Broken.size(), 65001, 65001);
  EXPECT_EQ(Same, Broken);
  EXPECT_EQ(Same.CodePage(), 65001);
  EXPECT_EQ(TZqEncoding::ConvertB("\xE9", 1, 1252, 65001), "é");
  EXPECT_THROW((void)TZqEncoding::ConvertB(Broken.data(), Broken.size(), 99, 65001), EOSError);
  for (const Word Page : std::initializer_list<Word>{1200, 1201, 12000, 12001})
    EXPECT_EQ(Raised<EAssertionFailed>([&] { (void)TZqEncoding::ConvertB("", 0, 1252, Page); }).substr(0, 17),
        "Assertion failure");
}

TEST(EncodingConversions, BuffersOfUtf16AreTakenAtAnyAddressAndNeverRaise) {
  const std::string Odd = "#\xE9\0\x3D\xD8\x41"s;  // behind "#": é, half a pair and half a unit
  const void* Unaligned = Odd.data() + 1;
  EXPECT_EQ(TZqEncoding::ConvertB(Unaligned, 5, 1200), (std::u16string{u'é', char16_t{0xD83D}}));
  EXPECT_EQ(TZqEncoding::ConvertB(Unaligned, 3, 1200, 1252), "\xE9");
  const RawByteString Failed = TZqEncoding::ConvertB(Unaligned, 4, 1200, 99);
  EXPECT_TRUE(Failed.IsEmpty());
  EXPECT_EQ(Failed.CodePage(), 99);
}

// ---- Normalisation --------------------------------------------------------------------------------------------------

TEST(Normalization, DecomposesAndFoldsWhatTheAnsiPageHas) {
  const TAnsiCodePageScope Scope(1252);
  EXPECT_EQ(ZqNormalizeString(u"e\u0301", nfC), u"é");
  EXPECT_EQ(ZqNormalizeString(u"é€", nfD), u"e\u0301\u0080");
  EXPECT_EQ(ZqNormalizeString(u"é€", nfC), u"é€");
  EXPECT_EQ(ZqNormalizeString(u"ﬁ", nfKC), u"fi");
  EXPECT_EQ(ZqSimplifyString(u"Crème brûlée ÅÉ ł 日😀"), u"Creme brulee AE ł 日😀");
  EXPECT_EQ(ZqSimplifyString(u""), u"");
}

TEST(Normalization, RaisesItsMessageForAFormThatIsNone) {
  EXPECT_EQ(Raised([] { (void)ZqNormalizeString(u"a", nfOther); }), "Failed to normalize the given value");
  EXPECT_EQ(uZqTypes::_SCantLoadNormalizDll.Id, 65527);
  EXPECT_EQ(
      UnicodeString(uZqTypes::_SCantFindNormalizeString.Text), u"Failed to find the \"NormalizeString\" function!");
  EXPECT_EQ(uZqTypes::_SEncodingNotSupported.Id, 65530);
}

// ---- Copies ---------------------------------------------------------------------------------------------------------

template <class TChar>
auto Taken(TChar* ACopy) {
  const std::basic_string<TChar> Result = ACopy == nullptr ? std::basic_string<TChar>(1, '0') : ACopy;
  ZqStrDispose(ACopy);
  return Result;
}

TEST(StringCopies, EndInAZeroAndCrossWidthsByCodePage0) {
  const TAnsiCodePageScope Scope(1252);
  EXPECT_EQ(Taken(ZqStrNew("\xE9x")), "\xE9x");
  EXPECT_EQ(Taken(ZqStrNewA(u"éx")), "\xE9x");
  EXPECT_EQ(Taken(ZqStrNewA("")), "");
  EXPECT_EQ(Taken(ZqStrNewW("\xE9x")), u"éx");
  EXPECT_EQ(ZqStrNewW(u""), nullptr);
}

// ---- Kinds ----------------------------------------------------------------------------------------------------------

TEST(TypeKinds, OfVariantTypesAreThoseOfTheTable) {
  const std::string_view cMain = "0011222538040820111111";
  const Byte cKinds[] = {0, 0, 6, 7, 9, 10, 11, 23, 17, 29, 0, 18, 24, 29, 10, 0, 5, 1, 2, 3, 8, 4};
  for (TVarType i = 0; i < std::size(cKinds); ++i) {
    EXPECT_EQ(static_cast<Byte>(ZqTypeKind(i)), cKinds[i]) << i;
    EXPECT_EQ(static_cast<int>(ZqMainTypeKind(i)), cMain[i] - '0') << i;
  }
  EXPECT_EQ(ZqTypeKind(varStrArg), rtkWString);
  EXPECT_EQ(ZqTypeKind(varString), rtkString);
  EXPECT_EQ(ZqTypeKind(varAny), rtkVariant);
  EXPECT_EQ(ZqMainTypeKind(varAny), mtkUnknown);
  EXPECT_EQ(ZqTypeKind(varUString), rtkWString);
  for (const TVarType Stranger : {TVarType{73}, TVarType{259}, TVarType{0x4003}})
    EXPECT_EQ(ZqTypeKind(Stranger), rtkUnknown) << Stranger;
  EXPECT_EQ(ZqTypeKind(TVarType{0xFFFF}), rtkDynArray);
  EXPECT_EQ(ZqMainTypeKind(TVarType{0x200C}), mtkArray);
}

TEST(TypeKinds, EachHasItsMainKindAndVariantType) {
  constexpr int cNone = -1;
  const int cVarTypes[] = {0, 17, 18, 19, 21, 16, 2, 3, 20, 4, 5, 6, 256, 256, 258, 256, 256, 258, 11, 3, 7, 7, 7, 7,
      12, cNone, cNone, cNone, 73, 13, cNone, cNone, cNone, cNone, cNone, cNone};
  const std::string_view cMain = "011111111222333333411555866778888888";
  ASSERT_EQ(std::size(cVarTypes), static_cast<std::size_t>(rtkClassRef) + 1);
  for (std::size_t i = 0; i < std::size(cVarTypes); ++i) {
    const auto Kind = static_cast<TZqTypeKind>(i);
    EXPECT_EQ(static_cast<int>(ZqMainTypeKind(Kind)), cMain[i] - '0') << i;
    EXPECT_EQ(ZqIsSimpleTypeKind(Kind), i >= 1 && i <= 24) << i;
    int VarType = cNone;
    EXPECT_EQ(Raised([&] { VarType = ZqTypeKindToVarType(Kind); }) == "nothing", cVarTypes[i] != cNone) << i;
    EXPECT_EQ(VarType, cVarTypes[i]) << i;
  }
}

TEST(TypeKinds, OfTheRuntimesKinds) {
  const Byte cKinds[] = {0, 7, 12, 19, 11, 15, 20, 34, 31, 14, 16, 17, 24, 25, 27, 29, 8, 26, 17, 35, 30, 32};
  const std::string_view cSimple = "0111111001111000101000";
  for (std::size_t i = 0; i < std::size(cKinds); ++i) {
    EXPECT_EQ(static_cast<Byte>(ZqTypeKind(static_cast<TTypeKind>(i))), cKinds[i]) << i;
    EXPECT_EQ(ZqIsSimpleTypeKind(static_cast<TTypeKind>(i)), cSimple[i] == '1') << i;
  }
  EXPECT_THROW((void)ZqTypeKind(static_cast<TTypeKind>(22)), EAssertionFailed);
  EXPECT_FALSE(ZqIsSimpleTypeKind(mtkUnknown) || ZqIsSimpleTypeKind(mtkArray));
}

// ---- Variants -------------------------------------------------------------------------------------------------------

// One of each type a variant holds, all of them 1.
const Variant cOnes[] = {ShortInt{1}, Byte{1}, SmallInt{1}, Word{1}, Integer{1}, Cardinal{1}, Int64{1}, UInt64{1},
    Single{1}, Double{1}, Currency{10000}, TDateTime{1}, true, UnicodeString(u"1"), VarArrayOf({})};

struct TMember {
  const char* Name;
  Extended (*Read)(const Variant&);
  std::string Accepts;  // by cOnes: 1 accepted, anything else refused
  std::string Type;
};
#define STRICT(AName, ...)                                                               \
  {                                                                                      \
#AName, [](const Variant& V) -> Extended { return ZqVar##AName(V, 7); }, __VA_ARGS__ \
  }
#define LOOSE(AName, ...)                                                                        \
  {                                                                                              \
#AName, [](const Variant& V) -> Extended { return ZqVarTo##AName(V, 7, true); }, __VA_ARGS__ \
  }

TEST(VariantReading, MembersTakeTheirTypesAndRefuseTheOthers) {
  const TMember cMembers[] = {STRICT(Shortint, "11", "shortint"), STRICT(Smallint, "11111", "smallint"),
      STRICT(LongInt, "111111", "longword"), STRICT(Int, "111111", "longword"), STRICT(Int64, "1111111", "int64"),
      STRICT(Byte, "11", "byte"), STRICT(Word, "1111", "word"), STRICT(Longword, "111111", "longword"),
      STRICT(Single, "111111..1", "single"), STRICT(Double, "111111..11", "double"),
      STRICT(Extended, "111111..111", "extended"), STRICT(Date, "111111..11.1", "datetime"),
      LOOSE(Shortint, "11111111....11", "shortint"), LOOSE(Smallint, "11111111....11", "smalling"),
      LOOSE(LongInt, "11111111....11", "LongInt"), LOOSE(Int, "11111111....11", "LongInt"),
      LOOSE(Int64, "11111111....11", "Int64"), LOOSE(Byte, "11111111....11", "Byte"),
      LOOSE(Word, "11111111....11", "Word"), LOOSE(Longword, "11111111....11", "LongWord"),
      LOOSE(Single, "11111111111..1", "Single"), LOOSE(Double, "111111111111.1", "Double"),
      LOOSE(Extended, "111111111111.1", "Extended")};
  for (const TMember& Member : cMembers) {
    SCOPED_TRACE(Member.Name + Member.Type);
    for (std::size_t i = 0; i < std::size(cOnes); ++i) {
      const bool Accepted = i < Member.Accepts.size() && Member.Accepts[i] == '1';
      EXPECT_EQ(Raised<EConvertError>([&] { EXPECT_EQ(Member.Read(cOnes[i]), 1); }),
          Accepted ? "nothing" : "The given value is not a valid " + Member.Type + " value!")
          << VarType(cOnes[i]);
    }
    EXPECT_EQ(Member.Read(Null()), 7);
  }
}

TEST(VariantReading, CutsWhatDoesNotFit) {
  EXPECT_EQ(ZqVarByte(Byte{200}, 0), 200);
  EXPECT_EQ(ZqVarShortint(Byte{200}, 0), -56);
  EXPECT_EQ(ZqVarSmallint(-40000, 0), 25536);
  EXPECT_THROW((void)ZqVarSmallint(32768, 0), EConvertError);
  EXPECT_EQ(ZqVarLongword(-1, 0), 0xFFFFFFFFU);
  EXPECT_EQ(ZqVarToByte(u"300", 0, true), 44);
  EXPECT_EQ(ZqVarToInt64(u"5000000000", 0, true), 5000000000);
}

TEST(VariantReading, GivesTheDefaultInSilenceWhereItMayNotRaise) {
  EXPECT_EQ(ZqVarToInt(u"12", 7, false), 12);
  EXPECT_EQ(ZqVarToInt(u"abc", 7, false), 7);
  EXPECT_THROW((void)ZqVarToInt(u"abc", 7, true), EConvertError);
  EXPECT_EQ(ZqVarToLongword(u"5000000000", 7, false), 7U);  // text is of 32 bits
  EXPECT_EQ(ZqVarToInt(Int64{5000000000}, 7, false), 7);
  EXPECT_EQ(ZqVarToDate(u"someday", 7, false), 7);
}

TEST(VariantReading, Booleans) {
  EXPECT_TRUE(ZqVarBool(256, false));
  EXPECT_FALSE(ZqVarToBool(256, true, true));  // by the low byte
  EXPECT_FALSE(ZqVarBool(u"", true));
  EXPECT_EQ(Raised<EConvertError>([] { (void)ZqVarBool(1.0, true); }), "The given value is not a valid boolean value!");
  EXPECT_EQ(Raised<EConvertError>([] { (void)ZqVarToBool(1.0, true, true); }),
      "The given value is not a valid Boolean value!");
  for (const char16_t* Yes : {u"Yes", u"true", u"1234", u"T"}) EXPECT_TRUE(ZqStrToBool(Yes));
  for (const char16_t* No : {u"0", u"no", u"", u" 1", u"\u0154"}) EXPECT_FALSE(ZqStrToBool(No));
  EXPECT_EQ(ZqNullableBool(true), nbYes);
  EXPECT_EQ(ZqNullableBool(false), nbNo);
  EXPECT_EQ(ZqNullableBool(u"True"), nbNull);
}

TEST(VariantReading, Text) {
  const TAnsiCodePageScope Scope(1252);
  EXPECT_EQ(ZqVarStr(u"é", u"-"), u"é");
  EXPECT_EQ(ZqVarStrA(u"é", "-"), "\xE9");
  EXPECT_EQ(Raised<EConvertError>([] { (void)ZqVarStr(1, u""); }), "The given value is not a valid string value!");
  EXPECT_EQ(ZqVarToStr(Int64{-5000000000}, u"", true), u"-5000000000");
  EXPECT_EQ(ZqVarToStr(1.5, u"", true), u"1.5");
  EXPECT_EQ(ZqVarToStr(true, u"", true), u"True");
  EXPECT_EQ(ZqVarToStr(TDateTime(44553.5), u"", true), DateTimeToStr(TDateTime(44553.5)));
  EXPECT_EQ(ZqVarToAStr(u"é", "", true), "\xE9");
  EXPECT_EQ(ZqVarToWStr(false, u"", true), u"False");
  const Variant Array = VarArrayOf({1});
  EXPECT_EQ(Raised<EConvertError>([&] { (void)ZqVarToAStr(Array, "", true); }),
      "The given value is not a valid AnsiString value!");
  EXPECT_EQ(Raised<EConvertError>([&] { (void)ZqVarToWStr(Array, u"", true); }),
      "The given value is not a valid WideString value!");
}

TEST(VariantReading, TextOfAnArrayIsThatOfItsElements) {
  EXPECT_EQ(ZqVarToStr(VarArrayOf({1, 2}), u"-", true), u"1\r\n2\r\n");
  EXPECT_EQ(ZqVarToStr(VarArrayOf({Null(), VarArrayOf({u"x"})}), u"-", true), u"-\r\nx\r\n\r\n");
  EXPECT_EQ(ZqVarToStr(VarArrayOf({}), u"-", true), u"");
  EXPECT_EQ(ZqVarToStr(VarArrayCreate({3, 4}, varInteger), u"-", true), u"0\r\n0\r\n");
  const Variant Table = VarArrayCreate({0, 1, 0, 1}, varInteger);
  EXPECT_EQ(ZqVarToStr(Table, u"-", false), u"-");
  EXPECT_EQ(Raised<EConvertError>([&] { (void)ZqVarToStr(Table, u"-", true); }),
      "The given array is not a to-string convertable value!");
  EXPECT_EQ(ZqVarArrayCount(VarArrayCreate({3, 4}, varInteger)), 5);
  EXPECT_EQ(ZqVarArrayCount(u"ab") + ZqVarArrayCount(Null()), 0);
}

TEST(VariantReading, EmptinessIsZeroBlanksOrNothing) {
  const Variant cEmpty[] = {0, UInt64{0}, 0.0, TDateTime(0), u"  ", u"", Variant(), Null(), VarArrayOf({})};
  const Variant cFull[] = {1, 0.5, u" x ", false, VarArrayOf({Null()}), VarArrayCreate({3, 2}, varInteger)};
  for (const Variant& Value : cEmpty) EXPECT_TRUE(ZqVarIsEmpty(Value)) << VarType(Value);
  for (const Variant& Value : cFull) EXPECT_FALSE(ZqVarIsEmpty(Value)) << VarType(Value);
}

// ---- Numbers and dates by any settings ------------------------------------------------------------------------------

// The current settings with these separators, while it lives.
class TSeparators {
 public:
  TSeparators(Char ADecimal, Char AThousand) {
    TFormatSettings Settings = FSaved;
    Settings.DecimalSeparator = ADecimal;
    Settings.ThousandSeparator = AThousand;
    Settings.ShortDateFormat = u"d/m/yyyy";
    Settings.DateSeparator = u'.';
    SetFormatSettings(Settings);
  }
  TSeparators(const TSeparators&) = delete;
  TSeparators& operator=(const TSeparators&) = delete;
  ~TSeparators() { SetFormatSettings(FSaved); }

 private:
  TFormatSettings FSaved = FormatSettings();
};

TEST(FloatText, IsReadByTheCurrentSeparatorAndThenByTheOneThatTheLocaleLacks) {
  if (GetLocaleFormatSettings().DecimalSeparator != u'.') GTEST_SKIP() << "speaks of a locale with a decimal point";
  const TSeparators Point(u'.', u',');
  EXPECT_EQ(ZqStrToFloat(u"1.5"), 1.5L);
  EXPECT_EQ(ZqStrToFloatDef(u"1.234,5", 0), 1234.5L);
  EXPECT_EQ(ZqStrToFloatDef(u"x", 7), 7);
  EXPECT_THROW((void)ZqStrToFloat(u"x"), EConvertError);
  EXPECT_EQ(ZqVarToDouble(u"1,5", 0, true), 1.5);
  EXPECT_EQ(ZqVarToExtended(u"1,5", 7, false), 7);
  const TSeparators Comma(u',', u'.');
  EXPECT_EQ(ZqStrToFloat(u"1,5"), 1.5L);
  EXPECT_EQ(ZqStrToFloatDef(u"1.5", 7), 7);  // the second try swaps the locale's separator, not the current one
}

TEST(DateText, IsIsoOnAnySettingsOrThatOfTheCurrentOnes) {
  const TSeparators Settings(u',', u'.');
  EXPECT_EQ(ZqVarToDate(u"2021-12-23", 0, true), 44553);
  EXPECT_EQ(ZqVarToDate(u"23.12.2021", 0, true), 44553);
  EXPECT_EQ(
      Raised<EConvertError>([] { (void)ZqVarToDate(true, 0, true); }), "The given value is not a valid Date value!");
}

}  // namespace
}  // namespace zq
