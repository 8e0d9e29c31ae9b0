#include "files.h"

#include <algorithm>
#include <cstdio>
#include <utility>

#include "common/uZqLogLayouts.h"
#include "common/uZqLogger/failures.h"
#include "event_log.h"
#include "runtime/core/utf8.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "signals.h"

using namespace zq;

namespace {

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

/// Has a line that the log doesn't take tried again, where that is wanted.
class TPipeEventLog : public TPatientEventLog {
 public:
  TPipeEventLog(TCounts& ACounts, Cardinal ARetry)
      : TPatientEventLog(zq::Logger(), u""), FCounts(ACounts), FRetry(ACounts, ARetry) {}

 protected:
  ~TPipeEventLog() override = default;
  bool Report(Word AType, Cardinal AEventId, const UnicodeString& AText) override {
    while (!TPatientEventLog::Report(AType, AEventId, AText))
      if (!FRetry.Again(u"The system's log: " + SysErrorMessage(static_cast<Integer>(GetLastError())))) return false;
    ++FCounts.Written;
    return true;
  }

 private:
  TCounts& FCounts;
  TRetry FRetry;
};

// The layout writes its stylesheet at once, where the file is then, and gives the file its extension: where another
// one was named, the file keeps that. The stylesheet of app, app.log, app.xml and app.log.xml is app.log.xsl.
void SetXmlLayout(TZqRollingFileAppender* AAppender, const TFileName& AName) {
  if (SameText(ExtractFileExt(AName), u".xml")) AAppender->SetFileName(ChangeFileExt(AName, u""));
  ForceDirectories(ExtractFileDir(AName));  // a folder that can't be made shows with the stylesheet
  AAppender->SetLayout(TZqLogBaseClass::Of<TZqXmlLayout>());
  AAppender->SetFileName(AName);
}

}  // namespace

TFilesOutput::TFilesOutput(const TOptions& AOptions, TComplaints& AComplaints)
    : TOutput(AComplaints), FOptions(AOptions) {
  ZqShowLogFailures(false);  // they are counted
  FLogger = Logger()->GetLogger(FromUTF8(AOptions.Logger));
  FLogger->SetLevel(llAll);
  FLogger->SetAdditive(false);
  for (const std::string& File : AOptions.Files) AddAppender(File);
  if (AOptions.Source) AddSource(*AOptions.Source);
}

void TFilesOutput::Finish() {
  for (const auto& Appender : FAppenders) Close(*Appender);
}

std::string TFilesOutput::Summary() const {
  return std::to_string(FCounts.Written) + " lines written, " + std::to_string(FCounts.Rolls) + " files rolled";
}

void TFilesOutput::AddAppender(const std::string& AFile) {
  if (FOptions.Pattern.empty()) return Add(AFile, New<TPipeAppender<TZqRollingFileAppender>>(FCounts, FOptions.Retry));
  auto* const Appender = New<TPipeAppender<TZqDailyRollingFileAppender>>(FCounts, FOptions.Retry);
  Appender->SetDatePattern(FOptions.Pattern);
  Add(AFile, Appender);
}

void TFilesOutput::Add(const std::string& AFile, TZqRollingFileAppender* AAppender) {
  FAppenders.emplace_back(AAppender);
  const TFileName Name = utf8::Decode(AFile, utf8::TMalformed::Escape);
  AAppender->SetFileName(Name);
  if (FOptions.MaxSize) AAppender->SetMaxFileSize(*FOptions.MaxSize);
  AAppender->SetMaxBackupCount(FOptions.Backups);
  AAppender->SetAppendExisting(FOptions.Append);
  AAppender->SetRetryInterval(1);  // after a roll that couldn't open its new file
  if (FOptions.Xml) SetXmlLayout(AAppender, Name);
  else
    AAppender->SetLayout(FOptions.Time ? TZqLogBaseClass::Of<TZqSimpleLayout>() : TZqLogBaseClass::Of<TNoTimeLayout>());
  AAppender->Initialize();  // a file that can't be opened shows here, before the first line
  FLogger->AddAppender(FAppenders.back());
}

void TFilesOutput::AddSource(const std::string& AName) {
  auto* const Appender = New<TPipeEventLog>(FCounts, FOptions.Retry);
  FAppenders.emplace_back(Appender);
  Appender->RegisterLogger(TextOf(AName));
  Appender->SetLayout(TZqLogBaseClass::Of<TTextLayout>());
  FLogger->AddAppender(FAppenders.back());
}
