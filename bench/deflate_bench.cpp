// 64 MiB through the deflate streams beside zlib with buffers of the same size, both to and from memory. The figures to
// quote are the ratios of each pair in one run: at most 1.02.

#include <benchmark/benchmark.h>
#include <zlib.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <random>
#include <string>
#include <utility>
#include <vector>

#include "common/uZqZLib.h"

namespace zq {
namespace {

constexpr std::size_t cSize = std::size_t{64} << 20U;
constexpr Integer cBuffer = 0x10000;  // of compressed data, as the streams have it
constexpr Integer cPiece = 0x100000;  // of what is written and read at a time

TBytes Noise() {
  std::minstd_rand Chance(7);  // NOLINT: the same bytes in each run
  TBytes Result(cSize);
  for (Byte& b : Result) b = static_cast<Byte>(Chance() >> 8U);
  return Result;
}

// Lines of words, some frequent and most rare, which deflate to about a third.
TBytes Text() {
  std::minstd_rand Chance(7);  // NOLINT: the same bytes in each run
  std::vector<std::string> Words(1000);
  for (std::string& Word : Words)
    for (auto Length = 2 + Chance() % 9; Length > 0; --Length) Word += static_cast<char>('a' + Chance() % 26);
  TBytes Result;
  Result.reserve(cSize + 20);
  while (Result.size() < cSize) {
    const std::string& Word = Words[Chance() % (1 + Chance() % Words.size())];
    Result.insert(Result.end(), Word.begin(), Word.end());
    Result.push_back(Chance() % 10 == 0 ? '\n' : ' ');
  }
  Result.resize(cSize);
  return Result;
}

// Both directions work in this block, whose pages are there by then.
struct TSample {
  explicit TSample(TBytes ABytes) : Plain(std::move(ABytes)), Packed(cSize + cSize / 8) {}
  TBytes Plain;
  TBytes Packed;
  std::size_t PackedSize = 0;
};

TSample& Sample(const benchmark::State& AState) {
  static TSample Samples[] = {TSample(Text()), TSample(Noise())};
  return Samples[AState.range(0)];
}

// Over the block of a sample, without a step that a stream over memory doesn't need.
class TBlock : public TStream {
 public:
  explicit TBlock(TBytes& ABytes) : FBytes(ABytes) {}
  using TStream::Seek;
  Integer Read(void* ABuffer, Integer ACount) override {
    std::memcpy(ABuffer, FBytes.data() + FPosition, static_cast<std::size_t>(ACount));
    FPosition += ACount;
    return ACount;
  }
  Integer Write(const void* ABuffer, Integer ACount) override {
    std::memcpy(FBytes.data() + FPosition, ABuffer, static_cast<std::size_t>(ACount));
    FPosition += ACount;
    return ACount;
  }
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override {
    return FPosition = AOrigin == soBeginning ? AOffset : FPosition + AOffset;
  }

 private:
  TBytes& FBytes;
  Int64 FPosition = 0;
};

void Count(benchmark::State& AState, bool ARight) {
  if (!ARight) std::abort();
  AState.SetBytesProcessed(static_cast<std::int64_t>(AState.iterations()) * static_cast<std::int64_t>(cSize));
}

void DeflateZlib(benchmark::State& AState) {
  TSample& Data = Sample(AState);
  static Byte Buffer[cBuffer];
  for (auto Step : AState) {
    z_stream Rec{};
    deflateInit(&Rec, 6);
    Byte* To = Data.Packed.data();
    const auto Drain = [&] {
      const std::size_t Filled = cBuffer - Rec.avail_out;
      std::memcpy(To, Buffer, Filled);
      To += Filled;
      Rec.next_out = Buffer;
      Rec.avail_out = cBuffer;
    };
    Rec.next_out = Buffer;
    Rec.avail_out = cBuffer;
    for (std::size_t At = 0; At < cSize; At += cPiece) {
      Rec.next_in = Data.Plain.data() + At;
      Rec.avail_in = cPiece;
      while (Rec.avail_in > 0) {
        ::deflate(&Rec, Z_NO_FLUSH);
        if (Rec.avail_out == 0) Drain();
      }
    }
    while (::deflate(&Rec, Z_FINISH) != Z_STREAM_END) Drain();
    Drain();
    Data.PackedSize = Rec.total_out;
    ::deflateEnd(&Rec);
  }
  AState.counters["ratio"] = static_cast<double>(cSize) / static_cast<double>(Data.PackedSize);
  Count(AState, true);
}

void DeflateStream(benchmark::State& AState) {
  TSample& Data = Sample(AState);
  Int64 Written = 0;
  for (auto Step : AState) {
    TBlock Dest(Data.Packed);
    TZqZLibCompressionStream Stream(&Dest, clLevel6);
    for (std::size_t At = 0; At < cSize; At += cPiece) Stream.Write(Data.Plain.data() + At, cPiece);
    Stream.Finish();
    Written = Dest.Position();
  }
  Count(AState, Written == static_cast<Int64>(Data.PackedSize));
}

void InflateZlib(benchmark::State& AState) {
  TSample& Data = Sample(AState);
  static Byte Buffer[cBuffer];
  std::vector<Byte> Piece(cPiece);
  std::size_t Total = 0;
  for (auto Step : AState) {
    z_stream Rec{};
    inflateInit(&Rec);
    const Byte* From = Data.Packed.data();
    for (int Code = Z_OK; Code != Z_STREAM_END;) {
      Rec.next_out = Piece.data();
      Rec.avail_out = cPiece;
      while (Rec.avail_out > 0 && Code != Z_STREAM_END) {
        if (Rec.avail_in == 0) {
          std::memcpy(Buffer, From, cBuffer);
          From += cBuffer;
          Rec.next_in = Buffer;
          Rec.avail_in = cBuffer;
        }
        Code = ::inflate(&Rec, Z_NO_FLUSH);
      }
    }
    Total = Rec.total_out;
    ::inflateEnd(&Rec);
  }
  Count(AState, Total == cSize);
}

void InflateStream(benchmark::State& AState) {
  TSample& Data = Sample(AState);
  std::vector<Byte> Piece(cPiece);
  std::size_t Total = 0;
  for (auto Step : AState) {
    TBlock Source(Data.Packed);
    TZqZLibDecompressionStream Stream(&Source);
    while (Stream.Read(Piece.data(), cPiece) > 0) {
    }
    Total = static_cast<std::size_t>(Stream.Position());
  }
  Count(AState, Total == cSize);
}

void Contents(benchmark::internal::Benchmark* ABenchmark) {
  ABenchmark->ArgName("text0_noise1")->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond);
}
BENCHMARK(DeflateZlib)->Apply(Contents);  // lays down what the others compare with and read
BENCHMARK(DeflateStream)->Apply(Contents);
BENCHMARK(InflateZlib)->Apply(Contents);
BENCHMARK(InflateStream)->Apply(Contents);

}  // namespace
}  // namespace zq
