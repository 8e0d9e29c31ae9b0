#include "common/uZqSysUtils.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "runtime/containers/lists.h"
#include "runtime/containers/string_list.h"
#include "runtime/platform/clock.h"
#include "runtime/platform/desktop_service.h"
#include "runtime/platform/registry_service.h"
#include "runtime/platform/resource_service.h"
#include "runtime/platform/user_service.h"
#include "runtime/text/datetime.h"
#include "runtime/text/encoding.h"
#include "tests/support/support.h"

namespace zq {
namespace {

using testing::_;
using testing::DoAll;
using testing::Return;
using testing::SetArgReferee;
using testing::StrictMock;

UnicodeString MessageOf(const std::function<void()>& ACall) {
  try {
    ACall();
    return u"no exception";
  } catch (const Exception& e) {
    return e.Message();
  }
}

// ---- Coded exceptions ----------------------------------------------------------------------------------------------

struct EShop : EZqException {
  using EZqException::EZqException;
};
struct EShopClosed : EZqAbort {
  using EZqAbort::EZqAbort;
};

// Has the first window that is asked for.
struct TScriptedDesktop : TDesktopService {
  bool FindWindow(const char16_t* AClass, const char16_t* ATitle) override {
    Asked.push_back(AClass + UnicodeString(u"/") + (ATitle == nullptr ? u"any" : ATitle));
    return Asked.size() == 1;
  }
  std::vector<UnicodeString> Asked;
};

class ExceptionRegistry : public testing::Test {
 protected:
  ~ExceptionRegistry() override { uZqSysUtils::Stop(); }
};

TEST_F(ExceptionRegistry, FindsByGroupAndCodeAndThroughTheEmptyGroupTheFirst) {
  EXPECT_FALSE(ZqGetExceptionClass(u"", 1) || ZqGetExceptionClassByName(u"EShop"));
  EXPECT_EQ(uZqSysUtils::ExceptionClassList, nullptr) << "a lookup makes no list";
  ZqRegisterExceptionClass(u"shop", 1, EZqExceptionClass::Of<EShop>());
  ZqRegisterExceptionClass(u"door", 1, EZqAbortClass::Of<EShopClosed>());
  EXPECT_EQ(ZqGetExceptionClass(u"shop", 1), ExceptionClass::Of<EShop>());
  EXPECT_EQ(ZqGetExceptionClass(u"door", 1), ExceptionClass::Of<EShopClosed>());
  EXPECT_EQ(ZqGetExceptionClass(u"", 1), ExceptionClass::Of<EShop>());
  EXPECT_FALSE(ZqGetExceptionClass(u"Shop", 1) || ZqGetExceptionClass(u"shop", 2));
  EXPECT_EQ(ZqGetExceptionClassByName(u"eSHOPclosed"), ExceptionClass::Of<EShopClosed>());
  uZqSysUtils::Stop();
  EXPECT_EQ(uZqSysUtils::ExceptionClassList, nullptr);
}

TEST_F(ExceptionRegistry, AnotherClassForACodeInUseIsRefused) {
  ZqRegisterExceptionClass(u"shop", 7, EZqExceptionClass::Of<EShop>());
  for (const char16_t* const Group : {u"shop", u""}) {
    const UnicodeString Message =
        MessageOf([&] { ZqRegisterExceptionClass(Group, 7, EZqAbortClass::Of<EShopClosed>()); });
    EXPECT_EQ(Message.Pos(u"ErrorCode 7 is already in use by EShop!; (common/uZqSysUtils, line "), 1)
        << ToUTF8(Message);
  }
  ZqRegisterExceptionClass(u"", 7, EZqExceptionClass::Of<EShop>());
  EXPECT_EQ(uZqSysUtils::ExceptionClassList->Count(), 1);
}

TEST_F(ExceptionRegistry, ClashIsLetPassWhileTheDevelopmentEnvironmentIsOpen) {
  TScriptedDesktop Desktop;
  const TPlatformOverride<TDesktopService> Fake(Desktop);
  ZqRegisterExceptionClass(u"shop", 7, EZqExceptionClass::Of<EShop>());
  EXPECT_NO_THROW(ZqRegisterExceptionClass(u"shop", 7, EZqAbortClass::Of<EShopClosed>()));
  EXPECT_EQ(ZqGetExceptionClass(u"shop", 7), ExceptionClass::Of<EShop>());
  EXPECT_EQ(Desktop.Asked, (std::vector<UnicodeString>{u"TApplication/Delphi", u"TAlignPalette/any",
                               u"TPropertyInspector/any", u"TAppBuilder/any"}));
}

TEST(CodedException, KeepsItsCodeThroughEveryConstructor) {
  EXPECT_EQ(EShop(u"%d%%", {5}).Message(), u"5%") << "arguments in braces are no code";
  EXPECT_EQ(EShopClosed(EShopClosed(u"%s", {u"x"}, 6)).ErrorCode(), 6);
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
  EXPECT_EQ(ZqCharCase(u"-a-b", rcLowerCamelCase, u"-"), u"-A-B");
  EXPECT_EQ(ZqCharCase(u"\U00010428\U00010428", rcTitleCase), u"\U00010400\U00010428") << "a pair is one character";
  EXPECT_EQ(ZqCharCase(u"\U00010428\U00010428", rcUpperCamelCase), u"\U00010400\U00010428");
}

struct TMockClock : TClockService {
  MOCK_METHOD(Int64, UtcMicroseconds, (), (override));
  MOCK_METHOD(Integer, UtcOffsetSeconds, (Int64), (override));
};

class AtTheTurnOfTheYear : public testing::Test {
 protected:
  AtTheTurnOfTheYear() {  // 2021-12-31 23:30 UTC, an hour later on the local clock
    ON_CALL(FClock, UtcMicroseconds).WillByDefault(Return(1640993400LL * 1000000));
    ON_CALL(FClock, UtcOffsetSeconds).WillByDefault(Return(3600));
    TTimeZone::Refresh();
  }
  ~AtTheTurnOfTheYear() override { TTimeZone::Refresh(); }
  testing::NiceMock<TMockClock> FClock;
  TPlatformOverride<TClockService> FFake{FClock};
};

TEST_F(AtTheTurnOfTheYear, YearAndAgeAreThoseOfTheLocalDay) {
  EXPECT_EQ(ZqStringIncrement(u"", 5), u"202200001");
  EXPECT_EQ(ZqStringIncrement(u" \t ", -3), u"202200001");
  EXPECT_EQ(ZqAge(EncodeDate(2000, 1, 1)), 22);
  EXPECT_EQ(ZqAge(EncodeDate(2000, 1, 2)), 21);
  EXPECT_EQ(ZqAge(EncodeDate(2000, 12, 1)), 21);
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

TEST(Tokens, SplitOnceAtARunOfDelimiters) {
  TStringList List;
  TStringList Delimiters;
  ZqTokenize(u"  ", &List, u"", &Delimiters);
  EXPECT_EQ(List.Count(), 0);
  EXPECT_EQ(Delimiters.Text(), u" \r\n \r\n");
  ZqTokenize(u"a b-_c~!@#$%^&*()-=+\\|]}[{'\";:/?.>,<`d", &List);
  EXPECT_EQ(List.Text(), u"a\r\nb\r\n_c\r\nd\r\n");
  ZqTokenize(u"-e,-f", &List, u",-", &Delimiters);
  EXPECT_EQ(List.Text(), u"a\r\nb\r\n_c\r\nd\r\ne\r\nf\r\n") << "it is not cleared";
  EXPECT_EQ(Delimiters.Text(), u" \r\n \r\n-\r\n,\r\n-\r\n");
}

TEST(Lists, SplitAndJoin) {
  TStringList List;
  EXPECT_EQ(ZqListToString(&List, u","), u"");
  ZqStringToList(u"a,,b,", u",", &List);
  ZqStringToList(u"", u",", &List);
  ZqStringToList(u"x::y", u"::", &List);
  ASSERT_EQ(List.Count(), 7);
  EXPECT_EQ(ZqListToString(&List, u","), u"a,,b,,,x,y");
  EXPECT_EQ(ZqListToString(&List, u", "), u" a, , b, , , x, y");
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
  const struct {
    const char16_t *Text, *Trim, *Left, *Right, *Literals;
  } cCases[] = {{u"", u"", u"", u"", u""}, {u"\t \n", u"", u"\n", u"\t", u"\n"}, {u" a ", u"a", u"a ", u" a", u"a"},
      {u"\"\"", u"\"\"", u"\"\"", u"\"\"", u"\""}, {u"'abc'", u"'abc'", u"'abc'", u"'abc'", u"abc"},
      {u" \"a'b\" ", u"\"a'b\"", u"\"a'b\" ", u" \"a'b\"", u"a'b"},
      {u"\u00A0", u"\u00A0", u"\u00A0", u"\u00A0", u"\u00A0"}};
  for (const auto& Case : cCases) {
    EXPECT_EQ(ZqTrim(UnicodeString(Case.Text)), Case.Trim);
    EXPECT_EQ(ZqTrimLeft(Case.Text), Case.Left);
    EXPECT_EQ(ZqTrimRight(Case.Text), Case.Right);
    EXPECT_EQ(ZqStripLiterals(Case.Text), Case.Literals);
    EXPECT_EQ(ZqTrim(AnsiString(ToUTF8(Case.Text))), ToUTF8(Case.Trim)) << "a byte of 128 or above is no blank";
  }
}

TEST(CutAndPad, KeepsToTheLength) {
  EXPECT_EQ(ZqRight(u"abc", 2), u"bc");
  EXPECT_EQ(ZqRight(u"abc", 5), u"abc");
  EXPECT_EQ(ZqRight(u"abc", std::numeric_limits<Integer>::min()), u"");
  EXPECT_EQ(ZqPadLeft(u"abc", 2, u'x'), u"abc");
  EXPECT_EQ(ZqPadLeft(u"abc", 5, u'\0'), u"  abc");
  EXPECT_EQ(ZqPadRight(u"abc", 5, u'x'), u"abcxx");
  EXPECT_EQ(ZqPadLeft(-5, 4, u'0'), u"00-5");
  EXPECT_EQ(ZqPadLeft(Int64{1} << 40, 14, u' '), u" 1099511627776");
  EXPECT_EQ(ZqAnsiCopy("\xC3\xA4z", 2, 9), "\xA4z");
}

TEST(Characters, OfAWideTextNeverAliasANarrowOne) {
  for (const char c : std::string_view("\n\r ),;")) EXPECT_TRUE(ZqIsNameDelimiter(c) && ZqIsNameDelimiter(WideChar(c)));
  EXPECT_FALSE(ZqIsNameDelimiter('(') || ZqIsNameDelimiter(u'\u0120') || ZqIsLiteral('`') || ZqIsLiteral(u'\u0122'));
  EXPECT_FALSE(ZqCharInSet(u'\u0141', {'A'}));
  EXPECT_TRUE(ZqCharInSet(u'\u00C4', {'\xC4'}) && ZqCharInSet('\xC4', {'\xC4'}) && ZqIsLiteral('"'));
}

TEST(Comparisons, OfTexts) {
  EXPECT_TRUE(ZqStrInSet(u"b", {u"a", u"b"}));
  EXPECT_FALSE(ZqStrInSet(u"B", {u"a", u"b"}) || ZqStrInSet(u"", {}));
  EXPECT_EQ(ZqLastPos(u"a.b.c", u'.'), 4);
  EXPECT_EQ(ZqLastPos(u"abc", u'.'), 0);
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
  EXPECT_FALSE(ZqSameArray(Long, Short) || ZqSameArray(VarArrayOf({1, 4}), Long));
  EXPECT_FALSE(ZqSameArray(Short, 5) || ZqSameArray(5, Short));
}

TEST(If, TakesTheOverloadOfItsArguments) {
  EXPECT_EQ(ZqIf(true, u"a", u"b"), u"a");
  EXPECT_EQ(ZqIf(false, UnicodeString(u"a"), u"b"), u"b");
  static_assert(ZqIf(false, u'a', u'b') == u'b' && ZqIf(true, 1, 2) == 1 && ZqIf(false, 1.5, 2.5) == 2.5);
  static_assert(std::same_as<decltype(ZqIf(true, true, false)), bool> && !ZqIf(false, true, false));
  EXPECT_EQ(VarType(ZqIf(true, Variant(u"a"), 5)), varUString);
}

// ---- Small utilities -----------------------------------------------------------------------------------------------

TEST(Round, PutsDecimalHalvesAwayFromZero) {
  const std::tuple<const char*, double, Integer, double> cCases[] = {{"hidden half", 1.005, 2, 1.01},
      {"negative hidden half", -1.005, 2, -1.01}, {"hidden behind more digits", 1234.5675, 3, 1234.568},
      {"no half", 1.00499999999999, 2, 1.0}, {"visible half", 2.345, 2, 2.35}, {"negative", -2.345, 2, -2.35},
      {"below the half", 2.344, 2, 2.34}, {"half alone", 0.5, 0, 1}, {"negative half alone", -0.5, 0, -1},
      {"not to even", 2.5, 0, 3}, {"carry", 0.999, 2, 1}, {"large whole part", 1234567890.126, 2, 1234567890.13},
      {"no fraction", 5e15, 0, 5e15}, {"beyond the digits", 1e300, 5, 1e300}, {"zero", 0, 3, 0},
      {"many digits", 0.125, 18, 0.125}};
  for (const auto& [Name, Value, Digits, Want] : cCases) EXPECT_EQ(ZqRound(Value, Digits), Want) << Name;
  EXPECT_EQ(ZqRound(1.005L, 2), 1 + 1 / 100.0L);
  EXPECT_EQ(ZqRound(-0.5L, 0), -1.0L);
  EXPECT_EQ(ZqRound(9007199254740993.25L, 1), 9007199254740993.0L + 3 / 10.0L) << "not by way of a double";
}

TEST(Bits, CountFromOne) {
  EXPECT_TRUE(ZqIsBitChecked(5, 1) && ZqIsBitChecked(5, 3) && ZqIsBitChecked(-1, 32));
  EXPECT_FALSE(ZqIsBitChecked(5, 2) || ZqIsBitChecked(-1, 33) || ZqIsBitChecked(-1, 0) || ZqIsBitChecked(1, 32));
}

struct TMockRegistry : TRegistryService {
  MOCK_METHOD(Integer, RegOpenKeyEx, (HKEY, const UnicodeString&, Cardinal, HKEY&), (override));
  MOCK_METHOD(Integer, RegCreateKeyEx, (HKEY, const UnicodeString&, Cardinal, HKEY&), (override));
  MOCK_METHOD(Integer, RegQueryValueEx, (HKEY, const UnicodeString&, Cardinal&, TBytes&), (override));
  MOCK_METHOD(Integer, RegSetValueEx, (HKEY, const UnicodeString&, Cardinal, const TBytes&), (override));
  MOCK_METHOD(void, RegCloseKey, (HKEY), (override));
};

TEST(MimeType, IsReadUnderTheLowerCaseExtension) {
  StrictMock<TMockRegistry> Registry;
  const TPlatformOverride<TRegistryService> Fake(Registry);
  const UnicodeString Extension = u".txt";
  EXPECT_CALL(Registry, RegOpenKeyEx(HKEY_CLASSES_ROOT, Extension, KEY_READ, _))
      .WillOnce(DoAll(SetArgReferee<3>(HKEY{77}), Return(ERROR_SUCCESS)));
  EXPECT_CALL(Registry, RegQueryValueEx(77, UnicodeString(u"Content Type"), _, _))
      .WillOnce(DoAll(
          SetArgReferee<2>(REG_SZ), SetArgReferee<3>(TBytes{'t', 0, '/', 0, 'p', 0, 0, 0}), Return(ERROR_SUCCESS)));
  EXPECT_CALL(Registry, RegCloseKey(77));
  EXPECT_EQ(ZqGetFileMimeType(u"dir.d/A.TXT"), u"t/p");
  EXPECT_EQ(ZqGetFileMimeType(u"dir.d/noext"), u"");
}

struct TMockResources : TResourceService {
  MOCK_METHOD(bool, FindResource, (HINST, const UnicodeString&, const UnicodeString&), (override));
  MOCK_METHOD(std::optional<TBytes>, LoadResource, (HINST, const UnicodeString&, const UnicodeString&), (override));
};

TEST(Resources, AreLookedForInTheLibraryAndThenInTheProgram) {
  StrictMock<TMockResources> Resources;
  const TPlatformOverride<TResourceService> Fake(Resources);
  const UnicodeString Name = u"LOGO", Type = RT_RCDATA;
  const testing::InSequence Order;
  EXPECT_CALL(Resources, FindResource(HInstance(), Name, Type)).WillOnce(Return(false));
  EXPECT_CALL(Resources, FindResource(MainInstance(), Name, Type)).WillOnce(Return(true));
  EXPECT_CALL(Resources, LoadResource(MainInstance(), Name, Type)).WillOnce(Return(TBytes{1, 2, 3}));
  EXPECT_EQ(ZqGetResource(Name, RT_RCDATA)->Size(), 3);
  EXPECT_CALL(Resources, FindResource).Times(4).WillRepeatedly(Return(false));
  EXPECT_EQ(ZqFindResource(Name, RT_RCDATA), nullptr);
  EXPECT_EQ(
      MessageOf([&] { std::ignore = ZqGetResource(Name, RT_RCDATA); }), u"There is no resource with the name: LOGO");
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
  const std::tuple<const char*, std::string, bool> cCases[] = {{"64", ProgramFile(0x8664), true},
      {"32", ProgramFile(0x14C), false}, {"offset 0", ProgramFile(0x8664, 0).substr(0, 64), false},
      {"16", ProgramFile(0x8664, 128, "NE"), false}, {"signature", ProgramFile(0x8664, 128, "PE\1"), false},
      {"text", std::string(400, 'M'), false}};
  const TTempFolder Folder;
  for (const auto& [Name, Content, Want] : cCases) {
    Folder.Write(Name, Content);
    EXPECT_EQ(Is64BitFile(Folder.File(Name)), Want) << Name;
  }
  for (const std::size_t Size : {63U, 375U}) {
    Folder.Write("short", ProgramFile(0x8664).substr(0, Size));
    EXPECT_THROW(std::ignore = Is64BitFile(Folder.File("short")), EReadError) << Size;
  }
  EXPECT_FALSE(Is64BitFile(u"sh")) << "found along the search path";
  EXPECT_THROW(std::ignore = Is64BitFile(Folder.File("none")), EFOpenError);
}

struct TMockUsers : TUserService {
  MOCK_METHOD(UnicodeString, GetComputerName, (), (override));
  MOCK_METHOD(UnicodeString, GetUserName, (), (override));
  MOCK_METHOD(void, LookupTokenUser, (UnicodeString&, UnicodeString&), (override));
  MOCK_METHOD(bool, LoadNetApi, (), (override));
  MOCK_METHOD(bool, HasServerGetInfo, (), (override));
  MOCK_METHOD(Cardinal, NetServerGetInfo, (UnicodeString&), (override));
};

TEST(ComputerDescription, EachStepHasItsRefusal) {
  StrictMock<TMockUsers> Users;
  const TPlatformOverride<TUserService> Fake(Users);
  EXPECT_CALL(Users, LoadNetApi).WillOnce(Return(false)).WillRepeatedly(Return(true));
  EXPECT_CALL(Users, HasServerGetInfo).WillOnce(Return(false)).WillRepeatedly(Return(true));
  EXPECT_CALL(Users, NetServerGetInfo)
      .WillOnce(Return(5))
      .WillOnce(DoAll(SetArgReferee<0>(UnicodeString(u"till 3")), Return(0)));
  const auto Message = [] { return MessageOf([] { std::ignore = ZqGetComputerDescription(); }); };
  EXPECT_EQ(Message().Pos(u"The ZqGetComputerDescription is not supported by your version of Windows ("), 1);
  EXPECT_EQ(Message(), u"Failed to locate API funtion.");
  EXPECT_EQ(Message(), u"Failed to execute the NetServerGetInfo funtion.");
  EXPECT_EQ(ZqGetComputerDescription(), u"till 3");
}

}  // namespace
}  // namespace zq
