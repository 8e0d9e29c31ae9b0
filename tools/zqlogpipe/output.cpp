#include "output.h"

#include <cstdio>

#include "runtime/core/utf8.h"

using namespace zq;

void TComplaints::Add(std::string_view AText) {
  FStatus = 1;
  Tell(AText);
}

void TComplaints::Tell(std::string_view AText) {
  std::fprintf(stderr, "zqlogpipe: %.*s\n", static_cast<int>(AText.size()), AText.data());
}

void TOutput::Close(IZqLogAppender& AAppender) {
  try {
    AAppender.Close();
  } catch (const Exception& e) {
    FComplaints.Add(e.what());
  }
}

UnicodeString TextOf(std::string_view ALine) {
  std::u16string Result = utf8::Decode(ALine, utf8::TMalformed::Escape);
  for (std::size_t i = 0; i < Result.size(); ++i) {
    const bool OfAPair = i != 0 && Result[i - 1] >= 0xD800 && Result[i - 1] < 0xDC00;
    if (!OfAPair && Result[i] >= 0xDC80 && Result[i] <= 0xDCFF) Result[i] &= 0xFF;
  }
  return Result;
}
