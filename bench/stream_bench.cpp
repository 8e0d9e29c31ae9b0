// Pieces of 16 bytes appended and read back, beside std::string::append and memcpy. The figures to quote are the ratios
// of each pair in one run.

#include <benchmark/benchmark.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "common/uZqClasses/text_streams.h"

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

void StringStream(benchmark::State& AState) {
  char Room[cPiece] = {};
  for (auto Step : AState) {
    TZqStringStream Stream(65001);
    for (auto i = AState.range(0); i > 0; --i) Stream.Write(cText, cPiece);
    Stream.SetPosition(0);
    while (Stream.Read(Room, cPiece) == cPiece) benchmark::DoNotOptimize(Room);
  }
  Finish(AState, Room[cPiece - 1]);
}

// Pieces of 8 UTF-16 units as strings of their own.
void WideStringAppendAndCopy(benchmark::State& AState) {
  const std::u16string Piece = u"8 units.";
  std::u16string Back;
  for (auto Step : AState) {
    std::u16string Text;
    for (auto i = AState.range(0); i > 0; --i) Text.append(Piece);
    for (std::size_t At = 0; At < Text.size(); At += Piece.size()) {
      Back = Text.substr(At, Piece.size());
      benchmark::DoNotOptimize(Back.data());
    }
  }
  Finish(AState, static_cast<char>(Back.back()));
}

void WideStringStream(benchmark::State& AState) {
  const UnicodeString Piece = u"8 units.";
  UnicodeString Back;
  for (auto Step : AState) {
    TZqStringStream Stream(1200);
    for (auto i = AState.range(0); i > 0; --i) Stream.Add(Piece);
    Stream.SetPosition(0);
    for (auto i = AState.range(0); i > 0; --i) {
      Back = Stream.ReadWString(Piece.size());
      benchmark::DoNotOptimize(Back.data());
    }
  }
  Finish(AState, static_cast<char>(Back[8]));
}

// The same text as UTF-8 inside.
void ConvertingStringStream(benchmark::State& AState) {
  const UnicodeString Piece = u"sixteen letters.";
  for (auto Step : AState) {
    TZqStringStream Stream(65001);
    for (auto i = AState.range(0); i > 0; --i) Stream.Add(Piece);
    benchmark::DoNotOptimize(Stream.Buffer());
  }
  Finish(AState, '.');
}

BENCHMARK(StringAppendAndCopy)->ArgName("pieces")->Arg(64)->Arg(4096);
BENCHMARK(StringStream)->ArgName("pieces")->Arg(64)->Arg(4096);
BENCHMARK(WideStringAppendAndCopy)->ArgName("pieces")->Arg(64)->Arg(4096);
BENCHMARK(WideStringStream)->ArgName("pieces")->Arg(64)->Arg(4096);
BENCHMARK(ConvertingStringStream)->ArgName("pieces")->Arg(64)->Arg(4096);
BENCHMARK(MemoryStream)->ArgNames({"pieces", "step"})->ArgsProduct({{64, 4096}, {16, 4096}});

}  // namespace
}  // namespace zq
