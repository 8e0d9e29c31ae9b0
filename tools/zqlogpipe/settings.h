#pragma once

#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "common/uZqLogger/failures.h"
#include "ini_configurator.h"
#include "output.h"

/// What is wrong with a file of settings, each "file:line: what", or "file: what".
class TSettingsFault : public std::runtime_error {
 public:
  explicit TSettingsFault(std::vector<std::string> AFaults)
      : std::runtime_error("faulty settings"), Faults(std::move(AFaults)) {}
  std::vector<std::string> Faults;
};

/// Loggers and appenders as a file of settings tells.
class TSettingsOutput final : public TOutput {
 public:
  /// ALogger is a dotted path below the root. Raises TSettingsFault, also where no appender of the file would get a
  /// line of that logger, and Exception for what can't be read or set up. An appender that can't be opened is
  /// complained of.
  TSettingsOutput(const std::string& AFile, const std::string& ALogger, TComplaints& AComplaints);
  ~TSettingsOutput() override;
  /// Takes the file's settings of now, unless they are faulty or can't be set up: the former ones stay then.
  void Reopen() override;
  void Finish() override;
  [[nodiscard]] std::string Summary() const override;

 private:
  using TConfig = zq::IntfRef<TIniLogConfigurator>;
  struct THandler {
    explicit THandler(zq::TZqLogFailureEvent AEvent) { zq::ZqSetLogFailureHandler(std::move(AEvent)); }
    THandler(const THandler&) = delete;
    THandler& operator=(const THandler&) = delete;
    ~THandler() { zq::ZqSetLogFailureHandler({}); }
  };
  [[nodiscard]] TConfig Read() const;
  void Use(const TConfig& AConfig);
  void Open(TIniLogConfigurator& AConfig);
  void Note(const zq::TZqLogFailure& AFailure);

  const zq::UnicodeString FFile, FPath, FName;  // of the logger: its path below the root, and its full name
  TConfig FConfig;
  const THandler FHandler;
};
