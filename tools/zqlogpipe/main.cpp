// zqlogpipe: logs each line of its input through rZqCommon into files that roll by size, and into the system's log.

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <charconv>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <iterator>
#include <limits>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "common/uZqLogAppenders.h"
#include "common/uZqLogLayouts.h"
#include "common/uZqLogger.h"
#include "common/uZqLogger/failures.h"
#include "runtime/core/utf8.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"

namespace {

using namespace zq;

constexpr char cHelp[] =
    "usage: zqlogpipe --file FILE|--syslog [option...] [INPUT...]\n"
    "\n"
    "Logs each line of the INPUT files, or of standard input. INPUT may be - for standard input.\n"
    "\n"
    "  --file FILE       log file, .log is added to a name without extension; missing folders are made. May be given\n"
    "                    again for a further log file\n"
    "  --syslog[=NAME]   the system's log, too, or alone without --file: the journal, or syslog where there is none,\n"
    "                    from the source NAME (zqlogpipe); an entry is the text of a line, an empty line is none\n"
    "  --max-size BYTES  a file that has reached this size is rolled, 0 for never (10M); K, M and G behind the number\n"
    "                    stand for its powers of 1024\n"
    "  --backups COUNT   files of the series, FILE among them, 1 to 65535 (5)\n"
    "  --daily           roll at midnight too, and name the old file by the day on which it was begun; the size is "
    "unlimited\n"
    "                    then unless --max-size is given\n"
    "  --pattern TEXT    the same for the period that this pattern of a date tells (yyyy-mm-dd)\n"
    "  --no-append       begin a new FILE; one that exists becomes a backup\n"
    "  --logger NAME     dotted path of the logger below the root (zqlogpipe)\n"
    "  --level LEVEL     level of the lines: trace, debug, info, warn or warning, error, fatal (info)\n"
    "  --detect-level    the first such word in a line decides its level, whatever its case; --level where there is "
    "none\n"
    "  --no-time         lines without the time\n"
    "  --layout LAYOUT   simple, a line of text for each line, or xml, an element; FILE gets .log.xml where it has no\n"
    "                    extension then, a stylesheet that shows it as a table is written beside it, and a FILE that\n"
    "                    exists becomes a backup, as with --no-append (simple)\n"
    "  --tee             lines go to standard output too, as they come\n"
    "  --retry SECONDS   a line that can't be written waits so long and is tried again, until it is written; without "
    "it\n"
    "                    the line is lost and counted\n"
    "  --quiet           no last line on standard error\n"
    "  --version         the version\n"
    "  -h, --help        this text\n"
    "\n"
    "An option's value may also stand behind '=', as in --file=app.log. At TERM and INT what was read is written, and "
    "the\n"
    "files are ended; the exit status is 128 and the signal's number then. At HUP the files are ended and begun again "
    "with\n"
    "the next line, for who has moved them away.\n"
    "\n"
    "A line ends at LF, or at the end of its input; it may have any length, and all other bytes are its text. The log "
    "is\n"
    "UTF-8: a byte that is no part of valid UTF-8 is taken as the character of that code (U+0080 to U+00FF), as in\n"
    "ISO 8859-1. The last line on standard error tells what was done. Exit status: 0, 1 for a failure, 2 for a wrong "
    "use.\n";

class TUsageError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

struct TOptions {
  std::vector<std::string> Files;
  std::optional<std::string> Source;  // in the system's log
  std::vector<std::string> Inputs;
  std::optional<Cardinal> MaxSize;  // the appender's own
  std::string Pattern;              // of the date that names old files; empty where the size alone rolls
  Word Backups = 5;
  bool Append = true;
  std::string Logger = "zqlogpipe";
  TZqLogLevel Level = llInfo;
  bool DetectLevel = false;
  bool Time = true;
  bool Xml = false;
  bool Tee = false;
  bool Quiet = false;
  Cardinal Retry = 0;  // seconds; 0: a line that can't be written is lost
  bool Help = false;
  bool Version = false;
};

struct TLevelWord {
  std::string_view Word;
  TZqLogLevel Level;
};
constexpr TLevelWord cLevels[] = {{"trace", llTrace}, {"debug", llDebug}, {"info", llInfo}, {"warn", llWarn},
    {"warning", llWarn}, {"error", llError}, {"fatal", llFatal}};

bool SameWord(std::string_view A, std::string_view B) {
  return std::equal(
      A.begin(), A.end(), B.begin(), B.end(), [](unsigned char a, unsigned char b) { return std::tolower(a) == b; });
}

std::optional<TZqLogLevel> LevelOf(std::string_view AWord) {
  for (const TLevelWord& Row : cLevels)
    if (SameWord(AWord, Row.Word)) return Row.Level;
  return std::nullopt;
}

std::optional<TZqLogLevel> DetectLevel(std::string_view ALine) {
  const auto IsLetter = [](unsigned char c) { return std::isalpha(c) != 0 || c >= 0x80; };
  for (auto From = ALine.begin(); From != ALine.end();) {
    From = std::find_if(From, ALine.end(), IsLetter);
    const auto To = std::find_if_not(From, ALine.end(), IsLetter);
    if (const auto Level = LevelOf({From, To})) return Level;
    From = To;
  }
  return std::nullopt;
}

template <class T>
T Number(std::string_view AOption, std::string_view AText, T ALeast) {
  T Result = 0;
  const auto [End, Error] = std::from_chars(AText.data(), AText.data() + AText.size(), Result);
  if (Error != std::errc() || End != AText.data() + AText.size() || Result < ALeast)
    throw TUsageError(std::string(AOption) + " takes a whole number from " + std::to_string(ALeast) + " to " +
                      std::to_string(std::numeric_limits<T>::max()) + ", not '" + std::string(AText) + "'");
  return Result;
}

// A number of bytes, of their powers of 1024 with K, M or G behind it.
Cardinal Bytes(std::string_view AOption, std::string_view AText) {
  constexpr std::string_view Units = "KMG";
  const std::size_t Unit = AText.empty() ? Units.npos : Units.find(static_cast<char>(std::toupper(AText.back())));
  if (Unit == Units.npos) return Number<Cardinal>(AOption, AText, 0);
  const UInt64 Result = UInt64{Number<Cardinal>(AOption, AText.substr(0, AText.size() - 1), 0)} << (10 * (Unit + 1));
  if (Result <= std::numeric_limits<Cardinal>::max()) return static_cast<Cardinal>(Result);
  throw TUsageError(std::string(AOption) + " takes less than 4G, not '" + std::string(AText) + "'");
}

bool IsXml(const std::string& ALayout) {
  if (ALayout == "simple" || ALayout == "xml") return ALayout == "xml";
  throw TUsageError("--layout takes simple or xml, not '" + ALayout + "'");
}

TOptions ParseOptions(const std::vector<std::string_view>& AWords) {
  TOptions Result;
  for (std::size_t i = 0; i < AWords.size(); ++i) {
    const std::size_t Equals = AWords[i].starts_with("--") ? AWords[i].find('=') : std::string_view::npos;
    const std::string_view Whole = AWords[i], Word = Whole.substr(0, Equals);
    bool Taken = Equals == std::string_view::npos;
    const auto Value = [&] {
      if (!std::exchange(Taken, true)) return std::string(Whole.substr(Equals + 1));
      if (++i == AWords.size()) throw TUsageError(std::string(Word) + " needs a value");
      return std::string(AWords[i]);
    };
    if (Word == "--file") Result.Files.push_back(Value());
    else if (Word == "--syslog") Result.Source = Taken ? "zqlogpipe" : Value();
    else if (Word == "--max-size") Result.MaxSize = Bytes(Word, Value());
    else if (Word == "--backups") Result.Backups = Number<zq::Word>(Word, Value(), 1);
    else if (Word == "--daily") Result.Pattern = "yyyy-mm-dd";
    else if (Word == "--pattern") Result.Pattern = Value();
    else if (Word == "--no-append") Result.Append = false;
    else if (Word == "--logger") Result.Logger = Value();
    else if (Word == "--detect-level") Result.DetectLevel = true;
    else if (Word == "--no-time") Result.Time = false;
    else if (Word == "--tee") Result.Tee = true;
    else if (Word == "--quiet") Result.Quiet = true;
    else if (Word == "--retry") Result.Retry = Number<Cardinal>(Word, Value(), 1);
    else if (Word == "--version") Result.Version = true;
    else if (Word == "--help" || Word == "-h") Result.Help = true;
    else if (Word == "--layout") Result.Xml = IsXml(Value());
    else if (Word == "--level") {
      const std::string Text = Value();
      const auto Level = LevelOf(Text);
      if (!Level) throw TUsageError("--level takes trace, debug, info, warn, error or fatal, not '" + Text + "'");
      Result.Level = *Level;
    } else if (Word == "--")
      Result.Inputs.insert(Result.Inputs.end(), AWords.begin() + static_cast<std::ptrdiff_t>(i) + 1, AWords.end()),
          i = AWords.size();
    else if (Word.size() > 1 && Word.front() == '-') throw TUsageError("unknown option '" + std::string(Word) + "'");
    else Result.Inputs.emplace_back(Word);
    if (!Taken) throw TUsageError(std::string(Word) + " takes no value");
  }
  const auto IsBlank = [](const std::string& AName) { return Trim(FromUTF8(AName)).IsEmpty(); };
  if (std::any_of(Result.Files.begin(), Result.Files.end(), IsBlank)) throw TUsageError("--file needs a name");
  if (Result.Xml && !Result.Time) throw TUsageError("--no-time goes with --layout simple only");
  if (Result.Xml) Result.Append = false;  // two logs in one file are no XML
  if (Result.Source && IsBlank(*Result.Source)) throw TUsageError("--syslog= needs a name");
  if (Result.Files.empty() && !Result.Source && !Result.Help && !Result.Version)
    throw TUsageError("--file or --syslog is needed");
  return Result;
}

// ---- Signals

volatile std::sig_atomic_t StopSignal = 0;
volatile std::sig_atomic_t ReopenSignal = 0;
int WakeUp[2] = {-1, -1};  // a byte for each signal, so that none is missed just before a wait

void OnSignal(int ANumber) {
  const int Saved = errno;
  (ANumber == SIGHUP ? ReopenSignal : StopSignal) = ANumber;
  static_cast<void>(!::write(WakeUp[1], "", 1));
  errno = Saved;
}

void HearSignals() {
  if (::pipe2(WakeUp, O_CLOEXEC | O_NONBLOCK) != 0) throw std::runtime_error(std::strerror(errno));
  for (const int Number : {SIGTERM, SIGINT, SIGHUP}) {
    struct sigaction Action {};
    Action.sa_handler = OnSignal;
    ::sigaction(Number, &Action, nullptr);
  }
  for (const int Number : {SIGXFSZ, SIGPIPE}) std::signal(Number, SIG_IGN);  // the write tells
}

// Until there is something to read from AHandle (-1: from nothing), a signal has come, or the time is over.
void Wait(int AHandle, int AMilliseconds) {
  pollfd Events[] = {{AHandle, POLLIN, 0}, {WakeUp[0], POLLIN, 0}};
  ::poll(Events, 2, AMilliseconds);
  for (char Byte = 0; ::read(WakeUp[0], &Byte, 1) > 0;) continue;
}

// ---- Appender and layout

/// The simple layout's line without the time.
class TNoTimeLayout : public Implements<TZqSimpleLayout, IZqLogByteLayout> {
 public:
  using Implements::Implements;
  void AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec, TZqLogIndent) override {
    ALine.Append(ZqLogLevels[ALogLevel]);
    ALine.AppendBytes(" ");
    ALine.Append(ALoggerName);
    ALine.AppendBytes(" - ");
    ALine.Append(ALogMessage);
  }

