#pragma once

#include <string_view>

#include "common/uZqClasses/characters.h"
#include "common/uZqClasses/streams.h"
#include "runtime/values/variants.h"

namespace zq {

namespace uZqClasses {
inline constexpr TResStringRec _SInvalidUTF8InStream2{
    65504, u"The stream does not contain valid UTF-8 code!\r\nThere is 1 byte missing!"};
inline constexpr TResStringRec _SUnsupportedType{65505, u"Unsupported type %d!"};
inline constexpr TResStringRec _SFileNotFound{65506, u"File %s not found."};
inline constexpr TResStringRec _SEncodingNotSupported{65510, u"The specified encoding is not supported!"};
inline constexpr TResStringRec _SUnspportedEnc{65531, u"The stream contains text in an unsupported encoding!"};
inline constexpr TResStringRec _SNoUnicodeData{65532, u"The sourcestream does not contain unicode data!"};
inline constexpr TResStringRec _SInvalidUTF8InStream{65534, u"The stream does not contain valid UTF-8 code!"};
inline constexpr TResStringRec _SInvalidUTF8InStream1{
    65535, u"The stream does not contain valid UTF-8 code!\r\nThere are 1 or 2 bytes missing!"};
}  // namespace uZqClasses

// ---- String stream --------------------------------------------------------------------------------------------------

/// A memory stream whose bytes are text in one code page: what goes in as text is converted to it, what comes out from
/// it, and the bytes in between stay as they are.
///
/// Code page 0 is the process's, 1200 UTF-16, 65001 UTF-8. Conversions raise what those of TZqEncoding raise. What sets
/// or changes a caller's block raises Exception (_SBufferResizeFailure).
class ZQ_API TZqStringStream : public TZqMemoryStream {
 public:
  explicit TZqStringStream(Word ACodePage = 0, NativeUInt ABlockSize = cBlockSize);
  // With this content, at position 0.
  /// The bytes as they are.
  [[nodiscard]] static TZqStringStream CreateEx(const AnsiString& AValue, Word ACodePage);
  /// In code page 1200.
  [[nodiscard]] static TZqStringStream CreateEx(const UnicodeString& AValue);
  /// In code page 65001.
  [[nodiscard]] static TZqStringStream CreateEx(const UTF8String& AValue);
  /// Over ABuffer, which stays the caller's and must outlive the stream.
  [[nodiscard]] static TZqStringStream WrapBuffer(void* ABuffer, Integer ABufSize, Word ACodePage);
  /// Turns this stream to ABuffer; a block of its own is freed.
  void Rewrap(void* ABuffer, Integer ABufSize, Word ACodePage);

  [[nodiscard]] Word CodePage() const noexcept { return FCodePage; }
  /// Makes ANewCodePage the content's, which is converted with AUpdateContent and relabelled without; the position is
  /// at the end of what was converted. Raises Exception for content that would have to be relabelled from or to 1200,
  /// and for content of a caller's block that would have to be converted.
  void ChangeCodePage(Word ANewCodePage, bool AUpdateContent);

  // The whole content, wherever the position stands.
  [[nodiscard]] UnicodeString AsString() const;
  [[nodiscard]] UnicodeString AsWidestring() const { return AsString(); }
  /// In code page 0.
  [[nodiscard]] AnsiString AsAnsiString() const;
  [[nodiscard]] UTF8String AsUTF8() const;
  [[nodiscard]] Variant Value() const { return AsString(); }
  /// In ACodePage, which is none of UTF-16 and UTF-32 (EAssertionFailed).
  [[nodiscard]] RawByteString StringData(Word ACodePage) const;
  /// Its length in UTF-16 units.
  [[nodiscard]] NativeUInt CharCnt() const;

  // Replace the whole content; the position is 0 then.
  void SetAsString(const UnicodeString& AValue);
  void SetAsWidestring(const UnicodeString& AValue) { SetAsString(AValue); }
  void SetAsAnsiString(const AnsiString& AValue);
  void SetAsUTF8(const UTF8String& AValue);
  /// The text of a string of any width; raises Exception (_SUnsupportedType) for everything else.
  void SetValue(const Variant& AValue);

