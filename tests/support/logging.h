#pragma once

#include <mutex>

#include "common/uZqLogAppenders.h"
#include "common/uZqLogLayouts.h"
#include "common/uZqLogger.h"
#include "tests/support/support.h"

namespace zq {

/// An appender of a host: no component, notes "<logger> <level> <message>" and then does what the test wants.
class TNotingAppender : public Implements<TInterfacedObject, IZqLogAppender> {
 public:
  UnicodeString GetName() const override { return u"noting"; }
  TComponent* Component() override { return nullptr; }
  void Write(const UnicodeString& ASender, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) override {
    {
      const std::lock_guard Guard(FLock);
      Sender = ASender;
      Indent = ALogIndent;
      FNotes.push_back((ALoggerName + u" " + ZqLogLevels[ALogLevel] + u" " + ALogMessage).ToUTF8());
    }
    if (OnWrite) OnWrite(AValue);
  }
  void Close() override {}
  [[nodiscard]] std::vector<std::string> Notes() const {
    const std::lock_guard Guard(FLock);
    return FNotes;
  }

  std::function<void(PZqDataRec)> OnWrite;
  UnicodeString Sender;
  TZqLogIndent Indent = liIndentNone;

 private:
  mutable std::mutex FLock;
  std::vector<std::string> FNotes;
};

/// A logger of its own below the root, at llAll, whose messages go no further up; the root is left as it was found.
struct TLoggerFixture {
  explicit TLoggerFixture(const char16_t* AName = u"test") : Log(Logger()->GetLogger(AName)) {
    Log->SetLevel(llAll);
    Log->SetAdditive(false);
  }
  IntfRef<IZqLogger> Log;
};

/// A file appender on ALog with the simple layout.
template <class TAppender = TZqFileAppender>
IntfRef<IZqFileAppender> AddFile(const IntfRef<IZqLogger>& ALog, const UnicodeString& AFileName) {
  const auto Appender =
      ALog->GetAppenders()->Add(TZqLogBaseClass::Of<TAppender>(), TZqLogBaseClass::Of<TZqSimpleLayout>());
  const auto File = Appender.template As<IZqFileAppender>();
  File->SetFileName(AFileName);
  return File;
}

}  // namespace zq
