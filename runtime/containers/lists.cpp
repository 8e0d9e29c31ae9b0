#include "runtime/containers/lists.h"

namespace zq {

void ListIndexError(Integer AIndex) { throw EListError(u"List index out of bounds (%d)", {AIndex}); }

void TObjectList::Notify(TObject* const& AObject, TListNotification AAction) {
  if (AAction == lnDeleted && FOwnsObjects) zq::Free(AObject);
}

void TObjectList::ClearQuietly() noexcept {
  while (Count() > 0) {
    try {
      Clear();
    } catch (...) {  // told in the contract
    }
  }
}

Integer TInterfaceList::IndexOf(const IntfRef<IInterface>& AItem) const {
  const auto Identity = AItem.Supports<IInterface>();
  const auto Found =
      std::find_if(begin(), end(), [&](const auto& Item) { return Item.template Supports<IInterface>() == Identity; });
  return Found == end() ? -1 : static_cast<Integer>(Found - begin());
}

}  // namespace zq
