#include <gmock/gmock.h>

#include <memory>

#include "common/uZqClasses.h"
#include "runtime/core/objects.h"
#include "runtime/io/streams.h"
#include "tests/support/support.h"

namespace zq {
namespace {

using testing::ElementsAre;

TEST(Hex, TwoDigitsAByte) {
  const TBytes Bytes{0x00, 0x0A, 0x9F, 0xFF};
  TStringStream Stream{AnsiString("x\x1A\xF0")};
  Stream.SetPosition(1);
  EXPECT_EQ(ZqBufToHex(Bytes), "000A9FFF");
  EXPECT_EQ(ZqBufToHex(Bytes.data(), 2), "000A");
  EXPECT_EQ(ZqBufToHex(nullptr, 0), "");
  EXPECT_EQ(ZqBufToHex(&Stream), "1AF0");
  EXPECT_EQ(Stream.Position(), 3);
  EXPECT_EQ(ZqBufToHex(&Stream), "");
}

TEST(Hex, DigitsOfEitherCaseAndNoOddOne) {
  EXPECT_THAT(ZqHexToBuf("0aFf"), ElementsAre(0x0A, 0xFF));
  EXPECT_THAT(ZqHexToBuf("19AfbC"), ElementsAre(0x19, 0xAF, 0xBC));
  EXPECT_THAT(ZqHexToBuf("ABC"), ElementsAre(0xAB));
  EXPECT_THAT(ZqHexToBuf("ABG"), ElementsAre(0xAB));
  NativeUInt Size = 99;
  const std::unique_ptr<void, decltype(&FreeMem)> Block(ZqHexToBuf("4142", Size), &FreeMem);
  EXPECT_EQ(std::string(static_cast<const char*>(Block.get()), Size), "AB");
  EXPECT_TRUE(ZqHexToBuf("", Size) == nullptr && Size == 0);
}

TEST(Hex, RefusesAPairThatIsNoNumber) {
  for (const char* const Pair : {"GG", "0G", "G0", "g0", "/0", ":0", "@0", "`0", "0 ", " 0", "x0", "$0", "-1"}) {
    NativeUInt Size = 99;
    TStringStream Dest;
    const UnicodeString Complaint = u"EConvertError: '$" + FromUTF8(Pair) + u"' is not a valid integer value";
    const std::string Hex = std::string("4142") + Pair + "43";
    EXPECT_EQ(RaisedBy([&] { (void)ZqHexToBuf(Hex); }), Complaint);
    EXPECT_EQ(RaisedBy([&] { (void)ZqHexToBuf(Hex, Size); }), Complaint);
    EXPECT_EQ(RaisedBy([&] { ZqHexToBuf(Hex, &Dest); }), Complaint);
    EXPECT_TRUE(Size == 0 && Dest.DataString() == u"AB") << Pair;  // what stood before has been written
  }
  EXPECT_EQ(RaisedBy([] { (void)ZqHexToBuf("\xC3\xA9"); }), u"EConvertError: '$\u00E9' is not a valid integer value");
  EXPECT_THAT(
      RaisedBy([] { ZqHexToBuf("41", nullptr); }).ToUTF8(), testing::StartsWith("EAssertionFailed: Assertion failure"));
}

TEST(Hex, DispatchersGoByTheEncoding) {
  for (const auto& [Encoding, Text] : {std::pair(beHexEncoded, "666F6F"), {beBase64, "Zm9v"}}) {
    TStringStream Source{AnsiString("foo")}, Dest;
    EXPECT_EQ(ZqBufToString("foo", 3, Encoding), Text);
    EXPECT_EQ(ZqBufToString(TBytes{'f', 'o', 'o'}, Encoding), Text);
    EXPECT_EQ(ZqBufToString(&Source, Encoding), Text);
    EXPECT_EQ(ZqBufToString(nullptr, 0, Encoding), "");
    EXPECT_THAT(ZqStringToBuf(Text, Encoding), ElementsAre('f', 'o', 'o'));
    NativeUInt Size = 0;
    const std::unique_ptr<void, decltype(&FreeMem)> Block(ZqStringToBuf(Text, Encoding, Size), &FreeMem);
    EXPECT_EQ(std::string(static_cast<const char*>(Block.get()), Size), "foo");
    ZqStringToBuf(Text, Encoding, &Dest);
    EXPECT_EQ(Dest.DataString(), u"foo");
  }
}

}  // namespace
}  // namespace zq
