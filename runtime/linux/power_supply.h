#pragma once

#include <functional>
#include <string>

#include "runtime/sync/thread_queue.h"

namespace zq {

/// Notices changes of the power supplies (mains on or off, what a battery holds and does) that the kernel lists, for
/// the Linux feeder. It belongs to the thread that made it and tells in that thread's loop.
///
/// The kernel's own messages are the wake-up. Not every driver sends one for each change, so every half minute it looks
/// by itself; every second where there are no such messages, and in the folder that SYSFS_PATH names in place of /sys.
class TPowerSupply {
 public:
  /// AChanged must not end the object.
  explicit TPowerSupply(std::function<void()> AChanged);
  TPowerSupply(const TPowerSupply&) = delete;
  TPowerSupply& operator=(const TPowerSupply&) = delete;
  ~TPowerSupply();

 private:
  void OpenMessages();
  void Hear();
  void Look();
  [[nodiscard]] std::string State() const;

  const std::function<void()> FChanged;
  const TThreadQueueRef FQueue = TThreadQueue::Current();
  const std::string FFolder;
  std::string FState;
  int FMessages = -1;  // the socket; -1: none
  TThreadQueue::TTimerID FTimer = 0;
};

}  // namespace zq
