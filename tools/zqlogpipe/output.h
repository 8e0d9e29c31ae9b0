#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "common/uZqLogger.h"

/// What became of the lines.
struct TCounts {
  std::size_t Rolls = 0;
  std::size_t Written = 0;
  std::size_t Failed = 0;
  zq::UnicodeString Failure;  // the first
};

/// Tells on standard error what goes wrong.
class TComplaints {
 public:
  /// The exit status is no longer 0.
  void Add(std::string_view AText);
  [[nodiscard]] int Status() const noexcept { return FStatus; }
  static void Tell(std::string_view AText);

 private:
  int FStatus = 0;
};

/// Where the lines go.
class TOutput {
 public:
  virtual ~TOutput() = default;
  void Log(zq::TZqLogLevel ALevel, const zq::UnicodeString& AText) { FLogger->Log(ALevel, AText); }
  /// Ends the files; the next line begins them again.
  virtual void Reopen() { Finish(); }
  virtual void Finish() = 0;
  /// For the last line of all.
  [[nodiscard]] virtual std::string Summary() const = 0;
  [[nodiscard]] const TCounts& Counts() const noexcept { return FCounts; }

 protected:
  explicit TOutput(TComplaints& AComplaints) : FComplaints(AComplaints) {}
  void Close(zq::IZqLogAppender& AAppender);

  TComplaints& FComplaints;
  TCounts FCounts;
  zq::IntfRef<zq::IZqLogger> FLogger;
};

/// The text of a line: UTF-8, with each byte that is none taken as the character of its code.
zq::UnicodeString TextOf(std::string_view ALine);
