#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <string_view>
#include <vector>

#include "common/uZqClasses/component.h"
#include "common/uZqTypes/kinds.h"
#include "runtime/component/component.h"
#include "runtime/core/interfaces.h"
#include "runtime/core/varrec.h"
#include "runtime/sync/critical_section.h"
#include "runtime/values/variants.h"

namespace zq {

namespace utf8 {
class TBuffer;
}

namespace uZqLogger {
/// The end of the process: every appender is closed, so that files get their footers. Nothing is freed, since other
/// threads may log still: a message behind a footer opens its file again.
void EndProcess() noexcept;
}  // namespace uZqLogger

enum class TZqLogLevel : Byte { llAll, llTrace, llDebug, llInfo, llWarn, llError, llFatal, llDoNotLog };
using enum TZqLogLevel;

/// Texts of the levels as they stand in log lines.
struct TZqLogLevelTexts {
  char16_t Texts[8][9];
  [[nodiscard]] constexpr std::u16string_view operator[](TZqLogLevel ALevel) const noexcept {
    return Texts[static_cast<Byte>(ALevel)];
  }
};
inline constexpr TZqLogLevelTexts ZqLogLevels{
    {u"All", u"Trace", u"Debug", u"Info", u"Warn", u"Error", u"Fatal", u"Disabled"}};

enum class TZqLogIndent : Byte { liIndentNone, liIndentIncrease, liIndentDecrease };
using enum TZqLogIndent;

/// The value that travels with a message; DataType says which member is valid. Lives for the log call only: pointers
/// are the caller's, and an appender keeps neither them nor the record.
struct TZqDataRec {
  struct TMethodRec {
    const void* Code;
    const void* Data;
  };

  TZqDataRec() noexcept : VInt64(0) {}

  TZqTypeKind DataType = rtkUnknown;
  union {
    Int64 VInt64;
    ShortInt VShortInt;
    SmallInt VSmallint;
    Integer VLongInt;
    Byte VByte;
    Word VWord;
    Cardinal VLongWord;
    Single VSingle;
    Double VDouble;
    Extended VExtended;
    Char VChar;
    const UnicodeString* VString;
    AnsiChar VAChar;
    WideChar VWChar;
    const AnsiString* VAString;
    const WideString* VWString;
    Boolean VBoolean;
    Integer VDate;  ///< day number
    TDateTime VTime;
    TDateTime VDatetime;
    const TObject* VObject;
    const void* VPointer;
    const void* VInterface;
    TMethodRec VMethod;
    const Variant* VVariant;
    const void* VRecord;
    const Exception* VException;
    Integer VEnumeration;
    Integer VSet;
    TClass VClass;
    const void* VProcedure;
    const void* VArray;
    const void* VDynArray;
  };
};
using PZqDataRec = const TZqDataRec*;

class TZqLogAppenderList;
class TZqLogBase;
class TZqLogData;
class TZqLogWalk;
class TZqLogger;
class TZqLoggerList;

using TZqLogBaseClass = TClassRef<TZqLogBase(TZqLogger*, const UnicodeString&)>;

// ---------------------------------------------------------------------------------------- appender contract

struct ZQ_API IZqLogBase : Extends<IInterface> {
  static constexpr TGUID IID = "{0061FD2F-FEF2-4D47-A7B2-2B69A7EB2CE1}"_guid;
  virtual UnicodeString GetName() const = 0;
  /// The component behind the interface, not counted; null for an appender of a host that is none.
  virtual TComponent* Component() = 0;

 protected:
  ~IZqLogBase() = default;
};

/// Takes messages from loggers. Called on the thread that logs, under the lock of the logger's appender list; what it
/// raises of the Exception family ends the message's way there and reaches nobody; anything else reaches the caller.
/// One that logs into its own logger gets those messages too, some hundred for one message; further ones are lost.
struct ZQ_API IZqLogAppender : Extends<IZqLogBase> {
  static constexpr TGUID IID = "{D10CACCF-3B7D-4CBB-96D3-7C22BEF8FE7E}"_guid;
  /// ASender is the full name of the logger that was called, ALoggerName that of the logger whose appender this is.
  virtual void Write(const UnicodeString& ASender, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) = 0;
  /// Ends what is open; the next Write opens it again. Raises what the last bytes raise; it is closed all the same.
  virtual void Close() = 0;

