#include <dlfcn.h>
#include <sys/auxv.h>

#include "runtime/io/files.h"
#include "runtime/io/paths.h"
#include "runtime/io/streams.h"
#include "runtime/platform/resource_service.h"

namespace zq {

namespace {

Dl_info ModuleAt(const void* AInside) noexcept {
  Dl_info Result{};
  return ::dladdr(AInside, &Result) == 0 ? Dl_info{} : Result;
}

UnicodeString ModuleFile(HINST AModule) {
  const Dl_info Module = ModuleAt(AModule);
  const Dl_info Program = ModuleAt(reinterpret_cast<const void*>(::getauxval(AT_PHDR)));
  // The loader knows the program only by the words that it was called with.
  if (Module.dli_fname == nullptr || Module.dli_fbase == Program.dli_fbase) return ParamStr(0);
  return FromSystemPath(Module.dli_fname);
}

UnicodeString FolderOfType(const UnicodeString& AType) {
  static constexpr struct {
    std::u16string_view Number, Folder;
  } Known[] = {{u"#10", u"RCDATA"}, {u"#23", u"HTML"}, {u"#24", u"MANIFEST"}};
  for (const auto& Entry : Known)
    if (AType == Entry.Number) return Entry.Folder;
  return AType;
}

// Path of the entry of that name without regard to case; empty if there is none.
UnicodeString EntryOf(const UnicodeString& AFolder, const UnicodeString& AName, Integer AWantedAttr) {
  const UnicodeString Name = AName.View().substr(AName.View().starts_with(u'#') ? 1 : 0);
  TSearchRec Found;
  for (Integer Code = FindFirst(AFolder + u"/*", faAnyFile, Found); Code == 0; Code = FindNext(Found))
    if (SameText(Found.Name, Name) && (Found.Attr & faDirectory) == AWantedAttr && Name != u"." && Name != u"..")
      return AFolder + u'/' + Found.Name;
  return {};
}

UnicodeString ResourceFile(HINST AModule, const UnicodeString& AName, const UnicodeString& AType) {
  const UnicodeString Folder = EntryOf(ModuleFile(AModule) + u".resources", FolderOfType(AType), faDirectory);
  return Folder.IsEmpty() ? UnicodeString() : EntryOf(Folder, AName, 0);
}

class TLinuxResources final : public TResourceService {
 public:
  bool FindResource(HINST AModule, const UnicodeString& AName, const UnicodeString& AType) override {
    return !ResourceFile(AModule, AName, AType).IsEmpty();
  }

  std::optional<TBytes> LoadResource(HINST AModule, const UnicodeString& AName, const UnicodeString& AType) override {
    const UnicodeString File = ResourceFile(AModule, AName, AType);
    if (File.IsEmpty()) return std::nullopt;
    try {
      TFileStream Stream(File, fmOpenRead | fmShareDenyNone);
      TBytes Result(static_cast<std::size_t>(Stream.Size()));
      Stream.ReadBuffer(Result.data(), static_cast<Int64>(Result.size()));
      return Result;
    } catch (const EStreamError&) {
      return std::nullopt;
    }
  }
};

constinit TLinuxResources LinuxResources;

}  // namespace

constinit TServiceSlot<TResourceService> TResourceService::Slot(LinuxResources);

HINST HInstance() noexcept { return ModuleAt(reinterpret_cast<const void*>(&HInstance)).dli_fbase; }

}  // namespace zq
