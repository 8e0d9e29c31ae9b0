#pragma once

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdlib>
#include <memory>
#include <mutex>
#include <string_view>

#include "runtime/core/types.h"
#include "runtime/text/character_source.h"
#include "runtime/text/code_pages.h"

namespace zq {

/// Both directions of a page of one or two bytes a character. What it has learned from the page's source it keeps for
/// ever, so that each pair and each character is asked for once. Any thread.
class TPageTable {
 public:
  /// nullptr where this system has no data for APage.
  [[nodiscard]] static TPageTable* Of(const TCodePage& APage);

  TPageTable(const TCodePage& APage, std::unique_ptr<TCharacterSource> ASource);

  /// Units written to ADest, which has room for one per byte; without ADest those needed. What is no character becomes
  /// U+FFFD and sets AMalformed.
  std::size_t Decode(const char* ASource, std::size_t ABytes, char16_t* ADest, bool& AMalformed);

  struct TMissing {
    std::string_view Bytes;  // stand in for a character that the page doesn't have; empty: its "?"
    bool BestFit = true;     // unless it has a similar one
    bool Composes = false;   // stop at a character that may meet the one before it,
    bool Meets = false;      // and say so
    bool Found = false;      // whether the bytes stood in
  };
  /// Bytes written to ADest, which has room for two per unit, and for AMissing's; without ADest those needed.
  std::size_t Encode(const char16_t* ASource, std::size_t AChars, char* ADest, TMissing& AMissing);

  /// A code is a byte, or two with the first in the high one. 0 where the page has none, and for U+0000.
  [[nodiscard]] Word CodeOf(char16_t AChar, bool ABestFit);

  /// Whether AChar, a mark for the most part, may make one character with what stands before it.
  [[nodiscard]] static bool MayMeet(char16_t AChar) noexcept;

 private:
  // An answer for each number of 16 bits; 0 where none is known yet. Memory is taken as answers come.
  class TMemo {
   public:
    [[nodiscard]] Word operator[](std::size_t AIndex) const noexcept {
      return std::atomic_ref(FAnswers[AIndex]).load(std::memory_order_relaxed);
    }
    void Learn(std::size_t AIndex, Word AAnswer) noexcept {
      std::atomic_ref(FAnswers[AIndex]).store(AAnswer, std::memory_order_relaxed);
    }
    [[nodiscard]] bool IsMade() const noexcept { return FAnswers != nullptr; }

   private:
    struct TFree {
      void operator()(Word* AAnswers) const noexcept { std::free(AAnswers); }
    };
    std::unique_ptr<Word[], TFree> FAnswers{static_cast<Word*>(std::calloc(0x10000, sizeof(Word)))};
  };

  // What stands for a code where there is none that may be written as it is; above all codes.
  static constexpr Word cMeets = 0xFFFE;
  static constexpr Word cNone = 0xFFFF;

  static TPageTable* Make(const TCodePage& APage, std::atomic<TPageTable*>& ATable);
  template <class TAsk>
  Word Recall(TMemo& AMemo, Word AIndex, TAsk AAsk);
  [[nodiscard]] bool IsAscii(unsigned AValue) const noexcept;
  char16_t Read(Word ACode) const;
  char16_t CharOf(Word ACode);
  Word Write(char16_t AChar, bool ABestFit) const;

  struct TUnitWriter;
  struct TUnitCounter;
  // Whether one is unassigned. ADest may be nullptr.
  bool DecodeSingles(const Byte* ASource, std::size_t ABytes, char16_t* ADest) const noexcept;
  std::size_t DecodePairs(const Byte* AAt, const Byte* AEnd, char16_t* ADest, bool& AMalformed);
  template <class TPut>
  TPut DecodeEach(const Byte* AAt, const Byte* AEnd, TPut APut);
  struct TByteWriter;
  struct TSingleWriter;
  struct TByteCounter;
  template <class TPut>
  const char16_t* EncodeKnown(const char16_t* AAt, const char16_t* AEnd, TPut& APut) const noexcept;
  template <class TPut>
  TPut EncodeEach(const char16_t* AAt, const char16_t* AEnd, TMissing& AMissing, TPut APut);

  const TCodePage& FPage;
  std::mutex FLock;  // while the source is asked
  std::unique_ptr<TCharacterSource> FSource;
  std::array<char16_t, 256> FSingles{};
  bool FHasPairs = false;
  bool FIsWhole = true;  // no single byte is unassigned
  TMemo FPairs;
  TMemo FCodes;    // of exactly the character
  TMemo FSimilar;  // of it or else a similar one
};

}  // namespace zq
