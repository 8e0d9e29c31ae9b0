#include "common/uZqLogger.h"

#include <algorithm>
#include <atomic>
#include <iterator>
#include <utility>

#include "common/uZqLogAppenders.h"
#include "common/uZqLogger/walk.h"
#include "common/uZqSysUtils.h"
#include "common/uZqTypes.h"
#include "common/uZqWindows.h"
#include "runtime/core/start_count.h"
#include "runtime/io/string_list.h"
#include "runtime/platform/version_service.h"
#include "runtime/sync/event.h"
#include "runtime/text/datetime.h"
#include "runtime/text/format.h"
#include "runtime/text/local_time.h"
#include "runtime/text/numbers.h"
#include "runtime/values/typeinfo.h"

namespace zq {

namespace {

constexpr Cardinal cLockWait = 5001;  // milliseconds
constexpr Integer cMostWithin = 200;  // messages that appenders log into their own logger, out of one
constexpr char16_t cAppenderListRequest[] = u".AppenderList.Remove";
constexpr char16_t cLoggerListRequest[] = u".LoggerList.Remove";

constinit TStartCount Starts;
std::atomic<TZqLogger*> RootLogger = nullptr;
constinit std::mutex RootLock;
std::atomic<TZqLogBaseClassList*> LayoutClasses = nullptr;
std::atomic<TZqLogBaseClassList*> AppenderClasses = nullptr;
std::vector<TZqLogBase*>* Appenders = nullptr;  // every appender alive
constinit std::mutex AppendersLock;
constinit TCriticalSection EndLock;  // held while an appender or a list ends: linked components must not at one time
const std::shared_ptr<const void>* EndToken = nullptr;  // under EndLock: for the entries of the appender that ends

// Holds a log lock for a scope, for a requester that is a name and an operation.
class TLogLockScope {
 public:
  TLogLockScope(TZqLogLock& ALock, const UnicodeString& AOwner, const char16_t* AOperation) : FLock(ALock) {
    FLock.Enter(AOwner, AOperation, true);
  }
  TLogLockScope(const TLogLockScope&) = delete;
  TLogLockScope& operator=(const TLogLockScope&) = delete;
  ~TLogLockScope() { FLock.Leave(); }

