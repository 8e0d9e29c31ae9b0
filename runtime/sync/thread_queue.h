#pragma once

#include <array>
#include <atomic>
#include <concepts>
#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <span>
#include <type_traits>
#include <vector>

#include "runtime/core/exceptions.h"
#include "runtime/sync/event.h"
#include "runtime/sync/parker.h"

namespace zq {

struct ZQ_API EThread : Exception {
  using Exception::Exception;
};
/// A call to another thread that can't run: the thread has ended, its window is gone, or the calls go in a circle.
struct ZQ_API ECallRefused : EThread {
  using EThread::EThread;
};

/// A callable of the caller's, for the time of a call.
class TCallRef {
 public:
  template <class TCallable>
    requires(std::invocable<TCallable&> && !std::same_as<std::remove_cvref_t<TCallable>, TCallRef>)
  // NOLINTNEXTLINE(bugprone-forwarding-reference-overload): the constraint leaves copies alone
  TCallRef(TCallable&& ACallable)
      : FCallable(const_cast<void*>(static_cast<const void*>(std::addressof(ACallable)))), FCall(&Call<TCallable>) {}
  void operator()() const { FCall(FCallable); }

 private:
  template <class TCallable>
  static void Call(void* ACalled) {
    static_cast<void>((*static_cast<std::remove_reference_t<TCallable>*>(ACalled))());
  }
  void* FCallable;
  void (*FCall)(void*);
};

class TThreadQueue;
using TThreadQueueRef = std::shared_ptr<TThreadQueue>;

/// What waits for one thread, and the place where that thread waits: calls from other threads, timers, descriptors.
///
/// Each thread has one. Its calls run while the thread is in RunOnce, Run or, for sent calls, in one of the waits that
/// serve them; a thread that is in none of these lets its callers wait. Where it says nothing else, any thread may
/// call.
class ZQ_API TThreadQueue : public std::enable_shared_from_this<TThreadQueue> {
 public:
  using TCall = std::function<void()>;
  /// By when they run: Sent in every wait that serves, Synchronized in CheckSynchronize, all in RunOnce.
  enum class TKind : Byte { Sent, Synchronized, Posted };

  /// The calling thread's own. It ends with the thread.
  [[nodiscard]] static TThreadQueueRef Current();
  /// That of the thread that the process began with.
  [[nodiscard]] static TThreadQueueRef Main();

  explicit TThreadQueue(Cardinal AThreadID) noexcept;
  TThreadQueue(const TThreadQueue&) = delete;
  TThreadQueue& operator=(const TThreadQueue&) = delete;
  ~TThreadQueue();

  [[nodiscard]] Cardinal ThreadID() const noexcept { return FThreadID; }
  [[nodiscard]] bool HasEnded() const;
  /// Has ACall run on the thread, behind what waits there. AOwner, which may be null, is whose Drop takes it back.
  /// Raises ECallRefused where the thread has ended. What ACall raises comes out where it was run.
  void Post(TCall ACall, const void* AOwner = nullptr, TKind AKind = TKind::Posted);
  /// Runs ACall on the thread and returns when it is done; at once where that is the caller. What it raises is raised
  /// here, as the same object. The caller serves calls sent to itself meanwhile. Raises ECallRefused where ACall was
  /// not run, or is under way on a thread that ended within it.
  void Send(TCallRef ACall, const void* AOwner = nullptr, TKind AKind = TKind::Sent);
  /// Calls of AOwner that have not begun: posted ones are dropped, the senders of the others get ECallRefused with
  /// AReason.
  void Drop(const void* AOwner, const UnicodeString& AReason);
  /// The same, for posted ones alone.
  void DropPosted(const void* AOwner);
  /// Set while calls of the kind Synchronized wait.
  [[nodiscard]] TEvent& SyncEvent() noexcept { return FSyncEvent; }

  // By the thread alone:

  /// Runs what waits now, or is the first within ATimeout milliseconds; false where there was nothing. What a call
  /// raises comes out here; what stands behind it stays.
  bool RunOnce(Cardinal ATimeout = 0);
  /// The calls of AKind that wait now.
  bool RunCalls(TKind AKind);
  /// RunOnce until Quit; returns its code. They nest: Quit ends the innermost.
  Integer Run();
  /// Any thread.
  void Quit(Integer ACode = 0);

