#include "runtime/sync/deadline.h"

#include <algorithm>
#include <ctime>
#include <limits>

namespace zq {

namespace {

constexpr Int64 cMillisecond = 1'000'000, cSecond = 1000 * cMillisecond;  // nanoseconds

}  // namespace

Int64 TDeadline::Now() noexcept {
  timespec Result{};
  ::clock_gettime(CLOCK_MONOTONIC, &Result);
  return Result.tv_sec * cSecond + Result.tv_nsec;
}

TDeadline TDeadline::In(Cardinal AMilliseconds) noexcept {
  return TDeadline(AMilliseconds == INFINITE ? cNever : Now() + AMilliseconds * cMillisecond);
}

int TDeadline::Milliseconds() const noexcept {
  if (IsNever()) return -1;
  const Int64 Left = std::max<Int64>(FNanoseconds - Now(), 0);
  return static_cast<int>(std::min<Int64>((Left + cMillisecond - 1) / cMillisecond, std::numeric_limits<int>::max()));
}

timespec TDeadline::Moment() const noexcept {
  timespec Result{};
  Result.tv_sec = static_cast<std::time_t>(FNanoseconds / cSecond);
  Result.tv_nsec = static_cast<long>(FNanoseconds % cSecond);
  return Result;
}

}  // namespace zq
