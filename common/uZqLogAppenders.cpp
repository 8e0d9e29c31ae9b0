#include "common/uZqLogAppenders.h"

#include <algorithm>
#include <cerrno>
#include <limits>
#include <utility>

#include "common/uZqDateTimeUtils.h"
#include "common/uZqLogger/walk.h"
#include "common/uZqWindows.h"
#include "runtime/core/start_count.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/io/streams.h"
#include "runtime/platform/disk_service.h"
#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"
#include "runtime/text/numbers.h"

namespace zq {

namespace {

constinit TStartCount Starts;
constexpr Word cVista = 601;
constexpr Integer cCommonDocuments = 46;
constexpr std::size_t cKeptLine = 1 << 16;  // bytes
constexpr std::size_t cLayoutState = 192;   // bytes that a layout is likely to read for a line

constexpr bool IsDigit(Char AChar) noexcept { return AChar >= u'0' && AChar <= u'9'; }

bool IsNumber(std::u16string_view AText) noexcept {
  return !AText.empty() && AText.size() <= 9 && std::ranges::all_of(AText, IsDigit);
}

bool IsBlank(const TFileName& AName) { return Trim(AName).IsEmpty(); }

// What AConfig tells of an appender, read by ARead.
template <class TRead>
auto Configured(IZqLogConfigurator& AConfig, const TZqBaseAppender& AAppender, const char16_t* AKey,
    TZqMainTypeKind AKind, const Variant& ADefault, TRead ARead) {
  return ARead(AConfig.GetAppenderValue(AAppender.GetName(), AKey, AKind, ADefault));
}

}  // namespace

// ---------------------------------------------------------------------------------------- TZqBaseAppender

void TZqBaseAppender::AfterConstruction() {
  Implements::AfterConstruction();
  if (const auto Config = Logger()->Configurator()) SetConfig(Config);
}

void TZqBaseAppender::BeforeDestruction() {
  LeaveLists();  // first: a message behind the footer would open the file again
  try {
    Close();
  } catch (const Exception&) {  // the last bytes can't be written: the file is closed, and the appender goes
  }
  Implements::BeforeDestruction();
}

IntfRef<IZqLogLayout> TZqBaseAppender::Layout() const {
  const TScope Scope(FLock);
  return FLayout;
}

void TZqBaseAppender::Initialize() { FInitialized = true; }

void TZqBaseAppender::Close() { FInitialized = false; }

void TZqBaseAppender::Write(
    const UnicodeString&, const UnicodeString&, TZqLogLevel, const UnicodeString&, PZqDataRec, TZqLogIndent) {
  if (!FInitialized && FInitializing == 0) Initialize();
}

void TZqBaseAppender::SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) {
  if (!AConfig) return;
  const UnicodeString Layout = Configured(*AConfig, *this, u"Layout", mtkString, u"", VarToUStr);
  if (!Layout.IsEmpty()) SetLayout(ShortString(Layout.ToUTF8()));
}

void TZqBaseAppender::SetLayout(const IntfRef<IZqLogLayout>& ALayout) {
  auto Bytes = ALayout.Supports<IZqLogByteLayout>();  // first: it asks the layout, which may raise
  if (FWriting != 0) FFormer.insert(FFormer.end(), {FLayout, FByteLayout});
  FLayout = ALayout;
  FByteLayout = std::move(Bytes);
  if (const auto Told = ALayout.Supports<_IZqLogLayout>()) Told->Initialize(this);
}

void TZqBaseAppender::SetLayout(TZqLogBaseClass ALayout) {
  const IntfRef<IZqLogBase> Made(ALayout.Create(Logger(), ALayout.ClassName()));
  SetLayout(Made.As<IZqLogLayout>());
}

void TZqBaseAppender::SetLayout(const TText& ALayout) { SetLayout(RegisteredLayouts()->GetClass(ALayout)); }

// ---------------------------------------------------------------------------------------- TZqTextFile

TZqTextFile::TZqTextFile(const TFileName& AFileName) {
  const bool Existed = FileExists(AFileName);
  ForceDirectories(ExtractFileDir(AFileName));  // a folder that can't be made shows at the open
  FFile.Assign(AFileName, 65001);
  if (Existed) FFound = std::max<Int64>(FileSizeOf(AFileName), 0);
  FFile.AppendOrCreate();
}

TZqTextFile::~TZqTextFile() {
  try {
    Close();
  } catch (const Exception&) {  // a destructor has nobody to tell
  }
}

ZQ_HOT Cardinal TZqTextFile::Size() const {
  return static_cast<Cardinal>(std::clamp<Int64>(FFound + FFile.Written(), 0, std::numeric_limits<Cardinal>::max()));
}

void TZqTextFile::Write(const UnicodeString& AValue) {
  const TLockScope Scope(FCritSect);
  FFile.Write(AValue);
}

void TZqTextFile::WriteLn(const UnicodeString& AValue) {
  const TLockScope Scope(FCritSect);
  FFile.WriteLn(AValue);
}

