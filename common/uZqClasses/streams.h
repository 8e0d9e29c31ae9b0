#pragma once

#include <concepts>
#include <cstring>
#include <limits>
#include <string_view>

#include "common/uZqClasses/hex.h"
#include "runtime/core/interfaces.h"
#include "runtime/io/streams.h"

namespace zq {

namespace uZqClasses {
inline constexpr TResStringRec _SUnexpectedEOF{65509, u"Unexpected EOF"};
inline constexpr TResStringRec _SBufferResizeFailure{65533, u"It is not possible to resize the buffer!"};
}  // namespace uZqClasses

// ---- Counted heap records -------------------------------------------------------------------------------------------
// One allocation holds the size and the bytes. A size that memory can't hold raises std::bad_alloc and changes nothing.

struct TZqMemoryBuffer {
  NativeUInt Size;  // of what Data leads to
  [[nodiscard]] Byte* Data() noexcept { return reinterpret_cast<Byte*>(this + 1); }
  [[nodiscard]] const Byte* Data() const noexcept { return reinterpret_cast<const Byte*>(this + 1); }
};
using PZqMemoryBuffer = TZqMemoryBuffer*;

/// All bytes are 0. ZqFreeMem frees it.
[[nodiscard]] ZQ_API PZqMemoryBuffer ZqGetMem(NativeUInt ASize);
/// Keeps the content as far as it fits; what is new is undefined. A nil record becomes a new one.
ZQ_API void ZqReallocateMem(PZqMemoryBuffer& ABuffer, NativeUInt ASize);
/// Sets the variable to nil; a nil record is left alone.
ZQ_API void ZqFreeMem(PZqMemoryBuffer& ABuffer) noexcept;
[[nodiscard]] ZQ_API PZqMemoryBuffer ZqCloneMem(const TZqMemoryBuffer* ABuffer);

// ---- Counted buffers ------------------------------------------------------------------------------------------------

/// A block of bytes that lives by its references and is freed with the last, also one that was handed to it.
struct ZQ_API IZqMemoryBuffer : Extends<IInterface> {
  static constexpr TGUID IID = "{F9DAEC94-FEDE-4A47-B9E8-317D256BD8E3}"_guid;
  /// The block, until the size or the content is set; nil when empty.
  virtual void* GetBuffer() = 0;
  virtual NativeUInt GetSize() = 0;
  virtual RawByteString GetAsString(TZqBinEncoding AEncoding) = 0;
  /// A copy.
  virtual TBytes GetAsByteArray() = 0;
  /// Keeps the content as far as it fits; what is new is undefined. Raises std::bad_alloc, and nothing has changed
  /// then.
  virtual void SetSize(NativeUInt AValue) = 0;
  /// Raises what ZqStringToBuf raises, and nothing has changed then.
  virtual void SetAsString(TZqBinEncoding AEncoding, const RawByteString& AValue) = 0;
  virtual void SetAsByteArray(const TBytes& AValue) = 0;

 protected:
  ~IZqMemoryBuffer() = default;
};

class ZQ_API TZqMemoryBufferImpl : public Implements<TInterfacedObject, IZqMemoryBuffer> {
 public:
  /// Not zeroed; no block at all for a size of 0.
  explicit TZqMemoryBufferImpl(NativeUInt ABufferSize);
  /// Takes ABuffer over, which must come from GetMem.
  TZqMemoryBufferImpl(void* ABuffer, NativeUInt ABufferSize) noexcept : FBuffer(ABuffer), FBufferSize(ABufferSize) {}

  void* GetBuffer() override { return FBuffer; }
  NativeUInt GetSize() override { return FBufferSize; }
  RawByteString GetAsString(TZqBinEncoding AEncoding) override;
  TBytes GetAsByteArray() override;
  void SetSize(NativeUInt AValue) override;
  void SetAsString(TZqBinEncoding AEncoding, const RawByteString& AValue) override;
  void SetAsByteArray(const TBytes& AValue) override;

 protected:
  ~TZqMemoryBufferImpl() override;

 private:
  void Take(void* ABlock, NativeUInt ASize) noexcept;

