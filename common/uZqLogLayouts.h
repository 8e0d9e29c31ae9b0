#pragma once

#include <limits>

#include "common/uZqLogger.h"
#include "runtime/core/utf8.h"

namespace zq {

/// One line of plain text per message: indent, time, level, logger, message, value.
///
/// The indentation that EnterMethod and ExitMethod build up is the layout's, so one layout serves one appender, which
/// calls it under its lock.
class ZQ_API TZqSimpleLayout : public Implements<TZqLogBase, _IZqLogLayout, IZqLogLayout> {
 public:
  using Implements::Implements;
  void Initialize(TZqLogBase*) override {}
  UnicodeString GetFooter() override;
  UnicodeString GetHeader() override;
  UnicodeString FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, const UnicodeString& ALogMessage,
      PZqDataRec AValue, TZqLogIndent ALogIndent) override;
  /// Appends, in UTF-8, what this class's FormatLine returns; a descendant's own FormatLine isn't asked.
  void AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent);

 protected:
  ~TZqSimpleLayout() override = default;

 private:
  void ChangeIndent(TZqLogIndent ALogIndent);
  const char* TimeNow();
  template <class TLine>
  void Compose(TLine& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, const UnicodeString& ALogMessage,
      PZqDataRec AValue, TZqLogIndent ALogIndent);

  UnicodeString FIndent;
  Int64 FSecond = std::numeric_limits<Int64>::min();  // the one that FTime shows, in milliseconds, UTC
  char FTime[27] = "yyyy-mm-dd hh:mm:ss:zzz - ";      // how the last line began
};

namespace uZqLogLayouts {
ZQ_API void Start();
}  // namespace uZqLogLayouts

}  // namespace zq
