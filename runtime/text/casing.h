#pragma once

#include "runtime/core/strings.h"

namespace zq {

// Case of every script, character by character and in no locale's special way: the length never changes, so "ß" stays.

[[nodiscard]] ZQ_API UnicodeString AnsiUpperCase(UnicodeString AText);
[[nodiscard]] ZQ_API UnicodeString AnsiLowerCase(UnicodeString AText);
[[nodiscard]] inline WideString WideUpperCase(WideString AText) { return AnsiUpperCase(std::move(AText)); }
[[nodiscard]] inline WideString WideLowerCase(WideString AText) { return AnsiLowerCase(std::move(AText)); }
/// Compares without regard to case, in every script.
[[nodiscard]] ZQ_API bool AnsiSameText(const UnicodeString& A, const UnicodeString& B);

}  // namespace zq