  void* FBuffer = nullptr;  // GetMem's
  NativeUInt FBufferSize = 0;
};

/// Takes ABuffer over without a copy: it must come from GetMem and is freed with the last reference.
[[nodiscard]] ZQ_API IntfRef<IZqMemoryBuffer> ZqCreateMemoryBuffer(void* ABuffer, NativeUInt ASize);
/// Not zeroed.
[[nodiscard]] ZQ_API IntfRef<IZqMemoryBuffer> ZqCreateMemoryBuffer(NativeUInt ASize);
/// ACount bytes of AStream from AOffset on, or as many as there are; ACount -1 takes all. AStream is left behind them.
[[nodiscard]] ZQ_API IntfRef<IZqMemoryBuffer> ZqCreateMemoryBuffer(TStream* AStream, Int64 AOffset, Int64 ACount);

// ---- Memory stream --------------------------------------------------------------------------------------------------

/// Byte stream over one block: its own, grown in steps of BlockSize, or a caller's, which it neither resizes nor frees.
///
/// Positions and sizes are bytes, and a position never lies outside of the content: seeking is clipped at both ends,
/// and soEnd counts back from the end, whatever the sign of its offset. Reading past the end is short, not an error;
/// ReadByte and its kin raise then.
/// Raises Exception (_SBufferResizeFailure) for what would resize a caller's block, EStreamError where there is no
/// memory; the stream is as before in both cases. One thread at a time.
class ZQ_API TZqMemoryStream : public TStream {
 public:
  /// Empty, with one block. A step of 0 is refused with EAssertionFailed when the stream has to grow.
  explicit TZqMemoryStream(NativeUInt ABlockSize);
  /// Over AData, which stays the caller's and must outlive the stream. All ACount bytes are content.
  [[nodiscard]] static TZqMemoryStream WrapBuffer(void* AData, NativeUInt ACount) {
    return TZqMemoryStream(TWrapped{}, AData, ACount);
  }
  ~TZqMemoryStream() override;

  using TStream::Seek;
  /// Reads and writes what fits; a negative count is 0.
  Integer Read(void* ABuffer, Integer ACount) override {
    if (ACount <= 0) return 0;
    const auto Count = static_cast<NativeUInt>(ACount);
    if (Count > BytesLeft()) [[unlikely]]
      return ReadRest(ABuffer);
    std::memcpy(ABuffer, FCurPos, Count);
    FCurPos += Count;
    return ACount;
  }
  /// Overwrites, and extends the content where it runs past its end. Returns ACount. ABuffer may lie in the content.
  Integer Write(const void* ABuffer, Integer ACount) override {
    if (ACount <= 0) return 0;
    const auto Count = static_cast<NativeUInt>(ACount);
    if (Count > static_cast<NativeUInt>(FWriteEnd - FCurPos) && !Steps(Count)) [[unlikely]]
      ABuffer = Extend(ABuffer, Count);
    std::memmove(FCurPos, ABuffer, Count);
    FCurPos += Count;
    if (FCurPos > FContentEnd) FContentEnd = FCurPos;
    return ACount;
  }
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override;
  /// Of the content, not the capacity.
  [[nodiscard]] Int64 GetSize() override { return static_cast<Int64>(ContentSize()); }
  /// New bytes are undefined, the position is clipped.
  void SetSize(Int64 ASize) override;
  /// No content, one block.
  void Clear();

  [[nodiscard]] NativeUInt BlockSize() const noexcept { return FBlockSize; }
  /// Takes effect at the next resize.
  void SetBlockSize(NativeUInt AValue) noexcept {
    FBlockSize = AValue;
    FStepMask = (AValue & (AValue - 1)) == 0 ? AValue - 1 : ~NativeUInt{0};
  }
  /// The block, as long as the stream isn't resized.
  [[nodiscard]] void* Buffer() const noexcept { return FBufferStart; }
  /// What the block holds before it has to grow: of a stream's own, one byte more than the content may have.
  [[nodiscard]] NativeUInt Capacity() const noexcept { return FBufferSize; }
  /// The content, as long as the stream is neither resized nor written to.
  [[nodiscard]] std::string_view View() const noexcept ZQ_LIFETIMEBOUND {
    return {reinterpret_cast<const char*>(FBufferStart), ContentSize()};
  }

  // In the machine's order. They raise Exception (_SUnexpectedEOF) when fewer bytes are left than asked for; those that
  // were there stay consumed.
  Byte ReadByte() { return ReadValue<Byte>(); }
  Word ReadWord() { return ReadValue<Word>(); }
  Cardinal ReadLongWord() { return ReadValue<Cardinal>(); }
  Int64 ReadInt64() { return ReadValue<Int64>(); }
  /// At least 1 (EAssertionFailed).
  [[nodiscard]] TBytes ReadBytes(Integer ALength);
  void ReadBytes(void* ABuffer, Integer ALength);

  void WriteByte(Byte AValue) { Write(&AValue, sizeof(AValue)); }
  void WriteWord(Word AValue) { Write(&AValue, sizeof(AValue)); }
  void WriteLongWord(Cardinal AValue) { Write(&AValue, sizeof(AValue)); }
  void WriteInt64(Int64 AValue) { Write(&AValue, sizeof(AValue)); }
  void WriteBytes(const TBytes& AValue) { WriteAll(AValue.data(), AValue.size()); }

 protected:
  struct TWrapped {};
  TZqMemoryStream(TWrapped, void* AData, NativeUInt ACount);
  /// Turns to AData as a stream made by WrapBuffer does; a block of its own is freed.
  void Wrap(void* AData, NativeUInt ACount);

  [[nodiscard]] bool OwnsBlock() const noexcept { return FFreeMem; }
  [[nodiscard]] NativeUInt ContentSize() const noexcept { return OffsetOf(FContentEnd); }
  [[nodiscard]] NativeUInt BytesLeft() const noexcept { return static_cast<NativeUInt>(FContentEnd - FCurPos); }
  [[nodiscard]] Byte* CurPos() const noexcept { return FCurPos; }

