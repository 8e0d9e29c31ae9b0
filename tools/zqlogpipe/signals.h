#pragma once

#include <csignal>

/// The number of the signal that ends the tool; 0 for none yet.
extern volatile std::sig_atomic_t StopSignal;
/// Not 0: SIGHUP has come. Whoever sees to it sets it back.
extern volatile std::sig_atomic_t ReopenSignal;

/// From now on; raises std::runtime_error.
void HearSignals();
/// Until there is something to read from AHandle (-1: from nothing), a signal has come, or the time is over.
void Wait(int AHandle, int AMilliseconds);
