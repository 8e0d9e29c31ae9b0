#pragma once

#include <memory>
#include <optional>
#include <vector>

#include "common/uZqLogger.h"
#include "runtime/core/utf8.h"
#include "runtime/io/files.h"
#include "runtime/io/text_file.h"

namespace zq {

/// State machine under all appenders: opened by the first Write, closed by Close, opened again by the next Write.
///
/// Without a layout an appender takes every message and writes nothing. Lock and Unlock keep its operations apart, also
/// when several loggers share it: those of this class take no lock, a descendant's hold FLock around them. Its end
/// closes it; an appender that can't write its last bytes goes all the same.
class ZQ_API TZqBaseAppender : public Implements<TZqLogBase, IZqLogAppender, IZqLogAppenderEx> {
 public:
  using Implements::Implements;
  [[nodiscard]] IntfRef<IZqLogLayout> Layout() const;

  /// Opens what the appender writes to; the first Write does so too. Raises what the opening raises.
  virtual void Initialize();
  /// Takes what AConfig tells of the appender's name; null changes nothing. Raises EListError for a layout that nobody
  /// has registered, and what the conversion of a value raises.
  virtual void SetConfig(const IntfRef<IZqLogConfigurator>& AConfig);
  /// Initialises the appender if need be; a descendant calls it first and then writes.
  void Write(const UnicodeString& ASender, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) override;
  void Close() override;
  /// An empty reference takes the layout away.
  void SetLayout(const IntfRef<IZqLogLayout>& ALayout) override;
  void SetLayout(TZqLogBaseClass ALayout) override;
  void SetLayout(const TText& ALayout) override;

  /// Several operations as one; other threads' messages wait meanwhile. May be nested.
  void Lock() const noexcept { FLock.Enter(); }
  void Unlock() const noexcept { FLock.Leave(); }

 protected:
  ~TZqBaseAppender() override = default;
  void AfterConstruction() override;
  void BeforeDestruction() override;

  // For descendants: Initialize and the end of a file run in this scope. A message from within, of a layout that logs,
  // goes into the file that is there; nothing is opened, rolled or closed for it.
  class TInitializing {
   public:
    explicit TInitializing(TZqBaseAppender& AAppender) noexcept : FAppender(AAppender) { ++FAppender.FInitializing; }
    TInitializing(const TInitializing&) = delete;
    TInitializing& operator=(const TInitializing&) = delete;
    ~TInitializing() { --FAppender.FInitializing; }

   private:
    TZqBaseAppender& FAppender;
  };
  // For descendants: a message is written in this scope. A layout that SetLayout replaces from within stays to its end.
  class TWriting {
   public:
    explicit TWriting(TZqBaseAppender& AAppender) noexcept : FAppender(AAppender) { ++FAppender.FWriting; }
    TWriting(const TWriting&) = delete;
    TWriting& operator=(const TWriting&) = delete;
    ~TWriting() {
      if (--FAppender.FWriting == 0 && !FAppender.FFormer.empty()) FAppender.FFormer.clear();
    }

   private:
    TZqBaseAppender& FAppender;
  };
  using TScope = TLockScope<TCriticalSection>;

  // These two are changed by SetLayout alone. The second is the first's way of writing bytes, empty if it has none.
  IntfRef<IZqLogLayout> FLayout;
  IntfRef<IZqLogByteLayout> FByteLayout;
  bool FInitialized = false;
  Integer FInitializing = 0;  // depth of TInitializing
  mutable TCriticalSection FLock;

 private:
  Integer FWriting = 0;  // depth of TWriting
  std::vector<IntfRef<IInterface>> FFormer;
};

/// Writer of UTF-8 text lines that counts its bytes. Each call is one system call, so what returned is in the file, and
/// a killed process loses none of it. Any thread may write.
///
/// A failed step raises EInOutError.
class ZQ_API TZqTextFile : public TObject {
 public:
  /// Makes missing folders; appends to an existing file.
  explicit TZqTextFile(const TFileName& AFileName);
  /// Closes; a failure there goes unseen. Close shows it.
  ~TZqTextFile() override;