 protected:
  ~IZqLogAppender() = default;
};

/// Turns messages into text, for one appender and under its lock. A line that it logs itself goes into the file that is
/// there; what its header or footer changes about the appender's file counts from the next opening on.
struct ZQ_API IZqLogLayout : Extends<IZqLogBase> {
  static constexpr TGUID IID = "{5008EFF8-569C-4FD3-8C1D-FCCEF0DF632E}"_guid;
  /// The last text of a file, without a line end; empty for none.
  virtual UnicodeString GetFooter() = 0;
  /// The first line of a file, without a line end; empty for none.
  virtual UnicodeString GetHeader() = 0;
  /// Without a line end; empty for no line at all.
  virtual UnicodeString FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) = 0;

 protected:
  ~IZqLogLayout() = default;
};

/// A layout that appends its line, as UTF-8, to the appender's own buffer, which spares a text and its conversion.
/// Beside IZqLogLayout: an appender that knows of it asks for it once, when the layout is set, and then for no
/// FormatLine.
struct ZQ_API IZqLogByteLayout : Extends<IInterface> {
  static constexpr TGUID IID = "{7F0C9D94-3B76-4F24-99D5-339276B8D37F}"_guid;
  /// Appends what FormatLine returns, so nothing for no line at all. ALine is the appender's and empty.
  virtual void AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) = 0;

 protected:
  ~IZqLogByteLayout() = default;
};

/// An appender that writes through a layout. Bears the GUID of IZqLogAppender.
struct ZQ_API IZqLogAppenderEx : Extends<IZqLogAppender> {
  static constexpr TGUID IID = IZqLogAppender::IID;
  virtual void SetLayout(const IntfRef<IZqLogLayout>& ALayout) = 0;
  virtual void SetLayout(TZqLogBaseClass ALayout) = 0;
  /// Raises EListError for a name that is not registered.
  virtual void SetLayout(const TText& ALayout) = 0;

 protected:
  ~IZqLogAppenderEx() = default;
};

/// A layout that decides the extension of its log file.
struct ZQ_API IZqLogLayoutEx : Extends<IZqLogLayout> {
  static constexpr TGUID IID = "{69516E7B-351A-4F40-AED4-7CD5FDCB3FFD}"_guid;
  virtual UnicodeString GetFileExt() = 0;

 protected:
  ~IZqLogLayoutEx() = default;
};

/// A layout that is told which appender it now serves.
struct ZQ_API _IZqLogLayout : Extends<IInterface> {
  static constexpr TGUID IID = "{D47392EB-1BA9-4A9E-B586-0F8FCFF87448}"_guid;
  /// By SetLayout of the appender, under its lock.
  virtual void Initialize(TZqLogBase* ALogBase) = 0;

 protected:
  ~_IZqLogLayout() = default;
};

/// Provided by a host: settings by the name of a logger, its full one, or of an appender.
///
/// A logger asks for "Level" (0 to 7; llDoNotLog where nothing is told), "Additive" and "Appenders", an array of names;
/// of each name that no live appender bears for "class". An appender asks for "Layout", one with a file for
/// "AppendExisting", "FileName" and "FileExt", one that rolls for "MaxFileSize" and "MaxBackupCount", one that rolls by
/// date for "DatePattern", that of the system's log for "ServiceName". It is asked on any thread that asks for a new
/// logger or makes an appender, under the logger's lock and the appender's: it must not wait for another thread that
/// logs.
struct ZQ_API IZqLogConfigurator : Extends<IInterface> {
  static constexpr TGUID IID = "{28A992A8-9491-4F32-B3BC-851901F67357}"_guid;
  /// The value stored for that name and key, ADefault if there is none. AKind tells what the caller expects.
  virtual Variant GetLoggerValue(
      const UnicodeString& ALoggerName, const UnicodeString& AKey, TZqMainTypeKind AKind, const Variant& ADefault) = 0;
  virtual Variant GetAppenderValue(const UnicodeString& AAppenderName, const UnicodeString& AKey, TZqMainTypeKind AKind,
      const Variant& ADefault) = 0;
  /// Never called by the library: the slot belongs to hosts that share a configurator among themselves.
  virtual Variant GetValue(
      const UnicodeString& AName, const UnicodeString& AKey, TZqMainTypeKind AKind, const Variant& ADefault) = 0;

 protected:
  ~IZqLogConfigurator() = default;
};

struct ZQ_API IZqLogConfiguratorEx : Extends<IZqLogConfigurator> {
  static constexpr TGUID IID = "{A57D0CA9-7632-4A0E-8333-DAF4BDA6CF3E}"_guid;
  /// Called with each logger that is given this configurator, before that asks for its keys.
  virtual void ConfigureLogger(TZqLogger* ALogger) = 0;

 protected:
  ~IZqLogConfiguratorEx() = default;
};

// ---------------------------------------------------------------------------------------- log events

