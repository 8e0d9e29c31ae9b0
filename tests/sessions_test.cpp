#include <dlfcn.h>
#include <poll.h>
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <mutex>
#include <thread>

#include "common/uZqSessionEvents.h"
#include "runtime/linux/bus_library.h"
#include "runtime/platform/session_service.h"
#include "runtime/sync/message_window.h"
#include "tests/support/session_log.h"

namespace zq {
namespace {

constexpr const char* cManager = "org.freedesktop.login1.Manager";
constexpr const char* cManagerPath = "/org/freedesktop/login1";
constexpr const char* cSession = "org.freedesktop.login1.Session";
constexpr const char* cProperties = "org.freedesktop.DBus.Properties";

/// Until it holds or ten seconds are over; the thread's loop runs meanwhile.
bool Soon(const std::function<bool()>& ACondition) {
  for (int i = 0; i < 1000 && !ACondition(); ++i) ProcessMessages(10);
  return ACondition();
}

/// A bus of the test's own in place of the system's.
class TBusDaemon {
 public:
  TBusDaemon() {
    const std::string Folder = FFolder.Path().string();
    FFolder.Write("bus.conf", "<busconfig><listen>" + Address + "</listen><pidfile>" + Folder +
                                  "/pid</pidfile><fork/><auth>EXTERNAL</auth><policy context=\"default\">"
                                  "<allow own=\"*\"/><allow send_type=\"*\"/><allow receive_type=\"*\"/></policy>"
                                  "</busconfig>");
    Begin();
  }
  ~TBusDaemon() { End(); }
  void Begin() const { Run("dbus-daemon --config-file=bus.conf"); }
  void End() const { Run("kill -9 $(cat pid) && rm -f pid socket"); }
  void Run(const std::string& ACommand) const {
    EXPECT_EQ(std::system(("cd " + FFolder.Path().string() + " && " + ACommand).c_str()), 0);
  }

 private:
  const TTempFolder FFolder;

 public:
  const std::string Address = "unix:path=" + (FFolder.Path() / "socket").string();

 private:
  const TEnvironmentScope FVariable{"DBUS_SYSTEM_BUS_ADDRESS", Address};
};

/// The login manager of that bus, on a thread of its own. It lists one session at first. Session "5" is somebody's at a
/// distance, "6" and those with a "c" are greeters, all others are somebody's here.
class TLoginManagerMock {
 public:
  explicit TLoginManagerMock(std::string ASession) : FSession(std::move(ASession)) {
    EXPECT_GE(FLibrary.sd_bus_open_system(&FBus), 0);
    Function<int(sd_bus*, const char*, std::uint64_t)>("sd_bus_request_name")(FBus, "org.freedesktop.login1", 0);
    FThread = std::thread([this] {
      while (!FStops) Serve();
    });
  }
  ~TLoginManagerMock() {
    FStops = true;
    FThread.join();
    FLibrary.sd_bus_flush_close_unref(FBus);
    ::close(FDelay);
  }
  void Session(const std::string& AName, const char* ASignal) { Emit(PathOf(AName), cSession, ASignal, ""); }
  void Property(const std::string& AName, const char* AProperty, bool AValue) {
    Emit(PathOf(AName), cProperties, "PropertiesChanged", "sa{sv}as", cSession, 2, "Idle", "s", "?", AProperty, "b",
        int{AValue}, 0);
  }
  void List(const std::string& AName, const char* ASignal) {
    Emit(cManagerPath, cManager, ASignal, "so", AName.c_str(), PathOf(AName).c_str());
  }
  void Comes(const char* AWhat, bool AComes) { Emit(cManagerPath, cManager, AWhat, "b", int{AComes}); }
  /// How often a delay was asked for, whether the last one is held, and by whom.
  [[nodiscard]] int Delays() const { return FDelays; }
  [[nodiscard]] bool IsHeld() const {
    pollfd Pipe{FDelay, 0, 0};
    return ::poll(&Pipe, 1, 0) == 0;
  }
  [[nodiscard]] const std::string& Client() const { return FClient; }

