// Base64 between buffers beside OpenSSL's block functions, in plain C++ and as the library does it on this processor.
// The figures to quote are the ratios of the three of a size.

#include <benchmark/benchmark.h>
#include <openssl/evp.h>

#include <cstdint>
#include <cstdlib>
#include <random>
#include <string>

#include "common/uZqBase64.h"
#include "common/uZqBase64/portable.h"
#include "runtime/core/objects.h"

namespace zq {
namespace {

struct TSample {
  explicit TSample(const benchmark::State& AState) : Bytes(static_cast<std::size_t>(AState.range(0))) {
    std::minstd_rand Chance(7);  // NOLINT: the same bytes in each run
    for (Byte& b : Bytes) b = static_cast<Byte>(Chance() >> 8U);
    Text = ZqEncodeBase64(Bytes).Str();
    ByteRoom.resize(Bytes.size() + 2);  // OpenSSL writes bytes for the padding, too
    TextRoom.resize(Text.size() + 1);   // and a zero behind a text
  }
  TBytes Bytes;
  std::string Text;
  TBytes ByteRoom;
  std::string TextRoom;
};

void Count(benchmark::State& AState, bool ARight) {
  if (!ARight) std::abort();
  AState.SetBytesProcessed(static_cast<std::int64_t>(AState.iterations()) * AState.range(0));
}

void EncodeOpenSsl(benchmark::State& AState) {
  TSample Sample(AState);
  for (auto Step : AState) {
    EVP_EncodeBlock(
        reinterpret_cast<Byte*>(Sample.TextRoom.data()), Sample.Bytes.data(), static_cast<int>(Sample.Bytes.size()));
    benchmark::ClobberMemory();
  }
  Count(AState, Sample.TextRoom.compare(0, Sample.Text.size(), Sample.Text) == 0);
}

void EncodePortable(benchmark::State& AState) {
  TSample Sample(AState);
  for (auto Step : AState) {
    base64::Encode(Sample.Bytes.data(), Sample.Bytes.size(), Sample.TextRoom.data());
    benchmark::ClobberMemory();
  }
  Count(AState, Sample.TextRoom.compare(0, Sample.Text.size(), Sample.Text) == 0);
}

void Encode(benchmark::State& AState) {  // with the string that it returns
  const TSample Sample(AState);
  AnsiString Text;
  for (auto Step : AState) benchmark::DoNotOptimize(Text = ZqEncodeBase64(Sample.Bytes));
  Count(AState, Text.Str() == Sample.Text);
}

void DecodeOpenSsl(benchmark::State& AState) {
  TSample Sample(AState);
  int Got = 0;
  for (auto Step : AState) {
    Got = EVP_DecodeBlock(Sample.ByteRoom.data(), reinterpret_cast<const Byte*>(Sample.Text.data()),
        static_cast<int>(Sample.Text.size()));
    benchmark::ClobberMemory();
  }
  Count(AState, Got >= AState.range(0));
}

void DecodePortable(benchmark::State& AState) {
  TSample Sample(AState);
  std::size_t Got = 0;
  for (auto Step : AState) {
    Got = base64::Decode(Sample.Text, Sample.ByteRoom.data());
    benchmark::ClobberMemory();
  }
  Count(AState, Got == Sample.Bytes.size());
}

void Decode(benchmark::State& AState) {  // with the array that it returns
  const TSample Sample(AState);
  TBytes Bytes;
  for (auto Step : AState) benchmark::DoNotOptimize(Bytes = ZqDecodeBase64(Sample.Text));
  Count(AState, Bytes == Sample.Bytes);
}

void DecodeLines(benchmark::State& AState) {  // 76 characters and a line break, as mail has them
  TSample Sample(AState);
  std::string Text;
  for (std::size_t i = 0; i < Sample.Text.size(); i += 76) Text += Sample.Text.substr(i, 76) + "\r\n";
  Text.resize((Text.size() + 3) / 4 * 4, ' ');
  TBytes Bytes;
  for (auto Step : AState) benchmark::DoNotOptimize(Bytes = ZqDecodeBase64(Text));
  Count(AState, Bytes == Sample.Bytes);
}

void Sizes(benchmark::internal::Benchmark* ABenchmark) { ABenchmark->ArgName("bytes")->Arg(4096)->Arg(1 << 20); }
BENCHMARK(EncodeOpenSsl)->Apply(Sizes);
BENCHMARK(EncodePortable)->Apply(Sizes);  // as fast at least,
BENCHMARK(Encode)->Apply(Sizes);          // and with AVX2 three times as fast
BENCHMARK(DecodeOpenSsl)->Apply(Sizes);
BENCHMARK(DecodePortable)->Apply(Sizes);  // the same
BENCHMARK(Decode)->Apply(Sizes);
BENCHMARK(DecodeLines)->Apply(Sizes);

}  // namespace
}  // namespace zq
