#pragma once

#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

/// File facts beyond what runtime/io has. Any thread.
class ZQ_API TFileService {
 public:
  static TServiceSlot<TFileService> Slot;

  /// The short form of an existing file's path; empty on failure. Linux knows none: the absolute path itself.
  [[nodiscard]] virtual UnicodeString GetShortPathName(const UnicodeString& AName) = 0;
  /// Folder for temporary files, with a separator at the end; empty on failure.
  [[nodiscard]] virtual UnicodeString GetTempPath() = 0;
  /// The name made of APath, APrefix, AUnique in four hexadecimal digits and ".tmp"; no file is made. Empty on failure.
  [[nodiscard]] virtual UnicodeString GetTempFileName(
      const UnicodeString& APath, const UnicodeString& APrefix, Cardinal AUnique) = 0;
  /// Opens an existing file for reading and writing with no sharing, and closes it. False where somebody has it open,
  /// as far as the file system tells, or a share mode keeps it, or it may not be written.
  [[nodiscard]] virtual bool OpensExclusively(const UnicodeString& AName) = 0;
  /// Looks a file up along the search path for programs; empty if it isn't there.
  [[nodiscard]] virtual UnicodeString SearchPath(const UnicodeString& AName) = 0;

 protected:
  ~TFileService() = default;
};

}  // namespace zq
