#pragma once

namespace zq {

/// One round of a spin: some ten to forty nanoseconds in which the core leaves its means to its other thread.
inline void SpinPause() noexcept {
#if defined(__x86_64__) || defined(__i386__)
  __builtin_ia32_pause();
#elif defined(__aarch64__)
  // `yield` is over at once on most cores, so that a spin would end too early.
  asm volatile("isb" ::: "memory");
#elif defined(__riscv)
  // `pause`: a core that does not know it takes it for an empty fence.
  asm volatile(".insn i 0x0F, 0, x0, x0, 0x010" ::: "memory");
#else
  asm volatile("" ::: "memory");
#endif
}

}  // namespace zq
