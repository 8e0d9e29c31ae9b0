// What a log call costs, each case beside the least that the same result can cost. The figures to quote are ratios of
// the two in one run.

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <malloc.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <mutex>
#include <new>
#include <string>
#include <thread>
#include <vector>

#include "common/uZqLogAppenders.h"
#include "common/uZqLogLayouts.h"
#include "common/uZqLogger.h"
#include "runtime/core/utf8.h"
#include "runtime/text/local_time.h"

namespace {

std::atomic<std::size_t> Allocations = 0;

}  // namespace

[[gnu::noinline]] void* operator new(std::size_t ASize) {
  Allocations.fetch_add(1, std::memory_order_relaxed);
  if (void* const Block = std::malloc(ASize)) return Block;
  throw std::bad_alloc();
}
[[gnu::noinline]] void operator delete(void* ABlock) noexcept { std::free(ABlock); }
[[gnu::noinline]] void operator delete(void* ABlock, std::size_t) noexcept { std::free(ABlock); }

namespace {

using namespace zq;

constexpr char16_t cMessage[] = u"The quick brown fox jumps over the lazy dog and comes back 12";  // 60 characters
constexpr char cLine[] =
    "2021-12-23 10:53:18:123 - Info root - The quick brown fox jumps over the lazy dog and comes back 12\r\n";

/// A new folder of its own on the disk that the temporary folder is on.
struct TFolder {
  TFolder() : Path((std::filesystem::temp_directory_path() / "zqbench.XXXXXX").string()) {
    if (::mkdtemp(Path.data()) == nullptr) std::abort();
  }
  ~TFolder() { std::filesystem::remove_all(Path); }
  std::string Path;
};

/// root.bench.line, whose messages reach one rolling appender on the root logger.
struct TLogging {
  explicit TLogging(Cardinal AMaxSize = 0, Word ABackups = 5) {
    Appender = Logger()->GetAppenders()->Add(
        TZqLogBaseClass::Of<TZqRollingFileAppender>(), TZqLogBaseClass::Of<TZqSimpleLayout>());
    const auto File = Appender.As<IZqRollingFileAppender>();
    File->SetFileName(FromUTF8(Folder.Path + "/app.log"));
    File->SetMaxFileSize(AMaxSize);
    File->SetMaxBackupCount(ABackups);
    Log = Logger()->GetLogger(u"bench.line");
  }
  ~TLogging() { Logger()->ClearAppenders(); }
  TFolder Folder;
  IntfRef<IZqLogAppender> Appender;
  IntfRef<IZqLogger> Log;
};

struct TPlainFile {
  TPlainFile() : Handle(::open((Folder.Path + "/app.log").c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666)) {}
  ~TPlainFile() { ::close(Handle); }
  void Put(const char* AText, std::size_t ALength) const {
    if (::write(Handle, AText, ALength) != static_cast<ssize_t>(ALength)) std::abort();
  }
  TFolder Folder;
  int Handle;
};

double Median(std::vector<double> AValues) {
  const auto Middle = AValues.begin() + static_cast<std::ptrdiff_t>(AValues.size() / 2);
  std::nth_element(AValues.begin(), Middle, AValues.end());
  return *Middle;
}

double Seconds(auto ARun) {
  const auto Start = std::chrono::steady_clock::now();
  ARun();
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - Start).count();
}

void Lines(std::size_t ACount, auto ACall) {
  for (std::size_t i = 0; i < ACount; ++i) ACall();
}

void OnThreads(std::size_t AThreads, auto ARun) {
  std::vector<std::thread> Running;
  for (std::size_t t = 0; t < AThreads; ++t) Running.emplace_back(ARun);
  for (std::thread& Thread : Running) Thread.join();
}

template <class TMessage>
TMessage MessageAs() {
  if constexpr (std::same_as<TMessage, std::string>) return ToUTF8(cMessage);
  else return cMessage;
}

// In these two cases both sides take turns, so that what the machine does meanwhile meets both. The counter is the
// median of the rounds.

