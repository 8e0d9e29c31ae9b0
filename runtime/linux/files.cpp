#include "runtime/io/files.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <filesystem>
#include <string_view>

#include "runtime/io/paths.h"
#include "runtime/linux/system_files.h"
#include "runtime/platform/file_service.h"
#include "runtime/text/numbers.h"

namespace zq {

namespace {

// The system grants a write lease on a file only to its sole opener. Whoever opens the file in the moment that it is
// held waits for its end; the signal that goes with that is one that nobody takes notice of.
bool IsSoleOpener(int AHandle) noexcept {
  ::fcntl(AHandle, F_SETSIG, SIGURG);
  return ::fcntl(AHandle, F_SETLEASE, F_WRLCK) == 0 || errno != EAGAIN;
}

class TLinuxFiles final : public TFileService {
 public:
  UnicodeString GetShortPathName(const UnicodeString& AName) override {
    if (FileGetAttr(AName) < 0) return {};
    std::error_code Failure;  // the text stays as it is: ".." may lie behind a link
    const auto Path = std::filesystem::absolute(ToSystemPath(AName), Failure);
    return Failure ? UnicodeString() : FromSystemPath(Path.string());
  }

  UnicodeString GetTempPath() override {
    const UnicodeString Told = FromSystemPath(EnvironmentText("TMPDIR"));
    return IncludeTrailingBackslash(DirectoryExists(Told) ? ExpandFileName(Told) : UnicodeString(u"/tmp"));
  }

  UnicodeString GetTempFileName(const UnicodeString& APath, const UnicodeString& APrefix, Cardinal AUnique) override {
    return IncludeTrailingBackslash(APath) + APrefix + IntToHex(AUnique & 0xFFFFU, 4) + u".tmp";
  }

  bool OpensExclusively(const UnicodeString& AName) override {
    const int Handle = ::open(ToSystemPath(AName).c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC);
    if (Handle < 0) return false;
    const bool Locked = ::flock(Handle, LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK;
    const bool Result = !Locked && IsSoleOpener(Handle);
    ::close(Handle);
    return Result;
  }

  UnicodeString SearchPath(const UnicodeString& AName) override {
    if (!AName.IsEmpty() && IsPathSeparator(AName[1])) return {};
    const std::string Folders = ToSystemPath(ExtractFileDir(ParamStr(0))) + ':' + EnvironmentText("PATH");
    for (std::string_view Rest = Folders; !Rest.empty();) {
      const std::string_view Folder = Rest.substr(0, Rest.find(':'));
      UnicodeString Name = FromSystemPath(Folder) + u'/' + AName;
      if (!Folder.empty() && FileExists(Name)) return Name;
      Rest.remove_prefix(std::min(Folder.size() + 1, Rest.size()));
    }
    return {};
  }
};

constinit TLinuxFiles LinuxFiles;

}  // namespace

constinit TServiceSlot<TFileService> TFileService::Slot(LinuxFiles);

}  // namespace zq
