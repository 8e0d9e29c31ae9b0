

#include "runtime/containers/collection.h"
#include "runtime/containers/lists.h"
#include "runtime/io/string_list.h"
#include "runtime/text/encoding.h"
#include "tests/support/support.h"

namespace zq {
namespace {

// ----------------------------------------------------------------------------------------------------------- Lists

TEST(Lists, AnIndexOutOfRangeRaisesAndItemsMoveBothWays) {
  TListOf<int> List;
  for (const int Item : {10, 21, 30, 41}) List.Add(Item);
  const std::function<void(Integer)> Uses[] = {[&](Integer i) { static_cast<void>(List.Items(i)); },
      [&](Integer i) { List.Delete(i); }, [&](Integer i) { List.SetItems(i, 9); }, [&](Integer i) { List.Move(i, 0); }};
  for (const auto& Use : Uses)
    for (const auto& [Index, Shown] : {std::pair(-1, u"(-1)"), std::pair(4, u"(4)")})
      EXPECT_EQ(RaisedBy([&, i = Index] { Use(i); }), UnicodeString(u"EListError: List index out of bounds ") + Shown);
  List.Move(0, 2);
  List.Move(3, 1);
  EXPECT_EQ(std::vector(List.begin(), List.end()), (std::vector{21, 41, 30, 10}));
}

void RefuseIf(bool ARefuses) {
  if (ARefuses) throw EInvalidOperation(u"no");
}

struct TCounted : TObject {
  explicit TCounted(int& AEnds) : Ends(AEnds) {}
  ~TCounted() override { ++Ends; }
  void BeforeDestruction() override { RefuseIf(Refuses); }
  int& Ends;
  bool Refuses = false;
};

TEST(Lists, AnObjectListEndsWhatItOwnsButForWhoRefuses) {
  int Ends = 0;
  TCounted Foreign(Ends);
  TCounted *const Stubborn = New<TCounted>(Ends), *const Taken = New<TCounted>(Ends);
  Stubborn->Refuses = true;
  {
    TObjectList Borrowing(false), Owning;
    Borrowing.Add(&Foreign);
    for (auto* const Item : {Taken, New<TCounted>(Ends), New<TCounted>(Ends)}) Owning.Add(Item);
    EXPECT_EQ(Owning.Extract(0), Taken);
    Owning.Delete(0);
    Owning.Add(Stubborn);
    EXPECT_THROW(Owning.Clear(), EInvalidOperation);
    Owning.Add(Stubborn);
  }
  EXPECT_EQ(Ends, 2);
  Stubborn->Refuses = false;
  Stubborn->Free();
  Taken->Free();
}

struct IFirst : Extends<IInterface> {
  static constexpr TGUID IID = "{0D3C1F10-0001-4000-8000-000000000001}"_guid;
};
struct ISecond : Extends<IInterface> {
  static constexpr TGUID IID = "{0D3C1F10-0001-4000-8000-000000000002}"_guid;
};
struct TBoth : Implements<TInterfacedObject, IFirst, ISecond> {
  TBoth(TInterfaceList& AList, Integer& ASeen) : List(AList), Seen(ASeen) {}
  ~TBoth() override { Seen = List.Count(); }
  TInterfaceList& List;
  Integer& Seen;
};

TEST(Lists, AnInterfaceListGoesByTheObjectAndHoldsACount) {
  TInterfaceList List;
  Integer SeenAtTheEnd = -1;
  auto* const Object = New<TBoth>(List, SeenAtTheEnd);
  List.Add(IntfRef<IFirst>(Object));
  EXPECT_EQ(List.IndexOf(IntfRef<ISecond>(Object)), 0);
  EXPECT_EQ(Object->RefCount(), 1);
  List.Delete(0);
  EXPECT_EQ(SeenAtTheEnd, 0) << "the item's end has to see a list without it";
}

TEST(ThreadList, ThreadsAddEachItemOnceAndTheOwnerMayNest) {
  TThreadListOf<int> List;
  OnThreads(4, [&](int) {
    for (int i = 0; i < 200; ++i) List.Add(i);
  });
  const auto Locked = List.Locked();
  List.Remove(0);
  EXPECT_EQ(Locked->Count(), 199);
}

// ---------------------------------------------------------------------------------------------------- String lists

std::vector<UnicodeString> Lines(const TStrings& AStrings) { return {AStrings.begin(), AStrings.end()}; }

TEST(StringList, TextSplitsAtEveryKindOfLineEndAndLinesAtTheFirstEqualSign) {
  TStringList List;
  const std::pair<const char16_t*, std::vector<UnicodeString>> Cases[] = {{u"", {}}, {u"a\r\nb", {u"a", u"b"}},
      {u"a\nb\n", {u"a", u"b"}}, {u"a\rb\r", {u"a", u"b"}}, {u"\r\n", {u""}}, {u"a\r\r\nb", {u"a", u"", u"b"}},
      {u"a\n\r\n\rb", {u"a", u"", u"", u"b"}}};
  for (const auto& [Text, Expected] : Cases) {
    List.SetText(Text);
    EXPECT_EQ(Lines(List), Expected) << UnicodeString(Text).ToUTF8();
  }
  EXPECT_EQ(List.Text(), u"a\r\n\r\n\r\nb\r\n");
  List.SetText(u"plain\nKey=a=b\nkey=second");
  EXPECT_TRUE(List.IndexOfName(u"") == -1 && List.Values(u"KEY") == u"a=b") << "no name is no empty name";
  for (const char16_t* const Name : {u"key", u"absent"}) List.SetValues(Name, u"");
  List.SetValues(u"new", u"1");
  EXPECT_EQ(Lines(List), (std::vector<UnicodeString>{u"plain", u"key=second", u"new=1"}));
}

TEST(StringList, OrderGoesByLowerCaseUnlessCaseCounts) {
  TStringList List;
  List.SetText(u"b\nÄ\n_\nB\nä\na\nAb");
  List.SetObjects(0, &List);
  List.Sort();
  EXPECT_EQ(Lines(List), (std::vector<UnicodeString>{u"_", u"a", u"Ab", u"b", u"B", u"Ä", u"ä"}));
  List.CustomSort([](const TStringList& A, Integer i, Integer j) { return A[i] < A[j] ? 1 : -(A[j] < A[i]); });
  EXPECT_EQ(Lines(List), (std::vector<UnicodeString>{u"ä", u"Ä", u"b", u"a", u"_", u"B", u"Ab"}));
  EXPECT_EQ(List.Objects(2), &List);
  List.SetCaseSensitive(true);
  List.SetSorted(true);
  EXPECT_EQ(Lines(List), (std::vector<UnicodeString>{u"Ab", u"B", u"_", u"a", u"b", u"Ä", u"ä"}));
  EXPECT_TRUE(List.IndexOf(u"A") == -1 && List.Add(u"C") == 2 && List.Add(u"C") == 2 && List.Count() == 8);
  EXPECT_THROW(List.Insert(0, u"x"), EStringListError);
  List.SetDuplicates(dupError);
  EXPECT_THROW(List.Add(u"C"), EStringListError);
}

TEST(StringList, FilesBearAndHonourTheByteOrderMark) {
  const TTempFolder Folder;
  const TAnsiCodePageScope Western(1252);
  const auto File = Folder.File("list.txt");
  TStringList List;
  List.Add(u"é");
  List.SaveToFile(File);
  EXPECT_EQ(Folder.Read("list.txt"), "\xE9\r\n");
  List.SaveToFile(File, TEncoding::UTF8());
  EXPECT_EQ(Folder.Read("list.txt"), "\xEF\xBB\xBF\xC3\xA9\r\n");
  using namespace std::string_view_literals;
  const std::tuple<std::string_view, const TEncoding*, const char16_t*> Cases[] = {{"\xE9"sv, nullptr, u"é"},
      {"\xEF\xBB\xBF\xC3\xA9"sv, nullptr, u"é"}, {"\xFF\xFE\xE9\0"sv, nullptr, u"é"},
      {"\xFE\xFF\0\xE9"sv, nullptr, u"é"}, {"\xC3\xA9"sv, &TEncoding::UTF8(), u"é"},
      {"\xEF\xBB\xBF\xC3\xA9"sv, &TEncoding::UTF8(), u"é"}, {"\xFF\xFE"sv, &TEncoding::ANSI(), u"ÿþ"}};
  for (const auto& [Bytes, Encoding, Text] : Cases) {
    Folder.Write("list.txt", Bytes);
    if (Encoding == nullptr) List.LoadFromFile(File);
    else List.LoadFromFile(File, *Encoding);
    EXPECT_EQ(List.Text(), Text + UnicodeString(u"\r\n"));
  }
}

// ----------------------------------------------------------------------------------------------------- Collections

struct TCard : TCollectionItem {
  using TCollectionItem::TCollectionItem;
  void SetText(const UnicodeString& AText) { Text = AText, Changed(false); }
  void AssignTo(TPersistent* ADest) const override { dynamic_cast<TCard&>(*ADest).SetText(Text); }
  void AfterConstruction() override { TCollectionItem::AfterConstruction(), RefuseIf(FailNext); }
  void BeforeDestruction() override { RefuseIf(Refuses), TCollectionItem::BeforeDestruction(); }
  UnicodeString Text;
  bool Refuses = false;
  static inline bool FailNext = false;
};

struct TCards : TCollection {
  TCards() : TCollection(TCollectionItemClass::Of<TCard>()) {}
  ~TCards() override { Clear(); }
  void Added(TCollectionItem* AItem) override { Log += "+" + dynamic_cast<TCard&>(*AItem).ClassName().ToUTF8(); }
  void Deleting(TCollectionItem* AItem) override { Log += "-" + dynamic_cast<TCard&>(*AItem).Text.ToUTF8(); }
  void Update(TCollectionItem* AItem) override { Log += AItem == nullptr ? "*" : "u"; }
  TCard& Card(Integer AIndex) { return dynamic_cast<TCard&>(*Items(AIndex)); }
  std::string Log;
};

TEST(Collection, HooksSeeWholeItemsAndUpdatesWaitForTheOutermostEnd) {
  TCards Cards;
  Cards.Add();
  Cards.Card(0).SetText(u"a");
  EXPECT_EQ(std::exchange(Cards.Log, ""), "+TCard*u");
  for (int i = 0; i < 2; ++i) Cards.BeginUpdate();
  dynamic_cast<TCard&>(*Cards.Insert(0)).SetText(u"b");
  Cards.EndUpdate();
  EXPECT_EQ(std::exchange(Cards.Log, ""), "+TCard");
  Cards.EndUpdate();
  Cards.Delete(1);
  Cards.BeginUpdate();
  Cards.EndUpdate();
  EXPECT_EQ(std::exchange(Cards.Log, ""), "*-a*") << "the last pair changed nothing";
}

TEST(Collection, CopiesByAssignAndLosesNothingToFailures) {
  TCards Cards, Copy;
  for (const char16_t* Text : {u"a", u"b", u"c"}) dynamic_cast<TCard&>(*Cards.Add()).Text = Text;
  Cards.Items(0)->SetIndex(2);
  Copy.Add();
  Copy.Assign(&Cards);
  EXPECT_EQ(Copy.Card(0).Text + Copy.Card(1).Text + Copy.Card(2).Text, u"bca");
  EXPECT_EQ(Cards.FindItemID(0)->Index(), 2);
  TStringList List;
  EXPECT_EQ(RaisedBy([&] { Copy.Assign(&List); }), u"EConvertError: Cannot assign a TStringList to a TCards");
  TCard::FailNext = true;
  EXPECT_THROW(Cards.Add(), EInvalidOperation);
  TCard::FailNext = false;
  EXPECT_EQ(Cards.Count(), 3);
  Cards.Card(1).Refuses = true;
  EXPECT_THROW(Cards.Clear(), EInvalidOperation);
  EXPECT_EQ(Cards.Count(), 2);
  Cards.Card(1).Refuses = false;
}

}  // namespace
}  // namespace zq