  /// Capacity for ABufSize bytes and one more; content and position stay, as far as they fit into ABufSize.
  void SetBufSize(NativeUInt ABufSize);
  /// Room for ASize more bytes of content.
  void CheckSize(NativeUInt ASize);
  /// ASize bytes of content, which may be more or fewer; the position is clipped.
  void SetContentEnd(Int64 ASize);
  // Without any test: the position must stay in the content, the content in the block.
  void IncCurPos(NativeUInt ASize) noexcept { FCurPos += ASize; }
  void DecCurPos(NativeUInt ASize) noexcept { FCurPos -= ASize; }
  void IncContentEnd(NativeUInt ASize) noexcept { FContentEnd += ASize; }

  /// Through Write, also where one call can't take so many bytes.
  void WriteAll(const void* ABuffer, NativeUInt ACount) {
    if (ACount <= static_cast<NativeUInt>(std::numeric_limits<Integer>::max()))
      Write(ABuffer, static_cast<Integer>(ACount));
    else WriteBuffer(ABuffer, static_cast<Int64>(ACount));
  }

 private:
  template <std::integral T>
  T ReadValue() {
    T Result = 0;
    ReadBytes(&Result, sizeof(Result));
    return Result;
  }
  [[nodiscard]] NativeUInt OffsetOf(const Byte* APos) const noexcept {
    return static_cast<NativeUInt>(APos - FBufferStart);
  }
  // Takes the capacity for ACount bytes at the position, if that much is allocated and the step is a power of two:
  // small steps and small pieces come here all the time.
  bool Steps(NativeUInt ACount) noexcept {
    const NativeUInt Last = (OffsetOf(FCurPos) + ACount + 1) | FStepMask;
    if (Last >= FRoom) return false;
    FBufferSize = Last + 1;
    FWriteEnd = FBufferStart + Last;
    return true;
  }
  Integer ReadRest(void* ABuffer) noexcept;
  const void* Extend(const void* ABuffer, NativeUInt ACount);
  void RequireOwnBlock() const;
  [[nodiscard]] NativeUInt CapacityFor(NativeUInt ASize) const;
  void Reallocate(NativeUInt ACapacity);
  void Resize(NativeUInt ACapacity, NativeUInt AContent, NativeUInt APosition);

  bool FFreeMem = true;  // the block is ours: it may grow and is freed
  NativeUInt FBlockSize = 0;
  NativeUInt FStepMask = ~NativeUInt{0};  // FBlockSize - 1 of a power of two
  Byte* FBufferStart = nullptr;
  NativeUInt FBufferSize = 0;
  NativeUInt FRoom = 0;       // what was allocated: FBufferSize or more, so that growth in small steps moves it seldom
  Byte* FWriteEnd = nullptr;  // how far content may reach: in our block one byte stays free behind it
  Byte* FContentEnd = nullptr;
  Byte* FCurPos = nullptr;
};

// ---- Raw memory and streams -----------------------------------------------------------------------------------------

/// What is behind AStream's position. True: ABuf is a new block that the caller frees with FreeMem, and the stream has
/// been read to its end. False: ABuf lies in the stream, as long as that isn't resized, and the position stays.
[[nodiscard]] ZQ_API bool ZqStreamToReadBuf(TStream* AStream, void*& ABuf, NativeUInt& ASize);
/// A place for ASize bytes. True: a new block, which the caller fills, writes to AStream and frees with FreeMem. False:
/// it lies in the stream, which ends behind it now, and the position stays.
[[nodiscard]] ZQ_API bool ZqStreamToWriteBuf(TStream* AStream, void*& ABuf, NativeUInt ASize);

/// ZqStreamToReadBuf for a scope.
class ZQ_API TZqReadBuf {
 public:
  explicit TZqReadBuf(TStream* AStream) : FOwned(ZqStreamToReadBuf(AStream, FBuf, FSize)) {}
  TZqReadBuf(const TZqReadBuf&) = delete;
  TZqReadBuf& operator=(const TZqReadBuf&) = delete;
  ~TZqReadBuf() {
    if (FOwned) FreeMem(FBuf);
  }
  [[nodiscard]] const void* Data() const noexcept ZQ_LIFETIMEBOUND { return FBuf; }
  [[nodiscard]] NativeUInt Size() const noexcept { return FSize; }

 private:
  void* FBuf = nullptr;
  NativeUInt FSize = 0;
  bool FOwned;
};

[[nodiscard]] ZQ_API TBytes ZqBufToByteArr(const void* ABuf, NativeUInt ASize);
/// A copy that the caller frees with FreeMem; nil for an empty array.
[[nodiscard]] ZQ_API void* ZqByteArrToBuf(const TBytes& AValue, NativeUInt& ASize);
ZQ_API void ZqReverseBuffer(void* ABuf, NativeUInt ASize) noexcept;

}  // namespace zq
