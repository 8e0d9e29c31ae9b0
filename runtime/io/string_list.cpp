#include "runtime/io/string_list.h"

#include <algorithm>
#include <compare>
#include <numeric>

#include "runtime/containers/lists.h"
#include "runtime/io/streams.h"
#include "runtime/text/casing.h"
#include "runtime/text/encoding.h"

namespace zq {

namespace {

constexpr std::u16string_view cLineEnd = u"\r\n";

Integer Sign(std::strong_ordering AOrder) noexcept { return std::is_lt(AOrder) ? -1 : std::is_gt(AOrder) ? 1 : 0; }

constexpr char16_t LowerAscii(char16_t AChar) noexcept {
  return AChar >= u'A' && AChar <= u'Z' ? static_cast<char16_t>(AChar + 32) : AChar;
}

// Orders by the lower-case forms, which are made only of what follows a common start in ASCII.
Integer CompareLowered(std::u16string_view A, std::u16string_view B) {
  while (!A.empty() && !B.empty() && A.front() < 128 && B.front() < 128) {
    const Integer Difference = LowerAscii(A.front()) - LowerAscii(B.front());
    if (Difference != 0) return Difference;
    A.remove_prefix(1);
    B.remove_prefix(1);
  }
  return Sign(AnsiLowerCase(A) <=> AnsiLowerCase(B));
}

TBytes ReadToEnd(TStream& AStream) {
  constexpr Integer Step = 0x10000;
  TBytes Result;
  for (Integer Got = Step; Got > 0;) {
    const std::size_t Known = Result.size();
    Result.resize(Known + Step);
    Got = AStream.Read(Result.data() + Known, Step);
    Result.resize(Known + static_cast<std::size_t>(std::max(Got, 0)));
  }
  return Result;
}

bool BeginsWithMark(const TBytes& ABytes, const TEncoding& AEncoding) {
  const TBytes Mark = AEncoding.GetPreamble();
  return !Mark.empty() && Mark.size() <= ABytes.size() && std::equal(Mark.begin(), Mark.end(), ABytes.begin());
}

const TEncoding& EncodingByMark(const TBytes& ABytes) {
  for (const TEncoding* const Encoding : {&TEncoding::UTF8(), &TEncoding::Unicode(), &TEncoding::BigEndianUnicode()})
    if (BeginsWithMark(ABytes, *Encoding)) return *Encoding;
  return TEncoding::Default();
}

void WriteBytes(TStream& AStream, const TBytes& ABytes) {
  AStream.WriteBuffer(ABytes.data(), static_cast<Int64>(ABytes.size()));
}

}  // namespace

// ---- TStrings ------------------------------------------------------------------------------------------------------

Integer TStrings::AddObject(const UnicodeString& AText, TObject* AObject) {
  InsertObject(Count(), AText, AObject);
  return Count() - 1;
}

Integer TStrings::IndexOf(const UnicodeString& AText) const {
  for (Integer i = 0; i < Count(); ++i)
    if (CompareStrings(Strings(i), AText) == 0) return i;
  return -1;
}

void TStrings::AddStrings(const TStrings& AStrings) {
  if (&AStrings == this) {
    TStringList Copy;
    Copy.AddStrings(AStrings);
    return AddStrings(Copy);
  }
  for (Integer i = 0; i < AStrings.Count(); ++i) AddObject(UnicodeString(AStrings.Strings(i)), AStrings.Objects(i));
}

void TStrings::Assign(const TPersistent* ASource) {
  const auto* const Source = dynamic_cast<const TStrings*>(ASource);
  if (Source == nullptr) return TPersistent::Assign(ASource);
  if (Source == this) return;
  Clear();
  FDelimiter = Source->FDelimiter;
  AddStrings(*Source);
}

Integer TStrings::CompareStrings(const UnicodeString& A, const UnicodeString& B) const { return CompareLowered(A, B); }

Integer TStrings::IndexOfName(const UnicodeString& AName) const {
  for (Integer i = 0; i < Count(); ++i)
    if (Strings(i).Pos(u"=") != 0 && CompareStrings(Names(i), AName) == 0) return i;
  return -1;
}

UnicodeString TStrings::Names(Integer AIndex) const {
  const UnicodeString& Line = Strings(AIndex);
  return Line.Copy(1, Line.Pos(u"=") - 1);
}

UnicodeString TStrings::Values(const UnicodeString& AName) const {
  const Integer Found = IndexOfName(AName);
  if (Found < 0) return {};
  const UnicodeString& Line = Strings(Found);
  return Line.Copy(Line.Pos(u"=") + 1, Line.Length());
}

void TStrings::SetValues(const UnicodeString& AName, const UnicodeString& AValue) {
  const Integer Found = IndexOfName(AName);
  const UnicodeString Line = AName + u"=" + AValue;
  if (AValue.IsEmpty() && Found >= 0) Delete(Found);
  if (AValue.IsEmpty()) return;
  if (Found >= 0) SetStrings(Found, Line);
  else Add(Line);
}

UnicodeString TStrings::Text() const {
  UnicodeString Result;
  for (const UnicodeString& Line : *this) Result.Append(Line).Append(cLineEnd);
  return Result;
}

void TStrings::SetText(const UnicodeString& AText) {
  const UnicodeString Kept(AText.View());  // AText may be one of the strings
  Clear();
  for (std::u16string_view Rest = Kept; !Rest.empty();) {
    const std::size_t Length = std::min(Rest.find_first_of(cLineEnd), Rest.size());
    Add(Rest.substr(0, Length));
    Rest.remove_prefix(Length);
    Rest.remove_prefix(Rest.starts_with(cLineEnd) ? 2 : Rest.empty() ? 0 : 1);
  }
}

void TStrings::SetBytes(const TBytes& ABytes, const TEncoding& AEncoding) {
  const std::size_t Mark = BeginsWithMark(ABytes, AEncoding) ? AEncoding.GetPreamble().size() : 0;
  SetText(AEncoding.GetString(ABytes.data() + Mark, ABytes.size() - Mark));
}

void TStrings::LoadFromFile(const UnicodeString& AFileName) {
  TFileStream File(AFileName, fmOpenRead | fmShareDenyWrite);
  LoadFromStream(File);
}

void TStrings::LoadFromFile(const UnicodeString& AFileName, const TEncoding& AEncoding) {
  TFileStream File(AFileName, fmOpenRead | fmShareDenyWrite);
  LoadFromStream(File, AEncoding);
}

void TStrings::LoadFromStream(TStream& AStream) {
  const TBytes Bytes = ReadToEnd(AStream);
  SetBytes(Bytes, EncodingByMark(Bytes));
}

void TStrings::LoadFromStream(TStream& AStream, const TEncoding& AEncoding) { SetBytes(ReadToEnd(AStream), AEncoding); }

void TStrings::SaveToFile(const UnicodeString& AFileName) const {
  TFileStream File(AFileName, fmCreate);
  SaveToStream(File);
}

void TStrings::SaveToFile(const UnicodeString& AFileName, const TEncoding& AEncoding) const {
  TFileStream File(AFileName, fmCreate);
  SaveToStream(File, AEncoding);
}

void TStrings::SaveToStream(TStream& AStream) const { WriteBytes(AStream, TEncoding::Default().GetBytes(Text())); }

void TStrings::SaveToStream(TStream& AStream, const TEncoding& AEncoding) const {
  WriteBytes(AStream, AEncoding.GetPreamble());
  WriteBytes(AStream, AEncoding.GetBytes(Text()));
}

// ---- TStringList ---------------------------------------------------------------------------------------------------

std::size_t TStringList::Slot(Integer AIndex) const {
  if (AIndex < 0 || AIndex >= Count()) ListIndexError(AIndex);
  return static_cast<std::size_t>(AIndex);
}

void TStringList::CheckUnsorted() const {
  if (FSorted) throw EStringListError(u"A sorted string list finds the place of each string itself");
}

Integer TStringList::CompareStrings(const UnicodeString& A, const UnicodeString& B) const {
  return FCaseSensitive ? Sign(A <=> B) : TStrings::CompareStrings(A, B);
}

void TStringList::SetSorted(bool AValue) {
  if (AValue && !FSorted) Sort();
  FSorted = AValue;
}

void TStringList::SetCaseSensitive(bool AValue) {
  FCaseSensitive = AValue;
  if (FSorted) Sort();
}

void TStringList::Sort() {
  std::stable_sort(FItems.begin(), FItems.end(),
      [this](const TItem& A, const TItem& B) { return CompareStrings(A.Text, B.Text) < 0; });
}

void TStringList::CustomSort(const TSortCompare& ACompare) {
  CheckUnsorted();
  std::vector<Integer> Order(FItems.size());
  std::iota(Order.begin(), Order.end(), 0);
  std::stable_sort(Order.begin(), Order.end(), [&](Integer A, Integer B) { return ACompare(*this, A, B) < 0; });
  std::vector<TItem> Items;
  Items.reserve(FItems.size());
  for (const Integer Index : Order) Items.push_back(std::move(FItems[static_cast<std::size_t>(Index)]));
  FItems = std::move(Items);
}

bool TStringList::Find(const UnicodeString& AText, Integer& AIndex) const {
  const auto Found = std::lower_bound(FItems.begin(), FItems.end(), AText,
      [this](const TItem& Item, const UnicodeString& Text) { return CompareStrings(Item.Text, Text) < 0; });
  AIndex = static_cast<Integer>(Found - FItems.begin());
  return Found != FItems.end() && CompareStrings(Found->Text, AText) == 0;
}

Integer TStringList::IndexOf(const UnicodeString& AText) const {
  if (!FSorted) return TStrings::IndexOf(AText);
  Integer Result = -1;
  return Find(AText, Result) ? Result : -1;
}

Integer TStringList::AddObject(const UnicodeString& AText, TObject* AObject) {
  Integer Result = Count();
  if (FSorted && Find(AText, Result)) {
    if (FDuplicates == dupIgnore) return Result;
    if (FDuplicates == dupError) throw EStringListError(u"The string list allows no duplicates");
  }
  FItems.insert(FItems.begin() + Result, {AText, AObject});
  return Result;
}

void TStringList::InsertObject(Integer AIndex, const UnicodeString& AText, TObject* AObject) {
  CheckUnsorted();
  if (AIndex < 0 || AIndex > Count()) ListIndexError(AIndex);
  FItems.insert(FItems.begin() + AIndex, {AText, AObject});
}

void TStringList::SetStrings(Integer AIndex, const UnicodeString& AText) {
  CheckUnsorted();
  FItems[Slot(AIndex)].Text = AText;
}

void TStringList::Delete(Integer AIndex) { FItems.erase(FItems.begin() + static_cast<Integer>(Slot(AIndex))); }

}  // namespace zq
