#pragma once

#include <optional>

#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

// What a window is told. Session: one of the WTS_ below and the session's id. Power: one of the PBT_ below. End of the
// session: bits of ENDSESSION_ as the second parameter; the first is not 0 where it ends and 0 where that is called
// off.
inline constexpr Cardinal WM_QUERYENDSESSION = 17;
inline constexpr Cardinal WM_ENDSESSION = 22;
inline constexpr Cardinal WM_POWERBROADCAST = 536;
inline constexpr Cardinal WM_WTSSESSION_CHANGE = 689;

inline constexpr NativeUInt WTS_CONSOLE_CONNECT = 1;
inline constexpr NativeUInt WTS_CONSOLE_DISCONNECT = 2;
inline constexpr NativeUInt WTS_REMOTE_CONNECT = 3;
inline constexpr NativeUInt WTS_REMOTE_DISCONNECT = 4;
inline constexpr NativeUInt WTS_SESSION_LOGON = 5;
inline constexpr NativeUInt WTS_SESSION_LOGOFF = 6;
inline constexpr NativeUInt WTS_SESSION_LOCK = 7;
inline constexpr NativeUInt WTS_SESSION_UNLOCK = 8;
inline constexpr NativeUInt WTS_SESSION_REMOTE_CONTROL = 9;
inline constexpr NativeUInt WTS_SESSION_CREATE = 10;
inline constexpr NativeUInt WTS_SESSION_TERMINATE = 11;

inline constexpr NativeUInt PBT_APMSUSPEND = 4;
inline constexpr NativeUInt PBT_APMRESUMESUSPEND = 7;
inline constexpr NativeUInt PBT_APMPOWERSTATUSCHANGE = 10;
inline constexpr NativeUInt PBT_APMRESUMEAUTOMATIC = 18;
inline constexpr NativeUInt PBT_POWERSETTINGCHANGE = 0x8013;

inline constexpr NativeInt ENDSESSION_CLOSEAPP = 1;
inline constexpr NativeInt ENDSESSION_CRITICAL = 0x40000000;
inline constexpr NativeInt ENDSESSION_LOGOFF = 0x80000000;

inline constexpr Cardinal NOTIFY_FOR_THIS_SESSION = 0;
inline constexpr Cardinal NOTIFY_FOR_ALL_SESSIONS = 1;

/// Sessions, power and the end of the session. What fails leaves its reason in GetLastError. Any thread may call; the
/// window's thread must serve sent calls then, and gets the messages in its loop.
///
/// On Linux sessions and ends come from the login manager over the system bus, whose library is loaded when first
/// needed, and power from it and from the kernel; docs/events.md tells what becomes which message.
class ZQ_API TSessionService {
 public:
  static TServiceSlot<TSessionService> Slot;

  /// The library that tells of sessions. False where there is none; each success is let go by FreeLibrary.
  [[nodiscard]] virtual bool LoadLibrary() = 0;
  virtual void FreeLibrary() = 0;
  /// Whether the library, which is loaded, has that function.
  [[nodiscard]] virtual bool GetProcAddress(const char16_t* AName) = 0;
  /// Starts WM_WTSSESSION_CHANGE for AWindow, by the scope NOTIFY_FOR_; again, it changes the scope.
  virtual bool WTSRegisterSessionNotification(HWND AWindow, Cardinal AScope) = 0;
  virtual bool WTSUnRegisterSessionNotification(HWND AWindow) = 0;

  /// Starts WM_POWERBROADCAST, WM_QUERYENDSESSION and WM_ENDSESSION for AWindow, as far as the system tells of such
  /// things: a top-level window gets them without having asked for more. Whoever makes one calls this behind it.
  virtual void StartSystemMessages(HWND AWindow) = 0;
  /// Comes before the window is destroyed.
  virtual void StopSystemMessages(HWND AWindow) = 0;

  /// The session of a process, 0 for one that has none; nothing where the system has no such function. On Linux ids are
  /// the login manager's: "3" is 3, "c3" is hexadecimal 80000003.
  [[nodiscard]] virtual std::optional<Cardinal> ProcessIdToSessionId(Cardinal AProcessID) = 0;

 protected:
  ~TSessionService() = default;
};

}  // namespace zq
