#include "common/uZqClasses/hex.h"

#include <string>

#include "common/uZqBase64.h"
#include "common/uZqClasses/streams.h"
#include "common/uZqTypes.h"
#include "runtime/text/numbers.h"

namespace zq {

// ---------------------------------------------------------------------------------------------------- hexadecimal

namespace {

void AppendHex(std::string& AText, Byte AValue) {
  constexpr std::string_view cDigits = "0123456789ABCDEF";
  AText += cDigits[AValue >> 4U];
  AText += cDigits[AValue & 15U];
}

constexpr unsigned DigitOf(char AChar) noexcept {
  if (AChar >= '0' && AChar <= '9') return static_cast<unsigned>(AChar - '0');
  if (AChar >= 'A' && AChar <= 'F') return static_cast<unsigned>(AChar - 'A' + 10);
  if (AChar >= 'a' && AChar <= 'f') return static_cast<unsigned>(AChar - 'a' + 10);
  return 16;
}

Byte PairToByte(std::string_view APair) {
  const unsigned High = DigitOf(APair[0]);
  const unsigned Low = DigitOf(APair[1]);
  if (High < 16 && Low < 16) return static_cast<Byte>(High << 4U | Low);
  return static_cast<Byte>(StrToInt(u"$" + TZqEncoding::ConvertA(AnsiString(APair))));  // which words the complaint
}

template <class TTake>
void ForEachByte(std::string_view AText, TTake ATake) {
  for (; AText.size() >= 2; AText.remove_prefix(2)) ATake(PairToByte(AText.substr(0, 2)));
}

}  // namespace

AnsiString ZqBufToHex(const void* ABuf, NativeUInt ASize) {
  std::string Result;
  Result.reserve(2 * ASize);
  for (NativeUInt i = 0; i < ASize; ++i) AppendHex(Result, static_cast<const Byte*>(ABuf)[i]);
  return Result;
}

AnsiString ZqBufToHex(const TBytes& AValue) { return ZqBufToHex(AValue.data(), AValue.size()); }

AnsiString ZqBufToHex(TStream* AStream) {
  Assert(AStream != nullptr);
  std::string Result;
  for (Byte Value = 0; AStream->Read(&Value, 1) == 1;) AppendHex(Result, Value);
  return Result;
}

TBytes ZqHexToBuf(std::string_view AValue) {
  TBytes Result;
  Result.reserve(AValue.size() / 2);
  ForEachByte(AValue, [&](Byte AByte) { Result.push_back(AByte); });
  return Result;
}

void* ZqHexToBuf(std::string_view AValue, NativeUInt& ASize) {
  ASize = 0;
  return ZqByteArrToBuf(ZqHexToBuf(AValue), ASize);
}

void ZqHexToBuf(std::string_view AValue, TStream* AStream) {
  Assert(AStream != nullptr);
  ForEachByte(AValue, [&](Byte AByte) { AStream->WriteBuffer(&AByte, 1); });
}

// ---------------------------------------------------------------------------------------------------- either form

AnsiString ZqBufToString(const void* ABuf, NativeUInt ASize, TZqBinEncoding AEncoding) {
  return AEncoding == beHexEncoded ? ZqBufToHex(ABuf, ASize) : ZqEncodeBase64(ABuf, ASize);
}

AnsiString ZqBufToString(const TBytes& AValue, TZqBinEncoding AEncoding) {
  return ZqBufToString(AValue.data(), AValue.size(), AEncoding);
}

AnsiString ZqBufToString(TStream* AStream, TZqBinEncoding AEncoding) {
  return AEncoding == beHexEncoded ? ZqBufToHex(AStream) : ZqEncodeBase64(AStream);
}

TBytes ZqStringToBuf(std::string_view AValue, TZqBinEncoding AEncoding) {
  return AEncoding == beHexEncoded ? ZqHexToBuf(AValue) : ZqDecodeBase64(AValue);
}

void* ZqStringToBuf(std::string_view AValue, TZqBinEncoding AEncoding, NativeUInt& ASize) {
  return AEncoding == beHexEncoded ? ZqHexToBuf(AValue, ASize) : ZqDecodeBase64(AValue, ASize);
}

void ZqStringToBuf(std::string_view AValue, TZqBinEncoding AEncoding, TStream* AStream) {
  AEncoding == beHexEncoded ? ZqHexToBuf(AValue, AStream) : ZqDecodeBase64(AValue, AStream);
}

}  // namespace zq
