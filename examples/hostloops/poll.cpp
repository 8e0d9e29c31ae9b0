// hostloop_poll: a host's own loop on poll serves what waits for the main thread.

#include <poll.h>

#include "work.h"

int main() {
  bool Done = false;
  const zq::HWND Window = MakeWindow();
  pollfd Polled{zq::TThreadQueue::Current()->Descriptor(), POLLIN, 0};
  const auto Work = BeginWork(Window, [&Done] { Done = true; });
  while (!Done) {
    ::poll(&Polled, 1, -1);
    zq::ProcessMessages();
  }
  Work->WaitFor();
  zq::DestroyWindow(Window);
}
