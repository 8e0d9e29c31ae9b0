#pragma once

#include "common/uZqLogAppenders/event_log.h"

/// Gives a log that is full a second to make room, once until it has taken a line again.
class TPatientEventLog : public zq::TZqEventLogAppender {
 public:
  using TZqEventLogAppender::TZqEventLogAppender;

 protected:
  ~TPatientEventLog() override = default;
  bool Report(zq::Word AType, zq::Cardinal AEventId, const zq::UnicodeString& AText) override;

 private:
  static constexpr int cPatience = 1000, cStep = 1;  // milliseconds
  int FPatience = cPatience;
};
