#pragma once

#include <algorithm>
#include <string_view>

#include "common/uZqLogAppenders/base.h"
#include "runtime/io/files.h"
#include "runtime/values/variants.h"

/// For the appenders of this folder alone.
namespace zq {

constexpr bool IsDigit(Char AChar) noexcept { return AChar >= u'0' && AChar <= u'9'; }

inline bool IsNumber(std::u16string_view AText) noexcept {
  return !AText.empty() && AText.size() <= 9 && std::ranges::all_of(AText, IsDigit);
}

/// No file has such a name: nothing is written then.
inline bool IsBlank(const TFileName& AName) { return Trim(AName).IsEmpty(); }

/// What AConfig tells of an appender, read by ARead.
template <class TRead>
auto Configured(IZqLogConfigurator& AConfig, const TZqBaseAppender& AAppender, const char16_t* AKey,
    TZqMainTypeKind AKind, const Variant& ADefault, TRead ARead) {
  return ARead(AConfig.GetAppenderValue(AAppender.GetName(), AKey, AKind, ADefault));
}

}  // namespace zq
