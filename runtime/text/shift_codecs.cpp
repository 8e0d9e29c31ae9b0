#include "runtime/text/shift_codecs.h"

#include <algorithm>
#include <array>
#include <new>

#include "runtime/text/code_pages.h"

namespace zq {

namespace {

constexpr char16_t cReplacement = 0xFFFD;
constexpr std::string_view cIn = "~{";
constexpr std::string_view cOut = "~}";

TPageTable& HzCharacters() {
  TPageTable* const Result = TPageTable::Of(*FindCodePage(936));
  if (Result == nullptr) throw std::bad_alloc();
  return *Result;
}

constexpr bool IsHalfOfPair(unsigned AByte) noexcept { return AByte >= 0x21 && AByte <= 0x7E; }

}  // namespace

// --------------------------------------------------------------------------------------------- HZ

std::u16string DecodeHz(std::string_view ABytes, bool& AMalformed) {
  TPageTable& Table = HzCharacters();
  std::u16string Result;
  bool Shifted = false;
  const auto Take = [&](std::size_t ACount) { ABytes.remove_prefix(ACount); };
  while (!ABytes.empty()) {
    const std::string_view Two = ABytes.substr(0, 2);
    const auto c = static_cast<Byte>(ABytes[0]);
    if (Two == cIn || Two == cOut) Shifted = Two == cIn, Take(2);
    else if (!Shifted && Two == "~\n") Take(2);
    else if (Shifted && Two.size() == 2 && IsHalfOfPair(c) && IsHalfOfPair(static_cast<Byte>(Two[1]))) {
      const char Pair[] = {static_cast<char>(c | 0x80U), static_cast<char>(Two[1] | 0x80)};
      char16_t Units[2];
      Result.append(Units, Table.Decode(Pair, 2, Units, AMalformed));
      Take(2);
    } else {
      if (c == '\n') Shifted = false;
      const bool Wrong = c >= 0x80 || (Shifted && IsHalfOfPair(c));
      AMalformed = AMalformed || Wrong;
      Result += Wrong ? cReplacement : char16_t{c};
      Take(!Shifted && Two == "~~" ? 2 : 1);
    }
  }
  return Result;
}

std::string EncodeHz(std::u16string_view AText, TPageTable::TMissing& AMissing) {
  TPageTable& Table = HzCharacters();
  std::string Result;
  bool Shifted = false;
  const auto Shift = [&](bool AIn) {
    if (Shifted != AIn) Result += AIn ? cIn : cOut;
    Shifted = AIn;
  };
  for (std::size_t i = 0; i < AText.size(); ++i) {
    const char16_t c = AText[i];
    const unsigned Code = Table.CodeOf(c, AMissing.BestFit);
    const bool IsPair = (Code & 0x8080U) == 0x8080U && Code < 0xF800 && Code >= 0xA100 && (Code & 0xFFU) > 0xA0;
    Shift(IsPair);
    if (IsPair) Result += {static_cast<char>(Code >> 8U & 0x7FU), static_cast<char>(Code & 0x7FU)};
    else if (c == u'~') Result += "~~";
    else if (Code < 0x80 && (Code != 0 || c == 0)) Result += static_cast<char>(Code);
    else {
      AMissing.Found = true;
      Result += AMissing.Bytes.empty() ? "?" : AMissing.Bytes;
      if ((c & 0xFC00U) == 0xD800U && i + 1 < AText.size() && (AText[i + 1] & 0xFC00U) == 0xDC00U) ++i;
    }
  }
  Shift(false);
  return Result;
}

// --------------------------------------------------------------------------------------------- UTF-7

namespace {

constexpr std::string_view cDigits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
constexpr Byte cNoDigit = 64;

constexpr auto cDigitOf = [] {
  std::array<Byte, 256> Result{};
  Result.fill(cNoDigit);
  for (std::size_t i = 0; i < cDigits.size(); ++i) Result[static_cast<Byte>(cDigits[i])] = static_cast<Byte>(i);
  return Result;
}();

constexpr auto cIsDirect = [] {
  std::array<bool, 0x80> Result{};
  for (const char c : std::string_view("\0\t\n\r '(),-./:?", 14)) Result[static_cast<Byte>(c)] = true;
  for (const char c : cDigits.substr(0, 62)) Result[static_cast<Byte>(c)] = true;
  return Result;
}();

constexpr bool IsDirect(char16_t AChar) noexcept { return AChar < cIsDirect.size() && cIsDirect[AChar]; }

// Reads the digits at the front of ABytes, which are gone then.
std::u16string DecodeDigits(std::string_view& ABytes) {
  std::u16string Result;
  Cardinal Bits = 0;
  unsigned Count = 0;
  for (; !ABytes.empty() && cDigitOf[static_cast<Byte>(ABytes[0])] != cNoDigit; ABytes.remove_prefix(1)) {
    Bits = Bits << 6U | cDigitOf[static_cast<Byte>(ABytes[0])];
    Count += 6;
    if (Count < 16) continue;
    Count -= 16;
    Result += static_cast<char16_t>(Bits >> Count);
  }
  const bool Whole = !Result.empty() && Count < 6 && (Bits & ((1U << Count) - 1)) == 0;
  return Whole ? Result : Result + cReplacement;
}

void EncodeDigits(std::u16string_view AText, std::string& AResult) {
  Cardinal Bits = 0;
  unsigned Count = 0;
  const auto Put = [&](unsigned AShift) { AResult += cDigits[Bits >> AShift & 0x3FU]; };
  for (const char16_t c : AText) {
    Bits = Bits << 16U | c;
    for (Count += 16; Count >= 6; Count -= 6) Put(Count - 6);
  }
  if (Count > 0) Bits <<= 6 - Count, Put(0);
}

}  // namespace

std::u16string DecodeUtf7(std::string_view ABytes) {
  std::u16string Result;
  while (!ABytes.empty()) {
    const auto c = static_cast<Byte>(ABytes[0]);
    ABytes.remove_prefix(1);
    if (c != '+') Result += c < 0x80 ? char16_t{c} : cReplacement;
    else {
      const bool Plus = ABytes.starts_with('-');
      Result += Plus ? u"+" : DecodeDigits(ABytes);
      if (ABytes.starts_with('-')) ABytes.remove_prefix(1);
    }
  }
  return Result;
}

std::string EncodeUtf7(std::u16string_view AText) {
  std::string Result;
  while (!AText.empty()) {
    const auto* const Shifts = std::ranges::find_if_not(AText, IsDirect);
    Result.append(AText.begin(), Shifts);
    AText.remove_prefix(static_cast<std::size_t>(Shifts - AText.begin()));
    if (AText.empty()) break;
    if (AText[0] == u'+') {
      Result += "+-";
      AText.remove_prefix(1);
      continue;
    }
    const auto* const Direct = std::ranges::find_if(AText, [](char16_t c) { return IsDirect(c) || c == u'+'; });
    Result += '+';
    EncodeDigits({AText.begin(), Direct}, Result);
    Result += '-';
    AText.remove_prefix(static_cast<std::size_t>(Direct - AText.begin()));
  }
  return Result;
}

// --------------------------------------------------------------------------------------------- ISO-2022-JP

std::string EscapeHalfWidth(std::string_view ABytes) {
  constexpr char cEscape = '\x1B';
  std::string_view Set = "\x1B(B";
  std::string Result;
  while (!ABytes.empty()) {
    const char c = ABytes[0];
    std::size_t Taken = 1;
    if (c == cEscape) {
      while (Taken < ABytes.size() && ABytes[Taken] < 0x30) ++Taken;  // intermediate bytes, and behind them the last
      Set = ABytes.substr(0, ++Taken);
      Result += Set;
    } else if (c == '\x0E') Result += "\x1B(I";
    else if (c != '\x0F') Result += c;
    else if (!ABytes.substr(1).starts_with(cEscape)) Result += Set;
    ABytes.remove_prefix(std::min(Taken, ABytes.size()));
  }
  return Result;
}

}  // namespace zq
