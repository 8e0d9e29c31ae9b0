#pragma once

#include "common/uZqLogger.h"
#include "runtime/core/delegates.h"

namespace zq {

/// Something that the log failed at. A log call itself raises nothing of it.
struct TZqLogFailure {
  UnicodeString Appender;  ///< its name, or its class where it has none; empty where no appender was reached
  UnicodeString Logger;    ///< full name of the logger that it serves; empty where no message was under way
  UnicodeString Error;     ///< what happened; empty: messages are written again
  Int64 Lost = 0;          ///< messages for this appender that are lost since the last one that it wrote
};
using TZqLogFailureEvent = TMethod<void(const TZqLogFailure& AFailure)>;

/// Has AHandler called for whatever the log fails at: each message that is lost, a roll that can't be made, a file that
/// somebody else writes too; and for the first message that is written again.
///
/// It is called on the thread where that happened, with none of the log's locks held, and one call at a time for all
/// threads: what happens meanwhile is told behind it. It may log; what it raises of the Exception family goes no
/// further. Without a handler the first failure of an appender, each one with another text, and the end of it are a
/// line on standard error.
ZQ_API void ZqSetLogFailureHandler(TZqLogFailureEvent AHandler);
/// False: nothing goes to standard error. True at the start.
ZQ_API void ZqShowLogFailures(bool AShow) noexcept;

/// For appenders, within Write: the message under way goes nowhere for that reason. Unlike an exception it doesn't keep
/// the message from the appenders behind.
ZQ_API void ZqLogMessageLost(const UnicodeString& AError);
/// For appenders: something else than a message failed.
ZQ_API void ZqLogTrouble(IZqLogAppender* AAppender, const UnicodeString& AError);

}  // namespace zq
