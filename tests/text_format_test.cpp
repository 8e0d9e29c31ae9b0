
#include <cmath>
#include <cstdlib>
#include <exception>
#include <stdexcept>
#include <system_error>

#include "runtime/text/casing.h"
#include "runtime/text/encoding.h"
#include "runtime/text/format.h"
#include "runtime/text/numbers.h"
#include "runtime/values/variants.h"
#include "tests/fakes/clock.h"
#include "tests/support/support.h"

// With LOCPATH set the system's newlocale leaks the search path that it makes of it.
extern "C" ZQ_API const char* __lsan_default_suppressions() { return "leak:__argz_add_sep\n"; }  // NOLINT

namespace zq {
namespace {

constexpr auto cMinInt64 = std::numeric_limits<Int64>::min();
constexpr auto cMaxUInt64 = std::numeric_limits<UInt64>::max();

TFormatSettings Comma() {
  TFormatSettings Result;
  Result.DecimalSeparator = u',';
  Result.ThousandSeparator = u'.';
  Result.CurrencyString = u"€";
  return Result;
}

TEST(TextFormat, FillsEachKindOfPlaceholder) {
  const std::pair<const char16_t*, UnicodeString> cCases[] = {{u"5% of -7", Format(u"%d%% of %d", {5, -7})},
      {u"-9223372036854775808 18446744073709551615", Format(u"%d %u", {cMinInt64, cMaxUInt64})},
      {u"4294967295 4294967295", Format(u"%u %d", {-1, 4294967295U})},
      {u"-00000042|   42|42   |", Format(u"%.8d|%5d|%-5d|", {-42, 42, 42})},
      {u"(-2147467259=0x80004005) (255=0x000000FF)",
          Format(u"(%0:d=0x%0:.8x) (%1:d=0x%1:.8X)", {static_cast<HRESULT>(0x80004005U), 255})},
      {u"FFFFFFFF FFFFFFFFFFFFFFFF FFFFFFFE", Format(u"%x %x %x", {-1, Int64{-1}, SmallInt{-2}})},
      {u"b a b", Format(u"%1:s %0:s %s", {u"a", u"b"})},
      {u"  abc|abc  |ab", Format(u"%*s|%-*s|%.*s", {5, u"abc", 5, u"abc", 2, u"abc"})},
      {u"3.14 -0.13 0.00 1235", Format(u"%f %f %f %.0f", {3.14159, -0.125, -0.001, 1234.5})},
      {u"1.50000000000000E+003 0.1 1.2", Format(u"%e %g %.2G", {1500.0, 0.1, 1.234})},
      {u"1,234,567.89", Format(u"%n", {1234567.891})},
      {u"0000ABCD 00000000", Format(u"%p %p", {reinterpret_cast<void*>(0xABCD), static_cast<TObject*>(nullptr)})},
      {u"ABCDEF012", Format(u"%p", {reinterpret_cast<void*>(0xABCDEF012)})},
      {u"TObject x 1.5", Format(u"%s %s %s", {ClassOf<TObject>(), u'x', Variant(1.5)})},
      {u"zażółć", Format(u"%s", {RawByteString("za\xBF\xF3\xB3\xE6", 1250)})}};
  for (const auto& [Expected, Text] : cCases) EXPECT_EQ(Text, Expected);
  const TVarRec Args[] = {1234.5, 1234.5, -1234.567};
  EXPECT_EQ(Format(u"%f %n %m", Args, Comma()), u"1234,50 1.234,50 -€1.234,57");
}

TEST(TextFormat, WhatDoesNotFitRaisesAndNamesTheFormat) {
  const std::pair<const char16_t*, TVarRec> cCases[] = {{u"%d", 1.5}, {u"%d", u"1"}, {u"%s", 1}, {u"%f", 1}, {u"%p", 1},
      {u"%x", true}, {u"%q", 1}, {u"%", 1}, {u"%5", 1}, {u"%.d", 1}, {u"%d %d", 1}, {u"%7:d", 1}, {u"%*d", u"x"},
      {u"%*d", -1}, {u"%99999999999999999999d", 1}};
  for (const auto& Case : cCases) {
    const UnicodeString Message = RaisedBy([&] { (void)Format(Case.first, {Case.second}); });
    EXPECT_TRUE(Message.Pos(u"EConvertError: ") == 1 && Message.Pos(u"'" + UnicodeString(Case.first) + u"'") != 0)
        << Message.ToUTF8();
  }
  EXPECT_THROW((Exception(u"%d", {u"x"})), EConvertError);
}

TEST(TextNumbers, ReadsIntegersUpToTheirLimits) {
  const std::tuple<const char16_t*, Int64, bool> cValid[] = {// true where it fits 32 bits too
      {u"12", 12, true}, {u"  -7", -7, true}, {u"+7", 7, true}, {u"$1F", 31, true}, {u"0xfF", 255, true},
      {u"-$10", -16, true}, {u"2147483647", 2147483647, true}, {u"-2147483648", -2147483648LL, true},
      {u"2147483648", 2147483648LL, false}, {u"-2147483649", -2147483649LL, false},
      {u"-9223372036854775808", cMinInt64, false}, {u"$FFFFFFFFFFFFFFFF", -1, false}};
  for (const auto& [Text, Value, IsInteger] : cValid) {
    Integer Small = 0;
    EXPECT_EQ(StrToInt64(Text), Value);
    EXPECT_EQ(TryStrToInt(Text, Small), IsInteger) << UnicodeString(Text).ToUTF8();
    EXPECT_EQ(Small, IsInteger ? Value : 0);
  }
  EXPECT_EQ(StrToInt(u"$FFFFFFFF"), -1);
  for (const char16_t* const Text : {u"", u"-", u"1 ", u"1.0", u"$", u"0x", u"$G", u"--1", u"١", u"9223372036854775808",
           u"-9223372036854775809", u"$10000000000000000"}) {
    EXPECT_EQ(RaisedBy([&] { (void)StrToInt64(Text); }),
        u"EConvertError: '" + UnicodeString(Text) + u"' is not a valid integer value");
    EXPECT_EQ(StrToIntDef(Text, 42), 42);
  }
}

TEST(TextNumbers, WritesIntegersAndTruth) {
  EXPECT_EQ(IntToStr(cMinInt64) + IntToStr(Byte{200}), u"-9223372036854775808200");
  EXPECT_EQ(IntToHex(-1) + IntToHex(0xABCU, 2) + IntToHex(0, 4), u"FFFFFFFFABC0000");
  EXPECT_EQ(BoolToStr(true) + BoolToStr(false) + BoolToStr(true, true) + BoolToStr(false, true), u"-10TrueFalse");
}

TEST(TextNumbers, FloatsHaveFifteenDigitsAndNoneTooMany) {
  constexpr bool cIs80Bit = std::numeric_limits<Extended>::digits == 64;
  const std::pair<Extended, const char16_t*> cCases[] = {{0.1 + 0.2, u"0.3"}, {0.0, u"0"}, {-0.0, u"0"}, {1.0, u"1"},
      {-1.5, u"-1.5"}, {100, u"100"}, {(1.005L - 1) * 1000, u"5"}, {4.999999999999893L, u"4.99999999999989"},
      {123456789012345.0, u"123456789012345"}, {1234567890123456.0, u"1.23456789012346E15"},
      {999999999999999.5, u"1E15"}, {0.0001, u"0.0001"}, {0.00001234, u"1.234E-5"}, {1e300, u"1E300"},
      {std::numeric_limits<Extended>::denorm_min(), cIs80Bit ? u"3.64519953188247E-4951" : u"6.47517511943803E-4966"},
      {HUGE_VALL, u"INF"}, {-HUGE_VALL, u"-INF"}, {std::nanl(""), u"NAN"}};
  for (const auto& [Value, Text] : cCases) EXPECT_EQ(FloatToStr(Value), Text);
}

TEST(TextNumbers, FloatFormatsRoundOnceAndAwayFromZero) {
  const std::tuple<Extended, TFloatFormat, Integer, Integer, const char16_t*> cCases[] = {{1.5, ffFixed, 8, 1, u"1,5"},
      {1024, ffFixed, 8, 1, u"1024,0"}, {0.125, ffFixed, 18, 2, u"0,13"}, {-0.125, ffFixed, 18, 2, u"-0,13"},
      {0.5, ffFixed, 18, 0, u"1"}, {1.45, ffFixed, 18, 1, u"1,4"}, {9.9996, ffFixed, 18, 3, u"10,000"},
      {0.0004, ffFixed, 18, 3, u"0,000"}, {-0.0004, ffFixed, 18, 3, u"0,000"}, {12345.678, ffFixed, 4, 2, u"1,235E4"},
      {12345.678, ffFixed, 6, 3, u"12345,700"}, {1234567.5, ffNumber, 18, 0, u"1.234.568"},
      {999.995, ffNumber, 18, 2, u"1.000,00"}, {-1000, ffCurrency, 18, 2, u"-€1.000,00"},
      {1234.5, ffExponent, 3, 4, u"1,23E+0003"}, {0.00012, ffExponent, 5, 0, u"1,2000E-4"},
      {0, ffExponent, 3, 2, u"0,00E+00"}, {12345.678, ffGeneral, 7, 0, u"12345,68"}};
  for (const auto& [Value, Format, Precision, Digits, Text] : cCases)
    EXPECT_EQ(FloatToStrF(Value, Format, Precision, Digits, Comma()), Text);
}

TEST(TextNumbers, ReadsFloats) {
  const std::pair<const char16_t*, Extended> cValid[] = {{u" 1,5 ", 1.5L}, {u"-,5", -0.5L}, {u"5,", 5}, {u"1e3", 1000},
      {u"1,5E-2", 0.015L}, {u"+12", 12}, {u"1.234,5", 1234.5L}, {u"1.234.567,", 1234567}, {u"0,1", 0.1L},
      {u"1E4932", 1e4932L}, {u"1E-4950", 1e-4950L}, {u"1E-5000", 0}};
  for (const auto& [Text, Value] : cValid) EXPECT_EQ(StrToFloat(Text, Comma()), Value);
  Extended Untouched = 7;
  for (const char16_t* const Text : {u"", u"-", u",", u"e5", u"1e", u"1.5", u"1.234", u"1.23,4", u"1234.567,8",
           u"1,5,5", u"1 5", u"0x10", u"inf", u"nan", u"1E5000", u"1,5.000"})
    EXPECT_TRUE(!TryStrToFloat(Text, Untouched, Comma()) && Untouched == 7) << UnicodeString(Text).ToUTF8();
  EXPECT_EQ(RaisedBy([] { (void)StrToFloat(u"1,2x"); }), u"EConvertError: '1,2x' is not a valid floating point value");
}

TEST(TextCasing, KeepsLengthInEveryScript) {
  EXPECT_EQ(AnsiUpperCase(u"straße éя ﬁ 𐐨 ÿ"), u"STRAßE ÉЯ ﬁ 𐐀 Ÿ");
  EXPECT_EQ(AnsiLowerCase(u"İSTANBUL ÉЯ 𐐀"), u"istanbul éя 𐐨");
  EXPECT_TRUE(AnsiSameText(u"Überfuhr", u"ÜBERFUHR") && !AnsiSameText(u"a", u"ä"));
}

// Settings of locales that are compiled for the test, since a system has few.
class TextLocale : public testing::Test {
 protected:
  bool Use(const std::string& ALocale) {
    std::string Source;
    for (const std::string Category : {"CTYPE", "COLLATE", "MESSAGES", "PAPER", "NAME", "ADDRESS", "TELEPHONE",
             "MEASUREMENT", "IDENTIFICATION", "TIME", "NUMERIC", "MONETARY"}) {
      const bool Own = Category == "TIME" || Category == "NUMERIC" || Category == "MONETARY";
      Source += "LC_" + Category + "\ncopy \"" + (Own ? ALocale : "POSIX") + "\"\nEND LC_" + Category + "\n";
    }
    Folder.Write("source", Source);
    const std::string Home = Folder.Path().string(), Name = ALocale + ".UTF-8";
    const std::string Command = "cd '" + Home + "' && LC_ALL=C localedef -c -i ./source -f UTF-8 './" + Name;
    if (std::system((Command + "' >/dev/null 2>&1").c_str()) == -1) return false;
    Path.emplace("LOCPATH", Home);
    setenv("LC_ALL", Name.c_str(), 1);
    return std::filesystem::exists(Folder.Path() / Name / "LC_TIME");
  }
  const TTempFolder Folder;
  const TEnvironmentScope Language{"LC_ALL", "C"};
  std::optional<TEnvironmentScope> Path;
};

TEST_F(TextLocale, SettingsComeFromTheEnvironment) {
  for (const char* const Name : {"C", "POSIX", "C.UTF-8", "xx_NONE"}) {
    setenv("LC_ALL", Name, 1);
    const TFormatSettings S = GetLocaleFormatSettings();
    EXPECT_EQ(S.ShortDateFormat + S.DateSeparator + S.DecimalSeparator + S.ThousandSeparator, u"yyyy-mm-dd-.,") << Name;
  }
  const std::pair<const char*, const char16_t*> cCases[] = {{"de_DE", u",..|dd.mm.yyyy|hh:nn:ss|Mai|Sonntag|€"},
      {"en_US", u".,/|mm/dd/yyyy|hh:nn:ss ampm|May|Sunday|$"},
      {"fr_FR", u",\u202F/|dd/mm/yyyy|hh:nn:ss|mai|dimanche|€"}};
  for (const auto& [Locale, Want] : cCases) {
    if (!Use(Locale)) GTEST_SKIP() << "the system has no localedef with sources";
    const TFormatSettings S = GetLocaleFormatSettings();
    UnicodeString Shown = UnicodeString(S.DecimalSeparator) + S.ThousandSeparator + S.DateSeparator;
    for (const UnicodeString& Text :
        {S.ShortDateFormat, S.LongTimeFormat, S.LongMonthNames[4], S.LongDayNames[0], S.CurrencyString})
      Shown += u"|" + Text;
    EXPECT_EQ(Shown, Want) << Locale;
  }
}

UnicodeString Told(const TVarRec& AValue) { return Format(u"%s", {AValue}); }

TEST(Format, TakesWhatAUserHandsIt) {
  using namespace std::chrono_literals;
  const TScriptedClock Clock(0, 3600);
  EXPECT_EQ(
      Told(std::runtime_error("\xC3\xA4")) + Told(std::make_exception_ptr(EConvertError(u"e"))) + Told(u8"ö"), u"äeö");
  EXPECT_EQ(Told(std::make_error_code(std::errc::no_such_file_or_directory)), u"No such file or directory");
  EXPECT_EQ(
      Told(std::optional<int>()) + Told(std::optional<std::string>("x")) + Told(std::filesystem::path("a/b")), u"xa/b");
  EXPECT_EQ(Told(5us) + Told(90min) + Told(std::chrono::sys_seconds(1s)), u"5 us90 min1970-01-01 01:00:01:000");
  EXPECT_EQ(Told(std::vector{1, -2}) + Told(std::vector<std::string>{}) + Told(rfReplaceAll), u"[1, -2][]0");
}

}  // namespace
}  // namespace zq
