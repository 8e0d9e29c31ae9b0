#include "log_reader.h"

#include <algorithm>
#include <charconv>

#include "runtime/core/utf8.h"

using namespace zq;

namespace {

constexpr std::size_t cNowhere = std::string_view::npos;
constexpr std::size_t cLongestPart = std::size_t{1} << 26;    // what is longer is no item
constexpr std::size_t cLongestDamage = std::size_t{1} << 16;  // and comes in several parts

constexpr std::string_view cBlanks = " \t\r\n";
constexpr std::string_view cInstruction = "<?xml", cRun = "<log", cRunEnd = "</log>", cItem = "<item>";

bool IsNameCharacter(char AChar) {
  const auto Code = static_cast<unsigned char>(AChar);
  return Code >= 0x80 || (Code >= '0' && Code <= '9') || ((Code | 0x20) >= 'a' && (Code | 0x20) <= 'z') ||
         AChar == '_' || AChar == '-' || AChar == '.' || AChar == ':';
}

// A part of a log begins here.
bool IsMark(std::string_view AText) {
  return AText.starts_with(cItem) || AText.starts_with(cRunEnd) || AText.starts_with(cInstruction) ||
         AText.starts_with("<log ") || AText.starts_with("<log>");
}

std::size_t FindMark(std::string_view AText, std::size_t AFrom) {
  for (auto At = AText.find('<', AFrom); At != cNowhere; At = AText.find('<', At + 1))
    if (IsMark(AText.substr(At))) return At;
  return cNowhere;
}

std::size_t FindMarkOfALine(std::string_view AText) {
  for (auto At = AText.find("\n<"); At != cNowhere; At = AText.find("\n<", At + 1))
    if (IsMark(AText.substr(At + 1))) return At + 1;
  return cNowhere;
}

// A section that was never ended runs on into that of a later item. Where a value holds a log itself, the sections in
// it are ended by the mask that a writer puts in the place of their end.
bool HoldsAnotherSection(std::string_view AContent) {
  const auto Begin = AContent.rfind("<![CDATA[");
  return Begin != cNowhere && AContent.find("__>", Begin) == cNowhere;
}

void AppendCodePoint(std::string& AText, unsigned ACode) {
  if (ACode == 0 || ACode > 0x10FFFF || (ACode >= 0xD800 && ACode <= 0xDFFF)) ACode = 0xFFFD;
  char16_t Units[2] = {static_cast<char16_t>(ACode)};
  if (ACode > 0xFFFF) Units[0] = static_cast<char16_t>(0xD7C0 + (ACode >> 10)), Units[1] = 0xDC00 | (ACode & 0x3FF);
  AText += utf8::Encode({Units, ACode > 0xFFFF ? 2U : 1U});
}

// What the entity stands for, its name without & and ;. False for one that XML doesn't know.
bool AppendEntity(std::string& AText, std::string_view AName) {
  constexpr std::pair<std::string_view, char> cNamed[] = {
      {"amp", '&'}, {"lt", '<'}, {"gt", '>'}, {"quot", '"'}, {"apos", '\''}};
  for (const auto& [Name, Char] : cNamed)
    if (AName == Name) return AText += Char, true;
  if (!AName.starts_with('#')) return false;
  const bool Hexadecimal = AName.starts_with("#x");
  const std::string_view Digits = AName.substr(Hexadecimal ? 2 : 1);
  unsigned Code = 0;
  const auto [End, Error] = std::from_chars(Digits.data(), Digits.data() + Digits.size(), Code, Hexadecimal ? 16 : 10);
  if (Error == std::errc::invalid_argument || End != Digits.data() + Digits.size()) return false;
  return AppendCodePoint(AText, Error == std::errc() ? Code : 0), true;
}

void AppendUnescaped(std::string& AText, std::string_view ASource) {
  constexpr std::size_t cLongestEntity = 12;
  for (std::size_t And = 0; (And = ASource.find('&')) != cNowhere;) {
    AText += ASource.substr(0, And);
    const std::size_t End = ASource.substr(And, cLongestEntity).find(';');
    const bool Known = End != cNowhere && AppendEntity(AText, ASource.substr(And + 1, End - 1));
    if (!Known) AText += '&';
    ASource.remove_prefix(And + (Known ? End + 1 : 1));
  }
  AText += ASource;
}

void MakeValid(std::string& AText) {
  if (utf8::AsciiRun(AText.data(), AText.size()) != AText.size()) AText = utf8::Encode(utf8::Decode(AText));
}

// For a field that has no value yet: one digit, up to the number of ALast.
template <class T>
bool KeepDigit(std::optional<T>& AField, std::string_view AText, T ALast) {
  if (AField || AText.size() != 1 || AText[0] < '0' || AText[0] > '0' + static_cast<int>(ALast)) return false;
  AField = static_cast<T>(AText[0] - '0');
  return true;
}

}  // namespace

