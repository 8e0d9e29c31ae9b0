#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <limits>

#include "runtime/core/exceptions.h"
#include "runtime/core/variants.h"
#include "runtime/text/casing.h"
#include "runtime/text/encoding.h"
#include "runtime/text/format.h"
#include "runtime/text/numbers.h"
#include "tests/support/support.h"

// With LOCPATH set the system's newlocale leaks the search path that it makes of it.
extern "C" ZQ_API const char* __lsan_default_suppressions() { return "leak:__argz_add_sep\n"; }  // NOLINT

namespace zq {
namespace {

constexpr auto cMinInt64 = std::numeric_limits<Int64>::min();
constexpr auto cMaxUInt64 = std::numeric_limits<UInt64>::max();

template <class TCall>
UnicodeString ConvertErrorOf(TCall ACall) {
  try {
    ACall();
  } catch (const EConvertError& e) {
    return e.Message();
  }
  return u"(nothing was raised)";
}

TFormatSettings Comma() {
  TFormatSettings Result;
  Result.DecimalSeparator = u',';
  Result.ThousandSeparator = u'.';
  Result.CurrencyString = u"€";
  return Result;
}

TEST(TextFormat, FillsEachKindOfPlaceholder) {
  const struct {
    const char16_t* Expected;
    UnicodeString Text;
  } cCases[] = {
      {u"5% of -7", Format(u"%d%% of %d", {5, -7})},
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
      {u"zażółć", Format(u"%s", {RawByteString("za\xBF\xF3\xB3\xE6", 1250)})},
  };
  for (const auto& Case : cCases) EXPECT_EQ(Case.Text, Case.Expected);
}

TEST(TextFormat, NumbersFollowTheGivenSettings) {
  const TVarRec Args[] = {1234.5, 1234.5, -1234.567};
  EXPECT_EQ(Format(u"%f %n %m", Args, Comma()), u"1234,50 1.234,50 -€1.234,57");
}

TEST(TextFormat, WhatDoesNotFitRaisesAndNamesTheFormat) {
  const struct {
    const char16_t* Format;
    TVarRec Argument;
  } cCases[] = {{u"%d", 1.5}, {u"%d", u"1"}, {u"%s", 1}, {u"%f", 1}, {u"%p", 1}, {u"%x", true}, {u"%q", 1}, {u"%", 1},
      {u"%5", 1}, {u"%.d", 1}, {u"%d %d", 1}, {u"%7:d", 1}, {u"%*d", u"x"}, {u"%*d", -1},
      {u"%99999999999999999999d", 1}};
  for (const auto& Case : cCases) {
    const UnicodeString Message = ConvertErrorOf([&] { (void)Format(Case.Format, {Case.Argument}); });
    EXPECT_NE(Message.Pos(u"'" + UnicodeString(Case.Format) + u"'"), 0) << Message.ToUTF8();
  }
  EXPECT_THROW((Exception(u"%d", {u"x"})), EConvertError);
  EXPECT_EQ((EListError(u"Class %s not found!", {u"TFoo"}).Message()), u"Class TFoo not found!");
}

TEST(TextNumbers, ReadsIntegersUpToTheirLimits) {
  const struct {
    const char16_t* Text;
    Int64 Value;
    bool IsInteger;  // fits 32 bits too
  } cValid[] = {{u"12", 12, true}, {u"  -7", -7, true}, {u"+7", 7, true}, {u"$1F", 31, true}, {u"0xfF", 255, true},
      {u"-$10", -16, true}, {u"2147483647", 2147483647, true}, {u"-2147483648", -2147483648LL, true},
      {u"2147483648", 2147483648LL, false}, {u"-2147483649", -2147483649LL, false},
      {u"-9223372036854775808", cMinInt64, false}, {u"$FFFFFFFFFFFFFFFF", -1, false}};
  for (const auto& Case : cValid) {
    Integer Value = 0;
    EXPECT_EQ(StrToInt64(Case.Text), Case.Value);
    EXPECT_EQ(TryStrToInt(Case.Text, Value), Case.IsInteger) << UnicodeString(Case.Text).ToUTF8();
    EXPECT_EQ(Value, Case.IsInteger ? Case.Value : 0);
  }
  EXPECT_EQ(StrToInt(u"$FFFFFFFF"), -1);
  for (const char16_t* const Text : {u"", u"-", u"1 ", u"1.0", u"$", u"0x", u"$G", u"--1", u"١", u"9223372036854775808",
           u"-9223372036854775809", u"$10000000000000000"}) {
    EXPECT_EQ(ConvertErrorOf([&] { (void)StrToInt64(Text); }),
        u"'" + UnicodeString(Text) + u"' is not a valid integer value");
    EXPECT_EQ(StrToIntDef(Text, 42), 42);
  }
}

TEST(TextNumbers, WritesIntegersAndTruth) {
  EXPECT_EQ(IntToStr(cMinInt64) + IntToStr(Byte{200}), u"-9223372036854775808200");
  EXPECT_EQ(IntToHex(-1) + IntToHex(0xABCU, 2) + IntToHex(0, 4), u"FFFFFFFFABC0000");
  EXPECT_EQ(BoolToStr(true) + BoolToStr(false) + BoolToStr(true, true) + BoolToStr(false, true), u"-10TrueFalse");
}

TEST(TextNumbers, FloatsHaveFifteenDigitsAndNoneTooMany) {
  const struct {
    Extended Value;
    const char16_t* Text;
  } cCases[] = {{0.1 + 0.2, u"0.3"}, {0.0, u"0"}, {-0.0, u"0"}, {1.0, u"1"}, {-1.5, u"-1.5"}, {100, u"100"},
      {(1.005L - 1) * 1000, u"5"}, {4.999999999999893L, u"4.99999999999989"}, {123456789012345.0, u"123456789012345"},
      {1234567890123456.0, u"1.23456789012346E15"}, {999999999999999.5, u"1E15"}, {0.0001, u"0.0001"},
      {0.00001234, u"1.234E-5"}, {1e300, u"1E300"},
      {std::numeric_limits<Extended>::denorm_min(), u"3.64519953188247E-4951"}, {HUGE_VALL, u"INF"},
      {-HUGE_VALL, u"-INF"}, {std::nanl(""), u"NAN"}};
  for (const auto& Case : cCases) EXPECT_EQ(FloatToStr(Case.Value), Case.Text);
}

TEST(TextNumbers, FloatFormatsRoundOnceAndAwayFromZero) {
  const struct {
    Extended Value;
    TFloatFormat Format;
    Integer Precision;
    Integer Digits;
    const char16_t* Text;
  } cCases[] = {{1.5, ffFixed, 8, 1, u"1,5"}, {1024, ffFixed, 8, 1, u"1024,0"}, {0.125, ffFixed, 18, 2, u"0,13"},
      {-0.125, ffFixed, 18, 2, u"-0,13"}, {0.5, ffFixed, 18, 0, u"1"}, {1.45, ffFixed, 18, 1, u"1,4"},
      {9.9996, ffFixed, 18, 3, u"10,000"}, {0.0004, ffFixed, 18, 3, u"0,000"}, {-0.0004, ffFixed, 18, 3, u"0,000"},
      {12345.678, ffFixed, 4, 2, u"1,235E4"}, {12345.678, ffFixed, 6, 3, u"12345,700"},
      {1234567.5, ffNumber, 18, 0, u"1.234.568"}, {999.995, ffNumber, 18, 2, u"1.000,00"},
      {-1000, ffCurrency, 18, 2, u"-€1.000,00"}, {1234.5, ffExponent, 3, 4, u"1,23E+0003"},
      {0.00012, ffExponent, 5, 0, u"1,2000E-4"}, {0, ffExponent, 3, 2, u"0,00E+00"},
      {12345.678, ffGeneral, 7, 0, u"12345,68"}};
  for (const auto& Case : cCases)
    EXPECT_EQ(FloatToStrF(Case.Value, Case.Format, Case.Precision, Case.Digits, Comma()), Case.Text);
}

TEST(TextNumbers, ReadsFloats) {
  const struct {
    const char16_t* Text;
    Extended Value;
  } cValid[] = {{u" 1,5 ", 1.5L}, {u"-,5", -0.5L}, {u"5,", 5}, {u"1e3", 1000}, {u"1,5E-2", 0.015L}, {u"+12", 12},
      {u"1.234,5", 1234.5L}, {u"1.234.567,", 1234567}, {u"0,1", 0.1L}, {u"1E4932", 1e4932L}};
  for (const auto& Case : cValid) EXPECT_EQ(StrToFloat(Case.Text, Comma()), Case.Value);
  for (const char16_t* const Text : {u"", u"-", u",", u"e5", u"1e", u"1.5", u"1.234", u"1.23,4", u"1234.567,8",
           u"1,5,5", u"1 5", u"0x10", u"inf", u"nan", u"1E5000", u"1,5.000"}) {
    Extended Value = 7;
    EXPECT_FALSE(TryStrToFloat(Text, Value, Comma())) << UnicodeString(Text).ToUTF8();
    EXPECT_EQ(Value, 7);
  }
  EXPECT_EQ(ConvertErrorOf([] { (void)StrToFloat(u"1,2x"); }), u"'1,2x' is not a valid floating point value");
}

TEST(TextCasing, KeepsLengthInEveryScript) {
  EXPECT_EQ(AnsiUpperCase(u"straße éя ﬁ 𐐨 ÿ"), u"STRAßE ÉЯ ﬁ 𐐀 Ÿ");
  EXPECT_EQ(AnsiLowerCase(u"İSTANBUL ÉЯ 𐐀"), u"istanbul éя 𐐨");
  EXPECT_TRUE(AnsiSameText(u"Überfuhr", u"ÜBERFUHR"));
  EXPECT_FALSE(AnsiSameText(u"a", u"ä"));
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
    const std::string Path = (Folder.Path() / ALocale).string();
    if (std::system(("cd '" + Folder.Path().string() + "' && LC_ALL=C localedef -c -i ./source -f UTF-8 '" + Path +
                     ".UTF-8' >/dev/null 2>&1")
                        .c_str()) == -1)
      return false;
    setenv("LOCPATH", Folder.Path().c_str(), 1);
    setenv("LC_ALL", (ALocale + ".UTF-8").c_str(), 1);
    return std::filesystem::exists(Path + ".UTF-8/LC_TIME");
  }
  void TearDown() override {
    unsetenv("LOCPATH");
    unsetenv("LC_ALL");
  }
  const TTempFolder Folder;
};

TEST_F(TextLocale, SettingsComeFromTheEnvironment) {
  const struct {
    const char* Locale;
    Char Decimal, Thousand, Date;
    const char16_t *ShortDate, *LongTime, *May, *Sunday, *Currency;
  } cCases[] = {
      {"de_DE", u',', u'.', u'.', u"dd.mm.yyyy", u"hh:nn:ss", u"Mai", u"Sonntag", u"€"},
      {"en_US", u'.', u',', u'/', u"mm/dd/yyyy", u"hh:nn:ss ampm", u"May", u"Sunday", u"$"},
      {"fr_FR", u',', u'\u202F', u'/', u"dd/mm/yyyy", u"hh:nn:ss", u"mai", u"dimanche", u"€"},
  };
  for (const auto& Case : cCases) {
    if (!Use(Case.Locale)) GTEST_SKIP() << "the system has no localedef with sources";
    const TFormatSettings S = GetLocaleFormatSettings();
    EXPECT_EQ(S.DecimalSeparator, Case.Decimal) << Case.Locale;
    EXPECT_EQ(S.ThousandSeparator, Case.Thousand) << Case.Locale;
    EXPECT_EQ(S.DateSeparator, Case.Date) << Case.Locale;
    EXPECT_EQ(S.ShortDateFormat, Case.ShortDate);
    EXPECT_EQ(S.LongTimeFormat, Case.LongTime);
    EXPECT_EQ(S.LongMonthNames[4], Case.May);
    EXPECT_EQ(S.LongDayNames[0], Case.Sunday);
    EXPECT_EQ(S.CurrencyString, Case.Currency);
  }
}

TEST_F(TextLocale, ThePlainLocalesAreInvariant) {
  for (const char* const Name : {"C", "POSIX", "C.UTF-8", "xx_NONE"}) {
    setenv("LC_ALL", Name, 1);
    const TFormatSettings S = GetLocaleFormatSettings();
    EXPECT_EQ(S.ShortDateFormat + S.DateSeparator + S.DecimalSeparator + S.ThousandSeparator, u"yyyy-mm-dd-.,") << Name;
  }
}

TEST(TextSettings, AChangeReachesTheFunctionsWithoutSettings) {
  const TFormatSettings Before = FormatSettings();
  const auto Held = SharedFormatSettings();
  SetFormatSettings(Comma());
  EXPECT_EQ(FloatToStr(1.5) + Format(u" %f", {2.5}), u"1,5 2,50");
  EXPECT_EQ(StrToFloat(u"1,5"), 1.5);
  EXPECT_EQ(Held->DecimalSeparator, Before.DecimalSeparator);
  SetFormatSettings(Before);
}

}  // namespace
}  // namespace zq
