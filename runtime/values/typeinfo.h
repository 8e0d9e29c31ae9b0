#pragma once

#include <array>
#include <concepts>
#include <cstring>
#include <deque>
#include <functional>
#include <limits>
#include <memory>
#include <span>
#include <type_traits>
#include <typeinfo>
#include <utility>
#include <vector>

#include "runtime/core/delegates.h"
#include "runtime/core/interfaces.h"
#include "runtime/core/objects.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/values/variants.h"

namespace zq {

enum class TTypeKind : Byte {
  tkUnknown,
  tkInteger,
  tkChar,
  tkEnumeration,
  tkFloat,
  tkString,
  tkSet,
  tkClass,
  tkMethod,
  tkWChar,
  tkLString,
  tkWString,
  tkVariant,
  tkArray,
  tkRecord,
  tkInterface,
  tkInt64,
  tkDynArray,
  tkUString,
  tkClassRef,
  tkPointer,
  tkProcedure
};
using enum TTypeKind;

struct TTypeInfo;
/// The one record of a type; lives to the end of the process and is compared by address.
///
/// A shared library that describes types or asks for records of its own types must stay loaded.
using PTypeInfo = const TTypeInfo*;

class TRttiType;
class TValue;

/// Published property of a class.
struct ZQ_API TPropInfo {
  UnicodeString Name;
  PTypeInfo PropType = nullptr;
  std::function<void(TObject*, void*)> Read;         // builds a value of PropType in raw storage
  std::function<void(TObject*, const void*)> Write;  // takes a value of PropType

