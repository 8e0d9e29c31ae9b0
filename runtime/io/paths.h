#pragma once

#include <string>
#include <string_view>

#include "runtime/core/api.h"
#include "runtime/core/strings.h"

/// Path text. Every function takes "/" and "\" as separators, alone or mixed; one that appends a separator appends the
/// kind that the path uses last, the backslash if it uses none. Drive letters mean nothing.
namespace zq {

[[nodiscard]] constexpr bool IsPathSeparator(Char AChar) noexcept { return AChar == u'/' || AChar == u'\\'; }
/// The kind of separator to append to APath.
[[nodiscard]] ZQ_API Char PathSeparatorOf(std::u16string_view APath) noexcept;

/// What stands behind the last separator.
[[nodiscard]] ZQ_API UnicodeString ExtractFileName(const UnicodeString& AFileName);
/// Up to the last separator and with it; empty if there is none.
[[nodiscard]] ZQ_API UnicodeString ExtractFilePath(const UnicodeString& AFileName);
/// The same without that separator, unless it is the root.
[[nodiscard]] ZQ_API UnicodeString ExtractFileDir(const UnicodeString& AFileName);
/// The last dot of the name and what follows; empty if there is none. A dot in a folder's name is no such dot.
[[nodiscard]] ZQ_API UnicodeString ExtractFileExt(const UnicodeString& AFileName);
/// Replaces from that dot on; adds AExtension if there is none; an empty one removes it.
[[nodiscard]] ZQ_API UnicodeString ChangeFileExt(const UnicodeString& AFileName, const UnicodeString& AExtension);
[[nodiscard]] ZQ_API UnicodeString IncludeTrailingBackslash(const UnicodeString& APath);
/// Takes one separator off the end.
[[nodiscard]] ZQ_API UnicodeString ExcludeTrailingBackslash(const UnicodeString& APath);

/// The host program's path for 0; then its arguments; empty behind the last.
[[nodiscard]] ZQ_API UnicodeString ParamStr(Integer AIndex);
/// Number of arguments.
[[nodiscard]] ZQ_API Integer ParamCount();

/// The name as the system takes it, up to a first zero character: UTF-8, "/" between folders. What FromSystemPath gave
/// goes back to the bytes that it came from.
[[nodiscard]] ZQ_API std::string ToSystemPath(std::u16string_view APath);
/// A name from the system. Bytes that are no UTF-8, and a backslash inside a name, travel as U+DC00 + byte.
[[nodiscard]] ZQ_API UnicodeString FromSystemPath(std::string_view APath);

}  // namespace zq
