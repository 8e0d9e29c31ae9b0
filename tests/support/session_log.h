#pragma once

#include "common/uZqSessionEvents.h"
#include "runtime/text/numbers.h"
#include "runtime/values/values.h"
#include "tests/support/support.h"

namespace zq {

/// Gives each published callback of AEvents, but for those of the end, one that writes its name and what it was told.
inline void Listen(TZqSessionEvents* AEvents, UnicodeString& ALog) {
  for (const PPropInfo Property : GetPropList(AEvents)) {
    const auto Tell = [&ALog, AEvents, Property](TObject* ASender, const UnicodeString& AMore) {
      EXPECT_EQ(ASender, AEvents);
      ALog += Property->Name + AMore;
    };
    if (Property->PropType == TypeInfo<TZqSessionEvent>())
      Property->SetValue(AEvents, TValue::From(TZqSessionEvent([Tell](TObject* ASender, NativeUInt AID) {
        Tell(ASender, u" " + IntToStr(static_cast<Int64>(AID)));
      })));
    if (Property->PropType == TypeInfo<TNotifyEvent>())
      Property->SetValue(AEvents, TValue::From(TNotifyEvent([Tell](TObject* ASender) { Tell(ASender, u""); })));
  }
}

}  // namespace zq
