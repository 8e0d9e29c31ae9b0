#pragma once

#include <exception>
#include <string>
#include <utility>

#include "runtime/core/objects.h"
#include "runtime/core/strings.h"
#include "runtime/core/varrec.h"

namespace zq {

/// Base of the library's exceptions: thrown by value, caught by reference.
class ZQ_API Exception : public TObject, public std::exception {
 public:
  Exception() = default;
  explicit Exception(UnicodeString AMessage) noexcept : FMessage(std::move(AMessage)) {}
  /// AFormat filled with AArgs as by Format; a format that doesn't fit them raises EConvertError instead.
  Exception(const UnicodeString& AFormat, TVarArgs AArgs);
  explicit Exception(const TResStringRec& AMessage) : FMessage(LoadResString(AMessage)) {}
  Exception(const TResStringRec& AFormat, TVarArgs AArgs) : Exception(LoadResString(AFormat), AArgs) {}
  Exception(const Exception& AOther)
      : std::exception(AOther), FMessage(AOther.FMessage), FHelpContext(AOther.FHelpContext) {}
  Exception& operator=(const Exception&) = delete;
  ~Exception() override = default;

  [[nodiscard]] const UnicodeString& Message() const noexcept { return FMessage; }
  void SetMessage(UnicodeString AMessage);
  [[nodiscard]] Integer HelpContext() const noexcept { return FHelpContext; }
  void SetHelpContext(Integer AValue) noexcept { FHelpContext = AValue; }
  /// The message in UTF-8; valid as long as the exception and its message.
  [[nodiscard]] const char* what() const noexcept override;
  [[nodiscard]] UnicodeString ToString() const override { return FMessage; }

 private:
  UnicodeString FMessage;
  Integer FHelpContext = 0;
  mutable std::string FWhat;  // made by what()
};

/// Kept silent by default handlers.
struct ZQ_API EAbort : Exception {
  using Exception::Exception;
};

struct ZQ_API EConvertError : Exception {
  using Exception::Exception;
};
struct ZQ_API EListError : Exception {
  using Exception::Exception;
};
struct ZQ_API EStringListError : EListError {
  using EListError::EListError;
};
struct ZQ_API EIntfCastError : Exception {
  using Exception::Exception;
};
struct ZQ_API EVariantError : Exception {
  using Exception::Exception;
};
struct ZQ_API EPropertyError : Exception {
  using Exception::Exception;
};
struct ZQ_API EComponentError : Exception {
  using Exception::Exception;
};
struct ZQ_API EInvalidOperation : Exception {
  using Exception::Exception;
};
struct ZQ_API EStreamError : Exception {
  using Exception::Exception;
};
struct ZQ_API EReadError : EStreamError {
  using EStreamError::EStreamError;
};
struct ZQ_API EWriteError : EStreamError {
  using EStreamError::EStreamError;
};
struct ZQ_API EFOpenError : EStreamError {
  using EStreamError::EStreamError;
};
struct ZQ_API EFCreateError : EStreamError {
  using EStreamError::EStreamError;
};
struct ZQ_API EResNotFound : Exception {
  using Exception::Exception;
};
struct ZQ_API ERegistryException : Exception {
  using Exception::Exception;
};
struct ZQ_API EEncodingError : Exception {
  using Exception::Exception;
};

/// A failed step on a text file. ErrorCode is the system's (errno).
class ZQ_API EInOutError : public Exception {
 public:
  EInOutError(UnicodeString AMessage, Integer AErrorCode) noexcept
      : Exception(std::move(AMessage)), FErrorCode(AErrorCode) {}
  [[nodiscard]] Integer ErrorCode() const noexcept { return FErrorCode; }

 private:
  Integer FErrorCode;
};

/// The last error of a system service.
class ZQ_API EOSError : public Exception {
 public:
  EOSError(UnicodeString AMessage, Integer AErrorCode) noexcept
      : Exception(std::move(AMessage)), FErrorCode(AErrorCode) {}
  [[nodiscard]] Integer ErrorCode() const noexcept { return FErrorCode; }

 private:
  Integer FErrorCode;
};

/// Raises EOSError for GetLastError of this thread.
[[noreturn]] ZQ_API void RaiseLastOSError();
/// Reason of the last failed system service on this thread, in the numbers of the services (122: buffer too small,
/// ...).
[[nodiscard]] ZQ_API Cardinal GetLastError() noexcept;
ZQ_API void SetLastError(Cardinal AError) noexcept;

/// A failed assertion. Message is the text followed by " (<unit>, line <n>)".
class ZQ_API EAssertionFailed : public Exception {
 public:
  EAssertionFailed(const UnicodeString& AText, const UnicodeString& AUnit, Integer ALine);
  [[nodiscard]] const UnicodeString& UnitName() const noexcept { return FUnit; }
  [[nodiscard]] Integer Line() const noexcept { return FLine; }

