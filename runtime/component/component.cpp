#include "runtime/component/component.h"

#include <algorithm>
#include <mutex>

#include "runtime/containers/lists.h"

namespace zq {

// ---- TObservers ----------------------------------------------------------------------------------------------------

void TObservers::Offer(Integer AID, const UnicodeString& AMember) { FOffers[AID].Member = AMember; }

UnicodeString TObservers::Member(Integer AID) const {
  const auto Found = FOffers.find(AID);
  return Found == FOffers.end() ? UnicodeString() : Found->second.Member;
}

void TObservers::AddObserver(Integer AID, const TObserver& AObserver) {
  const auto Found = FOffers.find(AID);
  if (Found == FOffers.end())
    throw EInvalidOperation(u"The component offers nothing to observe under the id %d", {AID});
  Found->second.Observers.push_back(AObserver);
}

void TObservers::RemoveObserver(Integer AID, const TObserver& AObserver) {
  if (const auto Found = FOffers.find(AID); Found != FOffers.end()) std::erase(Found->second.Observers, AObserver);
}

void TObservers::Changed(Integer AID, bool ACommitted) {
  const auto Found = FOffers.find(AID);
  if (Found == FOffers.end()) return;
  const auto& Present = Found->second.Observers;
  const auto Told = Present;
  for (const TObserver& Observer : Told)
    if (std::find(Present.begin(), Present.end(), Observer) != Present.end()) Observer(ACommitted);
}

// ---- TComponent ----------------------------------------------------------------------------------------------------

namespace {

// Guards FWatchers and FWatched of all components; no call out is made under it.
constinit std::mutex LinkLock;

bool IsLetter(char16_t AChar) noexcept {
  return (AChar >= u'A' && AChar <= u'Z') || (AChar >= u'a' && AChar <= u'z') || AChar == u'_' || AChar > 0x7F;
}
bool IsDigit(char16_t AChar) noexcept { return AChar >= u'0' && AChar <= u'9'; }

bool IsIdentifier(std::u16string_view AText) noexcept {
  return !AText.empty() && IsLetter(AText.front()) &&
         std::all_of(AText.begin(), AText.end(), [](char16_t c) { return IsLetter(c) || IsDigit(c); });
}

}  // namespace

TComponent::TComponent(TComponent* AOwner) : FOwner(AOwner) {
  if (AOwner != nullptr) AOwner->FComponents.push_back(this);
}

TComponent::~TComponent() {  // finds something to undo only where the construction failed
  while (!FComponents.empty()) {
    TComponent* const Component = FComponents.back();
    try {
      Component->Free();
    } catch (...) {  // one that refuses its end lives on without an owner
      Detach(Component);
    }
  }
  try {
    TellWatchers();
    if (FOwner != nullptr) FOwner->RemoveComponent(this);
  } catch (...) {  // a destructor has nobody to tell
  }
  if (FOwner != nullptr) FOwner->Detach(this);
  Unlink();
}

void TComponent::AfterConstruction() {
  Implements::AfterConstruction();
  if (FOwner != nullptr) FOwner->Notification(this, opInsert);
}

void TComponent::BeforeDestruction() {
  MarkDestroying(true);
  while (!FComponents.empty()) FComponents.back()->Free();
  TellWatchers();
  if (FOwner != nullptr) FOwner->RemoveComponent(this);
  Unlink();
  Implements::BeforeDestruction();
}

void TComponent::EndRefused() noexcept {
  MarkDestroying(false);
  Implements::EndRefused();
}

void TComponent::MarkDestroying(bool AOn) noexcept {
  SetStateFlag(csDestroying, AOn);
  for (TComponent* const Component : FComponents) Component->MarkDestroying(AOn);
}

TComponentState TComponent::ComponentState() const noexcept {
  TComponentState Result;
  const Byte State = FState.load(std::memory_order_acquire);
  for (const TComponentStateFlag Flag : {csLoading, csReading, csWriting, csDestroying})
    if ((State >> static_cast<unsigned>(Flag) & 1U) != 0) Result.Include(Flag);
  return Result;
}

void TComponent::SetStateFlag(TComponentStateFlag AFlag, bool AOn) noexcept {
  const auto Bit = static_cast<Byte>(1U << static_cast<unsigned>(AFlag));
  if (AOn) FState.fetch_or(Bit, std::memory_order_acq_rel);
  else FState.fetch_and(static_cast<Byte>(~Bit), std::memory_order_acq_rel);
}

// ---- Names and owners

void TComponent::SetName(const UnicodeString& AName) {
  if (AName == FName) return;
  if (!AName.IsEmpty() && !IsIdentifier(AName)) throw EComponentError(u"'%s' is not a valid component name", {AName});
  CheckName(AName, FOwner);
  FName = AName;
}

// Raises where AOwner has another component of that name.
void TComponent::CheckName(const UnicodeString& AName, const TComponent* AOwner) const {
  const TComponent* const Found = AOwner == nullptr || AName.IsEmpty() ? nullptr : AOwner->FindComponent(AName);
  if (Found != nullptr && Found != this)
    throw EComponentError(u"The owner has another component with the name %s", {AName});
}

TComponent* TComponent::Components(Integer AIndex) const {
  if (AIndex < 0 || AIndex >= ComponentCount()) ListIndexError(AIndex);
  return FComponents[static_cast<std::size_t>(AIndex)];
}

TComponent* TComponent::FindComponent(const UnicodeString& AName) const {
  if (AName.IsEmpty()) return nullptr;
  const auto Found = std::find_if(FComponents.begin(), FComponents.end(),
      [&](const TComponent* Component) { return SameText(Component->FName, AName); });
  return Found == FComponents.end() ? nullptr : *Found;
}

void TComponent::InsertComponent(TComponent* AComponent) {
  if (AComponent->FOwner == this) return;
  AComponent->CheckName(AComponent->FName, this);
  if (AComponent->FOwner != nullptr) AComponent->FOwner->RemoveComponent(AComponent);
  FComponents.push_back(AComponent);
  AComponent->FOwner = this;
  Notification(AComponent, opInsert);
}

void TComponent::RemoveComponent(TComponent* AComponent) {
  if (AComponent->FOwner != this) return;
  Notification(AComponent, opRemove);
  Detach(AComponent);
}

void TComponent::Detach(TComponent* AComponent) noexcept {
  std::erase(FComponents, AComponent);
  AComponent->FOwner = nullptr;
}

// ---- Free notification

void TComponent::FreeNotification(TComponent* AComponent) {
  const std::lock_guard Guard(LinkLock);
  if (FTelling != 0 || std::find(FWatchers.begin(), FWatchers.end(), AComponent) != FWatchers.end()) return;
  AComponent->FWatched.push_back(this);
  FWatchers.push_back(AComponent);
}

void TComponent::RemoveFreeNotification(TComponent* AComponent) {
  const std::lock_guard Guard(LinkLock);
  std::erase(FWatchers, AComponent);
  std::erase(AComponent->FWatched, this);
}

void TComponent::TellWatchers() {
  struct TTelling {
    explicit TTelling(Integer& ADepth) : Depth(ADepth) { Change(1); }
    ~TTelling() { Change(-1); }
    void Change(Integer ABy) const {
      const std::lock_guard Guard(LinkLock);
      Depth += ABy;
    }
    Integer& Depth;
  } const Telling(FTelling);
  for (;;) {
    std::unique_lock Guard(LinkLock);
    if (FWatchers.empty()) return;
    TComponent* const Watcher = FWatchers.back();
    FWatchers.pop_back();
    std::erase(Watcher->FWatched, this);
    Guard.unlock();
    Watcher->Notification(this, opRemove);
  }
}

void TComponent::Unlink() noexcept {
  const std::lock_guard Guard(LinkLock);
  for (TComponent* const Watched : FWatched) std::erase(Watched->FWatchers, this);
  for (TComponent* const Watcher : FWatchers) std::erase(Watcher->FWatched, this);
  FWatched.clear();
  FWatchers.clear();
}

// ---- The rest

TObservers& TComponent::GetObservers() {
  if (FObservers == nullptr) FObservers = std::make_unique<TObservers>();
  return *FObservers;
}

HRESULT TComponent::QueryInterface(const TGUID& AIID, void** AObj) {
  return GetInterface(AIID, AObj) ? S_OK : E_NOINTERFACE;
}

void TComponent::UpdateRegistry(bool, const UnicodeString&, const UnicodeString&) {}

void TComponent::Loaded() { SetStateFlag(csLoading, false); }

void TComponent::ReadState(TReader*) {}

void TComponent::WriteState(TWriter*) {}

}  // namespace zq
