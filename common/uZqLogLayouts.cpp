#include "common/uZqLogLayouts.h"

#include <algorithm>

#include "runtime/core/start_count.h"
#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"

namespace zq {

namespace {

constinit TStartCount Starts;
constexpr std::u16string_view cIndentStep = u"  ";
constexpr std::size_t cTimeLength = std::string_view("yyyy-mm-dd hh:mm:ss:zzz - ").size();

void AppendAscii(utf8::TBuffer& ALine, std::string_view AText) { ALine.AppendBytes(AText); }
void AppendAscii(UnicodeString& ALine, std::string_view AText) { ALine.Append(FromUTF8(AText)); }

}  // namespace

bool TZqSimpleLayout::GetInterface(const TGUID& AIID, void** AObj) {
  if (AIID != IZqLogByteLayout::IID || ClassType() != ClassOf<TZqSimpleLayout>())
    return Implements::GetInterface(AIID, AObj);
  *AObj = static_cast<IZqLogByteLayout*>(&FByteLayout);
  _AddRef();
  return true;
}

UnicodeString TZqSimpleLayout::GetHeader() { return u"Log started on : " + DateTimeToStr(Now()); }

UnicodeString TZqSimpleLayout::GetFooter() { return u"Log stopped on : " + DateTimeToStr(Now()); }

void TZqSimpleLayout::ChangeIndent(TZqLogIndent ALogIndent) {
  if (ALogIndent == liIndentIncrease) FIndent += cIndentStep;
  if (ALogIndent == liIndentDecrease) FIndent.SetLength(FIndent.Length() - static_cast<Integer>(cIndentStep.size()));
}

// Most lines come in the second of the one before: then the milliseconds alone are written anew, and nobody asks for
// the time zone.
ZQ_HOT const char* TZqSimpleLayout::TimeNow() {
  const Int64 Milliseconds = UtcMilliseconds();
  if (Milliseconds < FSecond || Milliseconds > FSecond + 999) {
    const Int64 Second = Milliseconds - (Milliseconds % 1000 + 1000) % 1000;
    const TDateTime Local = UnixMillisecondsToDateTime(LocalMilliseconds(Second));
    const UnicodeString Text = FormatDateTime(u"yyyy-mm-dd hh:mm:ss:", Local);
    std::copy(Text.begin(), Text.end(), FTime);
    FSecond = Second;
  }
  const auto Rest = static_cast<Integer>(Milliseconds - FSecond);
  char* const Digits = FTime + cTimeLength - 6;
  Digits[0] = static_cast<char>('0' + Rest / 100);
  Digits[1] = static_cast<char>('0' + Rest / 10 % 10);
  Digits[2] = static_cast<char>('0' + Rest % 10);
  return FTime;
}

template <class TLine>
ZQ_HOT void TZqSimpleLayout::Compose(TLine& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  ChangeIndent(ALogIndent);
  if (!FIndent.IsEmpty()) ALine.Append(FIndent);
  AppendAscii(ALine, {TimeNow(), cTimeLength});
  ALine.Append(ZqLogLevels[ALogLevel]);
  AppendAscii(ALine, " ");
  ALine.Append(ALoggerName);
  AppendAscii(ALine, " - ");
  ALine.Append(ALogMessage);
  if (AValue != nullptr) ALine.Append(u" - " + ZqDataRecToString(AValue));
}

ZQ_HOT void TZqSimpleLayout::AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  Compose(ALine, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
}

ZQ_HOT void TZqSimpleLayout::TByteLayout::AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName,
    TZqLogLevel ALogLevel, const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  Layout.Compose(ALine, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
}

UnicodeString TZqSimpleLayout::FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  UnicodeString Result;
  Compose(Result, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
  return Result;
}

void uZqLogLayouts::Start() {
  if (!Starts.Begins()) return;
  RegisteredLayouts()->Add(TZqLogBaseClass::Of<TZqSimpleLayout>());
}

void uZqLogLayouts::Stop() { Starts.Ends(); }

}  // namespace zq
