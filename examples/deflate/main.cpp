// Deflates and inflates from standard input to standard output, files or pipes alike.
//   zqdeflate c [LEVEL [BITS [MEMLEVEL [STRATEGY [PIECE]]]]]   LEVEL and STRATEGY are the library's, by ordinal
//   zqdeflate d [BITS [PIECE]]                                 ends with 2 where the data is cut
//   zqdeflate l [BITS]                                         tells how long the data is, inflated
// BITS tells the format: 15 zlib, -15 raw deflate, 31 gzip. PIECE is how much is read at a time, in bytes.

#include <charconv>
#include <cstdio>
#include <span>
#include <string_view>

#include "common/uZqZLib.h"

using namespace zq;

namespace {

constexpr Integer cPiece = 0x100000;

class TArguments {
 public:
  explicit TArguments(std::span<char*> AArgs) noexcept : FArgs(AArgs) {}
  [[nodiscard]] Integer At(std::size_t AIndex, Integer ADefault) const {
    if (AIndex >= FArgs.size()) return ADefault;
    const std::string_view Text = FArgs[AIndex];
    Integer Result = 0;
    const auto [End, Error] = std::from_chars(Text.data(), Text.data() + Text.size(), Result);
    if (Error != std::errc() || End != Text.data() + Text.size())
      throw EConvertError(FromUTF8(Text) + u" is no number");
    return Result;
  }

 private:
  std::span<char*> FArgs;
};

int Compress(const TArguments& AArgs) {
  THandleStream In(0), Out(1);
  TZqZLibCompressionStream Stream(&Out,
      static_cast<TZqZLibCompressionLevel>(AArgs.At(0, static_cast<Integer>(clDefault))), AArgs.At(1, 15),
      AArgs.At(2, 8), static_cast<TZqZLibStrategy>(AArgs.At(3, 0)));
  Stream.CopyFrom(In, -1, AArgs.At(4, cPiece));
  Stream.Finish();
  return 0;
}

int Decompress(const TArguments& AArgs) {
  THandleStream In(0), Out(1);
  TZqZLibDecompressionStream Stream(&In, AArgs.At(0, 15));
  Out.CopyFrom(Stream, -1, AArgs.At(1, cPiece));
  return Stream.AtEnd() ? 0 : 2;
}

int TellLength(const TArguments& AArgs) {
  THandleStream In(0);
  TZqZLibDecompressionStream Stream(&In, AArgs.At(0, 15));
  std::printf("%lld\n", Stream.Seek(0, soEnd));
  return Stream.AtEnd() ? 0 : 2;
}

int Run(std::string_view ACommand, const TArguments& AArgs) {
  if (ACommand == "c") return Compress(AArgs);
  if (ACommand == "d") return Decompress(AArgs);
  if (ACommand == "l") return TellLength(AArgs);
  std::fputs("usage: zqdeflate c [LEVEL [BITS [MEMLEVEL [STRATEGY [PIECE]]]]] | d [BITS [PIECE]] | l [BITS]\n", stderr);
  return 1;
}

}  // namespace

int main(int ACount, char** AArgs) {
  try {
    const std::span<char*> Given(AArgs, static_cast<std::size_t>(ACount));
    return Run(ACount > 1 ? Given[1] : "", TArguments(Given.subspan(ACount > 1 ? 2 : 1)));
  } catch (const Exception& e) {
    std::fprintf(stderr, "zqdeflate: %s\n", e.what());
    return 1;
  }
}
