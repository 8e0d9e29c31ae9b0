#include "common/uZqLogAppenders.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <set>
#include <thread>

#include "runtime/text/numbers.h"
#include "tests/support/logging.h"

namespace zq {
namespace {

using TLines = std::vector<std::string>;

constexpr char cTime[] = "2021-12-23 10:53:18:123";

// ---------------------------------------------------------------------------------------- layout

TEST(LayoutSimple, MakesTheToldLine) {
  TScriptedClock Clock;
  const TPlatformOverride<TClockService> Override(Clock);
  const IntfRef<IZqLogBase> Made(New<TZqSimpleLayout>(Logger(), u"l"));
  const auto Layout = Made.As<IZqLogLayout>();
  const auto Line = [&](TZqLogLevel ALevel, PZqDataRec AValue, TZqLogIndent AIndent) {
    return Layout->FormatLine(u"root.a", ALevel, u"x", AValue, AIndent).ToUTF8();
  };
  const std::string Time = cTime;
  EXPECT_EQ(Line(llInfo, nullptr, liIndentDecrease), Time + " - Info root.a - x") << "nothing to cut";
  EXPECT_EQ(Line(llDebug, nullptr, liIndentIncrease), "  " + Time + " - Debug root.a - x");
  EXPECT_EQ(Line(llDebug, nullptr, liIndentIncrease), "    " + Time + " - Debug root.a - x");
  EXPECT_EQ(Line(llDoNotLog, nullptr, liIndentDecrease), "  " + Time + " - Disabled root.a - x");
  const EConvertError Fault(u"bad");
  TZqDataRec Value;
  Value.DataType = rtkException;
  Value.VException = &Fault;
  EXPECT_EQ(Line(llFatal, &Value, liIndentDecrease), Time + " - Fatal root.a - x - EConvertError:bad");
  Clock.Microseconds += 876'999;  // to the last microsecond of the second
  EXPECT_EQ(Line(llInfo, nullptr, liIndentNone), "2021-12-23 10:53:18:999 - Info root.a - x");
  Clock.Microseconds += 1;
  EXPECT_EQ(Line(llInfo, nullptr, liIndentNone), "2021-12-23 10:53:19:000 - Info root.a - x");
}

// ---------------------------------------------------------------------------------------- file appender

struct TFileFixture : TLoggerFixture {
  TFileFixture() : Override(Clock) { File = AddFile(Log, Folder.File("app.log")); }
  TScriptedClock Clock;
  TPlatformOverride<TClockService> Override;
  TTempFolder Folder;
  IntfRef<IZqFileAppender> File;
};

TEST(AppenderFile, WritesHeaderLinesAndFooterInUtf8) {
  TFileFixture Fixture;
  Fixture.Log->GetLogger(u"a.b")->Info(u"gr\u00fc\u00df \U0001F600");
  Fixture.Log->Warn(u"two\r\nlines");
  const TLines Open = SplitLines(Fixture.Folder.Read("app.log"));
  ASSERT_EQ(Open.size(), 5U);
  EXPECT_TRUE(Open[0].starts_with("Log started on : "));
  EXPECT_EQ(Open[1], std::string(cTime) + " - Info root.test - gr\u00fc\u00df \U0001F600");
  EXPECT_EQ(Open[2], std::string(cTime) + " - Warn root.test - two");
  EXPECT_EQ(Open[4], "");
  Fixture.File->Close();
  const TLines Closed = SplitLines(Fixture.Folder.Read("app.log"));
  EXPECT_TRUE(Closed.back().starts_with("Log stopped on : "));
  Fixture.Log->Info(u"again");
  EXPECT_NE(Fixture.Folder.Read("app.log").find(Closed.back() + Open[0] + "\r\n"), std::string::npos)
      << "the next header stands directly behind the footer";
}

TEST(AppenderFile, NotAppendingBeginsAnew) {
  TFileFixture Fixture;
  Fixture.Folder.Write("app.log", "old");
  Fixture.File->SetAppendExisting(false);
  Fixture.Log->Info(u"x");
  EXPECT_EQ(Fixture.Folder.Read("app.log").find("old"), std::string::npos);
}

TEST(AppenderFile, NameAndExtensionFollowEachOther) {
  const IntfRef<IZqLogBase> Made(New<TZqFileAppender>(Logger(), u"x"));
  const auto File = Made.As<IZqFileAppender>();
  EXPECT_EQ(File->GetFileExt(), u".log");
  File->SetFileName(u"x");
  EXPECT_EQ(File->GetFileName(), u"x.log");
  File->SetFileName(u"y.txt");
  EXPECT_EQ(File->GetFileExt(), u".txt");
  File->SetFileExt(u"out");
  EXPECT_EQ(File->GetFileName(), u"y.out");
  EXPECT_EQ(File->GetFileExt(), u".out");
}

TEST(AppenderFile, BlankNameOrNoLayoutGivesNoOutput) {
  TFileFixture Fixture;
  const auto Bare = Fixture.Log->GetAppenders()->Add(ZqFileAppender).As<IZqFileAppender>();
  Bare->SetFileName(Fixture.Folder.File("bare.log"));
  Fixture.File->SetFileName(u"   ");
  Fixture.File->SetFileExt(u"");
  EXPECT_EQ(Fixture.File->GetFileName(), u"   ");
  Fixture.Log->Info(u"x");
  EXPECT_EQ(Fixture.Folder.Names(), TLines{"bare.log"});
  EXPECT_EQ(Fixture.Folder.Read("bare.log"), "");
}

// Gives its texts away before it returns them.
// Takes itself off its appender before it makes its line.
class TOwnBytes : public Implements<TZqSimpleLayout, IZqLogByteLayout> {
 public:
  using Implements::Implements;
  void Initialize(TZqLogBase* ALogBase) override { FAppender = Supports<IZqLogAppenderEx>(ALogBase).Get(); }
  void AppendLine(utf8::TBuffer& ALine, const UnicodeString&, TZqLogLevel, const UnicodeString& ALogMessage, PZqDataRec,
      TZqLogIndent) override {
    if (ALogMessage == u"last") FAppender->SetLayout(IntfRef<IZqLogLayout>());
    ALine.Append(FPrefix + ALogMessage);
  }

