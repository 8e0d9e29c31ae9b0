#pragma once

#include "common/uZqLogAppenders/base.h"
#include "common/uZqLogAppenders/daily.h"
#include "common/uZqLogAppenders/event_log.h"
#include "common/uZqLogAppenders/files.h"
#include "common/uZqLogAppenders/rolling.h"

namespace zq::uZqLogAppenders {

ZQ_API void Start();
ZQ_API void Stop();

}  // namespace zq::uZqLogAppenders
