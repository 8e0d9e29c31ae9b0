#pragma once

#include "runtime/platform/shell_service.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TShellCalls : TShellService {
  MOCK_METHOD(bool, SHGetSpecialFolderPath, (Integer, bool, UnicodeString&), (override));
  MOCK_METHOD(bool, SHGetMalloc, (), (override));
  MOCK_METHOD(TItemList, SHGetSpecialFolderLocation, (Integer), (override));
  MOCK_METHOD(bool, SHGetPathFromIDList, (TItemList, UnicodeString&), (override));
  MOCK_METHOD(void, FreeIDList, (TItemList), (override));
  MOCK_METHOD(Integer, SHFileOperation, (Cardinal, const UnicodeString&, const UnicodeString&, Word), (override));
  MOCK_METHOD(std::unique_ptr<TShellLink>, CreateShellLink, (), (override));
};
using TScriptedShell = TScripted<TShellService, TShellCalls>;

}  // namespace zq
