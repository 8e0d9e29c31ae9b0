// Logs of arbitrary bytes, read at once and in blocks of any size: the same parts, whose texts are valid UTF-8 and
// whose lines go forward. The first byte tells the size of the blocks.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

#include "common/uZqClasses.h"
#include "examples/zqlogview/log_reader.h"
#include "runtime/core/utf8.h"

using namespace zq;

namespace {

void Require(bool ACondition) {
  if (!ACondition) std::abort();
}

void Append(std::string& AText, const TLogFields& AFields) {
  for (const auto& [Name, Value] : AFields) AText += Name + "=" + Value + "\n";
}

std::string PartsOf(std::vector<Byte> ABytes, std::size_t ABlock) {
  TZqMemoryStream Source = TZqMemoryStream::WrapBuffer(ABytes.data(), ABytes.size());
  TLogReader Reader(Source, ABlock);
  std::string Result;
  Int64 Line = 1;
  for (TLogPart Part = Reader.Next(); Part != TLogPart::End; Part = Reader.Next()) {
    Require(Reader.Line() >= Line);
    Line = Reader.Line();
    Result += std::to_string(Line) + "\n";
    const TLogItem& Item = Reader.Item();
    if (Part == TLogPart::Run) Append(Result, Reader.Run());
    if (Part == TLogPart::RunEnd) Result += "end\n";
    if (Part == TLogPart::Damage) Result += Reader.Damage() + "\n";
    if (Part != TLogPart::Item) continue;
    for (const std::string& Text :
        {Item.TimeStamp, Item.Thread, Item.Logger, Item.Message, Item.Value, Item.ExceptionClass})
      Result += Text + "\n";
    Append(Result, Item.Others);
  }
  Require(utf8::Encode(utf8::Decode(Result)) == Result);
  return Result;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* AData, std::size_t ASize) {
  if (ASize < 1 || ASize > 8192) return 0;
  const std::vector<Byte> Bytes(AData + 1, AData + ASize);
  Require(PartsOf(Bytes, std::size_t{1} << 18) == PartsOf(Bytes, 1 + AData[0] % 64));
  return 0;
}
