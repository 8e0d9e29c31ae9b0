#include "common/uZqThreads.h"

#include "runtime/core/start_count.h"

namespace zq {

namespace {
constinit TStartCount Starts;
}

void uZqThreads::Start() {
  if (!Starts.Begins()) return;
  StartLocks();
}

void uZqThreads::Stop() {
  if (!Starts.Ends()) return;
  StopLocks();  // last: whoever ends before may hold a key
}

}  // namespace zq
