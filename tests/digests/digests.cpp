// The library's digests for tests/digests/compare.
//
// digests <MESSAGES: the bytes of all messages, and where each begins and ends in them, as Message has it. For each of
// them come the digests of both kinds on both of their ways.
// digests FILE...: a line for each, with SHA-1 by the file and by its stream, and MD5.
// digests zeros COUNT: a line with both digests of so many bytes of zero.

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <iterator>
#include <memory>
#include <random>
#include <string>

#include "common/uZqMD5.h"
#include "common/uZqSha1.h"
#include "common/uZqSha1/portable.h"
#include "runtime/io/streams.h"

namespace {

using namespace zq;

template <class T>
T* Input(std::vector<T>& ARoom, std::size_t ACount) {
  ARoom.resize(ACount);
  if (std::fread(ARoom.data(), sizeof(T), ACount, stdin) != ACount) std::abort();
  return ARoom.data();
}

template <class TDigest>
void Output(const TDigest& ADigest) {
  if (std::fwrite(ADigest.data(), 1, ADigest.size(), stdout) != ADigest.size()) std::abort();
}

// By pieces of 0 to 199 bytes.
TMD5Digest InPieces(const Byte* AMessage, std::size_t ASize, std::minstd_rand& AChance) {
  TMD5Context Context;
  MD5Init(Context);
  for (std::size_t At = 0, Count = 0; At < ASize; At += Count) {
    Count = std::min<std::size_t>(AChance() % 200, ASize - At);
    MD5Update(Context, AMessage + At, static_cast<NativeInt>(Count));
  }
  TMD5Digest Result;
  MD5Final(Context, Result);
  return Result;
}

struct TMessage {
  std::uint32_t At, Size;
};

void HashMessages() {
  std::minstd_rand Chance(7);  // NOLINT: the same pieces in each run
  std::vector<std::uint32_t> Counts;
  std::vector<Byte> Bytes;
  std::vector<TMessage> Messages;
  Input(Counts, 2);
  Input(Bytes, Counts[0]);
  Input(Messages, Counts[1]);
  for (const TMessage& Message : Messages) {
    const Byte* const From = Bytes.data() + Message.At;
    Output(ZqHashBuffer(From, Message.Size));
    Output(sha1::Hash(From, Message.Size, sha1::AddBlocks));
    Output(MD5Hash(From, Message.Size));
    Output(InPieces(From, Message.Size, Chance));
  }
}

void HashFile(const char* AName) {
  const UnicodeString Name = FromUTF8(AName);
  std::cout << ZqHashFile(Name, beHexEncoded).View() << ' ';
  TFileStream Stream(Name, fmOpenRead);
  std::cout << ZqHashStream(&Stream, false).View() << ' ';
  std::ifstream File(AName, std::ios::binary);
  const std::string Content(std::istreambuf_iterator<char>(File), {});
  std::cout << MD5Hash(Content).View() << '\n';
}

void HashZeros(std::size_t ACount) {
  const std::unique_ptr<void, decltype(&std::free)> Zeros(std::calloc(ACount, 1), &std::free);
  const TMD5Digest Digest = MD5Hash(Zeros.get(), static_cast<NativeInt>(ACount));
  std::cout << ZqHashBuffer(Zeros.get(), static_cast<NativeInt>(ACount), beHexEncoded).View() << ' '
            << ZqBufToHex(Digest.data(), Digest.size()).View() << '\n';
}

}  // namespace

int main(int ACount, char** AArguments) {
  if (ACount == 1) HashMessages();
  else if (ACount == 3 && AArguments[1] == std::string_view("zeros"))
    HashZeros(std::strtoull(AArguments[2], nullptr, 10));
  else
    for (int i = 1; i < ACount; ++i) HashFile(AArguments[i]);
}
