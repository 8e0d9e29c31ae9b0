#include "common/uZqClasses/counting.h"

namespace zq {

Integer TZqRefCount::Up(bool AClaim) noexcept {
  const UInt64 Now = FWord.fetch_add(cOne, std::memory_order_relaxed) + cOne;
  if (AClaim && StateIn(Now) == radComputed) {
    UInt64 Seen = Now;
    while (StateIn(Seen) == radComputed && !FWord.compare_exchange_weak(Seen, Seen | static_cast<Byte>(radTrue)))
      continue;
  }
  return CountIn(Now);
}

Integer TZqRefCount::Down(bool& AEnds) noexcept {
  const UInt64 Now = FWord.fetch_sub(cOne, std::memory_order_acq_rel) - cOne;
  AEnds = CountIn(Now) == 0 && StateIn(Now) == radTrue;
  return CountIn(Now);
}

void TZqRefCount::SetState(TZqAutoDestroy AValue) noexcept {
  UInt64 Seen = FWord.load(std::memory_order_relaxed);
  while (!FWord.compare_exchange_weak(Seen, (Seen & ~UInt64{0xFF}) | static_cast<Byte>(AValue))) continue;
}

}  // namespace zq
