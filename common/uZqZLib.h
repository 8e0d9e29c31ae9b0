#pragma once

#include <cstdint>
#include <utility>

#include "runtime/component/component.h"
#include "runtime/core/api.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/io/streams.h"

/// Deflate: streams that compress what is written to them and decompress what is read from them, the same in one call,
/// and zlib's own functions for who wants those.
///
/// Window bits tell the format, as zlib takes them: 9 to 15 zlib, -15 to -9 raw deflate, 25 to 31 gzip, and in
/// decompressing 40 to 47 for zlib or gzip as the data says.
namespace zq {

namespace uZqZLib {
ZQ_API void Start();
ZQ_API void Stop();
}  // namespace uZqZLib

// ---- zlib -----------------------------------------------------------------------------------------------------------
// zlib's own, with its semantics; whoever includes zlib.h too, before or behind, gets no conflict.

using TZlAlloc = void* (*)(void* AOpaque, Cardinal AItems, Cardinal ASize);
using TZlFree = void (*)(void* AOpaque, void* AAddress);

/// zlib's z_stream. It must not move while it is in use.
struct TZlStreamRec {
  const Byte* next_in = nullptr;
  Cardinal avail_in = 0;
  NativeUInt total_in = 0;
  Byte* next_out = nullptr;
  Cardinal avail_out = 0;
  NativeUInt total_out = 0;
  const AnsiChar* msg = nullptr;
  void* state = nullptr;
  TZlAlloc zalloc = nullptr;
  TZlFree zfree = nullptr;
  void* opaque = nullptr;
  Integer data_type = 0;
  NativeUInt adler = 0;
  NativeUInt reserved = 0;
};

// zlib.h has a macro of that name.
#pragma push_macro("ZLIB_VERSION")
#undef ZLIB_VERSION
/// For the Init functions, which take it with each zlib 1.x.
inline constexpr AnsiChar ZLIB_VERSION[] = "1.2.8";
#pragma pop_macro("ZLIB_VERSION")

// AStreamSize is sizeof(TZlStreamRec).
ZQ_API Integer deflateInit_(
    TZlStreamRec* AStream, Integer ALevel, const AnsiChar* AVersion, Integer AStreamSize) noexcept;
ZQ_API Integer deflateInit2_(TZlStreamRec* AStream, Integer ALevel, Integer AMethod, Integer AWindowBits,
    Integer AMemLevel, Integer AStrategy, const AnsiChar* AVersion, Integer AStreamSize) noexcept;
ZQ_API Integer deflateReset(TZlStreamRec* AStream) noexcept;
ZQ_API Integer deflate(TZlStreamRec* AStream, Integer AFlush) noexcept;
ZQ_API Integer deflateEnd(TZlStreamRec* AStream) noexcept;
ZQ_API Integer inflateInit_(TZlStreamRec* AStream, const AnsiChar* AVersion, Integer AStreamSize) noexcept;
ZQ_API Integer inflateInit2_(
    TZlStreamRec* AStream, Integer AWindowBits, const AnsiChar* AVersion, Integer AStreamSize) noexcept;
ZQ_API Integer inflateReset(TZlStreamRec* AStream) noexcept;
ZQ_API Integer inflate(TZlStreamRec* AStream, Integer AFlush) noexcept;
ZQ_API Integer inflateEnd(TZlStreamRec* AStream) noexcept;

namespace detail {
[[nodiscard]] ZQ_API NativeUInt AdlerOf(NativeUInt ASum, const Byte* ABuffer, Cardinal ACount) noexcept;
[[nodiscard]] ZQ_API NativeUInt CrcOf(NativeUInt ASum, const Byte* ABuffer, Cardinal ACount) noexcept;
}  // namespace detail

// Templates, so that a call is not ambiguous where zlib.h's functions of the same parameters are seen, too.
template <class = void>
[[nodiscard]] NativeUInt adler32(NativeUInt ASum, const Byte* ABuffer, Cardinal ACount) noexcept {
  return detail::AdlerOf(ASum, ABuffer, ACount);
}
template <class = void>
[[nodiscard]] NativeUInt crc32(NativeUInt ASum, const Byte* ABuffer, Cardinal ACount) noexcept {
  return detail::CrcOf(ASum, ABuffer, ACount);
}

enum class TZqZLibCompressionLevel : std::uint8_t {
  clNone,
  clFastest,  ///< zlib's 1
  clDefault,  ///< zlib's choice, between speed and size
  clMax,      ///< zlib's 9
  clLevel1,
  clLevel2,
  clLevel3,
  clLevel4,
  clLevel5,
  clLevel6,
  clLevel7,
  clLevel8,
  clLevel9
};
using enum TZqZLibCompressionLevel;

enum class TZqZLibStrategy : std::uint8_t { zsDefault, zsFiltered, zsHuffman, zsRLE, zsFixed };
using enum TZqZLibStrategy;

/// By ordinal what zlib's deflate and inflate take.
enum class TZqZLibFlush : std::uint8_t {
  zfNoFlush,
  zfPartialFlush,
  zfSyncFlush,
  zfFullFlush,
  zfFinish,
  zfBlock,
  zfTrees
};
using enum TZqZLibFlush;

// ---- Exceptions -----------------------------------------------------------------------------------------------------

/// ErrorCode is zlib's result, or 0 where the message is all.
class ZQ_API EZqZLibException : public Exception {
 public:
  using Exception::Exception;
  /// With zlib's message for ACode, 2 to -6; others have an empty one.
  explicit EZqZLibException(Integer ACode);

