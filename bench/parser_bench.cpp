// A text of 64 MiB walked by the parser and by loops written by hand that keep the same counters. The figures to quote
// are the ratios of each pair in one run.

#include <benchmark/benchmark.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "common/uZqClasses/parser.h"

namespace zq {
namespace {

constexpr std::size_t cSize = 64U << 20U;

// Lines of up to 70 bytes with a "<" every 40 or so, and in UTF-8 an "é" here and there.
const std::string& Text(bool AAscii) {
  const auto Make = [](bool AOnlyAscii) {
    std::string Result;
    Result.reserve(cSize + 64);
    unsigned Seed = 1;
    const auto Next = [&Seed] { return (Seed = Seed * 1664525U + 1013904223U) >> 16U; };
    while (Result.size() < cSize) {
      const unsigned Number = Next() % 80;
      if (Number == 0) Result += '\n';
      else if (Number < 3) Result += '<';
      else if (Number < 5 && !AOnlyAscii) Result += "\xC3\xA9";
      else Result += static_cast<char>('a' + Number % 26);
    }
    return Result;
  };
  static const std::string Ascii = Make(true);
  static const std::string Utf8 = Make(false);
  return AAscii ? Ascii : Utf8;
}

struct TCounters {
  int Line = 1;
  int Column = 0;
  int Characters = 0;
  int Bytes = 0;
  unsigned Sum = 0;
};

void Finish(benchmark::State& AState, const TCounters& ACounters, const std::string& AText) {
  if (ACounters.Bytes != static_cast<int>(AText.size()) || ACounters.Line < 2) std::abort();
  AState.SetBytesProcessed(AState.iterations() * static_cast<std::int64_t>(AText.size()));
}

TCounters CountersOf(const TZqTextParser& AParser) {
  return {AParser.LineNr(), AParser.ColNr(), AParser.CharsRead(), AParser.Position()};
}

void StepByHand(benchmark::State& AState) {
  const std::string& Ascii = Text(true);
  TCounters Counters;
  for (auto Step : AState) {
    Counters = {};
    for (const char *At = Ascii.data(), *End = At + Ascii.size(); At != End;) {
      Counters.Sum += static_cast<unsigned char>(*At);
      ++At, ++Counters.Characters, ++Counters.Bytes;
      if (At != End && *At == '\n') ++Counters.Line, Counters.Column = 0;
      ++Counters.Column;
    }
    benchmark::DoNotOptimize(Counters);
  }
  Finish(AState, Counters, Ascii);
}

void StepByHandUtf8(benchmark::State& AState) {
  const std::string& Utf8 = Text(false);
  TCounters Counters;
  for (auto Step : AState) {
    Counters = {};
    for (const char *At = Utf8.data(), *End = At + Utf8.size(); At != End;) {
      const auto First = static_cast<unsigned char>(*At);
      unsigned Char = First;
      int Length = 1;
      if (First >= 0xC0) {
        Length = First < 0xE0 ? 2 : First < 0xF0 ? 3 : 4;
        Char = First & 0x1FU;
        for (int i = 1; i < Length; ++i) Char = Char << 6U | (static_cast<unsigned char>(At[i]) & 0x3FU);
      }
      Counters.Sum += Char;
      if (First == '\n') ++Counters.Line, Counters.Column = 0;
      At += Length, Counters.Bytes += Length, ++Counters.Characters, ++Counters.Column;
    }
    benchmark::DoNotOptimize(Counters);
  }
  Finish(AState, Counters, Utf8);
}

void Step(benchmark::State& AState, Word ACodePage, const std::string& AText) {
  TCounters Counters;
  for (auto Step : AState) {
    TZqTextParser Parser = TZqTextParser::WrapMem(AText.data(), AText.size(), ACodePage);
    unsigned Sum = 0;
    for (; !Parser.Eof(); Parser.Next()) Sum += *Parser.CurrChar();
    benchmark::DoNotOptimize(Sum);
    Counters = CountersOf(Parser);
  }
  Finish(AState, Counters, AText);
}
void StepSbcs(benchmark::State& AState) { Step(AState, 1252, Text(true)); }
void StepMbcs(benchmark::State& AState) { Step(AState, 65001, Text(false)); }

void SkipByHand(benchmark::State& AState) {
  const std::string& Ascii = Text(true);
  TCounters Counters;
  for (auto Step : AState) {
    Counters = {};
    for (const char *At = Ascii.data(), *End = At + Ascii.size(); At != End;) {
      const void* const Found = std::memchr(At, '<', static_cast<std::size_t>(End - At));
      const char* const Stop = Found == nullptr ? End : static_cast<const char*>(Found);
      Counters.Bytes += static_cast<int>(Stop - At);
      Counters.Column += static_cast<int>(Stop - At);
      for (const char* Line = At; Line != Stop; ++Line)
        if (*Line == '\n') ++Counters.Line, Counters.Column = static_cast<int>(Stop - Line);
      At = Stop;
      if (At != End) ++At, ++Counters.Bytes, ++Counters.Column;
    }
    benchmark::DoNotOptimize(Counters);
  }
  Finish(AState, Counters, Ascii);
}

template <class TSkip>
void Skip(benchmark::State& AState, TSkip ASkip) {
  TCounters Counters;
  for (auto Step : AState) {
    TZqTextParser Parser = TZqTextParser::WrapMem(Text(true).data(), Text(true).size(), 1252);
    for (ASkip(Parser); !Parser.Eof(); ASkip(Parser)) Parser.Next();
    Counters = CountersOf(Parser);
  }
  Finish(AState, Counters, Text(true));
}
void SkipWhileUnEq(benchmark::State& AState) {
  Skip(AState, [](TZqTextParser& AParser) { AParser.SkipWhile(sopUnEq, '<'); });
}
void SkipWhileInSet(benchmark::State& AState) {
  Skip(AState, [](TZqTextParser& AParser) { AParser.SkipWhileInSet(sopNotIn, {'<'}); });
}

BENCHMARK(StepByHand)->Unit(benchmark::kMillisecond);
BENCHMARK(StepSbcs)->Unit(benchmark::kMillisecond);
BENCHMARK(StepByHandUtf8)->Unit(benchmark::kMillisecond);
BENCHMARK(StepMbcs)->Unit(benchmark::kMillisecond);
BENCHMARK(SkipByHand)->Unit(benchmark::kMillisecond);
BENCHMARK(SkipWhileUnEq)->Unit(benchmark::kMillisecond);
BENCHMARK(SkipWhileInSet)->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace zq
