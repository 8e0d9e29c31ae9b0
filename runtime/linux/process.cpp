#include <sys/utsname.h>

#include <string>
#include <string_view>

#include "runtime/linux/system_files.h"
#include "runtime/platform/process_facts.h"

namespace zq {

namespace {

class TLinuxProcess final : public TProcessFacts {
 public:
  std::optional<bool> IsWow64Process() override {
    utsname System{};
    if (::uname(&System) != 0) return std::nullopt;
    return sizeof(void*) == 4 && std::string_view(System.machine).find("64") != std::string_view::npos;
  }

  std::optional<bool> IsDebuggerPresent() override {
    constexpr std::string_view Tracer = "TracerPid:\t";
    const std::string Status = ReadSystemFile("/proc/self/status");
    const std::size_t Found = Status.find(Tracer);
    if (Found == Status.npos) return std::nullopt;
    return Status[Found + Tracer.size()] != '0';
  }
};

constinit TLinuxProcess LinuxProcess;

}  // namespace

constinit TServiceSlot<TProcessFacts> TProcessFacts::Slot(LinuxProcess);

}  // namespace zq
