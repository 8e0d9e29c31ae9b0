#include "common/uZqClasses.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "runtime/core/typeinfo.h"

namespace zq {
namespace {

struct TCountedThing : TZqObject {
  explicit TCountedThing(int& AEnds) : Ends(AEnds) {}
  ~TCountedThing() override { ++Ends; }
  void BeforeDestruction() override {
    TZqObject::BeforeDestruction();
    const IntfRef<IZqObject> HandedOut(this);
  }
  int& Ends;
};

TEST(CountedObject, BelongsToItsReferencesUnlessItsOwnerCameFirst) {
  int Ends = 0;
  auto* Object = New<TCountedThing>(Ends);
  EXPECT_EQ(Object->RefCount(), 0);
  EXPECT_FALSE(Object->AutoDestroy());
  { const IntfRef<IZqObject> Ref(Object); }
  EXPECT_EQ(Ends, 1) << "once, although the end itself hands out a reference";
  Object = New<TCountedThing>(Ends);
  Object->SetAutoDestroy(false);
  { const IntfRef<IZqObject> Ref(Object); }
  EXPECT_EQ(Ends, 1);
  Object->Free();
  EXPECT_EQ(Ends, 2);
}

TEST(CountedObject, RefusesToBeFreedWhileItIsCounted) {
  int Ends = 0;
  auto* const Object = New<TCountedThing>(Ends);
  std::optional<IntfRef<IZqObject>> Ref(Object);
  try {
    Object->Free();
    FAIL();
  } catch (const Exception& e) {
    EXPECT_EQ(e.Message(), u"An instance of TCountedThing is destroyed while it's refcount is not 0!");
  }
  Ref.reset();
  EXPECT_EQ(Ends, 0) << "its destruction had begun: no reference ends it any more";
  Object->Free();
  EXPECT_EQ(Ends, 1);
}

TEST(LockFreeCount, ReferencesOfManyThreadsEndTheObjectOnce) {
  int Ends = 0;
  std::vector<std::thread> Threads;
  {
    const IntfRef<IZqObject> Ref(New<TCountedThing>(Ends));
    for (int t = 0; t < 4; ++t)
      Threads.emplace_back([Ref] {
        for (int i = 0; i < 1000; ++i) IntfRef<IZqObject>(Ref).Reset();
      });
  }
  for (auto& Thread : Threads) Thread.join();
  EXPECT_EQ(Ends, 1);
}

// ---- Linked objects
// --------------------------------------------------------------------------------------------------

struct TLinked : TZqObjectEx {
  TLinked(std::string& ALog, const char* AName) : Log(ALog), Name(AName) {}
  void OnObjectDestroyed(TObject* AObject) override {
    Log += std::string(Name) + "<" + dynamic_cast<TLinked&>(*AObject).Name + " ";
  }
  ~TLinked() override { Log += std::string("~") + Name + " "; }
  [[nodiscard]] int Partners() const { return FreeNotifies() == nullptr ? 0 : FreeNotifies()->Count(); }
  [[nodiscard]] bool HasList() const { return FreeNotifies() != nullptr; }
  TZqObjectEx* GetOwner() override { return Owner; }
  std::string& Log;
  const char* Name;
  TZqObjectEx* Owner = nullptr;
};

TEST(LinkedObjects, AreToldInReverseOrderAndForgetEachOther) {
  std::string Log;
  auto* const A = New<TLinked>(Log, "a");
  const TOwned<TLinked> B(New<TLinked>(Log, "b")), C(New<TLinked>(Log, "c")), D(New<TLinked>(Log, "d"));
  A->SetAutoDestroy(false);
  C->SetAutoDestroy(true);
  for (TLinked* const Partner : {B.get(), D.get(), C.get(), B.get()}) A->FreeNotification(Partner);
  B->FreeNotificationEx(A);
  EXPECT_EQ(A->Partners(), 3);
  D->RemoveNotification(B.get());
  A->RemoveNotification(D.get());
  EXPECT_EQ(A->Partners(), 2);
  EXPECT_EQ(D->Partners(), 1) << "one-sided";
  D->RemoveFreeNotificationEx(A);
  A->Free();
  EXPECT_EQ(Log, "c<a b<a ~a ");
  for (const auto* const Partner : {B.get(), C.get(), D.get()}) EXPECT_FALSE(Partner->HasList());
  EXPECT_TRUE(C->AutoDestroy());
  EXPECT_FALSE(B->AutoDestroy());
}

/// Linked through the interfaces alone.
struct TForeign : Implements<TInterfacedObject, IZqObjectFreeNotificationEvent, IZqObjectEx> {
  TObject* Implementor() override { return this; }
  void OnObjectDestroyed(TObject* AObject) override { Gone = AObject; }
  void RemoveNotification(const TObject* AObject) override { std::erase(Links, AObject); }
  void FreeNotificationEx(const IntfRef<IZqObjectFreeNotificationEvent>& AObject) override {
    Links.push_back(AObject->Implementor());
  }
  void RemoveFreeNotificationEx(const IntfRef<IZqObject>&) override {}
  std::vector<const TObject*> Links;
  TObject* Gone = nullptr;
};

TEST(LinkedObjects, LinkWithOtherFamiliesThroughInterfaces) {
  std::string Log;
  auto* const Foreign = New<TForeign>();
  const IntfRef<IZqObjectFreeNotificationEvent> Ref(Foreign);
  auto* const Object = New<TLinked>(Log, "a");
  Object->FreeNotificationEx(Ref);
  Object->FreeNotificationEx(Ref);
  EXPECT_EQ(Foreign->Links, std::vector<const TObject*>{Object});
  EXPECT_FALSE(Object->AutoDestroy()) << "being handed over decided nothing";
  Object->Free();
  EXPECT_EQ(Foreign->Gone, Object);
  EXPECT_TRUE(Foreign->Links.empty());
}

TEST(LinkedObjects, AssignNamesBothClassesAndPathsGoOwnerFirst) {
  std::string Log;
  const TOwned<TLinked> A(New<TLinked>(Log, "a")), B(New<TLinked>(Log, "b"));
  const TOwned<TZqObjectEx> Plain(New<TZqObjectEx>());
  try {
    A->Assign(Plain.get());
    FAIL();
  } catch (const EConvertError& e) {
    EXPECT_EQ(e.Message(), u"Cannot assign a TZqObjectEx to a TLinked");
  }
  EXPECT_THROW(A->Assign(nullptr), EConvertError);
  B->Owner = Plain.get();
  A->Owner = B.get();
  EXPECT_EQ(A->GetNamePath(), u"TZqObjectEx.TLinked.TLinked");
}

TEST(LinkedObjects, FreeNotifiesServeObjectsOfAnyClass) {
  struct TUser : TObject {
    ~TUser() override { FreeAndNil(Notifies); }
    void Told(TObject* AObject) { Gone.push_back(AObject); }
    TZqFreeNotifies* Notifies = New<TZqFreeNotifies>(TZqFreeNotifiesOnNotify::Of<&TUser::Told>(this));
    std::vector<TObject*> Gone;
  };
  TUser Left, Parted;
  std::optional<TUser> Going(std::in_place);
  TObject* const Gone = &*Going;
  for (TUser* const User : {&Left, &Parted}) {
    User->Notifies->Add(Going->Notifies);
    Going->Notifies->Add(User->Notifies);
  }
  Parted.Notifies->Remove(Going->Notifies);
  Going->Notifies->Remove(Parted.Notifies);
  Going.reset();
  EXPECT_EQ(Left.Gone, std::vector{Gone});
  EXPECT_TRUE(Parted.Gone.empty());
}

TEST(ObjectAdapter, AnswersWithItsObjectAndEndsItOnlyWhenItOwnsIt) {
  for (const TZqObjectOwnership Ownership : {ooReference, ooOwned}) {
    int Ends = 0;
    auto* const Object = New<TCountedThing>(Ends);
    {
      const IntfRef<IZqObjectAdapter> Adapter(New<TZqObjectAdapter>(Object, Ownership));
      EXPECT_EQ(Adapter->GetOwnership(), Ownership);
      EXPECT_EQ(Adapter.As<IZqObject>()->Implementor(), Object);
    }
    EXPECT_EQ(Ends, Ownership == ooOwned ? 1 : 0);
    if (Ownership == ooReference) Object->Free();
  }
}

// ---- Components
// ------------------------------------------------------------------------------------------------------

class TPart : public TZqComponent {
 public:
  using TZqComponent::TZqComponent;
  ~TPart() override {
    if (Ends != nullptr) ++*Ends;
  }
  [[nodiscard]] Integer Size() const { return FSize; }
  void SetSize(Integer AValue) {
    if (std::exchange(FSize, AValue) != AValue) NotifyBindings(u"Size");
  }
  /// As a control does when its user has typed.
  void Type(Integer AValue) {
    SetSize(AValue);
    GetObservers().Changed(TObservers::ControlValueID, false);
  }
  int* Ends = nullptr;

