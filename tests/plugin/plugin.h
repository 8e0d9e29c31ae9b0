#pragma once

#include "runtime/core/delegates.h"
#include "runtime/core/interfaces.h"

namespace zq::plugin {

struct IEcho : Extends<IInterface> {
  static constexpr TGUID IID = "{6C1B9E0D-52E3-4F0A-9D0B-3B0C6B3F2A11}"_guid;
  virtual UnicodeString Echo(const UnicodeString& AText) = 0;
};
// Bears its parent's GUID, so a query gives the parent and the reference is cast on, here across two libraries.
struct IEchoEx : Extends<IEcho> {
  static constexpr TGUID IID = IEcho::IID;
  virtual UnicodeString EchoTwice(const UnicodeString& AText) = 0;
};

using TCallback = TMethod<UnicodeString(const UnicodeString&)>;

// What the library under the path ZQ_TEST_PLUGIN exports, in this order.
struct TEntries {
  TInterfacedObject* (*Make)();
  void (*Raise)(const char16_t* AMessage);
  UnicodeString (*Call)(const TCallback& ACallback, const UnicodeString& AText);
  ExceptionClass (*ClassOfRaised)();
};

}  // namespace zq::plugin
