#include "common/uZqLogAppenders/base.h"

#include <utility>

#include "common/uZqLogAppenders/internal.h"

namespace zq {

void TZqBaseAppender::AfterConstruction() {
  Implements::AfterConstruction();
  if (const auto Config = Logger()->Configurator()) SetConfig(Config);
}

void TZqBaseAppender::BeforeDestruction() {
  LeaveLists();  // first: a message behind the footer would open the file again
  try {
    Close();
  } catch (const Exception&) {  // the last bytes can't be written: the file is closed, and the appender goes
  }
  Implements::BeforeDestruction();
}

IntfRef<IZqLogLayout> TZqBaseAppender::Layout() const {
  const TScope Scope(FLock);
  return FLayout;
}

void TZqBaseAppender::Initialize() { FInitialized = true; }

void TZqBaseAppender::Close() { FInitialized = false; }

void TZqBaseAppender::SetConfig(const IntfRef<IZqLogConfigurator>& AConfig) {
  if (!AConfig) return;
  const UnicodeString Layout = Configured(*AConfig, *this, u"Layout", mtkString, u"", VarToUStr);
  if (!Layout.IsEmpty()) SetLayout(ShortString(Layout.ToUTF8()));
}

void TZqBaseAppender::SetLayout(const IntfRef<IZqLogLayout>& ALayout) {
  auto Bytes = ALayout.Supports<IZqLogByteLayout>();  // first: it asks the layout, which may raise
  if (FWriting != 0) FFormer.insert(FFormer.end(), {FLayout, FByteLayout});
  FLayout = ALayout;
  FByteLayout = std::move(Bytes);
  if (const auto Told = ALayout.Supports<_IZqLogLayout>()) Told->Initialize(this);
}

void TZqBaseAppender::SetLayout(TZqLogBaseClass ALayout) {
  const IntfRef<IZqLogBase> Made(ALayout.Create(Logger(), ALayout.ClassName()));
  SetLayout(Made.As<IZqLogLayout>());
}

void TZqBaseAppender::SetLayout(const TText& ALayout) { SetLayout(RegisteredLayouts()->GetClass(ALayout)); }

}  // namespace zq
