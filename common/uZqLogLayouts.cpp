#include "common/uZqLogLayouts.h"

#include "runtime/platform/clock.h"
#include "runtime/text/datetime.h"

namespace zq {

namespace {
constexpr std::u16string_view cIndentStep = u"  ";
}  // namespace

UnicodeString TZqSimpleLayout::GetHeader() { return u"Log started on : " + DateTimeToStr(Now()); }

UnicodeString TZqSimpleLayout::GetFooter() { return u"Log stopped on : " + DateTimeToStr(Now()); }

ZQ_HOT void TZqSimpleLayout::ChangeIndent(TZqLogIndent ALogIndent) {
  if (ALogIndent == liIndentIncrease) FIndent += cIndentStep;
  if (ALogIndent == liIndentDecrease) FIndent.SetLength(FIndent.Length() - static_cast<Integer>(cIndentStep.size()));
}

// Most lines come in the second of the one before: then the milliseconds alone are written anew.
ZQ_HOT const UnicodeString& TZqSimpleLayout::TimeNow() {
  const Int64 Milliseconds = NowMilliseconds();
  const auto Rest = static_cast<Integer>((Milliseconds % 1000 + 1000) % 1000);
  const Int64 Second = (Milliseconds - Rest) / 1000;
  if (Second != FSecond)
    FTime = FormatDateTime(u"yyyy-mm-dd hh:mm:ss:", UnixMillisecondsToDateTime(Milliseconds - Rest)) + u"zzz - ";
  FSecond = Second;
  Char* const Digits = FTime.data() + FTime.size() - 6;
  Digits[0] = static_cast<Char>(u'0' + Rest / 100);
  Digits[1] = static_cast<Char>(u'0' + Rest / 10 % 10);
  Digits[2] = static_cast<Char>(u'0' + Rest % 10);
  return FTime;
}

template <class TLine>
void TZqSimpleLayout::Compose(TLine& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  ChangeIndent(ALogIndent);
  if (!FIndent.IsEmpty()) ALine.Append(FIndent);
  ALine.Append(TimeNow());
  ALine.Append(ZqLogLevels[ALogLevel]);
  ALine.Append(u" ");
  ALine.Append(ALoggerName);
  ALine.Append(u" - ");
  ALine.Append(ALogMessage);
  if (AValue != nullptr) ALine.Append(u" - " + ZqDataRecToString(AValue));
}

ZQ_HOT void TZqSimpleLayout::AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  Compose(ALine, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
}

UnicodeString TZqSimpleLayout::FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  UnicodeString Result;
  Compose(Result, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
  return Result;
}

bool TZqSimpleLayout::GetInterface(const TGUID& AIID, void** AObj) {
  *AObj = nullptr;
  if (AIID == IZqLineLayout::IID && ClassType() != ClassOf<TZqSimpleLayout>()) return false;
  return Implements::GetInterface(AIID, AObj);
}

void uZqLogLayouts::Start() { RegisteredLayouts()->Add(TZqLogBaseClass::Of<TZqSimpleLayout>()); }

}  // namespace zq
