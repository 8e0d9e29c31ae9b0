// hostloop_glib: GLib's main loop serves what waits for the main thread.

#include <glib-unix.h>

#include "work.h"

int main() {
  GMainLoop* const Loop = g_main_loop_new(nullptr, FALSE);
  const zq::HWND Window = MakeWindow();
  const auto Pass = [](gint, GIOCondition, gpointer) -> gboolean {
    zq::ProcessMessages();
    return G_SOURCE_CONTINUE;
  };
  g_unix_fd_add(zq::TThreadQueue::Current()->Descriptor(), G_IO_IN, Pass, nullptr);
  const auto Work = BeginWork(Window, [Loop] { g_main_loop_quit(Loop); });
  g_main_loop_run(Loop);
  Work->WaitFor();
  zq::DestroyWindow(Window);
  g_main_loop_unref(Loop);
}
