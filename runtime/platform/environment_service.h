#pragma once

#include <optional>

#include "runtime/core/strings.h"
#include "runtime/platform/service.h"

namespace zq {

/// The process's environment.
class ZQ_API TEnvironmentService {
 public:
  static TServiceSlot<TEnvironmentService> Slot;

  /// The whole value; none if there is no such variable.
  [[nodiscard]] virtual std::optional<UnicodeString> GetEnvironmentVariable(const UnicodeString& AName) = 0;

 protected:
  ~TEnvironmentService() = default;
};

}  // namespace zq
