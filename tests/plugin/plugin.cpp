#include "tests/plugin/plugin.h"

namespace zq::plugin {

namespace {

struct EPluginError : EConvertError {
  using EConvertError::EConvertError;
};

}  // namespace

class TPluginEcho : public Implements<TInterfacedObject, IEchoEx> {
 public:
  UnicodeString Echo(const UnicodeString& AText) override { return AText; }
  UnicodeString EchoTwice(const UnicodeString& AText) override { return AText + AText; }

 protected:
  ~TPluginEcho() override = default;
};

extern "C" ZQ_API const TEntries ZqPluginEntries;
const TEntries ZqPluginEntries{
    []() -> TInterfacedObject* { return New<TPluginEcho>(); },
    [](const char16_t* AMessage) { throw EPluginError(AMessage); },
    [](const TCallback& ACallback, const UnicodeString& AText) { return ACallback(AText); },
    [] { return ExceptionClass::Of<EPluginError>(); },
};

}  // namespace zq::plugin