struct ZQ_API IZqLogData : Extends<IInterface> {
  static constexpr TGUID IID = "{63196C58-37A5-47C3-9217-D04A6FDEE05F}"_guid;
  /// The event itself, as long as it is referenced.
  virtual TZqLogData* Data() = 0;

 protected:
  ~IZqLogData() = default;
};

/// An event that a caller fills and hands to Log. Only level, indent and message reach the appenders; the other fields
/// are for who reads the event itself.
class ZQ_API TZqLogData : public Implements<TInterfacedObject, IZqLogData> {
 public:
  /// Fills in the computer, the user, the system and the time of now.
  TZqLogData(TZqLogLevel ALogLevel, UnicodeString ALogMessage);
  TZqLogData* Data() override { return this; }

  TZqLogLevel LogLevel;
  TZqLogIndent Indent = liIndentNone;
  UnicodeString LogMessage;
  UnicodeString ComputerName;
  UnicodeString UserName;
  UnicodeString ActiveForm;
  UnicodeString ActiveControl;
  UnicodeString ExtendedInfo;
  UnicodeString Source;
  UnicodeString OS;
  UnicodeString Version;
  TDateTime Timestamp;
  UnicodeString Resolution;
  UnicodeString HelpText;

 protected:
  ~TZqLogData() override = default;
};

/// The value as text. Objects are dumped with their published read-write properties, one line each; an object that
/// leads back to itself, or lies very deep, is told there by its head line alone. Raises what a conversion raises.
[[nodiscard]] ZQ_API UnicodeString ZqDataRecToString(PZqDataRec AValue);

// ---------------------------------------------------------------------------------------- loggers

namespace detail {
template <class T>
concept TNumber = std::is_arithmetic_v<T> && std::constructible_from<Variant, T>;
// What goes as the text that it has as an argument.
template <class T>
concept TShown =
    std::constructible_from<TVarRec, const T&> && !std::constructible_from<Variant, const T&> &&
    !std::derived_from<T, Exception> && !std::convertible_to<const T&, const TObject*> && !std::same_as<T, TVarRec> &&
    !std::same_as<T, TZqLogIndent> && (!std::is_array_v<T> || std::convertible_to<const T&, const char8_t*>);
}  // namespace detail