  /// Bytes in the file by this writer's count, at most 4294967295.
  [[nodiscard]] Cardinal Size() const;
  void Write(const UnicodeString& AValue);
  /// With CR LF behind it.
  void WriteLn(const UnicodeString& AValue);
  /// The file ends in the middle of a line: what is written next begins with a line end, unless GoOnInLine says
  /// otherwise.
  [[nodiscard]] bool IsTorn() const noexcept { return FFile.IsTorn(); }
  void GoOnInLine() noexcept { FFile.GoOnInLine(); }
  /// Opened by the process that this one was forked from: its header and footer, and the file's name, are that one's.
  [[nodiscard]] bool IsInherited() const noexcept { return FFile.IsInherited(); }
  /// False where another writer of the file, of this process or of another, has claimed it before.
  [[nodiscard]] bool Claim() { return FFile.Claim(); }
  /// UTF-8 as it is, line ends and all.
  void WriteBytes(std::string_view ABytes) {
    const TLockScope Scope(FCritSect);
    FFile.WriteBytes(ABytes);
  }
  void Close();

 private:
  friend class TZqFileAppender;
  TTextFile FFile;
  Int64 FFound = 0;  // bytes that the file had when it was opened
  mutable TCriticalSection FCritSect;
};

struct ZQ_API IZqFileAppender : Extends<IZqLogAppender> {
  static constexpr TGUID IID = "{36A4304E-7A72-4C9C-A6B8-AE1B4B533E9E}"_guid;
  virtual TFileName GetFileName() const = 0;
  virtual bool GetAppendExisting() const = 0;
  virtual UnicodeString GetFileExt() const = 0;
  /// Closes the present file. A name without extension gets FileExt, one with an extension changes it. With an empty
  /// name, or one of blanks, nothing is written. What Close raises leaves the name as it was.
  virtual void SetFileName(const TText& AValue) = 0;
  /// False: an existing file is not continued when it is opened.
  virtual void SetAppendExisting(bool AValue) = 0;
  /// Closes the present file and changes the extension of its name. The dot may be left out. What Close raises leaves
  /// both as they were.
  virtual void SetFileExt(const UnicodeString& AValue) = 0;

 protected:
  ~IZqFileAppender() = default;
};

struct ZQ_API IZqFileAppenderEx : Extends<IZqFileAppender> {
  static constexpr TGUID IID = "{6B1B7C1E-5A0D-4A7B-9B6F-0F5E6C0B5D21}"_guid;
  /// Milliseconds after a roll that couldn't open its new file, until a message tries again to open it. 0: only Close
  /// makes the appender try again.
  virtual Cardinal GetRetryInterval() const = 0;
  virtual void SetRetryInterval(Cardinal AValue) = 0;

 protected:
  ~IZqFileAppenderEx() = default;
};

/// Writes each message as a line into a UTF-8 text file, between a header and a footer.
///
/// In a process that was forked off it goes on with its lines in the parent's file, which it neither ends nor rolls.
/// By default the file is named after the host program and lies in a folder of that name below the common documents.
class ZQ_API TZqFileAppender : public Implements<TZqBaseAppender, IZqFileAppenderEx> {
 public:
  TZqFileAppender(TZqLogger* ALogger, const UnicodeString& AName);

  /// Raises EInOutError when the file can't be opened; the next Write tries again.
  void Initialize() override;
  void SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) override;
  /// Raises EInOutError when the line can't be written.
  void Write(const UnicodeString& ASender, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) override;
  /// Raises EInOutError when the footer can't be written, and what the layout raises; the file is closed all the same.
  void Close() override;
  using TZqBaseAppender::SetLayout;
  /// Closes the present file; a layout that has an extension of its own changes the file's. What Close raises leaves
  /// the layout as it was.
  void SetLayout(const IntfRef<IZqLogLayout>& ALayout) override;

  TFileName GetFileName() const override;
  bool GetAppendExisting() const override;
  UnicodeString GetFileExt() const override;
  void SetFileExt(const UnicodeString& AValue) override;
  void SetAppendExisting(bool AValue) override;
  void SetFileName(const TText& AValue) override;
  Cardinal GetRetryInterval() const override;
  void SetRetryInterval(Cardinal AValue) override;

