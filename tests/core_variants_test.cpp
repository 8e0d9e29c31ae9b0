
#include <cmath>

#include "runtime/text/encoding.h"
#include "runtime/text/format_settings.h"
#include "runtime/values/variants.h"
#include "tests/support/support.h"

namespace zq {
namespace {

class TCounted : public Implements<TInterfacedObject> {};
struct IScripted : Extends<IInterface> {
  static constexpr TGUID IID = "{00020400-0000-0000-C000-000000000046}"_guid;
};
struct IScriptedMore : Extends<IScripted> {
  static constexpr TGUID IID = "{7B1B86D3-5D35-4C0F-8E1B-0D8F6F0C4A11}"_guid;
};
class TPlain : public TObject {
 public:
  ~TPlain() override = default;
};

template <class T>
concept TVariantTakes = std::is_constructible_v<Variant, T>;
static_assert(!TVariantTakes<void*> && !TVariantTakes<const int*> && !TVariantTakes<std::nullptr_t>,
    "a pointer must not become a Boolean");
static_assert(sizeof(Variant) == 16);

TEST(Variants, TypeIsThatOfTheValue) {
  TPlain Object;
  const std::pair<Variant, TVarType> Cases[] = {{Variant(), 0}, {Null(), 1}, {SmallInt{1}, 2}, {1, 3}, {1.5F, 4},
      {1.5, 5}, {Extended{1.5}, 5}, {Currency{1}, 6}, {TDateTime(1), 7}, {TDate(1), 7}, {TTime(0.5), 7},
      {WideString(u"x"), 8}, {IntfRef<IScriptedMore>(), 9}, {VarAsError(E_FAIL), 10}, {true, 11}, {WordBool(true), 11},
      {IntfRef<IInterface>(), 13}, {ShortInt{1}, 16}, {Byte{1}, 17}, {Word{1}, 18}, {1U, 19}, {Int64{1}, 20},
      {NativeInt{1}, 20}, {UInt64{1}, 21}, {NativeUInt{1}, 21}, {&Object, 73}, {"x", 256}, {'x', 256},
      {UTF8String("x"), 256}, {u"x", 258}, {u'x', 258}, {UnicodeString(u"x"), 258}, {VarArrayOf({}), 0x200C}};
  for (const auto& [Value, Type] : Cases) EXPECT_EQ(VarType(Value), Type);
}

TEST(Variants, NumbersAreReadExactlyOrRefused) {
  constexpr Int64 cHigh = std::numeric_limits<Int64>::max();
  const std::pair<Variant, Int64> Whole[] = {{Variant(), 0}, {true, -1}, {false, 0}, {0.5, 0}, {1.5, 2}, {2.5, 2},
      {-2.5, -2}, {Currency{15000}, 2}, {Currency{cHigh}, 922337203685478}, {TDateTime(44553.25), 44553}, {u" 12", 12},
      {"2.5", 2}, {u"$FF", 255}, {cHigh, cHigh}, {u"9223372036854775807", cHigh}, {static_cast<UInt64>(cHigh), cHigh}};
  for (const auto& [Value, Number] : Whole) EXPECT_EQ(VarToInt64(Value), Number) << VarToStr(Value).ToUTF8();
  EXPECT_EQ(VarToUInt64(std::numeric_limits<UInt64>::max()), std::numeric_limits<UInt64>::max());
  EXPECT_EQ(VarToReal(u"-1.25"), -1.25L);
  EXPECT_EQ(VarToCurrency(-0.03125).Scaled, -312);
  EXPECT_EQ(VarToCurrency(0.09375).Scaled, 938);

  TPlain Object;
  for (const Variant& None : {Null(), Variant(u"abc"), Variant(u""), Variant(&Object), VarAsError(E_FAIL),
           VarArrayOf({1}), Variant(IntfRef<IInterface>())})
    EXPECT_THROW(static_cast<void>(VarToInteger(None)), EVariantTypeCast) << VarType(None);
  EXPECT_EQ(VarToInteger(-2147483648.5), std::numeric_limits<Integer>::min());
  for (const auto& [Value, Type] : {std::pair<Variant, TVarType>{2147483647.5, varInteger}, {std::nan(""), varInteger},
           {9223372036854775808.0, varInt64}, {std::numeric_limits<UInt64>::max(), varInt64}, {-1, varUInt64},
           {1e300, varSingle}, {128, varShortInt}, {256, varByte}, {-1, varWord}, {32768, varSmallint},
           {-1, varLongWord}})
    EXPECT_THROW(static_cast<void>(VarAsType(Value, Type)), EVariantOverflow) << Type;
}

struct TSettingsScope {
  TFormatSettings Saved = FormatSettings();
  ~TSettingsScope() { SetFormatSettings(Saved); }
};

TEST(Variants, TextFollowsTheFormatSettings) {
  const TSettingsScope Scope;
  TFormatSettings Settings = Scope.Saved;
  Settings.DecimalSeparator = u',';
  Settings.DateSeparator = u'-';
  Settings.ShortDateFormat = u"yyyy-mm-dd";
  Settings.LongTimeFormat = u"hh:nn:ss";
  SetFormatSettings(Settings);
  const std::pair<Variant, const char16_t*> Cases[] = {{Variant(), u""}, {true, u"True"}, {false, u"False"},
      {-7, u"-7"}, {1.5, u"1,5"}, {0.1F, u"0,1"}, {std::numeric_limits<UInt64>::max(), u"18446744073709551615"},
      {Currency{-12345}, u"-1,2345"}, {TDateTime(44553.25), u"2021-12-23 06:00:00"}, {TDate(44553), u"2021-12-23"},
      {"abc", u"abc"}};
  for (const auto& [Value, Text] : Cases) EXPECT_EQ(VarToUStr(Value), Text);
  EXPECT_EQ(VarToReal(u"1,5"), 1.5L);
  EXPECT_EQ(VarToDateTime(u"2021-12-23 06:00:00"), 44553.25);
  EXPECT_EQ(VarToDateTime(u"44553,25"), 44553.25);
  EXPECT_THROW(static_cast<void>(VarToUStr(Null())), EVariantTypeCast);
  EXPECT_EQ(VarToStrDef(Null(), u"none"), u"none");
  EXPECT_THROW(static_cast<void>(VarToStr(VarAsError(E_FAIL))), EVariantTypeCast);
}

TEST(Variants, BooleansAreReadFromWordsAndNumbers) {
  for (const Variant& Yes :
      {Variant(true), Variant(u"TRUE"), Variant("true"), Variant(2), Variant(u"-1"), Variant(0.5)})
    EXPECT_TRUE(VarToBool(Yes)) << VarToStr(Yes).ToUTF8();
  for (const Variant& No : {Variant(false), Variant(u"False"), Variant(0), Variant("0"), Variant()})
    EXPECT_FALSE(VarToBool(No)) << VarToStr(No).ToUTF8();
  EXPECT_THROW(static_cast<void>(VarToBool(u"yes")), EVariantTypeCast);
}

TEST(Variants, BytesKeepTheirCodePageAndTextGoesToTheProcesss) {
  const TAnsiCodePageScope Ansi(1252);
  const Variant Tagged = RawByteString("\xE9", 1251);
  EXPECT_EQ(VarToUStr(Tagged), u"\u0439");
  EXPECT_EQ(VarToUStr(UTF8String("\xC3\xA9")), u"\u00E9");
  EXPECT_EQ(VarToUStr("\xE9"), u"\u00E9");
  EXPECT_EQ(VarToLStr(u"\u00E9"), "\xE9");
  EXPECT_EQ(VarToLStr(UTF8String("\xC3\xA9")), "\xE9");
  EXPECT_EQ(VarToBytes(Tagged).CodePage(), 1251);
}

TEST(Variants, EqualityAndOrderNeverRaise) {
  TPlain Object;
  const Variant Counted = IntfRef<IInterface>(New<TCounted>());
  using TOrder = std::partial_ordering;
  constexpr TOrder Same = TOrder::equivalent, Less = TOrder::less, None = TOrder::unordered;
  const std::tuple<Variant, Variant, TOrder> Cases[] = {{1, 1.0, Same}, {1, 2U, Less},
      {-1, std::numeric_limits<UInt64>::max(), Less}, {std::numeric_limits<Int64>::max(), 9223372036854775808.0, Less},
      {true, -1, Same}, {1, Currency{10001}, Less}, {9, u"10", Less}, {u"10", u"9", Less},
      {"a", WideString(u"a"), Same}, {u"a", 1, None}, {u"0.1", 0.1, Same},
      {RawByteString("a", 709), RawByteString("a", 709), Same}, {RawByteString("1", 709), 1, None},
      {Null(), Null(), Same}, {Null(), 0, None}, {Variant(), Variant(), Same}, {Variant(), Null(), None},
      {Variant(), 0, None}, {Variant(), u"", None}, {&Object, &Object, Same}, {&Object, 1, None},
      {Counted, Counted, Same}, {Counted, IntfRef<IInterface>(), None}, {VarAsError(E_FAIL), VarAsError(E_FAIL), Same},
      {VarAsError(E_FAIL), E_FAIL, None}, {std::nan(""), std::nan(""), None},
      {VarArrayOf({1, u"a"}), VarArrayOf({1.0, "a"}), Same}, {VarArrayOf({1}), VarArrayOf({1, 2}), None}};
  for (const auto& [A, B, Order] : Cases) {
    EXPECT_EQ(A <=> B, Order) << VarType(A) << " and " << VarType(B);
    EXPECT_EQ(VarSameValue(B, A), Order == 0);
  }
}

TEST(Variants, CopiesAreDeepAndCountInterfaces) {
  auto* const Object = New<TCounted>();
  const IntfRef<TCounted> Held(Object);
  {
    Variant Array = VarArrayOf({u"one", VarArrayOf({2}), IntfRef<IInterface>(Object)});
    EXPECT_EQ(Object->RefCount(), 2);
    const Variant Copy = Array;
    EXPECT_EQ(Object->RefCount(), 3);
    VarArrayPut(Array, u"changed", {0});
    EXPECT_EQ(Copy[0], u"one");
    EXPECT_EQ(Copy[1][0], 2);
    const Variant Moved = std::move(Array);
    EXPECT_EQ(Moved[0], u"changed");
    EXPECT_EQ(Object->RefCount(), 3);
    Array = Copy;
    Array = Variant(Array[1]);
    EXPECT_EQ(Array[0], 2);
  }
  EXPECT_EQ(Object->RefCount(), 1);
}

TEST(Variants, ArraysHaveBoundsInEachDimension) {
  EXPECT_EQ(VarArrayHighBound(VarArrayOf({}), 1), -1);
  Variant Grid = VarArrayCreate({-1, 1, 5, 8}, varInteger);
  EXPECT_EQ(VarType(Grid), varArray | varInteger);
  EXPECT_EQ(VarArrayDimCount(Grid), 2);
  EXPECT_EQ(VarArrayLowBound(Grid, 1), -1);
  EXPECT_EQ(VarArrayHighBound(Grid, 2), 8);
  for (Integer i = -1; i <= 1; ++i)
    for (Integer j = 5; j <= 8; ++j) VarArrayPut(Grid, UnicodeString(FromUTF8(std::to_string(i * 10 + j))), {i, j});
  for (Integer i = -1; i <= 1; ++i)
    for (Integer j = 5; j <= 8; ++j) EXPECT_EQ(VarArrayGet(Grid, {i, j}), i * 10 + j);
  EXPECT_EQ(VarType(VarArrayGet(Grid, {0, 5})), varInteger);
  EXPECT_EQ(VarArrayGet(VarArrayCreate({0, 0}, varUString), {0}), u"");

  EXPECT_THROW(VarArrayPut(Grid, u"abc", {0, 5}), EVariantTypeCast);
  for (const auto& [i, j] : {std::pair{-2, 5}, {2, 5}, {0, 4}, {0, 9}})
    EXPECT_THROW(static_cast<void>(VarArrayGet(Grid, {i, j})), EVariantBadIndex);
  EXPECT_THROW(static_cast<void>(Grid[0]), EVariantBadIndex);
  EXPECT_THROW(static_cast<void>(VarArrayHighBound(Grid, 3)), EVariantBadIndex);
  EXPECT_THROW(static_cast<void>(VarArrayCreate({0, -2}, varVariant)), EVariantBadIndex);
  EXPECT_THROW(static_cast<void>(VarArrayHighBound(5, 1)), EVariantTypeCast);
  constexpr Integer cMin = std::numeric_limits<Integer>::min(), cMax = std::numeric_limits<Integer>::max();
  EXPECT_THROW(static_cast<void>(VarArrayCreate({cMin, cMax, cMin, cMax}, varInteger)), EVariantBadIndex);
}

TEST(Variants, ValuesConvertToTheTypeAskedFor) {
  for (const TVarType Type : {varSmallint, varInteger, varSingle, varDouble, varCurrency, varDate, varOleStr,
           varShortInt, varByte, varWord, varLongWord, varInt64, varUInt64, varString, varUString}) {
    const Variant Seven = VarAsType(u"7", Type);
    EXPECT_EQ(VarType(Seven), Type);
    EXPECT_EQ(Seven, 7) << Type;
  }
  EXPECT_THROW(static_cast<void>(VarAsType(1, varRecord)), EVariantTypeCast);
  auto* const Object = New<TCounted>();
  const IntfRef<IInterface> Held(Object);
  EXPECT_EQ(VarToIntf(Object), Held);
}

}  // namespace
}  // namespace zq
