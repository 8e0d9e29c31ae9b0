#pragma once

#include <cstdio>

#include "runtime/sync/message_window.h"
#include "runtime/sync/thread.h"

/// What the examples' loops have to serve: a thread that counts and asks the main thread each time, by a message to a
/// window of that; what the last answer brings is posted there, and ends the loop by ADone.
template <class TDone>
zq::TThreadHandle BeginWork(zq::HWND AWindow, TDone ADone) {
  return zq::BeginThread([AWindow, ADone] {
    zq::NativeInt Sum = 0;
    for (zq::NativeUInt i = 1; i <= 1000; ++i) Sum += zq::SendMessage(AWindow, 1024, i, 0);
    zq::TThread::Queue(nullptr, [Sum, ADone] {
      std::printf("%ld\n", Sum);
      ADone();
    });
    return 0;
  });
}

inline zq::HWND MakeWindow() {
  return zq::AllocateHWnd([](zq::HWND, zq::Cardinal, zq::NativeUInt AValue, zq::NativeInt) {
    return static_cast<zq::NativeInt>(2 * AValue);
  });
}
