#include "ini_configurator.h"

#include <algorithm>
#include <iterator>
#include <optional>
#include <utility>

#include "common/uZqClasses.h"
#include "common/uZqSysUtils.h"
#include "runtime/io/string_list.h"
#include "runtime/text/format.h"
#include "runtime/text/numbers.h"
#include "runtime/values/variants.h"

using namespace zq;

namespace {

// ---- Values: what a text of the file means, nothing where it means nothing ------------------------------------------

using TValue = std::optional<Variant>;

TValue AsText(const UnicodeString& AText) { return Variant(AText); }

TValue AsLevel(const UnicodeString& AText) {
  constexpr std::u16string_view cLevels[] = {u"all", u"trace", u"debug", u"info", u"warn", u"error", u"fatal", u"off"};
  for (Integer i = 0; i < static_cast<Integer>(std::size(cLevels)); ++i)
    if (SameText(AText, cLevels[i])) return Variant(i);
  return {};
}

TValue AsBoolean(const UnicodeString& AText) {
  for (const std::u16string_view Yes : {u"yes", u"true", u"on", u"1"})
    if (SameText(AText, Yes)) return Variant(true);
  for (const std::u16string_view No : {u"no", u"false", u"off", u"0"})
    if (SameText(AText, No)) return Variant(false);
  return {};
}

TValue AsBytes(const UnicodeString& AText) {
  constexpr std::u16string_view cUnits = u"KMG";
  const auto Unit = AText.IsEmpty() ? cUnits.npos : cUnits.find(UpperCase(AText)[AText.Length()]);
  Int64 Result = 0;
  const bool Known = TryStrToInt64(Unit == cUnits.npos ? AText : AText.Copy(1, AText.Length() - 1), Result);
  if (!Known || Result < 0 || Result > 0xFFFFFFFF) return {};
  if (Unit != cUnits.npos) Result <<= 10 * (Unit + 1);
  return Result > 0xFFFFFFFF ? TValue() : Variant(Result);
}

TValue AsCount(const UnicodeString& AText) {
  Integer Result = 0;
  return TryStrToInt(AText, Result) && Result >= 0 && Result <= 0xFFFF ? TValue(Result) : TValue();
}

TValue AsIdentifier(const UnicodeString& AText) {
  const auto IsLetter = [](Char c) { return (c >= u'a' && c <= u'z') || (c >= u'A' && c <= u'Z') || c == u'_'; };
  const auto IsPart = [&](Char c) { return IsLetter(c) || (c >= u'0' && c <= u'9'); };
  return !AText.IsEmpty() && IsLetter(AText[1]) && std::ranges::all_of(AText.View(), IsPart) ? AsText(AText) : TValue();
}

TValue AsNames(const UnicodeString& AText) {
  TStringList Names;
  ZqTokenize(AText, &Names, u",", nullptr);
  TArray<Variant> Items;
  for (const UnicodeString& Name : Names) Items.push_back(Variant(Trim(Name)));
  return VarArrayOf(Items);
}

TValue AsClassOf(TZqLogBaseClassList* AClasses, const UnicodeString& AText) try {
  std::ignore = AClasses->GetClass(AText);
  return Variant(AText);
} catch (const EListError&) {
  return {};
}
TValue AsAppender(const UnicodeString& AText) { return AsClassOf(RegisteredAppenders(), AText); }
TValue AsLayout(const UnicodeString& AText) { return AsClassOf(RegisteredLayouts(), AText); }

struct TKey {
  std::u16string_view Name;
  TValue (*Read)(const UnicodeString&);
};
constexpr TKey cLoggerKeys[] = {{u"level", AsLevel}, {u"additive", AsBoolean}, {u"appenders", AsNames}};
constexpr TKey cAppenderKeys[] = {{u"class", AsAppender}, {u"layout", AsLayout}, {u"appendexisting", AsBoolean},
    {u"filename", AsText}, {u"fileext", AsText}, {u"maxfilesize", AsBytes}, {u"maxbackupcount", AsCount},
    {u"datepattern", AsText}, {u"servicename", AsIdentifier}};

constexpr std::u16string_view cLogger = u"logger ", cAppender = u"appender ";

std::span<const TKey> KeysOf(const UnicodeString& ASection) {
  if (ASection.View().starts_with(cLogger)) return cLoggerKeys;
  if (ASection.View().starts_with(cAppender)) return cAppenderKeys;
  return {};
}

// "[logger root.shop]" as "logger root.shop"; empty for what is no such line.
UnicodeString SectionOf(const UnicodeString& ALine) {
  if (!ALine.View().starts_with(u'[') || !ALine.View().ends_with(u']')) return {};
  const UnicodeString Inner = Trim(ALine.Copy(2, ALine.Length() - 2));
  const Integer Blank = Inner.Pos(u" ");
  return Blank == 0 ? Inner : LowerCase(Inner.Copy(1, Blank)) + Trim(Inner.Copy(Blank, Inner.Length()));
}

UnicodeString NameIn(const UnicodeString& ASection, std::u16string_view AKind) {
  return ASection.Copy(static_cast<Integer>(AKind.size()) + 1, ASection.Length());
}

// Why there can be no such section; empty where it can.
UnicodeString FaultOf(const UnicodeString& ASection) {
  const std::u16string_view Section = ASection.View();
  const UnicodeString Root = Logger()->GetName();
  const UnicodeString Name = NameIn(ASection, Section.starts_with(cLogger) ? cLogger : cAppender);
  if (KeysOf(ASection).empty()) return u"no section of a logger or an appender";
  if (Section.starts_with(cAppender)) return AsIdentifier(Name) ? u"" : u"no identifier: " + Name;
  return Name == Root || Name.View().starts_with((Root + u".").View()) ? u"" : u"below no root: " + Name;
}

}  // namespace