void TZqTextFile::Close() {
  const TLockScope Scope(FCritSect);
  FFile.Close();
}

// ---------------------------------------------------------------------------------------- TZqFileAppender

namespace {

// A folder of that name that can be made, in the common documents, or among temporary files where there are none; empty
// where neither can be had.
UnicodeString FolderFor(const UnicodeString& AHost) {
  for (const auto Parent : {+[] { return ZqGetShellFolder(cCommonDocuments); }, +[] { return ZqGetTempDirectory(); }})
    try {
      const UnicodeString Folder = Parent();
      UnicodeString Result = IncludeTrailingBackslash(IncludeTrailingBackslash(Folder) + AHost);
      if (!Folder.IsEmpty() && ForceDirectories(ExcludeTrailingBackslash(Result))) return Result;
    } catch (const Exception&) {  // the next one
    }
  return {};
}

}  // namespace

TZqFileAppender::TZqFileAppender(TZqLogger* ALogger, const UnicodeString& AName)
    : Implements(ALogger, AName), FFileName(ChangeFileExt(ParamStr(0), u".log")) {
  if (ZqGetWindowsVersion() < cVista) return;
  const UnicodeString Host = ChangeFileExt(ExtractFileName(ParamStr(0)), u"");
  if (const UnicodeString Folder = FolderFor(Host); !Folder.IsEmpty()) FFileName = Folder + Host + FFileExt;
}

TFileName TZqFileAppender::GetFileName() const {
  const TScope Scope(FLock);
  return FFileName;
}

bool TZqFileAppender::GetAppendExisting() const {
  const TScope Scope(FLock);
  return FAppendExisting;
}

UnicodeString TZqFileAppender::GetFileExt() const {
  const TScope Scope(FLock);
  return FFileExt;
}

void TZqFileAppender::SetFileName(const TText& AText) {
  const TFileName AValue = AText.ToString();
  const TScope Scope(FLock);
  if (AValue == FFileName) return;
  Close();
  const UnicodeString Ext = ExtractFileExt(AValue);
  FFileName = Ext.IsEmpty() && !IsBlank(AValue) ? AValue + FFileExt : AValue;
  if (!Ext.IsEmpty()) FFileExt = Ext;
}

void TZqFileAppender::SetFileExt(const UnicodeString& AValue) {
  const TScope Scope(FLock);
  if (AValue == FFileExt) return;
  Close();
  FFileExt = AValue.View().starts_with(u'.') ? AValue : u"." + AValue;
  if (!IsBlank(FFileName)) FFileName = ChangeFileExt(FFileName, FFileExt);
}

void TZqFileAppender::SetAppendExisting(bool AValue) {
  const TScope Scope(FLock);
  FAppendExisting = AValue;
}

void TZqFileAppender::SetLayout(const IntfRef<IZqLogLayout>& ALayout) {
  const TScope Scope(FLock);
  Close();
  if (const auto Deciding = ALayout.Supports<IZqLogLayoutEx>()) SetFileExt(Deciding->GetFileExt());
  TZqBaseAppender::SetLayout(ALayout);
}

// The extension first: a file name's own one leads, and that of a layout, which comes last, before both.
void TZqFileAppender::SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) {
  const TScope Scope(FLock);
  if (AConfig) {
    FAppendExisting = Configured(*AConfig, *this, u"AppendExisting", mtkBoolean, true, VarToBool);
    const UnicodeString Name = Configured(*AConfig, *this, u"FileName", mtkString, u"", VarToUStr);
    const UnicodeString Ext = Configured(*AConfig, *this, u"FileExt", mtkString, u"", VarToUStr);
    if (!Ext.IsEmpty()) SetFileExt(Ext);
    if (!Name.IsEmpty()) SetFileName(Name);
  }
  TZqBaseAppender::SetConfig(AConfig);
}

void TZqFileAppender::Initialize() {
  const TZqLogWalk Walk;
  const TScope Scope(FLock);
  OpenFile(FAppendExisting);
}

void TZqFileAppender::OpenFile(bool AAppend) {
  const TInitializing Initializing(*this);
  FFileStream.reset();
  if (IsBlank(FFileName)) return;
  if (!AAppend && FileExists(FFileName)) DeleteFile(FFileName);
  FFailedAt = UtcMilliseconds();
  FFileStream = std::make_unique<TZqTextFile>(FFileName);
  if (!FFileStream->Claim()) ZqLogTrouble(this, u"The file is written by another appender too: " + FFileName);
  if (FLayout) WriteHeader();
  TZqBaseAppender::Initialize();
}

namespace {

// The file ends as ALayout ends one, whatever the time was.
bool EndsWithFooter(const TFileName& AFileName, IZqLogLayout& ALayout) {
  const std::string Footer = ALayout.GetFooter().ToUTF8();
  std::string Tail(Footer.size(), '\0');
  const Int64 Count = Service<TDiskService>().ReadTail(ToSystemPath(AFileName).c_str(), Tail.data(), Tail.size());
  return Count == static_cast<Int64>(Tail.size()) &&
         std::equal(Tail.begin(), Tail.end(), Footer.begin(), [&](char a, char b) {
           return a == b || (IsDigit(static_cast<Byte>(a)) && IsDigit(static_cast<Byte>(b)));
         });
}

}  // namespace

