#pragma once

#include "runtime/platform/user_service.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TUsersCalls : TUserService {
  MOCK_METHOD(UnicodeString, GetComputerName, (), (override));
  MOCK_METHOD(UnicodeString, GetUserName, (), (override));
  MOCK_METHOD(void, LookupTokenUser, (UnicodeString&, UnicodeString&), (override));
  MOCK_METHOD(bool, LoadNetApi, (), (override));
  MOCK_METHOD(bool, HasServerGetInfo, (), (override));
  MOCK_METHOD(Cardinal, NetServerGetInfo, (UnicodeString&), (override));
};
using TScriptedUsers = TScripted<TUserService, TUsersCalls>;

}  // namespace zq
