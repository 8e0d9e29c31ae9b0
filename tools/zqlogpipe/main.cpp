// zqlogpipe: logs each line of its input through rZqCommon into files that roll by size, and into the system's log.

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "files.h"
#include "options.h"
#include "output.h"
#include "settings.h"
#include "signals.h"

namespace {

using namespace zq;

class TPipe {
 public:
  TPipe(const TOptions& AOptions, TOutput& AOutput) : FOptions(AOptions), FOutput(AOutput) {}

  void Run(const std::string& AInput) {
    const bool Standard = AInput == "-";
    const int Handle = Standard ? STDIN_FILENO : ::open(AInput.c_str(), O_RDONLY | O_CLOEXEC);
    if (Handle < 0) throw std::runtime_error(Reason(AInput));
    std::string Rest;
    ssize_t Got = 0;
    std::vector<char> Block(1 << 16);
    for (;;) {
      Wait(Handle, -1);
      if (StopSignal != 0) break;
      if (std::exchange(ReopenSignal, 0) != 0) {
        FOutput.Reopen();
        continue;  // a signal that came meanwhile isn't left to wait for input
      }
      Got = ::read(Handle, Block.data(), Block.size());
      if (Got == 0 || (Got < 0 && errno != EINTR && errno != EAGAIN)) break;
      if (Got > 0) Split(Rest, {Block.data(), static_cast<std::size_t>(Got)});
    }
    const std::string Fault = Got < 0 ? Reason(Standard ? "standard input" : AInput) : "";
    if (!Standard) ::close(Handle);
    if (!Rest.empty()) LogLine(Rest);
    if (!Fault.empty()) throw std::runtime_error(Fault);
  }

  [[nodiscard]] std::size_t Read() const { return FRead; }

 private:
  static std::string Reason(const std::string& AName) { return AName + ": " + std::strerror(errno); }

  void Split(std::string& ARest, std::string_view ABlock) {
    for (std::size_t End = 0; (End = ABlock.find('\n')) != std::string_view::npos; ABlock.remove_prefix(End + 1)) {
      if (ARest.empty()) LogLine(ABlock.substr(0, End));
      else LogLine(ARest.append(ABlock.substr(0, End)));
      ARest.clear();
    }
    ARest += ABlock;
  }

  void LogLine(std::string_view ALine) {
    ++FRead;
    if (FOptions.Tee) Show(ALine);
    const auto Level = FOptions.DetectLevel ? DetectLevel(ALine) : std::nullopt;
    FOutput.Log(Level.value_or(FOptions.Level), TextOf(ALine));
  }

  // What standard output doesn't take is no line of the log that is lost.
  static void Show(std::string_view ALine) {
    std::fwrite(ALine.data(), 1, ALine.size(), stdout);
    std::fputc('\n', stdout);
    std::fflush(stdout);
  }

  const TOptions& FOptions;
  TOutput& FOutput;
  std::size_t FRead = 0;
};

std::unique_ptr<TOutput> MakeOutput(const TOptions& AOptions, TComplaints& AComplaints) {
  if (AOptions.Config.empty()) return std::make_unique<TFilesOutput>(AOptions, AComplaints);
  return std::make_unique<TSettingsOutput>(AOptions.Config, AOptions.Logger, AComplaints);
}

int Pipe(const TOptions& AOptions) {
  const auto Begin = std::chrono::steady_clock::now();
  TComplaints Complaints;
  HearSignals();
  const auto Output = MakeOutput(AOptions, Complaints);
  TPipe Pipe(AOptions, *Output);
  for (const std::string& Input : AOptions.Inputs.empty() ? std::vector<std::string>{"-"} : AOptions.Inputs) try {
      if (StopSignal != 0) break;
      Pipe.Run(Input);
    } catch (const std::runtime_error& e) {
      Complaints.Add(e.what());
    }
  Output->Finish();
  const TCounts& Counts = Output->Counts();
  if (Counts.Failed != 0)
    Complaints.Add(std::to_string(Counts.Failed) + " lines were not written: " + Counts.Failure.ToUTF8());
  const std::chrono::duration<double> Seconds = std::chrono::steady_clock::now() - Begin;
  if (!AOptions.Quiet)
    std::fprintf(
        stderr, "zqlogpipe: %zu lines read, %s, %.3f s\n", Pipe.Read(), Output->Summary().c_str(), Seconds.count());
  return StopSignal != 0 ? 128 + StopSignal : Complaints.Status();
}

}  // namespace

int main(int ACount, char** AWords) {
  try {
    const TOptions Options = ParseOptions({AWords + 1, AWords + ACount});
    if (Options.Help || Options.Version) std::fputs(Options.Help ? cHelp : "zqlogpipe " ZQ_VERSION "\n", stdout);
    return Options.Help || Options.Version ? 0 : Pipe(Options);
  } catch (const TUsageError& e) {
    std::fprintf(stderr, "zqlogpipe: %s\nTry zqlogpipe --help.\n", e.what());
    return 2;
  } catch (const TSettingsFault& e) {
    for (const std::string& Fault : e.Faults) TComplaints::Tell(Fault);
    return 2;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "zqlogpipe: %s\n", e.what());
    return 1;
  }
}
