#include <ctime>
#include <limits>
#include <mutex>

#include "runtime/platform/clock_service.h"

namespace zq {

namespace {

constexpr Int64 cQuarter = 900;  // of an hour, in seconds

constinit std::mutex ZoneLock;  // localtime_r reads what tzset writes

Integer SystemOffset(Int64 AUtcSeconds) noexcept {
  const auto Moment = static_cast<std::time_t>(AUtcSeconds);
  std::tm Local{};
  return localtime_r(&Moment, &Local) == nullptr ? 0 : static_cast<Integer>(Local.tm_gmtoff);
}

// Zones change their offset at most once in a quarter of an hour, mostly at its start. So a thread remembers the offset
// of one that begins and ends alike, and asks the system only on leaving it.
class TLinuxClock final : public TClockService {
 public:
  Int64 UtcMicroseconds() override {
    timespec Time{};
    clock_gettime(CLOCK_REALTIME, &Time);
    return Time.tv_sec * 1000000LL + Time.tv_nsec / 1000;
  }
  Integer UtcOffsetSeconds(Int64 AUtcSeconds) override {
    // Initial-exec: no call where a shared library would otherwise make one.
    __attribute__((tls_model("initial-exec"))) thread_local constinit TQuarter Known;
    const Int64 Quarter = AUtcSeconds / cQuarter - (AUtcSeconds % cQuarter < 0 ? 1 : 0);
    const unsigned Generation = FGeneration.load(std::memory_order_relaxed);
    if (Known.Number == Quarter && Known.Generation == Generation) return Known.Offset;
    const std::lock_guard Guard(ZoneLock);
    tzset();
    const Integer First = SystemOffset(Quarter * cQuarter);
    if (First != SystemOffset(Quarter * cQuarter + cQuarter - 1)) return SystemOffset(AUtcSeconds);
    Known = {Quarter, Generation, First};
    return First;
  }
  void ForgetZone() noexcept override { FGeneration.fetch_add(1, std::memory_order_relaxed); }

 private:
  struct TQuarter {
    Int64 Number = std::numeric_limits<Int64>::min();
    unsigned Generation = 0;
    Integer Offset = 0;
  };
  std::atomic<unsigned> FGeneration = 0;  // rises when the zone may have changed
};

constinit TLinuxClock LinuxClock;

}  // namespace

constinit TServiceSlot<TClockService> TClockService::Slot(LinuxClock);

}  // namespace zq
