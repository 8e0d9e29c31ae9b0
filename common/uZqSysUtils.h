#pragma once

#include <concepts>
#include <initializer_list>
#include <memory>
#include <span>

#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/core/varrec.h"
#include "runtime/io/streams.h"
#include "runtime/text/format.h"
#include "runtime/values/variants.h"

/// Texts, exceptions with codes and small utilities. All but the registry of exception classes may run on any thread.
namespace zq {

class TObjectList;
class TStringList;
class TStrings;

namespace uZqSysUtils {

inline constexpr TResStringRec _SErrorCodeInUse{0, u"ErrorCode %d is already in use by %s!;"};
inline constexpr TResStringRec _SAskToCreateDir{
    65521, u"The directory '%s' does not exist\r\nDo you want to create it?"};
inline constexpr TResStringRec _SFailedToCreateDir{65522, u"The directory '%s' could not be created!"};

/// The registered exception classes in order of registration; null until the first registration and after Stop.
ZQ_API extern TObjectList* ExceptionClassList;

ZQ_API void Start();
ZQ_API void Stop();

}  // namespace uZqSysUtils

// ---- Coded exceptions ----------------------------------------------------------------------------------------------

/// An exception with a code that means something within a group of codes.
class ZQ_API EZqException : public Exception {
 public:
  using Exception::Exception;
  template <std::integral TCode>  // a template, so that a list of arguments in braces is never taken for a code
  EZqException(UnicodeString AMessage, TCode AErrorCode) noexcept
      : Exception(std::move(AMessage)), FErrorCode(static_cast<Integer>(AErrorCode)) {}
  EZqException(const UnicodeString& AFormat, TVarArgs AArgs, Integer AErrorCode)
      : Exception(AFormat, AArgs), FErrorCode(AErrorCode) {}

  [[nodiscard]] Integer ErrorCode() const noexcept { return FErrorCode; }

 private:
  Integer FErrorCode = 0;
};

/// The same for an exception that default handlers keep silent about.
class ZQ_API EZqAbort : public EAbort {
 public:
  using EAbort::EAbort;
  template <std::integral TCode>
  EZqAbort(UnicodeString AMessage, TCode AErrorCode) noexcept
      : EAbort(std::move(AMessage)), FErrorCode(static_cast<Integer>(AErrorCode)) {}
  EZqAbort(const UnicodeString& AFormat, TVarArgs AArgs, Integer AErrorCode)
      : EAbort(AFormat, AArgs), FErrorCode(AErrorCode) {}

  [[nodiscard]] Integer ErrorCode() const noexcept { return FErrorCode; }

 private:
  Integer FErrorCode = 0;
};

/// Class reference of TRoot's descendants, which are made from a message and a code.
template <class TRoot>
class TZqCodedExceptionClass : public ExceptionClass {
 public:
  using ExceptionClass::ExceptionClass;
  TZqCodedExceptionClass() noexcept = default;
  template <std::derived_from<TRoot> E>
  [[nodiscard]] static TZqCodedExceptionClass Of() noexcept {
    return TZqCodedExceptionClass(ExceptionClass::Of<E>());
  }
  /// Made, not raised, with AFormat filled as by Format.
  [[nodiscard]] ExceptionRef CreateFmt(const UnicodeString& AFormat, TVarArgs AArgs, Integer AErrorCode) const {
    return Create(Format(AFormat, AArgs), AErrorCode);
  }