  [[nodiscard]] bool IsReadable() const noexcept { return static_cast<bool>(Read); }
  [[nodiscard]] bool IsWritable() const noexcept { return static_cast<bool>(Write); }
  [[nodiscard]] TTypeKind Kind() const noexcept;
  /// Raise EPropertyError where the property can't be read or written or AObject hasn't got it, and what the getter or
  /// setter raises. SetValue casts AValue to PropType as TValue::Cast does.
  [[nodiscard]] TValue GetValue(TObject* AObject) const;
  void SetValue(TObject* AObject, const TValue& AValue) const;
};
using PPropInfo = const TPropInfo*;

/// What can be done with the storage of a type's values. Storage of an object is a TObject*, of an interface an
/// IntfRef<IInterface>, of any other type the type itself. Null operations are those that the type hasn't got.
struct TTypeStorage {
  std::size_t Size = 0;
  std::size_t Alignment = 1;
  void (*Init)(void* ADest) = nullptr;
  void (*Copy)(void* ADest, const void* ASource) = nullptr;
  void (*Move)(void* ADest, void* ASource) noexcept = nullptr;
  void (*Done)(void* AValue) noexcept = nullptr;
  Variant (*ToVariant)(const void* AValue) = nullptr;
  void (*FromVariant)(void* AValue, const Variant& ASource) = nullptr;  // assigns; raises as VarToXxx do
};

struct TTypeData {
  UnicodeString UnitName;  // empty: the registry can't name the type
  TTypeStorage Storage;
  bool IsSigned = false;  // of an ordinal type, like the bounds
  Int64 MinValue = 0;
  UInt64 MaxValue = 0;
  TClass ClassType;                  // of a class
  PTypeInfo ElementType = nullptr;   // of a set, an array or a described list
  TArray<UnicodeString> EnumNames;   // from ordinal 0 on; an empty one names no value
  std::deque<TPropInfo> Properties;  // of the class itself, without its ancestors'
};

struct TTypeInfo {
  TTypeKind Kind = tkUnknown;
  UnicodeString Name;  // without the unit
  TTypeData Data;
  TRttiType* Rtti = nullptr;
};

// ---- From C++ types -------------------------------------------------------------------------------------------------

namespace detail {

template <TTypeKind AKind, class TElement = void>
struct TKindAndElement {
  static constexpr TTypeKind Kind = AKind;
  using Element = TElement;
};
template <class T>
struct TypeTraits : TKindAndElement<std::is_class_v<T> || std::is_union_v<T> ? tkRecord
                                    : std::is_function_v<T>                  ? tkProcedure
                                                                             : tkUnknown> {};
template <class T>
struct TypeTraits<TArray<T>> : TKindAndElement<tkDynArray, T> {};
template <class T, std::size_t N>
struct TypeTraits<std::array<T, N>> : TKindAndElement<tkArray, T> {};
template <class T, std::size_t N>
struct TypeTraits<T[N]> : TKindAndElement<tkArray, T> {};
template <class T>
struct TypeTraits<TSet<T>> : TKindAndElement<tkSet, T> {};
template <class T>
struct TypeTraits<TMethod<T>> : TKindAndElement<tkMethod> {};
template <class T>
struct TypeTraits<TClassRef<T>> : TKindAndElement<tkClassRef> {};
template <class T>
struct TypeTraits<std::function<T>> : TKindAndElement<tkProcedure> {};
template <class T>
struct TypeTraits<T*> : TKindAndElement<std::is_function_v<T> ? tkProcedure : tkPointer> {};

template <class T>
concept TClassType = std::derived_from<T, TObject>;
template <class T>
concept TIntfType = std::derived_from<T, IInterface> && !TClassType<T>;
template <class T>
concept TMoment = TOneOf<T, TDateTime, TDate, TTime>;

template <class T>
constexpr TTypeKind KindOf() noexcept {
  if constexpr (TOneOf<T, bool, WordBool> || std::is_enum_v<T>) return tkEnumeration;
  else if constexpr (std::same_as<T, char>) return tkChar;
  else if constexpr (std::same_as<T, char16_t>) return tkWChar;
  else if constexpr (std::integral<T>) return sizeof(T) == 8 ? tkInt64 : tkInteger;
  else if constexpr (std::floating_point<T> || TMoment<T> || std::same_as<T, Currency>) return tkFloat;
  else if constexpr (std::derived_from<T, WideString>) return tkWString;
  else if constexpr (std::derived_from<T, UnicodeString>) return tkUString;
  else if constexpr (std::derived_from<T, RawByteString>) return tkLString;
  else if constexpr (std::same_as<T, ShortString>) return tkString;
  else if constexpr (std::same_as<T, Variant>) return tkVariant;
  else if constexpr (TClassType<T>) return tkClass;
  else if constexpr (TIntfType<T>) return tkInterface;
  else if constexpr (std::same_as<T, TClass> || std::derived_from<T, ExceptionClass>) return tkClassRef;
  else return TypeTraits<T>::Kind;
}

// An object's type is its class, an interface reference's its interface: each two share a record.
template <class T>
struct TypeKey {
  using type = T;
};
template <TClassType T>
  requires(!std::is_const_v<T>)
struct TypeKey<T*> {
  using type = T;
};
template <class I>
struct TypeKey<IntfRef<I>> {
  using type = I;
};
template <class T>
using TypeKeyOf = typename TypeKey<std::remove_cv_t<T>>::type;

template <class TKey>
struct StorageFor {
  using type = TKey;
};
template <TClassType TKey>
struct StorageFor<TKey> {
  using type = TObject*;
};
template <TIntfType TKey>
struct StorageFor<TKey> {
  using type = IntfRef<IInterface>;
};
template <class T>
using StorageOf = typename StorageFor<TypeKeyOf<T>>::type;

/// nullptr where the object or interface in storage is no T.
template <class T>
[[nodiscard]] T FromStorage(const StorageOf<T>& AValue) {
  if constexpr (std::same_as<T, StorageOf<T>>) return AValue;
  else if constexpr (TClassType<TypeKeyOf<T>>) return dynamic_cast<T>(AValue);
  else return AValue.template Supports<TypeKeyOf<T>>();
}

/// AValue as a whole number from AMin to AMax. Raises as VarToInt64 does.
[[nodiscard]] ZQ_API Int64 VarToOrdinal(const Variant& AValue, Int64 AMin, Int64 AMax);
/// Raises EVariantOverflow for a number that isn't infinite and would become so. Single, Double, Extended.
template <class T>
[[nodiscard]] ZQ_API T VarToFloat(const Variant& AValue);
extern template Single VarToFloat(const Variant&);
extern template Double VarToFloat(const Variant&);
extern template Extended VarToFloat(const Variant&);
/// The one character of the text; raises EVariantTypeCast for more or fewer.
[[nodiscard]] ZQ_API char16_t VarToWChar(const Variant& AValue);
[[nodiscard]] ZQ_API char VarToAChar(const Variant& AValue);

template <class S>
concept TVariantValue = KindOf<S>()
== tkInteger || KindOf<S>() == tkInt64 || KindOf<S>() == tkChar || KindOf<S>() == tkWChar
    || KindOf<S>() == tkEnumeration || KindOf<S>() == tkSet || KindOf<S>() == tkFloat || KindOf<S>() == tkString
    || KindOf<S>() == tkVariant || std::derived_from<S, UnicodeString> || std::derived_from<S, RawByteString> ||
    TOneOf<S, TObject*, IntfRef<IInterface>>;

template <class S>
Variant StorageToVariant(const void* AStorage) {
  const S& Value = *static_cast<const S*>(AStorage);
  if constexpr (std::is_enum_v<S>) {
    constexpr bool Wide = static_cast<UInt64>(std::numeric_limits<std::underlying_type_t<S>>::max()) > 0x7FFFFFFFU;
    return static_cast<std::conditional_t<Wide, Int64, Integer>>(Value);
  } else if constexpr (KindOf<S>() == tkSet) return Value.ToInteger();
  else if constexpr (std::same_as<S, ShortString>) return UTF8String(Value.View());
  else if constexpr (std::convertible_to<S, Variant>) return Value;
  else return static_cast<Int64>(Value);
}

template <class S>
S VariantToOrdinal(const Variant& AValue) {
  if constexpr (TOneOf<S, bool, WordBool>) return VarToBool(AValue);
  else if constexpr (std::same_as<S, char16_t>) return VarToWChar(AValue);
  else if constexpr (std::same_as<S, char>) return VarToAChar(AValue);
  else if constexpr (TOneOf<S, UInt64, NativeUInt>) return VarToUInt64(AValue);
  else return static_cast<S>(VarToOrdinal(AValue, std::numeric_limits<S>::min(), std::numeric_limits<S>::max()));
}

template <class S>
S VariantToText(const Variant& AValue) {
  if constexpr (std::same_as<S, ShortString>) return S(VarToUStr(AValue).ToUTF8());
  else if constexpr (std::derived_from<S, UnicodeString>) return S(VarToUStr(AValue).View());
  else if constexpr (std::same_as<S, RawByteString>) return VarToBytes(AValue);
  else if constexpr (std::same_as<S, UTF8String>) return UTF8Encode(VarToUStr(AValue));
  else return S(VarToLStr(AValue).View());
}

template <class S>
void VariantToStorage(void* AStorage, const Variant& ASource) {
  S& Value = *static_cast<S*>(AStorage);
  if constexpr (std::is_enum_v<S>) Value = static_cast<S>(VariantToOrdinal<std::underlying_type_t<S>>(ASource));
  else if constexpr (std::integral<S> || std::same_as<S, WordBool>) Value = VariantToOrdinal<S>(ASource);
  else if constexpr (KindOf<S>() == tkSet) {
    const Integer Bits = VarToInteger(ASource);
    Value = S();
    std::memcpy(AStorage, &Bits, sizeof Bits);
  } else if constexpr (TMoment<S>) Value = VarToDateTime(ASource).Value;
  else if constexpr (std::same_as<S, Currency>) Value = VarToCurrency(ASource);
  else if constexpr (std::floating_point<S>) Value = VarToFloat<S>(ASource);
  else if constexpr (std::same_as<S, Variant>) Value = ASource;
  else if constexpr (std::same_as<S, TObject*>) Value = VarToObject(ASource);
  else if constexpr (std::same_as<S, IntfRef<IInterface>>) Value = VarToIntf(ASource);
  else Value = VariantToText<S>(ASource);
}

template <class S>
constexpr TTypeStorage MakeStorage() noexcept {
  TTypeStorage Result;
  if constexpr (std::is_object_v<S> && !std::is_array_v<S>) {
    Result.Size = sizeof(S);  // NOLINT(bugprone-sizeof-expression): a TObject* is stored as such
    Result.Alignment = alignof(S);
    if constexpr (std::default_initializable<S>) Result.Init = [](void* ADest) { new (ADest) S(); };
    if constexpr (std::copy_constructible<S> && std::is_nothrow_move_constructible_v<S>) {
      Result.Copy = [](void* ADest, const void* ASource) { new (ADest) S(*static_cast<const S*>(ASource)); };
      Result.Move = [](void* ADest, void* ASource) noexcept { new (ADest) S(std::move(*static_cast<S*>(ASource))); };
      Result.Done = [](void* AValue) noexcept { static_cast<S*>(AValue)->~S(); };
    }
    if constexpr (TVariantValue<S>) {
      Result.ToVariant = &StorageToVariant<S>;
      Result.FromVariant = &VariantToStorage<S>;
    }
  }
  return Result;
}

template <class T>
void SetBounds(TTypeData& AData) noexcept {
  if constexpr (std::is_enum_v<T>) SetBounds<std::underlying_type_t<T>>(AData);
  else if constexpr (std::same_as<T, WordBool>) SetBounds<std::int16_t>(AData);
  else if constexpr (std::integral<T>) {
    AData.IsSigned = std::is_signed_v<T> && !std::same_as<T, char>;
    AData.MinValue = AData.IsSigned ? static_cast<Int64>(std::numeric_limits<T>::min()) : 0;
    AData.MaxValue = std::same_as<T, char> ? 255U : static_cast<UInt64>(std::numeric_limits<T>::max());
  }
}

template <class TKey>
void FillTypeInfo(TTypeInfo& AInfo);
using TTypeFiller = void (*)(TTypeInfo& AInfo);
ZQ_API PTypeInfo FindOrAddType(const std::type_info& AType, TTypeFiller AFill);

}  // namespace detail

/// The record of T. T* and T are one type where T is a class of the TObject family, and so are IntfRef<I> and I.
template <class T>
[[nodiscard]] PTypeInfo TypeInfo() {
  using TKey = detail::TypeKeyOf<T>;
  static const PTypeInfo Known = detail::FindOrAddType(typeid(TKey), &detail::FillTypeInfo<TKey>);
  return Known;
}

template <class TKey>
void detail::FillTypeInfo(TTypeInfo& AInfo) {
  AInfo.Kind = KindOf<TKey>();
  AInfo.Data.Storage = MakeStorage<StorageOf<TKey>>();
  SetBounds<TKey>(AInfo.Data);
  if constexpr (TClassType<TKey>) AInfo.Data.ClassType = ClassOf<TKey>();
  else if constexpr (!std::is_void_v<typename TypeTraits<TKey>::Element>)
    AInfo.Data.ElementType = TypeInfo<typename TypeTraits<TKey>::Element>();
}

/// The record of a class; nullptr where nobody has described it or asked for its TypeInfo.
[[nodiscard]] ZQ_API PTypeInfo ClassInfo(TClass AClass);
[[nodiscard]] inline const TTypeData* GetTypeData(PTypeInfo AType) noexcept { return &AType->Data; }

// ---- Description ----------------------------------------------------------------------------------------------------

namespace detail {
ZQ_API TTypeInfo& NameType(PTypeInfo AType, const UnicodeString& AUnit, const UnicodeString& AName);
ZQ_API void AddProperty(TTypeInfo& AType, TPropInfo AProperty);
[[noreturn]] ZQ_API void RaiseForeignObject(PTypeInfo AType);
}  // namespace detail

/// Describes a type as the registry shows it. Belongs in start-up code: nobody may read the record meanwhile. To
/// describe a type again replaces what is told again.
template <class T>
class TTypeDescription {
 public:
  explicit TTypeDescription(TTypeInfo& AInfo) noexcept : FInfo(AInfo) {}

