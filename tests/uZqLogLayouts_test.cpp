#include "common/uZqLogLayouts.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <thread>

#include "runtime/text/datetime.h"
#include "tests/fakes/clock.h"
#include "tests/support/logging.h"

namespace zq {
namespace {

using testing::HasSubstr, testing::StartsWith;

struct TShouting : TZqXmlLayout {
  using TZqXmlLayout::TZqXmlLayout;
  UnicodeString FormatLine(const UnicodeString& ALoggerName, TZqLogLevel ALogLevel, const UnicodeString& ALogMessage,
      PZqDataRec AValue, TZqLogIndent ALogIndent) override {
    return TZqXmlLayout::FormatLine(ALoggerName, ALogLevel, ALogMessage + u"!", AValue, ALogIndent);
  }
};

struct LayoutXml : testing::Test, TLoggerFixture {
  [[nodiscard]] std::string LastItem() const {
    auto Lines = SplitLines(Folder.Read("app.log.xml"));
    return Lines.size() < 2 ? "" : Lines[Lines.size() - 2];
  }
  static std::string Item(const std::string& ALevelIndentAndRest, const std::string& ATime = "2021-12-23T09:53:18Z") {
    return "<item><timeStamp>" + ATime + "</timeStamp><threadID>" + std::to_string(GetCurrentThreadId()) +
           "</threadID><loggerName>root.test</loggerName><logLevel>" + ALevelIndentAndRest + "</item>";
  }
  TScriptedClock Clock{1640253198123000, 3600};
  const TTempFolder Folder;
  const IntfRef<IZqFileAppender> File = AddFile(Log, Folder.File("app.txt"));
};

TEST_F(LayoutXml, MakesTheToldItems) {
  File.As<IZqLogAppenderEx>()->SetLayout(ZqXmlLayout);
  const EConvertError Fault(u"a<b");
  Log->Fatal(Fault);
  const std::string Value =
      "</logMessage><logValue><![CDATA[a<b]]></logValue><exceptionClass>EConvertError</exceptionClass>";
  EXPECT_EQ(LastItem(), Item("6</logLevel><logIndent>0</logIndent><logMessage>EConvertError" + Value));
  EXPECT_THAT(Folder.Read("app.log.xml"), StartsWith("<?xml-stylesheet type=\"text/xsl\" href=\"app.log.xsl\"?><log "));
  Log->Fatal(u"text", Fault);
  EXPECT_THAT(LastItem(), HasSubstr("<logMessage>text" + Value));
  Log->Debug(u"x", Variant(UnicodeString(u" a]]>b]]>\x01\n")));
  EXPECT_THAT(LastItem(), HasSubstr("<![CDATA[ a__>b__>\u2401"));
  Log->Debug(u"\x1f\uFFFD\uFFFE", Variant(UnicodeString(u" \t")));
  EXPECT_EQ(LastItem(), Item("2</logLevel><logIndent>0</logIndent><logMessage>\u241F\uFFFD\uFFFD</logMessage>"));
  Log->EnterMethod(u"a");
  EXPECT_THAT(LastItem(), HasSubstr("<logIndent>1</"));
  Clock.Microseconds += 876'999;  // to the last microsecond of the second
  Log->ExitMethod(u"a");
  EXPECT_EQ(LastItem(), Item("2</logLevel><logIndent>2</logIndent><logMessage>a</logMessage>"));
  Clock.Microseconds += 1;
  Log->Info(u"a");
  EXPECT_EQ(LastItem(), Item("3</logLevel><logIndent>0</logIndent><logMessage>a</logMessage>", "2021-12-23T09:53:19Z"));
  const std::string Main = LastItem();
  std::thread([&] { Log->Info(u"a"); }).join();
  EXPECT_NE(LastItem(), Main) << "the thread is another one";
  Clock.Microseconds = 253402300800000000;
  Log->Info(u"a");
  EXPECT_THAT(LastItem(), HasSubstr(">10000-01-01T00:00:00Z<"));
  File->Close();
  EXPECT_EQ(SplitLines(Folder.Read("app.log.xml")).back(), "</log>");
}

TEST_F(LayoutXml, TextIsAsToldAndADescendantIsAskedForIt) {
  const auto Layout = IntfRef<IZqLogBase>(New<TZqXmlLayout>(Logger(), u"")).As<IZqLogLayout>();
  EXPECT_THAT(Layout->GetHeader().ToUTF8(), StartsWith("<log timeStamp=\"2021-12-23T09:53:18Z\" fileName=\"/"));
  EXPECT_NE(Layout->FormatLine(u"root.test", llAll, u"\x01\xD800", nullptr, liIndentNone).Pos(u"\x01\xD800"), 0);
  EXPECT_EQ(EscapeXml(std::u16string(u"\0\x01\t\n\"&'<>\uFFFE", 10)), u"\x01\t\n&quot;&amp;&apos;&lt;&gt;\uFFFE");
  EXPECT_EQ(FormatUtcStamp(EncodeDate(987, 1, 1) + EncodeTime(0, 0, 0, 0)), u"0986-12-31T23:00:00Z");
  File.As<IZqLogAppenderEx>()->SetLayout(TZqLogBaseClass::Of<TShouting>());
  Log->Info(u"a");
  EXPECT_THAT(LastItem(), HasSubstr("<logMessage>a!<"));
}

TEST_F(LayoutXml, AnEditedStylesheetStaysAndOneThatCannotBeWrittenIsTold) {
  const auto Appender = File.As<IZqLogAppenderEx>();
  Folder.Write("app.log.xsl", "edited");
  Appender->SetLayout(ZqXmlLayout);
  EXPECT_EQ(Folder.Read("app.log.xsl"), "edited");
  File->SetFileName(Folder.File("none/b.log"));
  EXPECT_THROW(Appender->SetLayout(ZqXmlLayout), EFCreateError);
  File->SetFileName(u" ");
  Appender->SetLayout(ZqXmlLayout);
  EXPECT_FALSE(std::filesystem::exists(".xsl")) << "no file, no stylesheet";
}

}  // namespace
}  // namespace zq
