#pragma once

#include <cstring>
#include <functional>
#include <string>
#include <string_view>
#include <utility>

#include "runtime/core/api.h"
#include "runtime/core/types.h"

namespace zq {

/// The default string: UTF-16 as a value. May hold any code unit; characters are counted from 1.
///
/// u"" literals and views convert to it and it converts to a view; text of another width comes in and goes out by name.
class ZQ_API UnicodeString {
 public:
  using value_type = char16_t;

  UnicodeString() noexcept = default;
  UnicodeString(const char16_t* AText) : FText(AText == nullptr ? u"" : AText) {}
  UnicodeString(std::u16string_view AText) : FText(AText) {}
  UnicodeString(std::u16string&& AText) noexcept : FText(std::move(AText)) {}
  UnicodeString(const std::u16string& AText) : FText(AText) {}
  UnicodeString(const char16_t* AText, std::size_t ALength) : FText(AText, ALength) {}
  /// ACount times AChar.
  UnicodeString(std::size_t ACount, char16_t AChar) : FText(ACount, AChar) {}
  explicit UnicodeString(char16_t AChar) : FText(1, AChar) {}

  /// Decodes UTF-8; what is no UTF-8 becomes U+FFFD.
  [[nodiscard]] static UnicodeString FromUTF8(std::string_view AText);
  [[nodiscard]] static UnicodeString FromUTF8(std::u8string_view AText);
  /// The text in UTF-8; a surrogate without its partner becomes U+FFFD.
  [[nodiscard]] std::string ToUTF8() const;

  /// In code units.
  [[nodiscard]] Integer Length() const noexcept { return static_cast<Integer>(FText.size()); }
  [[nodiscard]] bool IsEmpty() const noexcept { return FText.empty(); }
  void SetLength(Integer ALength) { FText.resize(ALength < 0 ? 0U : static_cast<std::size_t>(ALength)); }
  /// AIndex from 1 to Length; not checked.
  [[nodiscard]] char16_t operator[](Integer AIndex) const noexcept {
    return FText[static_cast<std::size_t>(AIndex - 1)];
  }
  [[nodiscard]] char16_t& operator[](Integer AIndex) noexcept ZQ_LIFETIMEBOUND {
    return FText[static_cast<std::size_t>(AIndex - 1)];
  }
  /// ACount characters from AIndex on, clipped at the end; empty for a count of 0 or less.
  [[nodiscard]] UnicodeString Copy(Integer AIndex, Integer ACount) const;
  /// Place of the first ASub, from 1; 0 if absent. An empty ASub is nowhere.
  [[nodiscard]] Integer Pos(std::u16string_view ASub) const noexcept;

  [[nodiscard]] const char16_t* c_str() const noexcept ZQ_LIFETIMEBOUND { return FText.c_str(); }
  [[nodiscard]] const char16_t* data() const noexcept ZQ_LIFETIMEBOUND { return FText.data(); }
  [[nodiscard]] char16_t* data() noexcept ZQ_LIFETIMEBOUND { return FText.data(); }
  [[nodiscard]] std::size_t size() const noexcept { return FText.size(); }
  [[nodiscard]] std::u16string_view View() const noexcept ZQ_LIFETIMEBOUND { return FText; }
  /// The string inside, for code that works on it with the standard library.
  [[nodiscard]] std::u16string& Str() noexcept ZQ_LIFETIMEBOUND { return FText; }
  [[nodiscard]] const std::u16string& Str() const noexcept ZQ_LIFETIMEBOUND { return FText; }
  operator std::u16string_view() const noexcept ZQ_LIFETIMEBOUND { return FText; }
  [[nodiscard]] auto begin() const noexcept ZQ_LIFETIMEBOUND { return FText.begin(); }
  [[nodiscard]] auto end() const noexcept ZQ_LIFETIMEBOUND { return FText.end(); }
  [[nodiscard]] auto begin() noexcept ZQ_LIFETIMEBOUND { return FText.begin(); }
  [[nodiscard]] auto end() noexcept ZQ_LIFETIMEBOUND { return FText.end(); }

