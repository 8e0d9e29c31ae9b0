#include <sys/resource.h>

#include <csignal>
#include <fstream>

#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/io/streams.h"
#include "runtime/io/text_file.h"
#include "runtime/text/encoding.h"
#include "tests/fakes/resources.h"
#include "tests/support/support.h"

namespace zq {
namespace {

namespace fs = std::filesystem;
using testing::Eq, testing::Return;

// -------------------------------------------------------------------------------------------------------- Paths

TEST(PathText, TakesEitherSeparatorAndKeepsTheKindInUse) {
  const UnicodeString Here = GetCurrentDir();
  const std::pair<UnicodeString (*)(const UnicodeString&), std::map<UnicodeString, UnicodeString>> Cases[] = {
      {ExtractFileName, {{u"C:\\l/app.1.log", u"app.1.log"}, {u"a/b\\", u""}}},
      {ExtractFilePath, {{u"a/b\\c.x", u"a/b\\"}, {u"name", u""}}},
      {ExtractFileDir, {{u"/x", u"/"}, {u"a\\b/c", u"a\\b"}, {u"a//b", u"a"}, {u"name", u""}}},
      {ExtractFileExt, {{u"/x.d/name", u""}, {u"x.d\\name", u""}, {u"/x/a.b.c", u".c"}, {u"a.", u"."}}},
      {IncludeTrailingBackslash, {{u"a\\b", u"a\\b\\"}, {u"/a\\b", u"/a\\b\\"}, {u"/x", u"/x/"}, {u"x/", u"x/"}}},
      {ExcludeTrailingBackslash, {{u"a//", u"a/"}, {u"", u""}}},
      {ExpandFileName, {{u"/a/./b/../c", u"/a/c"}, {u"/../x", u"/x"}, {u"\\a\\b\\", u"/a/b/"}, {u"/", u"/"},
                           {u".", Here}, {u"a/../b", Here + u"/b"}, {u"", u""}}}};
  for (const auto& [Function, Pairs] : Cases)
    for (const auto& [Path, Result] : Pairs) EXPECT_EQ(Function(Path), Result) << ToUTF8(Path);
  EXPECT_EQ(ChangeFileExt(u"/x.d/app", u".log") + ChangeFileExt(u"|a.tar.gz", u".x"), u"/x.d/app.log|a.tar.x");
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
    EXPECT_TRUE(RenameFile(Path, Path + u"2") && DeleteFile(Path + u"2"));
  }
}

TEST(Files, LinksAreFollowedFoldersMadeWholeAndNothingOverwritten) {
  const TTempFolder Folder({"file", "other"});
  const UnicodeString File = Folder.File("file"), Link = Folder.File("link"), Dangling = Folder.File("dangling");
  fs::create_symlink("file", ToSystemPath(Link));
  fs::create_symlink("nowhere", ToSystemPath(Dangling));
  EXPECT_TRUE(FileExists(Link) && DirectoryExists(Folder.File("")));
  EXPECT_FALSE(FileExists(Dangling) || FileExists(Folder.File("")) || DirectoryExists(File));
  fs::permissions(Folder.Path() / "file", fs::perms::owner_read);
  EXPECT_TRUE(FileGetAttr(Link) == (faArchive | faReadOnly) && FileGetAttr(Dangling) == -1 && FileSizeOf(Link) == 4);
  EXPECT_TRUE(!RenameFile(Folder.File("other"), File) && Folder.Read("file") == "file");
  for (const char* const Name : {"x\\y/z\\", "x/y"}) EXPECT_TRUE(ForceDirectories(Folder.File(Name)));
  EXPECT_TRUE(RemoveDir(Folder.File("x/y/z")));
  EXPECT_FALSE(ForceDirectories(Folder.File("file/z")) || RemoveDir(Folder.File("x")));
  EXPECT_FALSE(DeleteFile(Folder.File("x")) || CreateDir(Folder.File("x")));
}

TEST(Files, MasksFitLikeTheirRulesSay) {
  // Mask, a name that fits and one that does not.
  const std::tuple<const char16_t*, const char16_t*, const char16_t*> Cases[] = {{u"app*.*", u"app", u"myapp.log"},
      {u"app*.*", u"apple.log", u"App"}, {u"app.*", u"app", u"apple"}, {u"app.*", u"app.", u"ap"},
      {u"a?c", u"abc", u"ac"}, {u"a?c", u"a.c", u"abcd"}, {u"*a*b", u"xaxbxab", u"xaxbxa"}, {u"a*", u"a", u"ba"},
      {u"*.log", u".log", u"x.log.1"}};
  for (const auto& [Mask, Fits, Other] : Cases)
    EXPECT_TRUE(FitsMask(Fits, Mask) && !FitsMask(Other, Mask)) << ToUTF8(Mask) << ' ' << ToUTF8(Fits);
}

TEST(Files, FindsWhatFitsAndItsAttributesAllowAndLeavesNoHandle) {
  const TTempFolder Folder({"app.log", "app.1.log", ".app", "other"});
  fs::create_directory(Folder.Path() / "app.d");
  fs::create_directory_symlink("app.d", Folder.Path() / "app.link");
  const auto OpenHandles = [] { return std::distance(fs::directory_iterator("/proc/self/fd"), {}); };
  const auto Before = OpenHandles();
  EXPECT_EQ(Find(Folder.File("app*.*")), (std::set<std::string>{"app.log", "app.1.log", "app.d", "app.link"}));
  EXPECT_EQ(Find(Folder.File("*.*"), 0), (std::set<std::string>{"app.log", "app.1.log", "app.link", "other"}));
  EXPECT_TRUE(Find(Folder.File("*")).contains("..") && Find(Folder.File("")).empty());
  for (const bool Closed : {true, false}) {
    TSearchRec Found;
    ASSERT_EQ(FindFirst(Folder.File("app.link"), faAnyFile, Found), 0);
    EXPECT_EQ(Found.Attr & (faDirectory | faSymLink), faSymLink);
    for (int i = 0; i < 2; ++i) ASSERT_EQ(FindFirst(Folder.File("*"), faAnyFile, Found), 0);
    if (Closed) FindClose(Found);
    EXPECT_EQ(FindNext(Found), Closed ? 18 : 0);
  }
  EXPECT_EQ(OpenHandles(), Before);
}

// --------------------------------------------------------------------------------------------------- Text files

// A text file "a.txt", new and open.
class TextFile : public testing::Test {
 protected:
  TextFile() { File.Assign(Folder.File("a.txt")), File.Rewrite(); }
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
  EXPECT_EQ(Folder.Read("a.txt"), "b\xC3\xA4\r\nend\r\n");
  File.Assign(Folder.File("b.txt"), 1252);
  File.Rewrite();
  File.WriteLn(u"ä");
  EXPECT_EQ(Folder.Read("b.txt"), "\xE4\r\n");
  File.Assign(Folder.File("c.txt"), 50221);
  File.Rewrite();
  EXPECT_NO_THROW(File.WriteLn(u"\u0100")) << "a character with escape sequences on both sides";
}

TEST_F(TextFile, LongLinesComeWholeAndShortOnesInOneSystemCall) {
  std::string Expected;
  for (const std::size_t Length : {2728U, 2730U, 2731U, 50000U, 3U}) {
    File.WriteLn(UnicodeString(Length, u'€'));
    for (std::size_t i = 0; i < Length; ++i) Expected += "€";
    Expected += "\r\n";
  }
  EXPECT_EQ(Folder.Read("a.txt"), Expected);
  if (!std::ifstream("/proc/self/io")) GTEST_SKIP() << "the system keeps no count";
  const auto Calls = [] {
    const std::string Counts = ReadFile("/proc/self/io");
    return std::stoll(Counts.substr(Counts.find("syscw:") + 6));
  };
  const auto Before = Calls();
  for (int i = 0; i < 10; ++i, File.Flush()) File.WriteLn(u"a line");
  EXPECT_EQ(Calls() - Before, 10);
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

TEST_F(TextFile, FailedStepsTellFileAndReasonAsStreamsDo) {
  File.Assign(u"/no/a");
  const UnicodeString Missing = u" file \"/no/a\". No such file or directory";
  EXPECT_EQ(RaisedBy([&] { File.Rewrite(); }), u"EInOutError: Cannot create" + Missing);
  EXPECT_EQ(RaisedBy([&] { File.Append(); }), u"EInOutError: Cannot open" + Missing);
  EXPECT_EQ(RaisedBy([&] { File.Flush(); }), u"EInOutError: Cannot write file \"/no/a\". Bad file descriptor");
  File.Assign(u"/dev/full");
  File.Append();
  EXPECT_EQ(
      RaisedBy([&] { File.WriteLn(u"x"); }), u"EInOutError: Cannot write file \"/dev/full\". No space left on device");
  EXPECT_EQ(RaisedBy([] { TFileStream(u"/no/a", fmOpenRead); }), u"EFOpenError: Cannot open" + Missing);
  EXPECT_EQ(RaisedBy([] { TFileStream(u"/no/a", fmCreate); }), u"EFCreateError: Cannot create" + Missing);
  EXPECT_THROW(TFileStream(Folder.File(""), fmOpenRead), EFOpenError);
  TFileStream Full(u"/dev/full", fmOpenWrite);
  EXPECT_EQ(RaisedBy([&] { Full.WriteBuffer("x", 1); }), u"EWriteError: Stream write error");
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
    EXPECT_TRUE(Stream->Seek(-4, soEnd) == 6 && Stream->Seek(-2, soFromCurrent) == 4);
    char Buffer[8] = {};
    EXPECT_TRUE(Stream->Read(Buffer, 8) == 6 && Buffer == std::string("456789")) << Buffer;
    EXPECT_EQ(RaisedBy([&] { Stream->ReadBuffer(Buffer, 1); }), u"EReadError: Stream read error");
    Stream->SetPosition(12);
    EXPECT_EQ(Stream->Write("x", 1), 1);
    EXPECT_EQ(Content(*Stream), std::string("0123456789\0\0x", 13));
    Stream->SetSize(3);
    EXPECT_EQ(Content(*Stream), "012");
  }
}

TEST(Streams, CopiesTakeAllOrACountOrTheRestAndStringsKeepTheirEncoding) {
  TMemoryStream Source, Dest;
  Source.WriteBuffer("0123456789", 10);
  EXPECT_EQ(Dest.CopyFrom(Source), 10);  // from its start, wherever it stands
  Source.SetPosition(2);
  EXPECT_TRUE(Dest.CopyFrom(Source, 3, 2) == 3 && Dest.CopyFrom(Source, -1, 2) == 5);
  EXPECT_EQ(Content(Dest), "012345678923456789");
  Source.SetPosition(8);
  EXPECT_THROW(Dest.CopyFrom(Source, 3), EReadError);
  const TTempFolder Folder;
  Source.SaveToFile(Folder.File("a"));
  Dest.LoadFromFile(Folder.File("a"));
  EXPECT_EQ(Content(Dest), "0123456789");
  Dest.SetPosition(5);
  EXPECT_EQ(Dest.Seek(std::numeric_limits<Int64>::max(), soCurrent), std::numeric_limits<Int64>::max());
  EXPECT_THROW(Dest.Write("x", 1), EStreamError);
  TStringStream Text(u"aä", TEncoding::BigEndianUnicode());
  EXPECT_EQ(Content(Text), std::string("\0a\0\xE4", 4));
  Text.SetPosition(2);
  EXPECT_EQ(Text.ReadString(100) + TStringStream(RawByteString("\xE4", 1252)).DataString(), u"ää");
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

TEST(Streams, AResourceIsReadOnlyAndIsMissedByName) {
  TScriptedResources Resources;
  EXPECT_CALL(Resources, LoadResource(HInstance(), Eq(u"Logo"), Eq(u"#10"))).WillOnce(Return(TBytes{'P', 'N', 'G'}));
  EXPECT_CALL(Resources, LoadResource(MainInstance(), Eq(u"#7"), Eq(u"text"))).WillOnce(Return(std::nullopt));
  TResourceStream Logo(HInstance(), u"Logo", RT_RCDATA);
  EXPECT_EQ(Content(Logo), "PNG");
  EXPECT_THROW(Logo.Write("x", 1), EStreamError);
  EXPECT_EQ(RaisedBy([] { TResourceStream(MainInstance(), 7, u"text"); }), u"EResNotFound: Resource #7 not found");
}

}  // namespace
}  // namespace zq