 private:
  static std::string PathOf(const std::string& AName) {
    return "/org/freedesktop/login1/session/" + (AName[0] > '9' ? AName : "_3" + AName);
  }
  template <class TFunction>
  static TFunction* Function(const char* AName) {
    return reinterpret_cast<TFunction*>(::dlsym(::dlopen("libsystemd.so.0", RTLD_NOW), AName));
  }
  template <class... TArgs>
  void Emit(const std::string& APath, TArgs... AArgs) {
    const std::lock_guard Guard(FLock);
    FEmit(FBus, APath.c_str(), AArgs...);
  }
  void Serve() {
    pollfd Bus{FLibrary.sd_bus_get_fd(FBus), POLLIN, 0};
    ::poll(&Bus, 1, 1);
    const std::lock_guard Guard(FLock);
    for (sd_bus_message* Message = nullptr; FLibrary.sd_bus_process(FBus, &Message) > 0;) {
      if (Message != nullptr) Answer(Message);
      FLibrary.sd_bus_message_unref(std::exchange(Message, nullptr));
    }
  }
  void Answer(sd_bus_message* AMessage) {
    const std::string Path = FLibrary.sd_bus_message_get_path(AMessage);
    const char *Interface = nullptr, *Property = nullptr;
    if (FIsCall(AMessage, cManager, "ListSessions") > 0)
      FReply(AMessage, "a(susso)", 1, FSession.c_str(), 1000, "joe", "seat0", PathOf(FSession).c_str());
    if (FIsCall(AMessage, cManager, "Inhibit") > 0) {
      int Pipe[2];
      ::close(FDelay);
      EXPECT_EQ(::pipe(Pipe), 0);
      FDelay = Pipe[0];
      FClient = FLibrary.sd_bus_message_get_sender(AMessage);
      FReply(AMessage, "h", Pipe[1]);
      ::close(Pipe[1]);
      ++FDelays;
    }
    if (FIsCall(AMessage, cProperties, "Get") > 0) {
      FLibrary.sd_bus_message_read(AMessage, "ss", &Interface, &Property);
      const bool Greets = Path.ends_with("/_36") || Path.find("/c") != Path.npos;
      if (std::string_view(Property) == "Remote") FReply(AMessage, "v", "b", Path.ends_with("/_35"));
      else FReply(AMessage, "v", "s", Greets ? "greeter" : "user");
    }
  }

  using TEmit = int(sd_bus*, const char*, const char*, const char*, const char*, ...);
  using TReply = int(sd_bus_message*, const char*, ...);
  using TIsCall = int(sd_bus_message*, const char*, const char*);
  TEmit* const FEmit = Function<TEmit>("sd_bus_emit_signal");
  TReply* const FReply = Function<TReply>("sd_bus_reply_method_return");
  TIsCall* const FIsCall = Function<TIsCall>("sd_bus_message_is_method_call");
  const TBusLibrary& FLibrary = *TBusLibrary::Get();
  const std::string FSession;
  std::mutex FLock;
  sd_bus* FBus = nullptr;  // guarded by FLock
  std::atomic<bool> FStops = false;
  std::atomic<int> FDelays = 0, FDelay = -1;  // the end of a pipe that hears when the other one is closed
  std::string FClient;
  std::thread FThread;
};

struct SystemBus : testing::Test {
  TBusDaemon Daemon;
  std::optional<TLoginManagerMock> Mock{"1"};
  UnicodeString Log;
  TOwned<TZqSessionEvents> Events{New<TZqSessionEvents>(nullptr)};
  int Marks = 0;