  enum class TServe : bool { Nothing, SentCalls };
  /// As TEvent::WaitForAny.
  Integer WaitForAny(std::span<TEvent* const> AEvents, Cardinal ATimeout, TServe AServe = TServe::SentCalls);

  using TTimerID = NativeUInt;
  /// Runs ACall every AMilliseconds, 1 at least, until KillTimer. Calls that the thread is late for are made once.
  TTimerID SetTimer(Cardinal AMilliseconds, TCall ACall);
  void KillTimer(TTimerID AID) noexcept;
  enum class TReady : Byte { ToRead = 1, ToWrite = 2, ToReadOrWrite = 3 };
  /// Runs ACall as long as ADescriptor, which stays the caller's, is ready or has failed; one call for each descriptor.
  /// Unwatch comes before the descriptor is closed. Raises EThread where the system can't watch it (a plain file).
  void Watch(int ADescriptor, TReady AReady, TCall ACall);
  void Unwatch(int ADescriptor) noexcept;
  /// For a loop of the host's: readable whenever RunOnce has something to do. The queue's own. Raises EThread where the
  /// system has no descriptor to give.
  [[nodiscard]] int Descriptor();

 private:
  friend class TNativeThread;
  struct TSent;
  struct TEntry {
    TCall Call;
    const void* Owner = nullptr;
    TSent* Sent = nullptr;  // its sender waits
    UInt64 Number = 0;
  };
  class TDescriptors;
  struct TOfThread;

  static constexpr std::size_t cKinds = 3;
  std::deque<TEntry>& Entries(TKind AKind) noexcept { return FEntries[static_cast<std::size_t>(AKind)]; }
  void Add(TEntry AEntry, TKind AKind);
  std::optional<TEntry> Take(TKind AKind, UInt64 ALast);
  void RunEntry(TEntry& AEntry);
  bool RunAll();
  void Tell();
  template <class TReadyCall>
  bool WaitUntil(TReadyCall AReady, const TDeadline& ADeadline, TServe AServe, int ASpins);
  void WaitForReply(TSent& ASent);
  bool Withdraw(const TSent& ASent);
  static void Refuse(const std::deque<TEntry>& AEntries, const UnicodeString& AReason);
  template <class TLeaves>
  std::deque<TEntry> TakeOut(TLeaves ALeaves);
  TDescriptors& Descriptors();
  void RequireOwn() const;
  void End() noexcept;
  // Takes back what a thread that was stopped by force has begun to wait for, before End. A call that it has sent and
  // that runs already goes on, with what it refers to on the stack, which stays.
  void Abandon();
  static void AddHeld(const TSent* AServed, std::vector<const TThreadQueue*>& AHeld);
  [[nodiscard]] static std::vector<Cardinal> WayFrom(
      const TThreadQueue& AFrom, std::span<const TThreadQueue* const> AGoals);
  // AWaiting's wait for the end of AEnding's thread, for a scope. Raises EThread where that closes a circle.
  class TEndWait {
   public:
    TEndWait(TThreadQueue& AWaiting, TThreadQueueRef AEnding);
    TEndWait(const TEndWait&) = delete;
    TEndWait& operator=(const TEndWait&) = delete;
    ~TEndWait();

   private:
    TThreadQueue& FWaiting;
  };

  const Cardinal FThreadID;
  // What senders touch stands together, apart from what the thread looks at while it is awake and waits.
  alignas(64) mutable std::mutex FLock;  // innermost but for the parker
  // Guarded by FLock:
  std::atomic<UInt64> FLastNumber = 0;             // written under it
  std::atomic<std::size_t> FWaiting[cKinds] = {};  // sizes of FEntries, written under it
  bool FEnded = false;
  bool FTold = false;  // FHostEvent was signalled for what waits
  int FHostEvent = -1;
  std::array<std::deque<TEntry>, cKinds> FEntries;
  TSimpleEvent FSyncEvent;  // set exactly while there are such entries
  alignas(64) TParker FParker;
  // The thread's own:
  std::unique_ptr<TDescriptors> FDescriptors;
  std::optional<Integer> FQuit;
  struct TWait;
  TWait* FWait = nullptr;                  // the innermost
  TSent* FSending = nullptr;               // the innermost
  const TSent* FServed = nullptr;          // the innermost call under way
  Integer FServing = 0;                    // sent calls under way, one within the other
  std::vector<TThreadQueueRef> FWaitsFor;  // threads whose ends are waited for; guarded by a lock of all
};

}  // namespace zq
