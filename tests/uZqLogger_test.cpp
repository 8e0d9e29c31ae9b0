#include "common/uZqLogger.h"

#include <gtest/gtest.h>

#include <chrono>
#include <thread>

#include "common/rZqCommon.h"
#include "common/uZqSysUtils.h"
#include "runtime/text/datetime.h"
#include "runtime/text/format.h"
#include "runtime/text/numbers.h"
#include "runtime/values/typeinfo.h"
#include "tests/support/logging.h"
#include "tests/support/raised.h"

namespace zq {
namespace {

using TNotes = std::vector<std::string>;

IntfRef<TNotingAppender> AddNoting(const IntfRef<IZqLogger>& ALog) {
  IntfRef<TNotingAppender> Result(New<TNotingAppender>());
  ALog->AddAppender(IntfRef<IZqLogAppender>(Result.Get()));
  return Result;
}

// ---------------------------------------------------------------------------------------- the tree

TEST(LoggerTree, NamesThePathAndTheLastComponent) {
  const auto Child = Logger()->GetLogger(u"a..b.");
  EXPECT_EQ(Child->GetName(), u"root.a.b");
  EXPECT_EQ(Child->GetFullName(), u"b");
  EXPECT_EQ(Child->GetParentLogger()->GetName(), u"root.a");
  EXPECT_EQ(Logger()->GetName(), u"root");
  EXPECT_EQ(Logger()->GetFullName(), u"root");
}

TEST(LoggerTree, PathWithoutComponentsIsTheLoggerItself) {
  for (const char16_t* const Path : {u"", u".", u"..."}) EXPECT_EQ(Logger()->GetLogger(Path).Get(), Logger());
  EXPECT_EQ(Logger()->GetChildLoggers()->Count(), 0);
}

TEST(LoggerTree, OneLoggerPerPathAsLongAsItIsHeld) {
  auto First = Logger()->GetLogger(u"a.b");
  EXPECT_EQ(First, Logger()->GetLogger(u"a")->GetLogger(u"b"));
  EXPECT_NE(First, Logger()->GetLogger(u"a.B")) << "case counts";
  First->SetLevel(llFatal);
  First.Reset();
  EXPECT_EQ(Logger()->GetChildLoggers()->Count(), 0) << "the parent goes with its last child";
  EXPECT_EQ(Logger()->GetLogger(u"a.b")->GetLevel(), llDebug);
}

TEST(LoggerTree, RootRefusesToBeAskedForInterfaces) {
  void* Found = nullptr;
  EXPECT_EQ(RaisedBy([&] {
    Logger()->QueryInterface(IZqLogger::IID, &Found);
  }).Pos(u"EAssertionFailed: Do not get the IZqLogger interface from the rootlogger! (common/uZqLogger, line "),
      1);
}

TEST(LoggerTree, ChildOutlivesTheRootWithoutAParent) {
  auto Child = Logger()->GetLogger(u"orphan");
  Finalize();
  EXPECT_FALSE(Child->GetParentLogger());
  Child->Info(u"goes nowhere");
  EXPECT_EQ(Child->GetName(), u"root.orphan");
  Initialize();
  EXPECT_EQ(Logger()->GetChildLoggers()->Count(), 0) << "a new root knows no child of the old one";
  auto* const Left = dynamic_cast<TZqLogger*>(Child.Get());
  Child.Reset();
  Free(Left);  // its count ends nothing any more
  auto* const Freed = New<TZqLogger>(Logger(), u"freed");
  auto Held = Freed->GetLogger(u"held");
  auto* const Orphan = dynamic_cast<TZqLogger*>(Held.Get());
  Free(Freed);  // with the count that its child has on it
  Held.Reset();
  Free(Orphan);
}

// ---------------------------------------------------------------------------------------- levels and dispatch

TEST(LoggerLevel, ComesFromTheNearestAncestorThatHasOne) {
  const auto Parent = Logger()->GetLogger(u"p");
  const auto Child = Parent->GetLogger(u"q.r");
  Parent->SetLevel(llWarn);
  EXPECT_EQ(Child->GetLevel(), llWarn);
  EXPECT_TRUE(Child->IsEnabledFor(llWarn));
  EXPECT_FALSE(Child->IsInfoEnabled());
  Child->SetLevel(llTrace);
  EXPECT_FALSE(Child->GetParentLevel());
  EXPECT_TRUE(Child->IsDebugEnabled());
  Child->SetParentLevel(true);
  EXPECT_EQ(Child->GetLevel(), llWarn);
}

struct TDispatchCase {
  const char* Name;
  TZqLogLevel ParentLevel;
  TZqLogLevel ChildLevel;
  bool Additive;
  TZqLogLevel Message;
  TNotes AtParent;
  TNotes AtChild;
};
class LoggerDispatch : public testing::TestWithParam<TDispatchCase> {};

TEST_P(LoggerDispatch, TestsEachLoggerByItself) {
  const TDispatchCase& Case = GetParam();
  const TLoggerFixture Fixture(u"p");
  const auto Child = Fixture.Log->GetLogger(u"c");
  Fixture.Log->SetLevel(Case.ParentLevel);
  Child->SetLevel(Case.ChildLevel);
  Child->SetAdditive(Case.Additive);
  const auto AtParent = AddNoting(Fixture.Log);
  const auto AtChild = AddNoting(Child);
  Child->Log(Case.Message, u"x");
  EXPECT_EQ(AtParent->Notes(), Case.AtParent);
  EXPECT_EQ(AtChild->Notes(), Case.AtChild);
  if (!AtParent->Notes().empty()) {
    EXPECT_EQ(AtParent->Sender, u"root.p.c");
  }
}
INSTANTIATE_TEST_SUITE_P(Levels, LoggerDispatch,
    testing::Values(TDispatchCase{"BothPass", llAll, llInfo, true, llInfo, {"root.p Info x"}, {"root.p.c Info x"}},
        TDispatchCase{"ChildDropsAndStillHandsOn", llAll, llError, true, llInfo, {"root.p Info x"}, {}},
        TDispatchCase{"ParentDrops", llError, llAll, true, llWarn, {}, {"root.p.c Warn x"}},
        TDispatchCase{"NotAdditive", llAll, llAll, false, llFatal, {}, {"root.p.c Fatal x"}},
        TDispatchCase{"DoNotLogPassesItself", llDoNotLog, llDoNotLog, true, llDoNotLog, {"root.p Disabled x"},
            {"root.p.c Disabled x"}},
        TDispatchCase{"DoNotLogDropsFatal", llAll, llDoNotLog, true, llFatal, {"root.p Fatal x"}, {}}),
    [](const auto& AInfo) { return std::string(AInfo.param.Name); });

struct TShop : TObject {
  ~TShop() override = default;
};

struct TCallCase {
  const char* Name;
  std::function<void(IZqLogger&)> Call;
  const char* Note;
  TZqLogIndent Indent;
  const char16_t* Value;  // null for none
};
const Exception cFault(u"broke");
const TShop* Shop() {
  static const TShop& Result = *new TShop;
  return &Result;
}
class LoggerCalls : public testing::TestWithParam<TCallCase> {};

TEST_P(LoggerCalls, MakeTheToldMessage) {
  const TLoggerFixture Fixture(u"p");
  const auto Appender = AddNoting(Fixture.Log);
  UnicodeString Value = u"none";
  Appender->OnWrite = [&](PZqDataRec ARec) { Value = ARec == nullptr ? u"none" : ZqDataRecToString(ARec); };
  GetParam().Call(*Fixture.Log);
  EXPECT_EQ(Appender->Notes(), TNotes{GetParam().Note});
  EXPECT_EQ(Appender->Indent, GetParam().Indent);
  EXPECT_EQ(Value, GetParam().Value);
}
INSTANTIATE_TEST_SUITE_P(Forms, LoggerCalls,
    testing::Values(
        TCallCase{"DebugOneArg", [](IZqLogger& L) { L.Debug(u"%d", {1}); }, "root.p Debug 1", liIndentNone, u"none"},
        TCallCase{"DebugVariant", [](IZqLogger& L) { L.Debug(u"m", 0); }, "root.p Debug m", liIndentNone, u"0"},
        TCallCase{"DebugObject", [](IZqLogger& L) { L.Debug(u"m", Shop()); }, "root.p Debug m", liIndentNone,
            u"object : TShop\r\n"},
        TCallCase{"FatalException", [](IZqLogger& L) { L.Fatal(cFault); }, "root.p Fatal broke", liIndentNone,
            u"Exception:broke"},
        TCallCase{"ErrorException", [](IZqLogger& L) { dynamic_cast<TZqLogger&>(L).Error(u"m", cFault); },
            "root.p Error m\r\nbroke", liIndentNone, u"none"},
        TCallCase{
            "Count", [](IZqLogger& L) { L.Count(u"hits", 3); }, "root.p Debug #counter::hits#", liIndentNone, u"3"},
        TCallCase{"EnterMethod", [](IZqLogger& L) { L.EnterMethod(Shop(), u"Sell(%d)", {2}, llInfo); },
            "root.p Info TShop.Sell(2)", liIndentIncrease, u"none"},
        TCallCase{"ExitMethod", [](IZqLogger& L) { L.ExitMethod(u"Sell", llWarn); }, "root.p Warn Sell",
            liIndentDecrease, u"none"},
        TCallCase{"LogData",
            [](IZqLogger& L) {
              const auto Event = IntfRef<TZqLogData>(New<TZqLogData>(llError, u"e"));
              Event->Indent = liIndentIncrease;
              L.Log(IntfRef<IZqLogData>(Event.Get()));
            },
            "root.p Error e", liIndentIncrease, u"none"}),
    [](const auto& AInfo) { return std::string(AInfo.param.Name); });

TEST(LoggerCalls, FormatTheirTextFirst) {
  const TLoggerFixture Fixture(u"p");
  const auto Appender = AddNoting(Fixture.Log);
  Fixture.Log->Trace(Shop(), u"Sell(%d)", {2});
  EXPECT_EQ(Appender->Notes(), TNotes{Format(u"root.p Trace TShop($%p).Sell(2)", {Shop()}).ToUTF8()});
  EXPECT_THROW(Fixture.Log->Debug(u"%d", {u"no number"}), EConvertError) << "before the message is made";
}

// ---------------------------------------------------------------------------------------- faults of appenders

TEST(LoggerFaults, RaiseEndsTheWayAndReachesNobody) {
  const TLoggerFixture Fixture(u"p");
  const auto Child = Fixture.Log->GetLogger(u"c");
  const auto Raising = AddNoting(Child);
  const auto Behind = AddNoting(Child);
  const auto Above = AddNoting(Fixture.Log);
  Raising->OnWrite = [](PZqDataRec) { throw EConvertError(u"no"); };
  EXPECT_NO_THROW(Child->Info(u"x"));
  EXPECT_TRUE(Behind->Notes().empty());
  EXPECT_TRUE(Above->Notes().empty());
  Raising->OnWrite = nullptr;
  std::thread([&] { Child->Info(u"y"); }).join();  // no lock stayed behind
  EXPECT_EQ(Above->Notes(), TNotes{"root.p Info y"});
}

TEST(LoggerFaults, AppenderThatLogsIntoItsOwnLoggerEndsNothing) {
  const TLoggerFixture Fixture(u"p");
  const auto Once = AddNoting(Fixture.Log);
  Once->OnWrite = [&](PZqDataRec) {
    if (Once->Notes().size() == 1) Fixture.Log->Info(u"answer");
  };
  Fixture.Log->Info(u"call");
  EXPECT_EQ(Once->Notes(), (TNotes{"root.p Info call", "root.p Info answer"}));
  Once->OnWrite = [&](PZqDataRec) {
    for (int i = 0; i < 2; ++i) Fixture.Log->Info(u"echo");
  };
  Fixture.Log->Info(u"call");
  EXPECT_LT(Once->Notes().size(), 100U);
  const auto Before = Once->Notes().size();
  Once->OnWrite = nullptr;
  Fixture.Log->Info(u"after");
  EXPECT_EQ(Once->Notes().size(), Before + 1);
}

TEST(LoggerFaults, AppenderMayRemoveItselfWhileItWrites) {
  const TLoggerFixture Fixture(u"p");
  auto Leaving = AddNoting(Fixture.Log);
  Leaving->OnWrite = [&](PZqDataRec) {
    Fixture.Log->ClearAppenders();
    Leaving.Reset();
  };
  Fixture.Log->Info(u"x");
  EXPECT_EQ(Fixture.Log->GetAppenders()->Count(), 0);
}

TEST(LoggerLock, TimeOutTellsWhoAsksAndWhoHolds) {
  TZqLogLock Lock;
  std::thread Holder([&] { Lock.Enter(u"the holder", true); });
  Holder.join();  // the lock stays with a thread that is gone
  const UnicodeString Owner = u"asker";
  const auto Start = std::chrono::steady_clock::now();
  EXPECT_EQ(RaisedBy([&] { Lock.Enter(Owner, u".Op", true); })
                .Pos(u"Exception: A lock was requested by asker.Op (ThreadId: " + IntToStr(GetCurrentThreadId()) +
                     u"), however  logger has already been locked by the holder (ThreadId: "),
      1);
  EXPECT_GE(std::chrono::steady_clock::now() - Start, std::chrono::seconds(5));
}

TEST(LoggerLock, BusyListIsSkippedAndTheMessageGoesOn) {
  const TLoggerFixture Fixture(u"p");
  const auto Child = Fixture.Log->GetLogger(u"c");
  const auto Skipped = AddNoting(Child);
  const auto Above = AddNoting(Fixture.Log);
  Child->LockAppenders();
  std::thread([&] { Child->Info(u"x"); }).join();
  Child->UnLockAppenders();
  EXPECT_TRUE(Skipped->Notes().empty());
  EXPECT_EQ(Above->Notes(), TNotes{"root.p Info x"});
}

TEST(LoggerThreads, LoggersComeAndGoWhileOthersLog) {
  constexpr int cRounds = 2000;
  const TLoggerFixture Fixture(u"p");
  const auto Appender = AddNoting(Fixture.Log);
  std::vector<std::thread> Threads;
  for (int t = 0; t < 4; ++t)
    Threads.emplace_back([&, t] {
      for (int i = 0; i < cRounds; ++i) {
        const auto Deep = t % 2 == 0 ? Logger()->GetLogger(u"p.a.b") : Fixture.Log->GetLogger(u"a")->GetLogger(u"b");
        Deep->Info(u"x");
        if (i % 64 == 0) Deep->GetAppenders()->Add(IntfRef<IZqLogAppender>(Appender.Get()));
      }
    });
  for (std::thread& Thread : Threads) Thread.join();
  EXPECT_GE(Appender->Notes().size(), 4U * cRounds);
  EXPECT_EQ(Fixture.Log->GetChildLoggers()->Count(), 0);
}

// ---------------------------------------------------------------------------------------- appender lists, registries

class TNamed : public TZqBaseAppender {
 public:
  using TZqBaseAppender::TZqBaseAppender;
  static inline bool Refuses = false;

