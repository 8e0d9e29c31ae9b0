#pragma once

#include <map>
#include <string>
#include <string_view>

#include "log_reader.h"
#include "runtime/core/utf8.h"

/// Writes what readers of logs give as one page of HTML, which needs no other file and no network: a table for each
/// run, in which script filters. Its rows stand in the page, so it is readable without script, too. No text of a log
/// becomes markup; the page's policy admits no script and style but its own.
///
/// Raises what the stream raises. One thread at a time.
class TLogPage {
 public:
  /// Begins the page. ADest must outlive it. ATitle is UTF-8, as all texts are.
  TLogPage(zq::TStream& ADest, std::string_view ATitle);

  /// All that ALog has left, under AName.
  void Add(std::string_view AName, TLogReader& ALog);
  /// Ends the page, which is not whole without it.
  void Finish();

 private:
  void BeginRun(const TLogFields* AFields);
  void EndRun();
  void BeginRow();
  void AddItem(const TLogItem& AItem);
  void AddDamage(zq::Int64 ALine, std::string_view AText);
  int DepthOf(const TLogItem& AItem);

  void Markup(std::string_view AText) { FText.AppendBytes(AText); }
  void Text(std::string_view AText);
  void Cell(std::string_view AText);
  void Fields(const TLogFields& AFields);
  void Flush();

  zq::TStream& FDest;
  zq::utf8::TBuffer FText;
  bool FInRun = false;
  bool FRunEnded = false;
  int FRows = 0;                       // of the group
  std::map<std::string, int> FDepths;  // of the run's threads, those that are indented
};
