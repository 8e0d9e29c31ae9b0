#pragma once

#include <limits>

#include "common/uZqLogger.h"

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

 protected:
  ~TZqSimpleLayout() override = default;

 private:
  void ChangeIndent(TZqLogIndent ALogIndent);
  void AppendTime(std::u16string& ALine);

  UnicodeString FIndent;
  Int64 FSecond = std::numeric_limits<Int64>::min();  // the one that FSecondText shows
  UnicodeString FSecondText;                          // all but the milliseconds: the same for many lines
};

namespace uZqLogLayouts {
void Start();
}  // namespace uZqLogLayouts

}  // namespace zq
