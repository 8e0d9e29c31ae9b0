// The appender that rolls by date: where lines go, and under which name, as the clock walks on.

#include <gmock/gmock.h>

#include "common/uZqLogAppenders.h"
#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"
#include "tests/fakes/clock.h"
#include "tests/fakes/disk.h"
#include "tests/support/logging.h"

namespace zq {
namespace {

constexpr Int64 cSecond = 1000000, cHour = 3600 * cSecond, cDay = 24 * cHour;  // as the clock counts
constexpr Int64 cMidnight = 1640217600 * cSecond;                              // 2021-12-23 00:00, UTC

// A file system that keeps no time of creation, and a clock just before midnight.
struct LogDaily : testing::Test, TLoggerFixture {
  LogDaily() { Disk.CreatedTime = 0; }
  IntfRef<IZqDailyRollingFileAppender> Add() {
    return AddFile<TZqDailyRollingFileAppender>(Log, Folder.File("app.log")).As<IZqDailyRollingFileAppender>();
  }
  void LogAt(Int64 AMicroseconds, const char* AText) {
    Clock.Microseconds = AMicroseconds;
    Log->Info(AText);
  }
  // The texts of the lines in a file, run together.
  [[nodiscard]] std::string Texts(const std::string& AName) const {
    std::string Result;
    for (const std::string& Line : SplitLines(Folder.Read(AName)))
      if (const auto At = Line.find("root.test - "); At != Line.npos) Result += Line.substr(At + 12);
    return Result;
  }
  using TFiles = std::vector<std::pair<std::string, std::string>>;
  [[nodiscard]] TFiles Files() const {
    TFiles Result;
    for (const std::string& Name : Folder.Names())
      if (!std::filesystem::is_directory(Folder.Path() / Name)) Result.emplace_back(Name, Texts(Name));
    return Result;
  }
  TScriptedClock Clock{cMidnight - 1};
  TFaultyDisk Disk;
  const TTempFolder Folder;
};

TEST_F(LogDaily, TheFirstMessageOfADayRollsAndTheFileIsNamedByItsOwn) {
  const auto File = Add();
  EXPECT_EQ(File->GetMaxFileSize(), 2147483647U);
  LogAt(cMidnight - 1, "a");
  LogAt(cMidnight, "b");
  LogAt(cMidnight + cDay - 1, "c");
  EXPECT_EQ(Files(), (TFiles{{"app.2021-12-22.log", "a"}, {"app.log", "bc"}}));
  EXPECT_THAT(Folder.Read("app.2021-12-22.log"), testing::HasSubstr("a\r\nLog stopped on : 2021-12-23"));
  LogAt(cMidnight + 3 * cDay, "d");
  EXPECT_EQ(Files(), (TFiles{{"app.2021-12-22.log", "a"}, {"app.2021-12-23.log", "bc"}, {"app.log", "d"}}));
}

TEST_F(LogDaily, TheFileSystemsTimeOfCreationLeads) {
  Disk.CreatedTime = cMidnight - 2 * cDay - 1;
  Folder.Write("app.log", "Log started on : 2021-12-01 10:00:00\r\n");
  const auto File = Add();
  LogAt(cMidnight, "a");
  EXPECT_EQ(Folder.Names(), (std::vector<std::string>{"app.2021-12-20.log", "app.log"}));
}

// It lags some milliseconds behind, and at midnight a day.
TEST_F(LogDaily, TheHeaderKnowsBetterThanTheClockOfTheFileSystem) {
  const std::pair<Int64, const char*> cCases[] = {{2000, "app.2021-12-23.log"}, {cSecond, "app.2021-12-22.log"}};
  for (const auto& [Lag, Name] : cCases) {
    Disk.CreatedTime = cMidnight - Lag;
    Folder.Write("app.log", "Log started on : 2021-12-23 00:00:00\r\n");
    const auto File = Add();
    LogAt(cMidnight + cDay, "a");
    EXPECT_TRUE(std::filesystem::remove(Folder.Path() / Name)) << Lag;
    Log->ClearAppenders();
  }
}

struct TDay {
  const char* Zone;
  Int64 From, To;     // its midnights, in seconds since 1970
  const char* Names;  // of the file of the day before, and of its own
};

// When the zone changes, by an hour, by half an hour or at midnight itself, and the day is longer or shorter for it; on
// a leap day. In one run, with a start in between, and with a copy made before that start.
TEST_F(LogDaily, EachLineIsInTheFileOfItsDay) {
  const TDay cDays[] = {{"Europe/Berlin", 1616886000, 1616968800, "app.2021-03-27.log app.2021-03-28.log"},
      {"Europe/Berlin", 1635631200, 1635721200, "app.2021-10-30.log app.2021-10-31.log"},
      {"Australia/Lord_Howe", 1617454800, 1617543000, "app.2021-04-03.log app.2021-04-04.log"},
      {"Australia/Lord_Howe", 1633181400, 1633266000, "app.2021-10-02.log app.2021-10-03.log"},
      {"America/Havana", 1615698000, 1615780800, "app.2021-03-13.log app.2021-03-14.log"},
      {"UTC", 1709164800, 1709251200, "app.2024-02-28.log app.2024-02-29.log"}};
  Clock.OfZone = true;
  for (const TDay& Day : cDays)
    for (const bool Starts : {false, true}) {
      SCOPED_TRACE(testing::Message() << Day.Zone << ' ' << Day.Names << ' ' << Starts);
      const TZoneScope Zone(Day.Zone);
      Add();
      LogAt(Day.From * cSecond - 1, "a");
      LogAt(Day.From * cSecond, "b");
      if (Starts) {
        Log->ClearAppenders();
        std::filesystem::copy_file(Folder.Path() / "app.log", Folder.Path() / "copy");
        std::filesystem::rename(Folder.Path() / "copy", Folder.Path() / "app.log");
        Add();
      }
      LogAt(Day.To * cSecond - 1, "c");
      LogAt(Day.To * cSecond, "d");
      const std::string Names = Day.Names;
      EXPECT_EQ(Files(), (TFiles{{Names.substr(0, 18), "a"}, {Names.substr(19), "bc"}, {"app.log", "d"}}));
      Log->ClearAppenders();
      for (const std::string& Name : Folder.Names()) std::filesystem::remove(Folder.Path() / Name);
    }
}

// By whatever pattern, also one whose text is, or begins with, a number.
TEST_F(LogDaily, TheNewestAreKeptAndCountedFirst) {
  const std::tuple<const char*, std::vector<std::string>> cCases[] = {
      {"yyyy-mm-dd", {"app.2021-12-19.log", "app.2021-12-20.log", "app.2021-12-21.log"}},
      {"yyyymmdd", {"app.20211219.log", "app.20211220.log", "app.20211221.log"}},
      {"d.m.yyyy", {"app.29.11.2021.log", "app.9.12.2021.log", "app.10.12.2021.log"}}};
  for (const auto& [Pattern, Names] : cCases) {
    const auto File = Add();
    File->SetDatePattern(Pattern);
    for (int Age = 3; const std::string& Name : Names) {
      Folder.Write(Name, "root.test - " + std::to_string(Age) + "\r\n");
      const auto Now = std::filesystem::file_time_type::clock::now();
      std::filesystem::last_write_time(Folder.Path() / Name, Now - std::chrono::hours(Age--));
    }
    LogAt(cMidnight - 1, "a");
    File->SetMaxBackupCount(3);
    for (const std::size_t i : {1U, 2U})
      EXPECT_TRUE(Folder.Names().size() == 3U && Texts(Names[i]) == std::to_string(3 - i));
    Folder.Write("app." + FormatDateTime(FromUTF8(Pattern), zq::Now()).ToUTF8() + ".log", "");
    File->SetMaxBackupCount(5);
    File->RollOver();
    std::map<std::string, std::string> Numbers;
    for (const auto& [Name, Text] : Files()) Numbers[Name.substr(4, 2)] = Text;
    EXPECT_EQ(Numbers["1."] + Numbers["2."] + Numbers["3."] + Numbers["4."], "a12");
    Log->ClearAppenders();
    for (const std::string& Name : Folder.Names()) std::filesystem::remove(Folder.Path() / Name);
  }
}

TEST_F(LogDaily, ARollThatFailedAtTheStartIsTriedAgainAfterAMinute) {
  const auto File = Add();
  File->SetAppendExisting(false);
  Folder.Write("app.log", "Log started on : 2021-12-21 10:00:00\r\n");
  std::filesystem::create_directory(Folder.Path() / "app.2021-12-21.log");
  LogAt(cMidnight, "a");
  LogAt(cMidnight + 60 * cSecond - 1000, "b");
  std::filesystem::remove(Folder.Path() / "app.2021-12-21.log");
  LogAt(cMidnight + 60 * cSecond, "c");
  EXPECT_EQ(Files(), (TFiles{{"app.2021-12-21.log", "ab"}, {"app.log", "c"}}));
}

TEST_F(LogDaily, AFileOfAnEarlierDayIsRolledAtTheStart) {
  const TZoneScope Zone("XXX-2");
  Clock.OfZone = true;
  const std::pair<const char*, const char*> cFiles[] = {
      {"Log started on : 2021-12-01 10:00:00\r\n", "app.2021-12-01.log"},
      {"2021-02-31 10:00:00 is no date, 2021-02-28 23:59:59 is\r\n", "app.2021-02-28.log"},
      {"<log timeStamp=\"2021-12-19T22:00:00Z\" userName=\"x\">\r\n", "app.2021-12-20.log"}};
  for (const bool Appends : {true, false})
    for (const auto& [Content, Name] : cFiles) {
      Folder.Write("app.log", Content);
      const auto File = Add();
      File->SetAppendExisting(Appends);
      LogAt(cMidnight, "a");
      EXPECT_EQ(Folder.Read(Name), Content);
      EXPECT_EQ(Texts("app.log"), "a");
      Log->ClearAppenders();
      for (const std::string& Left : Folder.Names()) std::filesystem::remove(Folder.Path() / Left);
    }
}

TEST_F(LogDaily, ThePeriodIsThePatterns) {
  const std::tuple<const char16_t*, Int64, bool> cCases[] = {{u"yyyy-mm", 8 * cDay, false},
      {u"yyyy-mm", 9 * cDay, true}, {u"yyyy-mm-dd-hh", cHour - 1, false}, {u"yyyy-mm-dd-hh", cHour, true},
      {u"yyyymmdd hhnnss", cSecond - 1, false}, {u"yyyymmdd hhnnss", cSecond, true}, {u"hhnnsszzz", 999, false},
      {u"hhnnsszzz", 1000, true}};
  for (const auto& [Pattern, Later, Rolls] : cCases) {
    const auto File = Add();
    File->SetDatePattern(Pattern);
    LogAt(cMidnight, "a");
    LogAt(cMidnight + Later, "b");
    EXPECT_EQ(Folder.Names().size(), Rolls ? 2U : 1U) << Later;
    EXPECT_EQ(Texts("app.log"), Rolls ? "b" : "ab");
    Log->ClearAppenders();
    for (const std::string& Name : Folder.Names()) std::filesystem::remove(Folder.Path() / Name);
  }
}

// By size within one day, and with the clock set back behind midnight: a name that is taken ends in a number.
TEST_F(LogDaily, ANameThatIsTakenEndsInANumberedBackup) {
  const auto File = Add();
  File->SetMaxFileSize(1);
  for (const char* Text : {"a", "b", "c", "d"}) LogAt(cMidnight, Text);
  EXPECT_EQ(Files(), (TFiles{{"app.1.2021-12-23.log", "b"}, {"app.2.2021-12-23.log", "a"}, {"app.2021-12-23.log", "c"},
                         {"app.log", "d"}}));
  File->SetMaxFileSize(0);
  LogAt(cMidnight - cHour, "e");
  LogAt(cMidnight + cHour, "f");
  EXPECT_EQ(Texts("app.1.2021-12-23.log") + Texts("app.2021-12-22.log") + Texts("app.log"), "def");
}

TEST_F(LogDaily, WhatCannotBeNamedGoesOnAndIsTriedAgainAfterAMinute) {
  const auto File = Add();
  File->SetMaxFileSize(0);
  std::filesystem::create_directory(Folder.Path() / "app.2021-12-22.log");
  LogAt(cMidnight - 1, "a");
  LogAt(cMidnight, "b");
  EXPECT_EQ(Files(), (TFiles{{"app.log", "ab"}}));
  std::filesystem::remove(Folder.Path() / "app.2021-12-22.log");
  LogAt(cMidnight + 60 * cSecond - 1000, "c");
  EXPECT_EQ(Files(), (TFiles{{"app.log", "abc"}}));
  LogAt(cMidnight + 60 * cSecond, "d");
  EXPECT_EQ(Files(), (TFiles{{"app.2021-12-22.log", "abc"}, {"app.log", "d"}}));
  File->SetDatePattern("yyyy/mm/dd");
  LogAt(cMidnight + cDay, "e");
  EXPECT_EQ(Texts("app.log"), "de");
}

TEST_F(LogDaily, DatedFilesCountWhereTheCountIsSetAndForeignOnesStay) {
  const auto File = Add();
  LogAt(cMidnight, "a");
  const std::vector<const char*> cForeign = {"app..log", "app.1-2-3.log", "app.1.x.log", "app.2021-12-2.log",
      "app.2021-12-22.log.gz", "app.2021-12-22.old.log", "app.2021-12-22x.log", "app.2021_12_22.log",
      "app.x.2021-12-22.log", "apple.2021-12-22.log"};
  for (const char* Name : cForeign) Folder.Write(Name, Name);
  for (const char* Name : {"app.2021-12-21.log", "app.3.log", "app.1.2021-12-20.log"}) Folder.Write(Name, "mine");
  File->SetMaxBackupCount(1);
  EXPECT_EQ(Folder.Names().size(), cForeign.size() + 1);
  for (const char* Name : {"app.9.2.2021.log", "app.10.12.2021.log"}) Folder.Write(Name, "mine");
  File->SetDatePattern(u"yyyy-mm-dd");  // which doesn't
  File->SetDatePattern("d.m.yyyy");     // which rolls
  File->SetMaxBackupCount(1);
  std::vector<std::string> Left(cForeign.begin(), cForeign.end());
  Left.push_back("app.log");
  EXPECT_THAT(Folder.Names(), testing::UnorderedElementsAreArray(Left));
}

TEST_F(LogDaily, BehindTheYear9999NothingRollsAndNoLineIsLost) {
  const auto File = Add();
  LogAt(cMidnight, "a");
  LogAt(253402300800 * cSecond, "b");
  LogAt(253402300800 * cSecond + cDay, "c");
  std::string All;
  for (const auto& [Name, Text] : Files()) All += Text;
  EXPECT_EQ(All.size(), 3U);
}

}  // namespace
}  // namespace zq
