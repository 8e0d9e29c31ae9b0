// Dates, times and durations from arbitrary text: a value or one of the told exceptions, and what is written of a value
// reads as that value. The first byte tells how the text is read.

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <vector>

#include "common/uZqDateTimeUtils.h"
#include "runtime/text/datetime.h"
#include "runtime/text/local_time.h"

using namespace zq;

namespace {

void Require(bool ACondition) {
  if (!ACondition) std::abort();
}

void RequireItComesBack(TDateTime AValue) {
  const Int64 Moment = DateTimeToUnixMilliseconds(AValue);
  Require(DateTimeToUnixMilliseconds(ZqISOStrToDateTime(ZqDateTimeToISOStr(AValue))) == Moment);
  Require(DateTimeToUnixMilliseconds(ConvertLUOToDateTime(ConvertDateTimeToLUO(AValue))) == Moment);
}

void ReadDate(Byte AWay, const UnicodeString& AText) {
  switch (AWay % 5) {
    case 0: return RequireItComesBack(ZqISOStrToDateTime(AText));
    case 1: return RequireItComesBack(ZqISOStrToDate(AText));
    case 2: return RequireItComesBack(ZqISOStrToTime(AText));
    case 3: return RequireItComesBack(ConvertLUOToDateTime(AText));
    default: return RequireItComesBack(ZqStrToDateTime(AText));
  }
}

void ReadDuration(Byte AWay, const UnicodeString& AText) {
  const auto Range = static_cast<TZqTimeRange>(AWay % 3);
  const auto Format = static_cast<TZqTimeFormat>(AWay / 3 % 6);
  (void)ZqStrToTimeToInt(AText, AWay % 2 == 0, Range, Format, 1 << 30);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* AData, std::size_t ASize) {
  if (ASize < 1 || ASize > 256) return 0;
  // Mostly ASCII; a byte with the high bit becomes a character beyond it.
  UnicodeString Text;
  for (std::size_t i = 1; i < ASize; ++i) Text += static_cast<char16_t>(AData[i] < 0x80 ? AData[i] : AData[i] << 5U);
  try {
    if (AData[0] < 0x80) ReadDate(AData[0], Text);
    else ReadDuration(AData[0] & 0x7FU, Text);
  } catch (const EConvertError&) {
  } catch (const EListError&) {
  } catch (const Exception& Raised) {
    using namespace uZqDateTimeUtils;
    Require(Raised.Message() == LoadResString(_SInvalidTime) || Raised.Message() == LoadResString(_STimeDecodeError));
  }
  return 0;
}