/// A named logger of the tree. Any thread may call any operation. Texts come wide or as UTF-8; they are converted only
/// for who writes them. Once a message is made, logging lets no Exception
/// out; before that comes out what Format raises for a text and its arguments, and EAssertionFailed for an empty event.
/// What an appender raises beside Exception is let out. An AObject that names a method or a logger isn't null.
/// Operations on the tree and on the appenders raise Exception when a lock stays busy for some five seconds.
struct ZQ_API IZqLogger : Extends<IInterface> {
  static constexpr TGUID IID = "{C9719FC7-DE99-4B3B-A008-A480D810D29E}"_guid;
  /// Empty at the root.
  virtual IntfRef<IZqLogger> GetParentLogger() const = 0;
  virtual bool GetParentLevel() const = 0;
  /// That of the nearest ancestor that has one of its own, unless this logger has.
  virtual TZqLogLevel GetLevel() const = 0;
  /// The logger's own lists, valid as long as it lives.
  virtual TZqLogAppenderList* GetAppenders() = 0;
  virtual TZqLoggerList* GetChildLoggers() = 0;
  /// Whether messages go on to the parent.
  virtual bool GetAdditive() const = 0;
  /// The dotted path, "root.a.b".
  virtual UnicodeString GetName() const = 0;
  /// The last component, "b".
  virtual UnicodeString GetFullName() const = 0;
  virtual void SetAdditive(bool AValue) = 0;
  virtual void SetParentLevel(bool AValue) = 0;
  /// Also ends taking the level from the parent.
  virtual void SetLevel(TZqLogLevel AValue) = 0;
  /// Keeps a count on AConfig; new children get the root's. An empty one is handed down to all children.
  virtual void SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) = 0;
  /// Finds or makes the logger at a dotted path below this one; this logger itself for an empty path.
  virtual IntfRef<IZqLogger> GetLogger(const TText& AName) = 0;
  /// The child named by the class of AObject.
  virtual IntfRef<IZqLogger> GetLogger(const TObject* AObject) = 0;
  virtual bool IsDebugEnabled() const = 0;
  virtual bool IsErrorEnabled() const = 0;
  virtual bool IsFatalEnabled() const = 0;
  virtual bool IsInfoEnabled() const = 0;
  virtual bool IsWarnEnabled() const = 0;
  [[nodiscard]] bool IsTraceEnabled() const { return IsEnabledFor(llTrace); }
  /// Whether this logger's own appenders would get a message of that level.
  virtual bool IsEnabledFor(TZqLogLevel ALogLevel) const = 0;

  virtual void Trace(const TText& ALogMessage) = 0;
  virtual void Trace(const TObject* AObject, const TText& AMethodName) = 0;
  virtual void Trace(const TObject* AObject, const TText& AMethodName, TVarArgs AArgs) = 0;
  virtual void Debug(const TText& ALogMessage) = 0;
  virtual void Debug(const TText& ALogMessage, TVarArgs AArgs) = 0;
  virtual void Debug(const TText& AMessage, const Variant& AValue) = 0;
  virtual void Debug(const TText& AMessage, const TObject* AValue) = 0;
  virtual void Debug(const TText& AMessage, const Exception& AValue) = 0;
  /// A number goes as a Variant, and a literal 0 is none but a number.
  template <detail::TNumber T>
  void Debug(const TText& AMessage, T AValue) {
    Debug(AMessage, Variant(AValue));
  }
  /// A duration, an optional, a path, an enumeration's value, a range and the like: as its text.
  template <detail::TShown T>
  void Debug(const TText& AMessage, const T& AValue) {
    Debug(AMessage, Variant(VarRecText(AValue)));
  }
  virtual void Info(const TText& ALogMessage) = 0;
  virtual void Warn(const TText& ALogMessage) = 0;
  virtual void Error(const TText& ALogMessage) = 0;
  virtual void Fatal(const TText& ALogMessage) = 0;
  virtual void Fatal(const TText& ALogMessage, TVarArgs AArgs) = 0;
  virtual void Fatal(const Exception& AException) = 0;
  virtual void Fatal(const TText& ALogMessage, const Exception& AException) = 0;
  virtual void Count(const TText& ACounter, Integer AValue) = 0;
  /// Does nothing.
  virtual void ClearLog() = 0;
  virtual void EnterMethod(const TText& AMethodName, TZqLogLevel ALogLevel = llDebug) = 0;
  virtual void EnterMethod(const TText& AMethodName, TVarArgs AArgs, TZqLogLevel ALogLevel = llDebug) = 0;
  virtual void EnterMethod(const TObject* AObject, const TText& AMethodName, TZqLogLevel ALogLevel = llDebug) = 0;
  virtual void EnterMethod(
      const TObject* AObject, const TText& AMethodName, TVarArgs AArgs, TZqLogLevel ALogLevel = llDebug) = 0;
  virtual void ExitMethod(const TText& AMethodName, TZqLogLevel ALogLevel = llDebug) = 0;
  virtual void ExitMethod(const TText& AMethodName, TVarArgs AArgs, TZqLogLevel ALogLevel = llDebug) = 0;
  virtual void ExitMethod(const TObject* AObject, const TText& AMethodName, TZqLogLevel ALogLevel = llDebug) = 0;
  virtual void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, TZqLogIndent ALogIndent = liIndentNone) = 0;
  virtual void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, const Variant& AValue,
      TZqLogIndent ALogIndent = liIndentNone) = 0;
  virtual void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, const TObject* AValue,
      TZqLogIndent ALogIndent = liIndentNone) = 0;
  virtual void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, const Exception& AValue,
      TZqLogIndent ALogIndent = liIndentNone) = 0;
  virtual void Log(const IntfRef<IZqLogData>& ALogData) = 0;
  // With arguments, for the operations that have no such form of their own.
  void Info(const TText& ALogMessage, TVarArgs AArgs) { Log(llInfo, ALogMessage, AArgs); }
  void Warn(const TText& ALogMessage, TVarArgs AArgs) { Log(llWarn, ALogMessage, AArgs); }
  void Error(const TText& ALogMessage, TVarArgs AArgs) { Log(llError, ALogMessage, AArgs); }
  void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, TVarArgs AArgs, TZqLogIndent ALogIndent = liIndentNone);
  /// The exception's message on a line of its own.
  void Error(const TText& ALogMessage, const std::exception& AException);
  // Exceptions of the standard library, for the operations that take the library's own.
  void Debug(const TText& ALogMessage, const std::exception& AValue) { Log(llDebug, ALogMessage, AValue); }
  void Fatal(const std::exception& AException) { Log(llFatal, VarRecText(AException), AException); }
  void Fatal(const TText& ALogMessage, const std::exception& AException) { Log(llFatal, ALogMessage, AException); }
  template <detail::TNumber T>
  void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, T AValue, TZqLogIndent ALogIndent = liIndentNone) {
    Log(ALogLevel, ALogMessage, Variant(AValue), ALogIndent);
  }
  template <detail::TShown T>
  void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, const T& AValue, TZqLogIndent ALogIndent = liIndentNone) {
    Log(ALogLevel, ALogMessage, Variant(VarRecText(AValue)), ALogIndent);
  }

  /// The logger holds a count on AAppender until it is removed.
  virtual void AddAppender(const IntfRef<IZqLogAppender>& AAppender) = 0;
  /// Makes one of that class.
  virtual void AddAppender(TZqLogBaseClass AAppender) = 0;
  virtual void RemoveAppender(const IntfRef<IZqLogAppender>& AAppender) = 0;
  virtual void ClearAppenders() = 0;
  /// The list, locked for a walk until this thread calls UnLockAppenders.
  virtual TZqLogAppenderList* LockAppenders() = 0;
  virtual void UnLockAppenders() = 0;

 protected:
  ~IZqLogger() = default;
};

