#pragma once

#include "common/uZqClasses/characters.h"
#include "common/uZqClasses/component.h"
#include "common/uZqClasses/hex.h"
#include "common/uZqClasses/lists.h"
#include "common/uZqClasses/memo_list.h"
#include "common/uZqClasses/objects.h"
#include "common/uZqClasses/parser.h"
#include "common/uZqClasses/pointers.h"
#include "common/uZqClasses/streams.h"
#include "common/uZqClasses/text_streams.h"
#include "runtime/component/bindings.h"  // what Bind raises

namespace zq::uZqClasses {

ZQ_API void Start();
ZQ_API void Stop();

}  // namespace zq::uZqClasses
