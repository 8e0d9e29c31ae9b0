#include <gtest/gtest.h>

#include <filesystem>
#include <map>
#include <thread>

#include "runtime/com/registry.h"
#include "runtime/platform/clock.h"
#include "runtime/platform/environment_service.h"
#include "runtime/text/datetime.h"
#include "tests/support/environment_scope.h"
#include "tests/support/scripted_registry.h"
#include "tests/support/support.h"

namespace zq {
namespace {

class TScriptedClock : public TClockService {
 public:
  TScriptedClock(Int64 AMicroseconds, Integer AOffset) : FMicroseconds(AMicroseconds), FOffset(AOffset) {}
  Int64 UtcMicroseconds() override { return FMicroseconds; }
  Integer UtcOffsetSeconds(Int64) override { return FOffset; }

 private:
  Int64 FMicroseconds;
  Integer FOffset;
};

UnicodeString Shown(TDateTime AValue) { return FormatDateTime(u"yyyy-mm-dd hh:mm:ss:zzz", AValue); }

TEST(Platform, OverridesNestAndReachEveryCaller) {
  TClockService& Real = Platform().Clock();
  TScriptedClock First(1, 0);
  TScriptedClock Second(2, 0);
  {
    const TPlatformOverride<TClockService> Outer(First);
    {
      const TPlatformOverride<TClockService> Inner(Second);
      std::thread([&] { EXPECT_EQ(Platform().Clock().UtcMicroseconds(), 2); }).join();
    }
    EXPECT_EQ(&Platform().Clock(), &First);
  }
  EXPECT_EQ(&Platform().Clock(), &Real);
}

// -------------------------------------------------------------------------------------------------------- Clock

TEST(Clock, NowIsTheLocalTimeCutToMilliseconds) {
  const struct {
    Int64 Microseconds;
    Integer Offset;
    const char16_t* Shown;
  } Cases[] = {
      {1709251199999999, 0, u"2024-02-29 23:59:59:999"},     // never shown as the next day
      {1709251199999999, 3600, u"2024-03-01 00:59:59:999"},  // the local date decides
      {1709251200000000, -18000, u"2024-02-29 19:00:00:000"},
      {-1, 0, u"1969-12-31 23:59:59:999"},
  };
  for (const auto& Case : Cases) {
    TScriptedClock Clock(Case.Microseconds, Case.Offset);
    const TPlatformOverride<TClockService> Fake(Clock);
    EXPECT_EQ(Shown(Now()), Case.Shown);
    EXPECT_EQ(Shown(Date().Value + Time().Value), Case.Shown);
  }
}

TEST(Clock, MillisecondsSurviveTheDouble) {
  EXPECT_EQ(UnixMillisecondsToDateTime(0).Value, 25569.0);
  EXPECT_EQ(UnixMillisecondsToDateTime(-2209161600000 + 21600000).Value, 0.25);
  EXPECT_EQ(UnixMillisecondsToDateTime(-2209161600000 - 64800000).Value, -1.25);  // 1899-12-29 06:00
  for (const Int64 Value : {Int64{1}, Int64{-1}, Int64{1709251199999}, Int64{-2209161600001}, Int64{-5000000000123}})
    EXPECT_EQ(DateTimeToUnixMilliseconds(UnixMillisecondsToDateTime(Value)), Value);
}

// A time zone of the system for a scope.
class TZoneScope {
 public:
  explicit TZoneScope(const char* AZone) : FZone("TZ", AZone) { TTimeZone::Refresh(); }
  TZoneScope(const TZoneScope&) = delete;
  TZoneScope& operator=(const TZoneScope&) = delete;
  ~TZoneScope() { TTimeZone::Refresh(); }

