#pragma once

#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

namespace zq {

/// A new random identifier (RFC 4122, version 4). Raises EOSError where the system has no random numbers.
[[nodiscard]] ZQ_API TGUID CreateGUID();
/// "{01234567-89AB-CDEF-0123-456789ABCDEF}".
[[nodiscard]] ZQ_API UnicodeString GUIDToString(const TGUID& AValue);
[[nodiscard]] constexpr bool IsEqualGUID(const TGUID& A, const TGUID& B) noexcept { return A == B; }

}  // namespace zq
