#pragma once

#include <concepts>

#include "runtime/core/exceptions.h"  // EAssertionFailed
#include "runtime/core/interfaces.h"
#include "runtime/sync/critical_section.h"
#include "runtime/sync/event.h"

namespace zq {

class TKeyedLock;
class TKeyedLocks;

/// Lock with a limit to the wait. Its owner may take it again, and must then leave it as often; Unlock gives back one
/// level. Any thread may call.
class ZQ_API TZqCriticalSection : public TCriticalSection {
 public:
  using TCriticalSection::TryEnter;
  /// False when more than ATimeOut milliseconds have passed; 0 tries once, INFINITE waits for ever.
  [[nodiscard]] bool TryEnter(Cardinal ATimeOut) noexcept;

  /// TryEnter whose outcome a local variable keeps for Unlock, which may then be called on every way out, and twice.
  bool Lock(bool& AUnlock, Cardinal ATimeout) noexcept { return AUnlock = TryEnter(ATimeout); }
  /// Leaves if AUnlock is set, and clears it.
  void Unlock(bool& AUnlock) noexcept;

  /// Calls ASuccessProc with the lock held. What it raises comes out, and the lock is given back.
  template <class TSuccess>
    requires(std::invocable<TSuccess&>)
  void Execute(TSuccess&& ASuccessProc) {
    const TLockScope Scope(*this);
    ASuccessProc();
  }
  /// The same within ATimeOut as for TryEnter, else calls AFailureProc with the lock not held. Neither may be unset.
  template <class TSuccess, class TFailure>
    requires(std::invocable<TSuccess&>&& std::invocable<TFailure&>)
  void Execute(Cardinal ATimeOut, TSuccess&& ASuccessProc, TFailure&& AFailureProc) {
    if (!TryEnter(ATimeOut)) {
      AFailureProc();
      return;
    }
    const TLeaving Scope{*this};
    ASuccessProc();
  }

 private:
  struct TLeaving {
    TZqCriticalSection& Section;
    ~TLeaving() { Section.Leave(); }
  };
};

/// Takes the lock of that pointer, by its value, null like any other; waits without limit. A thread may take it again.
/// The lock exists only while somebody holds or wants it, and what the pointer points to is never looked at.
ZQ_API void ZqThreadLock(const void* AData);
/// Gives back one ZqThreadLock of this thread. Raises EAssertionFailed where it holds none; nothing changes then.
ZQ_API void ZqThreadUnlock(const void* AData);

/// Holds the lock of a pointer for a scope.
class [[nodiscard]] TZqThreadLockScope {
 public:
  explicit TZqThreadLockScope(const void* AData) : FData(AData) { ZqThreadLock(FData); }
  TZqThreadLockScope(const TZqThreadLockScope&) = delete;
  TZqThreadLockScope& operator=(const TZqThreadLockScope&) = delete;
  ~TZqThreadLockScope() { ZqThreadUnlock(FData); }

 private:
  const void* FData;
};

/// The lock of one pointer, as the table has it.
using TZqDataCriticalSection = TKeyedLock;

namespace uZqThreads {
/// The locks of ZqThreadLock, between start and stop of the module.
[[nodiscard]] ZQ_API const TKeyedLocks& DataLocks();
void StartLocks();
void StopLocks();
}  // namespace uZqThreads

/// A flag to wait for that lives as long as somebody holds a reference. Any thread may call; a wait ends at the signal.
struct ZQ_API IZqSimpleEvent : Extends<IInterface> {
  static constexpr TGUID IID = "{3E6C3974-3559-4114-A07F-60B03539C614}"_guid;
  /// For at most ATimeout milliseconds.
  virtual TWaitResult WaitFor(Cardinal ATimeout = INFINITE) = 0;
  /// Lets everybody pass until ResetEvent.
  virtual void SetEvent() = 0;
  virtual void ResetEvent() = 0;

 protected:
  ~IZqSimpleEvent() = default;
};

/// Not set at first.
class ZQ_API TZqSimpleEvent : public Implements<TInterfacedObject, IZqSimpleEvent> {
 public:
  TWaitResult WaitFor(Cardinal ATimeout = INFINITE) override;
  void SetEvent() override;
  void ResetEvent() override;

 protected:
  ~TZqSimpleEvent() override = default;

 private:
  TSimpleEvent FSimpleEvent;
};

}  // namespace zq
