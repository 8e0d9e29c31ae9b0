#include "common/uZqLogAppenders/daily.h"

#include <algorithm>
#include <cerrno>
#include <string>

#include "common/uZqDateTimeUtils.h"
#include "common/uZqLogAppenders/internal.h"
#include "common/uZqLogger/walk.h"
#include "common/uZqWindows.h"
#include "runtime/io/paths.h"
#include "runtime/io/streams.h"
#include "runtime/platform/disk_service.h"
#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"

namespace zq {

namespace {

constexpr Cardinal cMostSize = 2147483647;
constexpr std::size_t cHead = 1024;  // bytes of a file in which its first date is looked for

TDateTime LocalTime(Int64 AUtcMilliseconds) { return UnixMillisecondsToDateTime(LocalMilliseconds(AUtcMilliseconds)); }

// "0" in AShape is any digit.
bool BeginsWithShape(std::string_view AText, std::string_view AShape) noexcept {
  if (AText.size() < AShape.size()) return false;
  return std::equal(AShape.begin(), AShape.end(), AText.begin(),
      [](char a, char b) { return a == '0' ? IsDigit(static_cast<Byte>(b)) : a == b; });
}

// The local time that AText begins with: as it stands in the header of a simple layout, or in UTC as in that of XML.
std::optional<TDateTime> DateAtFront(std::string_view AText) {
  constexpr std::string_view cLocal = "0000-00-00 00:00:00", cUtc = "0000-00-00T00:00:00Z";
  const bool Utc = BeginsWithShape(AText, cUtc);
  if (!Utc && !BeginsWithShape(AText, cLocal)) return {};
  std::string Text(AText.substr(0, Utc ? cUtc.size() : cLocal.size()));
  Text[10] = 'T';
  try {
    return ZqISOStrToDateTime(FromUTF8(Text));
  } catch (const EConvertError&) {  // digits, but no date
    return {};
  }
}

// What a date pattern makes of a date: runs of digits, of letters, and single other characters.
enum class TRunKind : Byte { Digits, Letters, Other };
struct TRun {
  TRunKind Kind = TRunKind::Other;
  std::u16string_view Text;
};

TRunKind KindOf(Char AChar) noexcept {
  if (IsDigit(AChar)) return TRunKind::Digits;
  const bool Letter = AChar >= 0x80 || (AChar >= u'A' && AChar <= u'Z') || (AChar >= u'a' && AChar <= u'z');
  return Letter ? TRunKind::Letters : TRunKind::Other;
}

TRun TakeRun(std::u16string_view& ARest) noexcept {
  if (ARest.empty()) return {};
  const TRunKind Kind = KindOf(ARest[0]);
  std::size_t Length = 1;
  while (Kind != TRunKind::Other && Length < ARest.size() && KindOf(ARest[Length]) == Kind) ++Length;
  const std::u16string_view Text = ARest.substr(0, Length);
  ARest.remove_prefix(Length);
  return {Kind, Text};
}

// Whether AText could come of the pattern that made AShort and ALong of two dates, one with numbers as short and one
// with numbers as long as can be. Names may be any.
bool IsOfPattern(std::u16string_view AText, std::u16string_view AShort, std::u16string_view ALong) noexcept {
  while (!AText.empty() && !AShort.empty() && !ALong.empty()) {
    const TRun Run = TakeRun(AText), Short = TakeRun(AShort), Long = TakeRun(ALong);
    const std::size_t Size = Run.Text.size();
    if (Run.Kind != Short.Kind || (Run.Kind == TRunKind::Other && Run.Text != Short.Text)) return false;
    if (Run.Kind == TRunKind::Digits && (Size < Short.Text.size() || Size > Long.Text.size())) return false;
  }
  return AText.empty() && AShort.empty();
}

}  // namespace

TZqDailyRollingFileAppender::TZqDailyRollingFileAppender(TZqLogger* ALogger, const UnicodeString& AName)
    : Implements(ALogger, AName) {
  FMaxFileSize = cMostSize;
}

// Empty where the calendar ends: nothing rolls there, and no line is lost.
UnicodeString TZqDailyRollingFileAppender::TextOf(TDateTime AMoment) const {
  try {
    return FormatDateTime(FDatePattern, AMoment);
  } catch (const EConvertError&) {
    return {};
  }
}

// Made once a second, or a millisecond where the pattern shows those.
ZQ_HOT const UnicodeString& TZqDailyRollingFileAppender::TextOfNow() {
  const Int64 Now = UtcMilliseconds();
  if (Now < FNowFrom || Now > FNowTo) [[unlikely]] {
    const bool ShowsMilliseconds = LowerCase(FDatePattern).Pos(u"z") != 0;
    FNowText = TextOf(LocalTime(Now));
    FNowFrom = ShowsMilliseconds ? Now : Now - (Now % 1000 + 1000) % 1000;
    FNowTo = ShowsMilliseconds ? Now : FNowFrom + 999;
  }
  return FNowText;
}

std::optional<TDateTime> TZqDailyRollingFileAppender::DateInFile() const {
  try {
    TFileStream File(FFileName, fmOpenRead | fmShareDenyNone);
    std::string Head(cHead, '\0');
    Head.resize(static_cast<std::size_t>(File.Read(Head.data(), static_cast<Integer>(Head.size()))));
    for (std::string_view Rest = Head; !Rest.empty(); Rest.remove_prefix(1))
      if (const auto Date = DateAtFront(Rest)) return Date;
  } catch (const Exception&) {  // it can't be read: then its last change has to do
  }
  return {};
}

// The clock of a file system lags some milliseconds behind: a file made at the stroke of midnight is of the day before
// by it, and its header knows better.
std::optional<TDateTime> TZqDailyRollingFileAppender::TimeBegun() const {
  constexpr double cSecond = 1.0 / 86400;
  TDiskFacts Facts;
  if (Service<TDiskService>().Stat(ToSystemPath(FFileName).c_str(), true, Facts) != 0) return {};
  const TDateTime Known = LocalTime((Facts.CreatedTime != 0 ? Facts.CreatedTime : Facts.ModifiedTime) / 1000);
  const auto Date = DateInFile();
  return Date && (Facts.CreatedTime == 0 || (*Date > Known && *Date < Known + cSecond)) ? Date : Known;
}

// Onto no file that is there. A text that no file name can hold is the pattern's fault, and another roll wouldn't help.
TZqDailyRollingFileAppender::TMoved TZqDailyRollingFileAppender::MoveToDate() {
  errno = ENOENT;  // also of a folder
  if (!FileExists(FFileName)) return errno == ENOENT ? TMoved::Moved : TMoved::Refused;
  const auto Begun = TimeBegun();
  if (!Begun) return TMoved::Refused;
  const UnicodeString Text = TextOf(*Begun);
  if (FCurrent.IsEmpty()) FCurrent = Text;
  const UnicodeString Name = Folder() + Base() + u"." + Text + ExtractFileExt(FFileName);
  if (Text.IsEmpty() || FileExists(Name)) return TMoved::Refused;
  return RenameFile(FFileName, Name) ? TMoved::Moved : TMoved::Kept;
}

void TZqDailyRollingFileAppender::RollOver() {
  const TZqLogWalk Walk;
  const TScope Scope(FLock);
  if (!MayRoll()) return;
  switch (MoveToDate()) {
    case TMoved::Refused: return TZqRollingFileAppender::RollOver();
    case TMoved::Kept: return RollFailed();
    case TMoved::Moved: break;
  }
  EndRolled();
  if (FInitializing == 0) Initialize();
}

ZQ_HOT void TZqDailyRollingFileAppender::CheckRollover() {
  const TScope Scope(FLock);
  TZqRollingFileAppender::CheckRollover();
  if (FFileStream && TextOfNow() != FCurrent && IsRollDue()) RollOver();
}

// The text is set before the file is opened: where a header can't be written, the next line must not roll again.
void TZqDailyRollingFileAppender::Initialize() {
  const TZqLogWalk Walk;
  const TScope Scope(FLock);
  if (FInitializing == 0) FFailedRoll.reset();
  const TInitializing Initializing(*this);
  if (!FFileStream) {
    const UnicodeString Now = TextOfNow();
    const auto Begun = IsBlank(FFileName) ? std::nullopt : TimeBegun();
    FCurrent = Begun ? TextOf(*Begun) : Now;
    if (FCurrent != Now) RollOver();
    if (!FFailedRoll) FCurrent = Now;
  }
  TZqRollingFileAppender::Initialize();
}

void TZqDailyRollingFileAppender::SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) {
  const TScope Scope(FLock);
  TZqRollingFileAppender::SetConfig(AConfig);
  if (!AConfig) return;
  FDatePattern = Configured(*AConfig, *this, u"DatePattern", mtkString, FDatePattern, VarToUStr);
  FNowTo = FNowFrom - 1;
}