 private:
  TZqLogLock& FLock;
};

TZqDataRec VariantRec(const Variant& AValue) {
  TZqDataRec Result;
  Result.DataType = rtkVariant;
  Result.VVariant = &AValue;
  return Result;
}

TZqDataRec ObjectRec(const TObject* AValue) {
  TZqDataRec Result;
  Result.DataType = rtkObject;
  Result.VObject = AValue;
  return Result;
}

TZqDataRec ExceptionRec(const Exception& AValue) {
  TZqDataRec Result;
  Result.DataType = rtkException;
  Result.VException = &AValue;
  return Result;
}

UnicodeString MethodOf(const TObject* AObject, const TText& AMethodName) {
  return AObject->ClassName() + u"." + AMethodName.ToString();
}

}  // namespace

// ---------------------------------------------------------------------------------------- TZqLogLock

ZQ_HOT bool TZqLogLock::Take(const UnicodeString& AOwner, const char16_t* AOperation, bool ARaise) {
  if (FLock.TryEnterFor(cLockWait)) return true;
  if (ARaise)
    throw Exception(u"A lock was requested by %s (ThreadId: %d), however  logger has already been locked by %s!",
        {AOwner + AOperation, GetCurrentThreadId(), LockedBy()});
  return false;
}

ZQ_HOT bool TZqLogLock::Enter(const UnicodeString& AOwner, const char16_t* AOperation, bool ARaise) {
  if (!Take(AOwner, AOperation, ARaise)) return false;
  FOwner.store(&AOwner, std::memory_order_relaxed);
  FOperation.store(AOperation, std::memory_order_relaxed);
  FThread.store(GetCurrentThreadId(), std::memory_order_relaxed);
  return true;
}

bool TZqLogLock::Enter(const UnicodeString& ALockRequestedBy, bool ARaise) {
  if (!Take(ALockRequestedBy, u"", ARaise)) return false;
  const std::lock_guard Guard(FTextLock);
  FText = ALockRequestedBy;
  FOwner.store(nullptr, std::memory_order_relaxed);
  FThread.store(GetCurrentThreadId(), std::memory_order_relaxed);
  return true;
}

UnicodeString TZqLogLock::LockedBy() const {
  const std::lock_guard Guard(FTextLock);
  const UnicodeString* const Owner = FOwner.load(std::memory_order_relaxed);
  const UnicodeString Requester = Owner == nullptr ? FText : *Owner + FOperation.load(std::memory_order_relaxed);
  return Format(u"%s (ThreadId: %d)", {Requester, FThread.load(std::memory_order_relaxed)});
}

// ---------------------------------------------------------------------------------------- TZqLoggerList

TZqLoggerList::~TZqLoggerList() {
  try {
    Assert(FList.empty());
  } catch (const Exception&) {  // a destructor has nobody to tell
  }
}

void TZqLoggerList::AddLogger(TZqLogger* ALogger) {
  const TLogLockScope Scope(FLock, FLogger->FFullName, cLoggerListRequest);
  FList.push_back(ALogger);
}

void TZqLoggerList::RemoveLogger(TZqLogger* ALogger) {
  const TLogLockScope Scope(FLock, FLogger->FFullName, cLoggerListRequest);
  std::erase(FList, ALogger);
}

IntfRef<IZqLogger> TZqLoggerList::GetLogger(Integer AIndex) const {
  if (AIndex < 0 || AIndex >= Count()) throw EListError(u"List index out of bounds (%d)", {AIndex});
  return FList[static_cast<std::size_t>(AIndex)];
}

TZqLogger* TZqLoggerList::FindLogger(const UnicodeString& AName) {
  const TLogLockScope Scope(FLock, FLogger->FFullName, cLoggerListRequest);
  const auto Found =
      std::find_if(FList.rbegin(), FList.rend(), [&](const TZqLogger* AChild) { return AChild->FName == AName; });
  return Found == FList.rend() ? nullptr : *Found;
}

// ---------------------------------------------------------------------------------------- TZqLogAppenderList

TZqLogAppenderList::TZqLogAppenderList(TZqLogger* ALogger) : TComponent(nullptr), FLogger(ALogger) {}

void TZqLogAppenderList::BeforeDestruction() {
  TakeAll();  // an appender that ends here writes its footer: with no lock held
  const TLockScope Ending(EndLock);
  TComponent::BeforeDestruction();
}

void TZqLogAppenderList::Add(const IntfRef<IZqLogAppender>& AAppender) {
  Assert(static_cast<bool>(AAppender));
  const TLogLockScope Scope(FLock, FLogger->FFullName, cAppenderListRequest);
  const auto Added = std::make_shared<const TEntry>(TEntry{.Appender = AAppender, .Component = AAppender->Component()});
  {
    const TLockScope Guard(FItemsLock);
    if (std::any_of(FList.begin(), FList.end(), [&](const TItem& AItem) { return AItem->IsSame(*Added); })) return;
    FList.push_back(Added);
    FCount = static_cast<Integer>(FList.size());
  }
  if (Added->Component != nullptr) Added->Component->FreeNotification(this);
}

IntfRef<IZqLogAppender> TZqLogAppenderList::Add(TZqLogBaseClass AAppender) {
  const IntfRef<IZqLogBase> Made(AAppender.Create(FLogger, AAppender.ClassName()));
  IntfRef<IZqLogAppender> Result = Made.As<IZqLogAppender>();
  Add(Result);
  return Result;
}

IntfRef<IZqLogAppender> TZqLogAppenderList::Add(const TText& AAppender) {
  return Add(RegisteredAppenders()->GetClass(AAppender));
}

IntfRef<IZqLogAppender> TZqLogAppenderList::Add(TZqLogBaseClass AAppender, TZqLogBaseClass ALayout) {
  IntfRef<IZqLogAppender> Result = Add(AAppender);
  Result.As<IZqLogAppenderEx>()->SetLayout(ALayout);
  return Result;
}

IntfRef<IZqLogAppender> TZqLogAppenderList::Add(const TText& AAppender, const TText& ALayout) {
  IntfRef<IZqLogAppender> Result = Add(AAppender);
  Result.As<IZqLogAppenderEx>()->SetLayout(ALayout);
  return Result;
}

// The entries leave the list under its short lock and are dropped by the caller outside of it: dropping may end an
// appender, which runs host code.
template <class TLeaves>
TZqLogAppenderList::TItems TZqLogAppenderList::TakeItems(TLeaves ALeaves) {
  const TLockScope Guard(FItemsLock);
  const auto Kept =
      std::stable_partition(FList.begin(), FList.end(), [&](const TItem& AItem) { return !ALeaves(*AItem); });
  TItems Result(std::make_move_iterator(Kept), std::make_move_iterator(FList.end()));
  FList.erase(Kept, FList.end());
  FCount = static_cast<Integer>(FList.size());
  for (const TItem& Item : Result) ForgetFailures(Item->Appender.Get());
  return Result;
}

// Nobody tells this list any more of an appender that may end as soon as its count is dropped.
TZqLogAppenderList::TItems TZqLogAppenderList::TakeAll() {
  TItems Result = TakeItems([](const TEntry&) { return true; });
  for (const TItem& Item : Result)
    if (Item->Component != nullptr) Item->Component->RemoveFreeNotification(this);
  return Result;
}

void TZqLogAppenderList::Remove(const IntfRef<IZqLogAppender>& AAppender) {
  Assert(static_cast<bool>(AAppender));
  TItems Dropped;
  const TLogLockScope Scope(FLock, FLogger->FFullName, cAppenderListRequest);
  const TEntry Removed{.Appender = AAppender, .Component = AAppender->Component()};
  Dropped = TakeItems([&](const TEntry& AEntry) { return AEntry.IsSame(Removed); });
  if (Removed.Component != nullptr) Removed.Component->RemoveFreeNotification(this);
}

void TZqLogAppenderList::Clear() {
  TItems Dropped;
  const TLogLockScope Scope(FLock, FLogger->FFullName, cAppenderListRequest);
  Dropped = TakeAll();
}

ZQ_HOT TZqLogAppenderList::TItem TZqLogAppenderList::ItemOrNone(std::size_t AIndex) const {
  const TLockScope Guard(FItemsLock);
  return AIndex < FList.size() ? FList[AIndex] : nullptr;
}

IntfRef<IZqLogAppender> TZqLogAppenderList::GetAppender(Integer AIndex) const {
  const TItem Item = AIndex < 0 ? nullptr : ItemOrNone(static_cast<std::size_t>(AIndex));
  if (!Item) throw EListError(u"List index out of bounds (%d)", {AIndex});
  return Item->Appender;
}

// The appender that ends waits for the walks that share its entry; this thread's own walk is none to wait for.
void TZqLogAppenderList::LetGoOf(const TComponent* AComponent) {
  const TItems Taken = TakeItems([&](const TEntry& AEntry) { return AEntry.Component == AComponent; });
  if (EndLock.IsOwned() && EndToken != nullptr && !FLock.IsOwned())
    for (const TItem& Item : Taken) Item->Token = *EndToken;
}

void TZqLogAppenderList::Notification(TComponent* AComponent, TOperation AOperation) {
  TComponent::Notification(AComponent, AOperation);
  if (AOperation == opRemove && AComponent != this) LetGoOf(AComponent);
}

// ---------------------------------------------------------------------------------------- TZqLogger

TZqLogger::TZqLogger(TZqLogger* AParentLogger, UnicodeString AName)
    : FName(std::move(AName)),
      FFullName(AParentLogger == nullptr ? FName : AParentLogger->FFullName + u"." + FName),
      FParent(AParentLogger),
      FParentLogger(AParentLogger),
      FAppenders(New<TZqLogAppenderList>(this)),
      FChildLoggers(this) {}

void TZqLogger::AfterConstruction() {
  TObject::AfterConstruction();
  const TLogLockScope Scope(FLock, FFullName, u".AfterConstruction");
  if (TZqLogger* const Above = FParent) Above->FChildLoggers.AddLogger(this);
}

namespace {

// A count that no _Release takes part in.
class THold {
 public:
  explicit THold(std::atomic<Integer>& ACount) noexcept : FCount(ACount) { ++FCount; }
  THold(const THold&) = delete;
  THold& operator=(const THold&) = delete;
  ~THold() { --FCount; }

