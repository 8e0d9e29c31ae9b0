#include <algorithm>
#include <cstdio>
#include <filesystem>

#include "common/uZqLogAppenders.h"
#include "common/uZqLogLayouts.h"
#include "common/uZqLogger.h"

namespace {

using namespace zq;

class TConsoleAppender : public TZqBaseAppender {
 public:
  using TZqBaseAppender::TZqBaseAppender;
  void Write(const UnicodeString& ASender, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) override {
    const TScope Scope(FLock);
    TZqBaseAppender::Write(ASender, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
    if (FLayout)
      std::puts(FLayout->FormatLine(ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent).ToUTF8().c_str());
  }

 protected:
  ~TConsoleAppender() override = default;
};

// A string of JSON (RFC 8259).
void AppendQuoted(utf8::TBuffer& ALine, std::u16string_view AText) {
  constexpr char Digits[] = "0123456789abcdef";
  ALine.AppendBytes("\"");
  while (!AText.empty()) {
    const auto Special =
        std::find_if(AText.begin(), AText.end(), [](Char c) { return c < u' ' || c == u'"' || c == u'\\'; });
    const auto Plain = static_cast<std::size_t>(Special - AText.begin());
    ALine.Append(AText.substr(0, Plain));
    AText.remove_prefix(Plain);
    if (AText.empty()) break;
    const char Escape[] = {'\\', 'u', '0', '0', Digits[AText.front() >> 4U], Digits[AText.front() & 15U]};
    ALine.AppendBytes({Escape, sizeof Escape});
    AText.remove_prefix(1);
  }
  ALine.AppendBytes("\"");
}

class TJsonLayout : public Implements<TZqLogBase, IZqLogLayout, IZqLogByteLayout> {
 public:
  using Implements::Implements;
  UnicodeString GetHeader() override { return {}; }
  UnicodeString GetFooter() override { return {}; }
  UnicodeString FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, const UnicodeString& ALogMessage,
      PZqDataRec AValue, TZqLogIndent ALogIndent) override {
    utf8::TBuffer Line;
    AppendLine(Line, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
    return FromUTF8(Line.View());
  }
  void AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec, TZqLogIndent) override {
    ALine.AppendBytes(R"({"level":)");
    AppendQuoted(ALine, ZqLogLevels[ALogLevel]);
    ALine.AppendBytes(R"(,"logger":)");
    AppendQuoted(ALine, ALoggerName);
    ALine.AppendBytes(R"(,"text":)");
    AppendQuoted(ALine, ALogMessage);
    ALine.AppendBytes("}");
  }

 protected:
  ~TJsonLayout() override = default;
};

}  // namespace

int main() {
  const UnicodeString Order = u"4711";
  std::filesystem::create_directories("orders");
  std::filesystem::current_path("orders");

  const IntfRef<IZqLogger> Log = Logger()->GetLogger(u"shop.orders");
  Log->Info(u"started");
  Log->Debug(u"%d orders in %s", {12, u"Berlin"});  // formatted before the level is tested
  Log->Debug(u"order", Order);                      // an object, an Exception or a Variant goes as the message's value
  Log->EnterMethod(u"Close");                       // this line and the next ones stand two blanks further in
  Log->ExitMethod(u"Close");

  const auto Appender = Log->GetAppenders()->Add(ZqRollingFileAppender, ZqSimpleLayout);
  const auto File = Appender.As<IZqRollingFileAppender>();
  File->SetFileName(u"log/orders.log");  // missing folders are made
  File->SetMaxFileSize(1 << 20);         // bytes; 0 for no limit
  File->SetMaxBackupCount(5);            // files of the series, the log file among them

  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TConsoleAppender>());  // in start-up code

  Log->GetAppenders()->Add("TConsoleAppender", ZqSimpleLayout);
  Log->Info(u"to the file and to the console");
  Appender.As<IZqLogAppenderEx>()->SetLayout(TZqLogBaseClass::Of<TJsonLayout>());
  Log->Info(u"in \"JSON\"");

  const IntfRef<TZqEventLogAppender> System(New<TZqEventLogAppender>(Logger(), u"System"));
  System->RegisterLogger(u"shop");
  System->SetLayout(ZqSimpleLayout);
  Log->AddAppender(System);

  return std::filesystem::exists("log/orders.log") ? 0 : 1;
}
