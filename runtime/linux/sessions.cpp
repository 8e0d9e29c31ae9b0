#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "runtime/core/exceptions.h"
#include "runtime/linux/bus_library.h"
#include "runtime/linux/login_manager.h"
#include "runtime/linux/power_supply.h"
#include "runtime/linux/system_files.h"
#include "runtime/platform/session_service.h"
#include "runtime/sync/critical_section.h"
#include "runtime/sync/message_window.h"

namespace zq {

namespace {

// ---- Names of sessions ---------------------------------------------------------------------------------------------

// The login manager's: a number, or "c" and a number. 0 for any other.
Cardinal SessionNumber(std::string_view AName) {
  constexpr Cardinal Counted = 0x80000000;
  const bool IsCounted = AName.starts_with('c');
  if (IsCounted) AName.remove_prefix(1);
  Cardinal Result = 0;
  const auto [End, Failure] = std::from_chars(AName.data(), AName.data() + AName.size(), Result);
  if (Failure != std::errc() || End != AName.data() + AName.size() || Result >= Counted) return 0;
  return IsCounted ? Counted | Result : Result;
}

// From the control group that the login manager puts it in; a service of the user has no session there, but may have
// been told. Empty where there is none.
std::string SessionOf(Cardinal AProcessID) {
  constexpr std::string_view Before = "/session-", Behind = ".scope";
  const std::string Groups = ReadSystemFile("/proc/" + std::to_string(AProcessID) + "/cgroup");
  const std::size_t Begin = Groups.find(Before);
  const std::size_t End = Begin == Groups.npos ? Groups.npos : Groups.find(Behind, Begin);
  if (End != Groups.npos) return Groups.substr(Begin + Before.size(), End - Begin - Before.size());
  return AProcessID == GetCurrentProcessId() ? EnvironmentText("XDG_SESSION_ID") : std::string();
}

// ---- The windows of one thread -------------------------------------------------------------------------------------

// All of it is the thread's own.
class TThreadWindows final : TLoginManager::TListener {
 public:
  TThreadWindows() = default;
  TThreadWindows(const TThreadWindows&) = delete;
  TThreadWindows& operator=(const TThreadWindows&) = delete;
  ~TThreadWindows() { FQueue->DropPosted(this); }

  /// 0 or an errno.
  int Register(HWND AWindow, Cardinal AScope) {
    if (const int Failure = FLogin.Connect(); Failure != 0) return Failure;
    Find(AWindow).Scope = AScope;
    return 0;
  }
  // The bus comes with the first pass of the loop: a thread that runs none must not hold up the end of the system.
  void StartSystem(HWND AWindow) {
    Find(AWindow).System = true;
    if (!FPower) FPower.emplace([this] { PostPower(PBT_APMPOWERSTATUSCHANGE); });
    FQueue->Post([this] { FLogin.Connect(); }, this);
  }
  bool Unregister(HWND AWindow) { return std::exchange(Find(AWindow).Scope, std::nullopt).has_value(); }
  void StopSystem(HWND AWindow) { Find(AWindow).System = false; }
  /// Whether there is nobody left.
  bool IsDone() {
    std::erase_if(FWindows, [](const TWindow& AWindow) { return !AWindow.System && !AWindow.Scope; });
    return FWindows.empty();
  }

 private:
  struct TWindow {
    HWND Handle;
    bool System = false;
    std::optional<Cardinal> Scope = {};  // none: it isn't registered
  };

  TWindow& Find(HWND AWindow) {
    for (TWindow& Each : FWindows)
      if (Each.Handle == AWindow) return Each;
    return FWindows.emplace_back(TWindow{AWindow});
  }
  void PostSystem(Cardinal AMessage, NativeUInt AParam) const {
    for (const TWindow& Each : FWindows)
      if (Each.System) PostMessage(Each.Handle, AMessage, AParam, 0);
  }
  void PostPower(NativeUInt AEvent) const { PostSystem(WM_POWERBROADCAST, AEvent); }

