#include "common/uZqMD5.h"

#include <gmock/gmock.h>

#include "tests/support/support.h"

namespace zq {
namespace {

TEST(Md5, VectorsOfTheStandard) {
  const std::pair<const char*, const char*> Cases[] = {{"", "D41D8CD98F00B204E9800998ECF8427E"},
      {"a", "0CC175B9C0F1B6A831C399E269772661"}, {"abc", "900150983CD24FB0D6963F7D28E17F72"},
      {"message digest", "F96B697D7CB7938D525A2F31AAF161D0"},
      {"abcdefghijklmnopqrstuvwxyz", "C3FCD3D76192E4007DFB496CCA67E13B"},
      {"ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789", "D174AB98D277D9F5A5611C2C9F419D9F"},
      {"12345678901234567890123456789012345678901234567890123456789012345678901234567890",
          "57EDF4A22BE3C955AC49DA2E2107B67A"}};
  for (const auto& [Text, Digest] : Cases) EXPECT_EQ(MD5Hash(Text), Digest);
}

TEST(Md5, WideTextIsItsUnits) {
  EXPECT_EQ(MD5Hash(WideString(u"ab\u0141")), MD5Hash(std::string_view("a\0b\0\x41\x01", 6)));
  EXPECT_EQ(MD5Hash(u""), MD5Hash(""));
}

// A digest of the first ACut bytes and the rest of them, and what is in the context behind it.
TMD5Digest InTwo(std::string_view AText, std::size_t ACut) {
  TMD5Context Context;
  MD5Init(Context);
  MD5Update(Context, AText.substr(0, ACut));
  TMD5Context Copy = Context;
  MD5Update(Copy, AText.data() + ACut, static_cast<NativeInt>(AText.size() - ACut));
  TMD5Digest Result;
  MD5Final(Copy, Result);
  EXPECT_TRUE(Copy.State == TMD5State() && Copy.Count == TMD5Count() && Copy.Buffer == TMD5Buffer());
  return Result;
}

TEST(Md5, WhereverItIsCut) {
  std::string Text;
  for (std::size_t Length = 0; Length <= 200; ++Length, Text += static_cast<char>(Length * 151 >> 2))
    for (std::size_t Cut = 0; Cut <= Length; ++Cut)
      ASSERT_EQ(InTwo(Text, Cut), MD5Hash(Text.data(), static_cast<NativeInt>(Length))) << Length << " at " << Cut;
}

TEST(Md5, TheContextIsAsTold) {
  TMD5Context Context;
  Context.Buffer.fill(1);
  MD5Init(Context);
  EXPECT_EQ(Context.State, (TMD5State{0x67452301, 0xEFCDAB89, 0x98BADCFE, 0x10325476}));
  EXPECT_TRUE(Context.Count == TMD5Count() && Context.Buffer == TMD5Buffer());
  MD5Update(Context, nullptr, 0);
  MD5Update(Context, "abc", 3);
  EXPECT_EQ(Context.Count, (TMD5Count{24, 0}));
  EXPECT_EQ(std::string(Context.Buffer.begin(), Context.Buffer.begin() + 4), std::string("abc\0", 4));
  Context.Count = {0xFFFFFE18, 7};  // 61 bytes below the carry, of which 3 are held back
  MD5Update(Context, std::string(61, 'x').data(), 61);
  EXPECT_EQ(Context.Count, (TMD5Count{0, 8}));
}

TEST(Md5, RefusesASizeThatIsNone) {
  TMD5Context Context;
  MD5Init(Context);
  for (const auto& Action :
      std::vector<std::function<void()>>{[] { (void)MD5Hash("x", -1); }, [] { (void)MD5Hash(nullptr, 1); },
          [&] { MD5Update(Context, "x", -1); }, [&] { MD5Update(Context, nullptr, 1); }})
    EXPECT_THAT(RaisedBy(Action).ToUTF8(), testing::StartsWith("EAssertionFailed"));
}

}  // namespace
}  // namespace zq
