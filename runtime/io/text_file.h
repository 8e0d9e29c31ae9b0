#pragma once

#include <atomic>
#include <string>
#include <string_view>

#include "runtime/core/api.h"
#include "runtime/core/exceptions.h"
#include "runtime/core/objects.h"
#include "runtime/core/strings.h"

namespace zq {

/// Text file for writing, bound to a name and a code page, with lines ended by CR LF.
///
/// Every write is one system call that carries the text and its line end, appending to whatever the file holds then;
/// nothing is buffered here. A failed step raises EInOutError, whose ErrorCode is errno. After a write that reached the
/// file in part (disk full), now or in an earlier run, the next one begins with a line end, so that a torn line never
/// swallows it.
/// One thread at a time.
class ZQ_API TTextFile : public TObject {
 public:
  TTextFile() noexcept = default;
  /// Closes; a failure to do so stays silent here.
  ~TTextFile() override;

  /// Names the file; an open one is closed first. ACodePage is one in which ASCII stands for itself; 0 is the ANSI one.
  void Assign(const UnicodeString& AFileName, Word ACodePage = 65001);
  /// Makes the file new and empty, and opens it.
  void Rewrite();
  /// Opens the file, which must exist, to go on at its end.
  void Append();
  /// The same, but a missing file is made. Nothing that another writer put there in the meantime is lost.
  void AppendOrCreate();
  void Write(const UnicodeString& AText);
  void WriteLn(const UnicodeString& AText = {});
  /// The file ends in the middle of a line, and the next write begins with a line end: behind a write that got through
  /// in part, or where AppendOrCreate found it so.
  [[nodiscard]] bool IsTorn() const noexcept { return FTorn; }
  /// The next write stands directly behind what is there.
  void GoOnInLine() noexcept { FTorn = false; }
  /// The file was opened by the process that this one was forked from.
  [[nodiscard]] bool IsInherited() const noexcept;
  /// False where another appends to the file too, and has claimed it.
  [[nodiscard]] bool Claim();
  /// Ready bytes, line ends and all, as they are.
  void WriteBytes(std::string_view ABytes);
  /// Nothing to do but to raise on a file that isn't open: each write has gone to the system.
  void Flush();
  /// Nothing on a closed file. Raises where the system tells of lost data; the file is closed even so.
  void Close();

  [[nodiscard]] bool IsOpen() const noexcept { return FHandle >= 0; }
  [[nodiscard]] const UnicodeString& FileName() const noexcept { return FFileName; }
  /// Bytes that have reached the file since it was opened; failed writes count what they got through. Any thread.
  [[nodiscard]] Int64 Written() const noexcept { return FWritten.load(std::memory_order_relaxed); }

 private:
  void Open(int AFlags, const char16_t* AStep);
  void WriteText(std::u16string_view AText, std::string_view ALineEnd);
  void Put(std::string_view ABytes);
  void RequireOpen() const;
  [[noreturn]] void Fail(const char16_t* AStep, int AError) const;

  UnicodeString FFileName;
  std::string FLong;  // room for texts that the stack doesn't take; kept for the next one
  std::atomic<Int64> FWritten = 0;
  int FHandle = -1;
  int FProcess = 0;  // that opened it
  Word FCodePage = 65001;
  bool FTorn = false;
};

}  // namespace zq
