#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <vector>

#include "runtime/core/delegates.h"
#include "runtime/core/interfaces.h"
#include "runtime/core/persistent.h"

namespace zq {

class TComponent;
class TReader;
class TWriter;

enum class TOperation : std::uint8_t { opInsert, opRemove };
using enum TOperation;

enum class TComponentStateFlag : std::uint8_t { csLoading, csReading, csWriting, csDestroying };
using enum TComponentStateFlag;
using TComponentState = TSet<TComponentStateFlag>;

using TNotifyEvent = TMethod<void(TObject*)>;

/// What observers of a component can follow: kinds of observation, each named by an id and bound to one property.
/// One thread at a time.
class ZQ_API TObservers {
 public:
  static constexpr Integer ControlValueID = 4;

  /// Hears of a change; ACommitted is false for one that the user is still at.
  using TObserver = TMethod<void(bool ACommitted)>;

  /// Makes the component observable: AMember is the property whose value AID stands for.
  void Offer(Integer AID, const UnicodeString& AMember);
  [[nodiscard]] bool CanObserve(Integer AID) const { return FOffers.contains(AID); }
  /// Empty where AID is not offered.
  [[nodiscard]] UnicodeString Member(Integer AID) const;
  /// Raises EInvalidOperation where AID is not offered.
  void AddObserver(Integer AID, const TObserver& AObserver);
  void RemoveObserver(Integer AID, const TObserver& AObserver);
  /// Called by the component when the value has changed. Observers may come and go meanwhile.
  void Changed(Integer AID, bool ACommitted);

 private:
  struct TOffer {
    UnicodeString Member;
    std::vector<TObserver> Observers;
  };
  std::map<Integer, TOffer> FOffers;
};

/// Base of named, owned objects. Made by New, ended by Free or by its owner.
///
/// An owner's end ends its components, from the last to the first. The order of an end, all of it in BeforeDestruction
/// while the object is whole: csDestroying is set here and in all that is owned; the owned components end; those who
/// asked for FreeNotification are told, last come first; the owner is told and lets go. Where a component refuses
/// its end (its BeforeDestruction raises), the raise comes out of its owner's Free: the owner lives on with that
/// component and those not yet reached, nobody has been told of the owner's end, and csDestroying is cleared, so that
/// Free can be called again later.
///
/// Counts are ignored: _AddRef and _Release return -1. A component belongs to one thread at a time; only
/// FreeNotification and RemoveFreeNotification may be called from any. Two linked components must not end at the same
/// time on two threads.
class ZQ_API TComponent : public Implements<TPersistent, IInterface> {
 public:
  explicit TComponent(TComponent* AOwner);

  [[nodiscard]] TComponent* Owner() const noexcept { return FOwner; }
  [[nodiscard]] const UnicodeString& Name() const noexcept { return FName; }
  /// Takes an identifier or nothing: a letter or "_", then these and digits; characters above U+007F count as letters.
  /// Raises EComponentError for anything else, and where the owner has another component of that name.
  virtual void SetName(const UnicodeString& AName);
  [[nodiscard]] TComponentState ComponentState() const noexcept;
  [[nodiscard]] Integer ComponentCount() const noexcept { return static_cast<Integer>(FComponents.size()); }
  /// In order of insertion, from 0. Raises EListError.
  [[nodiscard]] TComponent* Components(Integer AIndex) const;
  /// The owned component of that name, in any case; nullptr if none.
  [[nodiscard]] TComponent* FindComponent(const UnicodeString& AName) const;

  /// Takes AComponent over from its owner. Raises EComponentError where its name is taken here.
  void InsertComponent(TComponent* AComponent);
  /// Lets go of AComponent, which then has no owner.
  void RemoveComponent(TComponent* AComponent);
  /// AComponent gets Notification(this, opRemove) when this component goes, once however often it asked, and also out
  /// of that Notification.
  void FreeNotification(TComponent* AComponent);
  void RemoveFreeNotification(TComponent* AComponent);
  /// Made on first use; lives as long as the component.
  [[nodiscard]] TObservers& GetObservers();
  /// For descendants that are COM classes: enters or removes what the registry has to know of one. Nothing here.
  virtual void UpdateRegistry(bool ARegister, const UnicodeString& AClassID, const UnicodeString& AProgID);

  HRESULT QueryInterface(const TGUID& AIID, void** AObj) override;
  Integer _AddRef() override { return -1; }
  Integer _Release() override { return -1; }

 protected:
  ~TComponent() override;
  void AfterConstruction() override;
  void BeforeDestruction() override;
  void EndRefused() noexcept override;
  /// AComponent came to this owner, or one that this component owns or asked about is going. Must not raise.
  virtual void Notification(TComponent*, TOperation) {}
  /// The component has been read from a stream: clears csLoading.
  virtual void Loaded();
  /// Read and write the component's own part of a stream. Nothing here.
  virtual void ReadState(TReader* AReader);
  virtual void WriteState(TWriter* AWriter);
  void SetStateFlag(TComponentStateFlag AFlag, bool AOn) noexcept;
  /// Tells those who asked for FreeNotification, who then have to ask again. BeforeDestruction does it.
  void TellWatchers();

 private:
  void CheckName(const UnicodeString& AName, const TComponent* AOwner) const;
  void Detach(TComponent* AComponent) noexcept;
  void MarkDestroying(bool AOn) noexcept;
  void Unlink() noexcept;

  TComponent* FOwner = nullptr;
  UnicodeString FName;
  std::vector<TComponent*> FComponents;
  std::vector<TComponent*> FWatchers;  // told of this component's end
  std::vector<TComponent*> FWatched;   // those whose FWatchers hold this component
  Integer FTelling = 0;                // above 0 while the watchers are being told
  std::atomic<Byte> FState = 0;        // a bit for each TComponentStateFlag
  std::unique_ptr<TObservers> FObservers;
};

}  // namespace zq
