// Arbitrary bytes read through the UTF-8 adapter in pieces of any size and cut at any byte, and read character by
// character through a string stream. The first byte tells the cut, the second the size of the pieces and the code page.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <iterator>
#include <string>
#include <vector>

#include "common/uZqClasses/text_streams.h"
#include "runtime/core/utf8.h"

using namespace zq;

namespace {

void Require(bool ACondition) {
  if (!ACondition) std::abort();
}

struct TReading {
  std::u16string Units;
  UnicodeString Refusal;
};

// In a fresh block of exactly that size, so that the sanitizer sees a step beyond it.
TReading ReadIn(Integer APiece, std::vector<Byte> ABytes) {
  TZqMemoryStream Wrapped = TZqMemoryStream::WrapBuffer(ABytes.data(), ABytes.size());
  TZqUTF8StreamAdapter Adapter(&Wrapped);
  TReading Result;
  std::vector<char16_t> Room(static_cast<std::size_t>(APiece));
  try {
    for (;;) {
      const Integer Count = Adapter.Read(Room.data(), 2 * APiece);
      Require(Count % 2 == 0 && Count <= 2 * APiece);
      if (Count == 0) break;
      Result.Units.append(Room.data(), static_cast<std::size_t>(Count / 2));
    }
    Require(Wrapped.Position() == Wrapped.Size());
  } catch (const Exception& e) {
    Result.Refusal = e.Message();
  }
  return Result;
}

void CheckWritten(const std::u16string& AUnits) {
  const std::string Expected = utf8::Encode(AUnits);
  TZqMemoryStream Wrapped(1);
  TZqUTF8StreamAdapter Adapter(&Wrapped, false, false);
  const auto Count = static_cast<Integer>(2 * AUnits.size());
  Require(Adapter.Write(AUnits.data(), Count) == Count && Wrapped.View() == Expected);
}

// Each read goes on, and none past the end.
void CheckStringStream(std::vector<Byte> ABytes, Word ACodePage, NativeUInt APiece) {
  TZqStringStream Stream = TZqStringStream::WrapBuffer(ABytes.data(), static_cast<Integer>(ABytes.size()), ACodePage);
  try {
    for (int i = 0; Stream.Position() < Stream.Size(); ++i) {
      const Int64 Before = Stream.Position();
      if (i % 3 == 0) (void)Stream.ReadWChar();
      else if (i % 3 == 1) Require(Stream.ReadWString(APiece).size() <= APiece);
      else (void)Stream.ReadAString(APiece);
      Require(Stream.Position() > Before && Stream.Position() <= Stream.Size());
    }
  } catch (const EOSError&) {  // no text of the code page
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* AData, std::size_t ASize) {
  if (ASize < 2 || ASize > 4096) return 0;
  constexpr Word cPages[] = {0, 932, 1200, 1201, 1252, 12000, 50220, 52936, 54936, 65000, 65001};
  const Integer Piece = 1 + AData[1] % 16;
  const std::vector<Byte> Bytes(AData + 2, AData + ASize);
  const std::size_t Cut = Bytes.empty() ? 0 : AData[0] % Bytes.size();
  const TReading Whole = ReadIn(4096, Bytes);
  const TReading Pieces = ReadIn(Piece, Bytes);
  const TReading Front = ReadIn(Piece, {Bytes.begin(), Bytes.begin() + static_cast<std::ptrdiff_t>(Cut)});
  // What a refusing call had read is not counted by its result: pieces show a part of it.
  Require(Pieces.Refusal == Whole.Refusal);
  Require(!Whole.Refusal.IsEmpty() || (Pieces.Units == Whole.Units && Whole.Units.starts_with(Front.Units)));
  Require(Front.Units.size() <= Cut);
  CheckWritten(Pieces.Units);
  CheckStringStream(Bytes, cPages[AData[1] % std::size(cPages)], static_cast<NativeUInt>(Piece));
  return 0;
}
