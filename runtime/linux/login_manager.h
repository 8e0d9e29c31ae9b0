#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>

#include "runtime/core/types.h"
#include "runtime/linux/bus_library.h"
#include "runtime/sync/thread_queue.h"

namespace zq {

/// What the login manager tells on the system bus: sessions, sleep, the end of the system. For the Linux feeder.
///
/// It belongs to the thread that made it and hears in that thread's loop. A bus that goes is asked again until it
/// answers; what came to the sessions meanwhile is told then.
class TLoginManager {
 public:
  /// Hears of it, and leaves what there is to do to calls that it posts to the thread.
  class TListener {
   public:
    /// AEvent is one of WTS_SESSION_ and its like.
    virtual void SessionChanged(NativeUInt AEvent, const std::string& ASession) = 0;
    /// True before it, false behind it. What holds it up ends behind the calls that are posted here.
    virtual void SleepComes(bool AComes) = 0;
    /// The same; false where it has been called off.
    virtual void EndComes(bool AComes) = 0;

   protected:
    ~TListener() = default;
  };

  explicit TLoginManager(TListener& AListener) : FListener(AListener) {}
  TLoginManager(const TLoginManager&) = delete;
  TLoginManager& operator=(const TLoginManager&) = delete;
  ~TLoginManager();

  /// Listens, and holds up sleep and end from now on, where it may. 0, also where it does so already, or an errno.
  int Connect();

 private:
  struct TSession {
    bool Remote = false;
    bool IsUser = true;               // somebody works in it; false for a greeter and the like
    std::optional<bool> Locked = {};  // none until it is told
  };
  struct TUnref {
    void operator()(sd_bus_message* AMessage) const noexcept { TBusLibrary::Get()->sd_bus_message_unref(AMessage); }
  };
  using TMessage = std::unique_ptr<sd_bus_message, TUnref>;
  // Holds up sleep and end as long as it lives.
  struct TDelay {
    explicit TDelay(int ALock) noexcept : Lock(ALock) {}
    TDelay(const TDelay&) = delete;
    TDelay& operator=(const TDelay&) = delete;
    ~TDelay();
    const int Lock;
  };
  struct TPlace {
    const char *Destination, *Path, *Interface;
  };
  static const TPlace cManager, cBus;

  template <class... TArgs>
  TMessage Call(const TPlace& APlace, const char* AMember, const char* ATypes, TArgs... AArgs);
  int Open();
  int Subscribe();
  int ReadSessions();
  void TakeDelay();
  void ReleaseDelay();
  void Close() noexcept;
  void Pump();
  void Hear(sd_bus_message* AMessage);
  void HearManager(sd_bus_message* AMessage);
  void HearSession(sd_bus_message* AMessage, const std::string& ASession);
  void HearProperties(sd_bus_message* AMessage, const std::string& ASession);
  [[nodiscard]] bool IsFromManager(sd_bus_message* AMessage);
  TSession Describe(const char* APath);
  void Began(const std::string& ASession, const char* APath);
  void Ended(const std::string& ASession);
  void SetActive(const std::string& ASession, bool AActive);
  void SetLocked(const std::string& ASession, bool ALocked);

  TListener& FListener;
  const TThreadQueueRef FQueue = TThreadQueue::Current();
  const TBusLibrary* FLibrary = nullptr;
  sd_bus* FBus = nullptr;  // null while there is no connection
  int FDescriptor = -1;    // the connection's
  std::shared_ptr<const TDelay> FDelay;
  int FFailure = 0;                   // errno of the last call
  TThreadQueue::TTimerID FRetry = 0;  // 0: the bus has not gone
  bool FKnowsSessions = false;
  std::map<std::string, TSession> FSessions;
};

}  // namespace zq
