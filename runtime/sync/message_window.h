#pragma once

#include <functional>

#include "runtime/core/types.h"
#include "runtime/sync/thread_queue.h"

namespace zq {

/// Takes a message to a window, on the window's thread, and returns the answer.
using TWindowProc = std::function<NativeInt(HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam)>;

// Hidden windows: places of a thread that take numbered messages. A number, never 0, names one and is not used again.
// Any thread may call, but for what says that it doesn't.

/// A window of the calling thread. It ends by DestroyWindow or with the thread.
[[nodiscard]] ZQ_API HWND AllocateHWnd(TWindowProc AProc);
/// By the window's own thread: false elsewhere, and where there is no such window. Messages that wait for it are
/// dropped, and their senders get ECallRefused.
ZQ_API bool DestroyWindow(HWND AWindow);
[[nodiscard]] ZQ_API bool IsWindow(HWND AWindow);
/// Those of all threads, in the order of their making.
[[nodiscard]] ZQ_API std::vector<HWND> AllWindows();
/// Of its thread; 0 where there is no such window.
[[nodiscard]] ZQ_API Cardinal GetWindowThread(HWND AWindow);
/// Of its thread; null where there is no such window.
[[nodiscard]] ZQ_API TThreadQueueRef GetWindowQueue(HWND AWindow);

/// Has the window's thread take the message and returns the answer, at once where that is the caller; what the window
/// raises is raised here. The caller serves calls that are sent to it meanwhile. Raises ECallRefused where the window
/// is gone, or goes before it has taken the message.
ZQ_API NativeInt SendMessage(HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam);
/// The same for at most AMilliseconds: nothing where the window has not answered by then, it may still take the
/// message.
ZQ_API std::optional<NativeInt> SendMessageTimeout(
    HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam, Cardinal AMilliseconds);
/// Doesn't wait; the thread takes it in its loop. False where there is no such window.
ZQ_API bool PostMessage(HWND AWindow, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam);

/// The loop of the calling thread, until QuitMessageLoop on it; returns its code.
ZQ_API Integer RunMessageLoop();
/// Ends the innermost loop of the calling thread.
ZQ_API void QuitMessageLoop(Integer ACode = 0);
/// One pass: what waits for the calling thread, or comes first within ATimeout milliseconds; false where there was
/// nothing.
ZQ_API bool ProcessMessages(Cardinal ATimeout = 0);

/// For the end of a thread.
void DestroyWindowsOf(const TThreadQueue& AQueue);

}  // namespace zq
