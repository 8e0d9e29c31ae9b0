#pragma once

#include "common/uZqClasses/component.h"
#include "common/uZqClasses/hex.h"
#include "common/uZqClasses/objects.h"
#include "common/uZqClasses/streams.h"
#include "runtime/component/bindings.h"  // what Bind raises

namespace zq::uZqClasses {

inline constexpr TResStringRec _SEncodingNotSupported{65510, u"The specified encoding is not supported!"};

ZQ_API void Start();
ZQ_API void Stop();

}  // namespace zq::uZqClasses
