#pragma once

#include "runtime/platform/version_service.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TVersionCalls : TVersionService {
  MOCK_METHOD(bool, HasKernel, (), (override));
  MOCK_METHOD(bool, KernelExports, (const char16_t*), (override));
  MOCK_METHOD(bool, GetVersionEx, (TOSVersionInfo&), (override));
  MOCK_METHOD(Integer, GetSystemMetrics, (Integer), (override));
  MOCK_METHOD(TSystemRelease, Release, (), (override));
};
using TScriptedVersion = TScripted<TVersionService, TVersionCalls>;

}  // namespace zq
