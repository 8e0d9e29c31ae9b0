#include <cstdlib>

#include "runtime/core/utf8.h"
#include "runtime/platform/environment_service.h"

namespace zq {

namespace {

class TLinuxEnvironment final : public TEnvironmentService {
 public:
  std::optional<UnicodeString> GetEnvironmentVariable(const UnicodeString& AName) override {
    const char* const Value = std::getenv(utf8::Encode(AName, utf8::TMalformed::Escape).c_str());
    if (Value == nullptr) return std::nullopt;
    return UnicodeString(utf8::Decode(Value, utf8::TMalformed::Escape));
  }
};

constinit TLinuxEnvironment LinuxEnvironment;

}  // namespace

constinit TServiceSlot<TEnvironmentService> TEnvironmentService::Slot(LinuxEnvironment);

}  // namespace zq
