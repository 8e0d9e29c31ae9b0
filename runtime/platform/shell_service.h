#pragma once

#include <memory>

#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

inline constexpr Cardinal FO_DELETE = 3;
inline constexpr Cardinal FO_RENAME = 4;
inline constexpr Word FOF_SILENT = 0x0004;
inline constexpr Word FOF_NOCONFIRMATION = 0x0010;
inline constexpr Word FOF_ALLOWUNDO = 0x0040;
inline constexpr Word FOF_NOCONFIRMMKDIR = 0x0200;
inline constexpr Word FOF_NOERRORUI = 0x0400;

inline constexpr Integer CSIDL_PERSONAL = 5;
inline constexpr Integer CSIDL_COMMON_DOCUMENTS = 46;
inline constexpr Cardinal STGM_SHARE_DENY_NONE = 0x40;

/// A shortcut to a file. On Linux a desktop entry (freedesktop): an application with its
/// command line where the target is a program, a link to it otherwise.
class ZQ_API TShellLink {
 public:
  virtual ~TShellLink() = default;
  virtual HRESULT SetArguments(const UnicodeString& AArguments) = 0;
  virtual HRESULT SetDescription(const UnicodeString& ADescription) = 0;
  virtual HRESULT SetPath(const UnicodeString& ATarget) = 0;
  /// The target; empty if there is none.
  virtual HRESULT GetPath(UnicodeString& ATarget) = 0;
  virtual HRESULT Save(const UnicodeString& AFile, bool ARemember) = 0;
  virtual HRESULT Load(const UnicodeString& AFile, Cardinal AMode) = 0;
};

/// List of shell items; made and freed by the service that gave it.
using TItemList = void*;

/// Shell folders, operations on whole folders, shortcuts.
class ZQ_API TShellService {
 public:
  static TServiceSlot<TShellService> Slot;

  /// Path of the shell folder with that number; with ACreate it is made if it isn't there. On Linux the XDG folders: a
  /// program's files for all users (46) lie in the user's data folder, which is always writable. Only what belongs to
  /// programs is made there (data, settings, cache, applications, autostart, fonts); the user's own folders (home,
  /// desktop, documents, music, pictures, videos, templates) are named and left to the user.
  [[nodiscard]] virtual bool SHGetSpecialFolderPath(Integer ACsidl, bool ACreate, UnicodeString& APath) = 0;
  /// The shell's allocator is there.
  [[nodiscard]] virtual bool SHGetMalloc() = 0;
  /// Null where there is no such folder.
  [[nodiscard]] virtual TItemList SHGetSpecialFolderLocation(Integer ACsidl) = 0;
  [[nodiscard]] virtual bool SHGetPathFromIDList(TItemList AList, UnicodeString& APath) = 0;
  virtual void FreeIDList(TItemList AList) = 0;

  /// FO_RENAME or FO_DELETE on a folder and all that it holds; texts end at their first zero character. FOF_ALLOWUNDO
  /// moves what is deleted into the trash. 0 for success.
  [[nodiscard]] virtual Integer SHFileOperation(
      Cardinal AFunc, const UnicodeString& AFrom, const UnicodeString& ATo, Word AFlags) = 0;
  /// Raises where the shell has no such objects.
  [[nodiscard]] virtual std::unique_ptr<TShellLink> CreateShellLink() = 0;

 protected:
  ~TShellService() = default;
};

}  // namespace zq
