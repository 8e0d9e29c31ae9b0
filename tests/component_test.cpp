#include "runtime/component/component.h"

#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "runtime/component/bindings.h"
#include "runtime/values/typeinfo.h"

namespace zq {
namespace {

/// Writes down what happens to it.
struct TProbe : TComponent {
  TProbe(TComponent* AOwner, std::string& ALog, const UnicodeString& AName = {}) : TComponent(AOwner), Log(ALog) {
    SetName(AName);
  }
  void Notification(TComponent* AComponent, TOperation AOperation) override {
    TComponent::Notification(AComponent, AOperation);
    if (AOperation == opRemove) AComponent->FreeNotification(this);  // of no use any more
    const char* const Sign = AComponent->ComponentState().Contains(csDestroying) ? "!" : "-";
    Log += Name().ToUTF8() + (AOperation == opInsert ? "+" : Sign) + AComponent->Name().ToUTF8();
    Log += dynamic_cast<TProbe*>(AComponent) == nullptr ? "? " : " ";
  }
  void AfterConstruction() override {
    TComponent::AfterConstruction();
    if (FailNext) throw EInvalidOperation(u"no");
  }
  void BeforeDestruction() override {
    if (Refuses) throw EInvalidOperation(u"no");
    TComponent::BeforeDestruction();
  }
  ~TProbe() override { Log += "~" + Name().ToUTF8() + " "; }