// One log call that writes, against the same bytes, preformatted, through one write(2): time to time.
template <class TMessage>
void LineByLoggerToOneWrite(benchmark::State& AState) {
  constexpr std::size_t cLines = 5000;
  const TPlainFile File;
  const TLogging Logging;
  const auto Message = MessageAs<TMessage>();
  Logging.Log->Info(Message);
  std::vector<double> Ratios;
  std::size_t Allocated = 0;
  for (auto _ : AState) {
    const double Plain = Seconds([&] { Lines(cLines, [&] { File.Put(cLine, sizeof cLine - 1); }); });
    const std::size_t Before = Allocations;
    const double Logged = Seconds([&] { Lines(cLines, [&] { Logging.Log->Info(Message); }); });
    Allocated += Allocations - Before;
    Ratios.push_back(Logged / Plain);
  }
  AState.counters["ratio"] = Median(Ratios);
  AState.counters["allocations"] = static_cast<double>(Allocated) / static_cast<double>(cLines * Ratios.size());
}
BENCHMARK(LineByLoggerToOneWrite<UnicodeString>)
    ->Name("LineByLoggerToOneWrite")
    ->Unit(benchmark::kMillisecond)
    ->Iterations(101);
BENCHMARK(LineByLoggerToOneWrite<std::string>)
    ->Name("Utf8LineByLoggerToOneWrite")
    ->Unit(benchmark::kMillisecond)
    ->Iterations(101);

// Layouts of a host that make the line of the simple one.
class THostTextLayout : public Implements<TZqLogBase, IZqLogLayout> {
 public:
  using Implements::Implements;
  UnicodeString GetHeader() override { return {}; }
  UnicodeString GetFooter() override { return {}; }
  UnicodeString FormatLine(const UnicodeString& ALoggerName, TZqLogLevel, const UnicodeString& ALogMessage, PZqDataRec,
      TZqLogIndent) override {
    return u"2021-12-23 10:53:18:123 - Info " + ALoggerName + u" - " + ALogMessage;
  }

 protected:
  ~THostTextLayout() override = default;
};
class THostByteLayout : public Implements<THostTextLayout, IZqLogByteLayout> {
 public:
  using Implements::Implements;
  void AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel, const UnicodeString& ALogMessage,
      PZqDataRec, TZqLogIndent) override {
    ALine.AppendBytes("2021-12-23 10:53:18:123 - Info ");
    ALine.Append(ALoggerName);
    ALine.AppendBytes(" - ");
    ALine.Append(ALogMessage);
  }

 protected:
  ~THostByteLayout() override = default;
};

// A line by another appender and layout against the same line by the rolling one and the simple one: time to time.
void OtherToSimple(benchmark::State& AState, TZqLogBaseClass AAppender, TZqLogBaseClass ALayout) {
  constexpr std::size_t cLines = 5000;
  const TLogging Simple;
  const auto Host = IntfRef<IZqLogBase>(AAppender.Create(Logger(), u"host")).As<IZqLogAppenderEx>();
  Host.As<IZqFileAppender>()->SetFileName(FromUTF8(Simple.Folder.Path + "/host.log"));
  Host->SetLayout(ALayout);
  const UnicodeString Message = cMessage;
  std::vector<double> Ratios;
  for (auto _ : AState) {
    const double Own = Seconds([&] { Lines(cLines, [&] { Simple.Log->Info(Message); }); });
    Logger()->ClearAppenders();
    Logger()->AddAppender(Host.As<IZqLogAppender>());
    const double Hosts = Seconds([&] { Lines(cLines, [&] { Simple.Log->Info(Message); }); });
    Logger()->ClearAppenders();
    Logger()->AddAppender(Simple.Appender);
    Ratios.push_back(Hosts / Own);
  }
  AState.counters["ratio"] = Median(Ratios);
}
void Rounds(benchmark::internal::Benchmark* ABenchmark) { ABenchmark->Unit(benchmark::kMillisecond)->Iterations(101); }
constexpr auto cAppender = TZqLogBaseClass::Of<TZqFileAppender>;
BENCHMARK_CAPTURE(OtherToSimple, bytes_of_a_host, cAppender(), TZqLogBaseClass::Of<THostByteLayout>())->Apply(Rounds);
BENCHMARK_CAPTURE(OtherToSimple, text_of_a_host, cAppender(), TZqLogBaseClass::Of<THostTextLayout>())->Apply(Rounds);
BENCHMARK_CAPTURE(OtherToSimple, rolling_by_date, TZqLogBaseClass::Of<TZqDailyRollingFileAppender>(),
    TZqLogBaseClass::Of<TZqSimpleLayout>())
    ->Apply(Rounds);
