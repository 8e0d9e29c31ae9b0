#include "runtime/platform/environment_service.h"

#include <algorithm>
#include <cstdlib>

#include "runtime/core/utf8.h"
#include "runtime/io/paths.h"

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
constinit std::atomic<TEnvironmentService*> Slot = &LinuxEnvironment;

}  // namespace

std::atomic<TEnvironmentService*>& ServiceSlot(const TEnvironmentService*) { return Slot; }

UnicodeString TEnvironmentService::ExpandEnvironmentStrings(const UnicodeString& AText) {
  UnicodeString Result;
  std::u16string_view Rest = AText;
  while (!Rest.empty()) {
    const std::size_t End = Rest.front() == u'%' ? Rest.find(u'%', 1) : Rest.npos;
    const auto Value = End == Rest.npos ? std::nullopt : GetEnvironmentVariable(Rest.substr(1, End - 1));
    // The "%" behind an unknown name may be the first of the next one.
    const std::size_t Taken = Value ? End + 1 : std::min(Rest.find(u'%', 1), Rest.size());
    Result += Value ? Value->View() : Rest.substr(0, Taken);
    Rest.remove_prefix(Taken);
  }
  return Result;
}

}  // namespace zq
