#pragma once

#include <span>

#include "runtime/core/api.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/values/typeinfo.h"

namespace zq {

/// One module of the library. Both operations count their calls: a module works at the first start and at the last
/// stop, also where it is called by itself. They are null where the module has no work.
struct TPackageUnit {
  const char16_t* Name;
  void (*Start)();
  void (*Stop)();
};

/// The table that drives the start and the stop: modules in dependency order.
struct TPackageInfo {
  std::span<const TPackageUnit> Units;
  TArray<PTypeInfo> Types;  ///< the type records that the library exports
};

/// Starts each module in the order of the table. The load of the library does it; further calls count, and so must
/// calls of Finalize. What a start operation raises comes out, and ends the load. One thread at a
/// time.
ZQ_API void Initialize();
/// Stops the modules in the reverse order when it has been called as often as Initialize. Appenders that still hang on
/// loggers write their footers here. No other thread may use the library any more. A library that was loaded stays to
/// the end of the process, which closes every appender, so that its footer is written, and frees nothing: threads that
/// run still may log.
ZQ_API void Finalize();
[[nodiscard]] ZQ_API const TPackageInfo& GetPackageInfoTable();

}  // namespace zq
