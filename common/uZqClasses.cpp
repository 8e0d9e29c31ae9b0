#include "common/uZqClasses.h"

#include "runtime/core/start_count.h"
#include "runtime/values/typeinfo.h"

namespace zq {

namespace {
constinit TStartCount Starts;
}

void uZqClasses::Start() {
  if (!Starts.Begins()) return;
  DescribeType<TZqAutoDestroy>(u"uZqClasses").EnumNames({u"radComputed", u"radFalse", u"radTrue"});
  DescribeType<TZqObjectOwnership>(u"uZqClasses").EnumNames({u"ooReference", u"ooOwned"});
  DescribeType<TZqBinEncoding>(u"uZqClasses").EnumNames({u"beBase64", u"beHexEncoded"});
}

void uZqClasses::Stop() { Starts.Ends(); }

}  // namespace zq