  [[nodiscard]] Integer ErrorCode() const noexcept { return FErrorCode; }
  void SetErrorCode(Integer AValue) noexcept { FErrorCode = AValue; }

 private:
  Integer FErrorCode = 0;
};
struct ZQ_API EZqZLibCompressionError : EZqZLibException {
  using EZqZLibException::EZqZLibException;
};
struct ZQ_API EZqZLibDecompressionError : EZqZLibException {
  using EZqZLibException::EZqZLibException;
};

// ---- Streams --------------------------------------------------------------------------------------------------------

/// What both directions share: the stream with the compressed data, which stays the caller's and must outlive the
/// object, and the buffer for it.
///
/// Others may use that stream between two calls: each call goes on where this object left it. A stream whose position
/// is negative can't seek (a pipe) and is taken as it stands. What it raises comes out, and nothing is lost by that:
/// the call may be repeated, and Position tells how far the uncompressed data has got. An object of 64 KiB, and zlib
/// takes up to 256 KiB more. It can't be copied or moved. One thread at a time.
class ZQ_API TZqZLibStream : public TStream {
 public:
  using TStream::Seek;
  /// Called with the stream for each 64 KiB that were written, and for each piece that was read, of compressed data.
  [[nodiscard]] const TNotifyEvent& OnProgress() const noexcept { return FOnProgress; }
  void SetOnProgress(TNotifyEvent AValue) noexcept { FOnProgress = std::move(AValue); }

 protected:
  static constexpr Integer cBufferSize = 0x10000;

  explicit TZqZLibStream(TStream* AStream);
  virtual void DoProgress();

  // On FZlStream, put to FZlStreamPos if it stands elsewhere; FZlStreamPos moves along. They raise what that raises,
  // and EZqZLibException (-1) where it can't be put there.
  Integer ZlStreamRead(void* ABuffer, Integer ACount);
  Integer ZlStreamWrite(const void* ABuffer, Integer ACount);
  Int64 ZlStreamSeek(Int64 AOffset, Word AOrigin);
  void ZlStreamReadBuffer(void* ABuffer, Int64 ACount);
  void ZlStreamWriteBuffer(const void* ABuffer, Int64 ACount);
  // Position and SetPosition of the compressed side.
  [[nodiscard]] Int64 ZlStreamPosition() { return FZlStream->Position(); }
  void SetZlStreamPosition(Int64 AValue);
  [[nodiscard]] bool CanSeek() const noexcept { return FZlStreamPos >= 0; }

  TStream* FZlStream;
  Int64 FZlStreamPos;  // where this object last left it; negative where it can't seek
  TNotifyEvent FOnProgress;
  TZlStreamRec FZlStreamRec;
  Byte FBuffer[cBufferSize];  // compressed data

 private:
  void Restore();
  void Moved(Int64 ACount) noexcept;
};

/// Compresses what is written to it. The compressed data is complete after Finish alone, which the end of the object
/// calls where nobody has: Free lets out what it raises and leaves the object alive then, while a scope's end, delete
/// and a std::unique_ptr can't raise and lose that. Call Finish, or Free, to be sure of the data.
///
/// What zlib reports is raised as EZqZLibCompressionError; so is "Invalid ZStream operation!" for Read, for Seek but to
/// ask for the position, and for Write behind Finish.
class ZQ_API TZqZLibCompressionStream : public TZqZLibStream {
 public:
  /// In the zlib format.
  TZqZLibCompressionStream(TStream* ADest, TZqZLibCompressionLevel ACompressionLevel);
  /// AMemLevel is 1 to 9, zlib's default is 8. A raise leaves nothing behind.
  TZqZLibCompressionStream(TStream* ADest, TZqZLibCompressionLevel ACompressionLevel, Integer AWindowBits,
      Integer AMemLevel, TZqZLibStrategy AStrategy);
  ~TZqZLibCompressionStream() override;

  /// Returns how many were taken: less than ACount where ADest is full. Those are kept, in here as far as ADest didn't
  /// take them, and ADest stands where it stood before the piece that it had no room for: once it has room, writing the
  /// rest goes on as if nothing had been. Position tells what was taken when ADest raises.
  Integer Write(const void* ABuffer, Integer ACount) override;
  /// Writes what is left and the end of the data to ADest; raises EWriteError where that is full, and may be called
  /// again then.
  void Finish();
  /// The bytes taken so far.
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override;
  Integer Read(void* ABuffer, Integer ACount) override;
  using TZqZLibStream::Seek;

