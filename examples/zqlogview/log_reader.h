#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "common/uZqLogger.h"
#include "runtime/io/streams.h"

/// Names and texts, in the log's order.
using TLogFields = std::vector<std::pair<std::string, std::string>>;

/// One message. What the log doesn't tell is empty.
struct TLogItem {
  std::string TimeStamp;
  std::string Thread;
  std::string Logger;
  std::optional<zq::TZqLogLevel> Level;
  std::optional<zq::TZqLogIndent> Indent;
  std::string Message;
  std::string Value;
  std::string ExceptionClass;
  TLogFields Others;  ///< elements of other names, further ones of a name, and numbers that mean nothing
};

enum class TLogPart { Run, RunEnd, Item, Damage, End };

/// Reads an XML log part by part, in memory for one part. Each byte of it is in a part: what is no part of a log, such
/// as a line that its writer couldn't finish, comes as Damage, and what follows is read on. All texts are valid UTF-8,
/// with U+FFFD for what isn't. Raises what ASource raises. One thread at a time.
class TLogReader {
 public:
  /// ASource must outlive the reader. ABlock: how many bytes are read at once, at least.
  explicit TLogReader(zq::TStream& ASource, std::size_t ABlock = 1 << 18) : FSource(ASource), FBlock(ABlock) {}

  /// Reads the next part, which the queries below tell until the next call.
  TLogPart Next();

  /// The attributes of a run's log element.
  [[nodiscard]] const TLogFields& Run() const noexcept { return FRun; }
  [[nodiscard]] const TLogItem& Item() const noexcept { return FItem; }
  /// As it stands in the log, without blanks and line ends around it; a long one comes in several parts.
  [[nodiscard]] const std::string& Damage() const noexcept { return FDamage; }
  /// The line in which the part begins, from 1.
  [[nodiscard]] zq::Int64 Line() const noexcept { return FPartLine; }

 private:
  struct TScan;
  bool More();
  void SkipBlanks();
  void Consume(std::size_t ACount);
  TLogPart Take(std::size_t ACount, TLogPart APart);
  TLogPart TakeDamage(std::size_t AFrom);
  [[nodiscard]] std::string_view Rest() const noexcept { return std::string_view(FBuffer).substr(FFrom); }

  bool ReadInstruction(TScan& AScan);
  bool ReadRun(TScan& AScan);
  bool ReadItem(TScan& AScan);
  bool ReadElement(TScan& AScan);
  bool ReadText(TScan& AScan, std::string_view AName);
  bool ReadCData(TScan& AScan);
  void Keep(std::string_view AName);

  zq::TStream& FSource;
  const std::size_t FBlock;
  bool FAtEnd = false;
  std::string FBuffer;
  std::size_t FFrom = 0;          // what lies before is consumed
  std::size_t FSearchedFrom = 0;  // in FBuffer: no CDATA section ends between the two
  std::size_t FSearchedTo = 0;
  zq::Int64 FLine = 1;
  zq::Int64 FPartLine = 1;
  TLogFields FRun;
  TLogItem FItem;
  std::string FText;  // of the element that is read
  std::string FDamage;
};
