#include "common/uZqLogLayouts/xml.h"

#include <algorithm>
#include <charconv>

#include "common/uZqDateTimeUtils.h"
#include "common/uZqLogAppenders.h"
#include "common/uZqSysUtils.h"
#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/io/string_list.h"
#include "runtime/sync/critical_section.h"
#include "runtime/text/local_time.h"
#include "runtime/text/numbers.h"

namespace zq {

namespace {

constexpr char16_t cStylesheet[] =
    uR"(<xsl:stylesheet version="1.0"  xmlns:xsl="http://www.w3.org/1999/XSL/Transform">
  <xsl:output omit-xml-declaration="yes" indent="yes"/>
  <xsl:template match="/*">
    <html>
      <style>
        *            {font-family: Arial}
        .tableHeader {background-color: #004B94; color: white}
        .llWarn      {background-color: #FF7B00}
        .llError     {background-color: #FF0000}
        .llFatal     {background-color: #AF0000}
      </style>
      <body>
        <div>
          Logdate: <xsl:value-of select="./@timeStamp"/><br/>
          UserName: <xsl:value-of select="./@userName"/><br/>
          Computer: <xsl:value-of select="./@computer"/><br/>
        </div>
        <br/>
        <table width="100%" border="1" cellspacing="0">
          <tr class="tableHeader" align="left">
            <th>Timestamp</th>
            <th>Thread</th>
            <th>Logger</th>
            <th>Message</th>
          </tr>
          <xsl:apply-templates select="item"/>
        </table>
      </body>
    </html>
  </xsl:template>

  <xsl:template match="item">
    <xsl:choose>
      <xsl:when test="./logLevel=4">
        <tr class="llWarn"><xsl:apply-templates select="./*"/></tr>
      </xsl:when>
      <xsl:when test="./logLevel=5">
        <tr class="llError"><xsl:apply-templates select="./*"/></tr>
      </xsl:when>
      <xsl:when test="./logLevel=6">
        <tr class="llFatal"><xsl:apply-templates select="./*"/></tr>
      </xsl:when>
      <xsl:otherwise>
        <tr><xsl:apply-templates select="./*"/></tr>
      </xsl:otherwise>
    </xsl:choose>
  </xsl:template>

  <xsl:template match="timeStamp">
    <td><xsl:value-of select="."/></td>
  </xsl:template>

  <xsl:template match="threadID">
    <td><xsl:value-of select="."/></td>
  </xsl:template>

  <xsl:template match="loggerName">
    <td><xsl:value-of select="."/></td>
  </xsl:template>

  <xsl:template match="logLevel">
  </xsl:template>

  <xsl:template match="logIndent">
  </xsl:template>

  <xsl:template match="logMessage">
    <td><xsl:value-of select="."/></td>
  </xsl:template>

</xsl:stylesheet>
)";

// ---- Text in XML

// Characters, those below 64 as bits by their codes.
struct TChars {
  UInt64 Low;
  Char Last;  // all behind it are of the set
  [[nodiscard]] constexpr bool Has(Char AChar) const noexcept {
    return AChar < 64 ? (Low >> AChar & 1U) != 0 : AChar > Last;
  }
};
constexpr UInt64 Bits(std::u16string_view AChars) noexcept {
  UInt64 Result = 0;
  for (const Char c : AChars) Result |= UInt64{1} << c;
  return Result;
}

constexpr Char cControlPictures = 0x2400, cReplacement = 0xFFFD;
constexpr UInt64 cMarkup = Bits(std::u16string_view(u"\0\"&'<>", 6)), cControls = 0xFFFFFFFF;
constexpr TChars cEscaped{cMarkup, 0xFFFF};
constexpr TChars cUnreadable{cControls & ~Bits(u"\t\n\r"), cReplacement};  // what XML 1.0 has no place for
constexpr TChars cEscapedInFile{cEscaped.Low | cUnreadable.Low, cUnreadable.Last};
constexpr TChars cEscapedInAttribute{cEscaped.Low | cControls, cUnreadable.Last};

// AText, with AReplace called in place of each character of ASet. Most texts have none.
template <class TLine, class TReplace>
void AppendRuns(TLine& ALine, std::u16string_view AText, TChars ASet, TReplace AReplace) {
  for (;;) {
    const auto Found = std::find_if(AText.begin(), AText.end(), [&](Char c) { return ASet.Has(c); });
    const auto Run = static_cast<std::size_t>(Found - AText.begin());
    ALine.Append(AText.substr(0, Run));
    if (Run == AText.size()) return;
    AReplace(*Found);
    AText.remove_prefix(Run + 1);
  }
}

template <class TLine>
void AppendEntity(TLine& ALine, Char AChar) {
  switch (AChar) {
    case u'"': return void(ALine.Append(u"&quot;"));
    case u'&': return void(ALine.Append(u"&amp;"));
    case u'\'': return void(ALine.Append(u"&apos;"));
    case u'<': return void(ALine.Append(u"&lt;"));
    case u'>': return void(ALine.Append(u"&gt;"));
    default: return;  // NUL
  }
}

// A control character's picture tells which one it was. Not even a reference could carry the character itself.
template <class TLine>
void AppendShown(TLine& ALine, Char AChar) {
  const Char Shown = AChar < u' ' ? static_cast<Char>(cControlPictures + AChar) : cReplacement;
  ALine.Append(std::u16string_view(&Shown, 1));
}

// A text keeps every character, bytes are for a file and have to be readable.

void AppendEscaped(UnicodeString& ALine, std::u16string_view AText) {
  AppendRuns(ALine, AText, cEscaped, [&](Char c) { AppendEntity(ALine, c); });
}
void AppendEscaped(utf8::TBuffer& ALine, std::u16string_view AText) {
  AppendRuns(ALine, AText, cEscapedInFile,
      [&](Char c) { return cEscaped.Has(c) ? AppendEntity(ALine, c) : AppendShown(ALine, c); });
}

void AppendData(UnicodeString& ALine, std::u16string_view AText) { ALine.Append(AText); }
void AppendData(utf8::TBuffer& ALine, std::u16string_view AText) {
  AppendRuns(ALine, AText, cUnreadable, [&](Char c) { AppendShown(ALine, c); });
}

void AppendAscii(UnicodeString& ALine, std::string_view AText) { ALine.Append(FromUTF8(AText)); }
void AppendAscii(utf8::TBuffer& ALine, std::string_view AText) { ALine.AppendBytes(AText); }

template <class TLine>
void AppendNumber(TLine& ALine, Cardinal ANumber) {
  char Digits[10];
  AppendAscii(ALine, {Digits, std::to_chars(Digits, Digits + sizeof Digits, ANumber).ptr});
}

// Of a header, which goes into a file. A parser would make blanks of line ends and tabs, but for references.
UnicodeString Attribute(std::u16string_view AName, const UnicodeString& AValue) {
  UnicodeString Result = u" " + UnicodeString(AName) + u"=\"";
  AppendRuns(Result, AValue, cEscapedInAttribute, [&](Char c) {
    if (cEscaped.Has(c)) return AppendEntity(Result, c);
    if (cUnreadable.Has(c)) return AppendShown(Result, c);
    Result += u"&#";
    AppendNumber(Result, c);
    Result += u";";
  });
  return Result + u"\"";
}

// The name of a file as a URI reference. What isn't allowed in one as it is, letters beyond ASCII among it, is taken by
// browsers alone.
UnicodeString Reference(const UnicodeString& AFileName) {
  constexpr std::string_view cAllowed = "-._~!$'()*+,;=@", cDigits = "0123456789ABCDEF";
  std::string Result;
  for (const char Byte : utf8::Encode(AFileName, utf8::TMalformed::Escape)) {
    const auto c = static_cast<unsigned char>(Byte);
    const bool IsAlphanumeric = (c >= '0' && c <= '9') || ((c | 0x20U) >= 'a' && (c | 0x20U) <= 'z');
    if (IsAlphanumeric || cAllowed.find(Byte) != cAllowed.npos) Result += Byte;
    else Result.append({'%', cDigits[c >> 4U], cDigits[c & 15U]});
  }
  return FromUTF8(Result);
}

// ---- Pieces of a line

template <class TLine>
void AppendFront(TLine& ALine, std::string_view ATime, Cardinal AThread, const UnicodeString& ALoggerName,
    TZqLogLevel ALogLevel, TZqLogIndent ALogIndent) {
  AppendAscii(ALine, "<item><timeStamp>");
  AppendAscii(ALine, ATime);
  AppendAscii(ALine, "</timeStamp><threadID>");
  AppendNumber(ALine, AThread);
  AppendAscii(ALine, "</threadID><loggerName>");
  AppendEscaped(ALine, ALoggerName);
  AppendAscii(ALine, "</loggerName><logLevel>");
  AppendNumber(ALine, static_cast<Cardinal>(ALogLevel));
  AppendAscii(ALine, "</logLevel><logIndent>");
  AppendNumber(ALine, static_cast<Cardinal>(ALogIndent));
  AppendAscii(ALine, "</logIndent><logMessage>");
}

template <class TLine>
void AppendValue(TLine& ALine, const UnicodeString& AValue, const UnicodeString& AClass) {
  if (!Trim(AValue).IsEmpty()) {
    AppendAscii(ALine, "<logValue><![CDATA[");
    AppendData(ALine, StringReplace(AValue, u"]]>", u"__>", {rfReplaceAll}));
    AppendAscii(ALine, "]]></logValue>");
  }
  if (AClass.IsEmpty()) return;
  AppendAscii(ALine, "<exceptionClass>");
  AppendEscaped(ALine, AClass);
  AppendAscii(ALine, "</exceptionClass>");
}

template <class TLine>
void AppendRest(TLine& ALine, const UnicodeString& ALogMessage, PZqDataRec AValue) {
  UnicodeString Value, Class;
  if (AValue != nullptr && AValue->DataType == rtkException) {
    Value = AValue->VException->Message();
    Class = AValue->VException->ClassName();
  } else if (AValue != nullptr) {
    Value = ZqDataRecToString(AValue);
  }
  AppendEscaped(ALine, !Class.IsEmpty() && ALogMessage == Value ? Class : ALogMessage);
  AppendAscii(ALine, "</logMessage>");
  if (AValue != nullptr) AppendValue(ALine, Value, Class);
  AppendAscii(ALine, "</item>");
}

// The years behind 9999 have five digits.
std::string UtcText(TDateTime ALocal) {
  std::string Result = ZqCalendarText(DateTimeToUnixMilliseconds(ZqLocalToUTC(ALocal)));
  Result[Result.find(' ')] = 'T';
  return Result + "Z";
}

}  // namespace

UnicodeString FormatUtcStamp(TDateTime AValue) { return FromUTF8(UtcText(AValue)); }

UnicodeString EscapeXml(const UnicodeString& AValue) {
  UnicodeString Result;
  AppendEscaped(Result, AValue);
  return Result;
}

// ---------------------------------------------------------------------------------------- TZqXmlLayout

bool TZqXmlLayout::GetInterface(const TGUID& AIID, void** AObj) {
  return FByteLayout.Answers(AIID, AObj) || Implements::GetInterface(AIID, AObj);
}

void TZqXmlLayout::Initialize(TZqLogBase* ALogBase) {
  const auto* const Appender = dynamic_cast<TZqFileAppender*>(ALogBase);
  if (Appender == nullptr || Trim(Appender->GetFileName()).IsEmpty()) return;
  FXslFilename = ChangeFileExt(Appender->GetFileName(), u".xsl");
  if (!FileExists(FXslFilename)) WriteStylesheet();
}

// What is written in part doesn't stay: a later run would take it for an edited one.
void TZqXmlLayout::WriteStylesheet() const {
  TStringList Lines;
  Lines.SetText(cStylesheet);
  try {
    Lines.SaveToFile(FXslFilename);
  } catch (const EWriteError&) {
    DeleteFile(FXslFilename);
    throw;
  }
}

UnicodeString TZqXmlLayout::GetFileExt() { return u".log.xml"; }

UnicodeString TZqXmlLayout::GetFooter() { return u"</log>"; }

UnicodeString TZqXmlLayout::GetHeader() {
  UnicodeString Result;
  if (!FXslFilename.IsEmpty())
    Result = u"<?xml-stylesheet type=\"text/xsl\" href=\"" + Reference(ExtractFileName(FXslFilename)) + u"\"?>";
  Result += u"<log" + Attribute(u"timeStamp", FormatUtcStamp(Now()));
  Result += Attribute(u"fileName", ParamStr(0));
  Result += Attribute(u"userName", ZqGetUserName());
  Result += Attribute(u"computer", ZqGetComputerName());
  Result += Attribute(u"processID", IntToStr(Int64{GetCurrentProcessId()}));
  return Result + u">";
}

std::string TZqXmlLayout::TimeText(Int64 ASecond) {
  return UtcText(UnixMillisecondsToDateTime(LocalMilliseconds(ASecond)));
}

std::string_view TZqXmlLayout::Front(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, TZqLogIndent ALogIndent) {
  const Int64 Moment = UtcMilliseconds();
  const Cardinal Thread = GetCurrentThreadId();
  if (!ZqIsInSecond(Moment, FSecond) || Thread != FThread || ALogLevel != FLevel || ALogIndent != FIndent ||
      ALoggerName != FLoggerName) [[unlikely]]
    RenewFront(Moment, Thread, ALoggerName, ALogLevel, ALogIndent);
  return FFront.View();
}

void TZqXmlLayout::RenewFront(
    Int64 AMoment, Cardinal AThread, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, TZqLogIndent ALogIndent) {
  FThread = 0;  // nobody's, should what follows fail
  FFront.Clear();
  AppendFront(FFront, FTime.At(AMoment), AThread, ALoggerName, ALogLevel, ALogIndent);
  FLoggerName = ALoggerName;
  FLevel = ALogLevel;
  FIndent = ALogIndent;
  FSecond = FTime.Second();
  FThread = AThread;
}

UnicodeString TZqXmlLayout::FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  UnicodeString Result;
  AppendFront(Result, FTime.At(UtcMilliseconds()), GetCurrentThreadId(), ALoggerName, ALogLevel, ALogIndent);
  AppendRest(Result, ALogMessage, AValue);
  return Result;
}

void TZqXmlLayout::AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
    const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) {
  ALine.AppendBytes(Front(ALoggerName, ALogLevel, ALogIndent));
  AppendRest(ALine, ALogMessage, AValue);
}

}  // namespace zq
