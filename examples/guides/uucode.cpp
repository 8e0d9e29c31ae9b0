// The two tools as one program, from the standard input to the standard output:
//   uucode PAGE encode MODE NAME
//   uucode PAGE decode [NAME]
// PAGE is the code page of the text. What the header says is told, and so is an error, with 1.

#include <iostream>
#include <iterator>
#include <string>

#include "common/uZqUUCode.h"
#include "runtime/io/streams.h"
#include "runtime/text/encoding.h"

using namespace zq;

int main(int argc, char** argv) try {
  if (argc < 3) return 0;
  const TAnsiCodePageScope Page(static_cast<Word>(std::stoi(argv[1])));
  THandleStream Input(0), Output(1);
  if (argc == 5) {
    ZqUUEncode(&Input, &Output, FromUTF8(argv[4]), static_cast<Word>(std::stoi(argv[3])));
    return 0;
  }
  TZqUUData Found;
  if (argc == 3) Found = ZqUUDecode(&Input, &Output);
  else Found = ZqUUDecode(std::string(std::istreambuf_iterator<char>(std::cin), {}), FromUTF8(argv[3]), &Output);
  std::cerr << Found.Mode << ' ' << Found.FileName.ToUTF8();
  return 0;
} catch (const Exception& E) {
  std::cerr << E.ClassName().ToUTF8() << ": " << E.what();
  return 1;
}
