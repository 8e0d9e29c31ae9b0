#pragma once

/// Marks what the shared library exports; everything else stays hidden in it.
#define ZQ_API __attribute__((visibility("default")))
