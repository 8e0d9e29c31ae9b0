#include "common/uZqClasses.h"
#include "runtime/values/typeinfo.h"
#include "tests/support/support.h"

namespace zq {
namespace {

std::vector<UnicodeString> Lines(const TStrings& AStrings) { return {AStrings.begin(), AStrings.end()}; }
using TLines = std::vector<UnicodeString>;

TEST(FileStream, WritesTheBytesOfStrings) {
  const TTempFolder Folder;
  TZqFileStream File(Folder.File("x"), fmCreate);
  File.WriteString("a\xE9");
  File.WriteString(u"");
  File.WriteString(u"\u0141b");
  EXPECT_EQ(Folder.Read("x"), std::string("a\xE9\x41\x01\x62\x00", 6));
  TZqFileStream Full(u"/dev/full", fmOpenWrite);
  EXPECT_THROW(Full.WriteString("a"), EWriteError);
}

TEST(StringListOfPieces, LeavesEmptyOnesOut) {
  TZqStringList List;
  List.Add(u"old");
  List.Tokenize(u",a,, \"b,", u',');
  EXPECT_EQ(Lines(List), (TLines{u"a", u" \"b"}));
  List.Tokenize(List[1], u'"');
  EXPECT_EQ(Lines(List), (TLines{u" ", u"b"}));
  EXPECT_EQ(List.Delimiter(), u'"');
}

// ------------------------------------------------------------------------------------------------ Keys, descriptions

struct TChoices {
  const TOwned<TZqKeyDescStringList> Owned{New<TZqKeyDescStringList>(nullptr)};
  TZqKeyDescStringList& List = *Owned;
  [[nodiscard]] TLines Keys() const { return Lines(*List.KeyValues()); }
};

TEST(KeysAndDescriptions, AreFoundByEachOther) {
  TChoices Choices;
  auto& List = Choices.List;
  List.AddItem(5, u"five");
  List.AddItem(u"", u"none");
  List.AddItem(u"x", u"FIVE");
  const std::pair<Variant, const char16_t*> Cases[] = {{5, u"five"}, {std::int16_t{5}, u"five"}, {u"5", u"five"},
      {Int64{5}, u"five"}, {u"", u"none"}, {Null(), u"none"}, {Variant(), u"none"}, {u"X", u"FIVE"}, {6, u""}};
  for (const auto& [Key, Description] : Cases)
    EXPECT_EQ(List.GetDescription(Key), Description) << VarToStr(Key).ToUTF8();
  EXPECT_TRUE(List.GetStrKeyValue(u"Five") == u"5" && List.GetStrKeyValue(u"?").IsEmpty());
  EXPECT_TRUE(
      List.GetIntKeyValue(u"five") == 5 && List.GetIntKeyValue(u"none") == -1 && List.GetIntKeyValue(u"?") == -1);
}

TEST(KeysAndDescriptions, CountOnAndAreTakenFromLists) {
  TChoices Choices, Others;
  auto& List = Choices.List;
  List.AddItem(u"a", u"A");
  List.AddItem(u"B");
  List.AddItems(*List.Descriptions());
  EXPECT_EQ(Choices.Keys(), (TLines{u"a", u"1", u"2", u"3"}));
  Others.List.Assign(&List);
  List.Assign(List.KeyValues());
  EXPECT_EQ(Choices.Keys(), (TLines{u"0", u"1", u"2", u"3"}));
  EXPECT_EQ(Lines(*List.Descriptions()), Others.Keys());
  EXPECT_EQ(Lines(*Others.List.Descriptions()), (TLines{u"A", u"B", u"A", u"B"}));
  EXPECT_THROW(List.Assign(nullptr), EConvertError);
  List.Clear();
  EXPECT_TRUE(List.KeyValues()->Count() == 0 && List.Descriptions()->Count() == 0);
}

// ---------------------------------------------------------------------------------------------------- Object lists

template <class TBase>
struct TTold : TBase {
  explicit TTold(int& AEnds, std::function<void()> AAtEnd = {}) : Ends(AEnds), AtEnd(std::move(AAtEnd)) {}
  ~TTold() override {
    ++Ends;
    if (AtEnd) AtEnd();
  }
  int& Ends;
  std::function<void()> AtEnd;
};
using TPlain = TTold<TObject>;
using TInterfaced = TTold<TInterfacedObject>;
using TDeciding = TTold<TZqObject>;

TDeciding* Deciding(int& AEnds, bool AAutoDestroy) {
  auto* const Result = New<TDeciding>(AEnds);
  Result->SetAutoDestroy(AAutoDestroy);
  return Result;
}

TEST(ObjectListOfCounts, TakesAnObjectOutByEachWay) {
  const std::tuple<const char*, bool, std::function<TObject*(int&)>> Kinds[] = {
      {"interfaced", true, [](int& AEnds) { return New<TInterfaced>(AEnds); }},
      {"by count", true, [](int& AEnds) { return Deciding(AEnds, true); }},
      {"by owner", false, [](int& AEnds) { return Deciding(AEnds, false); }},
      {"undecided", false, [](int& AEnds) { return New<TDeciding>(AEnds); }},
      {"plain", false, [](int& AEnds) { return New<TPlain>(AEnds); }}};
  const std::tuple<const char*, bool, std::function<void(TZqObjectList&)>> Ways[] = {
      {"Delete", true, [](TZqObjectList& AList) { AList.Delete(0); }},
      {"Remove", true, [](TZqObjectList& AList) { AList.Remove(AList[0]); }},
      {"Extract", false, [](TZqObjectList& AList) { AList.Extract(0); }},
      {"Clear", true, [](TZqObjectList& AList) { AList.Clear(); }},
      {"SetItems", true, [](TZqObjectList& AList) { AList.SetItems(0, nullptr); }},
      {"end", true, [](TZqObjectList&) {}}};
  for (const auto& [Kind, Counted, Make] : Kinds)
    for (const auto& [Way, Deletes, TakeOut] : Ways)
      for (const bool Owns : {true, false}) {
        int Ends = 0;
        TObject* const Object = Make(Ends);
        {
          TZqObjectList List(Owns);
          ASSERT_EQ(List.Add(Object), Object);
          List.SetItems(0, Object);
          ASSERT_EQ(Ends, 0);
          TakeOut(List);
        }
        EXPECT_EQ(Ends, Counted || (Owns && Deletes) ? 1 : 0) << Kind << ", " << Way << ", " << Owns;
        if (Ends == 0) Object->Free();
      }
}

TEST(ObjectListOfCounts, HoldsACountForEachPlaceOfAnObject) {
  int Ends = 0;
  TZqObjectList List;
  auto* const Twice = New<TInterfaced>(Ends);
  for (int i = 0; i < 2; ++i) List.Add(Twice);
  IntfRef<IInterface> Kept(Twice);
  EXPECT_EQ(Twice->RefCount(), 3);
  List.Delete(0);
  EXPECT_EQ(List.Extract(0), Twice);
  EXPECT_TRUE(Twice->RefCount() == 1 && Ends == 0);
  List.Add(Twice);
  Kept.Reset();
  EXPECT_EQ(Ends, 0);
  List.Clear();
  EXPECT_EQ(Ends, 1);
}

TEST(ObjectListOfCounts, AnEndMayUseTheList) {
  int Ends = 0;
  TZqObjectList List;
  auto* const Other = New<TPlain>(Ends);
  List.Add(New<TInterfaced>(Ends, [&] { List.Remove(Other); }));
  List.Add(Other);
  List.Delete(0);
  EXPECT_TRUE(Ends == 2 && List.Count() == 0);
  auto* const Successor = New<TInterfaced>(Ends);
  List.Add(New<TInterfaced>(Ends, [Held = IntfRef<IInterface>(Successor)]() mutable { Held.Reset(); }));
  List.SetItems(0, Successor);
  EXPECT_TRUE(Ends == 3 && Successor->RefCount() == 1) << "the list's count came before the old one's end";
  List.SetItems(0, New<TInterfaced>(Ends, [&] { List.Clear(); }));
  List.Delete(0);
  EXPECT_EQ(Ends, 5);
}

TEST(ObjectListOfCounts, GoesByWhatItCountedWhateverAnObjectDecidesInIt) {
  int Ends = 0;
  TZqObjectList Owning, Borrowing(false);
  auto* const NoLonger = Deciding(Ends, true);
  auto* const Later = Deciding(Ends, false);
  for (TObject* const Object : {NoLonger, Later}) Owning.Add(Object);
  NoLonger->SetAutoDestroy(false);
  Later->SetAutoDestroy(true);
  Owning.Clear();
  EXPECT_EQ(Ends, 2);
  auto* const Gone = Borrowing.Add(New<TPlain>(Ends));
  Gone->Free();
  Borrowing.Clear();  // touches nothing of what is gone
  EXPECT_EQ(Ends, 3);
}

// ------------------------------------------------------------------------------------------------------- Memo list

struct TMemos {
  const TOwned<TZqMemoList> Owned{New<TZqMemoList>(nullptr)};
  TZqMemoListItems& Items = *Owned->Items();
  [[nodiscard]] TLines Codes() const {
    TLines Result;
    for (Integer i = 0; i < Items.Count(); ++i) Result.push_back(Items.GetCode(i));
    return Result;
  }
};

TEST(MemoList, FindsItemsInAnyCaseAndAddsNoCodeTwice) {
  TMemos Memos, Others;
  auto& Items = Memos.Items;
  TStringList Text;
  Text.Add(u"text");
  Items.Add(u"alpha", &Text);
  Items.Add(u"beta", nullptr);
  Text.Clear();
  EXPECT_EQ(RaisedBy([&] { Items.Add(u"Alpha", nullptr); }), u"EListError: There already is a memo with code Alpha!");
  EXPECT_EQ(
      RaisedBy([&] { (void)Memos.Owned->MemoByCode(u"x"); }), u"Exception: There is no MemoItem with the code x!");
  EXPECT_EQ(Lines(*Memos.Owned->MemoByCode(u"ALPHA")), (TLines{u"text"}));
  EXPECT_TRUE(Items.Find(u"BETA") == Items.GetItem(1) && Items.IndexOf(u"x") == -1 && Items.Find(u"x") == nullptr);
  Others.Owned->SetItems(&Items);
  Items.Remove(u"x");
  EXPECT_THROW(Items.Remove(Others.Items.GetItem(1)), EListError);
  EXPECT_THROW((void)Items.GetItem(2), EListError);
  Items.Remove(Items.GetItem(0));
  Items.SetItem(0, Others.Items.GetItem(0));
  EXPECT_EQ(Memos.Codes(), (TLines{u"alpha"}));
  EXPECT_EQ(Lines(*Items.GetItem(0)->Memo()), (TLines{u"text"}));
  Items.Add(u"c", nullptr);
  Items.SetCode(1, u"ALPHA");
  Items.Remove(u"alpha");
  EXPECT_EQ(Memos.Codes(), (TLines{u"ALPHA"}));
  Items.Remove(0);
  EXPECT_EQ(Others.Codes(), (TLines{u"alpha", u"beta"}));
}

TEST(MemoList, AssignsToItemsThroughAdd) {
  struct TOpen : TZqMemoListItems {
    using TZqMemoListItems::AssignTo;
    using TZqMemoListItems::TZqMemoListItems;
  };
  TOpen Source(nullptr);
  TMemos Memos;
  for (const char16_t* const Code : {u"a", u"b"}) Source.Add(Code, nullptr);
  Source.GetItem(0)->Memo()->Add(u"text");
  Memos.Items.Add(u"old", nullptr);
  for (TPersistent* const Dest : std::initializer_list<TPersistent*>{&Memos.Items, &Source}) Source.AssignTo(Dest);
  EXPECT_EQ(Memos.Codes(), (TLines{u"a", u"b"}));
  EXPECT_EQ(Lines(*Memos.Owned->MemoByCode(u"a")), Lines(*Source.GetItem(0)->Memo()));
  EXPECT_EQ(Source.Count(), 2);
  Source.SetCode(1, u"A");
  EXPECT_THROW(Source.AssignTo(&Memos.Items), EListError);
  EXPECT_THROW(Source.AssignTo(Memos.Owned.get()), EConvertError);
}

TEST(PublishedLists, CanBeReadAndAssignedByName) {
  TChoices Choices;
  TMemos Memos, Others;
  TStringList Text;
  Text.Add(u"x");
  for (const char16_t* const Name : {u"KeyValues", u"Descriptions"}) {
    SetPropValue(&Choices.List, Name, &Text);
    EXPECT_EQ(Lines(dynamic_cast<TStrings&>(*GetObjectProp(&Choices.List, Name))), (TLines{u"x"}));
  }
  EXPECT_EQ(Choices.List.GetDescription(u"x"), u"x");
  auto* const Item = Memos.Items.Add(u"a", nullptr);
  SetPropValue(Item, u"Code", u"b");
  SetPropValue(Item, u"Memo", &Text);
  SetPropValue(Others.Owned.get(), u"Items", GetObjectProp(Memos.Owned.get(), u"Items"));
  EXPECT_EQ(Lines(*Others.Owned->MemoByCode(u"b")), (TLines{u"x"}));
}

// -------------------------------------------------------------------------------------------------------- Pointers

TEST(Pointers, KeepOrdinalsAndRefuseWhatDoesNotFit) {
  constexpr Integer cLeast = std::numeric_limits<Integer>::min(), cMost = std::numeric_limits<Integer>::max();
  for (const Integer Ordinal : {cLeast, -1, 0, 1, cMost}) {
    EXPECT_EQ(ZqPtr2Int(ZqOrdinal2Ptr(Ordinal)), Ordinal);
    EXPECT_EQ(ZqInt2Ptr(Ordinal), ZqUInt2Ptr(static_cast<NativeUInt>(Ordinal)));
    void* P = ZqInt2Ptr(0);
    ZqIncPtr(P, Ordinal);
    EXPECT_EQ(ZqPtrDiffS(P, nullptr), Ordinal);
  }
  EXPECT_EQ(ZqPtr2UInt(ZqOrdinal2Ptr(0xFFFFFFFFU)), 0xFFFFFFFFU);
  for (const Int64 Value : {Int64{cMost} + 1, Int64{cLeast} - 1, Int64{0xFFFFFFFF}}) {
    EXPECT_THROW((void)ZqPtr2Int(ZqOrdinal2Ptr(Value)), EAssertionFailed);
    EXPECT_THROW((void)ZqPtrDiffS(ZqPtrAdd(&cMost, Value), &cMost), EAssertionFailed);
  }
}

TEST(Pointers, SplitIntoHalvesAndMoveByBytes) {
  void* const P = ZqCombinePtr(0xFFFFFFFE, 0x12345678);
  Cardinal Low = 0, High = 0;
  ZqSplitPtr(ZqPtrAdd(P, 1U), Low, High);
  EXPECT_TRUE(Low == 0xFFFFFFFF && High == 0x12345678);
  ZqSplitPtr(ZqPtrAdd(P, 2), Low, High);
  EXPECT_TRUE(Low == 0 && High == 0x12345679);
  EXPECT_EQ(ZqPtrDiff(ZqPtrAdd(P, Int64{1} << 40), P), NativeUInt{1} << 40);
  EXPECT_EQ(ZqPtrDiff(P, ZqPtrAdd(P, 1)), ~NativeUInt{0});
}

}  // namespace
}  // namespace zq