 private:
  std::atomic<Integer>& FCount;
};

}  // namespace

void TZqLogger::BeforeDestruction() {
  {
    const THold Hold(FRefCount);  // the children's counts may be the last ones
    const TLogLockScope Scope(FLock, FFullName, u".BeforeDestruction");
    if (TZqLogger* const Above = FParent) Above->FChildLoggers.RemoveLogger(this);
    ClearChildLoggers();
  }
  SetConfigurator(nullptr);
  try {
    if (RefCount() != 0) AssertionFailed(Format(u"The refcount of \"%s\" is not equal to 0!", {FFullName}));
  } catch (const Exception&) {  // for a debugger to see: the destruction goes on
  }
  TZqLogger* Self = this;
  RootLogger.compare_exchange_strong(Self, nullptr);
  TObject::BeforeDestruction();
}

// The children live on without a parent. That their FParent goes too keeps them from reaching into a dead one.
void TZqLogger::ClearChildLoggers() {
  std::vector<IntfRef<IZqLogger>> Dropped;
  const TLogLockScope Scope(FChildLoggers.FLock, FFullName, u".ClearChildLoggers");
  for (; !FChildLoggers.FList.empty(); FChildLoggers.FList.pop_back()) {
    TZqLogger* const Child = FChildLoggers.FList.back();
    Child->FParent = nullptr;
    Dropped.push_back(std::move(Child->FParentLogger));
  }
}

HRESULT TZqLogger::QueryInterface(const TGUID& AIID, void** AObj) {
  Assert(this != RootLogger, u"Do not get the IZqLogger interface from the rootlogger!");
  return GetInterface(AIID, AObj) ? S_OK : E_NOINTERFACE;
}

Integer TZqLogger::_AddRef() { return FRefCount.fetch_add(1, std::memory_order_relaxed) + 1; }

// Another thread may find a child in its parent's list at the moment when its last reference goes. So the step from 1
// to 0 is made under the lock of that list, and the child leaves the list in the same step: nobody finds a dead one.
Integer TZqLogger::_Release() {
  Integer Count = FRefCount.load(std::memory_order_relaxed);
  while (Count > 1)
    if (FRefCount.compare_exchange_weak(Count, Count - 1, std::memory_order_acq_rel)) return Count - 1;
  TZqLogger* const Above = FParent;
  if (Above == nullptr) return FRefCount.fetch_sub(1, std::memory_order_acq_rel) - 1;
  try {
    const TLogLockScope Scope(Above->FChildLoggers.FLock, Above->FFullName, cLoggerListRequest);
    Count = FRefCount.fetch_sub(1, std::memory_order_acq_rel) - 1;
    if (Count == 0) Above->FChildLoggers.RemoveLogger(this);
  } catch (const Exception&) {  // listed still, it goes with the next reference that somebody takes and drops
    FRefCount.fetch_sub(1, std::memory_order_acq_rel);
    throw;
  }
  if (Count == 0 && !TZqLogWalk::TakesOver(this)) Free();
  return Count;
}

IntfRef<IZqLogger> TZqLogger::GetParentLogger() const { return FParent.load(); }

ZQ_HOT TZqLogLevel TZqLogger::GetLevel() const {
  const TZqLogger* Current = this;
  while (Current->FParentLevel.load(std::memory_order_relaxed)) {
    const TZqLogger* const Above = Current->FParent.load(std::memory_order_relaxed);
    if (Above == nullptr) break;
    Current = Above;
  }
  return Current->FLevel.load(std::memory_order_relaxed);
}

void TZqLogger::SetLevel(TZqLogLevel AValue) {
  FLevel.store(AValue, std::memory_order_relaxed);
  FParentLevel.store(false, std::memory_order_relaxed);
}

IntfRef<IZqLogConfigurator> TZqLogger::Configurator() const {
  const TLockScope Guard(FConfigLock);
  return FConfigurator;
}

IntfRef<IZqLogConfigurator> TZqLogger::SetConfigurator(IntfRef<IZqLogConfigurator> AConfig) {
  const TLockScope Guard(FConfigLock);
  return std::exchange(FConfigurator, std::move(AConfig));
}

void TZqLogger::SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) {
  std::vector<IntfRef<IZqLogConfigurator>> Former;  // go with no lock held: they may hold loggers
  ReplaceConfig(AConfig, Former);
}

