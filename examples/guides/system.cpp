#include "common/uZqWindows.h"

using namespace zq;

int main() {
  const UnicodeString Config = ZqExpandFileName(u"$(HOME)/.shop/shop.conf");

  return Config == ZqGetEnvironmentVar(u"HOME") + u"/.shop/shop.conf" ? 0 : 1;
}
