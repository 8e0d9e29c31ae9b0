#include <gtest/gtest.h>
#include <sys/resource.h>

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <map>
#include <set>

#include "common/uZqSysUtils.h"
#include "runtime/core/exceptions.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/io/streams.h"
#include "runtime/io/text_file.h"
#include "runtime/text/encoding.h"
#include "tests/support/raised.h"
#include "tests/support/support.h"

namespace zq {
namespace {

namespace fs = std::filesystem;

// -------------------------------------------------------------------------------------------------------- Paths

TEST(PathText, TakesEitherSeparatorAndKeepsTheKindInUse) {
  const std::tuple<UnicodeString (*)(const UnicodeString&), const char16_t*, const char16_t*> Cases[] = {
      {ExtractFileName, u"C:\\l/app.1.log", u"app.1.log"}, {ExtractFileName, u"a/b\\", u""},
      {ExtractFilePath, u"a/b\\c.x", u"a/b\\"}, {ExtractFilePath, u"name", u""}, {ExtractFileDir, u"/x", u"/"},
      {ExtractFileDir, u"a\\b/c", u"a\\b"}, {ExtractFileDir, u"name", u""}, {ExtractFileExt, u"/x.d/name", u""},
      {ExtractFileExt, u"x.d\\name", u""}, {ExtractFileExt, u"/x/a.b.c", u".c"}, {ExtractFileExt, u"a.", u"."},
      {IncludeTrailingBackslash, u"/tmp", u"/tmp/"}, {IncludeTrailingBackslash, u"a\\b", u"a\\b\\"},
      {IncludeTrailingBackslash, u"/a\\b", u"/a\\b\\"}, {IncludeTrailingBackslash, u"x", u"x\\"},
      {IncludeTrailingBackslash, u"x/", u"x/"}, {ExcludeTrailingBackslash, u"a//", u"a/"},
      {ExcludeTrailingBackslash, u"", u""}};
  for (const auto& [Function, Path, Result] : Cases) EXPECT_EQ(Function(Path), Result) << ToUTF8(Path);
  EXPECT_EQ(ChangeFileExt(u"/x.d/app", u".log"), u"/x.d/app.log");
  EXPECT_EQ(ChangeFileExt(u"app.tar.gz", u".log") + ChangeFileExt(u"|app.exe", u""), u"app.tar.log|app");
}

TEST(PathText, ExpandsByTheTextAlone) {
  const UnicodeString Here = GetCurrentDir();
  const std::map<UnicodeString, UnicodeString> Cases = {{u"/a/./b/../c", u"/a/c"}, {u"/../x", u"/x"},
      {u"\\a\\b\\", u"/a/b/"}, {u"/", u"/"}, {u".", Here}, {u"a\\b", Here + u"/a/b"}, {u"a/../b", Here + u"/b"},
      {u"", u""}};
  for (const auto& [Name, Result] : Cases) EXPECT_EQ(ExpandFileName(Name), Result);
  EXPECT_EQ(ToSystemPath(ParamStr(0)), fs::read_symlink("/proc/self/exe").string());
}

// -------------------------------------------------------------------------------------------------------- Files

std::set<std::string> Find(const UnicodeString& AMask, Integer AAttr = faAnyFile) {
  std::set<std::string> Names;
  TSearchRec Found;
  for (Integer Code = FindFirst(AMask, AAttr, Found); Code == 0; Code = FindNext(Found))
    Names.insert(ToSystemPath(Found.Name));
  return Names;
}

TEST(Files, EveryNameOfTheSystemCanBeUsed) {
  const TTempFolder Folder({"caf\xE9", "a\\b", "\xF0\x9F\x98\x80"});
  for (const std::string& Name : Folder.Names()) {
    TSearchRec Found;
    const UnicodeString Path = Folder.File("") + FromSystemPath(Name);
    ASSERT_EQ(FindFirst(Path, faAnyFile, Found), 0) << Name;
    EXPECT_EQ(ToSystemPath(Found.Name), Name);
    EXPECT_EQ(TFileStream(Path, fmOpenRead).Size(), static_cast<Int64>(Name.size()));
    EXPECT_TRUE(RenameFile(Path, Path + u"2"));
    EXPECT_TRUE(DeleteFile(Path + u"2"));
  }
  EXPECT_TRUE(Folder.Names().empty());
}

TEST(Files, ExistenceFollowsLinksAndTellsFoldersApart) {
  const TTempFolder Folder({"file"});
  const UnicodeString Link = Folder.File("link"), Dangling = Folder.File("dangling");
  fs::create_symlink("file", ToSystemPath(Link));
  fs::create_symlink("nowhere", ToSystemPath(Dangling));
  EXPECT_TRUE(FileExists(Link) && DirectoryExists(Folder.File("")));
  EXPECT_FALSE(FileExists(Dangling) || FileExists(Folder.File("")) || DirectoryExists(Folder.File("file")));
  EXPECT_EQ(FileGetAttr(Dangling), -1);
  fs::permissions(Folder.Path() / "file", fs::perms::owner_read);
  EXPECT_EQ(FileGetAttr(Link), faArchive | faReadOnly);
  EXPECT_EQ(FileSizeOf(Link), 4);
}

TEST(Files, FoldersAreMadeWholeAndNothingIsOverwritten) {
  const TTempFolder Folder({"file", "other"});
  EXPECT_FALSE(RenameFile(Folder.File("other"), Folder.File("file")));
  EXPECT_EQ(Folder.Read("file"), "file");
  EXPECT_TRUE(
      ForceDirectories(u"") && ForceDirectories(Folder.File("x\\y/z\\")) && ForceDirectories(Folder.File("x/y")));
  EXPECT_TRUE(fs::is_directory(Folder.Path() / "x/y/z"));
  EXPECT_FALSE(ForceDirectories(Folder.File("file/z")) || RemoveDir(Folder.File("x")));
  EXPECT_TRUE(RemoveDir(Folder.File("x/y/z")));
  EXPECT_FALSE(DeleteFile(Folder.File("x")) || CreateDir(Folder.File("x")));
}

TEST(Files, MasksFitLikeTheirRulesSay) {
  using TPairs = std::vector<std::pair<const char16_t*, const char16_t*>>;
  for (const auto& [Mask, Name] :
      TPairs{{u"*.*", u"app"}, {u"*.*", u".rc"}, {u"app*.*", u"app"}, {u"app*.*", u"apple.log"}, {u"app.*", u"app"},
          {u"app.*", u"app."}, {u"a?c", u"abc"}, {u"*a*b", u"xaxbxab"}, {u"a*", u"a"}, {u"*.log", u".log"}})
    EXPECT_TRUE(FitsMask(Name, Mask)) << ToUTF8(Mask) << ' ' << ToUTF8(Name);
  for (const auto& [Mask, Name] :
      TPairs{{u"app*.*", u"myapp.log"}, {u"app*.*", u"App"}, {u"app.*", u"apple"}, {u"a?c", u"ac"}, {u"a?c", u"abcd"},
          {u"*a*b", u"xaxbxa"}, {u"a*", u""}, {u"a*", u"ba"}, {u"*.log", u"x.log.1"}})
    EXPECT_FALSE(FitsMask(Name, Mask)) << ToUTF8(Mask) << ' ' << ToUTF8(Name);
}

TEST(Files, FindsWhatFitsAndItsAttributesAllow) {
  const TTempFolder Folder({"app.log", "app.1.log", ".app", "other"});
  fs::create_directory(Folder.Path() / "app.d");
  fs::create_directory_symlink("app.d", Folder.Path() / "app.link");
  EXPECT_EQ(Find(Folder.File("app*.*")), (std::set<std::string>{"app.log", "app.1.log", "app.d", "app.link"}));
  EXPECT_EQ(Find(Folder.File("*.*"), 0), (std::set<std::string>{"app.log", "app.1.log", "app.link", "other"}));
  EXPECT_TRUE(Find(Folder.File("*")).contains("..") && Find(Folder.File("")).empty());
  TSearchRec Found;
  ASSERT_EQ(FindFirst(Folder.File("app.link"), faAnyFile, Found), 0);
  EXPECT_EQ(Found.Attr & (faDirectory | faSymLink), faSymLink);
  EXPECT_EQ(FindFirst(Folder.File("missing"), faAnyFile, Found), ENOENT);
}

TEST(Files, AbandonedScansLeaveNoHandle) {
  const TTempFolder Folder({"a", "b"});
  const auto OpenHandles = [] { return std::distance(fs::directory_iterator("/proc/self/fd"), {}); };
  const auto Before = OpenHandles();
  for (int i = 0; i < 20; ++i) {
    TSearchRec Found;
    for (int j = 0; j < 2; ++j) ASSERT_EQ(FindFirst(Folder.File("*"), faAnyFile, Found), 0);
    if (i % 2 == 0) FindClose(Found);
    EXPECT_EQ(FindNext(Found), i % 2 == 0 ? 18 : 0);
  }
  EXPECT_EQ(OpenHandles(), Before);
}

// --------------------------------------------------------------------------------------------------- Text files

// A text file "a.txt", new and open.
class TextFile : public testing::Test {
 protected:
  TextFile() {
    File.Assign(Folder.File("a.txt"));
    File.Rewrite();
  }
  const TTempFolder Folder;
  TTextFile File;
};

TEST_F(TextFile, WritesLinesInItsCodePageAndGoesOnWhereTheFileEnds) {
  File.WriteLn(u"bä");
  File.Write(u"end");
  EXPECT_EQ(File.Written(), 8);
  EXPECT_EQ(Folder.Read("a.txt"), "b\xC3\xA4\r\nend");  // there before any flush
  File.Close();
  File.Append();
  File.WriteLn();
  EXPECT_EQ(File.Written(), 2);
  EXPECT_EQ(Folder.Read("a.txt"), "b\xC3\xA4\r\nend\r\n");
  File.Assign(Folder.File("b.txt"), 1252);
  File.Rewrite();
  File.WriteLn(u"ä");
  EXPECT_EQ(Folder.Read("b.txt"), "\xE4\r\n");
}

TEST_F(TextFile, LongLinesComeWhole) {
  std::string Expected;
  for (const std::size_t Length : {2728U, 2730U, 2731U, 50000U, 3U}) {
    File.WriteLn(UnicodeString(Length, u'€'));
    for (std::size_t i = 0; i < Length; ++i) Expected += "\xE2\x82\xAC";
    Expected += "\r\n";
  }
  EXPECT_EQ(Folder.Read("a.txt"), Expected);
}

Int64 WriteCalls() {
  const std::string Counts = ReadFile("/proc/self/io");
  return std::stoll(Counts.substr(Counts.find("syscw:") + 6));
}

TEST_F(TextFile, ALineIsOneSystemCall) {
  if (!std::ifstream("/proc/self/io")) GTEST_SKIP() << "the system keeps no count";
  File.WriteLn(u"the sanitizers' first look at the object may write too");
  const Int64 Before = WriteCalls();
  for (int i = 0; i < 10; ++i, File.Flush()) File.WriteLn(u"a line");
  File.Close();
  EXPECT_EQ(WriteCalls() - Before, 10);
}

TEST_F(TextFile, ATornLineNeverSwallowsTheNext) {
  rlimit Limit{};
  ::getrlimit(RLIMIT_FSIZE, &Limit);
  const rlimit Tight{100, Limit.rlim_max};
  const auto Handler = std::signal(SIGXFSZ, SIG_IGN);
  ::setrlimit(RLIMIT_FSIZE, &Tight);
  const UnicodeString Torn = RaisedBy([&] { File.WriteLn(UnicodeString(150, u'x')); });
  const UnicodeString Refused = RaisedBy([&] { File.WriteLn(u"lost"); });
  ::setrlimit(RLIMIT_FSIZE, &Limit);
  std::signal(SIGXFSZ, Handler);
  EXPECT_EQ(Torn, u"EInOutError: Cannot write file \"" + Folder.File("a.txt") + u"\". File too large");
  EXPECT_EQ(Refused, Torn);
  EXPECT_EQ(File.Written(), 100);
  File.WriteBytes("next\r\n");
  File.WriteLn(u"last");
  EXPECT_EQ(Folder.Read("a.txt"), std::string(100, 'x') + "\r\nnext\r\nlast\r\n");
  EXPECT_EQ(File.Written(), FileSizeOf(Folder.File("a.txt")));
}

TEST_F(TextFile, FailedStepsTellFileReasonAndCode) {
  File.Assign(u"/no/a.txt");
  const UnicodeString Missing = u" file \"/no/a.txt\". No such file or directory";
  EXPECT_EQ(RaisedBy([&] { File.Rewrite(); }), u"EInOutError: Cannot create" + Missing);
  EXPECT_EQ(RaisedBy([&] { File.Append(); }), u"EInOutError: Cannot open" + Missing);
  EXPECT_EQ(RaisedBy([&] { File.Flush(); }), u"EInOutError: Cannot write file \"/no/a.txt\". Bad file descriptor");
  File.Assign(u"/dev/full");
  File.Append();
  EXPECT_EQ(
      RaisedBy([&] { File.WriteLn(u"x"); }), u"EInOutError: Cannot write file \"/dev/full\". No space left on device");
  EXPECT_EQ(File.Written(), 0);
}

// ------------------------------------------------------------------------------------------------------ Streams

std::string Content(TStream& AStream) {
  std::string Result(static_cast<std::size_t>(AStream.Size()), '\0');
  AStream.SetPosition(0);
  AStream.ReadBuffer(Result.data(), static_cast<Int64>(Result.size()));
  return Result;
}

TEST(Streams, FilesAndMemoryKeepOneContract) {
  const TTempFolder Folder;
  TFileStream File(Folder.File("a"), fmCreate);
  TMemoryStream Memory;
  for (TStream* const Stream : std::initializer_list<TStream*>{&File, &Memory}) {
    SCOPED_TRACE(Stream->ClassName().ToUTF8());
    Stream->WriteBuffer("0123456789", 10);
    EXPECT_EQ(Stream->Seek(-4, soEnd), 6);
    EXPECT_EQ(Stream->Seek(-2, soFromCurrent), 4);
    char Buffer[8] = {};
    EXPECT_EQ(Stream->Read(Buffer, 8), 6);
    EXPECT_STREQ(Buffer, "456789");
    EXPECT_EQ(Stream->Read(Buffer, 8), 0);
    EXPECT_EQ(RaisedBy([&] { Stream->ReadBuffer(Buffer, 1); }), u"EReadError: Stream read error");
    Stream->SetPosition(12);
    EXPECT_EQ(Stream->Write("x", 1), 1);
    EXPECT_EQ(Content(*Stream), std::string("0123456789\0\0x", 13));
    Stream->SetSize(3);
    EXPECT_EQ(Content(*Stream), "012");
  }
}

TEST(Streams, CopyFromTakesAllOrACountOrTheRest) {
  TMemoryStream Source, Dest;
  Source.WriteBuffer("0123456789", 10);
  EXPECT_EQ(Dest.CopyFrom(Source), 10);  // from its start, wherever it stands
  Source.SetPosition(2);
  EXPECT_EQ(Dest.CopyFrom(Source, 3, 2), 3);
  EXPECT_EQ(Dest.CopyFrom(Source, -1, 2), 5);
  EXPECT_EQ(Content(Dest), "012345678923456789");
  Source.SetPosition(8);
  EXPECT_THROW(Dest.CopyFrom(Source, 3), EReadError);
  const TTempFolder Folder;
  Source.SaveToFile(Folder.File("a"));
  Dest.LoadFromFile(Folder.File("a"));
  EXPECT_EQ(Content(Dest), "0123456789");
}

TEST(Streams, FailuresTellWhy) {
  const TTempFolder Folder;
  const UnicodeString None = Folder.File("no/a"), Why = u" file \"" + None + u"\". No such file or directory";
  EXPECT_EQ(RaisedBy([&] { TFileStream(None, fmOpenRead); }), u"EFOpenError: Cannot open" + Why);
  EXPECT_EQ(RaisedBy([&] { TFileStream(None, fmCreate); }), u"EFCreateError: Cannot create" + Why);
  EXPECT_THROW(TFileStream(Folder.File(""), fmOpenRead), EFOpenError);
  TFileStream Full(u"/dev/full", fmOpenWrite);
  EXPECT_EQ(RaisedBy([&] { Full.WriteBuffer("x", 1); }), u"EWriteError: Stream write error");
}

TEST(Streams, ShareModesKeepOutThoseWhoAskForOneToo) {
  const std::tuple<int, int, bool> Cases[] = {
      {fmOpenReadWrite | fmShareExclusive, fmOpenRead | fmShareDenyWrite, false},
      {fmOpenReadWrite | fmShareExclusive, fmOpenRead | fmShareDenyNone, true},
      {fmOpenRead | fmShareDenyWrite, fmOpenRead | fmShareDenyWrite, true},
      {fmOpenRead | fmShareDenyWrite, fmOpenWrite | fmShareDenyWrite, false}, {fmCreate, fmOpenRead, true}};
  const TTempFolder Folder({"a"});
  for (const auto& Case : Cases) {
    const TFileStream First(Folder.File("a"), static_cast<Word>(std::get<0>(Case)));
    const auto Second = [&] { TFileStream(Folder.File("a"), static_cast<Word>(std::get<1>(Case))); };
    EXPECT_EQ(RaisedBy(Second) == u"nothing", std::get<2>(Case)) << testing::PrintToString(Case);
  }
}

TEST(Streams, StringsAreKeptInTheirEncoding) {
  TStringStream Text(u"aä", TEncoding::BigEndianUnicode());
  EXPECT_EQ(Content(Text), std::string("\0a\0\xE4", 4));
  Text.SetPosition(2);
  EXPECT_EQ(Text.ReadString(100), u"ä");
  Text.WriteString(u"!");
  EXPECT_EQ(Text.DataString() + TStringStream(RawByteString("\xE4", 1252)).DataString(), u"aä!ä");
}

TEST(Streams, ResourcesLieBesideTheirModule) {
  const fs::path Folder = ToSystemPath(ParamStr(0)) + ".resources";
  fs::create_directories(Folder / "RCDATA");
  std::ofstream(Folder / "RCDATA/Logo.png") << "PNG";
  std::ofstream(Folder / "RCDATA/7") << "seven";
  TResourceStream Logo(MainInstance(), u"LOGO.PNG", RT_RCDATA), ById(MainInstance(), 7, u"rcdata");
  EXPECT_EQ(Content(Logo) + Content(ById), "PNGseven");
  EXPECT_THROW(Logo.Write("x", 1), EStreamError);
  EXPECT_EQ(
      RaisedBy([] { TResourceStream(MainInstance(), u"none", RT_RCDATA); }), u"EResNotFound: Resource none not found");
  EXPECT_FALSE(Platform().Resources().FindResource(MainInstance(), u"../RCDATA", RT_RCDATA));
  EXPECT_EQ(ZqGetResource(u"logo.png", RT_RCDATA)->Size(), 3) << "of the program, as the library has none";
  EXPECT_EQ(ZqFindResource(u"LOGO", RT_RCDATA), nullptr);
  EXPECT_GT(
      RaisedBy([] { (void)ZqGetResource(u"LOGO", RT_RCDATA); }).Pos(u": There is no resource with the name: LOGO"), 1);
  fs::remove_all(Folder);
}

}  // namespace
}  // namespace zq
