#pragma once

#include <limits>
#include <string>
#include <string_view>

#include "common/uZqLogLayouts/byte_layout.h"
#include "common/uZqLogLayouts/time_text.h"
#include "common/uZqLogLayouts/xml.h"
#include "common/uZqLogger.h"
#include "runtime/core/utf8.h"

namespace zq {

/// One line of plain text per message: indent, time, level, logger, message, value.
///
/// The indentation that EnterMethod and ExitMethod build up is the layout's, so one layout serves one appender, which
/// calls it under its lock. This class writes bytes; a descendant is asked for its FormatLine, unless it names
/// IZqLogByteLayout among its interfaces and has an AppendLine of its own.
class ZQ_API TZqSimpleLayout : public Implements<TZqLogBase, _IZqLogLayout, IZqLogLayout> {
 public:
  using Implements::Implements;
  bool GetInterface(const TGUID& AIID, void** AObj) override;
  void Initialize(TZqLogBase*) override {}
  UnicodeString GetFooter() override;
  UnicodeString GetHeader() override;
  UnicodeString FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, const UnicodeString& ALogMessage,
      PZqDataRec AValue, TZqLogIndent ALogIndent) override;
  /// Appends, in UTF-8, what this class's FormatLine returns.
  void AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent);

 protected:
  ~TZqSimpleLayout() override = default;

 private:
  static std::string TimeText(Int64 ASecond);
  void ChangeIndent(TZqLogIndent ALogIndent);
  std::string_view Front(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel);
  void RenewFront(Int64 AMilliseconds, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel);
  template <class TLine>
  void Compose(TLine& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, const UnicodeString& ALogMessage,
      PZqDataRec AValue, TZqLogIndent ALogIndent);

  TZqByteLayoutOf<TZqSimpleLayout> FByteLayout{*this};
  UnicodeString FIndent;
  // How the last line began, in UTF-8: "yyyy-mm-dd hh:mm:ss:zzz - Level logger - ", and what that was made from.
  std::string FFront;
  Int64 FSecond = std::numeric_limits<Int64>::min();  // in milliseconds, UTC
  TZqLogLevel FLevel = llAll;
  UnicodeString FLoggerName;
  TZqSecondText FTime{TimeText};  // up to the milliseconds
};

namespace uZqLogLayouts {
ZQ_API void Start();
ZQ_API void Stop();
}  // namespace uZqLogLayouts

}  // namespace zq
