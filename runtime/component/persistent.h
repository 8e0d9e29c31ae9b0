#pragma once

#include "runtime/core/delegates.h"
#include "runtime/core/persistent.h"

namespace zq {

/// Carries the properties of a persistent object to or from its stored form. Hosts that store components implement it.
class ZQ_API TFiler : public TObject {
 public:
  /// Announces a value that is no published property: AReadData is called when a stored form has it, AWriteData when
  /// one is written and AHasData is set.
  virtual void DefineProperty(const UnicodeString& AName, TMethod<void(TFiler*)> AReadData,
      TMethod<void(TFiler*)> AWriteData, bool AHasData) = 0;

 protected:
  ~TFiler() override = default;
};
class ZQ_API TReader : public TFiler {};
class ZQ_API TWriter : public TFiler {};

}  // namespace zq
