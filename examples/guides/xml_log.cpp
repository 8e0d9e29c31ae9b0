#include <filesystem>

#include "common/uZqLogAppenders.h"
#include "common/uZqLogLayouts.h"
#include "common/uZqLogger.h"

int main() {
  using namespace zq;
  const IntfRef<IZqLogger> Log = Logger()->GetLogger(u"shop.orders");
  std::filesystem::create_directories("pages");

  const auto Page = Log->GetAppenders()->Add(ZqFileAppender);
  Page.As<IZqFileAppender>()->SetAppendExisting(false);
  Page.As<IZqFileAppender>()->SetFileName(u"pages/orders.log");  // first: the layout goes by it
  Page.As<IZqLogAppenderEx>()->SetLayout(ZqXmlLayout);           // pages/orders.log.xml, and orders.log.xsl beside it

  Log->Warn(u"two\r\nlines & a <mark>");
  Log->Debug(u"value", Variant(UnicodeString(u"a]]>b\x01 ")));
  Log->Debug(u"blanks", Variant(UnicodeString(u"  ")));
  Log->EnterMethod(u"Close");
  try {
    throw EConvertError(u"no date");
  } catch (const Exception& e) {
    Log->Fatal(e);
    Log->Fatal(u"not closed", e);
  }
  Log->ExitMethod(u"Close");
  return std::filesystem::exists("pages/orders.log.xsl") ? 0 : 1;
}
