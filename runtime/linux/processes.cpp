#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/ioctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <charconv>
#include <chrono>
#include <climits>
#include <csignal>
#include <filesystem>
#include <sstream>
#include <system_error>
#include <thread>
#include <utility>
#include <vector>

#include "runtime/core/exceptions.h"
#include "runtime/core/utf8.h"
#include "runtime/io/paths.h"
#include "runtime/linux/system_files.h"
#include "runtime/platform/process_service.h"
#include "runtime/sync/critical_section.h"
#include "runtime/sync/event.h"
#include "runtime/sync/message_window.h"

namespace zq {

namespace {

namespace fs = std::filesystem;

using TWords = std::vector<std::string>;

// ----------------------------------------------------------------------------------------------- Reasons of refusals

constexpr Cardinal cInvalidParameter = 87, cNoSuchDirectory = 267, cElevationRequired = 740, cNoAssociation = 1155;

std::nullptr_t Refuse(Cardinal AReason) noexcept {
  SetLastError(AReason);
  return nullptr;
}

// ------------------------------------------------------------------------------------------------------ Command lines

std::u16string_view CString(const UnicodeString& AText) noexcept { return AText.c_str(); }

bool IsBlank(Char AChar) noexcept { return AChar == u' ' || AChar == u'\t' || AChar == u'\n'; }

// Names of files may come with a backslash that travels by another code.
std::string ArgumentBytes(std::u16string AText) {
  std::ranges::replace(AText, static_cast<Char>(u'\xDC00' + u'\\'), u'\\');
  return utf8::Encode(AText, utf8::TMalformed::Escape);
}

// Adds the words of AText; False where a quote isn't closed.
bool SplitWords(std::u16string_view AText, TWords& AWords) {
  constexpr std::u16string_view EscapedInQuotes = u"\\\"$`\n";
  std::u16string Word;
  bool InWord = false;
  Char Quote = 0;
  for (std::size_t i = 0; i < AText.size(); ++i) {
    const Char Each = AText[i];
    if (Quote != 0 ? Each == Quote : Each == u'"' || Each == u'\'') {
      Quote = Quote == 0 ? Each : u'\0';
      InWord = true;
    } else if (Quote == 0 && IsBlank(Each)) {
      if (std::exchange(InWord, false)) AWords.push_back(ArgumentBytes(std::exchange(Word, {})));
    } else {
      const bool Escapes = Each == u'\\' && Quote != u'\'' && i + 1 < AText.size() &&
                           (Quote == 0 || EscapedInQuotes.find(AText[i + 1]) != EscapedInQuotes.npos);
      if (Escapes && AText[++i] == u'\n') continue;
      Word += AText[i];
      InWord = true;
    }
  }
  if (InWord) AWords.push_back(ArgumentBytes(std::move(Word)));
  return Quote == 0;
}

// Takes AWord, in any case, off the front of AText, where it is one.
bool TakeWord(std::u16string_view& AText, std::u16string_view AWord) {
  while (!AText.empty() && IsBlank(AText.front())) AText.remove_prefix(1);
  if (!SameText(AText.substr(0, AWord.size()), AWord)) return false;
  if (AText.size() > AWord.size() && !IsBlank(AText[AWord.size()])) return false;
  AText.remove_prefix(AWord.size());
  return true;
}

constexpr std::u16string_view cInterpreter = u"cmd.exe";

bool InterpreterWords(std::u16string_view AParameters, TWords& AWords) {
  AWords.emplace_back("/bin/sh");
  if (!TakeWord(AParameters, u"/C")) return SplitWords(AParameters, AWords);
  AWords.insert(AWords.end(), {"-c", "--", ArgumentBytes(std::u16string(AParameters))});
  return true;
}

bool CommandWords(std::u16string_view ACommand, TWords& AWords) {
  return TakeWord(ACommand, cInterpreter) ? InterpreterWords(ACommand, AWords) : SplitWords(ACommand, AWords);
}

// ----------------------------------------------------------------------------------------------------------- Children

class TDescriptor {
 public:
  explicit TDescriptor(int AHandle) noexcept : FHandle(AHandle) {}
  TDescriptor(TDescriptor&& AOther) noexcept : FHandle(std::exchange(AOther.FHandle, -1)) {}
  TDescriptor& operator=(TDescriptor&&) = delete;
  ~TDescriptor() {
    if (FHandle >= 0) ::close(FHandle);
  }
  [[nodiscard]] int Get() const noexcept { return FHandle; }

