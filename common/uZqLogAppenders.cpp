#include "common/uZqLogAppenders.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "common/uZqWindows.h"
#include "runtime/core/start_count.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/text/numbers.h"

namespace zq {

namespace {

constinit TStartCount Starts;
constexpr Word cVista = 601;
constexpr Integer cCommonDocuments = 46;
constexpr std::size_t cKeptLine = 1 << 16;  // bytes

bool IsBlank(const TFileName& AName) { return Trim(AName).IsEmpty(); }

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

void TZqBaseAppender::SetConfig(const IntfRef<IZqLogConfigurator>&) {}

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

void TZqBaseAppender::SetLayout(const ShortString& ALayout) { SetLayout(RegisteredLayouts()->GetClass(ALayout)); }

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

TZqFileAppender::TZqFileAppender(TZqLogger* ALogger, const UnicodeString& AName)
    : Implements(ALogger, AName), FFileName(ChangeFileExt(ParamStr(0), u".log")) {
  if (ZqGetWindowsVersion() < cVista) return;
  const UnicodeString Host = ChangeFileExt(ExtractFileName(ParamStr(0)), u"");
  const UnicodeString Folder = IncludeTrailingBackslash(ZqGetShellFolder(cCommonDocuments)) + Host;
  ForceDirectories(Folder);
  FFileName = IncludeTrailingBackslash(Folder) + Host + FFileExt;
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

void TZqFileAppender::SetFileName(const TFileName& AValue) {
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

void TZqFileAppender::SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) {
  const TScope Scope(FLock);
  TZqBaseAppender::SetConfig(AConfig);
}

void TZqFileAppender::Initialize() {
  const TScope Scope(FLock);
  const TInitializing Initializing(*this);
  FFileStream.reset();
  if (IsBlank(FFileName)) return;
  if (!FAppendExisting && FileExists(FFileName)) DeleteFile(FFileName);
  FFileStream = std::make_unique<TZqTextFile>(FFileName);
  if (const auto Layout = FLayout) {
    const UnicodeString Header = Layout->GetHeader();
    if (!Header.IsEmpty() && FFileStream) FFileStream->WriteLn(Header);
  }
  TZqBaseAppender::Initialize();
}

ZQ_HOT bool TZqFileAppender::PrepareWrite() { return true; }

ZQ_HOT void TZqFileAppender::Write(const UnicodeString& ASender, const UnicodeString& ALoggerName,
    TZqLogLevel ALogLevel, const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  const TScope Scope(FLock);
  if (!PrepareWrite()) return;
  TZqBaseAppender::Write(ASender, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
  if (!FLayout || !FFileStream) return;
  const TWriting Writing(*this);
  utf8::TBuffer Line = std::move(FSpareLine);  // a message from within the layout comes back here and finds none
  Line.Clear();
  if (FByteLayout) FByteLayout->AppendLine(Line, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
  else Line.Append(FLayout->FormatLine(ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent));
  if (!Line.IsEmpty() && FFileStream) {
    Line.AppendBytes("\r\n");
    FFileStream->WriteBytes(Line.View());
  }
  if (Line.Room() <= cKeptLine) FSpareLine = std::move(Line);
}

void TZqFileAppender::EndFile() {
  struct TEnd {
    ~TEnd() { Stream.reset(); }
    std::unique_ptr<TZqTextFile>& Stream;
  } const End{FFileStream};
  const TInitializing Ending(*this);
  const auto Layout = FFileStream ? FLayout : nullptr;
  const UnicodeString Footer = Layout ? Layout->GetFooter() : u"";
  if (!Footer.IsEmpty() && FFileStream) FFileStream->Write(Footer);
}

void TZqFileAppender::Close() {
  const TScope Scope(FLock);
  if (FInitializing != 0) return;
  FInitialized = false;
  EndFile();
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

bool TZqRollingFileAppender::IsOfSeries(const UnicodeString& AFileName) const {
  if (ExtractFileExt(AFileName) != ExtractFileExt(FFileName)) return false;
  const UnicodeString Stem = ChangeFileExt(AFileName, u"");
  const UnicodeString Left = Base();
  if (Stem == Left) return true;
  if (!Stem.View().starts_with((Left + u".").View())) return false;
  const std::u16string_view Number = Stem.View().substr(Left.size() + 1);
  return !Number.empty() && Number.size() <= 9 &&
         std::all_of(Number.begin(), Number.end(), [](Char c) { return c >= u'0' && c <= u'9'; });
}

std::vector<TZqRollingFileAppender::TEntry> TZqRollingFileAppender::ScanSeries() {
  std::vector<TEntry> Result;
  TSearchRec Found;
  for (int More = FindFirst(Folder() + Base() + u"*.*", faAnyFile, Found); More == 0; More = FindNext(Found))
    if ((Found.Attr & faDirectory) == 0 && IsOfSeries(Found.Name))
      Result.push_back({Found.Name, CreateFileInfo(Found.Name)});
  FindClose(Found);
  const UnicodeString LogFile = ExtractFileName(FFileName);
  std::sort(Result.begin(), Result.end(), [&](const TEntry& A, const TEntry& B) {
    if (A.Info->Index != B.Info->Index) return A.Info->Index < B.Info->Index;
    if ((A.Name == LogFile) != (B.Name == LogFile)) return A.Name == LogFile;
    return A.Name < B.Name;
  });
  return Result;
}

void TZqRollingFileAppender::Renumber(const TEntry& AEntry, std::size_t APosition) {
  const UnicodeString Path = Folder(), Ext = ExtractFileExt(FFileName);  // FileExt may hold a dot of its own
  const UnicodeString Name =
      Base() + u"." + IntToStr(static_cast<Int64>(APosition) + 1) + AEntry.Info->FileNameRight + Ext;
  if (Name == AEntry.Name) return;
  if (FileExists(Path + Name)) DeleteFile(Path + Name);
  RenameFile(Path + AEntry.Name, Path + Name);
}

// Entries that move down to close a gap go first, from the front; those that move up go from the back. So none is
// renamed onto one that still waits for its turn.
void TZqRollingFileAppender::RollOver() {
  const TScope Scope(FLock);
  if (FFileStream && FInitializing != 0) return;
  try {
    EndFile();
  } catch (const Exception&) {  // a footer that can't be written: the roll may be what makes room again
  }
  const std::vector<TEntry> Series = ScanSeries();
  const std::size_t Kept = std::min<std::size_t>(Series.size(), FMaxBackupCount);
  const auto MovesDown = [&](std::size_t i) { return Series[i].Info->Index > static_cast<Integer>(i) + 1; };
  for (std::size_t i = Series.size(); i-- > Kept;) DeleteFile(Folder() + Series[i].Name);
  for (std::size_t i = 0; i < Kept; ++i)
    if (MovesDown(i)) Renumber(Series[i], i);
  for (std::size_t i = Kept; i-- > 0;)
    if (!MovesDown(i)) Renumber(Series[i], i);
  if (FInitializing == 0) Initialize();
  CheckBackupCount();
}

void TZqRollingFileAppender::CheckBackupCount() {
  const TScope Scope(FLock);
  const std::vector<TEntry> Series = ScanSeries();
  for (std::size_t i = Series.size(); i-- > FMaxBackupCount;) DeleteFile(Folder() + Series[i].Name);
}

ZQ_HOT void TZqRollingFileAppender::CheckRollover() {
  const TScope Scope(FLock);
  if (FFileStream && FMaxFileSize != 0 && FFileStream->Size() >= FMaxFileSize) RollOver();
}

ZQ_HOT bool TZqRollingFileAppender::PrepareWrite() {
  if (FMaxBackupCount == 0) return false;
  CheckRollover();
  return true;
}

void TZqRollingFileAppender::Initialize() {
  const TScope Scope(FLock);
  const TInitializing Initializing(*this);
  if (!FFileStream && !FAppendExisting && FileExists(FFileName)) RollOver();
  TZqFileAppender::Initialize();
}

void TZqRollingFileAppender::SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) {
  const TScope Scope(FLock);
  TZqFileAppender::SetConfig(AConfig);
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
  const TScope Scope(FLock);
  FMaxBackupCount = AValue;
  if (AValue == 0) {
    FFileStream.reset();
    FInitialized = false;
  }
  CheckBackupCount();
}

void uZqLogAppenders::Start() {
  if (!Starts.Begins()) return;
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TZqFileAppender>());
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TZqRollingFileAppender>());
}

void uZqLogAppenders::Stop() { Starts.Ends(); }

}  // namespace zq