void TZqLogger::ReplaceConfig(
    const IntfRef<IZqLogConfigurator>& AConfig, std::vector<IntfRef<IZqLogConfigurator>>& AFormer) {
  const TLogLockScope Scope(FLock, FFullName, u".SetConfig");
  AFormer.push_back(SetConfigurator(AConfig));
  if (AConfig) return TakeConfig(AConfig);
  const TLogLockScope Children(FChildLoggers.FLock, FFullName, u".SetConfig");
  for (TZqLogger* const Child : FChildLoggers.FList) Child->ReplaceConfig(nullptr, AFormer);
}

void TZqLogger::TakeConfig(const IntfRef<IZqLogConfigurator>& AConfig) {
  if (const auto Configuring = AConfig.Supports<IZqLogConfiguratorEx>()) Configuring->ConfigureLogger(this);
  const auto ValueOf = [&](const char16_t* AKey, TZqMainTypeKind AKind, const Variant& ADefault) {
    return AConfig->GetLoggerValue(FFullName, AKey, AKind, ADefault);
  };
  const Integer Level = VarToInteger(ValueOf(u"Level", mtkInteger, static_cast<Integer>(llDoNotLog)));
  if (Level < 0 || Level > static_cast<Integer>(llDoNotLog))
    throw EConvertError(u"%d is no log level, for the logger %s", {Level, FFullName});
  SetLevel(static_cast<TZqLogLevel>(Level));
  SetAdditive(VarToBool(ValueOf(u"Additive", mtkBoolean, GetAdditive())));
  const Variant Names = ValueOf(u"Appenders", mtkArray, VarArrayOf({}));
  const Integer Count = ZqVarArrayCount(Names);
  const Integer First = Count == 0 ? 0 : VarArrayLowBound(Names, 1);
  for (Integer i = 0; i < Count; ++i) AddNamed(AConfig, VarToUStr(VarArrayGet(Names, {First + i})));
}

// An appender that is alive under that name, whoever made it and as it is, or else a new one of the class that is told,
// which configures itself.
void TZqLogger::AddNamed(const IntfRef<IZqLogConfigurator>& AConfig, const UnicodeString& AName) {
  const UnicodeString Class = VarToUStr(AConfig->GetAppenderValue(AName, u"class", mtkString, u""));
  for (TZqLogBase* const Live : LiveAppenders())
    if (Live->GetName() == AName) return AddAppender(IntfRef<IZqLogBase>(Live).As<IZqLogAppender>());
  if (Class.IsEmpty()) return;
  const TZqLogBaseClass Found = RegisteredAppenders()->GetClass(ShortString(Class.ToUTF8()));
  AddAppender(IntfRef<IZqLogBase>(Found.Create(this, AName)).As<IZqLogAppender>());
}

IntfRef<TZqLogger> TZqLogger::FindOrMakeChild(const UnicodeString& AName, bool& AMade) {
  const TLogLockScope Scope(FChildLoggers.FLock, FFullName, cLoggerListRequest);
  TZqLogger* const Found = FChildLoggers.FindLogger(AName);
  AMade = Found == nullptr;
  return AMade ? New<TZqLogger>(this, AName) : Found;
}

IntfRef<IZqLogger> TZqLogger::GetLogger(const TText& AName) {
  const TLogLockScope Scope(FLock, FFullName, u".GetLogger");
  TStringList Path;
  ZqTokenize(AName.ToString(), &Path, u".", nullptr);
  IntfRef<TZqLogger> Current(this);
  for (Integer i = 0; i < Path.Count(); ++i) {
    bool Made = false;
    Current = Current->FindOrMakeChild(Path.Strings(i), Made);
    const TZqLogger* const Root = RootLogger;
    if (Made) Current->SetConfig(Root == nullptr ? nullptr : Root->Configurator());
  }
  return Current;
}

IntfRef<IZqLogger> TZqLogger::GetLogger(const TObject* AObject) { return GetLogger(AObject->ClassName()); }

TZqLogAppenderList* TZqLogger::LockAppenders() {
  FAppenders->FLock.Enter(FFullName, u".LockAppenders", true);
  return FAppenders.get();
}

// A list whose lock stays busy is skipped. What an appender logs itself comes back here on the same thread; the
// number is bounded, so that one that answers every message with a message doesn't end the host. What an appender
// raises ends the message's way, and is told.
inline void TZqLogger::WriteToAppenders(TZqLogWalk& AWalk, const UnicodeString& ASender, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  TZqLogAppenderList& List = *FAppenders;
  if (!List.FLock.Enter(FFullName, u".DoLog", false))
    return TellLost(nullptr, FFullName, u"A lock stayed busy: " + List.FLock.LockedBy());
  struct TScope {
    explicit TScope(TZqLogAppenderList& AList) : Locked(AList) {
      Locked.FWithin = Locked.FNesting++ == 0 ? 0 : Locked.FWithin + 1;
    }
    ~TScope() {
      --Locked.FNesting;
      Locked.FLock.Leave();
    }
    TZqLogAppenderList& Locked;
  } const Scope(List);
  if (List.FWithin > cMostWithin) return TellLost(nullptr, FFullName, u"One message led to too many others");
  const auto AtStart = static_cast<std::size_t>(List.Count());
  for (std::size_t i = 0; i < AtStart; ++i)
    if (const auto Item = List.ItemOrNone(i)) try {
        Item->Appender->Write(ASender, FFullName, ALogLevel, ALogMessage, AValue, ALogIndent);
        if (AWalk.HasNotes() || AnyFails()) [[unlikely]]
          TellOutcome(Item->Appender.Get(), FFullName, AWalk.TakeLost());
      } catch (const Exception& e) {
        TellLost(Item->Appender.Get(), FFullName, e.Message());
        throw;
      }
}

