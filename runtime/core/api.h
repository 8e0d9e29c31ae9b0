#pragma once

/// Marks what the shared library exports; everything else stays hidden in it.
#define ZQ_API __attribute__((visibility("default")))

/// Marks what a view, a pointer or a record into an argument or an object must not outlive. Compilers that know it warn
/// where one is kept of something temporary.
#if defined(__has_cpp_attribute)
#if __has_cpp_attribute(clang::lifetimebound)
#define ZQ_LIFETIMEBOUND [[clang::lifetimebound]]
#endif
#endif
#ifndef ZQ_LIFETIMEBOUND
#define ZQ_LIFETIMEBOUND
#endif

#include <cstddef>

namespace zq {
/// Fetches AAddress's memory while something else is done. For objects that a call reads behind a system call, which
/// has taken the first cache for itself.
inline void Prefetch(const void* AAddress, std::size_t ABytes) noexcept {
  for (std::size_t i = 0; i < ABytes; i += 64) __builtin_prefetch(static_cast<const char*>(AAddress) + i);
}
}  // namespace zq

/// Marks the functions on the way of a log line. They stand together in the library, so that a line touches few pages.
#define ZQ_HOT [[gnu::hot]]
