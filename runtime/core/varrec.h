#pragma once

#include <concepts>
#include <initializer_list>
#include <string>
#include <string_view>
#include <type_traits>

#include "runtime/core/objects.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

namespace zq {

class Variant;

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

  template <std::signed_integral T>
    requires(!std::same_as<T, char>)
  TVarRec(T AValue)
  noexcept : Kind(vtInteger), Width(sizeof(T)), VInteger(AValue) {}
  template <std::unsigned_integral T>
    requires(!std::same_as<T, bool> && !std::same_as<T, char16_t>)
  TVarRec(T AValue)
  noexcept : Kind(vtUInt64), VUInt64(AValue) {}
  template <class T>
    requires std::is_enum_v<T> TVarRec(T AValue)
  noexcept : Kind(vtInteger), Width(sizeof(T)), VInteger(static_cast<Int64>(AValue)) {}
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

  TKind Kind;
  Byte Width = 8;     ///< of VInteger's own type, in bytes
  Word CodePage = 0;  ///< of VAnsiText
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

}  // namespace zq
