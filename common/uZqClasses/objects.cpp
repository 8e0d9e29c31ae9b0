#include "common/uZqClasses/objects.h"

#include "runtime/core/persistent.h"

namespace zq {

using namespace uZqClasses;

// ---- Counted objects -----------------------------------------------------------------------------------------------

HRESULT TZqObject::QueryInterface(const TGUID& AIID, void** AObj) {
  return GetInterface(AIID, AObj) ? S_OK : E_NOINTERFACE;
}

Integer TZqObject::_AddRef() { return FCount.Up(true); }

Integer TZqObject::_Release() {
  // Asked before the count goes down: an owner may free the object as soon as it is 0.
  const bool Destroying = FDestroying.load(std::memory_order_acquire);
  bool Ends = false;
  const Integer Result = FCount.Down(Ends);
  if (Ends && !Destroying) Free();
  return Result;
}

void TZqObject::AfterConstruction() {
  Implements::AfterConstruction();
  bool Ends = false;
  FCount.Down(Ends);
}

void TZqObject::BeforeDestruction() {
  FDestroying.store(true, std::memory_order_release);
  if (RefCount() != 0) throw Exception(_SObjRefCountNotZero, {ClassName()});
  Implements::BeforeDestruction();
}

// ---- Linked objects ------------------------------------------------------------------------------------------------

TZqObjectEx::~TZqObjectEx() {  // finds partners only where the construction failed or a destructor made new ones
  while (FFreeNotifies != nullptr) {
    TObject* const Partner = FFreeNotifies->Last();
    try {
      TellPartner(Partner);
    } catch (...) {  // a destructor has nobody to tell, but the link must go
      const TNeutral Kept(dynamic_cast<TZqObject*>(Partner));
      if (const auto Other = Supports<IZqObjectEx>(Partner)) Other->RemoveNotification(this);
      RemoveNotification(Partner);
    }
  }
}

void TZqObjectEx::BeforeDestruction() {
  Implements::BeforeDestruction();
  TellPartners();
}

bool TZqObjectEx::AddPartner(TObject* AObject) {
  if (FFreeNotifies == nullptr) FFreeNotifies = std::make_unique<TListOf<TObject*>>();
  if (FFreeNotifies->IndexOf(AObject) >= 0) return false;
  FFreeNotifies->Add(AObject);
  return true;
}

void TZqObjectEx::FreeNotification(TZqObjectEx* AObject) {
  if (AddPartner(AObject)) AObject->FreeNotification(this);
}

void TZqObjectEx::FreeNotificationEx(const IntfRef<IZqObjectFreeNotificationEvent>& AObject) {
  TObject* const Partner = AObject->Implementor();
  if (auto* const Linked = dynamic_cast<TZqObjectEx*>(Partner)) return FreeNotification(Linked);
  if (!AddPartner(Partner)) return;
  const TNeutral Kept(this);
  if (const auto Other = AObject.Supports<IZqObjectEx>()) Other->FreeNotificationEx(this);
}

void TZqObjectEx::RemoveNotification(const TObject* AObject) {
  if (FFreeNotifies == nullptr) return;
  const Integer Last = FFreeNotifies->Count() - 1;
  if (FFreeNotifies->Last() == AObject) FFreeNotifies->Delete(Last);
  else FFreeNotifies->Remove(const_cast<TObject*>(AObject));
  if (FFreeNotifies->Count() == 0) FFreeNotifies.reset();
}

void TZqObjectEx::RemoveFreeNotification(TZqObjectEx* AObject) {
  RemoveNotification(AObject);
  AObject->RemoveNotification(this);
}

void TZqObjectEx::RemoveFreeNotificationEx(const IntfRef<IZqObject>& AObject) {
  RemoveNotification(AObject->Implementor());
  if (const auto Other = AObject.Supports<IZqObjectEx>()) Other->RemoveNotification(this);
}

void TZqObjectEx::TellPartner(TObject* AObject) {
  const TNeutral Kept(dynamic_cast<TZqObject*>(AObject));
  const auto Event = Supports<IZqObjectFreeNotificationEvent>(AObject);
  Assert(static_cast<bool>(Event));
  Event->OnObjectDestroyed(this);
  RemoveFreeNotificationEx(Event);
  RemoveNotification(AObject);  // an entry that isn't its own implementor
}

void TZqObjectEx::TellPartners() {
  while (FFreeNotifies != nullptr) TellPartner(FFreeNotifies->Last());
}

void TZqObjectEx::Assign(TZqObjectEx* ASource) {
  if (ASource == nullptr) AssignError(nullptr);
  ASource->AssignTo(this);
}

void TZqObjectEx::AssignTo(TZqObjectEx* ADest) { ADest->AssignError(this); }

void TZqObjectEx::AssignError(const TZqObjectEx* ASource) const {
  throw EConvertError(SAssignError, {ASource == nullptr ? UnicodeString(u"nil") : ASource->ClassName(), ClassName()});
}

UnicodeString TZqObjectEx::GetNamePath() {
  TZqObjectEx* const Owner = GetOwner();
  const UnicodeString Path = Owner == nullptr ? UnicodeString() : Owner->GetNamePath();
  return Path.IsEmpty() ? ClassName() : Path + u"." + ClassName();
}

void TZqFreeNotifies::Add(TZqFreeNotifies* AFreeNotifies) {
  if (FList.Locked()->IndexOf(AFreeNotifies) >= 0) return;
  FList.Add(AFreeNotifies);
  AFreeNotifies->Add(this);
}

void TZqFreeNotifies::Remove(TZqFreeNotifies* AFreeNotifies) { FList.Remove(AFreeNotifies); }

void TZqFreeNotifies::BeforeDestruction() {
  const auto List = FList.Locked();
  while (List->Count() > 0) {
    TZqFreeNotifies* const Partner = List->Last();
    Partner->Remove(this);
    try {
      Partner->FOnObjectDestroyedProc(FOwner);
    } catch (...) {  // this one lives on, and the partner, which has forgotten it, may go
      List->Remove(Partner);
      throw;
    }
    List->Remove(Partner);
  }
  TObject::BeforeDestruction();
}

// Finds an object only where the construction failed.
TZqObjectAdapter::~TZqObjectAdapter() { const TOwned<TObject> Left(FOwnership == ooOwned ? FObject : nullptr); }

void TZqObjectAdapter::BeforeDestruction() {
  Implements::BeforeDestruction();
  if (FOwnership == ooOwned) zq::Free(FObject);
  FObject = nullptr;
}

}  // namespace zq
