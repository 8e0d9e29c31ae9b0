#pragma once

#include <memory>

#include "runtime/core/api.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

/// File operations. They report by their result and leave the reason in errno; none raises for what the system refuses.
namespace zq {

using TFileName = UnicodeString;

inline constexpr Integer faReadOnly = 0x01;  ///< nobody may write
inline constexpr Integer faHidden = 0x02;    ///< the name begins with a dot
inline constexpr Integer faSysFile = 0x04;   ///< device, pipe, socket
inline constexpr Integer faDirectory = 0x10;
inline constexpr Integer faArchive = 0x20;  ///< ordinary file
inline constexpr Integer faSymLink = 0x400;
inline constexpr Integer faAnyFile = 0x1FF;

/// What FindFirst and FindNext give for no (further) entry.
inline constexpr Integer cNoMoreFiles = 18;

/// Follows links; False for a folder.
[[nodiscard]] ZQ_API bool FileExists(const UnicodeString& AFileName);
[[nodiscard]] ZQ_API bool DirectoryExists(const UnicodeString& ADirectory);
/// Removes a file or a link, no folder.
ZQ_API bool DeleteFile(const UnicodeString& AFileName);
/// A file or a folder. Fails where ANewName exists, and across file systems.
ZQ_API bool RenameFile(const UnicodeString& AOldName, const UnicodeString& ANewName);
ZQ_API bool CreateDir(const UnicodeString& ADirectory);
/// Removes an empty folder.
ZQ_API bool RemoveDir(const UnicodeString& ADirectory);
/// Makes the whole path. True if it is there now; an empty one always is.
ZQ_API bool ForceDirectories(const UnicodeString& ADirectory);
/// Absolute, with "/" and without "." and ".."; taken by the text alone. The empty name stays empty, and a
/// relative one as it is where the current folder is gone.
[[nodiscard]] ZQ_API UnicodeString ExpandFileName(const UnicodeString& AFileName);
/// Empty where the folder is gone.
[[nodiscard]] ZQ_API UnicodeString GetCurrentDir();
ZQ_API bool SetCurrentDir(const UnicodeString& ADirectory);
/// Attributes, links followed; -1 if there is no such file.
[[nodiscard]] ZQ_API Integer FileGetAttr(const UnicodeString& AFileName);
/// In bytes, links followed; -1 if there is no such file.
[[nodiscard]] ZQ_API Int64 FileSizeOf(const UnicodeString& AFileName);
/// The system's own words for an errno.
[[nodiscard]] ZQ_API UnicodeString SysErrorMessage(Integer AErrorCode);

class TFolderScan;

/// One entry of a folder and the scan that found it; the scan ends with the record at the latest.
///
/// Of a link, Attr has faSymLink and never faDirectory, so that no walk leaves its folder; size and times are its
/// target's, or its own where that is a folder or missing.
struct ZQ_API TSearchRec {
  TSearchRec() noexcept;
  TSearchRec(TSearchRec&&) noexcept;
  TSearchRec& operator=(TSearchRec&&) noexcept;
  ~TSearchRec();

  UnicodeString Name;  ///< without the folder
  Integer Attr = 0;
  Int64 Size = 0;
  Int64 CreatedTime = 0;  ///< microseconds since 1970, UTC; the last change where the file system keeps no birth time
  Int64 ModifiedTime = 0;
  [[nodiscard]] TDateTime TimeStamp() const;  ///< last change, local

  std::unique_ptr<TFolderScan> Scan;  ///< of FindFirst
};

/// Finds the entries that fit the last part of AMask: "*" any text, "?" one character, case as it stands. "*.*" fits
/// every name and a trailing ".*" also one without a dot. Entries that are hidden, of the system or folders come only
/// if AAttr has their bit. 0 for a find; otherwise an errno, or cNoMoreFiles.
ZQ_API Integer FindFirst(const UnicodeString& AMask, Integer AAttr, TSearchRec& ARec);
ZQ_API Integer FindNext(TSearchRec& ARec);
/// Ends the scan; harmless when there is none.
ZQ_API void FindClose(TSearchRec& ARec) noexcept;
/// AName fits AMask by the rules of FindFirst.
[[nodiscard]] ZQ_API bool FitsMask(std::u16string_view AName, std::u16string_view AMask) noexcept;

}  // namespace zq