 protected:
  ~TNoTimeLayout() override = default;
};

/// The text of a line alone: the system's log has its own time, level and source.
class TTextLayout : public TZqSimpleLayout {
 public:
  using TZqSimpleLayout::TZqSimpleLayout;
  UnicodeString FormatLine(
      const UnicodeString&, TZqLogLevel, const UnicodeString& ALogMessage, PZqDataRec, TZqLogIndent) override {
    return ALogMessage;
  }

 protected:
  ~TTextLayout() override = default;
};

/// What became of an appender's lines.
struct TCounts {
  std::size_t Rolls = 0;
  std::size_t Written = 0;
  std::size_t Failed = 0;
  UnicodeString Failure;  // the first
};

/// Has a line that can't be written tried again, where that is wanted, until a signal ends the tool.
class TRetry {
 public:
  TRetry(TCounts& ACounts, Cardinal ASeconds) : FCounts(ACounts), FSeconds(std::min(ASeconds, cMostSeconds)) {}
  /// Waits and is true, or counts the line as lost.
  bool Again(const UnicodeString& AReason) {
    if (FSeconds == 0 || StopSignal != 0) {
      if (FCounts.Failed++ == 0) FCounts.Failure = AReason;
      return false;
    }
    if (!std::exchange(FWaiting, true)) std::fprintf(stderr, "zqlogpipe: waiting: %s\n", AReason.ToUTF8().c_str());
    Wait(-1, static_cast<int>(FSeconds * 1000));
    return true;
  }

