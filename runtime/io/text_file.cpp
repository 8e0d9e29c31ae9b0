#include "runtime/io/text_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <limits>
#include <utility>

#include "runtime/core/exceptions.h"
#include "runtime/core/utf8.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/platform/disk_service.h"
#include "runtime/text/code_pages.h"
#include "runtime/text/encoding.h"

namespace zq {

namespace {

constexpr Word cUTF8 = 65001;
constexpr std::string_view cLineEnd = "\r\n";
constexpr std::size_t cOnStack = 2048;
constexpr std::size_t cKeptRoom = 1 << 20;

std::size_t MaxBytesPerUnit(Word ACodePage) noexcept {
  const TCodePage* const Page = FindCodePage(ActualCodePage(ACodePage));
  return Page == nullptr ? 1 : Page->BytesPerUnit;  // what has no row, the conversion refuses
}

// Bytes written to ADest, which has ARoom; 0 for a text that the code page's converter refuses.
std::size_t EncodeTo(char* ADest, std::size_t ARoom, std::u16string_view AText, Word ACodePage) {
  if (ACodePage == cUTF8) return utf8::Encode(AText.data(), AText.size(), ADest);
  return static_cast<std::size_t>(
      WideCharToMultiByte(ACodePage, 0, AText.data(), static_cast<int>(AText.size()), ADest, static_cast<int>(ARoom)));
}

char* Copy(char* ADest, std::string_view ABytes) noexcept { return std::copy(ABytes.begin(), ABytes.end(), ADest); }

}  // namespace

TTextFile::~TTextFile() {
  if (IsOpen()) Service<TDiskService>().Close(FHandle);
}

void TTextFile::Assign(const UnicodeString& AFileName, Word ACodePage) {
  Close();
  FFileName = AFileName;
  FCodePage = ACodePage;
}

void TTextFile::Rewrite() { Open(O_CREAT | O_TRUNC, u"create"); }

void TTextFile::Append() { Open(0, u"open"); }

void TTextFile::AppendOrCreate() {
  Open(O_CREAT, u"open");
  char Last = '\n';
  FTorn = Service<TDiskService>().ReadTail(ToSystemPath(FFileName).c_str(), &Last, 1) == 1 && Last != '\n';
}

void TTextFile::Open(int AFlags, const char16_t* AStep) {
  Close();
  const std::string Path = ToSystemPath(FFileName);
  // A pipe that nobody reads is a failure then, and no endless wait; writing waits as it does for any file.
  FHandle = Service<TDiskService>().Open(Path.c_str(), AFlags | O_WRONLY | O_APPEND | O_NOCTTY | O_NONBLOCK, 0666);
  if (!IsOpen()) Fail(AStep, errno);
  ::fcntl(FHandle, F_SETFL, O_APPEND);
  FProcess = ::getpid();
  FWritten = 0;
  FTorn = false;
}

void TTextFile::Write(const UnicodeString& AText) { WriteText(AText, {}); }

void TTextFile::WriteLn(const UnicodeString& AText) { WriteText(AText, cLineEnd); }

void TTextFile::WriteText(std::u16string_view AText, std::string_view ALineEnd) {
  RequireOpen();
  char OnStack[cOnStack];
  const std::size_t Room = MaxBytesPerUnit(FCodePage) * AText.size();
  if (FCodePage != cUTF8 && Room > std::numeric_limits<int>::max()) Fail(u"write", EFBIG);
  if (Room + 2 * cLineEnd.size() > cOnStack && FLong.size() < Room + 2 * cLineEnd.size())
    FLong.resize(Room + 2 * cLineEnd.size());
  char* const Start = Room + 2 * cLineEnd.size() <= cOnStack ? OnStack : FLong.data();
  char* End = FTorn ? Copy(Start, cLineEnd) : Start;
  if (!AText.empty()) {
    const std::size_t Encoded = EncodeTo(End, Room, AText, FCodePage);
    if (Encoded == 0) Fail(u"write", EILSEQ);
    End += Encoded;
  }
  End = Copy(End, ALineEnd);
  Put({Start, static_cast<std::size_t>(End - Start)});
  if (FLong.size() > cKeptRoom) std::string().swap(FLong);
}

ZQ_HOT void TTextFile::WriteBytes(std::string_view ABytes) {
  RequireOpen();
  if (ABytes.empty()) return;
  if (FTorn) Put(cLineEnd);
  Put(ABytes);
}

ZQ_HOT void TTextFile::Put(std::string_view ABytes) {
  while (!ABytes.empty()) {
    const Int64 Count = Service<TDiskService>().Write(FHandle, ABytes.data(), ABytes.size());
    if (Count < 0 && errno == EINTR) continue;
    if (Count <= 0) Fail(u"write", Count < 0 ? errno : ENOSPC);
    FWritten.store(Written() + Count, std::memory_order_relaxed);
    ABytes.remove_prefix(static_cast<std::size_t>(Count));
    FTorn = !ABytes.empty();
  }
}

void TTextFile::Flush() { RequireOpen(); }

void TTextFile::Close() {
  // The descriptor is gone whatever close says, and EINTR tells of no loss.
  if (IsOpen() && Service<TDiskService>().Close(std::exchange(FHandle, -1)) != 0 && errno != EINTR)
    Fail(u"close", errno);
}

bool TTextFile::Claim() {
  RequireOpen();
  return Service<TDiskService>().Claim(FHandle);
}

bool TTextFile::IsInherited() const noexcept { return IsOpen() && FProcess != ::getpid(); }

void TTextFile::RequireOpen() const {
  if (!IsOpen()) Fail(u"write", EBADF);
}

void TTextFile::Fail(const char16_t* AStep, int AError) const {
  throw EInOutError(
      u"Cannot " + UnicodeString(AStep) + u" file \"" + FFileName + u"\". " + SysErrorMessage(AError), AError);
}

}  // namespace zq
