#pragma once

#include "runtime/core/api.h"
#include "runtime/core/types.h"

struct timespec;

namespace zq {

inline constexpr Cardinal INFINITE = 0xFFFFFFFF;

/// When a wait is over, on a clock that nobody sets.
class ZQ_API TDeadline {
 public:
  /// In that many milliseconds; never for INFINITE.
  [[nodiscard]] static TDeadline In(Cardinal AMilliseconds) noexcept;
  [[nodiscard]] static TDeadline At(Int64 ANanoseconds) noexcept { return TDeadline(ANanoseconds); }
  /// Nanoseconds of that clock.
  [[nodiscard]] static Int64 Now() noexcept;

  [[nodiscard]] bool IsNever() const noexcept { return FNanoseconds == cNever; }
  [[nodiscard]] bool IsOver() const noexcept { return !IsNever() && Now() >= FNanoseconds; }
  [[nodiscard]] bool operator<(const TDeadline& AOther) const noexcept { return FNanoseconds < AOther.FNanoseconds; }
  /// What is left, rounded up; -1 for never.
  [[nodiscard]] int Milliseconds() const noexcept;
  /// Not for never.
  [[nodiscard]] timespec Moment() const noexcept;

 private:
  static constexpr Int64 cNever = 0x7FFFFFFFFFFFFFFF;
  explicit TDeadline(Int64 ANanoseconds) noexcept : FNanoseconds(ANanoseconds) {}
  Int64 FNanoseconds;
};

}  // namespace zq
