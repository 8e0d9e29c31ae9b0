#include "runtime/io/files.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include "runtime/io/paths.h"
#include "runtime/text/local_time.h"

namespace zq {

namespace {

constexpr Integer cNoMoreFiles = 18;
constexpr Integer cOnlyOnDemand = faHidden | faSysFile | faDirectory;

bool Stat(const UnicodeString& AFileName, struct stat& AResult) {
  return ::stat(ToSystemPath(AFileName).c_str(), &AResult) == 0;
}

Integer AttributesOf(mode_t AMode, std::string_view AName) noexcept {
  Integer Result = S_ISDIR(AMode) ? faDirectory : S_ISREG(AMode) ? faArchive : S_ISLNK(AMode) ? faSymLink : faSysFile;
  if ((AMode & 0222U) == 0) Result |= faReadOnly;
  if (AName.starts_with('.') && AName != "." && AName != "..") Result |= faHidden;
  return Result;
}

// The text of a normal absolute path: no ".", no "..", one "/" between folders.
std::u16string Normalize(std::u16string_view APath) {
  std::vector<std::u16string_view> Folders;
  for (std::size_t Start = 0; Start <= APath.size();) {
    const std::size_t End = std::min(APath.find_first_of(u"/\\", Start), APath.size());
    const auto Folder = APath.substr(Start, End - Start);
    if (Folder == u"..") {
      if (!Folders.empty()) Folders.pop_back();
    } else if (!Folder.empty() && Folder != u".") {
      Folders.push_back(Folder);
    }
    Start = End + 1;
  }
  std::u16string Result;
  for (const auto Folder : Folders) (Result += u'/') += Folder;
  return Result;
}

}  // namespace

// --------------------------------------------------------------------------------------------- Files and folders

bool FileExists(const UnicodeString& AFileName) {
  struct stat Facts {};
  return Stat(AFileName, Facts) && !S_ISDIR(Facts.st_mode);
}

bool DirectoryExists(const UnicodeString& ADirectory) {
  struct stat Facts {};
  return Stat(ADirectory, Facts) && S_ISDIR(Facts.st_mode);
}

bool DeleteFile(const UnicodeString& AFileName) { return ::unlink(ToSystemPath(AFileName).c_str()) == 0; }

bool RenameFile(const UnicodeString& AOldName, const UnicodeString& ANewName) {
  const std::string Old = ToSystemPath(AOldName);
  const std::string New = ToSystemPath(ANewName);
  if (::renameat2(AT_FDCWD, Old.c_str(), AT_FDCWD, New.c_str(), RENAME_NOREPLACE) == 0) return true;
  if (errno != EINVAL && errno != ENOSYS) return false;
  // This file system can't do it in one step.
  struct stat Facts {};
  if (::lstat(New.c_str(), &Facts) == 0) {
    errno = EEXIST;
    return false;
  }
  return ::rename(Old.c_str(), New.c_str()) == 0;
}

bool CreateDir(const UnicodeString& ADirectory) { return ::mkdir(ToSystemPath(ADirectory).c_str(), 0777) == 0; }

bool RemoveDir(const UnicodeString& ADirectory) { return ::rmdir(ToSystemPath(ADirectory).c_str()) == 0; }

bool ForceDirectories(const UnicodeString& ADirectory) {
  if (ADirectory.IsEmpty() || DirectoryExists(ADirectory)) return true;
  std::string Path = ToSystemPath(ADirectory);
  // What can't be made may be there; the last step tells.
  for (std::size_t Slash = Path.find('/', 1); Slash != Path.npos; Slash = Path.find('/', Slash + 1)) {
    Path[Slash] = '\0';
    ::mkdir(Path.c_str(), 0777);
    Path[Slash] = '/';
  }
  return ::mkdir(Path.c_str(), 0777) == 0 || DirectoryExists(ADirectory);
}

UnicodeString ExpandFileName(const UnicodeString& AFileName) {
  if (AFileName.IsEmpty()) return {};
  const bool Absolute = IsPathSeparator(AFileName[1]);
  const UnicodeString Current = Absolute ? UnicodeString() : GetCurrentDir();
  if (!Absolute && Current.IsEmpty()) return AFileName;
  const std::u16string Full = Absolute ? AFileName.Str() : Current.Str() + u'/' + AFileName.Str();
  std::u16string Result = Normalize(Full);
  if (Result.empty() || IsPathSeparator(Full.back())) Result += u'/';
  return UnicodeString(std::move(Result));
}

UnicodeString GetCurrentDir() {
  const std::unique_ptr<char, decltype(&std::free)> Path(::getcwd(nullptr, 0), &std::free);
  return Path == nullptr ? UnicodeString() : FromSystemPath(Path.get());
}

bool SetCurrentDir(const UnicodeString& ADirectory) { return ::chdir(ToSystemPath(ADirectory).c_str()) == 0; }

Integer FileGetAttr(const UnicodeString& AFileName) {
  struct stat Facts {};
  if (!Stat(AFileName, Facts)) return -1;
  return AttributesOf(Facts.st_mode, ToSystemPath(ExtractFileName(AFileName)));
}

Int64 FileSizeOf(const UnicodeString& AFileName) {
  struct stat Facts {};
  return Stat(AFileName, Facts) ? Facts.st_size : -1;
}

UnicodeString SysErrorMessage(Integer AErrorCode) { return FromUTF8(std::generic_category().message(AErrorCode)); }

// ---------------------------------------------------------------------------------------------------------- Scans

class TFolderScan {
 public:
  TFolderScan(const std::string& APath, std::u16string_view AMask, Integer AAttr)
      : FFolder(::opendir(APath.c_str())), FMask(AMask), FAttr(AAttr) {}
  TFolderScan(const TFolderScan&) = delete;
  TFolderScan& operator=(const TFolderScan&) = delete;
  ~TFolderScan() {
    if (FFolder != nullptr) ::closedir(FFolder);
  }

