#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <thread>
#include <vector>

#include "runtime/component/component.h"
#include "runtime/component/create_options.h"
#include "runtime/core/delegates.h"
#include "runtime/core/interfaces.h"
#include "runtime/values/variants.h"

namespace zq {

/// A malformed expression, or one that names what isn't there.
struct ZQ_API EBindingError : Exception {
  using Exception::Exception;
};

/// An object and the name that it bears in expressions.
struct TBindingAssociation {
  TObject* Object;
  UnicodeString Name;
};
[[nodiscard]] inline TBindingAssociation Associate(TObject* AObject, const UnicodeString& AName) {
  return {AObject, AName};
}

/// Where the names of an expression are looked up.
struct ZQ_API IScope : Extends<IInterface> {
  static constexpr TGUID IID = "{7B0D6A52-53D4-4C0B-9B1E-5D0A3C5E8F21}"_guid;
  /// The object of that name, in any case; nullptr if none.
  virtual TObject* Lookup(const UnicodeString& AName) = 0;

 protected:
  ~IScope() = default;
};

/// Makes what is written out of what was read.
using TValueConverter = TMethod<Variant(const Variant& AValue)>;

class TBindingManager;

/// A property at the end of a path, "name.Property" or "name.Outer.Inner": the name is looked up once, the properties
/// at each use.
class ZQ_API TBindingPath {
 public:
  /// Raises EBindingError, also for a property that isn't there now.
  TBindingPath(const UnicodeString& AExpression, const TArray<IntfRef<IScope>>& AScopes);

  [[nodiscard]] TObject* Root() const noexcept { return FRoot; }
  // These raise EBindingError where an object on the path is missing or has no such property.
  [[nodiscard]] Variant Read() const;
  void Write(const Variant& AValue) const;
  /// The object whose property the path ends at.
  [[nodiscard]] TObject* Holder() const;
  [[nodiscard]] const UnicodeString& Property() const noexcept { return FNames.back(); }
  /// Whether the path leads over that property of AObject; an empty name stands for any.
  [[nodiscard]] bool LeadsOver(const TObject* AObject, const UnicodeString& AProperty) const;

 private:
  void Check(TObject* AObject, const UnicodeString& AProperty) const;

  UnicodeString FExpression;
  TObject* FRoot = nullptr;
  std::vector<UnicodeString> FNames;  // of the properties
};

/// Carries the value of an input path to an output path when it is notified. Its manager owns it. It belongs, with the
/// objects that it binds, to the thread that made it.
///
/// Where a component at the root of either path goes, the expression ends its work; it is not disposed of by that.
class ZQ_API TBindingExpression : public TComponent {
 public:
  TBindingExpression(TBindingPath AInput, TBindingPath AOutput, TValueConverter AConverter, TBindingManager& AManager,
      const TCreateOptions& AOptions);

  /// A call that comes while it is evaluating is ignored: two-way bindings come to rest.
  void Evaluate();
  [[nodiscard]] bool DependsOn(const TObject* AObject, const UnicodeString& AProperty) const;
  /// Whether this thread may ask: it made the expression, or AObject is where the path begins.
  [[nodiscard]] bool MayDependOn(const TObject* AObject) const noexcept {
    return FThread == std::this_thread::get_id() || FInput.Root() == AObject;
  }
  void Deactivate() noexcept { FActive.store(false, std::memory_order_release); }

 protected:
  ~TBindingExpression() override = default;
  void Notification(TComponent* AComponent, TOperation AOperation) override;

 private:
  TBindingPath FInput;
  TBindingPath FOutput;
  TValueConverter FConverter;
  TBindingManager& FManager;
  TCreateOptions FOptions;
  std::thread::id FThread = std::this_thread::get_id();
  std::atomic<bool> FActive = true;
  std::atomic<bool> FEvaluating = false;
};

/// Owns expressions. Any thread may use the manager, each for its own expressions.
class ZQ_API TBindingManager {
 public:
  TBindingManager() = default;
  TBindingManager(const TBindingManager&) = delete;
  TBindingManager& operator=(const TBindingManager&) = delete;

  /// The one that a nullptr stands for.
  [[nodiscard]] static TBindingManager& Default();

  void Add(std::shared_ptr<TBindingExpression> AExpression);
  /// Ends AExpression, whose pointer is dead then; nothing where it isn't here.
  void Remove(const TBindingExpression* AExpression);
  /// Evaluates those that depend on that property; an empty name stands for any. Those that other threads made are not
  /// asked, but where their path begins at AObject.
  void Notify(const TObject* AObject, const UnicodeString& AProperty);

 private:
  std::mutex FLock;  // no call out is made under it
  std::vector<std::shared_ptr<TBindingExpression>> FExpressions;
};

/// The engine's operations. Creation raises EBindingError for expressions that can't be compiled; all of them let out
/// what getters, setters and converters raise.
struct ZQ_API TBindings {
  [[nodiscard]] static IntfRef<IScope> CreateAssociationScope(TArray<TBindingAssociation> AAssociations);
  /// The manager owns the result, which RemoveBinding ends. A raise leaves nothing behind.
  static TBindingExpression* CreateManagedBinding(const TArray<IntfRef<IScope>>& AInputScopes,
      const UnicodeString& AInputExpression, const TArray<IntfRef<IScope>>& AOutputScopes,
      const UnicodeString& AOutputExpression, const TValueConverter& AConverter, TBindingManager* AManager,
      const TCreateOptions& AOptions = cDefaultCreateOptions);
  /// AExpression is dead then; nothing where the manager doesn't have it.
  static void RemoveBinding(TBindingExpression* AExpression, TBindingManager* AManager);
  /// Evaluates every expression that depends on that property of AObject; an empty name stands for all of them.
  static void Notify(const TObject* AObject, const UnicodeString& AProperty, TBindingManager* AManager);
};

/// Writes the value of a control to a property of a source component whenever the control's value changes.
///
/// The control must be observable for TObservers::ControlValueID.
class ZQ_API TLinkControlToProperty : public TComponent {
 public:
  explicit TLinkControlToProperty(TComponent* AOwner) : TComponent(AOwner) {}

  /// These end an active link first.
  void SetControlComponent(TComponent* AValue);
  void SetSourceComponent(TComponent* AValue);
  void SetComponentProperty(const UnicodeString& AValue);
  /// True: each change of the value is carried over; False: only committed ones.
  void SetTrack(bool AValue) noexcept { FTrack = AValue; }
  [[nodiscard]] bool Active() const noexcept { return FActive; }
  /// Switching it on raises EBindingError while control, source or property is missing; it carries nothing over.
  void SetActive(bool AValue);
  /// The control's property that bears its observable value.
  [[nodiscard]] UnicodeString ControlMember() const;

 protected:
  ~TLinkControlToProperty() override = default;
  void BeforeDestruction() override;
  void Notification(TComponent* AComponent, TOperation AOperation) override;

 private:
  void SetPart(TComponent*& APart, TComponent* AValue);
  void ControlChanged(bool ACommitted);

  TComponent* FControl = nullptr;
  TComponent* FSource = nullptr;
  UnicodeString FProperty;
  bool FTrack = false;
  bool FActive = false;
};

}  // namespace zq
