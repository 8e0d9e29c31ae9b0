#include "common/uZqSha1.h"

#include <gmock/gmock.h>

#include "common/uZqSha1/portable.h"
#include "runtime/io/streams.h"
#include "tests/support/support.h"

namespace zq {
namespace {

constexpr auto cZeros = "AAAAAAAAAAAAAAAAAAAAAAAAAAA=";
constexpr auto cAbc = "qZk+NkcGgWq6PiVxeFDCbJzQ2J0=";

// On both paths.
AnsiString HexOf(std::string_view AText) {
  const auto Portable = sha1::Hash(reinterpret_cast<const Byte*>(AText.data()), AText.size(), sha1::AddBlocks);
  EXPECT_EQ(ZqHashBuffer(AText.data(), static_cast<NativeInt>(AText.size())), Portable);
  EXPECT_EQ(ZqHashStringA(AText, beBase64), ZqBufToString(Portable.data(), Portable.size(), beBase64));
  return ZqHashStringA(AText, beHexEncoded);
}

TEST(Sha1, VectorsOfTheStandard) {
  EXPECT_EQ(HexOf("abc"), "A9993E364706816ABA3E25717850C26C9CD0D89D");
  EXPECT_EQ(
      HexOf("abcdbcdecdefdefgefghfghighijhijkijkljklmklmnlmnomnopnopq"), "84983E441C3BD26EBAAE4AA1F95129E5E54670F1");
  EXPECT_EQ(HexOf(std::string(1'000'000, 'a')), "34AA973CD4C4DAA4F61EEB2BDBAD27316534016F");
}

TEST(Sha1, NothingHasNoDigest) {
  TSHA1Digest Digest;
  Digest.fill(1);
  ZqHashString(u"", Digest);
  EXPECT_EQ(Digest, TSHA1Digest());
  EXPECT_EQ(ZqHashBuffer(nullptr, 0), TSHA1Digest());
  for (const TZqBinEncoding Encoding : {beBase64, beHexEncoded})
    for (const AnsiString& Text : {ZqHashBuffer(nullptr, 0, Encoding), ZqHashString(u"", Encoding),
             ZqHashStringW(u"", Encoding), ZqHashStringA("", Encoding)})
      EXPECT_EQ(Text, "");
}

TEST(Sha1, WideTextIsItsUnits) {
  const std::string_view Units("a\0b\0\x41\x01", 6);
  TSHA1Digest Digest;
  ZqHashString(u"ab\u0141", Digest);
  EXPECT_EQ(Digest, ZqHashBuffer(Units.data(), 6));
  EXPECT_EQ(ZqHashString(u"ab\u0141", beHexEncoded), ZqHashBuffer(Units.data(), 6, beHexEncoded));
  EXPECT_EQ(ZqHashStringW(WideString(u"ab\u0141"), beBase64), ZqHashStringA(Units, beBase64));
}

TEST(Sha1, RefusesASizeThatIsNone) {
  for (const auto& Action : std::vector<std::function<void()>>{[] { (void)ZqHashBuffer("x", -1); },
           [] { (void)ZqHashBuffer("x", -1, beBase64); }, [] { (void)ZqHashBuffer(nullptr, 1); },
           [] { (void)ZqHashStream(nullptr, true); }})
    EXPECT_THAT(RaisedBy(Action).ToUTF8(), testing::StartsWith("EAssertionFailed"));
}

TEST(Sha1, AStreamIsTakenFromThePositionOrTheStart) {
  TStringStream Stream{AnsiString("xabc")};
  Stream.SetPosition(1);
  EXPECT_EQ(ZqHashStream(&Stream, false), cAbc);
  EXPECT_EQ(Stream.Position(), 4);
  EXPECT_EQ(ZqHashStream(&Stream, false), cZeros);
  EXPECT_EQ(ZqHashStream(&Stream, true), ZqHashStringA("xabc", beBase64));
}

// Says that it has Told bytes, gives at most Step of those of Content at a time, and fails at the Read numbered FailAt.
struct TScriptedStream final : TStream {
  Integer Read(void* ABuffer, Integer ACount) override {
    Asked.push_back(ACount);
    if (static_cast<int>(Asked.size()) == FailAt) throw EReadError(u"broken");
    const std::size_t Count =
        Content.copy(static_cast<char*>(ABuffer), std::min(static_cast<std::size_t>(ACount), Step), At);
    At += Count;
    return static_cast<Integer>(Count);
  }
  Integer Write(const void*, Integer) override { return 0; }
  Int64 Seek(Int64, TSeekOrigin) override { return static_cast<Int64>(At); }
  Int64 GetSize() override { return Told; }
  std::string Content;
  Int64 Told = 0;
  std::size_t Step = 0, At = 0;
  int FailAt = 0;
  std::vector<Integer> Asked;
};

TEST(Sha1, ReadsOnceUnlessTheSizePromisedMoreOrNothing) {
  struct TCase {
    Int64 Told;
    std::size_t Step, At;
    std::vector<Integer> Asked;
  };
  const std::size_t All = 100'000;
  const TCase Cases[] = {{100'000, All, 0, {100'000}}, {100'000, All, 40'000, {100'000}},
      {100'000, 40'000, 0, {100'000, 60'000, 20'000}}, {200'000, All, 0, {200'000, 100'000}},
      {0, All, 0, {65'536, 65'536, 31'072}}, {-1, All, 99'999, {65'536, 65'535}}};
  for (const TCase& Case : Cases) {
    TScriptedStream Stream;
    for (std::size_t i = 0; i < All; ++i) Stream.Content += static_cast<char>(i * 151 >> 2);
    Stream.Told = Case.Told;
    Stream.Step = Case.Step;
    Stream.At = Case.At;
    const AnsiString Digest = ZqHashStream(&Stream, false);
    EXPECT_EQ(Digest, ZqHashStringA(std::string_view(Stream.Content).substr(Case.At), beBase64));
    EXPECT_EQ(Stream.Asked, Case.Asked);
    Stream.At = 0;
    Stream.FailAt = static_cast<int>(Stream.Asked.size()) + 1;
    EXPECT_EQ(RaisedBy([&] { (void)ZqHashStream(&Stream, false); }), u"EReadError: broken");
  }
}

TEST(Sha1, FilesAndWhatIsNone) {
  const TTempFolder Folder;
  Folder.Write("abc", "abc");
  Folder.Write("empty", "");
  const TFileStream Owner(Folder.File("abc"), fmOpenReadWrite | fmShareExclusive);
  EXPECT_EQ(ZqHashFile(Folder.File("abc"), beHexEncoded), "A9993E364706816ABA3E25717850C26C9CD0D89D");
  EXPECT_EQ(ZqHashFile(Folder.File("abc"), beBase64), cAbc);
  EXPECT_EQ(ZqHashFile(Folder.File("empty"), beHexEncoded), std::string(40, '0'));
  const std::pair<UnicodeString, std::string> Cases[] = {{Folder.File("none"), "EFOpenError: .*No such file.*"},
      {Folder.File("."), "EFOpenError: .*Is a directory"}, {u"/proc/self/mem", "EReadError: Input/output error"}};
  for (const auto& Case : Cases)
    EXPECT_THAT(RaisedBy([&] { (void)ZqHashFile(Case.first, beBase64); }).ToUTF8(), testing::MatchesRegex(Case.second));
}

}  // namespace
}  // namespace zq