  /// Of the ordinals from 0 on; an empty name stands for an ordinal that is no value.
  TTypeDescription& EnumNames(std::initializer_list<const char16_t*> ANames) {
    FInfo.Data.EnumNames.assign(ANames.begin(), ANames.end());
    FInfo.Data.MinValue = 0;
    FInfo.Data.MaxValue = ANames.size() - 1;
    return *this;
  }
  /// Of a class that is a list.
  TTypeDescription& ElementType(PTypeInfo AType) {
    FInfo.Data.ElementType = AType;
    return *this;
  }
  /// The next property, read-only. Getter and setter are member functions or callables that take a T& first.
  template <class TGet>
  TTypeDescription& Property(const UnicodeString& AName, TGet AGet) {
    return Add<TValueOf<TGet>>(AName, Reader(AGet), {});
  }
  template <class TGet, class TSet>
  TTypeDescription& Property(const UnicodeString& AName, TGet AGet, TSet ASet) {
    return Add<TValueOf<TGet>>(AName, Reader(AGet), Writer<TValueOf<TGet>>(ASet));
  }
  /// A property of type TData that can be set only.
  template <class TData, class TSet>
  TTypeDescription& Property(const UnicodeString& AName, std::nullptr_t, TSet ASet) {
    return Add<TData>(AName, {}, Writer<TData>(ASet));
  }

