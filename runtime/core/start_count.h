#pragma once

#include "runtime/core/types.h"

namespace zq {

/// How often a module has been started, so that its work is done once however often the start sequence runs: at the
/// first start and at the stop that is the last. One thread at a time.
class TStartCount {
 public:
  /// For the start operation: true for the first.
  [[nodiscard]] bool Begins() noexcept { return FCount-- == 0; }
  /// For the stop operation: true for the last.
  bool Ends() noexcept { return ++FCount == 0; }

 private:
  Integer FCount = 0;
};

}  // namespace zq
