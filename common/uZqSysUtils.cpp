#include "common/uZqSysUtils.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <string_view>
#include <utility>

#include "common/uZqClasses/text_streams.h"
#include "common/uZqTypes.h"
#include "runtime/com/registry.h"
#include "runtime/containers/lists.h"
#include "runtime/core/start_count.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/io/string_list.h"
#include "runtime/platform/desktop_service.h"
#include "runtime/platform/file_service.h"
#include "runtime/platform/process_facts.h"
#include "runtime/platform/resource_service.h"
#include "runtime/platform/user_service.h"
#include "runtime/text/casing.h"
#include "runtime/text/datetime.h"
#include "runtime/text/encoding.h"
#include "runtime/text/local_time.h"
#include "runtime/text/numbers.h"
#include "runtime/values/typeinfo.h"

namespace zq {

namespace uZqSysUtils {

TObjectList* ExceptionClassList = nullptr;

namespace {
constinit TStartCount Starts;
}

void Start() {
  if (!Starts.Begins()) return;
  ExceptionClassList = nullptr;
  DescribeType<TZqCharCase>(u"uZqSysUtils")
      .EnumNames({u"rcNormal", u"rcUpperCase", u"rcLowerCase", u"rcTitleCase", u"rcUpperCamelCase", u"rcLowerCamelCase",
          u"rcUpperCaseFirstLetter", u"rcLowerCaseFirstLetter"});
  DescribeType<TZqBitness>(u"uZqSysUtils").EnumNames({u"bit32", u"bit64"});
}

void Stop() {
  if (Starts.Ends()) FreeAndNil(ExceptionClassList);
}

}  // namespace uZqSysUtils

using namespace uZqSysUtils;

// ---- Coded exceptions ----------------------------------------------------------------------------------------------

namespace {

class TExceptionClass : public TObject {
 public:
  TExceptionClass(UnicodeString AErrorGroup, const ExceptionClass& AClass, Integer AErrorCode)
      : ErrorGroup(std::move(AErrorGroup)), Class(AClass), ErrorCode(AErrorCode) {}

