#pragma once

#include <gmock/gmock.h>

#include "runtime/platform/service.h"
#include "tests/support/support.h"

namespace zq {

/// A service that is in its seam as long as it lives and answers what the test has told it with EXPECT_CALL. A call
/// that nobody scripted fails the test, and so does a scripted one that never comes.
template <class TSeam, class TCalls>
class TScripted : public testing::StrictMock<TCalls> {
  const TPlatformOverride<TSeam> FSeat{*this};
};

}  // namespace zq