 private:
  int FHandle;  // -1: none
};

// What a child gets of this process: standard input, the outputs, the environment.
class TSpawnPlan {
 public:
  TSpawnPlan() noexcept {
    sigset_t Signals;
    ::sigemptyset(&Signals);
    FFailed |= ::posix_spawn_file_actions_init(&FActions) | ::posix_spawnattr_init(&FAttributes) |
               ::posix_spawnattr_setsigmask(&FAttributes, &Signals);
    ::sigaddset(&Signals, SIGPIPE);
    FFailed |= ::posix_spawnattr_setsigdefault(&FAttributes, &Signals) |
               ::posix_spawnattr_setflags(&FAttributes, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF);
  }
  TSpawnPlan(const TSpawnPlan&) = delete;
  TSpawnPlan& operator=(const TSpawnPlan&) = delete;
  ~TSpawnPlan() {
    ::posix_spawn_file_actions_destroy(&FActions);
    ::posix_spawnattr_destroy(&FAttributes);
  }

  void SetOutputs(int AHandle) noexcept {
    for (const int Each : {STDOUT_FILENO, STDERR_FILENO})
      FFailed |= ::posix_spawn_file_actions_adddup2(&FActions, AHandle, Each);
  }
  void SetFolder(const std::string& AFolder) noexcept {
    if (!AFolder.empty()) FFailed |= ::posix_spawn_file_actions_addchdir_np(&FActions, AFolder.c_str());
  }

  // 0 or an errno.
  int Run(const TWords& AWords, pid_t& APid) {
    // Not all that a host has open was opened to be closed here.
    FFailed |= ::posix_spawn_file_actions_addclosefrom_np(&FActions, STDERR_FILENO + 1);
    if (FFailed != 0) return ENOMEM;
    std::vector<char*> Arguments;
    for (const std::string& Each : AWords) Arguments.push_back(const_cast<char*>(Each.c_str()));
    Arguments.push_back(nullptr);
    return ::posix_spawnp(&APid, Arguments[0], &FActions, &FAttributes, Arguments.data(), ::environ);
  }

 private:
  posix_spawn_file_actions_t FActions{};
  posix_spawnattr_t FAttributes{};
  int FFailed = 0;
};

// The system library's own declarations of these two fit only C. -1 with errno where the kernel has none.
int OpenProcess(pid_t APid) noexcept { return static_cast<int>(::syscall(SYS_pidfd_open, APid, 0)); }
int SendSignal(int AProcess, int ASignal) noexcept {
  return static_cast<int>(::syscall(SYS_pidfd_send_signal, AProcess, ASignal, nullptr, 0));
}

// Whoever leaves a child to itself must still take note of its end, or it stays as a zombie.
void ReapLater(pid_t APid) noexcept {
  try {
    std::thread([APid] {
      while (::waitpid(APid, nullptr, 0) < 0 && errno == EINTR) {
      }
    }).detach();
  } catch (const std::system_error&) {  // no further thread: it stays one until this process ends
  }
}

class TLinuxChild final : public TChildProcess {
 public:
  TLinuxChild(pid_t APid, TDescriptor AOutput) noexcept
      : FPid(APid), FOutput(std::move(AOutput)), FEnd(OpenProcess(APid)) {}
  TLinuxChild(const TLinuxChild&) = delete;
  TLinuxChild& operator=(const TLinuxChild&) = delete;
  ~TLinuxChild() override {
    if (!HasEnded()) ReapLater(FPid);
  }

  Integer ReadFile(char* ABuffer, Integer ACount) override {
    while (FLeft < 0) {
      pollfd Both[] = {{FOutput.Get(), POLLIN, 0}, {FEnd.Get(), POLLIN, 0}};
      ::poll(Both, std::size(Both), Slice(-1));
      const bool MayHaveEnded = Both[1].revents != 0 || FEnd.Get() < 0;
      if (MayHaveEnded && HasEnded()) CountWhatIsLeft();
      else if (Both[0].revents != 0) return ReadSome(ABuffer, ACount);
    }
    const Integer Got = ReadSome(ABuffer, std::min(ACount, FLeft));
    FLeft -= Got;
    return Got;
  }

  Cardinal GetProcessId() const noexcept override { return static_cast<Cardinal>(FPid); }

  bool WaitForSingleObject(Cardinal AMilliseconds) override {
    using TClock = std::chrono::steady_clock;
    const auto Until = TClock::now() + std::chrono::milliseconds(AMilliseconds);
    while (!HasEnded()) {
      const auto Left = std::chrono::ceil<std::chrono::milliseconds>(Until - TClock::now()).count();
      if (AMilliseconds != INFINITE && Left <= 0) return false;
      pollfd End{FEnd.Get(), POLLIN, 0};
      ::poll(&End, 1, Slice(AMilliseconds == INFINITE ? -1 : static_cast<int>(std::min<Int64>(Left, INT_MAX))));
    }
    return true;
  }

