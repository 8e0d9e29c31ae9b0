#include "runtime/platform/desktop_service.h"

namespace zq {

namespace {

class TLinuxDesktop : public TDesktopService {
 public:
  bool FindWindow(const char16_t*, const char16_t*) override { return false; }
};

}  // namespace

std::atomic<TDesktopService*>& ServiceSlot(const TDesktopService*) {
  static std::atomic<TDesktopService*> Slot{new TLinuxDesktop};
  return Slot;
}

}  // namespace zq