 private:
  static constexpr Cardinal cMostSeconds = 86400;
  TCounts& FCounts;
  const Cardinal FSeconds;
  bool FWaiting = false;
};

/// Counts rolls, and keeps the failures that a logger never shows.
template <class TRolling>
class TPipeAppender : public TRolling {
 public:
  TPipeAppender(TCounts& ACounts, Cardinal ARetry)
      : TRolling(Logger(), u""), FCounts(ACounts), FRetry(ACounts, ARetry) {}
  void RollOver() override {
    const Cardinal Before = Size();
    TRolling::RollOver();
    if (!this->FFileStream || Size() < Before) ++FCounts.Rolls;  // not where the file goes on
  }
  void Write(const UnicodeString& ASender, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) override {
    for (;;) try {
        TRolling::Write(ASender, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
        if (!this->FFileStream) throw Exception(u"The file isn't open: " + this->GetFileName());  // since a roll
        ++FCounts.Written;
        return;
      } catch (const Exception& e) {
        if (!FRetry.Again(e.Message())) throw;
      }
  }

 protected:
  ~TPipeAppender() override = default;

 private:
  [[nodiscard]] Cardinal Size() const { return this->FFileStream ? this->FFileStream->Size() : 0; }
  TCounts& FCounts;
  TRetry FRetry;
};

/// Gives a log that is full a second to make room, once until it has taken a line again.
class TPipeEventLog : public TZqEventLogAppender {
 public:
  TPipeEventLog(TCounts& ACounts, Cardinal ARetry)
      : TZqEventLogAppender(zq::Logger(), u""), FCounts(ACounts), FRetry(ACounts, ARetry) {}

