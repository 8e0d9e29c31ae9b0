#include "runtime/sync/thread_queue.h"

#include <cxxabi.h>
#include <fcntl.h>
#include <pthread.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <sys/timerfd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <iterator>
#include <map>
#include <utility>
#include <vector>

#include "runtime/io/files.h"
#include "runtime/sync/critical_section.h"
#include "runtime/sync/event_watch.h"
#include "runtime/sync/message_window.h"
#include "runtime/text/format.h"
#include "runtime/text/numbers.h"

namespace zq {

namespace {

// Rounds of a spin. A wake-up costs tens of microseconds: one that comes soon is met awake, and who answers may have to
// wake up first.
constexpr int cSpins = 200, cReplySpins = 2000;
constexpr Integer cMostServing = 200;  // sent calls one within the other: more of them end no more

UnicodeString EndedText(Cardinal AThreadID) { return Format(u"The thread %d has ended", {AThreadID}); }

}  // namespace

// ---- Descriptors and timers ----------------------------------------------------------------------------------------

class TThreadQueue::TDescriptors {
 public:
  TDescriptors();
  TDescriptors(const TDescriptors&) = delete;
  TDescriptors& operator=(const TDescriptors&) = delete;
  ~TDescriptors() { CloseAll(); }

  [[nodiscard]] int Epoll() const noexcept { return FEpoll; }
  [[nodiscard]] int Event() const noexcept { return FEvent; }
  void TakeSignals() const noexcept {
    std::uint64_t Count = 0;
    static_cast<void>(!::read(FEvent, &Count, sizeof Count));
  }
  bool Dispatch();
  TTimerID SetTimer(Cardinal AMilliseconds, TCall ACall);
  void KillTimer(TTimerID AID) noexcept;
  void Watch(int ADescriptor, TReady AReady, TCall ACall);
  void Unwatch(int ADescriptor) noexcept;

 private:
  // A call may take itself away while it runs.
  using TKept = std::shared_ptr<const TCall>;
  struct TTimer {
    Int64 Next;      // nanoseconds of TDeadline's clock
    Int64 Interval;  // nanoseconds
    TKept Call;
  };
  struct TWatched {
    std::uint32_t Number;  // tells a descriptor from a later one of the same value
    TKept Call;
  };
  static constexpr std::uint64_t cEventKey = ~0ULL, cTimerKey = ~0ULL - 1;

  void Add(int ADescriptor, std::uint64_t AKey) const;
  void Arm() noexcept;
  bool RunTimers();
  void CloseAll() noexcept {
    for (const int Each : {FTimer, FEvent, FEpoll})
      if (Each >= 0) ::close(Each);
  }

