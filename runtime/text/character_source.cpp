#include "runtime/text/character_source.h"

#include <iconv.h>
#include <unicode/ucnv.h>

#include <array>
#include <bit>
#include <cerrno>
#include <cstring>

namespace zq {

namespace {

Word CodeOf(const char* ABytes, std::ptrdiff_t ACount) noexcept {
  const auto Byte0 = static_cast<Byte>(ABytes[0]);
  if (ACount == 1) return Byte0;
  return ACount == 2 ? static_cast<Word>(Byte0 << 8U | static_cast<Byte>(ABytes[1])) : Word{0};
}

// --------------------------------------------------------------------------------------------- ICU

class TIcuSource final : public TCharacterSource {
 public:
  explicit TIcuSource(UConverter* AConverter) noexcept : FConverter(AConverter) {
    UErrorCode Error = U_ZERO_ERROR;
    ucnv_setToUCallBack(AConverter, UCNV_TO_U_CALLBACK_STOP, nullptr, nullptr, nullptr, &Error);
    ucnv_setFromUCallBack(AConverter, UCNV_FROM_U_CALLBACK_STOP, nullptr, nullptr, nullptr, &Error);
  }

  char16_t Read(std::string_view ABytes) override {
    std::array<char16_t, 4> Units{};
    char16_t* To = Units.data();
    const char* From = ABytes.data();
    UErrorCode Error = U_ZERO_ERROR;
    ucnv_resetToUnicode(FConverter.get());
    ucnv_toUnicode(FConverter.get(), &To, Units.data() + Units.size(), &From, From + ABytes.size(), nullptr, 1, &Error);
    if (Error == U_TRUNCATED_CHAR_FOUND) return cLead;
    if (U_SUCCESS(Error) && To - Units.data() == 1) return Units[0];
    return From - ABytes.data() == 1 && ABytes.size() == 2 ? cLone : cUnassigned;
  }

  Word Write(char16_t AChar, bool ABestFit) override {
    std::array<char, 8> Bytes{};
    char* To = Bytes.data();
    const char16_t* From = &AChar;
    UErrorCode Error = U_ZERO_ERROR;
    ucnv_resetFromUnicode(FConverter.get());
    ucnv_setFallback(FConverter.get(), ABestFit ? 1 : 0);
    ucnv_fromUnicode(FConverter.get(), &To, Bytes.data() + Bytes.size(), &From, From + 1, nullptr, 1, &Error);
    return U_SUCCESS(Error) ? CodeOf(Bytes.data(), To - Bytes.data()) : Word{0};
  }

 private:
  struct TClose {
    void operator()(UConverter* AConverter) const noexcept { ucnv_close(AConverter); }
  };
  std::unique_ptr<UConverter, TClose> FConverter;
};

std::unique_ptr<TCharacterSource> OpenIcu(const char* AName) {
  UErrorCode Error = U_ZERO_ERROR;
  UConverter* const Converter = ucnv_open(AName, &Error);
  return U_FAILURE(Error) ? nullptr : std::make_unique<TIcuSource>(Converter);
}

// --------------------------------------------------------------------------------------------- the C library

// A descriptor of the C library's converters, closed with it. They know no similar characters.
class TDescriptor {
 public:
  TDescriptor(const char* ATo, const char* AFrom) noexcept : FHandle(iconv_open(ATo, AFrom)) {}
  TDescriptor(const TDescriptor&) = delete;
  TDescriptor& operator=(const TDescriptor&) = delete;
  ~TDescriptor() {
    if (IsOpen()) iconv_close(FHandle);
  }
  // NOLINTNEXTLINE(performance-no-int-to-ptr)
  [[nodiscard]] bool IsOpen() const noexcept { return FHandle != reinterpret_cast<iconv_t>(-1); }

  // Bytes written, from the initial state and back to it; -1 and the reason in errno where it can't.
  template <std::size_t cRoom>
  std::ptrdiff_t Convert(const void* ABytes, std::size_t ACount, std::array<char, cRoom>& AResult) noexcept {
    char* From = static_cast<char*>(const_cast<void*>(ABytes));
    char* To = AResult.data();
    std::size_t Room = cRoom;
    iconv(FHandle, nullptr, nullptr, nullptr, nullptr);
    if (iconv(FHandle, &From, &ACount, &To, &Room) != 0) return -1;  // not reversible is no answer, too
    if (iconv(FHandle, nullptr, nullptr, &To, &Room) != 0) return -1;
    return To - AResult.data();
  }

 private:
  iconv_t FHandle;
};

constexpr const char* cNative = std::endian::native == std::endian::little ? "UTF-16LE" : "UTF-16BE";

class TIconvSource final : public TCharacterSource {
 public:
  explicit TIconvSource(const char* AName) noexcept : FToWide(cNative, AName), FFromWide(AName, cNative) {}
  [[nodiscard]] bool IsOpen() const noexcept { return FToWide.IsOpen() && FFromWide.IsOpen(); }

  char16_t Read(std::string_view ABytes) override {
    std::array<char, 16> Units{};
    const std::ptrdiff_t Count = FToWide.Convert(ABytes.data(), ABytes.size(), Units);
    if (Count < 0 && errno == EINVAL) return cLead;
    if (Count == sizeof(char16_t)) {
      char16_t Result = 0;
      std::memcpy(&Result, Units.data(), sizeof Result);
      return Result;
    }
    return ABytes.size() == 2 && static_cast<Byte>(ABytes[1]) < 0x80 ? cLone : cUnassigned;
  }

  Word Write(char16_t AChar, bool) override {
    std::array<char, 16> Bytes{};
    return CodeOf(Bytes.data(), FFromWide.Convert(&AChar, sizeof AChar, Bytes));
  }

 private:
  TDescriptor FToWide;
  TDescriptor FFromWide;
};

std::unique_ptr<TCharacterSource> OpenIconv(const char* AName) {
  auto Result = std::make_unique<TIconvSource>(AName);
  return Result->IsOpen() ? std::move(Result) : nullptr;
}

}  // namespace

std::unique_ptr<TCharacterSource> TCharacterSource::Open(const TCharacterData& AData) {
  switch (AData.Source) {
    case TCharacterData::ICU: return OpenIcu(AData.Name);
    case TCharacterData::CLibrary: return OpenIconv(AData.Name);
    case TCharacterData::None: break;
  }
  return nullptr;
}

}  // namespace zq
