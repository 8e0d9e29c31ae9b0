#pragma once

#include <concepts>
#include <exception>
#include <initializer_list>
#include <string>
#include <string_view>
#include <type_traits>
#include <typeinfo>

#include "runtime/core/objects.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

namespace zq {

class Variant;

struct TVarRec;

namespace detail {

template <class T>
concept TPathLike = requires(const T& AValue) {
  { AValue.native() } -> std::same_as<const std::string&>;
  AValue.root_path();
};
template <class T>
concept TOptionalLike = requires(const T& AValue) {
  { AValue.has_value() } -> std::same_as<bool>;
  AValue.value();
};
template <class T>
concept TErrorCodeLike = requires(const T& AValue) {
  { AValue.message() } -> std::convertible_to<std::string>;
  AValue.category();
};
template <class T>
concept TDurationLike = requires(const T& AValue) {
  AValue.count();
  T::period::num;
};
// Of a clock that tells the time of day.
template <class T>
concept TMomentLike = requires(const T& AValue) {
  AValue.time_since_epoch();
  T::clock::to_time_t(AValue);
};
template <class T>
concept TRangeLike = requires(const T& AValue) {
  AValue.begin() != AValue.end();
  *AValue.begin();
}
&&!std::convertible_to<const T&, std::string_view> && !std::convertible_to<const T&, std::u16string_view> &&
    !std::convertible_to<const T&, std::u8string_view> && !TPathLike<T>;
template <class T>
concept TToldByText = TErrorCodeLike<T> || TDurationLike<T> || TMomentLike<T> || TRangeLike<T>;

template <class T>
UnicodeString TextOfOther(const void* AValue);

/// The name of an enumeration's value, its number where nobody has described it.
[[nodiscard]] UnicodeString EnumText(const std::type_info& AType, Int64 AOrdinal);
/// A moment by the local clock, "yyyy-mm-dd hh:mm:ss:zzz".
[[nodiscard]] ZQ_API UnicodeString MomentText(Int64 AUtcMilliseconds);
[[nodiscard]] ZQ_API UnicodeString ExceptionText(const void* AExceptionPtr);

}  // namespace detail

/// One tagged value of a variable argument list. Text and variants are looked at, not copied: a record lives no longer
/// than the call that it is made for.
struct TVarRec {
  enum TKind : std::uint8_t {
    vtInteger,
    vtUInt64,
    vtBoolean,
    vtExtended,
    vtWideChar,
    vtAnsiChar,
    vtPointer,
    vtWideText,
    vtAnsiText,
    vtObject,
    vtClass,
    vtOther
  };

  /// A value of a type that this floor doesn't know, with the way to its text, which may raise.
  struct TOther {
    const void* Value;
    UnicodeString (*ToText)(const void* AValue);
  };
  static constexpr Word cUTF8 = 65001;

  template <std::signed_integral T>
    requires(!std::same_as<T, char>)
  TVarRec(T AValue)
  noexcept : Kind(vtInteger), Width(sizeof(T)), VInteger(AValue) {}
  template <std::unsigned_integral T>
    requires(!std::same_as<T, bool> && !std::same_as<T, char16_t>)
  TVarRec(T AValue)
  noexcept : Kind(vtUInt64), VUInt64(AValue) {}
  /// By number, and for "%s" by the name that it is described with.
  template <class T>
    requires std::is_enum_v<T> TVarRec(T AValue)
  noexcept : Kind(vtInteger), Width(sizeof(T)), Enum(&typeid(T)), VInteger(static_cast<Int64>(AValue)) {}
  template <std::same_as<bool> T>
  TVarRec(T AValue) noexcept : Kind(vtBoolean), VBoolean(AValue) {}
  template <std::floating_point T>
  TVarRec(T AValue) noexcept : Kind(vtExtended), VExtended(AValue) {}
  template <class T>
    requires(std::same_as<T, TDateTime> || std::same_as<T, TDate> || std::same_as<T, TTime>)
  TVarRec(T AValue)
  noexcept : Kind(vtExtended), VExtended(AValue.Value) {}
  TVarRec(char16_t AValue) noexcept : Kind(vtWideChar), VWideChar(AValue) {}
  TVarRec(char AValue) noexcept : Kind(vtAnsiChar), VAnsiChar(AValue) {}
  TVarRec(const UnicodeString& AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtWideText), VWideText(AValue.View()) {}
  TVarRec(std::u16string_view AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtWideText), VWideText(AValue) {}
  TVarRec(const std::u16string& AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtWideText), VWideText(AValue) {}
  TVarRec(const char16_t* AValue ZQ_LIFETIMEBOUND) noexcept
      : Kind(vtWideText), VWideText(AValue == nullptr ? u"" : AValue) {}
  // Bytes without a code page of their own are in the process's; UTF-8 comes as UTF8String.
  TVarRec(const RawByteString& AValue ZQ_LIFETIMEBOUND) noexcept
      : Kind(vtAnsiText), CodePage(AValue.CodePage()), VAnsiText(AValue.View()) {}
  TVarRec(std::string_view AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtAnsiText), VAnsiText(AValue) {}
  TVarRec(const std::string& AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtAnsiText), VAnsiText(AValue) {}
  TVarRec(const char* AValue ZQ_LIFETIMEBOUND) noexcept
      : Kind(vtAnsiText), VAnsiText(AValue == nullptr ? "" : AValue) {}
  TVarRec(const ShortString& AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtAnsiText), VAnsiText(AValue.View()) {}
  ZQ_API TVarRec(const Variant& AValue ZQ_LIFETIMEBOUND) noexcept;
  TVarRec(const TObject* AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtObject), VObject(AValue) {}
  TVarRec(TClass AValue) noexcept : Kind(vtClass), VClass(AValue) {}
  TVarRec(const void* AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtPointer), VPointer(AValue) {}

