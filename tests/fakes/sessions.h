#pragma once

#include "runtime/platform/session_service.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TSessionsCalls : TSessionService {
  MOCK_METHOD(bool, LoadLibrary, (), (override));
  MOCK_METHOD(void, FreeLibrary, (), (override));
  MOCK_METHOD(bool, GetProcAddress, (const char16_t*), (override));
  MOCK_METHOD(bool, WTSRegisterSessionNotification, (HWND, Cardinal), (override));
  MOCK_METHOD(bool, WTSUnRegisterSessionNotification, (HWND), (override));
  MOCK_METHOD(void, StartSystemMessages, (HWND), (override));
  MOCK_METHOD(void, StopSystemMessages, (HWND), (override));
  MOCK_METHOD(std::optional<Cardinal>, ProcessIdToSessionId, (Cardinal), (override));
};
using TScriptedSessions = TScripted<TSessionService, TSessionsCalls>;

}  // namespace zq
