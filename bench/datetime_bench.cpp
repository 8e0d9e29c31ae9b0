// ISO dates as text and back, beside the C library on the same moment; the figures to quote are the ratios of the
// pairs. The C library's pairs begin and end with a count of seconds, as a TDateTime is a number, too; what it does
// between such a count and its fields is left out where the name says so.

#include <benchmark/benchmark.h>

#include <cstdlib>
#include <ctime>
#include <string>

#include "common/uZqDateTimeUtils.h"
#include "runtime/text/local_time.h"

namespace zq {
namespace {

constexpr std::time_t cSeconds = 1640256798;  // 2021-12-23 10:53:18 UTC
const TDateTime cMoment = UnixMillisecondsToDateTime(cSeconds * 1000LL);
constexpr const char* cText = "2021-12-23T10:53:18";
constexpr const char* cFormat = "%Y-%m-%dT%H:%M:%S";

void Require(bool ACondition) {
  if (!ACondition) std::abort();
}

template <class TFunction>
void Run(benchmark::State& AState, TFunction AFunction) {
  for (auto Step : AState) benchmark::DoNotOptimize(AFunction());
}

void IsoDateTimeToText(benchmark::State& AState) {
  Require(ZqDateTimeToISOStr(cMoment) == FromUTF8(cText) + u".000");
  Run(AState, [] { return ZqDateTimeToISOStr(cMoment); });
}

void IsoDateToText(benchmark::State& AState) {
  Run(AState, [] { return ZqDateToISOStr(cMoment); });
}

std::string Written(const std::tm& AFields, const char* AFormat) {
  char Room[32];
  return {Room, std::strftime(Room, sizeof Room, AFormat, &AFields)};
}

std::tm FieldsOf(std::time_t ASeconds) {
  std::tm Result{};
  gmtime_r(&ASeconds, &Result);
  return Result;
}

void CToText(benchmark::State& AState, const char* AFormat) {
  std::time_t Seconds = cSeconds;
  Run(AState, [&] {
    benchmark::DoNotOptimize(Seconds);
    return Written(FieldsOf(Seconds), AFormat);
  });
}

void CFieldsToText(benchmark::State& AState) {
  const std::tm Fields = FieldsOf(cSeconds);
  Run(AState, [&] { return Written(Fields, cFormat); });
}

void TextToIsoDateTime(benchmark::State& AState) {
  const UnicodeString Text = FromUTF8(cText);
  Require(ZqISOStrToDateTime(Text) == cMoment);
  Run(AState, [&] { return ZqISOStrToDateTime(Text); });
}

void TextToIsoDate(benchmark::State& AState) {
  const UnicodeString Text = u"2021-12-23";
  Run(AState, [&] { return ZqISOStrToDate(Text); });
}

void TextToIsoDateTimeOfUtc(benchmark::State& AState) {
  const UnicodeString Text = FromUTF8(cText) + u"Z";
  Run(AState, [&] { return ZqISOStrToDateTime(Text); });
}

void CTextToDateTime(benchmark::State& AState) {
  Run(AState, [] {
    std::tm Fields{};
    Require(strptime(cText, cFormat, &Fields) != nullptr);
    return timegm(&Fields);
  });
}

void CTextToFields(benchmark::State& AState, const char* AText, const char* AFormat) {
  Run(AState, [&] {
    std::tm Fields{};
    Require(strptime(AText, AFormat, &Fields) != nullptr);
    return Fields.tm_mday;
  });
}

BENCHMARK(IsoDateTimeToText);  // with milliseconds; faster than both below
BENCHMARK_CAPTURE(CToText, DateTime, cFormat);
BENCHMARK(CFieldsToText);
BENCHMARK(IsoDateToText);  // faster than the one below
BENCHMARK_CAPTURE(CToText, Date, "%Y-%m-%d");
BENCHMARK(TextToIsoDateTime);  // faster than both below
BENCHMARK(CTextToDateTime);
BENCHMARK_CAPTURE(CTextToFields, DateTime, cText, cFormat);
BENCHMARK(TextToIsoDateTimeOfUtc);  // local time
BENCHMARK(TextToIsoDate);           // faster than the one below
BENCHMARK_CAPTURE(CTextToFields, Date, "2021-12-23", "%Y-%m-%d");

}  // namespace
}  // namespace zq
