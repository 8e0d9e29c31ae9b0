#include "common/rZqCommon.h"

#include <iterator>

#include "common/uZqClasses.h"
#include "common/uZqDateTimeUtils.h"
#include "common/uZqLogAppenders.h"
#include "common/uZqLogLayouts.h"
#include "common/uZqLogger.h"
#include "common/uZqSessionEvents.h"
#include "common/uZqSysUtils.h"
#include "common/uZqThreads.h"
#include "common/uZqTypes.h"
#include "common/uZqZLib.h"

namespace zq {

namespace {

constexpr TPackageUnit cUnits[] = {
    {u"uZqSysUtils", uZqSysUtils::Start, uZqSysUtils::Stop},
    {u"uZqDateTimeUtils", uZqDateTimeUtils::Start, uZqDateTimeUtils::Stop},
    {u"uZqTypes", uZqTypes::Start, uZqTypes::Stop},
    {u"uZqClasses", uZqClasses::Start, uZqClasses::Stop},
    {u"uZqBase64", nullptr, nullptr},
    {u"uZqWindows", nullptr, nullptr},
    {u"uZqSessionEvents", uZqSessionEvents::Start, uZqSessionEvents::Stop},
    {u"uZqThreads", uZqThreads::Start, uZqThreads::Stop},
    {u"uZqUUCode", nullptr, nullptr},
    {u"uZqZLib", uZqZLib::Start, uZqZLib::Stop},
    {u"uZqLogLayouts", uZqLogLayouts::Start, uZqLogLayouts::Stop},
    {u"uZqLogger", uZqLogger::Start, uZqLogger::Stop},
    {u"uZqLogAppenders", uZqLogAppenders::Start, uZqLogAppenders::Stop},
    {u"uZqSha1", nullptr, nullptr},
    {u"uZqMD5", nullptr, nullptr},
};

// Also linked statically, the library starts before the program's own static objects and ends after them.
[[gnu::constructor(101)]] void Load() { Initialize(); }
[[gnu::destructor(101)]] void Unload() { uZqLogger::EndProcess(); }

}  // namespace

void Initialize() {
  for (const TPackageUnit& Unit : cUnits)
    if (Unit.Start != nullptr) Unit.Start();
}

void Finalize() {
  for (auto Unit = std::rbegin(cUnits); Unit != std::rend(cUnits); ++Unit)
    if (Unit->Stop != nullptr) Unit->Stop();
}

const TPackageInfo& GetPackageInfoTable() {
  static const TPackageInfo& Table = *new TPackageInfo{
      cUnits, {TypeInfo<TZqLogLevel>(), TypeInfo<TZqLogIndent>(), TypeInfo<TZqTypeKind>(), TypeInfo<TZqMainTypeKind>(),
                  TypeInfo<TZqNullableBool>(), TypeInfo<TZqCharCase>(), TypeInfo<TZqBitness>(),
                  TypeInfo<TZqWeekFormat>(), TypeInfo<TZqDatePeriod>(), TypeInfo<TZqWorkDayAdjustment>(),
                  TypeInfo<TZqDecodeType>(), TypeInfo<TZqTimeRange>(), TypeInfo<TZqTimeFormat>(),
                  TypeInfo<TZqAutoDestroy>(), TypeInfo<TZqObjectOwnership>(), TypeInfo<TZqCharacterSetType>(),
                  TypeInfo<TZqTextParserPosType>(), TypeInfo<TZqTextParserSkipOp>(), TypeInfo<TZqBinEncoding>(),
                  TypeInfo<TZqNotificationScope>(), TypeInfo<TZqSessionEventType>(), TypeInfo<TZqPowerEventType>(),
                  TypeInfo<TZqEndSessionType>(), TypeInfo<TZqThreadAction>(), TypeInfo<TZqThreadState>(),
                  TypeInfo<TZqZLibCompressionLevel>(), TypeInfo<TZqZLibStrategy>(), TypeInfo<TZqZLibFlush>()}};
  return Table;
}

}  // namespace zq
