#pragma once

#include <memory>
#include <optional>
#include <vector>

#include "common/uZqLogAppenders/files.h"

namespace zq {

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

}  // namespace zq