// ---- TIniLogConfigurator --------------------------------------------------------------------------------------------

TIniLogConfigurator::TSettings TIniLogConfigurator::Parse(std::vector<UnicodeString>& AFaults) const {
  TZqStringStream File(65001);
  File.LoadFromFile(FFileName);
  TStringList Lines;
  Lines.SetText(File.AsString());
  TSettings Result;
  UnicodeString Section;
  for (Integer i = 0; i < Lines.Count(); ++i) {
    const auto Fault = [&](const UnicodeString& AWhat) {
      AFaults.push_back(Format(u"%s:%d: %s", {FFileName, i + 1, AWhat}));
    };
    const UnicodeString& Whole = Lines.Strings(i);
    const UnicodeString Line = Trim(Whole.Copy(1, Whole.Pos(u";") == 0 ? Whole.Length() : Whole.Pos(u";") - 1));
    if (Line.IsEmpty()) continue;
    if (Line[1] == u'[') {
      Section = SectionOf(Line);
      if (const UnicodeString Why = FaultOf(Section); !Why.IsEmpty()) Fault(Why);
      else Result[Section];
      continue;
    }
    const Integer Equals = Line.Pos(u"=");
    const UnicodeString Key = LowerCase(Trim(Line.Copy(1, Equals - 1))),
                        Text = Trim(Line.Copy(Equals + 1, Line.Length()));
    const auto Keys = KeysOf(Section);
    const auto Known = std::ranges::find(Keys, Key.View(), &TKey::Name);
    if (Equals == 0) Fault(u"neither a section nor a setting");
    else if (Keys.empty()) Fault(u"a setting outside of such a section");
    else if (Known == Keys.end()) Fault(u"no such setting here: " + Key);
    else if (const TValue Value = Known->Read(Text)) Result[Section][Key] = *Value;
    else Fault(Format(u"no value of %s: %s", {Key, Text}));
  }
  std::erase_if(Result, [](const auto& ASection) { return !FaultOf(ASection.first).IsEmpty(); });
  return Result;
}

std::vector<UnicodeString> TIniLogConfigurator::Read() {
  std::vector<UnicodeString> Faults;
  const auto Settings = std::make_shared<const TSettings>(Parse(Faults));
  const std::lock_guard Guard(FLock);
  FSettings = Settings;
  return Faults;
}

// Loggers of before are let go of at the end: those that are named again must not end in between.
void TIniLogConfigurator::Apply() {
  const IntfRef<IZqLogConfigurator> Self(this);
  const auto Before = static_cast<std::ptrdiff_t>(FLoggers.size());
  const Integer Root = Logger()->GetName().Length();
  const auto Told = Settings();
  for (const auto& [Section, Values] : *Told) {
    if (!Section.View().starts_with(cLogger)) continue;
    const UnicodeString Name = NameIn(Section, cLogger);  // "root", or "root." and a path
    FLoggers.push_back(Logger()->GetLogger(Name.Copy(Root + 2, Name.Length())));
    FLoggers.back()->SetConfig(Self);
  }
  FLoggers.erase(FLoggers.begin(), FLoggers.begin() + Before);
}

std::vector<UnicodeString> TIniLogConfigurator::Load() {
  std::vector<UnicodeString> Faults = Read();
  Apply();
  return Faults;
}

void TIniLogConfigurator::Withdraw() {
  for (const auto& Logger : std::exchange(FLoggers, {})) {
    Logger->SetConfig({});
    Logger->ClearAppenders();
  }
}

std::shared_ptr<const TIniLogConfigurator::TSettings> TIniLogConfigurator::Settings() {
  const std::lock_guard Guard(FLock);
  return FSettings;
}

Variant TIniLogConfigurator::Find(const UnicodeString& ASection, const UnicodeString& AKey, const Variant& ADefault) {
  const auto Told = Settings();
  const auto Section = Told->find(ASection);
  if (Section == Told->end()) return ADefault;
  const auto Value = Section->second.find(LowerCase(AKey));
  return Value == Section->second.end() ? ADefault : Value->second;
}

Variant TIniLogConfigurator::GetLoggerValue(
    const UnicodeString& ALoggerName, const UnicodeString& AKey, TZqMainTypeKind, const Variant& ADefault) {
  return Find(cLogger + ALoggerName, AKey, ADefault);
}

Variant TIniLogConfigurator::GetAppenderValue(
    const UnicodeString& AAppenderName, const UnicodeString& AKey, TZqMainTypeKind, const Variant& ADefault) {
  return Find(cAppender + AAppenderName, AKey, ADefault);
}

Variant TIniLogConfigurator::GetValue(
    const UnicodeString&, const UnicodeString&, TZqMainTypeKind, const Variant& ADefault) {
  return ADefault;
}
