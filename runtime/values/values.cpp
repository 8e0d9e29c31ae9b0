#include "runtime/values/values.h"

#include <bit>
#include <cstring>
#include <memory>

#include "runtime/text/datetime.h"
#include "runtime/text/numbers.h"

namespace zq {

static_assert(std::endian::native == std::endian::little, "ordinals are read from the first bytes of their storage");

namespace {

// Between the types of one family, and from whole numbers to reals, a value is cast by its content.
enum class TFamily : Byte { None, Whole, Real, Text, Truth };

TFamily FamilyOf(PTypeInfo AType) noexcept {
  if (AType == nullptr) return TFamily::None;
  switch (AType->Kind) {
    case tkInteger:
    case tkInt64: return TFamily::Whole;
    case tkFloat: return TFamily::Real;
    case tkChar:
    case tkWChar:
    case tkString:
    case tkLString:
    case tkWString:
    case tkUString: return TFamily::Text;
    case tkEnumeration:
      return AType == TypeInfo<bool>() || AType == TypeInfo<WordBool>() ? TFamily::Truth : TFamily::None;
    default: return TFamily::None;
  }
}

// Bytes of the storage that tell the ordinal; 0 for a type without ordinals.
std::size_t OrdinalSize(PTypeInfo AType) noexcept {
  switch (AType->Kind) {
    case tkInteger:
    case tkInt64:
    case tkChar:
    case tkWChar:
    case tkEnumeration: return AType->Data.Storage.Size;
    case tkSet: return sizeof(Integer);
    default: return 0;
  }
}

bool FitsSlot(PTypeInfo AType, std::size_t ASlotSize) noexcept {
  return AType->Data.Storage.Size <= ASlotSize && AType->Data.Storage.Alignment <= alignof(std::max_align_t);
}

// The type that a value unpacked from a variant bears; nullptr for what stays packed.
PTypeInfo TypeForContent(TVarType AType) {
  switch (AType) {
    case varShortInt: return TypeInfo<ShortInt>();
    case varByte: return TypeInfo<Byte>();
    case varSmallint: return TypeInfo<SmallInt>();
    case varWord: return TypeInfo<Word>();
    case varInteger: return TypeInfo<Integer>();
    case varLongWord: return TypeInfo<Cardinal>();
    case varInt64: return TypeInfo<Int64>();
    case varUInt64: return TypeInfo<UInt64>();
    case varSingle: return TypeInfo<Single>();
    case varDouble: return TypeInfo<Double>();
    case varCurrency: return TypeInfo<Currency>();
    case varDate: return TypeInfo<TDateTime>();
    case varBoolean: return TypeInfo<bool>();
    case varOleStr: return TypeInfo<WideString>();
    case varUString: return TypeInfo<UnicodeString>();
    case varString: return TypeInfo<RawByteString>();
    case varObject: return TypeInfo<TObject>();
    case varDispatch:
    case varUnknown: return TypeInfo<IInterface>();
    default: return nullptr;
  }
}

void CheckBounds(PTypeInfo AType, Int64 AOrdinal) {
  const TTypeData& Data = AType->Data;
  const auto Place = static_cast<std::size_t>(AOrdinal);
  const bool IsHole = Place < Data.EnumNames.size() && Data.EnumNames[Place].IsEmpty();
  if (AOrdinal < Data.MinValue || (AOrdinal > 0 && static_cast<UInt64>(AOrdinal) > Data.MaxValue) || IsHole)
    throw EVariantOverflow(IntToStr(AOrdinal) + u" is no value of " + AType->Name);
}

}  // namespace

// ---- Storage --------------------------------------------------------------------------------------------------------

void* TValue::Reserve(PTypeInfo AType) {
  const TTypeStorage& Storage = AType->Data.Storage;
  if (Storage.Copy == nullptr) throw EInvalidCast(u"A value can't hold the type " + AType->Name);
  if (FitsSlot(AType, sizeof FSlot)) return FSlot;
  void* const Block = ::operator new(Storage.Size, std::align_val_t(Storage.Alignment));
  std::memcpy(FSlot, &Block, sizeof Block);
  return Block;
}

void TValue::Unreserve(PTypeInfo AType) noexcept {
  if (FitsSlot(AType, sizeof FSlot)) return;
  void* Block = nullptr;
  std::memcpy(&Block, FSlot, sizeof Block);
  ::operator delete(Block, std::align_val_t(AType->Data.Storage.Alignment));
}

const void* TValue::GetReferenceToRawData() const noexcept {
  if (FType == nullptr) return nullptr;
  if (FitsSlot(FType, sizeof FSlot)) return FSlot;
  const void* Block = nullptr;
  std::memcpy(&Block, FSlot, sizeof Block);
  return Block;
}

void TValue::TakeFrom(TValue& AOther) noexcept {
  FType = std::exchange(AOther.FType, nullptr);
  if (FType == nullptr) return;
  if (!FitsSlot(FType, sizeof FSlot)) {
    std::memcpy(FSlot, AOther.FSlot, sizeof(void*));
    return;
  }
  FType->Data.Storage.Move(FSlot, AOther.FSlot);
  FType->Data.Storage.Done(AOther.FSlot);
}

void TValue::Clear() noexcept {
  if (FType == nullptr) return;
  FType->Data.Storage.Done(Raw());
  Unreserve(std::exchange(FType, nullptr));
}

TValue::TValue(const TValue& AOther) {
  if (AOther.FType != nullptr) *this = Make(AOther.GetReferenceToRawData(), AOther.FType);
}

TValue TValue::Make(const void* AStorage, PTypeInfo AType) {
  const TTypeStorage& Storage = AType->Data.Storage;
  if (AStorage == nullptr && Storage.Init == nullptr) throw EInvalidCast(u"There is no zero value of " + AType->Name);
  return Build(AType, [&](void* ADest) { AStorage == nullptr ? Storage.Init(ADest) : Storage.Copy(ADest, AStorage); });
}

TValue TValue::FromOrdinal(PTypeInfo AType, Int64 AOrdinal) {
  const std::size_t Size = OrdinalSize(AType);
  if (Size == 0) throw EInvalidCast(AType->Name + u" is no ordinal type");
  if (AType == TypeInfo<bool>()) return From(AOrdinal != 0);  // a bool with other bits than 0 and 1 is no bool
  TValue Result = Make(nullptr, AType);
  std::memcpy(Result.Raw(), &AOrdinal, Size);
  return Result;
}

TValue TValue::FromVariant(const Variant& AValue) {
  if (VarIsEmpty(AValue) || VarIsNull(AValue)) return {};
  const PTypeInfo Type = TypeForContent(VarType(AValue));
  return Type == nullptr ? From(AValue) : FromVariant(AValue, Type);
}

TValue TValue::FromVariant(const Variant& AValue, PTypeInfo AType) {
  if (VarIsStr(AValue) && AType->Kind == tkSet) return FromOrdinal(AType, StringToSet(AType, VarToUStr(AValue)));
  if (VarIsStr(AValue) && AType->Kind == tkEnumeration)
    if (const Integer Ordinal = GetEnumValue(AType, VarToUStr(AValue)); Ordinal != -1)
      return FromOrdinal(AType, Ordinal);
  if (AType->Data.Storage.FromVariant == nullptr) throw EInvalidCast(u"No variant holds a " + AType->Name);
  TValue Result = Make(nullptr, AType);
  AType->Data.Storage.FromVariant(Result.Raw(), AValue);
  if (AType->Kind == tkClass && !Result.IsEmpty() && !Result.AsObject()->InheritsFrom(AType->Data.ClassType))
    Result.RaiseCast(AType);
  if (AType->Kind == tkEnumeration && FamilyOf(AType) != TFamily::Truth) CheckBounds(AType, Result.AsOrdinal());
  return Result;
}

// ---- Reading --------------------------------------------------------------------------------------------------------

bool TValue::IsEmpty() const noexcept {
  if (FType == nullptr) return true;
  if (FType->Kind == tkClass) return *static_cast<TObject* const*>(GetReferenceToRawData()) == nullptr;
  return FType->Kind == tkInterface && !*static_cast<const IntfRef<IInterface>*>(GetReferenceToRawData());
}

void TValue::RaiseCast(const UnicodeString& AType) const {
  throw EInvalidCast((FType == nullptr ? UnicodeString(u"An empty value") : u"A value of type " + FType->Name) +
                     u" can't be read as " + AType);
}

void TValue::RaiseCast(PTypeInfo AType) const { RaiseCast(AType->Name); }

Int64 TValue::AsOrdinal() const {
  if (GetTypeKind() == tkVariant) return VarToInt64(AsVariant());
  const std::size_t Size = FType == nullptr ? 0 : OrdinalSize(FType);
  if (Size == 0) RaiseCast(u"an ordinal");
  UInt64 Bits = 0;
  std::memcpy(&Bits, GetReferenceToRawData(), Size);
  const auto Unused = static_cast<unsigned>(64 - 8 * Size);
  if (!FType->Data.IsSigned) return static_cast<Int64>(Bits);
  return static_cast<Int64>(Bits << Unused) >> Unused;
}

Int64 TValue::AsInt64() const {
  if (FamilyOf(FType) != TFamily::Whole && GetTypeKind() != tkEnumeration && GetTypeKind() != tkVariant)
    RaiseCast(TypeInfo<Int64>());
  return AsOrdinal();
}

Integer TValue::AsInteger() const {
  const Int64 Result = AsInt64();
  const bool IsBits = Result < 0 && OrdinalSize(FType) == sizeof Result && !FType->Data.IsSigned;
  if (IsBits || Result != static_cast<Integer>(Result)) RaiseCast(TypeInfo<Integer>());
  return static_cast<Integer>(Result);
}

Extended TValue::AsExtended() const {
  if (FType == TypeInfo<Extended>()) return *static_cast<const Extended*>(GetReferenceToRawData());
  const TFamily Family = FamilyOf(FType);
  if (Family != TFamily::Real && Family != TFamily::Whole && GetTypeKind() != tkVariant)
    RaiseCast(TypeInfo<Extended>());
  return VarToReal(AsVariant());
}

bool TValue::AsBoolean() const {
  if (FamilyOf(FType) != TFamily::Truth && GetTypeKind() != tkVariant) RaiseCast(TypeInfo<bool>());
  return VarToBool(AsVariant());
}

UnicodeString TValue::AsString() const {
  if (FamilyOf(FType) != TFamily::Text && GetTypeKind() != tkVariant) RaiseCast(TypeInfo<UnicodeString>());
  return VarToUStr(AsVariant());
}

Variant TValue::AsVariant() const {
  if (FType == nullptr) return {};
  if (FType->Data.Storage.ToVariant == nullptr) RaiseCast(TypeInfo<Variant>());
  return FType->Data.Storage.ToVariant(GetReferenceToRawData());
}

TObject* TValue::AsObject() const {
  if (GetTypeKind() == tkVariant) return VarToObject(AsVariant());
  if (FType == nullptr) return nullptr;
  if (FType->Kind != tkClass) RaiseCast(TypeInfo<TObject>());
  return *static_cast<TObject* const*>(GetReferenceToRawData());
}

IntfRef<IInterface> TValue::AsInterface() const {
  if (FType == nullptr || FType->Kind == tkInterface || FType->Kind == tkVariant) return VarToIntf(AsVariant());
  auto Result = FType->Kind == tkClass ? Supports<IInterface>(AsObject()) : nullptr;
  if (!Result && (FType->Kind != tkClass || !IsEmpty())) RaiseCast(TypeInfo<IInterface>());
  return Result;
}

TValue TValue::Cast(PTypeInfo AType) const {
  TValue Result;
  if (!TryCast(AType, Result)) RaiseCast(AType);
  return Result;
}

bool TValue::TryCast(PTypeInfo AType, TValue& AResult) const {
  try {
    const bool IsObject = FType != nullptr && FType->Kind == tkClass && AType->Kind == tkClass;
    const bool IsFamily = FamilyOf(FType) != TFamily::None && FamilyOf(FType) == FamilyOf(AType);
    const bool IsWidened = FamilyOf(FType) == TFamily::Whole && FamilyOf(AType) == TFamily::Real;
    const bool IsNothing = FType == nullptr && (AType->Kind == tkClass || AType->Kind == tkInterface);
    if (FType == AType) AResult = *this;
    else if (AType->Kind == tkVariant) AResult = From(AsVariant());
    else if (IsObject || IsFamily || IsWidened || IsNothing || GetTypeKind() == tkVariant)
      AResult = FromVariant(AsVariant(), AType);
    else return false;
    return true;
  } catch (const Exception&) {  // of a content that doesn't convert
    return false;
  }
}

UnicodeString TValue::ToString() const {
  if (IsEmpty()) return u"(empty)";
  if (FType->Kind == tkEnumeration) return GetEnumName(FType, static_cast<Integer>(AsOrdinal()));
  if (FType->Kind == tkSet) return SetToString(FType, static_cast<Integer>(AsOrdinal()), true);
  if (FType->Kind == tkClass) return AsObject()->ToString();
  if (FType == TypeInfo<TDate>()) return DateToStr(static_cast<double>(AsExtended()));
  if (FType == TypeInfo<TTime>()) return TimeToStr(static_cast<double>(AsExtended()));
  if (FType == TypeInfo<Extended>()) return FloatToStr(AsExtended());
  if (FamilyOf(FType) != TFamily::None) return VarToStr(AsVariant());
  if (FType->Kind == tkVariant)
    if (const TValue Content = FromVariant(AsVariant()); Content.GetTypeKind() != tkVariant) return Content.ToString();
  return u"(" + FType->Name + u")";
}

}  // namespace zq
