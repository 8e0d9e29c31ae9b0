#include "runtime/text/format_settings.h"

#include <langinfo.h>

#include <climits>
#include <clocale>
#include <cstdlib>
#include <mutex>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "runtime/text/encoding.h"

namespace zq {

namespace {

struct TLocaleFreer {
  void operator()(locale_t ALocale) const noexcept { freelocale(ALocale); }
};
using TLocale = std::unique_ptr<std::remove_pointer_t<locale_t>, TLocaleFreer>;

std::string_view ValueOf(const char* AVariable) noexcept {
  const char* const Value = std::getenv(AVariable);
  return Value == nullptr ? "" : Value;
}

// The C locale's own names for dates are those of one country; here it stands for the invariant settings.
bool IsInvariant(const char* ACategory) noexcept {
  std::string_view Name;
  for (const char* const Variable : {"LC_ALL", ACategory, "LANG"})
    if (Name.empty()) Name = ValueOf(Variable);
  return Name.empty() || Name == "C" || Name == "POSIX" || Name.starts_with("C.");
}

// The facts of one locale, as text.
class TLocaleFacts {
 public:
  explicit TLocaleFacts(locale_t ALocale)
      : FLocale(ALocale), FCodePage(CodePageOfCharset(nl_langinfo_l(CODESET, ALocale))) {}

  [[nodiscard]] std::string_view Bytes(nl_item AItem) const { return nl_langinfo_l(AItem, FLocale); }
  [[nodiscard]] UnicodeString Text(nl_item AItem) const { return Decode(Bytes(AItem)); }
  [[nodiscard]] UnicodeString Decode(std::string_view ABytes) const {
    return TEncoding(FCodePage).GetString(ABytes.data(), ABytes.size());
  }
  void Replace(UnicodeString& AText, nl_item AItem) const {
    if (UnicodeString Found = Text(AItem); !Found.IsEmpty()) AText = std::move(Found);
  }
  template <std::size_t N>
  void Replace(std::array<UnicodeString, N>& ANames, nl_item AFirst) const {
    for (std::size_t i = 0; i < N; ++i) Replace(ANames[i], AFirst + static_cast<nl_item>(i));
  }