 protected:
  ~TZqFileAppender() override = default;
  // Begins each Write, under its lock; a message is dropped for false.
  virtual bool PrepareWrite();
  // Opens the file, for Initialize: AAppend continues one that is there, otherwise it is deleted first.
  void OpenFile(bool AAppend);
  // Writes the footer and closes the file, also when the footer fails, which raises then.
  void EndFile();

  TFileName FFileName;
  std::unique_ptr<TZqTextFile> FFileStream;
  bool FAppendExisting = true;
  UnicodeString FFileExt = u".log";

 private:
  void WriteHeader();
  void Revive();

  Cardinal FRetryInterval = 0;
  Int64 FFailedAt = 0;       // when a file couldn't be opened, as UtcMilliseconds
  utf8::TBuffer FSpareLine;  // room of the last line, for the next one
};

struct ZQ_API IZqRollingFileAppender : Extends<IZqFileAppender> {
  static constexpr TGUID IID = IZqFileAppender::IID;
  /// Bytes. 0: no limit.
  virtual Cardinal GetMaxFileSize() const = 0;
  /// Files of the series, the log file among them. 0: nothing is written.
  virtual Word GetMaxBackupCount() const = 0;
  virtual void SetMaxFileSize(Cardinal AValue) = 0;
  /// Deletes what the series has beyond it at once; 0 ends the file without a footer and deletes it too.
  virtual void SetMaxBackupCount(Word AValue) = 0;
  /// Ends the file, renumbers the series and begins a new file. Raises EInOutError when that can't be opened; messages
  /// go nowhere then until Close, or until the retry interval is over. A series that can't be renumbered stays as far
  /// as it is, and the log goes on in its file.
  virtual void RollOver() = 0;

 protected:
  ~IZqRollingFileAppender() = default;
};

/// The parts of one file name of a series.
class ZQ_API TZqFileInfo : public TObject {
 public:
  TZqFileInfo() = default;
  ~TZqFileInfo() override = default;
  UnicodeString FileNameLeft;   ///< name of the log file without folder and last extension
  Integer Index = 0;            ///< number in the name; 0 for none
  UnicodeString FileNameRight;  ///< what stands between the number and the last extension
};

/// Keeps the log file below a size: a file at the limit becomes "app.1.log", the backups before it move one up, and the
/// series never has more than MaxBackupCount files. Other files beside it are left alone.
///
/// No file of the series is replaced, or deleted for another reason than that number. A roll that fails is told as a
/// failure of the log and tried again when the file has grown by the limit once more, or after a minute.
///
/// The roll takes place in the call that found the file too large; other threads that log wait for it.
class ZQ_API TZqRollingFileAppender : public Implements<TZqFileAppender, IZqRollingFileAppender> {
 public:
  using Implements::Implements;

  /// A file that must not be continued is kept as a backup.
  void Initialize() override;
  void SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) override;
  /// Takes a name from the folder apart, without path. The caller owns the result.
  [[nodiscard]] virtual std::unique_ptr<TZqFileInfo> CreateFileInfo(const UnicodeString& AFileName);
  Cardinal GetMaxFileSize() const override;
  Word GetMaxBackupCount() const override;
  void SetMaxFileSize(Cardinal AValue) override;
  void SetMaxBackupCount(Word AValue) override;
  /// Deletes what the series has beyond MaxBackupCount.
  virtual void CheckBackupCount();
  /// Rolls if the file has reached MaxFileSize.
  virtual void CheckRollover();
  void RollOver() override;

 protected:
  ~TZqRollingFileAppender() override = default;
  bool PrepareWrite() override;
  // Whether a name from the folder is the log file or one of its backups: those alone are renamed and deleted.
  [[nodiscard]] virtual bool IsOfSeries(const UnicodeString& AFileName) const;
  // For descendants. Folder of the log file with its separator, empty where the name has none; name without extension.
  [[nodiscard]] UnicodeString Folder() const;
  [[nodiscard]] UnicodeString Base() const;
  // What a backup's name has between the log file's name with its dot and the last extension; nothing for other names.
  [[nodiscard]] std::optional<UnicodeString> SuffixOf(const UnicodeString& AFileName) const;
  // The steps of a roll. One that found no place for the file is told, and due again when the file has grown by the
  // limit or a minute is over.
  [[nodiscard]] bool MayRoll() const;
  [[nodiscard]] bool IsRollDue() const;
  void RollFailed();
  void EndRolled();

  struct TFailedRoll {
    Int64 Size;  // of the file
    Int64 Time;  // UtcMilliseconds
  };
  std::optional<TFailedRoll> FFailedRoll;  // of the file that is open, or being opened
  Cardinal FMaxFileSize = 10485760;
  Word FMaxBackupCount = 5;

 private:
  struct TEntry {
    UnicodeString Name;
    std::unique_ptr<TZqFileInfo> Info;
    Int64 Changed;  // microseconds since 1970, UTC
  };
  using TSeries = std::vector<TEntry>;
  bool ScanSeries(TSeries& ASeries);
  bool MoveTo(const TEntry& AEntry, std::size_t ANumber);
  bool MoveUp();
  void Prune(std::size_t AKept);
  void Complain(const UnicodeString& AWhat);
};

