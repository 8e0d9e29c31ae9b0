#include "runtime/core/interfaces.h"

namespace zq {

namespace {

// The answer for IInterface itself, which no Implements gives.
template <class T>
bool AnswerRoot(T* AObject, const TGUID& AIID, void** AObj) {
  *AObj = AIID == IInterface::IID ? static_cast<IInterface*>(AObject) : nullptr;
  if (*AObj != nullptr) AObject->_AddRef();
  return *AObj != nullptr;
}

}  // namespace

bool TInterfacedObject::GetInterface(const TGUID& AIID, void** AObj) { return AnswerRoot(this, AIID, AObj); }

HRESULT TInterfacedObject::QueryInterface(const TGUID& AIID, void** AObj) {
  return GetInterface(AIID, AObj) ? S_OK : E_NOINTERFACE;
}

Integer TInterfacedObject::_AddRef() { return FRefCount.fetch_add(1, std::memory_order_relaxed) + 1; }

Integer TInterfacedObject::_Release() {
  const Integer Result = FRefCount.fetch_sub(1, std::memory_order_acq_rel) - 1;
  if (Result == 0 && !FEnding.exchange(true, std::memory_order_acq_rel)) Free();
  return Result;
}

void TInterfacedObject::AfterConstruction() {
  TObject::AfterConstruction();
  FRefCount.fetch_sub(1, std::memory_order_relaxed);
}

void TInterfacedObject::BeforeDestruction() {
  if (RefCount() != 0) throw Exception(ClassName() + u" is freed while it is referenced");
  FEnding.store(true, std::memory_order_release);  // also of one that is freed by hand
  TObject::BeforeDestruction();
}

// The next last reference tries again.
void TInterfacedObject::EndRefused() noexcept {
  FEnding.store(false, std::memory_order_release);
  TObject::EndRefused();
}

bool TContainedObject::GetInterface(const TGUID& AIID, void** AObj) { return AnswerRoot(this, AIID, AObj); }

HRESULT TContainedObject::QueryInterface(const TGUID& AIID, void** AObj) {
  return GetInterface(AIID, AObj) ? S_OK : E_NOINTERFACE;
}

}  // namespace zq
