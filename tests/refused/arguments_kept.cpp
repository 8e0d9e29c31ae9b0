#include "runtime/core/varrec.h"

zq::UnicodeString Text();

void Keep() {
  const zq::TVarArgs Kept = {1, Text()};
  static_cast<void>(Kept);
}