  [[nodiscard]] bool IsOpen() const noexcept { return FFolder != nullptr; }
  Integer Next(TSearchRec& ARec);

 private:
  DIR* FFolder;
  std::u16string FMask;
  Integer FAttr;
};

namespace {

Int64 Microseconds(const statx_timestamp& AStamp) noexcept { return AStamp.tv_sec * 1000000LL + AStamp.tv_nsec / 1000; }

// Facts of a folder's entry; of a link to what is no folder, the facts of that. False where it is gone.
bool Describe(int AFolder, const char* AName, TSearchRec& ARec) {
  constexpr unsigned Wanted = STATX_BASIC_STATS | STATX_BTIME;
  struct statx Facts {};
  struct statx Target {};
  if (::statx(AFolder, AName, AT_SYMLINK_NOFOLLOW, Wanted, &Facts) != 0) return false;
  Integer Link = 0;
  if (S_ISLNK(Facts.stx_mode) && ::statx(AFolder, AName, 0, Wanted, &Target) == 0 && !S_ISDIR(Target.stx_mode)) {
    Facts = Target;
    Link = faSymLink;
  }
  const std::string_view Path = AName;
  ARec.Name = FromSystemPath(Path.substr(Path.rfind('/') + 1));
  ARec.Attr = AttributesOf(Facts.stx_mode, Path.substr(Path.rfind('/') + 1)) | Link;
  ARec.Size = S_ISDIR(Facts.stx_mode) ? 0 : static_cast<Int64>(Facts.stx_size);
  ARec.ModifiedTime = Microseconds(Facts.stx_mtime);
  ARec.CreatedTime = (Facts.stx_mask & STATX_BTIME) != 0 ? Microseconds(Facts.stx_btime) : ARec.ModifiedTime;
  return true;
}

bool Wanted(const TSearchRec& ARec, Integer AAttr) noexcept { return (ARec.Attr & cOnlyOnDemand & ~AAttr) == 0; }

bool FitsPlain(std::u16string_view AName, std::u16string_view AMask) noexcept {
  std::size_t Name = 0;
  std::size_t Mask = 0;
  std::size_t Star = AMask.npos;  // the last "*", which may take one character more at each turn back
  std::size_t Taken = 0;
  while (Name < AName.size()) {
    if (Mask < AMask.size() && AMask[Mask] == u'*') {
      Star = Mask++;
      Taken = Name;
    } else if (Mask < AMask.size() && (AMask[Mask] == u'?' || AMask[Mask] == AName[Name])) {
      ++Mask;
      ++Name;
    } else if (Star != AMask.npos) {
      Mask = Star + 1;
      Name = ++Taken;
    } else {
      return false;
    }
  }
  return AMask.find_first_not_of(u'*', Mask) == AMask.npos;
}

}  // namespace

TSearchRec::TSearchRec() noexcept = default;
TSearchRec::TSearchRec(TSearchRec&&) noexcept = default;
TSearchRec& TSearchRec::operator=(TSearchRec&&) noexcept = default;
TSearchRec::~TSearchRec() = default;

TDateTime TSearchRec::TimeStamp() const {
  return TTimeZone::Local().ToLocalTime(UnixMillisecondsToDateTime(ModifiedTime / 1000));
}

Integer TFolderScan::Next(TSearchRec& ARec) {
  for (;;) {
    errno = 0;
    const dirent* const Entry = ::readdir(FFolder);
    if (Entry == nullptr) return errno != 0 ? errno : cNoMoreFiles;
    // An entry that vanishes meanwhile was never there.
    if (FitsMask(FromSystemPath(Entry->d_name), FMask) && Describe(::dirfd(FFolder), Entry->d_name, ARec) &&
        Wanted(ARec, FAttr))
      return 0;
  }
}

bool FitsMask(std::u16string_view AName, std::u16string_view AMask) noexcept {
  return FitsPlain(AName, AMask) || (AMask.ends_with(u".*") && FitsPlain(AName, AMask.substr(0, AMask.size() - 2)));
}

Integer FindFirst(const UnicodeString& AMask, Integer AAttr, TSearchRec& ARec) {
  ARec.Scan.reset();
  const UnicodeString Name = ExtractFileName(AMask);
  if (Name.IsEmpty()) return ENOENT;
  if (Name.View().find_first_of(u"*?") == std::u16string_view::npos) {
    if (!Describe(AT_FDCWD, ToSystemPath(AMask).c_str(), ARec)) return errno;
    return Wanted(ARec, AAttr) ? 0 : cNoMoreFiles;
  }
  auto Scan = std::make_unique<TFolderScan>(ToSystemPath(ExtractFilePath(AMask) + u"."), Name, AAttr);
  if (!Scan->IsOpen()) return errno;
  const Integer Result = Scan->Next(ARec);
  if (Result == 0) ARec.Scan = std::move(Scan);
  return Result;
}

Integer FindNext(TSearchRec& ARec) { return ARec.Scan == nullptr ? cNoMoreFiles : ARec.Scan->Next(ARec); }

void FindClose(TSearchRec& ARec) noexcept { ARec.Scan.reset(); }

}  // namespace zq
