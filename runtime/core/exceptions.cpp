#include "runtime/core/exceptions.h"

#include <mutex>

namespace zq {

namespace {

thread_local Cardinal LastError = 0;

// "/any/where/common/uZqLogger.cpp" becomes "common/uZqLogger", whatever folders it lies in, and so does a topic of
// that module, "common/uZqLogger/failures.cpp".
UnicodeString UnitOf(std::string_view AFile) {
  std::size_t From = 0;
  for (const std::string_view Folder : {"common/", "runtime/"})
    if (const auto Found = AFile.rfind(Folder);
        Found != std::string_view::npos && Found > From && AFile[Found - 1] == '/')
      From = Found;
  AFile.remove_prefix(From);
  constexpr std::string_view cModule = "common/uZq";
  if (AFile.starts_with(cModule)) AFile = AFile.substr(0, AFile.find('/', cModule.size()));
  if (const auto Dot = AFile.rfind('.');
      Dot != std::string_view::npos && AFile.find('/', Dot) == std::string_view::npos)
    AFile = AFile.substr(0, Dot);
  return UnicodeString::FromUTF8(AFile);
}

UnicodeString Decimal(Integer AValue) { return UnicodeString::FromUTF8(std::to_string(AValue)); }

}  // namespace

void Exception::SetMessage(UnicodeString AMessage) {
  FMessage = std::move(AMessage);
  FWhat.clear();
}

const char* Exception::what() const noexcept {
  static constinit std::mutex Lock;  // an exception may be held by several threads
  try {
    const std::lock_guard Guard(Lock);
    if (FWhat.empty()) FWhat = FMessage.ToUTF8();
    return FWhat.c_str();
  } catch (...) {
    return "out of memory";
  }
}

Cardinal GetLastError() noexcept { return LastError; }

void SetLastError(Cardinal AError) noexcept { LastError = AError; }

void RaiseLastOSError() {
  const auto Code = static_cast<Integer>(GetLastError());
  throw EOSError(
      Code == 0 ? UnicodeString(u"A call to an OS function failed") : u"System Error.  Code: " + Decimal(Code), Code);
}

EAssertionFailed::EAssertionFailed(const UnicodeString& AText, const UnicodeString& AUnit, Integer ALine)
    : Exception(AText + u" (" + AUnit + u", line " + Decimal(ALine) + u")"), FUnit(AUnit), FLine(ALine) {}

void AssertionFailed(const UnicodeString& AText, const char* AFile, int ALine) {
  throw EAssertionFailed(AText, UnitOf(AFile), ALine);
}

ExceptionRef::ExceptionRef(std::exception_ptr AException) noexcept : FHeld(std::move(AException)) {
  if (FHeld == nullptr) return;
  try {
    std::rethrow_exception(FHeld);
  } catch (Exception& e) {
    FObject = &e;  // the handler sees the held object itself, which lives as long as FHeld
  } catch (...) {  // not of the family, held all the same
  }
}

UnicodeString ExceptionRef::Message() const {
  if (FObject != nullptr) return FObject->Message();
  if (FHeld == nullptr) return {};
  try {
    std::rethrow_exception(FHeld);
  } catch (const std::exception& e) {
    return UnicodeString::FromUTF8(e.what());
  } catch (...) {
    return u"unknown exception";
  }
}

void ExceptionRef::Raise() const {
  if (FHeld == nullptr) throw EInvalidOperation(u"There is no exception to raise");
  std::rethrow_exception(FHeld);
}

ExceptionRef ExceptionClass::Create(const UnicodeString& AMessage) const {
  if (FCreate == nullptr) throw EInvalidOperation(ClassName() + u" can't be made from a message alone");
  return FCreate(AMessage);
}

ExceptionRef ExceptionClass::Create(const UnicodeString& AMessage, Integer AErrorCode) const {
  if (FCreateCoded == nullptr) throw EInvalidOperation(ClassName() + u" takes no error code");
  return FCreateCoded(AMessage, AErrorCode);
}

}  // namespace zq
