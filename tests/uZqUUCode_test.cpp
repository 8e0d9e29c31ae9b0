#include "common/uZqUUCode.h"

#include "runtime/io/streams.h"
#include "tests/support/support.h"

namespace zq {
namespace {

// tests/uucode has the tables of texts.
TEST(UUCode, EveryLengthComesBack) {
  for (std::string Plain; Plain.size() <= 12000;
       Plain.append(1 + Plain.size() / 100, static_cast<char>(Plain.size()))) {
    TMemoryStream Dest;
    const TZqUUData Data = ZqUUDecode(ZqUUEncode(Plain, u"a.txt", 644), u"A.TXT", &Dest);
    ASSERT_TRUE(Data.FileName == u"a.txt" && Data.Mode == 644 && Dest.Size() == static_cast<Int64>(Plain.size()));
    ASSERT_TRUE(std::equal(Plain.begin(), Plain.end(), static_cast<const char*>(Dest.Memory())));
  }
}

}  // namespace
}  // namespace zq
