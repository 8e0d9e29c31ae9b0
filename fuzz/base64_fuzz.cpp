// Decoding of arbitrary text and encoding of arbitrary bytes: never past a buffer, and what the processor's own path
// and the one in plain C++ make is the same. What has been encoded comes back.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string_view>
#include <vector>

#include "common/uZqBase64.h"
#include "common/uZqBase64/portable.h"

using namespace zq;

namespace {

void Require(bool ACondition) {
  if (!ACondition) std::abort();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* AData, std::size_t ASize) {
  const TBytes Bytes(AData, AData + ASize);
  const AnsiString Text = ZqEncodeBase64(Bytes);
  std::vector<char> Room(base64::EncodedSize(ASize));
  Require(base64::Encode(Bytes.data(), ASize, Room.data()) == Room.size());
  Require(Text == std::string_view(Room.data(), Room.size()));
  Require(ZqDecodeBase64(Text) == Bytes);

  const std::vector<char> Source(AData, AData + ASize / 4 * 4);
  const std::string_view Coded(Source.data(), Source.size());
  TBytes Decoded(base64::DecodedCapacity(Coded.size()));
  Decoded.resize(base64::Decode(Coded, Decoded.data()));
  Require(ZqDecodeBase64(Coded) == Decoded);
  return 0;
}
