#include "common/uZqLogLayouts.h"

#include "runtime/platform/clock.h"
#include "runtime/text/datetime.h"

namespace zq {

namespace {
constexpr std::u16string_view cIndentStep = u"  ";
}  // namespace

UnicodeString TZqSimpleLayout::GetHeader() { return u"Log started on : " + DateTimeToStr(Now()); }

UnicodeString TZqSimpleLayout::GetFooter() { return u"Log stopped on : " + DateTimeToStr(Now()); }

void TZqSimpleLayout::ChangeIndent(TZqLogIndent ALogIndent) {
  if (ALogIndent == liIndentIncrease) FIndent += cIndentStep;
  if (ALogIndent == liIndentDecrease) FIndent.SetLength(FIndent.Length() - static_cast<Integer>(cIndentStep.size()));
}

void TZqSimpleLayout::AppendTime(std::u16string& ALine) {
  const TDateTime Time = Now();
  const Int64 Milliseconds = DateTimeToUnixMilliseconds(Time);
  const auto Rest = static_cast<Integer>((Milliseconds % 1000 + 1000) % 1000);
  const Int64 Second = (Milliseconds - Rest) / 1000;
  if (Second != FSecond) FSecondText = FormatDateTime(u"yyyy-mm-dd hh:mm:ss:", Time);
  FSecond = Second;
  ALine.append(FSecondText);
  for (const Integer Digit : {Rest / 100, Rest / 10 % 10, Rest % 10}) ALine.push_back(static_cast<Char>(u'0' + Digit));
}

UnicodeString TZqSimpleLayout::FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  constexpr std::size_t cTimeAndMarks = 23 + 16;
  ChangeIndent(ALogIndent);
  const UnicodeString Value = AValue == nullptr ? UnicodeString() : u" - " + ZqDataRecToString(AValue);
  std::u16string Line;
  Line.reserve(FIndent.size() + cTimeAndMarks + ALoggerName.size() + ALogMessage.size() + Value.size());
  Line.append(FIndent);
  AppendTime(Line);
  Line.append(u" - ").append(ZqLogLevels[ALogLevel]).append(u" ").append(ALoggerName);
  Line.append(u" - ").append(ALogMessage).append(Value);
  return Line;
}

void uZqLogLayouts::Start() { RegisteredLayouts()->Add(TZqLogBaseClass::Of<TZqSimpleLayout>()); }

}  // namespace zq
