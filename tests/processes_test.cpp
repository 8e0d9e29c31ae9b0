#include "tests/fakes/processes.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <thread>

#include "common/uZqWindows.h"
#include "runtime/io/paths.h"
#include "runtime/sync/critical_section.h"
#include "runtime/text/encoding.h"
#include "runtime/text/format.h"

namespace zq {
namespace {

namespace fs = std::filesystem;
using testing::Return;

bool Soon(const std::function<bool()>& ACondition) {
  for (int i = 0; i < 1000 && !ACondition(); ++i) std::this_thread::sleep_for(std::chrono::milliseconds(10));
  return ACondition();
}

bool HasChildren() {
  siginfo_t Info{};
  return ::waitid(P_ALL, 0, &Info, WEXITED | WNOHANG | WNOWAIT) == 0;
}

// The reason in GetLastError.
Cardinal RefusalOf(const std::function<void()>& AAction) {
  EXPECT_THROW(AAction(), EOSError);
  return GetLastError();
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
  const std::tuple<UnicodeString, const char16_t*, Cardinal> Cases[] = {{u"zq-none", u"", 2}, {u"/", u"", 5},
      {u"", u"", 87}, {u"true 'x", u"", 87}, {Folder.File("text"), u"", 193}, {u"true", u"/zq-none", 267}};
  for (const auto& Case : Cases)
    EXPECT_EQ(RefusalOf([&] { (void)ZqRunProcessAndCaptureOutput(std::get<0>(Case), std::get<1>(Case), false); }),
        std::get<2>(Case));
}

TEST(CapturedOutput, KeepsWhatIsLongAndWhatAPieceCuts) {
  const UnicodeString Flood = u"head -c 300000 /dev/zero | tr '\\0' x";
  EXPECT_EQ(ZqRunProcessAndCaptureOutput(Flood + u"; " + Flood + u" >&2", u"", true), StringOfChar(u'x', 600000));
  const UnicodeString Half = StringOfChar(u'ä', 100), Command = u"printf " + Half + Half;
  EXPECT_EQ(Captured(Command), Half + Half);
  std::vector<UnicodeString> Pieces;
  const auto Keep = [&](const UnicodeString& AOutput) { Pieces.push_back(AOutput); };
  for (const UnicodeString& Each : {UnicodeString(u"true"), Command})
    ZqRunProcessAndCaptureOutput(u"/", Each, Keep, false);
  const UnicodeString First = StringOfChar(u'ä', 127) + u'\xFFFD', Last = u'\xFFFD' + StringOfChar(u'ä', 72);
  EXPECT_EQ(Pieces, (std::vector{First, Last}));
  ZqRunProcessAndCaptureOutput(
      u"", u"echo", +[](const UnicodeString& AOutput) { EXPECT_EQ(AOutput, u"\n"); }, false);
}

TEST(CapturedOutput, EndsWithItsProcessAndLeavesNoZombie) {
  const UnicodeString Left = Captured(u"sh -c 'sleep 60 & echo $!'");  // one that holds the outputs
  EXPECT_TRUE(ZqKillProcess(tagPROCESSENTRY32W{556, static_cast<Cardinal>(std::stoul(Left.ToUTF8())), {}}));
  const auto Stop = [](const UnicodeString&) { throw EAbort(u"enough"); };
  EXPECT_THROW(ZqRunProcessAndCaptureOutput(u"", u"sh -c 'echo; exec sleep 0.5'", Stop, false), EAbort);
  EXPECT_TRUE(HasChildren());
  EXPECT_TRUE(Soon([] { return !HasChildren(); }));
}

TEST(CapturedOutput, SignalsOfTheHostAreNotTheChilds) {
  ::signal(SIGALRM, [](int) {});
  ::ualarm(5000, 5000);
  EXPECT_EQ(Captured(u"sh -c 'sleep 0.1; echo x; exec >&- 2>&-; sleep 0.1'"), u"x\n");
  ::ualarm(0, 0);
  ::signal(SIGPIPE, SIG_IGN);
  sigset_t All, Before;
  ::sigfillset(&All);
  ::pthread_sigmask(SIG_BLOCK, &All, &Before);
  for (const char16_t* const Name : {u"PIPE", u"TERM"})
    EXPECT_EQ(ZqRunProcessAndCaptureOutput(UnicodeString(u"kill -") + Name + u" $$; echo alive", u"", true), u"");
  ::pthread_sigmask(SIG_SETMASK, &Before, nullptr);
  ::signal(SIGPIPE, SIG_DFL);
}

TEST(CapturedOutput, NoChildGetsAnothersDescriptors) {
  const int Inheritable = ::open("/", O_RDONLY);  // NOLINT(android-cloexec-open): that is the case
  OnThreads(8, [](int) {
    for (int i = 0; i < 10; ++i) EXPECT_EQ(Captured(u"ls /proc/self/fd"), u"0\n1\n2\n3\n");  // 3: the folder
  });
  ::close(Inheritable);
}

// ----------------------------------------------------------------------------------------------- Opening by the shell

TEST(ShellExec, StartsProgramsAndHandsOnTheRest) {
  const TTempFolder Folder({"-a b.txt"});
  for (const char* const Name : {"xdg-open", "pkexec"}) {
    Folder.Write(Name,
        "#!/bin/sh\ncd \"${0%/*}\"\nprintf '%s|' \"$0\" \"$@\" >new\nmv new out\n"
        "case $1 in */sh) exec \"$@\"; esac\nexit 5");
    fs::permissions(Folder.Path() / Name, fs::perms::owner_all);
  }
  const std::string Here = Folder.Path().string();
  const auto OpenedWith = [&] { return Folder.Read("out").substr(Here.size()); };
  const TEnvironmentScope Path("PATH", Here + ":/usr/bin:/bin");
  EXPECT_EQ(ZqShellExecRun(u"sh", {u"-c", u" exit 7 "}), 7);
  EXPECT_EQ(ZqShellExec(u"", u"/bin/sh", {u"-c", u"kill -9 $$"}), 128 + 9);
  EXPECT_EQ(ZqShellExec(u"", Folder.File("-a b.txt"), {u"x"}), 5);
  EXPECT_EQ(OpenedWith(), "/xdg-open|" + Here + "/-a b.txt|");
  EXPECT_EQ(ZqShellExecRun(u"https://x/?a=1&b\\c", {}), 5);
  EXPECT_EQ(OpenedWith(), "/xdg-open|https://x/?a=1&b\\c|");
  EXPECT_EQ(ZqShellExec(u"RunAs", u"/bin/sh", {u"-c", u"exit 9"}), 9);
  EXPECT_EQ(OpenedWith(), "/pkexec|/bin/sh|-c|exit 9|");
  ZqShellExecOpenWebSite(u"a.b");
  EXPECT_TRUE(Soon([&] { return OpenedWith() == "/xdg-open|http://a.b|"; }));
  ZqShellExecCmd(u"/c cd " + Folder.File("") + u"; exec mv pkexec out", false);
  EXPECT_TRUE(Soon([&] { return !Folder.Read("out").starts_with(Here) && !HasChildren(); }));
  const std::tuple<const char16_t*, const char16_t*, Cardinal> Refused[] = {{u"", u"zq-none", 2}, {u"", u"c:x", 2},
      {u"", u"", 2}, {u"", u"/zq/none", 2}, {u"runas", u"ab:x", 2}, {u"runas", u"sh", 740}, {u"print", u"sh", 1155}};
  for (const auto& Case : Refused)
    EXPECT_EQ(RefusalOf([&] { ZqShellExec(std::get<0>(Case), std::get<1>(Case), {}); }), std::get<2>(Case));
  const TEnvironmentScope NoPath("PATH", "/zq-none");
  EXPECT_EQ(RefusalOf([] { ZqShellExecOpenFile(u"ab:x", SW_HIDE, false); }), 1155U);
}

TEST(ShellExec, BuildsItsArgumentsAndElevatesOnlyLimitedRights) {
  TScriptedProcesses System;
  UnicodeString Calls;
  EXPECT_CALL(System, ShellExecuteEx).WillRepeatedly([&](const TShellExecuteInfo& A, auto&) {
    Calls += Format(u"%d,%s,%s,%s,%d;", {A.fMask, A.Verb, A.File, A.Parameters, A.nShow});
    return A.File == u"f";
  });
  EXPECT_CALL(System, ShellExecute).WillRepeatedly([&](auto& AVerb, auto& AFile, auto& AParameters, Integer AShow) {
    Calls += Format(u"%s,%s,%s,%d;", {AVerb, AFile, AParameters, AShow});
    return AFile == u"f" ? 33 : 32;
  });
  const std::initializer_list<UnicodeString> Params = {u" a b ", u"-x ", u"/y", u" -z", u""};
  EXPECT_EQ(ZqShellExec(u"v", u"f", Params) + ZqShellExecRun(u"f", {}), 0);
  for (const auto* const Address : {u" A@b ", u"MailTo:A"}) ZqShellExecOpenEMail(Address);
  for (const auto* const Address : {u" A@b ", u"x.HTTPS"}) ZqShellExecOpenWebSite(Address);
  EXPECT_EQ(Calls,
      u"320,v,f,\"a b\" \"-x\" \"/y\" \"-z\" \"\",1;320,Open,f,,1;open,mailto:A@b,,1;open,MailTo:A,,1;"
      u"open,http://A@b,,1;open,x.HTTPS,,1;");
  using TBits = std::optional<Cardinal>;
  const std::tuple<TBits, TBits, TZqElevationLevel> Levels[] = {{2, 0, elFull}, {3, 1, elLimited}, {1, 1, elFull},
      {1, 0, elLimited}, {std::nullopt, 7, elFull}, {std::nullopt, std::nullopt, elDefault}};
  for (const auto& [Type, Elevated, Level] : Levels)
    for (const bool Elevates : {true, false}) {
      EXPECT_CALL(System, GetTokenInformation(18)).WillRepeatedly(Return(Type));
      EXPECT_CALL(System, GetTokenInformation(20)).WillRepeatedly(Return(Elevated));
      EXPECT_EQ(ZqGetElevationLevel(), Level);
      Calls = {};
      ZqShellExecOpenFile(u"f", Params, 6, Elevates);
      EXPECT_THROW(ZqShellExecCmd(u"/C \"x", Elevates), EOSError);
      EXPECT_EQ(Calls, Elevates && Level == elLimited
                           ? u"0,runas,f,\"a b\" -x /y \"-z\" \"\",6;0,runas,cmd.exe,/C \"x,0;"
                           : u"open,f,\"a b\" -x /y \"-z\" \"\",6;,cmd.exe,/C \"x,0;");
    }
}

// ------------------------------------------------------------------------------------------------ Running processes

auto Id(Cardinal AId) { return testing::Field(&tagPROCESSENTRY32W::th32ProcessID, AId); }

TEST(Processes, AreFoundAndEndedUnderAnyName) {
  const TTempFolder Folder;
  const std::string Name = "a) S 1 (b\nlonger than is kept" + std::to_string(::getpid());
  const UnicodeString Path = Folder.File(Name), ShortName = UpperCase(ExtractFileName(Path));
  tagPROCESSENTRY32W Entry;
  for (const int Way : {0, 1, 2}) {
    EXPECT_FALSE(ZqGetProcessID(ShortName, Entry) || ZqProcessExists(Path));
    EXPECT_TRUE(Entry.dwSize == 556 && !ZqKillProcess(Entry));
    fs::copy_file("/bin/sleep", Folder.Path() / Name);
    ZqShellExecOpenFile(Path, {u"60"}, SW_HIDE, false);
    fs::remove(Folder.Path() / Name);  // the system lists it with a mark from now on
    ASSERT_TRUE(ZqGetProcessID(ShortName, Entry) && ZqProcessExists(Path));
    EXPECT_TRUE(Entry.szExeFile == Path && Entry.dwSize == 556);
    EXPECT_FALSE(ZqKillProcess(tagPROCESSENTRY32W{556, Entry.th32ProcessID, Path, Entry.StartTime + 1}));
    if (Way == 0) EXPECT_TRUE(ZqKillProcess(Entry));
    else if (Way == 1) EXPECT_TRUE(ZqKillProcess(u"/elsewhere/" + ShortName));
    else ZqCloseProcess(Path);
    ASSERT_TRUE(Soon([&] { return !ZqProcessExists(Path) && !HasChildren(); }));
  }
}

TEST(Processes, MatchByTheRuleOfEachFunction) {
  TScriptedProcesses System;
  const UnicodeString Self = ParamStr(0);
  EXPECT_CALL(System, ProcessSnapshot)
      .WillRepeatedly(Return(TArray<tagPROCESSENTRY32W>{{556, 10, u"/bin/App", 1}, {556, 11, u"app", 2},
          {556, 12, u"/bin/apple", 3}, {556, 13, u"/x/APP", 4}, {556, GetCurrentProcessId(), Self, 5},
          {556, 20, Self, 6}, {556, 21, ExtractFileName(Self), 7}}));
  EXPECT_CALL(System, EnumWindows).WillRepeatedly(Return(TArray<HWND>{1, 2, 3}));
  EXPECT_CALL(System, GetWindowThreadProcessId).WillRepeatedly([](HWND AWindow) { return AWindow == 2 ? 12U : 10U; });
  tagPROCESSENTRY32W Entry;
  EXPECT_TRUE(ZqGetProcessID(u"/BIN/apple", Entry) && Entry.th32ProcessID == 12);
  EXPECT_TRUE(ZqGetProcessID(u"APP", Entry) && Entry.th32ProcessID == 10);
  EXPECT_FALSE(ZqProcessExists(u"/y/app") || ZqProcessExists(u"") || ZqKillProcess(u"appl"));
  for (const bool Last : {true, false}) {
    for (const Cardinal Each : {10U, 11U, 13U})
      EXPECT_CALL(System, TerminateProcess(Id(Each))).WillOnce(Return((Each == 13) == Last));
    EXPECT_EQ(ZqKillProcess(u"/y/app"), Last);
  }
  for (const HWND Each : {1U, 3U}) EXPECT_CALL(System, SendMessage(Each, 16, 0, 0));
  for (const Cardinal Each : {11U, 13U}) EXPECT_CALL(System, RequestEnd(Id(Each)));
  ZqCloseProcess(u"app");
  for (const Cardinal Each : {20U, 21U}) EXPECT_CALL(System, TerminateProcess(Id(Each)));
  ZqKillRunningInstances();
}

TEST(Processes, OfWindowsThatStayAreEnded) {
  const std::tuple<bool, Cardinal, bool> Cases[] = {
      {false, 9, true}, {true, 0, true}, {true, 9, false}, {true, 9, true}};
  for (const auto& [Stays, Owner, Ends] : Cases) {
    TScriptedProcesses System;
    EXPECT_CALL(System, SendMessageTimeout(7, 16, 0, 0, 2, 5000));
    EXPECT_CALL(System, IsWindow(7)).WillOnce(Return(Stays));
    EXPECT_CALL(System, GetWindowThreadProcessId(7)).WillRepeatedly(Return(Owner));
    if (Stays && Owner != 0) EXPECT_CALL(System, TerminateProcess(Id(9))).WillOnce(Return(Ends));
    EXPECT_EQ(ZqKillProcess(HWND{7}), Stays && Owner != 0 && Ends);
    EXPECT_CALL(System, SetWindowPos(7, static_cast<HWND>(-1), 0, 0, 0, 0, 3)).WillOnce(Return(!Ends));
    EXPECT_CALL(System, SetWindowPos(7, static_cast<HWND>(-2), 0, 0, 0, 0, 3)).WillOnce(Return(Ends));
    EXPECT_EQ(ZqBringToFront(7), Ends);
  }
}

// ------------------------------------------------------------------------------------------------- Questions, folders

TEST(CheckDirectory, RefusesOneThatIsMissing) {
  EXPECT_EQ(ZqCheckDirectory(u"  ") + ZqCheckDirectory(u" ", true, true) + ZqCheckDirectory(u" /usr/ "), u"/usr/");
  EXPECT_EQ(ZqCheckDirectory(u" /usr ", true, false), u"/usr/");
  const auto Check = [] { (void)ZqCheckDirectory(u" /zq/ ", false, false); };
  EXPECT_EQ(RaisedBy(Check), u"Exception: The directory '/zq' could not be created!");
}

}  // namespace
}  // namespace zq
