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

/// Marks the functions on the way of a log line. They stand together in the library, so that a line touches few pages.
#define ZQ_HOT [[gnu::hot]]
