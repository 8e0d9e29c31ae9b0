#include "common/uZqClasses.h"
#include "runtime/values/typeinfo.h"
#include "tests/support/support.h"

namespace zq {
namespace {

TEST(SmallLists, FilesTakeTheBytesOfStringsAndPiecesLeaveEmptyOnesOut) {
  const TTempFolder Folder;
  TZqFileStream File(Folder.File("x"), fmCreate);
  File.WriteString("a\xE9");
  File.WriteString(u"\u0141b");
  EXPECT_EQ(Folder.Read("x"), std::string("a\xE9\x41\x01\x62\x00", 6));
  TZqStringList List;
  List.Tokenize(u",a,, \"b and more,", u',');
  List.Tokenize(List[1], u'"');
  EXPECT_EQ(List.Text() + List.Delimiter(), u" \r\nb and more\r\n\"");
}

TEST(KeysAndDescriptions, AreFoundByEachOtherAndCountOn) {
  const TOwned<TZqKeyDescStringList> List(New<TZqKeyDescStringList>(nullptr));
  List->AddItem(5, u"five");
  List->AddItem(u"x", (*List->KeyValues())[0]);
  const std::pair<Variant, const char16_t*> Cases[] = {{5, u"five"}, {u"5", u"five"}, {Null(), u""}, {u"X", u"5"}};
  for (const auto& [Key, Description] : Cases) EXPECT_EQ(List->GetDescription(Key), Description);
  EXPECT_TRUE(List->GetStrKeyValue(u"Five") == u"5" && List->GetIntKeyValue(u"?") == -1);
  List->AddItems(*List->Descriptions());
  EXPECT_EQ(List->KeyValues()->Text(), u"5\r\nx\r\n2\r\n3\r\n");
  List->Assign(List->KeyValues());
  EXPECT_EQ(List->Descriptions()->Text() + List->KeyValues()->Text(), u"5\r\nx\r\n2\r\n3\r\n0\r\n1\r\n2\r\n3\r\n");
  List->Clear();
  EXPECT_EQ(List->KeyValues()->Count() + List->Descriptions()->Count(), 0);
}

// ---------------------------------------------------------------------------------------------------- Object lists

template <class TBase>
struct TTold : TBase {
  explicit TTold(
      int& AEnds, std::function<void()> AAtEnd = [] {})
      : Ends(AEnds), AtEnd(std::move(AAtEnd)) {}
  ~TTold() override { ++Ends, AtEnd(); }
  int& Ends;
  std::function<void()> AtEnd;
};
enum TKind : std::uint8_t { Plain, Undecided, ByOwner, ByCount, Interfaced };

TObject* Make(TKind AKind, int& AEnds) {
  if (AKind == Plain) return New<TTold<TObject>>(AEnds);
  if (AKind == Interfaced) return New<TTold<TInterfacedObject>>(AEnds);
  auto* const Result = New<TTold<TZqObject>>(AEnds);
  if (AKind != Undecided) Result->SetAutoDestroy(AKind == ByCount);
  return Result;
}

TEST(ObjectListOfCounts, EndsWhatItHoldsTheLastCountOnByEveryWayOut) {
  const std::function<void(TZqObjectList&)> Ways[] = {[](auto& AList) { AList.Extract(0); },
      [](auto& AList) { AList.Delete(0); }, [](auto& AList) { AList.SetItems(0, nullptr); }, [](auto&) {}};
  for (const TKind Kind : {Plain, Undecided, ByOwner, ByCount, Interfaced})
    for (const auto& Way : Ways)
      for (const bool Owns : {true, false}) {
        int Ends = 0;
        TObject* const Object = Make(Kind, Ends);
        {
          TZqObjectList List(Owns);
          ASSERT_EQ(List.Add(Object), Object);
          List.SetItems(0, Object);
          Way(List);
        }
        EXPECT_EQ(Ends, Kind >= ByCount || (Owns && &Way != Ways) ? 1 : 0) << Kind << " " << &Way - Ways << Owns;
        if (Ends == 0) Object->Free();
      }
}

TEST(ObjectListOfCounts, AnEndMayUseTheListAndAnObjectMayBeInItTwice) {
  int Ends = 0;
  TZqObjectList List;
  auto* const Twice = New<TTold<TInterfacedObject>>(Ends);
  List.Add(New<TTold<TInterfacedObject>>(Ends, [&List, Held = IntfRef<IInterface>(Twice)] { List.Remove(List[0]); }));
  List.SetItems(0, Twice);  // the list's count comes before the old one's end, which lets the new one go
  EXPECT_TRUE(Ends == 2 && List.Count() == 0);
  List.Add(List.Add(Make(Interfaced, Ends)));
  List.Delete(0);
  EXPECT_EQ(Ends, 2);
  List.Clear();
  EXPECT_EQ(Ends, 3);
}

TEST(ObjectListOfCounts, GoesByWhatItCountedWhateverAnObjectDecidesInIt) {
  int Ends = 0;
  TZqObjectList Owning, Borrowing(false);
  for (const TKind Kind : {ByCount, ByOwner})
    dynamic_cast<TZqObject&>(*Owning.Add(Make(Kind, Ends))).SetAutoDestroy(Kind == ByOwner);
  Owning.Clear();
  Borrowing.Add(Make(Plain, Ends))->Free();  // and is not touched when it is taken out
  EXPECT_EQ(Ends, 3);
}

// ------------------------------------------------------------------------------------------------------- Memo list

TEST(MemoList, FindsItemsInAnyCaseAndAddsNoCodeTwice) {
  const TOwned<TZqMemoList> List(New<TZqMemoList>(nullptr)), Copy(New<TZqMemoList>(nullptr));
  TZqMemoListItems &Items = *List->Items(), &Copies = *Copy->Items();
  for (const char16_t* const Code : {u"alpha", u"beta"}) Items.Add(Code, nullptr);
  EXPECT_EQ(RaisedBy([&] { Items.Add(u"Alpha", {}); }), u"EListError: There already is a memo with code Alpha!");
  EXPECT_EQ(RaisedBy([&] { (void)List->MemoByCode(u"x"); }), u"Exception: There is no MemoItem with the code x!");
  SetPropValue(Copy.get(), u"Items", GetObjectProp(List.get(), u"Items"));
  SetPropValue(Copies.GetItem(1), u"Code", u"ALPHA");
  Copies.GetItem(1)->Memo()->Add(u"text");
  SetPropValue(Copies.GetItem(0), u"Memo", GetObjectProp(Copies.GetItem(1), u"Memo"));
  EXPECT_EQ(Copy->MemoByCode(u"Alpha")->Text(), u"text\r\n");
  EXPECT_THROW(Items.Remove(Copies.GetItem(1)), EListError);
  for (const char16_t* const Code : {u"x", u"ALPHA"}) Items.Remove(Code);
  Items.SetItem(0, Copies.GetItem(1));
  EXPECT_TRUE(Items.Count() == 1 && Items.GetCode(0) == u"ALPHA" && Items.GetItem(0)->Memo()->Count() == 1);
  struct TOpen : TZqMemoListItems {
    using TZqMemoListItems::AssignTo;
    using TZqMemoListItems::TZqMemoListItems;
  } Open(nullptr);
  Open.Assign(&Items);
  for (TPersistent* const Dest : std::initializer_list<TPersistent*>{&Copies, &Open}) Open.AssignTo(Dest);
  EXPECT_TRUE(Copies.Count() == 1 && Open.Count() == 1 && Copy->MemoByCode(u"alpha")->Count() == 1);
}

// -------------------------------------------------------------------------------------------------------- Pointers

TEST(Pointers, KeepOrdinalsAndRefuseWhatDoesNotFit) {
  constexpr Int64 cLeast = std::numeric_limits<Integer>::min(), cMost = std::numeric_limits<Integer>::max();
  for (const Int64 Value : {cLeast - 1, cLeast, Int64{-1}, Int64{0}, cMost, cMost + 1, Int64{0xFFFFFFFF}}) {
    void* const P = ZqOrdinal2Ptr(Value);
    Cardinal Low = 0, High = 0;
    ZqSplitPtr(P, Low, High);
    EXPECT_TRUE(ZqCombinePtr(Low, High) == P && High == static_cast<UInt64>(Value) >> 32U);
    EXPECT_EQ(ZqPtrDiff(ZqPtrAdd(&cMost, Value), &cMost), static_cast<NativeUInt>(Value));
    if (std::in_range<Integer>(Value)) EXPECT_EQ(ZqPtrDiffS(ZqInt2Ptr(ZqPtr2Int(P)), nullptr), Value);
    else EXPECT_THROW((void)ZqPtr2Int(P), EAssertionFailed);
  }
}

}  // namespace
}  // namespace zq