struct ZQ_API IZqDailyRollingFileAppender : Extends<IZqRollingFileAppender> {
  static constexpr TGUID IID = IZqFileAppender::IID;
  virtual UnicodeString GetDatePattern() const = 0;
  /// A pattern of FormatDateTime. The file rolls at once where the text of the moment is another one by it.
  virtual void SetDatePattern(const TText& AValue) = 0;

 protected:
  ~IZqDailyRollingFileAppender() = default;
};

/// Rolls when the text of a date pattern changes, each midnight unless told otherwise, and names the old file by the
/// time at which it was begun: "app.2021-12-22.log". Where that name is taken, and at the limit of size for the second
/// time in one period, the roll is the numeric one, and the old file becomes "app.1.2021-12-22.log".
///
/// Files named by their date are of the series, but only a numeric roll and SetMaxBackupCount count them: behind the
/// log file, those changed last first. The time when a file was begun comes from the file system; where that keeps
/// none, from the first date that stands in the file, which a copy keeps, too, and else from its last change. A roll
/// that fails when the file is opened is tried again as any other.
class ZQ_API TZqDailyRollingFileAppender : public Implements<TZqRollingFileAppender, IZqDailyRollingFileAppender> {
 public:
  /// MaxFileSize is 2147483647 at first.
  TZqDailyRollingFileAppender(TZqLogger* ALogger, const UnicodeString& AName);

  /// A file begun in an earlier period is rolled before anything is added to it.
  void Initialize() override;
  void SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) override;
  [[nodiscard]] std::unique_ptr<TZqFileInfo> CreateFileInfo(const UnicodeString& AFileName) override;
  void CheckRollover() override;
  void RollOver() override;
  UnicodeString GetDatePattern() const override;
  void SetDatePattern(const TText& AValue) override;

 protected:
  ~TZqDailyRollingFileAppender() override = default;
  [[nodiscard]] bool IsOfSeries(const UnicodeString& AFileName) const override;

  UnicodeString FDatePattern = u"yyyy-mm-dd";
  UnicodeString FCurrent;  // the text of the pattern when the file was begun

 private:
  enum class TMoved : Byte { Moved, Kept, Refused };  // Kept: it stays where it is, and the log goes on in it
  TMoved MoveToDate();
  [[nodiscard]] UnicodeString TextOf(TDateTime AMoment) const;
  const UnicodeString& TextOfNow();
  [[nodiscard]] std::optional<TDateTime> TimeBegun() const;
  [[nodiscard]] std::optional<TDateTime> DateInFile() const;
  [[nodiscard]] bool IsDate(std::u16string_view AText) const;  // the text of a date by the pattern

  // The text of a moment, which serves for the moments around it that can't have another one.
  UnicodeString FNowText;
  Int64 FNowFrom = 0;  // UtcMilliseconds
  Int64 FNowTo = -1;
};

namespace uZqLogAppenders {
ZQ_API void Start();
ZQ_API void Stop();
}  // namespace uZqLogAppenders

}  // namespace zq

// Derives from what stands above.
#include "common/uZqLogAppenders/event_log.h"
