#pragma once

#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

struct TOSVersionInfo {
  Cardinal MajorVersion = 0;
  Cardinal MinorVersion = 0;
  Word ServicePackMajor = 0;
  Byte ProductType = 0;  ///< 1 for a workstation
};

/// The running system in its own numbers: on Linux those of the kernel's release, which is Text.
struct TSystemRelease {
  Cardinal Major = 0;
  Cardinal Minor = 0;
  Cardinal Build = 0;
  UnicodeString Text;
};

inline constexpr Integer SM_SERVERR2 = 89;

/// What the system says of its version, in the terms of the services that programs of this family ask. Linux answers as
/// a workstation of major version 10.
class ZQ_API TVersionService {
 public:
  static TServiceSlot<TVersionService> Slot;

  /// The kernel library is loaded.
  [[nodiscard]] virtual bool HasKernel() = 0;
  /// It exports AName.
  [[nodiscard]] virtual bool KernelExports(const char16_t* AName) = 0;
  [[nodiscard]] virtual bool GetVersionEx(TOSVersionInfo& AInfo) = 0;
  [[nodiscard]] virtual Integer GetSystemMetrics(Integer AIndex) = 0;
  [[nodiscard]] virtual TSystemRelease Release() = 0;

 protected:
  ~TVersionService() = default;
};

}  // namespace zq
