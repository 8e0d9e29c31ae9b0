#pragma once

#include <optional>

#include "runtime/core/strings.h"
#include "runtime/platform/platform.h"

namespace zq {

/// The process's environment.
class ZQ_API TEnvironmentService {
 public:
  /// The whole value; none if there is no such variable.
  [[nodiscard]] virtual std::optional<UnicodeString> GetEnvironmentVariable(const UnicodeString& AName) = 0;
  /// AText with each "%NAME%" replaced by the variable's value; unknown names stay as they are.
  [[nodiscard]] UnicodeString ExpandEnvironmentStrings(const UnicodeString& AText);

 protected:
  ~TEnvironmentService() = default;
};

}  // namespace zq
