#pragma once

#include <optional>

#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

/// Facts about this process. Each is absent where the system can't tell.
class ZQ_API TProcessFacts {
 public:
  static TServiceSlot<TProcessFacts> Slot;

  /// A 32-bit program on a 64-bit system.
  [[nodiscard]] virtual std::optional<bool> IsWow64Process() = 0;
  [[nodiscard]] virtual std::optional<bool> IsDebuggerPresent() = 0;

 protected:
  ~TProcessFacts() = default;
};

}  // namespace zq
