#pragma once

#include <atomic>
#include <memory>

#include "common/uZqClasses/counting.h"
#include "runtime/containers/lists.h"
#include "runtime/core/delegates.h"
#include "runtime/core/interfaces.h"

namespace zq {

class TFiler;

namespace uZqClasses {
inline constexpr TResStringRec _SObjRefCountNotZero{
    65507, u"An instance of %s is destroyed while it's refcount is not 0!"};
}  // namespace uZqClasses

struct ZQ_API IZqObjectFreeNotificationEvent : Extends<IZqObject> {
  static constexpr TGUID IID = "{BBECB66F-1397-4FFA-AFE5-C7BD63A1EAC6}"_guid;
  /// AObject is going; to drop pointers to it.
  virtual void OnObjectDestroyed(TObject* AObject) = 0;

 protected:
  ~IZqObjectFreeNotificationEvent() = default;
};

struct ZQ_API IZqObjectEx : Extends<IZqObject> {
  static constexpr TGUID IID = "{66D757F3-6274-47EC-95A9-39B144271EA9}"_guid;
  /// One-sided: only this object forgets AObject.
  virtual void RemoveNotification(const TObject* AObject) = 0;
  /// Links both ways, as far as AObject can; it must not be empty.
  virtual void FreeNotificationEx(const IntfRef<IZqObjectFreeNotificationEvent>& AObject) = 0;
  /// Undoes that on both sides.
  virtual void RemoveFreeNotificationEx(const IntfRef<IZqObject>& AObject) = 0;

 protected:
  ~IZqObjectEx() = default;
};

enum class TZqObjectOwnership : std::uint8_t { ooReference, ooOwned };
using enum TZqObjectOwnership;

struct ZQ_API IZqObjectAdapter : Extends<IInterface> {
  static constexpr TGUID IID = "{6C25403A-FB3F-4F23-87AC-8DD56330109B}"_guid;
  /// The object behind the adapter, which stays its owner's or the adapter's by GetOwnership.
  virtual TObject* GetObject() = 0;
  virtual TZqObjectOwnership GetOwnership() = 0;

 protected:
  ~IZqObjectAdapter() = default;
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

}  // namespace zq
