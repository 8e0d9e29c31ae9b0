#pragma once

#include <array>
#include <cstddef>
#include <span>
#include <string_view>

#include "runtime/core/api.h"
#include "runtime/core/types.h"

namespace zq {

// The one table of what is known of each code page. A new page is a new row, and nothing else.

/// How a code page writes text.
enum class TPageKind : Byte {
  SingleByte,
  MultiByte,  ///< one byte or several for a character, whatever stands before it
  Hz,         ///< this one and the next three shift: what a byte means depends on those before it
  Iscii,
  Iso2022,
  Utf7,
  Gb18030,
  Utf8,
  Utf16,
  Utf32,
  Symbol,  ///< the characters of a font
};

/// What bytes and characters below 80 have in common at the front of a text.
enum class TAsciiUse : Byte {
  Plain,    ///< they are the same
  Guarded,  ///< likewise as long as none of them shifts or quotes
  Foreign,  ///< nothing
};

/// Character data: who has it, and the name of the page there.
struct TCharacterData {
  enum TSource : Byte { None, ICU, CLibrary };
  TSource Source = None;
  const char* Name = nullptr;
};

/// Where a page and its character data part.
struct TMapping {
  enum TWay : Byte { Both, OnlyDecodes, OnlyEncodes };
  Word Code = 0;  // a byte, or two with the first in the high one
  char16_t Char = 0;
  TWay Way = Both;  // OnlyEncodes: a similar character, whose code means another one
};

struct TCodePage {
  Word Number = 0;
  TPageKind Kind = TPageKind::SingleByte;
  TAsciiUse Ascii = TAsciiUse::Foreign;
  Byte BytesPerUnit = 1;           // the most that one UTF-16 unit takes, with the shifts on either side of it
  TCharacterData Data = {};        // a page without refuses all text, whatever else its row says
  std::u16string_view Names = {};  // its name, then the further ones that lead to it, divided by "|"
  std::span<const Byte> Mark = {};
  std::span<const TMapping> Differences = {};  // of pages with one or two bytes a character

  [[nodiscard]] constexpr bool IsServed() const noexcept { return Data.Source != TCharacterData::None; }
  [[nodiscard]] constexpr bool IsUnicode() const noexcept {
    return Kind >= TPageKind::Utf7 && Kind <= TPageKind::Utf32;
  }
  /// Whether a conversion refuses any flag.
  [[nodiscard]] constexpr bool TakesNoFlags() const noexcept {
    return (Kind >= TPageKind::Iscii && Kind <= TPageKind::Utf7) || Kind == TPageKind::Symbol;
  }
  [[nodiscard]] constexpr std::size_t UnitSize() const noexcept {
    return Kind == TPageKind::Utf16 ? 2 : Kind == TPageKind::Utf32 ? 4 : 1;
  }
  /// Whether a table of one or two bytes a character serves it.
  [[nodiscard]] constexpr bool HasTable() const noexcept { return Kind <= TPageKind::MultiByte && BytesPerUnit <= 2; }
  [[nodiscard]] constexpr std::u16string_view Name() const noexcept { return Names.substr(0, Names.find(u'|')); }
};

inline constexpr std::array<Byte, 3> cUTF8Mark{0xEF, 0xBB, 0xBF};
inline constexpr std::array<Byte, 2> cUTF16BEMark{0xFE, 0xFF};
inline constexpr std::array<Byte, 2> cUTF16LEMark{0xFF, 0xFE};
inline constexpr std::array<Byte, 4> cUTF32BEMark{0x00, 0x00, 0xFE, 0xFF};
inline constexpr std::array<Byte, 4> cUTF32LEMark{0xFF, 0xFE, 0x00, 0x00};

/// All pages, by number.
[[nodiscard]] ZQ_API std::span<const TCodePage> CodePages() noexcept;

// nullptr where there is no such page. 0 is none.
[[nodiscard]] ZQ_API const TCodePage* FindCodePage(Word ANumber) noexcept;
/// Without regard to case; of pages that share a name the first.
[[nodiscard]] ZQ_API const TCodePage* FindCodePage(std::u16string_view AName) noexcept;
/// The page with the longest mark that ABytes begin with.
[[nodiscard]] ZQ_API const TCodePage* FindCodePageByMark(std::span<const Byte> ABytes) noexcept;

}  // namespace zq
