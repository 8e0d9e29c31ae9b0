#include <gmock/gmock.h>

#include "common/uZqClasses.h"
#include "runtime/core/objects.h"
#include "runtime/io/streams.h"
#include "tests/support/support.h"

namespace zq {
namespace {

using testing::ElementsAre, testing::StartsWith;

TEST(Hex, TwoDigitsAByteOfEitherCaseAndNoOddOne) {
  TStringStream Stream{AnsiString("x\x1A\xF0")};
  Stream.SetPosition(1);
  EXPECT_EQ(ZqBufToHex(&Stream), "1AF0");
  EXPECT_TRUE(Stream.Position() == 3 && ZqBufToHex(&Stream).IsEmpty());
  EXPECT_EQ(ZqBufToHex(TBytes{0x00, 0x0A, 0x9F, 0xFF}), "000A9FFF");
  EXPECT_THAT(ZqHexToBuf("0a9fFAc"), ElementsAre(0x0A, 0x9F, 0xFA));
}

TEST(Hex, RefusesAPairThatIsNoNumberBehindWhatWasWritten) {
  for (const char* const Pair : {"GG", "0g", "/0", ":0", "@0", "`0", " 0", "0 ", "x0", "-1", "\u00E9"}) {
    TStringStream Dest;
    EXPECT_EQ(RaisedBy([&] { ZqHexToBuf(std::string("4142") + Pair + "43", &Dest); }),
        u"EConvertError: '$" + FromUTF8(Pair) + u"' is not a valid integer value");
    EXPECT_EQ(Dest.DataString(), u"AB");
  }
  EXPECT_THAT(RaisedBy([] { ZqHexToBuf("", nullptr); }).ToUTF8(), StartsWith("EAssertionFailed: Assertion failure"));
}

TEST(Hex, DispatchersGoByTheEncoding) {
  for (const auto& [Encoding, Text] : {std::pair(beHexEncoded, "666F6F"), {beBase64, "Zm9v"}}) {
    TStringStream Source{AnsiString("foo")}, Dest;
    ZqStringToBuf(Text, Encoding, &Dest);
    EXPECT_EQ(Dest.DataString(), u"foo");
    EXPECT_EQ(ZqBufToString(&Source, Encoding), Text);
    EXPECT_EQ(ZqBufToString(ZqStringToBuf(Text, Encoding), Encoding), Text);
    NativeUInt Size = 0;
    const std::unique_ptr<void, decltype(&FreeMem)> Block(ZqStringToBuf(Text, Encoding, Size), &FreeMem);
    EXPECT_EQ(ZqBufToString(Block.get(), Size, Encoding), Text);
    EXPECT_TRUE(ZqStringToBuf("", Encoding, Size) == nullptr && Size == 0);
    EXPECT_TRUE(ZqBufToString(nullptr, 0, Encoding).IsEmpty());
  }
}

}  // namespace
}  // namespace zq
