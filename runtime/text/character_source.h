#pragma once

#include <memory>
#include <string_view>

#include "runtime/core/types.h"
#include "runtime/text/code_pages.h"

namespace zq {

/// The character data of one page, asked code by code. One thread at a time.
class TCharacterSource {
 public:
  // What Read answers where the bytes are no character: values that no character of one unit has.
  static constexpr char16_t cUnassigned = 0xFFFD;
  static constexpr char16_t cLead = 0xD800;  // a byte that another one follows
  static constexpr char16_t cLone = 0xD801;  // of two bytes the first is wrong, the second is a text of its own

  TCharacterSource() = default;
  TCharacterSource(const TCharacterSource&) = delete;
  TCharacterSource& operator=(const TCharacterSource&) = delete;
  virtual ~TCharacterSource() = default;

  /// nullptr where this system has no such data.
  [[nodiscard]] static std::unique_ptr<TCharacterSource> Open(const TCharacterData& AData);

  /// The character that one or two bytes stand for.
  [[nodiscard]] virtual char16_t Read(std::string_view ABytes) = 0;
  /// The code of one or two bytes, the first in the high one; 0 where there is none. ABestFit also takes a similar one.
  [[nodiscard]] virtual Word Write(char16_t AChar, bool ABestFit) = 0;
};

}  // namespace zq
