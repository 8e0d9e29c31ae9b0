#pragma once

#include "runtime/core/types.h"

namespace zq {

/// How a binding is made.
enum class TCreateOption : std::uint8_t {
  coNotifyOutput,  ///< a write tells the expressions that depend on the property written
  coEvaluate,      ///< the value is carried over once when the binding is made
};
using enum TCreateOption;
using TCreateOptions = TSet<TCreateOption>;
inline constexpr TCreateOptions cDefaultCreateOptions{coNotifyOutput, coEvaluate};

}  // namespace zq
