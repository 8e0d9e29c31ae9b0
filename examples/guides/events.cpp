#include "common/uZqSessionEvents.h"
#include "runtime/sync/message_window.h"

using namespace zq;

int main() {
  Integer Locks = 0;
  UnicodeString Why;

  const TOwned<TZqSessionEvents> Events(New<TZqSessionEvents>(nullptr));
  Events->SetOnSessionLock([&](TObject*, NativeUInt) { ++Locks; });
  Events->SetOnSuspend([&](TObject*) { /* saved before the system sleeps */ });
  Events->SetOnEndSession([](TObject*, bool AEnding, const TZqEndSessionTypes&) {
    if (AEnding) QuitMessageLoop();
  });
  try {
    Events->SetActive(true);
  } catch (const Exception& e) {  // nobody tells of sessions here
    Why = e.Message();
  }

  QuitMessageLoop();
  return RunMessageLoop() + Locks == 0 && Events->Active() == Why.IsEmpty() ? 0 : 1;
}
