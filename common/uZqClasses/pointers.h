#pragma once

#include <concepts>
#include <limits>
#include <utility>

#include "runtime/core/exceptions.h"
#include "runtime/core/types.h"

/// Pointers as numbers, in one place: code that goes by these doesn't care how wide a pointer is.
///
/// Distances are bytes. Nothing is read or written through a pointer, which may be any number.
namespace zq {

namespace detail {
template <std::integral T>
[[nodiscard]] void* NumberToPtr(T AValue) noexcept {
  return reinterpret_cast<void*>(static_cast<NativeUInt>(AValue));
}
[[nodiscard]] inline Integer Narrow(NativeInt AValue) {
  Assert(std::in_range<Integer>(AValue));
  return static_cast<Integer>(AValue);
}
}  // namespace detail

[[nodiscard]] inline NativeUInt ZqPtr2UInt(const void* P) noexcept { return reinterpret_cast<NativeUInt>(P); }
/// What ZqOrdinal2Ptr made of an Integer. A pointer that is no such number raises EAssertionFailed.
[[nodiscard]] inline Integer ZqPtr2Int(const void* P) { return detail::Narrow(static_cast<NativeInt>(ZqPtr2UInt(P))); }

[[nodiscard]] inline void* ZqInt2Ptr(Integer AValue) noexcept { return detail::NumberToPtr(AValue); }
[[nodiscard]] inline void* ZqUInt2Ptr(NativeUInt AValue) noexcept { return detail::NumberToPtr(AValue); }
/// Stores an ordinal in a pointer slot. A signed one comes back by ZqPtr2Int, an unsigned one by ZqPtr2UInt.
template <std::integral T>
[[nodiscard]] void* ZqOrdinal2Ptr(T AValue) noexcept {
  return detail::NumberToPtr(AValue);
}

/// From B to A, modulo the width of a pointer where B is the higher one.
[[nodiscard]] inline NativeUInt ZqPtrDiff(const void* A, const void* B) noexcept {
  return ZqPtr2UInt(A) - ZqPtr2UInt(B);
}
/// Raises EAssertionFailed where the distance doesn't fit.
[[nodiscard]] inline Integer ZqPtrDiffS(const void* A, const void* B) {
  return detail::Narrow(static_cast<NativeInt>(ZqPtrDiff(A, B)));
}
template <std::integral T>
[[nodiscard]] void* ZqPtrAdd(const void* P, T ADelta) noexcept {
  return ZqUInt2Ptr(ZqPtr2UInt(P) + static_cast<NativeUInt>(ADelta));
}
template <std::integral T>
void ZqIncPtr(void*& P, T ADelta) noexcept {
  P = ZqPtrAdd(P, ADelta);
}

/// The lower and the upper 32 bits.
inline void ZqSplitPtr(const void* P, Cardinal& ALow, Cardinal& AHigh) noexcept {
  ALow = static_cast<Cardinal>(ZqPtr2UInt(P));
  AHigh = static_cast<Cardinal>(UInt64{ZqPtr2UInt(P)} >> 32U);
}
[[nodiscard]] inline void* ZqCombinePtr(Cardinal ALow, Cardinal AHigh) noexcept {
  return ZqUInt2Ptr(static_cast<NativeUInt>(UInt64{AHigh} << 32U | ALow));
}

}  // namespace zq
