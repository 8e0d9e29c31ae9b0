#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>

#include "common/uZqLogger/failures.h"
#include "runtime/platform/resource_service.h"
#include "tests/fakes/event_log.h"
#include "tests/fakes/processes.h"
#include "tests/fakes/registry.h"
#include "tests/support/logging.h"

namespace zq {
namespace {

using testing::_, testing::Return;

// In an administrator's process.
struct EventLog : testing::Test, TLoggerFixture {
  EventLog() {
    EXPECT_CALL(Processes, GetTokenInformation(_)).WillRepeatedly([this](Integer) { return Elevation; });
  }
  Cardinal Elevation = 2;
  TScriptedProcesses Processes;
  TScriptedEventLog System;
  TScriptedRegistry Registry;
};

TEST_F(EventLog, LevelsBecomeTypesAndIdsAndWhatIsNotTakenIsCounted) {
  std::string Events, Lost;
  EXPECT_CALL(System, RegisterEventSourceW(FromUTF8(program_invocation_short_name))).WillOnce(Return(5));
  EXPECT_CALL(System, RegisterEventSourceW(UnicodeString(u"a b"))).WillOnce(Return(0)).WillOnce(Return(6));
  EXPECT_CALL(System, DeregisterEventSource(5));
  EXPECT_CALL(System, DeregisterEventSource(6));
  EXPECT_CALL(System, ReportEventW(6, _, _, _)).WillRepeatedly([&](auto, Word AType, Cardinal AId, const auto& AText) {
    Events += std::to_string(AType) + std::to_string(AId) + ' ';
    return AText.Pos(u"refused") == 0;
  });
  const IntfRef<TZqEventLogAppender> Appender(New<TZqEventLogAppender>(Logger(), u"Shop"));
  Log->AddAppender(Appender);
  Log->Error(u"without a layout");
  Appender->SetLayout("TZqSimpleLayout");
  ZqSetLogFailureHandler([&](const TZqLogFailure& AFailure) { Lost += std::to_string(AFailure.Lost) + ' '; });
  Appender->RegisterLogger(u"a b");
  Log->Error(u"without a source");
  Appender->RegisterLogger(u"a b");
  Log->Error(u"refused");
  for (int Level = 0; Level <= static_cast<int>(llDoNotLog); ++Level) Log->Log(static_cast<TZqLogLevel>(Level), u"x");
  Log->ClearAppenders();
  ZqSetLogFailureHandler(nullptr);
  EXPECT_EQ(Events, "14 42 42 42 01 23 14 14 ");
  EXPECT_EQ(Lost, "1 2 2 ");
}

TEST_F(EventLog, AdministratorsEnterSourcesOnce) {
  const UnicodeString Folder = u"HKLM\\SYSTEM\\CurrentControlSet\\Services\\Eventlog\\Application\\";
  Registry.Keys[Folder + u"Known"];
  EXPECT_CALL(System, RegisterEventSourceW(_)).Times(4).WillRepeatedly(Return(0));
  for (const char16_t* const Name : {u"Known", u"Shop", u"Limited", u"Raising"}) {
    Elevation = *Name == u'L' ? 3 : 2;
    Registry.IsReadOnly = *Name == u'R';
    New<TZqEventLogAppender>(Logger(), Name)->Free();
  }
  EXPECT_EQ(Registry.Keys.size(), 3U);
  EXPECT_TRUE(Registry.Keys[Folder + u"Known"].empty());
  EXPECT_EQ(Registry.Keys[Folder + u"Shop"][u"TypesSupported"].second, (TBytes{7, 0, 0, 0}));
  EXPECT_EQ(Registry.Keys[Folder + u"Shop"][u"EventMessageFile"].second[0], '/');
}

TEST(EventLogMessages, AreAResourceOfTheLibrary) {
  const auto Table = Service<TResourceService>().LoadResource(HInstance(), u"#1", RT_MESSAGETABLE);
  ASSERT_EQ(Table.has_value(), ZQ_TEST_STATIC == 0);
  const std::u16string_view Texts(
      Table ? reinterpret_cast<const Char*>(Table->data()) : u"", Table ? Table->size() / 2 : 0);
  EXPECT_TRUE(!Table || Texts.find(u"Here is id6 information message\r\n") != Texts.npos);
}

// Where the system has a journal, tests/system_log/journal asks that; this one has its protocol everywhere.
TEST(EventLogFeeder, LineBreaksStandBehindALengthAndNoneIsInASource) {
  const TTempFolder Folder;
  sockaddr_un Address{AF_UNIX, {}};
  (Folder.Path() / "journal").string().copy(Address.sun_path, sizeof Address.sun_path - 1);
  const int Socket = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  ASSERT_EQ(::bind(Socket, reinterpret_cast<sockaddr*>(&Address), sizeof Address), 0);
  SetEventLogSockets(Address.sun_path, "/none");
  TEventLogService& System = Service<TEventLogService>();
  const NativeUInt Source = System.RegisterEventSourceW(u"a\nb");
  SetEventLogSockets("/run/systemd/journal/socket", "/dev/log");
  EXPECT_TRUE(System.ReportEventW(Source, EVENTLOG_WARNING_TYPE, 3, u"1\n"));
  char Data[200];
  EXPECT_EQ(std::string(Data, static_cast<std::size_t>(::recv(Socket, Data, sizeof Data, MSG_DONTWAIT))),
      "PRIORITY=4\nSYSLOG_IDENTIFIER=a_b\nEVENT_TYPE=warning\nEVENT_ID=3\nMESSAGE\n\2" + std::string(7, '\0') +
          "1\n\n");
  while (System.ReportEventW(Source, EVENTLOG_SUCCESS, 1, u"unread")) continue;
  EXPECT_EQ(GetLastError(), Cardinal{EAGAIN});
  EXPECT_TRUE(System.DeregisterEventSource(Source) && ::close(Socket) == 0);
}

}  // namespace
}  // namespace zq
