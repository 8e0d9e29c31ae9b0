#include <gtest/gtest.h>

#include <filesystem>
#include <thread>

#include "runtime/com/registry.h"
#include "runtime/platform/clock_service.h"
#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"
#include "tests/support/scripted_registry.h"
#include "tests/support/support.h"

namespace zq {
namespace {

struct TScriptedClock : TClockService {
  TScriptedClock(Int64 AMicroseconds, Integer AOffset) : Microseconds(AMicroseconds), Offset(AOffset) {}
  Int64 UtcMicroseconds() override { return Microseconds; }
  Integer UtcOffsetSeconds(Int64) override { return Offset; }
  const Int64 Microseconds;
  const Integer Offset;
};

UnicodeString Shown(TDateTime AValue) { return FormatDateTime(u"yyyy-mm-dd hh:mm:ss:zzz", AValue); }

TEST(Platform, OverridesNestAndReachEveryCaller) {
  TClockService& Real = Service<TClockService>();
  TScriptedClock First(1, 0), Second(2, 0);
  {
    const TPlatformOverride<TClockService> Outer(First);
    {
      const TPlatformOverride<TClockService> Inner(Second);
      std::thread([&] { EXPECT_EQ(&Service<TClockService>(), &Second); }).join();
    }
    EXPECT_EQ(&Service<TClockService>(), &First);
  }
  EXPECT_EQ(&Service<TClockService>(), &Real);
}

// -------------------------------------------------------------------------------------------------------- Clock

TEST(Clock, NowIsTheLocalTimeCutToMilliseconds) {
  const std::tuple<Int64, Integer, const char16_t*> Cases[] = {
      {1709251199999999, 0, u"2024-02-29 23:59:59:999"},     // never shown as the next day
      {1709251199999999, 3600, u"2024-03-01 00:59:59:999"},  // the local date decides
      {1709251200000000, -18000, u"2024-02-29 19:00:00:000"}, {-1, 0, u"1969-12-31 23:59:59:999"}};
  for (const auto& [Microseconds, Offset, Want] : Cases) {
    TScriptedClock Clock(Microseconds, Offset);
    const TPlatformOverride<TClockService> Fake(Clock);
    EXPECT_EQ(Shown(Now()), Want);
    EXPECT_EQ(Shown(Date().Value + Time().Value), Want);
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
struct TZoneScope {
  explicit TZoneScope(const char* AZone) : Zone("TZ", AZone) { TTimeZone::Refresh(); }
  ~TZoneScope() { TTimeZone::Refresh(); }
  const TEnvironmentScope Zone;
};

TDateTime At(Word AMonth, Word ADay, Word AHour, Word AMinute) {
  return EncodeDate(2024, AMonth, ADay) + EncodeTime(AHour, AMinute, 0, 0);
}

TEST(Clock, UniversalTimeOfEveryHourOfTheClock) {
  const TZoneScope Zone("CET-1CEST,M3.5.0,M10.5.0/3");
  const TTimeZone& Local = TTimeZone::Local();
  const std::tuple<TDateTime, bool, const char16_t*> Cases[] = {{At(7, 1, 12, 0), false, u"2024-07-01 10:00:00:000"},
      {At(1, 1, 0, 30), true, u"2023-12-31 23:30:00:000"},
      {At(10, 27, 2, 30), false, u"2024-10-27 01:30:00:000"},  // shown twice
      {At(10, 27, 2, 30), true, u"2024-10-27 00:30:00:000"}, {At(10, 27, 20, 0), false, u"2024-10-27 19:00:00:000"},
      {At(3, 31, 2, 30), false, u"2024-03-31 01:30:00:000"},  // left out
      {At(3, 31, 20, 0), false, u"2024-03-31 18:00:00:000"}};
  for (const auto& [Moment, ForceDaylight, Utc] : Cases) {
    EXPECT_EQ(Shown(Local.ToUniversalTime(Moment, ForceDaylight)), Utc);
    EXPECT_EQ(Shown(Local.ToLocalTime(Local.ToUniversalTime(Moment, ForceDaylight))),
        Shown(Moment == At(3, 31, 2, 30) ? At(3, 31, 3, 30) : Moment));
  }
  EXPECT_EQ(Local.UtcOffset(At(7, 1, 12, 0)), 7200);
}

TEST(Clock, AChangeInTheMiddleOfAQuarterHourIsNotRemembered) {
  const TZoneScope Zone("AAA0BBB,M3.5.0/2:07,M10.5.0/3:07");
  for (int i = 0; i < 2; ++i) {
    EXPECT_EQ(Shown(TTimeZone::Local().ToLocalTime(At(3, 31, 2, 6))), u"2024-03-31 02:06:00:000");
    EXPECT_EQ(Shown(TTimeZone::Local().ToLocalTime(At(3, 31, 2, 7))), u"2024-03-31 03:07:00:000");
  }
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
  EXPECT_EQ(Registry.ReadString(u"content type") + Registry.ReadString(u"Other"), u"text/heavy");
  EXPECT_THROW(Registry.WriteString(u"Content Type", u"x"), ERegistryException);
  ASSERT_TRUE(Registry.OpenKey(u"\\.zqc", true));
  EXPECT_EQ(Registry.ReadString(u"Content Type"), u"text/flagged");
  EXPECT_FALSE(
      Registry.KeyExists(u"\\.zqnone") || Registry.OpenKey(u"\\.zqnone", true) || Registry.OpenKey(u"", false));
  Registry.CloseKey();
  EXPECT_EQ(Registry.ReadString(u"Content Type"), u"");
}

TEST(Registry, KeysOpenFromTheRootOrTheOpenKeyAndAreClosed) {
  TScriptedRegistry Service;
  const TPlatformOverride<TRegistryService> Fake(Service);
  {
    TRegistry Registry;
    EXPECT_FALSE(Registry.OpenKey(u"A", false));
    ASSERT_TRUE(Registry.OpenKey(u"A", true) && Registry.OpenKey(u"B", true));
    Registry.WriteString(u"Text", u"ä");
    Registry.WriteInteger(u"Number", -7);
    EXPECT_TRUE(Registry.ReadString(u"Text") == u"ä" && Registry.ReadInteger(u"Number") == -7);
    EXPECT_THROW(std::ignore = Registry.ReadString(u"Number"), ERegistryException);
    EXPECT_THROW(std::ignore = Registry.ReadInteger(u"None"), ERegistryException);
    EXPECT_TRUE(Registry.KeyExists(u"\\A\\B") && !Registry.OpenKey(u"C", false));
    EXPECT_TRUE(Registry.ValueExists(u"Text"));  // the open key stayed open
    EXPECT_EQ(Service.Open.size(), 4U);          // beside the three roots
    EXPECT_TRUE(Registry.OpenKeyReadOnly(u"\\A") && !Registry.ValueExists(u"Text"));
  }
  EXPECT_TRUE(Service.Open.size() == 3 && Service.Keys.contains(u"HKCU\\A\\B"));
}

}  // namespace
}  // namespace zq