  Integer GetExitCodeProcess() override { return HasEnded() ? FExitCode : STILL_ACTIVE; }

 private:
  static constexpr int cPollSlice = 10;  // milliseconds
  static constexpr int cKilled = 128;    // and the signal's number: as the shell tells it

  // A wait of poll: on a system whose kernel has no descriptors of processes, the end has to be looked for.
  [[nodiscard]] int Slice(int AMilliseconds) const noexcept {
    if (FEnd.Get() >= 0) return AMilliseconds;
    return AMilliseconds < 0 ? cPollSlice : std::min(AMilliseconds, cPollSlice);
  }

  bool HasEnded() noexcept {
    if (FEnded) return true;
    int Status = 0;
    const pid_t Found = ::waitpid(FPid, &Status, WNOHANG);
    FEnded = Found == FPid || (Found < 0 && errno == ECHILD);
    if (Found == FPid) FExitCode = WIFSIGNALED(Status) ? cKilled + WTERMSIG(Status) : WEXITSTATUS(Status);
    return FEnded;
  }

  void CountWhatIsLeft() noexcept {
    if (::ioctl(FOutput.Get(), FIONREAD, &FLeft) != 0) FLeft = 0;
  }

  [[nodiscard]] Integer ReadSome(char* ABuffer, Integer ACount) const noexcept {
    ssize_t Got = 0;
    do {
      Got = ::read(FOutput.Get(), ABuffer, static_cast<std::size_t>(ACount));
    } while (Got < 0 && errno == EINTR);
    return static_cast<Integer>(std::max<ssize_t>(Got, 0));
  }

