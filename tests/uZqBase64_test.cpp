#include "common/uZqBase64.h"

#include <gmock/gmock.h>

#include <bitset>

#include "common/uZqBase64/portable.h"
#include "common/uZqClasses/streams.h"
#include "runtime/io/streams.h"
#include "tests/support/support.h"

namespace zq {
namespace {

constexpr auto cRefusal = u"Exception: Invalid Base64 data!";
constexpr std::string_view cCharacters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

TBytes BitByBit(std::string_view AText) {
  std::string Bits;
  for (const char c : AText)
    if (const auto Value = cCharacters.find(c); Value != cCharacters.npos) Bits += std::bitset<6>(Value).to_string();
  TBytes Result(Bits.size() / 8);
  for (std::size_t i = 0; i < Result.size(); ++i)
    Result[i] = static_cast<Byte>(std::bitset<8>(Bits, 8 * i, 8).to_ulong());
  return Result;
}

// On both paths; the portable one into a block that ends where its memory does.
void ExpectDecoded(std::string_view AText, const TBytes& AExpected) {
  TBytes Portable(base64::DecodedCapacity(AText.size()));
  Portable.resize(base64::Decode(AText, Portable.data()));
  ASSERT_EQ(Portable, AExpected) << AText;
  ASSERT_EQ(ZqDecodeBase64(AText), AExpected) << AText;
}

TEST(Base64, VectorsOfTheStandard) {
  const std::pair<std::string, std::string> Cases[] = {{"", ""}, {"f", "Zg=="}, {"fo", "Zm8="}, {"foo", "Zm9v"},
      {"foob", "Zm9vYg=="}, {"fooba", "Zm9vYmE="}, {"foobar", "Zm9vYmFy"}};
  for (const auto& [Plain, Text] : Cases) {
    EXPECT_EQ(ZqEncodeBase64(Plain), Text);
    EXPECT_EQ(ZqDecodeBase64(WideString(FromUTF8(Text))), TBytes(Plain.begin(), Plain.end()));
  }
}

TEST(Base64, EveryLengthAndAlignmentOnEitherPath) {
  for (std::size_t Length = 0; Length <= 200; ++Length)
    for (std::size_t Shift = 0; Shift < 32; ++Shift) {
      TBytes Block(Shift + Length);
      for (std::size_t i = 0; i < Block.size(); ++i) Block[i] = static_cast<Byte>((i + Length) * 151 >> 2);
      const Byte* const Bytes = Block.data() + Shift;
      std::vector<char> Room(Shift + base64::EncodedSize(Length));
      base64::Encode(Bytes, Length, Room.data() + Shift);
      const std::string_view Text(Room.data() + Shift, Room.size() - Shift);
      ASSERT_EQ(ZqEncodeBase64(Bytes, Length), Text);
      ASSERT_EQ(Text.substr(std::min(Text.size(), (8 * Length + 5) / 6)), std::string_view("==", (3 - Length % 3) % 3));
      ASSERT_EQ(BitByBit(Text), TBytes(Bytes, Bytes + Length));
      ASSERT_NO_FATAL_FAILURE(ExpectDecoded(Text, TBytes(Bytes, Bytes + Length)));
    }
}

TEST(Base64, SkipsEveryByteThatIsNotInTheAlphabetWhereverItStands) {
  for (std::size_t Place = 0; Place < 96; ++Place)
    for (int Value = 0; Value < 256; ++Value) {
      std::string Text;
      for (std::size_t i = 0; i < 96; ++i) Text += i == Place ? static_cast<char>(Value) : cCharacters[i * 29 % 64];
      ASSERT_NO_FATAL_FAILURE(ExpectDecoded(Text, BitByBit(Text))) << Value << " at " << Place;
    }
}

TEST(Base64, PaddingAndLineBreaksEndNothing) {
  const std::string Line = std::string(76, 'x') + "\r\n";
  const std::string Tolerated[] = {"QQ==QQ==", "Q===", "====", "=QU=", "QUI=", Line + "QQ"};
  for (const std::string& Text : Tolerated) ExpectDecoded(Text, BitByBit(Text));
  const std::string Refused[] = {"Q", "QQ", "QUJ", "QUJD=", Line};
  for (const std::string& Text : Refused) EXPECT_EQ(RaisedBy([&] { (void)ZqDecodeBase64(Text); }), cRefusal) << Text;
}

TEST(Base64, WideTextIsItsUnitsOneWayAndCodePage0TheOther) {
  EXPECT_EQ(ZqEncodeBase64(WideString(u"\u0141")), "QQE=");
  EXPECT_EQ(ZqDecodeBase64(u"QUJD\u00E9\u00E9"), (TBytes{'A', 'B', 'C'}));  // two bytes each
  EXPECT_EQ(RaisedBy([] { (void)ZqDecodeBase64(u"QUJ\u00E9"); }), cRefusal);
}

TEST(Base64, StreamsAreTakenFromThePositionOn) {
  const TTempFolder Folder;
  TFileStream Plain(Folder.File("plain"), fmCreate), Coded(Folder.File("coded"), fmCreate);
  TStringStream Memory{AnsiString("xfoobar")};
  Memory.SetPosition(1);
  Coded.WriteBuffer("12345", 5);
  ZqEncodeBase64(&Memory, &Coded);
  EXPECT_TRUE(Memory.Position() == 1 && Coded.Position() == 13);
  Coded.SetPosition(5);
  ZqDecodeBase64(&Coded, &Plain);
  EXPECT_EQ(Folder.Read("coded") + Folder.Read("plain"), "12345Zm9vYmFyfoobar");
  EXPECT_EQ(ZqEncodeBase64(&Coded), "");
  Memory.SetPosition(8);
  EXPECT_EQ(ZqEncodeBase64(&Memory), "");
  Coded.SetPosition(0);
  EXPECT_EQ(RaisedBy([&] { ZqDecodeBase64(&Coded, &Plain); }), cRefusal);  // 13 characters
  EXPECT_THAT(RaisedBy([&] { ZqEncodeBase64(&Coded, &Coded); }).ToUTF8(), testing::StartsWith("EAssertionFailed"));
}

TEST(Base64, WorksInTheBlockOfAMemoryStream) {
  TZqMemoryStream Plain(16), Coded(16);
  Plain.WriteBuffer("xfoo", 4);
  Plain.SetPosition(1);
  Coded.WriteBuffer("12345old content of some length", 31);
  Coded.SetPosition(5);
  ZqEncodeBase64(&Plain, &Coded);
  EXPECT_TRUE(Plain.Position() == 1 && Coded.Position() == 5);
  EXPECT_EQ(ZqEncodeBase64("12345Zm9v"), ZqEncodeBase64(Coded.Buffer(), static_cast<NativeUInt>(Coded.Size())));
  ZqDecodeBase64("Zg==", &Plain);  // of the three bytes that it might be one is left
  EXPECT_EQ(Plain.Size(), 2);
}

}  // namespace
}  // namespace zq
