#include "common/uZqLogAppenders.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>

#include "common/uZqLogger/failures.h"
#include "runtime/text/numbers.h"
#include "tests/fakes/clock.h"
#include "tests/support/logging.h"

namespace zq {
namespace {

using TLines = std::vector<std::string>;

const std::string cTime = "2021-12-23 10:53:18:123";

// ---------------------------------------------------------------------------------------- layout

TEST(LayoutSimple, MakesTheToldLine) {
  TScriptedClock Clock;
  const auto Layout = IntfRef<IZqLogBase>(New<TZqSimpleLayout>(Logger(), u"l")).As<IZqLogLayout>();
  const auto Line = [&](TZqLogLevel ALevel, PZqDataRec AValue, TZqLogIndent AIndent) {
    return Layout->FormatLine(u"root.a", ALevel, u"x", AValue, AIndent).ToUTF8();
  };
  EXPECT_EQ(Line(llInfo, nullptr, liIndentDecrease), cTime + " - Info root.a - x") << "nothing to cut";
  EXPECT_EQ(Line(llDebug, nullptr, liIndentIncrease), "  " + cTime + " - Debug root.a - x");
  EXPECT_EQ(Line(llDebug, nullptr, liIndentIncrease), "    " + cTime + " - Debug root.a - x");
  EXPECT_EQ(Line(llDoNotLog, nullptr, liIndentDecrease), "  " + cTime + " - Disabled root.a - x");
  const EConvertError Fault(u"bad");
  TZqDataRec Value;
  Value.DataType = rtkException;
  Value.VException = &Fault;
  EXPECT_EQ(Line(llFatal, &Value, liIndentDecrease), cTime + " - Fatal root.a - x - EConvertError:bad");
  Clock.Microseconds += 876'999;  // to the last microsecond of the second
  EXPECT_EQ(Line(llInfo, nullptr, liIndentNone), "2021-12-23 10:53:18:999 - Info root.a - x");
  Clock.Microseconds += 1;
  EXPECT_EQ(Line(llInfo, nullptr, liIndentNone), "2021-12-23 10:53:19:000 - Info root.a - x");
}

// ---------------------------------------------------------------------------------------- file appender

struct AppenderFile : testing::Test, TLoggerFixture {
  const TScriptedClock Clock;
  const TTempFolder Folder;
  const IntfRef<IZqFileAppender> File = AddFile(Log, Folder.File("app.log"));
};

TEST_F(AppenderFile, WritesHeaderLinesAndFooterInUtf8) {
  Log->GetLogger(u"a.b")->Info(u"gr\u00fc\u00df \U0001F600");
  Log->Warn(u"two\r\nlines");
  const TLines Open = SplitLines(Folder.Read("app.log"));
  ASSERT_THAT(Open,
      testing::ElementsAre(testing::StartsWith("Log started on : "),
          cTime + " - Info root.test - gr\u00fc\u00df \U0001F600", cTime + " - Warn root.test - two", "lines", ""));
  File->Close();
  const TLines Closed = SplitLines(Folder.Read("app.log"));
  EXPECT_TRUE(Closed.back().starts_with("Log stopped on : "));
  Log->Info(u"again");
  EXPECT_NE(Folder.Read("app.log").find(Closed.back() + Open[0] + "\r\n"), std::string::npos)
      << "the next header stands directly behind the footer";
}

TEST_F(AppenderFile, NotAppendingBeginsAnew) {
  Folder.Write("app.log", "old");
  File->SetAppendExisting(false);
  Log->Info(u"x");
  EXPECT_EQ(Folder.Read("app.log").find("old"), std::string::npos);
}

TEST_F(AppenderFile, NameAndExtensionFollowEachOther) {
  EXPECT_EQ(File->GetFileExt(), u".log");
  File->SetFileName(u"x");
  EXPECT_EQ(File->GetFileName(), u"x.log");
  File->SetFileName(u"y.txt");
  EXPECT_EQ(File->GetFileExt(), u".txt");
  File->SetFileExt(u"out");
  EXPECT_EQ(File->GetFileName() + File->GetFileExt(), u"y.out.out");
}

TEST_F(AppenderFile, BlankNameOrNoLayoutGivesNoOutput) {
  const auto Bare = Log->GetAppenders()->Add(std::u16string(u"tzqfileappender")).As<IZqFileAppender>();
  Bare->SetFileName(Folder.File("bare.log"));
  File->SetFileName(u"   ");
  File->SetFileExt(u"");
  EXPECT_EQ(File->GetFileName(), u"   ");
  Log->Info(u"x");
  EXPECT_EQ(Folder.Names(), TLines{"bare.log"});
  EXPECT_EQ(Folder.Read("bare.log"), "");
}

// Takes itself off its appender before it makes its line.
struct TOwnBytes : Implements<TZqSimpleLayout, IZqLogByteLayout> {
  using Implements::Implements;
  void Initialize(TZqLogBase* ALogBase) override { FAppender = Supports<IZqLogAppenderEx>(ALogBase).Get(); }
  void AppendLine(utf8::TBuffer& ALine, const UnicodeString&, TZqLogLevel, const UnicodeString& ALogMessage, PZqDataRec,
      TZqLogIndent) override {
    if (ALogMessage == u"last") FAppender->SetLayout(IntfRef<IZqLogLayout>());
    ALine.Append(FPrefix + ALogMessage);
  }
  ~TOwnBytes() override { FPrefix = u"freed "; }
  UnicodeString FPrefix = u"bytes ";
  IZqLogAppenderEx* FAppender = nullptr;
};

// Wraps a simple layout and shows that one's component.
struct TWrapping : Implements<TInterfacedObject, IZqLogLayout> {
  UnicodeString GetName() const override { return u"wrapping"; }
  TComponent* Component() override { return FInner->Component(); }
  UnicodeString GetHeader() override { return FInner->GetHeader(); }
  UnicodeString GetFooter() override { return FInner->GetFooter(); }
  UnicodeString FormatLine(
      const UnicodeString&, TZqLogLevel, const UnicodeString& ALogMessage, PZqDataRec, TZqLogIndent) override {
    return ALogMessage == u"none" ? u"" : u"wrapped " + ALogMessage;
  }
  IntfRef<IZqLogLayout> FInner = IntfRef<IZqLogBase>(New<TZqSimpleLayout>(Logger(), u"")).As<IZqLogLayout>();
};

TEST_F(AppenderFile, ALayoutIsHeardInItsOwnWay) {
  const auto Appender = File.As<IZqLogAppenderEx>();
  const auto LastLine = [&](const char16_t* AMessage) {
    Log->Info(AMessage);
    const TLines Lines = SplitLines(Folder.Read("app.log"));
    return Lines[Lines.size() - 2];
  };
  Appender->SetLayout(IntfRef<IZqLogLayout>(New<TWrapping>()));
  EXPECT_EQ(LastLine(u"ä"), "wrapped ä");
  EXPECT_EQ(LastLine(u"none"), "wrapped ä");
  Appender->SetLayout(TZqLogBaseClass::Of<TZqSimpleLayout>());
  EXPECT_TRUE(LastLine(u"plain").ends_with(" - plain"));
  Appender->SetLayout(TZqLogBaseClass::Of<TOwnBytes>());
  EXPECT_EQ(LastLine(u"2"), "bytes 2");
  Log->Info(u"last");  // goes nowhere: the file was closed from within
  EXPECT_EQ(Folder.Read("app.log").find("last"), std::string::npos);
}

// Gives its texts away before it returns them.
struct TTalkingLayout : TZqSimpleLayout {
  using TZqSimpleLayout::TZqSimpleLayout;
  UnicodeString GetHeader() override { return OnText(u"header"), u"header"; }
  UnicodeString GetFooter() override { return OnText(u"footer"), u"footer"; }
  UnicodeString FormatLine(
      const UnicodeString&, TZqLogLevel, const UnicodeString& ALogMessage, PZqDataRec, TZqLogIndent) override {
    return ALogMessage;
  }
  static inline std::function<void(const char16_t*)> OnText;
};

TEST_F(AppenderFile, LayoutThatLogsAndClosesFromItsHeaderAndFooterLosesNoLine) {
  TTalkingLayout::OnText = [&](const char16_t* AText) {
    Log->Info(u"in " + UnicodeString(AText));
    File->Close();
  };
  File.As<IZqLogAppenderEx>()->SetLayout(TZqLogBaseClass::Of<TTalkingLayout>());
  Log->Info(u"x");
  File->Close();
  EXPECT_EQ(Folder.Read("app.log"), "in header\r\nheader\r\nx\r\nin footer\r\nfooter");
}

struct TReluctant : TZqFileAppender {
  using TZqFileAppender::TZqFileAppender;
  void BeforeDestruction() override {
    TZqFileAppender::BeforeDestruction();
    if (Refuses) throw EInvalidOperation(u"not yet");
  }
  static inline bool Refuses = false;
};

TEST(AppenderEnd, ARefusedOneLeavesTheAppenderListedAndItsCountToEndIt) {
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

TEST_F(AppenderFile, MakesFoldersAndTakesNamesThatAreNoText) {
  File->SetFileName(Folder.File("new") + u"/sub\\a\xDCFF.log");
  Log->Info(u"x");
  EXPECT_TRUE(std::filesystem::exists(Folder.Path() / "new/sub/a\xFF.log"));
}

TEST(AppenderTextFile, CountsItsBytes) {
  const TTempFolder Folder({"old"});
  TZqTextFile Fresh(Folder.File("fresh"));
  Fresh.WriteLn(u"abc");
  EXPECT_EQ(Fresh.Size(), 5U);
  Fresh.Write(u"\u00e4");
  EXPECT_EQ(Fresh.Size(), 7U);
  EXPECT_EQ(Folder.Read("fresh"), "abc\r\n\u00e4");
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
  const auto File = IntfRef<IZqLogBase>(New<TZqRollingFileAppender>(Logger(), u"x")).As<IZqRollingFileAppender>();
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

struct AppenderRolling : testing::Test, TLoggerFixture {
  const TTempFolder Folder;
  const IntfRef<IZqRollingFileAppender> File =
      AddFile<TZqRollingFileAppender>(Log, Folder.File("app.log")).As<IZqRollingFileAppender>();
};

TEST_F(AppenderRolling, TakesNamesApart) {
  const std::tuple<const char16_t*, Integer, const char16_t*> cCases[] = {{u"app.log", 0, u""}, {u"app.3.log", 3, u""},
      {u"app.3.x.log", 3, u".x"}, {u"apple.log", 0, u"le"}, {u"app.x.log", 0, u""}, {u"app.007.log", 7, u""}};
  for (const auto& [Name, Index, Right] : cCases) {
    const auto Info = dynamic_cast<TZqRollingFileAppender&>(*File).CreateFileInfo(Name);
    EXPECT_EQ(Info->FileNameLeft + u"|" + Info->FileNameRight, u"app|" + UnicodeString(Right));
    EXPECT_EQ(Info->Index, Index) << ToUTF8(Name);
  }
}

TEST_F(AppenderRolling, RollsAtTheLimitAndNotBelow) {
  Log->Info(u"x");
  const auto Size = static_cast<Cardinal>(Folder.Read("app.log").size());
  File->SetMaxFileSize(Size + 1);
  Log->Info(u"goes in still");
  EXPECT_EQ(Folder.Names(), TLines{"app.log"});
  File->SetMaxFileSize(static_cast<Cardinal>(Folder.Read("app.log").size()));
  Log->Info(u"rolls");
  EXPECT_EQ(Folder.Names(), (TLines{"app.1.log", "app.log"}));
  EXPECT_TRUE(SplitLines(Folder.Read("app.1.log")).back().starts_with("Log stopped on : "));
  const TLines Fresh = SplitLines(Folder.Read("app.log"));
  EXPECT_TRUE(Fresh[0].starts_with("Log started on : ") && Fresh[1].ends_with(" - rolls"));
}

TEST_F(AppenderRolling, OldOversizedFileRollsAtTheSecondWrite) {
  Folder.Write("app.log", std::string(100, 'o'));
  File->SetMaxFileSize(50);
  Log->Info(u"first");
  EXPECT_EQ(Folder.Names(), TLines{"app.log"});
  Log->Info(u"second");
  EXPECT_EQ(Folder.Names(), (TLines{"app.1.log", "app.log"}));
}

TEST_F(AppenderRolling, ExtensionWithADotOfItsOwnKeepsItsBackups) {
  File->SetFileExt(u".log.txt");
  for (int i = 0; i < 3; ++i) File->RollOver();
  EXPECT_EQ(Folder.Names(), (TLines{"app.log.1.txt", "app.log.2.txt", "app.log.txt"}));
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
  OnThreads(AThreads, [&](int t) {
    for (int i = 0; i < ALines; ++i) ALog(t, FromUTF8(std::to_string(t) + "/" + std::to_string(i)));
  });
}

TEST_F(AppenderRolling, EveryLineOfManyThreadsIsWholeWhileFilesRoll) {
  File->SetMaxFileSize(4000);
  File->SetMaxBackupCount(1000);
  LogOnThreads(4, 500, [&](int, const UnicodeString& AText) { Log->Info(AText); });
  EXPECT_EQ(MessagesIn(Folder), Expected(4, 500));
  EXPECT_GT(Folder.Names().size(), 10U);
}

TEST(AppenderThreads, TwoAppendersOfOneNameAndFileAreToldAndLoseNothing) {
  std::atomic<int> Told = 0;
  ZqSetLogFailureHandler([&](const TZqLogFailure& AFailure) { Told += AFailure.Error.Pos(u"by another") > 0 ? 1 : 0; });
  const TLoggerFixture Loggers[] = {TLoggerFixture(u"p"), TLoggerFixture(u"q")};
  for (int Round = 0; Round < 20; ++Round) {  // the first line opens the file, on both threads at once
    const TTempFolder Folder;
    for (const auto& [Log] : Loggers) AddFile(Log, Folder.File("app.log"));
    LogOnThreads(2, 20, [&](int t, const UnicodeString& AText) { Loggers[t].Log->Info(AText); });
    for (const auto& [Log] : Loggers) Log->ClearAppenders();
    EXPECT_EQ(MessagesIn(Folder), Expected(2, 20));
  }
  ZqSetLogFailureHandler(nullptr);
  EXPECT_EQ(Told, 20);
}

// A small file system over a folder of its own; needs the right to mount.
struct AppenderOnFullDisk : testing::Test {
  void SetUp() override {
    if (::mount("tmpfs", Folder.Path().c_str(), "tmpfs", 0, "size=256k") != 0) GTEST_SKIP() << "no right to mount";
  }
  void TearDown() override { ::umount2(Folder.Path().c_str(), MNT_DETACH); }
  const TTempFolder Folder;
  const UnicodeString Long = UnicodeString(1000, u'x');
};

TEST_F(AppenderOnFullDisk, RaisesNothingAndLosesNothingAcknowledged) {
  const TLoggerFixture Fixture;
  const auto File = AddFile(Fixture.Log, Folder.File("app.log"));
  for (int i = 0; i < 400; ++i) EXPECT_NO_THROW(Fixture.Log->Info(IntToStr(i) + u" " + Long));
  EXPECT_GT(SplitLines(Folder.Read("app.log")).size(), 200U);
  std::filesystem::resize_file(Folder.Path() / "app.log", 100'000);  // room again
  Fixture.Log->Info(u"after");
  const TLines Lines = SplitLines(Folder.Read("app.log"));
  EXPECT_TRUE(Lines[Lines.size() - 2].ends_with(" - Info root.test - after")) << "on a line of its own";
  for (int i = 0; i < 90; ++i)
    EXPECT_NE(Lines[static_cast<std::size_t>(i) + 1].find(" - " + std::to_string(i) + " x"), std::string::npos);
}

TEST_F(AppenderOnFullDisk, RollsOnOverItsOldestFiles) {
  const TLoggerFixture Fixture;
  const auto File = AddFile<TZqRollingFileAppender>(Fixture.Log, Folder.File("app.log")).As<IZqRollingFileAppender>();
  File->SetMaxFileSize(60'000);
  File->SetMaxBackupCount(4);
  for (int i = 0; i < 600; ++i) EXPECT_NO_THROW(Fixture.Log->Info(IntToStr(i) + u" " + Long));
  EXPECT_NE(Folder.Read("app.log").find(" - 599 x"), std::string::npos);
}

TEST_F(AppenderRolling, FolderTakenAwayComesBackWithTheNextOpening) {
  const auto Sub = Folder.Path() / "sub";
  File->SetFileName(Folder.File("sub/app.log"));
  Log->Info(u"one");
  std::filesystem::remove_all(Sub);
  EXPECT_NO_THROW(Log->Info(u"two"));
  File->RollOver();
  EXPECT_NO_THROW(Log->Info(u"three"));
  EXPECT_NE(ReadFile(Sub / "app.log").find(" - three"), std::string::npos);
}

TEST(AppenderThreads, KilledProcessLeavesEveryLineWhoseCallReturned) {
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
