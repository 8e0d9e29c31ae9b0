#pragma once

#include "common/uZqLogger.h"
#include "runtime/core/utf8.h"

namespace zq {

/// The bytes of a layout's lines, for TLayout itself: an object of its own, so that no descendant's AppendLine can be
/// overlooked and none of TLayout taken for one. It lives in the layout and counts as it.
template <class TLayout>
class TZqByteLayoutOf final : public IZqLogByteLayout {
 public:
  explicit TZqByteLayoutOf(TLayout& ALayout) noexcept : FLayout(ALayout) {}
  HRESULT QueryInterface(const TGUID& AIID, void** AObj) override { return FLayout.QueryInterface(AIID, AObj); }
  Integer _AddRef() override { return FLayout._AddRef(); }
  Integer _Release() override { return FLayout._Release(); }
  ZQ_HOT void AppendLine(utf8::TBuffer& ALine, const UnicodeString& ALoggerName, TZqLogLevel ALogLevel,
      const UnicodeString& ALogMessage, PZqDataRec AValue, TZqLogIndent ALogIndent) override {
    FLayout.AppendLine(ALine, ALoggerName, ALogLevel, ALogMessage, AValue, ALogIndent);
  }
  /// For the layout's GetInterface.
  bool Answers(const TGUID& AIID, void** AObj) {
    if (AIID != IZqLogByteLayout::IID || FLayout.ClassType() != ClassOf<TLayout>()) return false;
    *AObj = static_cast<IZqLogByteLayout*>(this);
    _AddRef();
    return true;
  }

 private:
  TLayout& FLayout;
};

}  // namespace zq
