#include "common/uZqSysUtils.h"

#include <gtest/gtest.h>

#include "runtime/containers/lists.h"
#include "runtime/io/string_list.h"
#include "runtime/text/datetime.h"
#include "runtime/text/encoding.h"
#include "tests/fakes/clock.h"
#include "tests/fakes/desktop.h"
#include "tests/fakes/files.h"
#include "tests/fakes/process.h"
#include "tests/fakes/registry.h"
#include "tests/fakes/resources.h"
#include "tests/fakes/users.h"

namespace zq {
namespace {

using testing::_, testing::DoAll, testing::Eq, testing::Return, testing::SetArgReferee;

// ---- Coded exceptions ----------------------------------------------------------------------------------------------

struct EShop : EZqException {
  using EZqException::EZqException;
};
struct EShopClosed : EZqAbort {
  using EZqAbort::EZqAbort;
};

TEST(ExceptionRegistry, FindsByGroupAndCodeAndRefusesAnotherClassForThem) {
  EXPECT_FALSE(ZqGetExceptionClass(u"", 1) || ZqGetExceptionClassByName(u"EShop"));
  EXPECT_EQ(uZqSysUtils::ExceptionClassList, nullptr) << "a lookup makes no list";
  ZqRegisterExceptionClass(u"shop", 1, EZqExceptionClass::Of<EShop>());
  ZqRegisterExceptionClass(u"door", 1, EZqAbortClass::Of<EShopClosed>());
  EXPECT_EQ(ZqGetExceptionClass(u"shop", 1), ExceptionClass::Of<EShop>());
  EXPECT_EQ(ZqGetExceptionClass(u"door", 1), ExceptionClass::Of<EShopClosed>());
  EXPECT_EQ(ZqGetExceptionClass(u"", 1), ExceptionClass::Of<EShop>()) << "the first";
  EXPECT_FALSE(ZqGetExceptionClass(u"Shop", 1) || ZqGetExceptionClass(u"shop", 2));
  EXPECT_EQ(ZqGetExceptionClassByName(u"eSHOPclosed"), ExceptionClass::Of<EShopClosed>());
  const UnicodeString Clash = u": ErrorCode 1 is already in use by EShop!; (common/uZqSysUtils, line ";
  for (const char16_t* const Group : {u"shop", u""})
    EXPECT_GT(RaisedBy([&] { ZqRegisterExceptionClass(Group, 1, EZqAbortClass::Of<EShopClosed>()); }).Pos(Clash), 1);
  ZqRegisterExceptionClass(u"", 1, EZqExceptionClass::Of<EShop>());
  TScriptedDesktop Desktop;  // the development environment is open, which lets a clash pass
  EXPECT_CALL(Desktop, FindWindow(_, testing::IsNull())).Times(3).WillRepeatedly(Return(false));
  EXPECT_CALL(Desktop, FindWindow(_, testing::NotNull())).WillOnce(Return(true));
  EXPECT_NO_THROW(ZqRegisterExceptionClass(u"shop", 1, EZqAbortClass::Of<EShopClosed>()));
  EXPECT_EQ(ZqGetExceptionClass(u"shop", 1), ExceptionClass::Of<EShop>());
  EXPECT_EQ(uZqSysUtils::ExceptionClassList->Count(), 2);
  uZqSysUtils::Stop();
  EXPECT_EQ(uZqSysUtils::ExceptionClassList, nullptr);
}

TEST(CodedException, KeepsItsCodeThroughEveryConstructor) {
  EXPECT_EQ(EShop(u"%d%%", {5}).Message(), u"5%") << "arguments in braces are no code";
  EXPECT_EQ(EShopClosed(EShopClosed(u"%s", {u"x"}, 6)).ErrorCode() + EShop(u"", 1).ErrorCode(), 7);
  const ExceptionRef Made = EZqAbortClass::Of<EShopClosed>().CreateFmt(u"%s!", {u"y"}, 8);
  EXPECT_EQ(Made->Message(), u"y!");
  EXPECT_EQ(dynamic_cast<EShopClosed&>(*Made.Get()).ErrorCode(), 8);
  EXPECT_THROW(std::ignore = ExceptionClass().Create(u"m", 1), EInvalidOperation);
}

// ---- Texts ---------------------------------------------------------------------------------------------------------

TEST(CharCase, OfEveryModeInBothWidths) {
  const std::pair<TZqCharCase, UnicodeString> cCases[] = {{rcNormal, u"hELLO \u00E4\u00D6 wORLD"},
      {rcUpperCase, u"HELLO \u00C4\u00D6 WORLD"}, {rcLowerCase, u"hello \u00E4\u00F6 world"},
      {rcTitleCase, u"Hello \u00E4\u00F6 world"}, {rcUpperCamelCase, u"Hello \u00C4\u00F6 World"},
      {rcLowerCamelCase, u"hello \u00C4\u00F6 World"}, {rcUpperCaseFirstLetter, u"HELLO \u00E4\u00D6 wORLD"},
      {rcLowerCaseFirstLetter, u"hELLO \u00E4\u00D6 wORLD"}};
  const TAnsiCodePageScope Ansi(1252);
  for (const auto& [Case, Want] : cCases) {
    EXPECT_EQ(ZqCharCase(u"hELLO \u00E4\u00D6 wORLD", Case, u" "), Want);
    const TBytes Bytes = TEncoding::ANSI().GetBytes(Want);
    EXPECT_EQ(ZqCharCase("hELLO \xE4\xD6 wORLD", Case, " "), std::string(Bytes.begin(), Bytes.end()));
    EXPECT_EQ(ZqCharCase(u"", Case), u"");
  }
  EXPECT_EQ(ZqCharCase(u"ÄB", rcLowerCaseFirstLetter) + ZqCharCase(u"-a-b", rcLowerCamelCase, u"-"), u"äB-A-B");
  EXPECT_EQ(ZqCharCase(u"\U00010428\U00010428", rcTitleCase), u"\U00010400\U00010428") << "a pair is one character";
  EXPECT_EQ(ZqCharCase(u"\U00010428\U00010428", rcUpperCamelCase), u"\U00010400\U00010428");
}

TEST(StringIncrement, AndAgeGoByTheLocalYear) {
  const TScriptedClock Clock(1640993400LL * 1000000, 3600);  // 2022-01-01 00:30, still 2021 by UTC
  EXPECT_EQ(ZqStringIncrement(u"", 5) + ZqStringIncrement(u" \t ", -3), u"202200001202200001");
  EXPECT_EQ(ZqAge(EncodeDate(2000, 1, 1)), 22);
  EXPECT_EQ(ZqAge(EncodeDate(2000, 1, 2)), 21);
  EXPECT_EQ(ZqAge(0) + ZqAge(-20000), 0);
}

TEST(StringIncrement, CountsTheDigitsAtTheEnd) {
  const std::tuple<UnicodeString, Integer, UnicodeString> cCases[] = {{u"INV0099", 1, u"INV0100"}, {u"A9", 1, u"A10"},
      {u"A00", -1, u"A-1"}, {u"A000", -1, u"A0-1"}, {u"007", 1, u"008"}, {u"1A2", 0, u"1A2"}, {u"$5", 5, u"$10"},
      {u"2147483647", 1, u"2147483648"}};
  for (const auto& [Value, Increment, Want] : cCases) EXPECT_EQ(ZqStringIncrement(Value, Increment), Want);
  for (const char16_t* const Bad : {u"A1 ", u"A", u"A2147483648", u"\u0661"})
    EXPECT_THROW(std::ignore = ZqStringIncrement(Bad, 1), EConvertError);
}

TEST(Lists, TokensSplitOnceAtARunOfDelimiters) {
  TStringList List, Delimiters;
  ZqTokenize(u"  ", &List, u"", &Delimiters);
  ZqTokenize(u"a b-_c~!@#$%^&*()-=+\\|]}[{'\";:/?.>,<d`", &List);
  EXPECT_EQ(List.Text(), u"a\r\nb\r\n_c\r\nd`\r\n");
  ZqTokenize(u"-e,-f", &List, u",-", &Delimiters);
  EXPECT_EQ(List.Text(), u"a\r\nb\r\n_c\r\nd`\r\ne\r\nf\r\n") << "it is not cleared";
  EXPECT_EQ(Delimiters.Text(), u" \r\n \r\n-\r\n,\r\n-\r\n");
}

TEST(Lists, SplitAndJoin) {
  TStringList List;
  EXPECT_EQ(ZqListToString(&List, u","), u"");
  ZqStringToList(u"a,,b,", u",", &List);
  ZqStringToList(u"", u",", &List);
  ZqStringToList(u"x::y", u"::", &List);
  EXPECT_EQ(ZqListToString(&List, u",") + ZqListToString(&List, u", "), u"a,,b,,,x,y a, , b, , , x, y");
  List.Add(StringOfChar(u'z', 1000000));
  EXPECT_EQ(ZqListToString(&List, u",").Length(), 999999);
}

TEST(Replace, LaterPairMeetsWhatAnEarlierPutIn) {
  EXPECT_EQ(ZqStringReplace(u"aBa", {u"a", u"b"}, {u"b", u"c"}, {rfReplaceAll}), u"cBc");
  const TArray<UnicodeString> Old{u"a"};
  EXPECT_EQ(ZqStringReplace(u"aa", Old, Old, {}), u"aa");
  EXPECT_THROW(std::ignore = ZqStringReplace(u"a", Old, {}, {}), EAssertionFailed);
}

TEST(Trimming, TakesAllOrLeavesTheLastCharacter) {
  using TText = const char16_t*;
  const std::tuple<TText, TText, TText, TText, TText> cCases[] = {{u"", u"", u"", u"", u""},
      {u"\t \n", u"", u"\n", u"\t", u"\n"}, {u" a ", u"a", u"a ", u" a", u"a"},
      {u"\"\"", u"\"\"", u"\"\"", u"\"\"", u"\""}, {u"'abc'", u"'abc'", u"'abc'", u"'abc'", u"abc"},
      {u" \"a'b\" ", u"\"a'b\"", u"\"a'b\" ", u" \"a'b\"", u"a'b"},
      {u"\u00A0", u"\u00A0", u"\u00A0", u"\u00A0", u"\u00A0"}};
  for (const auto& [Text, Trim, Left, Right, Literals] : cCases) {
    EXPECT_EQ(ZqTrim(UnicodeString(Text)), Trim);
    EXPECT_EQ(ZqTrimLeft(Text) + u"|" + ZqTrimRight(Text), Left + UnicodeString(u"|") + Right);
    EXPECT_EQ(ZqStripLiterals(Text), Literals);
    EXPECT_EQ(ZqTrim(AnsiString(ToUTF8(Text))), ToUTF8(Trim)) << "a byte of 128 or above is no blank";
  }
}

TEST(CutAndPad, KeepsToTheLength) {
  const std::pair<UnicodeString, const char16_t*> cCases[] = {{ZqRight(u"abc", 2), u"bc"}, {ZqRight(u"abc", 5), u"abc"},
      {ZqRight(u"abc", std::numeric_limits<Integer>::min()), u""}, {ZqPadLeft(u"abc", 2, u'x'), u"abc"},
      {ZqPadLeft(u"abc", 5, u'\0'), u"  abc"}, {ZqPadRight(u"abc", 5, u'x'), u"abcxx"},
      {ZqPadLeft(-5, 4, u'0'), u"00-5"}, {ZqPadLeft(Int64{1} << 40, 14, u' '), u" 1099511627776"}};
  for (const auto& [Text, Want] : cCases) EXPECT_EQ(Text, Want);
  EXPECT_EQ(ZqAnsiCopy("\xC3\xA4z", 2, 9), "\xA4z");
}

TEST(Characters, OfAWideTextNeverAliasANarrowOne) {
  for (const char c : std::string_view("\n\r ),;")) EXPECT_TRUE(ZqIsNameDelimiter(c) && ZqIsNameDelimiter(WideChar(c)));
  EXPECT_FALSE(ZqIsNameDelimiter('(') || ZqIsNameDelimiter(u'\u0120') || ZqIsLiteral('`') || ZqIsLiteral(u'\u0122'));
  EXPECT_FALSE(ZqCharInSet(u'\u0141', {'A'}));
  EXPECT_TRUE(ZqCharInSet(u'\u00C4', {'\xC4'}) && ZqCharInSet('\xC4', {'\xC4'}) && ZqIsLiteral('"'));
}

TEST(Comparisons, OfTexts) {
  EXPECT_TRUE(ZqStrInSet(u"b", {u"a", u"b"}) && !ZqStrInSet(u"B", {u"a", u"b"}) && !ZqStrInSet(u"", {}));
  EXPECT_TRUE(ZqLastPos(u"a.b.c", u'.') == 4 && ZqLastPos(u"abc", u'.') == 0);
  EXPECT_TRUE(ZqContainsText(u"B", u"abc") && ZqContainsText("B", "abc"));
  EXPECT_FALSE(ZqContainsText(u"abc", u"B") || ZqContainsText("\xC3\x84", "\xC3\xA4"));
  EXPECT_TRUE(ZqSameText(u"aB", u"Ab") && ZqSameText("aB", "Ab") && ZqSameTrimmedText(u" aB\n", u"\tAb"));
  EXPECT_FALSE(ZqSameText(u"a ", u"a") || ZqSameText("\xC3\x84", "\xC3\xA4"));
}

TEST(Comparisons, OfVariants) {
  EXPECT_TRUE(ZqSameVar(1, 1) && ZqSameVar(Null(), Null()));
  EXPECT_FALSE(ZqSameVar(1, 1.0) || ZqSameVar(1, 2) || ZqSameVar(Null(), Variant()));
  const Variant Short = VarArrayOf({1, u"2"}), Long = VarArrayOf({1.0, 2, 3});
  EXPECT_TRUE(ZqSameArray(Short, Long) && ZqSameArray(VarArrayOf({}), 5));
  EXPECT_FALSE(ZqSameArray(Long, Short) || ZqSameArray(VarArrayOf({1, 4}), Long) || ZqSameArray(Short, 5));
}

// ---- Small utilities -----------------------------------------------------------------------------------------------

TEST(Round, PutsDecimalHalvesAwayFromZero) {
  const std::tuple<double, Integer, double> cCases[] = {{1.005, 2, 1.01}, {-1.005, 2, -1.01}, {1234.5675, 3, 1234.568},
      {1.00499999999999, 2, 1.0}, {2.345, 2, 2.35}, {-2.345, 2, -2.35}, {2.344, 2, 2.34}, {0.5, 0, 1}, {-0.5, 0, -1},
      {2.5, 0, 3}, {0.999, 2, 1}, {1234567890.126, 2, 1234567890.13}, {5e15, 0, 5e15}, {1e300, 5, 1e300}, {0, 3, 0},
      {0.125, 18, 0.125}};
  for (const auto& [Value, Digits, Want] : cCases) EXPECT_EQ(ZqRound(Value, Digits), Want) << Value;
  EXPECT_EQ(ZqRound(1.005L, 2), 1 + 1 / 100.0L);
  EXPECT_EQ(ZqRound(9007199254740993.25L, 1), 9007199254740993.0L + 3 / 10.0L) << "not by way of a double";
}

TEST(Bits, CountFromOne) {
  EXPECT_TRUE(ZqIsBitChecked(5, 1) && ZqIsBitChecked(5, 3) && ZqIsBitChecked(-1, 32));
  EXPECT_FALSE(ZqIsBitChecked(5, 2) || ZqIsBitChecked(-1, 33) || ZqIsBitChecked(-1, 0) || ZqIsBitChecked(1, 32));
}

TEST(MimeType, IsReadUnderTheLowerCaseExtension) {
  TScriptedRegistry Registry;
  Registry.Keys[u"HKCR\\.txt"][u"Content Type"] = {REG_SZ, {'t', 0, '/', 0, 'p', 0, 0, 0}};
  EXPECT_EQ(ZqGetFileMimeType(u"dir.d/A.TXT") + ZqGetFileMimeType(u"dir.d/noext"), u"t/p");
}

// A program file with that machine and signature, whose second header stands at AHeaderAt.
std::string ProgramFile(std::uint16_t AMachine, unsigned char AHeaderAt = 128, std::string_view ASignature = "PE") {
  std::string Result(128 + 248, '\0');
  Result.replace(0, 2, "MZ");
  Result[60] = static_cast<char>(AHeaderAt);
  Result.replace(128, ASignature.size(), ASignature);
  Result[132] = static_cast<char>(AMachine & 0xFF);
  Result[133] = static_cast<char>(AMachine >> 8);
  return Result;
}

TEST(BitnessOfAFile, IsReadFromItsHeaders) {
  const TTempFolder Folder;
  const auto Is64Bit = [&](const std::string& AContent) {
    Folder.Write("file", AContent);
    return Is64BitFile(Folder.File("file"));
  };
  EXPECT_TRUE(Is64Bit(ProgramFile(0x8664)));
  for (const std::string& No : {ProgramFile(0x14C), ProgramFile(0x8664, 0).substr(0, 64),
           ProgramFile(0x8664, 128, "NE"), ProgramFile(0x8664, 128, "PE\1"), std::string(400, 'M')})
    EXPECT_FALSE(Is64Bit(No));
  for (const std::size_t Size : {63U, 375U}) EXPECT_THROW(Is64Bit(ProgramFile(0x8664).substr(0, Size)), EReadError);
  EXPECT_FALSE(Is64BitFile(u"sh")) << "found along the search path";
  TScriptedFiles Files;
  EXPECT_CALL(Files, SearchPath(Eq(u"no/file"))).WillOnce(Return(u""));
  EXPECT_EQ(RaisedBy([] { (void)Is64BitFile(u"no/file"); }),
      u"EFOpenError: Cannot open file \"no/file\". No such file or directory");
}

TEST(Resources, OfTheLibraryGoBeforeThoseOfTheProgram) {
  TScriptedResources System;
  const testing::InSequence InThisOrder;
  for (const HINST Module : {HInstance(), MainInstance()})
    EXPECT_CALL(System, FindResource(Module, Eq(u"LOGO"), Eq(u"#10"))).WillOnce(Return(false));
  EXPECT_EQ(RaisedBy([] { (void)ZqGetResource(u"LOGO", RT_RCDATA); }),
      u"Exception: There is no resource with the name: LOGO");
  for (const HINST Module : {HInstance(), MainInstance()})
    EXPECT_CALL(System, FindResource(Module, Eq(u"LOGO"), Eq(u"#10"))).WillOnce(Return(Module == MainInstance()));
  EXPECT_CALL(System, LoadResource(MainInstance(), Eq(u"LOGO"), Eq(u"#10"))).WillOnce(Return(TBytes{'P', 'N', 'G'}));
  EXPECT_EQ(ZqGetResource(u"LOGO", RT_RCDATA)->Size(), 3);
}

TEST(ProcessFacts, ThatTheSystemDoesNotTellAreNot) {
  TScriptedProcess System;
  for (const std::optional<bool> Told : {std::optional<bool>(), {false}, {true}}) {
    EXPECT_CALL(System, IsWow64Process).WillOnce(Return(Told));
    EXPECT_CALL(System, IsDebuggerPresent).WillOnce(Return(Told));
    EXPECT_EQ(IsWow64(), Told == true);
    EXPECT_EQ(ZqIsDebuggerPresent(), Told == true);
  }
}

TEST(UserAndComputer, EachStepThatFailsIsNamed) {
  TScriptedUsers System;
  EXPECT_CALL(System, LookupTokenUser).WillOnce(DoAll(SetArgReferee<0>(u"bob"), SetArgReferee<1>(u"shop")));
  UnicodeString Text;
  EXPECT_EQ(ZqGetUserName(Text) + u"@" + Text, u"bob@shop");
  EXPECT_CALL(System, LoadNetApi).WillOnce(Return(false)).WillRepeatedly(Return(true));
  EXPECT_CALL(System, HasServerGetInfo).WillOnce(Return(false)).WillRepeatedly(Return(true));
  EXPECT_CALL(System, NetServerGetInfo).WillOnce(Return(5)).WillOnce(DoAll(SetArgReferee<0>(u"till"), Return(0)));
  for (const char16_t* const Want :
      {u"EAssertionFailed: The ZqGetComputerDescription is not supported by your version of Windows (common/uZqSys",
          u"Exception: Failed to locate API funtion.", u"Exception: Failed to execute the NetServerGetInfo funtion.",
          u"nothing"})
    EXPECT_EQ(RaisedBy([&] { Text = ZqGetComputerDescription(); }).Pos(Want), 1);
  EXPECT_EQ(Text, u"till");
}

}  // namespace
}  // namespace zq
