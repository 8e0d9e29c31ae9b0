#pragma once

#include <functional>

#include "runtime/core/exceptions.h"

namespace zq {

/// Class and message of what AAction raises, as "EClass: message"; "nothing" if it raises nothing.
inline UnicodeString RaisedBy(const std::function<void()>& AAction) {
  try {
    AAction();
  } catch (const Exception& e) {
    return e.ClassName() + u": " + e.Message();
  }
  return u"nothing";
}

}  // namespace zq