  // At the position: overwrite what stands there, and extend the content where they run past its end.
  using TZqMemoryStream::Write;
  virtual void Write(const UnicodeString& AString);
  virtual void Write(const AnsiString& AString);
  virtual void WriteChar(Char AChar);
  virtual void WriteChar(AnsiChar AChar);
  // Like Write, and go to the end of the content then, which is not where they begin after a seek.
  void Add(const UnicodeString& AString);
  void Add(const RawByteString& AString, Word ACodePage);
  void Add(const TZqStringStream& AStringStream);
  // At the end of the content.
  void AddChar(Char AChar);
  void AddChar(AnsiChar AChar);
  /// A character 0.
  void WriteEOF() { AddChar(cZqEOFW); }

  // At the position. At the end of the content they give the character 0, or an empty string, and never raise.
  Char ReadChar() { return ReadWChar(); }
  /// A UTF-16 unit. A character that takes two comes in two calls in 65001 and UTF-16; other pages lose the second
  /// half.
  Char ReadWChar();
  /// In code page 0; "?" where that has no single byte for the character.
  AnsiChar ReadAChar();
  [[nodiscard]] UnicodeString ReadString(Integer ALength);
  /// ALength UTF-16 units, or as many as are left.
  [[nodiscard]] UnicodeString ReadWString(NativeUInt ALength);
  /// In code page 0: as many bytes of that page, or UTF-16 units of any other.
  [[nodiscard]] AnsiString ReadAString(NativeUInt ALength);

  /// Takes over content, code page and position.
  virtual void Assign(TZqStringStream& ASource);
  /// Adds AStream's text from its position on, or from its start, without its byte order mark if AReadBOM asks for
  /// that. AStreamCodePage -1: as the mark tells, else 0. Raises Exception where the mark tells another one. AStream is
  /// deleted if AStreamOwner, whatever is raised; what had been added stays.
  void LoadFromStream(
      TStream* AStream, bool AStreamOwner, bool AResetStreamPos, bool AReadBOM, Integer AStreamCodePage = -1);
  /// By its mark. Raises EFOpenError.
  void LoadFromFile(const UnicodeString& AFilename, Integer AStreamCodePage = -1);
  /// The whole content in ACodePage, behind that page's byte order mark if AWritePrefix asks for it and there is one.
  /// Raises EWriteError.
  void SaveToStream(TStream& AStream, Word ACodePage, bool AWritePrefix) const;
  /// Raises EFCreateError, too.
  void SaveToFile(const UnicodeString& AFilename, Word ACodePage, bool AWritePrefix) const;
  /// As it is, with a mark.
  void SaveToFile(const UnicodeString& AFilename) const { SaveToFile(AFilename, FCodePage, true); }

 private:
  static constexpr NativeUInt cBlockSize = 16;
  TZqStringStream(std::string_view ABytes, Word ACodePage);
  TZqStringStream(TWrapped, void* ABuffer, Integer ABufSize, Word ACodePage);

  [[nodiscard]] bool IsWide() const noexcept;
  void SetCodePage(Word ACodePage) noexcept;
  void SeekEnd() noexcept { IncCurPos(BytesLeft()); }
  void Skip(NativeUInt ACount) noexcept;
  void SkipText(std::u16string_view AText) noexcept;
  void WriteText(std::u16string_view AText);
  void CopyBytes(TStream& ASource, Int64 ACount);
  [[nodiscard]] Char PeekUnit() const;
  [[nodiscard]] UnicodeString PeekText(NativeUInt ALength) const;
  [[nodiscard]] Char SecondUnit() const noexcept;

