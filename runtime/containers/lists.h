#pragma once

#include <algorithm>
#include <mutex>
#include <utility>
#include <vector>

#include "runtime/core/exceptions.h"
#include "runtime/core/interfaces.h"
#include "runtime/core/objects.h"

namespace zq {

/// Raises EListError "List index out of bounds (%d)".
[[noreturn]] ZQ_API void ListIndexError(Integer AIndex);

enum class TListNotification : std::uint8_t { lnAdded, lnExtracted, lnDeleted };
using enum TListNotification;

/// Ordered list of values, counted from 0. Every index out of range raises EListError.
///
/// One thread at a time. An item is out of the list before Notify hears that it was deleted, so that its end may use
/// the list.
template <class T>
class ZQ_API TListOf : public TObject {
 public:
  TListOf() = default;
  ~TListOf() override = default;

  [[nodiscard]] Integer Count() const noexcept { return static_cast<Integer>(FItems.size()); }
  [[nodiscard]] const T& Items(Integer AIndex) const { return FItems[Slot(AIndex, Count())]; }
  [[nodiscard]] const T& operator[](Integer AIndex) const { return Items(AIndex); }
  [[nodiscard]] const T& First() const { return Items(0); }
  [[nodiscard]] const T& Last() const { return Items(Count() - 1); }
  /// The first equal item, -1 if absent.
  [[nodiscard]] virtual Integer IndexOf(const T& AItem) const {
    const auto Found = std::find(FItems.begin(), FItems.end(), AItem);
    return Found == FItems.end() ? -1 : static_cast<Integer>(Found - FItems.begin());
  }
  [[nodiscard]] auto begin() const noexcept { return FItems.begin(); }
  [[nodiscard]] auto end() const noexcept { return FItems.end(); }

  /// Returns the new item's index.
  Integer Add(T AItem) {
    Insert(Count(), std::move(AItem));
    return Count() - 1;
  }
  /// AIndex may be Count.
  void Insert(Integer AIndex, T AItem) {
    const std::size_t At = Slot(AIndex, Count() + 1);
    const T Added = *FItems.insert(Place(At), std::move(AItem));
    Notify(Added, lnAdded);
  }
  void SetItems(Integer AIndex, T AItem) {
    const T Old = std::exchange(FItems[Slot(AIndex, Count())], AItem);
    if (Old == AItem) return;
    Notify(AItem, lnAdded);  // first: the old item's end may raise, or take the new one out again
    Notify(Old, lnDeleted);
  }
  void Delete(Integer AIndex) { Notify(Take(AIndex), lnDeleted); }
  /// Deletes the first equal item and returns the index that it had; -1 if absent.
  Integer Remove(const T& AItem) {
    const Integer Found = IndexOf(AItem);
    if (Found >= 0) Delete(Found);
    return Found;
  }
  /// Takes the item out without ending it.
  T Extract(Integer AIndex) {
    T Result = Take(AIndex);
    Notify(Result, lnExtracted);
    return Result;
  }
  /// From the last item to the first.
  void Clear() {
    while (Count() > 0) Delete(Count() - 1);
  }
  void Exchange(Integer AFirst, Integer ASecond) {
    std::swap(FItems[Slot(AFirst, Count())], FItems[Slot(ASecond, Count())]);
  }
  void Move(Integer AFrom, Integer ATo) {
    const auto From = Place(Slot(AFrom, Count())), To = Place(Slot(ATo, Count()));
    if (From < To) std::rotate(From, From + 1, To + 1);
    else std::rotate(To, From, From + 1);
  }
  /// ACompare(a, b) is below 0 where a comes first. Equal items keep their order.
  template <class TCompare>
  void Sort(TCompare ACompare) {
    std::stable_sort(FItems.begin(), FItems.end(), [&](const T& A, const T& B) { return ACompare(A, B) < 0; });
  }

 protected:
  /// Hears of each item that came or went. Destruction is silent: a class with an override calls Clear in its own
  /// destructor.
  virtual void Notify(const T&, TListNotification) {}

 private:
  static std::size_t Slot(Integer AIndex, Integer ALimit) {
    if (AIndex < 0 || AIndex >= ALimit) ListIndexError(AIndex);
    return static_cast<std::size_t>(AIndex);
  }
  auto Place(std::size_t ASlot) { return FItems.begin() + static_cast<std::ptrdiff_t>(ASlot); }
  T Take(Integer AIndex) {
    const auto At = Place(Slot(AIndex, Count()));
    T Result = std::move(*At);
    FItems.erase(At);
    return Result;
  }

  std::vector<T> FItems;
};

using TList = TListOf<void*>;
using TClassList = TListOf<TClass>;

/// Frees its objects, through TObject::Free, when they are deleted from it and OwnsObjects is set.
///
/// What an object's BeforeDestruction raises comes out of Delete and Clear with that object alive and out of the list.
/// The list's own end goes on to the next object instead.
class ZQ_API TObjectList : public TListOf<TObject*> {
 public:
  explicit TObjectList(bool AOwnsObjects = true) noexcept : FOwnsObjects(AOwnsObjects) {}
  ~TObjectList() override { ClearQuietly(); }

  [[nodiscard]] bool OwnsObjects() const noexcept { return FOwnsObjects; }
  void SetOwnsObjects(bool AValue) noexcept { FOwnsObjects = AValue; }

 protected:
  void Notify(TObject* const& AObject, TListNotification AAction) override;
  /// Clear for a destructor.
  void ClearQuietly() noexcept;

 private:
  bool FOwnsObjects;
};

/// Holds a count on each item. Items are told apart by their object, whichever of its interfaces is asked for.
class ZQ_API TInterfaceList : public TListOf<IntfRef<IInterface>> {
 public:
  [[nodiscard]] Integer IndexOf(const IntfRef<IInterface>& AItem) const override;
};

/// A list behind a re-entrant lock. An item that is in it isn't added again.
template <class T>
class ZQ_API TThreadListOf : public TObject {
 public:
  TThreadListOf() = default;
  ~TThreadListOf() override = default;

  /// The list, which is the caller's alone until UnlockList.
  TListOf<T>* LockList() {
    FLock.lock();
    return &FList;
  }
  void UnlockList() { FLock.unlock(); }

  /// The list, locked for a scope.
  class [[nodiscard]] TScope {
   public:
    explicit TScope(TThreadListOf& AList) : FOwner(AList), FList(AList.LockList()) {}
    TScope(const TScope&) = delete;
    TScope& operator=(const TScope&) = delete;
    ~TScope() { FOwner.UnlockList(); }
    TListOf<T>* operator->() const noexcept { return FList; }
    TListOf<T>& operator*() const& noexcept { return *FList; }
    TListOf<T>& operator*() const&& = delete;  // in a range-for it would end before the loop's body

   private:
    TThreadListOf& FOwner;
    TListOf<T>* FList;
  };
  [[nodiscard]] TScope Locked() { return TScope(*this); }

  void Add(const T& AItem) {
    const TScope List(*this);
    if (List->IndexOf(AItem) < 0) List->Add(AItem);
  }
  void Remove(const T& AItem) { Locked()->Remove(AItem); }
  void Clear() { Locked()->Clear(); }

 private:
  std::recursive_mutex FLock;
  TListOf<T> FList;
};

using TThreadList = TThreadListOf<void*>;

}  // namespace zq
