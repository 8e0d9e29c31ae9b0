#pragma once

#include <string>
#include <vector>

#include "common/uZqLogAppenders.h"
#include "options.h"
#include "output.h"

/// Files, and the system's log, as the options tell.
class TFilesOutput final : public TOutput {
 public:
  /// Raises Exception where a file can't be opened. AOptions must outlive it.
  TFilesOutput(const TOptions& AOptions, TComplaints& AComplaints);
  void Finish() override;
  [[nodiscard]] std::string Summary() const override;

 private:
  void AddAppender(const std::string& AFile);
  void Add(const std::string& AFile, zq::TZqRollingFileAppender* AAppender);
  void AddSource(const std::string& AName);

  const TOptions& FOptions;
  std::vector<zq::IntfRef<zq::IZqLogAppender>> FAppenders;
};
