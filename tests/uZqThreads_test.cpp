#include "common/uZqThreads.h"

#include <pthread.h>

#include <atomic>
#include <cstdlib>
#include <iostream>
#include <thread>

#include "runtime/core/utf8.h"
#include "runtime/sync/message_window.h"
#include "runtime/sync/pause.h"
#include "tests/fakes/processes.h"
#include "tests/fakes/sessions.h"
#include "tests/support/support.h"

namespace zq {
namespace {

using ::testing::_;
using ::testing::Return;

constexpr Cardinal cLong = 30'000;  // ms that no passing test waits for

/// A thread of steps that the test gives it; it notes what is called.
class TSteps : public TZqThread {
 public:
  using TStep = std::function<void(TSteps&, TZqThreadAction&)>;
  TSteps(TZqThreadManager* AManager, TStep AStep, bool ASuspended = false, bool AFreesItself = true)
      : TZqThread(AManager, ASuspended), Step(std::move(AStep)) {
    SetFreeOnTerminate(AFreesItself);
  }
  using TZqThread::DoQueryEndSession;
  using TZqThread::SetThreadState;
  using TZqThread::Sleep;
  using TZqThread::Synchronize;

  const TStep Step;
  std::function<void()> OnInitialize, OnFinalize;
  std::atomic<int> Passes = 0;
  std::string Heard;
  bool MayEnd = true;
  std::atomic<bool>* Gone = nullptr;

