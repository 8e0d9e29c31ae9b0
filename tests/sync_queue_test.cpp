#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <iostream>
#include <thread>

#include "runtime/sync/message_window.h"
#include "runtime/sync/thread.h"
#include "runtime/text/numbers.h"
#include "tests/support/support.h"

namespace zq {
namespace {

constexpr Cardinal cLong = 30'000;  // ms that no passing test waits for
constexpr Cardinal cMessage = 1024;

/// A thread in its loop, with a window that runs what it is given.
class TLoopThread {
 public:
  using TProc = std::function<NativeInt(NativeUInt)>;
  explicit TLoopThread(TProc AProc = [](NativeUInt AValue) { return static_cast<NativeInt>(AValue + 1); })
      : FThread(BeginThread([this, AProc] {
          FWindow = AllocateHWnd([AProc](HWND, Cardinal, NativeUInt AValue, NativeInt) { return AProc(AValue); });
          FReady.SetEvent();
          return RunMessageLoop();
        })) {
    FReady.WaitFor();
  }
  ~TLoopThread() { End(); }
  Integer End() {
    try {
      FThread->Queue()->Quit(5);
    } catch (const ECallRefused&) {  // it has ended
    }
    return FThread->WaitFor();
  }
  NativeInt Send(NativeUInt AValue) const { return SendMessage(FWindow, cMessage, AValue, 0); }
  [[nodiscard]] HWND Window() const { return FWindow; }
  [[nodiscard]] TNativeThread& Thread() const { return *FThread; }

