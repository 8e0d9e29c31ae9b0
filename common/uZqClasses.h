#pragma once

#include <atomic>
#include <memory>

#include "runtime/component/bindings.h"
#include "runtime/component/component.h"
#include "runtime/containers/lists.h"
#include "runtime/core/delegates.h"
#include "runtime/core/interfaces.h"

namespace zq {

namespace uZqClasses {
inline constexpr TResStringRec _SObjRefCountNotZero{
    65507, u"An instance of %s is destroyed while it's refcount is not 0!"};
inline constexpr TResStringRec _SCompRefCountNotZero{
    65508, u"An instance of %s with the name %s is destroyed while it's refcount is not 0!"};
inline constexpr TResStringRec _SEncodingNotSupported{65510, u"The specified encoding is not supported!"};

ZQ_API void Start();
}  // namespace uZqClasses

// ---- Interfaces ----------------------------------------------------------------------------------------------------

struct IZqObject : Extends<IInterface> {
  static constexpr TGUID IID = "{0417F540-9CCC-4DE6-B2C4-1063D0508346}"_guid;
  /// The object behind the interface.
  virtual TObject* Implementor() = 0;
};

struct IZqObjectFreeNotificationEvent : Extends<IZqObject> {
  static constexpr TGUID IID = "{BBECB66F-1397-4FFA-AFE5-C7BD63A1EAC6}"_guid;
  /// AObject is going; to drop pointers to it.
  virtual void OnObjectDestroyed(TObject* AObject) = 0;
};

struct IZqObjectEx : Extends<IZqObject> {
  static constexpr TGUID IID = "{66D757F3-6274-47EC-95A9-39B144271EA9}"_guid;
  /// One-sided: only this object forgets AObject.
  virtual void RemoveNotification(const TObject* AObject) = 0;
  /// Links both ways, as far as AObject can; it must not be empty.
  virtual void FreeNotificationEx(const IntfRef<IZqObjectFreeNotificationEvent>& AObject) = 0;
  /// Undoes that on both sides.
  virtual void RemoveFreeNotificationEx(const IntfRef<IZqObject>& AObject) = 0;
};

enum class TZqObjectOwnership : std::uint8_t { ooReference, ooOwned };
using enum TZqObjectOwnership;

struct IZqObjectAdapter : Extends<IInterface> {
  static constexpr TGUID IID = "{6C25403A-FB3F-4F23-87AC-8DD56330109B}"_guid;
  /// The object behind the adapter, which stays its owner's or the adapter's by GetOwnership.
  virtual TObject* GetObject() = 0;
  virtual TZqObjectOwnership GetOwnership() = 0;
};

/// What a count of zero means for an instance.
enum class TZqAutoDestroy : std::uint8_t {
  radComputed,  ///< not decided yet: the state of every new instance
  radFalse,     ///< _Release never destroys; the owner does
  radTrue,      ///< the _Release that brings the count to 0 destroys
};
using enum TZqAutoDestroy;

// ---- Counted objects -----------------------------------------------------------------------------------------------

/// A reference count and what it means when it is zero. Any thread.
class ZQ_API TZqRefCount {
 public:
  [[nodiscard]] Integer Value() const noexcept { return CountIn(FWord.load(std::memory_order_acquire)); }
  [[nodiscard]] TZqAutoDestroy State() const noexcept { return StateIn(FWord.load(std::memory_order_acquire)); }
  void SetState(TZqAutoDestroy AValue) noexcept;
  /// Counts up; with AClaim an undecided instance becomes radTrue.
  Integer Up(bool AClaim) noexcept;
  /// Counts down; AEnds tells whether the count became 0 while the state was radTrue, both read in the same step.
  Integer Down(bool& AEnds) noexcept;

 private:
  static constexpr UInt64 cOne = UInt64{1} << 32U;  // the count stands above the state and doesn't run into it
  static Integer CountIn(UInt64 AWord) noexcept { return static_cast<Integer>(AWord >> 32U); }
  static TZqAutoDestroy StateIn(UInt64 AWord) noexcept { return static_cast<TZqAutoDestroy>(AWord & 0xFFU); }

  std::atomic<UInt64> FWord = cOne;  // the construction's own, so that a reference in a constructor is no end
};

/// Lives by an owner or by its interface references, which each instance decides: the first reference makes it theirs,
/// unless SetAutoDestroy came before.
///
/// Free with a count other than 0 raises Exception (_SObjRefCountNotZero) and leaves the object alive; no _Release
/// destroys it after that. Counting may happen on any thread.
class ZQ_API TZqObject : public Implements<TObject, IZqObject> {
 public:
  TZqObject() = default;

  [[nodiscard]] Integer RefCount() const noexcept { return FCount.Value(); }
  [[nodiscard]] virtual bool GetAutoDestroy() const { return FCount.State() == radTrue; }
  [[nodiscard]] bool AutoDestroy() const { return GetAutoDestroy(); }
  /// Decides; there is no way back to undecided.
  void SetAutoDestroy(bool AValue) noexcept { FCount.SetState(AValue ? radTrue : radFalse); }

  HRESULT QueryInterface(const TGUID& AIID, void** AObj) override;
  Integer _AddRef() override;
  Integer _Release() override;
  TObject* Implementor() override { return this; }

 protected:
  ~TZqObject() override = default;
  void AfterConstruction() override;
  void BeforeDestruction() override;