  Word FCodePage = 0;
  Word FCodePageMaxCharSize = 1;  // bytes of the longest character of FCodePage
};

// ---- UTF-8 adapter --------------------------------------------------------------------------------------------------

/// Shows a stream of UTF-8 as one of UTF-16: what is read is UTF-16, what is written arrives as UTF-8.
///
/// Positions are twice those of the stream below, which fits text of one-byte characters alone. Each Read takes whole
/// characters, byte by byte: it is meant for memory and for buffered streams. Characters of four bytes are refused as
/// no valid UTF-8 in reading. One thread at a time.
class ZQ_API TZqUTF8StreamAdapter : public TStream {
 public:
  /// With AStreamOwner the end deletes AWrappedStream, which must not be nil.
  explicit TZqUTF8StreamAdapter(TStream* AWrappedStream, bool AStreamOwner = false, bool AWriteUTF8Prefix = true);
  ~TZqUTF8StreamAdapter() override;

  using TStream::Seek;
  /// Bytes stored, 2 for each unit. Raises Exception (_SInvalidUTF8InStream and its kin); the units before that are in
  /// ABuffer, the bytes of the broken character stay consumed.
  Integer Read(void* ABuffer, Integer ACount) override;
  /// Both halves of a pair must come in one call. ACount, or 0 where the stream below didn't take all.
  Integer Write(const void* ABuffer, Integer ACount) override;
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override;

  [[nodiscard]] bool StreamOwner() const noexcept { return FStreamOwner; }
  void SetStreamOwner(bool AValue) noexcept { FStreamOwner = AValue; }
  /// Whether the next Write, also one of nothing, puts a byte order mark first.
  [[nodiscard]] bool WriteUTF8Prefix() const noexcept { return FWriteUTF8Prefix; }
  void SetWriteUTF8Prefix(bool AValue) noexcept { FWriteUTF8Prefix = AValue; }

 private:
  bool NextUnit(Char& AUnit);

  TStream* FWrappedStream;
  bool FStreamOwner;
  bool FWriteUTF8Prefix;
};

// ---- Whole streams --------------------------------------------------------------------------------------------------
// The text from AStream's position on, or from its start with AResetStreamPos, without its byte order mark if AReadBOM
// asks for that. AStreamCodePage -1: as the mark tells, else 0; another one than the mark's raises Exception.
// AStreamOwner deletes AStream, whatever is raised. Conversions raise what those of TZqEncoding raise.

[[nodiscard]] ZQ_API UnicodeString ZqStreamToWideString(
    TStream* AStream, bool AStreamOwner, bool AResetStreamPos, bool AReadBOM, Integer AStreamCodePage = -1);
[[nodiscard]] ZQ_API UnicodeString ZqStreamToString(
    TStream* AStream, bool AStreamOwner, bool AResetStreamPos, bool AReadBOM, Word AStreamCodePage);
/// In AResultCodePage, which is none of UTF-16 and UTF-32: those raise Exception (_SEncodingNotSupported) before
/// AStream is touched or deleted. Bytes of AStreamCodePage AResultCodePage come as they are, and tagged with 0.
[[nodiscard]] ZQ_API RawByteString ZqStreamToAnsiString(TStream* AStream, bool AStreamOwner, bool AResetStreamPos,
    bool AReadBOM, Integer AStreamCodePage, Word AResultCodePage);

/// From UTF-16 behind ASource's position to UTF-8. Raises EWriteError.
ZQ_API void ZqUTF8EncodeStream(TStream* ASource, TStream* ADest, bool AWritePrefix);
/// From UTF-8 behind ASource's position, and behind a byte order mark there, to UTF-16 without one. Raises what
/// TZqUTF8StreamAdapter raises in reading, and EWriteError.
ZQ_API void ZqUTF8DecodeStream(TStream* ASource, TStream* ADest);
/// The same as a string. Raises EConvertError (_SNoUnicodeData) where there is another mark than that of UTF-8.
[[nodiscard]] ZQ_API UnicodeString ZqUTF8Decode(TStream* AStream);

}  // namespace zq
