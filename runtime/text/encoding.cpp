#include "runtime/text/encoding.h"

#include <langinfo.h>
#include <unicode/ucnv.h>
#include <unicode/ucnv_cb.h>
#include <unicode/unorm2.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <clocale>
#include <cstring>
#include <limits>
#include <span>
#include <string>

#include "runtime/core/utf8.h"
#include "runtime/text/code_pages.h"
#include "runtime/text/numbers.h"
#include "runtime/text/page_table.h"
#include "runtime/text/shift_codecs.h"

namespace zq {

// --------------------------------------------------------------------------------------------- character data

namespace {

// HZ and UTF-7 are ours; of these only names come from their row's data.
constexpr bool HasCodec(const TCodePage& APage) noexcept {
  return APage.Kind == TPageKind::Hz || APage.Kind == TPageKind::Utf7;
}

// The page, if it has character data.
const TCodePage* ServedPage(Word ACodePage) noexcept {
  const TCodePage* const Page = FindCodePage(ActualCodePage(ACodePage));
  return Page != nullptr && Page->IsServed() ? Page : nullptr;
}

UConverter* OpenConverter(const TCodePage& APage) {
  UErrorCode Error = U_ZERO_ERROR;
  UConverter* const Result = ucnv_open(APage.Data.Name, &Error);
  return U_FAILURE(Error) ? nullptr : Result;
}

// Set when the thread's converters have ended: objects that end after them may convert still.
constinit thread_local bool ConvertersEnded = false;

// The threads' converters: opening one costs more than most conversions.
class TConverters {
 public:
  TConverters() = default;
  TConverters(const TConverters&) = delete;
  TConverters& operator=(const TConverters&) = delete;
  ~TConverters() {
    for (const TSlot& Slot : FSlots) ucnv_close(Slot.Converter);
    ConvertersEnded = true;
  }
  UConverter* Get(const TCodePage& APage) {
    for (const TSlot& Slot : FSlots)
      if (Slot.Page == &APage) {
        ucnv_reset(Slot.Converter);
        return Slot.Converter;
      }
    UConverter* const Result = OpenConverter(APage);
    if (Result == nullptr) return nullptr;
    TSlot& Slot = FSlots[FNext++ % FSlots.size()];
    ucnv_close(Slot.Converter);
    Slot = {&APage, Result};
    return Result;
  }