  /// Keeps references that come and go within a scope from deciding over AObject or ending it. One that stays decides.
  class TNeutral {
   public:
    /// AObject may be nullptr.
    explicit TNeutral(TZqObject* AObject) noexcept : FObject(AObject) {
      if (FObject == nullptr) return;
      FKept = FObject->FCount.State();
      FCount = FObject->RefCount();
      FObject->FCount.SetState(radFalse);
    }
    TNeutral(const TNeutral&) = delete;
    TNeutral& operator=(const TNeutral&) = delete;
    ~TNeutral() {
      if (FObject == nullptr) return;
      const bool Claimed = FKept == radComputed && FObject->RefCount() > FCount;
      FObject->FCount.SetState(Claimed ? radTrue : FKept);
    }

   private:
    TZqObject* FObject;
    Integer FCount = 0;
    TZqAutoDestroy FKept = radComputed;
  };

 private:
  TZqRefCount FCount;
  std::atomic<bool> FDestroying = false;  // never cleared
};

using TZqObjectClass = TClassRef<TZqObject()>;

/// A counted object whose end is told to those it is linked with, and theirs to it.
///
/// Partners are told in BeforeDestruction, after the count was tested and while the object is still whole, in reverse
/// order of linking. Linking, unlinking and the end of linked objects need one thread at a time.
class ZQ_API TZqObjectEx : public Implements<TZqObject, IZqObjectFreeNotificationEvent, IZqObjectEx> {
 public:
  TZqObjectEx() = default;

  /// Links both ways; a second call changes nothing.
  void FreeNotification(TZqObjectEx* AObject);
  void RemoveFreeNotification(TZqObjectEx* AObject);
  void RemoveNotification(const TObject* AObject) override;
  /// A reference claims an object that was undecided so far: one that its owner frees needs SetAutoDestroy(false)
  /// first.
  void FreeNotificationEx(const IntfRef<IZqObjectFreeNotificationEvent>& AObject) override;
  void RemoveFreeNotificationEx(const IntfRef<IZqObject>& AObject) override;

  void OnObjectDestroyed(TObject*) override {}
  virtual void AssignTo(TZqObjectEx* ADest);
  virtual void DefineProperties(TFiler*) {}
  /// Copies ASource. Raises EConvertError (SAssignError) where neither side knows how, and for nullptr.
  virtual void Assign(TZqObjectEx* ASource);
  [[nodiscard]] virtual TZqObjectEx* GetOwner() { return nullptr; }
  /// The class name, behind the owner's path and "." where there is one.
  [[nodiscard]] virtual UnicodeString GetNamePath();

 protected:
  ~TZqObjectEx() override;
  void BeforeDestruction() override;
  [[noreturn]] void AssignError(const TZqObjectEx* ASource) const;
  /// The partners; nullptr while there are none.
  [[nodiscard]] const TListOf<TObject*>* FreeNotifies() const noexcept { return FFreeNotifies.get(); }

 private:
  bool AddPartner(TObject* AObject);
  void TellPartner(TObject* AObject);
  void TellPartners();

  std::unique_ptr<TListOf<TObject*>> FFreeNotifies;  // not owning; only while it holds something
};

using TZqFreeNotifiesOnNotify = TMethod<void(TObject* AObjectToBeDestroyed)>;

/// The two-way free notification for objects of any class: each partner's callback gets the owner of the one that goes.
///
/// Any thread may link and unlink. The end holds the lock of its own list while it takes the partners' and runs their
/// callbacks, so a callback must not wait for another thread that uses this instance, and two partners must not end at
/// the same time on two threads.
class ZQ_API TZqFreeNotifies : public TObject {
 public:
  /// The object that the callback is bound to is the one on whose behalf this instance notifies.
  explicit TZqFreeNotifies(TZqFreeNotifiesOnNotify AOnObjectDestroyedProc)
      : FOnObjectDestroyedProc(std::move(AOnObjectDestroyedProc)), FOwner(FOnObjectDestroyedProc.Object()) {}

  /// Links both ways.
  void Add(TZqFreeNotifies* AFreeNotifies);
  /// One-sided.
  void Remove(TZqFreeNotifies* AFreeNotifies);

 protected:
  ~TZqFreeNotifies() override = default;
  void BeforeDestruction() override;

 private:
  TZqFreeNotifiesOnNotify FOnObjectDestroyedProc;
  TThreadListOf<TZqFreeNotifies*> FList;
  TObject* FOwner;
};

/// Common ancestor of the purely counted classes.
class ZQ_API TZqInterfacedObject : public TInterfacedObject {
 protected:
  ~TZqInterfacedObject() override = default;
};

/// Puts an object of any class behind an interface. Asked through IZqObject, it answers with that object.
class ZQ_API TZqObjectAdapter : public Implements<TInterfacedObject, IZqObjectAdapter, IZqObject> {
 public:
  /// With ooOwned the adapter's end frees AObject.
  explicit TZqObjectAdapter(TObject* AObject, TZqObjectOwnership AOwnership = ooReference) noexcept
      : FObject(AObject), FOwnership(AOwnership) {}

  [[nodiscard]] TObject* Obj() { return GetObject(); }
  [[nodiscard]] TZqObjectOwnership ObjectOwnership() { return GetOwnership(); }
  void SetObjectOwnership(TZqObjectOwnership AValue) noexcept { FOwnership = AValue; }
  TObject* GetObject() override { return FObject; }
  TZqObjectOwnership GetOwnership() override { return FOwnership; }
  TObject* Implementor() override { return FObject; }

 protected:
  ~TZqObjectAdapter() override;
  void BeforeDestruction() override;

 private:
  TObject* FObject;
  TZqObjectOwnership FOwnership;
};

// ---- Components ----------------------------------------------------------------------------------------------------

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
  TListOf<TBindingExpression*> FBindings;  // the engine's
};

}  // namespace zq
