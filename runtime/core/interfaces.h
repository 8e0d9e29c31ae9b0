#pragma once

#include <atomic>
#include <concepts>
#include <cstddef>
#include <type_traits>
#include <utility>

#include "runtime/core/exceptions.h"
#include "runtime/core/objects.h"

namespace zq {

/// Root of every interface: a reference-counted abstract class with a GUID.
struct ZQ_API IInterface {
  static constexpr TGUID IID = "{00000000-0000-0000-C000-000000000046}"_guid;
  /// S_OK and a counted interface in AObj, or E_NOINTERFACE and null.
  virtual HRESULT QueryInterface(const TGUID& AIID, void** AObj) = 0;
  /// Both return the new count. _Release raises what the object's BeforeDestruction raises; the object is alive then.
  virtual Integer _AddRef() = 0;
  virtual Integer _Release() = 0;

 protected:
  ~IInterface() = default;
};

/// The parent is inherited virtually: what a base class has implemented serves every interface that asks for it.
template <class TParent>
struct Extends : virtual TParent {
  using Parent = TParent;

 protected:
  ~Extends() = default;
};

/// The interface that a query for I's GUID answers with: of those that bear one GUID, the shortest.
template <class I>
struct BearerOf {
  using type = I;
};
template <class I>
  requires(I::IID == I::Parent::IID)
struct BearerOf<I> : BearerOf<typename I::Parent> {};

namespace detail {
// Direct base of the classes that Implements makes, and of no other: how the parent of a class is told from them.
struct ZQ_API TGivesInterfaces {};
}  // namespace detail

/// TBase and the interfaces I..., with the answers to GetInterface for them and their parents.
template <class TBase, class... I>
class Implements : public TBase, public virtual I..., private virtual detail::TGivesInterfaces {
 public:
  using TBase::TBase;

  bool GetInterface(const TGUID& AIID, void** AObj) override {
    return (Answer<I>(AIID, AObj) || ...) || TBase::GetInterface(AIID, AObj);
  }

 protected:
  ~Implements() override = default;

 private:
  template <class J>
  bool Answer(const TGUID& AIID, void** AObj) {
    if (AIID == J::IID) {
      *AObj = static_cast<typename BearerOf<J>::type*>(this);
      this->_AddRef();
      return true;
    }
    if constexpr (requires { typename J::Parent; }) return Answer<typename J::Parent>(AIID, AObj);
    return false;
  }
};

/// Holds one count on an object behind I. Identity is compared, the object is reached by ->.
///
/// The end of a scope never raises: what BeforeDestruction raises there goes no further and leaves the object alive.
/// Reset lets it out.
template <class I>
class IntfRef {
 public:
  IntfRef() noexcept = default;
  IntfRef(std::nullptr_t) noexcept {}
  /// Counts AObject, which may be a class that implements I.
  template <class T>
    requires(std::convertible_to<T*, I*>)
  IntfRef(T* AObject) : FPtr(AObject) {
    if (FPtr != nullptr) FPtr->_AddRef();
  }
  IntfRef(const IntfRef& AOther) : IntfRef(AOther.FPtr) {}
  IntfRef(IntfRef&& AOther) noexcept : FPtr(std::exchange(AOther.FPtr, nullptr)) {}
  template <class J>
    requires(!std::same_as<I, J> && std::convertible_to<J*, I*>)
  IntfRef(const IntfRef<J>& AOther) : IntfRef(AOther.Get()) {}
  IntfRef& operator=(IntfRef AOther) noexcept {
    std::swap(FPtr, AOther.FPtr);
    return *this;
  }
  ~IntfRef() {
    try {
      Reset();
    } catch (...) {  // told above
    }
  }

  /// Takes over a count that AObject already has.
  [[nodiscard]] static IntfRef Adopt(I* AObject) noexcept {
    IntfRef Result;
    Result.FPtr = AObject;
    return Result;
  }
  /// Drops the count and raises what the object's end raises.
  void Reset() {
    if (I* const Dropped = std::exchange(FPtr, nullptr)) Dropped->_Release();
  }
  /// Not counted; for a call, not to keep.
  [[nodiscard]] I* Get() const noexcept ZQ_LIFETIMEBOUND { return FPtr; }
  I* operator->() const noexcept { return FPtr; }
  I& operator*() const noexcept { return *FPtr; }
  explicit operator bool() const noexcept { return FPtr != nullptr; }
  friend bool operator==(const IntfRef& A, const IntfRef& B) noexcept { return A.FPtr == B.FPtr; }