/// Lock of the logger tree: re-entrant, gives up after some five seconds, and can tell who holds it.
class ZQ_API TZqLogLock : public TObject {
 public:
  TZqLogLock() = default;
  ~TZqLogLock() override = default;
  /// False, or Exception if ARaise, when the lock stays busy.
  bool Enter(const UnicodeString& ALockRequestedBy, bool ARaise);
  /// The same for AOwner followed by AOperation, joined only when somebody reads it. Both must outlive this object.
  bool Enter(const UnicodeString& AOwner, const char16_t* AOperation, bool ARaise);
  bool Enter(UnicodeString&& AOwner, const char16_t* AOperation, bool ARaise) = delete;
  void Leave() noexcept { FLock.Leave(); }
  /// Who took the lock last, and on which thread.
  [[nodiscard]] UnicodeString LockedBy() const;
  [[nodiscard]] bool IsOwned() const noexcept { return FLock.IsOwned(); }

 private:
  bool Take(const UnicodeString& AOwner, const char16_t* AOperation, bool ARaise);

  TCriticalSection FLock;
  std::atomic<const UnicodeString*> FOwner = nullptr;  // null: the holder gave a text of its own, FText
  std::atomic<const char16_t*> FOperation = u"";
  std::atomic<Cardinal> FThread = 0;
  mutable std::mutex FTextLock;
  UnicodeString FText;
};

/// The children of a logger, not counted: a child is here only as long as it lives.
class ZQ_API TZqLoggerList : public TObject {
 public:
  explicit TZqLoggerList(TZqLogger* ALogger) noexcept : FLogger(ALogger) {}
  ~TZqLoggerList() override;

  /// False, or Exception if ARaise, where the lock stays busy for some five seconds. Unlock is the same thread's.
  bool Lock(const UnicodeString& ALockRequestedBy, bool ARaise) { return FLock.Enter(ALockRequestedBy, ARaise); }
  void Unlock() noexcept { FLock.Leave(); }
  void AddLogger(TZqLogger* ALogger);
  void RemoveLogger(TZqLogger* ALogger);
  /// Count and GetLogger take no lock: who walks the list holds it. GetLogger raises EListError.
  [[nodiscard]] Integer Count() const noexcept { return static_cast<Integer>(FList.size()); }
  [[nodiscard]] IntfRef<IZqLogger> GetLogger(Integer AIndex) const;
  /// By the last component, exactly; nullptr if there is none. Not counted: safe to use only under the list's lock.
  [[nodiscard]] TZqLogger* FindLogger(const UnicodeString& AName);

 private:
  friend class TZqLogger;

  TZqLogger* FLogger;
  std::vector<TZqLogger*> FList;
  TZqLogLock FLock;
};

/// The appenders of a logger, each held by a count.
class ZQ_API TZqLogAppenderList : public TComponent {
 public:
  explicit TZqLogAppenderList(TZqLogger* ALogger);

  /// Adds an appender once, however often it is called. Raises EAssertionFailed for an empty reference.
  void Add(const IntfRef<IZqLogAppender>& AAppender);
  /// Makes an appender of that class, with the class name as its name. Raises EIntfCastError for a class that is no
  /// appender, EInvalidOperation for an empty one.
  IntfRef<IZqLogAppender> Add(TZqLogBaseClass AAppender);
  /// Of a registered class, whatever the case of the name; raises EListError if there is none.
  IntfRef<IZqLogAppender> Add(const TText& AAppender);
  /// The same with a layout.
  IntfRef<IZqLogAppender> Add(TZqLogBaseClass AAppender, TZqLogBaseClass ALayout);
  IntfRef<IZqLogAppender> Add(const TText& AAppender, const TText& ALayout);
  /// Raises EAssertionFailed for an empty reference.
  void Remove(const IntfRef<IZqLogAppender>& AAppender);
  void Clear();
  /// Count and GetAppender take no lock: who walks the list holds it. GetAppender raises EListError.
  [[nodiscard]] Integer Count() const noexcept { return FCount.load(std::memory_order_relaxed); }
  [[nodiscard]] IntfRef<IZqLogAppender> GetAppender(Integer AIndex) const;
  /// As those of TZqLoggerList.
  bool Lock(const UnicodeString& ALockRequestedBy, bool ARaise) { return FLock.Enter(ALockRequestedBy, ARaise); }
  void Unlock() noexcept { FLock.Leave(); }

