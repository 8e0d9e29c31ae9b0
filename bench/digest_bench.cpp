// SHA-1 and MD5 of a block beside OpenSSL's, by its one call and by its newer interface with a context that is used
// again, and SHA-1 as it is without the processor's instructions for it. The figures to quote are the ratios of the
// functions of a size and a kind, to the faster one of OpenSSL's.

#define OPENSSL_SUPPRESS_DEPRECATED  // SHA1 and MD5 are the quickest that it has

#include <benchmark/benchmark.h>
#include <openssl/evp.h>
#include <openssl/md5.h>
#include <openssl/sha.h>

#include <cstdint>
#include <cstdlib>
#include <memory>
#include <random>

#include "common/uZqMD5.h"
#include "common/uZqSha1.h"
#include "common/uZqSha1/portable.h"

namespace zq {
namespace {

TBytes Sample(const benchmark::State& AState) {
  TBytes Result(static_cast<std::size_t>(AState.range(0)));
  std::minstd_rand Chance(7);  // NOLINT: the same bytes in each run
  for (Byte& b : Result) b = static_cast<Byte>(Chance() >> 8U);
  return Result;
}

// AHash takes bytes, a size and the place of the digest, which is to be that of AKind.
template <class TDigest, class THash>
void Measure(benchmark::State& AState, const EVP_MD* AKind, THash AHash) {
  const TBytes Bytes = Sample(AState);
  TDigest Digest{}, Expected{};
  for (auto Step : AState) {
    AHash(Bytes.data(), Bytes.size(), Digest);
    benchmark::DoNotOptimize(Digest);
    benchmark::ClobberMemory();
  }
  EVP_Digest(Bytes.data(), Bytes.size(), Expected.data(), nullptr, AKind, nullptr);
  if (Digest != Expected) std::abort();
  AState.SetBytesProcessed(static_cast<std::int64_t>(AState.iterations()) * AState.range(0));
}

template <class TDigest>
void MeasureContext(benchmark::State& AState, const EVP_MD* AKind) {
  const std::unique_ptr<EVP_MD_CTX, decltype(&EVP_MD_CTX_free)> Context(EVP_MD_CTX_new(), EVP_MD_CTX_free);
  Measure<TDigest>(AState, AKind, [&](auto* ABytes, auto ASize, auto& ADigest) {
    EVP_DigestInit_ex(Context.get(), AKind, nullptr);
    EVP_DigestUpdate(Context.get(), ABytes, ASize);
    EVP_DigestFinal_ex(Context.get(), ADigest.data(), nullptr);
  });
}

void Sha1OpenSsl(benchmark::State& AState) {
  Measure<TSHA1Digest>(
      AState, EVP_sha1(), [](auto* ABytes, auto ASize, auto& ADigest) { SHA1(ABytes, ASize, ADigest.data()); });
}
void Sha1OpenSslContext(benchmark::State& AState) { MeasureContext<TSHA1Digest>(AState, EVP_sha1()); }
void Sha1Portable(benchmark::State& AState) {
  Measure<TSHA1Digest>(AState, EVP_sha1(),
      [](auto* ABytes, auto ASize, auto& ADigest) { ADigest = sha1::Hash(ABytes, ASize, sha1::AddBlocks); });
}
void Sha1(benchmark::State& AState) {
  Measure<TSHA1Digest>(AState, EVP_sha1(),
      [](auto* ABytes, auto ASize, auto& ADigest) { ADigest = ZqHashBuffer(ABytes, static_cast<NativeInt>(ASize)); });
}

void Md5OpenSsl(benchmark::State& AState) {
  Measure<TMD5Digest>(
      AState, EVP_md5(), [](auto* ABytes, auto ASize, auto& ADigest) { MD5(ABytes, ASize, ADigest.data()); });
}
void Md5OpenSslContext(benchmark::State& AState) { MeasureContext<TMD5Digest>(AState, EVP_md5()); }
void Md5(benchmark::State& AState) {
  Measure<TMD5Digest>(AState, EVP_md5(),
      [](auto* ABytes, auto ASize, auto& ADigest) { ADigest = MD5Hash(ABytes, static_cast<NativeInt>(ASize)); });
}

void Sizes(benchmark::internal::Benchmark* ABenchmark) {
  ABenchmark->ArgName("bytes")->Arg(64)->Arg(4096)->Arg(16 << 20);
}
BENCHMARK(Sha1OpenSsl)->Apply(Sizes);
BENCHMARK(Sha1OpenSslContext)->Apply(Sizes);
BENCHMARK(Sha1Portable)->Apply(Sizes);
BENCHMARK(Sha1)->Apply(Sizes);  // no slower than the faster one of OpenSSL's
BENCHMARK(Md5OpenSsl)->Apply(Sizes);
BENCHMARK(Md5OpenSslContext)->Apply(Sizes);
BENCHMARK(Md5)->Apply(Sizes);  // the same

}  // namespace
}  // namespace zq
