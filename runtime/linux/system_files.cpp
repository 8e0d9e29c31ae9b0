#include "runtime/linux/system_files.h"

#include <pwd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <utility>
#include <vector>

namespace zq {

namespace {

// A word of the shell, as far as such files use it: the quotes around a part go, a backslash keeps the next character,
// but between single quotes, where it is one of the text.
std::string Unquoted(std::string_view AText) {
  std::string Result;
  char Quote = 0;
  for (std::size_t i = 0; i < AText.size(); ++i) {
    const bool IsQuote = AText[i] == '"' || AText[i] == '\'';
    if (IsQuote && (Quote == 0 || Quote == AText[i])) {
      Quote = Quote == 0 ? AText[i] : '\0';
      continue;
    }
    if (AText[i] == '\\' && Quote != '\'' && i + 1 < AText.size()) ++i;
    Result += AText[i];
  }
  return Result;
}

}  // namespace

Cardinal ReasonOf(int AErrno) noexcept {
  constexpr Cardinal FileNotFound = 2, TooManyOpenFiles = 4, AccessDenied = 5, NotEnoughMemory = 8, GeneralFailure = 31,
                     BadExecutable = 193, TooLong = 206, ConnectionRefused = 1225, TimedOut = 1460;
  switch (AErrno) {
    case ENOENT:
    case ENOTDIR: return FileNotFound;
    case EACCES:
    case EPERM: return AccessDenied;
    case EMFILE:
    case ENFILE: return TooManyOpenFiles;
    case ENOMEM:
    case EAGAIN: return NotEnoughMemory;
    case ENOEXEC: return BadExecutable;
    case E2BIG:
    case ENAMETOOLONG: return TooLong;
    case ECONNREFUSED: return ConnectionRefused;
    case ETIMEDOUT: return TimedOut;
    default: return GeneralFailure;
  }
}

std::string ReadSystemFile(const std::string& APath) {
  const std::ifstream File(APath, std::ios::binary);
  std::ostringstream Content;
  // A file of a process that ends meanwhile fails while it is read; this way it raises nothing.
  return (Content << File.rdbuf()) ? std::move(Content).str() : std::string();
}

std::string_view TakeLine(std::string_view& AText) noexcept {
  const std::string_view Line = AText.substr(0, AText.find('\n'));
  AText.remove_prefix(std::min(Line.size() + 1, AText.size()));
  return Line;
}

std::optional<std::string> ShellAssignment(const std::string& APath, std::string_view AName) {
  const std::string Content = ReadSystemFile(APath);
  std::optional<std::string> Result;
  for (std::string_view Rest = Content; !Rest.empty();) {
    const std::string_view Line = TakeLine(Rest);
    if (Line.starts_with(AName) && Line.substr(AName.size()).starts_with('='))
      Result = Unquoted(Line.substr(AName.size() + 1));
  }
  return Result;
}

std::string EnvironmentText(const char* AName) {
  const char* const Value = std::getenv(AName);
  return Value == nullptr ? "" : Value;
}

std::string HomeFolder() {
  std::string Result = EnvironmentText("HOME");
  if (Result.empty()) {
    std::vector<char> Buffer(16384);
    passwd Entry{};
    passwd* Found = nullptr;
    if (::getpwuid_r(::geteuid(), &Entry, Buffer.data(), Buffer.size(), &Found) == 0 && Found != nullptr)
      Result = Found->pw_dir;
  }
  while (Result.ends_with('/')) Result.pop_back();
  return Result;
}

std::string XdgFolder(const char* AVariable, std::string_view AUsual) {
  std::string Result = EnvironmentText(AVariable);
  return Result.starts_with('/') ? Result : HomeFolder() + '/' + std::string(AUsual);
}

}  // namespace zq
