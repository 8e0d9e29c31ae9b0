
#include <future>
#include <latch>

#include "runtime/values/typeinfo.h"
#include "runtime/values/values.h"
#include "tests/support/support.h"

namespace zq {
namespace {

enum class TColour : Byte { Red, Green, Blue = 3 };
using TColours = TSet<TColour>;
struct TPair {
  UnicodeString Text;
  double Number;
};
struct IShape : Extends<IInterface> {
  static constexpr TGUID IID = "{0B7B1E0C-0C2E-4D52-8DE5-1E5D3E2B7E61}"_guid;
  virtual Integer Corners() = 0;
};
struct TShape : Implements<TInterfacedObject, IShape> {
  Integer Corners() override { return 3; }
};

struct TCustomer : TObject {
  ~TCustomer() override = default;
  [[nodiscard]] Integer GetRating() const { return Rating; }
  void SetRating(Integer AValue) {
    if (AValue < 0) throw EInvalidOperation(u"negative");
    Rating = AValue;
  }
  UnicodeString Name;
  Integer Rating = 0;
  TColour Colour = TColour::Red;
  TColours Colours;
  bool Active = false;
  TCustomer* Partner = nullptr;
  IntfRef<IShape> Shape;
};
struct TUndescribed : TCustomer {};
struct TVip : TUndescribed {
  [[nodiscard]] Char GetGrade() const { return u'A'; }
};

struct TypeInfoOfClass : testing::Test {
  static void SetUpTestSuite() {
    DescribeType<TColour>(u"uShop").EnumNames({u"cRed", u"cGreen", u"", u"cBlue"});
    DescribeType<TCustomer>(u"uShop")
        .Property(u"Name", &TCustomer::Name, [](TCustomer& A, const UnicodeString& AValue) { A.Name = AValue; })
        .Property(u"Rating", &TCustomer::GetRating, &TCustomer::SetRating)
        .Property(u"Colour", &TCustomer::Colour, [](TCustomer& A, TColour AValue) { A.Colour = AValue; })
        .Property(u"Colours", &TCustomer::Colours, [](TCustomer& A, const TColours& AValue) { A.Colours = AValue; })
        .Property(u"Active", &TCustomer::Active, [](TCustomer& A, bool AValue) { A.Active = AValue; })
        .Property(u"Partner", &TCustomer::Partner, [](TCustomer& A, TCustomer* AValue) { A.Partner = AValue; })
        .Property(u"Shape", &TCustomer::Shape, [](TCustomer& A, IntfRef<IShape> AValue) { A.Shape = AValue; })
        .Property<Integer>(u"Secret", nullptr, &TCustomer::SetRating);
    DescribeType<TVip>(u"uShop").Property(u"Grade", &TVip::GetGrade).Property(u"NAME", [](const TVip& A) {
      return u"Dr " + A.Name;
    });
  }
  TCustomer Customer;
  TVip Vip;
  static std::string Names(const TObject& AObject) {
    std::string Result;
    for (const PPropInfo Property : GetPropList(&AObject)) Result += Property->Name.ToUTF8() + ' ';
    return Result;
  }
};

TEST(TypeInfo, KindAndNameFollowTheCxxType) {
  const std::tuple<PTypeInfo, TTypeKind, const char16_t*> Cases[] = {{TypeInfo<NativeInt>(), tkInt64, u"NativeInt"},
      {TypeInfo<bool>(), tkEnumeration, u"Boolean"}, {TypeInfo<TDateTime>(), tkFloat, u"TDateTime"},
      {TypeInfo<UnicodeString>(), tkUString, u"string"}, {TypeInfo<RawByteString>(), tkLString, u"RawByteString"},
      {TypeInfo<TPair>(), tkRecord, u"TPair"}, {TypeInfo<IntfRef<IShape>>(), tkInterface, u"IShape"},
      {TypeInfo<TArray<Byte>>(), tkDynArray, u"TArray<System.Byte>"}, {TypeInfo<int[3]>(), tkArray, nullptr},
      {TypeInfo<TArray<UnicodeString>>(), tkDynArray, u"TStringDynArray"}, {TypeInfo<void>(), tkUnknown, nullptr},
      {TypeInfo<TMethod<void()>>(), tkMethod, nullptr}, {TypeInfo<ExceptionClass>(), tkClassRef, nullptr},
      {TypeInfo<TColours>(), tkSet, nullptr}, {TypeInfo<void (*)(int)>(), tkProcedure, nullptr}};
  for (const auto& [Type, Kind, Name] : Cases) {
    EXPECT_EQ(Type->Kind, Kind) << Type->Name.ToUTF8();
    EXPECT_TRUE(Name == nullptr || Type->Name == Name) << Type->Name.ToUTF8();
  }
  EXPECT_TRUE(TypeInfo<NativeInt>() != TypeInfo<Int64>() && TypeInfo<TShape*>() == TypeInfo<TShape>());
  EXPECT_EQ(GetTypeData(TypeInfo<int[3]>())->ElementType, TypeInfo<Integer>());
  EXPECT_EQ(GetTypeData(TypeInfo<TColours>())->ElementType, TypeInfo<TColour>());
}

template <int N>
struct TNumbered {};
template <bool Backwards, int... N>
std::set<PTypeInfo> AskForAll(std::integer_sequence<int, N...>) {
  return {TypeInfo<TArray<TNumbered<Backwards ? 99 - N : N>>>()...};
}

TEST(ThreadTypeInfo, FirstQuestionsFromTwoThreadsGetOneRecord) {
  constexpr auto cAll = std::make_integer_sequence<int, 100>();
  std::latch Start(2);
  const auto Ask = [&](auto ABackwards) {
    Start.arrive_and_wait();
    return AskForAll<ABackwards()>(cAll);
  };
  auto Other = std::async(std::launch::async, Ask, std::false_type());
  const std::set<PTypeInfo> Backwards = Ask(std::true_type()), Forwards = Other.get();
  EXPECT_EQ(Forwards, Backwards);
  EXPECT_EQ(Forwards.size(), 100U);
}

TEST_F(TypeInfoOfClass, PropertiesComeInOrderWithTheAncestorsFirst) {
  EXPECT_EQ(Names(Vip), "NAME Rating Colour Colours Active Partner Shape Secret Grade ");
  EXPECT_EQ(Names(TUndescribed()), "Name Rating Colour Colours Active Partner Shape Secret ");
  Vip.Name = u"Who";
  EXPECT_EQ(GetPropValue(&Vip, u"name"), u"Dr Who");
  EXPECT_FALSE(GetPropInfo(&Vip, u"Name")->IsWritable());
  const auto Before = GetPropList(TypeInfo<TVip>());
  SetUpTestSuite();
  EXPECT_EQ(GetPropList(TypeInfo<TVip>()), Before);
}

TEST_F(TypeInfoOfClass, PropertiesAreReadAndWrittenByKind) {
  const std::tuple<const char16_t*, Variant, Variant, Variant> Cases[] = {{u"Name", 12, u"12", u"12"},
      {u"Rating", u"7", 7, 7}, {u"Colour", u"CBLUE", 3, u"cBlue"}, {u"Colour", 1, 1, u"cGreen"},
      {u"Colours", u"[cRed, cBlue]", 9, u"cRed,cBlue"}, {u"Colours", 2, 2, u"cGreen"},
      {u"Active", u"true", true, u"True"}, {u"Active", 0, false, u"False"}};
  for (const auto& [Name, Written, Read, Preferred] : Cases) {
    SetPropValue(&Customer, Name, Written);
    EXPECT_EQ(GetPropValue(&Customer, Name, false), Read);
    EXPECT_EQ(VarType(GetPropValue(&Customer, Name, false)), VarType(Read));
    EXPECT_EQ(GetPropValue(&Customer, Name), Preferred);
  }
  SetPropValue(&Customer, u"Partner", &Vip);
  EXPECT_EQ(GetObjectProp(&Customer, u"Partner"), &Vip);
  SetPropValue(&Customer, u"Shape", IntfRef<IInterface>(New<TShape>()));
  EXPECT_EQ(Customer.Shape->Corners(), 3);
  SetPropValue(&Customer, u"Secret", 42);
  EXPECT_EQ(Customer.Rating, 42);
}

TEST_F(TypeInfoOfClass, WhatAPropertyCannotTakeOrGiveIsRefused) {
  EAbort Stranger(u"x");
  EXPECT_THROW(SetPropValue(&Customer, u"Rating", -1), EInvalidOperation) << "the setter's own";
  EXPECT_THROW(SetPropValue(&Customer, u"Rating", u"abc"), EVariantTypeCast);
  EXPECT_THROW(SetPropValue(&Customer, u"Colour", u"cPink"), EVariantTypeCast);
  EXPECT_THROW(SetPropValue(&Customer, u"Colour", 4), EVariantOverflow);
  EXPECT_THROW(SetPropValue(&Customer, u"Partner", &Stranger), EInvalidCast);
  EXPECT_THROW(SetPropValue(&Vip, u"Grade", u"B"), EPropertyError);
  EXPECT_THROW(std::ignore = GetPropValue(&Customer, u"Secret"), EPropertyError);
  const PPropInfo Rating = GetPropInfo(&Customer, u"Rating");
  EXPECT_THROW(static_cast<void>(Rating->GetValue(&Stranger)), EPropertyError);
  EXPECT_THROW(Rating->SetValue(nullptr, TValue::From(1)), EPropertyError);
}

TEST_F(TypeInfoOfClass, EnumerationsAndSetsHaveNames) {
  const PTypeInfo Colour = TypeInfo<TColour>(), Set = TypeInfo<TColours>();
  EXPECT_EQ(GetEnumName(Colour, 3) + GetEnumName(Colour, 2) + GetEnumName(TypeInfo<WordBool>(), -1), u"cBlue2True");
  EXPECT_EQ(GetEnumValue(Colour, u"CGREEN"), 1);
  const std::tuple<const char16_t*, Integer, const char16_t*> Cases[] = {
      {u"", 0, u"[]"}, {u" [ ] ", 0, u"[]"}, {u"cBlue, cred", 9, u"[cRed,cBlue]"}, {u"[cGreen]", 2, u"[cGreen]"}};
  for (const auto& [Text, Bits, Written] : Cases)
    EXPECT_TRUE(StringToSet(Set, Text) == Bits && SetToString(Set, Bits, true) == Written) << ToUTF8(Text);
  EXPECT_THROW(static_cast<void>(StringToSet(Colour, u"cRed,,cBlue")), EPropertyError);
}

TEST_F(TypeInfoOfClass, TypesAreFoundByQualifiedName) {
  const TRttiContext Context;
  EXPECT_EQ(Context.FindType(u"System.TDatetime"), Context.GetType(TypeInfo<TDateTime>()));
  EXPECT_EQ(Context.FindType(u"uShop.TCustomer")->GetHandle(), TypeInfo<TCustomer>());
  EXPECT_FALSE(Context.GetType(TypeInfo<TPair>())->GetIsPublicType());
  DescribeType<TNumbered<-1>>(u"uOld", u"TOne");
  DescribeType<TNumbered<-1>>(u"uNew", u"TTwo");
  for (const char16_t* Name : {u"TCustomer", u"uOld.TOne"}) EXPECT_EQ(Context.FindType(Name), nullptr);
  EXPECT_EQ(Context.FindType(u"uNew.TTwo")->GetHandle(), TypeInfo<TNumbered<-1>>());
  RegisterClass<TShape>();
  EXPECT_EQ(GetClass(u"tshape"), ClassOf<TShape>());
}

// ---- Values ---------------------------------------------------------------------------------------------------------

class Values : public TypeInfoOfClass {};  // with its descriptions

TEST_F(Values, ValuesOfEverySizeSurviveCopyAndMove) {
  struct alignas(64) TWide : TPair {};
  const TPair Pair{u"a text too long for any short string buffer", 2.5};
  TValue Value = TValue::From(Pair), Other = TValue::From(TWide{Pair});
  EXPECT_EQ(reinterpret_cast<std::uintptr_t>(Other.GetReferenceToRawData()) % 64, 0U);
  const TValue Copy = Value;
  std::swap(Value, Other);
  EXPECT_EQ(Value.AsType<TWide>().Number, 2.5);
  Other = TValue::From(AnsiString("a text too long for any short string buffer"));
  EXPECT_EQ(Copy.AsType<TPair>().Text, Pair.Text);
  Other = Copy;
  Value = std::move(Other);
  EXPECT_EQ(Value.AsType<TPair>().Number, 2.5);
  EXPECT_EQ(TValue::Make(&Pair, TypeInfo<TPair>()).AsType<TPair>().Text, Pair.Text);
  EXPECT_THROW(static_cast<void>(TValue::Make(nullptr, TypeInfo<std::future<int>>())), EInvalidCast);
  EXPECT_EQ(TValue::From(0.1L).AsExtended(), 0.1L) << "through a double it is another number";
}

TEST_F(Values, ValuesAreReadAsWhatTheyAreOnly) {
  constexpr UInt64 cHigh = std::numeric_limits<UInt64>::max();
  EXPECT_EQ(static_cast<UInt64>(TValue::From(cHigh).AsInt64()), cHigh);
  EXPECT_EQ(TValue::From(cHigh).AsExtended(), 18446744073709551615.0L);
  const TValue Refused[] = {
      TValue(), TValue::From(2.0), TValue::From(UnicodeString(u"2")), TValue::From(TPair{}), TValue::From(4000000000U)};
  for (const TValue& Value : Refused) EXPECT_THROW(std::ignore = Value.AsInteger(), EInvalidCast);
  EXPECT_THROW(std::ignore = TValue::From(1).AsBoolean(), EInvalidCast);
  EXPECT_THROW(std::ignore = TValue::From(1).AsString(), EInvalidCast);
  EXPECT_THROW(std::ignore = TValue::From(TPair{}).AsVariant(), EInvalidCast);
  EXPECT_EQ(TValue::From('\xE9').AsOrdinal(), 0xE9);
  EXPECT_EQ(TValue::From(Variant(u"12")).AsInteger(), 12);
  EXPECT_EQ(TValue::Make(300, TypeInfo<Byte>()).AsInteger(), 44);
  EXPECT_TRUE(TValue::Make(2, TypeInfo<bool>()).AsBoolean());
  EXPECT_TRUE(TValue::Make(9, TypeInfo<TColours>()).AsType<TColours>() == TColours({TColour::Red, TColour::Blue}));
  EXPECT_THROW(std::ignore = TValue::Make(1, TypeInfo<Double>()), EInvalidCast);
}

TEST_F(Values, CastsKeepTheValueOrRefuse) {
  EXPECT_EQ(TValue::From(200).AsType<Byte>(), 200);
  EXPECT_EQ(TValue::From(AnsiString("ab")).AsType<WideString>(), u"ab");
  EXPECT_EQ(TValue::From(Variant(u"2.5")).AsType<UnicodeString>(), u"2.5");
  EXPECT_EQ(TValue::From(TColour::Blue).AsType<Variant>(), 3);
  EXPECT_EQ(TValue::From<TCustomer*>(&Vip).AsType<TVip*>(), &Vip);
  EXPECT_EQ(TValue::From<TObject*>(New<TShape>()).AsType<IntfRef<IShape>>()->Corners(), 3);
  EXPECT_THROW(static_cast<void>(TValue::From<TObject*>(&Vip).AsType<IntfRef<IShape>>()), EInvalidCast);
  TValue Ignored;
  const std::pair<TValue, PTypeInfo> Refused[] = {{TValue::From(256), TypeInfo<Byte>()},
      {TValue::From(1.0), TypeInfo<Integer>()}, {TValue::From(UnicodeString(u"ab")), TypeInfo<Char>()},
      {TValue::From<TCustomer*>(&Vip), TypeInfo<TShape>()}, {TValue(), TypeInfo<Integer>()}};
  for (const auto& [Value, Type] : Refused) EXPECT_FALSE(Value.TryCast(Type, Ignored)) << Type->Name.ToUTF8();
}

TEST_F(Values, ToStringIsForReaders) {
  const std::pair<TValue, const char16_t*> Cases[] = {{TValue::From<TVip*>(nullptr), u"(empty)"},
      {TValue::From(&Vip), u"TVip"}, {TValue::From(TColour::Green), u"cGreen"}, {TValue::From(true), u"True"},
      {TValue::From(TColours{TColour::Red, TColour::Blue}), u"[cRed,cBlue]"}, {TValue::From(TPair{}), u"(TPair)"},
      {TValue::From(UTF8String("é")), u"é"}, {TValue::From(VarArrayOf({1})), u"(Variant)"},
      {TValue::From(std::numeric_limits<UInt64>::max()), u"18446744073709551615"}};
  for (const auto& [Value, Text] : Cases) EXPECT_EQ(Value.ToString(), Text);
}

TEST_F(Values, VariantsUnpackToTheTypeOfTheirContent) {
  auto* const Object = New<TShape>();
  const IntfRef<IShape> Held(Object);
  TValue Value = TValue::FromVariant(IntfRef<IInterface>(Object)), Copy = Value;
  EXPECT_EQ(Object->RefCount(), 3);
  EXPECT_EQ(Copy.AsType<IntfRef<IShape>>(), Held);
  Value = Copy = TValue();
  EXPECT_EQ(Object->RefCount(), 1);
  EXPECT_EQ(TValue::FromVariant(Word{5}).GetTypeInfo(), TypeInfo<Word>());
  EXPECT_TRUE(TValue::FromVariant(Null()).IsEmpty());
}

}  // namespace
}  // namespace zq
