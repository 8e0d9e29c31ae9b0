#pragma once

#include "runtime/sync/event.h"
#include "runtime/sync/parker.h"

namespace zq {

/// A thread's wait for AEvent, for its scope: AParker is woken by each signal.
class TEvent::TWatch {
 public:
  TWatch(TEvent& AEvent, TParker& AParker);
  TWatch(const TWatch&) = delete;
  TWatch& operator=(const TWatch&) = delete;
  ~TWatch();

 private:
  friend class TEvent;
  TEvent& FEvent;
  TParker& FParker;
  TWatch* FNext = nullptr;
  TWatch** FLink = nullptr;  // what points here
};

}  // namespace zq
