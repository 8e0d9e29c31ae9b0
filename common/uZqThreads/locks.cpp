#include "common/uZqThreads/locks.h"

#include <utility>

#include "runtime/sync/keyed_locks.h"

namespace zq {

// ------------------------------------------------------------------------------------------------- TZqCriticalSection

// By the milliseconds that a clock shows it is more than ATimeOut, never just that.
bool TZqCriticalSection::TryEnter(Cardinal ATimeOut) noexcept {
  return TryEnterFor(ATimeOut == 0 || ATimeOut == INFINITE ? ATimeOut : ATimeOut + 1);
}

void TZqCriticalSection::Unlock(bool& AUnlock) noexcept {
  if (AUnlock) Leave();
  AUnlock = false;
}

// ------------------------------------------------------------------------------------------------- Locks of pointers

namespace {

constinit TKeyedLocks* Locks = nullptr;

TKeyedLocks& Table() {
  Assert(Locks != nullptr, u"The module is not started");
  return *Locks;
}

}  // namespace

void uZqThreads::StartLocks() { Locks = new TKeyedLocks; }

void uZqThreads::StopLocks() { delete std::exchange(Locks, nullptr); }

const TKeyedLocks& uZqThreads::DataLocks() { return Table(); }

void ZqThreadLock(const void* AData) { Table().Enter(AData); }

void ZqThreadUnlock(const void* AData) {
  const TKeyedLocks::TLeft Left = Table().Leave(AData);
  Assert(Left != TKeyedLocks::TLeft::NobodyIn);
  Assert(Left != TKeyedLocks::TLeft::NotOwner, u"The lock is another thread's");
}

// ----------------------------------------------------------------------------------------------------- TZqSimpleEvent

TWaitResult TZqSimpleEvent::WaitFor(Cardinal ATimeout) { return FSimpleEvent.WaitFor(ATimeout); }

void TZqSimpleEvent::SetEvent() { FSimpleEvent.SetEvent(); }

void TZqSimpleEvent::ResetEvent() { FSimpleEvent.ResetEvent(); }

}  // namespace zq
