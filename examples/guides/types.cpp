#include "common/uZqTypes.h"

using namespace zq;

int main() {
  constexpr Byte Buffer[] = {0xEF, 0xBB, 0xBF, 'x'};
  constexpr Integer Size = sizeof Buffer;

  const RawByteString Bytes = TZqEncoding::ConvertW(u"Grüße", 1252);  // tagged with 1252
  const UnicodeString Text = TZqEncoding::ConvertA(Bytes, 1252);
  const Word Page = ZqGetCodePage(Buffer, Size);  // by a byte order mark; 0 where there is none

  return Bytes.Length() == 5 && Text == u"Grüße" && Page == 65001 ? 0 : 1;
}