 private:
  Integer FSize = 0;
};

class Components : public testing::Test {
 protected:
  Components() { DescribeType<TPart>(u"uZqClasses_test").Property(u"Size", &TPart::Size, &TPart::SetSize); }
  TPart* Make(TComponent* AOwner) {
    auto* const Result = New<TPart>(AOwner);
    Result->Ends = &Ends;
    return Result;
  }
  int Ends = 0;
};

TEST_F(Components, AReferenceClaimsOnlyThoseWithoutAnOwner) {
  { const IntfRef<IZqObject> Ref(Make(nullptr)); }
  EXPECT_EQ(Ends, 1);
  const TOwned<TPart> Owner(Make(nullptr));
  auto* const Owned = Make(Owner.get());
  { const IntfRef<IZqObject> Ref(Owned); }
  EXPECT_EQ(Ends, 1);
  EXPECT_FALSE(Owned->AutoDestroy());
  Owned->SetAutoDestroy(true);
  { const IntfRef<IZqObject> Ref(Owned); }
  EXPECT_EQ(Ends, 2);
  EXPECT_EQ(Owner->ComponentCount(), 0);
}

TEST_F(Components, ACountedOneSurvivesWholeWhoeverFreesIt) {
  auto* const Owner = Make(nullptr);
  auto* const Owned = Make(Owner);
  Owned->SetName(u"Part");
  IntfRef<IZqObject> Ref(Owned);
  for (TObject* const Freed : {static_cast<TObject*>(Owned), static_cast<TObject*>(Owner)}) try {
      Freed->Free();
      FAIL();
    } catch (const Exception& e) {
      EXPECT_EQ(e.Message(), u"An instance of TPart with the name Part is destroyed while it's refcount is not 0!");
    }
  EXPECT_EQ(Owned->Owner(), Owner);
  EXPECT_EQ(Ref.As<IZqObject>()->Implementor(), Owned);
  Ref.Reset();
  EXPECT_EQ(Ends, 0);
  Owner->Free();
  EXPECT_EQ(Ends, 2);
}

TEST_F(Components, BoundPropertiesLeadAndFollowUntilTheyAreCleared) {
  const TOwned<TPart> B(Make(nullptr));
  auto* const A = Make(nullptr);
  for (const Integer Size : {3, 5}) {
    A->SetSize(Size);
    A->Bind(u"Size", B.get(), u"Size");
    EXPECT_EQ(B->Size(), Size);
    B->SetSize(Size + 1);
    EXPECT_EQ(A->Size(), Size + 1);
    if (Size == 3) A->ClearBindings();
    if (Size == 3) A->SetSize(9);
    EXPECT_EQ(B->Size(), Size + 1);
  }
  EXPECT_THROW(A->Bind(u"Size", B.get(), u"Colour"), EBindingError);
  A->Free();
  B->SetSize(7);
}

TEST_F(Components, AControlLeadsAndFollowsThePropertyAndMayGoFirst) {
  const TOwned<TPart> Part(Make(nullptr));
  auto* const Control = Make(nullptr);
  EXPECT_THROW(Part->Bind(u"Size", Control), EAssertionFailed);
  Control->GetObservers().Offer(TObservers::ControlValueID, u"Size");
  Part->SetSize(1);
  Part->Bind(u"Size", Control);
  EXPECT_EQ(Control->Size(), 1);
  Control->Type(2);
  EXPECT_EQ(Part->Size(), 2);
  Part->SetSize(3);
  EXPECT_EQ(Control->Size(), 3);
  Part->ClearBindings();
  Control->Type(4);
  EXPECT_EQ(Part->Size(), 4) << "the link is a component and stays";
  Control->Free();
  Part->SetSize(5);
  EXPECT_EQ(Part->ComponentCount(), 1);
}

}  // namespace
}  // namespace zq
