#include "common/uZqZLib.h"

#include <zlib.h>

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <iterator>
#include <string>
#include <type_traits>
#include <utility>

#include "runtime/core/start_count.h"
#include "runtime/values/typeinfo.h"

namespace zq {

namespace uZqZLib {

namespace {
constinit TStartCount Starts;
}

void Start() {
  if (!Starts.Begins()) return;
  constexpr const char16_t* cUnit = u"uZqZLib";
  DescribeType<TZqZLibCompressionLevel>(cUnit).EnumNames({u"clNone", u"clFastest", u"clDefault", u"clMax", u"clLevel1",
      u"clLevel2", u"clLevel3", u"clLevel4", u"clLevel5", u"clLevel6", u"clLevel7", u"clLevel8", u"clLevel9"});
  DescribeType<TZqZLibStrategy>(cUnit).EnumNames({u"zsDefault", u"zsFiltered", u"zsHuffman", u"zsRLE", u"zsFixed"});
  DescribeType<TZqZLibFlush>(cUnit).EnumNames(
      {u"zfNoFlush", u"zfPartialFlush", u"zfSyncFlush", u"zfFullFlush", u"zfFinish", u"zfBlock", u"zfTrees"});
  using T = TZqZLibStream;
  DescribeType<TZqZLibCompressionStream>(cUnit).Property(u"OnProgress", &T::OnProgress, &T::SetOnProgress);
  DescribeType<TZqZLibDecompressionStream>(cUnit).Property(u"OnProgress", &T::OnProgress, &T::SetOnProgress);
}

void Stop() { Starts.Ends(); }

}  // namespace uZqZLib

// ------------------------------------------------------------------------------------------------------------ zlib

namespace {

template <class T, class TZlibs>
constexpr bool cSame = std::is_same_v<T, TZlibs> || (std::is_pointer_v<T> && std::is_pointer_v<TZlibs>);

#define ZQ_SAME(AField)                                                         \
  static_assert(offsetof(TZlStreamRec, AField) == offsetof(z_stream, AField) && \
                cSame<decltype(TZlStreamRec::AField), decltype(z_stream::AField)>)
ZQ_SAME(next_in);
ZQ_SAME(avail_in);
ZQ_SAME(total_in);
ZQ_SAME(next_out);
ZQ_SAME(avail_out);
ZQ_SAME(total_out);
ZQ_SAME(msg);
ZQ_SAME(state);
ZQ_SAME(zalloc);
ZQ_SAME(zfree);
ZQ_SAME(opaque);
ZQ_SAME(data_type);
ZQ_SAME(adler);
ZQ_SAME(reserved);
#undef ZQ_SAME
static_assert(sizeof(TZlStreamRec) == sizeof(z_stream));
static_assert(alignof(TZlStreamRec) == alignof(z_stream));
static_assert(std::is_same_v<TZlAlloc, alloc_func> && std::is_same_v<TZlFree, free_func>);

z_stream* Rec(TZlStreamRec* AStream) noexcept { return reinterpret_cast<z_stream*>(AStream); }

}  // namespace

Integer deflateInit_(TZlStreamRec* AStream, Integer ALevel, const AnsiChar* AVersion, Integer AStreamSize) noexcept {
  return ::deflateInit_(Rec(AStream), ALevel, AVersion, AStreamSize);
}

Integer deflateInit2_(TZlStreamRec* AStream, Integer ALevel, Integer AMethod, Integer AWindowBits, Integer AMemLevel,
    Integer AStrategy, const AnsiChar* AVersion, Integer AStreamSize) noexcept {
  return ::deflateInit2_(Rec(AStream), ALevel, AMethod, AWindowBits, AMemLevel, AStrategy, AVersion, AStreamSize);
}

Integer deflateReset(TZlStreamRec* AStream) noexcept { return ::deflateReset(Rec(AStream)); }

Integer deflate(TZlStreamRec* AStream, Integer AFlush) noexcept { return ::deflate(Rec(AStream), AFlush); }

Integer deflateEnd(TZlStreamRec* AStream) noexcept { return ::deflateEnd(Rec(AStream)); }

Integer inflateInit_(TZlStreamRec* AStream, const AnsiChar* AVersion, Integer AStreamSize) noexcept {
  return ::inflateInit_(Rec(AStream), AVersion, AStreamSize);
}

Integer inflateInit2_(
    TZlStreamRec* AStream, Integer AWindowBits, const AnsiChar* AVersion, Integer AStreamSize) noexcept {
  return ::inflateInit2_(Rec(AStream), AWindowBits, AVersion, AStreamSize);
}

Integer inflateReset(TZlStreamRec* AStream) noexcept { return ::inflateReset(Rec(AStream)); }

Integer inflate(TZlStreamRec* AStream, Integer AFlush) noexcept { return ::inflate(Rec(AStream), AFlush); }

Integer inflateEnd(TZlStreamRec* AStream) noexcept { return ::inflateEnd(Rec(AStream)); }

NativeUInt detail::AdlerOf(NativeUInt ASum, const Byte* ABuffer, Cardinal ACount) noexcept {
  return ::adler32(ASum, ABuffer, ACount);
}

NativeUInt detail::CrcOf(NativeUInt ASum, const Byte* ABuffer, Cardinal ACount) noexcept {
  return ::crc32(ASum, ABuffer, ACount);
}

// ------------------------------------------------------------------------------------------------------ Exceptions

namespace {

constexpr auto cInvalidOperation = u"Invalid ZStream operation!";

UnicodeString MessageOf(Integer ACode) {
  switch (ACode) {
    case Z_NEED_DICT: return u"Need dictionary";
    case Z_STREAM_END: return u"Stream end";
    case Z_OK: return u"OK";
    case Z_ERRNO: return u"File error";
    case Z_STREAM_ERROR: return u"Stream error";
    case Z_DATA_ERROR: return u"Data error";
    case Z_MEM_ERROR: return u"Insufficient memory";
    case Z_BUF_ERROR: return u"Buffer error";
    case Z_VERSION_ERROR: return u"Incompatible version";
    default: return {};
  }
}

}  // namespace

EZqZLibException::EZqZLibException(Integer ACode) : Exception(MessageOf(ACode)), FErrorCode(ACode) {}

// --------------------------------------------------------------------------------------------------- TZqZLibStream

namespace {

TStream* Required(TStream* AStream) {
  Assert(AStream != nullptr);
  return AStream;
}

}  // namespace

TZqZLibStream::TZqZLibStream(TStream* AStream) : FZlStream(Required(AStream)), FZlStreamPos(AStream->Position()) {}

void TZqZLibStream::DoProgress() {
  if (FOnProgress) FOnProgress(this);
}

// A device that keeps no position (/dev/null) answers with another one than it was put to, and may.
void TZqZLibStream::Restore() {
  if (!CanSeek() || FZlStream->Position() == FZlStreamPos) return;
  if (FZlStream->Seek(FZlStreamPos, soBeginning) < 0) throw EZqZLibException(Z_ERRNO);
}

void TZqZLibStream::Moved(Int64 ACount) noexcept {
  if (CanSeek()) FZlStreamPos += ACount;
}

Integer TZqZLibStream::ZlStreamRead(void* ABuffer, Integer ACount) {
  Restore();
  const Integer Result = std::max(FZlStream->Read(ABuffer, ACount), 0);
  Moved(Result);
  return Result;
}

Integer TZqZLibStream::ZlStreamWrite(const void* ABuffer, Integer ACount) {
  Restore();
  const Integer Result = std::max(FZlStream->Write(ABuffer, ACount), 0);
  Moved(Result);
  return Result;
}

Int64 TZqZLibStream::ZlStreamSeek(Int64 AOffset, Word AOrigin) {
  Restore();
  const Int64 Result = FZlStream->Seek(AOffset, static_cast<TSeekOrigin>(AOrigin));
  if (Result < 0) throw EZqZLibException(Z_ERRNO);
  return FZlStreamPos = Result;
}

void TZqZLibStream::ZlStreamReadBuffer(void* ABuffer, Int64 ACount) {
  Restore();
  FZlStream->ReadBuffer(ABuffer, ACount);
  Moved(ACount);
}

void TZqZLibStream::ZlStreamWriteBuffer(const void* ABuffer, Int64 ACount) {
  Restore();
  FZlStream->WriteBuffer(ABuffer, ACount);
  Moved(ACount);
}

void TZqZLibStream::SetZlStreamPosition(Int64 AValue) {
  FZlStream->SetPosition(AValue);
  FZlStreamPos = AValue;
}

// ---------------------------------------------------------------------------------------- TZqZLibCompressionStream

namespace {

Integer CheckCompression(Integer ACode) {
  if (ACode < 0) throw EZqZLibCompressionError(ACode);
  return ACode;
}

Integer LevelOf(TZqZLibCompressionLevel ALevel) noexcept {
  constexpr Integer cLevels[] = {
      Z_NO_COMPRESSION, Z_BEST_SPEED, Z_DEFAULT_COMPRESSION, Z_BEST_COMPRESSION, 1, 2, 3, 4, 5, 6, 7, 8, 9};
  const auto Index = static_cast<std::size_t>(ALevel);
  return Index < std::size(cLevels) ? cLevels[Index] : 10;  // which zlib refuses
}

}  // namespace

TZqZLibCompressionStream::TZqZLibCompressionStream(TStream* ADest, TZqZLibCompressionLevel ACompressionLevel)
    : TZqZLibCompressionStream(ADest, ACompressionLevel, MAX_WBITS, 8, zsDefault) {}

TZqZLibCompressionStream::TZqZLibCompressionStream(TStream* ADest, TZqZLibCompressionLevel ACompressionLevel,
    Integer AWindowBits, Integer AMemLevel, TZqZLibStrategy AStrategy)
    : TZqZLibStream(ADest) {
  FZlStreamRec.next_out = FBuffer;
  FZlStreamRec.avail_out = cBufferSize;
  CheckCompression(::deflateInit2_(Rec(&FZlStreamRec), LevelOf(ACompressionLevel), Z_DEFLATED, AWindowBits, AMemLevel,
      static_cast<Integer>(AStrategy), ZLIB_VERSION, sizeof(z_stream)));
}

TZqZLibCompressionStream::~TZqZLibCompressionStream() {
  try {
    Finish();
  } catch (...) {  // it can't leave a destructor
  }
  ::deflateEnd(Rec(&FZlStreamRec));
}

void TZqZLibCompressionStream::BeforeDestruction() {
  Finish();
  TZqZLibStream::BeforeDestruction();
}

Integer TZqZLibCompressionStream::Write(const void* ABuffer, Integer ACount) {
  if (FZlStreamRec.state == nullptr) throw EZqZLibCompressionError(cInvalidOperation);
  ACount = std::max(ACount, 0);
  FZlStreamRec.next_in = static_cast<const Byte*>(ABuffer);
  FZlStreamRec.avail_in = static_cast<Cardinal>(ACount);
  bool Room = HasRoom();
  while (Room && FZlStreamRec.avail_in > 0) {
    CheckCompression(::deflate(Rec(&FZlStreamRec), Z_NO_FLUSH));
    Room = HasRoom();
  }
  return ACount - static_cast<Integer>(std::exchange(FZlStreamRec.avail_in, 0));
}

bool TZqZLibCompressionStream::HasRoom() {
  if (FZlStreamRec.avail_out > 0) return true;
  if (!Drain()) return false;
  DoProgress();
  return true;
}

// Hands on what the buffer holds. Where the destination doesn't take all of it, nothing counts as handed on.
bool TZqZLibCompressionStream::Drain() {
  const Integer Filled = cBufferSize - static_cast<Integer>(FZlStreamRec.avail_out);
  Integer Done = 0;
  try {
    for (Integer Count = 1; Done < Filled && Count > 0; Done += Count)
      Count = ZlStreamWrite(FBuffer + Done, Filled - Done);
  } catch (...) {
    TakeBack(Done, Filled);
    throw;
  }
  if (Done < Filled) {
    TakeBack(Done, Filled);
    if (CanSeek()) ZlStreamSeek(0, soFromCurrent);
    return false;
  }
  FZlStreamRec.next_out = FBuffer;
  FZlStreamRec.avail_out = cBufferSize;
  return true;
}

void TZqZLibCompressionStream::DrainAll() {
  if (!Drain()) throw EWriteError(u"Stream write error");
}

// ACount bytes of the buffer are in the destination. They will be written again; where that can't be done, they go.
void TZqZLibCompressionStream::TakeBack(Integer ACount, Integer AFilled) noexcept {
  if (CanSeek()) {
    FZlStreamPos -= ACount;
    return;
  }
  std::memmove(FBuffer, FBuffer + ACount, static_cast<std::size_t>(AFilled - ACount));
  FZlStreamRec.next_out -= ACount;
  FZlStreamRec.avail_out += static_cast<Cardinal>(ACount);
}

void TZqZLibCompressionStream::Finish() {
  if (FZlStreamRec.state == nullptr) return;
  FZlStreamRec.next_in = nullptr;
  FZlStreamRec.avail_in = 0;
  do {
    if (FZlStreamRec.avail_out == 0) DrainAll();
  } while (CheckCompression(::deflate(Rec(&FZlStreamRec), Z_FINISH)) != Z_STREAM_END);
  DrainAll();
  ::deflateEnd(Rec(&FZlStreamRec));
}

Int64 TZqZLibCompressionStream::Seek(Int64 AOffset, TSeekOrigin AOrigin) {
  if (AOffset != 0 || AOrigin != soCurrent) throw EZqZLibCompressionError(cInvalidOperation);
  return static_cast<Int64>(FZlStreamRec.total_in);
}

Integer TZqZLibCompressionStream::Read(void*, Integer) { throw EZqZLibCompressionError(cInvalidOperation); }

Single TZqZLibCompressionStream::CompressionRate() const noexcept {
  if (FZlStreamRec.total_in == 0) return 0;
  const double Part = static_cast<double>(FZlStreamRec.total_out) / static_cast<double>(FZlStreamRec.total_in);
  return static_cast<Single>((1 - Part) * 100);
}

// -------------------------------------------------------------------------------------- TZqZLibDecompressionStream

namespace {

constexpr Integer cPieceSize = 8192;  // of what is read and dropped

Integer CheckDecompression(Integer ACode) {
  if (ACode < 0 || ACode == Z_NEED_DICT) throw EZqZLibDecompressionError(ACode);
  return ACode;
}

}  // namespace

TZqZLibDecompressionStream::TZqZLibDecompressionStream(TStream* ASource)
    : TZqZLibDecompressionStream(ASource, MAX_WBITS) {}

TZqZLibDecompressionStream::TZqZLibDecompressionStream(TStream* ASource, Integer AWindowBits) : TZqZLibStream(ASource) {
  Init(AWindowBits);
}

TZqZLibDecompressionStream::TZqZLibDecompressionStream(TStream* ASource, TByFirstByte) : TZqZLibStream(ASource) {
  if (!Fill()) throw EZqZLibDecompressionError(Z_STREAM_END);
  Init(FBuffer[0] == 0x78 ? MAX_WBITS : -MAX_WBITS);
}

void TZqZLibDecompressionStream::Init(Integer AWindowBits) {
  CheckDecompression(::inflateInit2_(Rec(&FZlStreamRec), AWindowBits, ZLIB_VERSION, sizeof(z_stream)));
}

TZqZLibDecompressionStream::~TZqZLibDecompressionStream() { ::inflateEnd(Rec(&FZlStreamRec)); }

Integer TZqZLibDecompressionStream::Read(void* ABuffer, Integer ACount) {
  ACount = std::max(ACount, 0);
  FZlStreamRec.next_out = static_cast<Byte*>(ABuffer);
  FZlStreamRec.avail_out = static_cast<Cardinal>(ACount);
  while (FZlStreamRec.avail_out > 0 && !FAtEnd) {
    // Also where there is nothing to give: zlib keeps bytes that the last call had no room for.
    const Integer Code = ::inflate(Rec(&FZlStreamRec), Z_NO_FLUSH);
    if (Code != Z_BUF_ERROR || FZlStreamRec.avail_in > 0) FAtEnd = CheckDecompression(Code) == Z_STREAM_END;
    else if (!Fill()) break;
  }
  if (FAtEnd) GiveBack();
  return ACount - static_cast<Integer>(FZlStreamRec.avail_out);
}

bool TZqZLibDecompressionStream::Fill() {
  FZlStreamRec.avail_in = static_cast<Cardinal>(ZlStreamRead(FBuffer, cBufferSize));
  if (FZlStreamRec.avail_in == 0) return false;
  FZlStreamRec.next_in = FBuffer;
  DoProgress();
  return true;
}

// What was read behind the end of the data.
void TZqZLibDecompressionStream::GiveBack() {
  if (FZlStreamRec.avail_in == 0 || !CanSeek()) return;
  ZlStreamSeek(-Int64{FZlStreamRec.avail_in}, soFromCurrent);
  FZlStreamRec.avail_in = 0;
}

Integer TZqZLibDecompressionStream::Write(const void*, Integer) { throw EZqZLibDecompressionError(cInvalidOperation); }

Int64 TZqZLibDecompressionStream::Seek(Int64 AOffset, TSeekOrigin AOrigin) {
  const auto Now = static_cast<Int64>(FZlStreamRec.total_out);
  if (AOrigin == soBeginning && AOffset == 0) Restart();
  else if (AOrigin == soBeginning && AOffset != Now) Drop(AOffset - Now);
  else if (AOrigin == soCurrent && AOffset >= 0) Drop(AOffset);
  else if (AOrigin == soEnd && AOffset == 0) DropAll();
  else throw EZqZLibDecompressionError(cInvalidOperation);
  return static_cast<Int64>(FZlStreamRec.total_out);
}

void TZqZLibDecompressionStream::Restart() {
  RequireSeek();
  ZlStreamSeek(0, soFromBeginning);
  CheckDecompression(::inflateReset(Rec(&FZlStreamRec)));
  FZlStreamRec.next_in = FBuffer;
  FZlStreamRec.avail_in = 0;
  FAtEnd = false;
}

void TZqZLibDecompressionStream::RequireSeek() const {
  if (!CanSeek()) throw EZqZLibDecompressionError(cInvalidOperation);
}

void TZqZLibDecompressionStream::Drop(Int64 ACount) {
  Byte Piece[cPieceSize];
  for (; ACount > 0; ACount -= cPieceSize) ReadBuffer(Piece, std::min<Int64>(ACount, cPieceSize));
}

void TZqZLibDecompressionStream::DropAll() {
  Byte Piece[cPieceSize];
  while (Read(Piece, cPieceSize) > 0) {
  }
}

void TZqZLibDecompressionStream::RequireEnd() {
  if (!FAtEnd) throw EReadError(u"Stream read error");
}

Int64 TZqZLibDecompressionStream::GetSize() {
  RequireSeek();
  const Int64 Saved = Position();
  const Int64 Result = Seek(0, soEnd);
  Restart();
  Drop(Saved);
  return Result;
}

// ----------------------------------------------------------------------------------------------------- In one call

namespace {

constexpr Integer cCopyBufferSize = 0x100000;

// Whether ASource, which is about to be decompressed, has to be put to its start behind AResetPos.
void Prepare(TStream* ASource, const TStream* ADest, bool AResetPos) {
  Assert(ASource != nullptr && ADest != nullptr && ASource != ADest);
  if (AResetPos) ASource->SetPosition(0);
}

bool CopyAll(TZqZLibDecompressionStream& AStream, bool AFromStart, TStream* ADest) {
  if (AFromStart) AStream.SetPosition(0);
  ADest->CopyFrom(AStream, -1, cCopyBufferSize);
  return AStream.AtEnd();
}

template <class TUnit>
std::basic_string<TUnit> Decompressed(TStream* ASource, bool AResetPos) {
  TMemoryStream Content;
  ZlDecompressStream(ASource, &Content, AResetPos);
  std::basic_string<TUnit> Result(static_cast<std::size_t>(Content.Size()) / sizeof(TUnit), TUnit());
  if (!Result.empty()) std::memcpy(Result.data(), Content.Memory(), Result.size() * sizeof(TUnit));
  return Result;
}

}  // namespace

void ZlCompressStream(TStream* ASource, TStream* ADest, TZqZLibCompressionLevel ACompressionLevel, bool AResetPos) {
  Prepare(ASource, ADest, AResetPos);
  TZqZLibCompressionStream Stream(ADest, ACompressionLevel);
  Stream.CopyFrom(*ASource, -1, cCopyBufferSize);
  ASource->RequireEnd();
  Stream.Finish();
}

void ZlStringToCompressedStream(
    const UnicodeString& AValue, TStream* ADest, TZqZLibCompressionLevel ACompressionLevel) {
  TStringStream Source(AValue);
  ZlCompressStream(&Source, ADest, ACompressionLevel, true);
}

bool ZlDecompressStream(TStream* ASource, TStream* ADest, bool AResetPos) {
  Prepare(ASource, ADest, AResetPos);
  const bool Behind = ASource->Position() > 0;
  TZqZLibDecompressionStream Stream(ASource, TZqZLibDecompressionStream::TByFirstByte{});
  return CopyAll(Stream, Behind, ADest);
}

bool ZlDecompressStream(TStream* ASource, TStream* ADest, Integer AWindowBits, bool AResetPos) {
  Prepare(ASource, ADest, AResetPos);
  const bool Behind = ASource->Position() > 0;
  TZqZLibDecompressionStream Stream(ASource, AWindowBits);
  return CopyAll(Stream, Behind, ADest);
}

AnsiString ZlDecompressStreamToAnsiString(TStream* ASource, bool AResetPos) {
  return Decompressed<AnsiChar>(ASource, AResetPos);
}

UnicodeString ZlDecompressStreamToString(TStream* ASource, bool AResetPos) {
  return Decompressed<Char>(ASource, AResetPos);
}

WideString ZlDecompressStreamToWideString(TStream* ASource, bool AResetPos) {
  return ZlDecompressStreamToString(ASource, AResetPos);
}

}  // namespace zq