  TVarRec(const char8_t* AValue ZQ_LIFETIMEBOUND) noexcept
      : TVarRec(std::u8string_view(AValue == nullptr ? u8"" : AValue)) {}
  TVarRec(std::u8string_view AValue ZQ_LIFETIMEBOUND) noexcept
      : Kind(vtAnsiText), CodePage(cUTF8), VAnsiText(reinterpret_cast<const char*>(AValue.data()), AValue.size()) {}
  TVarRec(const wchar_t* AValue) = delete;
  TVarRec(const char32_t* AValue) = delete;
  /// Its message, also of one that is not of the family.
  template <std::derived_from<std::exception> T>
  TVarRec(const T& AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtAnsiText), CodePage(cUTF8), VAnsiText(AValue.what()) {}
  TVarRec(const std::exception_ptr& AValue ZQ_LIFETIMEBOUND) noexcept
      : Kind(vtOther), VOther{&AValue, &detail::ExceptionText} {}
  template <detail::TPathLike T>
  TVarRec(const T& AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtAnsiText), CodePage(cUTF8), VAnsiText(AValue.native()) {}
  /// What it holds; an empty text where it holds nothing.
  template <detail::TOptionalLike T>
  TVarRec(const T& AValue ZQ_LIFETIMEBOUND) noexcept : TVarRec(AValue.has_value() ? TVarRec(*AValue) : TVarRec(u"")) {}
  /// An error code by its message, a duration with its unit, a moment by the local clock, a range as "[1, 2]".
  template <detail::TToldByText T>
  TVarRec(const T& AValue ZQ_LIFETIMEBOUND) noexcept : Kind(vtOther), VOther{&AValue, &detail::TextOfOther<T>} {}

  TKind Kind;
  Byte Width = 8;                        ///< of VInteger's own type, in bytes
  Word CodePage = 0;                     ///< of VAnsiText
  const std::type_info* Enum = nullptr;  ///< of an enumeration's value
  union {
    Int64 VInteger;
    UInt64 VUInt64;
    bool VBoolean;
    Extended VExtended;
    char16_t VWideChar;
    char VAnsiChar;
    const void* VPointer;
    std::u16string_view VWideText;
    std::string_view VAnsiText;
    const TObject* VObject;
    TClass VClass;
    TOther VOther;
  };
};

/// Arguments of a format text: {1, u"two", 3.0}.
using TVarArgs = std::initializer_list<TVarRec>;

/// The value as "%s" would write it, and a number, a Boolean or an address as text too.
[[nodiscard]] ZQ_API UnicodeString VarRecText(const TVarRec& AValue);

namespace detail {

template <class TPeriod>
constexpr const char16_t* UnitOf() noexcept {
  if constexpr (TPeriod::num == 1)
    return TPeriod::den == 1 ? u" s" : TPeriod::den == 1000 ? u" ms" : TPeriod::den == 1000000 ? u" us" : u" ns";
  else return TPeriod::num == 60 ? u" min" : TPeriod::num == 3600 ? u" h" : TPeriod::num == 86400 ? u" d" : u"";
}

template <class T>
UnicodeString TextOfOther(const void* AValue) {
  const T& Value = *static_cast<const T*>(AValue);
  if constexpr (TErrorCodeLike<T>) return UnicodeString::FromUTF8(std::string_view(Value.message()));
  else if constexpr (TDurationLike<T>) return VarRecText(Value.count()) + UnitOf<typename T::period>();
  else if constexpr (TMomentLike<T>) {
    using TPeriod = typename T::period;
    return MomentText(static_cast<Int64>(
        static_cast<long double>(Value.time_since_epoch().count()) * 1000 * TPeriod::num / TPeriod::den));
  } else {
    UnicodeString Result;
    for (const auto& Item : Value) Result += (Result.IsEmpty() ? u"" : u", ") + VarRecText(Item);
    return u"[" + Result + u"]";
  }
}

}  // namespace detail

}  // namespace zq
