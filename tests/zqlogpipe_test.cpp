#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdio>
#include <numeric>

#include "tests/support/support.h"

namespace zq {
namespace {

struct TRun {
  int Status;
  std::string Errors;
};

// AWords go through the shell. Both streams of output come back together.
TRun RunPipe(const std::string& AWords) {
  std::FILE* const Output = ::popen((std::string(ZQ_TEST_LOGPIPE " ") + AWords + " 2>&1").c_str(), "r");
  TRun Result{-1, {}};
  for (int c = 0; (c = std::fgetc(Output)) != EOF;) Result.Errors += static_cast<char>(c);
  const int Status = ::pclose(Output);
  Result.Status = WIFEXITED(Status) ? WEXITSTATUS(Status) : -1;
  return Result;
}

// What stands behind the logger's name, line by line.
std::vector<std::string> Texts(const std::string& ALog) {
  std::vector<std::string> Result;
  for (const std::string& Line : SplitLines(ALog))
    if (const auto Found = Line.find(" root.zqlogpipe - "); Found != std::string::npos)
      Result.push_back(Line.substr(Found + 18));
  return Result;
}

struct TWrongUse {
  const char* Name;
  const char* Words;
  int Status;
  const char* Message;
};
class PipeWrongUse : public testing::TestWithParam<TWrongUse> {};

TEST_P(PipeWrongUse, EndsWithAClearMessage) {
  const TTempFolder Folder({"plain"});
  const TRun Run = RunPipe("--file " + (Folder.Path() / "app.log").string() + " " + GetParam().Words + " </dev/null");
  EXPECT_EQ(Run.Status, GetParam().Status) << Run.Errors;
  EXPECT_NE(Run.Errors.find(GetParam().Message), std::string::npos) << Run.Errors;
}
INSTANTIATE_TEST_SUITE_P(Uses, PipeWrongUse,
    testing::Values(TWrongUse{"UnknownOption", "--colour", 2, "unknown option '--colour'"},
        TWrongUse{"NoValue", "--logger", 2, "--logger needs a value"},
        TWrongUse{"NoNumber", "--max-size 12k", 2, "--max-size takes a whole number from 0 to 4294967295, not '12k'"},
        TWrongUse{"TooManyBackups", "--backups 65536", 2, "--backups takes a whole number from 1 to 65535"},
        TWrongUse{"BlankFile", "--file ' '", 2, "--file needs a name"},
        TWrongUse{"NoLevel", "--level loud", 2, "not 'loud'"},
        TWrongUse{"MissingInput", "/no/such/file", 1, "/no/such/file: No such file or directory"},
        TWrongUse{"FolderAsInput", "/", 1, "Is a directory"},
        TWrongUse{"FolderThatCannotBeMade", "--file /dev/null/sub/app.log", 1, "/dev/null/sub/app.log"}),
    [](const auto& AInfo) { return std::string(AInfo.param.Name); });

TEST(Pipe, LinesOfAnyBytesAndLengthPassWhole) {
  const TTempFolder Folder;
  std::string Bytes;
  for (int c = 0; c < 256; ++c)
    if (c != '\n' && c != '\r') Bytes += static_cast<char>(c);
  const std::string Long(3'000'000, 'y');
  Folder.Write("in", Bytes + "\n\n" + Long + "\n\xF0\x9F\x92\x80 and a tail without an end");
  const TRun Run =
      RunPipe("--max-size 0 --file " + (Folder.Path() / "app.log").string() + " " + (Folder.Path() / "in").string());
  EXPECT_EQ(Run.Status, 0) << Run.Errors;
  EXPECT_NE(Run.Errors.find("4 lines read, 4 lines written, 0 files rolled"), std::string::npos) << Run.Errors;
  std::string Utf8;
  for (const char c : Bytes)
    Utf8 += c >= 0 ? std::string(1, c) : UnicodeString(1, static_cast<unsigned char>(c)).ToUTF8();
  EXPECT_EQ(Texts(Folder.Read("app.log")),
      (std::vector<std::string>{Utf8, "", Long, "\xF0\x9F\x92\x80 and a tail without an end"}));
}

TEST(Pipe, RollsAndCountsAndKeepsEveryLine) {
  const TTempFolder Folder;
  std::string Input;
  for (int i = 0; i < 5000; ++i) Input += "line " + std::to_string(i) + "\n";
  Folder.Write("in", Input);
  const TRun Run = RunPipe("--max-size 40000 --backups 100 --file " + (Folder.Path() / "logs/app.log").string() +
                           " - <" + (Folder.Path() / "in").string());
  EXPECT_EQ(Run.Status, 0) << Run.Errors;
  const auto Rolled = std::distance(std::filesystem::directory_iterator(Folder.Path() / "logs"), {}) - 1;
  EXPECT_GT(Rolled, 3);
  EXPECT_NE(Run.Errors.find("5000 lines written, " + std::to_string(Rolled) + " files rolled"), std::string::npos)
      << Run.Errors;
  std::vector<std::string> All;
  for (auto i = Rolled; i >= 0; --i)
    for (const std::string& Text :
        Texts(ReadFile(Folder.Path() / "logs" / (i == 0 ? "app.log" : "app." + std::to_string(i) + ".log"))))
      All.push_back(Text + "\n");
  EXPECT_EQ(std::accumulate(All.begin(), All.end(), std::string()), Input);
}

TEST(Pipe, LevelWordOfTheLineDecides) {
  const TTempFolder Folder;
  Folder.Write("in", "an ERROR here, no warning\ninfos are no level\n[Debug] x\n");
  const TRun Run = RunPipe("--detect-level --level fatal --file " + (Folder.Path() / "a").string() + " --file " +
                           (Folder.Path() / "b").string() + " " + (Folder.Path() / "in").string());
  EXPECT_EQ(Run.Status, 0) << Run.Errors;
  EXPECT_NE(Run.Errors.find("3 lines read, 6 lines written"), std::string::npos) << Run.Errors;
  for (const char* const Name : {"a.log", "b.log"}) {
    const auto Lines = SplitLines(Folder.Read(Name));
    ASSERT_EQ(Lines.size(), 5U);
    EXPECT_NE(Lines[1].find(" - Error "), std::string::npos);
    EXPECT_NE(Lines[2].find(" - Fatal "), std::string::npos);
    EXPECT_NE(Lines[3].find(" - Debug "), std::string::npos);
  }
}

TEST(Pipe, FullDeviceIsAFailure) {
  const TTempFolder Folder;
  std::filesystem::create_symlink("/dev/full", Folder.Path() / "app.log");
  const TRun Run = RunPipe("--file " + (Folder.Path() / "app.log").string() + " </etc/passwd");
  EXPECT_EQ(Run.Status, 1);
  EXPECT_NE(Run.Errors.find("No space left on device"), std::string::npos) << Run.Errors;
}

}  // namespace
}  // namespace zq
