#include "common/uZqClasses/streams.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <new>

namespace zq {

namespace {

constexpr NativeUInt cLargest = std::numeric_limits<std::ptrdiff_t>::max();  // of any block

void* Reallocated(void* ABlock, NativeUInt ASize) {
  void* const Result = ASize > cLargest ? nullptr : std::realloc(ABlock, std::max<NativeUInt>(ASize, 1));
  if (Result == nullptr) throw std::bad_alloc();
  return Result;
}

void Copy(void* ADest, const void* ASource, NativeUInt ASize) noexcept {
  if (ASize > 0) std::memcpy(ADest, ASource, ASize);
}

// Steps only where one call can't take so many bytes. Fewer come where the stream ends before.
NativeUInt ReadUpTo(TStream& AStream, void* ABuffer, NativeUInt ASize) {
  NativeUInt Result = 0;
  while (Result < ASize) {
    const auto Step = std::min<NativeUInt>(ASize - Result, std::numeric_limits<Integer>::max());
    const Integer Count = AStream.Read(static_cast<Byte*>(ABuffer) + Result, static_cast<Integer>(Step));
    if (Count <= 0) break;
    Result += static_cast<NativeUInt>(Count);
  }
  return Result;
}

NativeUInt BytesBehind(TStream& AStream, Int64 APosition) {
  return static_cast<NativeUInt>(std::max<Int64>(AStream.Size() - APosition, 0));
}

}  // namespace

// -------------------------------------------------------------------------------------------- Counted heap records

namespace {

NativeUInt RecordSize(NativeUInt ASize) {
  if (ASize > cLargest - sizeof(TZqMemoryBuffer)) throw std::bad_alloc();
  return sizeof(TZqMemoryBuffer) + ASize;
}

}  // namespace

PZqMemoryBuffer ZqGetMem(NativeUInt ASize) {
  auto* const Result = static_cast<PZqMemoryBuffer>(std::calloc(1, RecordSize(ASize)));
  if (Result == nullptr) throw std::bad_alloc();
  Result->Size = ASize;
  return Result;
}

void ZqReallocateMem(PZqMemoryBuffer& ABuffer, NativeUInt ASize) {
  ABuffer = static_cast<PZqMemoryBuffer>(Reallocated(ABuffer, RecordSize(ASize)));
  ABuffer->Size = ASize;
}

void ZqFreeMem(PZqMemoryBuffer& ABuffer) noexcept {
  std::free(ABuffer);
  ABuffer = nullptr;
}

PZqMemoryBuffer ZqCloneMem(const TZqMemoryBuffer* ABuffer) {
  const NativeUInt Size = RecordSize(ABuffer->Size);
  auto* const Result = static_cast<PZqMemoryBuffer>(GetMem(Size));
  std::memcpy(Result, ABuffer, Size);
  return Result;
}

// ------------------------------------------------------------------------------------------------- Counted buffers

TZqMemoryBufferImpl::TZqMemoryBufferImpl(NativeUInt ABufferSize)
    : TZqMemoryBufferImpl(ABufferSize == 0 ? nullptr : GetMem(ABufferSize), ABufferSize) {}

TZqMemoryBufferImpl::~TZqMemoryBufferImpl() { FreeMem(FBuffer); }

RawByteString TZqMemoryBufferImpl::GetAsString(TZqBinEncoding AEncoding) {
  return ZqBufToString(FBuffer, FBufferSize, AEncoding);
}

TBytes TZqMemoryBufferImpl::GetAsByteArray() { return ZqBufToByteArr(FBuffer, FBufferSize); }

void TZqMemoryBufferImpl::SetSize(NativeUInt AValue) {
  if (AValue == FBufferSize) return;
  if (AValue == 0) FreeMem(std::exchange(FBuffer, nullptr));
  else FBuffer = Reallocated(FBuffer, AValue);
  FBufferSize = AValue;
}

void TZqMemoryBufferImpl::SetAsString(TZqBinEncoding AEncoding, const RawByteString& AValue) {
  NativeUInt Size = 0;
  void* const Block = ZqStringToBuf(AValue.View(), AEncoding, Size);
  Take(Block, Size);
}

void TZqMemoryBufferImpl::SetAsByteArray(const TBytes& AValue) {
  NativeUInt Size = 0;
  void* const Block = ZqByteArrToBuf(AValue, Size);
  Take(Block, Size);
}

void TZqMemoryBufferImpl::Take(void* ABlock, NativeUInt ASize) noexcept {
  FreeMem(std::exchange(FBuffer, ABlock));
  FBufferSize = ASize;
}

IntfRef<IZqMemoryBuffer> ZqCreateMemoryBuffer(void* ABuffer, NativeUInt ASize) {
  return New<TZqMemoryBufferImpl>(ABuffer, ASize);
}

IntfRef<IZqMemoryBuffer> ZqCreateMemoryBuffer(NativeUInt ASize) { return New<TZqMemoryBufferImpl>(ASize); }

IntfRef<IZqMemoryBuffer> ZqCreateMemoryBuffer(TStream* AStream, Int64 AOffset, Int64 ACount) {
  Assert(AStream != nullptr && ACount >= -1);
  AStream->SetPosition(AOffset);
  const NativeUInt Left = BytesBehind(*AStream, AStream->Position());
  IntfRef<IZqMemoryBuffer> Result =
      ZqCreateMemoryBuffer(ACount == -1 ? Left : std::min(Left, static_cast<NativeUInt>(ACount)));
  Result->SetSize(ReadUpTo(*AStream, Result->GetBuffer(), Result->GetSize()));
  return Result;
}

// --------------------------------------------------------------------------------------------------- Memory stream

TZqMemoryStream::TZqMemoryStream(NativeUInt ABlockSize) {
  SetBlockSize(ABlockSize);
  Resize(ABlockSize, 0, 0);
}

TZqMemoryStream::TZqMemoryStream(TWrapped, void* AData, NativeUInt ACount) { Wrap(AData, ACount); }

TZqMemoryStream::~TZqMemoryStream() {
  if (FFreeMem) std::free(FBufferStart);
}

void TZqMemoryStream::Wrap(void* AData, NativeUInt ACount) {
  Assert((AData != nullptr || ACount == 0) && ACount <= cLargest);
  if (FFreeMem) std::free(FBufferStart);
  FFreeMem = false;
  FBlockSize = FRoom = 0;
  FBufferStart = FCurPos = static_cast<Byte*>(AData);
  FBufferSize = ACount;
  FContentEnd = FWriteEnd = FBufferStart + ACount;
}

Integer TZqMemoryStream::ReadRest(void* ABuffer) noexcept {
  const NativeUInt Count = BytesLeft();
  Copy(ABuffer, FCurPos, Count);
  FCurPos = FContentEnd;
  return static_cast<Integer>(Count);
}

Int64 TZqMemoryStream::Seek(Int64 AOffset, TSeekOrigin AOrigin) {
  const auto Size = static_cast<Int64>(ContentSize());
  const auto Position = static_cast<Int64>(OffsetOf(FCurPos));
  Int64 Result = 0;
  switch (AOrigin) {
    case soBeginning: Result = std::clamp<Int64>(AOffset, 0, Size); break;
    case soCurrent: Result = Position + std::clamp(AOffset, -Position, Size - Position); break;
    case soEnd: Result = Size - std::abs(std::clamp(AOffset, -Size, Size)); break;
  }
  FCurPos = FBufferStart + Result;
  return Result;
}

void TZqMemoryStream::RequireOwnBlock() const {
  if (!FFreeMem) throw Exception(uZqClasses::_SBufferResizeFailure);
}

namespace {

[[noreturn]] void RaiseNoMemory() { throw EStreamError(u"There is no memory for the stream"); }

}  // namespace

// The next multiple of the step above ASize.
NativeUInt TZqMemoryStream::CapacityFor(NativeUInt ASize) const {
  Assert(FBlockSize != 0);
  const NativeUInt Whole = ASize - ASize % FBlockSize;
  if (ASize > cLargest || FBlockSize > cLargest - Whole) RaiseNoMemory();
  return Whole + FBlockSize;
}

void TZqMemoryStream::Reallocate(NativeUInt ACapacity) {
  constexpr NativeUInt cAmple = 512;
  const NativeUInt Ample = FRoom > 0 && ACapacity > FRoom ? std::max({ACapacity, 2 * FRoom, cAmple}) : ACapacity;
  for (const NativeUInt Room : {Ample, ACapacity}) {
    void* const Block = Room > cLargest ? nullptr : std::realloc(FBufferStart, std::max<NativeUInt>(Room, 1));
    if (Block == nullptr) continue;
    FBufferStart = static_cast<Byte*>(Block);
    FRoom = Room;
    return;
  }
  if (ACapacity > FRoom || FBufferStart == nullptr) RaiseNoMemory();
}

void TZqMemoryStream::Resize(NativeUInt ACapacity, NativeUInt AContent, NativeUInt APosition) {
  const bool Shrinks = ACapacity < FBufferSize && ACapacity < FRoom / 2;
  if (ACapacity > FRoom || Shrinks || FBufferStart == nullptr) Reallocate(ACapacity);
  FBufferSize = ACapacity;
  FWriteEnd = FBufferStart + (ACapacity == 0 ? 0 : ACapacity - 1);
  FContentEnd = FBufferStart + AContent;
  FCurPos = FBufferStart + APosition;
}

void TZqMemoryStream::SetBufSize(NativeUInt ABufSize) {
  RequireOwnBlock();
  const NativeUInt Content = std::min(ContentSize(), ABufSize);
  Resize(CapacityFor(ABufSize), Content, std::min(OffsetOf(FCurPos), Content));
}

void TZqMemoryStream::CheckSize(NativeUInt ASize) {
  const NativeUInt Content = ContentSize();
  const NativeUInt Needed = ASize > cLargest - Content ? cLargest : Content + ASize + 1;  // the former is refused
  if (Needed > FBufferSize) SetBufSize(Needed);
}

// Makes room for ACount bytes at the position and returns where those of ABuffer are then.
const void* TZqMemoryStream::Extend(const void* ABuffer, NativeUInt ACount) {
  const auto Inside = reinterpret_cast<std::uintptr_t>(ABuffer) - reinterpret_cast<std::uintptr_t>(FBufferStart);
  const bool IsOurs = Inside < FBufferSize;
  CheckSize(ACount - BytesLeft());
  return IsOurs ? FBufferStart + Inside : ABuffer;
}

void TZqMemoryStream::SetSize(Int64 ASize) {
  RequireOwnBlock();
  const auto Content = static_cast<NativeUInt>(ASize);  // a negative one is beyond any memory
  Resize(CapacityFor(Content), Content, std::min(OffsetOf(FCurPos), Content));
}

void TZqMemoryStream::SetContentEnd(Int64 ASize) {
  if (ASize < 0 || static_cast<NativeUInt>(ASize) > ContentSize()) return SetSize(ASize);
  FContentEnd = FBufferStart + ASize;
  FCurPos = std::min(FCurPos, FContentEnd);
}

void TZqMemoryStream::Clear() {
  RequireOwnBlock();
  Resize(FBlockSize, 0, 0);
}

TBytes TZqMemoryStream::ReadBytes(Integer ALength) {
  Assert(ALength >= 1);
  TBytes Result(static_cast<std::size_t>(ALength));
  ReadBytes(Result.data(), ALength);
  return Result;
}

void TZqMemoryStream::ReadBytes(void* ABuffer, Integer ALength) {
  Assert(ALength >= 1);
  if (Read(ABuffer, ALength) < ALength) throw Exception(uZqClasses::_SUnexpectedEOF);
}

// ------------------------------------------------------------------------------------------ Raw memory and streams

bool ZqStreamToReadBuf(TStream* AStream, void*& ABuf, NativeUInt& ASize) {
  Assert(AStream != nullptr);
  const Int64 Position = AStream->Position();
  ASize = BytesBehind(*AStream, Position);
  if (auto* const Zq = dynamic_cast<TZqMemoryStream*>(AStream)) {
    ABuf = static_cast<Byte*>(Zq->Buffer()) + Position;
    return false;
  }
  if (auto* const Memory = dynamic_cast<TMemoryStream*>(AStream)) {
    ABuf = static_cast<Byte*>(Memory->Memory()) + (ASize == 0 ? 0 : Position);
    return false;
  }
  ABuf = GetMem(ASize);
  try {
    ASize = ReadUpTo(*AStream, ABuf, ASize);
  } catch (...) {
    FreeMem(std::exchange(ABuf, nullptr));
    throw;
  }
  return true;
}

bool ZqStreamToWriteBuf(TStream* AStream, void*& ABuf, NativeUInt ASize) {
  Assert(AStream != nullptr);
  auto* const Zq = dynamic_cast<TZqMemoryStream*>(AStream);
  if (Zq == nullptr) {
    ABuf = GetMem(ASize);
    return true;
  }
  const Int64 Position = Zq->Position();
  if (ASize > cLargest - static_cast<NativeUInt>(Position)) RaiseNoMemory();
  Zq->SetSize(Position + static_cast<Int64>(ASize));
  ABuf = static_cast<Byte*>(Zq->Buffer()) + Position;
  return false;
}

TBytes ZqBufToByteArr(const void* ABuf, NativeUInt ASize) {
  const auto* const Bytes = static_cast<const Byte*>(ABuf);
  return ASize == 0 ? TBytes() : TBytes(Bytes, Bytes + ASize);
}

void* ZqByteArrToBuf(const TBytes& AValue, NativeUInt& ASize) {
  ASize = AValue.size();
  if (AValue.empty()) return nullptr;
  void* const Result = GetMem(AValue.size());
  std::memcpy(Result, AValue.data(), AValue.size());
  return Result;
}

void ZqReverseBuffer(void* ABuf, NativeUInt ASize) noexcept {
  auto* const Bytes = static_cast<Byte*>(ABuf);
  std::reverse(Bytes, Bytes + ASize);
}

}  // namespace zq
