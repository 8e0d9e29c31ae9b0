#include "runtime/sync/message_window.h"

#include <map>
#include <utility>

#include "runtime/text/format.h"

namespace zq {

namespace {

struct TWindow {
  TThreadQueueRef Queue;
  TWindowProc Proc;
};
using TWindowRef = std::shared_ptr<const TWindow>;

struct TWindows {
  static TWindows& Get() {
    static TWindows& Result = *new TWindows;
    return Result;
  }
  TWindowRef Find(HWND AWindow) {
    const std::lock_guard Guard(Lock);
    const auto Found = Known.find(AWindow);
    return Found == Known.end() ? nullptr : Found->second;
  }
  std::mutex Lock;
  std::map<HWND, TWindowRef> Known;
  HWND Last = 0;
};

// The key of its messages in the queue.
const void* OwnerOf(const TWindowRef& AWindow) { return AWindow.get(); }

UnicodeString IsGone(HWND AWindow) { return Format(u"The window %d is gone", {AWindow}); }

}  // namespace

HWND AllocateHWnd(TWindowProc AProc) {
  const auto Window = std::make_shared<const TWindow>(TWindow{TThreadQueue::Current(), std::move(AProc)});
  TWindows& Windows = TWindows::Get();
  const std::lock_guard Guard(Windows.Lock);
  Windows.Known.emplace(++Windows.Last, Window);
  return Windows.Last;
}

bool DestroyWindow(HWND AWindow) {
  TWindows& Windows = TWindows::Get();
  const TWindowRef Window = Windows.Find(AWindow);
  if (Window == nullptr || Window->Queue != TThreadQueue::Current()) return false;
  {
    const std::lock_guard Guard(Windows.Lock);
    Windows.Known.erase(AWindow);
  }
  Window->Queue->Drop(OwnerOf(Window), IsGone(AWindow));
  return true;
}

void DestroyWindowsOf(const TThreadQueue& AQueue) {
  TWindows& Windows = TWindows::Get();
  std::vector<TWindowRef> Gone;  // ends behind the lock: what a window keeps may end there, too
  const std::lock_guard Guard(Windows.Lock);
  std::erase_if(Windows.Known, [&](auto& AEntry) {
    if (AEntry.second->Queue.get() != &AQueue) return false;
    Gone.push_back(std::move(AEntry.second));
    return true;
  });
}

bool IsWindow(HWND AWindow) { return TWindows::Get().Find(AWindow) != nullptr; }

std::vector<HWND> AllWindows() {
  TWindows& Windows = TWindows::Get();
  const std::lock_guard Guard(Windows.Lock);
  std::vector<HWND> Result;
  for (const auto& [Handle, Window] : Windows.Known) Result.push_back(Handle);
  return Result;
}

Cardinal GetWindowThread(HWND AWindow) {
  const TThreadQueueRef Queue = GetWindowQueue(AWindow);
  return Queue == nullptr ? 0 : Queue->ThreadID();
}

TThreadQueueRef GetWindowQueue(HWND AWindow) {
  const TWindowRef Window = TWindows::Get().Find(AWindow);
  return Window == nullptr ? nullptr : Window->Queue;
}

NativeInt SendMessage(HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam) {
  const TWindowRef Window = TWindows::Get().Find(AWindow);
  if (Window == nullptr) throw ECallRefused(IsGone(AWindow));
  NativeInt Result = 0;
  Window->Queue->Send([&] { Result = Window->Proc(AWindow, AMessage, AWParam, ALParam); }, OwnerOf(Window));
  return Result;
}

namespace {

// An answer that nobody may wait for any more.
struct TAnswer {
  TSimpleEvent Done;
  NativeInt Result = 0;
  ExceptionRef Error = ExceptionRef::Of<ECallRefused>(u"The window is gone");  // until it has taken the message
};

}  // namespace

std::optional<NativeInt> SendMessageTimeout(
    HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam, Cardinal AMilliseconds) {
  const TWindowRef Window = TWindows::Get().Find(AWindow);
  const TThreadQueueRef Own = TThreadQueue::Current();
  if (Window == nullptr || Window->Queue == Own) return SendMessage(AWindow, AMessage, AWParam, ALParam);
  const auto Answer = std::make_shared<TAnswer>();
  std::shared_ptr<void> Taken(nullptr, [Answer](void*) { Answer->Done.SetEvent(); });  // run or dropped
  Window->Queue->Post(
      [=, Kept = std::move(Taken)] {
        try {
          Answer->Result = Window->Proc(AWindow, AMessage, AWParam, ALParam);
          Answer->Error = {};
        } catch (...) {
          Answer->Error = ExceptionRef::Current();
        }
      },
      OwnerOf(Window), TThreadQueue::TKind::Sent);
  TEvent* const Done = &Answer->Done;
  if (Own->WaitForAny({&Done, 1}, AMilliseconds) < 0) return {};
  if (Answer->Error) Answer->Error.Raise();
  return Answer->Result;
}

bool PostMessage(HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam) {
  const TWindowRef Window = TWindows::Get().Find(AWindow);
  if (Window == nullptr) return false;
  try {
    Window->Queue->Post([=] { Window->Proc(AWindow, AMessage, AWParam, ALParam); }, OwnerOf(Window));
  } catch (const ECallRefused&) {  // its thread has just ended
    return false;
  }
  return true;
}

Integer RunMessageLoop() { return TThreadQueue::Current()->Run(); }

void QuitMessageLoop(Integer ACode) { TThreadQueue::Current()->Quit(ACode); }

bool ProcessMessages(Cardinal ATimeout) { return TThreadQueue::Current()->RunOnce(ATimeout); }

}  // namespace zq
