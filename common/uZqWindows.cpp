#include "common/uZqWindows.h"

#include <algorithm>
#include <filesystem>
#include <map>

#include "runtime/com/registry.h"
#include "runtime/core/exceptions.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/platform/environment_service.h"
#include "runtime/platform/file_service.h"
#include "runtime/platform/shell_service.h"
#include "runtime/platform/version_service.h"
#include "runtime/text/datetime.h"
#include "runtime/text/format.h"
#include "runtime/text/local_time.h"

namespace zq {

// ---------------------------------------------------------------------------------------------------- Environment

UnicodeString ZqGetEnvironmentVar(const UnicodeString& AName) {
  const auto Value = Service<TEnvironmentService>().GetEnvironmentVariable(AName);
  if (!Value || Value->IsEmpty()) throw Exception(u"There is no Environment Variable with the name %s", {AName});
  return *Value;
}

namespace {

// AText with each "%NAME%" replaced by the variable's value; unknown names stay as they are.
UnicodeString ExpandEnvironmentStrings(const UnicodeString& AText) {
  TEnvironmentService& Environment = Service<TEnvironmentService>();
  UnicodeString Result;
  std::u16string_view Rest = AText;
  while (!Rest.empty()) {
    const std::size_t End = Rest.front() == u'%' ? Rest.find(u'%', 1) : Rest.npos;
    const auto Value = End == Rest.npos ? std::nullopt : Environment.GetEnvironmentVariable(Rest.substr(1, End - 1));
    // The "%" behind an unknown name may be the first of the next one.
    const std::size_t Taken = Value ? End + 1 : std::min(Rest.find(u'%', 1), Rest.size());
    Result += Value ? Value->View() : Rest.substr(0, Taken);
    Rest.remove_prefix(Taken);
  }
  return Result;
}

}  // namespace

UnicodeString ZqExpandEnvVarsAndStrings(const UnicodeString& AText) {
  // Values that hold "$(" are expanded in turn: those that refer to each other in a circle must come to an end.
  constexpr Integer MaxRounds = 100;  // of one name
  constexpr Int64 MaxGrowth = 0x1000000;
  constexpr TReplaceFlags All{rfReplaceAll, rfIgnoreCase};
  UnicodeString Result = AText;
  std::map<UnicodeString, Integer> Rounds;
  for (Integer Start = Result.Pos(u"$("); Start > 0; Start = Result.Pos(u"$(")) {
    const std::size_t End = Result.View().find(u')', static_cast<std::size_t>(Start));
    const auto Length = End == std::u16string_view::npos ? 0 : static_cast<Integer>(End) + 2 - Start;
    const UnicodeString Part = Result.Copy(Start, Length);
    const UnicodeString Value = ZqGetEnvironmentVar(Part.Copy(3, Length - 3));
    const Int64 Places = (Result.Length() - StringReplace(Result, Part, {}, All).Length()) / Length;
    if (++Rounds[Part] > MaxRounds || Places * Value.Length() > MaxGrowth)
      throw Exception(u"The Environment Variable %s refers to itself", {Part});
    Result = StringReplace(Result, Part, Value, All);
  }
  return Result.Pos(u"%") == 0 ? Result : ExpandEnvironmentStrings(Result);
}

UnicodeString ZqExpandFileName(const UnicodeString& AName) {
  UnicodeString Text = ZqExpandEnvVarsAndStrings(AName);
  const UnicodeString Folder = ExtractFilePath(ParamStr(0));
  if (Text.IsEmpty() || !DirectoryExists(Folder)) return Text;
  return ExpandFileName(IsPathSeparator(Text[1]) ? Text : Folder + Text);
}

// ------------------------------------------------------------------------------------------------------ Path text

namespace {

bool EndsInSeparator(const UnicodeString& APath) { return !APath.IsEmpty() && IsPathSeparator(APath[APath.Length()]); }

// What may stand in no file name, beside the codes below 32.
constexpr std::u16string_view cNoFileNameChars = u"\"*/:<>?\\|";

}  // namespace

UnicodeString ZqIncludeTrailingBackslash(const UnicodeString& ADir) {
  UnicodeString Dir = Trim(ADir);
  if (EndsInSeparator(Dir)) return Dir;
  const bool IsPath = Dir.View().starts_with(u'\\') || Dir.View().find_first_of(u":/") != std::u16string_view::npos;
  return IsPath ? Dir + PathSeparatorOf(Dir) : Dir + u":\\";
}

UnicodeString ZqCheckDirSlash(const UnicodeString& ADir, bool AAddSlash) {
  UnicodeString Dir = Trim(ADir);
  if (Dir.IsEmpty()) return Dir;
  return AAddSlash ? IncludeTrailingBackslash(Dir) : ExcludeTrailingBackslash(Dir);
}

UnicodeString ZqCleanupFileName(const UnicodeString& AName, const TZqSetOfAnsiChar& AExtraChars) {
  UnicodeString Result;
  for (const Char Each : AName)
    if (Each >= 32 && cNoFileNameChars.find(Each) == cNoFileNameChars.npos && !CharInSet(Each, AExtraChars))
      Result += Each;
  return Result;
}

bool ZqIsAliasedFilename(const UnicodeString& AName) {
  if (Trim(AName).IsEmpty()) return false;
  if (AName[1] == u'.') return true;
  return AName[1] != u'/' && AName.View().find_first_of(u"/\\") != std::u16string_view::npos && AName.Pos(u":") == 0;
}

// ----------------------------------------------------------------------------------------------------- File facts

UnicodeString ZqGetShortFileName(const UnicodeString& AName) {
  UnicodeString Result = Service<TFileService>().GetShortPathName(AName);
  if (Result.IsEmpty()) throw Exception(u"Failed to determine the short filename!");
  return Result;
}

bool ZqFileIsReadOnly(const UnicodeString& AName) {
  if (!FileExists(AName)) return false;
  const Integer Attr = FileGetAttr(AName);
  return Attr >= 0 && (Attr & faReadOnly) != 0;
}

bool ZqFileIsInUse(const UnicodeString& AName) {
  return FileExists(AName) && !Service<TFileService>().OpensExclusively(AName);
}

namespace {

// The moment as the local date of a file, cut to its 2 seconds; 0 for one outside of its years.
TDateTime ThroughFileDate(Int64 AUtcMicroseconds) {
  constexpr double First = 29221, Last = 75971;  // the days 1980-01-01 and 2107-12-31
  const TDateTime Moment = TTimeZone::Local().ToLocalTime(UnixMillisecondsToDateTime(AUtcMicroseconds / 1000));
  if (Moment < First || Moment >= Last + 1) return 0;
  return FileDateToDateTime(DateTimeToFileDate(Moment));
}

TDateTime FileMoment(const UnicodeString& AName, Int64 TSearchRec::*AField) {
  TSearchRec Found;
  if (FindFirst(AName, faAnyFile, Found) != 0 || (Found.Attr & faDirectory) != 0 || DirectoryExists(AName)) return 0;
  return ThroughFileDate(Found.*AField);
}

constexpr Int64 cUnixEpochInFileTime = 11644473600000;  // milliseconds
constexpr UInt64 cFileTimeSteps = 10000;                // in a millisecond

}  // namespace

TDateTime ZqGetFileCreated(const UnicodeString& AName) { return FileMoment(AName, &TSearchRec::CreatedTime); }

TDateTime ZqGetFileLastModified(const UnicodeString& AName) { return FileMoment(AName, &TSearchRec::ModifiedTime); }

Integer ZqGetFileSize(const UnicodeString& AName) {
  TSearchRec Found;
  return FindFirst(AName, faAnyFile, Found) == 0 ? static_cast<Integer>(Found.Size & 0xFFFFFFFF) : -1;
}

TDateTime ZqFileTimeToDateTime(const FILETIME& AValue) {
  const UInt64 Steps = UInt64{AValue.dwHighDateTime} << 32U | AValue.dwLowDateTime;
  const Int64 Milliseconds = static_cast<Int64>(Steps / cFileTimeSteps) - cUnixEpochInFileTime;
  return SystemTimeToDateTime(DateTimeToSystemTime(UnixMillisecondsToDateTime(Milliseconds)));
}

FILETIME ZqDateTimeToFileTime(TDateTime AValue) {
  const TDateTime Moment = SystemTimeToDateTime(DateTimeToSystemTime(AValue));
  const Int64 Milliseconds = DateTimeToUnixMilliseconds(Moment) + cUnixEpochInFileTime;
  const UInt64 Steps = Milliseconds < 0 ? 0 : static_cast<UInt64>(Milliseconds) * cFileTimeSteps;
  return {static_cast<Cardinal>(Steps & 0xFFFFFFFFU), static_cast<Cardinal>(Steps >> 32U)};
}

// -------------------------------------------------------------------------------------------------------- Folders

namespace {

// The shell takes lists of paths, each ended by a zero character, the last by two.
UnicodeString ShellList(const UnicodeString& APath) { return APath + std::u16string_view(u"\0\0", 2); }

// The path of a folder by a name of its own: empty for the root, and for one that is called "." or "..".
UnicodeString NamedFolder(UnicodeString APath) {
  while (EndsInSeparator(APath)) APath.SetLength(APath.Length() - 1);
  const UnicodeString Name = ExtractFileName(APath);
  return Name == u"." || Name == u".." ? UnicodeString() : APath;
}

bool RemoveByHand(const UnicodeString& ADir) {
  std::error_code Ignored;
  if (std::filesystem::is_symlink(ToSystemPath(ADir), Ignored)) return DeleteFile(ADir);
  TSearchRec Found;
  bool Going = true;
  for (Integer Code = FindFirst(ADir + u"/*.*", faAnyFile, Found); Code == 0 && Going; Code = FindNext(Found)) {
    const UnicodeString Path = ADir + u'/' + Found.Name;
    if ((Found.Attr & faDirectory) == 0) DeleteFile(Path);
    else if (Found.Name != u"." && Found.Name != u"..") Going = RemoveByHand(Path);
  }
  FindClose(Found);
  return RemoveDir(ADir);
}

}  // namespace

bool ZqRenameFolder(const UnicodeString& AOld, const UnicodeString& ANew) {
  return Service<TShellService>().SHFileOperation(FO_RENAME, ShellList(Trim(AOld)), ShellList(Trim(ANew)),
             FOF_NOCONFIRMATION | FOF_NOCONFIRMMKDIR | FOF_NOERRORUI) == 0;
}

bool ZqRemoveDir(const UnicodeString& ADir, bool AUseRecycleBin) {
  const UnicodeString Dir = ZqCheckDirSlash(ADir, false);
  const UnicodeString Named = NamedFolder(Dir);
  if (Named.IsEmpty()) return false;
  Word Flags = FOF_SILENT | FOF_NOCONFIRMATION | FOF_NOERRORUI;
  if (AUseRecycleBin) Flags |= FOF_ALLOWUNDO;
  return Service<TShellService>().SHFileOperation(FO_DELETE, ShellList(Dir), {}, Flags) == 0 || RemoveByHand(Named);
}

UnicodeString ZqGetTempDirectory() {
  UnicodeString Result = Service<TFileService>().GetTempPath();
  if (Result.IsEmpty() || Result.Length() > 260) throw Exception(u"Can't determine name temp directory");
  return Result;
}

UnicodeString ZqCreateTempDirectory() {
  const UnicodeString Folder = ZqGetTempDirectory();
  for (Cardinal Number = 1; Number <= 65534; ++Number) {
    UnicodeString Name = Service<TFileService>().GetTempFileName(Folder, u"Ast", Number);
    if (!Name.IsEmpty() && CreateDir(Name)) return Name;
  }
  throw Exception(u"Failed to create a temporary directory!");
}

// ------------------------------------------------------------------------------------------------------ Shortcuts

void ZqCreateShortcut(const UnicodeString& ATarget, const UnicodeString& ALinkFile, const UnicodeString& ADescription,
    const UnicodeString& AArguments) {
  const auto Link = Service<TShellService>().CreateShellLink();
  Link->SetArguments(AArguments);
  Link->SetDescription(ADescription);
  Link->SetPath(ATarget);
  Link->Save(ALinkFile, false);
}

UnicodeString ZqGetTargetFromShortcut(const UnicodeString& ALinkFile) {
  const auto Link = Service<TShellService>().CreateShellLink();
  UnicodeString Result;
  Link->Load(ALinkFile, STGM_SHARE_DENY_NONE);
  Link->GetPath(Result);
  return Result;
}

// ------------------------------------------------------------------------------------ System version, shell folders

namespace {

constexpr Byte cWorkstation = 1;

Word VersionFive(const TOSVersionInfo& AInfo) {
  if (AInfo.MinorVersion == 0) return 500;
  if (AInfo.MinorVersion == 1)
    return AInfo.ServicePackMajor > 2 ? 517 : static_cast<Word>(511 + 2 * AInfo.ServicePackMajor);
  if (!Service<TVersionService>().KernelExports(u"GetLargePageMinimum")) return 521;
  return Service<TVersionService>().GetSystemMetrics(SM_SERVERR2) != 0 ? 523 : 520;
}

bool RegistrySaysSixThree() {
  TRegistry Registry(KEY_READ);
  Registry.SetRootKey(HKEY_LOCAL_MACHINE);
  return Registry.OpenKey(u"SOFTWARE\\Microsoft\\Windows NT\\CurrentVersion", false) &&
         Registry.ReadString(u"CurrentVersion") == u"6.3";
}

Word VersionByNumber(const TOSVersionInfo& AInfo) {
  const bool Workstation = AInfo.ProductType == cWorkstation;
  if (AInfo.MajorVersion == 5) return VersionFive(AInfo);
  if (AInfo.MajorVersion == 6 && AInfo.MinorVersion == 0) return Workstation ? 601 : 602;
  if (AInfo.MajorVersion == 6 && AInfo.MinorVersion == 1) return Workstation ? 611 : 610;
  if (!Workstation) return 620;
  return AInfo.MajorVersion == 6 && RegistrySaysSixThree() ? 630 : 621;
}

// Systems that don't tell their version differ in what their kernel exports.
Word VersionByExports() {
  static constexpr struct {
    const char16_t* Name;
    Word Version;
  } Probes[] = {{u"OpenThread", 11}, {u"GetThreadPriorityBoost", 16}, {u"IsDebuggerPresent", 7},
      {u"GetDiskFreeSpaceEx", 5}, {u"ConnectNamedPipe", 14}, {u"Beep", 3}};
  for (const auto& Probe : Probes)
    if (Service<TVersionService>().KernelExports(Probe.Name)) return Probe.Version;
  throw Exception(u"Failed to determine the version of the OS!");
}

}  // namespace

Word ZqGetWindowsVersion() {
  TVersionService& Version = Service<TVersionService>();
  if (!Version.HasKernel()) throw Exception(u"Failed to load Kernel32.dll!");
  TOSVersionInfo Info;
  const bool Known = Version.KernelExports(u"GetVersionExA") && Version.GetVersionEx(Info);
  return Known ? VersionByNumber(Info) : VersionByExports();
}

UnicodeString ZqGetShellFolder(Integer ACsidl) {
  TShellService& Shell = Service<TShellService>();
  UnicodeString Path;
  if (Shell.SHGetSpecialFolderPath(ACsidl, true, Path)) return Path;
  if (!Shell.SHGetMalloc()) return {};
  TItemList List = Shell.SHGetSpecialFolderLocation(ACsidl);
  const bool Found = Shell.SHGetPathFromIDList(List, Path);
  if (List != nullptr) Shell.FreeIDList(List);
  if (!Found) throw Exception(u"Invalid pidl");
  return Path;
}

UnicodeString ZqGetMyDocumentsFolder() { return ZqGetShellFolder(CSIDL_PERSONAL); }

}  // namespace zq
