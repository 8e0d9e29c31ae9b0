// Pieces of 16 bytes appended and read back, beside std::string::append and memcpy. The figures to quote are the ratios
// of each pair in one run.

#include <benchmark/benchmark.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "common/uZqClasses/streams.h"

namespace zq {
namespace {

constexpr std::size_t cPiece = 16;
constexpr char cText[cPiece + 1] = "sixteen letters.";

void Finish(benchmark::State& AState, char ALast) {
  if (ALast != '.') std::abort();
  AState.SetItemsProcessed(AState.iterations() * AState.range(0));
}

void StringAppendAndCopy(benchmark::State& AState) {
  char Room[cPiece] = {};
  for (auto Step : AState) {
    std::string Text;
    for (auto i = AState.range(0); i > 0; --i) Text.append(cText, cPiece);
    for (std::size_t At = 0; At < Text.size(); At += cPiece) {
      std::memcpy(Room, Text.data() + At, cPiece);
      benchmark::DoNotOptimize(Room);
    }
  }
  Finish(AState, Room[cPiece - 1]);
}

void MemoryStream(benchmark::State& AState) {
  char Room[cPiece] = {};
  for (auto Step : AState) {
    TZqMemoryStream Stream(static_cast<NativeUInt>(AState.range(1)));
    for (auto i = AState.range(0); i > 0; --i) Stream.Write(cText, cPiece);
    Stream.SetPosition(0);
    while (Stream.Read(Room, cPiece) == cPiece) benchmark::DoNotOptimize(Room);
  }
  Finish(AState, Room[cPiece - 1]);
}

BENCHMARK(StringAppendAndCopy)->ArgName("pieces")->Arg(64)->Arg(4096);
BENCHMARK(MemoryStream)->ArgNames({"pieces", "step"})->ArgsProduct({{64, 4096}, {16, 4096}});

}  // namespace
}  // namespace zq
