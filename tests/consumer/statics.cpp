#include "common/uZqLogAppenders.h"
#include "common/uZqLogLayouts.h"
#include "common/uZqLogger.h"

using namespace zq;

namespace {

// Logs before main begins and after it has ended.
struct THost {
  THost() {
    Logger()
        ->GetAppenders()
        ->Add(TZqLogBaseClass::Of<TZqFileAppender>(), TZqLogBaseClass::Of<TZqSimpleLayout>())
        .As<IZqFileAppender>()
        ->SetFileName(u"app.log");
    Logger()->Info(u"up");
  }
  ~THost() { Logger()->Info(u"down"); }
} Host;

}  // namespace

int main() {}
