#pragma once

#include <atomic>
#include <concepts>
#include <type_traits>
#include <utility>

#include "common/uZqSysUtils.h"
#include "runtime/core/delegates.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/platform/process_service.h"

/// Starting, finding and ending processes, and what the shell opens. Every function may run on any thread and blocks it
/// as long as it says. EOSError is raised for what the system refuses.
namespace zq {

// ------------------------------------------------------------------------------------------------- Captured output

using TZqOnCmdOutputProc = void (*)(const UnicodeString& AOutput);
using TZqOnCmdOutputMethod = TMethod<void(const UnicodeString& AOutput)>;

/// Runs a command line in a folder (empty: the current one), waits for its end and returns what it wrote to both
/// outputs, in the order in which it came. The text is in the ANSI code page; of each piece that is read, which has at
/// most 255 bytes, a zero byte and what follows it is left out. With AUseCmd the command interpreter runs ACommand.
///
/// The end of the process counts: others that it leaves behind may go on to hold its outputs, and nothing that they
/// write later is waited for. How a command line is taken apart is told with TProcessService. Raises EOSError where the
/// process can't be started.
[[nodiscard]] ZQ_API UnicodeString ZqRunProcessAndCaptureOutput(
    const UnicodeString& ACommand, const UnicodeString& ADirectory, bool AUseCmd);
/// The same, with the folder first, for output as it comes: AOnOutput gets each piece on this thread, and the process
/// waits meanwhile if it has more to write. A character of several bytes that is cut by the end of a piece arrives as
/// U+FFFD in both. What AOnOutput raises comes out of here, and the process is left to itself.
ZQ_API void ZqRunProcessAndCaptureOutput(
    const UnicodeString& ADirectory, const UnicodeString& ACommand, TZqOnCmdOutputProc AOnOutput, bool AUseCmd);
ZQ_API void ZqRunProcessAndCaptureOutput(const UnicodeString& ADirectory, const UnicodeString& ACommand,
    const TZqOnCmdOutputMethod& AOnOutput, bool AUseCmd);
/// For a lambda, which would fit both.
template <class TCallable>
  requires(std::is_class_v<std::remove_cvref_t<TCallable>> &&
           !std::same_as<std::remove_cvref_t<TCallable>, TZqOnCmdOutputMethod> &&
           std::constructible_from<TZqOnCmdOutputMethod, TCallable>)
void ZqRunProcessAndCaptureOutput(
    const UnicodeString& ADirectory, const UnicodeString& ACommand, TCallable&& AOnOutput, bool AUseCmd) {
  ZqRunProcessAndCaptureOutput(ADirectory, ACommand, TZqOnCmdOutputMethod(std::forward<TCallable>(AOnOutput)), AUseCmd);
}

// ----------------------------------------------------------------------------------------------- Opening by the shell

// Parameters are trimmed and put in double quotes, and the system takes the whole apart again: a double quote or a
// backslash in one of them has the meaning that it has in a command line.

/// Waits for the end of what AVerb (empty: the usual one) started and returns its exit code, 0 where there is nothing
/// to wait for. Raises EOSError.
ZQ_API Integer ZqShellExec(const UnicodeString& AVerb, const UnicodeString& AFile, TZqStringArgs AParams);
/// The same with the verb "Open".
ZQ_API Integer ZqShellExecRun(const UnicodeString& AFile, TZqStringArgs AParams);
/// Opens an address with "mailto:" in front, unless it holds that; a failure stays silent.
ZQ_API void ZqShellExecOpenEMail(const UnicodeString& AAddress);
/// The same with "http://", unless it holds "http".
ZQ_API void ZqShellExecOpenWebSite(const UnicodeString& AAddress);
/// Opens a file or starts a program, and doesn't wait; with AElevate and limited rights as an administrator, who is
/// asked for. Parameters that begin with "-" or "/" stand without quotes: their blanks want a backslash. Raises
/// EOSError.
ZQ_API void ZqShellExecOpenFile(const UnicodeString& AFile, TZqStringArgs AParams, Integer AShowCmd, bool AElevate);
ZQ_API void ZqShellExecOpenFile(const UnicodeString& AFile, Integer AShowCmd, bool AElevate);
/// Starts the command interpreter with AArgs as they are ("/C make all"), and doesn't wait. Raises EOSError.
ZQ_API void ZqShellExecCmd(const UnicodeString& AArgs, bool AElevate);

enum class TZqElevationLevel : Byte { elDefault, elFull, elLimited };
using enum TZqElevationLevel;

/// Whether this process may do what an administrator may; elDefault where the system doesn't tell. On Linux elFull is
/// root.
[[nodiscard]] ZQ_API TZqElevationLevel ZqGetElevationLevel();

// ------------------------------------------------------------------------------------------------ Running processes

// A name is that of the program, "firefox", or its whole path, in any case. On Linux a script is listed as what runs
// it.

[[nodiscard]] ZQ_API bool ZqProcessExists(const UnicodeString& AName);
/// Fills in the entry of the first one; one that isn't there leaves it cleared, but for its size.
[[nodiscard]] ZQ_API bool ZqGetProcessID(const UnicodeString& AName, tagPROCESSENTRY32W& AEntry);
/// Asks the windows of every such process to close, and on Linux, where none are known, the process to end.
ZQ_API void ZqCloseProcess(const UnicodeString& AName);
/// Ends it at once. False where that can't be done, also where another process has got that entry's id since.
ZQ_API bool ZqKillProcess(const tagPROCESSENTRY32W& AEntry);
/// Ends all that have the name or, of a path, its last part, this process included. Tells of the last one; False where
/// there was none.
ZQ_API bool ZqKillProcess(const UnicodeString& AName);
/// Asks a window to close and gives it 5 seconds; if it is there still, its process is ended. True only then.
ZQ_API bool ZqKillProcess(HWND AWindow);
template <std::integral T>
  requires(!std::same_as<T, HWND>)
bool ZqKillProcess(T AProcessID) = delete;  // the number of a process is no window
/// Ends all other processes that run this program.
ZQ_API void ZqKillRunningInstances();
ZQ_API bool ZqBringToFront(HWND AWindow);

// ------------------------------------------------------------------------------------------------- Questions, folders

using TZqModalResult = Integer;
/// Asks the user a question.
using TZqMsgBoxYesNo = TZqModalResult (*)(const UnicodeString&, const UnicodeString&);

namespace uZqWindows {
/// Null until the host sets it; the library itself asks nothing.
ZQ_API extern std::atomic<TZqMsgBoxYesNo> MsgBoxYesNo;
}  // namespace uZqWindows

ZQ_API void SetZqMsgBoxYesNo(TZqMsgBoxYesNo AValue) noexcept;

/// The trimmed folder, which must exist, or be empty: raises Exception (_SFailedToCreateDir).
[[nodiscard]] ZQ_API UnicodeString ZqCheckDirectory(const UnicodeString& ADir);
/// The same with a separator at the end, or without one. The last argument changes nothing.
[[nodiscard]] ZQ_API UnicodeString ZqCheckDirectory(const UnicodeString& ADir, bool ASlash, bool AUnused);

}  // namespace zq
