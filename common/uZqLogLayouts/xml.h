#pragma once

#include <limits>

#include "common/uZqLogLayouts/byte_layout.h"
#include "common/uZqLogLayouts/time_text.h"
#include "common/uZqLogger.h"
#include "runtime/core/utf8.h"

namespace zq {

/// "yyyy-mm-ddThh:mm:ssZ", in UTC, of a local time.
[[nodiscard]] ZQ_API UnicodeString FormatUtcStamp(TDateTime AValue);
/// AValue as the content of an XML element: without NUL, and with entities for quotes, apostrophes, ampersands and
/// angle brackets. All other characters stay, also those that XML 1.0 has no place for.
[[nodiscard]] ZQ_API UnicodeString EscapeXml(const UnicodeString& AValue);

/// A log in XML: each message is an item element, and a stylesheet (XSLT 1.0) beside the file shows them as a table.
///
/// The file's extension becomes ".log.xml", and "app.log.xsl" is the stylesheet of "app.log.xml": name the file before
/// its layout is set. A file that is continued has two root elements and is no XML then: SetAppendExisting(false), or a
/// roll, keeps each file well-formed.
///
/// What goes into a file can be read by any parser: characters that XML 1.0 has no place for are shown there as U+2400
/// plus their code, or as U+FFFD if they aren't control characters. FormatLine leaves them as they are. One layout
/// serves one appender, which calls it under its lock; a descendant is asked for its FormatLine, unless it names
/// IZqLogByteLayout among its interfaces and has an AppendLine of its own.
class ZQ_API TZqXmlLayout : public Implements<TZqLogBase, _IZqLogLayout, IZqLogLayoutEx, IZqLogLayout> {
 public:
  using Implements::Implements;
  bool GetInterface(const TGUID& AIID, void** AObj) override;
  /// Writes the stylesheet of a TZqFileAppender, unless there is one. Raises EFCreateError or EWriteError.
  void Initialize(TZqLogBase* ALogBase) override;
  UnicodeString GetFileExt() override;
  UnicodeString GetFooter() override;
  UnicodeString GetHeader() override;
  UnicodeString FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, const UnicodeString& ALogMessage,
      PZqDataRec AValue, TZqLogIndent ALogIndent) override;
  /// Appends, in UTF-8, what this class's FormatLine returns, but for what no XML file can hold.
  void AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent);

 protected:
  ~TZqXmlLayout() override = default;

 private:
  static std::string TimeText(Int64 ASecond);
  void WriteStylesheet() const;
  std::string_view Front(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, TZqLogIndent ALogIndent);
  void RenewFront(Int64 AMoment, Cardinal AThread, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      TZqLogIndent ALogIndent);

  TZqByteLayoutOf<TZqXmlLayout> FByteLayout{*this};
  UnicodeString FXslFilename;
  // How the last line began, up to its message, and what that was made from.
  utf8::TBuffer FFront;
  TZqSecondText FTime{TimeText};
  Int64 FSecond = std::numeric_limits<Int64>::min();
  Cardinal FThread = 0;
  TZqLogLevel FLevel = llAll;
  TZqLogIndent FIndent = liIndentNone;
  UnicodeString FLoggerName;
};

}  // namespace zq
