#include <gtest/gtest.h>

#include <thread>

#include "tests/fakes/clock.h"

namespace zq {
namespace {

TEST(Platform, OverridesNestAndReachEveryThread) {
  TClockService& Real = Service<TClockService>();
  {
    TScriptedClock First;
    {
      TScriptedClock Second;
      std::thread([&] { EXPECT_EQ(&Service<TClockService>(), &Second); }).join();
    }
    EXPECT_EQ(&Service<TClockService>(), &First);
  }
  EXPECT_EQ(&Service<TClockService>(), &Real);
}

}  // namespace
}  // namespace zq
