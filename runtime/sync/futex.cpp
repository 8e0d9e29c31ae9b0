#include "runtime/sync/futex.h"

#include <linux/futex.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>

namespace zq::futex {

bool Wait(void* AWord, std::uint32_t AValue, const TDeadline& ADeadline) noexcept {
  const timespec Moment = ADeadline.IsNever() ? timespec{} : ADeadline.Moment();
  return ::syscall(SYS_futex, AWord, FUTEX_WAIT_BITSET_PRIVATE, AValue, ADeadline.IsNever() ? nullptr : &Moment,
             nullptr, FUTEX_BITSET_MATCH_ANY) == 0 ||
         errno != ETIMEDOUT;
}

void WakeOne(void* AWord) noexcept { ::syscall(SYS_futex, AWord, FUTEX_WAKE_PRIVATE, 1, nullptr, nullptr, 0); }

}  // namespace zq::futex
