#include "runtime/containers/collection.h"

#include <algorithm>

#include "runtime/containers/lists.h"

namespace zq {

// ---- TCollectionItem -----------------------------------------------------------------------------------------------

TCollectionItem::~TCollectionItem() {
  if (FCollection != nullptr) FCollection->Forget(this);  // only where the construction failed behind AfterConstruction
}

void TCollectionItem::AfterConstruction() {
  TPersistent::AfterConstruction();
  if (FCollection != nullptr) FCollection->Enter(this);
}

void TCollectionItem::BeforeDestruction() {
  if (TCollection* const Left = FCollection) {
    Left->Deleting(this);
    const Integer Place = Index();
    Left->Forget(this);
    try {
      Left->Changed(nullptr);
    } catch (...) {
      Left->FItems.insert(Left->FItems.begin() + std::min(Place, Left->Count()), this);
      throw;
    }
    FCollection = nullptr;
  }
  TPersistent::BeforeDestruction();
}

Integer TCollectionItem::Index() const noexcept {
  if (FCollection == nullptr) return -1;
  const auto& Items = FCollection->FItems;
  return static_cast<Integer>(std::find(Items.begin(), Items.end(), this) - Items.begin());
}

void TCollectionItem::SetIndex(Integer AValue) {
  const Integer From = Index();
  if (From < 0 || From == AValue) return;
  if (AValue < 0 || AValue >= FCollection->Count()) ListIndexError(AValue);
  const auto Start = FCollection->FItems.begin();
  if (From < AValue) std::rotate(Start + From, Start + From + 1, Start + AValue + 1);
  else std::rotate(Start + AValue, Start + From, Start + From + 1);
  Changed(true);
}

void TCollectionItem::Changed(bool AAllItems) {
  if (FCollection != nullptr) FCollection->Changed(AAllItems ? nullptr : this);
}

// ---- TCollection ---------------------------------------------------------------------------------------------------

namespace {

// AWork between BeginUpdate and EndUpdate.
template <class TWork>
void InUpdate(TCollection* ACollection, TWork AWork) {
  ACollection->BeginUpdate();
  try {
    AWork();
  } catch (...) {
    ACollection->EndUpdate();
    throw;
  }
  ACollection->EndUpdate();
}

}  // namespace

TCollection::~TCollection() {
  while (!FItems.empty()) {
    TCollectionItem* const Item = FItems.back();
    try {
      Item->Free();
    } catch (...) {  // one that refuses its end lives on without a collection
      Forget(Item);
      Item->FCollection = nullptr;
    }
  }
}

TCollectionItem* TCollection::Items(Integer AIndex) const {
  if (AIndex < 0 || AIndex >= Count()) ListIndexError(AIndex);
  return FItems[static_cast<std::size_t>(AIndex)];
}

TCollectionItem* TCollection::FindItemID(Integer AID) const noexcept {
  const auto Found = std::find_if(FItems.begin(), FItems.end(), [&](const auto* Item) { return Item->FID == AID; });
  return Found == FItems.end() ? nullptr : *Found;
}

TCollectionItem* TCollection::Add() { return FItemClass.Create(this); }

TCollectionItem* TCollection::Insert(Integer AIndex) {
  if (AIndex < 0 || AIndex > Count()) ListIndexError(AIndex);
  TCollectionItem* Result = nullptr;
  InUpdate(this, [&] {
    Result = Add();
    Result->SetIndex(AIndex);
  });
  return Result;
}

void TCollection::Delete(Integer AIndex) { Items(AIndex)->Free(); }

void TCollection::Clear() {
  InUpdate(this, [&] {
    while (!FItems.empty()) FItems.back()->Free();
  });
}

void TCollection::Assign(const TPersistent* ASource) {
  const auto* const Source = dynamic_cast<const TCollection*>(ASource);
  if (Source == nullptr) return TPersistent::Assign(ASource);
  if (Source == this) return;
  InUpdate(this, [&] {
    Clear();
    for (const TCollectionItem* const Item : *Source) Add()->Assign(Item);
  });
}

void TCollection::EndUpdate() {
  if (--FUpdateCount == 0 && std::exchange(FChanged, false)) Update(nullptr);
}

void TCollection::Changed(TCollectionItem* AItem) {
  if (FUpdateCount > 0) FChanged = true;
  else Update(AItem);
}

void TCollection::Enter(TCollectionItem* AItem) {
  FItems.push_back(AItem);
  AItem->FID = FNextID++;
  Added(AItem);
  Changed(nullptr);
}

void TCollection::Forget(const TCollectionItem* AItem) noexcept { std::erase(FItems, AItem); }

}  // namespace zq
