#pragma once

#include <atomic>
#include <concepts>
#include <functional>
#include <memory>
#include <type_traits>
#include <utility>

#include "runtime/core/objects.h"

namespace zq {

template <class TSignature>
class TMethod;

/// Object-bound callback: an object and one of its member functions, two words, compared by both.
///
/// A lambda or another callable is taken too; copies share it, and it has no object. An unset one is false, and calling
/// it raises std::bad_function_call.
template <class R, class... TArgs>
class TMethod<R(TArgs...)> {
 public:
  TMethod() noexcept = default;
  TMethod(std::nullptr_t) noexcept {}
  template <class TCallable>
    requires(!std::same_as<std::remove_cvref_t<TCallable>, TMethod> &&
             std::is_invocable_r_v<R, std::remove_cvref_t<TCallable>&, TArgs...>)
  // NOLINTNEXTLINE(bugprone-forwarding-reference-overload): the constraint leaves copies and moves alone
  TMethod(TCallable&& ACallable)
      : FOps(&TShared<std::remove_cvref_t<TCallable>>::Ops),
        FData(new TShared<std::remove_cvref_t<TCallable>>(std::forward<TCallable>(ACallable))) {}
  /// AMethod of AObject, which stays the caller's and must outlive the calls.
  template <auto AMethod, class T>
  [[nodiscard]] static TMethod Of(T* AObject) noexcept {
    TMethod Result;
    Result.FOps = &TBound<AMethod, T>::Ops;
    Result.FData = const_cast<std::remove_const_t<T>*>(AObject);
    return Result;
  }

  TMethod(const TMethod& AOther) noexcept : FOps(AOther.FOps), FData(AOther.FData) {
    if (FOps != nullptr && FOps->Share != nullptr) FOps->Share(FData, 1);
  }
  TMethod(TMethod&& AOther) noexcept
      : FOps(std::exchange(AOther.FOps, nullptr)), FData(std::exchange(AOther.FData, nullptr)) {}
  TMethod& operator=(TMethod AOther) noexcept {
    std::swap(FOps, AOther.FOps);
    std::swap(FData, AOther.FData);
    return *this;
  }
  ~TMethod() {
    if (FOps != nullptr && FOps->Share != nullptr) FOps->Share(FData, -1);
  }

  R operator()(TArgs... AArgs) const {
    const TMethod Kept = *this;  // the call may overwrite or free the field it was made through
    if (Kept.FOps == nullptr) throw std::bad_function_call();
    return Kept.FOps->Call(Kept.FData, std::forward<TArgs>(AArgs)...);
  }
  explicit operator bool() const noexcept { return FOps != nullptr; }
  /// The object that the method is bound to; nullptr for any other callable.
  [[nodiscard]] TObject* Object() const noexcept {
    return FOps == nullptr || FOps->Object == nullptr ? nullptr : FOps->Object(FData);
  }
  friend bool operator==(const TMethod& A, const TMethod& B) noexcept { return A.FOps == B.FOps && A.FData == B.FData; }

 private:
  struct TOps {
    R (*Call)(void*, TArgs...);
    void (*Share)(void*, int);  // adds to the count of a shared callable, which goes at 0
    TObject* (*Object)(void*);
  };

  template <auto AMethod, class T>
  struct TBound {
    static R Call(void* AData, TArgs... AArgs) {
      return std::invoke(AMethod, static_cast<T*>(AData), std::forward<TArgs>(AArgs)...);
    }
    static TObject* Object(void* AData) {
      if constexpr (std::derived_from<T, TObject>) return const_cast<std::remove_const_t<T>*>(static_cast<T*>(AData));
      else return nullptr;
    }
    static constexpr TOps Ops{&Call, nullptr, &Object};
  };

  template <class TCallable>
  struct TShared {
    explicit TShared(TCallable ACallable) : Callable(std::move(ACallable)) {}
    static R Call(void* AData, TArgs... AArgs) {
      return std::invoke(static_cast<TShared*>(AData)->Callable, std::forward<TArgs>(AArgs)...);
    }
    static void Share(void* AData, int ABy) {
      auto* const Self = static_cast<TShared*>(AData);
      if (Self->Count.fetch_add(ABy, std::memory_order_acq_rel) + ABy == 0) delete Self;
    }
    static constexpr TOps Ops{&Call, &Share, nullptr};
    TCallable Callable;
    std::atomic<int> Count = 1;
  };

  const TOps* FOps = nullptr;
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
