// Conversions into a caller's buffer, beside ICU on the same text: for UTF-8 its direct functions, for the other pages
// a converter that stays open. The figures to quote are the ratios of the pairs.

#include <benchmark/benchmark.h>
#include <unicode/ucnv.h>
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

// What the benchmarks call text: phrases of some words each, in one script or in scripts that chance names; words among
// emoji; emoji without a blank.
enum TKind : std::int64_t { Ascii, Mixed, Chat, Emoji };

std::u16string MakeText(std::int64_t AKind, std::size_t ALength) {
  static const std::vector<TWords> cScripts[] = {
      {cAscii}, {cLatin, cLatin, cGreek, cCjk}, {cAscii, cCjk, cEmoji, cEmoji}, {cEmoji}};
  const std::vector<TWords>& Scripts = cScripts[AKind];
  std::minstd_rand Chance(7);  // NOLINT: the same text in each run
  std::u16string Result;
  const auto Append = [&](TWords AWords) {
    Result.append(AWords[Chance() % AWords.size()]).append(AKind == Emoji ? u"" : u" ");
  };
  while (Result.size() < ALength) {
    const TWords Words = Scripts[Chance() % Scripts.size()];
    for (auto Left = AKind == Chat ? 1 : 3 + Chance() % 6; Left > 0; --Left) Append(Words);
    if (AKind == Mixed && Chance() % 4 == 0) Append(cEmoji);
  }
  Result.resize(ALength);
  if ((Result.back() & 0xFC00) == 0xD800) Result.back() = u'.';  // a pair that was cut
  return Result;
}

struct TSample {
  explicit TSample(const benchmark::State& AState)
      : Text(MakeText(AState.range(0), static_cast<std::size_t>(AState.range(1)))),
        Bytes(TZqEncoding::ConvertW(Text, cUtf8).Str()),
        WideRoom(Bytes.size()),
        ByteRoom(3 * Text.size()) {}
  std::u16string Text;
  std::string Bytes;
  std::vector<char16_t> WideRoom;
  std::vector<char> ByteRoom;
};

// AConvert returns how many units or bytes it made, which must be AExpected.
void Measure(benchmark::State& AState, std::size_t AExpected, auto AConvert) {
  std::int64_t Got = 0;
  for (auto Step : AState) {
    Got = static_cast<std::int64_t>(AConvert());
    benchmark::ClobberMemory();
  }
  if (Got != static_cast<std::int64_t>(AExpected)) std::abort();
  AState.SetItemsProcessed(AState.iterations() * AState.range(1));
}

void Utf8ToUtf16(benchmark::State& AState) {
  TSample Sample(AState);
  Measure(AState, Sample.Text.size(), [&] {
    return TZqEncoding::ConvertA(reinterpret_cast<const Byte*>(Sample.Bytes.data()),
        static_cast<Integer>(Sample.Bytes.size()), cUtf8, Sample.WideRoom.data(),
        static_cast<Integer>(Sample.WideRoom.size()));
  });
}

void IcuUtf8ToUtf16(benchmark::State& AState) {
  TSample Sample(AState);
  Measure(AState, Sample.Text.size(), [&] {
    std::int32_t Got = 0;
    UErrorCode Error = U_ZERO_ERROR;
    u_strFromUTF8(Sample.WideRoom.data(), static_cast<std::int32_t>(Sample.WideRoom.size()), &Got, Sample.Bytes.data(),
        static_cast<std::int32_t>(Sample.Bytes.size()), &Error);
    return Got;
  });
}

void Utf8Size(benchmark::State& AState) {
  const TSample Sample(AState);
  Measure(AState, Sample.Text.size(), [&] {
    return TZqEncoding::ConvertA(reinterpret_cast<const Byte*>(Sample.Bytes.data()),
        static_cast<Integer>(Sample.Bytes.size()), cUtf8, nullptr, 0);
  });
}

void IcuUtf8Size(benchmark::State& AState) {
  const TSample Sample(AState);
  Measure(AState, Sample.Text.size(), [&] {
    std::int32_t Got = 0;
    UErrorCode Error = U_ZERO_ERROR;
    u_strFromUTF8(nullptr, 0, &Got, Sample.Bytes.data(), static_cast<std::int32_t>(Sample.Bytes.size()), &Error);
    return Got;
  });
}

void Utf16ToUtf8(benchmark::State& AState) {
  TSample Sample(AState);
  Measure(AState, Sample.Bytes.size(), [&] {
    return TZqEncoding::ConvertW(Sample.Text.data(), static_cast<Integer>(Sample.Text.size()),
        reinterpret_cast<Byte*>(Sample.ByteRoom.data()), static_cast<Integer>(Sample.ByteRoom.size()), cUtf8);
  });
}

void IcuUtf16ToUtf8(benchmark::State& AState) {
  TSample Sample(AState);
  Measure(AState, Sample.Bytes.size(), [&] {
    std::int32_t Got = 0;
    UErrorCode Error = U_ZERO_ERROR;
    u_strToUTF8(Sample.ByteRoom.data(), static_cast<std::int32_t>(Sample.ByteRoom.size()), &Got, Sample.Text.data(),
        static_cast<std::int32_t>(Sample.Text.size()), &Error);
    return Got;
  });
}

