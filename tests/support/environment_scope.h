#pragma once

#include <cstdlib>
#include <optional>
#include <string>

namespace zq {

/// Sets a variable of the environment for a scope.
class TEnvironmentScope {
 public:
  TEnvironmentScope(const char* AName, const std::string& AValue) : FName(AName) {
    if (const char* const Saved = std::getenv(AName)) FSaved = Saved;
    ::setenv(AName, AValue.c_str(), 1);
  }
  TEnvironmentScope(const TEnvironmentScope&) = delete;
  TEnvironmentScope& operator=(const TEnvironmentScope&) = delete;
  ~TEnvironmentScope() {
    if (FSaved) ::setenv(FName, FSaved->c_str(), 1);
    else ::unsetenv(FName);
  }

 private:
  const char* FName;
  std::optional<std::string> FSaved;
};

}  // namespace zq
