#include "settings.h"

#include <algorithm>

#include "common/uZqLogAppenders.h"
#include "common/uZqTypes.h"
#include "event_log.h"
#include "runtime/core/utf8.h"
#include "runtime/values/variants.h"

using namespace zq;

namespace {

/// The system's log gets its time to make room.
class TPipeConfigurator : public TIniLogConfigurator {
 public:
  using TIniLogConfigurator::TIniLogConfigurator;
  Variant GetAppenderValue(const UnicodeString& AAppenderName, const UnicodeString& AKey, TZqMainTypeKind AKind,
      const Variant& ADefault) override {
    Variant Told = TIniLogConfigurator::GetAppenderValue(AAppenderName, AKey, AKind, ADefault);
    const auto Plain = TZqLogBaseClass::Of<TZqEventLogAppender>(), Patient = TZqLogBaseClass::Of<TPatientEventLog>();
    const bool IsPlain = AKey == u"class" && SameText(VarToUStr(Told), Plain.ClassName());
    return IsPlain ? Variant(Patient.ClassName()) : Told;
  }

 protected:
  ~TPipeConfigurator() override = default;
};

using TNames = std::vector<UnicodeString>;

// The loggers to which a line of ALogger comes, by what AConfig tells.
TNames LoggersFrom(UnicodeString ALogger, TIniLogConfigurator& AConfig) {
  TNames Result{ALogger};
  for (auto Dot = ALogger.View().rfind(u'.'); Dot != std::u16string_view::npos; Dot = ALogger.View().rfind(u'.')) {
    if (!VarToBool(AConfig.GetLoggerValue(ALogger, u"Additive", mtkBoolean, true))) break;
    ALogger = ALogger.Copy(1, static_cast<Integer>(Dot));
    Result.push_back(ALogger);
  }
  return Result;
}

TNames AppendersOf(const UnicodeString& ALogger, TIniLogConfigurator& AConfig) {
  const Variant Told = AConfig.GetLoggerValue(ALogger, u"Appenders", mtkArray, VarArrayOf({}));
  TNames Result;
  for (Integer i = 0; i < ZqVarArrayCount(Told); ++i) Result.push_back(VarToUStr(VarArrayGet(Told, {i})));
  return Result;
}

// What would keep lines of ALogger from being written, though no setting of it is wrong.
TNames SilencesOf(const UnicodeString& ALogger, TIniLogConfigurator& AConfig) {
  TNames Result;
  bool Reaches = false;
  for (const UnicodeString& Logger : LoggersFrom(ALogger, AConfig)) {
    const TNames Appenders = AppendersOf(Logger, AConfig);
    Reaches = Reaches || !Appenders.empty();
    if (!Appenders.empty() && VarIsEmpty(AConfig.GetLoggerValue(Logger, u"Level", mtkInteger, Variant())))
      Result.push_back(u"the logger " + Logger + u" has appenders and no Level: it would log nothing");
    for (const UnicodeString& Appender : Appenders)
      for (const char16_t* const Key : {u"class", u"Layout"})
        if (VarToUStr(AConfig.GetAppenderValue(Appender, Key, mtkString, u"")).IsEmpty())
          Result.push_back(u"the appender " + Appender + u" of " + Logger + u" has no " + Key);
  }
  if (!Reaches) Result.push_back(u"no appender would get a line of the logger " + ALogger);
  return Result;
}

}  // namespace

TSettingsOutput::TSettingsOutput(const std::string& AFile, const std::string& ALogger, TComplaints& AComplaints)
    : TOutput(AComplaints),
      FFile(utf8::Decode(AFile, utf8::TMalformed::Escape)),
      FPath(FromUTF8(ALogger)),
      FName(Logger()->GetLogger(FPath)->GetName()),
      FHandler([this](const TZqLogFailure& AFailure) { Note(AFailure); }) {
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TPatientEventLog>());
  Use(Read());
}

TSettingsOutput::~TSettingsOutput() {
  FLogger.Reset();
  FConfig->Withdraw();
}

TSettingsOutput::TConfig TSettingsOutput::Read() const {
  const TConfig Result(New<TPipeConfigurator>(FFile));
  std::vector<std::string> Faults;
  for (const UnicodeString& Fault : Result->Read()) Faults.push_back(Fault.ToUTF8());
  if (!Faults.empty()) throw TSettingsFault(std::move(Faults));
  for (const UnicodeString& Silence : SilencesOf(FName, *Result.Get()))
    Faults.push_back((FFile + u": " + Silence).ToUTF8());
  if (!Faults.empty()) throw TSettingsFault(std::move(Faults));
  return Result;
}

void TSettingsOutput::Use(const TConfig& AConfig) {
  FConfig = AConfig;
  try {
    AConfig->Apply();
    FLogger = Logger()->GetLogger(FPath);
  } catch (const Exception&) {
    AConfig->Withdraw();
    throw;
  }
  Open(*AConfig.Get());
}

// What can't be opened shows here, before the next line.
void TSettingsOutput::Open(TIniLogConfigurator& AConfig) {
  TNames Reached;
  for (const UnicodeString& Logger : LoggersFrom(FName, AConfig))
    for (const UnicodeString& Appender : AppendersOf(Logger, AConfig)) Reached.push_back(Appender);
  for (TZqLogBase* const Live : LiveAppenders()) {
    auto* const File = dynamic_cast<TZqFileAppender*>(Live);
    if (File == nullptr || std::ranges::find(Reached, File->GetName()) == Reached.end()) continue;
    File->SetRetryInterval(1);  // after a roll that couldn't open its new file
    try {
      File->Initialize();
    } catch (const Exception& e) {
      FComplaints.Add(e.what());
    }
  }
}

void TSettingsOutput::Reopen() {
  TConfig Next;
  try {
    Next = Read();
  } catch (const TSettingsFault& e) {
    for (const std::string& Fault : e.Faults) FComplaints.Add(Fault);
  } catch (const Exception& e) {
    FComplaints.Add(e.what());
  }
  Finish();
  if (!Next) return TComplaints::Tell("the former settings stay");
  const TConfig Former = FConfig;
  FLogger.Reset();
  Former->Withdraw();
  try {
    Use(Next);
  } catch (const Exception& e) {
    FComplaints.Add(e.what());
    TComplaints::Tell("the former settings stay");
    Use(Former);
  }
}

void TSettingsOutput::Finish() {
  for (TZqLogBase* const Live : LiveAppenders())
    if (auto* const Appender = dynamic_cast<IZqLogAppender*>(Live)) Close(*Appender);
}

std::string TSettingsOutput::Summary() const { return std::to_string(FCounts.Failed) + " lines lost"; }

void TSettingsOutput::Note(const TZqLogFailure& AFailure) {
  if (AFailure.Error.IsEmpty()) return;  // messages are written again
  const UnicodeString What = AFailure.Appender + u": " + AFailure.Error;
  if (AFailure.Lost == 0) return TComplaints::Tell(What.ToUTF8());
  if (FCounts.Failed++ == 0) FCounts.Failure = What;
}
