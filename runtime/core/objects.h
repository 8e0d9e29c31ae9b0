#pragma once

#include <concepts>
#include <memory>
#include <typeinfo>
#include <utility>

#include "runtime/core/api.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"

namespace zq {

class TObject;
struct EInvalidOperation;  // runtime/core/exceptions.h has it

/// Names a class by C++'s type identity, which holds across shared libraries. The empty one names none.
class ZQ_API TClass {
 public:
  TClass() noexcept = default;
  explicit TClass(const std::type_info& AInfo) noexcept : FInfo(&AInfo) {}

  explicit operator bool() const noexcept { return FInfo != nullptr; }
  /// The name without namespaces; empty for no class.
  [[nodiscard]] UnicodeString ClassName() const;
  /// The base among the TObject family; empty at TObject.
  [[nodiscard]] TClass ClassParent() const noexcept;
  /// True for the class itself too.
  [[nodiscard]] bool InheritsFrom(TClass AClass) const noexcept;
  [[nodiscard]] const std::type_info& Info() const noexcept { return FInfo == nullptr ? typeid(void) : *FInfo; }
  friend bool operator==(TClass A, TClass B) noexcept { return A.Info() == B.Info(); }

 private:
  const std::type_info* FInfo = nullptr;
};

template <class T>
[[nodiscard]] TClass ClassOf() noexcept {
  return TClass(typeid(T));
}

/// Root of every class.
///
/// A plain class is ordinary C++ and makes its destructor public, which may do without raising what BeforeDestruction
/// does. One with a protocol, that needs AfterConstruction or BeforeDestruction or counts references, leaves it
/// protected: New makes it, Free or its last reference ends it.
class ZQ_API TObject {
 public:
  TObject() = default;
  TObject(const TObject&) = delete;
  TObject& operator=(const TObject&) = delete;

  /// Ends an object that New made. Raises what BeforeDestruction raises; the object is alive then.
  void Free();

  [[nodiscard]] TClass ClassType() const noexcept { return TClass(typeid(*this)); }
  [[nodiscard]] UnicodeString ClassName() const { return ClassType().ClassName(); }
  [[nodiscard]] bool InheritsFrom(TClass AClass) const noexcept { return ClassType().InheritsFrom(AClass); }
  /// Fills AObj with the interface of that GUID and counts it, without going through QueryInterface; False and a null
  /// AObj where the class has none.
  virtual bool GetInterface(const TGUID& AIID, void** AObj);
  /// The class name, unless a class has something better.
  [[nodiscard]] virtual UnicodeString ToString() const;
  [[nodiscard]] virtual bool Equals(const TObject* AOther) const { return this == AOther; }
  [[nodiscard]] virtual NativeInt GetHashCode() const;
  /// The result code for the exception being handled, out of a method whose caller wants a code and no exception.
  virtual HRESULT SafeCallException();

 protected:
  virtual ~TObject() = default;
  virtual void AfterConstruction() {}  ///< The first place where a call reaches the final class's override.
  virtual void BeforeDestruction() {}  ///< The last such place. An override ends with its parent's.
  /// BeforeDestruction has raised and the object lives on: puts back what its end had changed by then. An override ends
  /// with its parent's.
  virtual void EndRefused() noexcept {}

 private:
  template <std::derived_from<TObject> T, class... TArgs>
  friend T* New(TArgs&&... AArgs);
};

/// Builds a T on the heap, owned by the caller or by its own count. A raise leaves nothing behind.
template <std::derived_from<TObject> T, class... TArgs>
[[nodiscard]] T* New(TArgs&&... AArgs) {
  T* const Result = new T(std::forward<TArgs>(AArgs)...);
  TObject* const Root = Result;
  try {
    Root->AfterConstruction();
  } catch (...) {
    delete Root;
    throw;
  }
  return Result;
}

/// TObject::Free, and nothing on a null pointer.
inline void Free(TObject* AObject) {
  if (AObject != nullptr) AObject->Free();
}
/// Empties the pointer first, so that nobody reaches the object on its way out.
template <std::derived_from<TObject> T>
void FreeAndNil(T*& AObject) {
  Free(std::exchange(AObject, nullptr));
}

/// Owns an object of a family with a protocol. What its end raises goes no further and leaves it alive.
struct TFreer {
  void operator()(TObject* AObject) const noexcept {
    try {
      AObject->Free();
    } catch (...) {  // told above
    }
  }
};
template <class T>
using TOwned = std::unique_ptr<T, TFreer>;

namespace detail {
[[noreturn]] ZQ_API void RaiseNoClass();
}

template <class TSignature>
class TClassRef;

/// Names a class derived from TBase and makes objects of it through its constructor. The empty one names none, and
/// raises EInvalidOperation where it is to make one.
template <class TBase, class... TArgs>
class TClassRef<TBase(TArgs...)> {
 public:
  TClassRef() noexcept = default;
  template <std::derived_from<TBase> T>
  [[nodiscard]] static TClassRef Of() noexcept {
    return {ClassOf<T>(), [](TArgs... AArgs) -> TBase* { return New<T>(std::forward<TArgs>(AArgs)...); }};
  }
  explicit operator bool() const noexcept { return FCreate != nullptr; }
  [[nodiscard]] TBase* Create(TArgs... AArgs) const {
    if (FCreate == nullptr) detail::RaiseNoClass();
    return FCreate(std::forward<TArgs>(AArgs)...);
  }
  [[nodiscard]] TClass ClassType() const noexcept { return FClass; }
  [[nodiscard]] UnicodeString ClassName() const { return FClass.ClassName(); }
  [[nodiscard]] bool InheritsFrom(TClass AClass) const noexcept { return FClass.InheritsFrom(AClass); }
  friend bool operator==(const TClassRef& A, const TClassRef& B) noexcept { return A.FClass == B.FClass; }

 private:
  TClassRef(TClass AClass, TBase* (*ACreate)(TArgs...)) noexcept : FClass(AClass), FCreate(ACreate) {}
  TClass FClass;
  TBase* (*FCreate)(TArgs...) = nullptr;
};

/// malloc's, for the raw blocks that functions hand out. Raises std::bad_alloc; a size of 0 gives a block, too.
[[nodiscard]] ZQ_API void* GetMem(std::size_t ASize);
ZQ_API void FreeMem(void* ABlock) noexcept;

}  // namespace zq
