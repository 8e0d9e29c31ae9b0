#include "runtime/io/files.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include "runtime/io/paths.h"
#include "runtime/platform/disk_service.h"
#include "runtime/text/local_time.h"

namespace zq {

namespace {

constexpr Integer cOnlyOnDemand = faHidden | faSysFile | faDirectory;

TDiskService& Disk() noexcept { return Service<TDiskService>(); }

bool Stat(const UnicodeString& AFileName, TDiskFacts& AResult) {
  return Disk().Stat(ToSystemPath(AFileName).c_str(), true, AResult) == 0;
}

Integer AttributesOf(Cardinal AMode, std::string_view AName) noexcept {
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
  TDiskFacts Facts;
  return Stat(AFileName, Facts) && !S_ISDIR(Facts.Mode);
}

bool DirectoryExists(const UnicodeString& ADirectory) {
  TDiskFacts Facts;
  return Stat(ADirectory, Facts) && S_ISDIR(Facts.Mode);
}

bool DeleteFile(const UnicodeString& AFileName) { return Disk().Unlink(ToSystemPath(AFileName).c_str()) == 0; }

bool RenameFile(const UnicodeString& AOldName, const UnicodeString& ANewName) {
  return Disk().Rename(ToSystemPath(AOldName).c_str(), ToSystemPath(ANewName).c_str()) == 0;
}

bool CreateDir(const UnicodeString& ADirectory) { return Disk().MakeFolder(ToSystemPath(ADirectory).c_str()) == 0; }

bool RemoveDir(const UnicodeString& ADirectory) { return Disk().RemoveFolder(ToSystemPath(ADirectory).c_str()) == 0; }

bool ForceDirectories(const UnicodeString& ADirectory) {
  if (ADirectory.IsEmpty() || DirectoryExists(ADirectory)) return true;
  std::string Path = ToSystemPath(ADirectory);
  // What can't be made may be there; the last step tells.
  for (std::size_t Slash = Path.find('/', 1); Slash != Path.npos; Slash = Path.find('/', Slash + 1)) {
    Path[Slash] = '\0';
    Disk().MakeFolder(Path.c_str());
    Path[Slash] = '/';
  }
  return Disk().MakeFolder(Path.c_str()) == 0 || DirectoryExists(ADirectory);
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
  TDiskFacts Facts;
  if (!Stat(AFileName, Facts)) return -1;
  return AttributesOf(Facts.Mode, ToSystemPath(ExtractFileName(AFileName)));
}

Int64 FileSizeOf(const UnicodeString& AFileName) {
  TDiskFacts Facts;
  return Stat(AFileName, Facts) ? Facts.Size : -1;
}

UnicodeString SysErrorMessage(Integer AErrorCode) { return FromUTF8(std::generic_category().message(AErrorCode)); }

// ---------------------------------------------------------------------------------------------------------- Scans

class TFolderScan {
 public:
  TFolderScan(const UnicodeString& APath, std::u16string_view AMask, Integer AAttr)
      : FPath(ToSystemPath(APath)), FFolder(Disk().OpenFolder((FPath + '.').c_str())), FMask(AMask), FAttr(AAttr) {}
  TFolderScan(const TFolderScan&) = delete;
  TFolderScan& operator=(const TFolderScan&) = delete;
  ~TFolderScan() {
    if (FFolder != nullptr) FDisk.CloseFolder(FFolder);
  }

  [[nodiscard]] bool IsOpen() const noexcept { return FFolder != nullptr; }
  Integer Next(TSearchRec& ARec);

 private:
  TDiskService& FDisk = Disk();
  std::string FPath;  // of the folder, with a separator at the end
  void* FFolder;
  std::u16string FMask;
  Integer FAttr;
};

namespace {

// Facts of an entry; of a link to what is no folder, the facts of that. False, with errno, where there is none.
bool Describe(const std::string& APath, TSearchRec& ARec) {
  TDiskFacts Facts, Target;
  if (Disk().Stat(APath.c_str(), false, Facts) != 0) return false;
  Integer Link = 0;
  if (S_ISLNK(Facts.Mode) && Disk().Stat(APath.c_str(), true, Target) == 0 && !S_ISDIR(Target.Mode)) {
    Facts = Target;
    Link = faSymLink;
  }
  const std::string_view Name = std::string_view(APath).substr(APath.rfind('/') + 1);
  ARec.Name = FromSystemPath(Name);
  ARec.Attr = AttributesOf(Facts.Mode, Name) | Link;
  ARec.Size = S_ISDIR(Facts.Mode) ? 0 : Facts.Size;
  ARec.ModifiedTime = Facts.ModifiedTime;
  ARec.CreatedTime = Facts.CreatedTime != 0 ? Facts.CreatedTime : Facts.ModifiedTime;
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
    const char* const Name = FDisk.ReadFolder(FFolder);
    if (Name == nullptr) return errno != 0 ? errno : cNoMoreFiles;
    if (!FitsMask(FromSystemPath(Name), FMask)) continue;
    if (Describe(FPath + Name, ARec)) {
      if (Wanted(ARec, FAttr)) return 0;
    } else if (errno != ENOENT) {  // one that vanishes meanwhile was never there
      return errno;
    }
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
    if (!Describe(ToSystemPath(AMask), ARec)) return errno;
    return Wanted(ARec, AAttr) ? 0 : cNoMoreFiles;
  }
  auto Scan = std::make_unique<TFolderScan>(ExtractFilePath(AMask), Name, AAttr);
  if (!Scan->IsOpen()) return errno;
  const Integer Result = Scan->Next(ARec);
  if (Result == 0) ARec.Scan = std::move(Scan);
  return Result;
}

Integer FindNext(TSearchRec& ARec) { return ARec.Scan == nullptr ? cNoMoreFiles : ARec.Scan->Next(ARec); }

void FindClose(TSearchRec& ARec) noexcept { ARec.Scan.reset(); }

}  // namespace zq