 protected:
  void AfterConstruction() override {
    TZqBaseAppender::AfterConstruction();
    if (Refuses) throw EConvertError(u"no");
  }
  ~TNamed() override = default;
};

TEST(AppenderList, HoldsEachAppenderOnce) {
  const TLoggerFixture Fixture(u"p");
  TZqLogAppenderList& List = *Fixture.Log->GetAppenders();
  const IntfRef<IZqLogAppender> Appender = List.Add(TZqLogBaseClass::Of<TNamed>());
  List.Add(Appender);
  EXPECT_EQ(List.Count(), 1);
  EXPECT_EQ(Appender->GetName(), u"TNamed");
  const IntfRef<IZqLogAppender> Unnamed(New<TNamed>(Logger(), u"1st"));
  EXPECT_EQ(Unnamed->GetName(), u"") << "names don't begin with a digit";
  List.Remove(Unnamed);
  EXPECT_EQ(List.Count(), 1);
  List.Remove(Appender);
  EXPECT_EQ(List.Count(), 0);
  EXPECT_THROW(List.Add(IntfRef<IZqLogAppender>()), EAssertionFailed);
  EXPECT_THROW(static_cast<void>(List.GetAppender(0)), EListError);
}

TEST(AppenderList, AppenderFreedByHandLeavesEveryList) {
  const TLoggerFixture First(u"p");
  const TLoggerFixture Second(u"q");
  auto* const Appender = New<TNamed>(Logger(), u"shared");
  First.Log->AddAppender(IntfRef<IZqLogAppender>(Appender));
  Second.Log->AddAppender(IntfRef<IZqLogAppender>(Appender));
  Free(Appender);
  EXPECT_EQ(First.Log->GetAppenders()->Count(), 0);
  EXPECT_EQ(Second.Log->GetAppenders()->Count(), 0);
  EXPECT_TRUE(LiveAppenders().empty());
}

TEST(AppenderList, AppenderFreedByHandWaitsForMessagesOnTheirWay) {
  const TLoggerFixture Fixture(u"p");
  std::atomic<bool> Going = true;
  std::thread Other([&] {
    while (Going) Fixture.Log->Info("UTF-8 as it is");
  });
  for (int i = 0; i < 300; ++i) {
    auto* const Appender = New<TNamed>(Logger(), u"short");
    Fixture.Log->AddAppender(IntfRef<IZqLogAppender>(Appender));
    EXPECT_NO_THROW(Free(Appender));
  }
  Going = false;
  Other.join();
  EXPECT_TRUE(LiveAppenders().empty());
}

TEST(AppenderList, LastListToLetGoEndsTheAppender) {
  {
    const TLoggerFixture Fixture(u"p");
    Fixture.Log->AddAppender(TZqLogBaseClass::Of<TNamed>());
    TNamed::Refuses = true;
    EXPECT_THROW(Fixture.Log->AddAppender(TZqLogBaseClass::Of<TNamed>()), EConvertError);
    TNamed::Refuses = false;
    EXPECT_EQ(LiveAppenders().size(), 1U);
  }
  EXPECT_TRUE(LiveAppenders().empty());
}

TEST(AppenderRegistry, FindsClassesInAnyCaseAndNamesWhatIsMissing) {
  EXPECT_EQ(RegisteredAppenders()->GetClass("tzqROLLINGfileappender").ClassName(), u"TZqRollingFileAppender");
  EXPECT_EQ(RegisteredLayouts()->GetClass(ZqSimpleLayout), TZqLogBaseClass::Of<TZqSimpleLayout>());
  EXPECT_EQ(RaisedBy([] { static_cast<void>(RegisteredAppenders()->GetClass(ZqLogViewerAppenderClient)); }),
      u"EListError: Class TZqLogViewerAppenderClient not found!");
  const TLoggerFixture Fixture(u"p");
  EXPECT_THROW(Fixture.Log->GetAppenders()->Add("TZqNone"), EListError);
  std::thread([&] { EXPECT_EQ(Fixture.Log->LockAppenders()->Count(), 0), Fixture.Log->UnLockAppenders(); }).join();
}

// ---------------------------------------------------------------------------------------- configuration's first steps

class TConfig : public Implements<TInterfacedObject, IZqLogConfigurator> {
 public:
  IntfRef<IZqLogger> Kept;  // goes with the configurator
  Variant GetLoggerValue(const UnicodeString&, const UnicodeString&, TZqMainTypeKind, const Variant& A) override {
    return A;
  }
  Variant GetAppenderValue(const UnicodeString&, const UnicodeString&, TZqMainTypeKind, const Variant& A) override {
    return A;
  }
  Variant GetValue(const UnicodeString&, const UnicodeString&, TZqMainTypeKind, const Variant& A) override { return A; }