  const pid_t FPid;
  const TDescriptor FOutput;
  const TDescriptor FEnd;  // readable when the process has ended
  int FLeft = -1;          // bytes of output to take after the end; -1: it hasn't come yet
  bool FEnded = false;
  Integer FExitCode = 0;
};

std::unique_ptr<TChildProcess> Spawn(TSpawnPlan& APlan, const TWords& AWords, TDescriptor AOutput) {
  pid_t Pid = 0;
  const int Failure = APlan.Run(AWords, Pid);
  if (Failure != 0) return Refuse(ReasonOf(Failure));
  return std::make_unique<TLinuxChild>(Pid, std::move(AOutput));
}

// -------------------------------------------------------------------------------------------------------------- Shell

bool IsProgram(const std::string& APath) {
  std::error_code Ignored;
  return fs::is_regular_file(APath, Ignored) && ::access(APath.c_str(), X_OK) == 0;
}

// As the system finds it: by its path, or in the folders of PATH. Empty if there is none.
std::string FindProgram(const std::string& AName) {
  if (AName.empty()) return {};
  if (AName.find('/') != AName.npos) return IsProgram(AName) ? AName : "";
  const std::string Folders = EnvironmentText("PATH");
  for (std::size_t Start = 0; Start <= Folders.size();) {
    const std::size_t End = std::min(Folders.find(':', Start), Folders.size());
    std::string Path = End == Start ? "." : Folders.substr(Start, End - Start);
    Path.append("/").append(AName);
    if (IsProgram(Path)) return Path;
    Start = End + 1;
  }
  return {};
}

// A scheme and a colon; one letter and a colon are no scheme.
bool IsAddress(std::string_view AText) {
  const std::size_t Colon = AText.find(':');
  if (Colon == AText.npos || Colon < 2 || std::isalpha(static_cast<unsigned char>(AText[0])) == 0) return false;
  return std::ranges::all_of(AText.substr(0, Colon), [](unsigned char AChar) {
    return std::isalnum(AChar) != 0 || std::string_view("+-.").find(static_cast<char>(AChar)) != std::string_view::npos;
  });
}

// For a document or an address. Returns 0 or the reason against it, as the two below.
Cardinal DocumentWords(const UnicodeString& AFile, TWords& AWords) {
  const std::string Path = ToSystemPath(AFile);
  const std::string Address = ArgumentBytes(std::u16string(CString(AFile)));
  std::error_code Ignored;
  const bool IsFile = fs::exists(Path, Ignored);
  if (!IsFile && !IsAddress(Address)) return ReasonOf(ENOENT);
  const std::string Opener = FindProgram("xdg-open");
  if (Opener.empty()) return cNoAssociation;
  AWords.push_back(Opener);
  AWords.push_back(!IsFile ? Address : Path.starts_with('-') ? "./" + Path : Path);
  return 0;
}

Cardinal ProgramWords(const TShellExecuteInfo& AInfo, TWords& AWords) {
  const std::u16string_view Parameters = CString(AInfo.Parameters);
  if (SameText(CString(AInfo.File), cInterpreter)) return InterpreterWords(Parameters, AWords) ? 0 : cInvalidParameter;
  const std::string Program = FindProgram(ToSystemPath(AInfo.File));
  if (Program.empty()) return ReasonOf(ENOENT);
  AWords.push_back(Program);
  return SplitWords(Parameters, AWords) ? 0 : cInvalidParameter;
}

Cardinal ShellWords(const TShellExecuteInfo& AInfo, TWords& AWords) {
  const bool Elevates = SameText(CString(AInfo.Verb), u"runas");
  if (!Elevates && AInfo.Verb.c_str()[0] != 0 && !SameText(CString(AInfo.Verb), u"open")) return cNoAssociation;
  const Cardinal Refusal = ProgramWords(AInfo, AWords);
  if (!Elevates) return Refusal == ReasonOf(ENOENT) ? DocumentWords(AInfo.File, AWords) : Refusal;
  if (Refusal != 0) return Refusal;
  const std::string Elevator = FindProgram("pkexec");
  if (Elevator.empty()) return cElevationRequired;
  AWords[0] = fs::absolute(AWords[0]).string();
  AWords.insert(AWords.begin(), Elevator);
  return 0;
}

// -------------------------------------------------------------------------------------------------- List of processes

struct TStat {
  std::string Name;  // at most 15 bytes of it
  char State = 0;
  UInt64 StartTime = 0;  // ticks since the system's start
};

std::optional<TStat> ReadStat(const std::string& AProcess) {
  constexpr int Between = 18;  // fields between the state and the start
  const std::string Text = ReadSystemFile("/proc/" + AProcess + "/stat");
  const std::size_t Open = Text.find('('), Close = Text.rfind(')');  // the name may hold any of these, and line breaks
  if (Open == Text.npos || Close == Text.npos) return std::nullopt;
  TStat Result{Text.substr(Open + 1, Close - Open - 1)};
  std::istringstream Fields(Text.substr(Close + 1));
  Fields >> Result.State;
  std::string Skipped;
  for (int i = 0; i < Between; ++i) Fields >> Skipped;
  Fields >> Result.StartTime;
  return Result;
}

// The path of the program. It is no secret in processes of other users alone: of those the name is known, the rest of a
// long one from the command line.
std::string ProgramOf(const std::string& AProcess, const std::string& AShortName) {
  constexpr std::size_t CutAt = 15;
  constexpr std::string_view Gone = " (deleted)";
  std::error_code Failure;
  std::string Path = fs::read_symlink("/proc/" + AProcess + "/exe", Failure).string();
  if (!Failure)
    return Path.ends_with(Gone) && !fs::exists(Path, Failure) ? Path.substr(0, Path.size() - Gone.size()) : Path;
  if (AShortName.size() < CutAt) return AShortName;
  const std::string CommandLine = ReadSystemFile("/proc/" + AProcess + "/cmdline");
  const std::string Program = CommandLine.substr(0, CommandLine.find('\0'));
  return Program.substr(Program.rfind('/') + 1).starts_with(AShortName) ? Program : AShortName;
}

bool HasEnded(const TStat& AStat) noexcept { return AStat.State == 'Z' || AStat.State == 'X'; }

bool Signal(const tagPROCESSENTRY32W& AEntry, int ASignal) {
  // 0 and numbers below it mean whole groups of processes.
  if (AEntry.th32ProcessID == 0 || AEntry.th32ProcessID > INT_MAX) return false;
  const auto Id = static_cast<pid_t>(AEntry.th32ProcessID);
  const TDescriptor Process(OpenProcess(Id));  // held before the look at its start: no other can take its place
  const auto Stat = ReadStat(std::to_string(Id));
  if (!Stat || HasEnded(*Stat) || (AEntry.StartTime != 0 && Stat->StartTime != AEntry.StartTime)) return false;
  return (Process.Get() < 0 ? ::kill(Id, ASignal) : SendSignal(Process.Get(), ASignal)) == 0;
}

// ------------------------------------------------------------------------------------------------------------ Service

class TLinuxProcesses final : public TProcessService {
 public:
  std::unique_ptr<TChildProcess> CreateProcess(
      const UnicodeString& ACommand, const UnicodeString& ADirectory) override {
    TWords Words;
    if (!CommandWords(CString(ACommand), Words) || Words.empty()) return Refuse(cInvalidParameter);
    int Ends[2];
    if (::pipe2(Ends, O_CLOEXEC) != 0) return Refuse(ReasonOf(errno));
    TDescriptor Read(Ends[0]);
    const TDescriptor Write(Ends[1]);
    const std::string Folder = ToSystemPath(ADirectory);
    TSpawnPlan Plan;
    Plan.SetOutputs(Write.Get());
    Plan.SetFolder(Folder);
    auto Result = Spawn(Plan, Words, std::move(Read));
    std::error_code Ignored;
    if (Result == nullptr && !Folder.empty() && !fs::is_directory(Folder, Ignored)) SetLastError(cNoSuchDirectory);
    return Result;
  }

