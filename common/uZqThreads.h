#pragma once

#include "common/uZqThreads/locks.h"

namespace zq::uZqThreads {

ZQ_API void Start();
ZQ_API void Stop();

}  // namespace zq::uZqThreads
