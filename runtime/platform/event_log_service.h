#pragma once

#include <string>

#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

// Level classes of events.
inline constexpr Word EVENTLOG_SUCCESS = 0;
inline constexpr Word EVENTLOG_ERROR_TYPE = 1;
inline constexpr Word EVENTLOG_WARNING_TYPE = 2;
inline constexpr Word EVENTLOG_INFORMATION_TYPE = 4;

/// The log that a system keeps for all its programs. What fails leaves its reason in GetLastError. Any thread.
///
/// On Linux an event goes to the journal, or to syslog where no journal is to be had, and never waits: one that finds
/// the daemon's socket full is refused. The daemon is looked for with each event, so it may come later or start anew.
///
/// Fields of the journal are MESSAGE, SYSLOG_IDENTIFIER (the source), PRIORITY (3 error, 4 warning, 6 any other),
/// EVENT_TYPE ("success", "error", "warning", "information") and EVENT_ID; a text may have any length. Syslog gets
/// datagrams in the form of RFC 3164, facility user, with control characters as "#" and three octal digits ("#012"); a
/// text is cut between characters into as many of at most 8192 bytes as it needs.
class ZQ_API TEventLogService {
 public:
  static TServiceSlot<TEventLogService> Slot;

  /// Handle of a source on this computer; 0 where that fails. On Linux any name is a source and nothing is registered,
  /// whether a daemon is there or not: control characters in it become "_", in the tag of syslog those that end a tag,
  /// too, and an empty one is the program's name.
  [[nodiscard]] virtual NativeUInt RegisterEventSourceW(const UnicodeString& ASource) = 0;
  /// False for 0.
  virtual bool DeregisterEventSource(NativeUInt AHandle) = 0;
  /// An event with one text.
  virtual bool ReportEventW(NativeUInt AHandle, Word AType, Cardinal AEventId, const UnicodeString& AText) = 0;

 protected:
  ~TEventLogService() = default;
};

/// Where the daemons of Linux listen, for sources that are registered from now on; for a program whose own root isn't
/// the system's. Not while another thread registers one.
ZQ_API void SetEventLogSockets(const std::string& AJournal, const std::string& ASyslog);

}  // namespace zq
