// Arbitrary bytes through the decompression stream, in pieces of any size and in one call: the same comes from both, or
// the same is raised, whatever the source gives at a time and whether it can seek. Then bytes that were compressed with
// any arguments and writes, to a destination that is full now and then, come back. The first four bytes tell the rest.

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

#include "common/uZqZLib.h"

using namespace zq;

namespace {

constexpr Integer cMost = 1 << 17;  // of what is decompressed

void Require(bool ACondition) {
  if (!ACondition) std::abort();
}

// Gives and takes APiece bytes at a time; it takes none, or raises, each 30000 bytes.
class THostile : public TMemoryStream {
 public:
  using TMemoryStream::Seek;
  THostile(Integer APiece, bool APipe, bool ARaises) : FPiece(APiece), FPipe(APipe), FRaises(ARaises) {}
  Integer Read(void* ABuffer, Integer ACount) override {
    return TMemoryStream::Read(ABuffer, std::min(ACount, FPiece));
  }
  Integer Write(const void* ABuffer, Integer ACount) override {
    const auto Room = static_cast<Integer>(FLimit - FPosition);
    if (Room > 0) return TMemoryStream::Write(ABuffer, std::min({ACount, 20 * FPiece, Room}));
    FLimit += 30000;
    if (FRaises) throw EStreamError(u"refused");
    return 0;
  }
  Int64 Seek(Int64 AOffset, TSeekOrigin AOrigin) override { return FPipe ? -1 : TMemoryStream::Seek(AOffset, AOrigin); }
  void Fill(const std::vector<Byte>& ABytes) {
    TMemoryStream::Write(ABytes.data(), static_cast<Integer>(ABytes.size()));
    FPosition = 0;
  }
  void Rewind() noexcept { FPosition = 0; }

