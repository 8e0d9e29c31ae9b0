#include "common/uZqClasses/text_streams.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <limits>
#include <memory>

#include "common/uZqTypes.h"
#include "runtime/core/utf8.h"
#include "runtime/io/files.h"

namespace zq {

namespace {

constexpr Word cUtf16 = 1200;
constexpr Word cUtf16BE = 1201;
constexpr Word cUtf8 = 65001;

Word MaxCharSize(Word ACodePage) noexcept {
  constexpr Word cOfUtf8 = 6;
  const TCodePage* const Page = FindCodePage(ActualCodePage(ACodePage));
  return Page == nullptr || !Page->IsServed() ? 1 : Page->Kind == TPageKind::Utf8 ? cOfUtf8 : Page->BytesPerUnit;
}

// By itself: a conversion refuses half a pair.
Char BigEndianUnit(const Byte* ABytes) noexcept { return static_cast<Char>(ABytes[0] << 8U | ABytes[1]); }

bool IsAligned(const void* AUnits) noexcept { return reinterpret_cast<std::uintptr_t>(AUnits) % alignof(Char) == 0; }

Integer Countable(NativeUInt ACount) {
  Assert(ACount <= static_cast<NativeUInt>(std::numeric_limits<Integer>::max()));
  return static_cast<Integer>(ACount);
}

// The code page of what is behind AStream's position, which is left behind a mark.
Word SettleCodePage(TStream& AStream, bool AReadBOM, Integer AStreamCodePage) {
  Assert(AStreamCodePage >= -1 && AStreamCodePage <= std::numeric_limits<Word>::max());
  const Word Detected = AReadBOM ? ZqGetCodePage(&AStream) : Word{0};
  if (Detected != 0 && AStreamCodePage >= 0 && AStreamCodePage != Detected)
    throw Exception(u"The specified encoding does not match the BOM of the stream!");
  return AStreamCodePage >= 0 ? static_cast<Word>(AStreamCodePage) : Detected;
}

void WriteMark(TStream& AStream, Word ACodePage) {
  if (const TCodePage* const Page = FindCodePage(ACodePage))
    AStream.WriteBuffer(Page->Mark.data(), static_cast<Int64>(Page->Mark.size()));
}

}  // namespace

// --------------------------------------------------------------------------------------------------- String stream

TZqStringStream::TZqStringStream(Word ACodePage, NativeUInt ABlockSize) : TZqMemoryStream(ABlockSize) {
  SetCodePage(ACodePage);
}

TZqStringStream::TZqStringStream(std::string_view ABytes, Word ACodePage) : TZqStringStream(ACodePage) {
  WriteAll(ABytes.data(), ABytes.size());
  SetPosition(0);
}

TZqStringStream::TZqStringStream(TWrapped AWrapped, void* ABuffer, Integer ABufSize, Word ACodePage)
    : TZqMemoryStream(AWrapped, nullptr, 0) {
  Rewrap(ABuffer, ABufSize, ACodePage);
}

TZqStringStream TZqStringStream::CreateEx(const AnsiString& AValue, Word ACodePage) {
  return TZqStringStream(AValue.View(), ACodePage);
}

TZqStringStream TZqStringStream::CreateEx(const UnicodeString& AValue) {
  return TZqStringStream({reinterpret_cast<const char*>(AValue.data()), 2 * AValue.size()}, cUtf16);
}

TZqStringStream TZqStringStream::CreateEx(const UTF8String& AValue) { return TZqStringStream(AValue.View(), cUtf8); }

TZqStringStream TZqStringStream::WrapBuffer(void* ABuffer, Integer ABufSize, Word ACodePage) {
  return TZqStringStream(TWrapped{}, ABuffer, ABufSize, ACodePage);
}

void TZqStringStream::Rewrap(void* ABuffer, Integer ABufSize, Word ACodePage) {
  Assert(ABufSize >= 0);
  Wrap(ABuffer, static_cast<NativeUInt>(ABufSize));
  SetCodePage(ACodePage);
}

bool TZqStringStream::IsWide() const noexcept { return FCodePage == cUtf16; }

void TZqStringStream::SetCodePage(Word ACodePage) noexcept {
  FCodePage = ACodePage;
  FCodePageMaxCharSize = MaxCharSize(ACodePage);
}

void TZqStringStream::ChangeCodePage(Word ANewCodePage, bool AUpdateContent) {
  if (ANewCodePage == FCodePage) return;
  if (ContentSize() == 0) return SetCodePage(ANewCodePage);
  if (!AUpdateContent) {
    if (IsWide() || ANewCodePage == cUtf16)
      throw Exception(u"The current codepage cannot be changed without updating the content!");
    return SetCodePage(ANewCodePage);
  }
  if (!OwnsBlock())
    throw Exception(u"Updating the content is not allowed (the stream is probably using a wrapped buffer)!");
  // All that may fail comes before the content goes.
  const UnicodeString Text = AsString();
  const RawByteString Bytes = ANewCodePage == cUtf16 ? RawByteString() : TZqEncoding::ConvertW(Text, ANewCodePage);
  Clear();
  SetCodePage(ANewCodePage);
  if (IsWide()) Add(Text);
  else WriteAll(Bytes.data(), Bytes.size());
}

UnicodeString TZqStringStream::AsString() const { return TZqEncoding::ConvertB(Buffer(), ContentSize(), FCodePage); }

AnsiString TZqStringStream::AsAnsiString() const { return AnsiString(std::move(StringData(0).Str())); }

UTF8String TZqStringStream::AsUTF8() const { return UTF8String(std::move(StringData(cUtf8).Str())); }

RawByteString TZqStringStream::StringData(Word ACodePage) const {
  return TZqEncoding::ConvertB(Buffer(), ContentSize(), FCodePage, ACodePage);
}

NativeUInt TZqStringStream::CharCnt() const {
  if (IsWide()) return ContentSize() / 2;
  if (FCodePageMaxCharSize == 1) return ContentSize();
  const auto* const Bytes = static_cast<const Byte*>(Buffer());
  return static_cast<NativeUInt>(TZqEncoding::ConvertA(Bytes, Countable(ContentSize()), FCodePage, nullptr, 0));
}

void TZqStringStream::SetAsString(const UnicodeString& AValue) {
  Clear();
  Write(AValue);
  SetPosition(0);
}

void TZqStringStream::SetAsAnsiString(const AnsiString& AValue) {
  Clear();
  Write(AValue);
  SetPosition(0);
}

void TZqStringStream::SetAsUTF8(const UTF8String& AValue) {
  Clear();
  if (FCodePage == cUtf8) WriteAll(AValue.data(), AValue.size());
  else Write(TZqEncoding::ConvertA(AValue, cUtf8));
  SetPosition(0);
}

void TZqStringStream::SetValue(const Variant& AValue) {
  if (!VarIsStr(AValue)) throw Exception(uZqClasses::_SUnsupportedType, {AValue.Type()});
  if (AValue.Type() != varString) return SetAsString(VarToUStr(AValue));
  const RawByteString Bytes = VarToBytes(AValue);
  SetAsString(TZqEncoding::ConvertA(Bytes, Bytes.CodePage()));
}

// ---- Writing

void TZqStringStream::WriteText(std::u16string_view AText) {
  constexpr NativeUInt cShort = 64;
  if (AText.empty()) return;
  if (IsWide()) return WriteAll(AText.data(), 2 * AText.size());
  if (AText.size() <= cShort) {
    Byte Room[4 * cShort];
    const auto Length = static_cast<Integer>(AText.size());
    const Integer Count = TZqEncoding::ConvertW(AText.data(), Length, Room, sizeof(Room), FCodePage);
    if (Count > 0) return WriteAll(Room, static_cast<NativeUInt>(Count));
  }
  const RawByteString Bytes = TZqEncoding::ConvertW(AText.data(), Countable(AText.size()), FCodePage);
  WriteAll(Bytes.data(), Bytes.size());
}

void TZqStringStream::Write(const UnicodeString& AString) { WriteText(AString); }

void TZqStringStream::Write(const AnsiString& AString) {
  if (FCodePage == 0) WriteAll(AString.data(), AString.size());
  else Write(TZqEncoding::ConvertA(AString));
}

void TZqStringStream::WriteChar(Char AChar) { WriteText({&AChar, 1}); }

void TZqStringStream::WriteChar(AnsiChar AChar) {
  if (FCodePage == 0) return WriteAll(&AChar, 1);
  Char Unit = 0;
  if (TZqEncoding::ConvertA(reinterpret_cast<const Byte*>(&AChar), 1, 0, &Unit, 1) == 0) RaiseLastOSError();
  WriteChar(Unit);
}

void TZqStringStream::Add(const UnicodeString& AString) {
  if (AString.IsEmpty()) return;
  Write(AString);
  SeekEnd();
}

void TZqStringStream::Add(const RawByteString& AString, Word ACodePage) {
  if (ACodePage != FCodePage) return Add(TZqEncoding::ConvertA(AString, ACodePage));
  if (AString.IsEmpty()) return;
  WriteAll(AString.data(), AString.size());
  SeekEnd();
}

void TZqStringStream::Add(const TZqStringStream& AStringStream) {
  if (AStringStream.FCodePage == 0) Add(AStringStream.AsAnsiString(), 0);
  else Add(AStringStream.AsString());
}

void TZqStringStream::AddChar(Char AChar) {
  SeekEnd();
  WriteChar(AChar);
  SeekEnd();
}

void TZqStringStream::AddChar(AnsiChar AChar) {
  SeekEnd();
  WriteChar(AChar);
  SeekEnd();
}

// ---- Reading

void TZqStringStream::Skip(NativeUInt ACount) noexcept { IncCurPos(std::min(ACount, BytesLeft())); }

// What AText takes in the code page: bytes behind it that were converted with it stay.
void TZqStringStream::SkipText(std::u16string_view AText) noexcept {
  if (FCodePageMaxCharSize == 1) return Skip(AText.size());
  const Integer Size = TZqEncoding::ConvertW(AText.data(), static_cast<Integer>(AText.size()), nullptr, 0, FCodePage);
  Skip(static_cast<NativeUInt>(std::max(Size, 1)));
}

// The second unit of a character of four bytes, at the last of them: the first was read, and its size as text of its
// own is 3. 0 elsewhere.
Char TZqStringStream::SecondUnit() const noexcept {
  const Byte* const At = CurPos();
  const bool CanBe =
      ActualCodePage(FCodePage) == cUtf8 && BytesLeft() > 0 && At - static_cast<const Byte*>(Buffer()) >= 3;
  if (!CanBe || (At[0] & 0xC0U) != 0x80 || At[-3] < 0xF0) return 0;
  std::array<Char, 4> Units{};
  const std::size_t Count = utf8::Decode(reinterpret_cast<const char*>(At - 3), 4, Units.data());
  return Count == 2 ? Units[1] : Char{0};
}

// The span may end within a character: some pages refuse it then, and a shorter one gives the same unit.
Char TZqStringStream::PeekUnit() const {
  if (FCodePage == cUtf16BE && BytesLeft() > 1) return BigEndianUnit(CurPos());
  std::array<Char, 8> Units{};
  const NativeUInt Longest = std::min<NativeUInt>(BytesLeft(), FCodePageMaxCharSize);
  for (NativeUInt Span = Longest; Span > 0; --Span)
    if (TZqEncoding::ConvertA(CurPos(), static_cast<Integer>(Span), FCodePage, Units.data(), Units.size()) > 0)
      return Units[0];
  RaiseLastOSError();
}

Char TZqStringStream::ReadWChar() {
  Char Result = cZqEOFW;
  if (BytesLeft() == 0) return Result;
  if (IsWide()) {
    Read(&Result, sizeof(Result));
  } else if (Result = SecondUnit(); Result != 0) {
    Skip(1);
  } else {
    Result = PeekUnit();
    SkipText({&Result, 1});
  }
  return Result;
}

AnsiChar TZqStringStream::ReadAChar() {
  AnsiChar Result = cZqEOFA;
  if (BytesLeft() == 0) return Result;
  if (FCodePage == 0) {
    Read(&Result, sizeof(Result));
    return Result;
  }
  const Char Unit = ReadWChar();
  std::array<Byte, 8> Bytes{};
  const Integer Count = TZqEncoding::ConvertW(&Unit, 1, Bytes.data(), Bytes.size(), 0);
  return Count == 1 ? static_cast<AnsiChar>(Bytes[0]) : '?';
}

// At most ALength units of what is behind the position, which isn't moved.
UnicodeString TZqStringStream::PeekText(NativeUInt ALength) const {
  const NativeUInt Left = BytesLeft();
  if (FCodePage == cUtf16BE) {
    std::u16string Units(static_cast<std::size_t>(Countable(std::min(ALength, Left / 2))), u'\0');
    for (std::size_t i = 0; i < Units.size(); ++i) Units[i] = BigEndianUnit(CurPos() + 2 * i);
    return Units;
  }
  const NativeUInt Span = ALength > Left / FCodePageMaxCharSize ? Left : ALength * FCodePageMaxCharSize;
  NativeUInt Count = Span;
  const auto EndsWithin = [&] {  // a character: some pages refuse that
    return TZqEncoding::ConvertA(CurPos(), Countable(Count), FCodePage, nullptr, 0) == 0;
  };
  if (Span < Left && FCodePageMaxCharSize > 1)
    while (Count > 1 && Span - Count < FCodePageMaxCharSize && EndsWithin()) --Count;
  UnicodeString Result = TZqEncoding::ConvertB(CurPos(), Count, FCodePage);
  if (Result.size() > ALength) Result.Str().resize(ALength);
  return Result;
}

UnicodeString TZqStringStream::ReadString(Integer ALength) {
  return ReadWString(static_cast<NativeUInt>(std::max(ALength, 0)));
}

UnicodeString TZqStringStream::ReadWString(NativeUInt ALength) {
  UnicodeString Result;
  if (BytesLeft() == 0 || ALength == 0) return Result;
  if (IsWide()) {
    const NativeUInt Count = ALength > BytesLeft() / 2 ? BytesLeft() : 2 * ALength;
    const void* const At = CurPos();
    if (IsAligned(At))
      Result = UnicodeString(static_cast<const Char*>(At), static_cast<std::size_t>(Countable(Count / 2)));
    else Result = TZqEncoding::ConvertB(At, Count, FCodePage);
    Skip(Count);
  } else if (const Char Second = SecondUnit(); Second != 0) {
    Skip(1);
    Result = UnicodeString(Second) + ReadWString(ALength - 1);
  } else {
    Result = PeekText(ALength);
    SkipText(Result);
  }
  return Result;
}

AnsiString TZqStringStream::ReadAString(NativeUInt ALength) {
  if (FCodePage != 0) return AnsiString(TZqEncoding::ConvertW(ReadWString(ALength), 0));
  const NativeUInt Count = std::min(ALength, BytesLeft());
  AnsiString Result(std::string_view(reinterpret_cast<const char*>(CurPos()), Count));
  Skip(Count);
  return Result;
}

// ---- Transfer

// In the steps of CopyFrom, and out of memory without a copy between.
void TZqStringStream::CopyBytes(TStream& ASource, Int64 ACount) {
  constexpr Int64 cStep = 0x100000;
  if (ACount <= 0) return;
  const Int64 End = ASource.Position() + ACount;
  if (dynamic_cast<TZqMemoryStream*>(&ASource) == nullptr && dynamic_cast<TMemoryStream*>(&ASource) == nullptr) {
    CopyFrom(ASource, ACount, cStep);
    return;
  }
  const TZqReadBuf Source(&ASource);
  for (Int64 At = 0; At < ACount; At += cStep)
    Write(static_cast<const Byte*>(Source.Data()) + At, static_cast<Integer>(std::min(cStep, ACount - At)));
  ASource.SetPosition(End);
}

void TZqStringStream::Assign(TZqStringStream& ASource) {
  if (&ASource == this) return;
  Clear();
  ChangeCodePage(ASource.FCodePage, false);
  const Int64 Position = ASource.Position();
  ASource.SetPosition(0);
  CopyBytes(ASource, ASource.Size());
  ASource.SetPosition(Position);
  SetPosition(Position);
}

void TZqStringStream::LoadFromStream(
    TStream* AStream, bool AStreamOwner, bool AResetStreamPos, bool AReadBOM, Integer AStreamCodePage) {
  Assert(AStream != nullptr && AStream != this);
  const std::unique_ptr<TStream> Owned(AStreamOwner ? AStream : nullptr);
  const Int64 Start = AStream->Position();
  if (AResetStreamPos) AStream->SetPosition(0);
  const Word Source = SettleCodePage(*AStream, AReadBOM, AStreamCodePage);
  if (Source == FCodePage && (FCodePage == 0 || IsWide()))
    return CopyBytes(*AStream, AStream->Size() - AStream->Position());
  AStream->SetPosition(Start);
  Add(ZqStreamToWideString(AStream, false, AResetStreamPos, AReadBOM, AStreamCodePage));
}

void TZqStringStream::LoadFromFile(const UnicodeString& AFilename, Integer AStreamCodePage) {
  if (!FileExists(AFilename)) throw EFOpenError(uZqClasses::_SFileNotFound, {AFilename});
  TFileStream File(AFilename, fmOpenRead | fmShareDenyNone);
  LoadFromStream(&File, false, false, true, AStreamCodePage);
}

void TZqStringStream::SaveToStream(TStream& AStream, Word ACodePage, bool AWritePrefix) const {
  if (AWritePrefix) WriteMark(AStream, ACodePage);
  if (ACodePage == FCodePage && (FCodePage == 0 || IsWide()))
    return AStream.WriteBuffer(Buffer(), static_cast<Int64>(ContentSize()));
  const UnicodeString Text = AsString();
  if (ACodePage == cUtf16) return AStream.WriteBuffer(Text.data(), 2 * static_cast<Int64>(Text.size()));
  const RawByteString Bytes = TZqEncoding::ConvertW(Text, ACodePage);
  AStream.WriteBuffer(Bytes.data(), static_cast<Int64>(Bytes.size()));
}

void TZqStringStream::SaveToFile(const UnicodeString& AFilename, Word ACodePage, bool AWritePrefix) const {
  TFileStream File(AFilename, fmCreate);
  SaveToStream(File, ACodePage, AWritePrefix);
}

// --------------------------------------------------------------------------------------------------- UTF-8 adapter

TZqUTF8StreamAdapter::TZqUTF8StreamAdapter(TStream* AWrappedStream, bool AStreamOwner, bool AWriteUTF8Prefix)
    : FWrappedStream(AWrappedStream), FStreamOwner(AStreamOwner), FWriteUTF8Prefix(AWriteUTF8Prefix) {
  Assert(AWrappedStream != nullptr);
}

TZqUTF8StreamAdapter::~TZqUTF8StreamAdapter() {
  if (FStreamOwner) delete FWrappedStream;
}

// False at the end of the stream. The bytes behind the first one are not checked to go on with its character.
bool TZqUTF8StreamAdapter::NextUnit(Char& AUnit) {
  const auto Next = [&](Cardinal& AByte) {
    Byte Read = 0;
    const bool Came = FWrappedStream->Read(&Read, 1) == 1;
    AByte = Read;
    return Came;
  };
  Cardinal First = 0, Second = 0, Third = 0;
  if (!Next(First)) return false;
  if (First < 0x80) {
    AUnit = static_cast<Char>(First);
    return true;
  }
  if ((First & 0x40U) == 0) throw Exception(uZqClasses::_SInvalidUTF8InStream);
  if (!Next(Second)) throw Exception(uZqClasses::_SInvalidUTF8InStream1);
  if ((First & 0x20U) == 0) {
    AUnit = static_cast<Char>((First & 0x1FU) << 6U | (Second & 0x3FU));
    return true;
  }
  if (!Next(Third)) throw Exception(uZqClasses::_SInvalidUTF8InStream2);
  AUnit = static_cast<Char>((First & 0x0FU) << 12U | (Second & 0x3FU) << 6U | (Third & 0x3FU));
  return true;
}

Integer TZqUTF8StreamAdapter::Read(void* ABuffer, Integer ACount) {
  auto* const Dest = static_cast<Byte*>(ABuffer);
  Integer Result = 0;
  Char Unit = 0;
  while (Result + 1 < ACount && NextUnit(Unit)) {
    std::memcpy(Dest + Result, &Unit, sizeof(Unit));
    Result += static_cast<Integer>(sizeof(Unit));
  }
  return Result;
}

namespace {

bool TakesAll(TStream& AStream, const void* ABytes, std::size_t ACount) {
  const auto* const Bytes = static_cast<const Byte*>(ABytes);
  for (std::size_t At = 0; At < ACount;) {
    const auto Step = std::min<std::size_t>(ACount - At, std::numeric_limits<Integer>::max());
    const Integer Count = AStream.Write(Bytes + At, static_cast<Integer>(Step));
    if (Count <= 0) return false;
    At += static_cast<std::size_t>(Count);
  }
  return true;
}

}  // namespace

Integer TZqUTF8StreamAdapter::Write(const void* ABuffer, Integer ACount) {
  if (FWriteUTF8Prefix) {
    if (!TakesAll(*FWrappedStream, cZqUTF8.data(), cZqUTF8.size())) return 0;
    FWriteUTF8Prefix = false;
  }
  if (ACount <= 0) return 0;
  std::u16string Units(static_cast<std::size_t>(ACount / 2), u'\0');  // the buffer needn't be aligned
  std::memcpy(Units.data(), ABuffer, 2 * Units.size());
  const std::string Bytes = utf8::Encode(Units);
  return TakesAll(*FWrappedStream, Bytes.data(), Bytes.size()) ? ACount : 0;
}

Int64 TZqUTF8StreamAdapter::Seek(Int64 AOffset, TSeekOrigin AOrigin) {
  constexpr Int64 cFarthest = std::numeric_limits<Int64>::max() / 2;
  return 2 * std::min(FWrappedStream->Seek(AOffset / 2, AOrigin), cFarthest);
}

// --------------------------------------------------------------------------------------------------- Whole streams

namespace {

// What is behind AStream's position, straight into the string.
template <class TText>
TText ReadRest(TStream& AStream) {
  constexpr auto cUnit = static_cast<Int64>(sizeof(typename TText::value_type));
  const auto Left = static_cast<NativeUInt>(std::max<Int64>(AStream.Size() - AStream.Position(), 0) / cUnit);
  TText Result(static_cast<std::size_t>(Countable(Left)), {});
  AStream.ReadBuffer(Result.data(), static_cast<Int64>(Result.size()) * cUnit);
  return Result;
}

}  // namespace

UnicodeString ZqStreamToWideString(
    TStream* AStream, bool AStreamOwner, bool AResetStreamPos, bool AReadBOM, Integer AStreamCodePage) {
  Assert(AStream != nullptr);
  const std::unique_ptr<TStream> Owned(AStreamOwner ? AStream : nullptr);
  if (AResetStreamPos) AStream->SetPosition(0);
  const Word CodePage = SettleCodePage(*AStream, AReadBOM, AStreamCodePage);
  if (CodePage == cUtf16) return ReadRest<std::u16string>(*AStream);
  const TZqReadBuf Bytes(AStream);
  return TZqEncoding::ConvertB(Bytes.Data(), Bytes.Size(), CodePage);
}

UnicodeString ZqStreamToString(
    TStream* AStream, bool AStreamOwner, bool AResetStreamPos, bool AReadBOM, Word AStreamCodePage) {
  return ZqStreamToWideString(AStream, AStreamOwner, AResetStreamPos, AReadBOM, AStreamCodePage);
}

RawByteString ZqStreamToAnsiString(TStream* AStream, bool AStreamOwner, bool AResetStreamPos, bool AReadBOM,
    Integer AStreamCodePage, Word AResultCodePage) {
  Assert(AStream != nullptr);
  if (const TCodePage* const Page = FindCodePage(AResultCodePage); Page != nullptr && Page->UnitSize() != 1)
    throw Exception(uZqClasses::_SEncodingNotSupported);
  const std::unique_ptr<TStream> Owned(AStreamOwner ? AStream : nullptr);
  if (AResetStreamPos) AStream->SetPosition(0);
  const Word CodePage = SettleCodePage(*AStream, AReadBOM, AStreamCodePage);
  if (AStreamCodePage == AResultCodePage) return RawByteString(ReadRest<std::string>(*AStream));
  const TZqReadBuf Bytes(AStream);
  return TZqEncoding::ConvertB(Bytes.Data(), Bytes.Size(), CodePage, AResultCodePage);
}

void ZqUTF8EncodeStream(TStream* ASource, TStream* ADest, bool AWritePrefix) {
  Assert(ASource != nullptr && ADest != nullptr);
  const TZqReadBuf Source(ASource);
  const std::size_t Length = Source.Size() / 2;
  const auto* Units = static_cast<const char16_t*>(Source.Data());
  std::u16string Aligned;
  if (!IsAligned(Source.Data())) {
    Aligned.resize(Length);
    std::memcpy(Aligned.data(), Source.Data(), 2 * Length);
    Units = Aligned.data();
  }
  const std::string Bytes = utf8::Encode(std::u16string_view(Units, Length));
  if (AWritePrefix) WriteMark(*ADest, cUtf8);
  ADest->WriteBuffer(Bytes.data(), static_cast<Int64>(Bytes.size()));
}

void ZqUTF8DecodeStream(TStream* ASource, TStream* ADest) {
  Assert(ASource != nullptr && ADest != nullptr);
  const Int64 Start = ASource->Position();
  std::array<Byte, cZqUTF8.size()> Head{};
  if (ASource->Read(Head.data(), Head.size()) != Head.size() || Head != cZqUTF8) ASource->SetPosition(Start);
  TZqUTF8StreamAdapter Adapter(ASource);
  std::array<Byte, 1024> Room;
  Integer Count = 0;
  do {
    Count = Adapter.Read(Room.data(), Room.size());
    ADest->WriteBuffer(Room.data(), Count);
  } while (Count == Room.size());
}

UnicodeString ZqUTF8Decode(TStream* AStream) {
  const Word CodePage = ZqGetCodePage(AStream);
  if (CodePage != 0 && CodePage != cUtf8) throw EConvertError(uZqClasses::_SNoUnicodeData);
  TZqStringStream Text(cUtf16);
  ZqUTF8DecodeStream(AStream, &Text);
  return Text.AsString();
}

}  // namespace zq
