#pragma once

#include "runtime/component/component.h"
#include "runtime/containers/collection.h"
#include "runtime/io/string_list.h"

namespace zq {

namespace uZqClasses {
inline constexpr TResStringRec _SMemoWithCodeExists{65511, u"There already is a memo with code %s!"};
inline constexpr TResStringRec _SNoMemoWithCode{65512, u"There is no MemoItem with the code %s!"};
}  // namespace uZqClasses

class TZqMemoList;

/// A text under a code.
class ZQ_API TZqMemoListItem : public TCollectionItem {
 public:
  explicit TZqMemoListItem(TCollection* ACollection) noexcept : TCollectionItem(ACollection) {}

  [[nodiscard]] const UnicodeString& Code() const noexcept ZQ_LIFETIMEBOUND { return FCode; }
  /// Another item may bear the same code: only Add of the collection sees to that.
  void SetCode(const UnicodeString& AValue) { FCode = AValue; }
  /// Lives as long as the item; setting copies into it, and raises EConvertError for nullptr.
  [[nodiscard]] TStrings* Memo() noexcept ZQ_LIFETIMEBOUND { return &FMemo; }
  void SetMemo(const TStrings* AValue) { FMemo.Assign(AValue); }

 protected:
  ~TZqMemoListItem() override = default;
  void AssignTo(TPersistent* ADest) const override;

 private:
  TStringList FMemo;
  UnicodeString FCode;
};

/// Memos in order, found by their codes without regard to the case of ASCII letters.
///
/// A position out of range raises EListError. One thread at a time.
class ZQ_API TZqMemoListItems : public TCollection {
 public:
  /// AOwner stays the caller's; nullptr for items that are in no list.
  explicit TZqMemoListItems(TZqMemoList* AOwner) noexcept
      : TCollection(TCollectionItemClass::Of<TZqMemoListItem>()), FOwner(AOwner) {}
  ~TZqMemoListItems() override = default;

  [[nodiscard]] TZqMemoList* Owner() const noexcept { return FOwner; }
  [[nodiscard]] TZqMemoListItem* GetItem(Integer AIndex) const { return static_cast<TZqMemoListItem*>(Items(AIndex)); }
  /// Copies into the item that is there.
  void SetItem(Integer AIndex, const TZqMemoListItem* AValue) { GetItem(AIndex)->Assign(AValue); }
  [[nodiscard]] const UnicodeString& GetCode(Integer AIndex) const { return GetItem(AIndex)->Code(); }
  void SetCode(Integer AIndex, const UnicodeString& AValue) { GetItem(AIndex)->SetCode(AValue); }
  /// The first one; nullptr if there is none.
  [[nodiscard]] TZqMemoListItem* Find(const UnicodeString& ACode) const;
  /// -1 if there is none.
  [[nodiscard]] Integer IndexOf(const UnicodeString& ACode) const;
  [[nodiscard]] Integer IndexOf(const TZqMemoListItem* AItem) const noexcept;

  using TCollection::Add;
  /// A new item with a copy of AMemo, which may be nullptr. Raises EListError (_SMemoWithCodeExists).
  TZqMemoListItem* Add(const UnicodeString& ACode, const TStrings* AMemo);
  /// Nothing where there is none.
  void Remove(const UnicodeString& ACode);
  /// Raises EListError for an item of another collection.
  void Remove(const TZqMemoListItem* AItem) { Delete(IndexOf(AItem)); }
  void Remove(Integer AIndex) { Delete(AIndex); }

 protected:
  /// By Add, so EListError for a code that comes twice; what came before it is there then.
  void AssignTo(TPersistent* ADest) const override;

 private:
  TZqMemoList* FOwner;
};

/// Memos as a component.
class ZQ_API TZqMemoList : public TComponent {
 public:
  explicit TZqMemoList(TComponent* AOwner) : TComponent(AOwner) {}

  /// Live as long as the component; setting copies into them, and raises EConvertError for nullptr.
  [[nodiscard]] TZqMemoListItems* Items() noexcept ZQ_LIFETIMEBOUND { return &FItems; }
  void SetItems(const TZqMemoListItems* AValue) { FItems.Assign(AValue); }
  /// The item's own. Raises Exception (_SNoMemoWithCode).
  [[nodiscard]] TStrings* MemoByCode(const UnicodeString& ACode);

 protected:
  ~TZqMemoList() override = default;

 private:
  TZqMemoListItems FItems{this};
};

}  // namespace zq