  std::string& Log;
  bool Refuses = false;
  static inline bool FailNext = false;
};

TEST(Component, NamesAreIdentifiersAndUniqueInTheirOwner) {
  std::string Log;
  const TOwned<TProbe> Owner(New<TProbe>(nullptr, Log)), Foreign(New<TProbe>(nullptr, Log, u"first"));
  auto* const First = New<TProbe>(Owner.get(), Log, u"First");
  auto* const Second = New<TProbe>(Owner.get(), Log);
  for (const char16_t* Bad : {u"1st", u"a b", u"a.b", u"FIRST"}) EXPECT_THROW(Second->SetName(Bad), EComponentError);
  for (const char16_t* Good : {u"_1", u"Größe", u""}) EXPECT_NO_THROW(Second->SetName(Good));
  EXPECT_EQ(Owner->FindComponent(u"first"), First);
  EXPECT_THROW(Owner->InsertComponent(Foreign.get()), EComponentError);
  TProbe::FailNext = true;
  EXPECT_THROW(static_cast<void>(New<TProbe>(Owner.get(), Log, u"failed")), EInvalidOperation);
  TProbe::FailNext = false;
  EXPECT_EQ(Owner->ComponentCount(), 2);
  EXPECT_TRUE(Log.ends_with("+failed ~failed -failed? ")) << Log;
}

TEST(Component, AnEndIsToldOfWholeObjectsAndARefusedOneLeavesTheOwnerAlive) {
  std::string Log;
  auto* const Owner = New<TProbe>(nullptr, Log, u"o");
  TProbe *const First = New<TProbe>(Owner, Log, u"a"), *const Stubborn = New<TProbe>(Owner, Log, u"s");
  New<TProbe>(Owner, Log, u"z")->FreeNotification(First);
  const TOwned<TProbe> Watcher(New<TProbe>(nullptr, Log, u"w")), Dropped(New<TProbe>(nullptr, Log, u"d"));
  auto* const Gone = New<TProbe>(nullptr, Log, u"g");
  for (TProbe* const Asking : {Watcher.get(), Watcher.get(), Dropped.get(), Gone}) Owner->FreeNotification(Asking);
  Owner->RemoveFreeNotification(Dropped.get());
  Gone->Free();
  EXPECT_EQ(std::exchange(Log, ""), "o+a o+s o+z ~g ");
  Stubborn->Refuses = true;
  EXPECT_THROW(Owner->Free(), EInvalidOperation);
  EXPECT_EQ(std::exchange(Log, ""), "a!z o!z ~z ");
  EXPECT_EQ(Stubborn->Owner(), Owner);
  for (const TComponent* const Alive : {Owner, First}) EXPECT_FALSE(Alive->ComponentState().Contains(csDestroying));
  Stubborn->Refuses = false;
  Owner->Free();
  EXPECT_EQ(std::exchange(Log, ""), "o!s ~s o!a ~a w!o ~o ");
}

// ---- Bindings ------------------------------------------------------------------------------------------------------

struct TNode : TComponent {
  TNode() : TComponent(nullptr) {}
  void SetValue(Integer AValue) {
    Value = AValue;
    ++Writes;
    TBindings::Notify(this, u"Value", nullptr);
  }
  void SetNext(TNode* ANext) {
    Next = ANext;
    TBindings::Notify(this, u"Next", nullptr);
  }
  UnicodeString Text;
  Integer Value = 0, Writes = 0;
  TNode* Next = nullptr;
};

struct Bindings : testing::Test {
  Bindings() {
    DescribeType<TNode>(u"component_test")
        .Property(u"Value", &TNode::Value, &TNode::SetValue)
        .Property(u"Text", &TNode::Text, [](TNode& ANode, const UnicodeString& AText) { ANode.Text = AText; })
        .Property(u"Next", &TNode::Next, &TNode::SetNext);
  }
  ~Bindings() override {
    for (TBindingExpression* const Expression : Made) TBindings::RemoveBinding(Expression, nullptr);
  }
  void Bind(TObject* ASource, const UnicodeString& AInput, TObject* ADest, const UnicodeString& AOutput,
      const TCreateOptions& AOptions = cDefaultCreateOptions, const TValueConverter& AConverter = nullptr) {
    Made.push_back(
        TBindings::CreateManagedBinding({TBindings::CreateAssociationScope({Associate(ASource, u"src")})}, AInput,
            {TBindings::CreateAssociationScope({Associate(ADest, u"dst")})}, AOutput, AConverter, nullptr, AOptions));
  }
  std::vector<TBindingExpression*> Made;
  const TOwned<TNode> A{New<TNode>()}, B{New<TNode>()}, C{New<TNode>()};
};

TEST_F(Bindings, CarryValuesAtOnceAndAtEachNoticeAlongTheirPath) {
  A->SetNext(B.get());
  B->SetValue(7);
  Bind(A.get(), u"src.Next.Value", C.get(), u"DST.text");
  EXPECT_EQ(C->Text, u"7");
  Bind(
      B.get(), u"src.Value", C.get(), u"dst.Value", {}, [](const Variant& V) { return Variant(VarToInteger(V) * 10); });
  EXPECT_EQ(C->Value, 0) << "coEvaluate was left out";
  B->SetValue(8);
  EXPECT_EQ(C->Text, u"8");
  EXPECT_EQ(C->Value, 80);
  TBindings::RemoveBinding(Made.back(), nullptr);
  Made.pop_back();
  const TOwned<TNode> Other(New<TNode>());
  Other->SetValue(9);
  A->SetNext(Other.get());
  EXPECT_EQ(C->Text, u"9") << "the path leads over Next";
  B->SetValue(1);
  EXPECT_EQ(C->Text, u"9") << "the path has left B";
  EXPECT_EQ(C->Value, 80);
}

TEST_F(Bindings, NeitherFailedOnesNorThoseOfTheGoneWriteAnyMore) {
  for (const char16_t* Bad :
      {u"", u"src", u"src.", u".Value", u"src..Value", u"dst.Value", u"src.Colour", u"src.Next.Value"})
    EXPECT_THROW(Bind(A.get(), Bad, B.get(), u"dst.Value"), EBindingError) << UnicodeString(Bad).ToUTF8();
  A->Text = u"word";
  EXPECT_ANY_THROW(Bind(A.get(), u"src.Text", B.get(), u"dst.Value"));
  TNode *const Source = New<TNode>(), *const Dest = New<TNode>();
  Bind(Source, u"src.Value", B.get(), u"dst.Value");
  Bind(A.get(), u"src.Value", Dest, u"dst.Value");
  Dest->Free();
  Source->Free();
  B->Writes = 0;
  A->SetValue(1);
  TBindings::Notify(A.get(), u"", nullptr);
  TBindings::Notify(Source, u"Value", nullptr);
  EXPECT_EQ(B->Writes, 0);
  auto* const Doomed = New<TNode>();
  Bind(A.get(), u"src.Value", Doomed, u"dst.Value", {}, [&](const Variant& V) { return Doomed->Free(), V; });
  A->SetValue(2);
}

TEST_F(Bindings, OfAnotherThreadFollowTheObjectTheyBeginAt) {
  Bind(A.get(), u"src.Value", B.get(), u"dst.Value", {});
  std::thread([&] { A->SetValue(3); }).join();
  EXPECT_EQ(B->Value, 3);
}

}  // namespace
}  // namespace zq
