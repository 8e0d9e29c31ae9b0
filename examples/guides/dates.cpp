#include "common/uZqDateTimeUtils.h"
#include "runtime/text/datetime.h"

using namespace zq;

int main() {
  const TDateTime Ordered = EncodeDate(2024, 1, 31);
  const TDateTime Due = ZqClosestWeekDay(ZqAddMonths(Ordered, 1), wdNext);  // 29 February, a Thursday
  const UnicodeString Text = ZqDateToISOStr(Due);                           // "2024-02-29"

  const TDateTime Sent = ZqISOStrToDateTime(u"2024-03-31T10:53:18+02:00");   // in local time
  const UnicodeString Back = ZqDateTimeToISOStr(ZqLocalToUTC(Sent)) + u"Z";  // "2024-03-31T08:53:18.000Z"

  return Text == u"2024-02-29" && Back == u"2024-03-31T08:53:18.000Z" ? 0 : 1;
}
