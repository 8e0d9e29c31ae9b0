#include "runtime/io/streams.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <limits>
#include <new>
#include <stdexcept>
#include <utility>

#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/platform/disk_service.h"
#include "runtime/text/encoding.h"

namespace zq {

namespace {

Integer Step(Int64 ACount) noexcept {
  return static_cast<Integer>(std::min<Int64>(ACount, std::numeric_limits<Integer>::max()));
}

}  // namespace

// -------------------------------------------------------------------------------------------------------- TStream

Int64 TStream::GetSize() {
  const Int64 Saved = Position();
  const Int64 Result = Seek(0, soEnd);
  SetPosition(Saved);
  return Result;
}

void TStream::SetSize(Int64) {}

void TStream::ReadBuffer(void* ABuffer, Int64 ACount) {
  auto* Dest = static_cast<Byte*>(ABuffer);
  while (ACount > 0) {
    const Integer Count = Read(Dest, Step(ACount));
    if (Count <= 0) throw EReadError(u"Stream read error");
    Dest += Count;
    ACount -= Count;
  }
}

void TStream::RequireEnd() {
  if (Position() < Size()) throw EReadError(u"Stream read error");
}

void TStream::WriteBuffer(const void* ABuffer, Int64 ACount) {
  const auto* Source = static_cast<const Byte*>(ABuffer);
  while (ACount > 0) {
    const Integer Count = Write(Source, Step(ACount));
    if (Count <= 0) throw EWriteError(u"Stream write error");
    Source += Count;
    ACount -= Count;
  }
}

Int64 TStream::CopyFrom(TStream& ASource, Int64 ACount, Integer ABufferSize) {
  if (ACount == 0) {
    ASource.SetPosition(0);
    ACount = ASource.Size();
  }
  ABufferSize = std::max(ABufferSize, 1);
  const bool Exact = ACount >= 0;
  TBytes Buffer(static_cast<std::size_t>(Exact ? std::clamp<Int64>(ACount, 0, ABufferSize) : ABufferSize));
  Int64 Copied = 0;
  while (!Exact || Copied < ACount) {
    const auto Wanted = Exact ? std::min<Int64>(ACount - Copied, ABufferSize) : ABufferSize;
    const Integer Count = ASource.Read(Buffer.data(), static_cast<Integer>(Wanted));
    if (Count <= 0) break;
    WriteBuffer(Buffer.data(), Count);
    Copied += Count;
  }
  if (Exact && Copied < ACount) throw EReadError(u"Stream read error");
  return Copied;
}

// -------------------------------------------------------------------------------------- THandleStream, TFileStream

Integer THandleStream::Read(void* ABuffer, Integer ACount) {
  if (ACount <= 0) return 0;
  ssize_t Count = 0;
  do Count = ::read(FHandle, ABuffer, static_cast<std::size_t>(ACount));
  while (Count < 0 && errno == EINTR);
  return static_cast<Integer>(std::max<ssize_t>(Count, 0));
}

Integer THandleStream::Write(const void* ABuffer, Integer ACount) {
  Integer Done = 0;
  while (Done < ACount) {
    const ssize_t Count =
        ::write(FHandle, static_cast<const Byte*>(ABuffer) + Done, static_cast<std::size_t>(ACount - Done));
    if (Count < 0 && errno == EINTR) continue;
    if (Count <= 0) break;
    Done += static_cast<Integer>(Count);
  }
  return Done;
}

Int64 THandleStream::Seek(Int64 AOffset, TSeekOrigin AOrigin) {
  static_assert(SEEK_SET == 0 && SEEK_CUR == 1 && SEEK_END == 2);
  return ::lseek(FHandle, AOffset, static_cast<int>(AOrigin));
}

void THandleStream::SetSize(Int64 ASize) {
  if (::ftruncate(FHandle, ASize) != 0) throw EStreamError(SysErrorMessage(errno));
  SetPosition(ASize);
}

namespace {

// The lock that a share mode asks for; 0 for none.
int LockOf(Word AMode) noexcept {
  if (AMode == fmCreate) return 0;
  switch (AMode & 0xF0U) {
    case fmShareExclusive:
    case fmShareDenyRead: return LOCK_EX;
    case fmShareDenyWrite: return (AMode & 3U) == fmOpenRead ? LOCK_SH : LOCK_EX;
    default: return 0;
  }
}

// A descriptor, or -1 with errno.
int OpenFile(const std::string& APath, Word AMode) noexcept {
  static_assert(O_RDONLY == fmOpenRead && O_WRONLY == fmOpenWrite && O_RDWR == fmOpenReadWrite);
  const int Flags = AMode == fmCreate ? O_RDWR | O_CREAT | O_TRUNC : AMode & 3;
  const int Result = Service<TDiskService>().Open(APath.c_str(), Flags, 0666);
  struct stat Facts {};
  if (Result < 0 || ::fstat(Result, &Facts) != 0) return Result;
  // A file system without locks grants what it can't refuse.
  const int Lock = LockOf(AMode);
  const bool Refused = Lock != 0 && ::flock(Result, Lock | LOCK_NB) != 0 && errno == EWOULDBLOCK;
  if (!Refused && !S_ISDIR(Facts.st_mode)) return Result;
  ::close(Result);
  errno = Refused ? EWOULDBLOCK : EISDIR;
  return -1;
}

}  // namespace

TFileStream::TFileStream(const UnicodeString& AFileName, Word AMode)
    : THandleStream(OpenFile(ToSystemPath(AFileName), AMode)), FFileName(AFileName) {
  if (FHandle >= 0) return;
  const UnicodeString Reason = SysErrorMessage(errno);
  if (AMode == fmCreate) throw EFCreateError(u"Cannot create file \"" + AFileName + u"\". " + Reason);
  throw EFOpenError(u"Cannot open file \"" + AFileName + u"\". " + Reason);
}

TFileStream::~TFileStream() { ::close(FHandle); }

// ------------------------------------------------------------------------------------------------- Memory streams

Integer TCustomMemoryStream::Read(void* ABuffer, Integer ACount) {
  const Int64 Count = std::clamp<Int64>(FSize - FPosition, 0, std::max(ACount, 0));
  if (Count > 0) std::memcpy(ABuffer, static_cast<const Byte*>(FMemory) + FPosition, static_cast<std::size_t>(Count));
  FPosition += Count;
  return static_cast<Integer>(Count);
}

Int64 TCustomMemoryStream::Seek(Int64 AOffset, TSeekOrigin AOrigin) {
  const Int64 Base = AOrigin == soBeginning ? 0 : AOrigin == soCurrent ? FPosition : FSize;
  constexpr Int64 cFarthest = std::numeric_limits<Int64>::max();
  return FPosition = AOffset > cFarthest - Base ? cFarthest : std::max<Int64>(Base + AOffset, 0);
}

void TCustomMemoryStream::SaveToStream(TStream& ADest) const { ADest.WriteBuffer(FMemory, FSize); }

void TCustomMemoryStream::SaveToFile(const UnicodeString& AFileName) const {
  TFileStream File(AFileName, fmCreate);
  SaveToStream(File);
}

void TCustomMemoryStream::SetPointer(void* AMemory, Int64 ASize) noexcept {
  FMemory = AMemory;
  FSize = ASize;
}

void TMemoryStream::Resize(UInt64 ASize) {
  try {
    FBytes.resize(ASize);
  } catch (const std::bad_alloc&) {
    throw EStreamError(u"There is no memory for the stream");
  } catch (const std::length_error&) {
    throw EStreamError(u"There is no memory for the stream");
  }
  SetPointer(FBytes.data(), static_cast<Int64>(ASize));
}

Integer TMemoryStream::Write(const void* ABuffer, Integer ACount) {
  if (ACount <= 0) return 0;
  const UInt64 End = static_cast<UInt64>(FPosition) + static_cast<UInt64>(ACount);
  if (End > static_cast<UInt64>(FSize)) Resize(End);
  std::memcpy(FBytes.data() + FPosition, ABuffer, static_cast<std::size_t>(ACount));
  FPosition += ACount;
  return ACount;
}

void TMemoryStream::SetSize(Int64 ASize) {
  if (ASize <= 0) FBytes = {};
  Resize(static_cast<UInt64>(std::max<Int64>(ASize, 0)));
  FPosition = std::min(FPosition, FSize);
}

void TMemoryStream::LoadFromStream(TStream& ASource) {
  const Int64 Count = ASource.Size();
  ASource.SetPosition(0);
  SetSize(Count);
  if (Count < 0) CopyFrom(ASource, -1);
  ASource.ReadBuffer(FMemory, Count);
}

void TMemoryStream::LoadFromFile(const UnicodeString& AFileName) {
  TFileStream File(AFileName, fmOpenRead | fmShareDenyNone);
  LoadFromStream(File);
}

TStringStream::TStringStream(const UnicodeString& AText) : TStringStream(AText, TEncoding::Default()) { FCodePage = 0; }

TStringStream::TStringStream(const UnicodeString& AText, const TEncoding& AEncoding)
    : FCodePage(AEncoding.GetCodePage()) {
  WriteString(AText);
  FPosition = 0;
}

TStringStream::TStringStream(const RawByteString& ABytes) : FCodePage(ABytes.CodePage()) {
  WriteBuffer(ABytes.data(), ABytes.Length());
  FPosition = 0;
}

UnicodeString TStringStream::DataString() const {
  return TEncoding(FCodePage).GetString(FMemory, static_cast<std::size_t>(FSize));
}

UnicodeString TStringStream::ReadString(Integer ACount) {
  TBytes Bytes(static_cast<std::size_t>(std::clamp<Int64>(ACount, 0, std::max<Int64>(FSize - FPosition, 0))));
  ReadBuffer(Bytes.data(), static_cast<Int64>(Bytes.size()));
  return TEncoding(FCodePage).GetString(Bytes);
}

void TStringStream::WriteString(const UnicodeString& AText) {
  const TBytes Bytes = TEncoding(FCodePage).GetBytes(AText);
  WriteBuffer(Bytes.data(), static_cast<Int64>(Bytes.size()));
}

TResourceStream::TResourceStream(HINST AModule, const UnicodeString& AName, const WideChar* AType) {
  std::optional<TBytes> Found = Service<TResourceService>().LoadResource(AModule, AName, AType);
  if (!Found) throw EResNotFound(u"Resource " + AName + u" not found");
  FBytes = std::move(*Found);
  SetPointer(FBytes.data(), static_cast<Int64>(FBytes.size()));
}

TResourceStream::TResourceStream(HINST AModule, Integer AId, const WideChar* AType)
    : TResourceStream(AModule, u"#" + FromUTF8(std::to_string(AId)), AType) {}

Integer TResourceStream::Write(const void*, Integer) {
  throw EStreamError(u"Can't write to a read-only resource stream");
}

}  // namespace zq
