#include "tests/support/support.h"

#include <gtest/gtest.h>
#include <stdlib.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <thread>

#include "runtime/text/local_time.h"

namespace zq {

void PrintTo(const UnicodeString& AText, std::ostream* AStream) { *AStream << "u\"" << AText.ToUTF8() << '"'; }

void PrintTo(const RawByteString& ABytes, std::ostream* AStream) {
  *AStream << testing::PrintToString(ABytes.Str()) << " in code page " << ABytes.CodePage();
}

TTempFolder::TTempFolder() {
  std::string Template = (std::filesystem::temp_directory_path() / "zqtest.XXXXXX").string();
  if (::mkdtemp(Template.data()) == nullptr) throw std::runtime_error("no temporary folder");
  FPath = Template;
}

TTempFolder::TTempFolder(const std::vector<const char*>& AFiles) : TTempFolder() {
  for (const char* const Name : AFiles) Write(Name, Name);
}

TTempFolder::~TTempFolder() {
  std::error_code Ignored;
  std::filesystem::remove_all(FPath, Ignored);
}

UnicodeString TTempFolder::File(std::string_view AName) const { return FromUTF8((FPath / AName).string()); }

std::vector<std::string> TTempFolder::Names() const {
  std::vector<std::string> Result;
  for (const auto& Entry : std::filesystem::directory_iterator(FPath))
    Result.push_back(Entry.path().filename().string());
  std::sort(Result.begin(), Result.end());
  return Result;
}

void TTempFolder::Write(std::string_view AName, std::string_view AContent) const {
  std::ofstream(FPath / AName, std::ios::binary) << AContent;
}

std::string TTempFolder::Read(std::string_view AName) const { return ReadFile(FPath / AName); }

TEnvironmentScope::TEnvironmentScope(const char* AName, const std::string& AValue) : FName(AName) {
  if (const char* const Saved = ::getenv(AName)) FSaved = Saved;
  ::setenv(AName, AValue.c_str(), 1);
}

TEnvironmentScope::~TEnvironmentScope() { FSaved ? ::setenv(FName, FSaved->c_str(), 1) : ::unsetenv(FName); }

TZoneScope::TZoneScope(const char* AZone) : Variable("TZ", AZone) { TTimeZone::Refresh(); }

TZoneScope::~TZoneScope() { TTimeZone::Refresh(); }

void OnThreads(int ACount, const std::function<void(int)>& ABody) {
  std::vector<std::jthread> Threads;
  for (int i = 0; i < ACount; ++i) Threads.emplace_back(ABody, i);
}

UnicodeString RaisedBy(const std::function<void()>& AAction) {
  try {
    AAction();
  } catch (const Exception& e) {
    return e.ClassName() + u": " + e.Message();
  }
  return u"nothing";
}

std::string ReadFile(const std::filesystem::path& APath) {
  std::ifstream Stream(APath, std::ios::binary);
  EXPECT_TRUE(Stream.good()) << APath;
  return {std::istreambuf_iterator<char>(Stream), {}};
}

std::vector<std::string> SplitLines(std::string_view AText) {
  std::vector<std::string> Result;
  for (;;) {
    const auto End = AText.find("\r\n");
    Result.emplace_back(AText.substr(0, End));
    if (End == std::string_view::npos) return Result;
    AText.remove_prefix(End + 2);
  }
}

}  // namespace zq