 private:
  template <class TGet>
  using TValueOf = std::remove_cvref_t<std::invoke_result_t<TGet&, T&>>;

  static T& Self(TObject* AObject) {
    T* const Result = dynamic_cast<T*>(AObject);
    if (Result == nullptr) detail::RaiseForeignObject(TypeInfo<T>());
    return *Result;
  }
  template <class TGet>
  static auto Reader(TGet AGet) {
    return [AGet](TObject* AObject, void* ADest) {
      new (ADest) detail::StorageOf<TValueOf<TGet>>(std::invoke(AGet, Self(AObject)));
    };
  }
  template <class TData, class TSet>
  static auto Writer(TSet ASet) {
    return [ASet](TObject* AObject, const void* ASource) {
      const auto& Storage = *static_cast<const detail::StorageOf<TData>*>(ASource);
      auto Value = detail::FromStorage<TData>(Storage);
      if constexpr (detail::TIntfType<detail::TypeKeyOf<TData>>)
        if (Storage && !Value) detail::RaiseForeignObject(TypeInfo<TData>());
      std::invoke(ASet, Self(AObject), std::move(Value));
    };
  }
  template <class TData>
  TTypeDescription& Add(const UnicodeString& AName, std::function<void(TObject*, void*)> ARead,
      std::function<void(TObject*, const void*)> AWrite) {
    detail::AddProperty(FInfo, {AName, TypeInfo<TData>(), std::move(ARead), std::move(AWrite)});
    return *this;
  }

