#include <pwd.h>
#include <unistd.h>

#include <climits>
#include <string>
#include <vector>

#include "runtime/linux/system_files.h"
#include "runtime/platform/user_service.h"

namespace zq {

namespace {

using TNameCall = int (*)(char*, std::size_t);

UnicodeString NameBy(TNameCall ACall) {
  char Name[HOST_NAME_MAX + 2] = {};
  return ACall(Name, sizeof Name - 1) == 0 ? FromUTF8(Name) : UnicodeString();
}

class TLinuxUsers final : public TUserService {
 public:
  UnicodeString GetComputerName() override { return NameBy(&::gethostname); }

  UnicodeString GetUserName() override {
    std::vector<char> Buffer(16384);
    passwd Entry{};
    passwd* Found = nullptr;
    ::getpwuid_r(::geteuid(), &Entry, Buffer.data(), Buffer.size(), &Found);
    // An account without an entry has only its number.
    return FromUTF8(Found != nullptr ? Found->pw_name : std::to_string(::geteuid()));
  }

  void LookupTokenUser(UnicodeString& AName, UnicodeString& ADomain) override {
    AName = GetUserName();
    ADomain = NameBy(&::getdomainname);
    if (ADomain.IsEmpty() || ADomain == u"(none)") ADomain = GetComputerName();
  }

  bool LoadNetApi() override { return true; }
  bool HasServerGetInfo() override { return true; }
  Cardinal NetServerGetInfo(UnicodeString& AComment) override {
    AComment = FromUTF8(ShellAssignment("/etc/machine-info", "PRETTY_HOSTNAME").value_or(""));
    return 0;
  }
};

constinit TLinuxUsers LinuxUsers;

}  // namespace

constinit TServiceSlot<TUserService> TUserService::Slot(LinuxUsers);

}  // namespace zq
