// uucode encode NAME MODE, uucode decode [NAME]: from the standard input to the standard output, for the test that
// exchanges texts with other tools. An error is told and ends with 1.

#include <cstdlib>
#include <iostream>
#include <string_view>

#include "common/uZqUUCode.h"
#include "runtime/io/streams.h"

int main(int argc, char** argv) try {
  using namespace zq;
  THandleStream Input(0), Output(1);
  if (argc == 4 && std::string_view(argv[1]) == "encode")
    ZqUUEncode(&Input, &Output, FromUTF8(argv[2]), static_cast<Word>(std::atoi(argv[3])));
  else std::cerr << ZqUUDecode(&Input, &Output).FileName.ToUTF8();
  return 0;
} catch (const zq::Exception& E) {
  std::cerr << E.what();
  return 1;
}
