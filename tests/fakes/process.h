#pragma once

#include "runtime/platform/process_facts.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TProcessCalls : TProcessFacts {
  MOCK_METHOD(std::optional<bool>, IsWow64Process, (), (override));
  MOCK_METHOD(std::optional<bool>, IsDebuggerPresent, (), (override));
};
using TScriptedProcess = TScripted<TProcessFacts, TProcessCalls>;

}  // namespace zq
