#pragma once

#include <memory>
#include <optional>

#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

inline constexpr HWND HWND_TOPMOST = static_cast<HWND>(-1);
inline constexpr HWND HWND_NOTOPMOST = static_cast<HWND>(-2);
inline constexpr Cardinal WM_CLOSE = 16;
inline constexpr Cardinal SMTO_ABORTIFHUNG = 2;
inline constexpr Cardinal SWP_NOSIZE = 1;
inline constexpr Cardinal SWP_NOMOVE = 2;

inline constexpr Integer SW_HIDE = 0;
inline constexpr Integer SW_SHOWNORMAL = 1;
inline constexpr Cardinal SEE_MASK_NOCLOSEPROCESS = 0x40;
inline constexpr Cardinal SEE_MASK_FLAG_DDEWAIT = 0x100;

inline constexpr Integer TokenElevationType = 18;
inline constexpr Integer TokenElevation = 20;

inline constexpr Integer STILL_ACTIVE = 259;

/// A running process.
struct tagPROCESSENTRY32W {
  Cardinal dwSize = 0;  ///< 556 in every entry that the system filled in or is asked to fill in
  Cardinal th32ProcessID = 0;
  UnicodeString szExeFile;  ///< path of the program, or its name alone where the path isn't for this user to see
  UInt64 StartTime = 0;     ///< in units of the system; tells it from a later process with its id. 0: not known
};

struct TShellExecuteInfo {
  Cardinal fMask = 0;
  UnicodeString Verb;  ///< empty for the usual one
  UnicodeString File;
  UnicodeString Parameters;
  Integer nShow = 0;
};

/// A process that was started here. It outlives this object, and its end is taken note of all the same. One thread at
/// a time.
class ZQ_API TChildProcess {
 public:
  virtual ~TChildProcess() = default;
  /// Waits for output and takes at most ACount bytes. 0 when no more comes: both outputs are closed, or the process has
  /// ended and all that was written until then has been taken. Others that still hold its outputs aren't waited for.
  [[nodiscard]] virtual Integer ReadFile(char* ABuffer, Integer ACount) = 0;
  /// Whether it has ended, for which it waits at most that long.
  virtual bool WaitForSingleObject(Cardinal AMilliseconds) = 0;
  /// STILL_ACTIVE until it has ended. On Linux 128 and the signal's number for one that a signal ended, and 0 where the
  /// host takes the ends of all children away (SIGCHLD ignored).
  [[nodiscard]] virtual Integer GetExitCodeProcess() = 0;
  [[nodiscard]] virtual Cardinal GetProcessId() const noexcept = 0;
};

/// Processes, the shell's way to open something, the rights of this process, windows. What fails leaves its reason in
/// GetLastError. Texts end at their first zero character.
///
/// On Linux a command line is taken apart as a POSIX shell takes quotes and backslashes, and nothing is expanded: "$",
/// "*", "~", "|" and ">" are characters like others. The program "cmd.exe" stands for /bin/sh, and what follows its
/// switch /C goes to that as it is. Characters U+DC80 to U+DCFF become the bytes that they stand for in file names.
class ZQ_API TProcessService {
 public:
  static TServiceSlot<TProcessService> Slot;

  /// Starts a command line with this process's input and with both outputs in one pipe. An empty folder is the current
  /// one. Null where that fails. On Linux the process gets no other descriptor, no blocked signal and the usual
  /// SIGPIPE; a program given by a relative path is looked for from ADirectory.
  [[nodiscard]] virtual std::unique_ptr<TChildProcess> CreateProcess(
      const UnicodeString& ACommand, const UnicodeString& ADirectory) = 0;
  /// The same in the current folder and with this process's outputs: there is nothing to read from it.
  [[nodiscard]] virtual std::unique_ptr<TChildProcess> CreateFreeProcess(const UnicodeString& ACommand) = 0;

  /// Opens AInfo.File by AInfo.Verb; with SEE_MASK_NOCLOSEPROCESS AProcess is what was started, if there is something
  /// to wait for. On Linux a program runs with the parameters, anything else goes to xdg-open, without them; the verb
  /// "runas" runs a program by pkexec, other verbs but "open" are refused. The show mode means nothing there.
  virtual bool ShellExecuteEx(const TShellExecuteInfo& AInfo, std::unique_ptr<TChildProcess>& AProcess) = 0;
  /// The same with nothing to wait for; above 32 for success.
  virtual Integer ShellExecute(
      const UnicodeString& AVerb, const UnicodeString& AFile, const UnicodeString& AParameters, Integer AShowCmd) = 0;

  /// A fact about this process's token, none if it can't be had. On Linux TokenElevation is whether the effective user
  /// is root, and TokenElevationType is always 1, which says nothing.
  [[nodiscard]] virtual std::optional<Cardinal> GetTokenInformation(Integer AClass) = 0;

  /// All that run now.
  [[nodiscard]] virtual TArray<tagPROCESSENTRY32W> ProcessSnapshot() = 0;
  /// Ends a process at once. False where that can't be done, and where the entry's process is gone.
  virtual bool TerminateProcess(const tagPROCESSENTRY32W& AEntry) = 0;
  /// Asks a process to end that has no window which could be asked to close. On Linux by SIGTERM.
  virtual bool RequestEnd(const tagPROCESSENTRY32W& AEntry) = 0;

  /// Top-level windows. On Linux the hidden ones of this process; none of them can be moved.
  [[nodiscard]] virtual TArray<HWND> EnumWindows() = 0;
  /// Id of the window's process; 0 where there is no such window.
  [[nodiscard]] virtual Cardinal GetWindowThreadProcessId(HWND AWindow) = 0;
  virtual NativeInt SendMessage(HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam) = 0;
  /// False where the window hasn't answered in time.
  virtual bool SendMessageTimeout(HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam,
      Cardinal AFlags, Cardinal AMilliseconds) = 0;
  [[nodiscard]] virtual bool IsWindow(HWND AWindow) = 0;
  virtual bool SetWindowPos(
      HWND AWindow, HWND AInsertAfter, Integer AX, Integer AY, Integer AWidth, Integer AHeight, Cardinal AFlags) = 0;

 protected:
  ~TProcessService() = default;
};

}  // namespace zq
