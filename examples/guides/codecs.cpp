#include "common/uZqBase64.h"
#include "common/uZqClasses.h"
#include "common/uZqUUCode.h"

int main() {
  using namespace zq;
  const TBytes Key = ZqHexToBuf("0aFF10");
  const AnsiString Text = ZqEncodeBase64(Key);
  const AnsiString Either = ZqBufToString(Key, beHexEncoded);

  const AnsiString Block = ZqUUEncode("some bytes", u"notes.txt", 644);
  TMemoryStream Bytes;
  const TZqUUData Told = ZqUUDecode(Block, u"notes.txt", &Bytes);  // or without the name: the first line is the header

  const bool Right = Text == "Cv8Q" && ZqDecodeBase64(Text) == Key && Either == "0AFF10";
  return Right && Told.Mode == 644 && Bytes.Size() == 10 ? 0 : 1;
}