 private:
  UnicodeString FUnit;
  Integer FLine;
};

[[noreturn]] ZQ_API void AssertionFailed(
    const UnicodeString& AText, const char* AFile = __builtin_FILE(), int ALine = __builtin_LINE());
/// Raises EAssertionFailed with AText, the caller's unit and line if ACondition is false; in every build type.
inline void Assert(bool ACondition, const char16_t* AText = u"Assertion failure", const char* AFile = __builtin_FILE(),
    int ALine = __builtin_LINE()) {
  if (!ACondition) [[unlikely]]
    AssertionFailed(AText, AFile, ALine);
}

/// An exception that outlives its handler or changes threads: the same object, counted.
class ZQ_API ExceptionRef {
 public:
  ExceptionRef() noexcept = default;
  explicit ExceptionRef(std::exception_ptr AException) noexcept;
  /// Made, not raised.
  template <std::derived_from<std::exception> E, class... TArgs>
  [[nodiscard]] static ExceptionRef Of(TArgs&&... AArgs) {
    return ExceptionRef(std::make_exception_ptr(E(std::forward<TArgs>(AArgs)...)));
  }
  /// The one that is being handled; empty outside of a handler.
  [[nodiscard]] static ExceptionRef Current() noexcept { return ExceptionRef(std::current_exception()); }

  explicit operator bool() const noexcept { return FHeld != nullptr; }
  /// The object; nullptr when the exception held is none of the Exception family.
  [[nodiscard]] Exception* Get() const noexcept ZQ_LIFETIMEBOUND { return FObject; }
  Exception* operator->() const noexcept { return FObject; }
  /// The message, also of one that is not of the family.
  [[nodiscard]] UnicodeString Message() const;
  /// Raises that same object again; EInvalidOperation where there is none.
  [[noreturn]] void Raise() const;
  [[nodiscard]] const std::exception_ptr& Held() const noexcept { return FHeld; }
  friend bool operator==(const ExceptionRef& A, const ExceptionRef& B) noexcept { return A.FHeld == B.FHeld; }

 private:
  std::exception_ptr FHeld;
  Exception* FObject = nullptr;
};

/// Keeps the exception that is being handled alive.
[[nodiscard]] inline ExceptionRef AcquireExceptionObject() noexcept { return ExceptionRef::Current(); }

/// Class reference of the Exception family: names a class and makes one, not raised, from a message. The empty one is
/// nil.
class ZQ_API ExceptionClass {
 public:
  ExceptionClass() noexcept = default;
  ExceptionClass(std::nullptr_t) noexcept {}
  template <std::derived_from<Exception> E>
  [[nodiscard]] static ExceptionClass Of() noexcept {
    ExceptionClass Result(ClassOf<E>());
    if constexpr (std::constructible_from<E, const UnicodeString&>)
      Result.FCreate = [](const UnicodeString& AMessage) { return ExceptionRef::Of<E>(AMessage); };
    if constexpr (std::constructible_from<E, const UnicodeString&, Integer>)
      Result.FCreateCoded = [](const UnicodeString& AMessage, Integer ACode) {
        return ExceptionRef::Of<E>(AMessage, ACode);
      };
    return Result;
  }
  explicit operator bool() const noexcept { return static_cast<bool>(FClass); }
  [[nodiscard]] TClass ClassType() const noexcept { return FClass; }
  [[nodiscard]] UnicodeString ClassName() const { return FClass.ClassName(); }
  [[nodiscard]] bool InheritsFrom(TClass AClass) const noexcept { return FClass.InheritsFrom(AClass); }
  /// Raises EInvalidOperation where the class has no such constructor.
  [[nodiscard]] ExceptionRef Create(const UnicodeString& AMessage) const;
  [[nodiscard]] ExceptionRef Create(const UnicodeString& AMessage, Integer AErrorCode) const;
  friend bool operator==(const ExceptionClass& A, const ExceptionClass& B) noexcept { return A.FClass == B.FClass; }

 protected:
  explicit ExceptionClass(TClass AClass) noexcept : FClass(AClass) {}

 private:
  TClass FClass;
  ExceptionRef (*FCreate)(const UnicodeString&) = nullptr;
  ExceptionRef (*FCreateCoded)(const UnicodeString&, Integer) = nullptr;
};

}  // namespace zq