 protected:
  ~TConfig() override = default;
};

TEST(LoggerConfig, NewChildrenGetTheRootsAndNilGoesDown) {
  const auto Parent = Logger()->GetLogger(u"p");
  auto* const Config = New<TConfig>();
  for (const char16_t* const Name : {u"p.k", u"k"}) Config->Kept = Logger()->GetLogger(Name);
  Logger()->SetConfig(IntfRef<IZqLogConfigurator>(Config));
  const auto Child = Parent->GetLogger(u"c");
  const auto ConfigOf = [](const IntfRef<IZqLogger>& ALog) { return dynamic_cast<TZqLogger&>(*ALog).Configurator(); };
  EXPECT_TRUE(ConfigOf(Child));
  EXPECT_FALSE(ConfigOf(Parent)) << "not handed to children that exist";
  Logger()->SetConfig(nullptr);
  EXPECT_FALSE(ConfigOf(Child));
  EXPECT_EQ(Logger()->GetChildLoggers()->Count(), 1);
}

// ---------------------------------------------------------------------------------------- values and events

class TNode : public TPersistent {
 public:
  ~TNode() override = default;
  Integer GetSize() const { return 7; }
  void SetSize(Integer) {}
  Integer GetBroken() const { throw EConvertError(u"no value"); }
  TZqLogLevel GetLevel() const { return llWarn; }
  void SetLevel(TZqLogLevel) {}
  UnicodeString GetText() const { return u"skipped"; }
  void SetText(const UnicodeString&) {}
  WideString GetWide() const { return UnicodeString(u"shown"); }
  void SetWide(const WideString&) {}
  TNode* GetNext() const { return Next; }
  void SetNext(TNode* ANode) { Next = ANode; }
  TNode* Next = nullptr;
};

TEST(LogValues, DumpShowsReadWritePropertiesAndSurvivesCycles) {
  DescribeType<TNode>(u"uNodes")
      .Property(u"Size", &TNode::GetSize, &TNode::SetSize)
      .Property(u"ReadOnly", &TNode::GetSize)
      .Property(u"Broken", &TNode::GetBroken, &TNode::SetSize)
      .Property(u"Level", &TNode::GetLevel, &TNode::SetLevel)
      .Property(u"Text", &TNode::GetText, &TNode::SetText)
      .Property(u"Wide", &TNode::GetWide, &TNode::SetWide)
      .Property(u"Next", &TNode::GetNext, &TNode::SetNext);
  TNode Outer;
  TNode Inner;
  Outer.Next = &Inner;
  Inner.Next = &Outer;
  const std::u16string Lines =
      u"  Size = 7\r\n  Exception EConvertError(no value) was raised while trying to read property: Broken\r\n"
      u"  Level = llWarn\r\n  Wide = shown\r\n";
  std::u16string Indented;
  for (const Char c : Lines) Indented.append(Indented.empty() || Indented.back() == u'\n' ? u"  " : u"").push_back(c);
  TZqDataRec Rec;
  Rec.DataType = rtkObject;
  Rec.VObject = &Outer;
  EXPECT_EQ(ZqDataRecToString(&Rec),
      u"object : TNode\r\n" + Lines + u"  object : TNode\r\n" + Indented + u"    object : TNode\r\n");
  Rec.VObject = nullptr;
  EXPECT_EQ(ZqDataRecToString(&Rec), u"");
}

template <class T>
UnicodeString TextOf(TZqTypeKind AKind, T TZqDataRec::*AMember, T AValue) {
  TZqDataRec Rec;
  Rec.DataType = AKind;
  Rec.*AMember = AValue;
  return ZqDataRecToString(&Rec);
}

TEST(LogValues, EachKindHasItsText) {
  const WideString Wide = u"w\u00e4";
  EXPECT_EQ(TextOf(rtkShortInt, &TZqDataRec::VShortInt, ShortInt{-3}), u"-3");
  EXPECT_EQ(TextOf(rtkLongWord, &TZqDataRec::VLongWord, Cardinal{4000000000U}), u"4000000000");
  EXPECT_EQ(TextOf(rtkExtended, &TZqDataRec::VExtended, Extended{1.5}), u"1.50");
  EXPECT_EQ(TextOf(rtkBoolean, &TZqDataRec::VBoolean, true), u"-1");
  EXPECT_EQ(TextOf(rtkWChar, &TZqDataRec::VWChar, u'\u00e4'), u"\u00e4");
  EXPECT_EQ(TextOf(rtkWString, &TZqDataRec::VWString, &Wide), u"w\u00e4");
  EXPECT_EQ(
      TextOf(rtkPointer, &TZqDataRec::VPointer, static_cast<const void*>(reinterpret_cast<void*>(0xAB))), u"00AB");
  EXPECT_EQ(TextOf(rtkDate, &TZqDataRec::VDate, 44553), DateToStr(TDateTime(44553)));
  EXPECT_EQ(TextOf(rtkClass, &TZqDataRec::VClass, ClassOf<TShop>()), u"TShop");
  EXPECT_EQ(TextOf(rtkDynArray, &TZqDataRec::VInt64, Int64{0}), u"DynArray");
  EXPECT_EQ(TextOf(rtkUInt64, &TZqDataRec::VInt64, Int64{1}), u"unknown");
}

TEST(LogEvents, FillTheirFields) {
  const auto Event = IntfRef<TZqLogData>(New<TZqLogData>(llInfo, u"m"));
  EXPECT_EQ(Event->OS, u"Windows 8");
  EXPECT_FALSE(Event->ComputerName.IsEmpty());
  EXPECT_EQ(Event->ActiveForm, u"n.a.");
  EXPECT_NE(Event->Version.Pos(u"; Build: "), 0) << Event->Version.ToUTF8();
}

// ---------------------------------------------------------------------------------------- start and stop

TEST(LogPackage, StartsOnceHoweverOftenAndStopsWithTheLast) {
  Initialize();
  const auto* const Before = RegisteredLayouts();
  Finalize();
  EXPECT_EQ(RegisteredLayouts(), Before);
  const TLoggerFixture Fixture(u"p");
  EXPECT_EQ(GetPackageInfoTable().Units.front().Name, std::u16string_view(u"uZqSysUtils"));
  for (const PTypeInfo Type : GetPackageInfoTable().Types) EXPECT_NE(GetEnumName(Type, 1), u"1");
}

TEST(LogPackage, AModuleStartedByItselfKeepsWhatItHas) {
  ZqRegisterExceptionClass(u"package", 1, EZqExceptionClass::Of<EZqException>());
  const auto Appender = IntfRef<IZqLogAppender>(New<TZqFileAppender>(Logger(), u"own"));
  for (const bool Starting : {true, false}) {
    for (const TPackageUnit& Unit : GetPackageInfoTable().Units)
      if (Unit.Start != nullptr) (Starting ? Unit.Start : Unit.Stop)();
    EXPECT_TRUE(ZqGetExceptionClass(u"package", 1));
    EXPECT_EQ(LiveAppenders().size(), 1U);
    EXPECT_EQ(RegisteredAppenders()->Count(), 2);
  }
}

TEST(LogPackage, StopWritesTheFootersOfTheRootsAppenders) {
  const TTempFolder Folder;
  AddFile(IntfRef<IZqLogger>(Logger()), Folder.File("app.log"));
  Logger()->Info(u"x");
  Finalize();
  EXPECT_TRUE(SplitLines(Folder.Read("app.log")).back().starts_with("Log stopped on : "));
  Initialize();
  EXPECT_EQ(RegisteredAppenders()->Count(), 2);
}

}  // namespace
}  // namespace zq
