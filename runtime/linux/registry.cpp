#include <algorithm>
#include <memory>
#include <string>
#include <string_view>

#include "runtime/linux/system_files.h"
#include "runtime/platform/registry_service.h"

namespace zq {

namespace {

// The first type that the shared MIME database gives for "*.ext"; its lines are "weight:type:pattern[:flags]", heaviest
// first.
std::string TypeFromPatterns(const std::string& APath, std::string_view AExtension) {
  const std::string Content = ReadSystemFile(APath);
  for (std::string_view Rest = Content; !Rest.empty();) {
    std::string_view Line = TakeLine(Rest);
    const std::size_t Type = Line.find(':') + 1;
    const std::size_t Pattern = Line.find(':', Type);
    if (Type == 0 || Pattern == Line.npos) continue;
    std::string_view Glob = Line.substr(Pattern + 1);
    Glob = Glob.substr(0, Glob.find(':'));
    if (Glob.starts_with('*') && Glob.substr(1) == AExtension) return std::string(Line.substr(Type, Pattern - Type));
  }
  return {};
}

// Lines of mime.types are "type ext ext ...", separated by blanks and tabs.
std::string TypeFromList(const std::string& APath, std::string_view AExtension) {
  constexpr std::string_view Blanks = " \t";
  const std::string Content = ReadSystemFile(APath);
  for (std::string_view Rest = Content; !Rest.empty();) {
    const std::string_view Line = TakeLine(Rest);
    if (Line.starts_with('#')) continue;
    const std::size_t TypeEnd = Line.find_first_of(Blanks);
    for (std::size_t Start = Line.find_first_not_of(Blanks, TypeEnd); Start < Line.size();) {
      const std::size_t End = std::min(Line.find_first_of(Blanks, Start), Line.size());
      if (Line.substr(Start, End - Start) == AExtension) return std::string(Line.substr(0, TypeEnd));
      Start = Line.find_first_not_of(Blanks, End);
    }
  }
  return {};
}

std::string ContentType(std::string_view AExtension) {
  std::string Folders = EnvironmentText("XDG_DATA_DIRS");
  if (Folders.empty()) Folders = "/usr/local/share:/usr/share";
  Folders = XdgFolder("XDG_DATA_HOME", ".local/share") + ':' + Folders;
  for (std::string_view Rest = Folders; !Rest.empty();) {
    const std::string_view Folder = Rest.substr(0, Rest.find(':'));
    if (auto Found = TypeFromPatterns(std::string(Folder) + "/mime/globs2", AExtension); !Found.empty()) return Found;
    Rest.remove_prefix(std::min(Folder.size() + 1, Rest.size()));
  }
  return TypeFromList("/etc/mime.types", AExtension.substr(1));
}

bool IsRoot(HKEY AKey) noexcept { return AKey >= HKEY_CLASSES_ROOT && AKey <= HKEY_USERS; }

// The open key of a file type; its handle is its address.
struct TFileTypeKey {
  UnicodeString ContentType;
};

class TLinuxRegistry final : public TRegistryService {
 public:
  Integer RegOpenKeyEx(HKEY AKey, const UnicodeString& ASubKey, Cardinal, HKEY& AResult) override {
    if (IsRoot(AKey) && ASubKey.IsEmpty()) {
      AResult = AKey;
      return ERROR_SUCCESS;
    }
    if (AKey != HKEY_CLASSES_ROOT || ASubKey.Length() < 2 || ASubKey[1] != u'.') return ERROR_FILE_NOT_FOUND;
    const std::string Type = ContentType(LowerCase(ASubKey).ToUTF8());
    if (Type.empty()) return ERROR_FILE_NOT_FOUND;
    AResult = reinterpret_cast<HKEY>(new TFileTypeKey{FromUTF8(Type)});
    return ERROR_SUCCESS;
  }

  Integer RegCreateKeyEx(HKEY AKey, const UnicodeString& ASubKey, Cardinal AAccess, HKEY& AResult) override {
    return RegOpenKeyEx(AKey, ASubKey, AAccess, AResult) == ERROR_SUCCESS ? ERROR_SUCCESS : ERROR_ACCESS_DENIED;
  }

  Integer RegQueryValueEx(HKEY AKey, const UnicodeString& AName, Cardinal& AType, TBytes& AData) override {
    if (IsRoot(AKey) || !SameText(AName, u"Content Type")) return ERROR_FILE_NOT_FOUND;
    const UnicodeString& Value = reinterpret_cast<const TFileTypeKey*>(AKey)->ContentType;
    const auto* const Bytes = reinterpret_cast<const Byte*>(Value.c_str());
    AType = REG_SZ;
    AData.assign(Bytes, Bytes + (Value.size() + 1) * sizeof(Char));
    return ERROR_SUCCESS;
  }

  Integer RegSetValueEx(HKEY, const UnicodeString&, Cardinal, const TBytes&) override { return ERROR_ACCESS_DENIED; }

  void RegCloseKey(HKEY AKey) override {
    if (!IsRoot(AKey)) delete reinterpret_cast<TFileTypeKey*>(AKey);
  }
};

constinit TLinuxRegistry LinuxRegistry;

}  // namespace

constinit TServiceSlot<TRegistryService> TRegistryService::Slot(LinuxRegistry);

}  // namespace zq
