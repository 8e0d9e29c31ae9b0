#include "common/uZqZLib.h"

#include <gmock/gmock.h>
#include <sys/resource.h>
#include <zlib.h>

#include <csignal>
#include <random>

#include "tests/support/support.h"

#undef ZLIB_VERSION  // zlib's, which hides the library's

namespace zq {
namespace {

constexpr Integer cBlock = 0x10000;
constexpr Int64 cFar = Int64{3} << 30;

std::string Noise(std::size_t ACount) {
  std::minstd_rand Chance(7);  // NOLINT: the same in each run
  std::string Result(ACount, '\0');
  for (char& c : Result) c = static_cast<char>(Chance() >> 8U);
  return Result;
}
void Put(TStream& AStream, std::string_view AText) { AStream.WriteBuffer(AText.data(), std::ssize(AText)); }
std::string Get(TStream& AStream, Integer ACount) {
  std::string Result(static_cast<std::size_t>(ACount), '\0');
  Result.resize(static_cast<std::size_t>(AStream.Read(Result.data(), ACount)));
  return Result;
}
std::string Inflated(TStream& ASource) { return ZlDecompressStreamToAnsiString(&ASource, true).Str(); }

// Has room for Limit bytes, which it takes a thousand at a time; then it takes none, or raises. A pipe can't seek.
struct TReluctant : TMemoryStream {
  using TMemoryStream::Seek;
  TReluctant() = default;
  explicit TReluctant(std::string_view AText, Integer AWindowBits = 15) {  // deflated
    TZqZLibCompressionStream Zip(this, clMax, AWindowBits, 8, zsDefault);
    Put(Zip, AText);
    Zip.Finish();
    FPosition = 0;
  }
  Integer Write(const void* ABuffer, Integer ACount) override {
    const auto Count = static_cast<Integer>(std::min<Int64>({ACount, Limit - FPosition, 1000}));
    if (Count <= 0 && Raises) throw EStreamError(u"refused");
    return TMemoryStream::Write(ABuffer, Count);
  }
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override { return Pipe ? -1 : TMemoryStream::Seek(AOffset, AOrigin); }
  std::string Bytes() { return Get(*this, static_cast<Integer>((FPosition = 0, FSize))); }
  Int64 Limit = std::numeric_limits<Int64>::max();
  bool Raises = false, Pipe = false;
};

TEST(Deflate, NothingIsLostWhereTheDestinationIsFullOrRaises) {
  const std::string Data = Noise(300000);
  for (const bool Pipe : {false, true})
    for (const bool Raises : {false, true})
      for (const Integer Step : {30000, cBlock, 100000}) {
        TReluctant Dest;
        Dest.Limit = 0, Dest.Raises = Raises, Dest.Pipe = Pipe;
        TZqZLibCompressionStream Zip(&Dest, clNone);
        for (; Zip.Position() < std::ssize(Data); Dest.Limit += Step) {
          const std::string_view Rest = std::string_view(Data).substr(static_cast<std::size_t>(Zip.Position()));
          const UnicodeString Raised = RaisedBy([&] { Zip.Write(Rest.data(), static_cast<Integer>(Rest.size())); });
          ASSERT_TRUE(Raised == u"nothing" ? Pipe || Dest.Position() % cBlock == 0 : Raises) << Raised.ToUTF8();
        }
        for (Dest.Limit = 0; RaisedBy([&] { Zip.Finish(); }) != u"nothing";) Dest.Limit += Step;
        Dest.Pipe = false;
        ASSERT_EQ(Inflated(Dest), Data) << Pipe << Raises << Step;
      }
}

TEST(Deflate, AFullFileIsGoneOnWithAndItsEndIsToldByFreeAlone) {
  const TTempFolder Folder;
  const std::string Data = Noise(200000);
  TFileStream File(Folder.File("z"), fmCreate);
  const auto Limit = [Before = std::signal(SIGXFSZ, SIG_IGN)](rlim_t ABytes) {
    const rlimit Value{ABytes, RLIM_INFINITY};
    EXPECT_EQ(::setrlimit(RLIMIT_FSIZE, &Value), 0);
    if (ABytes == RLIM_INFINITY) std::signal(SIGXFSZ, Before);
  };
  auto* const Zip = new TZqZLibCompressionStream(&File, clNone);
  Limit(100000);
  const Integer Taken = Zip->Write(Data.data(), 200000);
  EXPECT_TRUE(Taken == Zip->Position() && Taken > cBlock && Taken < 200000 && File.Position() == cBlock) << Taken;
  Limit(3 * cBlock + 100);
  Put(*Zip, std::string_view(Data).substr(static_cast<std::size_t>(Taken)));
  EXPECT_EQ(RaisedBy([&] { Free(Zip); }), u"EWriteError: Stream write error");
  Limit(1);
  EXPECT_EQ(RaisedBy([&] { Put(*std::make_unique<TZqZLibCompressionStream>(&File, clMax), "x"); }), u"nothing");
  EXPECT_EQ(RaisedBy([&] { throw(TZqZLibCompressionStream(&File, clMax), Exception(u"1st")); }), u"Exception: 1st");
  Limit(RLIM_INFINITY);
  Free(Zip);
  EXPECT_EQ(Inflated(File), Data);
}

TEST(Deflate, OthersMayUseTheStreamInBetweenAlsoFarOut) {
  const TTempFolder Folder;
  TFileStream File(Folder.File("z"), fmCreate);
  const std::string Data = Noise(150000);
  const auto Elsewhere = [&] { File.SetPosition(0), Put(File, "head"); };
  File.SetPosition(cFar);
  {
    TZqZLibCompressionStream Zip(&File, clDefault);
    for (std::size_t i = 0; i < Data.size(); i += 50000) Put(Zip, Data.substr(i, 50000)), Elsewhere();
  }
  Put(File, "tail");
  File.SetPosition(cFar);
  TZqZLibDecompressionStream Unzip(&File);
  std::string Found;
  while (!Unzip.AtEnd()) Elsewhere(), Found += Get(Unzip, 10000);
  EXPECT_TRUE(Found == Data && File.Position() > cFar + 150000 && Get(Unzip, 1).empty());
  EXPECT_EQ(Get(File, 5), "tail");
}

TEST(Deflate, SeeksForwardAndToTheStartAndRefusesTheRest) {
  TReluctant Dest, Source(Noise(20000) + "0123456789"), Pipe("0123456789");
  Pipe.Pipe = true;
  TZqZLibCompressionStream Zip(&Dest, clMax);
  TZqZLibDecompressionStream Unzip(&Source), Piped(&Pipe);
  EXPECT_TRUE(Unzip.Seek(20001, soFromBeginning) == 20001 && Unzip.Seek(5, soFromBeginning) == 20001);
  EXPECT_TRUE(Unzip.Size() == 20010 && Unzip.Position() == 20001 && Unzip.Seek(2, soFromCurrent) == 20003);
  EXPECT_EQ(Get(Unzip, 2), "34");
  const std::function<void()> Wrong[] = {[&] { Unzip.Seek(-1, soFromCurrent); }, [&] { Unzip.Seek(1, soFromEnd); },
      [&] { Unzip.Seek(20005, soFromBeginning); }, [&] { Piped.SetPosition(0); }, [&] { (void)Piped.Size(); },
      [&] { Put(Unzip, "x"); }, [&] { Get(Zip, 1); }, [&] { Zip.Seek(1, soFromCurrent); }, [&] { (void)Zip.Size(); },
      [&] { Zip.Finish(), Zip.Finish(), Put(Zip, "x"); }};
  for (const auto& Action : Wrong)
    EXPECT_THAT(
        RaisedBy(Action).ToUTF8(), testing::MatchesRegex("EZqZLib(Dec|C)ompressionError: Invalid ZStream operation!"));
  EXPECT_EQ(Get(Piped, 100), "0123456789");
  EXPECT_EQ(RaisedBy([&] { Unzip.Seek(6, soFromCurrent); }), u"EReadError: Stream read error");
  EXPECT_TRUE(Unzip.Seek(0, soFromEnd) == 20010 && Unzip.Seek(0, soFromBeginning) == 0);
  EXPECT_EQ(Get(Unzip, 20000), Noise(20000));
  EXPECT_EQ(Inflated(Dest), "");
}

TEST(Deflate, ProgressAndRateFollowTheCompressedData) {
  TReluctant Dest;
  int Calls = 0;
  const auto Count = [&](TObject* ASender) { Calls += ASender->InheritsFrom(ClassOf<TZqZLibStream>()) ? 1 : 100; };
  TZqZLibCompressionStream Zip(&Dest, clNone);
  Zip.SetOnProgress(Count);
  EXPECT_EQ(Zip.CompressionRate(), 0);
  Put(Zip, Noise(200000));
  EXPECT_TRUE(Calls == 3 && Zip.CompressionRate() < 2 && (Zip.Finish(), Zip.CompressionRate() < 0));
  Dest.SetPosition(0);
  TZqZLibDecompressionStream Unzip(&Dest);
  Unzip.SetOnProgress(Count);
  EXPECT_TRUE(Unzip.Seek(0, soEnd) == 200000 && Calls == 3 + 4) << Calls;
}

TEST(Deflate, OneCallTellsTheFormatByTheFirstByteAndBeginsAtTheStart) {
  const std::string Text("\x41\x01\x42\0x", 5);
  for (const Integer Bits : {15, -15, 9}) {
    TReluctant Source(Text, Bits), Dest;
    Source.Seek(0, soEnd), Put(Source, "tail");
    const auto Decompress = [&] { EXPECT_TRUE(ZlDecompressStream(&Source, &Dest, false)); };
    EXPECT_EQ(RaisedBy(Decompress), u"EZqZLibDecompressionError: Stream end");
    Source.SetPosition(Bits == -15 ? 1 : 0);
    EXPECT_EQ(RaisedBy(Decompress), Bits == 9 ? u"EZqZLibDecompressionError: Data error" : u"nothing");
    EXPECT_TRUE(ZlDecompressStream(&Source, &Dest, Bits, true));
    EXPECT_EQ(Dest.Bytes() + Get(Source, 9), (Bits == 9 ? Text : Text + Text) + "tail");
    if (Bits == 15) {
      EXPECT_EQ(ZlDecompressStreamToWideString(&Source, true), u"\u0141\u0042");
    }
  }
  TReluctant Zipped;
  ZlStringToCompressedStream(u"text", &Zipped, clLevel1);
  EXPECT_EQ(Inflated(Zipped), "text");
  Zipped.SetSize(3), Zipped.SetPosition(0);
  TMemoryStream Dest;
  EXPECT_FALSE(ZlDecompressStream(&Zipped, &Dest, false));  // cut
  TZqZLibDecompressionStream Cut(&Zipped);
  EXPECT_EQ(RaisedBy([&] { ZlCompressStream(&Cut, &Dest, clMax, false); }), u"EReadError: Stream read error");
}

TEST(Deflate, ZlibsOwnFunctionsTakeTheConstantsOfTheLibrary) {
  TZlStreamRec Rec;
  Byte Bytes[100] = {'a', 'b', 'c'}, Packed[100];
  Rec.next_in = Bytes, Rec.avail_in = 100, Rec.next_out = Packed, Rec.avail_out = 100;
  ASSERT_EQ(zq::deflateInit_(&Rec, 9, zq::ZLIB_VERSION, sizeof(Rec)), Z_OK);
  EXPECT_TRUE(deflate(&Rec, Z_FINISH) == Z_STREAM_END && Rec.adler == zq::adler32(1, Bytes, 100));
  Rec.next_in = Packed, Rec.avail_in = static_cast<Cardinal>(Rec.total_out), Rec.next_out = Bytes, Rec.avail_out = 100;
  EXPECT_TRUE(deflateReset(&Rec) == Z_OK && deflateEnd(&Rec) == Z_OK);
  ASSERT_EQ(zq::inflateInit_(&Rec, zq::ZLIB_VERSION, sizeof(Rec)), Z_OK);
  EXPECT_TRUE(inflate(&Rec, Z_NO_FLUSH) == Z_STREAM_END && Rec.total_out == 100 && Bytes[0] == 'a');
  EXPECT_TRUE(inflateReset(&Rec) == Z_OK && Rec.total_out == 0 && inflateEnd(&Rec) == Z_OK);
  EXPECT_EQ(zq::crc32(0, reinterpret_cast<const Byte*>("123456789"), 9), 0xCBF43926U);
}

}  // namespace
}  // namespace zq

// A user's file: both headers, and all names of the library seen.
namespace user {
using namespace zq;
static_assert(std::is_same_v<decltype(adler32(crc32(0, Z_NULL, 0), Z_NULL, 0)), uLong> && sizeof(Byte) == 1);
[[maybe_unused]] int Inflates(z_stream* AStream) { return inflate(AStream, Z_SYNC_FLUSH) + inflateInit(AStream); }
}  // namespace user
