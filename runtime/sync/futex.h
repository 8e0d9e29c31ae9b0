#pragma once

#include <cstdint>

#include "runtime/sync/deadline.h"

/// Sleeping on a word of memory, for what blocks in this folder.
namespace zq::futex {

/// Sleeps unless the word at AWord isn't AValue any more. False when the time was over. May end without reason.
bool Wait(void* AWord, std::uint32_t AValue, const TDeadline& ADeadline) noexcept;
/// AWord is an address only: who lies there by now takes the wake-up for a reason to look again.
void WakeOne(void* AWord) noexcept;

}  // namespace zq::futex