  const UnicodeString ErrorGroup;
  const ExceptionClass Class;
  const Integer ErrorCode;
};

template <class TMatch>
ExceptionClass FindExceptionClass(TMatch AMatch) {
  if (ExceptionClassList == nullptr) return {};
  for (const TObject* const Item : *ExceptionClassList)
    if (const auto& Entry = static_cast<const TExceptionClass&>(*Item); AMatch(Entry)) return Entry.Class;
  return {};
}

void RegisterExceptionClass(const UnicodeString& AErrorGroup, Integer AErrorCode, const ExceptionClass& AClass) {
  if (ExceptionClassList == nullptr) ExceptionClassList = New<TObjectList>(true);
  const ExceptionClass Found = ZqGetExceptionClass(AErrorGroup, AErrorCode);
  if (!Found) ExceptionClassList->Add(New<TExceptionClass>(AErrorGroup, AClass, AErrorCode));
  else if (Found != AClass && !ZqIsDelphiRunning())
    AssertionFailed(Format(_SErrorCodeInUse, {AErrorCode, Found.ClassName()}));
}

}  // namespace

void ZqRegisterExceptionClass(
    const UnicodeString& AErrorGroup, Integer AErrorCode, const EZqExceptionClass& AExceptionClass) {
  RegisterExceptionClass(AErrorGroup, AErrorCode, AExceptionClass);
}

void ZqRegisterExceptionClass(
    const UnicodeString& AErrorGroup, Integer AErrorCode, const EZqAbortClass& AExceptionClass) {
  RegisterExceptionClass(AErrorGroup, AErrorCode, AExceptionClass);
}

ExceptionClass ZqGetExceptionClass(const UnicodeString& AErrorGroup, Integer AErrorCode) {
  return FindExceptionClass([&](const TExceptionClass& AEntry) {
    return AEntry.ErrorCode == AErrorCode && (AErrorGroup.IsEmpty() || AEntry.ErrorGroup == AErrorGroup);
  });
}

ExceptionClass ZqGetExceptionClassByName(const UnicodeString& AClassName) {
  return FindExceptionClass(
      [&](const TExceptionClass& AEntry) { return SameText(AClassName, AEntry.Class.ClassName()); });
}

Boolean ZqIsDelphiRunning() {
  constexpr std::pair<const char16_t*, const char16_t*> cWindows[] = {{u"TApplication", u"Delphi"},
      {u"TAlignPalette", nullptr}, {u"TPropertyInspector", nullptr}, {u"TAppBuilder", nullptr}};
  bool Result = false;
  for (const auto& [Class, Title] : cWindows) Result |= Service<TDesktopService>().FindWindow(Class, Title);
  return Result;
}

// ---- Case and numbering --------------------------------------------------------------------------------------------

namespace {

UnicodeString Widen(const AnsiString& AText) {
  return TEncoding::ANSI().GetString(AText.View().data(), AText.View().size());
}

AnsiString Narrow(const UnicodeString& AText) {
  const TBytes Bytes = TEncoding::ANSI().GetBytes(AText);
  return std::string(Bytes.begin(), Bytes.end());
}

bool Contains(const UnicodeString& ACharacters, Char AChar) noexcept {
  return ACharacters.View().find(AChar) != std::u16string_view::npos;
}

bool BeginsPair(Char AChar) noexcept { return (AChar & 0xFC00) == 0xD800; }

// AUpper: the first word is capitalised too.
UnicodeString CamelCase(const UnicodeString& AText, const UnicodeString& ADelimiters, bool AUpper) {
  const UnicodeString Upper = AnsiUpperCase(AText);
  UnicodeString Result = AnsiLowerCase(AText);  // neither changes the length
  for (Integer i = 1; i <= AText.Length(); ++i) {
    const bool Delimiter = Contains(ADelimiters, AText[i]);
    if (AUpper && !Delimiter) Result[i] = Upper[i];
    AUpper = Delimiter || (AUpper && BeginsPair(AText[i]));
  }
  return Result;
}

UnicodeString CharCase(const UnicodeString& AText, TZqCharCase ACase, const UnicodeString& ADelimiters) {
  if (AText.IsEmpty()) return AText;
  const Integer First = BeginsPair(AText[1]) ? 2 : 1;
  const UnicodeString Letter = AText.Copy(1, First);
  const UnicodeString Rest = AText.Copy(First + 1, AText.Length());
  switch (ACase) {
    case rcNormal: break;
    case rcUpperCase: return AnsiUpperCase(AText);
    case rcLowerCase: return AnsiLowerCase(AText);
    case rcTitleCase: return AnsiUpperCase(Letter) + AnsiLowerCase(Rest);
    case rcUpperCamelCase: return CamelCase(AText, ADelimiters, true);
    case rcLowerCamelCase: return CamelCase(AText, ADelimiters, false);
    case rcUpperCaseFirstLetter: return AnsiUpperCase(Letter) + Rest;
    case rcLowerCaseFirstLetter: return AnsiLowerCase(Letter) + Rest;
  }
  return AText;
}

Word CurrentYear() {
  Word Year = 0, Month = 0, Day = 0;
  DecodeDate(Now(), Year, Month, Day);
  return Year;
}

}  // namespace

AnsiString ZqCharCase(const AnsiString& AText, TZqCharCase ACase, const AnsiString& ADelimiters) {
  return ACase == rcNormal ? AText : Narrow(CharCase(Widen(AText), ACase, Widen(ADelimiters)));
}

WideString ZqCharCase(const WideString& AText, TZqCharCase ACase, const WideString& ADelimiters) {
  return CharCase(AText, ACase, ADelimiters);
}

UnicodeString ZqStringIncrement(const UnicodeString& AValue, Integer AIncrement) {
  if (Trim(AValue).IsEmpty()) return IntToStr(CurrentYear()) + u"00001";
  Integer Prefix = AValue.Length();
  while (Prefix > 0 && AValue[Prefix] >= u'0' && AValue[Prefix] <= u'9') --Prefix;
  const Integer Digits = AValue.Length() - Prefix;
  const Int64 Number = Int64{StrToInt(AValue.Copy(Prefix + 1, Digits))} + AIncrement;
  return AValue.Copy(1, Prefix) + ZqPadLeft(Number, Digits, u'0');
}

// ---- Lists and tokens ----------------------------------------------------------------------------------------------

void ZqTokenize(
    const UnicodeString& AText, TStringList* AList, const UnicodeString& ADelimiters, TStrings* ADelimiterList) {
  static constexpr const char16_t* cDefaultDelimiters = u" ~!@#$%^&*()-=+\\|]}[{'\";:/?.>,<";
  const UnicodeString Delimiters = ADelimiters.IsEmpty() ? cDefaultDelimiters : ADelimiters;
  UnicodeString Token;
  const auto AddToken = [&] {
    if (!Token.IsEmpty()) AList->Add(std::exchange(Token, {}));
  };
  for (const Char c : AText) {
    if (!Contains(Delimiters, c)) {
      Token += c;
      continue;
    }
    AddToken();
    if (ADelimiterList != nullptr) ADelimiterList->Add(UnicodeString(c));
  }
  AddToken();
}

void ZqStringToList(const UnicodeString& AText, const UnicodeString& ADelimiter, TStringList* AList) {
  std::u16string_view Rest = AText;
  while (const Integer Found = Pos(ADelimiter, Rest)) {
    AList->Add(Rest.substr(0, static_cast<std::size_t>(Found - 1)));
    Rest.remove_prefix(static_cast<std::size_t>(Found - 1) + ADelimiter.size());
  }
  AList->Add(Rest);
}

UnicodeString ZqListToString(const TStrings* AList, const UnicodeString& ADelimiter) {
  UnicodeString Result;
  for (const UnicodeString& Item : *AList) (Result += ADelimiter) += Item;
  return Result.Copy(2, 999999);
}

UnicodeString ZqStringReplace(
    const UnicodeString& AText, TZqStringArgs AOld, TZqStringArgs ANew, TReplaceFlags AFlags) {
  Assert(AOld.size() == ANew.size());
  UnicodeString Result = AText;
  for (std::size_t i = 0; i < AOld.size(); ++i) Result = StringReplace(Result, AOld[i], ANew[i], AFlags);
  return Result;
}

// ---- Trimming, cutting, padding ------------------------------------------------------------------------------------

namespace {

bool IsBlank(Char AChar) noexcept { return AChar < 33; }

bool IsBlankOrLiteral(Char AChar) noexcept { return IsBlank(AChar) || ZqIsLiteral(AChar); }

std::u16string_view StripLeft(std::u16string_view AText, bool (*AStrips)(Char)) noexcept {
  while (AText.size() > 1 && AStrips(AText.front())) AText.remove_prefix(1);
  return AText;
}

std::u16string_view StripRight(std::u16string_view AText, bool (*AStrips)(Char)) noexcept {
  while (AText.size() > 1 && AStrips(AText.back())) AText.remove_suffix(1);
  return AText;
}

// What AText lacks to ALength.
UnicodeString Padding(const UnicodeString& AText, Integer ALength, WideChar AChar) {
  return StringOfChar(AChar == 0 ? u' ' : AChar, std::max(ALength, AText.Length()) - AText.Length());
}

}  // namespace

UnicodeString ZqTrim(const UnicodeString& AText) { return Trim(AText); }

AnsiString ZqTrim(const AnsiString& AText) {
  const auto Blank = [](char c) { return IsBlank(static_cast<unsigned char>(c)); };
  std::string_view Rest = AText.View();
  while (!Rest.empty() && Blank(Rest.front())) Rest.remove_prefix(1);
  while (!Rest.empty() && Blank(Rest.back())) Rest.remove_suffix(1);
  return Rest;
}

UnicodeString ZqTrimLeft(const UnicodeString& AText) { return StripLeft(AText, IsBlank); }

UnicodeString ZqTrimRight(const UnicodeString& AText) { return StripRight(AText, IsBlank); }

UnicodeString ZqStripLiterals(const UnicodeString& AText) {
  return StripRight(StripLeft(AText, IsBlankOrLiteral), IsBlankOrLiteral);
}

UnicodeString ZqLeft(const UnicodeString& AText, Integer ACount) { return AText.Copy(1, ACount); }

UnicodeString ZqRight(const UnicodeString& AText, Integer ACount) {
  return AText.Copy(AText.Length() - std::max(ACount, 0) + 1, ACount);
}

UnicodeString ZqPadLeft(const UnicodeString& AText, Integer ALength, WideChar AChar) {
  return Padding(AText, ALength, AChar) + AText;
}

UnicodeString ZqPadLeft(Integer AValue, Integer ALength, WideChar AChar) {
  return ZqPadLeft(IntToStr(AValue), ALength, AChar);
}

UnicodeString ZqPadLeft(Int64 AValue, Integer ALength, WideChar AChar) {
  return ZqPadLeft(IntToStr(AValue), ALength, AChar);
}

UnicodeString ZqPadRight(const UnicodeString& AText, Integer ALength, WideChar AChar) {
  return AText + Padding(AText, ALength, AChar);
}

AnsiString ZqAnsiCopy(const AnsiString& AText, Integer AIndex, Integer ACount) { return Copy(AText, AIndex, ACount); }

AnsiString ZqIntToAnsiStr(Integer AValue) { return Narrow(IntToStr(AValue)); }

// ---- Tests and comparisons -----------------------------------------------------------------------------------------

namespace {

constexpr TZqSetOfAnsiChar cNameDelimiters{'\n', '\r', ' ', ')', ',', ';'};
constexpr TZqSetOfAnsiChar cLiterals{'"', '\''};

}  // namespace

Boolean ZqIsNameDelimiter(AnsiChar AChar) noexcept { return cNameDelimiters.Contains(AChar); }
Boolean ZqIsNameDelimiter(WideChar AChar) noexcept { return CharInSet(AChar, cNameDelimiters); }

Boolean ZqIsLiteral(AnsiChar AChar) noexcept { return cLiterals.Contains(AChar); }
Boolean ZqIsLiteral(WideChar AChar) noexcept { return CharInSet(AChar, cLiterals); }

Boolean ZqCharInSet(AnsiChar AChar, const TZqSetOfAnsiChar& ASet) noexcept { return ASet.Contains(AChar); }
Boolean ZqCharInSet(WideChar AChar, const TZqSetOfAnsiChar& ASet) noexcept { return CharInSet(AChar, ASet); }

Boolean ZqStrInSet(const UnicodeString& AText, TZqStringArgs ASet) noexcept {
  return std::find(ASet.begin(), ASet.end(), AText) != ASet.end();
}

Integer ZqLastPos(const UnicodeString& AText, WideChar AChar) noexcept {
  return static_cast<Integer>(AText.View().rfind(AChar) + 1);  // npos + 1 is 0
}

Boolean ZqContainsText(const AnsiString& ASub, const AnsiString& AText) {
  return ZqContainsText(WideString(Widen(ASub)), WideString(Widen(AText)));
}

Boolean ZqContainsText(const WideString& ASub, const WideString& AText) {
  return Pos(LowerCase(ASub), LowerCase(AText)) > 0;
}

Boolean ZqSameText(const UnicodeString& A, const UnicodeString& B) noexcept { return SameText(A, B); }

Boolean ZqSameText(const AnsiString& A, const AnsiString& B) { return SameText(Widen(A), Widen(B)); }

Boolean ZqSameTrimmedText(const UnicodeString& A, const UnicodeString& B) { return SameText(Trim(A), Trim(B)); }

Boolean ZqSameVar(const Variant& A, const Variant& B) { return VarType(A) == VarType(B) && VarSameValue(A, B); }

Boolean ZqSameArray(const Variant& A, const Variant& B) {
  try {
    const Integer High = VarArrayHighBound(A, 1);
    for (Integer i = VarArrayLowBound(A, 1); i <= High; ++i)
      if (!VarSameValue(A[i], B[i])) return false;
    return true;
  } catch (const Exception&) {
    return false;
  }
}

Boolean ZqSameGuid(const TGUID& A, const TGUID& B) noexcept { return A == B; }

// ---- Small utilities -----------------------------------------------------------------------------------------------

namespace {

// Works on the fraction alone, so that a large whole part loses nothing.
template <std::floating_point T>
T RoundOutward(T AValue, Integer ADigits) {
  const T Scale = static_cast<T>(static_cast<Int64>(std::pow(Extended{10}, std::min(ADigits, 18))));
  const T Whole = std::trunc(AValue);
  const T Shifted = (AValue - Whole) * Scale;
  const T Inner = std::trunc(Shifted);
  const T Rest = std::abs(Shifted - Inner);
  const T Step = AValue < 0 ? T{-1} : T{1};
  // A decimal half that no float can hold shows as 0.4999...: a text has fewer digits than the float and shows the half
  // again. Behind a whole part that took digits away it shows by being the float nearest to that half.
  const auto IsHiddenHalf = [&] {
    return FloatToStr(Rest * 10) == u"5" || static_cast<T>(Whole + (Inner + Step * Extended{0.5}) / Scale) == AValue;
  };
  const bool Outward = Rest > T{0.5} || (Rest > T{0.4} && IsHiddenHalf());
  return (Outward ? Inner + Step : Inner) / Scale + Whole;
}

Cardinal LittleEndian(const Byte* ABytes, std::size_t ACount) noexcept {
  Cardinal Result = 0;
  for (std::size_t i = ACount; i > 0; --i) Result = Result << 8U | ABytes[i - 1];
  return Result;
}

UnicodeString FindAlongPath(const UnicodeString& AFile) {
  if (FileExists(AFile)) return AFile;
  const UnicodeString Found = Service<TFileService>().SearchPath(AFile);
  return Found.IsEmpty() ? AFile : Found;
}

}  // namespace

double ZqRound(double AValue, Integer ADigits) { return RoundOutward(AValue, ADigits); }

Extended ZqRound(Extended AValue, Integer ADigits) { return RoundOutward(AValue, ADigits); }

Boolean ZqIsBitChecked(Integer AValue, Integer ABit) noexcept {
  return ABit >= 1 && ABit <= 32 && (static_cast<Cardinal>(AValue) >> static_cast<Cardinal>(ABit - 1) & 1U) != 0;
}

UnicodeString ZqGetFileMimeType(const UnicodeString& AFile) {
  const UnicodeString Extension = AnsiLowerCase(ExtractFileExt(AFile));
  TRegistry Registry(KEY_READ);
  Registry.SetRootKey(HKEY_CLASSES_ROOT);
  if (Extension.IsEmpty() || !Registry.OpenKey(Extension, false)) return {};
  return Registry.ReadString(u"Content Type");
}

std::unique_ptr<TResourceStream> ZqFindResource(const UnicodeString& AName, const WideChar* AType) {
  for (const HINST Module : {HInstance(), MainInstance()})
    if (Service<TResourceService>().FindResource(Module, AName, AType))
      return std::make_unique<TResourceStream>(Module, AName, AType);
  return nullptr;
}

std::unique_ptr<TResourceStream> ZqGetResource(const UnicodeString& AName, const WideChar* AType) {
  auto Result = ZqFindResource(AName, AType);
  if (Result == nullptr) throw Exception(u"There is no resource with the name: " + AName);
  return Result;
}

UnicodeString ZqFindResource(const UnicodeString& AName, Word ACodePage, const WideChar* AType) {
  const auto Resource = ZqFindResource(AName, AType);
  if (Resource == nullptr) return {};
  TZqStringStream Text(0);
  Text.CopyFrom(*Resource, 0);
  return TZqEncoding::ConvertA(Text.StringData(ACodePage), ACodePage);
}

UnicodeString ZqGetResource(const UnicodeString& AName, Word ACodePage, const WideChar* AType) {
  UnicodeString Result = ZqFindResource(AName, ACodePage, AType);
  if (Result.IsEmpty()) throw Exception(u"There is no resource with the name: " + AName);
  return Result;
}

UnicodeString ZqLoadStringFromFile(const UnicodeString& AFile, Word AMode) {
  return ZqStreamToWideString(new TFileStream(AFile, AMode), true, true, true);
}

void ZqSaveString(const UnicodeString& AFile, const WideString& AText, Word ACodePage, Boolean AWriteBOM) {
  TZqStringStream::CreateEx(UnicodeString(AText.View())).SaveToFile(AFile, ACodePage, AWriteBOM);
}

void ZqSaveString(const UnicodeString& AFile, const AnsiString& AText, Word ASourceCodePage, Integer ADestCodePage,
    Boolean AWriteBOM) {
  const Word CodePage = ADestCodePage == -1 ? ASourceCodePage : static_cast<Word>(ADestCodePage);
  TZqStringStream::CreateEx(AText, ASourceCodePage).SaveToFile(AFile, CodePage, AWriteBOM);
}

void ZqSaveString(const UnicodeString& AFile, const UTF8String& AText) {
  TZqStringStream::CreateEx(AText).SaveToFile(AFile, 65001, true);
}

Boolean IsWow64() { return Service<TProcessFacts>().IsWow64Process().value_or(false); }

Boolean IsOS64() { return IsCPU64() || IsWow64(); }

Boolean Is64BitFile(const UnicodeString& AFile) {
  constexpr Cardinal cDosMagic = 23117, cPESignature = 17744, cMachineI386 = 0x14C;
  constexpr std::size_t cNewHeaderAt = 60, cMachineAt = 4;
  TFileStream File(FindAlongPath(AFile), fmShareDenyNone);
  std::array<Byte, 64> DosHeader{};
  File.ReadBuffer(DosHeader.data(), DosHeader.size());
  const Cardinal NewHeader = LittleEndian(&DosHeader[cNewHeaderAt], 4);
  if (LittleEndian(DosHeader.data(), 2) != cDosMagic || NewHeader == 0) return false;
  std::array<Byte, 248> PEHeader{};
  File.SetPosition(NewHeader);
  File.ReadBuffer(PEHeader.data(), PEHeader.size());
  return LittleEndian(PEHeader.data(), 4) == cPESignature && LittleEndian(&PEHeader[cMachineAt], 2) != cMachineI386;
}

UnicodeString ZqGetUserName() { return Service<TUserService>().GetUserName(); }

UnicodeString ZqGetUserName(UnicodeString& ADomain) {
  UnicodeString Result;
  Service<TUserService>().LookupTokenUser(Result, ADomain);
  return Result;
}

UnicodeString ZqGetComputerName() { return Service<TUserService>().GetComputerName(); }

UnicodeString ZqGetComputerDescription() {
  TUserService& Users = Service<TUserService>();
  Assert(Users.LoadNetApi(), u"The ZqGetComputerDescription is not supported by your version of Windows");
  if (!Users.HasServerGetInfo()) throw Exception(u"Failed to locate API funtion.");
  UnicodeString Result;
  if (Users.NetServerGetInfo(Result) != 0) throw Exception(u"Failed to execute the NetServerGetInfo funtion.");
  return Result;
}

Boolean ZqIsDebuggerPresent() { return Service<TProcessFacts>().IsDebuggerPresent().value_or(false); }

Integer ZqAge(TDateTime ADate) {
  if (ADate <= 0) return 0;
  Word Year = 0, Month = 0, Day = 0, BirthYear = 0, BirthMonth = 0, BirthDay = 0;
  DecodeDate(Now(), Year, Month, Day);
  DecodeDate(ADate, BirthYear, BirthMonth, BirthDay);
  const bool BeforeBirthday = std::pair(Month, Day) < std::pair(BirthMonth, BirthDay);
  return Year - BirthYear - (BeforeBirthday ? 1 : 0);
}

}  // namespace zq
