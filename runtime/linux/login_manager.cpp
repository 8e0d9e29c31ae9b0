#include "runtime/linux/login_manager.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <string_view>
#include <utility>

#include "runtime/platform/session_service.h"

namespace zq {

namespace {

constexpr std::uint64_t cCallTimeout = 5'000'000;  // microseconds
constexpr Cardinal cRetry = 1000;                  // milliseconds

constexpr const char* cName = "org.freedesktop.login1";
constexpr const char* cManagerInterface = "org.freedesktop.login1.Manager";
constexpr const char* cSessionInterface = "org.freedesktop.login1.Session";
constexpr const char* cProperties = "org.freedesktop.DBus.Properties";
constexpr std::string_view cSessionFolder = "/org/freedesktop/login1/session/";

constexpr const char* cRules[] = {"type='signal',sender='org.freedesktop.login1',path='/org/freedesktop/login1'",
    "type='signal',sender='org.freedesktop.login1',path_namespace='/org/freedesktop/login1/session'"};

// The session of an object; "_31" in a path stands for "1". Empty for another object.
std::string SessionOfPath(const char* APath) {
  std::string_view Rest = APath == nullptr ? "" : APath;
  if (!Rest.starts_with(cSessionFolder)) return {};
  Rest.remove_prefix(cSessionFolder.size());
  std::string Result;
  for (std::size_t i = 0; i < Rest.size(); ++i) {
    int Code = 0;
    const char* const Digits = Rest.data() + i + 1;
    const bool Escaped =
        Rest[i] == '_' && i + 2 < Rest.size() && std::from_chars(Digits, Digits + 2, Code, 16).ptr == Digits + 2;
    Result += Escaped ? static_cast<char>(Code) : Rest[i];
    if (Escaped) i += 2;
  }
  return Result;
}

}  // namespace

constinit const TLoginManager::TPlace TLoginManager::cManager{cName, "/org/freedesktop/login1", cManagerInterface};
constinit const TLoginManager::TPlace TLoginManager::cBus{
    "org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus"};

TLoginManager::~TLoginManager() {
  if (FRetry != 0) FQueue->KillTimer(FRetry);
  FQueue->DropPosted(this);
  Close();
}

TLoginManager::TDelay::~TDelay() { ::close(Lock); }

// ---- The connection ------------------------------------------------------------------------------------------------

// Null with FFailure where that fails.
template <class... TArgs>
TLoginManager::TMessage TLoginManager::Call(
    const TPlace& APlace, const char* AMember, const char* ATypes, TArgs... AArgs) {
  sd_bus_message* Reply = nullptr;
  FFailure = -FLibrary->sd_bus_call_method(
      FBus, APlace.Destination, APlace.Path, APlace.Interface, AMember, nullptr, &Reply, ATypes, AArgs...);
  return TMessage(FFailure > 0 ? nullptr : Reply);
}

int TLoginManager::Connect() {
  if (FBus != nullptr) return 0;
  FLibrary = TBusLibrary::Get();
  if (FLibrary == nullptr || !FLibrary->IsWhole()) return ENOSYS;
  if (const int Failure = Open(); Failure != 0) {
    Close();
    return Failure;
  }
  if (FRetry != 0) FQueue->KillTimer(std::exchange(FRetry, 0));
  FQueue->Post([this] { Pump(); }, this);  // what has come between the answers
  return 0;
}

int TLoginManager::Open() try {
  if (const int Result = FLibrary->sd_bus_open_system(&FBus); Result < 0) return -Result;
  FLibrary->sd_bus_set_method_call_timeout(FBus, cCallTimeout);
  if (const int Failure = Subscribe(); Failure != 0) return Failure;
  if (const int Failure = ReadSessions(); Failure != 0) return Failure;
  TakeDelay();
  FDescriptor = FLibrary->sd_bus_get_fd(FBus);
  if (FDescriptor < 0) return -FDescriptor;
  FQueue->Watch(FDescriptor, TThreadQueue::TReady::ToRead, [this] { Pump(); });
  return 0;
} catch (const EThread&) {
  return EMFILE;
}

int TLoginManager::Subscribe() {
  for (const char* const Rule : cRules)
    if (Call(cBus, "AddMatch", "s", Rule) == nullptr) return FFailure;
  return 0;
}

// The first time they are taken as they are; later, what has changed is told.
int TLoginManager::ReadSessions() {
  const TMessage Reply = Call(cManager, "ListSessions", nullptr);
  if (Reply == nullptr) return FFailure;
  std::map<std::string, TSession> Gone = FSessions;
  const char *ID = nullptr, *User = nullptr, *Seat = nullptr, *Path = nullptr;
  std::uint32_t UserID = 0;
  FLibrary->sd_bus_message_enter_container(Reply.get(), 'a', "(susso)");
  while (FLibrary->sd_bus_message_read(Reply.get(), "(susso)", &ID, &UserID, &User, &Seat, &Path) > 0) {
    Gone.erase(ID);
    if (FKnowsSessions) Began(ID, Path);
    else FSessions[ID] = Describe(Path);
  }
  FKnowsSessions = true;
  for (const auto& [Session, Facts] : Gone) Ended(Session);
  return 0;
}

// It is refused to some, who then hear all the same, but may be late.
void TLoginManager::TakeDelay() {
  if (FDelay != nullptr) return;
  const TMessage Reply = Call(cManager, "Inhibit", "ssss", "sleep:shutdown", program_invocation_short_name,
      "Is told before the system sleeps or ends", "delay");
  int Lock = -1;
  if (Reply == nullptr || FLibrary->sd_bus_message_read(Reply.get(), "h", &Lock) <= 0) return;
  Lock = ::fcntl(Lock, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);  // the other one is the message's
  if (Lock >= 0) FDelay = std::make_shared<const TDelay>(Lock);
}

// A call behind those of the listener has it from now on. It may be late: the login manager doesn't wait for ever.
void TLoginManager::ReleaseDelay() {
  FQueue->Post([Held = std::exchange(FDelay, nullptr)] {}, this);
}

void TLoginManager::Close() noexcept {
  if (FDescriptor >= 0) FQueue->Unwatch(std::exchange(FDescriptor, -1));
  if (FBus != nullptr) FLibrary->sd_bus_flush_close_unref(std::exchange(FBus, nullptr));
  FDelay.reset();
  for (auto& [Name, Session] : FSessions) Session.Locked.reset();  // it may change unheard
}

void TLoginManager::Pump() {
  while (FBus != nullptr) {
    sd_bus_message* Message = nullptr;
    const int Result = FLibrary->sd_bus_process(FBus, &Message);
    if (Result == 0) return;
    const TMessage Kept(Message);
    if (Message != nullptr) Hear(Message);
    if (Result > 0) continue;
    Close();
    FRetry = FQueue->SetTimer(cRetry, [this] { Connect(); });
  }
}

// ---- What it tells -------------------------------------------------------------------------------------------------

// Anyone may send a signal straight to this connection.
bool TLoginManager::IsFromManager(sd_bus_message* AMessage) {
  const char* const Sender = FLibrary->sd_bus_message_get_sender(AMessage);
  const TMessage Reply = Call(cBus, "GetNameOwner", "s", cName);
  const char* Owner = nullptr;
  if (Sender == nullptr || Reply == nullptr || FLibrary->sd_bus_message_read(Reply.get(), "s", &Owner) <= 0)
    return false;
  return std::string_view(Sender) == Owner;
}

void TLoginManager::Hear(sd_bus_message* AMessage) {
  if (!FLibrary->sd_bus_message_is_signal(AMessage, nullptr, nullptr) || !IsFromManager(AMessage)) return;
  const std::string Session = SessionOfPath(FLibrary->sd_bus_message_get_path(AMessage));
  if (Session.empty()) HearManager(AMessage);
  else HearSession(AMessage, Session);
}

void TLoginManager::HearManager(sd_bus_message* AMessage) {
  const auto Is = [&](const char* AName) {
    return FLibrary->sd_bus_message_is_signal(AMessage, cManagerInterface, AName) > 0;
  };
  int Comes = 0;
  const char *Session = nullptr, *Path = nullptr;
  if (Is("PrepareForSleep") && FLibrary->sd_bus_message_read(AMessage, "b", &Comes) > 0) {
    FListener.SleepComes(Comes != 0);
  } else if (Is("PrepareForShutdown") && FLibrary->sd_bus_message_read(AMessage, "b", &Comes) > 0) {
    FListener.EndComes(Comes != 0);
  } else {
    if (FLibrary->sd_bus_message_read(AMessage, "so", &Session, &Path) <= 0) return;
    if (Is("SessionNew")) Began(Session, Path);
    if (Is("SessionRemoved")) Ended(Session);
    return;
  }
  if (Comes != 0) ReleaseDelay();
  else TakeDelay();
}

void TLoginManager::HearSession(sd_bus_message* AMessage, const std::string& ASession) {
  for (const auto& [Signal, Locks] : {std::pair("Lock", true), std::pair("Unlock", false)})
    if (FLibrary->sd_bus_message_is_signal(AMessage, cSessionInterface, Signal) > 0) SetLocked(ASession, Locks);
  if (FLibrary->sd_bus_message_is_signal(AMessage, cProperties, "PropertiesChanged") > 0)
    HearProperties(AMessage, ASession);
}

void TLoginManager::HearProperties(sd_bus_message* AMessage, const std::string& ASession) {
  const char *Interface = nullptr, *Property = nullptr;
  if (FLibrary->sd_bus_message_read(AMessage, "s", &Interface) <= 0 || std::string_view(Interface) != cSessionInterface)
    return;
  FLibrary->sd_bus_message_enter_container(AMessage, 'a', "{sv}");
  while (FLibrary->sd_bus_message_enter_container(AMessage, 'e', "sv") > 0) {
    FLibrary->sd_bus_message_read(AMessage, "s", &Property);
    const std::string_view Name = Property;
    int Value = 0;
    if (Name != "Active" && Name != "LockedHint") FLibrary->sd_bus_message_skip(AMessage, "v");
    else if (FLibrary->sd_bus_message_read(AMessage, "v", "b", &Value) <= 0) return;
    if (Name == "LockedHint") SetLocked(ASession, Value != 0);
    if (Name == "Active") SetActive(ASession, Value != 0);
    FLibrary->sd_bus_message_exit_container(AMessage);
  }
}

// A session that is gone meanwhile keeps what most have.
TLoginManager::TSession TLoginManager::Describe(const char* APath) {
  TSession Result;
  const TPlace Place{cName, APath, cProperties};
  int Remote = 0;
  const char* Class = nullptr;
  if (const TMessage Reply = Call(Place, "Get", "ss", cSessionInterface, "Remote"); Reply != nullptr)
    if (FLibrary->sd_bus_message_read(Reply.get(), "v", "b", &Remote) > 0) Result.Remote = Remote != 0;
  if (const TMessage Reply = Call(Place, "Get", "ss", cSessionInterface, "Class"); Reply != nullptr)
    if (FLibrary->sd_bus_message_read(Reply.get(), "v", "s", &Class) > 0)
      Result.IsUser = std::string_view(Class).starts_with("user");
  return Result;
}

void TLoginManager::Began(const std::string& ASession, const char* APath) {
  if (FSessions.contains(ASession)) return;  // came between the subscription and the list
  const TSession Facts = FSessions[ASession] = Describe(APath);
  FListener.SessionChanged(WTS_SESSION_CREATE, ASession);
  if (Facts.Remote) FListener.SessionChanged(WTS_REMOTE_CONNECT, ASession);
  if (Facts.IsUser) FListener.SessionChanged(WTS_SESSION_LOGON, ASession);
}

void TLoginManager::Ended(const std::string& ASession) {
  const auto Found = FSessions.find(ASession);
  if (Found == FSessions.end()) return;
  const TSession Facts = Found->second;
  FSessions.erase(Found);
  if (Facts.IsUser) FListener.SessionChanged(WTS_SESSION_LOGOFF, ASession);
  if (Facts.Remote) FListener.SessionChanged(WTS_REMOTE_DISCONNECT, ASession);
  FListener.SessionChanged(WTS_SESSION_TERMINATE, ASession);
}

void TLoginManager::SetActive(const std::string& ASession, bool AActive) {
  const NativeUInt Event = FSessions[ASession].Remote ? (AActive ? WTS_REMOTE_CONNECT : WTS_REMOTE_DISCONNECT)
                                                      : (AActive ? WTS_CONSOLE_CONNECT : WTS_CONSOLE_DISCONNECT);
  FListener.SessionChanged(Event, ASession);
}

// A lock is asked for by a signal and confirmed by a property, or one of both.
void TLoginManager::SetLocked(const std::string& ASession, bool ALocked) {
  if (std::exchange(FSessions[ASession].Locked, ALocked) == ALocked) return;
  FListener.SessionChanged(ALocked ? WTS_SESSION_LOCK : WTS_SESSION_UNLOCK, ASession);
}

}  // namespace zq