 private:
  explicit TZqCodedExceptionClass(const ExceptionClass& AClass) noexcept : ExceptionClass(AClass) {}
};
using EZqExceptionClass = TZqCodedExceptionClass<EZqException>;
using EZqAbortClass = TZqCodedExceptionClass<EZqAbort>;

// The registry of exception classes has no lock: register at start-up.

/// Names AExceptionClass as the one for that code. Registering the same again does nothing; another class for a code
/// in use raises EAssertionFailed, unless ZqIsDelphiRunning. An empty group meets the code in any group.
ZQ_API void ZqRegisterExceptionClass(
    const UnicodeString& AErrorGroup, Integer AErrorCode, const EZqExceptionClass& AExceptionClass);
ZQ_API void ZqRegisterExceptionClass(
    const UnicodeString& AErrorGroup, Integer AErrorCode, const EZqAbortClass& AExceptionClass);
/// The first class registered for that code; an empty group stands for any. Empty where there is none.
[[nodiscard]] ZQ_API ExceptionClass ZqGetExceptionClass(const UnicodeString& AErrorGroup, Integer AErrorCode);
/// The first class registered under that name in any case. Empty where there is none.
[[nodiscard]] ZQ_API ExceptionClass ZqGetExceptionClassByName(const UnicodeString& AClassName);
/// Whether the development environment is open on the desktop.
[[nodiscard]] ZQ_API Boolean ZqIsDelphiRunning();

// ---- Case and numbering --------------------------------------------------------------------------------------------

enum class TZqCharCase : Byte {
  rcNormal,
  rcUpperCase,
  rcLowerCase,
  rcTitleCase,       ///< first character upper, all others lower
  rcUpperCamelCase,  ///< the first of each word upper, all others lower
  rcLowerCamelCase,  ///< the same, but for the first word
  rcUpperCaseFirstLetter,
  rcLowerCaseFirstLetter
};
using enum TZqCharCase;

/// ADelimiters part the words of the camel cases and stay in the text; other modes don't read them. The narrow form is
/// in the process's ANSI code page.
[[nodiscard]] ZQ_API AnsiString ZqCharCase(
    const AnsiString& AText, TZqCharCase ACase, const AnsiString& ADelimiters = {});
[[nodiscard]] ZQ_API WideString ZqCharCase(
    const WideString& AText, TZqCharCase ACase, const WideString& ADelimiters = {});
/// Adds to the number that AValue ends in and keeps its width: "INV0099" and 1 give "INV0100". The year and "00001" for
/// a blank text. Raises EConvertError where the text ends in no digit or in too large a number.
[[nodiscard]] ZQ_API UnicodeString ZqStringIncrement(const UnicodeString& AValue, Integer AIncrement);

// ---- Lists and tokens ----------------------------------------------------------------------------------------------

/// Texts for the length of a call: a list in braces, a TArray, any contiguous range of UnicodeString.
class TZqStringArgs : public std::span<const UnicodeString> {
 public:
  TZqStringArgs() noexcept = default;
  TZqStringArgs(std::initializer_list<UnicodeString> AItems) noexcept : span(AItems.begin(), AItems.size()) {}
  template <class TRange>
    requires std::convertible_to<const TRange&, std::span<const UnicodeString>> TZqStringArgs(const TRange& AItems)
  noexcept : span(AItems) {}
};

/// Adds the pieces between characters of ADelimiters to AList, empty ones left out, and each such character to
/// ADelimiterList. No ADelimiters means the blank and ASCII's punctuation but "_" and "`". Clears neither list.
ZQ_API void ZqTokenize(const UnicodeString& AText, TStringList* AList, const UnicodeString& ADelimiters = {},
    TStrings* ADelimiterList = nullptr);
/// Adds the pieces between ADelimiter, empty ones too: one more than there are delimiters. Doesn't clear AList.
ZQ_API void ZqStringToList(const UnicodeString& AText, const UnicodeString& ADelimiter, TStringList* AList);
/// The items, each behind ADelimiter, without the first character of the whole: meant for delimiters of one character.
/// Cut at 999999 characters.
[[nodiscard]] ZQ_API UnicodeString ZqListToString(const TStrings* AList, const UnicodeString& ADelimiter);
/// Replaces pair by pair: a later pair meets what an earlier one put in. Asserts that there are as many new texts.
[[nodiscard]] ZQ_API UnicodeString ZqStringReplace(
    const UnicodeString& AText, TZqStringArgs AOld, TZqStringArgs ANew, TReplaceFlags AFlags);

// ---- Trimming, cutting, padding ------------------------------------------------------------------------------------

/// Without the characters up to U+0020 at both ends.
[[nodiscard]] ZQ_API UnicodeString ZqTrim(const UnicodeString& AText);
[[nodiscard]] ZQ_API AnsiString ZqTrim(const AnsiString& AText);
/// The same at one end; of a text of blanks one stays.
[[nodiscard]] ZQ_API UnicodeString ZqTrimLeft(const UnicodeString& AText);
[[nodiscard]] ZQ_API UnicodeString ZqTrimRight(const UnicodeString& AText);
/// Without blanks, control characters and quotes of both kinds at both ends; one character always stays.
[[nodiscard]] ZQ_API UnicodeString ZqStripLiterals(const UnicodeString& AText);
[[nodiscard]] ZQ_API UnicodeString ZqLeft(const UnicodeString& AText, Integer ACount);
[[nodiscard]] ZQ_API UnicodeString ZqRight(const UnicodeString& AText, Integer ACount);
/// Fills up to ALength characters; U+0000 stands for a blank. The fill goes before a number's sign.
[[nodiscard]] ZQ_API UnicodeString ZqPadLeft(const UnicodeString& AText, Integer ALength, WideChar AChar);
[[nodiscard]] ZQ_API UnicodeString ZqPadLeft(Integer AValue, Integer ALength, WideChar AChar);
[[nodiscard]] ZQ_API UnicodeString ZqPadLeft(Int64 AValue, Integer ALength, WideChar AChar);
[[nodiscard]] ZQ_API UnicodeString ZqPadRight(const UnicodeString& AText, Integer ALength, WideChar AChar);
/// By bytes, which may cut a character of several bytes.
[[nodiscard]] ZQ_API AnsiString ZqAnsiCopy(const AnsiString& AText, Integer AIndex, Integer ACount);
[[nodiscard]] ZQ_API AnsiString ZqIntToAnsiStr(Integer AValue);

// ---- Tests and comparisons -----------------------------------------------------------------------------------------

/// Line feed, carriage return, blank and the characters "),;".
[[nodiscard]] ZQ_API Boolean ZqIsNameDelimiter(AnsiChar AChar) noexcept;
[[nodiscard]] ZQ_API Boolean ZqIsNameDelimiter(WideChar AChar) noexcept;
/// A quote of either kind.
[[nodiscard]] ZQ_API Boolean ZqIsLiteral(AnsiChar AChar) noexcept;
[[nodiscard]] ZQ_API Boolean ZqIsLiteral(WideChar AChar) noexcept;
[[nodiscard]] ZQ_API Boolean ZqCharInSet(AnsiChar AChar, const TZqSetOfAnsiChar& ASet) noexcept;
/// False for any code of 256 or above.
[[nodiscard]] ZQ_API Boolean ZqCharInSet(WideChar AChar, const TZqSetOfAnsiChar& ASet) noexcept;
/// By exact comparison.
[[nodiscard]] ZQ_API Boolean ZqStrInSet(const UnicodeString& AText, TZqStringArgs ASet) noexcept;
/// From 1; 0 if there is none.
[[nodiscard]] ZQ_API Integer ZqLastPos(const UnicodeString& AText, WideChar AChar) noexcept;
/// Whether AText, the second argument, contains ASub; the case of ASCII letters doesn't count.
[[nodiscard]] ZQ_API Boolean ZqContainsText(const AnsiString& ASub, const AnsiString& AText);
[[nodiscard]] ZQ_API Boolean ZqContainsText(const WideString& ASub, const WideString& AText);
/// Equal, but for the case of ASCII letters; the last form compares without the blanks at both ends.
[[nodiscard]] ZQ_API Boolean ZqSameText(const UnicodeString& A, const UnicodeString& B) noexcept;
[[nodiscard]] ZQ_API Boolean ZqSameText(const AnsiString& A, const AnsiString& B);
[[nodiscard]] ZQ_API Boolean ZqSameTrimmedText(const UnicodeString& A, const UnicodeString& B);
/// The same type and an equal value.
[[nodiscard]] ZQ_API Boolean ZqSameVar(const Variant& A, const Variant& B);
/// Whether B has A's elements at A's indices; B may have more. False where either can't be read so.
[[nodiscard]] ZQ_API Boolean ZqSameArray(const Variant& A, const Variant& B);
[[nodiscard]] ZQ_API Boolean ZqSameGuid(const TGUID& A, const TGUID& B) noexcept;

/// A if AFlag is set, else B.
[[nodiscard]] constexpr WideChar ZqIf(Boolean AFlag, WideChar A, WideChar B) noexcept { return AFlag ? A : B; }
[[nodiscard]] inline UnicodeString ZqIf(Boolean AFlag, const UnicodeString& A, const UnicodeString& B) {
  return AFlag ? A : B;
}
// Literals would take the way of pointers otherwise, or that of variants.
[[nodiscard]] inline UnicodeString ZqIf(Boolean AFlag, const WideChar* A, const WideChar* B) { return AFlag ? A : B; }
[[nodiscard]] constexpr Integer ZqIf(Boolean AFlag, Integer A, Integer B) noexcept { return AFlag ? A : B; }
[[nodiscard]] constexpr Double ZqIf(Boolean AFlag, Double A, Double B) noexcept { return AFlag ? A : B; }
template <std::same_as<Boolean> T>
[[nodiscard]] constexpr T ZqIf(Boolean AFlag, T A, T B) noexcept {
  return AFlag ? A : B;
}
[[nodiscard]] inline Variant ZqIf(Boolean AFlag, const Variant& A, const Variant& B) { return AFlag ? A : B; }

// ---- Small utilities -----------------------------------------------------------------------------------------------

enum class TZqBitness : Byte { bit32, bit64 };
using enum TZqBitness;

/// AValue with ADigits decimals, 0 to 18, halves away from zero. A value that is the nearest float to a decimal half
/// counts as that half: 1.005 becomes 1.01.
[[nodiscard]] ZQ_API double ZqRound(double AValue, Integer ADigits);
[[nodiscard]] ZQ_API Extended ZqRound(Extended AValue, Integer ADigits);
/// ABit counts from 1, the lowest, to 32.
[[nodiscard]] ZQ_API Boolean ZqIsBitChecked(Integer AValue, Integer ABit) noexcept;
/// What the registry of file types tells for the extension; empty where it knows none.
[[nodiscard]] ZQ_API UnicodeString ZqGetFileMimeType(const UnicodeString& AFile);
/// The resource of this library or else of the host program; null where neither has it.
[[nodiscard]] ZQ_API std::unique_ptr<TResourceStream> ZqFindResource(const UnicodeString& AName, const WideChar* AType);
/// The same, raising Exception where neither has it.
[[nodiscard]] ZQ_API std::unique_ptr<TResourceStream> ZqGetResource(const UnicodeString& AName, const WideChar* AType);
/// The resource as text: its bytes are in code page 0 and go through ACodePage, and what that lacks is "?". Empty where
/// neither has it.
[[nodiscard]] ZQ_API UnicodeString ZqFindResource(const UnicodeString& AName, Word ACodePage, const WideChar* AType);
/// The same, raising Exception also for a resource that is empty.
[[nodiscard]] ZQ_API UnicodeString ZqGetResource(const UnicodeString& AName, Word ACodePage, const WideChar* AType);

/// A whole file as text: its byte order mark tells the encoding, without one it is in code page 0. AMode is that of
/// TFileStream. Raises EFOpenError, and EOSError for bytes that are no text.
[[nodiscard]] ZQ_API UnicodeString ZqLoadStringFromFile(const UnicodeString& AFile, Word AMode);
/// A file with that text in ACodePage, one that exists replaced; with AWriteBOM the mark of ACodePage ahead of it.
/// Raises EFCreateError and EWriteError, and EOSError for a code page without character data.
ZQ_API void ZqSaveString(const UnicodeString& AFile, const WideString& AText, Word ACodePage, Boolean AWriteBOM);
/// ADestCodePage -1: as the bytes come, which are in ASourceCodePage, whatever tag AText bears.
ZQ_API void ZqSaveString(const UnicodeString& AFile, const AnsiString& AText, Word ASourceCodePage,
    Integer ADestCodePage, Boolean AWriteBOM);
/// In UTF-8, with its mark.
ZQ_API void ZqSaveString(const UnicodeString& AFile, const UTF8String& AText);

/// Whether this library is built for 64 bits.
[[nodiscard]] constexpr Boolean IsCPU64() noexcept { return sizeof(void*) == 8; }
/// Whether this is a 32-bit process on a 64-bit system.
[[nodiscard]] ZQ_API Boolean IsWow64();
[[nodiscard]] ZQ_API Boolean IsOS64();
/// Whether the PE file is for another machine than the 32-bit one. A file that doesn't exist under that name is looked
/// for along the search path; one too short for its headers raises EReadError, one that can't be opened EFOpenError.
[[nodiscard]] ZQ_API Boolean Is64BitFile(const UnicodeString& AFile);
/// The account that this process runs under.
[[nodiscard]] ZQ_API UnicodeString ZqGetUserName();
/// And its domain.
[[nodiscard]] ZQ_API UnicodeString ZqGetUserName(UnicodeString& ADomain);
[[nodiscard]] ZQ_API UnicodeString ZqGetComputerName();
/// What an administrator wrote about this computer. Raises Exception where the service refuses, EAssertionFailed where
/// the system has no such service.
[[nodiscard]] ZQ_API UnicodeString ZqGetComputerDescription();
[[nodiscard]] ZQ_API Boolean ZqIsDebuggerPresent();
/// Whole years from that date until now; 0 for a date of 0 or below.
[[nodiscard]] ZQ_API Integer ZqAge(TDateTime ADate);

}  // namespace zq
