#include "runtime/text/casing.h"

#include <unicode/uchar.h>
#include <unicode/utf16.h>

#include "runtime/core/utf8.h"

namespace zq {

namespace {

// A character whose counterpart lies on the other side of U+FFFF keeps its place and stays as it is.
template <class TMap>
UnicodeString MapEach(UnicodeString AText, std::size_t AFrom, TMap AMap) {
  std::u16string& Text = AText.Str();
  for (std::size_t i = AFrom; i < Text.size();) {
    UChar32 c = 0;
    const std::size_t At = i;
    U16_NEXT(Text.data(), i, Text.size(), c);
    const UChar32 Mapped = AMap(c);
    if (U16_LENGTH(Mapped) != U16_LENGTH(c)) continue;
    std::size_t To = At;
    U16_APPEND_UNSAFE(Text.data(), To, Mapped);
  }
  return AText;
}

}  // namespace

UnicodeString AnsiUpperCase(UnicodeString AText) {
  const std::size_t Ascii = utf8::AsciiRun(AText.data(), AText.size());
  return MapEach(UpperCase(std::move(AText)), Ascii, u_toupper);
}

UnicodeString AnsiLowerCase(UnicodeString AText) {
  const std::size_t Ascii = utf8::AsciiRun(AText.data(), AText.size());
  return MapEach(LowerCase(std::move(AText)), Ascii, u_tolower);
}

bool AnsiSameText(const UnicodeString& A, const UnicodeString& B) {
  return A.size() == B.size() && (A == B || AnsiUpperCase(A) == AnsiUpperCase(B));
}

}  // namespace zq
