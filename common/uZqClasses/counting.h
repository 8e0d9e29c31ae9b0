#pragma once

#include <atomic>

#include "runtime/core/interfaces.h"

namespace zq {

struct ZQ_API IZqObject : Extends<IInterface> {
  static constexpr TGUID IID = "{0417F540-9CCC-4DE6-B2C4-1063D0508346}"_guid;
  /// The object behind the interface.
  virtual TObject* Implementor() = 0;

 protected:
  ~IZqObject() = default;
};

/// What a count of zero means for an instance.
enum class TZqAutoDestroy : std::uint8_t {
  radComputed,  ///< not decided yet: the state of every new instance
  radFalse,     ///< _Release never destroys; the owner does
  radTrue,      ///< the _Release that brings the count to 0 destroys
};
using enum TZqAutoDestroy;

/// A reference count and what it means when it is zero. Any thread.
class ZQ_API TZqRefCount {
 public:
  [[nodiscard]] Integer Value() const noexcept { return CountIn(FWord.load(std::memory_order_acquire)); }
  [[nodiscard]] TZqAutoDestroy State() const noexcept { return StateIn(FWord.load(std::memory_order_acquire)); }
  void SetState(TZqAutoDestroy AValue) noexcept;
  /// Counts up; with AClaim an undecided instance becomes radTrue.
  Integer Up(bool AClaim) noexcept;
  /// Counts down; AEnds tells whether the count became 0 while the state was radTrue, both read in the same step.
  Integer Down(bool& AEnds) noexcept;

 private:
  static constexpr UInt64 cOne = UInt64{1} << 32U;  // the count stands above the state and doesn't run into it
  static Integer CountIn(UInt64 AWord) noexcept { return static_cast<Integer>(AWord >> 32U); }
  static TZqAutoDestroy StateIn(UInt64 AWord) noexcept { return static_cast<TZqAutoDestroy>(AWord & 0xFFU); }

  std::atomic<UInt64> FWord = cOne;  // the construction's own, so that a reference in a constructor is no end
};

}  // namespace zq
