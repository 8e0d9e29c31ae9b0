// Decoding of arbitrary text in every form: never past a line, and an error is one of the two that are told. What has
// been encoded comes back.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

#include "common/uZqUUCode.h"
#include "runtime/io/streams.h"
#include "runtime/io/string_list.h"
#include "runtime/text/encoding.h"

using namespace zq;

namespace {

void Require(bool ACondition) {
  if (!ACondition) std::abort();
}

template <class TCall>
void RefusesOrDecodes(TCall ACall) {
  TMemoryStream Dest;
  try {
    ACall(&Dest);
  } catch (const Exception& E) {
    Require(E.Message() == u"Unexpected EOF" || E.Message() == u"Invalid UUData");
  }
}

void DecodeEveryWay(std::string_view AText) {
  const UnicodeString Name = UnicodeString::FromUTF8(AText.substr(0, AText.size() % 8));
  const std::string Block = "begin 644 a\n" + std::string(AText);  // so that the lines of data are reached
  TStringList Lines;
  Lines.SetText(UnicodeString::FromUTF8(Block));
  RefusesOrDecodes([&](TStream* ADest) { ZqUUDecode(AText, ADest); });
  RefusesOrDecodes([&](TStream* ADest) { ZqUUDecode(AText, Name, ADest); });
  RefusesOrDecodes([&](TStream* ADest) { ZqUUDecode(Block, ADest); });
  RefusesOrDecodes([&](TStream* ADest) { ZqUUDecode(Lines, u"A", ADest); });
  RefusesOrDecodes([&](TStream* ADest) { ZqUUDecode(Lines, ADest); });
  RefusesOrDecodes([&](TStream* ADest) {
    TStringStream Source{RawByteString(std::string(AText))};
    ZqUUDecode(&Source, ADest);
  });
}

void RoundTrip(std::string_view ABytes) {
  const AnsiString Text = ZqUUEncode(ABytes, u"a b", 644);
  TMemoryStream Dest;
  const TZqUUData Data = ZqUUDecode(Text, &Dest);
  Require(Data.FileName == u"a b" && Data.Mode == 644);
  Require(std::string_view(static_cast<const char*>(Dest.Memory()), static_cast<std::size_t>(Dest.Size())) == ABytes);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* AData, std::size_t ASize) {
  const std::string_view Text(reinterpret_cast<const char*>(AData), ASize);
  const TAnsiCodePageScope Page(ASize % 2 == 0 ? 65001 : 1252);
  DecodeEveryWay(Text);
  RoundTrip(Text);
  return 0;
}
