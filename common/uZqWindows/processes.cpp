#include "common/uZqWindows/processes.h"

#include <string>

#include "common/uZqWindows.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/sync/critical_section.h"
#include "runtime/sync/event.h"
#include "runtime/text/encoding.h"

namespace zq {

// ------------------------------------------------------------------------------------------------- Captured output

namespace {

UnicodeString AnsiText(std::string_view ABytes) { return TEncoding::ANSI().GetString(ABytes.data(), ABytes.size()); }

template <class TTake>
void RunAndRead(const UnicodeString& ACommand, const UnicodeString& ADirectory, bool AUseCmd, TTake ATake) {
  const auto Process =
      Service<TProcessService>().CreateProcess(AUseCmd ? u"cmd.exe /C " + ACommand : ACommand, ADirectory);
  if (Process == nullptr) RaiseLastOSError();
  char Buffer[255];
  for (Integer Got; (Got = Process->ReadFile(Buffer, sizeof Buffer)) > 0;) {
    const std::string_view Piece(Buffer, static_cast<std::size_t>(Got));
    ATake(Piece.substr(0, Piece.find('\0')));
  }
  Process->WaitForSingleObject(INFINITE);
}

}  // namespace

UnicodeString ZqRunProcessAndCaptureOutput(
    const UnicodeString& ACommand, const UnicodeString& ADirectory, bool AUseCmd) {
  std::string Bytes;  // decoded as a whole: the end of a piece may cut a character
  RunAndRead(ACommand, ADirectory, AUseCmd, [&](std::string_view APiece) { Bytes += APiece; });
  return AnsiText(Bytes);
}

void ZqRunProcessAndCaptureOutput(
    const UnicodeString& ADirectory, const UnicodeString& ACommand, TZqOnCmdOutputProc AOnOutput, bool AUseCmd) {
  ZqRunProcessAndCaptureOutput(ADirectory, ACommand, TZqOnCmdOutputMethod(AOnOutput), AUseCmd);
}

void ZqRunProcessAndCaptureOutput(const UnicodeString& ADirectory, const UnicodeString& ACommand,
    const TZqOnCmdOutputMethod& AOnOutput, bool AUseCmd) {
  RunAndRead(ACommand, ADirectory, AUseCmd, [&](std::string_view APiece) {
    if (AOnOutput) AOnOutput(AnsiText(APiece));
  });
}

// ----------------------------------------------------------------------------------------------- Opening by the shell

namespace {

constexpr Word cElevationIsKnown = 601;  // the first code of a system with levels
constexpr Integer cLastFailure = 32;     // of ShellExecute
constexpr Cardinal cLongestWait = 0x7FFFFFFF;

UnicodeString ArgumentText(TZqStringArgs AParams, bool ASwitchesBare) {
  UnicodeString Result;
  for (const UnicodeString& Each : AParams) {
    const bool Bare = ASwitchesBare && !Each.IsEmpty() && (Each[1] == u'-' || Each[1] == u'/');
    Result += Bare ? u' ' + Trim(Each) : u" \"" + Trim(Each) + u'"';
  }
  return Trim(Result);
}

void OpenAddress(const UnicodeString& AAddress, std::u16string_view AMark, std::u16string_view APrefix) {
  const UnicodeString Address = Trim(AAddress);
  const bool Marked = LowerCase(Address).Pos(AMark) > 0;
  Service<TProcessService>().ShellExecute(u"open", Marked ? Address : APrefix + Address, u"", SW_SHOWNORMAL);
}

void Start(const UnicodeString& AVerb, const UnicodeString& AFile, const UnicodeString& AParams, Integer AShowCmd,
    bool AElevate) {
  TProcessService& System = Service<TProcessService>();
  if (AElevate && ZqGetWindowsVersion() >= cElevationIsKnown && ZqGetElevationLevel() == elLimited) {
    std::unique_ptr<TChildProcess> Unused;
    if (!System.ShellExecuteEx({0, u"runas", AFile, AParams, AShowCmd}, Unused)) RaiseLastOSError();
  } else if (System.ShellExecute(AVerb, AFile, AParams, AShowCmd) <= cLastFailure) {
    RaiseLastOSError();
  }
}

}  // namespace

Integer ZqShellExec(const UnicodeString& AVerb, const UnicodeString& AFile, TZqStringArgs AParams) {
  const TShellExecuteInfo Info{
      SEE_MASK_NOCLOSEPROCESS | SEE_MASK_FLAG_DDEWAIT, AVerb, AFile, ArgumentText(AParams, false), SW_SHOWNORMAL};
  std::unique_ptr<TChildProcess> Process;
  if (!Service<TProcessService>().ShellExecuteEx(Info, Process)) RaiseLastOSError();
  if (Process == nullptr) return 0;
  Process->WaitForSingleObject(cLongestWait);
  return Process->GetExitCodeProcess();
}

Integer ZqShellExecRun(const UnicodeString& AFile, TZqStringArgs AParams) {
  return ZqShellExec(u"Open", AFile, AParams);
}

void ZqShellExecOpenEMail(const UnicodeString& AAddress) { OpenAddress(AAddress, u"mailto:", u"mailto:"); }

void ZqShellExecOpenWebSite(const UnicodeString& AAddress) { OpenAddress(AAddress, u"http", u"http://"); }

void ZqShellExecOpenFile(const UnicodeString& AFile, TZqStringArgs AParams, Integer AShowCmd, bool AElevate) {
  Start(u"open", AFile, ArgumentText(AParams, true), AShowCmd, AElevate);
}

void ZqShellExecOpenFile(const UnicodeString& AFile, Integer AShowCmd, bool AElevate) {
  ZqShellExecOpenFile(AFile, {}, AShowCmd, AElevate);
}

void ZqShellExecCmd(const UnicodeString& AArgs, bool AElevate) { Start(u"", u"cmd.exe", AArgs, SW_HIDE, AElevate); }

TZqElevationLevel ZqGetElevationLevel() {
  constexpr Cardinal Full = 2, Limited = 3;
  TProcessService& System = Service<TProcessService>();
  const auto Type = System.GetTokenInformation(TokenElevationType);
  if (Type == Full) return elFull;
  if (Type == Limited) return elLimited;
  const auto Elevated = System.GetTokenInformation(TokenElevation);
  if (!Elevated) return elDefault;
  return *Elevated != 0 ? elFull : elLimited;
}

// ------------------------------------------------------------------------------------------------ Running processes

namespace {

constexpr Cardinal cEntrySize = 556;
constexpr Cardinal cCloseTimeout = 5000;  // milliseconds

TArray<tagPROCESSENTRY32W> ProcessesNamed(const UnicodeString& AName) {
  TArray<tagPROCESSENTRY32W> Result = Service<TProcessService>().ProcessSnapshot();
  std::erase_if(Result, [&](const tagPROCESSENTRY32W& AEntry) {
    return !SameText(ExtractFileName(AEntry.szExeFile), AName) && !SameText(AEntry.szExeFile, AName);
  });
  return Result;
}

}  // namespace

bool ZqProcessExists(const UnicodeString& AName) { return !ProcessesNamed(AName).empty(); }

bool ZqGetProcessID(const UnicodeString& AName, tagPROCESSENTRY32W& AEntry) {
  AEntry = {};
  AEntry.dwSize = cEntrySize;
  const auto Found = ProcessesNamed(AName);
  if (!Found.empty()) AEntry = Found.front();
  return !Found.empty();
}

void ZqCloseProcess(const UnicodeString& AName) {
  TProcessService& System = Service<TProcessService>();
  for (const tagPROCESSENTRY32W& Each : ProcessesNamed(AName)) {
    bool HasWindow = false;
    for (const HWND Window : System.EnumWindows()) {
      if (System.GetWindowThreadProcessId(Window) != Each.th32ProcessID) continue;
      HasWindow = true;
      System.SendMessage(Window, WM_CLOSE, 0, 0);
    }
    if (!HasWindow) System.RequestEnd(Each);
  }
}

bool ZqKillProcess(const tagPROCESSENTRY32W& AEntry) { return Service<TProcessService>().TerminateProcess(AEntry); }

bool ZqKillProcess(const UnicodeString& AName) {
  bool Result = false;
  for (const tagPROCESSENTRY32W& Each : Service<TProcessService>().ProcessSnapshot())
    if (SameText(Each.szExeFile, AName) || SameText(ExtractFileName(Each.szExeFile), ExtractFileName(AName)))
      Result = ZqKillProcess(Each);
  return Result;
}

bool ZqKillProcess(HWND AWindow) {
  TProcessService& System = Service<TProcessService>();
  System.SendMessageTimeout(AWindow, WM_CLOSE, 0, 0, SMTO_ABORTIFHUNG, cCloseTimeout);
  if (!System.IsWindow(AWindow)) return false;
  tagPROCESSENTRY32W Owner;
  Owner.th32ProcessID = System.GetWindowThreadProcessId(AWindow);
  return Owner.th32ProcessID != 0 && System.TerminateProcess(Owner);
}

void ZqKillRunningInstances() {
  for (const tagPROCESSENTRY32W& Each : ProcessesNamed(ExtractFileName(ParamStr(0))))
    if (Each.th32ProcessID != GetCurrentProcessId()) ZqKillProcess(Each);
}

bool ZqBringToFront(HWND AWindow) {
  TProcessService& System = Service<TProcessService>();
  System.SetWindowPos(AWindow, HWND_TOPMOST, 0, 0, 0, 0, SWP_NOSIZE | SWP_NOMOVE);
  return System.SetWindowPos(AWindow, HWND_NOTOPMOST, 0, 0, 0, 0, SWP_NOSIZE | SWP_NOMOVE);
}

// ------------------------------------------------------------------------------------------------- Questions, folders

constinit std::atomic<TZqMsgBoxYesNo> uZqWindows::MsgBoxYesNo = nullptr;

void SetZqMsgBoxYesNo(TZqMsgBoxYesNo AValue) noexcept { uZqWindows::MsgBoxYesNo = AValue; }

namespace {

UnicodeString Existing(UnicodeString ADir) {
  if (!ADir.IsEmpty() && !DirectoryExists(ADir)) throw Exception(uZqSysUtils::_SFailedToCreateDir, {ADir});
  return ADir;
}

}  // namespace

UnicodeString ZqCheckDirectory(const UnicodeString& ADir) { return Existing(Trim(ADir)); }

UnicodeString ZqCheckDirectory(const UnicodeString& ADir, bool ASlash, bool) {
  return Existing(ZqCheckDirSlash(ADir, ASlash));
}

}  // namespace zq
