#include "runtime/linux/power_supply.h"

#include <linux/netlink.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <set>
#include <string_view>
#include <system_error>
#include <utility>

#include "runtime/linux/system_files.h"

namespace zq {

namespace {

constexpr Cardinal cLookToo = 30'000, cLookAlone = 1000;  // milliseconds

std::string SystemFolder() {
  const std::string Other = EnvironmentText("SYSFS_PATH");
  return Other.empty() ? "/sys" : Other;
}

}  // namespace

TPowerSupply::TPowerSupply(std::function<void()> AChanged)
    : FChanged(std::move(AChanged)), FFolder(SystemFolder() + "/class/power_supply"), FState(State()) {
  if (SystemFolder() == "/sys") OpenMessages();
  FTimer = FQueue->SetTimer(FMessages >= 0 ? cLookToo : cLookAlone, [this] { Look(); });
}

TPowerSupply::~TPowerSupply() {
  FQueue->KillTimer(FTimer);
  if (FMessages < 0) return;
  FQueue->Unwatch(FMessages);
  ::close(FMessages);
}

void TPowerSupply::OpenMessages() {
  FMessages = ::socket(AF_NETLINK, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_KOBJECT_UEVENT);
  if (FMessages < 0) return;
  sockaddr_nl Address{};
  Address.nl_family = AF_NETLINK;
  Address.nl_groups = 1;  // the kernel's own
  if (::bind(FMessages, reinterpret_cast<const sockaddr*>(&Address), sizeof Address) == 0) try {
      return FQueue->Watch(FMessages, TThreadQueue::TReady::ToRead, [this] { Hear(); });
    } catch (const EThread&) {  // it looks by itself, then
    }
  ::close(std::exchange(FMessages, -1));
}

// Whoever sent it, a message is no more than a reason to look. So is one that was lost.
void TPowerSupply::Hear() {
  char Buffer[8192];
  bool Looks = false;
  for (;;) {
    const ssize_t Count = ::recv(FMessages, Buffer, sizeof Buffer, 0);
    if (Count < 0 && errno == EINTR) continue;
    if (Count < 0 && errno != ENOBUFS) break;
    const std::string_view Text(Buffer, Count < 0 ? 0 : static_cast<std::size_t>(Count));
    Looks = Looks || Count < 0 || Text.find("SUBSYSTEM=power_supply") != Text.npos;
  }
  if (Looks) Look();
}

void TPowerSupply::Look() {
  std::string Now = State();
  if (Now == FState) return;
  FState = std::move(Now);
  FChanged();
}

std::string TPowerSupply::State() const {
  namespace fs = std::filesystem;
  std::set<std::string> Supplies;
  std::error_code Failure;
  for (fs::directory_iterator Each(FFolder, Failure), End; !Failure && Each != End; Each.increment(Failure))
    Supplies.insert(Each->path().string());
  std::string Result;
  for (const std::string& Supply : Supplies) {
    Result += Supply + '\n';
    for (const char* const Fact : {"/online", "/status", "/capacity"}) Result += ReadSystemFile(Supply + Fact) + '\n';
  }
  return Result;
}

}  // namespace zq
