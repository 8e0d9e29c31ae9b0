#include <gmock/gmock.h>
#include <sys/wait.h>

#include <cstdio>
#include <thread>

#include "tests/support/support.h"

namespace zq {
namespace {

using testing::_, testing::AllOf, testing::HasSubstr, testing::StartsWith;

class Pipe : public testing::Test {
 protected:
  // Runs in the folder, and AWords go through the shell. Gives the status and both streams of output together.
  [[nodiscard]] std::string Run(const std::string& AWords) const {
    const std::string Command = "cd '" + Folder.Path().string() + "' && " ZQ_TEST_LOGPIPE " ";
    std::FILE* const Output = ::popen((Command + AWords + " 2>&1").c_str(), "r");
    std::string Result;
    for (int c = 0; (c = std::fgetc(Output)) != EOF;) Result += static_cast<char>(c);
    const int Status = ::pclose(Output);
    return (WIFEXITED(Status) ? std::to_string(WEXITSTATUS(Status)) : "killed") + ": " + Result;
  }
  const TTempFolder Folder;
};

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
class PipeWrongUse : public Pipe, public testing::WithParamInterface<TWrongUse> {};

TEST_P(PipeWrongUse, EndsWithAClearMessage) {
  const std::string Told = Run("--file app.log " + std::string(GetParam().Words) + " </dev/null");
  EXPECT_THAT(Told, AllOf(StartsWith(std::to_string(GetParam().Status) + ": "), HasSubstr(GetParam().Message)));
}
INSTANTIATE_TEST_SUITE_P(Uses, PipeWrongUse,
    testing::Values(TWrongUse{"UnknownOption", "--colour", 2, "unknown option '--colour'"},
        TWrongUse{"NoValue", "--logger", 2, "--logger needs a value"},
        TWrongUse{"NoNumber", "--max-size 12x", 2, "--max-size takes a whole number from 0 to 4294967295, not '12x'"},
        TWrongUse{"TooLarge", "--max-size=4G", 2, "--max-size takes less than 4G, not '4G'"},
        TWrongUse{"ValueOfASwitch", "--quiet=1", 2, "--quiet takes no value"},
        TWrongUse{"TooManyBackups", "--backups 65536", 2, "--backups takes a whole number from 1 to 65535"},
        TWrongUse{"BlankFile", "--file ' '", 2, "--file needs a name"},
        TWrongUse{"BlankSource", "--syslog=", 2, "--syslog= needs a name"},
        TWrongUse{"NoLevel", "--level loud", 2, "not 'loud'"},
        TWrongUse{"MissingInput", "/no/such/file", 1, "/no/such/file: No such file or directory"},
        TWrongUse{"FolderAsInput", "/", 1, "Is a directory"},
        TWrongUse{"FolderThatCannotBeMade", "--file /dev/null/sub/app.log", 1, "/dev/null/sub/app.log"}),
    [](const auto& AInfo) { return std::string(AInfo.param.Name); });

TEST_F(Pipe, LinesOfAnyBytesAndLengthPassWhole) {
  std::string Bytes, Utf8;
  for (Char c = 0; c < 256; ++c)
    if (c != '\n' && c != '\r') Bytes += static_cast<char>(c), Utf8 += UnicodeString(c).ToUTF8();
  const std::string Long(3'000'000, 'y');
  Folder.Write("in", Bytes + "\n\n" + Long + "\n\xF0\x9F\x92\x80 and a tail without an end");
  EXPECT_THAT(
      Run("--max-size 0 --file app.log in"), StartsWith("0: zqlogpipe: 4 lines read, 4 lines written, 0 files"));
  EXPECT_EQ(Texts(Folder.Read("app.log")),
      (std::vector<std::string>{Utf8, "", Long, "\xF0\x9F\x92\x80 and a tail without an end"}));
}

TEST_F(Pipe, RollsAndCountsAndKeepsEveryLine) {
  std::string Input;
  for (int i = 0; i < 5000; ++i) Input += "line " + std::to_string(i) + "\n";
  Folder.Write("in", Input);
  const std::string Told = Run("--max-size 40000 --backups 100 --file logs/app.log - <in");
  const auto Rolled = std::distance(std::filesystem::directory_iterator(Folder.Path() / "logs"), {}) - 1;
  EXPECT_GT(Rolled, 3);
  EXPECT_THAT(Told,
      StartsWith("0: zqlogpipe: 5000 lines read, 5000 lines written, " + std::to_string(Rolled) + " files rolled"));
  std::string All;
  for (auto i = Rolled; i >= 0; --i)
    for (const std::string& Text :
        Texts(ReadFile(Folder.Path() / "logs" / (i == 0 ? "app.log" : "app." + std::to_string(i) + ".log"))))
      All += Text + "\n";
  EXPECT_EQ(All, Input);
}

TEST_F(Pipe, LevelWordOfTheLineDecides) {
  Folder.Write("in", "an ERROR here, no warning\ninfos are no level\n[Debug] x\n");
  EXPECT_THAT(Run("--detect-level --level fatal --file a --file b in"),
      StartsWith("0: zqlogpipe: 3 lines read, 6 lines written"));
  for (const char* const Name : {"a.log", "b.log"}) {
    EXPECT_THAT(SplitLines(Folder.Read(Name)),
        testing::ElementsAre(_, HasSubstr(" - Error "), HasSubstr(" - Fatal "), HasSubstr(" - Debug "), _));
  }
}

TEST_F(Pipe, OptionsOfFormAndOutput) {
  Folder.Write("in", "one\n");
  EXPECT_EQ(Run("--file=app --no-time --tee --quiet --max-size=1k in"), "0: one\n");
  EXPECT_EQ(SplitLines(Folder.Read("app.log"))[1], "Info root.zqlogpipe - one");
  EXPECT_THAT(Run("--version"), StartsWith("0: zqlogpipe 0."));
  EXPECT_THAT(Run("-h"), StartsWith("0: usage: "));
}

TEST_F(Pipe, AFileOfAnEarlierPeriodIsNamedByItsDate) {
  Folder.Write("in", "one\n");
  Folder.Write("app.log", "old");
  std::this_thread::sleep_for(std::chrono::milliseconds(1100));
  EXPECT_EQ(Run("--pattern=hhnnss --quiet --file app in"), "0: ");
  std::vector<std::string> Names = Folder.Names();
  ASSERT_EQ(Names.size(), 3U);
  EXPECT_EQ(Folder.Read(Names[0]), "old");
  EXPECT_TRUE(Names[0].starts_with("app.") && Names[0].size() == std::string("app.hhnnss.log").size());
  EXPECT_EQ(Texts(Folder.Read("app.log")), std::vector<std::string>{"one"});
}

TEST_F(Pipe, SignalsBeginTheFileAgainAndEndIt) {
  Folder.Write("script", "see() { until grep -q $1 $2 2>/dev/null; do sleep 0.05; done; }; mkfifo f; " ZQ_TEST_LOGPIPE
                         " --file app.log <f & p=$!; exec 3>f; echo one >&3; see one app.log; mv app.log old.log; "
                         "kill -HUP $p; see stopped old.log; echo two >&3; see two app.log; kill -TERM $p; wait $p; "
                         "echo status $?");
  EXPECT_THAT(Run("--version >/dev/null; timeout 60 sh script"), HasSubstr("status 143"));
  EXPECT_EQ(Texts(Folder.Read("old.log")), std::vector<std::string>{"one"});
  EXPECT_EQ(Texts(Folder.Read("app.log")), std::vector<std::string>{"two"});
  EXPECT_THAT(Folder.Read("app.log"), HasSubstr("\nLog stopped on"));
}

TEST_F(Pipe, FullDeviceIsAFailure) {
  std::filesystem::create_symlink("/dev/full", Folder.Path() / "app.log");
  const std::string Told = Run("--file app.log </etc/passwd");
  EXPECT_THAT(Told, AllOf(StartsWith("1: "), HasSubstr("No space left on device")));
}

}  // namespace
}  // namespace zq