  /// What was saved, in percent of the bytes taken; negative where the data has grown. 0 before the first.
  [[nodiscard]] Single CompressionRate() const noexcept;

 protected:
  void BeforeDestruction() override;

 private:
  [[nodiscard]] bool HasRoom();
  [[nodiscard]] bool Drain();
  void DrainAll();
  void TakeBack(Integer ACount, Integer AFilled) noexcept;
};

/// Decompresses what is read from it, up to the end of the compressed data. ASource stands right behind that then,
/// unless it can't seek: such a one has been read up to 64 KiB further.
///
/// What zlib reports is raised as EZqZLibDecompressionError; so is "Need dictionary" (2), which this class has no way
/// to give, and "Invalid ZStream operation!" for Write and for a Seek that isn't told below. A call that raises may
/// have delivered bytes: Position counts them.
class ZQ_API TZqZLibDecompressionStream : public TZqZLibStream {
 public:
  /// Of the zlib format.
  explicit TZqZLibDecompressionStream(TStream* ASource);
  /// A raise leaves nothing behind.
  TZqZLibDecompressionStream(TStream* ASource, Integer AWindowBits);
  ~TZqZLibDecompressionStream() override;

  /// Less than ACount at the end of the data, and without an error where ASource ends before that: see AtEnd.
  Integer Read(void* ABuffer, Integer ACount) override;
  /// True when a Read has met the end of the compressed data. A short Read that leaves it False: the data was cut.
  [[nodiscard]] bool AtEnd() const noexcept { return FAtEnd; }
  Integer Write(const void* ABuffer, Integer ACount) override;
  /// The bytes delivered so far, after this has moved:
  ///   soBeginning 0     begins anew at position 0 of ASource, wherever that stood at first
  ///   soBeginning other reads and drops up to there; nothing for a target that has been passed
  ///   soCurrent         reads and drops AOffset bytes, 0 or more
  ///   soEnd 0           reads and drops all
  /// With soBeginning the position where it stands, but 0, is an invalid operation.
  /// EReadError where the data ends before.
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override;
  using TZqZLibStream::Seek;
  /// Found by decompressing all, from position 0 of ASource again then, up to where it stood.
  [[nodiscard]] Int64 GetSize() override;
  /// By AtEnd, without decompressing anything.
  void RequireEnd() override;

 private:
  struct TByFirstByte {};
  TZqZLibDecompressionStream(TStream* ASource, TByFirstByte);
  friend ZQ_API bool ZlDecompressStream(TStream* ASource, TStream* ADest, bool AResetPos);

  void Init(Integer AWindowBits);
  [[nodiscard]] bool Fill();
  void GiveBack();
  void Restart();
  void Drop(Int64 ACount);
  void DropAll();
  void RequireSeek() const;

  bool FAtEnd = false;
};

// ---- In one call ----------------------------------------------------------------------------------------------------
// Streams stay the caller's and are two (EAssertionFailed). With AResetPos ASource is put to position 0 first. They
// raise what the classes above and the streams raise; what has been written to ADest before stays there.

/// What is left of ASource, to ADest in the zlib format. Where ASource raises, or gives less than it has (EReadError),
/// what came of it is completed in ADest.
ZQ_API void ZlCompressStream(
    TStream* ASource, TStream* ADest, TZqZLibCompressionLevel ACompressionLevel, bool AResetPos);
/// The text in the process's code page, which may not have all of its characters.
ZQ_API void ZlStringToCompressedStream(
    const UnicodeString& AValue, TStream* ADest, TZqZLibCompressionLevel ACompressionLevel);

// The compressed data begins at position 0 of ASource, wherever that stands, or where one stands that can't seek.
// ASource stands right behind the data then. Without window bits it is zlib's format for a first byte of 0x78, the one
// of its usual window, and raw deflate for any other; a position with nothing behind it raises
// EZqZLibDecompressionError ("Stream end", 1).

/// False where ASource ends before its compressed data does; what could be had of that is in ADest.
ZQ_API bool ZlDecompressStream(TStream* ASource, TStream* ADest, bool AResetPos);
ZQ_API bool ZlDecompressStream(TStream* ASource, TStream* ADest, Integer AWindowBits, bool AResetPos);

/// The bytes as they are.
[[nodiscard]] ZQ_API AnsiString ZlDecompressStreamToAnsiString(TStream* ASource, bool AResetPos);
/// The bytes are its UTF-16 units, the low one first; an odd last byte is left out.
[[nodiscard]] ZQ_API UnicodeString ZlDecompressStreamToString(TStream* ASource, bool AResetPos);
[[nodiscard]] ZQ_API WideString ZlDecompressStreamToWideString(TStream* ASource, bool AResetPos);

}  // namespace zq
