#include "common/rZqCommon.h"

#include "common/uZqClasses.h"
#include "common/uZqLogAppenders.h"
#include "common/uZqLogLayouts.h"
#include "common/uZqLogger.h"
#include "common/uZqSysUtils.h"
#include "common/uZqTypes.h"

namespace zq {

namespace {

constexpr TPackageUnit cUnits[] = {
    {u"uZqSysUtils", uZqSysUtils::Start, uZqSysUtils::Stop},
    {u"uZqTypes", uZqTypes::Start, nullptr},
    {u"uZqClasses", uZqClasses::Start, nullptr},
    {u"uZqWindows", nullptr, nullptr},
    {u"uZqLogLayouts", uZqLogLayouts::Start, nullptr},
    {u"uZqLogger", uZqLogger::Start, uZqLogger::Stop},
    {u"uZqLogAppenders", uZqLogAppenders::Start, nullptr},
};

// Of each unit: 0 before it has started, -1 with one start, -2 with two.
Integer Counters[std::size(cUnits)] = {};

[[gnu::constructor]] void Load() { Initialize(); }
[[gnu::destructor]] void Unload() { Finalize(); }

}  // namespace

void Initialize() {
  for (std::size_t i = 0; i < std::size(cUnits); ++i)
    if (Counters[i]-- == 0 && cUnits[i].Start != nullptr) cUnits[i].Start();
}

void Finalize() {
  for (std::size_t i = std::size(cUnits); i-- > 0;)
    if (++Counters[i] == 0 && cUnits[i].Stop != nullptr) cUnits[i].Stop();
}

const TPackageInfo& GetPackageInfoTable() {
  static const TPackageInfo& Table = *new TPackageInfo{
      cUnits, {TypeInfo<TZqLogLevel>(), TypeInfo<TZqLogIndent>(), TypeInfo<TZqTypeKind>(), TypeInfo<TZqMainTypeKind>(),
                  TypeInfo<TZqNullableBool>(), TypeInfo<TZqCharCase>(), TypeInfo<TZqBitness>(),
                  TypeInfo<TZqAutoDestroy>(), TypeInfo<TZqObjectOwnership>()}};
  return Table;
}

}  // namespace zq
