#pragma once

#include <gtest/gtest.h>

#include <map>
#include <tuple>

#include "runtime/platform/registry_service.h"

namespace zq {

/// A registry in memory, in its seam as long as it lives. Paths begin with their root: "HKLM\A\B". Closing a key that
/// isn't open fails the test, and so does any other use of one.
class TScriptedRegistry final : public TRegistryService {
 public:
  Integer RegOpenKeyEx(HKEY AKey, const UnicodeString& ASubKey, Cardinal, HKEY& AResult) override {
    const UnicodeString Path = Open.at(AKey) + u"\\" + ASubKey;
    if (!Keys.contains(Path)) return ERROR_FILE_NOT_FOUND;
    Open[AResult = ++FLast] = Path;
    return ERROR_SUCCESS;
  }
  Integer RegCreateKeyEx(HKEY AKey, const UnicodeString& ASubKey, Cardinal AAccess, HKEY& AResult) override {
    Keys[Open.at(AKey) + u"\\" + ASubKey];
    return RegOpenKeyEx(AKey, ASubKey, AAccess, AResult);
  }
  Integer RegQueryValueEx(HKEY AKey, const UnicodeString& AName, Cardinal& AType, TBytes& AData) override {
    const auto& Values = Keys[Open.at(AKey)];
    if (!Values.contains(AName)) return ERROR_FILE_NOT_FOUND;
    std::tie(AType, AData) = Values.at(AName);
    return ERROR_SUCCESS;
  }
  Integer RegSetValueEx(HKEY AKey, const UnicodeString& AName, Cardinal AType, const TBytes& AData) override {
    if (IsReadOnly) return ERROR_ACCESS_DENIED;
    Keys[Open.at(AKey)][AName] = {AType, AData};
    return ERROR_SUCCESS;
  }
  void RegCloseKey(HKEY AKey) override { EXPECT_EQ(Open.erase(AKey), 1U); }

  std::map<UnicodeString, std::map<UnicodeString, std::pair<Cardinal, TBytes>>> Keys;
  std::map<HKEY, UnicodeString> Open{
      {HKEY_CLASSES_ROOT, u"HKCR"}, {HKEY_CURRENT_USER, u"HKCU"}, {HKEY_LOCAL_MACHINE, u"HKLM"}};
  bool IsReadOnly = false;  // no value can be written

 private:
  HKEY FLast = 100;
  const TPlatformOverride<TRegistryService> FSeat{*this};
};

}  // namespace zq