 protected:
  ~TZqLogAppenderList() override = default;
  void BeforeDestruction() override;
  void Notification(TComponent* AComponent, TOperation AOperation) override;

 private:
  friend class TZqLogger;
  // A step of a walk shares the entry instead of counting the appender once more, which spares two calls to it.
  struct TEntry {
    mutable std::shared_ptr<const void> Token = nullptr;  // of an appender that ends, which waits until it is dropped
    IntfRef<IZqLogAppender> Appender;
    TComponent* Component;  // of the appender, asked for once: that is host code
    [[nodiscard]] bool IsSame(const TEntry& AOther) const noexcept {
      return Appender == AOther.Appender || (Component != nullptr && Component == AOther.Component);
    }
  };
  using TItem = std::shared_ptr<const TEntry>;
  using TItems = std::vector<TItem>;

  TItem ItemOrNone(std::size_t AIndex) const;
  template <class TLeaves>
  TItems TakeItems(TLeaves ALeaves);
  TItems TakeAll();
  void LetGoOf(const TComponent* AComponent);

  TZqLogger* FLogger;
  std::atomic<Integer> FCount = 0;  // FList's size
  // Guarded by FLock:
  Integer FNesting = 0;                 // calls to appenders under way
  Integer FWithin = 0;                  // messages within the outermost of them
  mutable TCriticalSection FItemsLock;  // innermost, for a few instructions: an appender may end on any thread
  TItems FList;
  TZqLogLock FLock;
};

/// A logger. The root is made by Logger() and never dies by its count; all others come from GetLogger and live as long
/// as somebody holds them or one of their children.
class ZQ_API TZqLogger : public Implements<TObject, IZqLogger> {
 public:
  TZqLogger(TZqLogger* AParentLogger, UnicodeString AName);

