#pragma once

#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "common/uZqLogger.h"

class TUsageError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

struct TOptions {
  std::string Config;  // a file of settings; empty where the options tell of files and layouts
  std::vector<std::string> Files;
  std::optional<std::string> Source;  // in the system's log
  std::vector<std::string> Inputs;
  std::optional<zq::Cardinal> MaxSize;  // the appender's own
  std::string Pattern;                  // of the date that names old files; empty where the size alone rolls
  zq::Word Backups = 5;
  bool Append = true;
  std::string Logger = "zqlogpipe";
  zq::TZqLogLevel Level = zq::llInfo;
  bool DetectLevel = false;
  bool Time = true;
  bool Xml = false;
  bool Tee = false;
  bool Quiet = false;
  zq::Cardinal Retry = 0;  // seconds; 0: a line that can't be written is lost
  bool Help = false;
  bool Version = false;
};

extern const char cHelp[];

/// Raises TUsageError.
TOptions ParseOptions(const std::vector<std::string_view>& AWords);
/// That of the first word of ALine which names one.
std::optional<zq::TZqLogLevel> DetectLevel(std::string_view ALine);