  SystemBus() {
    Listen(Events.get(), Log);
    Events->SetScope(nsAllSessions);
  }
  /// What the callbacks wrote up to a mark that is emitted behind all else.
  UnicodeString Heard() {
    const std::string Name = "c" + std::to_string(++Marks);
    Mock->List(Name, "SessionNew");
    const UnicodeString Mark = u"OnSessionCreate " + IntToStr(0x80000000LL + Marks);
    EXPECT_TRUE(Soon([&] { return Log.View().ends_with(Mark.View()); })) << Log.ToUTF8();
    const UnicodeString Result = Log.Copy(1, Log.Length() - Mark.Length());
    Log = u"";
    return Result;
  }
};

TEST_F(SystemBus, TellsOfSessions) {
  Events->SetActive(true);
  const std::pair<std::function<void()>, const char16_t*> Cases[] = {
      {[&] { Mock->List("7", "SessionNew"); }, u"OnSessionCreate 7OnSessionLogon 7"},
      {[&] { Mock->List("7", "SessionNew"); }, u""},
      {[&] { Mock->List("5", "SessionNew"); }, u"OnSessionCreate 5OnRemoteConnect 5OnSessionLogon 5"},
      {[&] { Mock->List("6", "SessionNew"); }, u"OnSessionCreate 6"},
      {[&] { Mock->Session("7", "Lock"); }, u"OnSessionLock 7"},
      {[&] { Mock->Property("7", "LockedHint", true); }, u""},
      {[&] { Mock->Property("7", "LockedHint", false); }, u"OnSessionUnlock 7"},
      {[&] { Mock->Session("7", "Unlock"); }, u""}, {[&] { Mock->Session("1", "Unlock"); }, u"OnSessionUnlock 1"},
      {[&] { Mock->Property("1", "Active", false); }, u"OnConsoleDisconnect 1"},
      {[&] { Mock->Property("1", "Active", true); }, u"OnConsoleConnect 1"},
      {[&] { Mock->Property("5", "Active", false); }, u"OnRemoteDisconnect 5"},
      {[&] { Mock->Property("5", "Active", true); }, u"OnRemoteConnect 5"},
      {[&] { Mock->List("5", "SessionRemoved"); }, u"OnSessionLogoff 5OnRemoteDisconnect 5OnSessionTerminate 5"},
      {[&] { Mock->List("6", "SessionRemoved"); }, u"OnSessionTerminate 6"},
      {[&] { Mock->List("9", "SessionRemoved"); }, u""}};
  for (const auto& [Action, Expected] : Cases) {
    Action();
    EXPECT_EQ(Heard(), Expected);
  }
}

TEST_F(SystemBus, TellsOfThisSessionAlone) {
  Events->SetActive(true);
  const TEnvironmentScope Variable("XDG_SESSION_ID", "42");
  const std::string Own = std::to_string(GetCurrentSessionID());
  UnicodeString OwnLog;
  std::thread([&] {  // a connection for each thread
    const TOwned<TZqSessionEvents> OwnEvents(New<TZqSessionEvents>(nullptr));
    Listen(OwnEvents.get(), OwnLog);
    OwnEvents->SetActive(true);
    for (const std::string& Name : {std::string("1"), Own}) Mock->Session(Name, "Lock");
    EXPECT_TRUE(Soon([&] { return !OwnLog.IsEmpty(); }));
  })
      .join();
  EXPECT_EQ(OwnLog, u"OnSessionLock " + FromUTF8(Own));
  EXPECT_EQ(Heard(), u"OnSessionLock 1" + OwnLog);
}

TEST_F(SystemBus, HoldsUpSleepUntilTheCallbacksAreDone) {
  Events->SetActive(true);
  EXPECT_TRUE(Mock->Delays() == 1 && Mock->IsHeld());
  Events->SetOnSuspend([&](TObject*) { Log += Mock->IsHeld() ? u"held" : u"late"; });
  Mock->Comes("PrepareForSleep", true);
  EXPECT_EQ(Heard(), u"held");
  EXPECT_TRUE(Soon([&] { return !Mock->IsHeld(); }));
  Mock->Comes("PrepareForSleep", false);
  EXPECT_EQ(Heard(), u"OnResumeAutomaticOnResumeSuspend");
  EXPECT_TRUE(Mock->Delays() == 2 && Mock->IsHeld());
  Events->SetOnSuspend([&](TObject*) { throw EAbort(u"stop"); });
  Mock->Comes("PrepareForSleep", true);
  EXPECT_EQ(RaisedBy([] { Soon([] { return false; }); }), u"EAbort: stop");
  EXPECT_TRUE(Soon([&] { return !Mock->IsHeld(); }));
}

TEST_F(SystemBus, TellsOfTheEnd) {
  Events->SetOnQueryEndSession([&](TObject*, const TZqEndSessionTypes& ATypes, bool& ACanEnd) {
    Log += ATypes.IsEmpty() && ACanEnd && Mock->IsHeld() ? u"query " : u"?";
    ACanEnd = false;
  });
  Events->SetOnEndSession([&](TObject*, bool AEnding, const TZqEndSessionTypes&) {
    Log += AEnding && Mock->IsHeld() ? u"ends" : u"stays";
    if (!AEnding) Events->SetActive(false);
  });
  Events->SetActive(true);
  Mock->Comes("PrepareForShutdown", true);
  EXPECT_EQ(Heard(), u"query ends");
  Mock->Comes("PrepareForShutdown", false);
  EXPECT_TRUE(Soon([&] { return !Log.IsEmpty(); }));
  EXPECT_EQ(Log, u"stays");
  EXPECT_TRUE(Soon([&] { return Mock->Delays() == 2 && !Mock->IsHeld(); })) << "an inactive component holds up nothing";
}

TEST_F(SystemBus, HearsNobodyButTheLoginManager) {
  Events->SetActive(true);
  Daemon.Run("dbus-send --bus=" + Daemon.Address + " --dest=" + Mock->Client() + ' ' + cManagerPath + ' ' + cManager +
             ".PrepareForSleep boolean:true");
  EXPECT_EQ(Heard(), u"");
}

TEST_F(SystemBus, IsHeardAgainWhenItComesBack) {
  Events->SetActive(true);
  Mock.reset();
  Daemon.End();
  ProcessMessages(100);
  Daemon.Begin();
  Mock.emplace("8");
  EXPECT_TRUE(Soon([&] { return Mock->Delays() == 1; }));
  EXPECT_EQ(Heard(), u"OnSessionCreate 8OnSessionLogon 8OnSessionLogoff 1OnSessionTerminate 1");
}

TEST_F(SystemBus, RefusesWhereThereIsNone) {
  Mock.reset();
  EXPECT_EQ(RaisedBy([&] { Events->SetActive(true); }), u"EOSError: System Error.  Code: 31") << "no login manager";
  const TEnvironmentScope None("DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/zq/none");
  EXPECT_EQ(RaisedBy([&] { Events->SetActive(true); }), u"EOSError: System Error.  Code: 2");
  EXPECT_EQ(RaisedBy([] { WTSRegisterSessionNotification(0, nsAllSessions); }), u"EOSError: System Error.  Code: 1400");
  EXPECT_FALSE(ProcessMessages(10) || Events->Active());
}

TEST_F(SystemBus, TellsWindowsThatOtherThreadsRegister) {
  const HWND Window = AllocateHWnd([&](HWND, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam) {
    Log += IntToStr(AMessage + static_cast<Int64>(AWParam) + ALParam);
    return 0;
  });
  std::thread Other([&] { WTSRegisterSessionNotification(Window, nsAllSessions); });
  EXPECT_TRUE(Soon([&] { return Mock->Delays() == 1; }));
  Other.join();
  Mock->Session("1", "Lock");
  EXPECT_TRUE(Soon([&] { return Log == u"697"; }));
  WTSUnRegisterSessionNotification(Window);
  DestroyWindow(Window);
}

TEST_F(SystemBus, PowerSuppliesAreLookedAt) {
  const TTempFolder Root;
  std::filesystem::create_directories(Root.Path() / "class/power_supply/AC");
  Root.Write("class/power_supply/AC/online", "1\n");
  const TEnvironmentScope Variable("SYSFS_PATH", Root.Path().string());
  Events->SetActive(true);
  for (const auto& [File, Content] : {std::pair("AC/online", "0\n"), std::pair("AC/capacity", "99\n")}) {
    EXPECT_EQ(Heard(), u"");
    Root.Write(std::string("class/power_supply/") + File, Content);
    EXPECT_TRUE(Soon([&] { return !Log.IsEmpty(); }));
    EXPECT_EQ(std::exchange(Log, u""), u"OnPowerStatusChange");
  }
}

}  // namespace
}  // namespace zq
