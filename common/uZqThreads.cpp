#include "common/uZqThreads.h"

#include "runtime/core/start_count.h"

namespace zq {

namespace {
constinit TStartCount Starts;
}

void uZqThreads::Start() {
  if (!Starts.Begins()) return;
  StartManagers();
  StartLocks();
}

void uZqThreads::Stop() {
  if (!Starts.Ends()) return;
  StopManagers();
  StopLocks();  // last: whoever ends before may hold a key
}

}  // namespace zq
