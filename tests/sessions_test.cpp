#include <thread>

#include "common/uZqSessionEvents.h"
#include "runtime/platform/session_service.h"
#include "runtime/sync/message_window.h"
#include "tests/support/support.h"

namespace zq {
namespace {

// tests/examples/sessions tells the rest, with a bus and a login manager.
struct LinuxSessions : testing::Test {
  const TTempFolder Root;
  const TEnvironmentScope Bus{"DBUS_SYSTEM_BUS_ADDRESS", "unix:path=" + (Root.Path() / "none").string()};
  const TEnvironmentScope System{"SYSFS_PATH", Root.Path().string()};
  std::vector<NativeUInt> Heard;
  const HWND Window = AllocateHWnd([this](HWND, Cardinal AMessage, NativeUInt AWParam, NativeInt) {
    Heard.push_back(AMessage + AWParam);
    return 0;
  });
  ~LinuxSessions() override { DestroyWindow(Window); }
};

TEST_F(LinuxSessions, TellWhoAskedWhyNot) {
  UnicodeString Refusals;
  std::thread Other([&] {  // it happens on the window's thread, which serves it
    Refusals = RaisedBy([&] { WTSRegisterSessionNotification(Window, nsThisSession); });
    Refusals += RaisedBy([&] { WTSRegisterSessionNotification(Window + 1, nsThisSession); });
    GetWindowQueue(Window)->Quit();
  });
  RunMessageLoop();
  Other.join();
  EXPECT_EQ(Refusals, u"EOSError: System Error.  Code: 2EOSError: System Error.  Code: 1400");
  EXPECT_FALSE(ProcessMessages(10));
}

TEST_F(LinuxSessions, LookAtPowerSuppliesWithoutABus) {
  TSessionService& Sessions = Service<TSessionService>();
  std::filesystem::create_directories(Root.Path() / "class/power_supply/BAT0");
  Root.Write("class/power_supply/BAT0/capacity", "100\n");
  Sessions.StartSystemMessages(Window);
  ProcessMessages(1500);  // the bus is asked, in vain
  EXPECT_TRUE(Heard.empty());
  Root.Write("class/power_supply/BAT0/capacity", "99\n");
  for (int i = 0; i < 100 && Heard.empty(); ++i) ProcessMessages(100);
  EXPECT_EQ(Heard, std::vector<NativeUInt>{WM_POWERBROADCAST + PBT_APMPOWERSTATUSCHANGE});
  Sessions.StopSystemMessages(Window);
  EXPECT_FALSE(ProcessMessages(1500)) << "it looks no more";
}

}  // namespace
}  // namespace zq