 protected:
  ~TOwnBytes() override { FPrefix = u"freed "; }

 private:
  UnicodeString FPrefix = u"bytes ";
  IZqLogAppenderEx* FAppender = nullptr;
};

// Wraps a simple layout and shows that one's component.
class TWrapping : public Implements<TInterfacedObject, IZqLogLayout> {
 public:
  UnicodeString GetName() const override { return u"wrapping"; }
  TComponent* Component() override { return FInner->Component(); }
  UnicodeString GetHeader() override { return FInner->GetHeader(); }
  UnicodeString GetFooter() override { return FInner->GetFooter(); }
  UnicodeString FormatLine(
      const UnicodeString&, TZqLogLevel, const UnicodeString& ALogMessage, PZqDataRec, TZqLogIndent) override {
    return ALogMessage == u"none" ? u"" : u"wrapped " + ALogMessage;
  }

 protected:
  ~TWrapping() override = default;

 private:
  IntfRef<IZqLogLayout> FInner = IntfRef<IZqLogBase>(New<TZqSimpleLayout>(Logger(), u"")).As<IZqLogLayout>();
};

TEST(AppenderFile, ALayoutIsHeardInItsOwnWay) {
  TFileFixture Fixture;
  const auto Appender = Fixture.File.As<IZqLogAppenderEx>();
  const auto LastLine = [&](const char16_t* AMessage) {
    Fixture.Log->Info(AMessage);
    const TLines Lines = SplitLines(Fixture.Folder.Read("app.log"));
    return Lines[Lines.size() - 2];
  };
  Appender->SetLayout(IntfRef<IZqLogLayout>(New<TWrapping>()));
  EXPECT_EQ(LastLine(u"ä"), "wrapped ä");
  EXPECT_EQ(LastLine(u"none"), "wrapped ä");
  Appender->SetLayout(TZqLogBaseClass::Of<TZqSimpleLayout>());
  EXPECT_TRUE(LastLine(u"plain").ends_with(" - plain"));
  Appender->SetLayout(TZqLogBaseClass::Of<TOwnBytes>());
  EXPECT_EQ(LastLine(u"2"), "bytes 2");
  Fixture.Log->Info(u"last");  // goes nowhere: the file was closed from within
  EXPECT_EQ(Fixture.Folder.Read("app.log").find("last"), std::string::npos);
}

class TTalkingLayout : public TZqSimpleLayout {
 public:
  using TZqSimpleLayout::TZqSimpleLayout;
  UnicodeString GetHeader() override { return OnText(u"header"), u"header"; }
  UnicodeString GetFooter() override { return OnText(u"footer"), u"footer"; }
  UnicodeString FormatLine(
      const UnicodeString&, TZqLogLevel, const UnicodeString& ALogMessage, PZqDataRec, TZqLogIndent) override {
    return ALogMessage;
  }
  static inline std::function<void(const char16_t*)> OnText;