// Steps through a text that may go on behind its end. A step that fails leaves At at what it couldn't take.
struct TLogReader::TScan {
  std::string_view Text;
  std::size_t At = 0;
  bool Short = false;  // what was asked for may lie behind the end

  bool Take(std::string_view AWord) {
    const std::string_view Here = Text.substr(At, AWord.size());
    if (Here == AWord) return At += AWord.size(), true;
    Short = Short || AWord.starts_with(Here);
    return false;
  }
  // What stands before the first of AEnds, which must come before any '<'.
  bool TakeUntil(char AEnd, std::string_view& AResult) {
    const std::size_t From = At;
    const char Ends[] = {AEnd, '<'};
    At = std::min(Text.size(), Text.find_first_of({Ends, AEnd == '<' ? 1U : 2U}, At));
    AResult = Text.substr(From, At - From);
    Short = Short || At == Text.size();
    return At < Text.size() && Text[At] == AEnd;
  }
  bool TakeName(std::string_view& AResult) {
    const std::size_t From = At;
    while (At < Text.size() && IsNameCharacter(Text[At])) ++At;
    AResult = Text.substr(From, At - From);
    Short = Short || At == Text.size();
    return At < Text.size() && !AResult.empty();
  }
  void SkipBlanks() { At = std::min(Text.size(), Text.find_first_not_of(cBlanks, At)); }
};

// ---- Input

// At least as much again as is there, so that what is read anew is read a few times only.
bool TLogReader::More() {
  if (FAtEnd || FBuffer.size() - FFrom >= cLongestPart) return false;
  FBuffer.erase(0, FFrom);
  FSearchedFrom -= std::min(FSearchedFrom, FFrom);
  FSearchedTo -= std::min(FSearchedTo, FFrom);
  FFrom = 0;
  const std::size_t Before = FBuffer.size(), Wanted = Before + std::max(FBlock, Before);
  FBuffer.resize(Wanted);
  std::size_t Size = Before;
  while (Size < Wanted && !FAtEnd) {
    const Integer Got = FSource.Read(FBuffer.data() + Size, static_cast<Integer>(Wanted - Size));
    FAtEnd = Got <= 0;
    Size += static_cast<std::size_t>(std::max(Got, 0));
  }
  FBuffer.resize(Size);
  return Size > Before;
}

void TLogReader::Consume(std::size_t ACount) {
  const auto From = FBuffer.begin() + static_cast<std::ptrdiff_t>(FFrom);
  FLine += std::count(From, From + static_cast<std::ptrdiff_t>(ACount), '\n');
  FFrom += ACount;
}

void TLogReader::SkipBlanks() {
  constexpr std::string_view cByteOrderMark = "\xEF\xBB\xBF";
  for (;;) {
    Consume(std::min(Rest().size(), Rest().find_first_not_of(cBlanks)));
    if (Rest().starts_with(cByteOrderMark)) Consume(cByteOrderMark.size());
    else if (Rest().size() >= cByteOrderMark.size() || !More()) return;
  }
}

TLogPart TLogReader::Take(std::size_t ACount, TLogPart APart) {
  FPartLine = FLine;
  Consume(ACount);
  return APart;
}

// What reaches to the next mark, which is not before AFrom.
TLogPart TLogReader::TakeDamage(std::size_t AFrom) {
  std::size_t Size = 0;
  do {
    Size = std::min(Rest().size(), FindMark(Rest(), AFrom));
  } while (Size == Rest().size() && Size <= AFrom + cLongestDamage && More());
  if (Size > AFrom + cLongestDamage) {  // cut where no mark and no character is cut
    const std::string_view Piece = Rest().substr(0, AFrom + cLongestDamage);
    std::size_t Cut = Piece.rfind('\n');
    if (Cut == cNowhere || Cut <= AFrom) Cut = Piece.find_last_of("<");
    if (Cut == cNowhere || Cut <= AFrom) Cut = Piece.size();
    while (Cut > AFrom && (static_cast<unsigned char>(Rest()[Cut]) & 0xC0) == 0x80) --Cut;
    Size = Cut > AFrom ? Cut : Piece.size();
  }
  FDamage = Rest().substr(0, Rest().substr(0, Size).find_last_not_of(cBlanks) + 1);
  MakeValid(FDamage);
  return Take(Size, TLogPart::Damage);
}

// ---- Parts

