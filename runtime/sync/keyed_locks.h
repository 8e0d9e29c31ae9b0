#pragma once

#include <cstddef>
#include <unordered_map>

#include "runtime/sync/critical_section.h"
#include "runtime/sync/deadline.h"

namespace zq {

/// What TKeyedLocks keeps for a key.
class TKeyedLock : public TCriticalSection {
  friend class TKeyedLocks;
  Integer FCount = 0;  // calls of Enter that no Leave has matched, those that wait included; under the table's lock
};

/// A re-entrant lock for each pointer, by its value, null like any other. It exists only while somebody holds or wants
/// it. Any thread may call; to wait for one key holds up no other. Must outlive what is held.
class ZQ_API TKeyedLocks {
 public:
  /// False when ATimeout milliseconds have passed.
  bool Enter(const void* AKey, Cardinal ATimeout = INFINITE);

  enum class TLeft : Byte { Done, NotOwner, NobodyIn };
  /// Gives back one Enter of this thread; where there is none, nothing changes.
  [[nodiscard]] TLeft Leave(const void* AKey);

  /// Keys that are held or wanted.
  [[nodiscard]] std::size_t Keys() const;
  /// Calls of Enter for AKey that no Leave has matched, those that wait included.
  [[nodiscard]] Integer Count(const void* AKey) const;

 private:
  TKeyedLock& Register(const void* AKey);

  mutable TCriticalSection FGuard;  // of FLocks, for a few instructions; never while a key is waited for
  std::unordered_map<const void*, TKeyedLock> FLocks;
};

}  // namespace zq
