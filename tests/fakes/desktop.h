#pragma once

#include "runtime/platform/desktop_service.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TDesktopCalls : TDesktopService {
  MOCK_METHOD(bool, FindWindow, (const char16_t*, const char16_t*), (override));
};
using TScriptedDesktop = TScripted<TDesktopService, TDesktopCalls>;

}  // namespace zq