// Level and count are tested first, so that a message that nobody writes takes no lock and isn't even made. Nothing is
// left to do behind the write, and all arguments fit into registers: no frame is kept to return into, see WriteWhole.
ZQ_HOT void TZqLogger::DoLog(
    TZqLogLevel ALogLevel, const TText& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  TZqLogger* const First = NextToWrite(this, ALogLevel);
  if (First == nullptr) return;
  if (!ALogMessage.IsWhole()) return WriteConverted(First, ALogLevel, ALogMessage, AValue, ALogIndent);
  WriteWhole(First, ALogLevel, ALogMessage.AsWhole(), AValue, ALogIndent);
}

// The nearest logger on the way up, from ALogger on, that has appenders for a message of that level.
inline TZqLogger* TZqLogger::NextToWrite(TZqLogger* ALogger, TZqLogLevel ALogLevel) {
  while (ALogger != nullptr && (ALogger->FAppenders->Count() == 0 || ALogger->TZqLogger::GetLevel() > ALogLevel))
    ALogger = ALogger->Upwards();
  return ALogger;
}

namespace {

// Room for a text that has to be made wide: the thread's own, so that a second call finds it, and taken out meanwhile,
// for a message from within an appender comes here too. Messages may come after the end of a thread's objects.
class TMessageRoom {
 public:
  TMessageRoom() : FText(std::exchange(Spare, nullptr)) {
    if (FText == nullptr) [[unlikely]]
      FText = Make();
  }
  TMessageRoom(const TMessageRoom&) = delete;
  TMessageRoom& operator=(const TMessageRoom&) = delete;
  ~TMessageRoom() {
    if (Ended || Spare != nullptr || FText->Str().capacity() > cKept) [[unlikely]]
      delete FText;
    else Spare = FText;
  }
  [[nodiscard]] UnicodeString& Text() const noexcept { return *FText; }

 private:
  static constexpr std::size_t cKept = 1 << 15;
  // Initial-exec: no call where a shared library would otherwise make one.
  __attribute__((tls_model("initial-exec"))) static inline constinit thread_local UnicodeString* Spare = nullptr;
  __attribute__((tls_model("initial-exec"))) static inline constinit thread_local bool Ended = false;

  [[gnu::noinline]] static UnicodeString* Make() {
    struct TEnd {
      ~TEnd() {
        Ended = true;
        delete std::exchange(Spare, nullptr);
      }
    };
    if (!Ended) thread_local const TEnd End;
    return new UnicodeString;
  }

  UnicodeString* FText;
};

}  // namespace

ZQ_HOT [[gnu::noinline]] void TZqLogger::WriteConverted(
    TZqLogger* AFirst, TZqLogLevel ALogLevel, const TText& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  const TMessageRoom Room;
  WriteWhole(AFirst, ALogLevel, ALogMessage.In(Room.Text()), AValue, ALogIndent);
}

// Each lock is left before the message goes on to the parent. Flat, because after a system call each return into one
// more frame is mispredicted.
[[gnu::flatten]] ZQ_HOT void TZqLogger::WriteWhole(TZqLogger* AFirst, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  TZqLogWalk Walk(this);
  try {
    for (TZqLogger* Current = AFirst; Current != nullptr; Current = NextToWrite(Current->Upwards(), ALogLevel))
      Current->WriteToAppenders(Walk, FFullName, ALogLevel, ALogMessage, AValue, ALogIndent);
  } catch (const Exception&) {  // logging never raises into its caller
  }
}

void TZqLogger::Trace(const TText& ALogMessage) { Log(llTrace, ALogMessage); }
void TZqLogger::Trace(const TObject* AObject, const TText& AMethodName) {
  Log(llTrace, Format(u"%s($%p).%s", {AObject->ClassName(), AObject, AMethodName.ToString()}));
}
void TZqLogger::Trace(const TObject* AObject, const TText& AMethodName, TVarArgs AArgs) {
  Trace(AObject, Format(AMethodName.ToString(), AArgs));
}
void TZqLogger::Debug(const TText& ALogMessage) { Log(llDebug, ALogMessage); }
void TZqLogger::Debug(const TText& ALogMessage, TVarArgs AArgs) { Log(llDebug, Format(ALogMessage.ToString(), AArgs)); }
void TZqLogger::Debug(const TText& AMessage, const Variant& AValue) { Log(llDebug, AMessage, AValue); }
void TZqLogger::Debug(const TText& AMessage, const TObject* AValue) { Log(llDebug, AMessage, AValue); }
void TZqLogger::Debug(const TText& AMessage, const Exception& AValue) { Log(llDebug, AMessage, AValue); }
ZQ_HOT void TZqLogger::Info(const TText& ALogMessage) { DoLog(llInfo, ALogMessage, nullptr, liIndentNone); }
void TZqLogger::Warn(const TText& ALogMessage) { Log(llWarn, ALogMessage); }
void TZqLogger::Error(const TText& ALogMessage) { Log(llError, ALogMessage); }
void IZqLogger::Error(const TText& ALogMessage, const std::exception& AException) {
  Log(llError, ALogMessage.ToString() + u"\r\n" + VarRecText(AException));
}
void TZqLogger::Fatal(const TText& ALogMessage) { Log(llFatal, ALogMessage); }
void TZqLogger::Fatal(const TText& ALogMessage, TVarArgs AArgs) { Log(llFatal, Format(ALogMessage.ToString(), AArgs)); }
void TZqLogger::Fatal(const Exception& AException) { Log(llFatal, AException.Message(), AException); }
void TZqLogger::Fatal(const TText& ALogMessage, const Exception& AException) { Log(llFatal, ALogMessage, AException); }
void TZqLogger::Count(const TText& ACounter, Integer AValue) {
  Debug(u"#counter::" + ACounter.ToString() + u"#", Variant(AValue));
}

