#include "runtime/core/objects.h"

#include <cxxabi.h>

#include <cstdlib>
#include <new>

#include "runtime/core/exceptions.h"
#include "runtime/core/interfaces.h"

namespace zq {

namespace {

// Bases of a class as the Itanium C++ ABI records them. AVisit gets each one and ends the walk with true.
template <class TVisitor>
bool AnyBase(const std::type_info& AInfo, TVisitor AVisit) noexcept {
  if (const auto* Single = dynamic_cast<const abi::__si_class_type_info*>(&AInfo)) return AVisit(*Single->__base_type);
  if (const auto* Many = dynamic_cast<const abi::__vmi_class_type_info*>(&AInfo))
    for (unsigned i = 0; i < Many->__base_count; ++i)
      if (AVisit(*Many->__base_info[i].__base_type)) return true;
  return false;
}

bool Derives(const std::type_info& AInfo, const std::type_info& ABase) noexcept {
  return AInfo == ABase || AnyBase(AInfo, [&](const std::type_info& AParent) { return Derives(AParent, ABase); });
}

// Drops every "a::" that stands outside of template arguments.
std::string WithoutNamespaces(std::string_view AName) {
  std::size_t From = 0;
  int Depth = 0;
  for (std::size_t i = 0; i + 1 < AName.size(); ++i) {
    if (AName[i] == '<' || AName[i] == '(') ++Depth;
    if (AName[i] == '>' || AName[i] == ')') --Depth;
    if (Depth == 0 && AName[i] == ':' && AName[i + 1] == ':') From = i + 2;
  }
  return std::string(AName.substr(From));
}

}  // namespace

UnicodeString TClass::ClassName() const {
  if (FInfo == nullptr) return {};
  int Status = 0;
  const std::unique_ptr<char, decltype(&std::free)> Name(
      abi::__cxa_demangle(FInfo->name(), nullptr, nullptr, &Status), &std::free);
  return UnicodeString::FromUTF8(WithoutNamespaces(Status == 0 ? Name.get() : FInfo->name()));
}

TClass TClass::ClassParent() const noexcept {
  TClass Result;
  if (FInfo == nullptr) return Result;
  AnyBase(*FInfo, [&](const std::type_info& AParent) {
    if (!Derives(AParent, typeid(TObject))) return false;
    Result = TClass(AParent);
    return true;
  });
  // Implements is a class only in C++: the one behind it is the parent.
  const auto IsMark = [](const std::type_info& ABase) { return ABase == typeid(detail::TGivesInterfaces); };
  return AnyBase(Result.Info(), IsMark) ? Result.ClassParent() : Result;
}

bool TClass::InheritsFrom(TClass AClass) const noexcept {
  return FInfo != nullptr && AClass.FInfo != nullptr && Derives(*FInfo, *AClass.FInfo);
}

void TObject::Free() {
  try {
    BeforeDestruction();
  } catch (...) {
    EndRefused();
    throw;
  }
  delete this;
}

bool TObject::GetInterface(const TGUID&, void** AObj) {
  *AObj = nullptr;
  return false;
}

UnicodeString TObject::ToString() const { return ClassName(); }

NativeInt TObject::GetHashCode() const { return reinterpret_cast<NativeInt>(this); }

HRESULT TObject::SafeCallException() { return E_UNEXPECTED; }

void detail::RaiseNoClass() { throw EInvalidOperation(u"There is no class to make an object of"); }

void* GetMem(std::size_t ASize) {
  void* const Result = std::malloc(ASize == 0 ? 1 : ASize);
  if (Result == nullptr) throw std::bad_alloc();
  return Result;
}

void FreeMem(void* ABlock) noexcept { std::free(ABlock); }

}  // namespace zq
