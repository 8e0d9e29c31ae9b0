#pragma once

#include <cstdint>
#include <filesystem>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

#include "runtime/core/strings.h"

namespace zq {

// How GoogleTest shows the strings of a failed comparison.
void PrintTo(const UnicodeString& AText, std::ostream* AStream);
void PrintTo(const RawByteString& ABytes, std::ostream* AStream);

/// A new, empty folder of its own, removed with all it holds at the end of the scope.
class TTempFolder {
 public:
  TTempFolder();
  /// With these files in it, each holding its own name.
  explicit TTempFolder(const std::vector<const char*>& AFiles);
  TTempFolder(const TTempFolder&) = delete;
  TTempFolder& operator=(const TTempFolder&) = delete;
  ~TTempFolder();

  [[nodiscard]] const std::filesystem::path& Path() const noexcept { return FPath; }
  /// Path of a name in the folder, as the library takes it.
  [[nodiscard]] UnicodeString File(std::string_view AName) const;
  /// Names of all entries, sorted.
  [[nodiscard]] std::vector<std::string> Names() const;
  void Write(std::string_view AName, std::string_view AContent) const;
  /// Whole content; fails the test where there is no such file.
  [[nodiscard]] std::string Read(std::string_view AName) const;

 private:
  std::filesystem::path FPath;
};

[[nodiscard]] std::string ReadFile(const std::filesystem::path& APath);
[[nodiscard]] std::vector<std::string> SplitLines(std::string_view AText);  // at CR LF; the last one has none

}  // namespace zq
