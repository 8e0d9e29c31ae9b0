#pragma once

#include "runtime/platform/process_service.h"
#include "tests/fakes/scripted.h"

namespace zq {

struct TProcessesCalls : TProcessService {
  MOCK_METHOD(std::unique_ptr<TChildProcess>, CreateProcess, (const UnicodeString&, const UnicodeString&), (override));
  MOCK_METHOD(std::unique_ptr<TChildProcess>, CreateFreeProcess, (const UnicodeString&), (override));
  MOCK_METHOD(bool, ShellExecuteEx, (const TShellExecuteInfo&, std::unique_ptr<TChildProcess>&), (override));
  MOCK_METHOD(
      Integer, ShellExecute, (const UnicodeString&, const UnicodeString&, const UnicodeString&, Integer), (override));
  MOCK_METHOD(std::optional<Cardinal>, GetTokenInformation, (Integer), (override));
  MOCK_METHOD(TArray<tagPROCESSENTRY32W>, ProcessSnapshot, (), (override));
  MOCK_METHOD(bool, TerminateProcess, (const tagPROCESSENTRY32W&), (override));
  MOCK_METHOD(bool, RequestEnd, (const tagPROCESSENTRY32W&), (override));
  MOCK_METHOD(TArray<HWND>, EnumWindows, (), (override));
  MOCK_METHOD(Cardinal, GetWindowThreadProcessId, (HWND), (override));
  MOCK_METHOD(NativeInt, SendMessage, (HWND, Cardinal, NativeUInt, NativeInt), (override));
  MOCK_METHOD(bool, SendMessageTimeout, (HWND, Cardinal, NativeUInt, NativeInt, Cardinal, Cardinal), (override));
  MOCK_METHOD(bool, IsWindow, (HWND), (override));
  MOCK_METHOD(bool, SetWindowPos, (HWND, HWND, Integer, Integer, Integer, Integer, Cardinal), (override));
};
using TScriptedProcesses = TScripted<TProcessService, TProcessesCalls>;

}  // namespace zq
