#include "common/uZqClasses.h"

#include "runtime/values/typeinfo.h"

namespace zq {

using namespace uZqClasses;

// ---- Counted objects -----------------------------------------------------------------------------------------------

Integer TZqRefCount::Up(bool AClaim) noexcept {
  const UInt64 Now = FWord.fetch_add(cOne, std::memory_order_relaxed) + cOne;
  if (AClaim && StateIn(Now) == radComputed) {
    UInt64 Seen = Now;
    while (StateIn(Seen) == radComputed && !FWord.compare_exchange_weak(Seen, Seen | static_cast<Byte>(radTrue)))
      continue;
  }
  return CountIn(Now);
}

Integer TZqRefCount::Down(bool& AEnds) noexcept {
  const UInt64 Now = FWord.fetch_sub(cOne, std::memory_order_acq_rel) - cOne;
  AEnds = CountIn(Now) == 0 && StateIn(Now) == radTrue;
  return CountIn(Now);
}

void TZqRefCount::SetState(TZqAutoDestroy AValue) noexcept {
  UInt64 Seen = FWord.load(std::memory_order_relaxed);
  while (!FWord.compare_exchange_weak(Seen, (Seen & ~UInt64{0xFF}) | static_cast<Byte>(AValue))) continue;
}

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

// ---- Components ----------------------------------------------------------------------------------------------------

TZqComponent::~TZqComponent() { ClearBindings(); }

Integer TZqComponent::_AddRef() { return FCount.Up(Owner() == nullptr); }

Integer TZqComponent::_Release() {
  bool Ends = false;
  const Integer Result = FCount.Down(Ends);
  if (Ends && !ComponentState().Contains(csDestroying)) Free();
  return Result;
}

void TZqComponent::AfterConstruction() {
  Implements::AfterConstruction();
  bool Ends = false;
  FCount.Down(Ends);
}

void TZqComponent::BeforeDestruction() {
  if (RefCount() != 0) throw Exception(_SCompRefCountNotZero, {ClassName(), Name()});
  ClearBindings();  // first: nothing of what ends now is to reach a setter
  Implements::BeforeDestruction();
}

void TZqComponent::BindOneWay(TObject* ASource, const UnicodeString& ASourceProperty, TObject* ADest,
    const UnicodeString& ADestProperty, const TCreateOptions& ACreateOptions) {
  FBindings.Add(TBindings::CreateManagedBinding({TBindings::CreateAssociationScope({Associate(ASource, u"src")})},
      u"src." + ASourceProperty, {TBindings::CreateAssociationScope({Associate(ADest, u"dst")})},
      u"dst." + ADestProperty, nullptr, nullptr, ACreateOptions));
}

void TZqComponent::Bind(const UnicodeString& AProperty, TObject* ABindToObj, const UnicodeString& ABindToProperty,
    const TCreateOptions& ACreateOptions) {
  BindOneWay(this, AProperty, ABindToObj, ABindToProperty, ACreateOptions);
  BindOneWay(ABindToObj, ABindToProperty, this, AProperty, ACreateOptions);
}

void TZqComponent::Bind(const UnicodeString& AProperty, TComponent* ABindToCtrl, const TCreateOptions& ACreateOptions) {
  Assert(ABindToCtrl->GetObservers().CanObserve(TObservers::ControlValueID));
  auto* const Link = New<TLinkControlToProperty>(this);
  Link->SetControlComponent(ABindToCtrl);
  Link->SetTrack(true);
  Link->SetSourceComponent(this);
  Link->SetComponentProperty(AProperty);
  Link->SetActive(true);
  BindOneWay(this, AProperty, ABindToCtrl, Link->ControlMember(), ACreateOptions);
}

void TZqComponent::ClearBindings() {
  for (TBindingExpression* const Expression : FBindings) TBindings::RemoveBinding(Expression, nullptr);
  FBindings.Clear();
}

void TZqComponent::NotifyBindings(const UnicodeString& APropertyName) {
  TBindings::Notify(this, APropertyName, nullptr);
}

void uZqClasses::Start() {
  DescribeType<TZqAutoDestroy>(u"uZqClasses").EnumNames({u"radComputed", u"radFalse", u"radTrue"});
  DescribeType<TZqObjectOwnership>(u"uZqClasses").EnumNames({u"ooReference", u"ooOwned"});
}

}  // namespace zq
