#include "runtime/component/bindings.h"

#include <algorithm>
#include <iterator>

#include "runtime/values/typeinfo.h"

namespace zq {

namespace {

class TAssociationScope : public Implements<TInterfacedObject, IScope> {
 public:
  explicit TAssociationScope(std::vector<TBindingAssociation> AAssociations) noexcept
      : FAssociations(std::move(AAssociations)) {}
  TObject* Lookup(const UnicodeString& AName) override {
    const auto Found = std::find_if(FAssociations.begin(), FAssociations.end(),
        [&](const TBindingAssociation& Association) { return SameText(Association.Name, AName); });
    return Found == FAssociations.end() ? nullptr : Found->Object;
  }

 protected:
  ~TAssociationScope() override = default;

 private:
  std::vector<TBindingAssociation> FAssociations;
};

std::vector<UnicodeString> SplitAtDots(std::u16string_view AText) {
  std::vector<UnicodeString> Result;
  for (;;) {
    const std::size_t Dot = AText.find(u'.');
    Result.push_back(Trim(AText.substr(0, Dot)));
    if (Dot == std::u16string_view::npos) return Result;
    AText.remove_prefix(Dot + 1);
  }
}

TBindingManager& Resolve(TBindingManager* AManager) {
  return AManager == nullptr ? TBindingManager::Default() : *AManager;
}

}  // namespace

// ---- TBindingPath --------------------------------------------------------------------------------------------------

TBindingPath::TBindingPath(const UnicodeString& AExpression, const TArray<IntfRef<IScope>>& AScopes)
    : FExpression(AExpression), FNames(SplitAtDots(AExpression)) {
  const bool Malformed = std::any_of(FNames.begin(), FNames.end(), [](const auto& Name) { return Name.IsEmpty(); });
  if (Malformed || FNames.size() < 2) throw EBindingError(u"'%s' doesn't have the form name.Property", {AExpression});
  for (const auto& Scope : AScopes)
    if (FRoot == nullptr) FRoot = Scope->Lookup(FNames.front());
  if (FRoot == nullptr) throw EBindingError(u"'%s' begins with a name that no scope has", {AExpression});
  FNames.erase(FNames.begin());
  Check(Holder(), Property());
}

// Raises unless AObject is there and has the property.
void TBindingPath::Check(TObject* AObject, const UnicodeString& AProperty) const {
  if (AObject == nullptr) throw EBindingError(u"'%s': there is no object to ask for %s", {FExpression, AProperty});
  if (GetPropInfo(AObject, AProperty) == nullptr)
    throw EBindingError(u"'%s': %s has no property %s", {FExpression, AObject->ClassName(), AProperty});
}

TObject* TBindingPath::Holder() const {
  TObject* Result = FRoot;
  for (std::size_t i = 0; i + 1 < FNames.size(); ++i) {
    Check(Result, FNames[i]);
    Result = GetObjectProp(Result, FNames[i]);
  }
  return Result;
}

Variant TBindingPath::Read() const {
  TObject* const Object = Holder();
  Check(Object, Property());
  return GetPropValue(Object, Property(), false);
}

void TBindingPath::Write(const Variant& AValue) const {
  TObject* const Object = Holder();
  Check(Object, Property());
  SetPropValue(Object, Property(), AValue);
}

bool TBindingPath::LeadsOver(const TObject* AObject, const UnicodeString& AProperty) const {
  const auto IsMeant = [&](const UnicodeString& Name) { return AProperty.IsEmpty() || SameText(Name, AProperty); };
  if (std::none_of(FNames.begin(), FNames.end(), IsMeant)) return false;  // before any getter is called
  TObject* Object = FRoot;
  for (std::size_t i = 0; Object != nullptr; ++i) {
    if (Object == AObject && IsMeant(FNames[i])) return true;
    Object = i + 1 < FNames.size() ? GetObjectProp(Object, FNames[i]) : nullptr;
  }
  return false;
}

// ---- TBindingExpression --------------------------------------------------------------------------------------------

TBindingExpression::TBindingExpression(TBindingPath AInput, TBindingPath AOutput, TValueConverter AConverter,
    TBindingManager& AManager, const TCreateOptions& AOptions)
    : TComponent(nullptr),
      FInput(std::move(AInput)),
      FOutput(std::move(AOutput)),
      FConverter(std::move(AConverter)),
      FManager(AManager),
      FOptions(AOptions) {
  for (TObject* const Root : {FInput.Root(), FOutput.Root()})
    if (auto* const Component = dynamic_cast<TComponent*>(Root)) Component->FreeNotification(this);
}

void TBindingExpression::Notification(TComponent* AComponent, TOperation AOperation) {
  TComponent::Notification(AComponent, AOperation);
  if (AOperation == opRemove && (AComponent == FInput.Root() || AComponent == FOutput.Root())) Deactivate();
}

bool TBindingExpression::DependsOn(const TObject* AObject, const UnicodeString& AProperty) const {
  return FActive.load(std::memory_order_acquire) && FInput.LeadsOver(AObject, AProperty);
}

void TBindingExpression::Evaluate() {
  if (!FActive.load(std::memory_order_acquire) || FEvaluating.exchange(true)) return;
  struct TDone {
    ~TDone() { Flag.store(false); }
    std::atomic<bool>& Flag;
  } const Done{FEvaluating};
  // Getters and converters are the host's: one of them may end what is bound here.
  const auto IsActive = [this] { return FActive.load(std::memory_order_acquire); };
  Variant Value = FInput.Read();
  if (IsActive() && FConverter) Value = FConverter(Value);
  if (!IsActive()) return;
  FOutput.Write(Value);
  if (FOptions.Contains(coNotifyOutput) && FActive.load(std::memory_order_acquire))
    FManager.Notify(FOutput.Holder(), FOutput.Property());
}

// ---- TBindingManager -----------------------------------------------------------------------------------------------

TBindingManager& TBindingManager::Default() {
  static TBindingManager& Result = *new TBindingManager;
  return Result;
}

void TBindingManager::Add(std::shared_ptr<TBindingExpression> AExpression) {
  const std::lock_guard Guard(FLock);
  FExpressions.push_back(std::move(AExpression));
}

void TBindingManager::Remove(const TBindingExpression* AExpression) {
  std::shared_ptr<TBindingExpression> Removed;  // ends behind the lock
  const std::lock_guard Guard(FLock);
  const auto Found = std::find_if(FExpressions.begin(), FExpressions.end(),
      [&](const auto& Expression) { return Expression.get() == AExpression; });
  if (Found == FExpressions.end()) return;
  Removed = std::move(*Found);
  FExpressions.erase(Found);
  Removed->Deactivate();
}

void TBindingManager::Notify(const TObject* AObject, const UnicodeString& AProperty) {
  // The expressions of other threads stay out of it: their objects are not to be touched, nor kept from their end.
  std::vector<std::shared_ptr<TBindingExpression>> Expressions;
  std::unique_lock Guard(FLock);
  std::copy_if(FExpressions.begin(), FExpressions.end(), std::back_inserter(Expressions),
      [&](const auto& AExpression) { return AExpression->MayDependOn(AObject); });
  Guard.unlock();
  for (const auto& Expression : Expressions)
    if (Expression->DependsOn(AObject, AProperty)) Expression->Evaluate();
}

// ---- TBindings -----------------------------------------------------------------------------------------------------

IntfRef<IScope> TBindings::CreateAssociationScope(TArray<TBindingAssociation> AAssociations) {
  return New<TAssociationScope>(std::move(AAssociations));
}

TBindingExpression* TBindings::CreateManagedBinding(const TArray<IntfRef<IScope>>& AInputScopes,
    const UnicodeString& AInputExpression, const TArray<IntfRef<IScope>>& AOutputScopes,
    const UnicodeString& AOutputExpression, const TValueConverter& AConverter, TBindingManager* AManager,
    const TCreateOptions& AOptions) {
  TBindingManager& Manager = Resolve(AManager);
  const std::shared_ptr<TBindingExpression> Result(
      New<TBindingExpression>(TBindingPath(AInputExpression, AInputScopes),
          TBindingPath(AOutputExpression, AOutputScopes), AConverter, Manager, AOptions),
      TFreer());
  if (AOptions.Contains(coEvaluate)) Result->Evaluate();
  Manager.Add(Result);
  return Result.get();
}

void TBindings::RemoveBinding(TBindingExpression* AExpression, TBindingManager* AManager) {
  Resolve(AManager).Remove(AExpression);
}

void TBindings::Notify(const TObject* AObject, const UnicodeString& AProperty, TBindingManager* AManager) {
  Resolve(AManager).Notify(AObject, AProperty);
}

// ---- TLinkControlToProperty ----------------------------------------------------------------------------------------

void TLinkControlToProperty::SetPart(TComponent*& APart, TComponent* AValue) {
  SetActive(false);
  APart = AValue;
  if (AValue != nullptr) AValue->FreeNotification(this);
}

void TLinkControlToProperty::SetControlComponent(TComponent* AValue) { SetPart(FControl, AValue); }

void TLinkControlToProperty::SetSourceComponent(TComponent* AValue) { SetPart(FSource, AValue); }

void TLinkControlToProperty::SetComponentProperty(const UnicodeString& AValue) {
  SetActive(false);
  FProperty = AValue;
}

UnicodeString TLinkControlToProperty::ControlMember() const {
  return FControl == nullptr ? UnicodeString() : FControl->GetObservers().Member(TObservers::ControlValueID);
}

void TLinkControlToProperty::SetActive(bool AValue) {
  if (AValue == FActive) return;
  if (AValue && (FSource == nullptr || ControlMember().IsEmpty() || GetPropInfo(FSource, FProperty) == nullptr))
    throw EBindingError(u"A link needs an observable control and a property of a source component");
  const auto Observer = TObservers::TObserver::Of<&TLinkControlToProperty::ControlChanged>(this);
  if (AValue) FControl->GetObservers().AddObserver(TObservers::ControlValueID, Observer);
  else FControl->GetObservers().RemoveObserver(TObservers::ControlValueID, Observer);
  FActive = AValue;
}

void TLinkControlToProperty::ControlChanged(bool ACommitted) {
  if (FTrack || ACommitted) SetPropValue(FSource, FProperty, GetPropValue(FControl, ControlMember(), false));
}

void TLinkControlToProperty::Notification(TComponent* AComponent, TOperation AOperation) {
  TComponent::Notification(AComponent, AOperation);
  if (AOperation != opRemove) return;
  if (AComponent == FControl) SetControlComponent(nullptr);
  if (AComponent == FSource) SetSourceComponent(nullptr);
}

void TLinkControlToProperty::BeforeDestruction() {
  SetActive(false);
  TComponent::BeforeDestruction();
}

}  // namespace zq
