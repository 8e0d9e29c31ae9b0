#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <vector>

#include "common/uZqLogger.h"

/// Settings of loggers and appenders out of an INI file, to be copied by a host and fitted to its needs:
///
///     [logger root.shop]
///     Level = info               ; all, trace, debug, info, warn, error, fatal, off
///     Additive = no
///     Appenders = orders, errors
///
///     [appender orders]
///     class = TZqDailyRollingFileAppender
///     Layout = TZqSimpleLayout
///     FileName = /var/log/shop/orders.log
///     MaxFileSize = 10M
///
/// The file's encoding is told by its byte order mark, and is UTF-8 without one. Any thread may ask; a reload takes
/// place of the settings as a whole.
class TIniLogConfigurator : public zq::Implements<zq::TInterfacedObject, zq::IZqLogConfigurator> {
 public:
  explicit TIniLogConfigurator(zq::UnicodeString AFileName) : FFileName(std::move(AFileName)) {}

  // One thread at a time:

  /// Reads the file. Returns what is wrong with it, "file:line: what" for each: such a setting counts as not given.
  /// Raises EFOpenError where the file can't be read, and keeps the former settings then.
  std::vector<zq::UnicodeString> Read();
  /// Configures each logger that has a section in the file; what that doesn't name stays as it is. Raises what an
  /// appender or a layout raises.
  void Apply();
  /// Both.
  std::vector<zq::UnicodeString> Load();
  /// Takes the appenders from the loggers that were configured, and lets go of those.
  void Withdraw();

  zq::Variant GetLoggerValue(const zq::UnicodeString& ALoggerName, const zq::UnicodeString& AKey,
      zq::TZqMainTypeKind AKind, const zq::Variant& ADefault) override;
  zq::Variant GetAppenderValue(const zq::UnicodeString& AAppenderName, const zq::UnicodeString& AKey,
      zq::TZqMainTypeKind AKind, const zq::Variant& ADefault) override;
  zq::Variant GetValue(const zq::UnicodeString& AName, const zq::UnicodeString& AKey, zq::TZqMainTypeKind AKind,
      const zq::Variant& ADefault) override;

 protected:
  ~TIniLogConfigurator() override = default;

 private:
  // By "logger NAME" or "appender NAME", and then by key in lower case.
  using TSection = std::map<zq::UnicodeString, zq::Variant>;
  using TSettings = std::map<zq::UnicodeString, TSection>;
  zq::Variant Find(const zq::UnicodeString& ASection, const zq::UnicodeString& AKey, const zq::Variant& ADefault);
  [[nodiscard]] TSettings Parse(std::vector<zq::UnicodeString>& AFaults) const;
  std::shared_ptr<const TSettings> Settings();

  const zq::UnicodeString FFileName;
  std::mutex FLock;
  std::vector<zq::IntfRef<zq::IZqLogger>> FLoggers;  // kept: a logger that nobody holds forgets its settings
  std::shared_ptr<const TSettings> FSettings = std::make_shared<const TSettings>();
};
