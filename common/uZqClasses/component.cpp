#include "common/uZqClasses/component.h"

#include "runtime/component/bindings.h"

namespace zq {

using namespace uZqClasses;

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
  FBindings.push_back(TBindings::CreateManagedBinding({TBindings::CreateAssociationScope({Associate(ASource, u"src")})},
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
  FBindings.clear();
}

void TZqComponent::NotifyBindings(const UnicodeString& APropertyName) {
  TBindings::Notify(this, APropertyName, nullptr);
}

}  // namespace zq
