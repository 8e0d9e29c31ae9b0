#include "runtime/core/persistent.h"

namespace zq {

void TPersistent::Assign(const TPersistent* ASource) {
  if (ASource == nullptr) AssignError(nullptr);
  ASource->AssignTo(this);
}

void TPersistent::AssignTo(TPersistent* ADest) const { ADest->AssignError(this); }

void TPersistent::AssignError(const TPersistent* ASource) const {
  throw EConvertError(SAssignError, {ASource == nullptr ? UnicodeString(u"nil") : ASource->ClassName(), ClassName()});
}

}  // namespace zq
