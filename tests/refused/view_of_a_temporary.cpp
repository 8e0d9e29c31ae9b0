#include "runtime/core/strings.h"

zq::UnicodeString Text();

void Keep() {
  const std::u16string_view Kept = Text();
  static_cast<void>(Kept);
}
