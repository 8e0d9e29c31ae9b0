// UTF-8 to UTF-16 and back into a caller's buffer, beside the direct functions of ICU on the same text. The figures to
// quote are the ratios of the pairs.

#include <benchmark/benchmark.h>
#include <unicode/ustring.h>

#include <array>
#include <cstdint>
#include <cstdlib>
#include <random>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "common/uZqTypes.h"

namespace zq {
namespace {

constexpr Word cUtf8 = 65001;

using TWords = std::span<const std::u16string_view>;
constexpr std::u16string_view cAscii[] = {
    u"the", u"quick", u"brown", u"fox", u"jumps", u"over", u"lazy", u"dog,", u"2024", u"while", u"a", u"line."};
constexpr std::u16string_view cLatin[] = {u"the", u"größer", u"Straße", u"café", u"naïve", u"señor", u"plain", u"words",
    u"between", u"déjà", u"mañana", u"of", u"über", u"Ångström", u"house,", u"façade"};
constexpr std::u16string_view cGreek[] = {
    u"καλημέρα", u"κόσμε", u"και", u"το", u"ουρανός", u"θάλασσα", u"λόγος", u"ήλιος", u"η", u"άνθρωπος", u"Αθήνα,"};
constexpr std::u16string_view cCjk[] = {
    u"漢字", u"日本語", u"文章", u"世界", u"東京都", u"かな交じり", u"中文", u"한국어", u"你好", u"測試"};
constexpr std::u16string_view cEmoji[] = {u"😀", u"🚀", u"👍"};

// ALength characters: phrases of some words each, in one script or, mixed, in a script that chance names.
std::u16string MakeText(bool AMixed, std::size_t ALength) {
  constexpr std::array<TWords, 4> cScripts{cLatin, cLatin, cGreek, cCjk};
  std::minstd_rand Chance(7);  // NOLINT: the same text in each run
  std::u16string Result;
  const auto Append = [&](TWords AWords) { Result.append(AWords[Chance() % AWords.size()]).append(u" "); };
  while (Result.size() < ALength) {
    const TWords Words = AMixed ? cScripts[Chance() % cScripts.size()] : TWords(cAscii);
    for (auto Left = 3 + Chance() % 6; Left > 0; --Left) Append(Words);
    if (AMixed && Chance() % 4 == 0) Append(cEmoji);
  }
  Result.resize(ALength);
  if ((Result.back() & 0xFC00) == 0xD800) Result.back() = u'.';  // a pair that was cut
  return Result;
}

struct TSample {
  explicit TSample(const benchmark::State& AState)
      : Text(MakeText(AState.range(0) != 0, static_cast<std::size_t>(AState.range(1)))),
        Bytes(TZqEncoding::ConvertW(Text, cUtf8).Str()),
        WideRoom(Bytes.size()),
        ByteRoom(3 * Text.size()) {}
  std::u16string Text;
  std::string Bytes;
  std::vector<char16_t> WideRoom;
  std::vector<char> ByteRoom;
};

void Count(benchmark::State& AState, std::size_t AExpected, std::int64_t AGot) {
  if (AGot != static_cast<std::int64_t>(AExpected)) std::abort();
  AState.SetItemsProcessed(AState.iterations() * AState.range(1));
}

void Utf8ToUtf16(benchmark::State& AState) {
  TSample Sample(AState);
  Integer Got = 0;
  for (auto Step : AState) {
    Got = TZqEncoding::ConvertA(reinterpret_cast<const Byte*>(Sample.Bytes.data()),
        static_cast<Integer>(Sample.Bytes.size()), cUtf8, Sample.WideRoom.data(),
        static_cast<Integer>(Sample.WideRoom.size()));
    benchmark::ClobberMemory();
  }
  Count(AState, Sample.Text.size(), Got);
}

void IcuUtf8ToUtf16(benchmark::State& AState) {
  TSample Sample(AState);
  std::int32_t Got = 0;
  for (auto Step : AState) {
    UErrorCode Error = U_ZERO_ERROR;
    u_strFromUTF8(Sample.WideRoom.data(), static_cast<std::int32_t>(Sample.WideRoom.size()), &Got, Sample.Bytes.data(),
        static_cast<std::int32_t>(Sample.Bytes.size()), &Error);
    benchmark::ClobberMemory();
  }
  Count(AState, Sample.Text.size(), Got);
}

void Utf16ToUtf8(benchmark::State& AState) {
  TSample Sample(AState);
  Integer Got = 0;
  for (auto Step : AState) {
    Got = TZqEncoding::ConvertW(Sample.Text.data(), static_cast<Integer>(Sample.Text.size()),
        reinterpret_cast<Byte*>(Sample.ByteRoom.data()), static_cast<Integer>(Sample.ByteRoom.size()), cUtf8);
    benchmark::ClobberMemory();
  }
  Count(AState, Sample.Bytes.size(), Got);
}

void IcuUtf16ToUtf8(benchmark::State& AState) {
  TSample Sample(AState);
  std::int32_t Got = 0;
  for (auto Step : AState) {
    UErrorCode Error = U_ZERO_ERROR;
    u_strToUTF8(Sample.ByteRoom.data(), static_cast<std::int32_t>(Sample.ByteRoom.size()), &Got, Sample.Text.data(),
        static_cast<std::int32_t>(Sample.Text.size()), &Error);
    benchmark::ClobberMemory();
  }
  Count(AState, Sample.Bytes.size(), Got);
}

void Texts(benchmark::internal::Benchmark* ABenchmark) {
  ABenchmark->ArgNames({"mixed", "chars"})->ArgsProduct({{0, 1}, {64, 4096}});
}
BENCHMARK(Utf8ToUtf16)->Apply(Texts);     // never slower than the one below,
BENCHMARK(IcuUtf8ToUtf16)->Apply(Texts);  // on ASCII at least 3 times faster
BENCHMARK(Utf16ToUtf8)->Apply(Texts);     // the same
BENCHMARK(IcuUtf16ToUtf8)->Apply(Texts);

}  // namespace
}  // namespace zq