  UnicodeString& operator+=(const UnicodeString& AText) { return Append(AText.FText); }
  UnicodeString& operator+=(std::u16string_view AText) { return Append(AText); }
  UnicodeString& operator+=(const std::u16string& AText) { return Append(AText); }
  UnicodeString& operator+=(const char16_t* AText) { return Append(AText); }
  UnicodeString& operator+=(char16_t AChar) {
    FText += AChar;
    return *this;
  }
  template <class T>
    requires(std::is_arithmetic_v<T> && !std::same_as<T, char16_t>)
  UnicodeString& operator+=(T) = delete;  // a number or a byte is no character
  UnicodeString& Append(std::u16string_view AText) {
    FText += AText;
    return *this;
  }

  friend UnicodeString operator+(UnicodeString A, const UnicodeString& B) { return std::move(A += B); }
  friend UnicodeString operator+(UnicodeString A, std::u16string_view B) { return std::move(A += B); }
  friend UnicodeString operator+(UnicodeString A, const std::u16string& B) { return std::move(A += B); }
  friend UnicodeString operator+(UnicodeString A, const char16_t* B) { return std::move(A += B); }
  template <class T>
    requires(std::is_arithmetic_v<T> && !std::same_as<T, char16_t>)
  friend UnicodeString operator+(const UnicodeString& A, T B) = delete;
  friend UnicodeString operator+(UnicodeString A, char16_t B) { return std::move(A += B); }
  friend UnicodeString operator+(std::u16string_view A, const UnicodeString& B) { return UnicodeString(A) += B; }
  friend UnicodeString operator+(const std::u16string& A, const UnicodeString& B) { return UnicodeString(A) += B; }
  friend UnicodeString operator+(const char16_t* A, const UnicodeString& B) { return UnicodeString(A) += B; }
  friend UnicodeString operator+(char16_t A, const UnicodeString& B) { return UnicodeString(A) += B; }

  // Plain equality and order: by code unit.
  friend bool operator==(const UnicodeString& A, const UnicodeString& B) noexcept { return A.FText == B.FText; }
  friend bool operator==(const UnicodeString& A, std::u16string_view B) noexcept { return A.FText == B; }
  friend bool operator==(const UnicodeString& A, const char16_t* B) noexcept { return A.FText == B; }
  friend bool operator==(const UnicodeString& A, const std::u16string& B) noexcept { return A.FText == B; }
  friend auto operator<=>(const UnicodeString& A, const UnicodeString& B) noexcept { return A.FText <=> B.FText; }
  friend auto operator<=>(const UnicodeString& A, std::u16string_view B) noexcept { return A.View() <=> B; }
  friend auto operator<=>(const UnicodeString& A, const char16_t* B) noexcept { return A.FText <=> B; }

 private:
  std::u16string FText;
};

/// String of COM: its own type over the same content.
class ZQ_API WideString : public UnicodeString {
 public:
  using UnicodeString::UnicodeString;
  WideString() noexcept = default;
  WideString(UnicodeString AText) noexcept : UnicodeString(std::move(AText)) {}
};

/// Bytes with the number of their code page; 0 is the process's ANSI code page. Equality compares bytes.
class ZQ_API RawByteString {
 public:
  RawByteString() noexcept = default;
  explicit RawByteString(std::string ABytes, Word ACodePage = 0) noexcept
      : FBytes(std::move(ABytes)), FCodePage(ACodePage) {}

