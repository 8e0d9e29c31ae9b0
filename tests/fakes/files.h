#pragma once

#include "runtime/platform/file_service.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TFilesCalls : TFileService {
  MOCK_METHOD(UnicodeString, GetShortPathName, (const UnicodeString&), (override));
  MOCK_METHOD(UnicodeString, GetTempPath, (), (override));
  MOCK_METHOD(UnicodeString, GetTempFileName, (const UnicodeString&, const UnicodeString&, Cardinal), (override));
  MOCK_METHOD(bool, OpensExclusively, (const UnicodeString&), (override));
  MOCK_METHOD(UnicodeString, SearchPath, (const UnicodeString&), (override));
};
using TScriptedFiles = TScripted<TFileService, TFilesCalls>;

}  // namespace zq
