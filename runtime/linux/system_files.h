#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "runtime/core/types.h"

/// Reasons of refusals, and small texts that the system keeps; for the Linux feeders.
namespace zq {

/// Of an errno, in the numbers of GetLastError.
[[nodiscard]] Cardinal ReasonOf(int AErrno) noexcept;
/// Whole content; empty where it can't be read.
[[nodiscard]] std::string ReadSystemFile(const std::string& APath);
/// Takes the first line off AText, without its end.
std::string_view TakeLine(std::string_view& AText) noexcept;
/// The value of the last NAME=value line in a file of shell assignments, without quotes; none if there is no such line.
[[nodiscard]] std::optional<std::string> ShellAssignment(const std::string& APath, std::string_view AName);
/// A variable of the environment; empty if it isn't set.
[[nodiscard]] std::string EnvironmentText(const char* AName);
/// The user's home folder, without a separator at the end.
[[nodiscard]] std::string HomeFolder();
/// A base folder of XDG: the variable's, if absolute, or AUsual below the home folder.
[[nodiscard]] std::string XdgFolder(const char* AVariable, std::string_view AUsual);

}  // namespace zq
