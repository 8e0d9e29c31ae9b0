#pragma once

#include <vector>

#include "common/uZqClasses/counting.h"
#include "runtime/component/component.h"
#include "runtime/component/create_options.h"

namespace zq {

class TBindingExpression;

namespace uZqClasses {
inline constexpr TResStringRec _SCompRefCountNotZero{
    65508, u"An instance of %s with the name %s is destroyed while it's refcount is not 0!"};
}  // namespace uZqClasses

/// A component with the count-or-own choice of TZqObject, and with its properties bound to those of other objects.
///
/// One with an owner stays its owner's when it is referenced, unless SetAutoDestroy(true) was called. An end with a
/// count other than 0 raises Exception (_SCompRefCountNotZero) before anything is undone. Counting may happen on any
/// thread; binding and clearing belong on one.
class ZQ_API TZqComponent : public Implements<TComponent, IZqObject> {
 public:
  explicit TZqComponent(TComponent* AOwner) : Implements(AOwner) {}

  [[nodiscard]] Integer RefCount() const noexcept { return FCount.Value(); }
  [[nodiscard]] virtual bool GetAutoDestroy() const { return FCount.State() == radTrue; }
  [[nodiscard]] bool AutoDestroy() const { return GetAutoDestroy(); }
  void SetAutoDestroy(bool AValue) noexcept { FCount.SetState(AValue ? radTrue : radFalse); }

  /// Two-way: AProperty follows ABindToProperty of ABindToObj and leads it. Raises what the engine raises; what was
  /// bound before that stays. An ABindToObj that is no component must outlive the binding.
  void Bind(const UnicodeString& AProperty, TObject* ABindToObj, const UnicodeString& ABindToProperty,
      const TCreateOptions& ACreateOptions = cDefaultCreateOptions);
  /// The same with the value of a control, which must be observable for TObservers::ControlValueID.
  void Bind(const UnicodeString& AProperty, TComponent* ABindToCtrl,
      const TCreateOptions& ACreateOptions = cDefaultCreateOptions);
  /// Ends what Bind made, but for the links of controls, which go with the component.
  void ClearBindings();
  /// For setters: lets what is bound to the property follow.
  void NotifyBindings(const UnicodeString& APropertyName);

  Integer _AddRef() override;
  Integer _Release() override;
  TObject* Implementor() override { return this; }

 protected:
  ~TZqComponent() override;
  void AfterConstruction() override;
  void BeforeDestruction() override;

 private:
  void BindOneWay(TObject* ASource, const UnicodeString& ASourceProperty, TObject* ADest,
      const UnicodeString& ADestProperty, const TCreateOptions& ACreateOptions);

  TZqRefCount FCount;
  std::vector<TBindingExpression*> FBindings;  // the engine's
};

}  // namespace zq