void TZqLogger::EnterMethod(const TText& AMethodName, TZqLogLevel ALogLevel) {
  Log(ALogLevel, AMethodName, liIndentIncrease);
}
void TZqLogger::EnterMethod(const TText& AMethodName, TVarArgs AArgs, TZqLogLevel ALogLevel) {
  Log(ALogLevel, Format(AMethodName.ToString(), AArgs), liIndentIncrease);
}
void TZqLogger::EnterMethod(const TObject* AObject, const TText& AMethodName, TZqLogLevel ALogLevel) {
  Log(ALogLevel, MethodOf(AObject, AMethodName), liIndentIncrease);
}
void TZqLogger::EnterMethod(const TObject* AObject, const TText& AMethodName, TVarArgs AArgs, TZqLogLevel ALogLevel) {
  Log(ALogLevel, Format(MethodOf(AObject, AMethodName), AArgs), liIndentIncrease);
}
void TZqLogger::ExitMethod(const TText& AMethodName, TZqLogLevel ALogLevel) {
  Log(ALogLevel, AMethodName, liIndentDecrease);
}
void TZqLogger::ExitMethod(const TText& AMethodName, TVarArgs AArgs, TZqLogLevel ALogLevel) {
  Log(ALogLevel, Format(AMethodName.ToString(), AArgs), liIndentDecrease);
}
void TZqLogger::ExitMethod(const TObject* AObject, const TText& AMethodName, TZqLogLevel ALogLevel) {
  Log(ALogLevel, MethodOf(AObject, AMethodName), liIndentDecrease);
}

ZQ_HOT void TZqLogger::Log(TZqLogLevel ALogLevel, const TText& ALogMessage, TZqLogIndent ALogIndent) {
  DoLog(ALogLevel, ALogMessage, nullptr, ALogIndent);
}
void TZqLogger::Log(TZqLogLevel ALogLevel, const TText& ALogMessage, const Variant& AValue, TZqLogIndent ALogIndent) {
  const TZqDataRec Value = VariantRec(AValue);
  DoLog(ALogLevel, ALogMessage, &Value, ALogIndent);
}
void TZqLogger::Log(TZqLogLevel ALogLevel, const TText& ALogMessage, const TObject* AValue, TZqLogIndent ALogIndent) {
  const TZqDataRec Value = ObjectRec(AValue);
  DoLog(ALogLevel, ALogMessage, &Value, ALogIndent);
}
void TZqLogger::Log(TZqLogLevel ALogLevel, const TText& ALogMessage, const Exception& AValue, TZqLogIndent ALogIndent) {
  const TZqDataRec Value = ExceptionRec(AValue);
  DoLog(ALogLevel, ALogMessage, &Value, ALogIndent);
}
void TZqLogger::Log(const IntfRef<IZqLogData>& ALogData) {
  Assert(static_cast<bool>(ALogData));
  const TZqLogData& Event = *ALogData->Data();
  Log(Event.LogLevel, Event.LogMessage, Event.Indent);
}

void IZqLogger::Log(TZqLogLevel ALogLevel, const TText& ALogMessage, TVarArgs AArgs, TZqLogIndent ALogIndent) {
  Log(ALogLevel, Format(ALogMessage.ToString(), AArgs), ALogIndent);
}

TZqLogger* Logger() {
  if (TZqLogger* const Root = RootLogger.load(std::memory_order_acquire)) return Root;
  const std::lock_guard Guard(RootLock);
  if (TZqLogger* const Root = RootLogger.load(std::memory_order_acquire)) return Root;
  auto* const Root = New<TZqLogger>(nullptr, u"root");
  Root->SetLevel(llDebug);
  RootLogger.store(Root, std::memory_order_release);
  return Root;
}

// ---------------------------------------------------------------------------------------- TZqLogBase and registries

TZqLogBase::TZqLogBase(TZqLogger* ALogger, const UnicodeString& AName) : Implements(nullptr), FLogger(ALogger) {
  if (!AName.IsEmpty() && (AName[1] < u'0' || AName[1] > u'9')) SetName(AName);
}

namespace {

void ForgetAppender(const TZqLogBase* AObject) {
  const std::lock_guard Guard(AppendersLock);
  if (Appenders != nullptr) std::erase(*Appenders, AObject);
}

}  // namespace

void TZqLogBase::AfterConstruction() {
  Implements::AfterConstruction();
  ListAppender();
}

void TZqLogBase::ListAppender() {
  if (dynamic_cast<TZqBaseAppender*>(this) == nullptr) return;
  const std::lock_guard Guard(AppendersLock);
  Assert(Appenders != nullptr, u"An appender is made before the library has started");
  if (std::find(Appenders->begin(), Appenders->end(), this) == Appenders->end()) Appenders->push_back(this);
}

// An appender whose AfterConstruction raised, further down, is listed still.
TZqLogBase::~TZqLogBase() { ForgetAppender(this); }

void TZqLogBase::BeforeDestruction() {
  ForgetAppender(this);
  LeaveLists();
  const TLockScope Ending(EndLock);
  Implements::BeforeDestruction();
}

