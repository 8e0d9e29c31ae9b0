#include "common/uZqLogAppenders.h"
#include "common/uZqLogLayouts.h"
#include "common/uZqLogger.h"

int main() {
  using namespace zq;
  const auto Appender = Logger()->GetAppenders()->Add(
      TZqLogBaseClass::Of<TZqRollingFileAppender>(), TZqLogBaseClass::Of<TZqSimpleLayout>());
  Appender.As<IZqRollingFileAppender>()->SetFileName(u"app.log");
  Logger()->GetLogger(u"shop.orders")->Info(u"started");
}