  TTypeInfo& FInfo;
};

/// Gives T its qualified name, AUnit, "." and AName, which is the C++ name without namespaces if left out.
template <class T>
TTypeDescription<T> DescribeType(const UnicodeString& AUnit, const UnicodeString& AName = {}) {
  return TTypeDescription<T>(detail::NameType(TypeInfo<T>(), AUnit, AName));
}

namespace detail {
ZQ_API void AddRegisteredClass(PTypeInfo AClass);
}
/// Makes T known to GetClass.
template <std::derived_from<TObject> T>
void RegisterClass() {
  detail::AddRegisteredClass(TypeInfo<T>());
}
/// The registered class of that name, without regard to case; the empty one if there is none.
[[nodiscard]] ZQ_API TClass GetClass(const UnicodeString& AName);

// ---- Enumerations and sets ------------------------------------------------------------------------------------------

/// The decimal text of AOrdinal where it has no name.
[[nodiscard]] ZQ_API UnicodeString GetEnumName(PTypeInfo AType, Integer AOrdinal);
/// Without regard to case; -1 where no value has that name.
[[nodiscard]] ZQ_API Integer GetEnumValue(PTypeInfo AType, const UnicodeString& AName);
/// The bits of a set's text: names between commas, with or without "[" and "]". Raises EPropertyError for an unknown
/// name. AType is a set's or its element's.
[[nodiscard]] ZQ_API Integer StringToSet(PTypeInfo AType, const UnicodeString& AText);
[[nodiscard]] ZQ_API UnicodeString SetToString(PTypeInfo AType, Integer ABits, bool ABrackets = false);

// ---- Published properties -------------------------------------------------------------------------------------------

/// Properties of the class and all its ancestors, those of the ancestors first; one that a class describes anew stands
/// in its ancestor's place. Empty for what has no description.
[[nodiscard]] ZQ_API TArray<PPropInfo> GetPropList(TClass AClass);
[[nodiscard]] inline TArray<PPropInfo> GetPropList(PTypeInfo AType) { return GetPropList(AType->Data.ClassType); }
[[nodiscard]] inline TArray<PPropInfo> GetPropList(const TObject* AObject) { return GetPropList(AObject->ClassType()); }
/// Without regard to case; nullptr where there is none.
[[nodiscard]] ZQ_API PPropInfo GetPropInfo(TClass AClass, const UnicodeString& AName);
[[nodiscard]] inline PPropInfo GetPropInfo(const TObject* AObject, const UnicodeString& AName) {
  return GetPropInfo(AObject->ClassType(), AName);
}

// These raise EPropertyError for a name that the object's class hasn't published and for a property that can't be read
// or written, and what the getter or setter raises.

/// An ordinal for an enumeration or a set, or, with APreferStrings, the name or the set's text; a Boolean is varBoolean
/// and the name.
[[nodiscard]] ZQ_API Variant GetPropValue(TObject* AObject, PPropInfo AProperty, bool APreferStrings = true);
[[nodiscard]] ZQ_API Variant GetPropValue(TObject* AObject, const UnicodeString& AName, bool APreferStrings = true);
/// Converts AValue as TValue::FromVariant does.
ZQ_API void SetPropValue(TObject* AObject, PPropInfo AProperty, const Variant& AValue);
ZQ_API void SetPropValue(TObject* AObject, const UnicodeString& AName, const Variant& AValue);
/// Raises EPropertyError where the property is no object.
[[nodiscard]] ZQ_API TObject* GetObjectProp(TObject* AObject, PPropInfo AProperty);
[[nodiscard]] ZQ_API TObject* GetObjectProp(TObject* AObject, const UnicodeString& AName);
[[nodiscard]] ZQ_API TTypeKind PropType(const TObject* AObject, const UnicodeString& AName);

// ---- Types by name --------------------------------------------------------------------------------------------------

/// A type as the context shows it; lives as long as its record.
class ZQ_API TRttiType {
 public:
  explicit TRttiType(PTypeInfo AHandle) noexcept : FHandle(AHandle) {}
  TRttiType(const TRttiType&) = delete;
  TRttiType& operator=(const TRttiType&) = delete;

