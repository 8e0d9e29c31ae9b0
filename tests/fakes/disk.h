#pragma once

#include <cerrno>
#include <csignal>
#include <functional>
#include <optional>

#include "runtime/platform/disk_service.h"

namespace zq {

/// The real disk, in its seam as long as it lives, of which one call fails: the one that FailAt counts, from 1; 0 for
/// none. With cKill as its error the process is killed there, before the call.
class TFaultyDisk final : public TDiskService {
 public:
  static constexpr int cKill = -1;
  explicit TFaultyDisk(int AFailAt = 0, int AError = 0) : FailAt(AFailAt), Error(AError) {}

  int Open(const char* APath, int AFlags, Cardinal AMode) override {
    return Fails() ? -1 : FReal.Open(APath, AFlags, AMode);
  }
  Int64 Write(int AHandle, const void* AData, std::size_t ACount) override {
    if (!Fails()) return FReal.Write(AHandle, AData, ACount);
    FReal.Write(AHandle, AData, ACount / 2);  // some of it reaches the disk
    errno = Error;
    return -1;
  }
  int Close(int AHandle) override { return FReal.Close(AHandle) != 0 || Fails() ? -1 : 0; }
  bool Claim(int AHandle) override { return FReal.Claim(AHandle); }
  Int64 ReadTail(const char* APath, void* AData, std::size_t ACount) override {
    return Fails() ? -1 : FReal.ReadTail(APath, AData, ACount);
  }
  int Rename(const char* AOld, const char* ANew) override { return Fails() ? -1 : FReal.Rename(AOld, ANew); }
  int Unlink(const char* APath) override { return Fails() ? -1 : FReal.Unlink(APath); }
  int MakeFolder(const char* APath) override { return Fails() ? -1 : FReal.MakeFolder(APath); }
  int RemoveFolder(const char* APath) override { return Fails() ? -1 : FReal.RemoveFolder(APath); }
  int Stat(const char* APath, bool AFollow, TDiskFacts& AFacts) override {
    const int Result = Fails() ? -1 : FReal.Stat(APath, AFollow, AFacts);
    if (CreatedTime) AFacts.CreatedTime = *CreatedTime;
    return Result;
  }
  void* OpenFolder(const char* APath) override { return Fails() ? nullptr : FReal.OpenFolder(APath); }
  const char* ReadFolder(void* AFolder) override { return Fails() ? nullptr : FReal.ReadFolder(AFolder); }
  void CloseFolder(void* AFolder) override { FReal.CloseFolder(AFolder); }

  /// The faulty call has been made.
  [[nodiscard]] bool HasFailed() const noexcept { return FCalls >= FailAt; }

  std::optional<Int64> CreatedTime;  // said of each file
  const int FailAt;
  const int Error;

 private:
  bool Fails() noexcept {
    if (++FCalls != FailAt) return false;
    if (Error == cKill) std::raise(SIGKILL);
    errno = Error;
    return true;
  }

  int FCalls = 0;
  TDiskService& FReal = Service<TDiskService>();
  const TPlatformOverride<TDiskService> FSeat{*this};
};

}  // namespace zq
