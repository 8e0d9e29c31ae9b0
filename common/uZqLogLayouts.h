#pragma once

#include <limits>

#include "common/uZqLogger.h"

namespace zq {

/// One line of plain text per message: indent, time, level, logger, message, value.
///
/// The indentation that EnterMethod and ExitMethod build up is the layout's, so one layout serves one appender, which
/// calls it under its lock.
class ZQ_API TZqSimpleLayout : public Implements<TZqLogBase, _IZqLogLayout, IZqLogLayout, IZqLineLayout> {
 public:
  using Implements::Implements;
  void Initialize(TZqLogBase*) override {}
  UnicodeString GetFooter() override;
  UnicodeString GetHeader() override;
  UnicodeString FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, const UnicodeString& ALogMessage,
      PZqDataRec AValue, TZqLogIndent ALogIndent) override;

  void AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) override;
  /// A descendant, whose FormatLine may be its own, doesn't answer to IZqLineLayout.
  bool GetInterface(const TGUID& AIID, void** AObj) override;

 protected:
  ~TZqSimpleLayout() override = default;

 private:
  void ChangeIndent(TZqLogIndent ALogIndent);
  const UnicodeString& TimeNow();
  template <class TLine>
  void Compose(TLine& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, const UnicodeString& ALogMessage,
      PZqDataRec AValue, TZqLogIndent ALogIndent);

  UnicodeString FIndent;
  Int64 FSecond = std::numeric_limits<Int64>::min();  // the one that FTime shows
  UnicodeString FTime;                                // time of the last line and the dash behind it
};

namespace uZqLogLayouts {
void Start();
}  // namespace uZqLogLayouts

}  // namespace zq