 private:
  Integer FPiece;
  bool FPipe;
  bool FRaises;
  Int64 FLimit = 0;
};

// A destination with a bound.
struct TBounded : TMemoryStream {
  Integer Write(const void* ABuffer, Integer ACount) override {
    if (FPosition + ACount > cMost) throw EStreamError(u"too long");
    return TMemoryStream::Write(ABuffer, ACount);
  }
};

struct TReading {
  std::string Bytes;
  UnicodeString Refusal;
  bool AtEnd = false;
  Int64 Position = 0;  // of the source, behind the end
};

TReading ReadIn(Integer APiece, TStream& ASource, Integer ABits) {
  TReading Result;
  try {
    TZqZLibDecompressionStream Stream(&ASource, ABits);
    std::vector<char> Room(static_cast<std::size_t>(APiece));
    try {
      while (Result.Bytes.size() < cMost) {
        const Integer Count = Stream.Read(Room.data(), APiece);
        Require(Count >= 0 && Count <= APiece);
        if (Count == 0) break;
        Result.Bytes.append(Room.data(), static_cast<std::size_t>(Count));
      }
    } catch (const EZqZLibDecompressionError& e) {
      Result.Refusal = e.Message();
      const auto Counted = static_cast<std::size_t>(Stream.Position());  // those of the call that raised, too
      Require(Counted - Result.Bytes.size() <= Room.size());
      Result.Bytes.append(Room.data(), Counted - Result.Bytes.size());
    }
    Require(Stream.Position() == static_cast<Int64>(Result.Bytes.size()));
    Result.AtEnd = Stream.AtEnd();
    Result.Position = ASource.Position();
  } catch (const EZqZLibDecompressionError& e) {
    Result.Refusal = e.Message();
  }
  return Result;
}

bool IsBounded(const TReading& AReading) { return AReading.Bytes.size() < cMost; }

void CheckOneCall(const std::vector<Byte>& ABytes) {
  const Integer Bits = !ABytes.empty() && ABytes[0] == 0x78 ? 15 : -15;
  TMemoryStream Source;
  Source.WriteBuffer(ABytes.data(), static_cast<Int64>(ABytes.size()));
  Source.SetPosition(0);
  const TReading Told = ReadIn(4096, Source, Bits);
  TBounded Dest;
  try {
    const bool Whole = ZlDecompressStream(&Source, &Dest, true);
    Require(!ABytes.empty() && Told.Refusal.IsEmpty() && Whole == Told.AtEnd);
    Require(Told.Bytes == std::string(static_cast<const char*>(Dest.Memory()), static_cast<std::size_t>(Dest.Size())));
    Require(!Whole || Source.Position() == Told.Position);
  } catch (const EZqZLibDecompressionError& e) {
    Require(ABytes.empty() || e.Message() == Told.Refusal || !IsBounded(Told));
  } catch (const EStreamError&) {
    Require(!IsBounded(Told));
  }
}

// Write and Finish again until all is taken.
template <class TAction>
void Insist(TAction AAction) {
  for (int i = 0;; ++i) {
    Require(i < 1000000);
    try {
      if (AAction()) return;
    } catch (const EStreamError&) {
    }
  }
}

void CheckRoundTrip(const Byte* AHow, Integer APiece, const std::vector<Byte>& ABytes) {
  constexpr Integer cFormats[] = {-15, -9, 9, 12, 15, 25, 31};
  const Integer Bits = cFormats[AHow[0] % std::size(cFormats)];
  THostile Dest(1 + AHow[2], AHow[3] % 2 == 1, AHow[3] % 4 >= 2);
  const auto Size = static_cast<Int64>(ABytes.size());
  {
    TZqZLibCompressionStream Stream(&Dest, static_cast<TZqZLibCompressionLevel>(AHow[2] % 13), Bits, 1 + AHow[1] % 9,
        static_cast<TZqZLibStrategy>(AHow[3] % 5));
    Insist([&] {
      const Int64 At = Stream.Position();
      if (At < Size) Stream.Write(ABytes.data() + At, static_cast<Integer>(std::min<Int64>(APiece, Size - At)));
      return Stream.Position() == Size;
    });
    Insist([&] { return Stream.Finish(), true; });
  }
  Dest.Rewind();
  const TReading Back = ReadIn(APiece, Dest, Bits);
  Require(Back.AtEnd && Back.Refusal.IsEmpty() && Back.Bytes == std::string(ABytes.begin(), ABytes.end()));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* AData, std::size_t ASize) {
  if (ASize < 4 || ASize > 10000) return 0;
  const std::vector<Byte> Bytes(AData + 4, AData + ASize);
  constexpr Integer cFormats[] = {-15, 15, 31, 47, -9, 9};
  const Integer Bits = cFormats[AData[0] % std::size(cFormats)];
  THostile Whole(1 << 20, false, false), Pieces(1 + AData[1], AData[2] % 2 == 1, false);
  Whole.Fill(Bytes);
  Pieces.Fill(Bytes);
  const TReading First = ReadIn(65536, Whole, Bits);
  const TReading Second = ReadIn(1 + AData[3], Pieces, Bits);
  if (IsBounded(First) && IsBounded(Second))
    Require(First.Bytes == Second.Bytes && First.Refusal == Second.Refusal && First.AtEnd == Second.AtEnd &&
            (!First.AtEnd || Second.Position < 0 || First.Position == Second.Position));
  CheckOneCall(Bytes);
  CheckRoundTrip(AData, 1 + AData[1], Bytes);
  // Many times the same is what is longer than a buffer.
  if (AData[3] % 16 == 5 && !Bytes.empty()) {
    std::vector<Byte> Long;
    for (std::size_t i = 0; Long.size() < 70000; ++i)
      for (const Byte b : Bytes) Long.push_back(static_cast<Byte>(b + i * (b ^ 0x5AU)));
    CheckRoundTrip(AData, 100 + AData[1] * AData[1], Long);
  }
  return 0;
}
