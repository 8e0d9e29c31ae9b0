#include <fcntl.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <memory>
#include <string>
#include <string_view>

#include "runtime/core/exceptions.h"
#include "runtime/platform/event_log_service.h"

namespace zq {

namespace {

constexpr std::size_t cMostOfSyslog = 8192;  // bytes that every usual daemon takes in one datagram
constexpr std::size_t cMostOfTag = 48;
constexpr int cSocketRoom = 8 << 20;  // bytes; the system gives what its limit allows

struct TSockets {
  std::string Journal = "/run/systemd/journal/socket";
  std::string Syslog = "/dev/log";
};
TSockets& Sockets() {
  static TSockets& Result = *new TSockets;
  return Result;
}

/// One socket serves both daemons and is connected to none: one that starts anew is found, and a forked child writes
/// in its own name.
struct TSource {
  ~TSource() {
    if (Socket >= 0) ::close(Socket);
  }
  sockaddr_un Journal{};
  sockaddr_un Syslog{};
  std::string Identifier;
  std::string Tag;
  int Socket = -1;
};

struct TKind {
  Word Type;
  std::string_view Name;
  int Priority;
};
constexpr TKind cKinds[] = {{EVENTLOG_INFORMATION_TYPE, "information", LOG_INFO},
    {EVENTLOG_SUCCESS, "success", LOG_INFO}, {EVENTLOG_WARNING_TYPE, "warning", LOG_WARNING},
    {EVENTLOG_ERROR_TYPE, "error", LOG_ERR}};

struct TEvent {
  const TKind& Kind;
  Cardinal Id;
  std::string Text;  // UTF-8
};

const TKind& KindOf(Word AType) noexcept {
  const auto* const Found = std::ranges::find(cKinds, AType, &TKind::Type);
  return Found == std::end(cKinds) ? cKinds[0] : *Found;
}

bool IsControl(char AByte) noexcept { return static_cast<unsigned char>(AByte) < ' ' || AByte == '\x7F'; }

// ---- Datagrams

bool SetAddress(sockaddr_un& AAddress, const std::string& APath) noexcept {
  AAddress.sun_family = AF_UNIX;
  errno = ENAMETOOLONG;
  if (APath.size() >= sizeof AAddress.sun_path) return false;
  std::memcpy(AAddress.sun_path, APath.c_str(), APath.size() + 1);
  return true;
}

// With AFile, which isn't negative, that file goes along.
bool Send(const TSource& ASource, const sockaddr_un& ATo, std::string_view AData, int AFile = -1) noexcept {
  iovec Block{const_cast<char*>(AData.data()), AData.size()};
  alignas(cmsghdr) char Control[CMSG_SPACE(sizeof AFile)] = {};
  msghdr Message{};
  Message.msg_name = const_cast<sockaddr_un*>(&ATo);
  Message.msg_namelen = sizeof ATo;
  Message.msg_iov = &Block;
  Message.msg_iovlen = 1;
  if (AFile >= 0) {
    Message.msg_control = Control;
    Message.msg_controllen = sizeof Control;
    cmsghdr* const Header = CMSG_FIRSTHDR(&Message);
    Header->cmsg_level = SOL_SOCKET;
    Header->cmsg_type = SCM_RIGHTS;
    Header->cmsg_len = CMSG_LEN(sizeof AFile);
    std::memcpy(CMSG_DATA(Header), &AFile, sizeof AFile);
  }
  return ::sendmsg(ASource.Socket, &Message, MSG_DONTWAIT | MSG_NOSIGNAL) >= 0;
}

// ---- The journal

// A value with a line break goes behind its length, eight bytes with the low one first.
void AppendField(std::string& AFields, std::string_view AName, std::string_view AValue) {
  AFields += AName;
  if (AValue.find('\n') == AValue.npos) {
    AFields += '=';
  } else {
    AFields += '\n';
    for (UInt64 Size = AValue.size(), i = 0; i < sizeof Size; ++i, Size >>= 8) AFields += static_cast<char>(Size);
  }
  AFields += AValue;
  AFields += '\n';
}

// What no datagram holds goes as a file in memory, which the journal takes only when nobody can change it any more.
bool SendAsFile(const TSource& ASource, std::string_view AFields) noexcept {
  const int File = ::memfd_create("event", MFD_CLOEXEC | MFD_ALLOW_SEALING);
  if (File < 0) return false;
  errno = EFBIG;
  const bool Sent = ::write(File, AFields.data(), AFields.size()) == static_cast<ssize_t>(AFields.size()) &&
                    ::fcntl(File, F_ADD_SEALS, F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE | F_SEAL_SEAL) == 0 &&
                    Send(ASource, ASource.Journal, {}, File);
  const int Reason = errno;
  ::close(File);
  errno = Reason;
  return Sent;
}

bool ToJournal(const TSource& ASource, const TEvent& AEvent) {
  std::string Fields;
  Fields.reserve(AEvent.Text.size() + ASource.Identifier.size() + 128);
  AppendField(Fields, "PRIORITY", std::to_string(AEvent.Kind.Priority));
  AppendField(Fields, "SYSLOG_IDENTIFIER", ASource.Identifier);
  AppendField(Fields, "EVENT_TYPE", AEvent.Kind.Name);
  AppendField(Fields, "EVENT_ID", std::to_string(AEvent.Id));
  AppendField(Fields, "MESSAGE", AEvent.Text);
  return Send(ASource, ASource.Journal, Fields) ||
         ((errno == EMSGSIZE || errno == ENOBUFS) && SendAsFile(ASource, Fields));
}

// ---- Syslog

// "<14>Dec  3 10:53:18 shop[4711]: "
std::string SyslogHead(const TSource& ASource, const TEvent& AEvent) {
  const std::time_t Now = std::time(nullptr);
  char Date[26] = {};  // "Fri Dec  3 10:53:18 2021\n", in English whatever the locale
  if (::ctime_r(&Now, Date) == nullptr) Date[0] = '\0';
  const std::string_view Time =
      std::string_view(Date).size() < 19 ? std::string_view() : std::string_view(Date + 4, 15);
  return '<' + std::to_string(LOG_USER | AEvent.Kind.Priority) + '>' + std::string(Time) + ' ' + ASource.Tag + '[' +
         std::to_string(::getpid()) + "]: ";
}

std::string Escaped(std::string_view AText) {
  std::string Result;
  Result.reserve(AText.size());
  for (const char Byte : AText) {
    if (!IsControl(Byte) || Byte == '\t') {
      Result += Byte;
      continue;
    }
    Result += {'#', static_cast<char>('0' + Byte / 64), static_cast<char>('0' + Byte / 8 % 8),
        static_cast<char>('0' + Byte % 8)};
  }
  return Result;
}

// At most AMost bytes off the front of ARest, which is UTF-8, and no piece of a character.
std::string_view TakeFront(std::string_view& ARest, std::size_t AMost) noexcept {
  std::size_t Size = std::min(ARest.size(), AMost);
  while (Size < ARest.size() && Size > 0 && (ARest[Size] & 0xC0) == 0x80) --Size;
  const std::string_view Result = ARest.substr(0, Size);
  ARest.remove_prefix(Size);
  return Result;
}

bool ToSyslog(const TSource& ASource, const TEvent& AEvent) {
  const std::string Head = SyslogHead(ASource, AEvent), Text = Escaped(AEvent.Text);
  std::string_view Rest = Text;
  do {
    std::string Line = Head;
    Line += TakeFront(Rest, cMostOfSyslog - Head.size());
    if (!Send(ASource, ASource.Syslog, Line)) return false;
  } while (!Rest.empty());
  return true;
}

std::string TagOf(const std::string& AIdentifier) {
  std::string_view Rest = AIdentifier;
  std::string Result(TakeFront(Rest, cMostOfTag));
  std::ranges::replace_if(
      Result, [](char AByte) { return std::string_view(" :[]").find(AByte) != std::string_view::npos; }, '_');
  return Result;
}

class TLinuxEventLog final : public TEventLogService {
 public:
  NativeUInt RegisterEventSourceW(const UnicodeString& ASource) override {
    auto Result = std::make_unique<TSource>();
    Result->Identifier = ASource.IsEmpty() ? program_invocation_short_name : ASource.ToUTF8();
    std::ranges::replace_if(Result->Identifier, IsControl, '_');
    Result->Tag = TagOf(Result->Identifier);
    if (SetAddress(Result->Journal, Sockets().Journal) && SetAddress(Result->Syslog, Sockets().Syslog))
      Result->Socket = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    if (Result->Socket < 0) {
      Refuse();
      return 0;
    }
    ::setsockopt(Result->Socket, SOL_SOCKET, SO_SNDBUF, &cSocketRoom, sizeof cSocketRoom);
    return reinterpret_cast<NativeUInt>(Result.release());
  }

  bool DeregisterEventSource(NativeUInt AHandle) override {
    errno = EBADF;
    if (AHandle == 0) return Refuse();
    delete reinterpret_cast<TSource*>(AHandle);
    return true;
  }

  bool ReportEventW(NativeUInt AHandle, Word AType, Cardinal AEventId, const UnicodeString& AText) override {
    errno = EBADF;
    if (AHandle == 0) return Refuse();
    const TSource& Source = *reinterpret_cast<const TSource*>(AHandle);
    const TEvent Event{KindOf(AType), AEventId, AText.ToUTF8()};
    // A full journal is one that is there.
    return ToJournal(Source, Event) || (errno != EAGAIN && ToSyslog(Source, Event)) || Refuse();
  }

 private:
  static bool Refuse() noexcept {
    SetLastError(static_cast<Cardinal>(errno));
    return false;
  }
};

constinit TLinuxEventLog LinuxEventLog;

}  // namespace

constinit TServiceSlot<TEventLogService> TEventLogService::Slot(LinuxEventLog);

void SetEventLogSockets(const std::string& AJournal, const std::string& ASyslog) { Sockets() = {AJournal, ASyslog}; }

}  // namespace zq
