#include "log_page.h"

#include <algorithm>
#include <array>

#include "common/uZqLogger.h"
#include "page_parts.h"

using namespace zq;

namespace {

constexpr std::size_t cBlock = std::size_t{1} << 16;
constexpr int cRowsOfAGroup = 200;  // laid out together when they come into view
constexpr int cDeepest = 15;        // the style knows no more

// By TZqLogLevel; the names are those of the log's own stylesheet.
constexpr const char* cClasses[] = {
    "llAll", "llTrace", "llDebug", "llInfo", "llWarn", "llError", "llFatal", "llDoNotLog"};

constexpr const char cTableBegin[] =
    "<table>\n<thead><tr><th>Timestamp</th><th>Thread</th><th>Logger</th><th>Level</th><th>Message</th><th>Value</th>"
    "<th>Exception</th></tr></thead>\n";

std::string NameOf(TZqLogLevel ALevel) { return UnicodeString(ZqLogLevels[ALevel]).ToUTF8(); }
std::string NumberOf(TZqLogLevel ALevel) { return std::to_string(static_cast<int>(ALevel)); }

// How a character is written where it isn't written as itself.
constexpr auto cEscapes = [] {
  std::array<const char*, 256> Result{};
  Result['&'] = "&amp;";
  Result['<'] = "&lt;";
  Result['>'] = "&gt;";
  Result['"'] = "&quot;";
  Result['\''] = "&#39;";
  Result[0] = "\xEF\xBF\xBD";  // a browser would drop it unseen
  return Result;
}();

}  // namespace

// ---- Page

TLogPage::TLogPage(TStream& ADest, std::string_view ATitle) : FDest(ADest) {
  Markup(
      "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
      "<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; base-uri 'none'; form-action 'none'; "
      "style-src '");
  Markup(cPageStyleHash);
  Markup("'; script-src '");
  Markup(cPageScriptHash);
  Markup("'\">\n<meta name=\"viewport\" content=\"width=device-width\">\n<title>");
  Text(ATitle);
  Markup("</title>\n<style>");
  Markup(cPageStyle);
  Markup("</style>\n</head>\n<body>\n<form id=\"filter\" hidden>\n<label>Level from <select id=\"level\">");
  for (const TZqLogLevel Level : {llAll, llTrace, llDebug, llInfo, llWarn, llError, llFatal}) {
    Markup("<option value=\"" + NumberOf(Level) + "\">");
    Text(NameOf(Level));
    Markup("</option>");
  }
  Markup(
      "</select></label>\n<label>Logger <input id=\"logger\" size=\"20\"></label>\n"
      "<label>Text <input id=\"text\" type=\"search\" size=\"30\"></label>\n<output id=\"count\"></output>\n</form>\n");
}

void TLogPage::Add(std::string_view AName, TLogReader& ALog) {
  Markup("<h1>");
  Text(AName);
  Markup("</h1>\n");
  for (TLogPart Part = ALog.Next(); Part != TLogPart::End; Part = ALog.Next()) {
    if (Part == TLogPart::Run) BeginRun(&ALog.Run());
    else if (!FInRun) BeginRun(nullptr);
    if (Part == TLogPart::RunEnd) FRunEnded = true;
    if (Part == TLogPart::Item) AddItem(ALog.Item());
    if (Part == TLogPart::Damage) AddDamage(ALog.Line(), ALog.Damage());
    if (FText.View().size() >= cBlock) Flush();
  }
  EndRun();
}

void TLogPage::Finish() {
  Markup("<script>");
  Markup(cPageScript);
  Markup("</script>\n</body>\n</html>\n");
  Flush();
}

// ---- Run

// AFields is null for what stands in no run.
void TLogPage::BeginRun(const TLogFields* AFields) {
  EndRun();
  Markup("<section>\n<header>");
  if (AFields != nullptr) Fields(*AFields);
  else Markup("The begin of this run is missing.");
  Markup("</header>\n");
  Markup(cTableBegin);
  FInRun = true;
}

