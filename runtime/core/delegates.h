#pragma once

#include <atomic>
#include <concepts>
#include <functional>
#include <memory>
#include <type_traits>
#include <typeinfo>
#include <utility>

#include "runtime/core/objects.h"

namespace zq {

template <class TSignature>
class TMethod;

namespace detail {

// The class that a member function belongs to, which a bound T is kept as; T for a callable of another kind, and where
// that class wouldn't lead back to the object.
template <class TMember, class T>
struct TOwnerOf {
  using type = T;
};
template <class TMember, class TOwner, class T>
  requires(std::is_polymorphic_v<TOwner> || !std::derived_from<T, TObject>)
struct TOwnerOf<TMember TOwner::*, T> {
  using type = std::conditional_t<std::is_const_v<T>, const TOwner, TOwner>;
};

template <class R, class TCallable, class... TArgs>
R Invoke(TCallable&& ACallable, TArgs&&... AArgs) {
  if constexpr (std::is_void_v<R>) std::invoke(std::forward<TCallable>(ACallable), std::forward<TArgs>(AArgs)...);
  else return std::invoke(std::forward<TCallable>(ACallable), std::forward<TArgs>(AArgs)...);
}

}  // namespace detail

/// Object-bound callback: an object and one of its member functions, two words, compared by both.
///
/// A lambda or another callable is taken too; copies share it, and it has no object. An unset one, also one made of an
/// empty callable, is false, and calling it raises std::bad_function_call.
template <class R, class... TArgs>
class TMethod<R(TArgs...)> {
 public:
  TMethod() noexcept = default;
  TMethod(std::nullptr_t) noexcept {}
  template <class TCallable>
    requires(
        !std::same_as<std::decay_t<TCallable>, TMethod> && std::is_invocable_r_v<R, std::decay_t<TCallable>&, TArgs...>)
  // NOLINTNEXTLINE(bugprone-forwarding-reference-overload): the constraint leaves copies and moves alone
  TMethod(TCallable&& ACallable) {
    using TKept = std::decay_t<TCallable>;
    if constexpr (std::constructible_from<TKept, std::nullptr_t> && requires(const TKept& AKept) { !AKept; })
      if (!static_cast<const TKept&>(ACallable)) return;
    FData = new TShared<TKept>(std::forward<TCallable>(ACallable));
    FOps = &TShared<TKept>::Ops;
  }
  /// AMethod of AObject, which stays the caller's and must outlive the calls.
  template <auto AMethod, class T>
  [[nodiscard]] static TMethod Of(T* AObject) noexcept {
    using TOwner = typename detail::TOwnerOf<decltype(AMethod), T>::type;
    return {TBound<AMethod, TOwner>::Ops, const_cast<std::remove_const_t<TOwner>*>(static_cast<TOwner*>(AObject))};
  }

  TMethod(const TMethod& AOther) noexcept : TMethod(*AOther.FOps, AOther.FData) {}
  TMethod(TMethod&& AOther) noexcept
      : FOps(std::exchange(AOther.FOps, &cUnset)), FData(std::exchange(AOther.FData, nullptr)) {}
  TMethod& operator=(TMethod AOther) noexcept {
    std::swap(FOps, AOther.FOps);
    std::swap(FData, AOther.FData);
    return *this;
  }
  ~TMethod() {
    if (FOps->Share != nullptr) FOps->Share(FData, -1);
  }

  /// The field that it is made through may be overwritten or freed by the call.
  R operator()(TArgs... AArgs) const { return FOps->Call(FData, std::forward<TArgs>(AArgs)...); }
  explicit operator bool() const noexcept { return FOps->Id != nullptr; }
  /// The object that the method is bound to; nullptr for any other callable.
  [[nodiscard]] TObject* Object() const noexcept { return FOps->Object == nullptr ? nullptr : FOps->Object(FData); }
  friend bool operator==(const TMethod& A, const TMethod& B) noexcept {
    if (A.FData != B.FData || !A || !B) return A.FData == B.FData && !A && !B;
    return *A.FOps->Id == *B.FOps->Id;  // each library may have a FOps of its own for one method
  }

 private:
  struct TOps {
    R (*Call)(void*, TArgs...);
    void (*Share)(void*, int);  // adds to the count of a shared callable, which goes at 0
    TObject* (*Object)(void*);
    const std::type_info* Id;  // nullptr: unset
  };

  template <auto AMethod, class T>
  struct TBound {
    static R Call(void* AData, TArgs... AArgs) {
      return detail::Invoke<R>(AMethod, static_cast<T*>(AData), std::forward<TArgs>(AArgs)...);
    }
    static TObject* Object(void* AData) {
      auto* const Owner = static_cast<std::remove_const_t<T>*>(AData);
      if constexpr (std::derived_from<T, TObject>) return Owner;
      else if constexpr (std::is_polymorphic_v<T>) return dynamic_cast<TObject*>(Owner);
      else return nullptr;
    }
    static constexpr TOps Ops{&Call, nullptr, &Object, &typeid(TBound*)};
  };

  template <class TCallable>
  struct TShared {
    explicit TShared(TCallable ACallable) : Callable(std::move(ACallable)) {}
    static R Call(void* AData, TArgs... AArgs) {
      const TMethod Kept(Ops, AData);
      return detail::Invoke<R>(static_cast<TShared*>(AData)->Callable, std::forward<TArgs>(AArgs)...);
    }
    static void Share(void* AData, int ABy) {
      auto* const Self = static_cast<TShared*>(AData);
      if (Self->Count.fetch_add(ABy, std::memory_order_acq_rel) + ABy == 0) delete Self;
    }
    static constexpr TOps Ops{&Call, &Share, nullptr, &typeid(TShared*)};
    TCallable Callable;
    std::atomic<int> Count = 1;
  };

  TMethod(const TOps& AOps, void* AData) noexcept : FOps(&AOps), FData(AData) {
    if (FOps->Share != nullptr) FOps->Share(FData, 1);
  }

  [[noreturn]] static R Raise(void*, TArgs...) { throw std::bad_function_call(); }
  static constexpr TOps cUnset{&Raise, nullptr, nullptr, nullptr};

  const TOps* FOps = &cUnset;
  void* FData = nullptr;
};

/// Bind<&THost::OnDone>(Host) where the signature is taken from the target.
template <auto AMethod, class T>
struct TBinding {
  T* Object;
  template <class R, class... TArgs>
  operator TMethod<R(TArgs...)>() const noexcept {
    return TMethod<R(TArgs...)>::template Of<AMethod>(Object);
  }
};
template <auto AMethod, class T>
[[nodiscard]] TBinding<AMethod, T> Bind(T* AObject) noexcept {
  return {AObject};
}

}  // namespace zq