  [[nodiscard]] Integer RefCount() const noexcept { return FRefCount.load(std::memory_order_relaxed); }
  [[nodiscard]] IntfRef<IZqLogConfigurator> Configurator() const;
  /// Also hands nullptr down to the children.
  void SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) override;

  /// Raises EAssertionFailed at the root.
  HRESULT QueryInterface(const TGUID& AIID, void** AObj) override;
  Integer _AddRef() override;
  Integer _Release() override;

  IntfRef<IZqLogger> GetParentLogger() const override;
  bool GetParentLevel() const override { return FParentLevel.load(std::memory_order_relaxed); }
  TZqLogLevel GetLevel() const override;
  TZqLogAppenderList* GetAppenders() override { return FAppenders.get(); }
  TZqLoggerList* GetChildLoggers() override { return &FChildLoggers; }
  bool GetAdditive() const override { return FAdditive.load(std::memory_order_relaxed); }
  UnicodeString GetName() const override { return FFullName; }
  UnicodeString GetFullName() const override { return FName; }
  void SetAdditive(bool AValue) override { FAdditive.store(AValue, std::memory_order_relaxed); }
  void SetParentLevel(bool AValue) override { FParentLevel.store(AValue, std::memory_order_relaxed); }
  void SetLevel(TZqLogLevel AValue) override;
  IntfRef<IZqLogger> GetLogger(const TText& AName) override;
  IntfRef<IZqLogger> GetLogger(const TObject* AObject) override;
  bool IsDebugEnabled() const override { return IsEnabledFor(llDebug); }
  bool IsErrorEnabled() const override { return IsEnabledFor(llError); }
  bool IsFatalEnabled() const override { return IsEnabledFor(llFatal); }
  bool IsInfoEnabled() const override { return IsEnabledFor(llInfo); }
  bool IsWarnEnabled() const override { return IsEnabledFor(llWarn); }
  bool IsEnabledFor(TZqLogLevel ALogLevel) const override { return GetLevel() <= ALogLevel; }

  using IZqLogger::Debug;
  using IZqLogger::Error;
  using IZqLogger::Fatal;
  using IZqLogger::Info;
  using IZqLogger::Log;
  using IZqLogger::Trace;
  using IZqLogger::Warn;
  void Trace(const TText& ALogMessage) override;
  void Trace(const TObject* AObject, const TText& AMethodName) override;
  void Trace(const TObject* AObject, const TText& AMethodName, TVarArgs AArgs) override;
  void Debug(const TText& ALogMessage) override;
  void Debug(const TText& ALogMessage, TVarArgs AArgs) override;
  void Debug(const TText& AMessage, const Variant& AValue) override;
  void Debug(const TText& AMessage, const TObject* AValue) override;
  void Debug(const TText& AMessage, const Exception& AValue) override;
  void Info(const TText& ALogMessage) override;
  void Warn(const TText& ALogMessage) override;
  void Error(const TText& ALogMessage) override;
  void Fatal(const TText& ALogMessage) override;
  void Fatal(const TText& ALogMessage, TVarArgs AArgs) override;
  void Fatal(const Exception& AException) override;
  void Fatal(const TText& ALogMessage, const Exception& AException) override;
  void Count(const TText& ACounter, Integer AValue) override;
  void ClearLog() override {}
  void EnterMethod(const TText& AMethodName, TZqLogLevel ALogLevel = llDebug) override;
  void EnterMethod(const TText& AMethodName, TVarArgs AArgs, TZqLogLevel ALogLevel = llDebug) override;
  void EnterMethod(const TObject* AObject, const TText& AMethodName, TZqLogLevel ALogLevel = llDebug) override;
  void EnterMethod(
      const TObject* AObject, const TText& AMethodName, TVarArgs AArgs, TZqLogLevel ALogLevel = llDebug) override;
  void ExitMethod(const TText& AMethodName, TZqLogLevel ALogLevel = llDebug) override;
  void ExitMethod(const TText& AMethodName, TVarArgs AArgs, TZqLogLevel ALogLevel = llDebug) override;
  void ExitMethod(const TObject* AObject, const TText& AMethodName, TZqLogLevel ALogLevel = llDebug) override;
  void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, TZqLogIndent ALogIndent = liIndentNone) override;
  void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, const Variant& AValue,
      TZqLogIndent ALogIndent = liIndentNone) override;
  void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, const TObject* AValue,
      TZqLogIndent ALogIndent = liIndentNone) override;
  void Log(TZqLogLevel ALogLevel, const TText& ALogMessage, const Exception& AValue,
      TZqLogIndent ALogIndent = liIndentNone) override;
  void Log(const IntfRef<IZqLogData>& ALogData) override;

  void AddAppender(const IntfRef<IZqLogAppender>& AAppender) override { FAppenders->Add(AAppender); }
  void AddAppender(TZqLogBaseClass AAppender) override { FAppenders->Add(AAppender); }
  void RemoveAppender(const IntfRef<IZqLogAppender>& AAppender) override { FAppenders->Remove(AAppender); }
  void ClearAppenders() override { FAppenders->Clear(); }
  TZqLogAppenderList* LockAppenders() override;
  void UnLockAppenders() override { FAppenders->Unlock(); }

 protected:
  ~TZqLogger() override = default;
  void AfterConstruction() override;
  void BeforeDestruction() override;

 private:
  friend class TZqLoggerList;
  friend class TZqLogAppenderList;
  friend ZQ_API TZqLogger* Logger();
  friend void uZqLogger::EndProcess() noexcept;

  void DoLog(TZqLogLevel ALogLevel, const TText& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent);
  static TZqLogger* NextToWrite(TZqLogger* ALogger, TZqLogLevel ALogLevel);
  // Where a message goes on to; null where it ends.
  [[nodiscard]] TZqLogger* Upwards() const noexcept {
    return FAdditive.load(std::memory_order_relaxed) ? FParent.load(std::memory_order_relaxed) : nullptr;
  }
  void WriteConverted(
      TZqLogger* AFirst, TZqLogLevel ALogLevel, const TText& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent);
  void WriteWhole(TZqLogger* AFirst, TZqLogLevel ALogLevel, const UnicodeString& ALogMessage, PZqDataRec AValue,
      TZqLogIndent ALogIndent);
  void WriteToAppenders(TZqLogWalk& AWalk, const UnicodeString& ASender, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent);
  IntfRef<TZqLogger> FindOrMakeChild(const UnicodeString& AName, bool& AMade);
  void ClearChildLoggers();
  void CollectAppenders(std::vector<IntfRef<IZqLogAppender>>& AFound);
  IntfRef<IZqLogConfigurator> SetConfigurator(IntfRef<IZqLogConfigurator> AConfig);
  void ReplaceConfig(const IntfRef<IZqLogConfigurator>& AConfig, std::vector<IntfRef<IZqLogConfigurator>>& AFormer);
  void TakeConfig(const IntfRef<IZqLogConfigurator>& AConfig);
  void AddNamed(const IntfRef<IZqLogConfigurator>& AConfig, const UnicodeString& AName);

  // In this order, so that the children's list goes first at the end. What a message reads on its way up lies together.
  UnicodeString FName;
  UnicodeString FFullName;
  mutable TCriticalSection FConfigLock;  // innermost, for one copy of FConfigurator
  IntfRef<IZqLogConfigurator> FConfigurator;
  TZqLogLock FLock;
  std::atomic<Integer> FRefCount = 0;
  std::atomic<TZqLogger*> FParent;  // the same object as FParentLogger; emptied with it when the parent goes first
  IntfRef<IZqLogger> FParentLogger;
  std::atomic<bool> FParentLevel = true;
  std::atomic<TZqLogLevel> FLevel = llDebug;
  std::atomic<bool> FAdditive = true;
  TOwned<TZqLogAppenderList> FAppenders;
  TZqLoggerList FChildLoggers;
};