TLogPart TLogReader::Next() {
  for (;;) {
    SkipBlanks();
    TScan Scan{Rest()};
    if (Scan.Text.empty()) return TLogPart::End;
    if (Scan.Take(cRunEnd)) return Take(Scan.At, TLogPart::RunEnd);
    if (Scan.Text.starts_with(cItem)) {
      if (ReadItem(Scan)) return Take(Scan.At, TLogPart::Item);
    } else if (Scan.Text.starts_with(cInstruction)) {
      if (ReadInstruction(Scan)) {
        Consume(Scan.At);
        continue;
      }
    } else if (IsMark(Scan.Text)) {
      if (ReadRun(Scan)) return Take(Scan.At, TLogPart::Run);
    } else {
      Scan.Short = Scan.Text.size() < cItem.size();
    }
    if (!Scan.Short || !More()) return TakeDamage(std::max(Scan.At, std::size_t{1}));
  }
}

bool TLogReader::ReadInstruction(TScan& AScan) {
  std::string_view Content;
  AScan.Take(cInstruction);
  return AScan.TakeUntil('>', Content) && Content.ends_with('?') && AScan.Take(">");
}

bool TLogReader::ReadRun(TScan& AScan) {
  FRun.clear();
  AScan.Take(cRun);
  for (;;) {
    AScan.SkipBlanks();
    if (AScan.Take(">")) return true;
    std::string_view Name, Text;
    if (!AScan.TakeName(Name) || !AScan.Take("=\"") || !AScan.TakeUntil('"', Text) || !AScan.Take("\"")) return false;
    auto& [Kept, Value] = FRun.emplace_back(Name, "");
    AppendUnescaped(Value, Text);
    MakeValid(Kept);
    MakeValid(Value);
  }
}

bool TLogReader::ReadItem(TScan& AScan) {
  FItem = {};
  AScan.Take(cItem);
  for (;;) {
    AScan.SkipBlanks();
    if (AScan.Take("</item>")) return true;
    if (!ReadElement(AScan)) return false;
  }
}

bool TLogReader::ReadElement(TScan& AScan) {
  if (IsMark(AScan.Text.substr(AScan.At)) || !AScan.Take("<")) return false;
  std::string_view Name;
  FText.clear();
  if (!AScan.TakeName(Name)) return AScan.At -= Name.size() + 1, false;  // it may yet be a mark
  if (!AScan.Take("/>") && (!AScan.Take(">") || !ReadText(AScan, Name))) return false;
  Keep(Name);
  return true;
}

bool TLogReader::ReadText(TScan& AScan, std::string_view AName) {
  for (;;) {
    std::string_view Text;
    if (!AScan.TakeUntil('<', Text)) return false;
    AppendUnescaped(FText, Text);
    if (AScan.Take("<![CDATA[")) {
      if (!ReadCData(AScan)) return false;
      continue;
    }
    TScan End = AScan;
    const bool Ends = End.Take("</") && End.Take(AName) && End.Take(">");
    AScan.Short = AScan.Short || End.Short;
    if (Ends) AScan.At = End.At;
    return Ends;
  }
}

bool TLogReader::ReadCData(TScan& AScan) {
  constexpr std::string_view cEnd = "]]>";
  // A section without an end makes what follows it be read anew, but not be searched anew.
  const bool Known = FSearchedFrom <= FFrom + AScan.At && FFrom + AScan.At <= FSearchedTo;
  const std::size_t End = AScan.Text.find(cEnd, Known ? FSearchedTo - FFrom : AScan.At);
  if (!Known) FSearchedFrom = FFrom + AScan.At;
  FSearchedTo = FFrom + std::min(End, std::max(AScan.At, AScan.Text.size() - std::min(AScan.Text.size(), cEnd.size())));
  const std::string_view Content = AScan.Text.substr(AScan.At, End - AScan.At);
  if (const std::size_t Mark = FindMarkOfALine(Content);
      End == cNowhere || (Mark != cNowhere && HoldsAnotherSection(Content))) {
    AScan.Short = End == cNowhere;
    AScan.At += std::min(Mark, Content.size());
    return false;
  }
  FText += Content;
  AScan.At = End + cEnd.size();
  return true;
}

void TLogReader::Keep(std::string_view AName) {
  struct TField {
    std::string_view Name;
    std::string TLogItem::*Text;
  };
  constexpr TField cFields[] = {{"timeStamp", &TLogItem::TimeStamp}, {"threadID", &TLogItem::Thread},
      {"loggerName", &TLogItem::Logger}, {"logMessage", &TLogItem::Message}, {"logValue", &TLogItem::Value},
      {"exceptionClass", &TLogItem::ExceptionClass}};
  MakeValid(FText);
  if (AName == "logLevel" && KeepDigit(FItem.Level, FText, llDoNotLog)) return;
  if (AName == "logIndent" && KeepDigit(FItem.Indent, FText, liIndentDecrease)) return;
  for (const TField& Field : cFields)
    if (AName == Field.Name && (FItem.*Field.Text).empty()) return (FItem.*Field.Text).swap(FText);
  MakeValid(FItem.Others.emplace_back(AName, FText).first);
}
