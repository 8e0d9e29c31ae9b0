// logconfig SETTINGS LOGGER: logs each line of standard input by the settings of an INI file. The line "reload" has the
// file read again.

#include <cstdio>
#include <iostream>
#include <string>

#include "common/uZqLogAppenders.h"
#include "ini_configurator.h"

using namespace zq;

namespace {

bool Load(TIniLogConfigurator& AConfig) {
  try {
    const auto Faults = AConfig.Load();
    for (const UnicodeString& Fault : Faults) std::fprintf(stderr, "%s\n", Fault.ToUTF8().c_str());
    return Faults.empty();
  } catch (const Exception& e) {
    std::fprintf(stderr, "%s\n", e.what());
    return false;
  }
}

}  // namespace

int main(int ACount, char** AWords) {
  if (ACount != 3) return std::fputs("usage: logconfig SETTINGS LOGGER <LINES\n", stderr), 2;
  auto* const Config = New<TIniLogConfigurator>(FromUTF8(AWords[1]));
  const IntfRef<IZqLogConfigurator> Kept(Config);
  bool Good = Load(*Config);
  const auto Log = Logger()->GetLogger(AWords[2]);
  for (std::string Line; std::getline(std::cin, Line);) {
    if (Line == "reload") Good = Load(*Config) && Good;
    else Log->Info(Line);
  }
  return Good ? 0 : 1;
}