  [[nodiscard]] Word CodePage() const noexcept { return FCodePage; }
  [[nodiscard]] Integer Length() const noexcept { return static_cast<Integer>(FBytes.size()); }
  [[nodiscard]] bool IsEmpty() const noexcept { return FBytes.empty(); }
  void SetLength(Integer ALength) { FBytes.resize(ALength < 0 ? 0U : static_cast<std::size_t>(ALength)); }
  /// AIndex from 1 to Length; not checked.
  [[nodiscard]] char operator[](Integer AIndex) const noexcept { return FBytes[static_cast<std::size_t>(AIndex - 1)]; }
  [[nodiscard]] char& operator[](Integer AIndex) noexcept ZQ_LIFETIMEBOUND {
    return FBytes[static_cast<std::size_t>(AIndex - 1)];
  }
  [[nodiscard]] const char* c_str() const noexcept ZQ_LIFETIMEBOUND { return FBytes.c_str(); }
  [[nodiscard]] const char* data() const noexcept ZQ_LIFETIMEBOUND { return FBytes.data(); }
  [[nodiscard]] char* data() noexcept ZQ_LIFETIMEBOUND { return FBytes.data(); }
  [[nodiscard]] std::size_t size() const noexcept { return FBytes.size(); }
  [[nodiscard]] std::string_view View() const noexcept ZQ_LIFETIMEBOUND { return FBytes; }
  [[nodiscard]] std::string& Str() noexcept ZQ_LIFETIMEBOUND { return FBytes; }
  [[nodiscard]] const std::string& Str() const noexcept ZQ_LIFETIMEBOUND { return FBytes; }
  operator std::string_view() const noexcept ZQ_LIFETIMEBOUND { return FBytes; }
  [[nodiscard]] auto begin() const noexcept ZQ_LIFETIMEBOUND { return FBytes.begin(); }
  [[nodiscard]] auto end() const noexcept ZQ_LIFETIMEBOUND { return FBytes.end(); }

  friend bool operator==(const RawByteString& A, const RawByteString& B) noexcept { return A.FBytes == B.FBytes; }
  friend bool operator==(const RawByteString& A, std::string_view B) noexcept { return A.FBytes == B; }
  friend bool operator==(const RawByteString& A, const char* B) noexcept { return A.FBytes == B; }
  friend auto operator<=>(const RawByteString& A, const RawByteString& B) noexcept { return A.FBytes <=> B.FBytes; }

 protected:
  // The tag without a conversion: SetCodePage of the text folder is the public way.
  void Tag(Word ACodePage) noexcept { FCodePage = ACodePage; }
  friend ZQ_API void TagCodePage(RawByteString& AString, Word ACodePage) noexcept;

 private:
  std::string FBytes;
  Word FCodePage = 0;
};

/// Names AString's code page without touching its bytes.
ZQ_API void TagCodePage(RawByteString& AString, Word ACodePage) noexcept;

/// Bytes in the process's ANSI code page.
class ZQ_API AnsiString : public RawByteString {
 public:
  AnsiString() noexcept = default;
  AnsiString(const char* AText) : RawByteString(AText == nullptr ? "" : AText) {}
  AnsiString(std::string_view AText) : RawByteString(std::string(AText)) {}
  AnsiString(std::string AText) noexcept : RawByteString(std::move(AText)) {}
  /// The bytes as they are, whatever their tag.
  explicit AnsiString(const RawByteString& ABytes) : RawByteString(ABytes.Str()) {}

