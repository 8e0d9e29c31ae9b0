#include "options.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <iterator>
#include <limits>
#include <utility>

#include "runtime/core/utf8.h"

using namespace zq;

const char cHelp[] =
    "usage: zqlogpipe --file FILE|--syslog|--config FILE [option...] [INPUT...]\n"
    "\n"
    "Logs each line of the INPUT files, or of standard input. INPUT may be - for standard input.\n"
    "\n"
    "  --file FILE       log file, .log is added to a name without extension; missing folders are made. May be given\n"
    "                    again for a further log file\n"
    "  --syslog[=NAME]   the system's log, too, or alone without --file: the journal, or syslog where there is none,\n"
    "                    from the source NAME (zqlogpipe); an entry is the text of a line, an empty line is none\n"
    "  --config FILE     loggers and appenders as this file of settings tells, instead of the options about files and\n"
    "                    their layout; told below\n"
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
    "the next line, for who has moved them away, and the FILE of --config is read again.\n"
    "\n"
    "A line ends at LF, or at the end of its input; it may have any length, and all other bytes are its text. The log "
    "is\n"
    "UTF-8: a byte that is no part of valid UTF-8 is taken as the character of that code (U+0080 to U+00FF), as in\n"
    "ISO 8859-1.\n"
    "\n"
    "The FILE of --config, with ';' before a comment:\n"
    "\n"
    "  [logger root.zqlogpipe]        ; the logger of --logger, or one above it, up to root\n"
    "  Level = info                   ; the least for its appenders: all, trace, debug, info, warn, error, fatal, off\n"
    "  Additive = no                  ; lines don't go on to the logger above (yes)\n"
    "  Appenders = lines, system      ; sections of this file\n"
    "\n"
    "  [appender lines]\n"
    "  class = TZqFileAppender        ; or TZqRollingFileAppender, TZqDailyRollingFileAppender\n"
    "  Layout = TZqSimpleLayout       ; or TZqXmlLayout, best with AppendExisting = no\n"
    "  FileName = app.log             ; also FileExt, AppendExisting, MaxFileSize, MaxBackupCount, DatePattern\n"
    "\n"
    "  [appender system]\n"
    "  class = TZqEventLogAppender    ; the system's log\n"
    "  Layout = TZqSimpleLayout\n"
    "  ServiceName = app              ; the source of its entries\n"
    "\n"
    "What is wrong with it is told with its line, and nothing is read then; at HUP the former settings stay. A line "
    "that\n"
    "can't be written is lost and counted, by each appender.\n"
    "\n"
    "The last line on standard error tells what was done. Exit status: 0, 1 for a failure, 2 for a wrong "
    "use.\n";

namespace {

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

}  // namespace

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

namespace {

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

}  // namespace

TOptions ParseOptions(const std::vector<std::string_view>& AWords) {
  constexpr std::string_view cOfOutput[] = {"--file", "--syslog", "--max-size", "--backups", "--daily", "--pattern",
      "--no-append", "--no-time", "--layout", "--retry"};
  TOptions Result;
  std::string_view OfOutput;  // the first of those
  bool Configured = false;
  for (std::size_t i = 0; i < AWords.size(); ++i) {
    const std::size_t Equals = AWords[i].starts_with("--") ? AWords[i].find('=') : std::string_view::npos;
    const std::string_view Whole = AWords[i], Word = Whole.substr(0, Equals);
    bool Taken = Equals == std::string_view::npos;
    const auto Value = [&] {
      if (!std::exchange(Taken, true)) return std::string(Whole.substr(Equals + 1));
      if (++i == AWords.size()) throw TUsageError(std::string(Word) + " needs a value");
      return std::string(AWords[i]);
    };
    if (OfOutput.empty() && std::ranges::find(cOfOutput, Word) != std::end(cOfOutput)) OfOutput = Word;
    if (Word == "--config") Result.Config = Value(), Configured = true;
    else if (Word == "--file") Result.Files.push_back(Value());
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
  if (Configured && !OfOutput.empty()) throw TUsageError(std::string(OfOutput) + " doesn't go with --config");
  if (Configured && IsBlank(Result.Config)) throw TUsageError("--config needs a name");
  if (std::any_of(Result.Files.begin(), Result.Files.end(), IsBlank)) throw TUsageError("--file needs a name");
  if (Result.Xml && !Result.Time) throw TUsageError("--no-time goes with --layout simple only");
  if (Result.Xml) Result.Append = false;  // two logs in one file are no XML
  if (Result.Source && IsBlank(*Result.Source)) throw TUsageError("--syslog= needs a name");
  if (Result.Files.empty() && !Result.Source && !Configured && !Result.Help && !Result.Version)
    throw TUsageError("--file, --syslog or --config is needed");
  return Result;
}
