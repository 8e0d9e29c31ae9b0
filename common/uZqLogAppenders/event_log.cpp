#include "common/uZqLogAppenders/event_log.h"

#include <utility>

#include "common/uZqLogger/failures.h"
#include "common/uZqWindows.h"
#include "runtime/com/registry.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/platform/event_log_service.h"
#include "runtime/text/format.h"

namespace zq {

namespace {

struct TKind {
  Word Type;
  Cardinal EventId;  // of the text in the message table that passes its insertion through
};

TKind KindOf(TZqLogLevel ALevel) noexcept {
  switch (ALevel) {
    case llInfo: return {EVENTLOG_SUCCESS, 1};
    case llWarn: return {EVENTLOG_WARNING_TYPE, 3};
    case llError:
    case llFatal: return {EVENTLOG_ERROR_TYPE, 4};
    default: return {EVENTLOG_INFORMATION_TYPE, 2};
  }
}

}  // namespace

TZqEventLogAppender::TZqEventLogAppender(TZqLogger* ALogger, const UnicodeString& AName)
    : TZqBaseAppender(ALogger, AName) {
  RegisterLogger(ChangeFileExt(ExtractFileName(ParamStr(0)), u""));
}

TZqEventLogAppender::~TZqEventLogAppender() {
  if (FHandle != 0) Service<TEventLogService>().DeregisterEventSource(FHandle);
}

void TZqEventLogAppender::RegisterSource() const {
  constexpr Integer cErrorsWarningsInformation = 7;
  try {
    TRegistry Registry(KEY_ALL_ACCESS);
    Registry.SetRootKey(HKEY_LOCAL_MACHINE);
    const UnicodeString Key = Format(u"SYSTEM\\CurrentControlSet\\Services\\Eventlog\\Application\\%s", {Name()});
    if (Registry.KeyExists(Key) || !Registry.OpenKey(Key, true)) return;
    Registry.WriteString(u"EventMessageFile", ParamStr(0));
    Registry.WriteInteger(u"TypesSupported", cErrorsWarningsInformation);
  } catch (const Exception&) {  // a reader of events misses the message table then, and that is all
  }
}

void TZqEventLogAppender::RegisterLogger(const UnicodeString& AName) {
  const TScope Scope(FLock);
  if (ZqGetElevationLevel() == elFull) RegisterSource();
  TEventLogService& System = Service<TEventLogService>();
  const NativeUInt Former = std::exchange(FHandle, System.RegisterEventSourceW(AName));
  if (Former != 0) System.DeregisterEventSource(Former);
}

void TZqEventLogAppender::SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) {
  const TScope Scope(FLock);
  TZqBaseAppender::SetConfig(AConfig);
  if (!AConfig) return;
  SetName(VarToUStr(AConfig->GetAppenderValue(GetName(), u"ServiceName", mtkString, u"")));
  if (!Name().IsEmpty()) RegisterLogger(Name());
}

void TZqEventLogAppender::Initialize() {
  const TScope Scope(FLock);
  TZqBaseAppender::Initialize();
}

void TZqEventLogAppender::Close() {
  const TScope Scope(FLock);
  TZqBaseAppender::Close();
}

void TZqEventLogAppender::SetLayout(const IntfRef<IZqLogLayout>& ALayout) {
  const TScope Scope(FLock);
  TZqBaseAppender::SetLayout(ALayout);
}

bool TZqEventLogAppender::Report(Word AType, Cardinal AEventId, const UnicodeString& AText) {
  return Service<TEventLogService>().ReportEventW(FHandle, AType, AEventId, AText);
}

void TZqEventLogAppender::Write(const UnicodeString& ASender, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  const TScope Scope(FLock);
  TZqBaseAppender::Write(ASender, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
  if (!FLayout || ALogLevel == llDoNotLog) return;
  if (FHandle == 0) return ZqLogMessageLost(u"The system's log has no source for it");
  const TWriting Writing(*this);
  const TKind Kind = KindOf(ALogLevel);
  const UnicodeString Text = FLayout->FormatLine(ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
  if (!Text.IsEmpty() && !Report(Kind.Type, Kind.EventId, Text))
    ZqLogMessageLost(u"The system's log didn't take it: " + SysErrorMessage(static_cast<Integer>(GetLastError())));
}

}  // namespace zq
