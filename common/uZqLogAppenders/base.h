#pragma once

#include <vector>

#include "common/uZqLogger.h"

namespace zq {

/// State machine under all appenders: opened by the first Write, closed by Close, opened again by the next Write.
///
/// Without a layout an appender takes every message and writes nothing. Lock and Unlock keep its operations apart, also
/// when several loggers share it: those of this class take no lock, a descendant's hold FLock around them. Its end
/// closes it; an appender that can't write its last bytes goes all the same.
class ZQ_API TZqBaseAppender : public Implements<TZqLogBase, IZqLogAppender, IZqLogAppenderEx> {
 public:
  using Implements::Implements;
  [[nodiscard]] IntfRef<IZqLogLayout> Layout() const;

  /// Opens what the appender writes to; the first Write does so too. Raises what the opening raises.
  virtual void Initialize();
  /// Takes what AConfig tells of the appender's name; null changes nothing. Raises EListError for a layout that nobody
  /// has registered, and what the conversion of a value raises.
  virtual void SetConfig(const IntfRef<IZqLogConfigurator>& AConfig);
  /// Initialises the appender if need be; a descendant calls it first and then writes.
  void Write(const UnicodeString&, const UnicodeString&, TZqLogLevel, const UnicodeString&, PZqDataRec,
      TZqLogIndent) override {
    if (!FInitialized && FInitializing == 0) Initialize();
  }
  void Close() override;
  /// An empty reference takes the layout away.
  void SetLayout(const IntfRef<IZqLogLayout>& ALayout) override;
  void SetLayout(TZqLogBaseClass ALayout) override;
  void SetLayout(const TText& ALayout) override;

  /// Several operations as one; other threads' messages wait meanwhile. May be nested.
  void Lock() const noexcept { FLock.Enter(); }
  void Unlock() const noexcept { FLock.Leave(); }

 protected:
  ~TZqBaseAppender() override = default;
  void AfterConstruction() override;
  void BeforeDestruction() override;

  // For descendants: Initialize and the end of a file run in this scope. A message from within, of a layout that logs,
  // goes into the file that is there; nothing is opened, rolled or closed for it.
  class TInitializing {
   public:
    explicit TInitializing(TZqBaseAppender& AAppender) noexcept : FAppender(AAppender) { ++FAppender.FInitializing; }
    TInitializing(const TInitializing&) = delete;
    TInitializing& operator=(const TInitializing&) = delete;
    ~TInitializing() { --FAppender.FInitializing; }

   private:
    TZqBaseAppender& FAppender;
  };
  // For descendants: a message is written in this scope. A layout that SetLayout replaces from within stays to its end.
  class TWriting {
   public:
    explicit TWriting(TZqBaseAppender& AAppender) noexcept : FAppender(AAppender) { ++FAppender.FWriting; }
    TWriting(const TWriting&) = delete;
    TWriting& operator=(const TWriting&) = delete;
    ~TWriting() {
      if (--FAppender.FWriting == 0 && !FAppender.FFormer.empty()) FAppender.FFormer.clear();
    }

   private:
    TZqBaseAppender& FAppender;
  };
  using TScope = TLockScope<TCriticalSection>;

  // These two are changed by SetLayout alone. The second is the first's way of writing bytes, empty if it has none.
  IntfRef<IZqLogLayout> FLayout;
  IntfRef<IZqLogByteLayout> FByteLayout;
  bool FInitialized = false;
  Integer FInitializing = 0;  // depth of TInitializing
  mutable TCriticalSection FLock;

 private:
  Integer FWriting = 0;  // depth of TWriting
  std::vector<IntfRef<IInterface>> FFormer;
};

}  // namespace zq
