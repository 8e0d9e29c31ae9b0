#include "runtime/core/strings.h"

zq::UTF8String Text();

void Keep() {
  const char* const Kept = Text().c_str();
  static_cast<void>(Kept);
}
