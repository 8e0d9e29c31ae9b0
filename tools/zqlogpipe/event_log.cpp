#include "event_log.h"

#include <cerrno>

#include "runtime/io/files.h"
#include "signals.h"

using namespace zq;

bool TPatientEventLog::Report(Word AType, Cardinal AEventId, const UnicodeString& AText) {
  while (!TZqEventLogAppender::Report(AType, AEventId, AText)) {
    if (GetLastError() != EAGAIN || FPatience <= 0) return false;
    Wait(-1, cStep);
    FPatience -= cStep;
  }
  FPatience = cPatience;
  return true;
}