void TLogPage::EndRun() {
  if (!FInRun) return;
  if (FRows != 0) Markup("</tbody>\n");
  Markup("</table>\n");
  if (!FRunEnded) Markup("<p class=\"note\">The log doesn't tell the end of this run.</p>\n");
  Markup("</section>\n");
  FInRun = FRunEnded = false;
  FRows = 0;
  FDepths.clear();
}

// ---- Rows

void TLogPage::BeginRow() {
  if (FRows == cRowsOfAGroup) {
    Markup("</tbody>\n");
    FRows = 0;
  }
  if (FRows++ == 0) Markup("<tbody>\n");
}

// As in a log of plain lines, a step goes before the line that asks for it; but each thread has its own.
int TLogPage::DepthOf(const TLogItem& AItem) {
  if (AItem.Indent != liIndentIncrease && FDepths.empty()) return 0;
  const auto Place = FDepths.try_emplace(AItem.Thread, 0).first;
  if (AItem.Indent == liIndentIncrease) ++Place->second;
  if (AItem.Indent == liIndentDecrease) Place->second = std::max(Place->second - 1, 0);
  const int Result = Place->second;
  if (Result == 0) FDepths.erase(Place);
  return Result;
}

void TLogPage::AddItem(const TLogItem& AItem) {
  BeginRow();
  const int Depth = std::min(DepthOf(AItem), cDeepest);
  Markup("<tr class=\"");
  if (AItem.Level) Markup(cClasses[static_cast<std::size_t>(*AItem.Level)]);
  if (Depth != 0) Markup(" i" + std::to_string(Depth));
  if (AItem.Level) Markup("\" data-level=\"" + NumberOf(*AItem.Level));
  Markup("\">");
  Cell(AItem.TimeStamp);
  Cell(AItem.Thread);
  Cell(AItem.Logger);
  Cell(AItem.Level ? NameOf(*AItem.Level) : "");
  Cell(AItem.Message);
  Markup("<td>");
  Text(AItem.Value);
  if (!AItem.Others.empty()) Fields(AItem.Others);
  Markup("</td>");
  Cell(AItem.ExceptionClass);
  Markup("</tr>\n");
}

void TLogPage::AddDamage(Int64 ALine, std::string_view AText) {
  BeginRow();
  Markup(
      "<tr class=\"damaged\"><td colspan=\"7\"><b>Line " + std::to_string(ALine) + " is no whole part of a log:</b> ");
  Text(AText);
  Markup("</td></tr>\n");
}

// ---- Text

void TLogPage::Text(std::string_view AText) {
  std::size_t From = 0;
  for (std::size_t At = 0; At < AText.size(); ++At) {
    const char* const Escape = cEscapes[static_cast<unsigned char>(AText[At])];
    if (Escape == nullptr) continue;
    Markup(AText.substr(From, At - From));
    Markup(Escape);
    From = At + 1;
  }
  Markup(AText.substr(From));
}

void TLogPage::Cell(std::string_view AText) {
  Markup("<td>");
  Text(AText);
  Markup("</td>");
}

void TLogPage::Fields(const TLogFields& AFields) {
  constexpr std::pair<std::string_view, std::string_view> cTitles[] = {{"timeStamp", "Started"}, {"userName", "User"},
      {"computer", "Computer"}, {"fileName", "Program"}, {"processID", "Process"}};
  Markup("<dl>");
  for (const auto& [Name, Value] : AFields) {
    const auto* const Title = std::ranges::find(cTitles, Name, &std::pair<std::string_view, std::string_view>::first);
    Markup("<div><dt>");
    Text(Title == std::end(cTitles) ? Name : Title->second);
    Markup("</dt><dd>");
    Text(Value);
    Markup("</dd></div>");
  }
  Markup("</dl>");
}

void TLogPage::Flush() {
  FDest.WriteBuffer(FText.View().data(), static_cast<Int64>(FText.View().size()));
  FText.Clear();
}