  /// The object's interface J; empty where it has none.
  template <class J>
  [[nodiscard]] IntfRef<J> Supports() const {
    using TBearer = typename BearerOf<J>::type;
    void* Found = nullptr;
    if (FPtr == nullptr || FPtr->QueryInterface(J::IID, &Found) != S_OK) return {};
    auto Bearer = IntfRef<TBearer>::Adopt(static_cast<TBearer*>(Found));
    if constexpr (std::same_as<J, TBearer>) return Bearer;
    else return IntfRef<J>(dynamic_cast<J*>(Bearer.Get()));
  }
  /// The same, raising EIntfCastError where the object has no J.
  template <class J>
  [[nodiscard]] IntfRef<J> As() const {
    IntfRef<J> Result = Supports<J>();
    if (!Result) throw EIntfCastError(u"Interface not supported");
    return Result;
  }

 private:
  I* FPtr = nullptr;
};

/// Asks an object of any class for J; empty where it has none.
template <class J>
[[nodiscard]] IntfRef<J> Supports(TObject* AObject) {
  using TBearer = typename BearerOf<J>::type;
  void* Found = nullptr;
  if (AObject == nullptr || !AObject->GetInterface(J::IID, &Found)) return {};
  auto Bearer = IntfRef<TBearer>::Adopt(static_cast<TBearer*>(Found));
  if constexpr (std::same_as<J, TBearer>) return Bearer;
  else return IntfRef<J>(dynamic_cast<J*>(Bearer.Get()));
}

/// Lives by its count alone: the last reference destroys it. Refuses to be freed while it is counted. References that
/// come and go while it is being destroyed are no further end.
class ZQ_API TInterfacedObject : public TObject, public virtual IInterface {
 public:
  [[nodiscard]] Integer RefCount() const noexcept { return FRefCount.load(std::memory_order_relaxed); }
  bool GetInterface(const TGUID& AIID, void** AObj) override;
  HRESULT QueryInterface(const TGUID& AIID, void** AObj) override;
  Integer _AddRef() override;
  Integer _Release() override;

 protected:
  ~TInterfacedObject() override = default;
  void AfterConstruction() override;
  /// Raises Exception while the count is not 0.
  void BeforeDestruction() override;
  void EndRefused() noexcept override;

 private:
  std::atomic<Integer> FRefCount = 1;  // the construction's own count, so that a reference in a constructor is no end
  std::atomic<bool> FEnding = false;
};

/// Implements an interface for a controlling object, to which it forwards all three operations. Does not hold a count
/// on the controller, which owns it.
class ZQ_API TAggregatedObject : public TObject {
 public:
  explicit TAggregatedObject(IInterface* AController) noexcept : FController(AController) {}
  [[nodiscard]] IntfRef<IInterface> Controller() const { return FController; }
  HRESULT QueryInterface(const TGUID& AIID, void** AObj) { return FController->QueryInterface(AIID, AObj); }
  Integer _AddRef() { return FController->_AddRef(); }
  Integer _Release() { return FController->_Release(); }

 protected:
  ~TAggregatedObject() override = default;

 private:
  IInterface* FController;
};

/// The same with an identity of its own: queries stay with it, counts go to the controller.
class ZQ_API TContainedObject : public TObject, public virtual IInterface {
 public:
  explicit TContainedObject(IInterface* AController) noexcept : FController(AController) {}
  [[nodiscard]] IntfRef<IInterface> Controller() const { return FController; }
  bool GetInterface(const TGUID& AIID, void** AObj) override;
  HRESULT QueryInterface(const TGUID& AIID, void** AObj) override;
  Integer _AddRef() override { return FController->_AddRef(); }
  Integer _Release() override { return FController->_Release(); }

 protected:
  ~TContainedObject() override = default;

 private:
  IInterface* FController;
};

}  // namespace zq