 private:
  TSimpleEvent FReady;
  HWND FWindow = 0;
  TThreadHandle FThread;
};

TEST(ThreadQueue, ASentCallRunsThereAndBringsAnswerAndExceptionBack) {
  const Exception* Raised = nullptr;
  TLoopThread Loop([&](NativeUInt AValue) {
    if (AValue != 0) return static_cast<NativeInt>(GetCurrentThreadId());
    const auto Kept = ExceptionRef::Of<EConvertError>(u"from there");
    Raised = Kept.Get();
    Kept.Raise();
  });
  EXPECT_EQ(Loop.Send(1), static_cast<NativeInt>(Loop.Thread().ThreadID()));
  EXPECT_EQ(GetWindowThread(Loop.Window()), Loop.Thread().ThreadID());
  try {
    Loop.Send(0);
    ADD_FAILURE();
  } catch (const EConvertError& e) {
    EXPECT_EQ(&e, Raised);
  }
  const HWND Own = AllocateHWnd([](HWND, Cardinal AMessage, NativeUInt AW, NativeInt AL) {
    return static_cast<NativeInt>(AMessage * 100 + AW * 10) + AL;
  });
  EXPECT_EQ(SendMessage(Own, 3, 2, 1), 321) << "at once on the own thread";
  EXPECT_FALSE(DestroyWindow(Loop.Window())) << "another thread's";
  EXPECT_EQ(AllWindows(), (std::vector{Loop.Window(), Own}));
  EXPECT_TRUE(DestroyWindow(Own));
  EXPECT_FALSE(DestroyWindow(Own) || IsWindow(Own) || PostMessage(Own, 1, 0, 0));
  EXPECT_EQ(RaisedBy([&] { SendMessage(Own, 1, 0, 0); }), u"ECallRefused: The window " + IntToStr(Own) + u" is gone");
  EXPECT_EQ(Loop.End(), 5);
  EXPECT_FALSE(IsWindow(Loop.Window())) << "it ends with its thread";
}

TEST(ThreadQueue, WhoWaitsForAnAnswerServesTheOthersCalls) {
  const HWND Here = AllocateHWnd([](HWND, Cardinal, NativeUInt AValue, NativeInt) { return NativeInt(AValue) + 10; });
  TLoopThread Loop([&](NativeUInt AValue) { return SendMessage(Here, cMessage, AValue, 0) + 100; });
  EXPECT_EQ(Loop.Send(1), 111);
  TSimpleEvent Set;
  const auto Setter = BeginThread([&] {
    SendMessage(Here, cMessage, 1, 0);
    Set.SetEvent();
    return 3;
  });
  EXPECT_EQ(Setter->WaitFor(), 3) << "so does who waits for an end";
  DestroyWindow(Here);
}

TEST(ThreadQueue, AnAnswerMayComeTooLate) {
  TSimpleEvent Go;
  TLoopThread Loop([&](NativeUInt AValue) {
    if (AValue == 1) Go.WaitFor();
    if (AValue == 2) throw EAbort(u"stop");
    return NativeInt(AValue);
  });
  const auto Send = [&](NativeUInt AValue, Cardinal ATime) {
    return SendMessageTimeout(Loop.Window(), cMessage, AValue, 0, ATime);
  };
  EXPECT_EQ(Send(3, cLong), 3);
  EXPECT_EQ(Send(1, 10), std::nullopt);
  EXPECT_EQ(Send(3, 10), std::nullopt) << "it is still busy";
  Go.SetEvent();
  EXPECT_THROW(Send(2, cLong), EAbort);
  const HWND Own = AllocateHWnd([](HWND, Cardinal, NativeUInt, NativeInt) { return NativeInt{6}; });
  EXPECT_EQ(SendMessageTimeout(Own, 1, 0, 0, 0), 6);
  DestroyWindow(Own);
  EXPECT_THROW(SendMessageTimeout(Own, 1, 0, 0, 0).value_or(0), ECallRefused);
  TSimpleEvent Busy;
  Loop.Thread().Queue()->Post([&] {
    Busy.SetEvent();
    Sleep(20);
    DestroyWindow(Loop.Window());
  });
  Busy.WaitFor();
  EXPECT_THROW(Send(3, cLong).value_or(0), ECallRefused) << "it goes before it has taken the message";
}

TEST(ThreadQueue, CallsThatGoInACircleWithoutEndAreRefusedByName) {
  HWND There = 0;
  const HWND Here = AllocateHWnd([&](HWND, Cardinal, NativeUInt, NativeInt) { return SendMessage(There, 1, 0, 0); });
  const TLoopThread Loop([&](NativeUInt) { return SendMessage(Here, 1, 0, 0); });
  There = Loop.Window();
  const UnicodeString Told = RaisedBy([&] { SendMessage(There, 1, 0, 0); });
  for (const Cardinal Thread : {GetCurrentThreadId(), Loop.Thread().ThreadID()})
    EXPECT_NE(Told.Pos(IntToStr(Thread)), 0) << Told.ToUTF8();
  EXPECT_NE(Told.Pos(u"call each other without end"), 0);
  EXPECT_TRUE(DestroyWindow(Here));
}

TEST(ThreadQueue, ThreadsThatWaitForEachOthersEndAreToldSo) {
  TThreadHandle First, Second;
  TSimpleEvent Known;
  std::atomic<int> Refused = 0;
  const auto Wait = [&](const TThreadHandle& AOther) {
    Known.WaitFor();
    const UnicodeString Told = RaisedBy([&] { AOther->WaitFor(); });
    if (Told == u"nothing") return 0;
    for (const auto& Each : {First, Second}) EXPECT_NE(Told.Pos(IntToStr(Each->ThreadID())), 0) << Told.ToUTF8();
    return static_cast<int>(++Refused);
  };
  First = BeginThread([&] { return Wait(Second); });
  Second = BeginThread([&] { return Wait(First); });
  Known.SetEvent();
  EXPECT_EQ(First->WaitFor() + Second->WaitFor(), 1) << "exactly one finds the circle, which ends it for the other";
}

TEST(ThreadQueue, WhoServesACallCantWaitForTheEndOfItsSender) {
  TThreadHandle Sender, Between;
  UnicodeString Told;
  const HWND Here = AllocateHWnd([&](HWND, Cardinal, NativeUInt ADirect, NativeInt) -> NativeInt {
    Told = RaisedBy([&] { (ADirect != 0 ? Sender : Between)->WaitFor(); });
    return 0;
  });
  for (const bool Direct : {true, false}) {
    TSimpleEvent Waits;
    Sender = BeginThread([&] {
      if (!Direct) Waits.WaitFor();
      SendMessage(Here, cMessage, Direct ? 1 : 0, 0);
      return 0;
    });
    if (!Direct) Between = BeginThread([&] { return Waits.SetEvent(), Sender->WaitFor(); });
    if (!Direct) Sleep(20);
    EXPECT_EQ(Sender->WaitFor(), 0);
    for (const Cardinal ID : {GetCurrentThreadId(), Sender->ThreadID()})
      EXPECT_NE(Told.Pos(IntToStr(ID)), 0) << Told.ToUTF8();
    if (!Direct) Between->WaitFor();
  }
  DestroyWindow(Here);
}

TEST(ThreadQueue, NoSenderHangsWhereTheThreadOrTheWindowGoes) {
  for (const bool ByThread : {false, true}) {
    TSimpleEvent Busy, Go;
    TLoopThread Loop([&](NativeUInt) -> NativeInt { return 0; });
    Loop.Thread().Queue()->Post([&] {
      Busy.SetEvent();
      Go.WaitFor();  // serves nothing
      if (ByThread) EndThread(7);
      DestroyWindow(Loop.Window());
    });
    Busy.WaitFor();
    std::atomic<int> Refused = 0;
    std::jthread Senders([&] {
      OnThreads(3, [&](int) {
        const UnicodeString Told = RaisedBy([&] { Loop.Send(1); });
        Refused += Told.Pos(ByThread ? u"has ended" : u"is gone") != 0 ? 1 : 0;
      });
    });
    Sleep(20);
    Go.SetEvent();
    Senders.join();
    EXPECT_EQ(Refused, 3);
    EXPECT_EQ(Loop.End(), ByThread ? 7 : 5);
    EXPECT_THROW(Loop.Thread().Queue()->Post([] {}), ECallRefused);
  }
}

TEST(ThreadQueue, PostedCallsRunInOrderAndARaiseLeavesTheRest) {
  const auto Queue = TThreadQueue::Current();
  std::vector<int> Ran;
  const auto Post = [&](int AValue, const void* AOwner = nullptr) {
    Queue->Post([&Ran, AValue] { Ran.push_back(AValue); }, AOwner);
  };
  Post(1);
  Queue->Post([&] {
    Post(4);  // for the next pass
    throw EAbort(u"stop");
  });
  Post(2, &Ran);
  Post(3);
  Queue->DropPosted(&Ran);
  EXPECT_THROW(ProcessMessages(), EAbort);
  EXPECT_TRUE(ProcessMessages());
  EXPECT_EQ(Ran, (std::vector{1, 3, 4}));
  EXPECT_FALSE(ProcessMessages(5));
  Queue->Post([&] {
    Queue->Quit(2);
    EXPECT_EQ(RunMessageLoop(), 2) << "the inner one";
    Queue->Quit(1);
  });
  EXPECT_EQ(RunMessageLoop(), 1);
}

TEST(ThreadQueue, TimersComeAgainAndACallMayEndThem) {
  const auto Queue = TThreadQueue::Current();
  const auto Start = std::chrono::steady_clock::now();
  int Fast = 0, Slow = 0;
  TThreadQueue::TTimerID FastID = 0, SlowID = 0;
  FastID = Queue->SetTimer(10, [&] {
    if (++Fast == 3) Queue->KillTimer(FastID);
  });
  SlowID = Queue->SetTimer(60, [&] {
    Sleep(200);  // late for the next ones: those come once
    if (++Slow < 2) return;
    Queue->KillTimer(SlowID);
    Queue->Quit();
  });
  RunMessageLoop();
  const auto Took = std::chrono::steady_clock::now() - Start;
  EXPECT_EQ(std::pair(Fast, Slow), std::pair(3, 2));
  EXPECT_GE(Took, std::chrono::milliseconds(60 + 2 * 200));
  EXPECT_LT(Took, std::chrono::milliseconds(cLong));
}

struct TPipe {
  TPipe() { EXPECT_EQ(::pipe2(Ends, O_CLOEXEC), 0); }
  ~TPipe() { ::close(Ends[0]), ::close(Ends[1]); }
  void Fill() const { EXPECT_EQ(::write(Ends[1], "x", 1), 1); }
  void Empty() const {
    char Byte = 0;
    EXPECT_EQ(::read(Ends[0], &Byte, 1), 1);
  }
  int Ends[2] = {};
};

TEST(ThreadQueue, WatchesDescriptors) {
  const auto Queue = TThreadQueue::Current();
  const TPipe First, Second;
  std::string Ran;
  const auto Watch = [&](const TPipe& APipe, char AName) {
    Queue->Watch(APipe.Ends[0], TThreadQueue::TReady::ToRead, [&, AName] {
      Ran += AName;
      APipe.Empty();
      Queue->Unwatch(Second.Ends[0]);  // also its own
    });
  };
  Watch(First, '-');
  Watch(First, 'a');  // instead
  Watch(Second, 'b');
  EXPECT_FALSE(ProcessMessages());
  First.Fill();
  EXPECT_TRUE(ProcessMessages(cLong));
  Second.Fill();
  EXPECT_FALSE(ProcessMessages(5)) << Ran;
  Watch(Second, 'c');
  EXPECT_TRUE(ProcessMessages(cLong));
  int Writable = 0;
  Queue->Watch(First.Ends[1], TThreadQueue::TReady::ToWrite, [&] { ++Writable; });
  EXPECT_TRUE(ProcessMessages(cLong));
  EXPECT_EQ(std::pair(Ran, Writable), std::pair(std::string("ac"), 1));
  const int File = ::open("/proc/self/exe", O_RDONLY | O_CLOEXEC);
  EXPECT_THROW(Queue->Watch(File, TThreadQueue::TReady::ToRead, [] {}), EThread);
  ::close(File);
  for (const int Each : {First.Ends[0], First.Ends[1]}) Queue->Unwatch(Each);
  const auto Other = BeginThread([&] { return Queue->SetTimer(1, [] {}) == 0 ? 1 : 0; });
  EXPECT_EQ(Other->WaitFor(), -1) << "it is the thread's own to do";
}

// A host's loop that knows the descriptor only.
TEST(ThreadQueue, TheDescriptorIsReadableWhileThereIsSomethingToDo) {
  const auto Queue = TThreadQueue::Current();
  Queue->Post([] {});
  pollfd Polled{Queue->Descriptor(), POLLIN, 0};
  const auto Readable = [&](int AMilliseconds) { return ::poll(&Polled, 1, AMilliseconds) == 1; };
  EXPECT_TRUE(Readable(0)) << "what came before it was asked for";
  const HWND Window = AllocateHWnd([](HWND, Cardinal, NativeUInt, NativeInt) { return NativeInt{8}; });
  const TPipe Pipe;
  const std::function<void()> Works[] = {
      [&] { Queue->Post([] {}); }, [&] { Pipe.Fill(); }, [&] { PostMessage(Window, 1, 0, 0); }};
  Queue->Watch(Pipe.Ends[0], TThreadQueue::TReady::ToRead, [&] { Pipe.Empty(); });
  ProcessMessages();
  for (const auto& Work : Works) {
    EXPECT_FALSE(Readable(0));
    std::jthread(Work).join();
    EXPECT_TRUE(Readable(0));
    EXPECT_TRUE(ProcessMessages());
  }
  Queue->Post([] { throw EAbort(u"stop"); });
  Queue->Post([] {});
  EXPECT_THROW(ProcessMessages(), EAbort);
  EXPECT_TRUE(Readable(0)) << "for what the raise has left";
  EXPECT_TRUE(ProcessMessages());
  const std::jthread Sender([&] { EXPECT_EQ(SendMessage(Window, 1, 0, 0), 8); });
  EXPECT_TRUE(Readable(cLong));
  while (!ProcessMessages(cLong)) continue;
  const auto Timer = Queue->SetTimer(5, [] {});
  EXPECT_TRUE(Readable(cLong));
  Queue->KillTimer(Timer);
  Queue->Unwatch(Pipe.Ends[0]);
  DestroyWindow(Window);
}

TEST(ThreadQueue, AForkedChildHasAQueueOfItsOwn) {
  const auto Queue = TThreadQueue::Current();
  Queue->Post([] {});
  const pid_t Child = ::fork();
  if (Child == 0) {
    bool Good = !ProcessMessages() && TThreadQueue::Main()->ThreadID() == GetCurrentThreadId();
    const auto Thread = BeginThread([&] {
      TThread::Synchronize(nullptr, [&] { Good = Good && IsMainThread(); });
      return 4;
    });
    Good = Thread->WaitFor() == 4 && Good;
    ::_exit(Good ? 0 : 1);
  }
  int Status = 1;
  ::waitpid(Child, &Status, 0);
  EXPECT_EQ(Status, 0);
  EXPECT_TRUE(ProcessMessages());
}

// Threads that send to each other and are sent to, while windows come and go: each call is answered or refused.
TEST(ThreadQueue, NothingIsLostAmongManyThreads) {
  constexpr int cThreads = 4;
  const auto Until = std::chrono::steady_clock::now() + std::chrono::seconds(2);
  std::array<std::atomic<HWND>, cThreads> Windows{};
  std::atomic<int> Running = cThreads;
  std::atomic<Int64> Answered = 0, Refused = 0, Taken = 0;
  OnThreads(cThreads, [&](int AThread) {
    const auto Own = static_cast<std::size_t>(AThread);
    const auto Answer = [&](HWND, Cardinal, NativeUInt AValue, NativeInt) { return ++Taken, NativeInt(AValue + 1); };
    for (NativeUInt i = 0; std::chrono::steady_clock::now() < Until; ++i) {
      if (i % 50 == 0) {
        if (const HWND Former = Windows[Own].exchange(0); Former != 0) DestroyWindow(Former);
        Windows[Own] = AllocateHWnd(Answer);
      }
      try {
        if (SendMessage(Windows[(Own + i) % cThreads], 1, i, 0) == static_cast<NativeInt>(i + 1)) ++Answered;
      } catch (const ECallRefused&) {
        ++Refused;
      }
    }
    for (--Running; Running != 0;) ProcessMessages(1);
    DestroyWindow(Windows[Own]);
  });
  EXPECT_EQ(Answered, Taken);
  EXPECT_GT(Answered, 1000);
  std::cout << Answered << " answered, " << Refused << " refused\n";
}

}  // namespace
}  // namespace zq