std::unique_ptr<TZqFileInfo> TZqDailyRollingFileAppender::CreateFileInfo(const UnicodeString& AFileName) {
  const TScope Scope(FLock);
  auto Result = TZqRollingFileAppender::CreateFileInfo(AFileName);
  if (const auto Suffix = SuffixOf(AFileName); Suffix && IsDate(Suffix->View())) Result->Index = 0;
  if (Result->Index == 0) Result->FileNameRight = u"." + ZqCleanupFileName(FCurrent);
  return Result;
}

bool TZqDailyRollingFileAppender::IsDate(std::u16string_view AText) const {
  const UnicodeString Short = ZqCleanupFileName(TextOf(EncodeDate(2001, 2, 3) + EncodeTime(4, 5, 6, 7)));
  const UnicodeString Long = ZqCleanupFileName(TextOf(EncodeDate(2012, 12, 23) + EncodeTime(14, 15, 16, 178)));
  return !AText.empty() && IsOfPattern(AText, Short.View(), Long.View());
}

// Beside what the numeric roll makes: a date, or a number and a date.
bool TZqDailyRollingFileAppender::IsOfSeries(const UnicodeString& AFileName) const {
  if (TZqRollingFileAppender::IsOfSeries(AFileName)) return true;
  const auto Suffix = SuffixOf(AFileName);
  if (!Suffix) return false;
  const std::size_t Dot = Suffix->View().find(u'.');
  return IsDate(Suffix->View()) || (Dot != std::u16string_view::npos && IsNumber(Suffix->View().substr(0, Dot)) &&
                                       IsDate(Suffix->View().substr(Dot + 1)));
}

UnicodeString TZqDailyRollingFileAppender::GetDatePattern() const {
  const TScope Scope(FLock);
  return FDatePattern;
}

void TZqDailyRollingFileAppender::SetDatePattern(const TText& AValue) {
  const TZqLogWalk Walk;
  const TScope Scope(FLock);
  FDatePattern = AValue.ToString();
  FNowTo = FNowFrom - 1;
  if (FFileStream && TextOfNow() != FCurrent) RollOver();
}

}  // namespace zq
