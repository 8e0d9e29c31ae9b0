// zqlogview: turns XML logs into one page of HTML that a browser shows as a table, without a stylesheet or network.

#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "log_page.h"
#include "log_reader.h"
#include "runtime/core/utf8.h"
#include "runtime/io/files.h"

using namespace zq;
namespace fs = std::filesystem;

namespace {

constexpr char cHelp[] =
    "usage: zqlogview [--output FILE] LOG...\n"
    "\n"
    "Turns XML logs into one page of HTML, in the order given; LOG may be - for standard input. Logs that were rolled\n"
    "are given oldest first: app.2.log.xml app.1.log.xml app.log.xml.\n"
    "\n"
    "  -o, --output FILE  the page, - for standard output (-). A FILE that exists is replaced when the page is whole\n"
    "  --version          the version\n"
    "  -h, --help         this text\n"
    "\n"
    "The page filters by level, logger and text. The filter stands in its address, so that a view can be linked:\n"
    "page.html#level=4&logger=root.shop&text=disk shows from warnings on (levels: 1 trace, 2 debug, 3 info, 4 warn,\n"
    "5 error, 6 fatal) what root.shop and the loggers below it said of disk. Lines of a log that can't be read, such\n"
    "as one that its writer couldn't finish, are shown as they are, with their number.\n"
    "Exit status: 0, 1 for a failure, 2 for a wrong use.\n";

class TUsageError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

struct TOptions {
  std::vector<std::string> Inputs;
  std::string Output = "-";
  bool Help = false;
  bool Version = false;
};

TOptions ParseOptions(const std::vector<std::string_view>& AWords) {
  TOptions Result;
  bool OnlyFiles = false;
  for (std::size_t i = 0; i < AWords.size(); ++i) {
    const std::string_view Word = AWords[i];
    if (OnlyFiles || Word == "-" || !Word.starts_with('-')) Result.Inputs.emplace_back(Word);
    else if (Word == "--") OnlyFiles = true;
    else if (Word == "--help" || Word == "-h") Result.Help = true;
    else if (Word == "--version") Result.Version = true;
    else if (Word.starts_with("--output=")) Result.Output = Word.substr(Word.find('=') + 1);
    else if (Word != "--output" && Word != "-o") throw TUsageError("unknown option '" + std::string(Word) + "'");
    else if (++i == AWords.size()) throw TUsageError(std::string(Word) + " needs a value");
    else Result.Output = AWords[i];
  }
  if (Result.Help || Result.Version) return Result;
  if (Result.Inputs.empty()) throw TUsageError("which log?");
  if (Result.Output.empty()) throw TUsageError("--output needs a name");
  return Result;
}

UnicodeString NameOf(const std::string& AFile) { return utf8::Decode(AFile, utf8::TMalformed::Escape); }

[[noreturn]] void Fail(const std::string& AName, int AError) {
  throw std::runtime_error(AName + ": " + std::strerror(AError));
}

/// A log's bytes. A read that fails is no end of the log, and raises.
class TInput : public TStream {
 public:
  explicit TInput(const std::string& AFile) : FName(AFile == "-" ? "standard input" : AFile) {
    if (AFile == "-") FStream = std::make_unique<THandleStream>(STDIN_FILENO);
    else if (DirectoryExists(NameOf(AFile))) Fail(AFile, EISDIR);
    else FStream = std::make_unique<TFileStream>(NameOf(AFile), fmOpenRead | fmShareDenyNone);
  }
  [[nodiscard]] const std::string& Name() const { return FName; }
  Integer Read(void* ABuffer, Integer ACount) override {
    errno = 0;
    const Integer Result = FStream->Read(ABuffer, ACount);
    if (Result == 0 && errno != 0 && errno != EINTR) Fail(FName, errno);
    return Result;
  }
  Integer Write(const void*, Integer) override { return 0; }
  using TStream::Seek;
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override { return FStream->Seek(AOffset, AOrigin); }

 private:
  std::string FName;
  std::unique_ptr<TStream> FStream;
};

/// A new file beside the one that it takes the place of when it is whole, and that stays as it is otherwise. What is no
/// ordinary file, such as a terminal or a pipe, is written straight.
class TOutput {
 public:
  explicit TOutput(const std::string& AFile) : FName(AFile == "-" ? "standard output" : AFile) {
    if (AFile == "-") {
      FStream = std::make_unique<THandleStream>(STDOUT_FILENO);
    } else if ((FileGetAttr(NameOf(AFile)) + 1) != 0 && !fs::is_regular_file(AFile)) {
      if (fs::is_directory(AFile)) Fail(AFile, EISDIR);
      FStream = std::make_unique<TFileStream>(NameOf(AFile), fmOpenWrite);
    } else {
      FFinal = fs::weakly_canonical(AFile).string();
      FTemporary = FFinal + "." + std::to_string(::getpid()) + ".tmp";
      FStream = std::make_unique<TFileStream>(NameOf(FTemporary), fmCreate);
    }
  }
  TOutput(const TOutput&) = delete;
  TOutput& operator=(const TOutput&) = delete;
  ~TOutput() {
    if (!FTemporary.empty()) std::remove(FTemporary.c_str());
  }
  TStream& Stream() { return *FStream; }
  [[nodiscard]] const std::string& Name() const { return FName; }
  void Finish() {
    FStream.reset();
    if (!FTemporary.empty() && std::rename(FTemporary.c_str(), FFinal.c_str()) != 0) Fail(FName, errno);
    FTemporary.clear();
  }

 private:
  std::string FName;
  std::string FFinal;
  std::string FTemporary;
  std::unique_ptr<TStream> FStream;
};

void View(const TOptions& AOptions) {
  std::vector<std::unique_ptr<TInput>> Inputs;  // all are there before the page begins
  std::error_code Ignored;
  for (const std::string& Input : AOptions.Inputs) {
    Inputs.push_back(std::make_unique<TInput>(Input));
    if (fs::is_regular_file(AOptions.Output, Ignored) && fs::equivalent(Input, AOptions.Output, Ignored))
      throw std::runtime_error(AOptions.Output + ": the page would take the log's place");
  }
  TOutput Output(AOptions.Output);
  const std::size_t Further = Inputs.size() - 1;
  try {
    TLogPage Page(Output.Stream(),
        UnicodeString::FromUTF8(Inputs[0]->Name() + (Further == 0 ? "" : " and " + std::to_string(Further) + " more"))
            .ToUTF8());
    for (const auto& Input : Inputs) {
      TLogReader Log(*Input);
      Page.Add(UnicodeString::FromUTF8(Input->Name()).ToUTF8(), Log);
    }
    Page.Finish();
  } catch (const EWriteError& e) {
    throw std::runtime_error(Output.Name() + ": " + e.what());
  }
  Output.Finish();
}

}  // namespace

int main(int ACount, char** AWords) {
  for (const int Number : {SIGXFSZ, SIGPIPE}) std::signal(Number, SIG_IGN);  // the write tells
  try {
    const TOptions Options = ParseOptions({AWords + 1, AWords + ACount});
    if (Options.Help || Options.Version) std::fputs(Options.Help ? cHelp : "zqlogview " ZQ_VERSION "\n", stdout);
    else View(Options);
    return 0;
  } catch (const TUsageError& e) {
    std::fprintf(stderr, "zqlogview: %s\nTry zqlogview --help.\n", e.what());
    return 2;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "zqlogview: %s\n", e.what());
    return 1;
  }
}