void Texts(benchmark::internal::Benchmark* ABenchmark) {
  ABenchmark->ArgNames({"text", "chars"})->ArgsProduct({{Ascii, Mixed, Chat, Emoji}, {64, 4096}});
}
BENCHMARK(Utf8ToUtf16)->Apply(Texts);     // never slower than the one below,
BENCHMARK(IcuUtf8ToUtf16)->Apply(Texts);  // on ASCII at least 3 times faster
BENCHMARK(Utf16ToUtf8)->Apply(Texts);     // the same
BENCHMARK(IcuUtf16ToUtf8)->Apply(Texts);
BENCHMARK(Utf8Size)->Apply(Texts);  // never slower than the one below
BENCHMARK(IcuUtf8Size)->Apply(Texts);

// --------------------------------------------------------------------------------------------- other pages

struct TPageCase {
  Word Page;
  const char* Converter;
  std::u16string_view Words;
};

constexpr TPageCase cPageCases[] = {
    {1252, "ibm-5348_P100-1997", u"größer Straße café naïve señor plain words between déjà über façade "},
    {1251, "ibm-5347_P100-1998", u"съешь же ещё этих мягких французских булок да выпей чаю, 2024 "},
    {437, "ibm-437_P100-1995", u"größer café naïve señor plain words between déjà über ░▒▓│┤ "},
    {932, "ibm-943_P15A-2003", u"日本語の文章、カタカナとひらがな交じり、plain words 漢字 "},
    {936, "windows-936-2000", u"中文测试，这是一个句子，plain words 汉字编码 "},
    {949, "windows-949-2000", u"한국어 문장, 세계 여러 나라 plain words 서울 "},
    {950, "windows-950-2000", u"中文測試，這是一個句子，plain words 漢字編碼 "}};

struct TPageSample {
  explicit TPageSample(const benchmark::State& AState) : Case(cPageCases[AState.range(0)]) {
    const auto Length = static_cast<std::size_t>(AState.range(1));
    while (Text.size() < Length) Text += Case.Words;
    Text.resize(Length);
    Bytes = TZqEncoding::ConvertW(Text, Case.Page).Str();
    WideRoom.resize(Bytes.size());
    ByteRoom.resize(2 * Length);
    UErrorCode Error = U_ZERO_ERROR;
    Converter = ucnv_open(Case.Converter, &Error);
  }
  TPageSample(const TPageSample&) = delete;
  TPageSample& operator=(const TPageSample&) = delete;
  ~TPageSample() { ucnv_close(Converter); }

  const TPageCase& Case;
  std::u16string Text;
  std::string Bytes;
  std::vector<char16_t> WideRoom;
  std::vector<char> ByteRoom;
  UConverter* Converter = nullptr;
};

void PageToUtf16(benchmark::State& AState) {
  TPageSample Sample(AState);
  Measure(AState, Sample.Text.size(), [&] {
    return TZqEncoding::ConvertA(reinterpret_cast<const Byte*>(Sample.Bytes.data()),
        static_cast<Integer>(Sample.Bytes.size()), Sample.Case.Page, Sample.WideRoom.data(),
        static_cast<Integer>(Sample.WideRoom.size()));
  });
}

void IcuPageToUtf16(benchmark::State& AState) {
  TPageSample Sample(AState);
  Measure(AState, Sample.Text.size(), [&] {
    UErrorCode Error = U_ZERO_ERROR;
    return ucnv_toUChars(Sample.Converter, Sample.WideRoom.data(), static_cast<std::int32_t>(Sample.WideRoom.size()),
        Sample.Bytes.data(), static_cast<std::int32_t>(Sample.Bytes.size()), &Error);
  });
}

void Utf16ToPage(benchmark::State& AState) {
  TPageSample Sample(AState);
  Measure(AState, Sample.Bytes.size(), [&] {
    return TZqEncoding::ConvertW(Sample.Text.data(), static_cast<Integer>(Sample.Text.size()),
        reinterpret_cast<Byte*>(Sample.ByteRoom.data()), static_cast<Integer>(Sample.ByteRoom.size()),
        Sample.Case.Page);
  });
}

void IcuUtf16ToPage(benchmark::State& AState) {
  TPageSample Sample(AState);
  Measure(AState, Sample.Bytes.size(), [&] {
    UErrorCode Error = U_ZERO_ERROR;
    return ucnv_fromUChars(Sample.Converter, Sample.ByteRoom.data(), static_cast<std::int32_t>(Sample.ByteRoom.size()),
        Sample.Text.data(), static_cast<std::int32_t>(Sample.Text.size()), &Error);
  });
}

void Pages(benchmark::internal::Benchmark* ABenchmark) {
  ABenchmark->ArgNames({"case", "chars"})->ArgsProduct({{0, 1, 2, 3, 4, 5, 6}, {64, 4096}});
}
BENCHMARK(PageToUtf16)->Apply(Pages);     // twice as fast as the one below with one byte a character,
BENCHMARK(IcuPageToUtf16)->Apply(Pages);  // never slower with two
BENCHMARK(Utf16ToPage)->Apply(Pages);     // the same
BENCHMARK(IcuUtf16ToPage)->Apply(Pages);

}  // namespace
}  // namespace zq
