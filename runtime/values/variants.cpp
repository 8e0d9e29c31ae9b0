#include "runtime/values/variants.h"

#include <cmath>
#include <limits>
#include <optional>

#include "runtime/text/datetime.h"
#include "runtime/text/encoding.h"
#include "runtime/text/format_settings.h"
#include "runtime/text/numbers.h"
#include "runtime/values/typeinfo.h"

namespace zq {

namespace detail {

struct TVarArrayData {
  struct TBounds {
    Integer Low;
    Integer High;
    friend bool operator==(const TBounds&, const TBounds&) = default;
  };
  TArray<TBounds> Bounds;  // of each dimension
  TArray<Variant> Items;   // the last index runs fastest
};

struct TVarAccess {
  using TData = Variant::TData;
  static const TData& Data(const Variant& AValue) noexcept { return AValue.FData; }
  static Variant Make(TVarType AType, TData AData) noexcept { return {AType, AData}; }
  static Variant Make(TVarType AType, UnicodeString AText) { return {AType, std::move(AText)}; }
  static Variant Make(TVarType AType, RawByteString ABytes) { return {AType, std::move(ABytes)}; }
  static Variant Make(TVarType AType, const IntfRef<IInterface>& AIntf) noexcept { return {AType, AIntf}; }
};

}  // namespace detail

namespace {

using detail::TVarAccess;
using detail::TVarArrayData;

// Member of the data that is valid.
enum class THolds : Byte { Nothing, Int, Real, Text, Bytes, Intf, Object, Array };

constexpr THolds HoldsOf(TVarType AType) noexcept {
  if ((AType & varArray) != 0) return THolds::Array;
  switch (AType) {
    case varEmpty:
    case varNull: return THolds::Nothing;
    case varSingle:
    case varDouble:
    case varDate: return THolds::Real;
    case varOleStr:
    case varUString: return THolds::Text;
    case varString: return THolds::Bytes;
    case varDispatch:
    case varUnknown: return THolds::Intf;
    case varObject: return THolds::Object;
    default: return THolds::Int;
  }
}
THolds HoldsOf(const Variant& AValue) noexcept { return HoldsOf(AValue.Type()); }

UnicodeString TextOf(const Variant& AValue) {
  const auto& Data = TVarAccess::Data(AValue);
  if (HoldsOf(AValue) == THolds::Text) return *Data.Text;
  return TEncoding(Data.Bytes->CodePage()).GetString(Data.Bytes->data(), Data.Bytes->size());
}

// None where there is no character data for the code page of the bytes.
std::optional<UnicodeString> ReadableText(const Variant& AValue) {
  try {
    if (VarIsStr(AValue)) return TextOf(AValue);
  } catch (const EEncodingError&) {  // the answer is none
  }
  return std::nullopt;
}

UnicodeString Described(const Variant& AValue) {
  const auto Text = ReadableText(AValue);
  return Text ? u"\"" + *Text + u"\"" : u"A variant of type " + IntToStr(AValue.Type());
}
[[noreturn]] void RaiseTypeCast(const Variant& AValue, std::u16string_view AWanted) {
  throw EVariantTypeCast(Described(AValue) + u" can't be read as " + AWanted);
}
[[noreturn]] void RaiseOverflow(const Variant& AValue, std::u16string_view AWanted) {
  throw EVariantOverflow(Described(AValue) + u" doesn't fit " + AWanted);
}

// Extended holds every integer of 64 bits, signed or not: one kind of number serves them all.
static_assert(std::numeric_limits<Extended>::digits >= 64);
constexpr Extended cCurrencyScale = 10000;

std::optional<Extended> NumberIn(const UnicodeString& AText) {
  Int64 Whole = 0;
  if (TryStrToInt64(AText, Whole)) return static_cast<Extended>(Whole);
  Extended Real = 0;
  if (TryStrToFloat(AText, Real)) return Real;
  return std::nullopt;
}

std::optional<Extended> NumberOf(const Variant& AValue) {
  const auto& Data = TVarAccess::Data(AValue);
  switch (HoldsOf(AValue)) {
    case THolds::Real: return static_cast<Extended>(Data.Real);
    case THolds::Text:
    case THolds::Bytes: {
      const auto Text = ReadableText(AValue);
      return Text ? NumberIn(*Text) : std::nullopt;
    }
    case THolds::Int: break;
    default: return std::nullopt;
  }
  if (AValue.Type() == varError) return std::nullopt;
  if (AValue.Type() == varUInt64) return static_cast<Extended>(static_cast<UInt64>(Data.Int));
  return static_cast<Extended>(Data.Int) / (AValue.Type() == varCurrency ? cCurrencyScale : 1);
}

Extended ToNumber(const Variant& AValue, std::u16string_view AWanted) {
  if (VarIsEmpty(AValue)) return 0;
  const auto Number = NumberOf(AValue);
  if (!Number) RaiseTypeCast(AValue, AWanted);
  return *Number;
}

// ANumber rounded, halves to even, if it lies in the range of T.
template <std::integral T>
T ToWhole(const Variant& AValue, Extended ANumber, std::u16string_view AWanted) {
  const Extended Whole = std::rint(ANumber);
  const bool Fits = Whole >= static_cast<Extended>(std::numeric_limits<T>::min()) &&
                    Whole <= static_cast<Extended>(std::numeric_limits<T>::max());
  if (!Fits) RaiseOverflow(AValue, AWanted);
  return static_cast<T>(Whole);
}
bool IsWhole(Extended ANumber) noexcept { return std::rint(ANumber) == ANumber; }

template <std::integral T>
T ToWhole(const Variant& AValue, std::u16string_view AWanted) {
  return ToWhole<T>(AValue, ToNumber(AValue, AWanted), AWanted);
}

}  // namespace

// ---- Variant --------------------------------------------------------------------------------------------------------

Variant::Variant(TVarType AType, const IntfRef<IInterface>& AIntf) noexcept
    : Variant(AType, TData{.Intf = AIntf.Get()}) {
  if (FData.Intf != nullptr) FData.Intf->_AddRef();
}

void Variant::Clone() {
  switch (HoldsOf(FType)) {
    case THolds::Text: FData.Text = new UnicodeString(*FData.Text); break;
    case THolds::Bytes: FData.Bytes = new RawByteString(*FData.Bytes); break;
    case THolds::Array: FData.Array = new TVarArrayData(*FData.Array); break;
    default:
      if (FData.Intf != nullptr) FData.Intf->_AddRef();
  }
}

void Variant::Drop() noexcept {
  switch (HoldsOf(FType)) {
    case THolds::Text: delete FData.Text; break;
    case THolds::Bytes: delete FData.Bytes; break;
    case THolds::Array: delete FData.Array; break;
    default: static_cast<void>(IntfRef<IInterface>::Adopt(FData.Intf));
  }
}

std::partial_ordering operator<=>(const Variant& A, const Variant& B) {
  const auto Equal = [](bool AEqual) {
    return AEqual ? std::partial_ordering::equivalent : std::partial_ordering::unordered;
  };
  const auto& DataA = TVarAccess::Data(A);
  const auto& DataB = TVarAccess::Data(B);
  if (VarIsStr(A) && VarIsStr(B)) {
    const auto TextA = ReadableText(A), TextB = ReadableText(B);
    if (TextA && TextB) return *TextA <=> *TextB;
    return Equal(
        !TextA && !TextB && DataA.Bytes->CodePage() == DataB.Bytes->CodePage() && *DataA.Bytes == *DataB.Bytes);
  }
  if (A.Type() == varError && B.Type() == varError) return Equal(DataA.Int == DataB.Int);
  if (HoldsOf(A) == HoldsOf(B)) switch (HoldsOf(A)) {
      case THolds::Nothing: return Equal(A.Type() == B.Type());
      case THolds::Intf: return Equal(DataA.Intf == DataB.Intf);
      case THolds::Object: return Equal(DataA.Object == DataB.Object);
      case THolds::Array:
        return Equal(DataA.Array->Bounds == DataB.Array->Bounds && DataA.Array->Items == DataB.Array->Items);
      default: break;
    }
  const auto NumberA = NumberOf(A);
  const auto NumberB = NumberOf(B);
  if (!NumberA || !NumberB) return std::partial_ordering::unordered;
  // A fraction in text or of a Currency is the Double nearest to it, where it meets a Double.
  const bool WithReal = HoldsOf(A) == THolds::Real || HoldsOf(B) == THolds::Real;
  if (WithReal && !(IsWhole(*NumberA) && IsWhole(*NumberB)))
    return static_cast<double>(*NumberA) <=> static_cast<double>(*NumberB);
  return *NumberA <=> *NumberB;
}

TVarRec::TVarRec(const Variant& AValue) noexcept
    : Kind(vtOther), VOther{&AValue, [](const void* AVariant) {
                              return VarToUStr(*static_cast<const Variant*>(AVariant));
                            }} {}

Variant Null() noexcept { return TVarAccess::Make(varNull, TVarAccess::TData{.Int = 0}); }

Variant VarAsError(HRESULT ACode) noexcept { return TVarAccess::Make(varError, TVarAccess::TData{.Int = ACode}); }

// ---- Conversions ----------------------------------------------------------------------------------------------------

Integer VarToInteger(const Variant& AValue) { return ToWhole<Integer>(AValue, u"Integer"); }

Int64 VarToInt64(const Variant& AValue) { return ToWhole<Int64>(AValue, u"Int64"); }

UInt64 VarToUInt64(const Variant& AValue) { return ToWhole<UInt64>(AValue, u"UInt64"); }

Extended VarToReal(const Variant& AValue) { return ToNumber(AValue, u"Double"); }

bool VarToBool(const Variant& AValue) {
  if (VarIsStr(AValue)) {
    const UnicodeString Text = TextOf(AValue);
    if (SameText(Text, u"True")) return true;
    if (SameText(Text, u"False")) return false;
  }
  return ToNumber(AValue, u"Boolean") != 0;
}

Currency VarToCurrency(const Variant& AValue) {
  constexpr std::u16string_view cWanted = u"Currency";
  return {ToWhole<Int64>(AValue, ToNumber(AValue, cWanted) * cCurrencyScale, cWanted)};
}

TDateTime VarToDateTime(const Variant& AValue) {
  const auto Number = NumberOf(AValue);  // first: "7" is a day, though it could be the hour of a time
  TDateTime Result;
  if (!Number && VarIsStr(AValue) && TryStrToDateTime(TextOf(AValue), Result, FormatSettings())) return Result;
  return static_cast<double>(Number ? *Number : ToNumber(AValue, u"TDateTime"));
}

UnicodeString VarToUStr(const Variant& AValue) {
  const auto& Data = TVarAccess::Data(AValue);
  if (VarIsStr(AValue)) return TextOf(AValue);
  switch (AValue.Type()) {
    case varEmpty: return {};
    case varBoolean: return BoolToStr(Data.Int != 0, true);
    case varDate: return DateTimeToStr(Data.Real);
    case varDouble: return FloatToStr(Data.Real);
    case varSingle: return FloatToStrF(Data.Real, ffGeneral, std::numeric_limits<Single>::digits10 + 1, 0);
    case varCurrency: return FloatToStrF(VarToReal(AValue), ffGeneral, std::numeric_limits<Extended>::digits10, 0);
    case varUInt64: return IntToStr(static_cast<UInt64>(Data.Int));
    case varError: break;
    default:
      if (HoldsOf(AValue) == THolds::Int) return IntToStr(Data.Int);
  }
  RaiseTypeCast(AValue, u"text");
}

WideString VarToWStr(const Variant& AValue) { return VarToUStr(AValue); }

RawByteString VarToBytes(const Variant& AValue) {
  if (AValue.Type() == varString) return *TVarAccess::Data(AValue).Bytes;
  const TBytes Bytes = TEncoding::ANSI().GetBytes(VarToUStr(AValue));
  return RawByteString(std::string(Bytes.begin(), Bytes.end()));
}

AnsiString VarToLStr(const Variant& AValue) {
  if (AValue.Type() == varString && TVarAccess::Data(AValue).Bytes->CodePage() != 0)
    return AnsiString(VarToBytes(TextOf(AValue)));
  return AnsiString(VarToBytes(AValue));
}

UnicodeString VarToStrDef(const Variant& AValue, const UnicodeString& ADefault) {
  return VarIsNull(AValue) ? ADefault : VarToUStr(AValue);
}

TObject* VarToObject(const Variant& AValue) {
  if (AValue.Type() == varObject) return TVarAccess::Data(AValue).Object;
  if (HoldsOf(AValue) == THolds::Nothing) return nullptr;
  RaiseTypeCast(AValue, u"an object");
}

IntfRef<IInterface> VarToIntf(const Variant& AValue) {
  if (HoldsOf(AValue) == THolds::Intf) return TVarAccess::Data(AValue).Intf;
  if (HoldsOf(AValue) == THolds::Nothing) return nullptr;
  if (AValue.Type() == varObject)
    if (auto Result = Supports<IInterface>(TVarAccess::Data(AValue).Object)) return Result;
  RaiseTypeCast(AValue, u"an interface");
}

Variant VarAsType(const Variant& AValue, TVarType AType) {
  if (AType == AValue.Type()) return AValue;
  switch (AType) {
    case varEmpty: return {};
    case varNull: return Null();
    case varVariant: return AValue;
    case varShortInt: return ToWhole<ShortInt>(AValue, u"ShortInt");
    case varByte: return ToWhole<Byte>(AValue, u"Byte");
    case varSmallint: return ToWhole<SmallInt>(AValue, u"SmallInt");
    case varWord: return ToWhole<Word>(AValue, u"Word");
    case varInteger: return VarToInteger(AValue);
    case varLongWord: return ToWhole<Cardinal>(AValue, u"Cardinal");
    case varInt64: return VarToInt64(AValue);
    case varUInt64: return VarToUInt64(AValue);
    case varSingle: return detail::VarToFloat<Single>(AValue);
    case varDouble: return detail::VarToFloat<Double>(AValue);
    case varCurrency: return VarToCurrency(AValue);
    case varDate: return VarToDateTime(AValue);
    case varBoolean: return VarToBool(AValue);
    case varOleStr: return VarToWStr(AValue);
    case varUString: return VarToUStr(AValue);
    case varString: return VarToLStr(AValue);
    case varObject: return VarToObject(AValue);
    case varDispatch:
    case varUnknown: return TVarAccess::Make(AType, VarToIntf(AValue));
    default: RaiseTypeCast(AValue, u"type " + IntToStr(AType));
  }
}

namespace detail {

Int64 VarToOrdinal(const Variant& AValue, Int64 AMin, Int64 AMax) {
  const Int64 Result = VarToInt64(AValue);
  if (Result < AMin || Result > AMax) RaiseOverflow(AValue, IntToStr(AMin) + u" to " + IntToStr(AMax));
  return Result;
}

template <class T>
T VarToFloat(const Variant& AValue) {
  const Extended Number = VarToReal(AValue);
  if (std::isfinite(Number) && !std::isfinite(static_cast<T>(Number))) RaiseOverflow(AValue, TypeInfo<T>()->Name);
  return static_cast<T>(Number);
}
template Single VarToFloat(const Variant&);
template Double VarToFloat(const Variant&);
template Extended VarToFloat(const Variant&);

char16_t VarToWChar(const Variant& AValue) {
  const UnicodeString Text = VarToUStr(AValue);
  if (Text.Length() != 1) RaiseTypeCast(AValue, u"a character");
  return Text[1];
}

char VarToAChar(const Variant& AValue) {
  const AnsiString Text = VarToLStr(AValue);
  if (Text.Length() != 1) RaiseTypeCast(AValue, u"a character");
  return Text[1];
}

}  // namespace detail

// ---- Arrays ---------------------------------------------------------------------------------------------------------

namespace {

const TVarArrayData& ArrayOf(const Variant& AArray) {
  if (!VarIsArray(AArray)) RaiseTypeCast(AArray, u"an array");
  return *TVarAccess::Data(AArray).Array;
}

const TVarArrayData::TBounds& BoundsOf(const Variant& AArray, Integer ADimension) {
  const auto& Bounds = ArrayOf(AArray).Bounds;
  if (ADimension < 1 || static_cast<std::size_t>(ADimension) > Bounds.size())
    throw EVariantBadIndex(u"The array has no dimension " + IntToStr(ADimension));
  return Bounds[static_cast<std::size_t>(ADimension - 1)];
}

std::size_t CountOf(Integer ALow, Integer AHigh) noexcept {
  return static_cast<std::size_t>(static_cast<Int64>(AHigh) - ALow + 1);
}

std::size_t PlaceOf(const Variant& AArray, std::span<const Integer> AIndices) {
  const auto& Bounds = ArrayOf(AArray).Bounds;
  if (AIndices.size() != Bounds.size()) throw EVariantBadIndex(u"The array needs an index for each dimension");
  std::size_t Result = 0;
  for (std::size_t i = 0; i < Bounds.size(); ++i) {
    if (AIndices[i] < Bounds[i].Low || AIndices[i] > Bounds[i].High)
      throw EVariantBadIndex(u"Index " + IntToStr(AIndices[i]) + u" is out of the array's bounds");
    Result = Result * CountOf(Bounds[i].Low, Bounds[i].High) + CountOf(Bounds[i].Low, AIndices[i]) - 1;
  }
  return Result;
}

}  // namespace

const Variant& Variant::operator[](Integer AIndex) const { return ArrayOf(*this).Items[PlaceOf(*this, {&AIndex, 1})]; }

Variant VarArrayOf(TArray<Variant> AItems) {
  const Integer High = static_cast<Integer>(AItems.size()) - 1;
  auto* const Data = new TVarArrayData{{{0, High}}, std::move(AItems)};
  return TVarAccess::Make(varArray | varVariant, TVarAccess::TData{.Array = Data});
}

Variant VarArrayCreate(std::span<const Integer> ABounds, TVarType AElementType) {
  if (ABounds.empty() || ABounds.size() % 2 != 0) throw EVariantBadIndex(u"A dimension has a low and a high bound");
  if (AElementType == varEmpty || AElementType == varNull) RaiseTypeCast({}, u"elements of a type that holds nothing");
  auto Data = std::make_unique<TVarArrayData>();
  std::size_t Count = 1;
  for (std::size_t i = 0; i < ABounds.size(); i += 2) {
    if (static_cast<Int64>(ABounds[i + 1]) < static_cast<Int64>(ABounds[i]) - 1)
      throw EVariantBadIndex(u"A high bound lies below its low bound");
    Data->Bounds.push_back({ABounds[i], ABounds[i + 1]});
    if (__builtin_mul_overflow(Count, CountOf(ABounds[i], ABounds[i + 1]), &Count) || Count > Data->Items.max_size())
      throw EVariantBadIndex(u"The array would have too many elements");
  }
  Data->Items.assign(Count, VarAsType({}, AElementType));
  return TVarAccess::Make(varArray | AElementType, TVarAccess::TData{.Array = Data.release()});
}

Integer VarArrayDimCount(const Variant& AArray) noexcept {
  return VarIsArray(AArray) ? static_cast<Integer>(TVarAccess::Data(AArray).Array->Bounds.size()) : 0;
}

Integer VarArrayLowBound(const Variant& AArray, Integer ADimension) { return BoundsOf(AArray, ADimension).Low; }

Integer VarArrayHighBound(const Variant& AArray, Integer ADimension) { return BoundsOf(AArray, ADimension).High; }

const Variant& VarArrayGet(const Variant& AArray, std::initializer_list<Integer> AIndices) {
  return ArrayOf(AArray).Items[PlaceOf(AArray, {AIndices.begin(), AIndices.size()})];
}

void VarArrayPut(Variant& AArray, const Variant& AValue, std::initializer_list<Integer> AIndices) {
  const std::size_t Place = PlaceOf(AArray, {AIndices.begin(), AIndices.size()});
  TVarAccess::Data(AArray).Array->Items[Place] = VarAsType(AValue, AArray.Type() & varTypeMask);
}

}  // namespace zq
