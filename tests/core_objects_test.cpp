#include <dlfcn.h>

#include <thread>

#include "runtime/core/delegates.h"
#include "runtime/core/objects.h"
#include "tests/plugin/plugin.h"
#include "tests/support/support.h"

namespace zq {

struct TOuter : TObject {
  struct TInner : TObject {};
};
template <class T>
struct TBox : TObject {};

namespace {

struct THidden : TObject {};

TEST(ClassName, DropsWhatEnclosesTheClassAndKeepsItsArguments) {
  struct TLocal : TObject {};
  EXPECT_EQ(TOuter::TInner().ClassName(), u"TInner");
  EXPECT_EQ(THidden().ToString(), u"THidden");
  EXPECT_EQ(TLocal().ClassName(), u"TLocal");
  EXPECT_EQ(TBox<TOuter::TInner>().ClassName(), u"TBox<zq::TOuter::TInner>");
  EXPECT_EQ(TBox<THidden>().ClassName(), u"TBox<zq::(anonymous namespace)::THidden>");
}

struct TForeign {
  virtual ~TForeign() = default;
};
struct TLeft : TForeign, TObject {};
struct TDeep : TLeft {};

TEST(Class, IsKnownThroughASecondBase) {
  const TDeep Deep;
  EXPECT_EQ(static_cast<const TObject&>(Deep).ClassType(), ClassOf<TDeep>());
  EXPECT_TRUE(Deep.InheritsFrom(ClassOf<TDeep>()) && Deep.InheritsFrom(ClassOf<TForeign>()));
  EXPECT_FALSE(Deep.InheritsFrom(ClassOf<THidden>()) || Deep.InheritsFrom(TClass()));
  EXPECT_FALSE(ClassOf<TLeft>().InheritsFrom(ClassOf<TDeep>()));
  EXPECT_EQ(ClassOf<TLeft>().ClassParent(), ClassOf<TObject>()) << "the first base is none of the family";
}

// ---- Life ----------------------------------------------------------------------------------------------------------

struct TLifeBase : TObject {
  TLifeBase(std::string& ASteps, char ARaiseAt) : RaiseAt(ARaiseAt), FSteps(ASteps) { Step('c'); }
  ~TLifeBase() override { FSteps += 'd'; }
  void AfterConstruction() override { Step('a'); }
  void BeforeDestruction() override { Step('b'); }
  void Step(char AStep) {
    FSteps += AStep;
    if (AStep == RaiseAt) throw Exception(u"at the step");
  }
  char RaiseAt;
  std::string& FSteps;
};

struct TLife : TLifeBase {
  using TLifeBase::TLifeBase;
  ~TLife() override { FSteps += 'D'; }
  void AfterConstruction() override {
    TLifeBase::AfterConstruction();
    Step('A');
  }
};

TEST(Life, RaiseOnTheWayInLeavesNothingBehind) {
  std::string Steps;
  for (const char Step : {'c', 'A'}) EXPECT_THROW(std::ignore = New<TLife>(Steps, Step), Exception);
  EXPECT_EQ(Steps, "ccaADd");
}

TEST(Life, RaiseBeforeTheEndLeavesTheObjectAlive) {
  std::string Steps;
  TLife *const Object = New<TLife>(Steps, 'b'), *Field = Object;
  EXPECT_THROW(FreeAndNil(Field), Exception);
  EXPECT_EQ(Field, nullptr) << "the field is emptied first";
  EXPECT_EQ(Steps, "caAb");
  Object->RaiseAt = ' ';
  Free(Object);
  EXPECT_EQ(Steps, "caAbbDd");
}

// ---- Callbacks -----------------------------------------------------------------------------------------------------

using TAdd = TMethod<int(int)>;

struct TCounter : TObject {
  int Add(int ABy) { return Sum += ABy; }
  int Twice(int ABy) { return Sum += 2 * ABy; }
  int Sum = 0;
};

struct TWideCounter : TForeign, TCounter {};

TEST(Method, BoundToAnObjectComparesByObjectAndFunction) {
  TCounter A, B;
  const TAdd OfA = Bind<&TCounter::Add>(&A);
  EXPECT_EQ(OfA(3) + OfA(4), 10);
  EXPECT_EQ(OfA, TAdd::Of<&TCounter::Add>(&A));
  EXPECT_NE(OfA, TAdd::Of<&TCounter::Add>(&B));
  EXPECT_NE(OfA, TAdd::Of<&TCounter::Twice>(&A));
  TWideCounter Wide;
  EXPECT_EQ(TAdd::Of<&TCounter::Add>(&Wide), TAdd::Of<&TCounter::Add>(static_cast<TCounter*>(&Wide)));
  EXPECT_FALSE(TAdd(std::function<int(int)>()) || TAdd(static_cast<int (*)(int)>(nullptr)));
  TMethod<void(int)>{OfA}(1);  // its result is nobody's
  EXPECT_EQ(A.Sum, 8);
  EXPECT_THROW(TAdd()(1), std::bad_function_call);
}

TEST(Method, CopiesOfALambdaShareItAndTheLastOneEndsIt) {
  const auto Token = std::make_shared<int>(0);
  TAdd First = [Token, Sum = 0](int ABy) mutable { return Sum += ABy; };
  const TAdd Second = First;
  EXPECT_EQ(First, Second);
  EXPECT_EQ(First(2) + Second(3), 2 + 5);
  TAdd Moved = std::move(First);
  Moved = Second;
  EXPECT_EQ(Token.use_count(), 2);
}

TEST(Method, CallMayOverwriteTheFieldItWasMadeThrough) {
  TAdd Field;
  const auto Token = std::make_shared<int>(7);
  Field = [&Field, Token](int ABy) {
    Field = nullptr;
    return *Token + ABy;  // reads the callable, which the field no longer keeps
  };
  EXPECT_EQ(Field(1), 8);
  EXPECT_EQ(Token.use_count(), 1);
}

// ---- Exceptions ----------------------------------------------------------------------------------------------------

TEST(ThreadException, StaysTheSameObjectAcrossThreads) {
  ExceptionRef Held;
  const Exception* Raised = nullptr;
  std::thread([&] {
    try {
      throw EInOutError(u"d\u00FCnn", 28);
    } catch (const Exception& e) {
      Raised = &e;
      Held = AcquireExceptionObject();
    }
  }).join();
  EXPECT_EQ(Held.Get(), Raised);
  try {
    Held.Raise();
  } catch (const EInOutError& e) {
    EXPECT_EQ(&e, Raised);
  }
  EXPECT_STREQ(Held->what(), "d\xC3\xBCnn");
  Held->SetMessage(u"other");
  EXPECT_STREQ(Held->what(), "other") << "the text of an earlier what() is gone";
}

TEST(ExceptionRef, HoldsWhatIsNotOfTheFamily) {
  const auto Foreign = ExceptionRef::Of<std::runtime_error>("f\xC3\xBCr");
  EXPECT_EQ(Foreign.Get(), nullptr);
  EXPECT_EQ(Foreign.Message(), u"f\u00FCr");
  EXPECT_THROW(Foreign.Raise(), std::runtime_error);
  EXPECT_EQ(ExceptionRef(std::make_exception_ptr(5)).Message(), u"unknown exception");
  EXPECT_FALSE(ExceptionRef::Current());
}

TEST(ExceptionClass, MakesOnlyWhatTheClassCanBeMadeFrom) {
  const ExceptionClass Plain = ExceptionClass::Of<EListError>(), Coded = ExceptionClass::Of<EOSError>();
  EXPECT_THROW(Plain.Create(u"m").Raise(), EListError);
  EXPECT_THROW(std::ignore = Plain.Create(u"m", 3), EInvalidOperation);
  EXPECT_EQ(dynamic_cast<EOSError&>(*Coded.Create(u"m", 3).Get()).ErrorCode(), 3);
  EXPECT_THROW(std::ignore = Coded.Create(u"m"), EInvalidOperation);
}

TEST(Assertion, NamesTheUnitByItsPlaceInTheLibrary) {
  const std::pair<const char*, UnicodeString> cCases[] = {{"/src/common/uZqLogger.cpp", u"common/uZqLogger"},
      {"common/uZqLogger.h", u"common/uZqLogger"}, {"/home/common/lib/runtime/io/files.cpp", u"runtime/io/files"},
      {"/runtime/lib/common/uZqTypes.cpp", u"common/uZqTypes"}, {"/uncommon/host.cpp", u"/uncommon/host"},
      {"/src/common/uZqThreads/locks.cpp", u"common/uZqThreads"}, {"common/lib/host.cpp", u"common/lib/host"},
      {"/v1.2/host", u"/v1.2/host"}};
  for (const auto& [File, Unit] : cCases)
    EXPECT_EQ(RaisedBy([&, &Place = File] { Assert(false, u"t", Place, 7); }),
        u"EAssertionFailed: t (" + Unit + u", line 7)");
  try {
    Assert(1 + 1 == 3);
  } catch (const EAssertionFailed& e) {
    EXPECT_EQ(e.Line(), __LINE__ - 2) << "the caller's";
    EXPECT_EQ(e.Message().Pos(u"Assertion failure ("), 1);
  }
}

// ---- A second library ----------------------------------------------------------------------------------------------

struct Plugin : testing::Test {
  void SetUp() override {
    void* const Library = dlopen(ZQ_TEST_PLUGIN, RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(Library, nullptr) << dlerror();
    FEntries = static_cast<const plugin::TEntries*>(dlsym(Library, "ZqPluginEntries"));
    ASSERT_NE(FEntries, nullptr);
  }
  const plugin::TEntries* FEntries = nullptr;
};

TEST_F(Plugin, ClassesAndInterfacesAreTheSameOnBothSides) {
  TInterfacedObject* const Object = FEntries->Make();
  const IntfRef<IInterface> Held(Object);
  EXPECT_EQ(Object->ClassName(), u"TPluginEcho");
  EXPECT_TRUE(Object->InheritsFrom(ClassOf<TInterfacedObject>()) && Object->InheritsFrom(ClassOf<plugin::IEchoEx>()));
  EXPECT_EQ(Supports<plugin::IEcho>(Object)->Echo(u"ab"), u"ab");
  EXPECT_EQ(Held.As<plugin::IEchoEx>()->EchoTwice(u"ab"), u"abab");
}

TEST_F(Plugin, ExceptionIsCaughtByItsTypeAndOutlivesItsHandler) {
  ExceptionRef Held;
  try {
    FEntries->Raise(u"from afar");
  } catch (const EListError&) {
    ADD_FAILURE() << "caught as a stranger";
  } catch (const EConvertError&) {
    Held = ExceptionRef::Current();
  }
  ASSERT_TRUE(Held);
  EXPECT_EQ(Held.Message(), u"from afar");
  EXPECT_EQ(Held->ClassName(), u"EPluginError");
  EXPECT_EQ(Held->ClassType(), FEntries->ClassOfRaised().ClassType());
  const auto Refuse = [](const UnicodeString& AText) -> UnicodeString { throw EListError(AText); };
  EXPECT_THROW(FEntries->Call(Refuse, u"x"), EListError) << "raised here, through the other library";
}

}  // namespace
}  // namespace zq