/// The root logger, named "root", at level llDebug; made by the first call. Lives until the library stops.
[[nodiscard]] ZQ_API TZqLogger* Logger();

// ---------------------------------------------------------------------------------------- log components

/// Base of appenders and layouts: a named component, made through its class, that lives by its count.
class ZQ_API TZqLogBase : public Implements<TZqComponent, IZqLogBase> {
 public:
  /// AName becomes the component's name unless it is empty or begins with a digit; raises EComponentError for one that
  /// is no identifier. ALogger must outlive the object.
  TZqLogBase(TZqLogger* ALogger, const UnicodeString& AName);
  [[nodiscard]] TZqLogger* Logger() const noexcept { return FLogger; }
  UnicodeString GetName() const override { return Name(); }
  TComponent* Component() override { return this; }

 protected:
  ~TZqLogBase() override;
  void AfterConstruction() override;
  /// Freed by hand, on any thread, the object first leaves the lists that hold it and waits, for some five seconds at
  /// most, until no other thread's message is on its way through it. It raises Exception where it is counted still, as
  /// out of a message of its own.
  void BeforeDestruction() override;
  /// Listed and ended by its count as before; the lists that it left don't get it back.
  void EndRefused() noexcept override;
  // That first step: nothing where nobody counts the object. Its last count doesn't end it any more.
  void LeaveLists();

 private:
  void ListAppender();

  TZqLogger* FLogger;
  bool FEndedByCount = false;  // until LeaveLists
};

/// Classes by name, in order of registration.
class ZQ_API TZqLogBaseClassList : public TObject {
 public:
  TZqLogBaseClassList() = default;
  ~TZqLogBaseClassList() override = default;
  /// Adds a class once.
  void Add(TZqLogBaseClass AClass);
  /// Whatever the case of the name; raises EListError if there is none.
  [[nodiscard]] TZqLogBaseClass GetClass(const TText& AClassName) const;
  [[nodiscard]] Integer Count() const noexcept { return static_cast<Integer>(FList.size()); }

 private:
  std::vector<TZqLogBaseClass> FList;
};

/// Made by the first call, which belongs in start-up code: it takes no lock.
[[nodiscard]] ZQ_API TZqLogBaseClassList* RegisteredLayouts();
[[nodiscard]] ZQ_API TZqLogBaseClassList* RegisteredAppenders();
/// Every appender alive, in order of creation; a copy, for a moment.
[[nodiscard]] ZQ_API std::vector<TZqLogBase*> LiveAppenders();

/// Class names for Add and SetLayout, which raise EListError for one that nobody has registered.
inline constexpr ShortString ZqFileAppender = "TZqFileAppender";
inline constexpr ShortString ZqRollingFileAppender = "TZqRollingFileAppender";
inline constexpr ShortString ZqDailyRollingFileAppender = "TZqDailyRollingFileAppender";
inline constexpr ShortString ZqLogViewerAppenderServer = "TZqLogViewerAppenderServer";
inline constexpr ShortString ZqLogViewerAppenderClient = "TZqLogViewerAppenderClient";
inline constexpr ShortString ZqSimpleLayout = "TZqSimpleLayout";
inline constexpr ShortString ZqXmlLayout = "TZqXmlLayout";

namespace uZqLogger {
ZQ_API void Start();
ZQ_API void Stop();
}  // namespace uZqLogger

}  // namespace zq
