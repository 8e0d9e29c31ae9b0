#pragma once

#include <array>
#include <memory>

#include "runtime/core/strings.h"
#include "runtime/core/types.h"

namespace zq {

/// How numbers, dates and times are written and read. The defaults are those of the C locale.
///
/// In the four formats "/" stands for DateSeparator and ":" for TimeSeparator; the letters are those of FormatDateTime,
/// which takes d m y h n s z t c and a/p for its own in either case and copies all else. What is to stand as it is goes
/// into quotes: yyyy-mm-dd"T"hh:nn:ss. Without them that T would be the short time.
struct TFormatSettings {
  Char DecimalSeparator = u'.';
  Char ThousandSeparator = u',';
  Char DateSeparator = u'-';
  Char TimeSeparator = u':';
  UnicodeString ShortDateFormat = u"yyyy-mm-dd";
  UnicodeString LongDateFormat = u"dddd, d mmmm yyyy";
  UnicodeString ShortTimeFormat = u"hh:nn";
  UnicodeString LongTimeFormat = u"hh:nn:ss";
  UnicodeString TimeAMString = u"AM";
  UnicodeString TimePMString = u"PM";
  UnicodeString CurrencyString;
  Byte CurrencyDecimals = 2;
  std::array<UnicodeString, 12> ShortMonthNames = {
      u"Jan", u"Feb", u"Mar", u"Apr", u"May", u"Jun", u"Jul", u"Aug", u"Sep", u"Oct", u"Nov", u"Dec"};
  std::array<UnicodeString, 12> LongMonthNames = {u"January", u"February", u"March", u"April", u"May", u"June", u"July",
      u"August", u"September", u"October", u"November", u"December"};
  /// From Sunday on.
  std::array<UnicodeString, 7> ShortDayNames = {u"Sun", u"Mon", u"Tue", u"Wed", u"Thu", u"Fri", u"Sat"};
  std::array<UnicodeString, 7> LongDayNames = {
      u"Sunday", u"Monday", u"Tuesday", u"Wednesday", u"Thursday", u"Friday", u"Saturday"};
};

/// The process's current settings, as a copy. At first they are those of the environment's locale. Any thread.
[[nodiscard]] ZQ_API TFormatSettings FormatSettings();
/// The same without a copy: for who only reads. Later changes don't reach it.
[[nodiscard]] ZQ_API std::shared_ptr<const TFormatSettings> SharedFormatSettings();
/// Changes them for all threads.
ZQ_API void SetFormatSettings(const TFormatSettings& ASettings);
/// Those of the locale that the environment names (LC_ALL, LC_NUMERIC, LC_TIME, LC_MONETARY, LANG); of the C locale
/// where the system doesn't know it.
[[nodiscard]] ZQ_API TFormatSettings GetLocaleFormatSettings();

}  // namespace zq