  [[nodiscard]] const UnicodeString& GetName() const noexcept { return FHandle->Name; }
  /// Unit, "." and name; the name alone where the type is not public.
  [[nodiscard]] UnicodeString GetQualifiedName() const;
  [[nodiscard]] PTypeInfo GetHandle() const noexcept { return FHandle; }
  /// True where the registry can name the type and find it by that name.
  [[nodiscard]] bool GetIsPublicType() const noexcept { return !FHandle->Data.UnitName.IsEmpty(); }
  [[nodiscard]] TTypeKind GetTypeKind() const noexcept { return FHandle->Kind; }
  /// nullptr for what has no elements.
  [[nodiscard]] TRttiType* GetElementType() const noexcept;
  [[nodiscard]] TArray<PPropInfo> GetProperties() const { return GetPropList(FHandle); }

 private:
  PTypeInfo FHandle;
};

/// View of the pool of types, which all contexts share; any thread.
class ZQ_API TRttiContext {
 public:
  /// nullptr for nullptr.
  [[nodiscard]] TRttiType* GetType(PTypeInfo AType) const noexcept { return AType == nullptr ? nullptr : AType->Rtti; }
  [[nodiscard]] TRttiType* GetType(TClass AClass) const { return GetType(ClassInfo(AClass)); }
  /// By qualified name, without regard to case; nullptr for an unknown one.
  [[nodiscard]] TRttiType* FindType(const UnicodeString& AQualifiedName) const;
  /// All public types, by qualified name.
  [[nodiscard]] TArray<TRttiType*> GetTypes() const;
  /// The pool lives on and types already found stay valid; the next use opens the context again.
  void Free() noexcept {}
};

}  // namespace zq
