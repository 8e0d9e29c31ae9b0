#pragma once

#include <memory>
#include <utility>
#include <vector>

#include "common/uZqLogger/failures.h"

/// For the modules of the log alone.
namespace zq {

class TZqLogWalk;
// Initial-exec: no call where a shared library would otherwise make one.
__attribute__((tls_model("initial-exec"))) extern constinit thread_local TZqLogWalk* CurrentWalk;

/// A log call, or an operation of an appender, under way on this thread; they nest. An operation opens one before it
/// takes its lock: what is told of failures meanwhile is passed on at the end of the outermost, when all are left.
class TZqLogWalk {
 public:
  explicit TZqLogWalk(TZqLogger* ALogger = nullptr) noexcept : FLogger(ALogger), FOuter(CurrentWalk) {
    CurrentWalk = this;
  }
  TZqLogWalk(const TZqLogWalk&) = delete;
  TZqLogWalk& operator=(const TZqLogWalk&) = delete;
  ~TZqLogWalk() {
    CurrentWalk = FOuter;
    if (FNotes != nullptr) [[unlikely]]
      Finish();
  }

  /// True where a call of ALogger is under way on this thread: the outermost such call ends it then.
  static bool TakesOver(TZqLogger* ALogger);
  struct TTold {
    TZqLogFailure Failure;
    bool IsNews;  // for standard error
  };
  void Keep(TTold ATold) { Notes().Told.push_back(std::move(ATold)); }
  /// The message isn't written, for that reason; TakeLost tells it once, and is empty otherwise.
  void SetLost(const UnicodeString& AError) { Notes().Lost = AError; }
  [[nodiscard]] UnicodeString TakeLost() { return FNotes == nullptr ? u"" : std::exchange(FNotes->Lost, {}); }
  /// Whether there is anything to take or to tell.
  [[nodiscard]] bool HasNotes() const noexcept { return FNotes != nullptr; }

 private:
  // What few calls have, apart from what each has to fill.
  struct TNotes {
    std::vector<TTold> Told;
    UnicodeString Lost;
    bool Ends = false;  // the logger, with the call
  };
  TNotes& Notes() {
    if (FNotes == nullptr) FNotes = std::make_unique<TNotes>();
    return *FNotes;
  }
  void Finish() noexcept;

  TZqLogger* FLogger;
  TZqLogWalk* FOuter;
  std::unique_ptr<TNotes> FNotes;
};

/// AAppender couldn't write a message of ALogger.
void TellLost(IZqLogAppender* AAppender, const UnicodeString& ALogger, const UnicodeString& AError);
/// The same with an error; without one it has written the message, and what that ends of its failures is told.
void TellOutcome(IZqLogAppender* AAppender, const UnicodeString& ALogger, const UnicodeString& AError);
/// Whether any appender has lost its last message.
[[nodiscard]] bool AnyFails() noexcept;
/// What is known of AAppender's failures goes with it.
void ForgetFailures(const IZqLogAppender* AAppender) noexcept;

}  // namespace zq
