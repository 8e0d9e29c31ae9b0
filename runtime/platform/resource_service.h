#pragma once

#include <optional>

#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

/// A loaded module by the address that it was loaded to; null is the host program.
using HINST = const void*;

// Types of resources. "#n" names a type or a resource by number.
inline constexpr const WideChar* RT_RCDATA = u"#10";
inline constexpr const WideChar* RT_MESSAGETABLE = u"#11";
inline constexpr const WideChar* RT_HTML = u"#23";
inline constexpr const WideChar* RT_MANIFEST = u"#24";

/// Resources of modules: blocks of bytes under a type and a name, which compare without regard to case. Any thread.
///
/// On Linux they are files beside the module: "<module>.resources/<type>/<name>", so
/// "lib/libshop.so.resources/RCDATA/LOGO". Types 10, 23 and 24 are the folders RCDATA, HTML and MANIFEST, any other
/// number is its digits.
class ZQ_API TResourceService {
 public:
  static TServiceSlot<TResourceService> Slot;

  [[nodiscard]] virtual bool FindResource(HINST AModule, const UnicodeString& AName, const UnicodeString& AType) = 0;
  /// The content; none where it isn't found or can't be read.
  [[nodiscard]] virtual std::optional<TBytes> LoadResource(
      HINST AModule, const UnicodeString& AName, const UnicodeString& AType) = 0;

 protected:
  ~TResourceService() = default;
};

/// This library's module, and the program's.
[[nodiscard]] ZQ_API HINST HInstance() noexcept;
[[nodiscard]] constexpr HINST MainInstance() noexcept { return nullptr; }

}  // namespace zq
