
#include "runtime/com/registry.h"
#include "tests/fakes/registry.h"
#include "tests/support/support.h"

namespace zq {
namespace {

TEST(Registry, KeysOpenFromTheRootOrTheOpenKeyAndAreClosed) {
  TScriptedRegistry System;
  {
    TRegistry Registry;
    EXPECT_FALSE(Registry.OpenKey(u"A", false) || Registry.ValueExists(u"Text"));
    ASSERT_TRUE(Registry.OpenKey(u"A", true) && Registry.OpenKey(u"B", true));
    Registry.WriteString(u"Text", u"ä");
    Registry.WriteInteger(u"Number", -7);
    EXPECT_TRUE(Registry.ReadString(u"Text") == u"ä" && Registry.ReadInteger(u"Number") == -7);
    EXPECT_THROW(std::ignore = Registry.ReadString(u"Number"), ERegistryException);
    EXPECT_THROW(std::ignore = Registry.ReadInteger(u"None"), ERegistryException);
    EXPECT_TRUE(Registry.KeyExists(u"\\A\\B") && !Registry.OpenKey(u"C", false));
    EXPECT_TRUE(Registry.ValueExists(u"Text"));  // the open key stayed open
    EXPECT_EQ(System.Open.size(), 4U);           // beside the three roots
    EXPECT_TRUE(Registry.OpenKeyReadOnly(u"\\A") && !Registry.ValueExists(u"Text"));
  }
  EXPECT_TRUE(System.Open.size() == 3 && System.Keys.contains(u"HKCU\\A\\B"));
}

}  // namespace
}  // namespace zq
