#include "runtime/sync/keyed_locks.h"

namespace zq {

TKeyedLock& TKeyedLocks::Register(const void* AKey) {
  const TLockScope Guard(FGuard);
  TKeyedLock& Result = FLocks[AKey];
  ++Result.FCount;
  return Result;
}

bool TKeyedLocks::Enter(const void* AKey, Cardinal ATimeout) {
  TKeyedLock& Lock = Register(AKey);
  if (Lock.TryEnterFor(ATimeout)) return true;
  const TLockScope Guard(FGuard);
  if (Lock.FCount == 1) {  // the owner is counted out and about to leave: to go now would pull the lock from under it
    Lock.Enter();
    return true;
  }
  --Lock.FCount;
  return false;
}

TKeyedLocks::TLeft TKeyedLocks::Leave(const void* AKey) {
  decltype(FLocks)::node_type Last;  // outlives the guard's scope, and the lock's Leave
  TKeyedLock* Lock = nullptr;
  {
    const TLockScope Guard(FGuard);
    const auto Found = FLocks.find(AKey);
    if (Found == FLocks.end()) return TLeft::NobodyIn;
    Lock = &Found->second;
    if (!Lock->IsOwned()) return TLeft::NotOwner;
    if (--Lock->FCount == 0) Last = FLocks.extract(Found);
  }
  Lock->Leave();  // it may wake a thread: nothing to hold others up for. Whoever is counted keeps it alive
  return TLeft::Done;
}

std::size_t TKeyedLocks::Keys() const {
  const TLockScope Guard(FGuard);
  return FLocks.size();
}

Integer TKeyedLocks::Count(const void* AKey) const {
  const TLockScope Guard(FGuard);
  const auto Found = FLocks.find(AKey);
  return Found == FLocks.end() ? 0 : Found->second.FCount;
}

}  // namespace zq
