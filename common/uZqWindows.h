#pragma once

#include "common/uZqWindows/processes.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

/// Files, folders, environment, the system's version and shell folders. Every function may run on any thread.
namespace zq {

/// 100-nanosecond steps since 1601-01-01.
struct FILETIME {
  Cardinal dwLowDateTime = 0;
  Cardinal dwHighDateTime = 0;
};

// ---------------------------------------------------------------------------------------------------- Environment

/// The whole value. Raises Exception if the variable is missing or empty.
[[nodiscard]] ZQ_API UnicodeString ZqGetEnvironmentVar(const UnicodeString& AName);
/// Expands "$(NAME)", where NAME must exist (Exception), then "%NAME%", where an unknown one stays. Values may hold
/// "$(NAME)" themselves; those that refer to each other in a circle raise Exception.
[[nodiscard]] ZQ_API UnicodeString ZqExpandEnvVarsAndStrings(const UnicodeString& AText);
/// The same, made absolute: a relative path is taken from the program's folder.
[[nodiscard]] ZQ_API UnicodeString ZqExpandFileName(const UnicodeString& AName);

// ------------------------------------------------------------------------------------------------------ Path text

/// The trimmed path with a separator behind it. A text that neither begins with "\" nor holds ":" or "/" counts as a
/// drive: "C" becomes "C:\", but "logs" becomes "logs:\", too.
[[nodiscard]] ZQ_API UnicodeString ZqIncludeTrailingBackslash(const UnicodeString& ADir);
/// The trimmed text with a separator behind it, or with one taken off; empty stays empty.
[[nodiscard]] ZQ_API UnicodeString ZqCheckDirSlash(const UnicodeString& ADir, bool AAddSlash);
/// Without the characters that no file name may hold and without AExtraChars.
[[nodiscard]] ZQ_API UnicodeString ZqCleanupFileName(
    const UnicodeString& AName, const TZqSetOfAnsiChar& AExtraChars = {});
/// The name is relative to some folder: it begins with a dot, or has a separator and neither a drive nor, with "/", a
/// root.
[[nodiscard]] ZQ_API bool ZqIsAliasedFilename(const UnicodeString& AName);

// ----------------------------------------------------------------------------------------------------- File facts

/// The file under a name that every program can use; on Linux the absolute path, there is no shorter form. Raises
/// Exception where there is no such file.
[[nodiscard]] ZQ_API UnicodeString ZqGetShortFileName(const UnicodeString& AName);
/// Whether its permissions let nobody write; False where there is no such file.
[[nodiscard]] ZQ_API bool ZqFileIsReadOnly(const UnicodeString& AName);
/// Whether this process can't have the file for itself now, to read and write: somebody has it open, or it may not be
/// written. False where there is no such file.
[[nodiscard]] ZQ_API bool ZqFileIsInUse(const UnicodeString& AName);
/// Local, to 2 seconds; 0 for a folder, where there is no such file, and outside of the years 1980 to 2107. Linux file
/// systems that keep no time of birth give the last change.
[[nodiscard]] ZQ_API TDateTime ZqGetFileCreated(const UnicodeString& AName);
[[nodiscard]] ZQ_API TDateTime ZqGetFileLastModified(const UnicodeString& AName);
/// In bytes, the low 32 bits; -1 where there is no such file. In this one and the two above, a name with "*" or "?" is
/// a mask and means its first match.
[[nodiscard]] ZQ_API Integer ZqGetFileSize(const UnicodeString& AName);
/// These two leave the time zone as it is. They raise EConvertError outside of the years 1 to 9999; a moment before
/// 1601 becomes 0.
[[nodiscard]] ZQ_API TDateTime ZqFileTimeToDateTime(const FILETIME& AValue);
[[nodiscard]] ZQ_API FILETIME ZqDateTimeToFileTime(TDateTime AValue);

// -------------------------------------------------------------------------------------------------------- Folders

/// False where ANew exists, or lies on another file system.
ZQ_API bool ZqRenameFolder(const UnicodeString& AOld, const UnicodeString& ANew);
/// Removes the folder and all that it holds; into the trash with AUseRecycleBin, if that can be done. Links are
/// removed, not followed. False where it is still there, or never was, and for "/", "." and "..".
ZQ_API bool ZqRemoveDir(const UnicodeString& ADir, bool AUseRecycleBin);
/// With a separator at the end. Raises Exception where it is longer than 260 characters.
[[nodiscard]] ZQ_API UnicodeString ZqGetTempDirectory();
/// Makes a new folder, the caller's; without a separator at the end. Raises Exception where that can't be done.
[[nodiscard]] ZQ_API UnicodeString ZqCreateTempDirectory();

// ------------------------------------------------------------------------------------------------------ Shortcuts

/// A failure stays silent.
ZQ_API void ZqCreateShortcut(const UnicodeString& ATarget, const UnicodeString& ALinkFile,
    const UnicodeString& ADescription, const UnicodeString& AArguments);
/// Empty where the file can't be loaded.
[[nodiscard]] ZQ_API UnicodeString ZqGetTargetFromShortcut(const UnicodeString& ALinkFile);

// ------------------------------------------------------------------------------------ System version, shell folders

/// The system as a code: 601 and above is one with the services of its sixth generation; Linux is 621. Raises
/// Exception.
[[nodiscard]] ZQ_API Word ZqGetWindowsVersion();
/// Path of the shell folder with that number, made if it isn't there; on Linux the user's own ones (home, desktop,
/// documents, music, pictures, videos, templates) are named, not made. Raises Exception ("Invalid pidl").
[[nodiscard]] ZQ_API UnicodeString ZqGetShellFolder(Integer ACsidl);
/// The user's folder for documents. On Linux it may not be there.
[[nodiscard]] ZQ_API UnicodeString ZqGetMyDocumentsFolder();

}  // namespace zq