 private:
  TEnvironmentScope FZone;
};

TDateTime At(Word AMonth, Word ADay, Word AHour, Word AMinute) {
  return EncodeDate(2024, AMonth, ADay) + EncodeTime(AHour, AMinute, 0, 0);
}

TEST(Clock, UniversalTimeOfEveryHourOfTheClock) {
  const TZoneScope Zone("CET-1CEST,M3.5.0,M10.5.0/3");
  const TTimeZone& Local = TTimeZone::Local();
  const struct {
    TDateTime Local;
    bool ForceDaylight;
    const char16_t* Utc;
  } Cases[] = {{At(7, 1, 12, 0), false, u"2024-07-01 10:00:00:000"},
      {At(1, 1, 0, 30), true, u"2023-12-31 23:30:00:000"},
      {At(10, 27, 2, 30), false, u"2024-10-27 01:30:00:000"},  // shown twice
      {At(10, 27, 2, 30), true, u"2024-10-27 00:30:00:000"}, {At(10, 27, 20, 0), false, u"2024-10-27 19:00:00:000"},
      {At(3, 31, 2, 30), false, u"2024-03-31 01:30:00:000"},  // left out
      {At(3, 31, 20, 0), false, u"2024-03-31 18:00:00:000"}};
  for (const auto& Case : Cases) EXPECT_EQ(Shown(Local.ToUniversalTime(Case.Local, Case.ForceDaylight)), Case.Utc);
  for (const auto& Case : Cases)  // and back, but for the hour that no clock shows
    EXPECT_EQ(Shown(Local.ToLocalTime(Local.ToUniversalTime(Case.Local, Case.ForceDaylight))),
        Shown(Case.Local == At(3, 31, 2, 30) ? At(3, 31, 3, 30) : Case.Local));
  EXPECT_EQ(Local.UtcOffset(At(7, 1, 12, 0)), 7200);
}

TEST(Clock, AChangeInTheMiddleOfAQuarterHourIsNotRemembered) {
  const TZoneScope Zone("AAA0BBB,M3.5.0/2:07,M10.5.0/3:07");
  for (int i = 0; i < 2; ++i) {
    EXPECT_EQ(Shown(TTimeZone::Local().ToLocalTime(At(3, 31, 2, 6))), u"2024-03-31 02:06:00:000");
    EXPECT_EQ(Shown(TTimeZone::Local().ToLocalTime(At(3, 31, 2, 7))), u"2024-03-31 03:07:00:000");
  }
}

// --------------------------------------------------------------------------------------------------- Environment

TEST(Environment, ExpandsKnownNamesBetweenPercentSigns) {
  const TEnvironmentScope A("ZQ_A", "one");
  const TEnvironmentScope B("ZQ_B", "\xFF");
  const std::map<UnicodeString, UnicodeString> Cases = {{u"%ZQ_A%", u"one"}, {u"x%ZQ_A%y%ZQ_A%", u"xoneyone"},
      {u"%ZQ_NO%", u"%ZQ_NO%"}, {u"%ZQ_NO%ZQ_A%", u"%ZQ_NOone"}, {u"100%", u"100%"}, {u"%%", u"%%"},
      {u"%ZQ_A", u"%ZQ_A"}, {u"", u""}, {u"%ZQ_B%", UnicodeString(u'\xDCFF')}};
  for (const auto& [Text, Result] : Cases) EXPECT_EQ(Platform().Environment().ExpandEnvironmentStrings(Text), Result);
}

// ------------------------------------------------------------------------------------------------------ Registry

TEST(Registry, FileTypesComeFromTheMimeTables) {
  const TTempFolder Data;
  std::filesystem::create_directory(Data.Path() / "mime");
  Data.Write("mime/globs2", "# comment\n60:text/heavy:*.zqx\n50:text/light:*.zqx\n50:text/flagged:*.zqc:cs\n");
  const TEnvironmentScope Home("XDG_DATA_HOME", Data.Path().string());
  TRegistry Registry(KEY_READ);
  Registry.SetRootKey(HKEY_CLASSES_ROOT);
  ASSERT_TRUE(Registry.OpenKey(u".ZQX", false));
  EXPECT_EQ(Registry.ReadString(u"content type"), u"text/heavy");
  EXPECT_EQ(Registry.ReadString(u"Other"), u"");
  EXPECT_THROW(Registry.WriteString(u"Content Type", u"x"), ERegistryException);
  ASSERT_TRUE(Registry.OpenKey(u"\\.zqc", true));
  EXPECT_EQ(Registry.ReadString(u"Content Type"), u"text/flagged");
  EXPECT_FALSE(Registry.KeyExists(u"\\.zqnone"));
  EXPECT_FALSE(Registry.OpenKey(u"\\.zqnone", true));
  EXPECT_FALSE(Registry.OpenKey(u"", false));
  Registry.CloseKey();
  EXPECT_EQ(Registry.ReadString(u"Content Type"), u"");
}

TEST(Registry, KeysOpenFromTheRootOrTheOpenKeyAndAreClosed) {
  TScriptedRegistry Service;
  const TPlatformOverride<TRegistryService> Fake(Service);
  {
    TRegistry Registry;
    EXPECT_FALSE(Registry.OpenKey(u"A", false));
    ASSERT_TRUE(Registry.OpenKey(u"A", true));
    ASSERT_TRUE(Registry.OpenKey(u"B", true));
    Registry.WriteString(u"Text", u"ä");
    Registry.WriteInteger(u"Number", -7);
    EXPECT_EQ(Registry.ReadString(u"Text"), u"ä");
    EXPECT_EQ(Registry.ReadInteger(u"Number"), -7);
    EXPECT_THROW(static_cast<void>(Registry.ReadString(u"Number")), ERegistryException);
    EXPECT_THROW(static_cast<void>(Registry.ReadInteger(u"None")), ERegistryException);
    EXPECT_TRUE(Registry.KeyExists(u"\\A\\B"));
    EXPECT_FALSE(Registry.OpenKey(u"C", false));
    EXPECT_TRUE(Registry.ValueExists(u"Text"));  // the open key stayed open
    EXPECT_EQ(Service.Open.size(), 4U);          // beside the three roots
    ASSERT_TRUE(Registry.OpenKeyReadOnly(u"\\A"));
    EXPECT_FALSE(Registry.ValueExists(u"Text"));
  }
  EXPECT_EQ(Service.Open.size(), 3U);
  EXPECT_EQ(Service.Keys.count(u"HKCU\\A\\B"), 1U);
}

}  // namespace
}  // namespace zq
