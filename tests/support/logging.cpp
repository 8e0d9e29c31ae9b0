#include "tests/support/logging.h"

namespace zq {

void TNotingAppender::Write(const UnicodeString& ASender, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  {
    const std::lock_guard Guard(FLock);
    Sender = ASender;
    Indent = ALogIndent;
    FNotes.push_back((ALoggerName + u" " + ZqLogLevels[ALogLevel] + u" " + ALogMessage).ToUTF8());
  }
  if (OnWrite) OnWrite(AValue);
}

std::vector<std::string> TNotingAppender::Notes() const {
  const std::lock_guard Guard(FLock);
  return FNotes;
}

TLoggerFixture::TLoggerFixture(const char16_t* AName) : Log(Logger()->GetLogger(AName)) {
  Log->SetLevel(llAll);
  Log->SetAdditive(false);
}

}  // namespace zq
