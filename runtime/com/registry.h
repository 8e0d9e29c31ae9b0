#pragma once

#include "runtime/core/exceptions.h"
#include "runtime/core/objects.h"
#include "runtime/platform/registry_service.h"

namespace zq {

/// Reads and writes the registry through one open key. A key's path that begins with "\" starts at the root key, any
/// other at the open key. One thread at a time.
class ZQ_API TRegistry : public TObject {
 public:
  explicit TRegistry(Cardinal AAccess = KEY_ALL_ACCESS) noexcept : FAccess(AAccess) {}
  ~TRegistry() override { CloseKey(); }

  [[nodiscard]] HKEY RootKey() const noexcept { return FRootKey; }
  /// At first HKEY_CURRENT_USER. Closes the open key.
  void SetRootKey(HKEY AValue);
  [[nodiscard]] Cardinal Access() const noexcept { return FAccess; }
  /// In place of the open key; with ACanCreate a missing one is made. False leaves the open key open.
  bool OpenKey(const UnicodeString& AKey, bool ACanCreate);
  bool OpenKeyReadOnly(const UnicodeString& AKey);
  [[nodiscard]] bool KeyExists(const UnicodeString& AKey) const;
  [[nodiscard]] bool ValueExists(const UnicodeString& AName) const;
  /// Empty for a missing value. Raises ERegistryException for one that is no text.
  [[nodiscard]] UnicodeString ReadString(const UnicodeString& AName) const;
  /// Raises ERegistryException for a missing value and one that is no integer.
  [[nodiscard]] Integer ReadInteger(const UnicodeString& AName) const;
  /// These two raise ERegistryException.
  void WriteString(const UnicodeString& AName, const UnicodeString& AValue);
  void WriteInteger(const UnicodeString& AName, Integer AValue);
  void CloseKey() noexcept;

 private:
  // The key opened or, with ACreate, made; 0 if that fails.
  [[nodiscard]] HKEY Find(const UnicodeString& AKey, Cardinal AAccess, bool ACreate) const;
  bool Take(HKEY AKey) noexcept;
  [[nodiscard]] bool Query(const UnicodeString& AName, Cardinal& AType, TBytes& AData) const;
  void Write(const UnicodeString& AName, Cardinal AType, const TBytes& AData);

  HKEY FRootKey = HKEY_CURRENT_USER;
  HKEY FKey = 0;
  Cardinal FAccess;
};

}  // namespace zq
