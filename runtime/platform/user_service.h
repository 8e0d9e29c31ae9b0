#pragma once

#include <optional>

#include "runtime/core/strings.h"
#include "runtime/core/types.h"
#include "runtime/platform/service.h"

namespace zq {

/// Who runs this process, and where. Texts are empty where the system refuses.
class ZQ_API TUserService {
 public:
  static TServiceSlot<TUserService> Slot;

  [[nodiscard]] virtual UnicodeString GetComputerName() = 0;
  [[nodiscard]] virtual UnicodeString GetUserName() = 0;
  /// Name and domain of the account in the process's token. Linux: the NIS domain, else the computer's name.
  virtual void LookupTokenUser(UnicodeString& AName, UnicodeString& ADomain) = 0;

  /// The network library with the question below is there.
  [[nodiscard]] virtual bool LoadNetApi() = 0;
  /// It has that question.
  [[nodiscard]] virtual bool HasServerGetInfo() = 0;
  /// The computer's description; 0 for success. Linux: PRETTY_HOSTNAME of /etc/machine-info, empty if none is set.
  [[nodiscard]] virtual Cardinal NetServerGetInfo(UnicodeString& AComment) = 0;

 protected:
  ~TUserService() = default;
};

}  // namespace zq
