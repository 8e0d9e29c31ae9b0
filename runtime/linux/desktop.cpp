#include "runtime/platform/desktop_service.h"

namespace zq {

namespace {

class TLinuxDesktop final : public TDesktopService {
 public:
  bool FindWindow(const char16_t*, const char16_t*) override { return false; }
};

constinit TLinuxDesktop LinuxDesktop;

}  // namespace

constinit TServiceSlot<TDesktopService> TDesktopService::Slot(LinuxDesktop);

}  // namespace zq