BENCHMARK_CAPTURE(OtherToSimple, xml, cAppender(), TZqLogBaseClass::Of<TZqXmlLayout>())->Apply(Rounds);

// The text of the time in each of 1000 lines a second, against one strftime for each: time to time.
void TimeTextToStrftime(benchmark::State& AState) {
  constexpr Int64 cFirst = 1640256798000, cLines = 100000;
  const auto OfSecond = [](Int64 ASecond) {
    return FormatUtcStamp(UnixMillisecondsToDateTime(LocalMilliseconds(ASecond))).ToUTF8();
  };
  std::vector<double> Ratios;
  for (auto _ : AState) {
    TZqSecondText Text(OfSecond);
    const double Own = Seconds([&] {
      for (Int64 i = 0; i < cLines; ++i) benchmark::DoNotOptimize(Text.At(cFirst + i).data());
    });
    const double Plain = Seconds([&] {
      char Buffer[32];
      tm Time{};
      const std::time_t First = cFirst / 1000;
      ::gmtime_r(&First, &Time);
      for (Int64 i = 0; i < cLines; ++i) {
        Time.tm_sec = static_cast<int>(i / 1000 % 60);
        benchmark::DoNotOptimize(std::strftime(Buffer, sizeof Buffer, "%Y-%m-%dT%H:%M:%SZ", &Time));
      }
    });
    Ratios.push_back(Own / Plain);
  }
  AState.counters["ratio"] = Median(Ratios);
}
BENCHMARK(TimeTextToStrftime)->Apply(Rounds);

// Threads on one appender, against the same bytes written under one std::mutex: lines per second to lines per second.
void ThreadsOnOneAppenderToOneMutex(benchmark::State& AState) {
  constexpr std::size_t cLines = 20000;
  const auto Threads = static_cast<std::size_t>(AState.range(0));
  const TPlainFile File;
  std::mutex Mutex;
  const TLogging Logging;
  const UnicodeString Message = cMessage;
  std::vector<double> Ratios;
  for (auto _ : AState) {
    const auto PutLocked = [&] {
      const std::lock_guard Guard(Mutex);
      File.Put(cLine, sizeof cLine - 1);
    };
    const double Plain = Seconds([&] { OnThreads(Threads, [&] { Lines(cLines, PutLocked); }); });
    const double Logged =
        Seconds([&] { OnThreads(Threads, [&] { Lines(cLines, [&] { Logging.Log->Info(Message); }); }); });
    Ratios.push_back(Plain / Logged);
  }
  AState.counters["ratio"] = Median(Ratios);
}
BENCHMARK(ThreadsOnOneAppenderToOneMutex)->Arg(2)->Arg(4)->Unit(benchmark::kMillisecond)->UseRealTime()->Iterations(21);

// A call below the level, chain of three loggers, against two uncontended pairs of std::recursive_mutex.
void TwoRecursiveMutexPairs(benchmark::State& AState) {
  std::recursive_mutex A;
  std::recursive_mutex B;
  for (auto _ : AState) {
    A.lock();
    benchmark::ClobberMemory();
    A.unlock();
    B.lock();
    benchmark::ClobberMemory();
    B.unlock();
  }
}
template <class TMessage>
void CallBelowTheLevel(benchmark::State& AState) {
  const TLogging Logging;
  Logger()->SetLevel(llError);
  const auto Message = MessageAs<TMessage>();
  const std::size_t Before = Allocations;
  for (auto _ : AState) Logging.Log->Info(Message);
  AState.counters["allocations"] = static_cast<double>(Allocations - Before) / static_cast<double>(AState.iterations());
  Logger()->SetLevel(llDebug);
}
BENCHMARK(TwoRecursiveMutexPairs)->Repetitions(5)->ReportAggregatesOnly();
BENCHMARK(CallBelowTheLevel<UnicodeString>)->Name("CallBelowTheLevel")->Repetitions(5)->ReportAggregatesOnly();
BENCHMARK(CallBelowTheLevel<std::string>)->Name("Utf8CallBelowTheLevel")->Repetitions(5)->ReportAggregatesOnly();

