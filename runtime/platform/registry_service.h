#pragma once

#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

/// Key of the registry: a root below or one that the service opened; 0 is none.
using HKEY = NativeUInt;
inline constexpr HKEY HKEY_CLASSES_ROOT = 0x80000000U;
inline constexpr HKEY HKEY_CURRENT_USER = 0x80000001U;
inline constexpr HKEY HKEY_LOCAL_MACHINE = 0x80000002U;
inline constexpr HKEY HKEY_USERS = 0x80000003U;

inline constexpr Cardinal KEY_READ = 0x20019;
inline constexpr Cardinal KEY_WRITE = 0x20006;
inline constexpr Cardinal KEY_ALL_ACCESS = 0xF003F;
inline constexpr Cardinal KEY_WOW64_64KEY = 0x100;
inline constexpr Cardinal KEY_WOW64_32KEY = 0x200;

inline constexpr Cardinal REG_NONE = 0;
inline constexpr Cardinal REG_SZ = 1;
inline constexpr Cardinal REG_EXPAND_SZ = 2;
inline constexpr Cardinal REG_BINARY = 3;
inline constexpr Cardinal REG_DWORD = 4;
inline constexpr Cardinal REG_MULTI_SZ = 7;

inline constexpr Integer ERROR_SUCCESS = 0;
inline constexpr Integer ERROR_FILE_NOT_FOUND = 2;
inline constexpr Integer ERROR_ACCESS_DENIED = 5;

/// The registry: keys by path ("A\B"), values with a type by name; neither goes by case. Each operation gives a result
/// code, 0 for success. Texts are UTF-16 little-endian bytes, usually with a terminator.
///
/// Linux has the file types only: HKEY_CLASSES_ROOT "\.ext" with the value "Content Type", out of the system's MIME
/// tables. Any other key is not found, and none can be made or written.
class ZQ_API TRegistryService {
 public:
  static TServiceSlot<TRegistryService> Slot;

  [[nodiscard]] virtual Integer RegOpenKeyEx(
      HKEY AKey, const UnicodeString& ASubKey, Cardinal AAccess, HKEY& AResult) = 0;
  /// Opens a key that exists.
  [[nodiscard]] virtual Integer RegCreateKeyEx(
      HKEY AKey, const UnicodeString& ASubKey, Cardinal AAccess, HKEY& AResult) = 0;
  [[nodiscard]] virtual Integer RegQueryValueEx(
      HKEY AKey, const UnicodeString& AName, Cardinal& AType, TBytes& AData) = 0;
  [[nodiscard]] virtual Integer RegSetValueEx(
      HKEY AKey, const UnicodeString& AName, Cardinal AType, const TBytes& AData) = 0;
  virtual void RegCloseKey(HKEY AKey) = 0;

 protected:
  ~TRegistryService() = default;
};

}  // namespace zq
