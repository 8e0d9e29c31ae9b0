#include "runtime/io/paths.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

#include "runtime/core/utf8.h"

namespace zq {

namespace {

constexpr std::u16string_view cSeparators = u"/\\";
constexpr char16_t cNamedBackslash = 0xDC00 + '\\';  // a backslash that is part of a name

// Where the name begins: behind the last separator.
std::size_t NameStart(std::u16string_view APath) noexcept { return APath.find_last_of(cSeparators) + 1; }

// Where the extension begins; the length if there is none.
std::size_t ExtStart(std::u16string_view APath) noexcept {
  const std::size_t Found = APath.find_last_of(u"./\\");
  return Found != APath.npos && APath[Found] == u'.' ? Found : APath.size();
}

// A unit of this value behind a high surrogate is half of a character.
std::size_t FindNamedBackslash(std::u16string_view AText) noexcept {
  std::size_t Found = AText.find(cNamedBackslash);
  while (Found != AText.npos && Found > 0 && (AText[Found - 1] & 0xFC00U) == 0xD800U)
    Found = AText.find(cNamedBackslash, Found + 1);
  return Found;
}

UnicodeString ProgramPath() {
  std::error_code Ignored;
  std::string Path = std::filesystem::read_symlink("/proc/self/exe", Ignored).string();
  constexpr std::string_view Replaced = " (deleted)";  // said of a program file replaced while it runs
  if (Path.ends_with(Replaced) && !std::filesystem::exists(Path, Ignored)) Path.resize(Path.size() - Replaced.size());
  return FromSystemPath(Path);
}

std::vector<std::string> CommandLine() {
  std::ifstream File("/proc/self/cmdline", std::ios::binary);
  std::vector<std::string> Result;
  for (std::string Argument; std::getline(File, Argument, '\0');) Result.push_back(Argument);
  return Result;
}

}  // namespace

Char PathSeparatorOf(std::u16string_view APath) noexcept {
  const std::size_t Found = APath.find_last_of(cSeparators);
  return Found == APath.npos ? u'\\' : APath[Found];
}

UnicodeString ExtractFileName(const UnicodeString& AFileName) { return AFileName.View().substr(NameStart(AFileName)); }

UnicodeString ExtractFilePath(const UnicodeString& AFileName) {
  return AFileName.View().substr(0, NameStart(AFileName));
}

UnicodeString ExtractFileDir(const UnicodeString& AFileName) {
  std::size_t Length = NameStart(AFileName);
  while (Length > 1 && IsPathSeparator(AFileName.View()[Length - 1])) --Length;
  return AFileName.View().substr(0, Length);
}

UnicodeString ExtractFileExt(const UnicodeString& AFileName) { return AFileName.View().substr(ExtStart(AFileName)); }

UnicodeString ChangeFileExt(const UnicodeString& AFileName, const UnicodeString& AExtension) {
  return UnicodeString(AFileName.View().substr(0, ExtStart(AFileName))) + AExtension;
}

UnicodeString IncludeTrailingBackslash(const UnicodeString& APath) {
  if (!APath.IsEmpty() && IsPathSeparator(APath[APath.Length()])) return APath;
  return APath + PathSeparatorOf(APath);
}

UnicodeString ExcludeTrailingBackslash(const UnicodeString& APath) {
  if (APath.IsEmpty() || !IsPathSeparator(APath[APath.Length()])) return APath;
  return APath.View().substr(0, APath.size() - 1);
}

UnicodeString ParamStr(Integer AIndex) {
  if (AIndex == 0) return ProgramPath();
  const std::vector<std::string> Arguments = CommandLine();
  if (AIndex < 0 || static_cast<std::size_t>(AIndex) >= Arguments.size()) return {};
  return UnicodeString(utf8::Decode(Arguments[static_cast<std::size_t>(AIndex)], utf8::TMalformed::Escape));
}

Integer ParamCount() { return std::max(static_cast<Integer>(CommandLine().size()) - 1, 0); }

std::string ToSystemPath(std::u16string_view APath) {
  std::u16string Text(APath.substr(0, APath.find(u'\0')));
  std::replace(Text.begin(), Text.end(), u'\\', u'/');
  std::string Result;
  std::u16string_view Rest = Text;
  for (std::size_t Found = FindNamedBackslash(Rest); Found != Rest.npos; Found = FindNamedBackslash(Rest)) {
    Result += utf8::Encode(Rest.substr(0, Found), utf8::TMalformed::Escape) + '\\';
    Rest.remove_prefix(Found + 1);
  }
  return Result + utf8::Encode(Rest, utf8::TMalformed::Escape);
}

UnicodeString FromSystemPath(std::string_view APath) {
  std::u16string Result = utf8::Decode(APath, utf8::TMalformed::Escape);
  std::replace(Result.begin(), Result.end(), u'\\', cNamedBackslash);
  return UnicodeString(std::move(Result));
}

}  // namespace zq
