#include <string>

#include "common/uZqBase64.h"
#include "common/uZqClasses.h"
#include "common/uZqMD5.h"
#include "common/uZqSha1.h"
#include "common/uZqUUCode.h"
#include "common/uZqZLib.h"

static bool ShowDigests() {
  using namespace zq;
  const AnsiString Program = ZqHashFile(u"/proc/self/exe", beHexEncoded);
  const AnsiString Short = ZqHashStringA("abc", beBase64);

  TMD5Context Context;
  MD5Init(Context);
  for (const char* Piece : {"a", "bc"}) MD5Update(Context, Piece);
  TMD5Digest Digest;
  MD5Final(Context, Digest);
  return Program.Length() == 40 && Short == "qZk+NkcGgWq6PiVxeFDCbJzQ2J0=" && Digest == MD5Hash("abc", 3);
}

static bool ShowDeflate(const zq::AnsiString& Text) {
  using namespace zq;
  TMemoryStream Packed;
  TZqZLibCompressionStream Zip(&Packed, clMax);
  Zip.WriteBuffer(Text.data(), Text.Length());
  Zip.Finish();

  Packed.SetPosition(0);
  TZqZLibDecompressionStream Unzip(&Packed);
  std::string Back(100, ' ');
  Back.resize(static_cast<std::size_t>(Unzip.Read(Back.data(), 100)));
  return Text == Back && Unzip.AtEnd();
}

int main() {
  using namespace zq;
  const TBytes Key = ZqHexToBuf("0aFF10");
  const AnsiString Text = ZqEncodeBase64(Key);
  const AnsiString Either = ZqBufToString(Key, beHexEncoded);

  const AnsiString Block = ZqUUEncode("some bytes", u"notes.txt", 644);
  TMemoryStream Bytes;
  const TZqUUData Told = ZqUUDecode(Block, u"notes.txt", &Bytes);  // or without the name: the first line is the header

  const bool Right = Text == "Cv8Q" && ZqDecodeBase64(Text) == Key && Either == "0AFF10" && Told.Mode == 644;
  return Right && Bytes.Size() == 10 && ShowDigests() && ShowDeflate(Text) ? 0 : 1;
}
