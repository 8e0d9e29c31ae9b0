#include "common/uZqWindows.h"

using namespace zq;

int main() {
  const UnicodeString Config = ZqExpandFileName(u"$(HOME)/.shop/shop.conf");

  const UnicodeString System = ZqRunProcessAndCaptureOutput(u"uname -s", u"", false);
  UnicodeString Names;
  ZqRunProcessAndCaptureOutput(
      u"/usr", u"ls | grep bin", [&](const UnicodeString& AOutput) { Names += AOutput; }, true);

  const bool Right = Config == ZqGetEnvironmentVar(u"HOME") + u"/.shop/shop.conf" && System == u"Linux\n";
  return Right && Names.View().starts_with(u"bin\n") ? 0 : 1;
}
