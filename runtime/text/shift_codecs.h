#pragma once

#include <string>
#include <string_view>

#include "runtime/text/page_table.h"

namespace zq {

// Encodings whose bytes mean this or that by what stands before them. They end as they begin, unshifted.

/// HZ (RFC 1843) over the characters of 936. A tilde that begins no sequence stands for itself; what is no character
/// becomes U+FFFD and sets AMalformed.
[[nodiscard]] std::u16string DecodeHz(std::string_view ABytes, bool& AMalformed);
[[nodiscard]] std::string EncodeHz(std::u16string_view AText, TPageTable::TMissing& AMissing);

/// UTF-7 (RFC 2152). Reads each character of ASCII but "+" as itself, writes so only those that the standard calls
/// direct, and ends each shifted run with "-". What is malformed becomes U+FFFD.
[[nodiscard]] std::u16string DecodeUtf7(std::string_view ABytes);
[[nodiscard]] std::string EncodeUtf7(std::u16string_view AText);

/// ISO-2022-JP with half-width letters behind SO, as 50222 has them, with those behind ESC ( I, as 50221 has them.
[[nodiscard]] std::string EscapeHalfWidth(std::string_view ABytes);

}  // namespace zq
