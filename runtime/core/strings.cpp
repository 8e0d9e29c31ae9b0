#include "runtime/core/strings.h"

#include <algorithm>

#include "runtime/core/utf8.h"

namespace zq {

namespace {

constexpr char16_t LowerAscii(char16_t AChar) noexcept {
  return AChar >= u'A' && AChar <= u'Z' ? static_cast<char16_t>(AChar + 32) : AChar;
}
constexpr char16_t UpperAscii(char16_t AChar) noexcept {
  return AChar >= u'a' && AChar <= u'z' ? static_cast<char16_t>(AChar - 32) : AChar;
}

// The part of a string of ALength that an index from 1 and a count name, clipped at both ends.
struct TSlice {
  TSlice(std::size_t ALength, Integer AIndex, Integer ACount) {
    if (AIndex < 1) AIndex = 1;
    From = std::min(ALength, static_cast<std::size_t>(AIndex - 1));
    Count = ACount <= 0 ? 0 : std::min(ALength - From, static_cast<std::size_t>(ACount));
  }
  std::size_t From;
  std::size_t Count;
};

std::size_t FindText(
    std::u16string_view AText, std::u16string_view ASub, std::size_t AFrom, bool AIgnoreCase) noexcept {
  if (!AIgnoreCase) return AText.find(ASub, AFrom);
  const auto Found = std::search(AText.begin() + static_cast<std::ptrdiff_t>(AFrom), AText.end(), ASub.begin(),
      ASub.end(), [](char16_t a, char16_t b) { return LowerAscii(a) == LowerAscii(b); });
  return Found == AText.end() ? std::u16string_view::npos : static_cast<std::size_t>(Found - AText.begin());
}

}  // namespace

UnicodeString UnicodeString::FromUTF8(std::string_view AText) { return utf8::Decode(AText); }

UnicodeString UnicodeString::FromUTF8(std::u8string_view AText) {
  return FromUTF8(std::string_view(reinterpret_cast<const char*>(AText.data()), AText.size()));
}

std::string UnicodeString::ToUTF8() const { return utf8::Encode(FText); }

UnicodeString UnicodeString::Copy(Integer AIndex, Integer ACount) const { return zq::Copy(*this, AIndex, ACount); }

Integer UnicodeString::Pos(std::u16string_view ASub) const noexcept { return zq::Pos(ASub, FText); }

const UnicodeString& TText::Make(UnicodeString& ARoom) const {
  std::u16string& Text = ARoom.Str();
  if (FForm == Wide) {
    Text.assign(static_cast<const char16_t*>(FData), FSize);
  } else {
    Text.resize(FSize);
    const auto Malformed = FForm == Path ? utf8::TMalformed::Escape : utf8::TMalformed::Replace;
    Text.resize(utf8::Decode(static_cast<const char*>(FData), FSize, Text.data(), Malformed));
  }
  return ARoom;
}

void TagCodePage(RawByteString& AString, Word ACodePage) noexcept { AString.Tag(ACodePage); }

UTF8String UTF8Encode(const UnicodeString& AText) { return AText.ToUTF8(); }

UnicodeString Copy(const UnicodeString& AText, Integer AIndex, Integer ACount) {
  const TSlice Slice(AText.size(), AIndex, ACount);
  return AText.View().substr(Slice.From, Slice.Count);
}

AnsiString Copy(const AnsiString& AText, Integer AIndex, Integer ACount) {
  const TSlice Slice(AText.size(), AIndex, ACount);
  return AText.View().substr(Slice.From, Slice.Count);
}

Integer Pos(std::u16string_view ASub, std::u16string_view AText) noexcept {
  if (ASub.empty()) return 0;
  const std::size_t Found = AText.find(ASub);
  return Found == std::u16string_view::npos ? 0 : static_cast<Integer>(Found) + 1;
}

UnicodeString Trim(const UnicodeString& AText) {
  std::u16string_view Result = AText;
  while (!Result.empty() && Result.front() <= u' ') Result.remove_prefix(1);
  while (!Result.empty() && Result.back() <= u' ') Result.remove_suffix(1);
  return Result;
}

UnicodeString LowerCase(UnicodeString AText) {
  std::transform(AText.begin(), AText.end(), AText.begin(), LowerAscii);
  return AText;
}

UnicodeString UpperCase(UnicodeString AText) {
  std::transform(AText.begin(), AText.end(), AText.begin(), UpperAscii);
  return AText;
}

Integer CompareText(std::u16string_view A, std::u16string_view B) noexcept {
  const std::size_t Common = std::min(A.size(), B.size());
  for (std::size_t i = 0; i < Common; ++i) {
    const Integer Difference = UpperAscii(A[i]) - UpperAscii(B[i]);
    if (Difference != 0) return Difference;
  }
  return static_cast<Integer>(A.size()) - static_cast<Integer>(B.size());
}

bool SameText(std::u16string_view A, std::u16string_view B) noexcept {
  return A.size() == B.size() && CompareText(A, B) == 0;
}

UnicodeString StringReplace(
    const UnicodeString& AText, const UnicodeString& AOld, const UnicodeString& ANew, TReplaceFlags AFlags) {
  if (AOld.IsEmpty()) return AText;
  UnicodeString Result;
  std::size_t From = 0;
  for (;;) {
    const std::size_t Found = FindText(AText, AOld, From, AFlags.Contains(rfIgnoreCase));
    if (Found == std::u16string_view::npos) break;
    Result += AText.View().substr(From, Found - From);
    Result += ANew;
    From = Found + AOld.size();
    if (!AFlags.Contains(rfReplaceAll)) break;
  }
  return Result += AText.View().substr(From);
}

}  // namespace zq
