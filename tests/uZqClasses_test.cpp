#include "common/uZqClasses.h"

#include <thread>

#include "runtime/values/typeinfo.h"
#include "tests/support/support.h"

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
  IntfRef<IZqObject>(New<TCountedThing>(Ends)).Reset();
  EXPECT_EQ(Ends, 1) << "once, although the end itself hands out a reference";
  auto* const Object = New<TCountedThing>(Ends);
  Object->SetAutoDestroy(false);
  IntfRef<IZqObject>(Object).Reset();
  EXPECT_EQ(Ends, 1);
  Object->Free();
}

TEST(CountedObject, RefusesToBeFreedWhileItIsCounted) {
  int Ends = 0;
  auto* const Object = New<TCountedThing>(Ends);
  {
    const IntfRef<IZqObject> Ref(Object);
    EXPECT_EQ(RaisedBy([&] { Object->Free(); }),
        u"Exception: An instance of TCountedThing is destroyed while it's refcount is not 0!");
  }
  EXPECT_EQ(Ends, 0) << "its destruction had begun: no reference ends it any more";
  Object->Free();
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

// ---- Linked objects ------------------------------------------------------------------------------------------------

struct TLinked : TZqObjectEx {
  TLinked(std::string& ALog, const char* AName) : Log(ALog), Name(AName) {}
  void OnObjectDestroyed(TObject* AObject) override { Log += Name + "<" + dynamic_cast<TLinked&>(*AObject).Name + " "; }
  ~TLinked() override { Log += "~" + Name + " "; }
  [[nodiscard]] int Partners() const { return FreeNotifies() == nullptr ? 0 : FreeNotifies()->Count(); }
  std::string& Log;
  std::string Name;
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
  EXPECT_EQ(B->Partners() + C->Partners() + D->Partners(), 0);
  EXPECT_TRUE(C->AutoDestroy() && !B->AutoDestroy());
}

TEST(LinkedObjects, FreeNotifiesServeObjectsOfAnyClass) {
  struct TUser : TObject {
    ~TUser() override { FreeAndNil(Notifies); }
    void Told(TObject* AObject) { Gone = AObject; }
    TZqFreeNotifies* Notifies = New<TZqFreeNotifies>(TZqFreeNotifiesOnNotify::Of<&TUser::Told>(this));
    TObject* Gone = nullptr;
  };
  TUser Left, Parted;
  TOwned<TUser> Going(New<TUser>());
  TObject* const Gone = Going.get();
  for (TUser* const User : {&Left, &Parted}) User->Notifies->Add(Going->Notifies);
  Parted.Notifies->Remove(Going->Notifies);
  Going->Notifies->Remove(Parted.Notifies);
  Going.reset();
  EXPECT_EQ(Left.Gone, Gone);
  EXPECT_EQ(Parted.Gone, nullptr);
}

TEST(ObjectAdapter, AnswersWithItsObjectAndEndsItOnlyWhenItOwnsIt) {
  for (const TZqObjectOwnership Ownership : {ooReference, ooOwned}) {
    int Ends = 0;
    auto* const Object = New<TCountedThing>(Ends);
    {
      const IntfRef<IZqObjectAdapter> Adapter(New<TZqObjectAdapter>(Object, Ownership));
      EXPECT_EQ(Adapter.As<IZqObject>()->Implementor(), Object);
    }
    EXPECT_EQ(Ends, Ownership == ooOwned ? 1 : 0);
    if (Ownership == ooReference) Object->Free();
  }
}

struct TNested : TLinked {
  using TLinked::TLinked;
  TZqObjectEx* GetOwner() override { return Owner; }
  TZqObjectEx* Owner = nullptr;
};

TEST(LinkedObjects, TellTheirPathAndWhatTheyCannotTake) {
  std::string Log;
  const TOwned<TNested> Inner(New<TNested>(Log, "i")), Outer(New<TNested>(Log, "o"));
  EXPECT_EQ(Inner->GetNamePath(), u"TNested");
  Inner->Owner = Outer.get();
  EXPECT_EQ(Inner->GetNamePath(), u"TNested.TNested");
  EXPECT_EQ(RaisedBy([&] { Inner->Assign(nullptr); }), u"EConvertError: Cannot assign a nil to a TNested");
}

// ---- Components ----------------------------------------------------------------------------------------------------

struct TPart : TZqComponent {
  using TZqComponent::TZqComponent;
  ~TPart() override { ++Ends; }
  [[nodiscard]] Integer Size() const { return FSize; }
  void SetSize(Integer AValue) {
    if (std::exchange(FSize, AValue) != AValue) NotifyBindings(u"Size");
  }
  Integer FSize = 0;
  static inline int Ends = 0;
};

struct Components : testing::Test {
  Components() {
    DescribeType<TPart>(u"uZqClasses_test").Property(u"Size", &TPart::Size, &TPart::SetSize);
    TPart::Ends = 0;
  }
  const TOwned<TPart> Part{New<TPart>(nullptr)};
};

TEST_F(Components, AReferenceClaimsOnlyThoseWithoutAnOwner) {
  auto* const Owned = New<TPart>(Part.get());
  for (auto* const Object : {New<TPart>(nullptr), Owned}) const IntfRef<IZqObject> Ref(Object);
  EXPECT_EQ(TPart::Ends, 1);
  Owned->SetAutoDestroy(true);
  IntfRef<IZqObject>(Owned).Reset();
  EXPECT_EQ(TPart::Ends, 2);
  EXPECT_EQ(Part->ComponentCount(), 0);
}

TEST_F(Components, ACountedOneSurvivesWholeWhoeverFreesIt) {
  auto* const Owner = New<TPart>(nullptr);
  auto* const Owned = New<TPart>(Owner);
  Owned->SetName(u"Part");
  IntfRef<IZqObject> Ref(Owned);
  for (TPart* const Freed : {Owned, Owner})
    EXPECT_EQ(RaisedBy([&] { Freed->Free(); }),
        u"Exception: An instance of TPart with the name Part is destroyed while it's refcount is not 0!");
  EXPECT_EQ(Owned->Owner(), Owner);
  EXPECT_EQ(Ref.As<IZqObject>()->Implementor(), Owned);
  Ref.Reset();
  EXPECT_EQ(TPart::Ends, 0);
  Owner->Free();
  EXPECT_EQ(TPart::Ends, 2);
}

TEST_F(Components, BoundPropertiesLeadAndFollowUntilTheyAreCleared) {
  auto* const A = New<TPart>(nullptr);
  for (const Integer Size : {3, 5}) {
    A->SetSize(Size);
    A->Bind(u"Size", Part.get(), u"Size");
    EXPECT_EQ(Part->Size(), Size);
    Part->SetSize(Size + 1);
    EXPECT_EQ(A->Size(), Size + 1);
    A->ClearBindings();
    A->SetSize(9);
    EXPECT_EQ(Part->Size(), Size + 1);
  }
  A->Bind(u"Size", Part.get(), u"Size");
  EXPECT_THROW(A->Bind(u"Size", Part.get(), u"Colour"), EBindingError);
  A->Free();
  Part->SetSize(7);
}

TEST_F(Components, AControlLeadsAndFollowsThePropertyAndMayGoFirst) {
  auto* const Control = New<TPart>(nullptr);
  EXPECT_THROW(Part->Bind(u"Size", Control), EAssertionFailed);
  Control->GetObservers().Offer(TObservers::ControlValueID, u"Size");
  Part->SetSize(1);
  Part->Bind(u"Size", Control);
  EXPECT_EQ(Control->Size(), 1);
  Part->SetSize(3);
  EXPECT_EQ(Control->Size(), 3);
  for (const Integer Typed : {2, 4}) {
    Control->SetSize(Typed);
    Control->GetObservers().Changed(TObservers::ControlValueID, false);
    EXPECT_EQ(Part->Size(), Typed) << "the link is a component and stays";
    Part->ClearBindings();
  }
  Control->Free();
  Part->SetSize(5);
  EXPECT_EQ(Part->ComponentCount(), 1);
}

}  // namespace
}  // namespace zq
