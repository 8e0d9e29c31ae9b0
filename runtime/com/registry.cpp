#include "runtime/com/registry.h"

#include <algorithm>
#include <cstring>
#include <utility>

namespace zq {

void TRegistry::SetRootKey(HKEY AValue) {
  CloseKey();
  FRootKey = AValue;
}

HKEY TRegistry::Find(const UnicodeString& AKey, Cardinal AAccess, bool ACreate) const {
  TRegistryService& System = Service<TRegistryService>();
  const bool FromRoot = AKey.View().starts_with(u'\\');
  const HKEY Base = FromRoot || FKey == 0 ? FRootKey : FKey;
  const UnicodeString Path = AKey.View().substr(FromRoot ? 1 : 0);
  HKEY Result = 0;
  if (System.RegOpenKeyEx(Base, Path, AAccess, Result) == ERROR_SUCCESS) return Result;
  return ACreate && System.RegCreateKeyEx(Base, Path, AAccess, Result) == ERROR_SUCCESS ? Result : 0;
}

bool TRegistry::Take(HKEY AKey) noexcept {
  if (AKey == 0) return false;
  CloseKey();
  FKey = AKey;
  return true;
}

bool TRegistry::OpenKey(const UnicodeString& AKey, bool ACanCreate) { return Take(Find(AKey, FAccess, ACanCreate)); }

bool TRegistry::OpenKeyReadOnly(const UnicodeString& AKey) { return Take(Find(AKey, KEY_READ, false)); }

bool TRegistry::KeyExists(const UnicodeString& AKey) const {
  const HKEY Key = Find(AKey, KEY_READ, false);
  if (Key != 0) Service<TRegistryService>().RegCloseKey(Key);
  return Key != 0;
}

bool TRegistry::Query(const UnicodeString& AName, Cardinal& AType, TBytes& AData) const {
  return FKey != 0 && Service<TRegistryService>().RegQueryValueEx(FKey, AName, AType, AData) == ERROR_SUCCESS;
}

bool TRegistry::ValueExists(const UnicodeString& AName) const {
  Cardinal Type = 0;
  TBytes Data;
  return Query(AName, Type, Data);
}

UnicodeString TRegistry::ReadString(const UnicodeString& AName) const {
  Cardinal Type = 0;
  TBytes Data;
  if (!Query(AName, Type, Data)) return {};
  if (Type != REG_SZ && Type != REG_EXPAND_SZ) throw ERegistryException(u"Invalid data type for '" + AName + u"'");
  std::u16string Text(Data.size() / sizeof(Char), u'\0');
  if (!Text.empty()) std::memcpy(Text.data(), Data.data(), Text.size() * sizeof(Char));
  Text.resize(std::min(Text.find(u'\0'), Text.size()));
  return UnicodeString(std::move(Text));
}

Integer TRegistry::ReadInteger(const UnicodeString& AName) const {
  Cardinal Type = 0;
  TBytes Data;
  if (!Query(AName, Type, Data)) throw ERegistryException(u"Failed to get data for '" + AName + u"'");
  Integer Result = 0;
  if (Type != REG_DWORD || Data.size() != sizeof Result)
    throw ERegistryException(u"Invalid data type for '" + AName + u"'");
  std::memcpy(&Result, Data.data(), sizeof Result);
  return Result;
}

void TRegistry::WriteString(const UnicodeString& AName, const UnicodeString& AValue) {
  const auto* const Bytes = reinterpret_cast<const Byte*>(AValue.c_str());
  Write(AName, REG_SZ, TBytes(Bytes, Bytes + (AValue.size() + 1) * sizeof(Char)));
}

void TRegistry::WriteInteger(const UnicodeString& AName, Integer AValue) {
  const auto* const Bytes = reinterpret_cast<const Byte*>(&AValue);
  Write(AName, REG_DWORD, TBytes(Bytes, Bytes + sizeof AValue));
}

void TRegistry::Write(const UnicodeString& AName, Cardinal AType, const TBytes& AData) {
  if (FKey == 0 || Service<TRegistryService>().RegSetValueEx(FKey, AName, AType, AData) != ERROR_SUCCESS)
    throw ERegistryException(u"Failed to set data for '" + AName + u"'");
}

void TRegistry::CloseKey() noexcept {
  if (FKey != 0) Service<TRegistryService>().RegCloseKey(std::exchange(FKey, 0));
}

}  // namespace zq
