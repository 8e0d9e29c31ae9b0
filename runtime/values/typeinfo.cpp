#include "runtime/values/typeinfo.h"

#include <algorithm>
#include <map>
#include <mutex>
#include <shared_mutex>
#include <typeindex>
#include <unordered_map>

#include "runtime/text/numbers.h"
#include "runtime/values/values.h"

namespace zq {

namespace {

// ---- Names of the runtime's own types -------------------------------------------------------------------------------

using TNames = std::span<const char16_t* const>;
constexpr const char16_t* cBooleanNames[] = {u"False", u"True"};
constexpr const char16_t* cTypeKindNames[] = {u"tkUnknown", u"tkInteger", u"tkChar", u"tkEnumeration", u"tkFloat",
    u"tkString", u"tkSet", u"tkClass", u"tkMethod", u"tkWChar", u"tkLString", u"tkWString", u"tkVariant", u"tkArray",
    u"tkRecord", u"tkInterface", u"tkInt64", u"tkDynArray", u"tkUString", u"tkClassRef", u"tkPointer", u"tkProcedure"};

struct THouseType {
  PTypeInfo (*Info)();
  const std::type_info* Type;
  const char16_t* UnitName;
  const char16_t* Name;
  TNames EnumNames;
};
template <class T>
constexpr THouseType House(const char16_t* AName, const char16_t* AUnit = u"System", TNames AEnumNames = {}) {
  return {&TypeInfo<T>, &typeid(T), AUnit, AName, AEnumNames};
}

constexpr THouseType cHouseTypes[] = {
    House<Byte>(u"Byte"),
    House<ShortInt>(u"ShortInt"),
    House<Word>(u"Word"),
    House<SmallInt>(u"SmallInt"),
    House<Cardinal>(u"Cardinal"),
    House<Integer>(u"Integer"),
    House<NativeUInt>(u"NativeUInt"),
    House<NativeInt>(u"NativeInt"),
    House<UInt64>(u"UInt64"),
    House<Int64>(u"Int64"),
    House<Single>(u"Single"),
    House<Double>(u"Double"),
    House<Extended>(u"Extended"),
    House<Currency>(u"Currency"),
    House<Boolean>(u"Boolean", u"System", cBooleanNames),
    House<WordBool>(u"WordBool", u"System", cBooleanNames),
    House<Char>(u"Char"),
    House<AnsiChar>(u"AnsiChar"),
    House<UnicodeString>(u"string"),
    House<WideString>(u"WideString"),
    House<AnsiString>(u"AnsiString"),
    House<UTF8String>(u"UTF8String"),
    House<RawByteString>(u"RawByteString"),
    House<ShortString>(u"ShortString"),
    House<TDateTime>(u"TDateTime"),
    House<TDate>(u"TDate"),
    House<TTime>(u"TTime"),
    House<Variant>(u"Variant"),
    House<TGUID>(u"TGUID"),
    House<Pointer>(u"Pointer"),
    House<TClass>(u"TClass"),
    House<TObject>(u"TObject"),
    House<IInterface>(u"IInterface"),
    House<TTypeKind>(u"TTypeKind", u"System", cTypeKindNames),
    House<TArray<UnicodeString>>(u"TStringDynArray", u"System.Types"),
    House<TArray<Integer>>(u"TIntegerDynArray", u"System.Types"),
    House<TArray<Boolean>>(u"TBooleanDynArray", u"System.Types"),
    House<TArray<TDateTime>>(u"TDateTimeDynArray", u"System.Types"),
};

void OpenHouseTypes() {
  for (const THouseType& House : cHouseTypes) House.Info();
}

// ---- Pool -----------------------------------------------------------------------------------------------------------

struct TRecord {
  TTypeInfo Info;
  TRttiType Rtti{&Info};
};

struct TNoCase {
  bool operator()(const UnicodeString& A, const UnicodeString& B) const noexcept { return CompareText(A, B) < 0; }
};

struct TPool {
  std::shared_mutex Lock;
  std::unordered_map<std::type_index, std::unique_ptr<TRecord>> ByType;
  std::map<UnicodeString, TTypeInfo*, TNoCase> ByName;  // the public ones, by qualified name
  TArray<PTypeInfo> Registered;                         // classes that GetClass knows
};

TPool& Pool() {
  static TPool& Result = *new TPool;
  return Result;
}

UnicodeString QualifiedName(PTypeInfo AType) {
  return AType->Data.UnitName.IsEmpty() ? AType->Name : AType->Data.UnitName + u"." + AType->Name;
}

void NameFirst(TTypeInfo& AInfo, const std::type_info& AType) {
  const auto* const House = std::find_if(
      std::begin(cHouseTypes), std::end(cHouseTypes), [&](const THouseType& A) { return *A.Type == AType; });
  if (House != std::end(cHouseTypes)) {
    AInfo.Name = House->Name;
    AInfo.Data.UnitName = House->UnitName;
    AInfo.Data.EnumNames.assign(House->EnumNames.begin(), House->EnumNames.end());
    if (!House->EnumNames.empty() && !AInfo.Data.IsSigned) AInfo.Data.MaxValue = House->EnumNames.size() - 1;
  } else if (AInfo.Kind == tkDynArray) AInfo.Name = u"TArray<" + QualifiedName(AInfo.Data.ElementType) + u">";
  else AInfo.Name = TClass(AType).ClassName();
}

TRecord* FindRecord(TPool& APool, const std::type_info& AType) {
  const std::shared_lock Guard(APool.Lock);
  const auto Found = APool.ByType.find(AType);
  return Found == APool.ByType.end() ? nullptr : Found->second.get();
}

}  // namespace

namespace detail {

PTypeInfo FindOrAddType(const std::type_info& AType, TTypeFiller AFill) {
  TPool& Types = Pool();
  if (const TRecord* const Known = FindRecord(Types, AType)) return &Known->Info;
  auto Made = std::make_unique<TRecord>();  // outside of the lock: AFill may ask for other types
  Made->Info.Rtti = &Made->Rtti;
  AFill(Made->Info);
  NameFirst(Made->Info, AType);
  const std::unique_lock Guard(Types.Lock);
  const auto [Place, IsNew] = Types.ByType.try_emplace(AType, std::move(Made));
  TTypeInfo& Info = Place->second->Info;
  if (IsNew && !Info.Data.UnitName.IsEmpty()) Types.ByName.emplace(QualifiedName(&Info), &Info);
  return &Info;
}

TTypeInfo& NameType(PTypeInfo AType, const UnicodeString& AUnit, const UnicodeString& AName) {
  TPool& Types = Pool();
  const std::unique_lock Guard(Types.Lock);
  auto& Info = const_cast<TTypeInfo&>(*AType);  // all records belong to the pool
  if (const auto Old = Types.ByName.find(QualifiedName(AType)); Old != Types.ByName.end() && Old->second == AType)
    Types.ByName.erase(Old);
  if (!AName.IsEmpty()) Info.Name = AName;
  Info.Data.UnitName = AUnit;
  if (!AUnit.IsEmpty()) Types.ByName.insert_or_assign(QualifiedName(AType), &Info);
  return Info;
}

void AddProperty(TTypeInfo& AType, TPropInfo AProperty) {
  auto& Known = AType.Data.Properties;
  const auto Place =
      std::find_if(Known.begin(), Known.end(), [&](const TPropInfo& A) { return SameText(A.Name, AProperty.Name); });
  if (Place == Known.end()) Known.push_back(std::move(AProperty));
  else *Place = std::move(AProperty);
}

void RaiseForeignObject(PTypeInfo AType) { throw EPropertyError(u"The object is no " + AType->Name); }

void AddRegisteredClass(PTypeInfo AClass) {
  TPool& Types = Pool();
  const std::unique_lock Guard(Types.Lock);
  if (std::find(Types.Registered.begin(), Types.Registered.end(), AClass) == Types.Registered.end())
    Types.Registered.push_back(AClass);
}

}  // namespace detail

TClass GetClass(const UnicodeString& AName) {
  TPool& Types = Pool();
  const std::shared_lock Guard(Types.Lock);
  for (const PTypeInfo Class : Types.Registered)
    if (SameText(Class->Name, AName)) return Class->Data.ClassType;
  return {};
}

PTypeInfo ClassInfo(TClass AClass) {
  const TRecord* const Record = AClass ? FindRecord(Pool(), AClass.Info()) : nullptr;
  return Record == nullptr ? nullptr : &Record->Info;
}

UnicodeString TRttiType::GetQualifiedName() const { return QualifiedName(FHandle); }

TRttiType* TRttiType::GetElementType() const noexcept {
  return FHandle->Data.ElementType == nullptr ? nullptr : FHandle->Data.ElementType->Rtti;
}

TRttiType* TRttiContext::FindType(const UnicodeString& AQualifiedName) const {
  OpenHouseTypes();
  TPool& Types = Pool();
  const std::shared_lock Guard(Types.Lock);
  const auto Found = Types.ByName.find(AQualifiedName);
  return Found == Types.ByName.end() ? nullptr : Found->second->Rtti;
}

TArray<TRttiType*> TRttiContext::GetTypes() const {
  OpenHouseTypes();
  TPool& Types = Pool();
  const std::shared_lock Guard(Types.Lock);
  TArray<TRttiType*> Result;
  Result.reserve(Types.ByName.size());
  for (const auto& [Name, Info] : Types.ByName) Result.push_back(Info->Rtti);
  return Result;
}

// ---- Enumerations and sets ------------------------------------------------------------------------------------------

UnicodeString GetEnumName(PTypeInfo AType, Integer AOrdinal) {
  const auto& Names = AType->Data.EnumNames;
  const Integer Place = AType == TypeInfo<WordBool>() ? static_cast<Integer>(AOrdinal != 0) : AOrdinal;
  const bool Known = Place >= 0 && static_cast<std::size_t>(Place) < Names.size();
  if (Known && !Names[static_cast<std::size_t>(Place)].IsEmpty()) return Names[static_cast<std::size_t>(Place)];
  return IntToStr(AOrdinal);
}

UnicodeString detail::EnumText(const std::type_info& AType, Int64 AOrdinal) {
  const PTypeInfo Type = ClassInfo(TClass(AType));
  return Type == nullptr ? IntToStr(AOrdinal) : GetEnumName(Type, static_cast<Integer>(AOrdinal));
}

Integer GetEnumValue(PTypeInfo AType, const UnicodeString& AName) {
  const auto& Names = AType->Data.EnumNames;
  const auto Found = std::find_if(
      Names.begin(), Names.end(), [&](const UnicodeString& A) { return !A.IsEmpty() && SameText(A, AName); });
  return Found == Names.end() ? -1 : static_cast<Integer>(Found - Names.begin());
}

namespace {

PTypeInfo ElementOfSet(PTypeInfo AType) { return AType->Kind == tkSet ? AType->Data.ElementType : AType; }

}  // namespace

Integer StringToSet(PTypeInfo AType, const UnicodeString& AText) {
  const PTypeInfo Element = ElementOfSet(AType);
  UnicodeString Rest = Trim(AText);
  if (!Rest.IsEmpty() && Rest[1] == u'[') Rest = Rest.Copy(2, Rest.Length());
  if (!Rest.IsEmpty() && Rest[Rest.Length()] == u']') Rest.SetLength(Rest.Length() - 1);
  Cardinal Result = 0;
  while (!Trim(Rest).IsEmpty()) {
    const Integer Comma = Rest.Pos(u",");
    const UnicodeString Name = Trim(Comma == 0 ? Rest : Rest.Copy(1, Comma - 1));
    const Integer Ordinal = GetEnumValue(Element, Name);
    if (Ordinal < 0 || Ordinal > 31) throw EPropertyError(u"\"" + Name + u"\" is no element of the set " + AType->Name);
    Result |= Cardinal{1} << static_cast<Cardinal>(Ordinal);
    Rest = Comma == 0 ? UnicodeString() : Rest.Copy(Comma + 1, Rest.Length());
  }
  return static_cast<Integer>(Result);
}

UnicodeString SetToString(PTypeInfo AType, Integer ABits, bool ABrackets) {
  UnicodeString Result;
  for (Integer i = 0; i < 32; ++i)
    if ((static_cast<Cardinal>(ABits) >> static_cast<Cardinal>(i) & 1U) != 0)
      Result += (Result.IsEmpty() ? u"" : u",") + GetEnumName(ElementOfSet(AType), i);
  return ABrackets ? u"[" + Result + u"]" : Result;
}

// ---- Published properties -------------------------------------------------------------------------------------------

TTypeKind TPropInfo::Kind() const noexcept { return PropType->Kind; }

TValue TPropInfo::GetValue(TObject* AObject) const {
  if (!IsReadable()) throw EPropertyError(u"The property " + Name + u" can't be read");
  return TValue::Build(PropType, [&](void* ADest) { Read(AObject, ADest); });
}

void TPropInfo::SetValue(TObject* AObject, const TValue& AValue) const {
  if (!IsWritable()) throw EPropertyError(u"The property " + Name + u" can't be written");
  Write(AObject, AValue.Cast(PropType).GetReferenceToRawData());
}

TArray<PPropInfo> GetPropList(TClass AClass) {
  if (!AClass) return {};
  TArray<PPropInfo> Result = GetPropList(AClass.ClassParent());
  const PTypeInfo Info = ClassInfo(AClass);
  if (Info == nullptr) return Result;
  for (const TPropInfo& Own : Info->Data.Properties) {
    const auto Place =
        std::find_if(Result.begin(), Result.end(), [&](PPropInfo A) { return SameText(A->Name, Own.Name); });
    if (Place == Result.end()) Result.push_back(&Own);
    else *Place = &Own;
  }
  return Result;
}

PPropInfo GetPropInfo(TClass AClass, const UnicodeString& AName) {
  for (; AClass; AClass = AClass.ClassParent())
    if (const PTypeInfo Info = ClassInfo(AClass))
      for (const TPropInfo& Property : Info->Data.Properties)
        if (SameText(Property.Name, AName)) return &Property;
  return nullptr;
}

namespace {

PPropInfo NeedProperty(const TObject* AObject, const UnicodeString& AName) {
  const PPropInfo Result = AObject == nullptr ? nullptr : GetPropInfo(AObject, AName);
  if (Result == nullptr) throw EPropertyError(u"There is no property " + AName);
  return Result;
}

}  // namespace

Variant GetPropValue(TObject* AObject, PPropInfo AProperty, bool APreferStrings) {
  const TValue Value = AProperty->GetValue(AObject);
  if (APreferStrings && AProperty->Kind() == tkEnumeration)
    return GetEnumName(AProperty->PropType, static_cast<Integer>(Value.AsOrdinal()));
  if (APreferStrings && AProperty->Kind() == tkSet)
    return SetToString(AProperty->PropType, static_cast<Integer>(Value.AsOrdinal()));
  return Value.AsVariant();
}

Variant GetPropValue(TObject* AObject, const UnicodeString& AName, bool APreferStrings) {
  return GetPropValue(AObject, NeedProperty(AObject, AName), APreferStrings);
}

void SetPropValue(TObject* AObject, PPropInfo AProperty, const Variant& AValue) {
  AProperty->SetValue(AObject, TValue::FromVariant(AValue, AProperty->PropType));
}

void SetPropValue(TObject* AObject, const UnicodeString& AName, const Variant& AValue) {
  SetPropValue(AObject, NeedProperty(AObject, AName), AValue);
}

TObject* GetObjectProp(TObject* AObject, PPropInfo AProperty) {
  if (AProperty->Kind() != tkClass) throw EPropertyError(u"The property " + AProperty->Name + u" is no object");
  return AProperty->GetValue(AObject).AsObject();
}

TObject* GetObjectProp(TObject* AObject, const UnicodeString& AName) {
  return GetObjectProp(AObject, NeedProperty(AObject, AName));
}

TTypeKind PropType(const TObject* AObject, const UnicodeString& AName) { return NeedProperty(AObject, AName)->Kind(); }

}  // namespace zq
