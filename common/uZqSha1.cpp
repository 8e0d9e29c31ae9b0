#include "common/uZqSha1.h"

#if defined(__x86_64__)
#include <cpuid.h>
#include <immintrin.h>
#endif

#include <algorithm>
#include <cerrno>
#include <limits>
#include <memory>
#include <new>
#include <utility>

#include "common/uZqSha1/portable.h"
#include "runtime/io/files.h"
#include "runtime/io/streams.h"

namespace zq {

// --------------------------------------------------------------------------------------------------------- blocks

namespace {

#if defined(__x86_64__)

// Asked once: under a hypervisor the question costs more than a digest.
bool HasSha() noexcept {
  static const bool Result = [] {
    unsigned A = 0, B = 0, C = 0, D = 0;
    return __get_cpuid_count(7, 0, &A, &B, &C, &D) != 0 && (B & bit_SHA) != 0 && __builtin_cpu_supports("sse4.1") != 0;
  }();
  return Result;
}

// The words a to d from the highest on; e in the highest alone, or, between two groups, the a of four steps ago, from
// which the processor makes it. Of the schedule the last four times four words.
struct TRegisters {
  __m128i Abcd;
  __m128i E;
  __m128i Words[4];
};

// Four steps. The words of the next three groups go as far as they can with those of this one.
template <std::size_t AGroup>
[[gnu::target("sha,sse4.1"), gnu::always_inline]] inline void Group(TRegisters& A) noexcept {
  const __m128i Words = A.Words[AGroup % 4];
  const __m128i E = AGroup == 0 ? _mm_add_epi32(A.E, Words) : _mm_sha1nexte_epu32(A.E, Words);
  A.E = A.Abcd;
  asm("" : "+x"(A.E));  // The copy: else the compiler goes on with it, and the chain of steps waits for it.
  A.Abcd = _mm_sha1rnds4_epu32(A.Abcd, E, AGroup / 5);
  __m128i& Next = A.Words[(AGroup + 1) % 4];
  __m128i& Second = A.Words[(AGroup + 2) % 4];
  __m128i& Third = A.Words[(AGroup + 3) % 4];
  if constexpr (AGroup >= 3 && AGroup < 19) Next = _mm_sha1msg2_epu32(Next, Words);
  if constexpr (AGroup >= 2 && AGroup < 18) Second = _mm_xor_si128(Second, Words);
  if constexpr (AGroup >= 1 && AGroup < 17) Third = _mm_sha1msg1_epu32(Third, Words);
}

template <std::size_t... AGroup>
[[gnu::target("sha,sse4.1"), gnu::always_inline]] inline void Groups(
    std::index_sequence<AGroup...>, TRegisters& A) noexcept {
  (Group<AGroup>(A), ...);
}

[[gnu::target("sha,sse4.1")]] void AddBlocksSha(
    sha1::TState& AState, const Byte* ABlocks, std::size_t ACount) noexcept {
  constexpr int cTurned = 0x1B;
  const __m128i BigEndian = _mm_setr_epi8(15, 14, 13, 12, 11, 10, 9, 8, 7, 6, 5, 4, 3, 2, 1, 0);
  auto* const Abcd = reinterpret_cast<__m128i*>(AState.data());
  TRegisters Work;
  Work.Abcd = _mm_shuffle_epi32(_mm_loadu_si128(Abcd), cTurned);
  Work.E = _mm_set_epi32(static_cast<int>(AState[4]), 0, 0, 0);
  for (; ACount > 0; --ACount, ABlocks += sha1::cBlockSize) {
    const __m128i OldAbcd = Work.Abcd;
    const __m128i OldE = Work.E;
    const auto* const Block = reinterpret_cast<const __m128i*>(ABlocks);
    for (int i = 0; i < 4; ++i) Work.Words[i] = _mm_shuffle_epi8(_mm_loadu_si128(Block + i), BigEndian);
    Groups(std::make_index_sequence<20>(), Work);
    Work.E = _mm_sha1nexte_epu32(Work.E, OldE);
    Work.Abcd = _mm_add_epi32(Work.Abcd, OldAbcd);
  }
  _mm_storeu_si128(Abcd, _mm_shuffle_epi32(Work.Abcd, cTurned));
  AState[4] = static_cast<std::uint32_t>(_mm_extract_epi32(Work.E, 3));
}

TSHA1Digest HashMessage(const Byte* AMessage, std::size_t ASize) noexcept {
  return HasSha() ? sha1::Hash(AMessage, ASize, AddBlocksSha) : sha1::Hash(AMessage, ASize, sha1::AddBlocks);
}

#else

TSHA1Digest HashMessage(const Byte* AMessage, std::size_t ASize) noexcept {
  return sha1::Hash(AMessage, ASize, sha1::AddBlocks);
}

#endif

}  // namespace

// ----------------------------------------------------------------------------------------------- blocks and texts

TSHA1Digest ZqHashBuffer(const void* ABuf, NativeInt ASize) {
  Assert(ASize >= 0 && (ABuf != nullptr || ASize == 0));
  if (ASize == 0) return {};
  return HashMessage(static_cast<const Byte*>(ABuf), static_cast<std::size_t>(ASize));
}

AnsiString ZqHashBuffer(const void* ABuf, NativeInt ASize, TZqBinEncoding AEncoding) {
  const TSHA1Digest Digest = ZqHashBuffer(ABuf, ASize);
  return ASize == 0 ? AnsiString() : ZqBufToString(Digest.data(), Digest.size(), AEncoding);
}

void ZqHashString(std::u16string_view AValue, TSHA1Digest& ADigest) {
  ADigest = ZqHashBuffer(AValue.data(), static_cast<NativeInt>(AValue.size() * sizeof(WideChar)));
}

AnsiString ZqHashString(std::u16string_view AValue, TZqBinEncoding AEncoding) {
  return ZqHashBuffer(AValue.data(), static_cast<NativeInt>(AValue.size() * sizeof(WideChar)), AEncoding);
}

AnsiString ZqHashStringW(std::u16string_view AValue, TZqBinEncoding AEncoding) {
  return ZqHashString(AValue, AEncoding);
}

AnsiString ZqHashStringA(std::string_view AValue, TZqBinEncoding AEncoding) {
  return ZqHashBuffer(AValue.data(), static_cast<NativeInt>(AValue.size()), AEncoding);
}

// ---------------------------------------------------------------------------------------------- streams and files

namespace {

constexpr Int64 cLargest = std::numeric_limits<Integer>::max();

// 0 at the end alone: a stream over a file gives it also where the system refuses, and leaves the reason.
Integer ReadSome(TStream& AStream, Byte* ATo, Int64 ACount) {
  errno = 0;
  const Integer Result = AStream.Read(ATo, static_cast<Integer>(std::min(ACount, cLargest)));
  const int Reason = Result > 0 || dynamic_cast<THandleStream*>(&AStream) == nullptr ? 0 : errno;
  if (Reason != 0 && Reason != EINTR) throw EReadError(SysErrorMessage(Reason));  // an interrupted read was repeated
  return std::max(Result, 0);
}

struct TContent {
  explicit TContent(Int64 ARoom) : Room(ARoom), Block(NewBlock(ARoom)) {}
  void Grow() {
    if (Room > cLargest / 2) throw std::bad_alloc();
    auto Larger = NewBlock(Room *= 2);
    std::copy_n(Block.get(), Size, Larger.get());
    Block = std::move(Larger);
  }
  static std::unique_ptr<Byte[]> NewBlock(Int64 ARoom) {
    return std::make_unique_for_overwrite<Byte[]>(static_cast<std::size_t>(ARoom));
  }
  Int64 Room;
  Int64 Size = 0;
  std::unique_ptr<Byte[]> Block;
};

TContent ReadRest(TStream& AStream) {
  constexpr Int64 cFirstRoom = 0x10000;  // of a stream that doesn't know its size
  const Int64 Size = AStream.Size();
  const Int64 Promised = Size - AStream.Position();
  TContent Result(Size > 0 ? Size : cFirstRoom);
  while (const Integer Count = ReadSome(AStream, Result.Block.get() + Result.Size, Result.Room - Result.Size)) {
    Result.Size += Count;
    if (Promised > 0 && Result.Size >= Promised) break;
    if (Result.Size == Result.Room) Result.Grow();
  }
  return Result;
}

AnsiString HashRest(TStream& AStream, TZqBinEncoding AEncoding) {
  const TContent Content = ReadRest(AStream);
  const TSHA1Digest Digest = ZqHashBuffer(Content.Block.get(), static_cast<NativeInt>(Content.Size));
  return ZqBufToString(Digest.data(), Digest.size(), AEncoding);
}

}  // namespace

AnsiString ZqHashStream(TStream* AStream, Boolean AFromStart) {
  Assert(AStream != nullptr);
  if (AFromStart) AStream->SetPosition(0);
  return HashRest(*AStream, beBase64);
}

AnsiString ZqHashFile(const UnicodeString& AFilename, TZqBinEncoding AEncoding) {
  TFileStream File(AFilename, fmOpenRead | fmShareDenyNone);
  return HashRest(File, AEncoding);
}

}  // namespace zq