 protected:
  ~TSteps() override {
    if (Gone != nullptr) *Gone = true;
  }
  void Initialize() override {
    if (OnInitialize) OnInitialize();
  }
  void Execute(TZqThreadAction& AAction) override {
    ++Passes;
    Step(*this, AAction);
  }
  void Finalize() override {
    if (OnFinalize) OnFinalize();
  }
  void DoSessionEvent(TZqSessionEventType AType, Cardinal AID) override {
    Heard += 's' + std::to_string(static_cast<int>(AType)) + '/' + std::to_string(AID) + ' ';
  }
  void DoPowerEvent(TZqPowerEventType AType) override { Heard += 'p' + std::to_string(static_cast<int>(AType)) + ' '; }
  void DoQueryEndSession(const TZqEndSessionTypes& ATypes, bool& ACanEnd) override {
    Heard += ATypes.Contains(esLogoff) ? "q! " : "q ";
    ACanEnd = ACanEnd && MayEnd;
  }
  void DoEndSession(bool AEnding, const TZqEndSessionTypes&) override { Heard += AEnding ? "e! " : "e "; }
};

/// A manager that notes its callbacks as letters, those of states by the state's number.
struct TNoted {
  TNoted() {
    const auto Note = [this](const char* AText) {
      return TZqThreadEvent([this, AText](TZqThread* AThread) {
        const std::lock_guard Guard(Lock);
        Text += *AText == '=' ? std::to_string(static_cast<int>(AThread->ThreadState())) : std::string(AText);
        if (*AText == Raises) throw EAbort(u"from the callback");
      });
    };
    Manager->SetOnThreadError(Note("E"));
    Manager->SetOnThreadRunning(Note("r"));
    Manager->SetOnThreadSuspended(Note("s"));
    Manager->SetOnThreadDone(Note("D"));
    Manager->SetOnThreadDestroyed(Note("x"));
    Manager->SetOnThreadStateChanged(Note("="));
  }
  auto Count(char ALetter) {
    const std::lock_guard Guard(Lock);
    return std::ranges::count(Text, ALetter);
  }
  // What was noted; the thread is waited for and freed.
  std::string After(TZqThread* AThread) {
    AThread->WaitFor();
    while (Count('D') == 0) ProcessMessages(1);  // a state that is final comes before its callbacks
    AThread->Free();
    return Text;
  }
  std::mutex Lock;
  std::string Text;
  std::atomic<char> Raises = ' ';
  const TOwned<TZqThreadManager> Manager{New<TZqThreadManager>(nullptr)};
};

// The caller's, and suspended.
TSteps* Owned(TZqThreadManager* AManager, TSteps::TStep AStep) {
  auto* const Result = New<TSteps>(AManager, std::move(AStep), true, false);
  while (Result->ThreadState() != tsSuspended && !Result->Terminated()) ProcessMessages(1);
  return Result;
}
TSteps* Owned(const TNoted& ANoted, TSteps::TStep AStep) { return Owned(ANoted.Manager.get(), std::move(AStep)); }

void Nothing(TSteps&, TZqThreadAction&) {}

// ---- States --------------------------------------------------------------------------------------------------------

// All begin suspended: Running, the first pass, Suspended, and Running again with the Resume.
TEST(ManagedThread, EachWayToTheEndHasItsStatesAndCallbacks) {
  struct TCase {
    const char* Noted;
    Cardinal ExitCode;
    TSteps::TStep Step;
  };
  const auto Twice = [](TSteps& AThread, TZqThreadAction& AAction) {
    AAction = AThread.Passes == 2 ? taTerminate : taRunAgain;
  };
  const TCase Cases[] = {{"1r2s16Dx", 0, Nothing}, {"1r2s1r6Dx", 0, Twice},
      {"1r2s17EDx", 0xFFFFFFFF, [](TSteps&, TZqThreadAction&) { throw EConvertError(u"lost"); }},
      {"1r2s16Dx", 0, [](TSteps&, TZqThreadAction&) { throw 1; }},
      {"1r2s145Dx", 0,
          [](TSteps& AThread, TZqThreadAction& AAction) {
            AAction = taRunAgain;
            AThread.Terminate(false);
            AThread.SetThreadState(tsRunning);  // refused
            AThread.Sleep(1'000'000);           // at once
          }},
      {"1r2s131r6Dx", 0,
          [&](TSteps& AThread, TZqThreadAction& AAction) {
            Twice(AThread, AAction);
            if (AThread.Passes == 1) AThread.Sleep(1);
          }},
      {"1r2s147Dx", 0, [](TSteps& AThread, TZqThreadAction&) {
         AThread.Terminate(false);
         AThread.SetThreadState(tsError);  // taken
       }}};
  for (const TCase& Case : Cases) {
    TNoted Noted;
    TSteps* const Thread = Owned(Noted, Case.Step);
    EXPECT_TRUE(Thread->Suspended());
    Thread->Resume();
    EXPECT_EQ(Thread->WaitFor(), Case.ExitCode);
    EXPECT_EQ(static_cast<bool>(Thread->FatalException()), Case.ExitCode != 0);
    EXPECT_EQ(Noted.After(Thread), Case.Noted);
  }
}

TEST(ManagedThread, AStepMaySuspendItAndTerminateWakesIt) {
  for (const bool Resumes : {false, true}) {
    TNoted Noted;
    Noted.Manager->SetOnThreadStateChanged(nullptr);  // both threads change it
    TSteps* const Thread = Owned(Noted, [](TSteps&, TZqThreadAction& AAction) { AAction = taSuspend; });
    Thread->Resume();
    while (Noted.Count('s') != 2) ProcessMessages(1);
    Thread->Terminate(Resumes);
    EXPECT_EQ(Thread->WaitFor(), 0U);
    EXPECT_EQ(Thread->ThreadState(), tsTerminated);
    EXPECT_EQ(Thread->Suspended(), !Resumes);
    EXPECT_EQ(Noted.After(Thread), "rsrsDx");
  }
}

TEST(ManagedThread, WhatIsTerminatedBeforeItBeginsNeverRuns) {
  struct TEarly : TSteps {
    explicit TEarly(TZqThreadManager* AManager) : TSteps(AManager, Nothing) {
      SetFreeOnTerminate(false);
      OnInitialize = OnFinalize = [] { ADD_FAILURE(); };
      Terminate(true);
    }
  };
  TNoted Noted;
  auto* const Thread = New<TEarly>(Noted.Manager.get());
  Thread->WaitFor();
  while (Thread->ThreadState() != tsTerminated) ProcessMessages(1);
  EXPECT_EQ(Noted.After(Thread), "45Dx");
  const UnicodeString Told =
      RaisedBy([] { std::ignore = New<TSteps>(static_cast<TZqThreadManager*>(nullptr), Nothing); });
  EXPECT_EQ(Told.Pos(u"EAssertionFailed: The TZqThread needs a Thread Manager! (common/uZqThreads"), 1);
}

TEST(ManagedThread, FinalizeRunsBehindWhatInitializeHasLet) {
  struct TFails : TSteps {
    TFails(TZqThreadManager* AManager, std::string& ARan, bool AInInitialize)
        : TSteps(AManager, [&ARan](TSteps&, TZqThreadAction&) {
            ARan += 'E';
            throw EAbort(u"step");
          }) {
      SetFreeOnTerminate(false);
      OnInitialize = [AInInitialize] {
        if (AInInitialize) throw EAbort(u"begin");
      };
      OnFinalize = [&ARan] { ARan += 'F'; };
    }
  };
  for (const bool InInitialize : {true, false}) {
    TNoted Noted;
    std::string Ran;
    auto* const Thread = New<TFails>(Noted.Manager.get(), Ran, InInitialize);
    while (!Thread->Terminated()) ProcessMessages(1);
    EXPECT_EQ(Thread->FatalException().Message(), InInitialize ? u"begin" : u"step");
    EXPECT_EQ(Noted.After(Thread), InInitialize ? "17EDx" : "1r7EDx");
    EXPECT_EQ(Ran, InInitialize ? "" : "EF");
  }
}

TEST(ManagedThread, WhatACallbackRaisesEndsTheThreadAndIsKept) {
  const std::pair<char, const char*> Cases[] = {
      {'=', "1rDx"}, {'r', "1r7EDx"}, {'s', "1r2s7EDx"}, {'E', "1r2s17EDx"}, {'D', "1r2s17EDx"}};
  for (const bool Direct : {false, true}) {
    for (const auto& [Raises, Expected] : Cases) {
      TNoted Noted;
      Noted.Raises = Raises;
      Noted.Manager->SetMultiThreadedEvents(Direct);
      TSteps* const Thread = Owned(Noted, [](TSteps&, TZqThreadAction&) { throw EAbort(u"from the step"); });
      Thread->Resume();
      while (Thread->ThreadState() != tsError || Noted.Count('D') == 0) ProcessMessages(1);
      EXPECT_EQ(
          Thread->FatalException().Message(), Raises == 'D' || Raises == 'E' ? u"from the step" : u"from the callback");
      EXPECT_EQ(Noted.After(Thread), Expected) << Direct;
    }
  }
}

TEST(ManagedThread, CallbacksRunOnTheManagersThreadUnlessTheyMayRunAnywhere) {
  for (const bool Anywhere : {false, true}) {
    const TOwned<TZqThreadManager> Manager(New<TZqThreadManager>(nullptr));
    Manager->SetMultiThreadedEvents(Anywhere);
    std::atomic<Cardinal> Ran = 0, Synchronized = 0;
    Manager->SetOnThreadRunning([&](TZqThread*) { Ran = GetCurrentThreadId(); });
    TSteps* const Thread = Owned(Manager.get(), [&](TSteps& AThread, TZqThreadAction&) {
      AThread.Synchronize([&](Pointer AData) { Synchronized = GetCurrentThreadId() + (AData == &Ran ? 0 : 1); }, &Ran);
      try {
        AThread.Synchronize([](Pointer) { throw EConvertError(u"there"); }, nullptr);
      } catch (const EConvertError& e) {
        throw EAbort(e.Message() + u" and here");
      }
    });
    Thread->Resume();
    EXPECT_EQ(Thread->WaitFor(), 0xFFFFFFFF);
    EXPECT_EQ(Thread->FatalException().Message(), u"there and here");
    EXPECT_EQ(Ran, Anywhere ? Thread->ThreadID() : GetCurrentThreadId());
    EXPECT_EQ(Synchronized, GetCurrentThreadId());
    Thread->Free();
  }
}

// ---- The manager ---------------------------------------------------------------------------------------------------

TEST(ThreadManager, TheDefaultOneIsTheFirstWithoutAnOwner) {
  const TOwned<TComponent> Owner(New<TComponent>(nullptr));
  std::ignore = New<TZqThreadManager>(Owner.get());
  TZqThreadManager* const First = ZqThreadManager();
  EXPECT_EQ(First->Owner(), nullptr);
  const TOwned<TZqThreadManager> Second(New<TZqThreadManager>(nullptr));
  EXPECT_EQ(ZqThreadManager(), First);
  First->Free();
  EXPECT_EQ(ZqThreadManager(), Second.get());
}

TEST(ThreadManager, EndsOneOrAllOfItsThreads) {
  const TNoted Noted, Other;
  std::atomic<bool> Gone[3] = {};
  const auto Make = [&](std::atomic<bool>& AGone) {
    auto* const Result = New<TSteps>(
        Noted.Manager.get(),
        [](TSteps& AThread, TZqThreadAction& AAction) {
          AAction = taRunAgain;
          AThread.Sleep(100'000);
        },
        &AGone == &Gone[2]);
    Result->Gone = &AGone;
    return Result;
  };
  TSteps* const Threads[] = {Make(Gone[0]), Make(Gone[1]), Make(Gone[2])};
  EXPECT_EQ(Noted.Manager->ThreadCount(), 3);
  EXPECT_EQ(Noted.Manager->GetThread(1), Threads[1]);
  EXPECT_THROW(static_cast<void>(Noted.Manager->GetThread(3)), EListError);
  EXPECT_EQ(RaisedBy([&] { Other.Manager->TerminateThread(Threads[0], true); }),
      u"EZqThread: The specified thread is not managed by this ThreadManager or has already been destroyed!");
  EXPECT_THROW(Other.Manager->KillUnresponsiveThread(Threads[0]), EZqThread);
  EXPECT_FALSE(Threads[0]->Terminated());
  Noted.Manager->TerminateThread(Threads[0], true);
  EXPECT_TRUE(Gone[0]);
  EXPECT_EQ(Noted.Manager->ThreadCount(), 2);
  Threads[1]->SetFreeOnTerminate(false);
  Noted.Manager->TerminateThread(Threads[1], false);
  while (!Gone[1]) ProcessMessages(1);
  Noted.Manager->TerminateAllThreads(true);
  EXPECT_TRUE(Gone[2]) << "the suspended one";
  EXPECT_EQ(Noted.Manager->ThreadCount(), 0);
  Noted.Manager->TerminateAllThreads(true);
}

// Who frees, in every race: the thread itself, an owner in any state of it, the manager's end.
TEST(ThreadManager, NobodyFreesTwiceOrNever) {
  std::atomic<int> Alive = 0;
  struct TCounted : TSteps {
    TCounted(TZqThreadManager* AManager, std::atomic<int>& AAlive, bool AFrees, int ASleeps)
        : TSteps(AManager,
              [ASleeps](TSteps& AThread, TZqThreadAction& AAction) {
                if (ASleeps % 3 == 0) AThread.Sleep(ASleeps % 2);
                if (ASleeps % 3 == 1) AAction = taSuspend;
              }),
          Counted(AAlive) {
      SetFreeOnTerminate(AFrees);
      ++Counted;
    }
    ~TCounted() override { --Counted; }
    std::atomic<int>& Counted;
  };
  for (int Round = 0; Round < 300; ++Round) {
    const TOwned<TZqThreadManager> Manager(New<TZqThreadManager>(nullptr));
    if (Round % 2 == 0) Manager->SetOnThreadDone([](TZqThread*) {});
    for (int i = 0; i < 4; ++i) {
      auto* const Thread = New<TCounted>(Manager.get(), Alive, i % 2 == 0, Round);
      if (i % 2 != 0) Thread->Free();
      else try {
          if (Round % 4 == 1) Manager->TerminateThread(Thread, i == 0);
        } catch (const EZqThread&) {  // it is gone
        }
    }
  }
  EXPECT_EQ(Alive, 0);
}

TEST(ThreadManager, TheModulesStopEndsWhatIsLeft) {
  std::atomic<bool> Gone[2] = {};
  const auto Sleeping = [](TSteps& AThread, TZqThreadAction&) { AThread.Sleep(1'000'000); };
  for (std::atomic<bool>& Each : Gone) New<TSteps>(New<TZqThreadManager>(nullptr), Sleeping)->Gone = &Each;
  uZqThreads::Stop();
  EXPECT_TRUE(Gone[0] && Gone[1]);
  uZqThreads::Start();
  TZqThreadManager* const Anew = ZqThreadManager();
  EXPECT_EQ(Anew->ThreadCount(), 0);
  Anew->Free();
}

TEST(ThreadManager, CantBeFreedWhereItsWorkerWaitsForThat) {
  auto* const Manager = New<TZqThreadManager>(nullptr);
  UnicodeString Told;
  Manager->SetOnThreadRunning([&](TZqThread*) { Told = RaisedBy([&] { Manager->Free(); }); });
  auto* const Thread = New<TSteps>(Manager, Nothing, true);
  while (Told.IsEmpty()) ProcessMessages(1);
  EXPECT_NE(Told.Pos(u"EThread: These threads would wait for each other"), 0) << Told.ToUTF8();
  EXPECT_EQ(Manager->GetThread(0), Thread);
  EXPECT_EQ(ZqThreadManager(), Manager) << "it goes on";
  Manager->Free();
}

TEST(ThreadManager, StopsAThreadThatNeverReturns) {
  if (cThreadsCantBeStopped) GTEST_SKIP();
  TNoted Noted;
  TSteps* const Thread = Owned(Noted, [](TSteps&, TZqThreadAction&) {
    for (std::atomic<int> i = 0;; ++i) continue;
  });
  Thread->Resume();
  while (Noted.Text != "1r2s1") ProcessMessages(1);
  Noted.Manager->KillUnresponsiveThread(Thread);
  EXPECT_EQ(Noted.Text, "1r2s1x4") << "nothing of its own end runs";
  EXPECT_EQ(Noted.Manager->ThreadCount(), 0);
}

TEST(ThreadManager, SystemMessagesReachTheThreadsByTheTables) {
  TScriptedSessions Sessions;
  HWND Window = 0;
  EXPECT_CALL(Sessions, StartSystemMessages(_)).WillOnce([&](HWND AWindow) { Window = AWindow; });
  TNoted Noted;
  const auto Make = [&] { return Owned(Noted, Nothing); };
  TSteps* const Threads[] = {Make(), Make()};
  struct TCase {
    Cardinal Message;
    NativeUInt WParam;
    NativeInt LParam, Answer;
    const char* Heard;
  };
  const TCase Cases[] = {{689, 1, 7, 1, "s0/7 "}, {689, 11, 8, 1, "s10/8 "}, {689, 0, 7, 1, ""}, {689, 12, 7, 1, ""},
      {536, 4, 0, 1, "p0 "}, {536, 18, 0, 1, "p1 "}, {536, 32787, 0, 1, "p4 "}, {536, 5, 0, 1, ""},
      {17, 0, NativeInt{0x80000000}, 1, "q! "}, {17, 0, 0, 1, "q "}, {22, 0, 0, 0, "e "}, {18, 1, 0, 0, ""}};
  for (const TCase& Case : Cases) {
    for (TSteps* const Each : Threads) Each->Heard.clear();
    EXPECT_EQ(SendMessage(Window, Case.Message, Case.WParam, Case.LParam), Case.Answer) << Case.Message;
    for (TSteps* const Each : Threads) EXPECT_EQ(Each->Heard, Case.Heard);
  }
  Threads[0]->MayEnd = false;
  EXPECT_EQ(SendMessage(Window, 17, 0, 0), 0);
  EXPECT_NE(Threads[1]->Heard.find('q'), std::string::npos) << "all are asked";
  EXPECT_EQ(SendMessage(Window, 22, 1, 0), 0);
  EXPECT_EQ(Noted.Manager->ThreadCount(), 0);
  EXPECT_CALL(Sessions, StopSystemMessages(Window));
}

TEST(ThreadManager, RegistersForSessionsOnce) {
  TScriptedSessions Sessions;
  EXPECT_CALL(Sessions, StartSystemMessages(_));
  TOwned<TZqThreadManager> Manager(New<TZqThreadManager>(nullptr));
  EXPECT_CALL(Sessions, LoadLibrary()).WillRepeatedly(Return(true));
  EXPECT_CALL(Sessions, GetProcAddress(_)).WillRepeatedly(Return(true));
  EXPECT_CALL(Sessions, FreeLibrary()).Times(3);
  EXPECT_CALL(Sessions, WTSRegisterSessionNotification(_, 0)).WillOnce(Return(false)).WillOnce(Return(true));
  EXPECT_THROW(Manager->SetSessionEvents(true), Exception);
  EXPECT_FALSE(Manager->SessionEvents());
  Manager->SetSessionEvents(true);
  Manager->SetSessionEvents(true);
  testing::Sequence Ends;
  EXPECT_CALL(Sessions, WTSUnRegisterSessionNotification(_)).InSequence(Ends).WillOnce(Return(true));
  EXPECT_CALL(Sessions, StopSystemMessages(_)).InSequence(Ends);
  Manager.reset();
}

// ---- Work on threads -----------------------------------------------------------------------------------------------

TEST(RunThreaded, AnEventTellsOfTheClosuresEndButNotOfItsFailure) {
  std::atomic<Cardinal> Ran = 0;
  EXPECT_EQ(ZqRunThreaded([&](const auto&) { Ran = GetCurrentThreadId(); })->WaitFor(cLong), wrSignaled);
  EXPECT_NE(Ran, GetCurrentThreadId());
  const auto Lost = ZqRunThreaded([&](const auto&) { throw EAbort(u"lost"); });
  const auto Early = ZqRunThreaded([&](const auto& AEvent) {
    AEvent->SetEvent();
    throw EAbort(u"lost");
  });
  EXPECT_EQ(Early->WaitFor(cLong), wrSignaled);
  while (ZqThreadManager()->ThreadCount() != 0) ProcessMessages(1);
  EXPECT_EQ(Lost->WaitFor(0), wrTimeout);
  std::ignore = New<TZqExecThread>([&](const auto& AEvent) { Ran = AEvent ? 1 : 2; }, IntfRef<IZqSimpleEvent>());
  while (ZqThreadManager()->ThreadCount() != 0) ProcessMessages(1);
  EXPECT_EQ(Ran, 2U) << "without an event";
}

TEST(RunThreaded, ACallbackIsALoopWithItsData) {
  std::atomic<int> Plain = 0, Bound = 0;
  ZqRunThreaded(
      [](TZqThread* AThread, TZqThreadAction& AAction, Pointer AData) {
        EXPECT_EQ(AThread->ThreadID(), GetCurrentThreadId());
        const int Calls = ++*static_cast<std::atomic<int>*>(AData);
        EXPECT_EQ(AAction, Calls == 1 ? taTerminate : taRunAgain);
        AAction = Calls == 4 ? taTerminate : taRunAgain;
      },
      &Plain);
  ZqRunThreaded(TZqThreadMethod([&](TZqThread*, TZqThreadAction&, Pointer AData) {
    if (AData == &Bound) ++Bound;
  }),
      &Bound);
  while (ZqThreadManager()->ThreadCount() != 0) ProcessMessages(1);
  EXPECT_EQ(std::pair(Plain.load(), Bound.load()), std::pair(4, 1));
}

TEST(RunThreaded, QueuedWorkRunsOnTheMainThreadAndSetsItsEventInAnyCase) {
  IntfRef<IZqSimpleEvent> Good, Bad;
  std::jthread([&] {
    Good = ZqQueue([](const auto&) { EXPECT_TRUE(IsMainThread()); });
    Bad = ZqQueue([](const auto&) { throw EAbort(u"out"); });
  }).join();
  EXPECT_EQ(Good->WaitFor(0), wrTimeout);
  EXPECT_THROW(CheckSynchronize(), EAbort);
  EXPECT_EQ(Good->WaitFor(0), wrSignaled);
  EXPECT_EQ(Bad->WaitFor(0), wrSignaled);
}

TEST(RunThreaded, ProcessesAreStartedAndNotWaitedFor) {
  const PROCESS_INFORMATION Started = ZqCreateProcess(u"/bin/sh -c 'exit 3'");
  ASSERT_NE(Started.hProcess, nullptr);
  EXPECT_NE(Started.dwProcessId, 0U);
  EXPECT_TRUE(Started.hProcess->WaitForSingleObject(cLong));
  EXPECT_EQ(Started.hProcess->GetExitCodeProcess(), 3);
  EXPECT_EQ(ZqCreateProcess(u"/no/such/program").hProcess, nullptr);
}

// ---- Races ---------------------------------------------------------------------------------------------------------

int RacingPairs() {
  const char* const Wanted = std::getenv("ZQ_RACING_PAIRS");
  return Wanted == nullptr ? 100'000 : std::atoi(Wanted);
}

// A wake-up that is lost leaves the worker asleep: the next pass doesn't come in time.
TEST(ManagedThreadRaces, NoWakeUpIsLost) {
  const TOwned<TZqThreadManager> Manager(New<TZqThreadManager>(nullptr));
  const auto Start = std::chrono::steady_clock::now();
  const int Pairs = RacingPairs();
  auto* const Thread = New<TSteps>(Manager.get(), [](TSteps& AThread, TZqThreadAction& AAction) {
    AAction = taRunAgain;
    if (AThread.Passes % 2 == 0) AThread.Sleep(1'000'000);
  });
  int Done = 0;
  for (; Done < Pairs; ++Done) {
    const int Seen = Thread->Passes;
    if (Done % 2 == 0) Thread->Suspend();
    else
      while (Thread->Passes % 2 == 0 && Thread->ThreadState() != tsSleeping) SpinPause();
    for (int i = Done % 64; i > 0; --i) SpinPause();
    Thread->Resume();
    const auto Until = std::chrono::steady_clock::now() + std::chrono::milliseconds(cLong);
    while (Thread->Passes == Seen) {
      if (Thread->ThreadState() == tsSleeping) Thread->Resume();  // one that began since
      if (std::chrono::steady_clock::now() > Until) FAIL() << Done << " pairs, then it slept on";
    }
  }
  Manager->TerminateThread(Thread, true);
  const std::chrono::duration<double> Took = std::chrono::steady_clock::now() - Start;
  std::cout << Done << " pairs in " << Took.count() << " s\n";
}

TEST(ManagedThreadRaces, ATerminateIsNeverLostAndLeavesNothing) {
  const auto Open = [] {
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), std::filesystem::directory_iterator());
  };
  const TOwned<TZqThreadManager> Manager(New<TZqThreadManager>(nullptr));
  const auto Before = Open();
  for (int Round = 0; Round < 1000; ++Round) {
    auto* const Thread = New<TSteps>(
        Manager.get(),
        [](TSteps& AThread, TZqThreadAction& AAction) {
          AAction = AThread.Passes % 2 == 0 ? taSuspend : taRunAgain;
          if (AAction == taRunAgain) AThread.Sleep(1'000'000);
        },
        Round % 3 == 0);
    for (int i = 20 * (Round % 100); i > 0; --i) SpinPause();
    if (Round % 5 == 0) Thread->Resume();
    Manager->TerminateThread(Thread, true);
  }
  EXPECT_EQ(Open(), Before);
}

}  // namespace
}  // namespace zq
