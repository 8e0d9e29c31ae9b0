// Conversions of arbitrary bytes under an arbitrary code page: never past a buffer, and sizing, filling and the string
// forms agree. The first two bytes tell the code page, the third the size of the short buffers.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <iterator>
#include <string_view>
#include <vector>

#include "common/uZqTypes.h"

using namespace zq;

namespace {

void Require(bool ACondition) {
  if (!ACondition) std::abort();
}

// One page of each shape, or any number.
Word PageOf(Byte AFirst, Byte ASecond) {
  constexpr Word cPages[] = {0, 437, 932, 936, 949, 950, 1200, 1201, 1252, 1361, 12000, 12001, 20127, 20932, 50220,
      50225, 51936, 52936, 54936, 57002, 65000, 65001};
  return AFirst < std::size(cPages) ? cPages[AFirst] : static_cast<Word>(AFirst | ASecond << 8);
}

// A fresh block of exactly that size, so that the sanitizer sees a step beyond it.
template <class T>
std::vector<T> Block(Integer ACount) {
  return std::vector<T>(static_cast<std::size_t>(ACount));
}

void CheckBack(const UnicodeString& AText, Word ACodePage, Integer AShort) {
  const Integer Needed = TZqEncoding::ConvertW(AText.data(), AText.Length(), nullptr, 0, ACodePage);
  auto Bytes = Block<Byte>(Needed);
  if (Needed > 0) {
    Require(TZqEncoding::ConvertW(AText.data(), AText.Length(), Bytes.data(), Needed, ACodePage) == Needed);
    Require(TZqEncoding::ConvertW(AText, ACodePage).Length() == Needed);
  }
  auto Small = Block<Byte>(AShort + 1);
  Require(TZqEncoding::ConvertW(AText.data(), AText.Length(), Small.data(), AShort + 1, ACodePage) <= AShort + 1);
  if (ACodePage == 65001 && Needed > 0) {
    const UnicodeString Again = TZqEncoding::ConvertA(Bytes.data(), Needed, ACodePage);
    Require(TZqEncoding::ConvertW(Again, ACodePage).View() ==
            std::string_view(reinterpret_cast<const char*>(Bytes.data()), Bytes.size()));
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* AData, std::size_t ASize) {
  if (ASize < 3 || ASize > 4096) return 0;
  const Word CodePage = PageOf(AData[0], AData[1]);
  const Integer Short = AData[2] % 32;
  const std::vector<Byte> Source(AData + 3, AData + ASize);
  const auto Size = static_cast<Integer>(Source.size());
  const Integer Needed = TZqEncoding::ConvertA(Source.data(), Size, CodePage, nullptr, 0);
  auto Wide = Block<WideChar>(Needed);
  if (Needed > 0) {
    Require(TZqEncoding::ConvertA(Source.data(), Size, CodePage, Wide.data(), Needed) == Needed);
    Require(
        TZqEncoding::ConvertA(Source.data(), Size, CodePage).View() == std::u16string_view(Wide.data(), Wide.size()));
    CheckBack(UnicodeString(Wide.data(), Wide.size()), CodePage, Short);
  }
  auto Small = Block<WideChar>(Short + 1);
  Require(TZqEncoding::ConvertA(Source.data(), Size, CodePage, Small.data(), Short + 1) <= Short + 1);
  CheckBack(TZqEncoding::ConvertB(Source.data(), Source.size(), 1200), CodePage, Short);  // any units at all
  Require(ZqGetCodePage(Source.data(), Size) != 1);
  return 0;
}
