#pragma once

#include "runtime/platform/resource_service.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TResourcesCalls : TResourceService {
  MOCK_METHOD(bool, FindResource, (HINST, const UnicodeString&, const UnicodeString&), (override));
  MOCK_METHOD(std::optional<TBytes>, LoadResource, (HINST, const UnicodeString&, const UnicodeString&), (override));
};
using TScriptedResources = TScripted<TResourceService, TResourcesCalls>;

}  // namespace zq