// A header stands directly behind the footer of an earlier run, which has no line end, but on a line of its own behind
// a line that was torn.
void TZqFileAppender::WriteHeader() {
  const auto Layout = FLayout;
  const UnicodeString Header = Layout->GetHeader();
  if (Header.IsEmpty() || !FFileStream) return;
  if (FFileStream->IsTorn() && EndsWithFooter(FFileName, *Layout) && FFileStream) FFileStream->GoOnInLine();
  if (FFileStream) FFileStream->WriteLn(Header);
}

ZQ_HOT bool TZqFileAppender::PrepareWrite() { return true; }

ZQ_HOT void TZqFileAppender::Write(const UnicodeString& ASender, const UnicodeString& ALoggerName,
    TZqLogLevel ALogLevel, const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  Prefetch(this, sizeof *this);
  const TScope Scope(FLock);
  Prefetch(FFileStream.get(), sizeof(TZqTextFile));
  Prefetch(FByteLayout.Get(), cLayoutState);
  if (!PrepareWrite()) return;
  TZqBaseAppender::Write(ASender, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
  if (!FFileStream && FInitialized) [[unlikely]]
    Revive();
  if (!FLayout || !FFileStream) return;
  const TWriting Writing(*this);
  utf8::TBuffer Line = std::move(FSpareLine);  // a message from within the layout comes back here and finds none
  Line.Clear();
  if (FByteLayout) FByteLayout->AppendLine(Line, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
  else Line.Append(FLayout->FormatLine(ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent));
  if (!Line.IsEmpty() && FFileStream) {
    Line.AppendBytes("\r\n");
    FFileStream->FFile.WriteBytes(Line.View());  // by FLock it is nobody else's
  }
  if (Line.Room() <= cKeptLine) FSpareLine = std::move(Line);
}

// After a roll that couldn't open its file.
void TZqFileAppender::Revive() {
  const Int64 Waited = UtcMilliseconds() - FFailedAt;
  try {
    if (FRetryInterval != 0 && (Waited < 0 || Waited >= Int64{FRetryInterval})) Initialize();
    if (!FFileStream) ZqLogMessageLost(u"The file isn't open: " + FFileName);
  } catch (const EInOutError& e) {
    ZqLogMessageLost(e.Message());
  }
}

void TZqFileAppender::EndFile() {
  struct TEnd {
    ~TEnd() { Stream.reset(); }
    std::unique_ptr<TZqTextFile>& Stream;
  } const End{FFileStream};
  const TInitializing Ending(*this);
  const auto Layout = FFileStream && !FFileStream->IsInherited() ? FLayout : nullptr;
  const UnicodeString Footer = Layout ? Layout->GetFooter() : u"";
  if (!Footer.IsEmpty() && FFileStream) FFileStream->Write(Footer);
}

void TZqFileAppender::Close() {
  const TZqLogWalk Walk;
  const TScope Scope(FLock);
  if (FInitializing != 0) return;
  FInitialized = false;
  EndFile();
}

Cardinal TZqFileAppender::GetRetryInterval() const {
  const TScope Scope(FLock);
  return FRetryInterval;
}

void TZqFileAppender::SetRetryInterval(Cardinal AValue) {
  const TScope Scope(FLock);
  FRetryInterval = AValue;
}

// ---------------------------------------------------------------------------------------- TZqRollingFileAppender

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

// ---------------------------------------------------------------------------------------- TZqDailyRollingFileAppender

namespace {

constexpr Cardinal cMostSize = 2147483647;
constexpr std::size_t cHead = 1024;  // bytes of a file in which its first date is looked for

TDateTime LocalTime(Int64 AUtcMilliseconds) { return UnixMillisecondsToDateTime(LocalMilliseconds(AUtcMilliseconds)); }

// "yyyy-mm-dd hh:mm:ss" at the front of AText.
std::optional<TDateTime> DateAtFront(std::string_view AText) {
  constexpr std::string_view cShape = "0000-00-00 00:00:00";
  if (AText.size() < cShape.size()) return {};
  for (std::size_t i = 0; i < cShape.size(); ++i)
    if (cShape[i] == '0' ? !IsDigit(static_cast<Byte>(AText[i])) : AText[i] != cShape[i]) return {};
  try {
    return JoinDateTime(ZqISOStrToDate(FromUTF8(AText.substr(0, 10))), ZqISOStrToTime(FromUTF8(AText.substr(11, 8))));
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

void uZqLogAppenders::Start() {
  if (!Starts.Begins()) return;
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TZqDailyRollingFileAppender>());
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TZqFileAppender>());
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TZqRollingFileAppender>());
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TZqEventLogAppender>());
}

void uZqLogAppenders::Stop() { Starts.Ends(); }

}  // namespace zq