void TZqLogBase::EndRefused() noexcept {
  if (std::exchange(FEndedByCount, false)) SetAutoDestroy(true);
  try {
    ListAppender();
  } catch (...) {  // the library has stopped, or memory is out: nobody finds it by its name then
  }
  Implements::EndRefused();
}

void TZqLogBase::LeaveLists() {
  if (RefCount() == 0) return;
  FEndedByCount = FEndedByCount || AutoDestroy();
  SetAutoDestroy(false);
  const auto Over = std::make_shared<TSimpleEvent>();
  {
    const TLockScope Ending(EndLock);
    const std::shared_ptr<const void> Token(nullptr, [Over](auto) { Over->SetEvent(); });
    const struct TGiving {
      ~TGiving() { EndToken = Outer; }
      const std::shared_ptr<const void>* Outer;
    } Giving{std::exchange(EndToken, &Token)};
    TellWatchers();
  }
  Over->WaitFor(cLockWait);
}

std::vector<TZqLogBase*> LiveAppenders() {
  const std::lock_guard Guard(AppendersLock);
  return Appenders == nullptr ? std::vector<TZqLogBase*>() : *Appenders;
}

void TZqLogBaseClassList::Add(TZqLogBaseClass AClass) {
  if (std::find(FList.begin(), FList.end(), AClass) == FList.end()) FList.push_back(AClass);
}

TZqLogBaseClass TZqLogBaseClassList::GetClass(const TText& AClassName) const {
  const UnicodeString Name = AClassName.ToString();
  for (const TZqLogBaseClass& Class : FList)
    if (SameText(Class.ClassName(), Name)) return Class;
  throw EListError(u"Class %s not found!", {Name});
}

namespace {

TZqLogBaseClassList* MadeOnFirstUse(std::atomic<TZqLogBaseClassList*>& AList) {
  if (AList.load(std::memory_order_acquire) == nullptr) AList.store(new TZqLogBaseClassList, std::memory_order_release);
  return AList.load(std::memory_order_acquire);
}

}  // namespace

TZqLogBaseClassList* RegisteredLayouts() { return MadeOnFirstUse(LayoutClasses); }
TZqLogBaseClassList* RegisteredAppenders() { return MadeOnFirstUse(AppenderClasses); }

void uZqLogger::Start() {
  if (!Starts.Begins()) return;
  Appenders = new std::vector<TZqLogBase*>;
  DescribeType<TZqLogLevel>(u"uZqLogger")
      .EnumNames({u"llAll", u"llTrace", u"llDebug", u"llInfo", u"llWarn", u"llError", u"llFatal", u"llDoNotLog"});
  DescribeType<TZqLogIndent>(u"uZqLogger").EnumNames({u"liIndentNone", u"liIndentIncrease", u"liIndentDecrease"});
}

void uZqLogger::Stop() {
  if (!Starts.Ends()) return;
  Free(RootLogger.load());
  delete LayoutClasses.exchange(nullptr);
  delete AppenderClasses.exchange(nullptr);
  const std::lock_guard Guard(AppendersLock);
  delete std::exchange(Appenders, nullptr);
}

void TZqLogger::CollectAppenders(std::vector<IntfRef<IZqLogAppender>>& AFound) {
  for (std::size_t i = 0; const auto Item = FAppenders->ItemOrNone(i); ++i) AFound.push_back(Item->Appender);
  std::vector<IntfRef<TZqLogger>> Children;
  {
    const TLogLockScope Scope(FChildLoggers.FLock, FFullName, u".EndProcess");
    Children.assign(FChildLoggers.FList.begin(), FChildLoggers.FList.end());
  }
  for (const IntfRef<TZqLogger>& Child : Children) Child->CollectAppenders(AFound);
}

void uZqLogger::EndProcess() noexcept {
  std::vector<IntfRef<IZqLogAppender>> Found;
  try {
    if (TZqLogger* const Root = RootLogger.load()) Root->CollectAppenders(Found);
    const std::lock_guard Guard(AppendersLock);
    if (Appenders == nullptr) return;
    for (TZqLogBase* const Appender : *Appenders)  // those that a host holds without a logger
      if (Appender->RefCount() > 0) Found.push_back(Supports<IZqLogAppender>(Appender));
  } catch (...) {  // what was found is closed
  }
  for (const IntfRef<IZqLogAppender>& Appender : Found) try {
      Appender->Close();
    } catch (...) {  // its last bytes can't be written, and there is nobody left to tell
    }
}

// ---------------------------------------------------------------------------------------- log events

namespace {

struct TSystemName {
  Word Code;
  const char16_t* Name;
};
constexpr TSystemName cSystemNames[] = {{1, u"Win 3.1"}, {3, u"Windows 95"}, {5, u"Windows 95 OSR2"},
    {7, u"Windows 98"}, {9, u"Windows 98 SE"}, {11, u"Windows Milennium"}, {12, u"Windows NT"}, {14, u"Windows NT 3.0"},
    {16, u"Windows NT 4.0"}, {500, u"Windows 2000"}, {511, u"Windows XP"}, {520, u"Windows Server 2003"},
    {601, u"Vista"}, {611, u"Windows 7"}, {621, u"Windows 8"}};

UnicodeString SystemName(Word ACode) {
  for (const TSystemName& Row : cSystemNames)
    if (Row.Code == ACode) return Row.Name;
  return u"Unidentified OS";
}

UnicodeString SystemVersion() {
  const TSystemRelease Release = Service<TVersionService>().Release();
  return Format(u"%d.%d", {Release.Major, Release.Minor}) +
         Format(u"; Build: %x, \"%s\"", {Release.Build, Release.Text});
}

}  // namespace