 protected:
  ~TPipeEventLog() override = default;
  bool Report(Word AType, Cardinal AEventId, const UnicodeString& AText) override {
    while (!TZqEventLogAppender::Report(AType, AEventId, AText)) {
      const Cardinal Error = GetLastError();
      if (Error == EAGAIN && FPatience > 0) Wait(-1, cStep), FPatience -= cStep;
      else if (!FRetry.Again(u"The system's log: " + SysErrorMessage(static_cast<Integer>(Error)))) return false;
    }
    FPatience = cPatience;
    ++FCounts.Written;
    return true;
  }

 private:
  static constexpr int cPatience = 1000, cStep = 1;  // milliseconds
  TCounts& FCounts;
  TRetry FRetry;
  int FPatience = cPatience;
};

/// The text of a line: UTF-8, with each byte that is none taken as the character of its code.
UnicodeString TextOf(std::string_view ALine) {
  std::u16string Result = utf8::Decode(ALine, utf8::TMalformed::Escape);
  for (std::size_t i = 0; i < Result.size(); ++i) {
    const bool OfAPair = i != 0 && Result[i - 1] >= 0xD800 && Result[i - 1] < 0xDC00;
    if (!OfAPair && Result[i] >= 0xDC80 && Result[i] <= 0xDCFF) Result[i] &= 0xFF;
  }
  return Result;
}

class TPipe {
 public:
  explicit TPipe(const TOptions& AOptions)
      : FOptions(AOptions), FLogger(Logger()->GetLogger(FromUTF8(AOptions.Logger))) {
    FLogger->SetLevel(llAll);
    FLogger->SetAdditive(false);
    for (const std::string& File : AOptions.Files) AddAppender(File);
    if (AOptions.Source) AddSource(*AOptions.Source);
  }

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
      if (std::exchange(ReopenSignal, 0) != 0) Finish();  // the next line opens the files again
      Got = ::read(Handle, Block.data(), Block.size());
      if (Got == 0 || (Got < 0 && errno != EINTR && errno != EAGAIN)) break;
      if (Got > 0) Split(Rest, {Block.data(), static_cast<std::size_t>(Got)});
    }
    const std::string Fault = Got < 0 ? Reason(Standard ? "standard input" : AInput) : "";
    if (!Standard) ::close(Handle);
    if (!Rest.empty()) LogLine(Rest);
    if (!Fault.empty()) throw std::runtime_error(Fault);
  }

  /// Ends the files, so that what fails there is told too.
  void Finish() {
    for (const auto& Appender : FAppenders) Appender->Close();
  }

  [[nodiscard]] std::size_t Read() const { return FRead; }
  [[nodiscard]] const TCounts& Counts() const { return FCounts; }

 private:
  static std::string Reason(const std::string& AName) { return AName + ": " + std::strerror(errno); }

  void AddAppender(const std::string& AFile) {
    if (FOptions.Pattern.empty())
      return Add(AFile, New<TPipeAppender<TZqRollingFileAppender>>(FCounts, FOptions.Retry));
    auto* const Appender = New<TPipeAppender<TZqDailyRollingFileAppender>>(FCounts, FOptions.Retry);
    Appender->SetDatePattern(FOptions.Pattern);
    Add(AFile, Appender);
  }

  void Add(const std::string& AFile, TZqRollingFileAppender* AAppender) {
    FAppenders.emplace_back(AAppender);
    const TFileName Name = utf8::Decode(AFile, utf8::TMalformed::Escape);
    AAppender->SetFileName(Name);
    if (FOptions.MaxSize) AAppender->SetMaxFileSize(*FOptions.MaxSize);
    AAppender->SetMaxBackupCount(FOptions.Backups);
    AAppender->SetAppendExisting(FOptions.Append);
    AAppender->SetRetryInterval(1);  // after a roll that couldn't open its new file
    if (FOptions.Xml) SetXmlLayout(AAppender, Name);
    else
      AAppender->SetLayout(
          FOptions.Time ? TZqLogBaseClass::Of<TZqSimpleLayout>() : TZqLogBaseClass::Of<TNoTimeLayout>());
    AAppender->Initialize();  // a file that can't be opened shows here, before the first line
    FLogger->AddAppender(FAppenders.back());
  }

  // The layout writes its stylesheet at once, where the file is then, and gives the file its extension: where another
  // one was named, the file keeps that. The stylesheet of app, app.log, app.xml and app.log.xml is app.log.xsl.
  static void SetXmlLayout(TZqRollingFileAppender* AAppender, const TFileName& AName) {
    if (SameText(ExtractFileExt(AName), u".xml")) AAppender->SetFileName(ChangeFileExt(AName, u""));
    ForceDirectories(ExtractFileDir(AName));  // a folder that can't be made shows with the stylesheet
    AAppender->SetLayout(TZqLogBaseClass::Of<TZqXmlLayout>());
    AAppender->SetFileName(AName);
  }

  void AddSource(const std::string& AName) {
    auto* const Appender = New<TPipeEventLog>(FCounts, FOptions.Retry);
    FAppenders.emplace_back(Appender);
    Appender->RegisterLogger(TextOf(AName));
    Appender->SetLayout(TZqLogBaseClass::Of<TTextLayout>());
    FLogger->AddAppender(FAppenders.back());
  }

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
    FLogger->Log(Level.value_or(FOptions.Level), TextOf(ALine));
  }

  // What standard output doesn't take is no line of the log that is lost.
  static void Show(std::string_view ALine) {
    std::fwrite(ALine.data(), 1, ALine.size(), stdout);
    std::fputc('\n', stdout);
    std::fflush(stdout);
  }

  const TOptions& FOptions;
  TCounts FCounts;
  IntfRef<IZqLogger> FLogger;
  std::vector<IntfRef<IZqLogAppender>> FAppenders;
  std::size_t FRead = 0;
};

