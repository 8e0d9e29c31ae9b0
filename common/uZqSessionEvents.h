#pragma once

#include <cstdint>
#include <optional>
#include <utility>

#include "runtime/component/component.h"
#include "runtime/core/api.h"
#include "runtime/core/delegates.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/types.h"

/// Sessions, power and the end of the session as events.
namespace zq {

namespace uZqSessionEvents {
ZQ_API void Start();
ZQ_API void Stop();
}  // namespace uZqSessionEvents

/// Which sessions a registration covers, as it is passed to the system.
enum class TZqNotificationScope : std::uint8_t { nsThisSession, nsAllSessions };
using enum TZqNotificationScope;

enum class TZqSessionEventType : std::uint8_t {
  seConnect,
  seDisconnect,
  seRemoteConnect,
  seRemoteDisconnect,
  seSessionLogon,
  seSessionLogoff,
  seSessionLock,
  seSessionUnlock,
  seSessionRemoteControl,
  seSessionCreate,
  seSessionTerminate
};
using enum TZqSessionEventType;

enum class TZqPowerEventType : std::uint8_t {
  peSuspend,
  peResumeAutomatic,
  peResumeSuspend,
  pePowerStatusChange,
  pePowerSettingChange
};
using enum TZqPowerEventType;

enum class TZqEndSessionType : std::uint8_t { esCloseApp, esCritical, esLogoff };
using enum TZqEndSessionType;
using TZqEndSessionTypes = TSet<TZqEndSessionType>;

using TZqSessionEvent = TMethod<void(TObject* ASender, NativeUInt ASessionID)>;
/// ACanEnd comes as true.
using TZqOnQueryEndSessionEvent = TMethod<void(TObject* ASender, const TZqEndSessionTypes& AEndTypes, bool& ACanEnd)>;
/// AEnding is false where the end has been called off.
using TZqOnEndSessionEvent = TMethod<void(TObject* ASender, bool AEnding, const TZqEndSessionTypes& AEndTypes)>;

// What the parameters of the messages mean.

/// Of the first one of WM_WTSSESSION_CHANGE; nothing outside of 1 to 11.
[[nodiscard]] ZQ_API std::optional<TZqSessionEventType> TranslateSessionEvent(NativeUInt AParam) noexcept;
/// Of the first one of WM_POWERBROADCAST; nothing for one that is no event here.
[[nodiscard]] ZQ_API std::optional<TZqPowerEventType> TranslatePowerEvent(NativeUInt AParam) noexcept;
/// Of the second one of WM_QUERYENDSESSION and WM_ENDSESSION.
[[nodiscard]] ZQ_API TZqEndSessionTypes TranslateEndTypes(NativeInt AParam) noexcept;

/// Starts WM_WTSSESSION_CHANGE for a window. Raises Exception where the system tells of no sessions, EOSError where it
/// refuses.
ZQ_API void WTSRegisterSessionNotification(HWND AWindow, TZqNotificationScope AScope);
/// Nothing where there is nothing to end.
ZQ_API void WTSUnRegisterSessionNotification(HWND AWindow);
/// Of this process; 0 where the system has none.
[[nodiscard]] ZQ_API Cardinal GetCurrentSessionID();

/// Tells of sessions, power and the end of the session while it is active.
///
/// Callbacks run on the thread that activated it, out of its loop (RunMessageLoop, ProcessMessages): a thread without
/// one hears nothing. What they raise comes out of the loop. They may deactivate and free the component. Making and
/// ending components and hearing them all belong to one thread, or the host keeps them apart.
///
/// On Linux the end of the session is that of the system, and no answer to the query can hold it up for longer than the
/// login manager waits for the callbacks; no active component should belong to a thread that leaves its loop alone.
class ZQ_API TZqSessionEvents : public TComponent {
 public:
  explicit TZqSessionEvents(TComponent* AOwner);

  [[nodiscard]] bool Active() const noexcept { return FActive; }
  /// Raises what WTSRegisterSessionNotification raises, and stays inactive then.
  void SetActive(bool AValue);
  [[nodiscard]] TZqNotificationScope Scope() const noexcept { return FScope; }
  /// Takes effect at the next activation.
  void SetScope(TZqNotificationScope AValue) noexcept { FScope = AValue; }

