#include "common/uZqBase64.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <memory>

#include "common/uZqBase64/portable.h"
#include "runtime/core/objects.h"
#include "runtime/io/streams.h"
#include "tests/support/support.h"

namespace zq {
namespace {

constexpr auto cRefusal = u"Exception: Invalid Base64 data!";
constexpr std::string_view cCharacters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

// The bits of units of AFrom bits as units of ATo bits, the highest first; what doesn't fill one is filled with zeros
// or left out.
TBytes Regroup(const TBytes& AUnits, std::size_t AFrom, std::size_t ATo, bool AFill) {
  const std::size_t Bits = AUnits.size() * AFrom;
  TBytes Result((Bits + (AFill ? ATo - 1 : 0)) / ATo);
  for (std::size_t i = 0; i < std::min(Bits, Result.size() * ATo); ++i)
    if ((AUnits[i / AFrom] >> (AFrom - 1 - i % AFrom) & 1) != 0)
      Result[i / ATo] = static_cast<Byte>(Result[i / ATo] | 1U << (ATo - 1 - i % ATo));
  return Result;
}

std::string Encoded(const TBytes& ABytes) {
  std::string Result;
  for (const Byte Value : Regroup(ABytes, 8, 6, true)) Result += cCharacters[Value];
  return Result.append((4 - Result.size() % 4) % 4, '=');
}

TBytes Decoded(std::string_view AText) {
  TBytes Values;
  for (const char c : AText)
    if (const auto Value = cCharacters.find(c); Value != cCharacters.npos) Values.push_back(static_cast<Byte>(Value));
  return Regroup(Values, 6, 8, false);
}

TBytes PortablyDecoded(std::string_view AText) {
  TBytes Result(base64::DecodedCapacity(AText.size()));
  Result.resize(base64::Decode(AText, Result.data()));
  return Result;
}

std::string Text(const TBytes& ABytes) { return {ABytes.begin(), ABytes.end()}; }

std::string Rest(TStream& AStream, Int64 AFrom) {
  std::string Result(static_cast<std::size_t>(AStream.Size() - AFrom), '\0');
  AStream.SetPosition(AFrom);
  AStream.ReadBuffer(Result.data(), static_cast<Int64>(Result.size()));
  return Result;
}

TEST(Base64, VectorsOfTheStandardInAllForms) {
  const std::pair<std::string, std::string> Cases[] = {{"", ""}, {"f", "Zg=="}, {"fo", "Zm8="}, {"foo", "Zm9v"},
      {"foob", "Zm9vYg=="}, {"fooba", "Zm9vYmE="}, {"foobar", "Zm9vYmFy"}};
  for (const auto& [Plain, Base64] : Cases) {
    TStringStream Source{AnsiString(Plain)}, Coded{AnsiString(Base64)}, Dest, Back;
    ZqEncodeBase64(&Source, &Dest);
    ZqDecodeBase64(&Coded, &Back);
    EXPECT_EQ(Rest(Dest, 0) + "|" + Rest(Back, 0), Base64 + "|" + Plain);
    EXPECT_EQ(ZqEncodeBase64(&Source), Base64);  // the streams of memory have stayed at their start
    EXPECT_EQ(ZqEncodeBase64(Plain), Base64);
    EXPECT_EQ(ZqEncodeBase64(TBytes(Plain.begin(), Plain.end())), Base64);
    EXPECT_EQ(ZqEncodeBase64(Plain.data(), Plain.size()), Base64);
    EXPECT_EQ(Text(ZqDecodeBase64(Base64)) + Text(ZqDecodeBase64(WideString(FromUTF8(Base64)))), Plain + Plain);
    NativeUInt Size = 99;
    const std::unique_ptr<void, decltype(&FreeMem)> Block(ZqDecodeBase64(Base64, Size), &FreeMem);
    EXPECT_EQ(std::string(static_cast<const char*>(Block.get()), Size), Plain);
    EXPECT_EQ(Block == nullptr, Plain.empty());
  }
}

// Blocks end where their memory does, for the sanitizer to see a step beyond them.
TEST(Base64, EveryLengthAndAlignmentOnEitherPath) {
  for (std::size_t Length = 0; Length <= 200; ++Length)
    for (std::size_t Shift = 0; Shift < 32; ++Shift) {
      TBytes Block(Shift + Length);
      for (std::size_t i = 0; i < Block.size(); ++i) Block[i] = static_cast<Byte>((i + Length) * 151 >> 2);
      const TBytes Bytes(Block.begin() + static_cast<std::ptrdiff_t>(Shift), Block.end());
      const std::string Expected = Encoded(Bytes);
      std::vector<char> Room(Shift + Expected.size());
      ASSERT_EQ(base64::Encode(Block.data() + Shift, Length, Room.data() + Shift), Expected.size());
      const std::string_view Portable(Room.data() + Shift, Expected.size());
      ASSERT_EQ(Portable, Expected) << Length;
      ASSERT_EQ(ZqEncodeBase64(Block.data() + Shift, Length), Expected) << Length;
      ASSERT_TRUE(PortablyDecoded(Portable) == Bytes && ZqDecodeBase64(Portable) == Bytes) << Length;
    }
}

TEST(Base64, SkipsEveryByteThatIsNotInTheAlphabetWhereverItStands) {
  std::string Coded;
  for (std::size_t i = 0; i < 96; ++i) Coded += cCharacters[i * 29 % 64];
  for (std::size_t Place = 0; Place < Coded.size(); ++Place)
    for (int Value = 0; Value < 256; ++Value) {
      std::string Changed = Coded;
      Changed[Place] = static_cast<char>(Value);
      const TBytes Expected = Decoded(Changed);
      ASSERT_TRUE(PortablyDecoded(Changed) == Expected && ZqDecodeBase64(Changed) == Expected)
          << Value << " at " << Place;
    }
}

TEST(Base64, PaddingAndLineBreaksEndNothing) {
  EXPECT_EQ(Text(ZqDecodeBase64("QQ==QQ==")), "A\x04\x10");
  EXPECT_EQ(Text(ZqDecodeBase64("Q===") /* too little for a byte */) + Text(ZqDecodeBase64("=QU=")), "A");
  std::string Lines(76, 'A');
  EXPECT_EQ(ZqDecodeBase64(Lines + "\r\nQQ"), Decoded(Lines + "QQ"));
  EXPECT_EQ(RaisedBy([&] { (void)ZqDecodeBase64(Lines + "\r\n"); }), cRefusal);
  NativeUInt Size = 99;
  EXPECT_TRUE(ZqDecodeBase64("====", Size) == nullptr && Size == 0);
}

TEST(Base64, RefusesALengthThatIsNoMultipleOfFour) {
  for (const std::size_t Length : {1U, 2U, 3U, 5U, 79U, 81U}) {
    const std::string Coded(Length, 'A');
    NativeUInt Size = 99;
    TStringStream Source{AnsiString(Coded)}, Dest;
    EXPECT_EQ(RaisedBy([&] { (void)ZqDecodeBase64(Coded); }), cRefusal);
    EXPECT_EQ(RaisedBy([&] { (void)ZqDecodeBase64(WideString(FromUTF8(Coded))); }), cRefusal);
    EXPECT_EQ(RaisedBy([&] { (void)ZqDecodeBase64(Coded, Size); }), cRefusal);
    EXPECT_EQ(RaisedBy([&] { ZqDecodeBase64(Coded, &Dest); }), cRefusal);
    EXPECT_EQ(RaisedBy([&] { ZqDecodeBase64(&Source, &Dest); }), cRefusal);
    EXPECT_TRUE(Size == 0 && Dest.Size() == 0);
  }
}

TEST(Base64, WideTextIsItsUnitsOneWayAndCodePage0TheOther) {
  EXPECT_EQ(ZqEncodeBase64(WideString(u"\u0141")), "QQE=");
  EXPECT_EQ(Text(ZqDecodeBase64(u"QUJD\u00E9\u00E9")), "ABC");  // two bytes each
  EXPECT_EQ(RaisedBy([] { (void)ZqDecodeBase64(u"QUJ\u00E9"); }), cRefusal);
}

TEST(Base64, StreamsAreTakenFromThePositionOn) {
  const TTempFolder Folder;
  TFileStream Plain(Folder.File("plain"), fmCreate), Coded(Folder.File("coded"), fmCreate);
  Plain.WriteBuffer("xfoobar", 7);
  EXPECT_EQ(ZqEncodeBase64(&Plain), "");
  Plain.SetPosition(1);
  Coded.WriteBuffer("12345", 5);
  ZqEncodeBase64(&Plain, &Coded);
  EXPECT_TRUE(Plain.Position() == 7 && Coded.Position() == 13);
  EXPECT_EQ(Rest(Coded, 0), "12345Zm9vYmFy");
  Coded.SetPosition(5);
  ZqDecodeBase64(&Coded, &Plain);
  ZqDecodeBase64("Zg==", &Plain);
  EXPECT_EQ(Plain.Position(), 14);
  EXPECT_EQ(Rest(Plain, 0), "xfoobarfoobarf");

  TStringStream Memory{AnsiString("xfoo")};
  Memory.SetPosition(1);
  EXPECT_TRUE(ZqEncodeBase64(&Memory) == "Zm9v" && Memory.Position() == 1);
  Memory.SetPosition(9);
  EXPECT_EQ(ZqEncodeBase64(&Memory), "");
}

TEST(Base64, RefusesStreamsThatAreNotTwo) {
  TStringStream Stream;
  TStream *const One = &Stream, *const None = nullptr;
  for (const auto& Call :
      {+[](TStream*A, TStream*B) { ZqEncodeBase64(A, B); }, +[](TStream*A, TStream*B) { ZqDecodeBase64(A, B); }})
    for (const auto& [Source, Dest] : {std::pair(One, One), {One, None}, {None, One}})
      EXPECT_THAT(RaisedBy([&] { Call(Source, Dest); }).ToUTF8(), testing::StartsWith("EAssertionFailed: Assertion"));
}

}  // namespace
}  // namespace zq
