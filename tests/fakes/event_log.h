#pragma once

#include "runtime/platform/event_log_service.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TEventLogCalls : TEventLogService {
  MOCK_METHOD(NativeUInt, RegisterEventSourceW, (const UnicodeString&), (override));
  MOCK_METHOD(bool, DeregisterEventSource, (NativeUInt), (override));
  MOCK_METHOD(bool, ReportEventW, (NativeUInt, Word, Cardinal, const UnicodeString&), (override));
};
using TScriptedEventLog = TScripted<TEventLogService, TEventLogCalls>;

}  // namespace zq
