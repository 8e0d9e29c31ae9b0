
#include <fstream>

#include "runtime/com/registry.h"
#include "runtime/io/paths.h"
#include "runtime/platform/resource_service.h"
#include "runtime/platform/user_service.h"
#include "runtime/platform/version_service.h"
#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"
#include "tests/support/support.h"

namespace zq {
namespace {

namespace fs = std::filesystem;

TEST(LinuxClock, AChangeInTheMiddleOfAQuarterHourIsNotRemembered) {
  const TZoneScope Zone("AAA0BBB,M3.5.0/2:07,M10.5.0/3:07");
  const TDateTime Change = EncodeDate(2024, 3, 31) + EncodeTime(2, 7, 0, 0);
  for (int i = 0; i < 2; ++i) {
    EXPECT_EQ(FormatDateTime(u"hh:nn", TTimeZone::Local().ToLocalTime(Change - EncodeTime(0, 1, 0, 0))), u"02:06");
    EXPECT_EQ(FormatDateTime(u"hh:nn", TTimeZone::Local().ToLocalTime(Change)), u"03:07");
  }
}

TEST(LinuxNames, AreThoseOfTheKernel) {
  EXPECT_EQ(Service<TUserService>().GetComputerName().ToUTF8() + '\n', ReadFile("/proc/sys/kernel/hostname"));
  EXPECT_EQ(Service<TVersionService>().Release().Text.ToUTF8() + '\n', ReadFile("/proc/sys/kernel/osrelease"));
}

TEST(LinuxRegistry, FileTypesComeFromTheMimeTables) {
  const TTempFolder Data;
  fs::create_directory(Data.Path() / "mime");
  Data.Write("mime/globs2", "# comment\n60:text/heavy:*.zqx\n50:text/light:*.zqx\n50:text/flagged:*.zqc:cs\n");
  const TEnvironmentScope Home("XDG_DATA_HOME", Data.Path().string());
  TRegistry Registry(KEY_READ);
  Registry.SetRootKey(HKEY_CLASSES_ROOT);
  ASSERT_TRUE(Registry.OpenKey(u".ZQX", false));
  EXPECT_EQ(Registry.ReadString(u"content type") + Registry.ReadString(u"Other"), u"text/heavy");
  EXPECT_THROW(Registry.WriteString(u"Content Type", u"x"), ERegistryException);
  ASSERT_TRUE(Registry.OpenKey(u"\\.zqc", true));
  EXPECT_EQ(Registry.ReadString(u"Content Type"), u"text/flagged");
  EXPECT_FALSE(
      Registry.KeyExists(u"\\.zqnone") || Registry.OpenKey(u"\\.zqnone", true) || Registry.OpenKey(u"", false));
}

TEST(LinuxResources, LieBesideTheirModule) {
  const fs::path Folder = ToSystemPath(ParamStr(0)) + ".resources";
  fs::create_directories(Folder / "RCDATA");
  std::ofstream(Folder / "RCDATA/Logo.png") << "PNG";
  std::ofstream(Folder / "RCDATA/7") << "7";
  TResourceService& System = Service<TResourceService>();
  EXPECT_EQ(System.LoadResource(MainInstance(), u"LOGO.PNG", RT_RCDATA), (TBytes{'P', 'N', 'G'}));
  EXPECT_EQ(System.LoadResource(MainInstance(), u"#7", u"rcdata"), TBytes{'7'});
  EXPECT_EQ(System.LoadResource(MainInstance(), u"none", RT_RCDATA), std::nullopt);
  EXPECT_TRUE(System.FindResource(MainInstance(), u"logo.png", RT_RCDATA));
  EXPECT_EQ(System.FindResource(HInstance(), u"logo.png", RT_RCDATA), ZQ_TEST_STATIC != 0) << "the library's own";
  EXPECT_FALSE(System.FindResource(MainInstance(), u"../RCDATA", RT_RCDATA));
  fs::remove_all(Folder);
}

}  // namespace
}  // namespace zq