int Pipe(const TOptions& AOptions) {
  const auto Begin = std::chrono::steady_clock::now();
  int Status = 0;
  const auto Complain = [&](std::string_view AText) {
    std::fprintf(stderr, "zqlogpipe: %.*s\n", static_cast<int>(AText.size()), AText.data());
    Status = 1;
  };
  ZqShowLogFailures(false);  // told below
  HearSignals();
  TPipe Pipe(AOptions);
  for (const std::string& Input : AOptions.Inputs.empty() ? std::vector<std::string>{"-"} : AOptions.Inputs) try {
      if (StopSignal != 0) break;
      Pipe.Run(Input);
    } catch (const std::runtime_error& e) {
      Complain(e.what());
    }
  try {
    Pipe.Finish();
  } catch (const Exception& e) {
    Complain(e.what());
  }
  const TCounts& Counts = Pipe.Counts();
  if (Counts.Failed != 0)
    Complain(std::to_string(Counts.Failed) + " lines were not written: " + Counts.Failure.ToUTF8());
  const std::chrono::duration<double> Seconds = std::chrono::steady_clock::now() - Begin;
  if (!AOptions.Quiet)
    std::fprintf(stderr, "zqlogpipe: %zu lines read, %zu lines written, %zu files rolled, %.3f s\n", Pipe.Read(),
        Counts.Written, Counts.Rolls, Seconds.count());
  return StopSignal != 0 ? 128 + StopSignal : Status;
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
  } catch (const std::exception& e) {
    std::fprintf(stderr, "zqlogpipe: %s\n", e.what());
    return 1;
  }
}
