#include "common/uZqSessionEvents.h"

#include "runtime/sync/critical_section.h"
#include "runtime/sync/message_window.h"
#include "runtime/text/numbers.h"
#include "runtime/values/values.h"
#include "tests/fakes/sessions.h"

namespace zq {
namespace {

using testing::_;
using testing::Return;

constexpr const char16_t* cRegister = u"WTSRegisterSessionNotification";
constexpr const char16_t* cUnregister = u"WTSUnRegisterSessionNotification";
auto Named(const char16_t* AName) {
  return testing::ResultOf([](const char16_t* AText) { return UnicodeString(AText); }, UnicodeString(AName));
}

/// A system on which all succeeds, which remembers the window.
class TWillingSessions : public testing::NiceMock<TSessionsCalls> {
 public:
  TWillingSessions() {
    ON_CALL(*this, LoadLibrary).WillByDefault(Return(true));
    ON_CALL(*this, GetProcAddress).WillByDefault(Return(true));
    ON_CALL(*this, WTSRegisterSessionNotification).WillByDefault([this](HWND AWindow, Cardinal) {
      Window = AWindow;
      return true;
    });
  }
  HWND Window = 0;

 private:
  const TPlatformOverride<TSessionService> FSeat{*this};
};

/// Gives each published callback of AEvents, but for those of the end, one that writes its name and what it was told.
void Listen(TZqSessionEvents* AEvents, UnicodeString& ALog) {
  for (const PPropInfo Property : GetPropList(AEvents)) {
    const auto Tell = [&ALog, AEvents, Property](TObject* ASender, const UnicodeString& AMore) {
      EXPECT_EQ(ASender, AEvents);
      ALog += Property->Name + AMore;
    };
    if (Property->PropType == TypeInfo<TZqSessionEvent>())
      Property->SetValue(AEvents, TValue::From(TZqSessionEvent([Tell](TObject* ASender, NativeUInt AID) {
        Tell(ASender, u" " + IntToStr(static_cast<Int64>(AID)));
      })));
    if (Property->PropType == TypeInfo<TNotifyEvent>())
      Property->SetValue(AEvents, TValue::From(TNotifyEvent([Tell](TObject* ASender) { Tell(ASender, u""); })));
  }
}

struct TSessionEvents : testing::Test {
  TWillingSessions System;
  UnicodeString Log;
  TOwned<TZqSessionEvents> Events{New<TZqSessionEvents>(nullptr)};
  /// What the callbacks wrote, and the answer.
  UnicodeString Send(Cardinal AMessage, NativeUInt AWParam, NativeInt ALParam = 0) {
    const NativeInt Answer = SendMessage(System.Window, AMessage, AWParam, ALParam);
    return std::exchange(Log, u"") + u" = " + IntToStr(static_cast<Int64>(Answer));
  }
};

TEST_F(TSessionEvents, FollowTheTables) {
  Listen(Events.get(), Log);
  Events->SetActive(true);
  const std::tuple<Cardinal, NativeUInt, const char16_t*> Cases[] = {{689, 0, u" = 1"},
      {689, 1, u"OnConsoleConnect 7 = 1"}, {689, 2, u"OnConsoleDisconnect 7 = 1"}, {689, 3, u"OnRemoteConnect 7 = 1"},
      {689, 4, u"OnRemoteDisconnect 7 = 1"}, {689, 5, u"OnSessionLogon 7 = 1"}, {689, 6, u"OnSessionLogoff 7 = 1"},
      {689, 7, u"OnSessionLock 7 = 1"}, {689, 8, u"OnSessionUnlock 7 = 1"}, {689, 9, u"OnSessionRemoteControl 7 = 1"},
      {689, 10, u"OnSessionCreate 7 = 1"}, {689, 11, u"OnSessionTerminate 7 = 1"}, {689, 12, u" = 1"},
      {536, 4, u"OnSuspend = 1"}, {536, 5, u" = 1"}, {536, 7, u"OnResumeSuspend = 1"},
      {536, 10, u"OnPowerStatusChange = 1"}, {536, 18, u"OnResumeAutomatic = 1"},
      {536, 0x8013, u"OnPowerSettingChange = 1"}, {17, 0, u" = 1"}, {22, 1, u" = 0"}, {16, 1, u" = 0"}};
  for (const auto& [Message, Param, Expected] : Cases)
    EXPECT_EQ(Send(Message, Param, 7), Expected) << Message << ' ' << Param;
  EXPECT_EQ(GetEnumName(TypeInfo<TZqSessionEventType>(), static_cast<Integer>(*TranslateSessionEvent(11))),
      u"seSessionTerminate");
  EXPECT_EQ(
      GetEnumName(TypeInfo<TZqPowerEventType>(), static_cast<Integer>(*TranslatePowerEvent(7))), u"peResumeSuspend");
}

TEST_F(TSessionEvents, TellAndAskOfTheEnd) {
  bool Allowed = true;
  Events->SetOnQueryEndSession([&](TObject*, const TZqEndSessionTypes& ATypes, bool& ACanEnd) {
    Log += IntToStr(ATypes.ToInteger()) + (ACanEnd ? u"?" : u"!");
    ACanEnd = Allowed;
  });
  Events->SetOnEndSession([&](TObject*, bool AEnding, const TZqEndSessionTypes& ATypes) {
    Log += IntToStr(ATypes.ToInteger()) + (AEnding ? u" ends" : u" stays");
  });
  Events->SetActive(true);
  EXPECT_EQ(Send(17, 0, 0xC0000001), u"7? = 1");
  Allowed = false;
  EXPECT_EQ(Send(17, 1, 0x40000000), u"2? = 0");
  EXPECT_EQ(Send(22, 0, 0x80000000), u"4 stays = 0");
  EXPECT_EQ(Send(22, 1, 0x3FFFFFFE), u"0 ends = 0");
}

TEST(SessionRegistration, IsMadeOnceAndUndoneOnce) {
  TScriptedSessions System;
  TOwned<TZqSessionEvents> Events(New<TZqSessionEvents>(nullptr));
  Events->SetActive(false);
  HWND Window = 0;
  testing::InSequence Order;
  EXPECT_CALL(System, StartSystemMessages(_)).WillOnce(testing::SaveArg<0>(&Window));
  EXPECT_CALL(System, LoadLibrary).WillOnce(Return(true));
  EXPECT_CALL(System, GetProcAddress(Named(cRegister))).WillOnce(Return(true));
  EXPECT_CALL(System, WTSRegisterSessionNotification(_, 1)).WillOnce(Return(true));
  EXPECT_CALL(System, FreeLibrary);
  EXPECT_CALL(System, LoadLibrary).WillOnce(Return(true));
  EXPECT_CALL(System, GetProcAddress(Named(cUnregister))).WillOnce(Return(true));
  EXPECT_CALL(System, WTSUnRegisterSessionNotification(testing::Eq(testing::ByRef(Window)))).WillOnce(Return(false));
  EXPECT_CALL(System, FreeLibrary);
  EXPECT_CALL(System, StopSystemMessages(testing::Eq(testing::ByRef(Window))));
  Events->SetScope(nsAllSessions);
  Events->SetActive(true);
  Events->SetScope(nsThisSession);
  Events->SetActive(true);
  EXPECT_TRUE(IsWindow(Window));
  Events.reset();
  EXPECT_FALSE(IsWindow(Window));
}

TEST_F(TSessionEvents, AreRefusedInTheToldWords) {
  EXPECT_CALL(System, LoadLibrary).WillOnce(Return(false)).WillRepeatedly(Return(true));
  EXPECT_CALL(System, GetProcAddress(Named(cRegister))).WillOnce(Return(false)).WillRepeatedly(Return(true));
  EXPECT_CALL(System, FreeLibrary).Times(2);
  EXPECT_CALL(System, WTSRegisterSessionNotification(_, 0)).WillOnce([](HWND, Cardinal) {
    SetLastError(5);
    return false;
  });
  HWND Window = 0;
  EXPECT_CALL(System, StartSystemMessages(_)).WillRepeatedly(testing::SaveArg<0>(&Window));
  EXPECT_CALL(System, StopSystemMessages(testing::Eq(testing::ByRef(Window)))).Times(3);
  for (const char16_t* const Words : {u"Exception: Failed to load the Wtsapi32.dll!",
           u"Exception: Failed to locate the WTSRegisterSessionNotification function!",
           u"EOSError: System Error.  Code: 5"}) {
    EXPECT_EQ(RaisedBy([&] { Events->SetActive(true); }), Words);
    EXPECT_FALSE(Events->Active() || IsWindow(Window));
  }
}

TEST(SessionRegistration, EndsSilentlyWithoutTheLibraryOrItsFunction) {
  TScriptedSessions System;
  EXPECT_CALL(System, LoadLibrary).WillOnce(Return(false)).WillOnce(Return(true));
  EXPECT_CALL(System, GetProcAddress(Named(cUnregister))).WillOnce(Return(false));
  EXPECT_CALL(System, FreeLibrary);
  for (int i = 0; i < 2; ++i) WTSUnRegisterSessionNotification(1);
}

TEST(CurrentSession, IsThatOfTheProcessOrNone) {
  TScriptedSessions System;
  EXPECT_CALL(System, ProcessIdToSessionId(GetCurrentProcessId())).WillOnce(Return(3)).WillOnce(Return(std::nullopt));
  EXPECT_EQ(GetCurrentSessionID(), 3U);
  EXPECT_EQ(GetCurrentSessionID(), 0U);
}

TEST_F(TSessionEvents, MayFreeTheComponentWithinAndRaise) {
  const TOwned<TZqSessionEvents> Other(New<TZqSessionEvents>(nullptr));
  Other->SetOnSuspend([&](TObject*) { Log += u"other"; });
  Other->SetActive(true);
  const HWND OthersWindow = System.Window;
  Events->SetOnQueryEndSession([&](TObject*, const TZqEndSessionTypes&, bool& ACanEnd) {
    Events.reset();
    ACanEnd = false;
  });
  Events->SetActive(true);
  EXPECT_EQ(Send(17, 0), u" = 0");
  EXPECT_EQ(RaisedBy([&] { Send(536, 4); }),
      u"ECallRefused: The window " + IntToStr(static_cast<Int64>(System.Window)) + u" is gone");
  System.Window = OthersWindow;
  EXPECT_EQ(Send(536, 4), u"other = 1");
  Other->SetOnSuspend([](TObject*) { throw EAbort(u"stop"); });
  ASSERT_TRUE(PostMessage(System.Window, 536, 4, 0));
  EXPECT_EQ(RaisedBy([] { ProcessMessages(); }), u"EAbort: stop");
}

}  // namespace
}  // namespace zq
