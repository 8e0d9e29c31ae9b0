#pragma once

#include "common/uZqThreads/execution.h"
#include "common/uZqThreads/locks.h"
#include "common/uZqThreads/managed.h"
#include "common/uZqThreads/manager.h"

namespace zq::uZqThreads {

ZQ_API void Start();
ZQ_API void Stop();

}  // namespace zq::uZqThreads
