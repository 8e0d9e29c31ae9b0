#pragma once

#include <cstddef>

#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

/// What the system knows of a file. Times in microseconds since 1970, UTC.
struct TDiskFacts {
  Cardinal Mode = 0;  ///< the system's kind and permissions (S_IFMT and below)
  Int64 Size = 0;
  Int64 CreatedTime = 0;  ///< 0 where the file system keeps none
  Int64 ModifiedTime = 0;
};

/// The system's calls about files and folders, in its own terms: paths are the system's bytes, flags and modes its
/// numbers. A failed call gives -1, or null, and leaves its reason in errno. Any thread.
class ZQ_API TDiskService {
 public:
  static TServiceSlot<TDiskService> Slot;

  /// A descriptor, never one of the three standard ones.
  virtual int Open(const char* APath, int AFlags, Cardinal AMode) = 0;
  /// Bytes taken, which may be fewer than ACount.
  virtual Int64 Write(int AHandle, const void* AData, std::size_t ACount) = 0;
  virtual int Close(int AHandle) = 0;
  /// Claims a file opened for writing until it is closed. False where another open file has claimed it, in whatever
  /// process; a file system without such locks grants every claim. Keeps nobody from reading or writing.
  virtual bool Claim(int AHandle) = 0;
  /// The last bytes of a file, at most ACount: how many came.
  virtual Int64 ReadTail(const char* APath, void* AData, std::size_t ACount) = 0;

  /// Never replaces: EEXIST where ANew is there.
  virtual int Rename(const char* AOld, const char* ANew) = 0;
  /// A file or a link, no folder.
  virtual int Unlink(const char* APath) = 0;
  virtual int MakeFolder(const char* APath) = 0;
  virtual int RemoveFolder(const char* APath) = 0;
  /// Of a link, with AFollow of what it leads to.
  virtual int Stat(const char* APath, bool AFollow, TDiskFacts& AFacts) = 0;

  /// A walk through a folder, to be closed; ReadFolder gives the next name, valid until the next call, or null: at the
  /// end with an errno of 0.
  virtual void* OpenFolder(const char* APath) = 0;
  virtual const char* ReadFolder(void* AFolder) = 0;
  virtual void CloseFolder(void* AFolder) = 0;

 protected:
  ~TDiskService() = default;
};

}  // namespace zq
