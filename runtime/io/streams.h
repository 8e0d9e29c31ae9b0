#pragma once

#include "runtime/core/api.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/objects.h"
#include "runtime/core/strings.h"
#include "runtime/platform/resource_service.h"

namespace zq {

class TEncoding;

enum class TSeekOrigin : Byte { soBeginning, soCurrent, soEnd };
using enum TSeekOrigin;
inline constexpr Word soFromBeginning = 0;
inline constexpr Word soFromCurrent = 1;
inline constexpr Word soFromEnd = 2;

/// Byte stream. Positions and sizes are bytes. Short reads and writes are told by their result and raise nothing,
/// except out of ReadBuffer, WriteBuffer and CopyFrom. One thread at a time.
class ZQ_API TStream : public TObject {
 public:
  ~TStream() override = default;

  /// At most ACount bytes; returns how many came, 0 at the end.
  virtual Integer Read(void* ABuffer, Integer ACount) = 0;
  /// Returns how many were taken.
  virtual Integer Write(const void* ABuffer, Integer ACount) = 0;
  /// Returns the new position. For soEnd and soCurrent AOffset may be negative.
  virtual Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) = 0;
  /// The 32-bit form, with the numbers soFromBeginning and its kin; the result is cut to its width.
  Integer Seek(Integer AOffset, Word AOrigin) {
    return static_cast<Integer>(Seek(Int64{AOffset}, static_cast<TSeekOrigin>(AOrigin)));
  }
  Int64 Seek(Int64 AOffset, Word AOrigin) = delete;  // it would lose the high half of AOffset
  /// Found by going to the end and back, unless a class knows better.
  [[nodiscard]] virtual Int64 GetSize();
  /// Nothing in a stream whose size can't be set.
  virtual void SetSize(Int64 ASize);

  [[nodiscard]] Int64 Size() { return GetSize(); }
  [[nodiscard]] Int64 Position() { return Seek(0, soCurrent); }
  void SetPosition(Int64 APosition) { Seek(APosition, soBeginning); }
  /// All ACount bytes, or EReadError; those that came stay consumed.
  void ReadBuffer(void* ABuffer, Int64 ACount);
  /// All ACount bytes, or EWriteError.
  void WriteBuffer(const void* ABuffer, Int64 ACount);
  /// For who has read until nothing came: raises EReadError where more should have come, because 0 bytes also stand for
  /// a refusal. A stream that can't seek tells no end, and nothing is raised.
  virtual void RequireEnd();
  /// Copies ACount bytes from ASource's position on, which must be there (EReadError); 0: all of ASource from its
  /// start, if it can seek; negative: whatever is left of it. Returns the number. ABufferSize is the size of the steps.
  Int64 CopyFrom(TStream& ASource, Int64 ACount = 0, Integer ABufferSize = 0x100000);
};

/// Stream over an open file descriptor, which stays the caller's. A refusal of the system counts as 0 bytes.
class ZQ_API THandleStream : public TStream {
 public:
  explicit THandleStream(int AHandle) noexcept : FHandle(AHandle) {}
  using TStream::Seek;
  Integer Read(void* ABuffer, Integer ACount) override;
  Integer Write(const void* ABuffer, Integer ACount) override;
  /// -1 where the system refuses; the position stays.
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override;
  /// Cuts or fills with zeros, and goes to the new end. Raises EStreamError.
  void SetSize(Int64 ASize) override;
  [[nodiscard]] int Handle() const noexcept { return FHandle; }

 protected:
  int FHandle;
};

inline constexpr Word fmCreate = 0xFFFF;
inline constexpr Word fmOpenRead = 0x0000;
inline constexpr Word fmOpenWrite = 0x0001;
inline constexpr Word fmOpenReadWrite = 0x0002;
inline constexpr Word fmShareCompat = 0x0000;
inline constexpr Word fmShareExclusive = 0x0010;
inline constexpr Word fmShareDenyWrite = 0x0020;
inline constexpr Word fmShareDenyRead = 0x0030;
inline constexpr Word fmShareDenyNone = 0x0040;

/// Stream over a file, closed with the stream.
///
/// AMode is fmCreate, for a new and empty file, or one fmOpenXxx with one fmShareXxx. A share mode is an advisory lock:
/// it keeps out, and is kept out by, those who ask for one too. fmShareExclusive and fmShareDenyRead admit no other,
/// fmShareDenyWrite on a file opened for reading admits its like; fmShareCompat, fmShareDenyNone and fmCreate ask for
/// none.
class ZQ_API TFileStream : public THandleStream {
 public:
  /// Raises EFCreateError or EFOpenError.
  TFileStream(const UnicodeString& AFileName, Word AMode);
  ~TFileStream() override;
  [[nodiscard]] const UnicodeString& FileName() const noexcept { return FFileName; }

 private:
  UnicodeString FFileName;
};

/// Stream over a block of memory that a descendant provides. A position may lie behind the end, never before the start.
class ZQ_API TCustomMemoryStream : public TStream {
 public:
  using TStream::Seek;
  Integer Read(void* ABuffer, Integer ACount) override;
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override;
  [[nodiscard]] Int64 GetSize() override { return FSize; }
  /// The content, as long as it isn't resized; may be null when empty.
  [[nodiscard]] void* Memory() const noexcept { return FMemory; }
  /// The whole content, wherever the position is.
  void SaveToStream(TStream& ADest) const;
  void SaveToFile(const UnicodeString& AFileName) const;

 protected:
  void SetPointer(void* AMemory, Int64 ASize) noexcept;

  void* FMemory = nullptr;
  Int64 FSize = 0;
  Int64 FPosition = 0;
};

/// Memory that grows with what is written. Raises EStreamError where there is no memory for it.
class ZQ_API TMemoryStream : public TCustomMemoryStream {
 public:
  Integer Write(const void* ABuffer, Integer ACount) override;
  /// New bytes are zero; the position is clipped.
  void SetSize(Int64 ASize) override;
  void Clear() { SetSize(0); }
  /// Replaces the content with all of ASource, from its start, or with what is left in one that can't seek.
  void LoadFromStream(TStream& ASource);
  void LoadFromFile(const UnicodeString& AFileName);

 private:
  void Resize(UInt64 ASize);

  TBytes FBytes;
};

/// Memory stream over text in an encoding, at position 0.
class ZQ_API TStringStream : public TMemoryStream {
 public:
  /// In the default encoding, the ANSI code page.
  explicit TStringStream(const UnicodeString& AText = {});
  TStringStream(const UnicodeString& AText, const TEncoding& AEncoding);
  /// The bytes as they are.
  explicit TStringStream(const RawByteString& ABytes);

  /// The whole content as text.
  [[nodiscard]] UnicodeString DataString() const;
  /// ACount bytes from the position on, or as many as there are, as text.
  [[nodiscard]] UnicodeString ReadString(Integer ACount);
  void WriteString(const UnicodeString& AText);

 private:
  Word FCodePage = 0;
};

/// A module's resource, for reading.
class ZQ_API TResourceStream : public TCustomMemoryStream {
 public:
  /// Raises EResNotFound.
  TResourceStream(HINST AModule, const UnicodeString& AName, const WideChar* AType);
  TResourceStream(HINST AModule, Integer AId, const WideChar* AType);
  /// Raises EStreamError.
  Integer Write(const void* ABuffer, Integer ACount) override;

 private:
  TBytes FBytes;
};

}  // namespace zq
