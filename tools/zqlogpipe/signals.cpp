#include "signals.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

volatile std::sig_atomic_t StopSignal = 0;
volatile std::sig_atomic_t ReopenSignal = 0;

namespace {

int WakeUp[2] = {-1, -1};  // a byte for each signal, so that none is missed just before a wait

void OnSignal(int ANumber) {
  const int Saved = errno;
  (ANumber == SIGHUP ? ReopenSignal : StopSignal) = ANumber;
  static_cast<void>(!::write(WakeUp[1], "", 1));
  errno = Saved;
}

}  // namespace

void HearSignals() {
  if (::pipe2(WakeUp, O_CLOEXEC | O_NONBLOCK) != 0) throw std::runtime_error(std::strerror(errno));
  for (const int Number : {SIGTERM, SIGINT, SIGHUP}) {
    struct sigaction Action {};
    Action.sa_handler = OnSignal;
    ::sigaction(Number, &Action, nullptr);
  }
  for (const int Number : {SIGXFSZ, SIGPIPE}) std::signal(Number, SIG_IGN);  // the write tells
}

void Wait(int AHandle, int AMilliseconds) {
  pollfd Events[] = {{AHandle, POLLIN, 0}, {WakeUp[0], POLLIN, 0}};
  ::poll(Events, 2, AMilliseconds);
  for (char Byte = 0; ::read(WakeUp[0], &Byte, 1) > 0;) continue;
}
