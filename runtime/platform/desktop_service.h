#pragma once

#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

/// Windows on the desktop. Linux keeps none by class that programs could look up: never found there.
class ZQ_API TDesktopService {
 public:
  static TServiceSlot<TDesktopService> Slot;

  /// A top-level window of that class and title exists; a null text fits any.
  [[nodiscard]] virtual bool FindWindow(const char16_t* AClass, const char16_t* ATitle) = 0;

 protected:
  ~TDesktopService() = default;
};

}  // namespace zq