TZqLogData::TZqLogData(TZqLogLevel ALogLevel, UnicodeString ALogMessage)
    : LogLevel(ALogLevel),
      LogMessage(std::move(ALogMessage)),
      ComputerName(ZqGetComputerName()),
      UserName(ZqGetUserName()),
      ActiveForm(u"n.a."),
      ActiveControl(u"n.a."),
      OS(SystemName(ZqGetWindowsVersion())),
      Version(SystemVersion()),
      Timestamp(Now()),
      Resolution(u"n.a.") {}

// ---------------------------------------------------------------------------------------- value text

namespace {

// Dumps an object and the persistent objects that it publishes. One that leads back to itself gets its head line only
// there, and so does what lies too deep or is too much: getters may make a new object at each call.
class TDumper {
 public:
  void Dump(TObject* AObject, const UnicodeString& AIndent) {
    const auto* const Component = dynamic_cast<const TComponent*>(AObject);
    Text += AIndent + u"object " + (Component == nullptr ? UnicodeString() : Component->Name()) + u": " +
            AObject->ClassName() + u"\r\n";
    constexpr std::size_t MaxIndent = 64, MaxObjects = 10000;
    if (AIndent.size() > MaxIndent || ++FCount > MaxObjects) return;
    if (std::find(FPath.begin(), FPath.end(), AObject) != FPath.end()) return;
    FPath.push_back(AObject);
    for (const PPropInfo Property : GetPropList(AObject)) DumpProperty(AObject, Property, AIndent + u"  ");
    FPath.pop_back();
  }
  UnicodeString Text;

 private:
  void DumpProperty(TObject* AObject, PPropInfo AProperty, const UnicodeString& AIndent) {
    if (!AProperty->IsReadable() || !AProperty->IsWritable()) return;
    try {
      switch (AProperty->Kind()) {
        case tkInteger:
        case tkChar:
        case tkEnumeration:
        case tkFloat:
        case tkString:
        case tkSet:
        case tkWChar:
        case tkLString:
        case tkWString:
        case tkVariant: {
          const Variant Value = GetPropValue(AObject, AProperty, AProperty->Kind() == tkEnumeration);
          Text += AIndent + AProperty->Name + u" = " + ZqVarToStr(Value, u"", false) + u"\r\n";
          break;
        }
        case tkClass:
          if (auto* const Part = dynamic_cast<TPersistent*>(GetObjectProp(AObject, AProperty))) Dump(Part, AIndent);
          break;
        default: break;
      }
    } catch (const Exception& e) {
      Text += AIndent + u"Exception " + e.ClassName() + u"(" + e.Message() +
              u") was raised while trying to read property: " + AProperty->Name + u"\r\n";
    }
  }

  std::vector<const TObject*> FPath;  // from the outermost to the one that is being dumped
  std::size_t FCount = 0;
};

UnicodeString DumpObject(const TObject* AObject) {
  if (AObject == nullptr) return {};
  TDumper Dumper;
  Dumper.Dump(const_cast<TObject*>(AObject), u"");  // getters need not be const
  return Dumper.Text;
}

UnicodeString AddressText(const void* AValue) { return IntToHex(reinterpret_cast<NativeUInt>(AValue), 4); }

}  // namespace

UnicodeString ZqDataRecToString(PZqDataRec AValue) {
  switch (AValue->DataType) {
    case rtkByte: return IntToStr(AValue->VByte);
    case rtkWord: return IntToStr(AValue->VWord);
    case rtkLongWord: return IntToStr(AValue->VLongWord);
    case rtkShortInt: return IntToStr(AValue->VShortInt);
    case rtkSmallInt: return IntToStr(AValue->VSmallint);
    case rtkLongInt: return IntToStr(AValue->VLongInt);
    case rtkInt64: return IntToStr(AValue->VInt64);
    case rtkSingle: return Format(u"%f", {AValue->VSingle});
    case rtkDouble: return Format(u"%f", {AValue->VDouble});
    case rtkExtended: return Format(u"%f", {AValue->VExtended});
    case rtkChar: return UnicodeString(AValue->VChar);
    case rtkWChar: return UnicodeString(AValue->VWChar);
    case rtkAChar: return TZqEncoding::ConvertA(AnsiString(std::string_view(&AValue->VAChar, 1)));
    case rtkString: return *AValue->VString;
    case rtkAString: return TZqEncoding::ConvertA(*AValue->VAString);
    case rtkWString: return *AValue->VWString;
    case rtkBoolean: return BoolToStr(AValue->VBoolean, false);
    case rtkEnumeration: return IntToStr(AValue->VEnumeration);
    case rtkSet: return IntToStr(AValue->VSet);
    case rtkDate: return DateToStr(TDateTime(AValue->VDate));
    case rtkTime: return TimeToStr(AValue->VTime);
    case rtkDatetime: return DateTimeToStr(AValue->VDatetime);
    case rtkVariant: return ZqVarToStr(*AValue->VVariant, u"", false);
    case rtkObject: return DumpObject(AValue->VObject);
    case rtkInterface: return AddressText(AValue->VInterface);
    case rtkPointer: return AddressText(AValue->VPointer);
    case rtkException: return AValue->VException->ClassName() + u":" + AValue->VException->Message();
    case rtkClass: return AValue->VClass.ClassName();
    case rtkArray: return u"Array";
    case rtkDynArray: return u"DynArray";
    case rtkRecord: return u"Record";
    case rtkMethod: return u"Method";
    case rtkProcedure: return u"Procedure";
    default: return u"unknown";
  }
}

}  // namespace zq
