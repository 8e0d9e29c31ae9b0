#include "common/uZqSha1.h"

#include "common/uZqSha1/portable.h"
#include "runtime/io/streams.h"
#include "tests/support/support.h"

namespace zq {
namespace {

TEST(Sha1, VectorsOfTheStandardOnBothPaths) {
  const std::pair<std::string, const char*> Cases[] = {{"abc", "A9993E364706816ABA3E25717850C26C9CD0D89D"},
      {"abcdbcdecdefdefgefghfghighijhijkijkljklmklmnlmnomnopnopq", "84983E441C3BD26EBAAE4AA1F95129E5E54670F1"},
      {std::string(1'000'000, 'a'), "34AA973CD4C4DAA4F61EEB2BDBAD27316534016F"}};
  for (const auto& [Text, Digest] : Cases) {
    const auto Portable = sha1::Hash(reinterpret_cast<const Byte*>(Text.data()), Text.size(), sha1::AddBlocks);
    EXPECT_EQ(ZqBufToHex(Portable.data(), Portable.size()), Digest);
    EXPECT_EQ(ZqHashStringA(Text, beHexEncoded), Digest);
  }
}

TEST(Sha1, NothingHasNoDigestAndWideTextIsItsUnits) {
  TSHA1Digest Digest;
  ZqHashString(u"\u0141", Digest);
  EXPECT_EQ(Digest, ZqHashBuffer("\x41\x01", 2));
  EXPECT_EQ(ZqHashStringW(WideString(u"\u0141"), beBase64), ZqHashBuffer("\x41\x01", 2, beBase64));
  ZqHashString(u"", Digest);
  EXPECT_EQ(Digest, TSHA1Digest());
  EXPECT_EQ(ZqHashBuffer(nullptr, 0, beHexEncoded), "");
  EXPECT_THROW((void)ZqHashBuffer("x", -1, beBase64), EAssertionFailed);
  EXPECT_THROW((void)ZqHashBuffer(nullptr, 1), EAssertionFailed);
}

// Says that it has Told bytes and gives at most Step of Content's at a time; with a Step of 0 it fails.
struct TScriptedStream final : TStream {
  Integer Read(void* ABuffer, Integer ACount) override {
    if (Step == 0) throw EReadError(u"broken");
    Asked.push_back(ACount);
    const auto Count = Content.copy(static_cast<char*>(ABuffer), std::min(static_cast<std::size_t>(ACount), Step), At);
    At += Count;
    return static_cast<Integer>(Count);
  }
  Integer Write(const void*, Integer) override { return 0; }
  Int64 Seek(Int64, TSeekOrigin) override { return static_cast<Int64>(At); }
  Int64 GetSize() override { return Told; }
  std::string Content = std::string(60'000, 'x') + std::string(40'000, 'y');
  Int64 Told = 0;
  std::size_t Step = 0, At = 0;
  std::vector<Integer> Asked;
};

TEST(Sha1, ReadsOnceUnlessTheSizePromisedMoreOrNothing) {
  const std::tuple<Int64, std::size_t, std::size_t, std::vector<Integer>> Cases[] = {{100'000, 100'000, 0, {100'000}},
      {100'000, 100'000, 40'000, {100'000}}, {100'000, 40'000, 0, {100'000, 60'000, 20'000}},
      {200'000, 100'000, 0, {200'000, 100'000}}, {0, 100'000, 0, {65'536, 65'536, 31'072}},
      {-1, 100'000, 99'999, {65'536, 65'535}}};
  for (const auto& [Told, Step, At, Asked] : Cases) {
    TScriptedStream Stream;
    Stream.Told = Told;
    EXPECT_THROW((void)ZqHashStream(&Stream, false), EReadError);
    Stream.Step = Step;
    Stream.At = At;
    EXPECT_EQ(ZqHashStream(&Stream, false), ZqHashStringA(std::string_view(Stream.Content).substr(At), beBase64));
    EXPECT_EQ(Stream.Asked, Asked);
  }
}

TEST(Sha1, StreamsAndFilesAndWhatIsNone) {
  TStringStream Stream{AnsiString("xabc")};
  Stream.SetPosition(1);
  EXPECT_EQ(ZqHashStream(&Stream, false), "qZk+NkcGgWq6PiVxeFDCbJzQ2J0=");
  EXPECT_EQ(ZqHashStream(&Stream, false), "AAAAAAAAAAAAAAAAAAAAAAAAAAA=");
  EXPECT_EQ(ZqHashStream(&Stream, true), ZqHashStringA("xabc", beBase64));
  const TTempFolder Folder({"abc"});
  const TFileStream Owner(Folder.File("abc"), fmOpenReadWrite | fmShareExclusive);
  EXPECT_EQ(ZqHashFile(Folder.File("abc"), beHexEncoded), ZqHashStringA("abc", beHexEncoded));
  EXPECT_EQ(ZqHashFile(u"/dev/null", beHexEncoded), std::string(40, '0'));
  EXPECT_THROW((void)ZqHashFile(Folder.File("."), beBase64), EFOpenError);
  EXPECT_EQ(RaisedBy([] { (void)ZqHashFile(u"/proc/self/mem", beBase64); }), u"EReadError: Input/output error");
}

}  // namespace
}  // namespace zq