  AnsiString& operator+=(std::string_view AText) {
    Str() += AText;
    return *this;
  }
  friend AnsiString operator+(AnsiString A, std::string_view B) { return std::move(A += B); }
  // Bytes that may be in another code page.
  template <class T>
    requires(std::derived_from<T, RawByteString> && !std::derived_from<T, AnsiString>)
  AnsiString& operator+=(const T& AText) = delete;
  template <class T>
    requires(std::derived_from<T, RawByteString> && !std::derived_from<T, AnsiString>)
  friend AnsiString operator+(AnsiString A, const T& B) = delete;
};

/// Bytes in UTF-8.
class ZQ_API UTF8String : public RawByteString {
 public:
  UTF8String() noexcept : RawByteString({}, 65001) {}
  UTF8String(const char* AText) : RawByteString(AText == nullptr ? "" : AText, 65001) {}
  UTF8String(std::string_view AText) : RawByteString(std::string(AText), 65001) {}
  UTF8String(std::string AText) noexcept : RawByteString(std::move(AText), 65001) {}
  UTF8String(const RawByteString& ABytes) = delete;  // they may be in another code page
};

/// At most 255 one-byte characters, inline; what is longer is cut. Carries class names.
class ShortString {
 public:
  constexpr ShortString() noexcept = default;
  constexpr ShortString(const char* AText) noexcept : ShortString(std::string_view(AText)) {}
  constexpr ShortString(std::string_view AText) noexcept
      : FLength(static_cast<unsigned char>(AText.size() < 255 ? AText.size() : 255)) {
    for (std::size_t i = 0; i < FLength; ++i) FText[i] = AText[i];
  }
  [[nodiscard]] constexpr std::string_view View() const noexcept ZQ_LIFETIMEBOUND { return {FText, FLength}; }
  [[nodiscard]] constexpr Integer Length() const noexcept { return FLength; }
  [[nodiscard]] UnicodeString ToString() const { return UnicodeString::FromUTF8(View()); }
  friend constexpr bool operator==(const ShortString& A, const ShortString& B) noexcept { return A.View() == B.View(); }

 private:
  unsigned char FLength = 0;
  char FText[255] = {};
};

/// A text for the length of a call, in whatever form the caller has it: wide, UTF-8 bytes, or a path of the standard
/// library, whose bytes travel as those of file names do. It is converted only where In is called, and a UnicodeString
/// is never copied. Bytes of another code page and texts of other widths don't convert.
class ZQ_API TText {
 public:
  TText(const UnicodeString& AText ZQ_LIFETIMEBOUND) noexcept : FData(&AText), FForm(Whole) {}
  TText(std::u16string_view AText ZQ_LIFETIMEBOUND) noexcept : TText(AText.data(), AText.size(), Wide) {}
  TText(const std::u16string& AText ZQ_LIFETIMEBOUND) noexcept : TText(AText.data(), AText.size(), Wide) {}
  TText(const char16_t* AText ZQ_LIFETIMEBOUND) noexcept : TText(std::u16string_view(AText == nullptr ? u"" : AText)) {}
  TText(std::string_view AText ZQ_LIFETIMEBOUND) noexcept : TText(AText.data(), AText.size(), Utf8) {}
  TText(const std::string& AText ZQ_LIFETIMEBOUND) noexcept : TText(AText.data(), AText.size(), Utf8) {}
  TText(const ShortString& AText ZQ_LIFETIMEBOUND) noexcept : TText(AText.View()) {}
  TText(const char* AText ZQ_LIFETIMEBOUND) noexcept : TText(std::string_view(AText == nullptr ? "" : AText)) {}
  TText(const UTF8String& AText ZQ_LIFETIMEBOUND) noexcept : TText(AText.View()) {}
  TText(std::u8string_view AText ZQ_LIFETIMEBOUND) noexcept : TText(AText.data(), AText.size(), Utf8) {}
  TText(const char8_t* AText ZQ_LIFETIMEBOUND) noexcept : TText(std::u8string_view(AText == nullptr ? u8"" : AText)) {}
  template <class T>
    requires requires(const T& APath) {
      { APath.native() } -> std::same_as<const std::string&>;
      APath.root_path();
    }
  TText(const T& APath ZQ_LIFETIMEBOUND) noexcept : TText(APath.native().data(), APath.native().size(), Path) {}
  TText(const RawByteString& AText) = delete;
  TText(const wchar_t* AText) = delete;
  TText(const char32_t* AText) = delete;
  TText(std::nullptr_t) = delete;

