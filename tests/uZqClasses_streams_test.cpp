

#include "common/uZqClasses/streams.h"
#include "tests/support/support.h"

namespace zq {
namespace {

constexpr Int64 cFar = std::numeric_limits<Int64>::max();
const UnicodeString cNoResize = u"Exception: It is not possible to resize the buffer!";
const UnicodeString cEOF = u"Exception: Unexpected EOF";

struct TOpenStream : TZqMemoryStream {
  using TZqMemoryStream::SetBufSize;
  using TZqMemoryStream::SetContentEnd;
  using TZqMemoryStream::TZqMemoryStream;
};

void Fill(TStream& AStream, std::string_view AText) {
  AStream.WriteBuffer(AText.data(), static_cast<Int64>(AText.size()));
}

TEST(MemoryStream, GrowsByStepsAndAlwaysKeepsAByteFree) {
  using TFacts = std::tuple<NativeUInt, Int64, Int64>;  // capacity, size, position
  const std::tuple<const char*, std::vector<int>, void (*)(TOpenStream&), TFacts> Cases[] = {
      {"15 fit", {15}, nullptr, {16, 15, 15}}, {"16 don't", {16}, nullptr, {32, 16, 16}},
      {"31 ask for 32", {31}, nullptr, {48, 31, 31}}, {"31 in two fit", {16, 15}, nullptr, {32, 31, 31}},
      {"SetSize", {3}, [](auto& s) { s.SetSize(32); }, {48, 32, 3}},
      {"SetSize down", {99}, [](auto& s) { s.SetSize(15); }, {16, 15, 15}},
      {"SetSize 0", {3}, [](auto& s) { s.SetSize(0); }, {16, 0, 0}},
      {"Clear", {99}, [](auto& s) { s.Clear(); }, {16, 0, 0}},
      {"step changed", {}, [](auto& s) { s.SetBlockSize(10), Fill(s, std::string(16, 'x')); }, {20, 16, 16}},
      {"SetBufSize keeps", {3}, [](auto& s) { s.SetBufSize(16); }, {32, 3, 3}},
      {"SetBufSize cuts", {3}, [](auto& s) { s.SetBufSize(2); }, {16, 2, 2}},
      {"SetContentEnd", {3}, [](auto& s) { s.SetContentEnd(2); }, {16, 2, 2}},
      {"in the middle", {4}, [](auto& s) { s.SetPosition(1), Fill(s, "xy"); }, {16, 4, 3}}};
  for (const auto& [Name, Pieces, Then, Facts] : Cases) {
    TOpenStream Stream(16);
    for (const int Piece : Pieces) Fill(Stream, std::string(static_cast<std::size_t>(Piece), 'x'));
    if (Then != nullptr) Then(Stream);
    EXPECT_EQ(TFacts(Stream.Capacity(), Stream.Size(), Stream.Position()), Facts) << Name;
  }
}

TEST(MemoryStream, KeepsItsBytesThroughManySteps) {
  TZqMemoryStream Stream(7);
  std::string Expected;
  for (int i = 0; i < 1000; ++i) {
    Expected.append(static_cast<std::size_t>(i % 19), static_cast<char>('a' + i % 26));
    Fill(Stream, std::string_view(Expected).substr(static_cast<std::size_t>(Stream.Size())));
  }
  Stream.Write(Stream.Buffer(), static_cast<Integer>(Expected.size()));  // its own block, which moves meanwhile
  EXPECT_EQ(Stream.View(), Expected + Expected);
  Stream.SetSize(5);
  EXPECT_EQ(Stream.View(), Expected.substr(0, 5));
}

TEST(MemoryStream, SeeksAreClippedAtBothEnds) {
  TZqMemoryStream Stream(16);
  Fill(Stream, "0123456789");
  const std::tuple<Int64, TSeekOrigin, Int64> Cases[] = {{100, soBeginning, 10}, {-1, soBeginning, 0},
      {cFar, soBeginning, 10}, {3, soEnd, 7}, {-3, soEnd, 7}, {100, soEnd, 0}, {-cFar - 1, soEnd, 0}, {0, soEnd, 10},
      {-4, soCurrent, 1}, {5, soCurrent, 10}, {4, soCurrent, 9}, {cFar, soCurrent, 10}, {-cFar - 1, soCurrent, 0}};
  for (const auto& [Offset, Origin, Position] : Cases) {
    Stream.SetPosition(5);
    EXPECT_EQ(Stream.Seek(Offset, Origin), Position) << Offset << ' ' << static_cast<int>(Origin);
    EXPECT_EQ(Stream.Position(), Position);
  }
}

TEST(MemoryStream, NumbersAreLittleEndianAndNeverShort) {
  TZqMemoryStream Stream(16);
  Stream.WriteByte(1), Stream.WriteWord(0x0203), Stream.WriteLongWord(0x04050607), Stream.WriteInt64(-2);
  Stream.WriteBytes({}), Stream.WriteBytes({8, 9});
  EXPECT_EQ(Stream.View(), std::string("\1\3\2\7\6\5\4\xFE\xFF\xFF\xFF\xFF\xFF\xFF\xFF\x8\x9"));
  Stream.SetPosition(0);
  EXPECT_TRUE(Stream.ReadByte() == 1 && Stream.ReadWord() == 0x0203 && Stream.ReadLongWord() == 0x04050607);
  EXPECT_TRUE(Stream.ReadInt64() == -2 && Stream.ReadBytes(2) == (TBytes{8, 9}));
  EXPECT_EQ(RaisedBy([&] { Stream.ReadByte(); }), cEOF);
  Stream.SetPosition(Stream.Size() - 5);
  EXPECT_EQ(RaisedBy([&] { Stream.ReadInt64(); }), cEOF);
  Byte Room = 7;
  EXPECT_TRUE(Stream.Position() == Stream.Size() && Stream.Read(&Room, 1) == 0 && Stream.Read(&Room, -1) == 0);
  EXPECT_THROW(Stream.ReadBytes(&Room, 0), EAssertionFailed);
}

TEST(MemoryStream, AWrappedBlockIsOverwrittenAndNeverResized) {
  char Block[] = "abcd|";
  TZqMemoryStream Stream = TZqMemoryStream::WrapBuffer(Block, 4);
  EXPECT_EQ(Stream.Write("wxyz", 4), 4);
  EXPECT_EQ(Block, std::string("wxyz|"));
  Stream.SetPosition(1);
  EXPECT_EQ(RaisedBy([&] { Stream.Write("1234", 4); }), cNoResize);
  EXPECT_EQ(RaisedBy([&] { Stream.Clear(); }) + RaisedBy([&] { Stream.SetSize(4); }), cNoResize + cNoResize);
  EXPECT_TRUE(Block == std::string("wxyz|") && Stream.Size() == 4 && Stream.Position() == 1);
  EXPECT_THROW((void)TZqMemoryStream::WrapBuffer(nullptr, 1), EAssertionFailed);
}

TEST(MemoryStream, WhatMemoryCantHoldIsRefusedAndChangesNothing) {
  TZqMemoryStream Stream(16);
  Fill(Stream, "abc");
  for (const Int64 Size : {Int64{-1}, -cFar - 1, cFar})
    EXPECT_EQ(RaisedBy([&] { Stream.SetSize(Size); }), u"EStreamError: There is no memory for the stream") << Size;
  void* Place = nullptr;
  EXPECT_THROW((void)ZqStreamToWriteBuf(&Stream, Place, ~NativeUInt{}), EStreamError);
  EXPECT_TRUE(Stream.View() == "abc" && Stream.Capacity() == 16 && Stream.Position() == 3);
  TZqMemoryStream NoStep(0);
  EXPECT_THROW(NoStep.WriteByte(1), EAssertionFailed);
  EXPECT_THROW((void)ZqGetMem(~NativeUInt{}), std::bad_alloc);
}

TEST(StreamBuffers, MemoryIsReachedInPlaceAndOthersAreReadToTheirEnd) {
  const TTempFolder Folder({"file"});
  TFileStream File(Folder.File("file"), fmOpenRead);
  TZqMemoryStream Zq(16);
  TMemoryStream Memory;
  Fill(Zq, "file"), Fill(Memory, "file");
  for (TStream* const Stream : std::initializer_list<TStream*>{&File, &Zq, &Memory}) {
    Stream->SetPosition(1);
    void* Buffer = nullptr;
    NativeUInt Size = 0;
    const bool Owned = ZqStreamToReadBuf(Stream, Buffer, Size);
    EXPECT_EQ(std::string_view(static_cast<char*>(Buffer), Size), "ile");
    EXPECT_TRUE(Owned == (Stream == &File) && Stream->Position() == (Owned ? 4 : 1));
    if (Owned) FreeMem(Buffer);
  }
  Memory.SetPosition(9);
  EXPECT_EQ(TZqReadBuf(&Memory).Size(), 0U);
  void* Place = nullptr;
  EXPECT_FALSE(ZqStreamToWriteBuf(&Zq, Place, 20));
  EXPECT_TRUE(Place == static_cast<char*>(Zq.Buffer()) + 1 && Zq.Size() == 21 && Zq.Position() == 1);
  EXPECT_TRUE(ZqStreamToWriteBuf(&Memory, Place, 20));
  FreeMem(Place);
}

TEST(StreamBuffers, CountedBuffersTakeWhatTheStreamHas) {
  TZqMemoryStream Stream(16);
  Fill(Stream, "0123456789");
  const std::tuple<Int64, Int64, NativeUInt> Cases[] = {{0, -1, 10}, {0, 100, 10}, {8, -1, 2}, {8, 1, 1}, {0, 0, 0}};
  for (const auto& [Offset, Count, Size] : Cases) {
    const auto Buffer = ZqCreateMemoryBuffer(&Stream, Offset, Count);
    EXPECT_TRUE(Buffer->GetSize() == Size && Stream.Position() == Offset + static_cast<Int64>(Size));
  }
  const auto Buffer = ZqCreateMemoryBuffer(&Stream, 2, 3);
  EXPECT_THROW(Buffer->SetSize(~NativeUInt{}), std::bad_alloc);
  EXPECT_EQ(Buffer->GetAsByteArray(), (TBytes{'2', '3', '4'}));
  Buffer->SetAsByteArray({9}), Buffer->SetAsString(beBase64, AnsiString("AQID")), Buffer->SetSize(2);
  EXPECT_EQ(Buffer->GetAsByteArray(), (TBytes{1, 2}));
  Buffer->SetSize(0);
  EXPECT_TRUE(Buffer->GetBuffer() == nullptr && Buffer->GetAsByteArray().empty());
  NativeUInt Size = 7;
  EXPECT_EQ(ZqByteArrToBuf({}, Size), nullptr);
  const auto Taken = ZqCreateMemoryBuffer(ZqByteArrToBuf({4, 5}, Size), 2);  // freed with it
  EXPECT_TRUE(Size == 2 && Taken->GetAsByteArray() == (TBytes{4, 5}) && Taken->GetAsString(beHexEncoded) == "0405");
  ZqReverseBuffer(Taken->GetBuffer(), 2);
  EXPECT_EQ(ZqBufToByteArr(Taken->GetBuffer(), 1), (TBytes{5}));
}

TEST(StreamBuffers, HeapRecordsHoldSizeAndBytesInOneBlock) {
  PZqMemoryBuffer Record = ZqGetMem(3);
  EXPECT_EQ(ZqBufToByteArr(Record->Data(), Record->Size), (TBytes{0, 0, 0}));
  Record->Data()[1] = 7, ZqReallocateMem(Record, 2);
  PZqMemoryBuffer Clone = ZqCloneMem(Record);
  ZqFreeMem(Record);
  EXPECT_TRUE(Record == nullptr && ZqBufToByteArr(Clone->Data(), Clone->Size) == (TBytes{0, 7}));
  ZqFreeMem(Clone);
}

}  // namespace
}  // namespace zq
