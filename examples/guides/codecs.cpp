#include "common/uZqBase64.h"
#include "common/uZqClasses.h"

int main() {
  using namespace zq;
  const TBytes Key = ZqHexToBuf("0aFF10");
  const AnsiString Text = ZqEncodeBase64(Key);
  const AnsiString Either = ZqBufToString(Key, beHexEncoded);
  return Text == "Cv8Q" && ZqDecodeBase64(Text) == Key && Either == "0AFF10" ? 0 : 1;
}
