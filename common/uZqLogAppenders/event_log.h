#pragma once

#include "common/uZqLogAppenders/base.h"

namespace zq {

/// Writes each message as an event into the system's log: on Linux the journal or syslog, told with TEventLogService.
///
/// The source of the events is the program's name, without folder and extension, until a configurator gives a
/// "ServiceName" or RegisterLogger another one. llInfo is a success, llWarn a warning, llError and llFatal are errors,
/// any other level is an information. A line of the layout is one event; its header and footer aren't used.
///
/// No message waits for the log. One that it doesn't take, because it is full or not there, is lost, and the host hears
/// of it (common/uZqLogger/failures.h).
class ZQ_API TZqEventLogAppender : public TZqBaseAppender {
 public:
  TZqEventLogAppender(TZqLogger* ALogger, const UnicodeString& AName);

  void Initialize() override;
  /// "ServiceName" becomes the name of the appender and of the source; empty takes the appender's name away and leaves
  /// the source. Raises EComponentError for one that is no identifier.
  void SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) override;
  void Write(const UnicodeString& ASender, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) override;
  void Close() override;
  using TZqBaseAppender::SetLayout;
  void SetLayout(const IntfRef<IZqLogLayout>& ALayout) override;

  /// Events come from the source AName from now on. An administrator's process also enters the appender's own name as
  /// a source in the registry, where that has none of this name; what fails at that goes unseen.
  void RegisterLogger(const UnicodeString& AName);

 protected:
  ~TZqEventLogAppender() override;
  /// Hands an event to the log, under the lock. False, with the reason in GetLastError: it is lost.
  virtual bool Report(Word AType, Cardinal AEventId, const UnicodeString& AText);

 private:
  void RegisterSource() const;

  NativeUInt FHandle = 0;  // of the source; 0 for none
};

}  // namespace zq
