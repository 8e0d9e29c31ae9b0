#pragma once

#include <memory>

#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

namespace zq {

/// Reasons that a refused conversion leaves in GetLastError.
inline constexpr Cardinal ERROR_INVALID_PARAMETER = 87;
inline constexpr Cardinal ERROR_INSUFFICIENT_BUFFER = 122;
inline constexpr Cardinal ERROR_INVALID_FLAGS = 1004;
inline constexpr Cardinal ERROR_NO_UNICODE_TRANSLATION = 1113;

inline constexpr Cardinal MB_ERR_INVALID_CHARS = 0x08;
inline constexpr Cardinal WC_DISCARDNS = 0x10;
inline constexpr Cardinal WC_SEPCHARS = 0x20;
inline constexpr Cardinal WC_DEFAULTCHAR = 0x40;
inline constexpr Cardinal WC_ERR_INVALID_CHARS = 0x80;
inline constexpr Cardinal WC_COMPOSITECHECK = 0x200;
inline constexpr Cardinal WC_NO_BEST_FIT_CHARS = 0x400;

// The services below take source lengths in bytes or UTF-16 units. A length of -1 means up to and with the terminator.
// With a destination's size of 0 they return the size needed, otherwise what they wrote; nothing is written behind that
// size. 0 is failure, with the reason in GetLastError: ERROR_INVALID_PARAMETER also for a code
// page without character data, ERROR_INVALID_FLAGS for unknown flags and, on the pages that take none (UTF-7, the
// ISO-2022 family, ISCII), for any. They run on any thread.

/// Text of ABytes bytes in ACodePage. What is malformed or unassigned becomes U+FFFD, or fails under
/// MB_ERR_INVALID_CHARS with ERROR_NO_UNICODE_TRANSLATION. 1200, 1201, 12000 and 12001 are served too; a byte order
/// mark is a character like any other.
ZQ_API int MultiByteToWideChar(
    Word ACodePage, Cardinal AFlags, const char* ASource, int ABytes, char16_t* ADest, int ADestChars);
/// Bytes of AChars units in ACodePage. What the page doesn't have becomes a similar character, unless
/// WC_NO_BEST_FIT_CHARS, or else "?" (U+FFFD in a Unicode page). Under WC_COMPOSITECHECK a letter followed by a
/// combining mark goes as one character where the page has that; WC_ERR_INVALID_CHARS fails on lone surrogates in
/// 65001 and 54936. The other flags change nothing.
ZQ_API int WideCharToMultiByte(
    Word ACodePage, Cardinal AFlags, const char16_t* ASource, int AChars, char* ADest, int ADestBytes);
/// WideCharToMultiByte with the bytes ADefaultChar, zero-terminated, in place of "?"; an empty one stands for a single
/// byte 0. AUsedDefault may be null.
ZQ_API int LocaleCharsFromUnicode(Word ACodePage, Cardinal AFlags, const char16_t* ASource, int AChars, char* ADest,
    int ADestBytes, const char* ADefaultChar, bool* AUsedDefault);
/// AForm: 1 C, 2 D, 5 KC, 6 KD. The size that it returns without a destination is exact.
ZQ_API int NormalizeString(int AForm, const char16_t* ASource, int AChars, char16_t* ADest, int ADestChars);

/// The process's ANSI code page, which 0 stands for everywhere: that of the environment's locale at the first use,
/// 65001 where it names none, and what a TAnsiCodePageScope says while one lives.
[[nodiscard]] ZQ_API Word GetACP() noexcept;

[[nodiscard]] inline Word ActualCodePage(Word ACodePage) noexcept { return ACodePage == 0 ? GetACP() : ACodePage; }

/// The code page of a charset that the system names; 65001 for ASCII and for one without character data.
[[nodiscard]] ZQ_API Word CodePageOfCharset(const char* ACharset) noexcept;

/// Sets the process's ANSI code page, for all threads, until the end of its scope. Scopes nest.
class ZQ_API TAnsiCodePageScope {
 public:
  [[nodiscard]] explicit TAnsiCodePageScope(Word ACodePage) noexcept;
  TAnsiCodePageScope(const TAnsiCodePageScope&) = delete;
  TAnsiCodePageScope& operator=(const TAnsiCodePageScope&) = delete;
  ~TAnsiCodePageScope();

 private:
  Word FSaved;
};

/// Names AString's code page; with AConvert its bytes are converted first, which raises EOSError on failure,
/// or EEncodingError where 2 GiB aren't enough for the text.
ZQ_API void SetCodePage(RawByteString& AString, Word ACodePage, bool AConvert = true);

/// Text encoding of one code page. Conversions replace what they can't convert; they raise EEncodingError only where
/// there is no character data for the page, or 2 GiB aren't enough for the text. Any thread.
class ZQ_API TEncoding : public TObject {
 public:
  explicit TEncoding(Word ACodePage) noexcept : FCodePage(ACodePage) {}
  ~TEncoding() override = default;

  /// Those of the process, never freed. ANSI and Default follow the ANSI code page.
  [[nodiscard]] static const TEncoding& UTF8();
  [[nodiscard]] static const TEncoding& UTF7();
  [[nodiscard]] static const TEncoding& Unicode();
  [[nodiscard]] static const TEncoding& BigEndianUnicode();
  [[nodiscard]] static const TEncoding& ANSI();
  [[nodiscard]] static const TEncoding& ASCII();
  [[nodiscard]] static const TEncoding& Default() { return ANSI(); }
  /// A new one; raises EEncodingError for a page without character data.
  [[nodiscard]] static std::unique_ptr<TEncoding> GetEncoding(Word ACodePage);

  [[nodiscard]] std::unique_ptr<TEncoding> Clone() const { return std::make_unique<TEncoding>(FCodePage); }
  [[nodiscard]] Word GetCodePage() const noexcept { return ActualCodePage(FCodePage); }
  /// Number and name: "1252 (windows-1252)".
  [[nodiscard]] UnicodeString GetEncodingName() const;
  /// The preferred MIME name, else the registered one, else "cp" and the number.
  [[nodiscard]] UnicodeString GetMIMEName() const;
  /// The byte order mark, empty where the page has none.
  [[nodiscard]] TBytes GetPreamble() const;

  [[nodiscard]] TBytes GetBytes(const UnicodeString& AText) const;
  [[nodiscard]] UnicodeString GetString(const TBytes& ABytes) const;
  [[nodiscard]] UnicodeString GetString(const void* ABytes, std::size_t ACount) const;

 private:
  Word FCodePage;  // 0: the ANSI code page of the moment
};

}  // namespace zq
