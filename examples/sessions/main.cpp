// sessionwatch [--this] [COMMAND]: tells of sessions, power and the end of the system, a line each, until the system
// ends. COMMAND is run for each, with its words behind it; the system waits for that before it sleeps or ends.

#include <iostream>
#include <string_view>

#include "common/uZqSessionEvents.h"
#include "common/uZqWindows.h"
#include "runtime/sync/message_window.h"
#include "runtime/text/format.h"

using namespace zq;

namespace {

using TEvents = TZqSessionEvents;

constexpr std::pair<void (TEvents::*)(TZqSessionEvent) noexcept, const char16_t*> cOfSessions[] = {
    {&TEvents::SetOnConsoleConnect, u"connect"}, {&TEvents::SetOnConsoleDisconnect, u"disconnect"},
    {&TEvents::SetOnRemoteConnect, u"remote-connect"}, {&TEvents::SetOnRemoteDisconnect, u"remote-disconnect"},
    {&TEvents::SetOnSessionLogon, u"logon"}, {&TEvents::SetOnSessionLogoff, u"logoff"},
    {&TEvents::SetOnSessionLock, u"lock"}, {&TEvents::SetOnSessionUnlock, u"unlock"},
    {&TEvents::SetOnSessionCreate, u"create"}, {&TEvents::SetOnSessionTerminate, u"terminate"}};

constexpr std::pair<void (TEvents::*)(TNotifyEvent) noexcept, const char16_t*> cOfPower[] = {
    {&TEvents::SetOnPowerStatusChange, u"power"}, {&TEvents::SetOnSuspend, u"suspend"},
    {&TEvents::SetOnResumeAutomatic, u"resume"}, {&TEvents::SetOnResumeSuspend, u"resume-suspend"}};

void Watch(TZqNotificationScope AScope, const UnicodeString& ACommand) {
  const auto Tell = [&](const UnicodeString& AWords) {
    if (!ACommand.IsEmpty()) std::cout << ToUTF8(ZqRunProcessAndCaptureOutput(ACommand + u" " + AWords, u"", false));
    std::cout << ToUTF8(AWords) << std::endl;
  };
  const TOwned<TEvents> Events(New<TEvents>(nullptr));
  for (const auto& [Set, Words] : cOfSessions)
    (*Events.*Set)([&Tell, Words = Words](TObject*, NativeUInt AID) { Tell(Format(u"%s %d", {Words, AID})); });
  for (const auto& [Set, Words] : cOfPower) (*Events.*Set)([&Tell, Words = Words](TObject*) { Tell(Words); });
  Events->SetOnQueryEndSession([&](TObject*, const TZqEndSessionTypes&, bool&) { Tell(u"end?"); });
  Events->SetOnEndSession([&](TObject*, bool AEnding, const TZqEndSessionTypes&) {
    Tell(AEnding ? u"end" : u"no-end");
    if (AEnding) QuitMessageLoop();
  });
  Events->SetScope(AScope);
  Events->SetActive(true);
  std::cout << "session " << GetCurrentSessionID() << std::endl;
  RunMessageLoop();
}

}  // namespace

int main(int argc, char* argv[]) try {
  const bool This = argc > 1 && std::string_view(argv[1]) == "--this";
  const int Next = This ? 2 : 1;
  Watch(This ? nsThisSession : nsAllSessions, Next < argc ? FromUTF8(argv[Next]) : u"");
  return 0;
} catch (const std::exception& e) {
  std::cerr << e.what() << std::endl;
  return 1;
}