  std::unique_ptr<TChildProcess> CreateFreeProcess(const UnicodeString& ACommand) override {
    TWords Words;
    TSpawnPlan Plan;
    if (!CommandWords(CString(ACommand), Words) || Words.empty()) return Refuse(cInvalidParameter);
    return Spawn(Plan, Words, TDescriptor(-1));
  }

  bool ShellExecuteEx(const TShellExecuteInfo& AInfo, std::unique_ptr<TChildProcess>& AProcess) override {
    TWords Words;
    const Cardinal Refusal = ShellWords(AInfo, Words);
    TSpawnPlan Plan;
    auto Process = Refusal == 0 ? Spawn(Plan, Words, TDescriptor(-1)) : Refuse(Refusal);
    const bool Started = Process != nullptr;
    if ((AInfo.fMask & SEE_MASK_NOCLOSEPROCESS) != 0) AProcess = std::move(Process);
    return Started;
  }

  Integer ShellExecute(const UnicodeString& AVerb, const UnicodeString& AFile, const UnicodeString& AParameters,
      Integer AShowCmd) override {
    constexpr Integer Success = 42, Failure = 0;
    std::unique_ptr<TChildProcess> Unused;
    return ShellExecuteEx({0, AVerb, AFile, AParameters, AShowCmd}, Unused) ? Success : Failure;
  }

  std::optional<Cardinal> GetTokenInformation(Integer AClass) override {
    constexpr Cardinal TypeDefault = 1;
    if (AClass == TokenElevationType) return TypeDefault;
    if (AClass == TokenElevation) return ::geteuid() == 0 ? 1 : 0;
    return std::nullopt;
  }

  TArray<tagPROCESSENTRY32W> ProcessSnapshot() override {
    constexpr Cardinal EntrySize = 556;
    TArray<tagPROCESSENTRY32W> Result;
    std::error_code Failure;
    for (fs::directory_iterator Each("/proc", Failure), End; !Failure && Each != End; Each.increment(Failure)) {
      const std::string Name = Each->path().filename().string();
      Cardinal Id = 0;
      if (std::from_chars(Name.data(), Name.data() + Name.size(), Id).ptr != Name.data() + Name.size()) continue;
      const auto Stat = ReadStat(Name);
      if (!Stat || HasEnded(*Stat)) continue;
      Result.push_back({EntrySize, Id, FromSystemPath(ProgramOf(Name, Stat->Name)), Stat->StartTime});
    }
    return Result;
  }

  bool TerminateProcess(const tagPROCESSENTRY32W& AEntry) override { return Signal(AEntry, SIGKILL); }
  bool RequestEnd(const tagPROCESSENTRY32W& AEntry) override { return Signal(AEntry, SIGTERM); }

  TArray<HWND> EnumWindows() override { return AllWindows(); }
  Cardinal GetWindowThreadProcessId(HWND AWindow) override { return zq::IsWindow(AWindow) ? GetCurrentProcessId() : 0; }
  NativeInt SendMessage(HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam) override try {
    return zq::SendMessage(AWindow, AMessage, AWParam, ALParam);
  } catch (const ECallRefused&) {
    return 0;
  }
  bool SendMessageTimeout(HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam, Cardinal,
      Cardinal AMilliseconds) override try {
    return zq::SendMessageTimeout(AWindow, AMessage, AWParam, ALParam, AMilliseconds).has_value();
  } catch (const ECallRefused&) {
    return false;
  }
  bool IsWindow(HWND AWindow) override { return zq::IsWindow(AWindow); }
  bool SetWindowPos(HWND, HWND, Integer, Integer, Integer, Integer, Cardinal) override { return false; }
};

constinit TLinuxProcesses LinuxProcesses;

}  // namespace

constinit TServiceSlot<TProcessService> TProcessService::Slot(LinuxProcesses);

}  // namespace zq