  [[nodiscard]] const TZqSessionEvent& OnConsoleConnect() const noexcept { return FOnConsoleConnect; }
  [[nodiscard]] const TZqSessionEvent& OnConsoleDisconnect() const noexcept { return FOnConsoleDisconnect; }
  [[nodiscard]] const TZqSessionEvent& OnRemoteConnect() const noexcept { return FOnRemoteConnect; }
  [[nodiscard]] const TZqSessionEvent& OnRemoteDisconnect() const noexcept { return FOnRemoteDisconnect; }
  [[nodiscard]] const TZqSessionEvent& OnSessionLogon() const noexcept { return FOnSessionLogon; }
  [[nodiscard]] const TZqSessionEvent& OnSessionLogoff() const noexcept { return FOnSessionLogoff; }
  [[nodiscard]] const TZqSessionEvent& OnSessionLock() const noexcept { return FOnSessionLock; }
  [[nodiscard]] const TZqSessionEvent& OnSessionUnlock() const noexcept { return FOnSessionUnlock; }
  [[nodiscard]] const TZqSessionEvent& OnSessionRemoteControl() const noexcept { return FOnSessionRemoteControl; }
  [[nodiscard]] const TZqSessionEvent& OnSessionCreate() const noexcept { return FOnSessionCreate; }
  [[nodiscard]] const TZqSessionEvent& OnSessionTerminate() const noexcept { return FOnSessionTerminate; }
  [[nodiscard]] const TNotifyEvent& OnPowerStatusChange() const noexcept { return FOnPowerStatusChange; }
  [[nodiscard]] const TNotifyEvent& OnResumeAutomatic() const noexcept { return FOnResumeAutomatic; }
  [[nodiscard]] const TNotifyEvent& OnResumeSuspend() const noexcept { return FOnResumeSuspend; }
  [[nodiscard]] const TNotifyEvent& OnSuspend() const noexcept { return FOnSuspend; }
  [[nodiscard]] const TNotifyEvent& OnPowerSettingChange() const noexcept { return FOnPowerSettingChange; }
  [[nodiscard]] const TZqOnQueryEndSessionEvent& OnQueryEndSession() const noexcept { return FOnQueryEndSession; }
  [[nodiscard]] const TZqOnEndSessionEvent& OnEndSession() const noexcept { return FOnEndSession; }

  void SetOnConsoleConnect(TZqSessionEvent AValue) noexcept { FOnConsoleConnect = std::move(AValue); }
  void SetOnConsoleDisconnect(TZqSessionEvent AValue) noexcept { FOnConsoleDisconnect = std::move(AValue); }
  void SetOnRemoteConnect(TZqSessionEvent AValue) noexcept { FOnRemoteConnect = std::move(AValue); }
  void SetOnRemoteDisconnect(TZqSessionEvent AValue) noexcept { FOnRemoteDisconnect = std::move(AValue); }
  void SetOnSessionLogon(TZqSessionEvent AValue) noexcept { FOnSessionLogon = std::move(AValue); }
  void SetOnSessionLogoff(TZqSessionEvent AValue) noexcept { FOnSessionLogoff = std::move(AValue); }
  void SetOnSessionLock(TZqSessionEvent AValue) noexcept { FOnSessionLock = std::move(AValue); }
  void SetOnSessionUnlock(TZqSessionEvent AValue) noexcept { FOnSessionUnlock = std::move(AValue); }
  void SetOnSessionRemoteControl(TZqSessionEvent AValue) noexcept { FOnSessionRemoteControl = std::move(AValue); }
  void SetOnSessionCreate(TZqSessionEvent AValue) noexcept { FOnSessionCreate = std::move(AValue); }
  void SetOnSessionTerminate(TZqSessionEvent AValue) noexcept { FOnSessionTerminate = std::move(AValue); }
  void SetOnPowerStatusChange(TNotifyEvent AValue) noexcept { FOnPowerStatusChange = std::move(AValue); }
  void SetOnResumeAutomatic(TNotifyEvent AValue) noexcept { FOnResumeAutomatic = std::move(AValue); }
  void SetOnResumeSuspend(TNotifyEvent AValue) noexcept { FOnResumeSuspend = std::move(AValue); }
  void SetOnSuspend(TNotifyEvent AValue) noexcept { FOnSuspend = std::move(AValue); }
  void SetOnPowerSettingChange(TNotifyEvent AValue) noexcept { FOnPowerSettingChange = std::move(AValue); }
  void SetOnQueryEndSession(TZqOnQueryEndSessionEvent AValue) noexcept { FOnQueryEndSession = std::move(AValue); }
  void SetOnEndSession(TZqOnEndSessionEvent AValue) noexcept { FOnEndSession = std::move(AValue); }

 protected:
  ~TZqSessionEvents() override;
  void AfterConstruction() override;
  void BeforeDestruction() override;
  void EndRefused() noexcept override;
  // These four call the callback that fits, if it is assigned; after their parent's call an override must not touch the
  // component, which may be gone.
  /// AEvent is the first parameter of WM_WTSSESSION_CHANGE.
  virtual void TriggerWtsEvent(Integer AEvent, Cardinal ASessionID);
  /// AEvent is the first parameter of WM_POWERBROADCAST.
  virtual void TriggerPwrEvent(Integer AEvent);
  virtual void TriggerQesEvent(const TZqEndSessionTypes& AEndTypes, bool& ACanEnd);
  virtual void TriggerEndSessionEvent(bool AEnding, const TZqEndSessionTypes& AEndTypes);
  void CloseHandle();

 private:
  static TZqSessionEvents* Find(HWND AHandle) noexcept;
  static NativeInt WindowProc(HWND AHandle, Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam);

  HWND FHandle = 0;  // 0 while inactive
  bool FActive = false;
  TZqNotificationScope FScope = nsThisSession;
  TZqSessionEvent FOnConsoleConnect, FOnConsoleDisconnect, FOnRemoteConnect, FOnRemoteDisconnect, FOnSessionLogon,
      FOnSessionLogoff, FOnSessionLock, FOnSessionUnlock, FOnSessionRemoteControl, FOnSessionCreate,
      FOnSessionTerminate;
  TNotifyEvent FOnPowerStatusChange, FOnResumeAutomatic, FOnResumeSuspend, FOnSuspend, FOnPowerSettingChange;
  TZqOnQueryEndSessionEvent FOnQueryEndSession;
  TZqOnEndSessionEvent FOnEndSession;
};

}  // namespace zq
