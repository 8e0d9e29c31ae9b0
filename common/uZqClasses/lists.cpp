#include "common/uZqClasses/lists.h"

#include <utility>

#include "common/uZqClasses/objects.h"
#include "common/uZqSysUtils.h"
#include "runtime/text/format.h"
#include "runtime/text/numbers.h"

namespace zq {

// -------------------------------------------------------------------------------------------------------- Strings

void TZqFileStream::WriteString(const AnsiString& AString) {
  WriteBuffer(AString.data(), static_cast<Int64>(AString.size()));
}

void TZqFileStream::WriteString(const UnicodeString& AString) {
  WriteBuffer(AString.data(), static_cast<Int64>(AString.size()) * Int64{sizeof(Char)});
}

void TZqStringList::Tokenize(const UnicodeString& ASource, Char ADelimiter) {
  const UnicodeString Kept(ASource.View());  // it may be one of the strings
  SetDelimiter(ADelimiter);
  Clear();
  ZqTokenize(Kept, this, UnicodeString(ADelimiter));
}

void TZqKeyDescStringList::Clear() {
  FKeyValues.Clear();
  FDescriptions.Clear();
}

void TZqKeyDescStringList::AddItem(const UnicodeString& AItem, const UnicodeString& ADescription) {
  const UnicodeString Description(ADescription.View());  // it may be one of the keys
  FKeyValues.Add(AItem);
  FDescriptions.Add(Description);
}

void TZqKeyDescStringList::AddItem(Integer AItem, const UnicodeString& ADescription) {
  AddItem(IntToStr(AItem), ADescription);
}

void TZqKeyDescStringList::AddItem(const UnicodeString& ADescription) {
  FKeyValues.Add(IntToStr(FDescriptions.Add(ADescription)));
}

void TZqKeyDescStringList::AddItems(const TStrings& ADescriptions) {
  const Integer Count = ADescriptions.Count();  // it may be one of the two that grow here
  for (Integer i = 0; i < Count; ++i) AddItem(ADescriptions[i]);
}

void TZqKeyDescStringList::Assign(const TPersistent* ASource) {
  if (const auto* const Source = dynamic_cast<const TZqKeyDescStringList*>(ASource)) {
    FKeyValues.Assign(&Source->FKeyValues);
    FDescriptions.Assign(&Source->FDescriptions);
  } else if (const auto* const Strings = dynamic_cast<const TStrings*>(ASource)) {
    FDescriptions.Assign(Strings);
    FKeyValues.Clear();
    for (Integer i = 0; i < FDescriptions.Count(); ++i) FKeyValues.Add(IntToStr(i));
  } else TComponent::Assign(ASource);
}

UnicodeString TZqKeyDescStringList::GetDescription(const Variant& AKeyValue) const {
  const Integer Found = FKeyValues.IndexOf(VarToStr(AKeyValue));
  return Found < 0 ? UnicodeString() : FDescriptions[Found];
}

UnicodeString TZqKeyDescStringList::GetStrKeyValue(const UnicodeString& ADescription) const {
  const Integer Found = FDescriptions.IndexOf(ADescription);
  return Found < 0 ? UnicodeString() : FKeyValues[Found];
}

Integer TZqKeyDescStringList::GetIntKeyValue(const UnicodeString& ADescription) const {
  return StrToIntDef(GetStrKeyValue(ADescription), -1);
}

// -------------------------------------------------------------------------------------------------------- Objects

namespace {

// What counts AObject; nullptr where it lives by an owner.
IInterface* CounterOf(TObject* AObject) {
  if (auto* const Interfaced = dynamic_cast<TInterfacedObject*>(AObject)) return Interfaced;
  auto* const Deciding = dynamic_cast<TZqObject*>(AObject);
  return Deciding != nullptr && Deciding->AutoDestroy() ? Deciding : nullptr;
}

}  // namespace

TObject* TZqObjectList::Add(TObject* AObject) {
  TObjectList::Add(AObject);
  return AObject;
}

void TZqObjectList::Notify(TObject* const& AObject, TListNotification AAction) {
  if (AAction == lnAdded) {
    if (IInterface* const Counter = CounterOf(AObject)) FCounts.emplace(AObject, IntfRef<IInterface>(Counter));
    return TObjectList::Notify(AObject, AAction);
  }
  const auto Found = FCounts.find(AObject);  // goes by the address: an object without a count may be gone by now
  if (Found == FCounts.end()) return TObjectList::Notify(AObject, AAction);
  auto Count = std::move(Found->second);
  FCounts.erase(Found);
  const bool EndsByCount = CounterOf(AObject) != nullptr;
  Count.Reset();
  if (!EndsByCount) TObjectList::Notify(AObject, AAction);
}

}  // namespace zq
