#pragma once

#include <vector>

#include "runtime/core/persistent.h"

namespace zq {

class TCollection;

/// An item of a collection, which owns it. Made by New or by the collection, ended by Free or by the collection.
///
/// It enters its collection in AfterConstruction and leaves it in BeforeDestruction, so Added and Deleting see it
/// whole.
class ZQ_API TCollectionItem : public TPersistent {
 public:
  explicit TCollectionItem(TCollection* ACollection) noexcept : FCollection(ACollection) {}

  [[nodiscard]] TCollection* Collection() const noexcept { return FCollection; }
  /// The number that the collection gave it, never given twice.
  [[nodiscard]] Integer ID() const noexcept { return FID; }
  /// Its place, -1 without a collection.
  [[nodiscard]] Integer Index() const noexcept;
  /// Moves it. Raises EListError.
  void SetIndex(Integer AValue);

 protected:
  ~TCollectionItem() override;
  void AfterConstruction() override;
  void BeforeDestruction() override;
  /// To be called by setters: Update of the collection with this item, or with nullptr where all items are touched.
  void Changed(bool AAllItems);

 private:
  friend class TCollection;
  TCollection* FCollection;
  Integer FID = -1;
};

using TCollectionItemClass = TClassRef<TCollectionItem(TCollection*)>;

/// Owned, ordered items of one class.
///
/// An item whose end is refused (its BeforeDestruction, Deleting or Update raises) stays where it is. The collection's
/// own end can't reach an override of Deleting or Update: a class that needs one there calls Clear in its destructor.
/// One thread at a time.
class ZQ_API TCollection : public TPersistent {
 public:
  explicit TCollection(TCollectionItemClass AItemClass) noexcept : FItemClass(AItemClass) {}
  ~TCollection() override;

  [[nodiscard]] TCollectionItemClass ItemClass() const noexcept { return FItemClass; }
  [[nodiscard]] Integer Count() const noexcept { return static_cast<Integer>(FItems.size()); }
  /// From 0. Raises EListError.
  [[nodiscard]] TCollectionItem* Items(Integer AIndex) const;
  [[nodiscard]] TCollectionItem* FindItemID(Integer AID) const noexcept;
  [[nodiscard]] auto begin() const noexcept { return FItems.begin(); }
  [[nodiscard]] auto end() const noexcept { return FItems.end(); }

  /// Makes an item at the end.
  TCollectionItem* Add();
  /// AIndex may be Count. Raises EListError.
  TCollectionItem* Insert(Integer AIndex);
  /// Ends the item. Raises EListError.
  void Delete(Integer AIndex);
  /// From the last item to the first.
  void Clear();
  /// Items of its own class with the content of those of another collection, by Assign.
  void Assign(const TPersistent* ASource) override;

  /// Holds Update back until the matching EndUpdate, which calls it if anything changed.
  void BeginUpdate() noexcept { ++FUpdateCount; }
  void EndUpdate();

 protected:
  /// AItem has changed; nullptr for the collection as a whole.
  virtual void Update(TCollectionItem*) {}
  virtual void Added(TCollectionItem*) {}
  virtual void Deleting(TCollectionItem*) {}
  void Changed(TCollectionItem* AItem);

 private:
  friend class TCollectionItem;
  void Enter(TCollectionItem* AItem);
  void Forget(const TCollectionItem* AItem) noexcept;

  TCollectionItemClass FItemClass;
  std::vector<TCollectionItem*> FItems;
  Integer FNextID = 0;
  Integer FUpdateCount = 0;
  bool FChanged = false;  // while FUpdateCount is above 0
};

}  // namespace zq
