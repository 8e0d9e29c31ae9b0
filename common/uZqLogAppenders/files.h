#pragma once

#include <memory>
#include <string_view>

#include "common/uZqLogAppenders/base.h"
#include "runtime/core/utf8.h"
#include "runtime/io/files.h"
#include "runtime/io/text_file.h"

namespace zq {

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

}  // namespace zq
