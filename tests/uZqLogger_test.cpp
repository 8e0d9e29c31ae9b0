#include "common/uZqLogger.h"

#include <thread>

#include "common/rZqCommon.h"
#include "common/uZqSysUtils.h"
#include "common/uZqTypes.h"
#include "runtime/text/datetime.h"
#include "runtime/text/format.h"
#include "runtime/text/numbers.h"
#include "runtime/values/typeinfo.h"
#include "tests/fakes/event_log.h"
#include "tests/fakes/version.h"
#include "tests/support/logging.h"

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
  EXPECT_EQ(Child->GetName() + u" " + Child->GetFullName(), u"root.a.b b");
  EXPECT_EQ(Child->GetParentLogger()->GetName(), u"root.a");
  EXPECT_EQ(Logger()->GetName() + u" " + Logger()->GetFullName(), u"root root");
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
  const UnicodeString Raised = RaisedBy([&] { Logger()->QueryInterface(IZqLogger::IID, &Found); });
  EXPECT_EQ(Raised.Pos(u"EAssertionFailed: Do not get the IZqLogger interface from the rootlogger! (common/"), 1);
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
  EXPECT_TRUE(Child->IsEnabledFor(llWarn) && !Child->IsInfoEnabled());
  Child->SetLevel(llTrace);
  EXPECT_TRUE(Child->IsDebugEnabled() && !Child->GetParentLevel());
  Child->SetParentLevel(true);
  EXPECT_EQ(Child->GetLevel(), llWarn);
}

// A logger "p" with its child "c", and what arrives at each.
struct TFamily : TLoggerFixture {
  TFamily() : TLoggerFixture(u"p") {}
  const IntfRef<IZqLogger> Child = Log->GetLogger(u"c");
  const IntfRef<TNotingAppender> AtParent = AddNoting(Log), AtChild = AddNoting(Child);
};

struct TDispatchCase {
  const char* Name;
  TZqLogLevel ParentLevel, ChildLevel;
  bool Additive;
  TZqLogLevel Message;
  TNotes AtParent, AtChild;
};
struct LoggerDispatch : testing::TestWithParam<TDispatchCase>, TFamily {};