  void SessionChanged(NativeUInt AEvent, const std::string& ASession) override {
    const NativeInt Number = SessionNumber(ASession);
    for (const TWindow& Each : FWindows)
      if (Each.Scope == NOTIFY_FOR_ALL_SESSIONS || (Each.Scope == NOTIFY_FOR_THIS_SESSION && ASession == FOwn))
        PostMessage(Each.Handle, WM_WTSSESSION_CHANGE, AEvent, Number);
  }
  void SleepComes(bool AComes) override {
    if (AComes) return PostPower(PBT_APMSUSPEND);
    PostPower(PBT_APMRESUMEAUTOMATIC);
    PostPower(PBT_APMRESUMESUSPEND);
  }
  // It is settled by then, so an answer to the query changes nothing.
  void EndComes(bool AComes) override {
    if (AComes) PostSystem(WM_QUERYENDSESSION, 0);
    PostSystem(WM_ENDSESSION, AComes ? 1 : 0);
  }

  const TThreadQueueRef FQueue = TThreadQueue::Current();
  const std::string FOwn = SessionOf(GetCurrentProcessId());
  std::vector<TWindow> FWindows;
  TLoginManager FLogin{*this};
  std::optional<TPowerSupply> FPower;
};

// A forked child leaves its parent's alone: what the two watch is one.
struct TOfThread {
  ~TOfThread() {
    Ended = true;
    LeaveToParent();
  }
  static TOfThread& Get() {
    thread_local TOfThread Result;
    Result.LeaveToParent();
    return Result;
  }
  void LeaveToParent() noexcept {
    const pid_t Now = ::getpid();
    if (std::exchange(Process, Now) != Now) static_cast<void>(Windows.release());
  }
  static constinit thread_local bool Ended;  // for what the thread ends behind this
  pid_t Process = ::getpid();
  std::unique_ptr<TThreadWindows> Windows;
};
constinit thread_local bool TOfThread::Ended = false;

// Runs ACall with the windows of the calling thread; false where the thread has none any more.
template <class TCall>
bool WithWindows(TCall ACall) {
  if (TOfThread::Ended) return false;
  auto& Windows = TOfThread::Get().Windows;
  if (Windows == nullptr) Windows = std::make_unique<TThreadWindows>();
  struct TDone {
    ~TDone() {
      if (Windows->IsDone()) Windows.reset();
    }
    std::unique_ptr<TThreadWindows>& Windows;
  } const Done{Windows};
  ACall(*Windows);
  return true;
}

// The same on the window's thread; false also where there is no such window.
template <class TCall>
bool OnThreadOf(HWND AWindow, TCall ACall) try {
  const TThreadQueueRef Queue = GetWindowQueue(AWindow);
  bool Result = false;
  if (Queue != nullptr) Queue->Send([&] { Result = WithWindows(ACall); });
  return Result;
} catch (const ECallRefused&) {
  return false;
}

// ---- Service -------------------------------------------------------------------------------------------------------

class TLinuxSessions final : public TSessionService {
 public:
  bool LoadLibrary() override { return TBusLibrary::Get() != nullptr; }
  void FreeLibrary() override {}  // it stays: connections may use it
  bool GetProcAddress(const char16_t*) override { return TBusLibrary::Get()->IsWhole(); }

  bool WTSRegisterSessionNotification(HWND AWindow, Cardinal AScope) override {
    constexpr Cardinal NoWindow = 1400;
    int Failure = 0;
    const bool Found = OnThreadOf(AWindow, [&](TThreadWindows& AOn) { Failure = AOn.Register(AWindow, AScope); });
    if (!Found || Failure != 0) SetLastError(Found ? ReasonOf(Failure) : NoWindow);
    return Found && Failure == 0;
  }
  bool WTSUnRegisterSessionNotification(HWND AWindow) override {
    bool Result = false;
    OnThreadOf(AWindow, [&](TThreadWindows& AOn) { Result = AOn.Unregister(AWindow); });
    return Result;
  }
  void StartSystemMessages(HWND AWindow) override {
    OnThreadOf(AWindow, [&](TThreadWindows& AOn) { AOn.StartSystem(AWindow); });
  }
  void StopSystemMessages(HWND AWindow) override {
    OnThreadOf(AWindow, [&](TThreadWindows& AOn) { AOn.StopSystem(AWindow); });
  }
  std::optional<Cardinal> ProcessIdToSessionId(Cardinal AProcessID) override {
    return SessionNumber(SessionOf(AProcessID));
  }
};

constinit TLinuxSessions LinuxSessions;

}  // namespace

constinit TServiceSlot<TSessionService> TSessionService::Slot(LinuxSessions);

}  // namespace zq