 protected:
  ~TTalkingLayout() override = default;
};

TEST(AppenderFile, LayoutThatLogsAndClosesFromItsHeaderAndFooterLosesNoLine) {
  TFileFixture Fixture;
  TTalkingLayout::OnText = [&](const char16_t* AText) {
    Fixture.Log->Info(u"in " + UnicodeString(AText));
    Fixture.File->Close();
  };
  Fixture.File.As<IZqLogAppenderEx>()->SetLayout(TZqLogBaseClass::Of<TTalkingLayout>());
  Fixture.Log->Info(u"x");
  Fixture.File->Close();
  EXPECT_EQ(Fixture.Folder.Read("app.log"), "in header\r\nheader\r\nx\r\nin footer\r\nfooter");
}

class TReluctant : public TZqFileAppender {
 public:
  using TZqFileAppender::TZqFileAppender;
  static inline bool Refuses = false;

 protected:
  ~TReluctant() override = default;
  void BeforeDestruction() override {
    TZqFileAppender::BeforeDestruction();
    if (Refuses) throw EInvalidOperation(u"not yet");
  }
};

TEST(AppenderFile, ARefusedEndLeavesTheAppenderListedAndItsCountToEndIt) {
  const TLoggerFixture Fixture;
  auto Appender = Fixture.Log->GetAppenders()->Add(TZqLogBaseClass::Of<TReluctant>());
  auto* const Object = dynamic_cast<TReluctant*>(Appender->Component());
  Fixture.Log->ClearAppenders();
  TReluctant::Refuses = true;
  EXPECT_THROW(Appender.Reset(), EInvalidOperation);
  TReluctant::Refuses = false;
  EXPECT_EQ(LiveAppenders(), std::vector<TZqLogBase*>{Object});
  EXPECT_FALSE(Object->ComponentState().Contains(csDestroying));
  Appender = Object;
  Appender.Reset();
  EXPECT_TRUE(LiveAppenders().empty());
}

TEST(AppenderFile, MakesFoldersAndTakesNamesThatAreNoText) {
  TFileFixture Fixture;
  Fixture.File->SetFileName(Fixture.Folder.File("new") + u"/sub\\a\xDCFF.log");
  Fixture.Log->Info(u"x");
  EXPECT_TRUE(std::filesystem::exists(Fixture.Folder.Path() / "new/sub/a\xFF.log"));
}

TEST(AppenderTextFile, CountsBytesAndKeepsLongLinesWhole) {
  const TTempFolder Folder({"old"});
  TZqTextFile Fresh(Folder.File("fresh"));
  Fresh.WriteLn(u"abc");
  EXPECT_EQ(Fresh.Size(), 5U);
  Fresh.Write(u"\u00e4");
  EXPECT_EQ(Fresh.Size(), 7U);
  const UnicodeString Long(100'000, u'\u20ac');
  Fresh.WriteLn(Long);
  EXPECT_EQ(Fresh.Size(), 7U + 300'002U);
  EXPECT_EQ(Folder.Read("fresh"), "abc\r\n\u00e4" + Long.ToUTF8() + "\r\n");
  EXPECT_EQ(TZqTextFile(Folder.File("old")).Size(), 3U);
  EXPECT_THROW(TZqTextFile(Folder.File("old/below")), EInOutError);
}

// ---------------------------------------------------------------------------------------- rolling appender

struct TRollCase {
  const char* Name;
  std::vector<const char*> Before;
  Word MaxBackupCount;
  // name and what it holds now, by the name that the file had
  std::vector<std::pair<std::string, std::string>> After;
};
class AppenderRollOver : public testing::TestWithParam<TRollCase> {};

TEST_P(AppenderRollOver, RenumbersTheSeriesAndNothingElse) {
  const TTempFolder Folder(GetParam().Before);
  std::filesystem::create_directory(Folder.Path() / "app.9.log");  // a folder of such a name
  const IntfRef<IZqLogBase> Made(New<TZqRollingFileAppender>(Logger(), u"x"));
  const auto File = Made.As<IZqRollingFileAppender>();
  File->SetFileName(Folder.File("app.log"));
  File->SetMaxBackupCount(GetParam().MaxBackupCount);
  File->RollOver();
  std::vector<std::pair<std::string, std::string>> After;
  for (const std::string& Name : Folder.Names())
    if (Name != "app.9.log") After.emplace_back(Name, Folder.Read(Name));
  EXPECT_EQ(After, GetParam().After);
}
INSTANTIATE_TEST_SUITE_P(Series, AppenderRollOver,
    testing::Values(TRollCase{"FirstRoll", {"app.log"}, 5, {{"app.1.log", "app.log"}, {"app.log", ""}}},
        TRollCase{"GapClosesAndNothingIsOverwritten", {"app.log", "app.3.log", "app.7.log"}, 5,
            {{"app.1.log", "app.log"}, {"app.2.log", "app.3.log"}, {"app.3.log", "app.7.log"}, {"app.log", ""}}},
        TRollCase{"OldestGo", {"app.log", "app.1.log", "app.2.log"}, 3,
            {{"app.1.log", "app.log"}, {"app.2.log", "app.1.log"}, {"app.log", ""}}},
        TRollCase{"OneFileOnly", {"app.log", "app.1.log"}, 1, {{"app.log", ""}}},
        TRollCase{"NumbersWithZerosAndOfTwoDigits", {"app.log", "app.007.log", "app.10.log"}, 9,
            {{"app.1.log", "app.log"}, {"app.2.log", "app.007.log"}, {"app.3.log", "app.10.log"}, {"app.log", ""}}},
        TRollCase{"ForeignFilesComeToNoHarm",
            {"app.log", "apple.log", "app.xsl", "app.1.log.gz", "app.x.log", "app.3.x.log", "APP.1.log", "app1.log",
                "app..log"},
            2,
            {{"APP.1.log", "APP.1.log"}, {"app..log", "app..log"}, {"app.1.log", "app.log"},
                {"app.1.log.gz", "app.1.log.gz"}, {"app.3.x.log", "app.3.x.log"}, {"app.log", ""},
                {"app.x.log", "app.x.log"}, {"app.xsl", "app.xsl"}, {"app1.log", "app1.log"},
                {"apple.log", "apple.log"}}}),
    [](const auto& AInfo) { return std::string(AInfo.param.Name); });

TEST(AppenderRolling, TakesNamesApart) {
  const IntfRef<IZqLogBase> Made(New<TZqRollingFileAppender>(Logger(), u"x"));
  auto& Rolling = dynamic_cast<TZqRollingFileAppender&>(*Made);
  Rolling.SetFileName(u"/l/app.log");
  const std::tuple<const char16_t*, Integer, const char16_t*> cCases[] = {{u"app.log", 0, u""}, {u"app.3.log", 3, u""},
      {u"app.3.x.log", 3, u".x"}, {u"apple.log", 0, u"le"}, {u"app.x.log", 0, u""}, {u"app.007.log", 7, u""}};
  for (const auto& [File, Index, Right] : cCases) {
    const auto Info = Rolling.CreateFileInfo(File);
    EXPECT_EQ(Info->FileNameLeft, u"app");
    EXPECT_EQ(Info->Index, Index) << UnicodeString(File).ToUTF8();
    EXPECT_EQ(Info->FileNameRight, Right) << UnicodeString(File).ToUTF8();
  }
}

struct TRollingFixture : TLoggerFixture {
  TRollingFixture() {
    File = AddFile<TZqRollingFileAppender>(Log, Folder.File("app.log")).As<IZqRollingFileAppender>();
  }
  TTempFolder Folder;
  IntfRef<IZqRollingFileAppender> File;
};

TEST(AppenderRolling, RollsAtTheLimitAndNotBelow) {
  TRollingFixture Fixture;
  Fixture.Log->Info(u"x");
  const auto Size = static_cast<Cardinal>(Fixture.Folder.Read("app.log").size());
  Fixture.File->SetMaxFileSize(Size + 1);
  Fixture.Log->Info(u"goes in still");
  EXPECT_EQ(Fixture.Folder.Names(), TLines{"app.log"});
  Fixture.File->SetMaxFileSize(static_cast<Cardinal>(Fixture.Folder.Read("app.log").size()));
  Fixture.Log->Info(u"rolls");
  EXPECT_EQ(Fixture.Folder.Names(), (TLines{"app.1.log", "app.log"}));
  EXPECT_TRUE(SplitLines(Fixture.Folder.Read("app.1.log")).back().starts_with("Log stopped on : "));
  const TLines Fresh = SplitLines(Fixture.Folder.Read("app.log"));
  EXPECT_TRUE(Fresh[0].starts_with("Log started on : "));
  EXPECT_TRUE(Fresh[1].ends_with(" - rolls"));
}

TEST(AppenderRolling, OldOversizedFileRollsAtTheSecondWrite) {
  TRollingFixture Fixture;
  Fixture.Folder.Write("app.log", std::string(100, 'o'));
  Fixture.File->SetMaxFileSize(50);
  Fixture.Log->Info(u"first");
  EXPECT_EQ(Fixture.Folder.Names(), TLines{"app.log"});
  Fixture.Log->Info(u"second");
  EXPECT_EQ(Fixture.Folder.Names(), (TLines{"app.1.log", "app.log"}));
}

TEST(AppenderRolling, NotAppendingKeepsTheOldFileAsABackup) {
  TRollingFixture Fixture;
  Fixture.Folder.Write("app.log", "old");
  Fixture.File->SetAppendExisting(false);
  Fixture.Log->Info(u"x");
  EXPECT_EQ(Fixture.Folder.Read("app.1.log"), "old");
}

TEST(AppenderRolling, NoBackupsMeansNoOutput) {
  TRollingFixture Fixture;
  Fixture.Log->Info(u"x");
  Fixture.File->RollOver();
  Fixture.File->SetMaxBackupCount(0);
  Fixture.Log->Info(u"y");
  EXPECT_TRUE(Fixture.Folder.Names().empty());
  Fixture.File->SetMaxBackupCount(5);
  Fixture.Log->Info(u"z");
  EXPECT_EQ(Fixture.Folder.Names(), TLines{"app.log"}) << "it writes again";
}

TEST(AppenderRolling, ExtensionWithADotOfItsOwnKeepsItsBackups) {
  TRollingFixture Fixture;
  Fixture.File->SetFileExt(u".log.txt");
  for (int i = 0; i < 3; ++i) Fixture.File->RollOver();
  EXPECT_EQ(Fixture.Folder.Names(), (TLines{"app.log.1.txt", "app.log.2.txt", "app.log.txt"}));
}

// ---------------------------------------------------------------------------------------- threads and faults

TLines MessagesIn(const TTempFolder& AFolder) {
  TLines Result;
  for (const std::string& Name : AFolder.Names())
    for (const std::string& Line : SplitLines(AFolder.Read(Name)))
      if (const auto Found = Line.find(" - Info "); Found != std::string::npos)
        Result.push_back(Line.substr(Line.rfind(' ') + 1));
  std::sort(Result.begin(), Result.end());
  return Result;
}

TLines Expected(int AThreads, int ALines) {
  TLines Result;
  for (int t = 0; t < AThreads; ++t)
    for (int i = 0; i < ALines; ++i) Result.push_back(std::to_string(t) + "/" + std::to_string(i));
  std::sort(Result.begin(), Result.end());
  return Result;
}

void LogOnThreads(int AThreads, int ALines, const std::function<void(int, const UnicodeString&)>& ALog) {
  std::vector<std::thread> Threads;
  for (int t = 0; t < AThreads; ++t)
    Threads.emplace_back([&, t] {
      for (int i = 0; i < ALines; ++i) ALog(t, FromUTF8(std::to_string(t) + "/" + std::to_string(i)));
    });
  for (std::thread& Thread : Threads) Thread.join();
}

TEST(AppenderThreads, EveryLineIsWholeWhileFilesRoll) {
  TRollingFixture Fixture;
  Fixture.File->SetMaxFileSize(4000);
  Fixture.File->SetMaxBackupCount(1000);
  LogOnThreads(4, 500, [&](int, const UnicodeString& AText) { Fixture.Log->Info(AText); });
  EXPECT_EQ(MessagesIn(Fixture.Folder), Expected(4, 500));
  EXPECT_GT(Fixture.Folder.Names().size(), 10U);
}

TEST(AppenderThreads, TwoAppendersOfOneNameAndFileLoseNothing) {
  const TTempFolder Folder;
  const TLoggerFixture First(u"p");
  const TLoggerFixture Second(u"q");
  const IntfRef<IZqLogger> Logs[] = {First.Log, Second.Log};
  for (int Round = 0; Round < 20; ++Round) {  // the first line opens the file, on both threads at once
    for (const auto& Log : Logs) AddFile(Log, Folder.File("app" + std::to_string(Round) + ".log"));
    LogOnThreads(2, 20, [&](int t, const UnicodeString& AText) { Logs[t]->Info(AText); });
    for (const auto& Log : Logs) Log->ClearAppenders();
  }
  TLines All;
  for (int Round = 0; Round < 20; ++Round)
    for (const std::string& Line : Expected(2, 20)) All.push_back(Line);
  std::sort(All.begin(), All.end());
  EXPECT_EQ(MessagesIn(Folder), All);
}

/// A file system of ABytes over a folder of its own; needs the right to mount.
struct TSmallDisk {
  explicit TSmallDisk(const char* AOptions) {
    Mounted = ::mount("tmpfs", Folder.Path().c_str(), "tmpfs", 0, AOptions) == 0;
  }
  ~TSmallDisk() {
    if (Mounted) ::umount2(Folder.Path().c_str(), MNT_DETACH);
  }
  TTempFolder Folder;
  bool Mounted = false;
};

TEST(AppenderFaults, FullDiskRaisesNothingAndLosesNothingAcknowledged) {
  const TSmallDisk Disk("size=256k");
  if (!Disk.Mounted) GTEST_SKIP() << "no right to mount";
  const TLoggerFixture Fixture;
  const auto File = AddFile(Fixture.Log, Disk.Folder.File("app.log"));
  const UnicodeString Long(1000, u'x');
  int Sent = 0;
  for (; Sent < 400; ++Sent) EXPECT_NO_THROW(Fixture.Log->Info(IntToStr(Sent) + u" " + Long));
  const auto Whole = static_cast<int>(SplitLines(Disk.Folder.Read("app.log")).size());
  EXPECT_GT(Whole, 200);
  std::filesystem::resize_file(Disk.Folder.Path() / "app.log", 100'000);  // room again
  Fixture.Log->Info(u"after");
  const TLines Lines = SplitLines(Disk.Folder.Read("app.log"));
  EXPECT_TRUE(Lines[Lines.size() - 2].ends_with(" - Info root.test - after")) << "on a line of its own";
  for (int i = 0; i < 90; ++i)
    EXPECT_NE(Lines[static_cast<std::size_t>(i) + 1].find(" - " + std::to_string(i) + " x"), std::string::npos);
}

TEST(AppenderFaults, FullDiskRollsOnOverItsOldestFiles) {
  const TSmallDisk Disk("size=256k");
  if (!Disk.Mounted) GTEST_SKIP() << "no right to mount";
  const TLoggerFixture Fixture;
  const auto File =
      AddFile<TZqRollingFileAppender>(Fixture.Log, Disk.Folder.File("app.log")).As<IZqRollingFileAppender>();
  File->SetMaxFileSize(60'000);
  File->SetMaxBackupCount(4);
  const UnicodeString Long(1000, u'x');
  for (int i = 0; i < 600; ++i) EXPECT_NO_THROW(Fixture.Log->Info(IntToStr(i) + u" " + Long));
  EXPECT_NE(Disk.Folder.Read("app.log").find(" - 599 x"), std::string::npos);
}

TEST(AppenderFaults, EndsThoughItsFooterCannotBeWritten) {
  const TSmallDisk Disk("size=64k");
  if (!Disk.Mounted) GTEST_SKIP() << "no right to mount";
  const auto Handles = [] { return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {}); };
  const auto Before = Handles();
  {
    const TLoggerFixture Fixture;
    const auto File = AddFile(Fixture.Log, Disk.Folder.File("app.log"));
    while (std::filesystem::space(Disk.Folder.Path()).available > 0) Fixture.Log->Info(UnicodeString(1000, u'x'));
    for (int i = 0; i < 5; ++i) Fixture.Log->Info(UnicodeString(1000, u'x'));
  }
  EXPECT_TRUE(LiveAppenders().empty());
  EXPECT_EQ(Handles(), Before);
}

TEST(AppenderFaults, FolderTakenAwayComesBackWithTheNextOpening) {
  TRollingFixture Fixture;
  const auto Sub = Fixture.Folder.Path() / "sub";
  Fixture.File->SetFileName(Fixture.Folder.File("sub/app.log"));
  Fixture.Log->Info(u"one");
  std::filesystem::remove_all(Sub);
  EXPECT_NO_THROW(Fixture.Log->Info(u"two"));
  Fixture.File->RollOver();
  EXPECT_NO_THROW(Fixture.Log->Info(u"three"));
  EXPECT_NE(ReadFile(Sub / "app.log").find(" - three"), std::string::npos);
  Fixture.File->Close();
  std::filesystem::remove_all(Sub);
  Fixture.Folder.Write("sub", "a file in the place of the folder");
  EXPECT_NO_THROW(Fixture.Log->Info(u"four"));
  std::filesystem::remove(Sub);
  Fixture.Log->Info(u"five");
  EXPECT_NE(ReadFile(Sub / "app.log").find(" - five"), std::string::npos);
}

TEST(AppenderFaults, KilledProcessLeavesEveryLineWhoseCallReturned) {
  const TTempFolder Folder;
  int Pipe[2];
  ASSERT_EQ(::pipe(Pipe), 0);
  const pid_t Child = ::fork();
  if (Child == 0) {
    ::close(Pipe[0]);
    const TLoggerFixture Fixture;
    AddFile(Fixture.Log, Folder.File("app.log"));
    for (int i = 0;; ++i) {
      Fixture.Log->Info(FromUTF8("0/" + std::to_string(i)));
      if (::write(Pipe[1], &i, sizeof i) != sizeof i) ::_exit(1);
    }
  }
  ::close(Pipe[1]);
  int Last = 0;
  while (Last < 500) ASSERT_EQ(::read(Pipe[0], &Last, sizeof Last), static_cast<ssize_t>(sizeof Last));
  ::kill(Child, SIGKILL);
  while (::read(Pipe[0], &Last, sizeof Last) == static_cast<ssize_t>(sizeof Last))
    continue;  // what it had told by then
  ::close(Pipe[0]);
  ::waitpid(Child, nullptr, 0);
  const TLines Found = MessagesIn(Folder);
  const TLines Told = Expected(1, Last + 1);
  EXPECT_TRUE(std::includes(Found.begin(), Found.end(), Told.begin(), Told.end()))
      << Found.size() << " of " << Last + 1;
}

}  // namespace
}  // namespace zq
