#pragma once

#include <functional>
#include <iterator>
#include <utility>
#include <vector>

#include "runtime/core/persistent.h"
#include "runtime/core/strings.h"

namespace zq {

class TStream;
class TEncoding;

/// List of strings, counted from 0, with an object beside each string that stays the caller's.
///
/// An index out of range raises EListError. One thread at a time.
class ZQ_API TStrings : public TPersistent {
 public:
  ~TStrings() override = default;

  [[nodiscard]] virtual Integer Count() const noexcept = 0;
  [[nodiscard]] virtual const UnicodeString& Strings(Integer AIndex) const = 0;
  virtual void SetStrings(Integer AIndex, const UnicodeString& AText) = 0;
  [[nodiscard]] virtual TObject* Objects(Integer AIndex) const = 0;
  virtual void SetObjects(Integer AIndex, TObject* AObject) = 0;
  virtual void InsertObject(Integer AIndex, const UnicodeString& AText, TObject* AObject) = 0;
  virtual void Delete(Integer AIndex) = 0;
  virtual void Clear() = 0;
  /// Returns the index.
  virtual Integer AddObject(const UnicodeString& AText, TObject* AObject);
  /// The first equal string, by the list's own comparison, mostly without regard to case; -1 if absent.
  [[nodiscard]] virtual Integer IndexOf(const UnicodeString& AText) const;

  [[nodiscard]] const UnicodeString& operator[](Integer AIndex) const { return Strings(AIndex); }
  Integer Add(const UnicodeString& AText) { return AddObject(AText, nullptr); }
  void Insert(Integer AIndex, const UnicodeString& AText) { InsertObject(AIndex, AText, nullptr); }
  /// With their objects.
  void AddStrings(const TStrings& AStrings);
  /// The strings, objects and the delimiter of another TStrings.
  void Assign(const TPersistent* ASource) override;

  // Strings of the form Name=Value.
  /// The first string of that name, by the same comparison; -1 if absent.
  [[nodiscard]] Integer IndexOfName(const UnicodeString& AName) const;
  /// What stands before the first "="; empty where there is none.
  [[nodiscard]] UnicodeString Names(Integer AIndex) const;
  /// Empty where the name is absent.
  [[nodiscard]] UnicodeString Values(const UnicodeString& AName) const;
  /// Changes or adds the string of that name; an empty value deletes it.
  void SetValues(const UnicodeString& AName, const UnicodeString& AValue);

  /// Every string, each ended by CR LF.
  [[nodiscard]] UnicodeString Text() const;
  /// One string for each line. Lines end by CR LF, CR or LF; an end at the end adds no empty line.
  void SetText(const UnicodeString& AText);
  /// Kept for those who split and join strings by it.
  [[nodiscard]] Char Delimiter() const noexcept { return FDelimiter; }
  void SetDelimiter(Char AValue) noexcept { FDelimiter = AValue; }

  // Text in a file or from a stream's position to its end. Without an encoding a load goes by the byte order mark of
  // UTF-8 or UTF-16 and takes the default encoding where there is none; with one it skips that encoding's mark. A save
  // without an encoding takes the default one and writes no mark; with one it writes that encoding's mark. Errors are
  // those of the stream.
  void LoadFromFile(const UnicodeString& AFileName);
  void LoadFromFile(const UnicodeString& AFileName, const TEncoding& AEncoding);
  void LoadFromStream(TStream& AStream);
  void LoadFromStream(TStream& AStream, const TEncoding& AEncoding);
  void SaveToFile(const UnicodeString& AFileName) const;
  void SaveToFile(const UnicodeString& AFileName, const TEncoding& AEncoding) const;
  void SaveToStream(TStream& AStream) const;
  void SaveToStream(TStream& AStream, const TEncoding& AEncoding) const;

  /// For range-for over the strings.
  class TIterator {
   public:
    using iterator_category = std::input_iterator_tag;
    using value_type = UnicodeString;
    using difference_type = std::ptrdiff_t;
    using pointer = const UnicodeString*;
    using reference = const UnicodeString&;

