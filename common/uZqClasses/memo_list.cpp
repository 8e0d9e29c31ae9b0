#include "common/uZqClasses/memo_list.h"

#include <algorithm>

#include "runtime/text/format.h"

namespace zq {

using namespace uZqClasses;

void TZqMemoListItem::AssignTo(TPersistent* ADest) const {
  auto* const Dest = dynamic_cast<TZqMemoListItem*>(ADest);
  if (Dest == nullptr) return TCollectionItem::AssignTo(ADest);
  Dest->SetCode(FCode);
  Dest->SetMemo(&FMemo);
}

Integer TZqMemoListItems::IndexOf(const UnicodeString& ACode) const {
  for (Integer i = 0; i < Count(); ++i)
    if (SameText(GetCode(i), ACode)) return i;
  return -1;
}

Integer TZqMemoListItems::IndexOf(const TZqMemoListItem* AItem) const noexcept {
  const auto Found = std::find(begin(), end(), AItem);
  return Found == end() ? -1 : static_cast<Integer>(Found - begin());
}

TZqMemoListItem* TZqMemoListItems::Find(const UnicodeString& ACode) const {
  const Integer Found = IndexOf(ACode);
  return Found < 0 ? nullptr : GetItem(Found);
}

TZqMemoListItem* TZqMemoListItems::Add(const UnicodeString& ACode, const TStrings* AMemo) {
  if (IndexOf(ACode) >= 0) throw EListError(_SMemoWithCodeExists, {ACode});
  auto* const Result = static_cast<TZqMemoListItem*>(Add());
  Result->SetCode(ACode);
  if (AMemo != nullptr) Result->SetMemo(AMemo);
  return Result;
}

void TZqMemoListItems::Remove(const UnicodeString& ACode) {
  const Integer Found = IndexOf(ACode);
  if (Found >= 0) Delete(Found);
}

void TZqMemoListItems::AssignTo(TPersistent* ADest) const {
  auto* const Dest = dynamic_cast<TZqMemoListItems*>(ADest);
  if (Dest == nullptr) return TCollection::AssignTo(ADest);
  if (Dest == this) return;
  Dest->Clear();
  for (Integer i = 0; i < Count(); ++i) Dest->Add(GetCode(i), nullptr)->Assign(GetItem(i));
}

TStrings* TZqMemoList::MemoByCode(const UnicodeString& ACode) {
  TZqMemoListItem* const Found = FItems.Find(ACode);
  if (Found == nullptr) throw Exception(_SNoMemoWithCode, {ACode});
  return Found->Memo();
}

}  // namespace zq
