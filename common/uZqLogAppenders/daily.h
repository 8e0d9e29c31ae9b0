#pragma once

#include <memory>
#include <optional>
#include <string_view>

#include "common/uZqLogAppenders/rolling.h"

namespace zq {

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

}  // namespace zq
