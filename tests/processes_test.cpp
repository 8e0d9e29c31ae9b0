#include "tests/fakes/processes.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <thread>

#include "common/uZqWindows.h"
#include "runtime/io/paths.h"
#include "runtime/sync/critical_section.h"
#include "runtime/sync/event.h"
#include "runtime/text/encoding.h"

namespace zq {
namespace {

namespace fs = std::filesystem;
using testing::_, testing::AllOf, testing::Eq, testing::Field, testing::Return;

bool Soon(const std::function<bool()>& ACondition) {
  for (int i = 0; i < 1000 && !ACondition(); ++i) std::this_thread::sleep_for(std::chrono::milliseconds(10));
  return ACondition();
}

bool HasChildren() {
  siginfo_t Info{};
  return ::waitid(P_ALL, 0, &Info, WEXITED | WNOHANG | WNOWAIT) == 0;
}

UnicodeString Captured(const UnicodeString& ACommand) { return ZqRunProcessAndCaptureOutput(ACommand, u"", false); }

// ------------------------------------------------------------------------------------------------- Captured output

TEST(CapturedOutput, OfCommandsInTheirForms) {
  const std::pair<const char16_t*, const char16_t*> Cases[] = {
      {u"printf '<%s>' 'a  b' \"c\\\"\\d$x*\\$\" e\\ f '' \"it's\"'\\' ~\t|",
          u"<a  b><c\"\\d$x*$><e f><><it's\\><~><|>"},
      {u" printf a\\\nb\\", u"ab\\"}, {u"printf %s \xDCE4\xDC5C", u"ä\\"}, {u"true", u""},
      {u"sh -c 'echo out; echo err >&2; exit 3'", u"out\nerr\n"}, {u"sh -c 'printf x; kill -9 $$'", u"x"},
      {u"sh -c 'exec >&- 2>&-; exec sleep 0.1'", u""}, {u"printf 'a\\0b'", u"a"},
      {u"CMD.EXE  /c printf $((1+2)) | tr 3 4", u"4"}, {u"cmd.exe /C -x 2>&- || printf no", u"no"},
      {u"cmd.exe -c 'printf \"a b\"'", u"a b"}};
  const TAnsiCodePageScope Latin(1252);
  for (const auto& [Command, Output] : Cases) EXPECT_EQ(Captured(Command), Output) << ToUTF8(Command);
  EXPECT_EQ(ZqRunProcessAndCaptureOutput(u"pwd; exit 1", u"/", true), u"/\n");
  EXPECT_FALSE(HasChildren());
}

TEST(CapturedOutput, TellsWhyNothingRuns) {
  const TTempFolder Folder({"text"});
  fs::permissions(Folder.Path() / "text", fs::perms::owner_all);
  const std::tuple<UnicodeString, const char16_t*, Integer> Cases[] = {{u"zq-none", u"", 2}, {u"/", u"", 5},
      {u"", u"", 87}, {u"true 'x", u"", 87}, {Folder.File("text"), u"", 193}, {u"true", u"/zq-none", 267}};
  for (const auto& [Command, Directory, Code] : Cases) try {
      (void)ZqRunProcessAndCaptureOutput(Command, Directory, false);
      ADD_FAILURE() << ToUTF8(Command);
    } catch (const EOSError& e) {
      EXPECT_EQ(e.ErrorCode(), Code) << ToUTF8(Command);
    }
}

TEST(CapturedOutput, KeepsWhatIsLongAndWhatAPieceCuts) {
  const UnicodeString Flood = u"head -c 300000 /dev/zero | tr '\\0' x";
  EXPECT_EQ(ZqRunProcessAndCaptureOutput(Flood + u"; " + Flood + u" >&2", u"", true), StringOfChar(u'x', 600000));
  const UnicodeString Half = StringOfChar(u'ä', 100), Command = u"printf " + Half + Half;
  EXPECT_EQ(Captured(Command), Half + Half);
  std::vector<UnicodeString> Pieces;
  ZqRunProcessAndCaptureOutput(
      u"/", Command, [&](const UnicodeString& AOutput) { Pieces.push_back(AOutput); }, false);
  const UnicodeString First = StringOfChar(u'ä', 127) + u'\xFFFD', Last = u'\xFFFD' + StringOfChar(u'ä', 72);
  EXPECT_EQ(Pieces, (std::vector{First, Last}));
  static Integer Calls;
  Calls = 0;
  const TZqOnCmdOutputProc Count = [](const UnicodeString&) { ++Calls; };
  ZqRunProcessAndCaptureOutput(u"", u"true", Count, false);
  ZqRunProcessAndCaptureOutput(u"", u"echo", Count, false);
  ZqRunProcessAndCaptureOutput(u"", u"echo", TZqOnCmdOutputMethod(), false);
  EXPECT_EQ(Calls, 1);
}

TEST(CapturedOutput, EndsWithItsProcessAndLeavesNoZombie) {
  const UnicodeString Left = Captured(u"sh -c 'sleep 60 & echo $!'");  // one that holds the outputs
  tagPROCESSENTRY32W Daemon;
  Daemon.th32ProcessID = static_cast<Cardinal>(std::stoul(Left.ToUTF8()));
  EXPECT_TRUE(ZqKillProcess(Daemon));
  EXPECT_EQ(RaisedBy([] {
    ZqRunProcessAndCaptureOutput(
        u"", u"sh -c 'echo; exec sleep 0.5'", [](const UnicodeString&) { throw EAbort(u"enough"); }, false);
  }),
      u"EAbort: enough");
  EXPECT_TRUE(HasChildren());
  EXPECT_TRUE(Soon([] { return !HasChildren(); }));
}

TEST(CapturedOutput, SignalsOfTheHostAreNotTheChilds) {
  struct sigaction Alarm {};
  Alarm.sa_handler = [](int) {};
  ::sigaction(SIGALRM, &Alarm, nullptr);
  const itimerval Every{{0, 5000}, {0, 5000}}, Never{};
  ::setitimer(ITIMER_REAL, &Every, nullptr);
  EXPECT_EQ(Captured(u"sh -c 'sleep 0.1; echo x; exec >&- 2>&-; sleep 0.1'"), u"x\n");
  ::setitimer(ITIMER_REAL, &Never, nullptr);
  auto* const Pipe = ::signal(SIGPIPE, SIG_IGN);
  sigset_t Term, Before;
  ::sigemptyset(&Term);
  ::sigaddset(&Term, SIGTERM);
  ::pthread_sigmask(SIG_BLOCK, &Term, &Before);
  for (const char16_t* const Name : {u"PIPE", u"TERM"})
    EXPECT_EQ(ZqRunProcessAndCaptureOutput(UnicodeString(u"kill -") + Name + u" $$; echo alive", u"", true), u"");
  ::pthread_sigmask(SIG_SETMASK, &Before, nullptr);
  ::signal(SIGPIPE, Pipe);
}

TEST(CapturedOutput, NoChildGetsAnothersDescriptors) {
  const int Inheritable = ::open("/", O_RDONLY);  // NOLINT(android-cloexec-open): that is the case
  OnThreads(8, [](int) {
    for (int i = 0; i < 10; ++i) EXPECT_EQ(Captured(u"ls /proc/self/fd"), u"0\n1\n2\n3\n");  // 3: the folder
  });
  ::close(Inheritable);
}

TEST(CapturedOutput, IsAskedForByTheCommandInterpreterInPieces) {
  TScriptedProcesses System;
  EXPECT_CALL(System, CreateProcess(Eq(u"cmd.exe /C dir"), Eq(u"/d"))).WillOnce([](auto&&...) {
    auto Child = std::make_unique<testing::StrictMock<TScriptedChild>>();
    EXPECT_CALL(*Child, ReadFile(_, 255))
        .WillOnce([](char* ABuffer, Integer) { return *ABuffer = 'x', 1; })
        .WillOnce(Return(0));
    EXPECT_CALL(*Child, WaitForSingleObject(INFINITE));
    return Child;
  });
  UnicodeString Output;
  ZqRunProcessAndCaptureOutput(
      u"/d", u"dir", [&](const UnicodeString& AOutput) { Output += AOutput; }, true);
}

// ----------------------------------------------------------------------------------------------- Opening by the shell

TEST(ShellExec, StartsProgramsAndHandsOnTheRest) {
  const TTempFolder Folder({"-a b.txt"});
  for (const char* const Name : {"xdg-open", "pkexec"}) {
    Folder.Write(Name,
        "#!/bin/sh\ncd \"${0%/*}\"\nprintf '%s|' \"$0\" \"$@\" >new\nmv new out\n"
        "case $1 in /bin/*) exec \"$@\"; esac\nexit 5");
    fs::permissions(Folder.Path() / Name, fs::perms::owner_all);
  }
  const std::string Here = Folder.Path().string();
  const auto OpenedWith = [&] { return Folder.Read("out").substr(Here.size()); };
  std::unique_ptr<TChildProcess> Child;
  const auto Elevated = [&](const char16_t* AFile) {
    return Service<TProcessService>().ShellExecuteEx(
        {SEE_MASK_NOCLOSEPROCESS, u"RunAs", AFile, u"/C exit 9", 0}, Child);
  };
  {
    const TEnvironmentScope Path("PATH", Here + ":/usr/bin:/bin");
    EXPECT_EQ(ZqShellExecRun(u"sh", {u"-c", u" exit 7 "}), 7);
    EXPECT_EQ(ZqShellExec(u"", u"/bin/sh", {u"-c", u"kill -9 $$"}), 128 + 9);
    EXPECT_EQ(ZqShellExec(u"", Folder.File("-a b.txt"), {u"x"}), 5);
    EXPECT_EQ(OpenedWith(), "/xdg-open|" + Here + "/-a b.txt|");
    EXPECT_EQ(ZqShellExecRun(u"https://x/?a=1&b\\c", {}), 5);
    EXPECT_EQ(OpenedWith(), "/xdg-open|https://x/?a=1&b\\c|");
    EXPECT_TRUE(Elevated(u"cmd.exe") && Child->WaitForSingleObject(INFINITE));
    EXPECT_EQ(Child->GetExitCodeProcess(), 9);
    EXPECT_EQ(OpenedWith(), "/pkexec|/bin/sh|-c|--| exit 9|");
    ZqShellExecOpenWebSite(u"a.b");
    EXPECT_TRUE(Soon([&] { return OpenedWith() == "/xdg-open|http://a.b|"; }));
    EXPECT_TRUE(Soon([] { return !HasChildren(); }));
    const std::pair<const char16_t*, const char16_t*> Refused[] = {
        {u"", u"zq-none"}, {u"", u"c:x"}, {u"", u""}, {u"", u"/zq/none"}, {u"print", u"sh"}};
    for (const auto& [Verb, File] : Refused) EXPECT_THROW((void)ZqShellExec(Verb, File, {}), EOSError);
    EXPECT_EQ(GetLastError(), 1155U);
    EXPECT_FALSE(Elevated(u"https://x"));
  }
  const TEnvironmentScope Path("PATH", "/zq-none");
  EXPECT_THROW(ZqShellExecOpenFile(Folder.File("-a b.txt"), SW_HIDE, false), EOSError);
  EXPECT_EQ(GetLastError(), 1155U);
  EXPECT_FALSE(Elevated(u"cmd.exe"));
  EXPECT_EQ(GetLastError(), 740U);
}

auto Info(Cardinal AMask, const char16_t* AVerb, const char16_t* AFile, const char16_t* AParameters, Integer AShow) {
  using T = TShellExecuteInfo;
  return AllOf(Field(&T::fMask, AMask), Field(&T::Verb, Eq(AVerb)), Field(&T::File, Eq(AFile)),
      Field(&T::Parameters, Eq(AParameters)), Field(&T::nShow, AShow));
}

TEST(ShellExec, BuildsItsArgumentsAndElevatesOnlyLimitedRights) {
  TScriptedProcesses System;
  const std::initializer_list<UnicodeString> Params = {u" a b ", u"-x ", u"/y", u" -z", u""};
  EXPECT_CALL(System, ShellExecuteEx(Info(0x140, u"v", u"f", u"\"a b\" \"-x\" \"/y\" \"-z\" \"\"", 1), _))
      .WillOnce([](auto&&, auto& AProcess) {
        auto Child = std::make_unique<testing::StrictMock<TScriptedChild>>();
        EXPECT_CALL(*Child, WaitForSingleObject(0x7FFFFFFF)).WillOnce(Return(false));
        EXPECT_CALL(*Child, GetExitCodeProcess).WillOnce(Return(STILL_ACTIVE));
        AProcess = std::move(Child);
        return true;
      });
  EXPECT_EQ(ZqShellExec(u"v", u"f", Params), STILL_ACTIVE);
  EXPECT_CALL(System, ShellExecuteEx(Info(0x140, u"Open", u"f", u"", 1), _)).WillOnce(Return(true));
  EXPECT_EQ(ZqShellExecRun(u"f", {}), 0);

  using TBits = std::optional<Cardinal>;
  const std::tuple<TBits, TBits, TZqElevationLevel> Levels[] = {{2, 0, elFull}, {3, 1, elLimited}, {1, 1, elFull},
      {1, 0, elLimited}, {std::nullopt, 7, elFull}, {std::nullopt, std::nullopt, elDefault}};
  for (const auto& [Type, Elevated, Level] : Levels) {
    EXPECT_CALL(System, GetTokenInformation(18)).WillRepeatedly(Return(Type));
    EXPECT_CALL(System, GetTokenInformation(20)).WillRepeatedly(Return(Elevated));
    EXPECT_EQ(ZqGetElevationLevel(), Level);
    for (const bool Elevates : {true, false}) {
      const bool RunAs = Elevates && Level == elLimited;
      const UnicodeString Text = u"\"a b\" -x /y \"-z\" \"\"";
      if (RunAs) {
        EXPECT_CALL(System, ShellExecuteEx(Info(0, u"runas", u"f", Text.c_str(), 6), _)).WillOnce(Return(true));
        EXPECT_CALL(System, ShellExecuteEx(Info(0, u"runas", u"cmd.exe", u"/C \"x", 0), _)).WillOnce(Return(false));
      } else {
        EXPECT_CALL(System, ShellExecute(Eq(u"open"), Eq(u"f"), Eq(Text), 6)).WillOnce(Return(33));
        EXPECT_CALL(System, ShellExecute(Eq(u""), Eq(u"cmd.exe"), Eq(u"/C \"x"), 0)).WillOnce(Return(32));
      }
      ZqShellExecOpenFile(u"f", Params, 6, Elevates);
      EXPECT_THROW(ZqShellExecCmd(u"/C \"x", Elevates), EOSError);
    }
  }
  for (const auto* const Address : {u"mailto:A@b", u"MailTo:A", u"http://A@b", u"x.HTTPS"})
    EXPECT_CALL(System, ShellExecute(Eq(u"open"), Eq(Address), Eq(u""), 1)).WillOnce(Return(0));
  for (const auto* const Address : {u" A@b ", u"MailTo:A"}) ZqShellExecOpenEMail(Address);
  for (const auto* const Address : {u" A@b ", u"x.HTTPS"}) ZqShellExecOpenWebSite(Address);
}

// ------------------------------------------------------------------------------------------------ Running processes

TEST(Processes, AreFoundAndEndedUnderAnyName) {
  const TTempFolder Folder;
  const std::string Name = "a) S 1 (b\nlonger than is kept" + std::to_string(::getpid());
  const UnicodeString Path = Folder.File(Name), ShortName = UpperCase(ExtractFileName(Path));
  tagPROCESSENTRY32W Entry;
  for (const int Way : {0, 1, 2, 3}) {
    EXPECT_FALSE(ZqGetProcessID(ShortName, Entry) || ZqProcessExists(Path));
    EXPECT_TRUE(Entry.dwSize == 556 && Entry.th32ProcessID == 0 && !ZqKillProcess(Entry));
    fs::copy_file("/bin/sleep", Folder.Path() / Name);
    ZqShellExecOpenFile(Path, {u"60"}, SW_HIDE, false);
    fs::remove(Folder.Path() / Name);  // the system lists it with a mark from now on
    ASSERT_TRUE(ZqGetProcessID(ShortName, Entry) && ZqProcessExists(Path));
    EXPECT_TRUE(Entry.szExeFile == Path && Entry.dwSize == 556);
    tagPROCESSENTRY32W Other = Entry;
    ++Other.StartTime;
    EXPECT_FALSE(ZqKillProcess(Other));
    if (Way == 0) EXPECT_TRUE(ZqKillProcess(Entry));
    else if (Way == 1) EXPECT_TRUE(ZqKillProcess(u"/elsewhere/" + ShortName));
    else if (Way == 2) ZqCloseProcess(Path);
    else EXPECT_EQ(::kill(static_cast<pid_t>(Entry.th32ProcessID), SIGTERM), 0);
    ASSERT_TRUE(Soon([&] { return !ZqProcessExists(Path) && !HasChildren(); }));
  }
}

const TArray<tagPROCESSENTRY32W> cList = {
    {556, 10, u"/bin/App", 1}, {556, 11, u"app", 2}, {556, 12, u"/bin/apple", 3}, {556, 13, u"/x/APP", 4}};
auto Id(Cardinal AId) { return Field(&tagPROCESSENTRY32W::th32ProcessID, AId); }

TEST(Processes, MatchByTheRuleOfEachFunction) {
  TScriptedProcesses System;
  EXPECT_CALL(System, ProcessSnapshot).WillRepeatedly(Return(cList));
  tagPROCESSENTRY32W Entry;
  EXPECT_TRUE(ZqGetProcessID(u"/BIN/apple", Entry) && Entry.th32ProcessID == 12);
  EXPECT_TRUE(ZqGetProcessID(u"APP", Entry) && Entry.th32ProcessID == 10);
  EXPECT_FALSE(ZqProcessExists(u"/y/app") || ZqProcessExists(u"") || ZqKillProcess(u"appl"));
  for (const bool Last : {true, false}) {
    for (const Cardinal Each : {10U, 11U, 13U})
      EXPECT_CALL(System, TerminateProcess(Id(Each))).WillOnce(Return((Each == 13) == Last));
    EXPECT_EQ(ZqKillProcess(u"/y/app"), Last);
  }
  EXPECT_CALL(System, EnumWindows).WillRepeatedly(Return(TArray<HWND>{1, 2, 3}));
  EXPECT_CALL(System, GetWindowThreadProcessId).WillRepeatedly([](HWND AWindow) { return AWindow == 2 ? 12U : 10U; });
  for (const HWND Each : {1U, 3U}) EXPECT_CALL(System, SendMessage(Each, 16, 0, 0));
  for (const Cardinal Each : {11U, 13U}) EXPECT_CALL(System, RequestEnd(Id(Each)));
  ZqCloseProcess(u"app");

  const UnicodeString Self = ParamStr(0);
  EXPECT_CALL(System, ProcessSnapshot)
      .WillOnce(Return(TArray<tagPROCESSENTRY32W>{{556, GetCurrentProcessId(), Self}, {556, 20, Self},
          {556, 21, ExtractFileName(Self)}, {556, 22, u"/other"}}));
  for (const Cardinal Each : {20U, 21U}) EXPECT_CALL(System, TerminateProcess(Id(Each)));
  ZqKillRunningInstances();
}

TEST(Processes, OfWindowsThatStayAreEnded) {
  const std::tuple<bool, Cardinal, bool, bool> Cases[] = {
      {false, 9, true, false}, {true, 0, true, false}, {true, 9, false, false}, {true, 9, true, true}};
  for (const auto& [Stays, Owner, Ends, Result] : Cases) {
    TScriptedProcesses System;
    EXPECT_CALL(System, SendMessageTimeout(7, 16, 0, 0, 2, 5000));
    EXPECT_CALL(System, IsWindow(7)).WillOnce(Return(Stays));
    if (Stays) EXPECT_CALL(System, GetWindowThreadProcessId(7)).WillOnce(Return(Owner));
    if (Stays && Owner != 0) EXPECT_CALL(System, TerminateProcess(Id(Owner))).WillOnce(Return(Ends));
    EXPECT_EQ(ZqKillProcess(HWND{7}), Result);
    const testing::InSequence Order;
    EXPECT_CALL(System, SetWindowPos(7, static_cast<HWND>(-1), 0, 0, 0, 0, 3)).WillOnce(Return(!Ends));
    EXPECT_CALL(System, SetWindowPos(7, static_cast<HWND>(-2), 0, 0, 0, 0, 3)).WillOnce(Return(Ends));
    EXPECT_EQ(ZqBringToFront(7), Ends);
  }
  EXPECT_FALSE(ZqKillProcess(HWND{7}) || ZqBringToFront(7));  // Linux has none
}

// ------------------------------------------------------------------------------------------------- Questions, folders

TEST(CheckDirectory, RefusesOneThatIsMissing) {
  EXPECT_EQ(ZqCheckDirectory(u"  ") + ZqCheckDirectory(u" ", true, true), u"");
  EXPECT_EQ(ZqCheckDirectory(u" /usr/ ") + ZqCheckDirectory(u" /usr ", true, false), u"/usr//usr/");
  EXPECT_EQ(ZqCheckDirectory(u" /usr/ ", false, false), u"/usr");
  EXPECT_EQ(
      RaisedBy([] { (void)ZqCheckDirectory(u" /zq "); }), u"Exception: The directory '/zq' could not be created!");
  EXPECT_THROW((void)ZqCheckDirectory(u"/zq", true, false), Exception);
  SetZqMsgBoxYesNo([](const UnicodeString& A, const UnicodeString& B) { return A.Length() - B.Length(); });
  EXPECT_EQ(uZqWindows::MsgBoxYesNo.load()(u"abc", u"d"), 2);
  SetZqMsgBoxYesNo(nullptr);
}

}  // namespace
}  // namespace zq