    TIterator() noexcept = default;
    TIterator(const TStrings& AStrings, Integer AIndex) noexcept : FStrings(&AStrings), FIndex(AIndex) {}
    reference operator*() const { return FStrings->Strings(FIndex); }
    TIterator& operator++() noexcept {
      ++FIndex;
      return *this;
    }
    TIterator operator++(int) noexcept { return {*FStrings, FIndex++}; }
    friend bool operator==(const TIterator&, const TIterator&) noexcept = default;

   private:
    const TStrings* FStrings = nullptr;
    Integer FIndex = 0;
  };
  [[nodiscard]] TIterator begin() const noexcept { return {*this, 0}; }
  [[nodiscard]] TIterator end() const noexcept { return {*this, Count()}; }

 protected:
  /// Below 0 where A comes before B. Without regard to case: by the code units of the lower-case forms.
  [[nodiscard]] virtual Integer CompareStrings(const UnicodeString& A, const UnicodeString& B) const;

 private:
  void SetBytes(const TBytes& ABytes, const TEncoding& AEncoding);

  Char FDelimiter = u',';
};

enum class TDuplicates : std::uint8_t { dupIgnore, dupAccept, dupError };
using enum TDuplicates;

/// The strings in memory, in order of insertion or kept sorted.
class ZQ_API TStringList : public TStrings {
 public:
  /// Below 0 where the string at AFirst comes before that at ASecond. The list stays as it is during the sort.
  using TSortCompare = std::function<Integer(const TStringList& AList, Integer AFirst, Integer ASecond)>;

  TStringList() = default;
  ~TStringList() override = default;

  /// Sets whether strings are kept in the order of Sort. SetStrings and Insert raise EStringListError then.
  void SetSorted(bool AValue);
  [[nodiscard]] bool Sorted() const noexcept { return FSorted; }
  /// What AddObject does in a sorted list with a string that is there: nothing, add it, or raise EStringListError.
  void SetDuplicates(TDuplicates AValue) noexcept { FDuplicates = AValue; }
  [[nodiscard]] TDuplicates Duplicates() const noexcept { return FDuplicates; }
  /// Whether comparing regards case. A sorted list is sorted anew.
  void SetCaseSensitive(bool AValue);
  [[nodiscard]] bool CaseSensitive() const noexcept { return FCaseSensitive; }

  /// By the lower-case forms, or as they are where CaseSensitive is set; by code unit either way, so that the order is
  /// the same in every locale. Equal strings keep their order.
  void Sort();
  /// Raises EStringListError in a list that is kept sorted.
  void CustomSort(const TSortCompare& ACompare);
  /// In a sorted list, AText's first place, or where it belongs; True if it is there.
  bool Find(const UnicodeString& AText, Integer& AIndex) const;

  [[nodiscard]] Integer Count() const noexcept override { return static_cast<Integer>(FItems.size()); }
  [[nodiscard]] const UnicodeString& Strings(Integer AIndex) const override { return FItems[Slot(AIndex)].Text; }
  void SetStrings(Integer AIndex, const UnicodeString& AText) override;
  [[nodiscard]] TObject* Objects(Integer AIndex) const override { return FItems[Slot(AIndex)].Object; }
  void SetObjects(Integer AIndex, TObject* AObject) override { FItems[Slot(AIndex)].Object = AObject; }
  void InsertObject(Integer AIndex, const UnicodeString& AText, TObject* AObject) override;
  void Delete(Integer AIndex) override;
  void Clear() override { FItems.clear(); }
  Integer AddObject(const UnicodeString& AText, TObject* AObject) override;
  [[nodiscard]] Integer IndexOf(const UnicodeString& AText) const override;

 protected:
  [[nodiscard]] Integer CompareStrings(const UnicodeString& A, const UnicodeString& B) const override;

 private:
  struct TItem {
    UnicodeString Text;
    TObject* Object = nullptr;
  };
  [[nodiscard]] std::size_t Slot(Integer AIndex) const;
  void CheckUnsorted() const;

  std::vector<TItem> FItems;
  bool FSorted = false;
  bool FCaseSensitive = false;
  TDuplicates FDuplicates = dupIgnore;
};

}  // namespace zq
