#include "common/uZqLogAppenders.h"

#include "runtime/core/start_count.h"

namespace zq {

namespace {
constinit TStartCount Starts;
}

void uZqLogAppenders::Start() {
  if (!Starts.Begins()) return;
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TZqFileAppender>());
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TZqRollingFileAppender>());
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TZqDailyRollingFileAppender>());
  RegisteredAppenders()->Add(TZqLogBaseClass::Of<TZqEventLogAppender>());
}

void uZqLogAppenders::Stop() { Starts.Ends(); }

}  // namespace zq
