#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <filesystem>
#include <iterator>
#include <string>
#include <string_view>
#include <utility>

#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/io/text_file.h"
#include "runtime/linux/system_files.h"
#include "runtime/platform/shell_service.h"
#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"

namespace zq {

namespace {

// Bytes of a path as the path of a URL.
std::string PercentEncoded(std::string_view APath) {
  constexpr std::string_view Plain = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-._~/";
  constexpr char Digits[] = "0123456789ABCDEF";
  std::string Result;
  for (const char Char : APath) {
    const auto Value = static_cast<unsigned char>(Char);
    if (Plain.find(Char) != Plain.npos) Result += Char;
    else ((Result += '%') += Digits[Value >> 4U]) += Digits[Value & 15U];
  }
  return Result;
}

std::string PercentDecoded(std::string_view AText) {
  std::string Result;
  for (std::size_t i = 0; i < AText.size(); ++i) {
    unsigned char Value = 0;
    const char* const Digits = AText.data() + i + 1;
    const bool Coded =
        AText[i] == '%' && i + 2 < AText.size() && std::from_chars(Digits, Digits + 2, Value, 16).ptr == Digits + 2;
    Result += Coded ? static_cast<char>(Value) : AText[i];
    if (Coded) i += 2;
  }
  return Result;
}

// -------------------------------------------------------------------------------------------------- Shell folders

struct TShellFolder {
  Integer Csidl;
  const char* Variable;  // null: the home folder itself
  const char* Usual;     // below the home folder
  const char* Below;
};

// No folder of all users is writable for each of them: those are the user's own here.
constexpr TShellFolder cShellFolders[] = {
    {0, "XDG_DESKTOP_DIR", "Desktop", ""},
    {2, "XDG_DATA_HOME", ".local/share", "/applications"},
    {CSIDL_PERSONAL, "XDG_DOCUMENTS_DIR", "Documents", ""},
    {7, "XDG_CONFIG_HOME", ".config", "/autostart"},
    {13, "XDG_MUSIC_DIR", "Music", ""},
    {14, "XDG_VIDEOS_DIR", "Videos", ""},
    {16, "XDG_DESKTOP_DIR", "Desktop", ""},
    {20, "XDG_DATA_HOME", ".local/share", "/fonts"},
    {21, "XDG_TEMPLATES_DIR", "Templates", ""},
    {26, "XDG_CONFIG_HOME", ".config", ""},
    {28, "XDG_DATA_HOME", ".local/share", ""},
    {32, "XDG_CACHE_HOME", ".cache", ""},
    {35, "XDG_DATA_HOME", ".local/share", ""},
    {39, "XDG_PICTURES_DIR", "Pictures", ""},
    {40, nullptr, "", ""},
    {CSIDL_COMMON_DOCUMENTS, "XDG_DATA_HOME", ".local/share", ""},
};

// What the user has set in user-dirs.dirs; empty if nothing.
std::string UserFolder(std::string_view AVariable) {
  constexpr std::string_view Home = "$HOME";
  std::string Value =
      ShellAssignment(XdgFolder("XDG_CONFIG_HOME", ".config") + "/user-dirs.dirs", AVariable).value_or("");
  if (Value.starts_with(Home)) Value.replace(0, Home.size(), HomeFolder());
  while (Value.size() > 1 && Value.ends_with('/')) Value.pop_back();
  return Value.starts_with('/') ? Value : std::string();
}

// Its place is the user's to choose, and so is whether it exists.
bool IsUsersOwn(const TShellFolder& AFolder) {
  return AFolder.Variable == nullptr || std::string_view(AFolder.Variable).ends_with("_DIR");
}

UnicodeString PathOf(const TShellFolder& AFolder) {
  if (AFolder.Variable == nullptr) return FromSystemPath(HomeFolder());
  std::string Path;
  if (IsUsersOwn(AFolder) && EnvironmentText(AFolder.Variable).empty()) Path = UserFolder(AFolder.Variable);
  if (Path.empty()) Path = XdgFolder(AFolder.Variable, AFolder.Usual);
  return FromSystemPath(Path + AFolder.Below);
}

const TShellFolder* FindShellFolder(Integer ACsidl) noexcept {
  const auto* const Found = std::ranges::find(cShellFolders, ACsidl, &TShellFolder::Csidl);
  return Found == std::end(cShellFolders) ? nullptr : Found;
}

// ----------------------------------------------------------------------------------------------------------- Trash

// By the freedesktop rules for the trash. The path is recorded as ARecorded: absolute in the user's own trash, below
// the mount's top in that one's. False with errno.
bool MoveIntoTrash(const std::string& ATrash, const std::string& APath, const std::string& ARecorded) {
  std::error_code Ignored;
  for (const char* const Part : {"/files", "/info"}) std::filesystem::create_directories(ATrash + Part, Ignored);
  std::filesystem::permissions(ATrash, std::filesystem::perms::owner_all, Ignored);
  const TDateTime Moment = Now();
  const std::string Info = "[Trash Info]\nPath=" + PercentEncoded(ARecorded) +
                           "\nDeletionDate=" + FormatDateTime(u"yyyy-mm-dd\"T\"hh:mm:ss", Moment).ToUTF8() + '\n';
  const std::string Name = APath.substr(APath.rfind('/') + 1);
  for (int Number = 1; Number < 10000; ++Number) {
    const std::string Unique = Number == 1 ? Name : std::string(Name).append(".").append(std::to_string(Number));
    const std::string InfoFile = std::string(ATrash).append("/info/").append(Unique).append(".trashinfo");
    const int Handle = ::open(InfoFile.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
    if (Handle < 0 && errno == EEXIST) continue;
    if (Handle < 0) return false;
    const bool Written = ::write(Handle, Info.data(), Info.size()) == static_cast<ssize_t>(Info.size());
    const bool Done =
        ::close(Handle) == 0 && Written &&
        RenameFile(FromSystemPath(APath), FromSystemPath(std::string(ATrash).append("/files/").append(Unique)));
    if (Done) return true;
    const int Reason = errno;
    ::unlink(InfoFile.c_str());
    errno = Reason;
    if (Reason != EEXIST) return false;
  }
  return false;
}

// The folder that the file system of APath is mounted on.
std::string MountTop(const std::string& APath) {
  struct stat Facts {};
  if (::lstat(APath.c_str(), &Facts) != 0) return {};
  std::string Result = APath;
  for (std::string Parent = Result; Result != "/";) {
    Parent = Parent.substr(0, Parent.rfind('/'));
    struct stat Above {};
    if (::stat(Parent.empty() ? "/" : Parent.c_str(), &Above) != 0 || Above.st_dev != Facts.st_dev) break;
    Result = Parent.empty() ? "/" : Parent;
  }
  return Result;
}

bool MoveToTrash(const std::string& APath) {
  if (MoveIntoTrash(XdgFolder("XDG_DATA_HOME", ".local/share") + "/Trash", APath, APath)) return true;
  if (errno != EXDEV) return false;
  const std::string Top = MountTop(APath);
  if (Top.size() <= 1) return false;
  // Where others may write, a link of that name would lead our files to wherever they want.
  const std::string Trash = Top + "/.Trash-" + std::to_string(::getuid());
  struct stat Facts {};
  ::mkdir(Trash.c_str(), 0700);
  if (::lstat(Trash.c_str(), &Facts) != 0 || !S_ISDIR(Facts.st_mode) || Facts.st_uid != ::getuid()) return false;
  return MoveIntoTrash(Trash, APath, APath.substr(Top.size() + 1));
}

// The path is taken as the system takes it: a ".." behind a link leads elsewhere than its text says.
Integer DeleteTree(std::string APath, bool AUndo) {
  while (APath.ends_with('/')) APath.pop_back();
  if (APath.empty()) return ENOENT;
  std::error_code Failure;
  const auto Kind = std::filesystem::symlink_status(APath, Failure).type();
  if (Kind == std::filesystem::file_type::not_found) return ENOENT;
  const std::filesystem::path Full = std::filesystem::absolute(APath, Failure);
  if (Full.filename() == "." || Full.filename() == "..") return EINVAL;
  if (AUndo) return MoveToTrash(Full.string()) ? 0 : errno;
  std::filesystem::remove_all(Full, Failure);
  return Failure.value();
}

// ------------------------------------------------------------------------------------------------ Desktop entries

// A value of the type string.
std::string EscapedValue(std::string_view AText) {
  std::string Result;
  for (const char Char : AText) switch (Char) {
      case '\\': Result += "\\\\"; break;
      case '\n': Result += "\\n"; break;
      case '\r': Result += "\\r"; break;
      case '\t': Result += "\\t"; break;
      default: Result += Char;
    }
  return Result;
}

std::string UnescapedValue(std::string_view AText) {
  std::string Result;
  for (std::size_t i = 0; i < AText.size(); ++i) {
    if (AText[i] != '\\' || i + 1 == AText.size()) {
      Result += AText[i];
      continue;
    }
    constexpr std::string_view Codes = "snrt";
    const std::size_t Code = Codes.find(AText[++i]);
    Result += Code == Codes.npos ? AText[i] : " \n\r\t"[Code];
  }
  return Result;
}

// The program of an Exec line, in quotes.
std::string QuotedProgram(std::string_view APath) {
  std::string Result = "\"";
  for (const char Char : APath) {
    if (std::string_view("\"`$\\").find(Char) != std::string_view::npos) Result += '\\';
    Result += Char;
    if (Char == '%') Result += Char;
  }
  return Result + '"';
}

std::string ProgramOf(std::string_view AExec) {
  std::string Result;
  const bool Quoted = AExec.starts_with('"');
  for (std::size_t i = Quoted ? 1 : 0; i < AExec.size() && AExec[i] != (Quoted ? '"' : ' '); ++i) {
    const bool Double = AExec[i] == '\\' || (AExec[i] == '%' && AExec.substr(i).starts_with("%%"));
    if (Double && i + 1 < AExec.size()) ++i;
    Result += AExec[i];
  }
  return Result;
}

std::string_view WithoutBlanks(std::string_view AText) {
  const std::size_t First = std::min(AText.find_first_not_of(" \t\r"), AText.size());
  return AText.substr(First, AText.find_last_not_of(" \t\r") + 1 - First);
}

// The value of AKey in the group "Desktop Entry"; empty if there is none.
std::string EntryValue(std::string_view AContent, std::string_view AKey) {
  bool InGroup = false;
  while (!AContent.empty()) {
    const std::string_view Line = WithoutBlanks(TakeLine(AContent));
    if (Line.starts_with('[')) InGroup = Line == "[Desktop Entry]";
    const std::size_t Equals = Line.find('=');
    if (InGroup && Equals != Line.npos && WithoutBlanks(Line.substr(0, Equals)) == AKey)
      return UnescapedValue(WithoutBlanks(Line.substr(Equals + 1)));
  }
  return {};
}

class TDesktopEntry : public TShellLink {
 public:
  HRESULT SetArguments(const UnicodeString& AArguments) override { return Keep(FArguments, AArguments); }
  HRESULT SetDescription(const UnicodeString& ADescription) override { return Keep(FDescription, ADescription); }
  HRESULT SetPath(const UnicodeString& ATarget) override { return Keep(FTarget, ATarget); }

  HRESULT GetPath(UnicodeString& ATarget) override {
    ATarget = FTarget;
    return FTarget.IsEmpty() ? S_FALSE : S_OK;
  }

  HRESULT Save(const UnicodeString& AFile, bool) override {
    const UnicodeString Target = FileGetAttr(FTarget) < 0 ? FTarget : ExpandFileName(FTarget);
    const std::string Path = ToSystemPath(Target);
    const bool Program = !FArguments.IsEmpty() || (FileExists(Target) && ::access(Path.c_str(), X_OK) == 0);
    const std::string Name = ChangeFileExt(ExtractFileName(AFile), u"").ToUTF8();
    const std::string Content = "[Desktop Entry]\nType=" + std::string(Program ? "Application" : "Link") +
                                "\nName=" + EscapedValue(Name) + "\nComment=" + EscapedValue(FDescription.ToUTF8()) +
                                '\n' + (Program ? ExecLine(Path) : UrlLine(Target)) + '\n';
    try {
      TTextFile File;
      File.Assign(AFile);
      File.Rewrite();
      File.WriteBytes(Content);
      File.Close();
    } catch (const EInOutError&) {
      return E_FAIL;
    }
    // Desktops start only entries that may be executed.
    return !Program || ::chmod(ToSystemPath(AFile).c_str(), 0755) == 0 ? S_OK : E_FAIL;
  }

  HRESULT Load(const UnicodeString& AFile, Cardinal) override {
    const std::string Content = ReadSystemFile(ToSystemPath(AFile));
    const std::string Url = EntryValue(Content, "URL");
    FDescription = FromUTF8(EntryValue(Content, "Comment"));
    if (EntryValue(Content, "Type") == "Application") FTarget = FromSystemPath(ProgramOf(EntryValue(Content, "Exec")));
    else FTarget = TargetOf(Url);
    return FTarget.IsEmpty() ? E_FAIL : S_OK;
  }

 private:
  // A file's URL may name this computer before the path.
  static UnicodeString TargetOf(std::string_view AUrl) {
    constexpr std::string_view FileUrl = "file://";
    if (!AUrl.starts_with(FileUrl)) return FromUTF8(AUrl);
    const std::size_t Path = AUrl.find('/', FileUrl.size());
    return FromSystemPath(PercentDecoded(AUrl.substr(std::min(Path, AUrl.size()))));
  }
  static HRESULT Keep(UnicodeString& AField, const UnicodeString& AValue) {
    AField = AValue;
    return S_OK;
  }
  [[nodiscard]] std::string ExecLine(const std::string& APath) const {
    const UnicodeString Arguments = StringReplace(FArguments, u"%", u"%%", {rfReplaceAll});
    return "Exec=" + EscapedValue(QuotedProgram(APath) + (Arguments.IsEmpty() ? "" : " " + Arguments.ToUTF8()));
  }
  [[nodiscard]] static std::string UrlLine(const UnicodeString& ATarget) {
    if (ATarget.Pos(u"://") > 0) return "URL=" + EscapedValue(ATarget.ToUTF8());
    return "URL=file://" + PercentEncoded(ToSystemPath(ExpandFileName(ATarget)));
  }

  UnicodeString FTarget;
  UnicodeString FArguments;
  UnicodeString FDescription;
};

class TLinuxShell final : public TShellService {
 public:
  bool SHGetSpecialFolderPath(Integer ACsidl, bool ACreate, UnicodeString& APath) override {
    const TShellFolder* const Folder = FindShellFolder(ACsidl);
    if (Folder == nullptr) return false;
    const UnicodeString Path = PathOf(*Folder);
    if (ACreate && !IsUsersOwn(*Folder) && !ForceDirectories(Path)) return false;
    APath = Path;
    return true;
  }

  bool SHGetMalloc() override { return true; }

  TItemList SHGetSpecialFolderLocation(Integer ACsidl) override {
    const TShellFolder* const Folder = FindShellFolder(ACsidl);
    return Folder == nullptr ? nullptr : new UnicodeString(PathOf(*Folder));
  }

  bool SHGetPathFromIDList(TItemList AList, UnicodeString& APath) override {
    if (AList != nullptr) APath = *static_cast<UnicodeString*>(AList);
    return AList != nullptr;
  }

  void FreeIDList(TItemList AList) override { delete static_cast<UnicodeString*>(AList); }

  Integer SHFileOperation(Cardinal AFunc, const UnicodeString& AFrom, const UnicodeString& ATo, Word AFlags) override {
    if (AFunc == FO_RENAME) return RenameFile(AFrom, ATo) ? 0 : errno;
    if (AFunc != FO_DELETE) return EINVAL;
    return DeleteTree(ToSystemPath(AFrom), (AFlags & FOF_ALLOWUNDO) != 0);
  }

  std::unique_ptr<TShellLink> CreateShellLink() override { return std::make_unique<TDesktopEntry>(); }
};

constinit TLinuxShell LinuxShell;

}  // namespace

constinit TServiceSlot<TShellService> TShellService::Slot(LinuxShell);

}  // namespace zq
