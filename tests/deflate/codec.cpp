// What the library deflates and inflates, for others to compare: standard input to standard output.
//   codec c LEVEL BITS MEMLEVEL STRATEGY PIECE   the first and the fourth by ordinal, written in pieces of that size
//   codec d BITS PIECE                           ends with 2 where the data is cut
//   codec s BITS                                 tells the position at the end
// Ends with 1 and the message where something is raised. zlib.h stands first here and last in the unit's test.

#include <zlib.h>

#include <cstdio>
#include <cstdlib>

#include "common/uZqZLib.h"

using namespace zq;

namespace {

int Convert(char** AArgs) {
  THandleStream In(0), Out(1);
  const auto Number = [AArgs](int AIndex) { return std::atoi(AArgs[AIndex]); };
  if (*AArgs[1] == 'c') {
    TZqZLibCompressionStream Stream(&Out, static_cast<TZqZLibCompressionLevel>(Number(2)), Number(3), Number(4),
        static_cast<TZqZLibStrategy>(Number(5)));
    Stream.CopyFrom(In, -1, Number(6));
    Stream.Finish();
    return adler32(0, Z_NULL, 0) == 1 && crc32(0, Z_NULL, 0) == 0 ? 0 : 3;  // zlib's, which is no less seen
  }
  TZqZLibDecompressionStream Stream(&In, Number(2));
  if (*AArgs[1] == 's') {
    Stream.Seek(0, soEnd);
    return std::printf("%lld\n", Stream.Position()) > 0 ? 0 : 3;
  }
  Out.CopyFrom(Stream, -1, Number(3));
  return Stream.AtEnd() ? 0 : 2;
}

}  // namespace

int main(int, char** AArgs) {
  try {
    return Convert(AArgs);
  } catch (const Exception& e) {
    std::fprintf(stderr, "%s\n", e.what());
    return 1;
  }
}
