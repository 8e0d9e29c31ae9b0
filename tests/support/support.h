#pragma once

// What nearly every test uses comes along.
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <functional>
#include <limits>
#include <map>
#include <memory>
#include <optional>
#include <ostream>
#include <set>
#include <string>
#include <string_view>
#include <tuple>
#include <utility>
#include <vector>

#include "runtime/core/exceptions.h"

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

/// Sets a variable of the environment for a scope.
class TEnvironmentScope {
 public:
  TEnvironmentScope(const char* AName, const std::string& AValue);
  TEnvironmentScope(const TEnvironmentScope&) = delete;
  TEnvironmentScope& operator=(const TEnvironmentScope&) = delete;
  ~TEnvironmentScope();

 private:
  const char* FName;
  std::optional<std::string> FSaved;
};

/// A time zone of the system for a scope.
struct TZoneScope {
  explicit TZoneScope(const char* AZone);
  ~TZoneScope();
  const TEnvironmentScope Variable;
};

/// A thread that is stopped by force never ends for the sanitizers, which then find its leaks, or hold its signal back.
#if defined(__SANITIZE_THREAD__) || defined(__SANITIZE_ADDRESS__)
inline constexpr bool cThreadsCantBeStopped = true;
#else
inline constexpr bool cThreadsCantBeStopped = false;
#endif

/// Runs ABody with the numbers below ACount, each on a thread of its own, and waits for their ends.
void OnThreads(int ACount, const std::function<void(int)>& ABody);
/// Class and message of what AAction raises, as "EClass: message"; "nothing" if it raises nothing.
[[nodiscard]] UnicodeString RaisedBy(const std::function<void()>& AAction);
[[nodiscard]] std::string ReadFile(const std::filesystem::path& APath);
[[nodiscard]] std::vector<std::string> SplitLines(std::string_view AText);  // at CR LF; the last one has none

}  // namespace zq
