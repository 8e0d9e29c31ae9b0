#include "common/uZqLogLayouts.h"

#include "runtime/core/start_count.h"
#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"

namespace zq {

namespace {

constinit TStartCount Starts;
constexpr std::u16string_view cIndentStep = u"  ";

UnicodeString NowText() {
  try {
    return DateTimeToStr(Now());
  } catch (const EConvertError&) {
    return FromUTF8(ZqCalendarText(LocalMilliseconds(UtcMilliseconds())));
  }
}

void AppendUtf8(utf8::TBuffer& ALine, std::string_view AText) { ALine.AppendBytes(AText); }
void AppendUtf8(UnicodeString& ALine, std::string_view AText) { ALine.Append(FromUTF8(AText)); }

}  // namespace

bool TZqSimpleLayout::GetInterface(const TGUID& AIID, void** AObj) {
  return FByteLayout.Answers(AIID, AObj) || Implements::GetInterface(AIID, AObj);
}

UnicodeString TZqSimpleLayout::GetHeader() { return u"Log started on : " + NowText(); }

UnicodeString TZqSimpleLayout::GetFooter() { return u"Log stopped on : " + NowText(); }

std::string TZqSimpleLayout::TimeText(Int64 ASecond) { return ZqCalendarText(LocalMilliseconds(ASecond)) + ":"; }

void TZqSimpleLayout::ChangeIndent(TZqLogIndent ALogIndent) {
  if (ALogIndent == liIndentIncrease) FIndent += cIndentStep;
  if (ALogIndent == liIndentDecrease) FIndent.SetLength(FIndent.Length() - static_cast<Integer>(cIndentStep.size()));
}

// Most lines begin like the one before, but for the milliseconds: then those alone are written anew, and nobody asks
// for the time zone.
ZQ_HOT std::string_view TZqSimpleLayout::Front(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel) {
  const Int64 Milliseconds = UtcMilliseconds();
  if (!ZqIsInSecond(Milliseconds, FSecond) || ALogLevel != FLevel || ALoggerName != FLoggerName) [[unlikely]]
    RenewFront(Milliseconds, ALoggerName, ALogLevel);
  const auto Rest = static_cast<Integer>(Milliseconds - FSecond);
  char* const Digits = FFront.data() + FTime.Text().size();
  Digits[0] = static_cast<char>('0' + Rest / 100);
  Digits[1] = static_cast<char>('0' + Rest / 10 % 10);
  Digits[2] = static_cast<char>('0' + Rest % 10);
  return FFront;
}

void TZqSimpleLayout::RenewFront(Int64 AMilliseconds, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel) {
  const std::string& Time = FTime.At(AMilliseconds);
  FLoggerName = ALoggerName;
  FLevel = ALogLevel;
  FFront = Time + "zzz - " + ToUTF8(ZqLogLevels[ALogLevel]) + " " + ToUTF8(ALoggerName) + " - ";
  FSecond = FTime.Second();
}

template <class TLine>
ZQ_HOT void TZqSimpleLayout::Compose(TLine& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  if (ALogIndent != liIndentNone) ChangeIndent(ALogIndent);
  if (!FIndent.IsEmpty()) ALine.Append(FIndent);
  AppendUtf8(ALine, Front(ALoggerName, ALogLevel));
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

void uZqLogLayouts::Start() {
  if (!Starts.Begins()) return;
  RegisteredLayouts()->Add(TZqLogBaseClass::Of<TZqSimpleLayout>());
  RegisteredLayouts()->Add(TZqLogBaseClass::Of<TZqXmlLayout>());
}

void uZqLogLayouts::Stop() { Starts.Ends(); }

}  // namespace zq