// 200,000 lines that roll at 1 MiB with 5 backups, against a loop that formats, writes and rolls the same way by hand.
constexpr std::size_t cRollLines = 200000;
constexpr std::size_t cRollSize = 1 << 20;

class THandRoller {
 public:
  explicit THandRoller(const std::string& AFolder) : FBase(AFolder + "/app") { Open(); }
  ~THandRoller() { End(); }
  void Line(const char* AText) {
    if (FSize >= cRollSize) Roll();
    char Buffer[512];
    timespec Time{};
    ::clock_gettime(CLOCK_REALTIME, &Time);
    tm Local{};
    ::localtime_r(&Time.tv_sec, &Local);
    Put(Buffer, std::snprintf(Buffer, sizeof Buffer, "%04d-%02d-%02d %02d:%02d:%02d:%03ld - Info root - %s\r\n",
                    Local.tm_year + 1900, Local.tm_mon + 1, Local.tm_mday, Local.tm_hour, Local.tm_min, Local.tm_sec,
                    Time.tv_nsec / 1000000, AText));
  }

 private:
  void Put(const char* AText, int ALength) {
    if (::write(FHandle, AText, static_cast<std::size_t>(ALength)) != ALength) std::abort();
    FSize += static_cast<std::size_t>(ALength);
  }
  void Mark(const char* AText, const char* AEnd) {
    char Buffer[128];
    const std::time_t Time = std::time(nullptr);
    tm Local{};
    ::localtime_r(&Time, &Local);
    Put(Buffer, std::snprintf(Buffer, sizeof Buffer, "%s%04d-%02d-%02d %02d:%02d:%02d%s", AText, Local.tm_year + 1900,
                    Local.tm_mon + 1, Local.tm_mday, Local.tm_hour, Local.tm_min, Local.tm_sec, AEnd));
  }
  void Open() {
    FHandle = ::open((FBase + ".log").c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666);
    FSize = 0;
    Mark("Log started on : ", "\r\n");
  }
  void End() {
    Mark("Log stopped on : ", "");
    ::close(FHandle);
  }
  void Roll() {
    End();
    const auto Name = [&](int i) { return i == 0 ? FBase + ".log" : FBase + "." + std::to_string(i) + ".log"; };
    std::error_code Ignored;
    std::filesystem::remove(Name(4), Ignored);
    for (int i = 4; i-- > 0;) std::filesystem::rename(Name(i), Name(i + 1), Ignored);
    Open();
  }

  std::string FBase;
  int FHandle = -1;
  std::size_t FSize = 0;
};

void RollByHand(benchmark::State& AState) {
  for (auto _ : AState) {
    const TFolder Folder;
    THandRoller Roller(Folder.Path);
    for (std::size_t i = 0; i < cRollLines; ++i)
      Roller.Line("The quick brown fox jumps over the lazy dog and comes back 12");
  }
}
void RollByAppender(benchmark::State& AState) {
  const UnicodeString Message = cMessage;
  for (auto _ : AState) {
    const TLogging Logging(cRollSize, 5);
    for (std::size_t i = 0; i < cRollLines; ++i) Logging.Log->Info(Message);
  }
}
BENCHMARK(RollByHand)->Unit(benchmark::kMillisecond)->Iterations(1)->Repetitions(5)->ReportAggregatesOnly();
BENCHMARK(RollByAppender)->Unit(benchmark::kMillisecond)->Iterations(1)->Repetitions(5)->ReportAggregatesOnly();

// Heap in use after 10,000 and after 1,000,000 lines: the two counters are to be equal.
void HeapOfManyLines(benchmark::State& AState) {
  const UnicodeString Message = cMessage;
  const TLogging Logging(cRollSize, 5);
  for (auto _ : AState) {
    for (std::size_t i = 0; i < 10000; ++i) Logging.Log->Info(Message);
    const std::size_t Early = ::mallinfo2().uordblks;
    for (std::size_t i = 10000; i < 1000000; ++i) Logging.Log->Info(Message);
    AState.counters["heap10k"] = static_cast<double>(Early);
    AState.counters["heap1M"] = static_cast<double>(::mallinfo2().uordblks);
  }
}
BENCHMARK(HeapOfManyLines)->Unit(benchmark::kMillisecond)->Iterations(1);

}  // namespace