  int FEpoll = -1, FEvent = -1, FTimer = -1;
  std::map<TTimerID, TTimer> FTimers;
  std::map<int, TWatched> FWatched;
  TTimerID FLastTimer = 0;
  std::uint32_t FLastNumber = 0;
};

TThreadQueue::TDescriptors::TDescriptors() {
  FEpoll = ::epoll_create1(EPOLL_CLOEXEC);
  FEvent = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
  FTimer = ::timerfd_create(CLOCK_MONOTONIC, TFD_CLOEXEC | TFD_NONBLOCK);
  try {
    Add(FEvent, cEventKey);
    Add(FTimer, cTimerKey);
  } catch (...) {
    CloseAll();
    throw;
  }
}

void TThreadQueue::TDescriptors::Add(int ADescriptor, std::uint64_t AKey) const {
  epoll_event Event{};
  Event.events = EPOLLIN;
  Event.data.u64 = AKey;
  if (::epoll_ctl(FEpoll, EPOLL_CTL_ADD, ADescriptor, &Event) != 0)
    throw EThread(u"The thread can't watch descriptors: " + SysErrorMessage(errno));
}

bool TThreadQueue::TDescriptors::Dispatch() {
  epoll_event Events[16];
  const int Count = ::epoll_wait(FEpoll, Events, static_cast<int>(std::size(Events)), 0);
  bool Result = false;
  for (int i = 0; i < Count; ++i) {
    const std::uint64_t Key = Events[i].data.u64;
    if (Key == cTimerKey) Result = RunTimers() || Result;
    const auto Found = FWatched.find(static_cast<int>(Key & 0xFFFFFFFF));
    if (Found == FWatched.end() || Found->second.Number != Key >> 32) continue;
    const TKept Call = Found->second.Call;
    Result = true;
    (*Call)();
  }
  return Result;
}

TThreadQueue::TTimerID TThreadQueue::TDescriptors::SetTimer(Cardinal AMilliseconds, TCall ACall) {
  const Int64 Interval = std::max<Int64>(AMilliseconds, 1) * 1'000'000;
  FTimers[++FLastTimer] = {TDeadline::Now() + Interval, Interval, std::make_shared<const TCall>(std::move(ACall))};
  Arm();
  return FLastTimer;
}

void TThreadQueue::TDescriptors::KillTimer(TTimerID AID) noexcept {
  FTimers.erase(AID);
  Arm();
}

// For the nearest timer; a moment that is over makes it ready at once.
void TThreadQueue::TDescriptors::Arm() noexcept {
  itimerspec Moment{};
  const auto Nearest = std::ranges::min_element(FTimers, {}, [](const auto& AEntry) { return AEntry.second.Next; });
  if (Nearest != FTimers.end()) Moment.it_value = TDeadline::At(Nearest->second.Next).Moment();
  ::timerfd_settime(FTimer, TFD_TIMER_ABSTIME, &Moment, nullptr);
}

bool TThreadQueue::TDescriptors::RunTimers() {
  struct TArm {
    ~TArm() { Descriptors.Arm(); }
    TDescriptors& Descriptors;
  } const Armed{*this};
  const Int64 Now = TDeadline::Now();
  std::vector<TTimerID> Due;
  for (const auto& [ID, Timer] : FTimers)
    if (Timer.Next <= Now) Due.push_back(ID);
  for (const TTimerID ID : Due) {
    const auto Found = FTimers.find(ID);
    if (Found == FTimers.end()) continue;
    TTimer& Timer = Found->second;
    Timer.Next = Timer.Next + Timer.Interval > Now ? Timer.Next + Timer.Interval : Now + Timer.Interval;
    const TKept Call = Timer.Call;
    (*Call)();
  }
  return !Due.empty();
}

void TThreadQueue::TDescriptors::Watch(int ADescriptor, TReady AReady, TCall ACall) {
  const TWatched Watched{++FLastNumber, std::make_shared<const TCall>(std::move(ACall))};
  const bool Known = FWatched.contains(ADescriptor);
  epoll_event Event{};
  if (AReady != TReady::ToWrite) Event.events |= EPOLLIN;
  if (AReady != TReady::ToRead) Event.events |= EPOLLOUT;
  Event.data.u64 = std::uint64_t{Watched.Number} << 32 | static_cast<std::uint32_t>(ADescriptor);
  if (::epoll_ctl(FEpoll, Known ? EPOLL_CTL_MOD : EPOLL_CTL_ADD, ADescriptor, &Event) != 0)
    throw EThread(u"The descriptor %d can't be watched: %s", {ADescriptor, SysErrorMessage(errno)});
  FWatched[ADescriptor] = Watched;
}

void TThreadQueue::TDescriptors::Unwatch(int ADescriptor) noexcept {
  if (FWatched.erase(ADescriptor) != 0) ::epoll_ctl(FEpoll, EPOLL_CTL_DEL, ADescriptor, nullptr);
}

// ---- Sent calls ----------------------------------------------------------------------------------------------------

// The sender's side, in its frame.
struct TThreadQueue::TSent {
  // The last touch: the sender's frame goes with it.
  void Finish() {
    const TThreadQueueRef Kept = Sender;
    Over.store(true, std::memory_order_release);
    Kept->FParker.Wake();
  }
  TThreadQueueRef Sender;
  TThreadQueue* Target;
  TSent* Outer;                   // what its thread has sent and waits for, too
  const TSent* Within;            // the call that its thread was serving when it sent this one
  const TSent* Former = nullptr;  // what Target was serving when it began with this one
  ExceptionRef Error = {};
  std::atomic<bool> Over = false;
};

void TThreadQueue::Send(TCallRef ACall, const void* AOwner, TKind AKind) {
  const TThreadQueueRef Own = Current();
  if (Own.get() == this) return ACall();
  if (Own->FServing >= cMostServing)
    throw ECallRefused(u"The threads %d and %d call each other without end", {Own->FThreadID, FThreadID});
  TSent Sent{Own, this, Own->FSending, Own->FServed};
  Add({ACall, AOwner, &Sent}, AKind);
  Own->WaitForReply(Sent);
  if (Sent.Error) Sent.Error.Raise();
}

// A thread that is cancelled in its wait leaves nothing behind.
void TThreadQueue::WaitForReply(TSent& ASent) {
  struct TGuard {
    explicit TGuard(TSent& ASent) : Sent(ASent) { Sent.Sender->FSending = &Sent; }
    ~TGuard() {
      while (!Sent.Over.load(std::memory_order_acquire) && !Sent.Target->Withdraw(Sent))
        Sent.Sender->FParker.Sleep(TDeadline::In(INFINITE));
      Sent.Sender->FSending = Sent.Outer;
    }
    TSent& Sent;
  } const Guard(ASent);
  WaitUntil([&] { return ASent.Over.load(std::memory_order_acquire); }, TDeadline::In(INFINITE), TServe::SentCalls,
      cReplySpins);
}

// False where it isn't waiting any more.
bool TThreadQueue::Withdraw(const TSent& ASent) {
  return !TakeOut([&](const TEntry& AEntry) { return AEntry.Sent == &ASent; }).empty();
}

void TThreadQueue::RunEntry(TEntry& AEntry) {
  if (AEntry.Sent == nullptr) return AEntry.Call();
  struct TServing {
    TServing(TThreadQueue& AQueue, TSent& ASent) : Queue(AQueue) {
      ASent.Former = std::exchange(Queue.FServed, &ASent);
      ++Queue.FServing;
    }
    ~TServing() {
      Queue.FServed = Queue.FServed->Former;
      --Queue.FServing;
    }
    TThreadQueue& Queue;
  };
  try {
    const TServing Serving(*this, *AEntry.Sent);
    AEntry.Call();
  } catch (const abi::__forced_unwind&) {
    AEntry.Sent->Error = ExceptionRef::Of<ECallRefused>(EndedText(FThreadID));
    AEntry.Sent->Finish();
    throw;
  } catch (...) {
    AEntry.Sent->Error = ExceptionRef::Current();
  }
  AEntry.Sent->Finish();
}

// ---- TThreadQueue --------------------------------------------------------------------------------------------------

struct TThreadQueue::TOfThread {
  ~TOfThread() {
    Ended = true;
    if (Process == ::getpid()) Queue->End();  // a forked child leaves its parent's thread alone
  }
  static constinit thread_local bool Ended;
  TThreadQueueRef Queue;
  pid_t Process = ::getpid();
};
constinit thread_local bool TThreadQueue::TOfThread::Ended = false;

TThreadQueueRef TThreadQueue::Main() {
  static TThreadQueueRef& Result = *new TThreadQueueRef(std::make_shared<TThreadQueue>(GetCurrentProcessId()));
  static const int Forks = ::pthread_atfork(nullptr, nullptr, [] {
    // Those that the queue served are in the parent, and its lock may be held there.
    new TThreadQueueRef(std::exchange(Result, std::make_shared<TThreadQueue>(GetCurrentProcessId())));
  });
  static_cast<void>(Forks);
  return Result;
}

// What waits behind the end of a thread's own objects, in the last of them, gets a queue that nobody knows. The main
// thread's comes back then: it still serves the ends of modules.
TThreadQueueRef TThreadQueue::Current() {
  const bool IsMain = GetCurrentThreadId() == GetCurrentProcessId();
  if (TOfThread::Ended && !IsMain) return std::make_shared<TThreadQueue>(GetCurrentThreadId());
  if (TOfThread::Ended) {
    TThreadQueueRef Result = Main();
    const std::lock_guard Guard(Result->FLock);
    Result->FEnded = false;
    return Result;
  }
  thread_local const TOfThread Own{IsMain ? Main() : std::make_shared<TThreadQueue>(GetCurrentThreadId())};
  return IsMain ? Main() : Own.Queue;
}

TThreadQueue::TThreadQueue(Cardinal AThreadID) noexcept : FThreadID(AThreadID) {}

TThreadQueue::~TThreadQueue() = default;

void TThreadQueue::RequireOwn() const {
  if (GetCurrentThreadId() != FThreadID) throw EThread(u"Only the thread %d may do that", {FThreadID});
}

bool TThreadQueue::HasEnded() const {
  const std::lock_guard Guard(FLock);
  return FEnded;
}

void TThreadQueue::Post(TCall ACall, const void* AOwner, TKind AKind) { Add({std::move(ACall), AOwner}, AKind); }

void TThreadQueue::Add(TEntry AEntry, TKind AKind) {
  {
    const std::lock_guard Guard(FLock);
    if (FEnded) throw ECallRefused(EndedText(FThreadID));
    AEntry.Number = FLastNumber.fetch_add(1, std::memory_order_relaxed) + 1;
    Entries(AKind).push_back(std::move(AEntry));
    FWaiting[static_cast<std::size_t>(AKind)].fetch_add(1, std::memory_order_relaxed);
    if (AKind == TKind::Synchronized) FSyncEvent.SetEvent();
    if (FHostEvent >= 0 && !std::exchange(FTold, true)) Signal(FHostEvent);
  }
  FParker.Wake();
}

// The first call, unless it came after ALast.
std::optional<TThreadQueue::TEntry> TThreadQueue::Take(TKind AKind, UInt64 ALast) {
  const std::lock_guard Guard(FLock);
  auto& Waiting = Entries(AKind);
  if (Waiting.empty() || Waiting.front().Number > ALast) return std::nullopt;
  std::optional Result = std::move(Waiting.front());
  Waiting.pop_front();
  FWaiting[static_cast<std::size_t>(AKind)].fetch_sub(1, std::memory_order_relaxed);
  if (AKind == TKind::Synchronized && Waiting.empty()) FSyncEvent.ResetEvent();
  return Result;
}

template <class TLeaves>
std::deque<TThreadQueue::TEntry> TThreadQueue::TakeOut(TLeaves ALeaves) {
  std::deque<TEntry> Result;
  const std::lock_guard Guard(FLock);
  for (std::size_t Kind = 0; Kind < cKinds; ++Kind) {
    auto& Waiting = FEntries[Kind];
    const auto Leaving =
        std::stable_partition(Waiting.begin(), Waiting.end(), [&](const TEntry& AEntry) { return !ALeaves(AEntry); });
    std::move(Leaving, Waiting.end(), std::back_inserter(Result));
    Waiting.erase(Leaving, Waiting.end());
    FWaiting[Kind].store(Waiting.size(), std::memory_order_relaxed);
  }
  if (Entries(TKind::Synchronized).empty()) FSyncEvent.ResetEvent();
  return Result;
}

void TThreadQueue::Refuse(const std::deque<TEntry>& AEntries, const UnicodeString& AReason) {
  for (const TEntry& Entry : AEntries)
    if (Entry.Sent != nullptr) {
      Entry.Sent->Error = ExceptionRef::Of<ECallRefused>(AReason);
      Entry.Sent->Finish();
    }
}

void TThreadQueue::Drop(const void* AOwner, const UnicodeString& AReason) {
  Refuse(TakeOut([&](const TEntry& AEntry) { return AEntry.Owner == AOwner; }), AReason);
}

void TThreadQueue::DropPosted(const void* AOwner) {
  TakeOut([&](const TEntry& AEntry) { return AEntry.Owner == AOwner && AEntry.Sent == nullptr; });
}

void TThreadQueue::End() noexcept {
  {
    const std::lock_guard Guard(FLock);
    FEnded = true;
    FHostEvent = -1;
  }
  Refuse(TakeOut([](const TEntry&) { return true; }), EndedText(FThreadID));
  DestroyWindowsOf(*this);
  FDescriptors.reset();
}

// ---- Waiting -------------------------------------------------------------------------------------------------------

bool TThreadQueue::RunCalls(TKind AKind) {
  const auto& Waiting = FWaiting[static_cast<std::size_t>(AKind)];
  if (Waiting.load(std::memory_order_relaxed) == 0) return false;
  const UInt64 Last = FLastNumber.load(std::memory_order_relaxed);  // calls that these calls add are for the next time
  bool Result = false;
  while (Waiting.load(std::memory_order_relaxed) != 0) {
    auto Entry = Take(AKind, Last);
    if (!Entry) break;
    Result = true;
    RunEntry(*Entry);
  }
  return Result;
}

// A host's loop that watches the descriptor, of calls that wait.
void TThreadQueue::Tell() {
  if (FDescriptors == nullptr) return;
  const std::lock_guard Guard(FLock);
  const bool Waits = std::ranges::any_of(FEntries, [](const auto& AEntries) { return !AEntries.empty(); });
  if (FHostEvent >= 0 && Waits && !std::exchange(FTold, true)) Signal(FHostEvent);
}

bool TThreadQueue::RunAll() {
  struct TLeft {
    ~TLeft() { Queue.Tell(); }
    TThreadQueue& Queue;
  } const Left{*this};  // what a call that raised has left
  if (FDescriptors != nullptr) {
    const std::lock_guard Guard(FLock);
    FTold = false;
    FDescriptors->TakeSignals();
  }
  bool Result = false;
  for (const TKind Kind : {TKind::Sent, TKind::Synchronized, TKind::Posted}) Result = RunCalls(Kind) || Result;
  return (FDescriptors != nullptr && FDescriptors->Dispatch()) || Result;
}

bool TThreadQueue::RunOnce(Cardinal ATimeout) {
  RequireOwn();
  for (const TDeadline Deadline = TDeadline::In(ATimeout);;) {
    if (RunAll()) return true;
    if (Deadline.IsOver()) return false;
    if (FParker.Spin(cSpins)) continue;
    if (FDescriptors == nullptr) FParker.Sleep(Deadline);
    else FParker.SleepOn(FDescriptors->Epoll(), FDescriptors->Event(), Deadline);
  }
}

Integer TThreadQueue::Run() {
  while (!FQuit) RunOnce(INFINITE);
  return *std::exchange(FQuit, std::nullopt);
}

void TThreadQueue::Quit(Integer ACode) {
  Post([this, ACode] { FQuit = ACode; });
}

template <class TReadyCall>
bool TThreadQueue::WaitUntil(TReadyCall AReady, const TDeadline& ADeadline, TServe AServe, int ASpins) {
  for (;;) {
    if (AReady()) return true;
    if (AServe == TServe::SentCalls && RunCalls(TKind::Sent)) continue;
    if (ADeadline.IsOver()) return false;
    if (!FParker.Spin(ASpins)) FParker.Sleep(ADeadline);
  }
}

// A wait of the thread for events, in its frame.
struct TThreadQueue::TWait {
  TWait(TThreadQueue& AQueue, std::span<TEvent* const> AEvents)
      : Queue(AQueue), Outer(AQueue.FWait), Watches(AEvents.size()) {
    Queue.FWait = this;
    for (std::size_t i = 0; i < AEvents.size(); ++i) Watches[i].emplace(*AEvents[i], Queue.FParker);
  }
  TWait(const TWait&) = delete;
  TWait& operator=(const TWait&) = delete;
  ~TWait() { Queue.FWait = Outer; }
  TThreadQueue& Queue;
  TWait* Outer;
  std::vector<std::optional<TEvent::TWatch>> Watches;
};

Integer TThreadQueue::WaitForAny(std::span<TEvent* const> AEvents, Cardinal ATimeout, TServe AServe) {
  const TDeadline Deadline = TDeadline::In(ATimeout);
  const TWait Wait(*this, AEvents);
  Integer Result = -1;
  const auto Passes = [&] {
    const auto Passed = std::ranges::find_if(AEvents, [](TEvent* AEvent) { return AEvent->TryPass(); });
    if (Passed != AEvents.end()) Result = static_cast<Integer>(Passed - AEvents.begin());
    return Result >= 0;
  };
  WaitUntil(Passes, Deadline, AServe, cSpins);
  return Result;
}

TThreadQueue::TDescriptors& TThreadQueue::Descriptors() {
  RequireOwn();
  if (FDescriptors == nullptr) FDescriptors = std::make_unique<TDescriptors>();
  return *FDescriptors;
}

TThreadQueue::TTimerID TThreadQueue::SetTimer(Cardinal AMilliseconds, TCall ACall) {
  return Descriptors().SetTimer(AMilliseconds, std::move(ACall));
}

void TThreadQueue::KillTimer(TTimerID AID) noexcept {
  if (FDescriptors != nullptr) FDescriptors->KillTimer(AID);
}

void TThreadQueue::Watch(int ADescriptor, TReady AReady, TCall ACall) {
  Descriptors().Watch(ADescriptor, AReady, std::move(ACall));
}

void TThreadQueue::Unwatch(int ADescriptor) noexcept {
  if (FDescriptors != nullptr) FDescriptors->Unwatch(ADescriptor);
}

int TThreadQueue::Descriptor() {
  const TDescriptors& Own = Descriptors();
  {
    const std::lock_guard Guard(FLock);
    FHostEvent = Own.Event();
  }
  Tell();
  return Own.Epoll();
}

// ---- Ends of threads -----------------------------------------------------------------------------------------------

namespace {

constinit std::mutex EndWaitsLock;

}  // namespace

// Threads that go on only when this one does: its own, and those whose calls it is serving, with whose calls they
// serve. What they refer to stays as it is meanwhile.
void TThreadQueue::AddHeld(const TSent* AServed, std::vector<const TThreadQueue*>& AHeld) {
  for (const TSent* Served = AServed; Served != nullptr; Served = Served->Former) {
    AHeld.push_back(Served->Sender.get());
    AddHeld(Served->Within, AHeld);
  }
}

// The way from AFrom along the threads whose ends are waited for, to one of AGoals: empty where there is none.
std::vector<Cardinal> TThreadQueue::WayFrom(const TThreadQueue& AFrom, std::span<const TThreadQueue* const> AGoals) {
  if (std::ranges::find(AGoals, &AFrom) != AGoals.end()) return {AFrom.FThreadID};
  for (const TThreadQueueRef& Next : AFrom.FWaitsFor)
    if (auto Way = WayFrom(*Next, AGoals); !Way.empty()) {
      Way.push_back(AFrom.FThreadID);
      return Way;
    }
  return {};
}

TThreadQueue::TEndWait::TEndWait(TThreadQueue& AWaiting, TThreadQueueRef AEnding) : FWaiting(AWaiting) {
  std::vector<const TThreadQueue*> Held{&AWaiting};
  AddHeld(AWaiting.FServed, Held);
  const std::lock_guard Guard(EndWaitsLock);
  if (const auto Way = WayFrom(*AEnding, Held); !Way.empty()) {
    UnicodeString Names = IntToStr(AWaiting.FThreadID);
    for (const Cardinal ID : Way)
      if (ID != AWaiting.FThreadID) Names += u", " + IntToStr(ID);
    throw EThread(u"These threads would wait for each other without end: %s", {Names});
  }
  AWaiting.FWaitsFor.push_back(std::move(AEnding));
}

TThreadQueue::TEndWait::~TEndWait() {
  const std::lock_guard Guard(EndWaitsLock);
  FWaiting.FWaitsFor.pop_back();
}

void TThreadQueue::Abandon() {
  {
    const std::lock_guard Guard(EndWaitsLock);
    FWaitsFor.clear();
  }
  for (TWait* Wait = FWait; Wait != nullptr; Wait = Wait->Outer) Wait->Watches.clear();
  for (const TSent* Sent = FSending; Sent != nullptr; Sent = Sent->Outer) Sent->Target->Withdraw(*Sent);
}

}  // namespace zq
