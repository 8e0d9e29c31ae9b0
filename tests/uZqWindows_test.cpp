#include "common/uZqWindows.h"

#include <gtest/gtest.h>

#include <chrono>
#include <set>

#include "runtime/com/registry.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/io/streams.h"
#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"
#include "tests/fakes/environment.h"
#include "tests/fakes/files.h"
#include "tests/fakes/registry.h"
#include "tests/fakes/shell.h"
#include "tests/fakes/version.h"

namespace zq {
namespace {

namespace fs = std::filesystem;
using testing::_, testing::DoAll, testing::Eq, testing::Return, testing::SetArgReferee;

// -------------------------------------------------------------------------------------------------- Environment

TEST(EnvironmentVars, BothFormsExpandInTheirOrder) {
  const TEnvironmentScope Values[] = {{"ZQ_T", "/tmp"}, {"ZQ_IN", "$(ZQ_T)/in"}, {"ZQ_PC", "%ZQ_T%"}, {"ZQ_EMPTY", ""},
      {"ZQ_A", "$(ZQ_B)"}, {"ZQ_B", "$(ZQ_A)"}, {"ZQ_BIG", "$(ZQ_BIG)$(ZQ_BIG)"}, {"ZQ_LONG", std::string(5000, 'x')},
      {"ZQ_FF", "\xFF"}};
  const std::pair<const char16_t*, UnicodeString> Cases[] = {{u"$(ZQ_T)-$(zq_t)", u"/tmp-/tmp"},
      {u"$(ZQ_IN)", u"/tmp/in"}, {u"$(ZQ_PC)+%ZQ_IN%", u"/tmp+$(ZQ_T)/in"}, {u"a)$(ZQ_T)b)", u"a)/tmpb)"},
      {u"%ZQ_EMPTY%", u""}, {u"%ZQ_NO%ZQ_T%", u"%ZQ_NO/tmp"}, {u"%ZQ_NO%|100%", u"%ZQ_NO%|100%"}, {u"%%", u"%%"},
      {u"%ZQ_T", u"%ZQ_T"}, {u"%ZQ_FF%", UnicodeString(u'\xDCFF')}};
  for (const auto& [Text, Result] : Cases) EXPECT_EQ(ZqExpandEnvVarsAndStrings(Text), Result);
  EXPECT_EQ(ZqGetEnvironmentVar(u"ZQ_LONG").Length(), 5000);
  for (const char16_t* const Text : {u"$(ZQ_EMPTY)", u"$(ZQ_A)", u"$(ZQ_BIG)"})
    EXPECT_THROW((void)ZqExpandEnvVarsAndStrings(Text), Exception);
  const TEnvironmentScope Name("ZQ_NAME", "x.log");
  const UnicodeString Here = GetCurrentDir();
  ASSERT_TRUE(SetCurrentDir(u"/"));  // relative names start at the program all the same
  EXPECT_EQ(ZqExpandFileName(u"sub/../$(ZQ_NAME)"), ExtractFilePath(ParamStr(0)) + u"x.log");
  EXPECT_EQ(ZqExpandFileName(u"/a/../%ZQ_NAME%"), u"/x.log");
  EXPECT_TRUE(GetCurrentDir() == u"/" && SetCurrentDir(Here));
}

TEST(EnvironmentVars, AMissingOneIsNamedOrStaysAsItStands) {
  TScriptedEnvironment System;
  EXPECT_CALL(System, GetEnvironmentVariable).WillRepeatedly(Return(std::nullopt));
  EXPECT_CALL(System, GetEnvironmentVariable(Eq(u"a"))).WillRepeatedly(Return(u"%b%$(c)"));
  EXPECT_EQ(ZqExpandEnvVarsAndStrings(u"%a%%b%"), u"%b%$(c)%b%");
  const UnicodeString Missing = u"Exception: There is no Environment Variable with the name ";
  EXPECT_EQ(RaisedBy([] { (void)ZqExpandEnvVarsAndStrings(u"$(a)"); }), Missing + u"c");
  EXPECT_EQ(RaisedBy([] { (void)ZqExpandEnvVarsAndStrings(u"%b%$(a"); }), Missing);
}

// ---------------------------------------------------------------------------------------------------- Path text

TEST(PathRules, OfSeparatorsNamesAndFolders) {
  const std::pair<UnicodeString, const char16_t*> Cases[] = {{ZqIncludeTrailingBackslash(u"C"), u"C:\\"},
      {ZqIncludeTrailingBackslash(u"C:"), u"C:\\"}, {ZqIncludeTrailingBackslash(u" \\x "), u"\\x\\"},
      {ZqIncludeTrailingBackslash(u"  "), u":\\"}, {ZqIncludeTrailingBackslash(u"x/y"), u"x/y/"},
      {ZqIncludeTrailingBackslash(u"/x/"), u"/x/"}, {ZqIncludeTrailingBackslash(u"x\\y"), u"x\\y:\\"},
      {ZqCheckDirSlash(u"c:\\x\\\\", false), u"c:\\x\\"}, {ZqCheckDirSlash(u" /x/ ", false), u"/x"},
      {ZqCheckDirSlash(u"/x", true), u"/x/"}, {ZqCheckDirSlash(u"x", true), u"x\\"},
      {ZqCheckDirSlash(u"  ", true), u""}, {ZqCleanupFileName(u"\"*/:<>?\\|\x1F\tä "), u"ä "},
      {ZqCleanupFileName(u"a b\u0161c", {'a', ' '}), u"b\u0161c"}};  // U+0161 isn't the "a" of its low byte
  for (const auto& [Text, Result] : Cases) EXPECT_EQ(Text, Result);
  for (const char16_t* const Name : {u".", u"..\\x", u"x\\y", u"\\\\server\\share", u"x/y", u"../x"})
    EXPECT_TRUE(ZqIsAliasedFilename(Name)) << ToUTF8(Name);
  for (const char16_t* const Name : {u"c:\\x", u"x", u"  ", u"/x/y"}) EXPECT_FALSE(ZqIsAliasedFilename(Name));
}

// --------------------------------------------------------------------------------------------------- File facts

TEST(FileFacts, TellSizeStateUseAndLocalTimesOfTwoSeconds) {
  const TTempFolder Folder({"file"});
  const UnicodeString File = Folder.File("file"), None = Folder.File("none");
  EXPECT_TRUE(ZqGetFileSize(File) == 4 && ZqGetFileSize(None) == -1);
  for (const auto& Name : {File, None}) EXPECT_FALSE(ZqFileIsInUse(Name) || ZqFileIsReadOnly(Name));
  const TFileStream Holder(File, fmOpenReadWrite | fmShareExclusive);
  EXPECT_TRUE(ZqFileIsInUse(File));
  fs::resize_file(Folder.Path() / "file", 0x100000005);
  EXPECT_EQ(ZqGetFileSize(File), 5);
  fs::permissions(Folder.Path() / "file", fs::perms::owner_read);
  EXPECT_TRUE(ZqFileIsReadOnly(File));
  EXPECT_EQ(RaisedBy([&] { (void)ZqGetShortFileName(None); }), u"Exception: Failed to determine the short filename!");

  const TZoneScope Zone("XXX-2");
  EXPECT_NEAR(ZqGetFileCreated(File), Now(), 5 / 86400.0);
  const std::chrono::sys_seconds Time{std::chrono::seconds(1709251199)};  // 2024-02-29 23:59:59 UTC
  fs::last_write_time(Folder.Path() / "file", std::chrono::file_clock::from_sys(Time));
  EXPECT_EQ(FormatDateTime(u"yyyy-mm-dd hh:mm:ss", ZqGetFileLastModified(File)), u"2024-03-01 01:59:58");
  EXPECT_EQ(ZqGetFileLastModified(None).Value, 0);
  const FILETIME Moment{0x256D4000, 0x01BF53EB};  // 2000-01-01, counted from 1601
  EXPECT_EQ(ZqFileTimeToDateTime(Moment).Value, 36526.0);
  const FILETIME Back = ZqDateTimeToFileTime(36526.0 + 1 / 86400.0);
  EXPECT_EQ(std::pair(Back.dwLowDateTime, Back.dwHighDateTime), std::pair(0x256D4000U + 10000000U, 0x01BF53EBU));
  EXPECT_THROW((void)ZqDateTimeToFileTime(1e300), EConvertError);
}

TEST(FileFacts, RefusedByTheSystemAreTold) {
  const TTempFolder Folder({"file"});
  TScriptedFiles System;
  EXPECT_CALL(System, OpensExclusively(Folder.File("file"))).WillOnce(Return(false)).WillOnce(Return(true));
  EXPECT_CALL(System, GetShortPathName(Eq(u"file"))).WillOnce(Return(u"")).WillOnce(Return(u"FILE~1"));
  for (const bool Refused : {true, false}) {
    EXPECT_EQ(ZqFileIsInUse(Folder.File("file")), Refused);
    EXPECT_EQ(RaisedBy([] { EXPECT_EQ(ZqGetShortFileName(u"file"), u"FILE~1"); }),
        Refused ? u"Exception: Failed to determine the short filename!" : u"nothing");
  }
  for (const Integer Length : {0, 261, 260}) {
    EXPECT_CALL(System, GetTempPath).WillRepeatedly(Return(StringOfChar(u'/', Length)));
    EXPECT_EQ(RaisedBy([&] { EXPECT_EQ(ZqGetTempDirectory().Length(), Length); }),
        Length == 260 ? u"nothing" : u"Exception: Can't determine name temp directory");
  }
  EXPECT_CALL(System, GetTempFileName(StringOfChar(u'/', 260), Eq(u"Ast"), _)).Times(65534).WillRepeatedly(Return(u""));
  EXPECT_EQ(RaisedBy([] { (void)ZqCreateTempDirectory(); }), u"Exception: Failed to create a temporary directory!");
}

// ------------------------------------------------------------------------------------------------------ Folders

TEST(Folders, TheTrashKeepsTheirPathAndTemporaryOnesAreNew) {
  const TTempFolder Folder({"Ast0001.tmp"});
  const TEnvironmentScope Data("XDG_DATA_HOME", Folder.Path().string()), Temp("TMPDIR", Folder.Path().string());
  for (const char* const Name : {"Ast0002.tmp", "Ast0003.tmp"}) {
    EXPECT_EQ(ZqCreateTempDirectory(), Folder.File(Name));
    fs::rename(Folder.Path() / Name, Folder.Path() / "a b");
    Folder.Write("a b/file", Name);
    EXPECT_TRUE(ZqRemoveDir(Folder.File("a b"), true));
    Folder.Write(Name, "");
  }
  EXPECT_EQ(Folder.Read("Trash/files/a b/file") + Folder.Read("Trash/files/a b.2/file"), "Ast0002.tmpAst0003.tmp");
  const std::string Info = Folder.Read("Trash/info/a b.2.trashinfo");
  EXPECT_EQ(Info.rfind("[Trash Info]\nPath=" + Folder.Path().string() + "/a%20b\nDeletionDate=20", 0), 0U) << Info;
}

// ---------------------------------------------------------------------------------------------------- Shortcuts

TEST(Shortcuts, LeadBackToTheirTargets) {
  const TTempFolder Folder({"doc 100%.txt", "a \"b\" $c `d` e%f\\g", "ä"});
  for (const std::string& Name : Folder.Names())
    for (const bool Program : {false, true}) {
      fs::permissions(Folder.Path() / Name, Program ? fs::perms::owner_all : fs::perms::owner_read);
      const UnicodeString Target = Folder.File("") + FromSystemPath(Name);
      ZqCreateShortcut(Target, Folder.File("link.desktop"), u"Line\nbreak", Program ? u"-x 50%" : u"");
      EXPECT_EQ(ZqGetTargetFromShortcut(Folder.File("link.desktop")), Target) << Name;
    }
  ZqCreateShortcut(u"/bin/s%h", Folder.File("link.desktop"), u"The shell", u"-c 'echo \\n 5%'");
  EXPECT_EQ(Folder.Read("link.desktop"),
      "[Desktop Entry]\nType=Application\nName=link\nComment=The shell\nExec=\"/bin/s%%h\" -c 'echo \\\\n 5%%'\n");
  EXPECT_EQ(ZqGetTargetFromShortcut(Folder.File("none.desktop")), u"");
  EXPECT_NO_THROW(ZqCreateShortcut(u"/bin/sh", Folder.File("none/link.desktop"), u"", u""));
  TScriptedShell Shell;
  EXPECT_CALL(Shell, CreateShellLink).WillOnce(testing::Throw(EOSError(u"no links", 1)));
  EXPECT_THROW(ZqCreateShortcut(u"/bin/sh", Folder.File("link.desktop"), u"", u""), EOSError);
}

// ------------------------------------------------------------------------------- System version, shell folders

TEST(SystemVersion, NumbersDecideByTheTableAndWithoutThemTheFirstExport) {
  // Major, minor, service pack and product type, one more export, metrics, value of the registry: the version.
  const std::tuple<TOSVersionInfo, const char16_t*, Integer, const char16_t*, Word> Cases[] = {
      {{5, 0, 1, 1}, u"", 0, u"", 500}, {{5, 1, 0, 1}, u"", 0, u"", 511}, {{5, 1, 1, 1}, u"", 0, u"", 513},
      {{5, 1, 2, 1}, u"", 0, u"", 515}, {{5, 1, 3, 1}, u"", 0, u"", 517}, {{5, 2, 0, 3}, u"", 1, u"", 521},
      {{5, 2, 0, 3}, u"GetLargePageMinimum", 1, u"", 523}, {{5, 3, 0, 3}, u"GetLargePageMinimum", 0, u"", 520},
      {{6, 0, 0, 1}, u"", 0, u"", 601}, {{6, 0, 0, 3}, u"", 0, u"", 602}, {{6, 1, 0, 1}, u"", 0, u"", 611},
      {{6, 1, 0, 2}, u"", 0, u"", 610}, {{6, 3, 0, 1}, u"", 0, u"", 621}, {{6, 2, 0, 1}, u"", 0, u"6.2", 621},
      {{6, 3, 0, 1}, u"", 0, u"6.3", 630}, {{6, 3, 0, 1}, u"", 0, u"6.30", 621}, {{6, 3, 0, 3}, u"", 0, u"6.3", 620},
      {{10, 0, 0, 1}, u"", 0, u"6.3", 621}, {{10, 0, 0, 3}, u"", 0, u"6.3", 620}, {{4, 0, 0, 1}, u"", 0, u"6.3", 621}};
  EXPECT_EQ(ZqGetWindowsVersion(), 621);
  TScriptedVersion System;
  TScriptedRegistry Registry;
  std::set<UnicodeString> Exports;
  EXPECT_CALL(System, HasKernel).WillRepeatedly(Return(true));
  EXPECT_CALL(System, KernelExports).WillRepeatedly([&](const char16_t* AName) { return Exports.contains(AName); });
  TRegistry Values;
  Values.SetRootKey(HKEY_LOCAL_MACHINE);
  for (const auto& [Info, Export, Metrics, Current, Code] : Cases) {
    Exports = {u"GetVersionExA", Export, u"Beep"};
    EXPECT_CALL(System, GetVersionEx).WillOnce(DoAll(SetArgReferee<0>(Info), Return(true)));
    EXPECT_CALL(System, GetSystemMetrics(89)).WillRepeatedly(Return(Metrics));
    if (*Current != 0 && Values.OpenKey(u"\\SOFTWARE\\Microsoft\\Windows NT\\CurrentVersion", true))
      Values.WriteString(u"CurrentVersion", Current);
    EXPECT_EQ(ZqGetWindowsVersion(), Code) << Info.MajorVersion << '.' << Info.MinorVersion;
  }
  Exports.clear();  // without GetVersionExA the version isn't asked for
  EXPECT_EQ(RaisedBy([] { (void)ZqGetWindowsVersion(); }), u"Exception: Failed to determine the version of the OS!");
  const std::pair<const char16_t*, Word> Probes[] = {{u"Beep", 3}, {u"ConnectNamedPipe", 14},
      {u"GetDiskFreeSpaceEx", 5}, {u"IsDebuggerPresent", 7}, {u"GetThreadPriorityBoost", 16}, {u"OpenThread", 11}};
  for (const auto& [Name, Code] : Probes) {  // each goes before those already there
    Exports.insert(Name);
    EXPECT_EQ(ZqGetWindowsVersion(), Code);
  }
  Exports.insert(u"GetVersionExA");
  EXPECT_CALL(System, GetVersionEx).WillOnce(Return(false));
  EXPECT_EQ(ZqGetWindowsVersion(), 11);
  EXPECT_CALL(System, HasKernel).WillOnce(Return(false));
  EXPECT_EQ(RaisedBy([] { (void)ZqGetWindowsVersion(); }), u"Exception: Failed to load Kernel32.dll!");
}

// A folder "tree" with files, folders and a link that leads out to "kept/file".
void GrowTree(const TTempFolder& AFolder) {
  for (const char* const Name : {"tree/a/b", "kept"}) fs::create_directories(AFolder.Path() / Name);
  for (const char* const Name : {"tree/a/b/.file", "tree/file", "kept/file"}) AFolder.Write(Name, "x");
  fs::create_directory_symlink(AFolder.Path() / "kept", AFolder.Path() / "tree/out");
}

TEST(ShellFolders, ATreeGoesWithoutWhatItsLinksLeadToEvenIfTheShellFails) {
  const TTempFolder Folder;
  GrowTree(Folder);
  EXPECT_FALSE(ZqRenameFolder(Folder.File("tree"), Folder.File("kept")));
  EXPECT_TRUE(ZqRenameFolder(Folder.File("tree"), u" " + Folder.File("new") + u" "));
  EXPECT_TRUE(ZqRemoveDir(Folder.File("new/"), false));
  EXPECT_TRUE(Folder.Names() == std::vector<std::string>{"kept"} && Folder.Read("kept/file") == "x");
  EXPECT_FALSE(ZqRemoveDir(Folder.File("tree"), false) || ZqRemoveDir(u" ", false));
  EXPECT_FALSE(ZqRemoveDir(Folder.File("kept/.//"), false));
  GrowTree(Folder);
  const auto List = [&](const char* AName) { return Folder.File(AName) + std::u16string_view(u"\0\0", 2); };
  TScriptedShell Shell;
  const testing::InSequence InThisOrder;
  EXPECT_CALL(Shell, SHFileOperation(4, List("tree"), List("new"), 0x0610)).WillOnce(Return(5));
  EXPECT_CALL(Shell, SHFileOperation(3, List("tree"), Eq(u""), 0x0454)).WillOnce(Return(5));
  EXPECT_CALL(Shell, SHFileOperation(3, List("tree"), Eq(u""), 0x0414)).WillOnce(Return(5));
  EXPECT_CALL(Shell, SHFileOperation(3, List("link"), Eq(u""), 0x0414)).WillOnce(Return(5));
  EXPECT_FALSE(ZqRenameFolder(Folder.File("tree"), Folder.File("new")));
  EXPECT_TRUE(ZqRemoveDir(Folder.File("tree"), true));
  EXPECT_FALSE(ZqRemoveDir(Folder.File("tree"), false) || fs::exists(Folder.Path() / "tree"));
  fs::create_directory_symlink(Folder.Path() / "kept", Folder.Path() / "link");
  EXPECT_TRUE(ZqRemoveDir(Folder.File("link/"), false));
  EXPECT_EQ(Folder.Read("kept/file"), "x");
}

TEST(ShellFolders, ComeByWayOfTheItemListWhereTheirPathIsRefused) {
  TScriptedShell Shell;
  int Item = 0;
  EXPECT_CALL(Shell, SHGetSpecialFolderPath(5, true, _)).WillRepeatedly(Return(false));
  EXPECT_CALL(Shell, SHGetMalloc).WillOnce(Return(false)).WillRepeatedly(Return(true));
  EXPECT_CALL(Shell, SHGetSpecialFolderLocation(5)).WillOnce(Return(nullptr)).WillRepeatedly(Return(&Item));
  EXPECT_CALL(Shell, SHGetPathFromIDList(nullptr, _)).WillOnce(Return(false));
  const auto Listed = DoAll(SetArgReferee<1>(u"/listed"), Return(true));
  EXPECT_CALL(Shell, SHGetPathFromIDList(&Item, _)).WillOnce(Return(false)).WillOnce(Listed);
  EXPECT_CALL(Shell, FreeIDList(&Item)).Times(2);
  EXPECT_EQ(ZqGetMyDocumentsFolder(), u"") << "no allocator";
  for (const char16_t* const Want : {u"Exception: Invalid pidl", u"Exception: Invalid pidl", u"nothing"})
    EXPECT_EQ(RaisedBy([] { EXPECT_EQ(ZqGetMyDocumentsFolder(), u"/listed"); }), Want);
}

TEST(ShellFolders, FollowTheUsersChoiceAndThoseOfProgramsAreMade) {
  const TTempFolder Home;
  const TEnvironmentScope Values[] = {{"HOME", Home.Path().string() + "/"}, {"XDG_CACHE_HOME", ""},
      {"XDG_DATA_HOME", Home.Path().string() + "/data"}, {"XDG_CONFIG_HOME", "relative is no choice"}};
  const std::pair<Integer, const char*> cUsers[] = {{0, "Desktop"}, {5, "Documents"}, {13, "Music"}, {14, "Videos"},
      {16, "Desktop"}, {21, "Templates"}, {39, "Pictures"}};
  const std::pair<Integer, const char*> cPrograms[] = {{2, "data/applications"}, {7, ".config/autostart"},
      {20, "data/fonts"}, {26, ".config"}, {28, "data"}, {32, ".cache"}, {35, "data"}, {46, "data"}};
  for (const auto& [Csidl, Name] : cUsers) EXPECT_EQ(ZqGetShellFolder(Csidl), Home.File(Name));
  EXPECT_EQ(Home.Names(), std::vector<std::string>());
  for (const auto& [Csidl, Name] : cPrograms)
    EXPECT_TRUE(ZqGetShellFolder(Csidl) == Home.File(Name) && fs::is_directory(Home.Path() / Name)) << Name;
  Home.Write(".config/user-dirs.dirs", "# XDG_DOCUMENTS_DIR=\"/no\"\nXDG_DOCUMENTS_DIR=\"$HOME/Bob's\\ Docs/\"\n");
  EXPECT_EQ(ZqGetMyDocumentsFolder(), Home.File("Bob's Docs"));
  EXPECT_EQ(Home.Names(), (std::vector<std::string>{".cache", ".config", "data"}));
  EXPECT_EQ(RaisedBy([] { (void)ZqGetShellFolder(12345); }), u"Exception: Invalid pidl");
}

}  // namespace
}  // namespace zq
