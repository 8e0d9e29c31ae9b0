// What becomes of log lines and of the files of a series when one call to the system fails.

#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <thread>

#include "common/uZqLogAppenders.h"
#include "common/uZqLogger/failures.h"
#include "tests/fakes/clock.h"
#include "tests/fakes/disk.h"
#include "tests/support/logging.h"

namespace zq {
namespace {

using TLines = std::vector<std::string>;

// What is told of failures in a scope.
struct TFailures {
  TFailures() {
    ZqSetLogFailureHandler([this](const TZqLogFailure& AFailure) { Told.push_back(AFailure); });
  }
  ~TFailures() { ZqSetLogFailureHandler(nullptr); }
  std::vector<TZqLogFailure> Told;
};

std::map<std::string, std::string> Contents(const TTempFolder& AFolder) {
  std::map<std::string, std::string> Result;
  for (const std::string& Name : AFolder.Names())
    if (std::filesystem::is_regular_file(AFolder.Path() / Name)) Result[Name] = AFolder.Read(Name);
  return Result;
}

// Of a killed one -1.
int ExitOf(const std::function<void()>& AChild) {
  const pid_t Child = ::fork();
  if (Child == 0) {
    AChild();
    std::exit(0);
  }
  int Status = 0;
  ::waitpid(Child, &Status, 0);
  return WIFEXITED(Status) ? WEXITSTATUS(Status) : -1;
}

template <class TAppender = TZqRollingFileAppender>
IntfRef<IZqRollingFileAppender> AddRolling(const IntfRef<IZqLogger>& ALog, const TTempFolder& AFolder, Word ABackups) {
  const auto Result = AddFile<TAppender>(ALog, AFolder.File("app.log")).template As<IZqRollingFileAppender>();
  Result->SetMaxBackupCount(ABackups);
  return Result;
}

struct TFaultCase {
  const char* Name;
  std::vector<const char*> Before;  // files of the folder, each holding its name
  std::function<void(const IntfRef<IZqLogger>&, const IntfRef<IZqRollingFileAppender>&)> Action;
  decltype(&AddRolling<>) Add = AddRolling<>;
};
constexpr Int64 cDay = 86400 * Int64{1000000};  // as the clock counts
TScriptedClock* FaultClock = nullptr;
const auto cMidnight = [](const IntfRef<IZqLogger>& ALog, const IntfRef<IZqRollingFileAppender>&) {
  FaultClock->Microseconds += cDay;
  ALog->Info(u"of the next day");
};
const auto cLine = [](const IntfRef<IZqLogger>& ALog, const IntfRef<IZqRollingFileAppender>& AFile) {
  AFile->SetMaxFileSize(1);
  ALog->Info(u"that rolls");
  AFile->SetMaxFileSize(0);
};
const auto cCall = [](const IntfRef<IZqLogger>&, const IntfRef<IZqRollingFileAppender>& AFile) {
  std::ignore = RaisedBy([&] { AFile->RollOver(); });  // where the new file can't be opened
};
const auto cStart = [](const IntfRef<IZqLogger>& ALog, const IntfRef<IZqRollingFileAppender>& AFile) {
  AFile->SetAppendExisting(false);
  std::ignore = RaisedBy([&] { AFile->Close(); });  // where the footer can't be written
  ALog->Info(u"that starts anew");
};

class LogFaults : public testing::TestWithParam<TFaultCase> {};

// After each fault: what was acknowledged is in the series, older files are as they were, under whatever number, and
// the log works again.
TEST_P(LogFaults, OfEachCallCostNothingThatIsKept) {
  for (const int Error : {ENOSPC, EIO, EACCES, EXDEV, ENAMETOOLONG})
    for (int Call = 1, More = 1; More != 0; ++Call) {
      SCOPED_TRACE(testing::Message() << "call " << Call << " fails with " << Error);
      const TFailures Failures;
      const TLoggerFixture Fixture;
      TScriptedClock Time;
      FaultClock = &Time;
      TFaultyDisk Young;
      Young.CreatedTime = 0;
      const TTempFolder Folder(GetParam().Before);
      std::filesystem::create_directory(Folder.Path() / "app.9.log");
      const auto File = GetParam().Add(Fixture.Log, Folder, 20);
      Fixture.Log->Info(u"acknowledged");
      const auto Before = Contents(Folder);
      {
        const TFaultyDisk Disk(Call, Error);
        GetParam().Action(Fixture.Log, File);
        More = Disk.HasFailed() ? 1 : 0;
      }
      std::ignore = RaisedBy([&] { File->Close(); });
      Fixture.Log->Info(u"afterwards");
      std::string After;
      for (const auto& [Name, Content] : Contents(Folder)) After += Content + '\n';
      for (const auto& [Name, Content] : Before) EXPECT_NE(After.find(Content), After.npos) << Name;
      EXPECT_NE(After.find("- afterwards\r\n"), After.npos);
      ASSERT_LT(Call, 200);
    }
}

// Killed before each call, and started again: every line and every older file is there once.
TEST_P(LogFaults, AKilledProcessCostsNothingEither) {
  TScriptedClock Time;
  FaultClock = &Time;
  TFaultyDisk Young;
  Young.CreatedTime = 0;
  for (int Call = 1, Exit = -1; Exit != 0; ++Call) {
    SCOPED_TRACE(testing::Message() << "killed before call " << Call);
    const TTempFolder Folder(GetParam().Before);
    const auto Start = [&](const char* AText) {
      const TLoggerFixture Fixture;
      const auto File = GetParam().Add(Fixture.Log, Folder, 20);
      Fixture.Log->Info(AText);
      TFaultyDisk Disk(Exit == -1 ? Call : 0, TFaultyDisk::cKill);
      Disk.CreatedTime = 0;
      GetParam().Action(Fixture.Log, File);
    };
    Exit = ExitOf([&] { Start("acknowledged"); });
    ASSERT_TRUE(Exit == 0 || Exit == -1);
    FaultClock->Microseconds += cDay;
    const int Killed = std::exchange(Exit, 0);
    Start("afterwards");
    Exit = Killed;
    FaultClock->Microseconds -= 2 * cDay;
    std::string After;
    for (const auto& [Name, Content] : Contents(Folder)) After += Content + '\n';
    std::vector<std::string> Kept(GetParam().Before.begin(), GetParam().Before.end());
    Kept.insert(Kept.end(), {"- acknowledged\r\n", "- afterwards\r\n"});
    for (const std::string& Text : Kept) {
      const auto At = After.find(Text);
      EXPECT_TRUE(At != After.npos && After.find(Text, At + 1) == After.npos) << Text;
    }
    ASSERT_LT(Call, 200);
  }
}
INSTANTIATE_TEST_SUITE_P(Calls, LogFaults,
    testing::Values(TFaultCase{"RollByALine", {"app.1.log", "app.2.log"}, cLine},
        TFaultCase{"RollByACall", {"app.2.log", "app.4.log", "app.007.log", "apple.log", "app.xsl"}, cCall},
        TFaultCase{"StartAnew", {"app.1.log", "app.3.log"}, cStart},
        TFaultCase{"RollByDate", {"app.2021-12-21.log"}, cMidnight, AddRolling<TZqDailyRollingFileAppender>},
        TFaultCase{"RollByDateOfATakenName", {"app.1.log", "app.2021-12-23.log"}, cMidnight,
            AddRolling<TZqDailyRollingFileAppender>}),
    [](const auto& AInfo) { return std::string(AInfo.param.Name); });

// ---------------------------------------------------------------------------------------- failures are told

TEST(LogFailures, TellEachLostMessageAndTheFirstThatIsWrittenAgain) {
  const TLoggerFixture Fixture;
  const TTempFolder Folder({"file"});
  const auto File = AddFile(Fixture.Log, Folder.File("file/app.log"));  // below what is no folder
  const TFailures Failures;
  Fixture.Log->Info(u"1");
  Fixture.Log->Info(u"2");
  std::filesystem::remove(Folder.Path() / "file");
  Fixture.Log->Info(u"3");
  Fixture.Log->Info(u"4");
  ASSERT_EQ(Failures.Told.size(), 3U);
  EXPECT_EQ(Failures.Told[0].Appender + Failures.Told[1].Logger, u"TZqFileAppenderroot.test");
  EXPECT_TRUE(Failures.Told[0].Error.Pos(u"Cannot open file") == 1 && Failures.Told[0].Lost == 1);
  EXPECT_EQ(Failures.Told[1].Lost, 2);
  EXPECT_TRUE(Failures.Told[2].Error.IsEmpty() && Failures.Told[2].Lost == 2);
}

TEST(LogFailures, AreToldWithNoLockHeldAndNeverWithinOneAnother) {
  const TLoggerFixture Fixture;
  const auto Appender = IntfRef<TNotingAppender>(New<TNotingAppender>());
  Appender->OnWrite = [](PZqDataRec) { throw EConvertError(u"no"); };
  Fixture.Log->AddAppender(IntfRef<IZqLogAppender>(Appender.Get()));
  int Depth = 0, Calls = 0;
  ZqSetLogFailureHandler([&](const TZqLogFailure&) {
    EXPECT_EQ(++Depth, 1);
    ++Calls;
    std::jthread([&] {
      EXPECT_TRUE(Fixture.Log->GetAppenders()->Lock(u"test", false));
      Fixture.Log->GetAppenders()->Unlock();
    }).join();
    Fixture.Log->Info(u"within");  // fails too
    --Depth;
    throw EConvertError(u"goes no further");
  });
  Fixture.Log->Info(u"x");
  ZqSetLogFailureHandler(nullptr);
  EXPECT_EQ(Calls, 1);
}

TEST(LogFailures, GoToStandardErrorOnceForEachKind) {
  const auto Act = [] {
    const TTempFolder Folder({"file"});
    const TLoggerFixture Fixture;
    const auto File = AddFile(Fixture.Log, Folder.File("file/app.log"));
    for (int i = 0; i < 3; ++i) Fixture.Log->Info(u"x");
    std::filesystem::remove(Folder.Path() / "file");
    Fixture.Log->Info(u"x");
    ::write(2, "end", 3);
    ::_exit(0);
  };
  EXPECT_EXIT(Act(), testing::ExitedWithCode(0),
      "^Logging: TZqFileAppender \\(root.test\\): Cannot open file [^\n]*\n"
      "Logging: TZqFileAppender \\(root.test\\): writes again, 3 messages were lost\nend$");
}

TEST(LogFailures, ARollThatFailsWaitsForTheLimitAgainOrAMinute) {
  TScriptedClock Clock;
  const TLoggerFixture Fixture;
  const TTempFolder Folder;
  std::filesystem::create_directory(Folder.Path() / "app.1.log");
  const auto File = AddRolling(Fixture.Log, Folder, 5);
  Fixture.Log->Info(u"x");
  const auto Line = static_cast<Cardinal>(SplitLines(Folder.Read("app.log"))[1].size()) + 2;
  const auto Size = static_cast<Cardinal>(Folder.Read("app.log").size());
  File->SetMaxFileSize(Size);
  const TFailures Failures;
  const std::tuple<Int64, std::size_t> cSteps[] = {{0, 1}, {59'999'000, 1}, {1'000, 2}, {0, 2}};
  for (const auto& [Microseconds, Told] : cSteps) {
    Clock.Microseconds += Microseconds;
    Fixture.Log->Info(u"x");
    EXPECT_EQ(Failures.Told.size(), Told);
  }
  for (Cardinal Grown = 2 * Line; Grown < Size; Grown += Line) Fixture.Log->Info(u"x");
  EXPECT_EQ(Failures.Told.size(), 2U);
  Fixture.Log->Info(u"x");
  EXPECT_EQ(Failures.Told.size(), 3U);
  File->RollOver();
  EXPECT_EQ(Failures.Told.size(), 4U) << "who asks for a roll gets it tried";
  EXPECT_EQ(Folder.Read("app.log").find("Log started", 1), std::string::npos) << "no header for each try";
}

// ---------------------------------------------------------------------------------------- what is kept

TEST(LogKeeps, NoMoreFilesThanItMayAndNeverTheOpenOneLess) {
  const TTempFolder Folder;
  for (int i = 0; i < 8; ++i) {
    const TLoggerFixture Fixture;
    const auto File = AddRolling(Fixture.Log, Folder, 3);
    File->SetAppendExisting(false);
    Fixture.Log->Info(u"x");
    EXPECT_LE(Folder.Names().size(), 3U);
  }
  const TLoggerFixture Fixture;
  const auto File = AddRolling(Fixture.Log, Folder, 0);
  EXPECT_TRUE(Folder.Names().empty());
  File->RollOver();
  File->SetMaxBackupCount(3);
  Fixture.Log->Info(u"2");
  EXPECT_EQ(Folder.Names(), TLines{"app.log"});
}

TEST(LogKeeps, TheLineBehindATornOneBeginsOnItsOwn) {
  const TScriptedClock Clock;
  const std::string Header = "Log started on : 2021-12-23 10:53:18\r\n";
  const std::tuple<const char*, std::string> cCases[] = {{"", Header}, {"torn", "torn\r\n" + Header},
      {"whole\n", "whole\n" + Header},
      {"Log stopped on : 2020-01-02 03:04:05", "Log stopped on : 2020-01-02 03:04:05" + Header},
      {"Log stopped on : 2020-01-02 03:04:0", "Log stopped on : 2020-01-02 03:04:0\r\n" + Header}};
  for (const auto& [Before, After] : cCases) {
    const TTempFolder Folder;
    Folder.Write("app.log", Before);
    const TLoggerFixture Fixture;
    AddFile(Fixture.Log, Folder.File("app.log"));
    Fixture.Log->Info(u"x");
    EXPECT_TRUE(Folder.Read("app.log").starts_with(After + "2021")) << Folder.Read("app.log");
  }
}

TEST(LogKeeps, EveryLineOfTheYearTenThousand) {
  TScriptedClock Clock(253402300799999000);
  const TLoggerFixture Fixture;
  const TTempFolder Folder;
  const auto File = AddFile(Fixture.Log, Folder.File("app.log"));
  Fixture.Log->Info(u"last");
  Clock.Microseconds += 1000;
  Fixture.Log->Info(u"first");
  File->Close();
  const TLines Lines = SplitLines(Folder.Read("app.log"));
  EXPECT_EQ(Lines[1], "9999-12-31 23:59:59:999 - Info root.test - last");
  EXPECT_EQ(Lines[2], "10000-01-01 00:00:00:000 - Info root.test - first");
  EXPECT_EQ(Lines[3], "Log stopped on : 10000-01-01 00:00:00");
}

TEST(LogKeeps, AfterAFailedOpenOfTheNewFileTheIntervalDecides) {
  TScriptedClock Clock;
  const TLoggerFixture Fixture;
  const TTempFolder Folder;
  const auto File = AddRolling(Fixture.Log, Folder, 5);
  Fixture.Log->Info(u"x");
  for (int Call = 1; Folder.Names().size() < 2 || std::filesystem::exists(Folder.Path() / "app.log"); ++Call) {
    const TFaultyDisk Disk(Call, ENOSPC);
    std::ignore = RaisedBy([&] { File->RollOver(); });
    ASSERT_LT(Call, 50);
  }
  const TFailures Failures;
  Fixture.Log->Info(u"lost");
  File.As<IZqFileAppenderEx>()->SetRetryInterval(1000);
  Clock.Microseconds += 999'000;
  Fixture.Log->Info(u"lost");
  Clock.Microseconds += 1'000;
  Fixture.Log->Info(u"found");
  ASSERT_EQ(Failures.Told.size(), 3U);
  EXPECT_EQ(Failures.Told[2].Lost, 2);
  EXPECT_TRUE(Folder.Read("app.log").ends_with("- found\r\n"));
}

TEST(LogKeeps, MessagesOutOfStandardErrorsDescriptor) {
  const auto Act = [](const TTempFolder& AFolder) {
    ::close(2);
    const TLoggerFixture Fixture;
    AddFile(Fixture.Log, AFolder.File("app.log"));
    Fixture.Log->Info(u"x");
    ::write(2, "noise", 5);
    ::_exit(AFolder.Read("app.log").ends_with("- x\r\n") ? 0 : 1);
  };
  const TTempFolder Folder;
  EXPECT_EXIT(Act(Folder), testing::ExitedWithCode(0), "");
}

TEST(LogKeeps, AForkedChildNeitherEndsNorRollsItsParentsFile) {
  const TLoggerFixture Fixture;
  const TTempFolder Folder;
  const auto File = AddRolling(Fixture.Log, Folder, 5);
  Fixture.Log->Info(u"parent");
  EXPECT_EQ(ExitOf([&] {
    File->SetMaxFileSize(1);
    Fixture.Log->Info(u"child");
    File->RollOver();
  }),
      0);
  EXPECT_EQ(Folder.Names(), TLines{"app.log"});
  EXPECT_TRUE(Folder.Read("app.log").ends_with("- child\r\n"));
  EXPECT_EQ(ExitOf([&] {
    File->SetFileName(Folder.File("child.log"));
    Fixture.Log->Info(u"own");
  }),
      0);
  EXPECT_NE(Folder.Read("child.log").find("Log stopped"), std::string::npos);
}

TEST(LogKeeps, ThreadsThatLogWhileTheProcessEndsTouchNothingFreed) {
  const TTempFolder Folder;
  for (int i = 0; i < 10; ++i)
    EXPECT_EQ(ExitOf([&] {
      Logger()
          ->GetAppenders()
          ->Add(TZqLogBaseClass::Of<TZqFileAppender>(), TZqLogBaseClass::Of<TZqSimpleLayout>())
          .As<IZqFileAppender>()
          ->SetFileName(Folder.File("app.log"));
      for (int t = 0; t < 3; ++t)
        std::thread([] {
          for (const auto Log = Logger()->GetLogger(u"a.b");;) Log->Info(u"x");
        }).detach();
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }),
        0);
  EXPECT_NE(Folder.Read("app.log").find("Log stopped"), std::string::npos);
}

TEST(LogKeeps, ALoggerWhoseMessageDropsItsLastReference) {
  auto Log = Logger()->GetLogger(u"dropped.here");
  const auto Appender = IntfRef<TNotingAppender>(New<TNotingAppender>());
  Log->AddAppender(IntfRef<IZqLogAppender>(Appender.Get()));
  Logger()->AddAppender(IntfRef<IZqLogAppender>(Appender.Get()));
  Appender->OnWrite = [&](PZqDataRec) { Log.Reset(); };
  Log->Info(u"x");
  Logger()->ClearAppenders();
  EXPECT_EQ(Appender->Notes(), (TLines{"root.dropped.here Info x", "root Info x"}));
  EXPECT_EQ(Logger()->GetChildLoggers()->Count(), 0);
}

}  // namespace
}  // namespace zq
