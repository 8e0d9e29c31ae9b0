#pragma once

#include "runtime/platform/environment_service.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TEnvironmentCalls : TEnvironmentService {
  MOCK_METHOD(std::optional<UnicodeString>, GetEnvironmentVariable, (const UnicodeString&), (override));
};
using TScriptedEnvironment = TScripted<TEnvironmentService, TEnvironmentCalls>;

}  // namespace zq