 private:
  struct TSlot {
    const TCodePage* Page = nullptr;
    UConverter* Converter = nullptr;
  };
  std::array<TSlot, 4> FSlots;
  std::size_t FNext = 0;
};

struct TGiveBack {
  bool Close;
  void operator()(UConverter* AConverter) const noexcept {
    if (Close) ucnv_close(AConverter);
  }
};

std::unique_ptr<UConverter, TGiveBack> ConverterOf(const TCodePage& APage) {
  if (ConvertersEnded) return {OpenConverter(APage), {.Close = true}};
  thread_local TConverters Converters;
  return {Converters.Get(APage), {.Close = false}};
}

// --------------------------------------------------------------------------------------------- conversion, both ways

constexpr int cFailed = -1;
constexpr int cMeets = -2;  // stopped at a character that may meet the one before it

int Refuse(Cardinal AReason) noexcept {
  SetLastError(AReason);
  return cFailed;
}

// Runs AStep over the destination and then over scratch space, as often as it takes; returns the units, which without a
// destination nobody keeps. A converter may ask for more room and then have nothing left to write.
template <class TUnit, class TStep>
int Pump(TUnit* ADest, int ACapacity, TStep AStep) {
  std::array<TUnit, 512> Scratch;
  TUnit* Begin = ADest == nullptr ? Scratch.data() : ADest;
  TUnit* End = ADest == nullptr ? Begin + Scratch.size() : Begin + ACapacity;
  const std::ptrdiff_t Limit = ADest == nullptr ? std::numeric_limits<int>::max() : ACapacity;
  for (std::ptrdiff_t Total = 0;;) {
    TUnit* At = Begin;
    UErrorCode Error = U_ZERO_ERROR;
    AStep(&At, End, &Error);
    Total += At - Begin;
    if (Total > Limit) return Refuse(ERROR_INSUFFICIENT_BUFFER);
    if (Error != U_BUFFER_OVERFLOW_ERROR)
      return U_FAILURE(Error) ? Refuse(ERROR_NO_UNICODE_TRANSLATION) : static_cast<int>(Total);
    Begin = Scratch.data();
    End = Begin + Scratch.size();
  }
}

// What shifts or quotes in one guarded page or another.
constexpr auto cGuarded = [] {
  std::array<bool, 0x80> Result{};
  for (unsigned i = 0; i < 0x20; ++i) Result[i] = i != 9 && i != 10 && i != 13;
  for (const char c : {'~', '\x7F'}) Result[static_cast<unsigned char>(c)] = true;
  return Result;
}();

// Length of the front of a text that is the same in ASCII.
template <class TUnit>
std::size_t PlainRun(const TCodePage& APage, const TUnit* AText, std::size_t ALength) noexcept {
  if (APage.Ascii == TAsciiUse::Foreign) return 0;
  const std::size_t Run = utf8::AsciiRun(AText, ALength);
  if (APage.Ascii != TAsciiUse::Guarded) return Run;
  const auto* const Guarded =
      std::find_if(AText, AText + Run, [](TUnit u) { return cGuarded[static_cast<unsigned char>(u)]; });
  return static_cast<std::size_t>(Guarded - AText);
}

// The codecs of UTF-8 are the fastest to copy ASCII.
char16_t* CopyPlain(const char* ASource, int ACount, char16_t* ADest) noexcept {
  return ADest + utf8::Decode(ASource, static_cast<std::size_t>(ACount), ADest);
}

char* CopyPlain(const char16_t* ASource, int ACount, char* ADest) noexcept {
  return ADest + utf8::Encode(ASource, static_cast<std::size_t>(ACount), ADest);
}

// Copies the plain run and has ARest convert what is behind it, into what is left of the destination. A short run isn't
// worth a step of its own.
template <class TFrom, class TTo, class TRest>
int AfterPlainRun(const TCodePage& APage, const TFrom* ASource, int ACount, TTo* ADest, int ACapacity, TRest ARest) {
  constexpr int cShort = 16;
  auto Run = static_cast<int>(PlainRun(APage, ASource, static_cast<std::size_t>(ACount)));
  if (Run < std::min(cShort, ACount)) Run = 0;
  if (ADest != nullptr && Run > 0) {
    if (Run > ACapacity) return Refuse(ERROR_INSUFFICIENT_BUFFER);
    ADest = CopyPlain(ASource, Run, ADest);
  }
  if (Run == ACount) return Run;
  const int Rest = ARest(ASource + Run, ACount - Run, ADest, ACapacity - Run);
  if (Rest > std::numeric_limits<int>::max() - Run) return Refuse(ERROR_INSUFFICIENT_BUFFER);
  return Rest < 0 ? Rest : Run + Rest;
}

// Bytes or units up to and with the zero that ends them.
template <class TUnit>
int TerminatedLength(const void* AText) noexcept {
  const char* const Text = static_cast<const char*>(AText);
  std::size_t i = 0;
  for (TUnit Unit = 1; Unit != 0; i += sizeof(TUnit)) std::memcpy(&Unit, Text + i, sizeof(TUnit));
  return static_cast<int>(std::min<std::size_t>(i, std::numeric_limits<int>::max()));
}

// Also makes a call with room for nothing a sizing call.
template <class TUnit>
bool ValidArguments(const void* ASource, int ACount, TUnit*& ADest, int ACapacity) noexcept {
  if (ACapacity == 0) ADest = nullptr;
  return ASource != nullptr && (ACount > 0 || ACount == -1) && ACapacity >= 0 && (ADest != nullptr || ACapacity == 0) &&
         ASource != ADest;
}

// What the services return: nothing written without a reason is a failure to them.
int Answer(int AResult) noexcept {
  if (AResult == 0) Refuse(ERROR_NO_UNICODE_TRANSLATION);
  return std::max(AResult, 0);
}

// --------------------------------------------------------------------------------------------- to UTF-16

void U_CALLCONV DecodeMalformed(const void* AStrict, UConverterToUnicodeArgs* AArgs, const char*, int32_t,
    UConverterCallbackReason AReason, UErrorCode* AError) {
  if (AReason > UCNV_IRREGULAR || *static_cast<const bool*>(AStrict)) return;
  constexpr UChar cReplacement = 0xFFFD;
  *AError = U_ZERO_ERROR;
  ucnv_cbToUWriteUChars(AArgs, &cReplacement, 1, 0, AError);
}

int DecodeByConverter(
    const TCodePage& APage, bool AStrict, const char* ASource, int ABytes, char16_t* ADest, int ADestChars) {
  const auto Converter = ConverterOf(APage);
  if (Converter == nullptr) return Refuse(ERROR_INVALID_PARAMETER);
  UErrorCode Error = U_ZERO_ERROR;
  ucnv_setToUCallBack(Converter.get(), DecodeMalformed, &AStrict, nullptr, nullptr, &Error);
  const char* const End = ASource + ABytes;
  const auto Step = [&](char16_t** AAt, const char16_t* ALimit, UErrorCode* AError) {
    ucnv_toUnicode(Converter.get(), AAt, ALimit, &ASource, End, nullptr, true, AError);
  };
  return Pump(ADest, ADestChars, Step);
}

int DecodeByTable(
    const TCodePage& APage, bool AStrict, const char* ASource, int ABytes, char16_t* ADest, int ADestChars) {
  TPageTable* const Table = TPageTable::Of(APage);
  if (Table == nullptr) return Refuse(ERROR_INVALID_PARAMETER);
  const auto Bytes = static_cast<std::size_t>(ABytes);
  bool Malformed = false;
  const bool Roomy = ADest != nullptr && ADestChars >= ABytes;
  const auto Needed = Roomy ? 0 : static_cast<int>(Table->Decode(ASource, Bytes, nullptr, Malformed));
  if (Needed > ADestChars && ADest != nullptr) return Refuse(ERROR_INSUFFICIENT_BUFFER);
  const int Result = ADest == nullptr ? Needed : static_cast<int>(Table->Decode(ASource, Bytes, ADest, Malformed));
  return AStrict && Malformed ? Refuse(ERROR_NO_UNICODE_TRANSLATION) : Result;
}

// AText is the result, for a destination that may be too small or none.
template <class TUnit>
int Deliver(std::basic_string_view<TUnit> AText, TUnit* ADest, int ACapacity) {
  const std::size_t Limit = ADest == nullptr ? std::numeric_limits<int>::max() : static_cast<std::size_t>(ACapacity);
  if (AText.size() > Limit) return Refuse(ERROR_INSUFFICIENT_BUFFER);
  if (ADest != nullptr) std::ranges::copy(AText, ADest);
  return static_cast<int>(AText.size());
}

int DecodeByCodec(const TCodePage& APage, bool AStrict, std::string_view ABytes, char16_t* ADest, int ADestChars) {
  bool Malformed = false;
  const std::u16string Text = APage.Kind == TPageKind::Hz ? DecodeHz(ABytes, Malformed) : DecodeUtf7(ABytes);
  if (AStrict && Malformed) return Refuse(ERROR_NO_UNICODE_TRANSLATION);
  return Deliver<char16_t>(Text, ADest, ADestChars);
}

// Escaped bytes are low surrogates, and only they come without a high one.
bool IsUtf8(std::string_view ABytes) {
  const std::u16string Text = utf8::Decode(ABytes, utf8::TMalformed::Escape);
  char16_t Previous = 0;
  for (const char16_t c : Text) {
    if ((c & 0xFC00U) == 0xDC00U && (Previous & 0xFC00U) != 0xD800U) return false;
    Previous = c;
  }
  return true;
}

int DecodeUtf8(bool AStrict, const char* ASource, int ABytes, char16_t* ADest, int ADestChars) {
  const auto Bytes = static_cast<std::size_t>(ABytes);
  if (AStrict && !IsUtf8({ASource, Bytes})) return Refuse(ERROR_NO_UNICODE_TRANSLATION);
  const bool Roomy = ADest != nullptr && ADestChars >= ABytes;
  const auto Needed = Roomy ? 0 : static_cast<int>(utf8::DecodedLength(ASource, Bytes));
  if (ADest == nullptr) return Needed;
  if (Needed > ADestChars) return Refuse(ERROR_INSUFFICIENT_BUFFER);
  return static_cast<int>(utf8::Decode(ASource, Bytes, ADest));
}

int DecodeText(const TCodePage& APage, bool AStrict, const char* ASource, int ABytes, char16_t* ADest, int ADestChars) {
  if (APage.Kind == TPageKind::Utf8) return DecodeUtf8(AStrict, ASource, ABytes, ADest, ADestChars);
  return AfterPlainRun(
      APage, ASource, ABytes, ADest, ADestChars, [&](const char* AFrom, int ACount, char16_t* ATo, int ACapacity) {
        if (APage.HasTable()) return DecodeByTable(APage, AStrict, AFrom, ACount, ATo, ACapacity);
        if (!HasCodec(APage)) return DecodeByConverter(APage, AStrict, AFrom, ACount, ATo, ACapacity);
        return DecodeByCodec(APage, AStrict, {AFrom, static_cast<std::size_t>(ACount)}, ATo, ACapacity);
      });
}

int BytesUpToZero(const TCodePage& APage, const char* ASource) noexcept {
  switch (APage.UnitSize()) {
    case 2: return TerminatedLength<char16_t>(ASource);
    case 4: return TerminatedLength<char32_t>(ASource);
    default: return TerminatedLength<char>(ASource);
  }
}

}  // namespace

int MultiByteToWideChar(
    Word ACodePage, Cardinal AFlags, const char* ASource, int ABytes, char16_t* ADest, int ADestChars) {
  constexpr Cardinal cKnown = 0x7U | MB_ERR_INVALID_CHARS;
  const TCodePage* const Page = ServedPage(ACodePage);
  if (Page == nullptr || !ValidArguments(ASource, ABytes, ADest, ADestChars))
    return Answer(Refuse(ERROR_INVALID_PARAMETER));
  const Cardinal Allowed = Page->TakesNoFlags() ? 0 : Page->Kind == TPageKind::Utf8 ? MB_ERR_INVALID_CHARS : cKnown;
  if ((AFlags & ~Allowed) != 0) return Answer(Refuse(ERROR_INVALID_FLAGS));
  const int Bytes = ABytes == -1 ? BytesUpToZero(*Page, ASource) : ABytes;
  return Answer(DecodeText(*Page, (AFlags & MB_ERR_INVALID_CHARS) != 0, ASource, Bytes, ADest, ADestChars));
}

// --------------------------------------------------------------------------------------------- from UTF-16

namespace {

// What stands in for a character that the page doesn't have.
struct TSubstitute {
  const char* Bytes = nullptr;  // zero-terminated; nullptr for the page's own
  char16_t Char = u'?';
  bool Strict = false;  // fail instead
  bool Used = false;
  [[nodiscard]] std::string_view View() const noexcept {  // of Bytes, of which an empty one is a byte 0
    return Bytes == nullptr ? std::string_view()
                            : std::string_view(Bytes, std::max<std::size_t>(std::strlen(Bytes), 1));
  }
};

void U_CALLCONV EncodeMissing(const void* AContext, UConverterFromUnicodeArgs* AArgs, const UChar*, int32_t, UChar32,
    UConverterCallbackReason AReason, UErrorCode* AError) {
  if (AReason > UCNV_IRREGULAR) return;
  auto& Substitute = *static_cast<TSubstitute*>(const_cast<void*>(AContext));
  if (Substitute.Strict) return;
  Substitute.Used = true;
  *AError = U_ZERO_ERROR;
  if (Substitute.Bytes != nullptr) {
    ucnv_cbFromUWriteBytes(AArgs, Substitute.Bytes, static_cast<int32_t>(Substitute.View().size()), 0, AError);
  } else {
    const UChar* At = &Substitute.Char;
    ucnv_cbFromUWriteUChars(AArgs, &At, At + 1, 0, AError);
  }
}

int EncodeByConverter(const TCodePage& APage, bool ABestFit, TSubstitute& ASubstitute, const char16_t* ASource,
    int AChars, char* ADest, int ADestBytes) {
  const auto Converter = ConverterOf(APage);
  if (Converter == nullptr) return Refuse(ERROR_INVALID_PARAMETER);
  UErrorCode Error = U_ZERO_ERROR;
  ucnv_setFallback(Converter.get(), ABestFit ? 1 : 0);
  ucnv_setFromUCallBack(Converter.get(), EncodeMissing, &ASubstitute, nullptr, nullptr, &Error);
  const char16_t* const End = ASource + AChars;
  const auto Step = [&](char** AAt, const char* ALimit, UErrorCode* AError) {
    ucnv_fromUnicode(Converter.get(), AAt, ALimit, &ASource, End, nullptr, true, AError);
  };
  return Pump(ADest, ADestBytes, Step);
}

int EncodeByTable(const TCodePage& APage, Cardinal AFlags, TSubstitute& ASubstitute, const char16_t* ASource,
    int AChars, char* ADest, int ADestBytes) {
  TPageTable* const Table = TPageTable::Of(APage);
  if (Table == nullptr) return Refuse(ERROR_INVALID_PARAMETER);
  TPageTable::TMissing Missing{.Bytes = ASubstitute.View(),
      .BestFit = (AFlags & WC_NO_BEST_FIT_CHARS) == 0,
      .Composes = (AFlags & WC_COMPOSITECHECK) != 0};
  const auto Chars = static_cast<std::size_t>(AChars);
  const std::size_t Most = Chars * std::max<std::size_t>(APage.BytesPerUnit, Missing.Bytes.size());
  const bool Roomy = ADest != nullptr && static_cast<std::size_t>(ADestBytes) >= Most;
  const std::size_t Needed = Roomy ? 0 : Table->Encode(ASource, Chars, nullptr, Missing);
  const std::size_t Room = ADest == nullptr ? std::numeric_limits<int>::max() : static_cast<std::size_t>(ADestBytes);
  if (Missing.Meets) return cMeets;
  if (Needed > Room) return Refuse(ERROR_INSUFFICIENT_BUFFER);
  const std::size_t Result = ADest == nullptr ? Needed : Table->Encode(ASource, Chars, ADest, Missing);
  if (Missing.Meets) return cMeets;
  ASubstitute.Used = ASubstitute.Used || Missing.Found;
  return static_cast<int>(Result);
}

int EncodeByCodec(const TCodePage& APage, bool ABestFit, TSubstitute& ASubstitute, std::u16string_view AText,
    char* ADest, int ADestBytes) {
  if (APage.Kind == TPageKind::Utf7) return Deliver<char>(EncodeUtf7(AText), ADest, ADestBytes);
  TPageTable::TMissing Missing{.Bytes = ASubstitute.View(), .BestFit = ABestFit};
  const std::string Bytes = EncodeHz(AText, Missing);
  ASubstitute.Used = ASubstitute.Used || Missing.Found;
  return Deliver<char>(Bytes, ADest, ADestBytes);
}

// The converter has half-width letters behind SO.
int EncodeWithEscapes(
    const TCodePage& APage, TSubstitute& ASubstitute, std::u16string_view AText, char* ADest, int ADestBytes) {
  const auto Chars = static_cast<int>(AText.size());
  const int Size = EncodeByConverter(APage, true, ASubstitute, AText.data(), Chars, nullptr, 0);
  if (Size == cFailed) return cFailed;
  std::string Bytes(static_cast<std::size_t>(Size), '\0');
  EncodeByConverter(APage, true, ASubstitute, AText.data(), Chars, Bytes.data(), Size);
  return Deliver<char>(EscapeHalfWidth(Bytes), ADest, ADestBytes);
}

bool PageHas(const TCodePage& APage, UChar32 AChar) {
  if (APage.HasTable()) {
    TPageTable* const Table = TPageTable::Of(APage);
    return Table != nullptr && Table->CodeOf(static_cast<char16_t>(AChar), false) != 0;
  }
  TSubstitute Substitute{.Strict = true};
  const std::u16string Text = AChar > 0xFFFF ? std::u16string{U16_LEAD(AChar), U16_TRAIL(AChar)}
                                             : std::u16string(1, static_cast<char16_t>(AChar));
  return EncodeByConverter(APage, false, Substitute, Text.data(), static_cast<int>(Text.size()), nullptr, 0) > 0;
}

const UNormalizer2* Composer() noexcept {
  UErrorCode Error = U_ZERO_ERROR;
  return unorm2_getNFCInstance(&Error);
}

// AText with each letter and the mark behind it as one character, where the page has that character.
std::u16string ComposeFor(const TCodePage& APage, std::u16string_view AText) {
  std::u16string Result;
  for (const char16_t c : AText) {
    const UChar32 Whole =
        Result.empty() || !TPageTable::MayMeet(c) ? U_SENTINEL : unorm2_composePair(Composer(), Result.back(), c);
    if (Whole > 0 && Whole <= 0xFFFF && PageHas(APage, Whole)) Result.back() = static_cast<char16_t>(Whole);
    else Result += c;
  }
  return Result;
}

bool HasLoneSurrogate(std::u16string_view AText) noexcept {
  for (std::size_t i = 0; i < AText.size(); ++i) {
    if ((AText[i] & 0xF800U) != 0xD800U) continue;
    const bool Pair = (AText[i] & 0xFC00U) == 0xD800U && i + 1 < AText.size() && (AText[i + 1] & 0xFC00U) == 0xDC00U;
    if (!Pair) return true;
    ++i;
  }
  return false;
}

int EncodeUtf8(const char16_t* ASource, int AChars, char* ADest, int ADestBytes) {
  const auto Chars = static_cast<std::size_t>(AChars);
  const bool Roomy = ADest != nullptr && static_cast<std::size_t>(ADestBytes) / 3 >= Chars;
  const std::size_t Needed = Roomy ? 0 : utf8::EncodedLength(ASource, Chars);
  if (Needed > std::numeric_limits<int>::max()) return Refuse(ERROR_INSUFFICIENT_BUFFER);
  if (ADest == nullptr) return static_cast<int>(Needed);
  if (static_cast<int>(Needed) > ADestBytes) return Refuse(ERROR_INSUFFICIENT_BUFFER);
  return static_cast<int>(utf8::Encode(ASource, Chars, ADest));
}

int EncodeText(const TCodePage& APage, Cardinal AFlags, TSubstitute& ASubstitute, const char16_t* ASource, int AChars,
    char* ADest, int ADestBytes) {
  const bool Strict = (AFlags & WC_ERR_INVALID_CHARS) != 0;
  if (Strict && HasLoneSurrogate({ASource, static_cast<std::size_t>(AChars)}))
    return Refuse(ERROR_NO_UNICODE_TRANSLATION);
  if (APage.Kind == TPageKind::Utf8) return EncodeUtf8(ASource, AChars, ADest, ADestBytes);
  const auto Rest = [&](const char16_t* AFrom, int ACount, char* ATo, int ACapacity) {
    const bool BestFit = (AFlags & WC_NO_BEST_FIT_CHARS) == 0;
    const std::u16string_view Text(AFrom, static_cast<std::size_t>(ACount));
    if (APage.HasTable()) return EncodeByTable(APage, AFlags, ASubstitute, AFrom, ACount, ATo, ACapacity);
    if (HasCodec(APage)) return EncodeByCodec(APage, BestFit, ASubstitute, Text, ATo, ACapacity);
    if (APage.Number == 50221) return EncodeWithEscapes(APage, ASubstitute, Text, ATo, ACapacity);
    return EncodeByConverter(APage, BestFit, ASubstitute, AFrom, ACount, ATo, ACapacity);
  };
  return AfterPlainRun(APage, ASource, AChars, ADest, ADestBytes, Rest);
}

Cardinal AllowedEncodeFlags(const TCodePage& APage) noexcept {
  constexpr Cardinal cAny = WC_DISCARDNS | WC_SEPCHARS | WC_DEFAULTCHAR | WC_COMPOSITECHECK | WC_NO_BEST_FIT_CHARS;
  if (APage.TakesNoFlags()) return 0;
  if (APage.Kind == TPageKind::Utf8) return WC_ERR_INVALID_CHARS;
  return APage.Kind == TPageKind::Gb18030 ? cAny | WC_ERR_INVALID_CHARS : cAny;
}

int Encode(Word ACodePage, Cardinal AFlags, const char16_t* ASource, int AChars, char* ADest, int ADestBytes,
    TSubstitute& ASubstitute) {
  const TCodePage* const Page = ServedPage(ACodePage);
  if (Page == nullptr || !ValidArguments(ASource, AChars, ADest, ADestBytes)) return Refuse(ERROR_INVALID_PARAMETER);
  if ((AFlags & ~AllowedEncodeFlags(*Page)) != 0) return Refuse(ERROR_INVALID_FLAGS);
  if (Page->IsUnicode()) ASubstitute.Char = 0xFFFD;
  const int Chars = AChars == -1 ? TerminatedLength<char16_t>(ASource) / 2 : AChars;
  const std::u16string_view Text(ASource, static_cast<std::size_t>(Chars));
  const bool Composes = (AFlags & WC_COMPOSITECHECK) != 0 && !Page->IsUnicode();
  const bool Meets = Composes && !Page->HasTable() && std::ranges::any_of(Text, TPageTable::MayMeet);
  const int Result = Meets ? cMeets : EncodeText(*Page, AFlags, ASubstitute, ASource, Chars, ADest, ADestBytes);
  if (Result != cMeets) return Result;
  const std::u16string Composed = ComposeFor(*Page, Text);
  return EncodeText(*Page, AFlags & ~WC_COMPOSITECHECK, ASubstitute, Composed.data(), static_cast<int>(Composed.size()),
      ADest, ADestBytes);
}

}  // namespace

int WideCharToMultiByte(
    Word ACodePage, Cardinal AFlags, const char16_t* ASource, int AChars, char* ADest, int ADestBytes) {
  TSubstitute Substitute;
  return Answer(Encode(ACodePage, AFlags, ASource, AChars, ADest, ADestBytes, Substitute));
}

int LocaleCharsFromUnicode(Word ACodePage, Cardinal AFlags, const char16_t* ASource, int AChars, char* ADest,
    int ADestBytes, const char* ADefaultChar, bool* AUsedDefault) {
  TSubstitute Substitute{.Bytes = ADefaultChar};
  const int Result = Answer(Encode(ACodePage, AFlags, ASource, AChars, ADest, ADestBytes, Substitute));
  if (AUsedDefault != nullptr) *AUsedDefault = Substitute.Used;
  return Result;
}

int NormalizeString(int AForm, const char16_t* ASource, int AChars, char16_t* ADest, int ADestChars) {
  using TForm = const UNormalizer2* (*)(UErrorCode*);
  constexpr TForm cForms[] = {nullptr, unorm2_getNFCInstance, unorm2_getNFDInstance, nullptr, nullptr,
      unorm2_getNFKCInstance, unorm2_getNFKDInstance};
  const bool Known = AForm > 0 && AForm < static_cast<int>(std::size(cForms)) && cForms[AForm] != nullptr;
  if (!Known || !ValidArguments(ASource, AChars, ADest, ADestChars)) return Answer(Refuse(ERROR_INVALID_PARAMETER));
  UErrorCode Error = U_ZERO_ERROR;
  const UNormalizer2* const Form = cForms[AForm](&Error);
  const int Chars = AChars == -1 ? TerminatedLength<char16_t>(ASource) / 2 : AChars;
  const int Result = unorm2_normalize(Form, ASource, Chars, ADest, ADestChars, &Error);
  if (Error == U_BUFFER_OVERFLOW_ERROR && ADest != nullptr) return Answer(Refuse(ERROR_INSUFFICIENT_BUFFER));
  if (U_FAILURE(Error) && Error != U_BUFFER_OVERFLOW_ERROR) return Answer(Refuse(ERROR_INVALID_PARAMETER));
  return Answer(Result);
}

// --------------------------------------------------------------------------------------------- ANSI code page

Word CodePageOfCharset(const char* ACharset) noexcept {
  constexpr Word cUtf8 = 65001;
  UErrorCode Error = U_ZERO_ERROR;
  const char* const Converter = ucnv_getAlias(ACharset, 0, &Error);
  if (U_FAILURE(Error) || Converter == nullptr || std::strcmp(Converter, "US-ASCII") == 0) return cUtf8;
  for (const TCodePage& Page : CodePages())
    if (Page.Data.Source == TCharacterData::ICU && std::strcmp(Page.Data.Name, Converter) == 0) return Page.Number;
  return cUtf8;
}

namespace {

constinit std::atomic<Word> AnsiCodePage{0};  // 0: not asked for yet

Word PageOfEnvironment() noexcept {
  const locale_t Locale = newlocale(LC_CTYPE_MASK, "", nullptr);
  if (Locale == nullptr) return 65001;
  const Word Result = CodePageOfCharset(nl_langinfo_l(CODESET, Locale));
  freelocale(Locale);
  return Result;
}

}  // namespace

Word GetACP() noexcept {
  if (const Word Known = AnsiCodePage.load(std::memory_order_relaxed); Known != 0) return Known;
  Word Expected = 0;
  const Word Found = PageOfEnvironment();
  return AnsiCodePage.compare_exchange_strong(Expected, Found) ? Found : Expected;
}

TAnsiCodePageScope::TAnsiCodePageScope(Word ACodePage) noexcept : FSaved(GetACP()) { AnsiCodePage = ACodePage; }

TAnsiCodePageScope::~TAnsiCodePageScope() { AnsiCodePage = FSaved; }

// --------------------------------------------------------------------------------------------- strings, TEncoding

namespace {

template <class TResult, class TConvert>
TResult SizedAndFilled(std::size_t ACount, TConvert AConvert) {
  TResult Result;
  if (ACount == 0) return Result;
  const bool Countable = ACount <= static_cast<std::size_t>(std::numeric_limits<int>::max());
  const int Size = Countable ? AConvert(nullptr, 0) : 0;
  if (!Countable || (Size == 0 && GetLastError() == ERROR_INSUFFICIENT_BUFFER))
    throw EEncodingError(u"The text is too long to be converted");
  Result.resize(static_cast<std::size_t>(Size));
  if (Size > 0) AConvert(Result.data(), Size);
  return Result;
}

std::u16string Widen(Word ACodePage, std::string_view ABytes) {
  return SizedAndFilled<std::u16string>(ABytes.size(), [&](char16_t* ADest, int ACapacity) {
    return MultiByteToWideChar(ACodePage, 0, ABytes.data(), static_cast<int>(ABytes.size()), ADest, ACapacity);
  });
}

std::string Narrow(Word ACodePage, std::u16string_view AText) {
  return SizedAndFilled<std::string>(AText.size(), [&](char* ADest, int ACapacity) {
    return WideCharToMultiByte(ACodePage, 0, AText.data(), static_cast<int>(AText.size()), ADest, ACapacity);
  });
}

const TCodePage& RequiredPage(Word ACodePage) {
  const TCodePage* const Page = ServedPage(ACodePage);
  if (Page != nullptr && (!Page->HasTable() || TPageTable::Of(*Page) != nullptr)) return *Page;
  throw EEncodingError(u"There is no character data for code page " + IntToStr(ACodePage));
}

template <Word ACodePage>
const TEncoding& ProcessEncoding() {
  static const TEncoding& Encoding = *new TEncoding(ACodePage);
  return Encoding;
}

}  // namespace

void SetCodePage(RawByteString& AString, Word ACodePage, bool AConvert) {
  if (AConvert && !AString.IsEmpty() && AString.CodePage() != ACodePage) {
    const std::u16string Text = Widen(AString.CodePage(), AString.View());
    std::string Bytes = Narrow(ACodePage, Text);
    if (Text.empty() || Bytes.empty()) RaiseLastOSError();
    AString = RawByteString(std::move(Bytes));
  }
  TagCodePage(AString, ACodePage);
}

const TEncoding& TEncoding::UTF8() { return ProcessEncoding<65001>(); }
const TEncoding& TEncoding::UTF7() { return ProcessEncoding<65000>(); }
const TEncoding& TEncoding::Unicode() { return ProcessEncoding<1200>(); }
const TEncoding& TEncoding::BigEndianUnicode() { return ProcessEncoding<1201>(); }
const TEncoding& TEncoding::ANSI() { return ProcessEncoding<0>(); }
const TEncoding& TEncoding::ASCII() { return ProcessEncoding<20127>(); }

std::unique_ptr<TEncoding> TEncoding::GetEncoding(Word ACodePage) {
  RequiredPage(ACodePage);
  return std::make_unique<TEncoding>(ACodePage);
}

UnicodeString TEncoding::GetEncodingName() const { return IntToStr(GetCodePage()) + u" (" + GetMIMEName() + u")"; }

UnicodeString TEncoding::GetMIMEName() const {
  const TCodePage& Page = RequiredPage(FCodePage);
  if (Page.Data.Source != TCharacterData::ICU) return Page.Name();
  for (const char* const Standard : {"MIME", "IANA"}) {
    UErrorCode Error = U_ZERO_ERROR;
    if (const char* const Name = ucnv_getStandardName(Page.Data.Name, Standard, &Error))
      return UnicodeString::FromUTF8(Name);
  }
  return u"cp" + IntToStr(Page.Number);
}

TBytes TEncoding::GetPreamble() const {
  const TCodePage* const Page = FindCodePage(GetCodePage());
  return Page == nullptr ? TBytes() : TBytes(Page->Mark.begin(), Page->Mark.end());
}

TBytes TEncoding::GetBytes(const UnicodeString& AText) const {
  const std::string Bytes = Narrow(RequiredPage(FCodePage).Number, AText);
  return {Bytes.begin(), Bytes.end()};
}

UnicodeString TEncoding::GetString(const void* ABytes, std::size_t ACount) const {
  return Widen(RequiredPage(FCodePage).Number, {static_cast<const char*>(ABytes), ACount});
}

UnicodeString TEncoding::GetString(const TBytes& ABytes) const { return GetString(ABytes.data(), ABytes.size()); }

}  // namespace zq
