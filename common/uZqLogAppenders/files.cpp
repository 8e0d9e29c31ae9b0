#include "common/uZqLogAppenders/files.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "common/uZqLogAppenders/internal.h"
#include "common/uZqLogger/walk.h"
#include "common/uZqWindows.h"
#include "runtime/io/paths.h"
#include "runtime/platform/disk_service.h"
#include "runtime/text/local_time.h"

namespace zq {

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

constexpr Word cVista = 601;
constexpr Integer cCommonDocuments = 46;
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

namespace {

constexpr std::size_t cKeptLine = 1 << 16;  // bytes
constexpr std::size_t cLayoutState = 192;   // bytes that a layout is likely to read for a line

}  // namespace

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

}  // namespace zq
