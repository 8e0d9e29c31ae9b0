#include <sys/utsname.h>

#include <cstdio>

#include "runtime/platform/version_service.h"

namespace zq {

namespace {

class TLinuxVersion final : public TVersionService {
 public:
  bool HasKernel() override { return true; }
  bool KernelExports(const char16_t* AName) override { return std::u16string_view(AName) == u"GetVersionExA"; }
  bool GetVersionEx(TOSVersionInfo& AInfo) override {
    AInfo = {.MajorVersion = 10, .MinorVersion = 0, .ServicePackMajor = 0, .ProductType = 1};
    return true;
  }
  Integer GetSystemMetrics(Integer) override { return 0; }
  TSystemRelease Release() override {
    TSystemRelease Result;
    utsname Names{};
    if (::uname(&Names) != 0) return Result;
    static_cast<void>(std::sscanf(Names.release, "%u.%u.%u", &Result.Major, &Result.Minor, &Result.Build));
    Result.Text = FromUTF8(Names.release);
    return Result;
  }
};

constinit TLinuxVersion LinuxVersion;

}  // namespace

constinit TServiceSlot<TVersionService> TVersionService::Slot(LinuxVersion);

}  // namespace zq
