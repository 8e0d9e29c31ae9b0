#include "common/uZqLogger/failures.h"

#include <atomic>
#include <deque>
#include <iterator>
#include <map>
#include <mutex>
#include <string>
#include <utility>

#include "common/uZqLogger/walk.h"
#include "runtime/platform/disk_service.h"
#include "runtime/text/format.h"

namespace zq {

constinit thread_local TZqLogWalk* CurrentWalk = nullptr;

namespace {

using TTold = TZqLogWalk::TTold;

constexpr int cStandardError = 2;

struct TFailing {
  Int64 Lost = 0;
  UnicodeString Error;  // the last one
};

// No call out is made under the lock.
struct TState {
  std::mutex Lock;
  std::map<std::pair<const IZqLogAppender*, UnicodeString>, TFailing> Failing;  // by appender and logger
  TZqLogFailureEvent Handler;
  std::deque<TTold> Waiting;  // for the thread that is calling
  bool Calling = false;
};
TState& State() {
  static TState& Result = *new TState;
  return Result;
}
constinit std::atomic<bool> Fails = false;  // Failing isn't empty
constinit std::atomic<bool> Shows = true;
constinit thread_local bool InHandler = false;

UnicodeString NameOf(IZqLogAppender* AAppender) {
  if (AAppender == nullptr) return {};
  const UnicodeString Result = AAppender->GetName();
  TComponent* const Component = Result.IsEmpty() ? AAppender->Component() : nullptr;
  return Component == nullptr ? Result : Component->ClassName();
}

void Show(const TZqLogFailure& AFailure) {
  UnicodeString Line = u"Logging: " + AFailure.Appender;
  if (!AFailure.Logger.IsEmpty()) Line += u" (" + AFailure.Logger + u")";
  if (AFailure.Error.IsEmpty()) Line += Format(u": writes again, %d messages were lost", {AFailure.Lost});
  else Line += u": " + AFailure.Error;
  const std::string Bytes = Line.ToUTF8() + '\n';
  Service<TDiskService>().Write(cStandardError, Bytes.data(), Bytes.size());
}

void HandOver(const TTold& ATold, const TZqLogFailureEvent& AHandler) noexcept {
  InHandler = true;
  try {
    if (AHandler) AHandler(ATold.Failure);
    else if (ATold.IsNews && Shows) Show(ATold.Failure);
  } catch (...) {  // there is nobody left to tell
  }
  InHandler = false;
}

// One call at a time: whoever is at it takes what comes meanwhile too.
void Deliver(std::vector<TTold>&& ATold) {
  TState& S = State();
  std::unique_lock Guard(S.Lock);
  std::move(ATold.begin(), ATold.end(), std::back_inserter(S.Waiting));
  if (std::exchange(S.Calling, true)) return;
  while (!S.Waiting.empty()) {
    const TTold Next = std::move(S.Waiting.front());
    S.Waiting.pop_front();
    const TZqLogFailureEvent Handler = S.Handler;
    Guard.unlock();
    HandOver(Next, Handler);
    Guard.lock();
  }
  S.Calling = false;
}

// What fails while the handler runs, of messages of its own, is counted and no more.
void Tell(TTold ATold) {
  if (InHandler) return;
  if (CurrentWalk != nullptr) return CurrentWalk->Keep(std::move(ATold));
  std::vector<TTold> Told;
  Told.push_back(std::move(ATold));
  Deliver(std::move(Told));
}

}  // namespace

void ZqSetLogFailureHandler(TZqLogFailureEvent AHandler) {
  TState& S = State();
  const std::lock_guard Guard(S.Lock);
  std::swap(S.Handler, AHandler);
}

void ZqShowLogFailures(bool AShow) noexcept { Shows = AShow; }

void ZqLogMessageLost(const UnicodeString& AError) {
  if (CurrentWalk != nullptr) CurrentWalk->SetLost(AError);
}

void ZqLogTrouble(IZqLogAppender* AAppender, const UnicodeString& AError) {
  Tell({{NameOf(AAppender), {}, AError, 0}, true});
}

void TellLost(IZqLogAppender* AAppender, const UnicodeString& ALogger, const UnicodeString& AError) {
  TTold Told{{NameOf(AAppender), ALogger, AError, 0}, true};
  {
    TState& S = State();
    const std::lock_guard Guard(S.Lock);
    TFailing& Failing = S.Failing[{AAppender, ALogger}];
    Told.Failure.Lost = ++Failing.Lost;
    Told.IsNews = std::exchange(Failing.Error, AError) != AError;
    Fails = true;
  }
  Tell(std::move(Told));
}

namespace {

Int64 TakeCount(const IZqLogAppender* AAppender, const UnicodeString& ALogger) {
  TState& S = State();
  const std::lock_guard Guard(S.Lock);
  const auto Found = S.Failing.extract({AAppender, ALogger});
  Fails = !S.Failing.empty();
  return Found ? Found.mapped().Lost : 0;
}

}  // namespace

void TellOutcome(IZqLogAppender* AAppender, const UnicodeString& ALogger, const UnicodeString& AError) {
  if (!AError.IsEmpty()) return TellLost(AAppender, ALogger, AError);
  for (IZqLogAppender* const Failed : {AAppender, static_cast<IZqLogAppender*>(nullptr)})
    if (const Int64 Lost = TakeCount(Failed, ALogger); Lost != 0) Tell({{NameOf(Failed), ALogger, {}, Lost}, true});
}

bool AnyFails() noexcept { return Fails.load(std::memory_order_relaxed); }

void ForgetFailures(const IZqLogAppender* AAppender) noexcept {
  if (!AnyFails()) return;
  TState& S = State();
  const std::lock_guard Guard(S.Lock);
  std::erase_if(S.Failing, [&](const auto& AItem) { return AItem.first.first == AAppender; });
  Fails = !S.Failing.empty();
}

// ---- Walks ---------------------------------------------------------------------------------------------------------

bool TZqLogWalk::TakesOver(TZqLogger* ALogger) {
  TZqLogWalk* Outermost = nullptr;
  for (TZqLogWalk* Walk = CurrentWalk; Walk != nullptr; Walk = Walk->FOuter)
    if (Walk->FLogger == ALogger) Outermost = Walk;
  if (Outermost != nullptr) Outermost->Notes().Ends = true;
  return Outermost != nullptr;
}

void TZqLogWalk::Finish() noexcept {
  try {
    if (FNotes->Ends) Free(FLogger);
    if (FOuter == nullptr) return Deliver(std::move(FNotes->Told));
    for (TTold& Told : FNotes->Told) FOuter->Keep(std::move(Told));
  } catch (...) {  // a log call raises nothing
  }
}

}  // namespace zq