 private:
  locale_t FLocale;
  Word FCodePage;
};

std::string_view LongForm(char AField, const TLocaleFacts& AFacts) {
  switch (AField) {
    case 'D': return "%m/%d/%y";
    case 'F': return "%Y-%m-%d";
    case 'T': return "%H:%M:%S";
    case 'R': return "%H:%M";
    case 'r': {
      const std::string_view Halves = AFacts.Bytes(T_FMT_AMPM);
      return Halves.find("%r") == std::string_view::npos ? Halves : "";
    }
    default: return {};
  }
}

// A date or time pattern of the system with its abbreviations spelled out and the flags of its fields left away.
std::string Spelled(std::string_view APattern, const TLocaleFacts& AFacts) {
  std::string Result;
  for (std::size_t i = 0; i < APattern.size(); ++i) {
    Result += APattern[i];
    if (APattern[i] != '%') continue;
    while (i + 1 < APattern.size() && std::string_view("-_0^#EO").find(APattern[i + 1]) != std::string_view::npos) ++i;
    if (++i == APattern.size()) break;
    if (const std::string_view Long = LongForm(APattern[i], AFacts); Long.empty()) Result += APattern[i];
    else Result.replace(Result.size() - 1, 1, Spelled(Long, AFacts));
  }
  return Result;
}

struct TField {
  char System;
  const char16_t* Letters;
};

// The fields of APattern that AFields knows, in its order; the separator is the first ASCII sign between two of them.
UnicodeString FieldsOf(std::string_view APattern, std::span<const TField> AFields, Char& ASeparator) {
  std::vector<const char16_t*> Found;
  bool Separated = false;
  for (std::size_t i = 0; i < APattern.size(); ++i) {
    const char c = APattern[i];
    if (c == '%' && i + 1 < APattern.size()) {
      ++i;
      for (const TField& Field : AFields)
        if (Field.System == APattern[i]) Found.push_back(Field.Letters);
    } else if (!Found.empty() && !Separated && c > ' ' && c < '\x7F') {
      ASeparator = static_cast<Char>(c);
      Separated = true;
    }
  }
  UnicodeString Result;
  for (const char16_t* const Letters : Found) Result += (Result.IsEmpty() ? u"" : UnicodeString(ASeparator)) + Letters;
  return Result;
}

void ReadDateFormat(const TLocaleFacts& AFacts, TFormatSettings& ASettings) {
  constexpr TField cFields[] = {
      {'d', u"dd"}, {'e', u"d"}, {'m', u"mm"}, {'b', u"mm"}, {'B', u"mm"}, {'h', u"mm"}, {'y', u"yy"}, {'Y', u"yyyy"}};
  Char Separator = ASettings.DateSeparator;
  const UnicodeString Format = FieldsOf(Spelled(AFacts.Bytes(D_FMT), AFacts), cFields, Separator);
  const bool Whole = Format.Pos(u"d") != 0 && Format.Pos(u"m") != 0 && Format.Pos(u"y") != 0;
  if (!Whole) return;  // another calendar, for one
  ASettings.ShortDateFormat = Format;
  ASettings.DateSeparator = Separator;
}

void ReadTimeFormat(const TLocaleFacts& AFacts, TFormatSettings& ASettings) {
  constexpr TField cFields[] = {{'H', u"hh"}, {'k', u"h"}, {'I', u"hh"}, {'l', u"h"}, {'M', u"nn"}};
  const std::string Pattern = Spelled(AFacts.Bytes(T_FMT), AFacts);
  const UnicodeString Format = FieldsOf(Pattern, cFields, ASettings.TimeSeparator);
  if (Format.Pos(u"h") == 0 || Format.Pos(u"n") == 0) return;
  const bool Halves = Pattern.find("%I") != std::string::npos || Pattern.find("%l") != std::string::npos;
  const char16_t* const Marker = Halves ? u" ampm" : u"";
  ASettings.ShortTimeFormat = Format + Marker;
  ASettings.LongTimeFormat = Format + ASettings.TimeSeparator + u"ss" + Marker;
}

void ReadNumbers(const TLocaleFacts& AFacts, TFormatSettings& ASettings) {
  if (const UnicodeString Point = AFacts.Text(RADIXCHAR); Point.Length() == 1) ASettings.DecimalSeparator = Point[1];
  const UnicodeString Group = AFacts.Text(THOUSEP);
  const Char Other = ASettings.DecimalSeparator == u',' ? u'.' : u',';
  ASettings.ThousandSeparator = Group.Length() == 1 ? Group[1] : Other;
}

void ReadMoney(const TLocaleFacts& AFacts, TFormatSettings& ASettings) {
  const std::string_view Money = AFacts.Bytes(CRNCYSTR);  // a sign that tells its place, and the text
  if (Money.size() > 1) ASettings.CurrencyString = AFacts.Decode(Money.substr(1));
  const auto Decimals = static_cast<unsigned char>(*AFacts.Bytes(FRAC_DIGITS).data());
  if (Decimals < CHAR_MAX) ASettings.CurrencyDecimals = Decimals;
}

// The one object behind the process's settings. A reader keeps what it took, so a change never moves it under its feet.
struct TCurrentSettings {
  std::mutex Lock;
  std::shared_ptr<const TFormatSettings> Settings = std::make_shared<TFormatSettings>(GetLocaleFormatSettings());
};

TCurrentSettings& Current() {
  static TCurrentSettings& Held = *new TCurrentSettings;
  return Held;
}

}  // namespace

TFormatSettings GetLocaleFormatSettings() {
  TFormatSettings Result;
  const TLocale Locale(newlocale(LC_ALL_MASK, "", nullptr));
  if (Locale == nullptr) return Result;
  const TLocaleFacts Facts(Locale.get());
  if (!IsInvariant("LC_NUMERIC")) ReadNumbers(Facts, Result);
  if (!IsInvariant("LC_MONETARY")) ReadMoney(Facts, Result);
  if (IsInvariant("LC_TIME")) return Result;
  ReadDateFormat(Facts, Result);
  ReadTimeFormat(Facts, Result);
  Facts.Replace(Result.TimeAMString, AM_STR);
  Facts.Replace(Result.TimePMString, PM_STR);
  Facts.Replace(Result.ShortMonthNames, ABMON_1);
  Facts.Replace(Result.LongMonthNames, MON_1);
  Facts.Replace(Result.ShortDayNames, ABDAY_1);
  Facts.Replace(Result.LongDayNames, DAY_1);
  return Result;
}

std::shared_ptr<const TFormatSettings> SharedFormatSettings() {
  TCurrentSettings& Held = Current();
  const std::scoped_lock Locked(Held.Lock);
  return Held.Settings;
}

TFormatSettings FormatSettings() { return *SharedFormatSettings(); }

void SetFormatSettings(const TFormatSettings& ASettings) {
  auto Fresh = std::make_shared<const TFormatSettings>(ASettings);
  TCurrentSettings& Held = Current();
  const std::scoped_lock Locked(Held.Lock);
  Held.Settings.swap(Fresh);
}

}  // namespace zq