TEST_P(LoggerDispatch, TestsEachLoggerByItself) {
  const TDispatchCase& Case = GetParam();
  Log->SetLevel(Case.ParentLevel);
  Child->SetLevel(Case.ChildLevel);
  Child->SetAdditive(Case.Additive);
  Child->Log(Case.Message, u"x");
  EXPECT_EQ(AtParent->Notes(), Case.AtParent);
  EXPECT_EQ(AtChild->Notes(), Case.AtChild);
  EXPECT_EQ(AtParent->Sender, AtParent->Notes().empty() ? u"" : u"root.p.c");
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

struct TShop : TObject {};

struct TCallCase {
  const char* Name;
  std::function<void(IZqLogger&)> Call;
  const char* Note;
  TZqLogIndent Indent;
  const char16_t* Value;  // null for none
};
const Exception cFault(u"broke");
const TShop cShop;
struct LoggerCalls : testing::TestWithParam<TCallCase>, TFamily {};

TEST_P(LoggerCalls, MakeTheToldMessage) {
  UnicodeString Value = u"none";
  AtParent->OnWrite = [&](PZqDataRec ARec) { Value = ARec == nullptr ? u"none" : ZqDataRecToString(ARec); };
  GetParam().Call(*Log);
  EXPECT_EQ(AtParent->Notes(), TNotes{GetParam().Note});
  EXPECT_EQ(AtParent->Indent, GetParam().Indent);
  EXPECT_EQ(Value, GetParam().Value);
}
INSTANTIATE_TEST_SUITE_P(Forms, LoggerCalls,
    testing::Values(TCallCase{"Utf8Literal", [](IZqLogger& L) { L.Warn(u8"\u00fc %d", {1}); }, "root.p Warn \u00fc 1",
                        liIndentNone, u"none"},
        TCallCase{"BracesAreArguments", [](IZqLogger& L) { L.Log(llInfo, "m %d", {1}, liIndentIncrease); },
            "root.p Info m 1", liIndentIncrease, u"none"},
        TCallCase{"ErrorWithArguments", [](IZqLogger& L) { L.Error("m %s", {u"x"}); }, "root.p Error m x", liIndentNone,
            u"none"},
        TCallCase{"EnumerationAsValue", [](IZqLogger& L) { L.Log(llInfo, "m", llWarn, liIndentIncrease); },
            "root.p Info m", liIndentIncrease, u"llWarn"},
        TCallCase{"DebugOneArg", [](IZqLogger& L) { L.Debug(u"%d", {1}); }, "root.p Debug 1", liIndentNone, u"none"},
        TCallCase{"DebugVariant", [](IZqLogger& L) { L.Debug(u"m", 0); }, "root.p Debug m", liIndentNone, u"0"},
        TCallCase{"DebugObject", [](IZqLogger& L) { L.Debug(u"m", &cShop); }, "root.p Debug m", liIndentNone,
            u"object : TShop\r\n"},
        TCallCase{"FatalException", [](IZqLogger& L) { L.Fatal(cFault); }, "root.p Fatal broke", liIndentNone,
            u"Exception:broke"},
        TCallCase{"ErrorException", [](IZqLogger& L) { dynamic_cast<TZqLogger&>(L).Error(u"m", cFault); },
            "root.p Error m\r\nbroke", liIndentNone, u"none"},
        TCallCase{"FatalStandardException", [](IZqLogger& L) { L.Fatal(std::out_of_range("brök")); },
            "root.p Fatal brök", liIndentNone, u"brök"},
        TCallCase{
            "Count", [](IZqLogger& L) { L.Count(u"hits", 3); }, "root.p Debug #counter::hits#", liIndentNone, u"3"},
        TCallCase{"EnterMethod", [](IZqLogger& L) { L.EnterMethod(&cShop, u"Sell(%d)", {2}, llInfo); },
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

// ---------------------------------------------------------------------------------------- faults

struct LoggerFaults : testing::Test, TFamily {};

TEST_F(LoggerFaults, TextIsFormattedFirst) {
  Log->Trace(&cShop, u"Sell(%d)", {2});
  EXPECT_EQ(AtParent->Notes(), TNotes{Format(u"root.p Trace TShop($%p).Sell(2)", {&cShop}).ToUTF8()});
  EXPECT_THROW(Log->Debug(u"%d", {u"no number"}), EConvertError) << "before the message is made";
}

TEST_F(LoggerFaults, RaiseEndsTheWayAndReachesNobody) {
  const auto Behind = AddNoting(Child);
  AtChild->OnWrite = [](PZqDataRec) { throw EConvertError(u"no"); };
  EXPECT_NO_THROW(Child->Info(u"x"));
  EXPECT_TRUE(Behind->Notes().empty() && AtParent->Notes().empty());
  AtChild->OnWrite = nullptr;
  std::thread([&] { Child->Info(u"y"); }).join();  // no lock stayed behind
  EXPECT_EQ(AtParent->Notes(), TNotes{"root.p Info y"});
}

TEST_F(LoggerFaults, AppenderThatLogsIntoItsOwnLoggerEndsNothing) {
  AtParent->OnWrite = [&](PZqDataRec) {
    if (AtParent->Notes().size() == 1) Log->Info(u"answer");
  };
  Log->Info(u"call");
  EXPECT_EQ(AtParent->Notes(), (TNotes{"root.p Info call", "root.p Info answer"}));
  AtParent->OnWrite = [&](PZqDataRec) {
    for (int i = 0; i < 2; ++i) Log->Info(u"echo");
  };
  Log->Info(u"call");
  EXPECT_EQ(AtParent->Notes().size(), 2U + 1 + 200) << "one message leads to so many and no more";
  const auto Before = AtParent->Notes().size();
  AtParent->OnWrite = nullptr;
  Log->Info(u"after");
  EXPECT_EQ(AtParent->Notes().size(), Before + 1);
}

TEST_F(LoggerFaults, AppenderMayRemoveItselfWhileItWrites) {
  auto Leaving = AddNoting(Log);
  Leaving->OnWrite = [&](PZqDataRec) {
    Log->ClearAppenders();
    Leaving.Reset();
  };
  Log->Info(u"x");
  EXPECT_EQ(Log->GetAppenders()->Count(), 0);
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

TEST_F(LoggerFaults, BusyListIsSkippedAndTheMessageGoesOn) {
  Child->LockAppenders();
  std::thread([&] { Child->Info(u"x"); }).join();
  Child->UnLockAppenders();
  EXPECT_TRUE(AtChild->Notes().empty());
  EXPECT_EQ(AtParent->Notes(), TNotes{"root.p Info x"});
}

TEST(LoggerThreads, LoggersComeAndGoWhileOthersLog) {
  constexpr int cRounds = 2000;
  const TLoggerFixture Fixture(u"p");
  const auto Appender = AddNoting(Fixture.Log);
  OnThreads(4, [&](int t) {
    for (int i = 0; i < cRounds; ++i) {
      const auto Deep = t % 2 == 0 ? Logger()->GetLogger(u"p.a.b") : Fixture.Log->GetLogger(u"a")->GetLogger(u"b");
      Deep->Info(u"x");
      if (i % 64 == 0) Deep->GetAppenders()->Add(IntfRef<IZqLogAppender>(Appender.Get()));
    }
  });
  EXPECT_GE(Appender->Notes().size(), 4U * cRounds);
  EXPECT_EQ(Fixture.Log->GetChildLoggers()->Count(), 0);
}

// ---------------------------------------------------------------------------------------- appender lists, registries

struct TNamed : TZqBaseAppender {
  using TZqBaseAppender::TZqBaseAppender;
  void AfterConstruction() override {
    TZqBaseAppender::AfterConstruction();
    if (Refuses) throw EConvertError(u"no");
  }
  static inline bool Refuses = false;
};

TEST(AppenderList, HoldsEachAppenderOnce) {
  const TLoggerFixture Fixture(u"p");
  TZqLogAppenderList& List = *Fixture.Log->GetAppenders();
  const IntfRef<IZqLogAppender> Appender = List.Add(TZqLogBaseClass::Of<TNamed>());
  List.Add(Appender);
  const IntfRef<IZqLogAppender> Unnamed(New<TNamed>(Logger(), u"1st"));
  EXPECT_EQ(Appender->GetName() + Unnamed->GetName(), u"TNamed") << "names don't begin with a digit";
  List.Remove(Unnamed);
  EXPECT_EQ(List.Count(), 1);
  List.Remove(Appender);
  EXPECT_EQ(List.Count(), 0);
  EXPECT_THROW(List.Add(IntfRef<IZqLogAppender>()), EAssertionFailed);
  EXPECT_THROW(static_cast<void>(List.GetAppender(0)), EListError);
}

TEST(AppenderList, AppenderFreedByHandLeavesEveryList) {
  const TLoggerFixture First(u"p"), Second(u"q");
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
  EXPECT_THROW(Fixture.Log->GetAppenders()->Add(u"TZqNone"), EListError);
  std::thread([&] { EXPECT_EQ(Fixture.Log->LockAppenders()->Count(), 0), Fixture.Log->UnLockAppenders(); }).join();
}

// ---------------------------------------------------------------------------------------- configuration

// Answers from a table by "name.key", and notes what it was asked.
struct TConfig : Implements<TInterfacedObject, IZqLogConfiguratorEx> {
  using TText = const UnicodeString&;
  Variant GetLoggerValue(TText AName, TText AKey, TZqMainTypeKind AKind, const Variant& A) override {
    return Answer(AName, AKey, AKind, A);
  }
  Variant GetAppenderValue(TText AName, TText AKey, TZqMainTypeKind AKind, const Variant& A) override {
    return Answer(AName, AKey, AKind, A);
  }
  Variant GetValue(TText, TText, TZqMainTypeKind, const Variant& A) override { return A; }
  void ConfigureLogger(TZqLogger* ALogger) override { Asked.push_back("configure " + ALogger->GetName().ToUTF8()); }
  Variant Answer(TText AName, TText AKey, TZqMainTypeKind AKind, const Variant& ADefault) {
    const UnicodeString Default = AKind == mtkArray ? IntToStr(ZqVarArrayCount(ADefault)) : VarToUStr(ADefault);
    Asked.push_back(Format(u"%s.%s %d %s", {AName, AKey, static_cast<Integer>(AKind), Default}).ToUTF8());
    const auto Found = Values.find((AName + u"." + AKey).ToUTF8());
    return Found == Values.end() ? ADefault : Found->second;
  }
  std::map<std::string, Variant> Values;
  TNotes Asked;
  IntfRef<IZqLogger> Kept;  // goes with the configurator
};

struct LoggerConfig : testing::Test {
  ~LoggerConfig() override {
    Logger()->SetConfig(nullptr);
    Logger()->SetLevel(llDebug);
    Logger()->ClearAppenders();
  }
  static Variant Names(std::initializer_list<const char16_t*> ANames) {
    TArray<Variant> Items;
    for (const char16_t* Name : ANames) Items.push_back(Variant(UnicodeString(Name)));
    return VarArrayOf(Items);
  }
  IntfRef<IZqLogConfigurator> Config{New<TConfig>()};
  TConfig& Told = dynamic_cast<TConfig&>(*Config);
};

TEST_F(LoggerConfig, ServiceNameIsThatOfTheAppenderAndOfItsSource) {
  testing::NiceMock<TEventLogCalls> System;
  const TPlatformOverride<TEventLogService> Seat(System);
  Told.Values["Shop.ServiceName"] = UnicodeString(u"Orders");
  const IntfRef<TZqEventLogAppender> Appender(New<TZqEventLogAppender>(Logger(), u"Shop"));
  EXPECT_CALL(System, RegisterEventSourceW(UnicodeString(u"Orders")));
  for (const char16_t* const Name : {u"Orders", u""}) {  // nothing is told of "Orders"
    Appender->SetConfig(Config);
    EXPECT_EQ(Appender->GetName(), Name);
  }
}

TEST_F(LoggerConfig, NewChildrenGetTheRootsAndNilGoesDown) {
  const auto Parent = Logger()->GetLogger(u"p");
  for (const char16_t* const Name : {u"p.k", u"k"}) Told.Kept = Logger()->GetLogger(Name);
  Logger()->SetConfig(Config);
  const auto Child = Parent->GetLogger(u"c");
  const auto ConfigOf = [](const IntfRef<IZqLogger>& ALog) { return dynamic_cast<TZqLogger&>(*ALog).Configurator(); };
  EXPECT_TRUE(ConfigOf(Child));
  EXPECT_FALSE(ConfigOf(Parent)) << "not handed to children that exist";
  Config.Reset();
  Logger()->SetConfig(nullptr);
  EXPECT_FALSE(ConfigOf(Child));
  EXPECT_EQ(Logger()->GetChildLoggers()->Count(), 1);
  EXPECT_EQ(Child->GetLevel(), llDoNotLog) << "stays";
}

TEST_F(LoggerConfig, AsksForExactlyTheseKeysInThisOrder) {
  Told.Values = {{"root.c.Level", 1}, {"root.c.Appenders", Names({u"daily", u"nobody"})},
      {"daily.class", UnicodeString(u"tzqDAILYrollingfileappender")}};
  const auto Log = Logger()->GetLogger(u"c");
  Log->SetConfig(Config);
  EXPECT_EQ(
      Told.Asked, (TNotes{"configure root.c", "root.c.Level 1 7", "root.c.Additive 4 True", "root.c.Appenders 6 0",
                      "daily.class 3 ", "daily.AppendExisting 4 True", "daily.FileName 3 ", "daily.FileExt 3 ",
                      "daily.Layout 3 ", "daily.MaxFileSize 1 2147483647", "daily.MaxBackupCount 1 5",
                      "daily.DatePattern 3 yyyy-mm-dd", "nobody.class 3 "}));
  EXPECT_EQ(Log->GetAppenders()->Count(), 1);
  EXPECT_EQ(Log->GetLevel(), llTrace);
}

TEST_F(LoggerConfig, AppendersAreMadeOnceAndTakeTheirSettings) {
  const TTempFolder Folder;
  const UnicodeString Path = Folder.File("log");
  Told.Values = {{"root.a.Level", 3}, {"root.b.Level", UnicodeString(u"2")}, {"root.a.Additive", false},
      {"root.a.Appenders", Names({u"file"})}, {"root.b.Appenders", Names({u"file", u"FILE"})},
      {"file.class", UnicodeString(u"TZqRollingFileAppender")}, {"file.Layout", UnicodeString(u"tzqsimplelayout")},
      {"file.FileName", Path}, {"file.FileExt", UnicodeString(u"txt")},
      {"file.AppendExisting", UnicodeString(u"False")}, {"file.MaxFileSize", Int64{0x100000400}},
      {"file.MaxBackupCount", 7}};
  Logger()->SetConfig(Config);
  const auto A = Logger()->GetLogger(u"a"), B = Logger()->GetLogger(u"b");
  ASSERT_EQ(B->GetAppenders()->Count(), 1);
  const auto File = A->GetAppenders()->GetAppender(0).As<IZqRollingFileAppender>();
  EXPECT_EQ(B->GetAppenders()->GetAppender(0), A->GetAppenders()->GetAppender(0));
  EXPECT_EQ(File->GetFileName(), Path + u".txt");
  EXPECT_TRUE(!File->GetAppendExisting() && File->GetMaxFileSize() == 0x400 && File->GetMaxBackupCount() == 7);
  EXPECT_TRUE(!A->GetAdditive() && B->GetAdditive() && A->GetLevel() == llInfo && B->GetLevel() == llDebug);
  A->Info(u"written");
  EXPECT_NE(Folder.Read("log.txt").find("root.a - written"), std::string::npos);
  A->SetConfig(Config);
  EXPECT_EQ(A->GetAppenders()->Count(), 1);
}

TEST_F(LoggerConfig, WhatItCannotTakeIsRaisedAndTheLockIsFree) {
  const std::tuple<const char*, Variant, const char16_t*> cCases[] = {
      {"x.class", UnicodeString(u"TNone"), u"EListError: Class TNone not found!"},
      {"x.Layout", UnicodeString(u"TNone"), u"EListError: Class TNone not found!"},
      {"root.e.Level", 8, u"EConvertError: 8 is no log level, for the logger root.e"},
      {"root.e.Level", -1, u"EConvertError: -1 is no log level, for the logger root.e"},
      {"root.e.Level", UnicodeString(u"Info"), u"EVariantTypeCast"},
      {"root.e.Additive", UnicodeString(u"maybe"), u"EVariantTypeCast"},
      {"x.MaxFileSize", UnicodeString(u"big"), u"EVariantTypeCast"}};
  for (const auto& [Key, Value, Error] : cCases) {
    Told.Values = {{"root.e.Level", 3}, {"root.e.Appenders", Names({u"x"})},
        {"x.class", UnicodeString(u"TZqRollingFileAppender")}};
    Told.Values[Key] = Value;
    const auto Log = Logger()->GetLogger(u"e");
    EXPECT_TRUE(RaisedBy([&] { Log->SetConfig(Config); }).View().starts_with(UnicodeString(Error).View())) << Key;
    std::thread([&] { Logger()->GetLogger(u"e.below"); }).join();
    EXPECT_EQ(LiveAppenders().size(), 0U);
  }
}

// ---------------------------------------------------------------------------------------- values and events

struct TNode : TPersistent {
  Integer Size = 7;
  TZqLogLevel Level = llWarn;
  UnicodeString Text = u"skipped";
  WideString Wide = UnicodeString(u"shown");
  TNode* Next = nullptr;
};

TEST(LogValues, DumpShowsReadWritePropertiesAndSurvivesCycles) {
  const auto Ignore = [](TNode&, const auto&) {};
  DescribeType<TNode>(u"uNodes")
      .Property(u"Size", &TNode::Size, Ignore)
      .Property(u"ReadOnly", &TNode::Size)
      .Property(
          u"Broken", [](const TNode&) -> Integer { throw EConvertError(u"no value"); }, Ignore)
      .Property(u"Level", &TNode::Level, Ignore)
      .Property(u"Text", &TNode::Text, Ignore)
      .Property(u"Wide", &TNode::Wide, Ignore)
      .Property(u"Next", &TNode::Next, Ignore);
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
  EXPECT_EQ(TextOf(rtkPointer, &TZqDataRec::VPointer, reinterpret_cast<const void*>(0xAB)), u"00AB");
  EXPECT_EQ(TextOf(rtkDate, &TZqDataRec::VDate, 44553), DateToStr(TDateTime(44553)));
  EXPECT_EQ(TextOf(rtkClass, &TZqDataRec::VClass, ClassOf<TShop>()), u"TShop");
  EXPECT_EQ(TextOf(rtkDynArray, &TZqDataRec::VInt64, Int64{0}), u"DynArray");
  EXPECT_EQ(TextOf(rtkUInt64, &TZqDataRec::VInt64, Int64{1}), u"unknown");
}

TEST(LogEvents, TellWhatTheSystemTells) {
  TScriptedVersion Version;
  EXPECT_CALL(Version, HasKernel).WillOnce(testing::Return(true));
  EXPECT_CALL(Version, KernelExports).WillRepeatedly(testing::Return(true));
  EXPECT_CALL(Version, GetVersionEx).WillOnce(testing::Return(false));
  EXPECT_CALL(Version, Release).WillOnce(testing::Return(TSystemRelease{6, 1, 2600, u"SP 3"}));
  const auto Event = IntfRef<TZqLogData>(New<TZqLogData>(llInfo, u"m"));
  EXPECT_TRUE(!Event->ComputerName.IsEmpty() && Event->ActiveForm == u"n.a.");
  EXPECT_EQ(Event->OS + u"|" + Event->Version, u"Windows Milennium|6.1; Build: A28, \"SP 3\"");
}

// ---------------------------------------------------------------------------------------- start and stop

TEST(LogPackage, TableNamesModulesInOrderAndDescribedTypes) {
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
    EXPECT_EQ(RegisteredAppenders()->Count(), 4);
  }
}

TEST(LogPackage, StopWritesTheFootersOfTheRootsAppenders) {
  const TTempFolder Folder;
  AddFile(IntfRef<IZqLogger>(Logger()), Folder.File("app.log"));
  Logger()->Info(u"x");
  Finalize();
  EXPECT_TRUE(SplitLines(Folder.Read("app.log")).back().starts_with("Log stopped on : "));
  Initialize();
  EXPECT_EQ(RegisteredAppenders()->Count(), 4);
}

}  // namespace
}  // namespace zq
