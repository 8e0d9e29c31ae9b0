#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <limits>

#include "runtime/platform/disk_service.h"

namespace zq {

namespace {

Int64 Microseconds(const statx_timestamp& AStamp) noexcept { return AStamp.tv_sec * 1000000LL + AStamp.tv_nsec / 1000; }

// The same file on a descriptor above the standard ones: a host that closed its standard error must not find its
// messages in what was opened next.
int AboveStandard(int AHandle) noexcept {
  if (AHandle < 0 || AHandle > STDERR_FILENO) return AHandle;
  const int Result = ::fcntl(AHandle, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
  const int Reason = errno;
  ::close(AHandle);
  errno = Reason;
  return Result;
}

class TLinuxDisk final : public TDiskService {
 public:
  int Open(const char* APath, int AFlags, Cardinal AMode) override {
    int Result = -1;
    do Result = ::open(APath, AFlags | O_CLOEXEC, AMode);
    while (Result < 0 && errno == EINTR);
    return AboveStandard(Result);
  }
  Int64 Write(int AHandle, const void* AData, std::size_t ACount) override { return ::write(AHandle, AData, ACount); }
  int Close(int AHandle) override { return ::close(AHandle); }

  // Beyond the bytes of any file, and of another kind than the locks of share modes.
  bool Claim(int AHandle) override {
    struct flock Range {};
    Range.l_type = F_WRLCK;
    Range.l_whence = SEEK_SET;
    Range.l_start = std::numeric_limits<off_t>::max() - 1;
    Range.l_len = 1;
    return ::fcntl(AHandle, F_OFD_SETLK, &Range) == 0 || (errno != EAGAIN && errno != EACCES);
  }

  Int64 ReadTail(const char* APath, void* AData, std::size_t ACount) override {
    const int Handle = ::open(APath, O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (Handle < 0) return -1;
    const off_t Size = ::lseek(Handle, 0, SEEK_END);
    const off_t From = std::max<off_t>(Size - static_cast<off_t>(ACount), 0);
    const Int64 Result = Size < 0 ? -1 : ::pread(Handle, AData, ACount, From);
    const int Reason = errno;
    ::close(Handle);
    errno = Reason;
    return Result;
  }

  int Rename(const char* AOld, const char* ANew) override {
    if (::renameat2(AT_FDCWD, AOld, AT_FDCWD, ANew, RENAME_NOREPLACE) == 0) return 0;
    if (errno != EINVAL && errno != ENOSYS) return -1;
    // This file system can't do it in one step.
    struct stat Facts {};
    if (::lstat(ANew, &Facts) != 0) return ::rename(AOld, ANew);
    errno = EEXIST;
    return -1;
  }
  int Unlink(const char* APath) override { return ::unlink(APath); }
  int MakeFolder(const char* APath) override { return ::mkdir(APath, 0777); }
  int RemoveFolder(const char* APath) override { return ::rmdir(APath); }

  int Stat(const char* APath, bool AFollow, TDiskFacts& AFacts) override {
    struct statx Facts {};
    const int Flags = AFollow ? 0 : AT_SYMLINK_NOFOLLOW;
    if (::statx(AT_FDCWD, APath, Flags, STATX_BASIC_STATS | STATX_BTIME, &Facts) != 0) return -1;
    AFacts.Mode = Facts.stx_mode;
    AFacts.Size = static_cast<Int64>(Facts.stx_size);
    AFacts.CreatedTime = (Facts.stx_mask & STATX_BTIME) != 0 ? Microseconds(Facts.stx_btime) : 0;
    AFacts.ModifiedTime = Microseconds(Facts.stx_mtime);
    return 0;
  }

  void* OpenFolder(const char* APath) override { return ::opendir(APath); }
  const char* ReadFolder(void* AFolder) override {
    errno = 0;
    const dirent* const Entry = ::readdir(static_cast<DIR*>(AFolder));
    return Entry == nullptr ? nullptr : Entry->d_name;
  }
  void CloseFolder(void* AFolder) override { ::closedir(static_cast<DIR*>(AFolder)); }
};

constinit TLinuxDisk LinuxDisk;

}  // namespace

constinit TServiceSlot<TDiskService> TDiskService::Slot(LinuxDisk);

}  // namespace zq
