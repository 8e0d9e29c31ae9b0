#pragma once

#include <unordered_map>

#include "runtime/component/component.h"
#include "runtime/containers/lists.h"
#include "runtime/io/streams.h"
#include "runtime/io/string_list.h"
#include "runtime/values/variants.h"

namespace zq {

// ---- Strings --------------------------------------------------------------------------------------------------------

class ZQ_API TZqFileStream : public TFileStream {
 public:
  using TFileStream::TFileStream;

  // At the position, without a line end or a byte order mark. Raise EWriteError.
  /// The bytes as they are.
  void WriteString(const AnsiString& AString);
  /// In UTF-16, the low byte first.
  void WriteString(const UnicodeString& AString);
};

class ZQ_API TZqStringList : public TStringList {
 public:
  /// Replaces the strings with the pieces of ASource between ADelimiter, empty ones left out, and makes it the list's
  /// Delimiter. Nothing is trimmed and no quote has a meaning.
  void Tokenize(const UnicodeString& ASource, Char ADelimiter);
};

/// Keys and their descriptions, side by side: what a list shows and what a choice in it stands for.
///
/// Look-ups take the first equal text, mostly without regard to case. Both lists can be changed by themselves; who
/// leaves one shorter than the other finds no description for the rest, or EListError. One thread at a time.
class ZQ_API TZqKeyDescStringList : public TComponent {
 public:
  explicit TZqKeyDescStringList(TComponent* AOwner) : TComponent(AOwner) {}

  // Live as long as the component; setting copies into them, and raises EConvertError for nullptr.
  [[nodiscard]] TStrings* KeyValues() noexcept ZQ_LIFETIMEBOUND { return &FKeyValues; }
  void SetKeyValues(const TStrings* AValue) { FKeyValues.Assign(AValue); }
  [[nodiscard]] TStrings* Descriptions() noexcept ZQ_LIFETIMEBOUND { return &FDescriptions; }
  void SetDescriptions(const TStrings* AValue) { FDescriptions.Assign(AValue); }

  void Clear();
  void AddItem(const UnicodeString& AItem, const UnicodeString& ADescription);
  void AddItem(Integer AItem, const UnicodeString& ADescription);
  /// The key is the description's index.
  void AddItem(const UnicodeString& ADescription);
  void AddItems(const TStrings& ADescriptions);
  /// From another of this class, or from a TStrings: its strings become the descriptions, their indices the keys.
  void Assign(const TPersistent* ASource) override;

  /// Empty where there is no such key. Null is the empty key; raises what VarToUStr raises for a value without a text.
  [[nodiscard]] UnicodeString GetDescription(const Variant& AKeyValue) const;
  /// Empty where there is no such description.
  [[nodiscard]] UnicodeString GetStrKeyValue(const UnicodeString& ADescription) const;
  /// -1 where there is no such description, or its key is no integer.
  [[nodiscard]] Integer GetIntKeyValue(const UnicodeString& ADescription) const;

 protected:
  ~TZqKeyDescStringList() override = default;

 private:
  TStringList FKeyValues;
  TStringList FDescriptions;
};

// ---- Objects --------------------------------------------------------------------------------------------------------

/// An object list that shares in the life of counted objects.
///
/// It holds a count for each time that a TInterfacedObject, or a TZqObject whose AutoDestroy is set by then, is in it;
/// OwnsObjects doesn't apply to these. Out of the list, also by Extract, such an object ends if that was the last
/// count: who goes on with what Extract gives has a reference of their own. Every other object is treated as by
/// TObjectList, among them a TZqObject that became AutoDestroy only in the list. One whose AutoDestroy was cleared
/// there loses its count and is treated so from then on.
class ZQ_API TZqObjectList : public TObjectList {
 public:
  using TObjectList::TObjectList;
  ~TZqObjectList() override { ClearQuietly(); }

  /// Returns AObject.
  TObject* Add(TObject* AObject);

 protected:
  void Notify(TObject* const& AObject, TListNotification AAction) override;

 private:
  std::unordered_multimap<const TObject*, IntfRef<IInterface>> FCounts;  // one for each place of a counted object
};

// ---- Arguments ------------------------------------------------------------------------------------------------------

/// For hosts that tell one set of arguments by this GUID. What can be asked of it is the host's: nothing here
/// implements or calls it, so it has no operation of its own.
struct ZQ_API IZqArguments : Extends<IInterface> {
  static constexpr TGUID IID = "{415EAA46-9BBE-4C5A-92B2-1B7FD14CE250}"_guid;

 protected:
  ~IZqArguments() = default;
};

}  // namespace zq
