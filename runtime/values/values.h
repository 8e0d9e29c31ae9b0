#pragma once

#include <concepts>
#include <cstddef>
#include <new>

#include "runtime/core/exceptions.h"
#include "runtime/values/typeinfo.h"
#include "runtime/values/variants.h"

namespace zq {

/// A value that can't be read as the type that was asked for.
struct ZQ_API EInvalidCast : Exception {
  using Exception::Exception;
};

/// Value of any copyable type with the record of that type; the empty one has none. Copies are deep, of interfaces they
/// count, of objects they point at the same one.
///
/// The AsXxx raise EInvalidCast where the value is no such thing, and read a Variant inside by its content, raising as
/// the VarToXxx do.
class ZQ_API TValue {
 public:
  TValue() noexcept = default;
  TValue(const TValue& AOther);
  TValue(TValue&& AOther) noexcept { TakeFrom(AOther); }
  TValue& operator=(TValue AOther) noexcept {
    Clear();
    TakeFrom(AOther);
    return *this;
  }
  ~TValue() { Clear(); }

  template <class T>
  [[nodiscard]] static TValue From(const T& AValue) {
    return Build(TypeInfo<T>(), [&](void* ADest) { new (ADest) detail::StorageOf<T>(AValue); });
  }
  /// Copies a value of AType out of its storage; from nullptr a zero value of that type.
  [[nodiscard]] static TValue Make(const void* AStorage, PTypeInfo AType);
  static void Make(const void* AStorage, PTypeInfo AType, TValue& ADest) { ADest = Make(AStorage, AType); }
  /// A value of an ordinal or set type, cut to its width. Raises EInvalidCast for any other type.
  template <std::integral T>
  [[nodiscard]] static TValue Make(T AOrdinal, PTypeInfo AType) {
    return FromOrdinal(AType, static_cast<Int64>(AOrdinal));
  }
  template <std::integral T>
  static void Make(T AOrdinal, PTypeInfo AType, TValue& ADest) {
    ADest = FromOrdinal(AType, static_cast<Int64>(AOrdinal));
  }
  [[nodiscard]] static TValue FromOrdinal(PTypeInfo AType, Int64 AOrdinal);
  /// A value of the type that fits AValue's content; empty for Empty and Null, an array stays a Variant.
  [[nodiscard]] static TValue FromVariant(const Variant& AValue);
  /// A value of AType; text is read as the name of an enumeration's value and as a set's text. Raises as VarToXxx do,
  /// EVariantOverflow for an ordinal that an enumeration hasn't got, EInvalidCast for a type that no variant holds.
  [[nodiscard]] static TValue FromVariant(const Variant& AValue, PTypeInfo AType);

  /// True without a type and for a null object or interface.
  [[nodiscard]] bool IsEmpty() const noexcept;
  [[nodiscard]] PTypeInfo GetTypeInfo() const noexcept { return FType; }
  [[nodiscard]] TTypeKind GetTypeKind() const noexcept { return FType == nullptr ? tkUnknown : FType->Kind; }
  /// The storage of the value, valid until the value changes or goes; nullptr without a type.
  [[nodiscard]] const void* GetReferenceToRawData() const noexcept ZQ_LIFETIMEBOUND;

  /// Of integers, characters, enumerations and sets (their lowest 32 elements); of UInt64 the bits.
  [[nodiscard]] Int64 AsOrdinal() const;
  [[nodiscard]] Integer AsInteger() const;
  /// Of integers and enumerations; of UInt64 the bits.
  [[nodiscard]] Int64 AsInt64() const;
  /// Of floats and integers.
  [[nodiscard]] Extended AsExtended() const;
  [[nodiscard]] bool AsBoolean() const;
  /// Of strings and characters.
  [[nodiscard]] UnicodeString AsString() const;
  /// Of all that a Variant can hold; Empty of an empty value.
  [[nodiscard]] Variant AsVariant() const;
  /// nullptr of an empty value.
  [[nodiscard]] TObject* AsObject() const;
  [[nodiscard]] IntfRef<IInterface> AsInterface() const;
  /// The value cast to T; an interface is asked for T.
  template <class T>
  [[nodiscard]] T AsType() const {
    if constexpr (detail::TIntfType<detail::TypeKeyOf<T>>) {
      const IntfRef<IInterface> Held = AsInterface();
      T Result = detail::FromStorage<T>(Held);
      if (Held && !Result) RaiseCast(TypeInfo<T>());
      return Result;
    } else {
      const TValue Cast = this->Cast(TypeInfo<T>());
      return detail::FromStorage<T>(*static_cast<const detail::StorageOf<T>*>(Cast.GetReferenceToRawData()));
    }
  }
  template <class T>
  [[nodiscard]] bool IsType() const {
    TValue Ignored;
    return TryCast(TypeInfo<T>(), Ignored);
  }
  /// To the same type, to another type of integers, of floats, of text or of truth values that can hold the value, from
  /// integers to floats, to a class of the object, to and from Variant.
  [[nodiscard]] TValue Cast(PTypeInfo AType) const;
  [[nodiscard]] bool TryCast(PTypeInfo AType, TValue& AResult) const;
  /// For readers: the value as text by the process's format settings, "(empty)" without a value, and the type's name in
  /// brackets for what has no text.
  [[nodiscard]] UnicodeString ToString() const;

 private:
  friend struct TPropInfo;

  template <class TFill>
  static TValue Build(PTypeInfo AType, TFill AFill) {
    TValue Result;
    void* const Slot = Result.Reserve(AType);
    try {
      AFill(Slot);
    } catch (...) {
      Result.Unreserve(AType);
      throw;
    }
    Result.FType = AType;
    return Result;
  }
  void* Reserve(PTypeInfo AType);
  void Unreserve(PTypeInfo AType) noexcept;
  void* Raw() noexcept { return const_cast<void*>(GetReferenceToRawData()); }
  void TakeFrom(TValue& AOther) noexcept;
  void Clear() noexcept;
  [[noreturn]] void RaiseCast(PTypeInfo AType) const;
  [[noreturn]] void RaiseCast(const UnicodeString& AType) const;

  alignas(std::max_align_t) std::byte FSlot[40];  // the value, or the address of its block where it doesn't fit
  PTypeInfo FType = nullptr;
};

}  // namespace zq
