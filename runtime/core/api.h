#pragma once

/// Marks what the shared library exports; everything else stays hidden in it.
#define ZQ_API __attribute__((visibility("default")))

/// Marks the functions on the way of a log line. They stand together in the library, so that a line touches few pages.
#define ZQ_HOT [[gnu::hot]]