  /// The text itself, in ARoom where it has to be made.
  [[nodiscard]] const UnicodeString& In(UnicodeString& ARoom ZQ_LIFETIMEBOUND) const ZQ_LIFETIMEBOUND {
    return IsWhole() ? AsWhole() : Make(ARoom);
  }
  /// A UnicodeString of the caller's, which AsWhole returns.
  [[nodiscard]] bool IsWhole() const noexcept { return FForm == Whole; }
  [[nodiscard]] const UnicodeString& AsWhole() const noexcept { return *static_cast<const UnicodeString*>(FData); }
  [[nodiscard]] UnicodeString ToString() const {
    UnicodeString Room;
    return In(Room);
  }

 private:
  enum TForm : std::uint8_t { Whole, Wide, Utf8, Path };
  TText(const void* AData, std::size_t ASize, TForm AForm) noexcept : FData(AData), FSize(ASize), FForm(AForm) {}
  const UnicodeString& Make(UnicodeString& ARoom) const;

  const void* FData;
  std::size_t FSize = 0;
  TForm FForm;
};

[[nodiscard]] inline UnicodeString FromUTF8(std::string_view AText) { return UnicodeString::FromUTF8(AText); }
[[nodiscard]] inline std::string ToUTF8(const UnicodeString& AText) { return AText.ToUTF8(); }
[[nodiscard]] ZQ_API UTF8String UTF8Encode(const UnicodeString& AText);

[[nodiscard]] inline Integer Length(const UnicodeString& AText) noexcept { return AText.Length(); }
/// ACount characters from AIndex on, clipped at the end; an index below 1 counts as 1.
[[nodiscard]] ZQ_API UnicodeString Copy(const UnicodeString& AText, Integer AIndex, Integer ACount);
[[nodiscard]] ZQ_API AnsiString Copy(const AnsiString& AText, Integer AIndex, Integer ACount);
[[nodiscard]] ZQ_API Integer Pos(std::u16string_view ASub, std::u16string_view AText) noexcept;
/// Without the characters up to U+0020 at both ends.
[[nodiscard]] ZQ_API UnicodeString Trim(const UnicodeString& AText);
/// These four touch and compare the ASCII letters only.
[[nodiscard]] ZQ_API UnicodeString LowerCase(UnicodeString AText);
[[nodiscard]] ZQ_API UnicodeString UpperCase(UnicodeString AText);
[[nodiscard]] ZQ_API bool SameText(std::u16string_view A, std::u16string_view B) noexcept;
[[nodiscard]] ZQ_API Integer CompareText(std::u16string_view A, std::u16string_view B) noexcept;
[[nodiscard]] inline UnicodeString StringOfChar(Char AChar, Integer ACount) {
  return {static_cast<std::size_t>(ACount < 0 ? 0 : ACount), AChar};
}

enum class TReplaceFlag : std::uint8_t { rfReplaceAll, rfIgnoreCase };
using enum TReplaceFlag;
using TReplaceFlags = TSet<TReplaceFlag>;
/// AText with the first AOld, or with every one, replaced. An empty AOld changes nothing. rfIgnoreCase goes by ASCII.
[[nodiscard]] ZQ_API UnicodeString StringReplace(
    const UnicodeString& AText, const UnicodeString& AOld, const UnicodeString& ANew, TReplaceFlags AFlags);
[[nodiscard]] constexpr bool CharInSet(WideChar AChar, const TSet<AnsiChar>& ASet) noexcept {
  return AChar < 256 && ASet.Contains(static_cast<AnsiChar>(AChar));
}

/// A message with the id it bears among the library's resources; 0 where it has none.
struct TResStringRec {
  Word Id;
  const char16_t* Text;
};
[[nodiscard]] inline UnicodeString LoadResString(const TResStringRec& ARecord) { return ARecord.Text; }

}  // namespace zq

template <>
struct std::hash<zq::UnicodeString> {
  std::size_t operator()(const zq::UnicodeString& AText) const noexcept {
    return std::hash<std::u16string_view>()(AText);
  }
};
