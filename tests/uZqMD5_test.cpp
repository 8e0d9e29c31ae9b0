#include "common/uZqMD5.h"

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
  EXPECT_EQ(MD5Hash(WideString(u"\u0141")), MD5Hash("\x41\x01"));
}

TEST(Md5, TheContextIsAsToldByteByByte) {
  TMD5Context Context;
  Context.Buffer.fill(1);
  MD5Init(Context);
  EXPECT_TRUE(Context.State[3] == 0x10325476 && Context.Count == TMD5Count() && Context.Buffer == TMD5Buffer());
  MD5Update(Context, nullptr, 0);
  const std::string Text(200, 'x');
  for (const char& c : Text) MD5Update(Context, &c, 1);
  EXPECT_EQ(Context.Count, (TMD5Count{1600, 0}));
  TMD5Context Carried = Context;
  Carried.Count[0] = 0xFFFFFE40;  // 56 bytes below the carry, of which 8 are held back
  MD5Update(Carried, Text.substr(0, 56));
  EXPECT_EQ(Carried.Count, (TMD5Count{0, 1}));
  TMD5Digest Digest;
  MD5Final(Context, Digest);
  EXPECT_EQ(Digest, MD5Hash(Text.data(), 200));
  EXPECT_TRUE(Context.State == TMD5State() && Context.Count == TMD5Count() && Context.Buffer == TMD5Buffer());
  EXPECT_THROW(MD5Update(Context, "x", -1), EAssertionFailed);
  EXPECT_THROW(MD5Update(Context, nullptr, 1), EAssertionFailed);
  EXPECT_THROW((void)MD5Hash("x", -1), EAssertionFailed);
}

}  // namespace
}  // namespace zq
