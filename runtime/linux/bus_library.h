#pragma once

#include <dlfcn.h>

#include <cstdint>

namespace zq {

struct sd_bus;
struct sd_bus_message;

/// The bus library's functions that are used, under its own names, for the Linux feeders. Each answers with a negative
/// errno for a failure. A connection belongs to one thread at a time.
class TBusLibrary {
 public:
  /// Null where there is no such library; once loaded, it stays.
  [[nodiscard]] static const TBusLibrary* Get() {
    static const TBusLibrary Result;
    return Result.FHandle == nullptr ? nullptr : &Result;
  }
  /// Has every function.
  [[nodiscard]] bool IsWhole() const noexcept { return FWhole; }

  int (*sd_bus_open_system)(sd_bus** AResult);
  int (*sd_bus_set_method_call_timeout)(sd_bus* ABus, std::uint64_t AMicroseconds);
  sd_bus* (*sd_bus_flush_close_unref)(sd_bus* ABus);
  int (*sd_bus_get_fd)(sd_bus* ABus);
  /// Above 0 where it has done something; AMessage is what came, if that is nobody else's.
  int (*sd_bus_process)(sd_bus* ABus, sd_bus_message** AMessage);
  int (*sd_bus_call_method)(sd_bus* ABus, const char* ADestination, const char* APath, const char* AInterface,
      const char* AMember, void* AError, sd_bus_message** AReply, const char* ATypes, ...);
  int (*sd_bus_message_is_signal)(sd_bus_message* AMessage, const char* AInterface, const char* AMember);
  const char* (*sd_bus_message_get_path)(sd_bus_message* AMessage);
  const char* (*sd_bus_message_get_sender)(sd_bus_message* AMessage);
  /// 0 at the end. Texts are the message's.
  int (*sd_bus_message_read)(sd_bus_message* AMessage, const char* ATypes, ...);
  int (*sd_bus_message_skip)(sd_bus_message* AMessage, const char* ATypes);
  int (*sd_bus_message_enter_container)(sd_bus_message* AMessage, char AType, const char* AContents);
  int (*sd_bus_message_exit_container)(sd_bus_message* AMessage);
  sd_bus_message* (*sd_bus_message_unref)(sd_bus_message* AMessage);

 private:
  TBusLibrary() noexcept {
    for (const char* const Name : {"libsystemd.so.0", "libelogind.so.0"})
      if (FHandle == nullptr) FHandle = ::dlopen(Name, RTLD_NOW | RTLD_LOCAL);
    if (FHandle == nullptr) return;
    Find("sd_bus_open_system", sd_bus_open_system);
    Find("sd_bus_set_method_call_timeout", sd_bus_set_method_call_timeout);
    Find("sd_bus_flush_close_unref", sd_bus_flush_close_unref);
    Find("sd_bus_get_fd", sd_bus_get_fd);
    Find("sd_bus_process", sd_bus_process);
    Find("sd_bus_call_method", sd_bus_call_method);
    Find("sd_bus_message_is_signal", sd_bus_message_is_signal);
    Find("sd_bus_message_get_path", sd_bus_message_get_path);
    Find("sd_bus_message_get_sender", sd_bus_message_get_sender);
    Find("sd_bus_message_read", sd_bus_message_read);
    Find("sd_bus_message_skip", sd_bus_message_skip);
    Find("sd_bus_message_enter_container", sd_bus_message_enter_container);
    Find("sd_bus_message_exit_container", sd_bus_message_exit_container);
    Find("sd_bus_message_unref", sd_bus_message_unref);
  }

  template <class TFunction>
  void Find(const char* AName, TFunction*& AFunction) noexcept {
    AFunction = reinterpret_cast<TFunction*>(::dlsym(FHandle, AName));
    FWhole = FWhole && AFunction != nullptr;
  }

  void* FHandle = nullptr;
  bool FWhole = true;
};

}  // namespace zq
