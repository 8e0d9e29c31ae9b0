#include "common/uZqLogAppenders/rolling.h"

#include <algorithm>
#include <cerrno>
#include <utility>

#include "common/uZqLogAppenders/internal.h"
#include "common/uZqLogger/walk.h"
#include "runtime/io/paths.h"
#include "runtime/text/local_time.h"
#include "runtime/text/numbers.h"

namespace zq {

UnicodeString TZqRollingFileAppender::Folder() const {
  const UnicodeString Dir = ExtractFileDir(FFileName);
  return Dir.IsEmpty() ? Dir : IncludeTrailingBackslash(Dir);
}

UnicodeString TZqRollingFileAppender::Base() const { return ChangeFileExt(ExtractFileName(FFileName), u""); }

std::unique_ptr<TZqFileInfo> TZqRollingFileAppender::CreateFileInfo(const UnicodeString& AFileName) {
  const TScope Scope(FLock);
  auto Result = std::make_unique<TZqFileInfo>();
  Result->FileNameLeft = Base();
  const UnicodeString Stem = ChangeFileExt(ExtractFileName(AFileName), u"");
  const UnicodeString Rest = Stem.Copy(Result->FileNameLeft.Length() + 1, Stem.Length());
  if (!Rest.View().starts_with(u'.')) {
    Result->FileNameRight = Rest;
    return Result;
  }
  const UnicodeString Number = Rest.Copy(2, Rest.Length());
  const Integer Dot = Number.Pos(u".");
  Result->Index = StrToIntDef(Dot > 1 ? Number.Copy(1, Dot - 1) : Number, 0);
  if (Dot > 1) Result->FileNameRight = Number.Copy(Dot, Number.Length());
  return Result;
}

std::optional<UnicodeString> TZqRollingFileAppender::SuffixOf(const UnicodeString& AFileName) const {
  const UnicodeString Stem = ChangeFileExt(AFileName, u"");
  const UnicodeString Left = Base() + u".";
  if (ExtractFileExt(AFileName) != ExtractFileExt(FFileName) || !Stem.View().starts_with(Left.View())) return {};
  return Stem.Copy(Left.Length() + 1, Stem.Length());
}

bool TZqRollingFileAppender::IsOfSeries(const UnicodeString& AFileName) const {
  const auto Suffix = SuffixOf(AFileName);
  return Suffix ? IsNumber(Suffix->View()) : AFileName == ExtractFileName(FFileName);
}

// In order of their numbers, the log file first; of one number, which entries without one share, too, the newest first.
// False, with errno, where the folder couldn't be read to its end: what
// was found then must not be taken for the series.
bool TZqRollingFileAppender::ScanSeries(TSeries& ASeries) {
  TSearchRec Found;
  int Code = FindFirst(Folder() + Base() + u"*.*", faAnyFile, Found);
  for (; Code == 0; Code = FindNext(Found))
    if ((Found.Attr & faDirectory) == 0 && IsOfSeries(Found.Name))
      ASeries.push_back({Found.Name, CreateFileInfo(Found.Name), Found.ModifiedTime});
  FindClose(Found);
  const UnicodeString LogFile = ExtractFileName(FFileName);
  std::sort(ASeries.begin(), ASeries.end(), [&](const TEntry& A, const TEntry& B) {
    if (A.Info->Index != B.Info->Index) return A.Info->Index < B.Info->Index;
    if ((A.Name == LogFile) != (B.Name == LogFile)) return A.Name == LogFile;
    return A.Changed != B.Changed ? A.Changed > B.Changed : A.Name > B.Name;
  });
  errno = Code;
  return Code == cNoMoreFiles || Code == ENOENT;
}

// Never onto what is there: that is no file of the series, or one that couldn't be moved.
bool TZqRollingFileAppender::MoveTo(const TEntry& AEntry, std::size_t ANumber) {
  const UnicodeString Name = Base() + u"." + IntToStr(static_cast<Int64>(ANumber)) + AEntry.Info->FileNameRight +
                             ExtractFileExt(FFileName);  // FileExt may hold a dot of its own
  return Name == AEntry.Name || RenameFile(Folder() + AEntry.Name, Folder() + Name);
}

// Entries that move down to close a gap go first, from the front; those that move up go from the back, the log file as
// the last. So none meets one that still waits for its turn, and where one can't be moved the log file stands under its
// name.
bool TZqRollingFileAppender::MoveUp() {
  TSeries Series;
  if (!ScanSeries(Series)) return false;
  const auto MovesDown = [&](std::size_t i) { return Series[i].Info->Index > static_cast<Integer>(i) + 1; };
  for (std::size_t i = 0; i < Series.size(); ++i)
    if (MovesDown(i) && !MoveTo(Series[i], i + 1)) return false;
  for (std::size_t i = Series.size(); i-- > 0;)
    if (!MovesDown(i) && !MoveTo(Series[i], i + 1)) return false;
  return true;
}

void TZqRollingFileAppender::Complain(const UnicodeString& AWhat) {
  const UnicodeString Reason = SysErrorMessage(errno);
  ZqLogTrouble(this, AWhat + u" " + FFileName + u": " + Reason);
}

bool TZqRollingFileAppender::MayRoll() const {
  return FMaxBackupCount != 0 && !(FFileStream && (FInitializing != 0 || FFileStream->IsInherited()));
}

void TZqRollingFileAppender::RollFailed() {
  Complain(u"The roll failed:");
  FFailedRoll = {FFileStream ? FFileStream->Size() : 0, UtcMilliseconds()};
  if (!FFileStream && FInitializing == 0) OpenFile(true);
}

void TZqRollingFileAppender::EndRolled() {
  FFailedRoll.reset();
  try {
    EndFile();
  } catch (const Exception&) {  // a footer that can't be written: the roll may be what makes room again
  }
}

// Makes room for the new file before it is begun, so the series is never longer than it may be; and only when all
// before it have moved, so that a roll that fails costs no file. The open file stays open until it has its footer.
void TZqRollingFileAppender::RollOver() {
  const TZqLogWalk Walk;
  const TScope Scope(FLock);
  if (!MayRoll()) return;
  if (!MoveUp()) return RollFailed();
  EndRolled();
  Prune(FMaxBackupCount - std::size_t{1});
  if (FInitializing == 0) Initialize();
  CheckBackupCount();
}

// The file that is open stays, whatever its place.
void TZqRollingFileAppender::Prune(std::size_t AKept) {
  TSeries Series;
  if (!ScanSeries(Series)) return Complain(u"Backups could not be counted:");
  const UnicodeString Open = FFileStream ? ExtractFileName(FFileName) : u"";
  for (std::size_t i = Series.size(); i-- > AKept;)
    if (Series[i].Name != Open && !DeleteFile(Folder() + Series[i].Name))
      return Complain(u"A backup could not be deleted:");
}

void TZqRollingFileAppender::CheckBackupCount() {
  const TZqLogWalk Walk;
  const TScope Scope(FLock);
  Prune(FMaxBackupCount);
}

bool TZqRollingFileAppender::IsRollDue() const {
  constexpr Int64 cMinute = 60000;
  if (FFileStream->IsInherited()) return false;
  if (!FFailedRoll || (FMaxFileSize != 0 && FFileStream->Size() >= FFailedRoll->Size + FMaxFileSize)) return true;
  const Int64 Waited = UtcMilliseconds() - FFailedRoll->Time;
  return Waited < 0 || Waited >= cMinute;
}

ZQ_HOT void TZqRollingFileAppender::CheckRollover() {
  const TScope Scope(FLock);
  if (FFileStream && FMaxFileSize != 0 && FFileStream->Size() >= FMaxFileSize && IsRollDue()) RollOver();
}

ZQ_HOT bool TZqRollingFileAppender::PrepareWrite() {
  if (FMaxBackupCount == 0) return false;
  CheckRollover();
  return true;
}

// What a roll couldn't put away is continued, and the roll waits for its next try.
void TZqRollingFileAppender::Initialize() {
  const TZqLogWalk Walk;
  const TScope Scope(FLock);
  if (FInitializing == 0) FFailedRoll.reset();
  const TInitializing Initializing(*this);
  if (!FFileStream && !FAppendExisting && !FFailedRoll && FileExists(FFileName)) RollOver();
  OpenFile(true);
  if (FFailedRoll && FFileStream) FFailedRoll->Size = FFileStream->Size();
}

void TZqRollingFileAppender::SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) {
  const TScope Scope(FLock);
  TZqFileAppender::SetConfig(AConfig);
  if (!AConfig) return;
  FMaxFileSize =
      static_cast<Cardinal>(Configured(*AConfig, *this, u"MaxFileSize", mtkInteger, Int64{FMaxFileSize}, VarToInt64));
  SetMaxBackupCount(static_cast<Word>(
      Configured(*AConfig, *this, u"MaxBackupCount", mtkInteger, Integer{FMaxBackupCount}, VarToInteger)));
}

Cardinal TZqRollingFileAppender::GetMaxFileSize() const {
  const TScope Scope(FLock);
  return FMaxFileSize;
}

Word TZqRollingFileAppender::GetMaxBackupCount() const {
  const TScope Scope(FLock);
  return FMaxBackupCount;
}

void TZqRollingFileAppender::SetMaxFileSize(Cardinal AValue) {
  const TScope Scope(FLock);
  FMaxFileSize = AValue;
}

void TZqRollingFileAppender::SetMaxBackupCount(Word AValue) {
  const TZqLogWalk Walk;
  const TScope Scope(FLock);
  FMaxBackupCount = AValue;
  if (AValue == 0) {
    FFileStream.reset();
    FInitialized = false;
  }
  CheckBackupCount();
}

}  // namespace zq
