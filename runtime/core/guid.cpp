#include "runtime/core/guid.h"

#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "runtime/core/exceptions.h"

namespace zq {

TGUID CreateGUID() {
  TGUID Result;
  if (::getentropy(&Result, sizeof Result) != 0) {
    SetLastError(static_cast<Cardinal>(errno));
    RaiseLastOSError();
  }
  Result.D3 = static_cast<std::uint16_t>((Result.D3 & 0x0FFFU) | 0x4000U);
  Result.D4[0] = static_cast<std::uint8_t>((Result.D4[0] & 0x3FU) | 0x80U);
  return Result;
}

UnicodeString GUIDToString(const TGUID& AValue) {
  char Text[39];
  const auto& D4 = AValue.D4;
  std::snprintf(Text, sizeof Text, "{%08X-%04X-%04X-%02X%02X-%02X%02X%02X%02X%02X%02X}", AValue.D1, AValue.D2,
      AValue.D3, D4[0], D4[1], D4[2], D4[3], D4[4], D4[5], D4[6], D4[7]);
  return UnicodeString::FromUTF8(Text);
}

}  // namespace zq
