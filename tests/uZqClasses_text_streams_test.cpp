

#include "common/uZqClasses/text_streams.h"
#include "common/uZqSysUtils.h"
#include "common/uZqTypes.h"
#include "tests/support/support.h"

namespace zq {
namespace {

std::string BytesOf(TZqMemoryStream& AStream) { return std::string(AStream.View()); }

void Fill(TStream& AStream, std::string_view AText) {
  AStream.WriteBuffer(AText.data(), static_cast<Int64>(AText.size()));
  AStream.SetPosition(0);
}

TEST(StringStream, HoldsItsTextInItsCodePageAndGivesItInAny) {
  const std::tuple<Word, std::string> Cases[] = {{1200, std::string("a\0\xE9\0", 4)},
      {1201, std::string("\0a\0\xE9", 4)}, {1252, "a\xE9"}, {65001, "a\xC3\xA9"},
      {12000, std::string("a\0\0\0\xE9\0\0\0", 8)}};
  const TAnsiCodePageScope Ansi(1252);
  for (const auto& [Page, Bytes] : Cases) {
    TZqStringStream Stream(Page);
    Stream.SetAsString(u"aé");
    EXPECT_EQ(BytesOf(Stream), Bytes) << Page;
    EXPECT_TRUE(Stream.CharCnt() == 2 && Stream.Position() == 0) << Page;
    Stream.SetPosition(1);
    EXPECT_EQ(Stream.AsAnsiString(), "a\xE9");
    EXPECT_TRUE(Stream.AsUTF8() == "a\xC3\xA9" && Stream.AsUTF8().CodePage() == 65001 && Stream.Position() == 1);
    Stream.SetAsUTF8("\xC3\xA9"), Stream.AddChar(u'a'), Stream.AddChar('\xE9');
    EXPECT_EQ(Stream.AsString(), u"éaé") << Page;
    Stream.SetAsAnsiString("\xE9"), Stream.SetPosition(0), Stream.WriteEOF();
    EXPECT_EQ(Stream.AsString(), UnicodeString(u"é\0", 2)) << Page;
    Stream.SetValue(Variant(RawByteString("\xC3\xA9", 65001)));
    EXPECT_EQ(VarToUStr(Stream.Value()), u"é") << Page;
    EXPECT_EQ(RaisedBy([&] { Stream.SetValue(7); }), u"Exception: Unsupported type 3!");
  }
  TZqStringStream Wide = TZqStringStream::CreateEx(u"abc"), Utf8 = TZqStringStream::CreateEx("\xC3\xA9");
  EXPECT_TRUE(Wide.Size() == 6 && Wide.CharCnt() == 3 && Wide.Position() == 0);
  EXPECT_TRUE(Utf8.Size() == 2 && Utf8.CharCnt() == 1 && Utf8.StringData(1252) == "\xE9");
}

TEST(StringStream, AddOverwritesFromThePositionAndAddCharGoesToTheEnd) {
  TZqStringStream Stream(65001);
  Stream.SetAsString(u"abcdef");
  Stream.Add(u"é");
  EXPECT_TRUE(Stream.AsString() == u"écdef" && Stream.Position() == 6);
  Stream.SetPosition(0), Stream.Add(AnsiString("xy"), 65001), Stream.SetPosition(0), Stream.AddChar(u'!');
  EXPECT_TRUE(Stream.AsString() == u"xycdef!" && Stream.Position() == 7);
  Stream.SetPosition(1), Stream.Add(TZqStringStream::CreateEx(AnsiString("\xE9"), 1252));
  EXPECT_EQ(Stream.AsString(), u"xédef!");
  Stream.Write(UnicodeString(100, u'é'));
  EXPECT_EQ(Stream.Size(), 207);
}

TEST(StringStream, ReadsWholeCharactersWhereverTheirBytesWouldBeCut) {
  const TAnsiCodePageScope Ansi(1252);
  for (const Word Page : std::initializer_list<Word>{1200, 1201, 12000, 65001, 932, 54936, 1252}) {
    SCOPED_TRACE(Page);
    const bool HasKana = Page != 1252;
    TZqStringStream Stream(Page);
    Stream.SetAsString(HasKana ? u"aあiうb" : u"aéiöb");
    const UnicodeString Text = Stream.AsString();
    for (std::size_t Length = 0; Length <= 6; ++Length) {
      Stream.SetPosition(0);
      EXPECT_EQ(Stream.ReadWString(Length), Text.View().substr(0, Length)) << Length;
      for (std::size_t i = Length; i < Text.size(); ++i) EXPECT_EQ(Stream.ReadWChar(), Text.View()[i]) << Length;
      EXPECT_TRUE(Stream.ReadWChar() == 0 && Stream.ReadAChar() == 0 && Stream.ReadAString(3) == "");
      EXPECT_EQ(Stream.Position(), Stream.Size());
    }
    Stream.SetPosition(0);
    EXPECT_EQ(Stream.ReadAChar(), 'a');
    EXPECT_EQ(Stream.ReadAChar(), HasKana ? '?' : '\xE9');
    EXPECT_TRUE(Stream.ReadAString(1) == "i" && Stream.ReadString(-1) == u"" && Stream.ReadChar() == Text[4]);
  }
  TZqStringStream Own = TZqStringStream::CreateEx(AnsiString("\xE9xyz"), 0);
  EXPECT_TRUE(Own.ReadAChar() == '\xE9' && Own.ReadAString(2) == "xy" && Own.ReadAString(9) == "z");
  const TAnsiCodePageScope LongAnsi(65001);
  TZqStringStream Latin = TZqStringStream::CreateEx(AnsiString("\xE9\xE9z"), 1252);
  EXPECT_TRUE(Latin.ReadAString(2) == "\xC3\xA9\xC3\xA9" && Latin.ReadAChar() == 'z');
}

TEST(StringStream, APairIsReadInHalvesAndABrokenEndIsNotLeft) {
  for (const Word Page : std::initializer_list<Word>{65001, 1200, 1201, 0}) {
    TZqStringStream Stream(Page);
    Stream.SetAsString(u"😀z");
    EXPECT_TRUE(Stream.ReadWChar() == 0xD83D && Stream.ReadWChar() == 0xDE00 && Stream.ReadWChar() == 'z') << Page;
    Stream.SetPosition(0);
    EXPECT_TRUE(Stream.ReadWString(1) == u"\xD83D" && Stream.ReadWString(2) == u"\xDE00z") << Page;
  }
  TZqStringStream Broken = TZqStringStream::CreateEx("a\xF0\x9F");
  EXPECT_TRUE(Broken.ReadWString(9) == u"a\xFFFD" && Broken.Position() == 3);
}

TEST(StringStream, CodePageChangesRelabelOrConvertAndLoseNothing) {
  TZqStringStream Stream = TZqStringStream::CreateEx(AnsiString("\xC3\xA9"), 1252);
  const UnicodeString NoRelabel = u"Exception: The current codepage cannot be changed without updating the content!";
  EXPECT_EQ(RaisedBy([&] { Stream.ChangeCodePage(1200, false); }), NoRelabel);
  EXPECT_THROW(Stream.ChangeCodePage(709, true), EOSError);  // there is no character data
  EXPECT_TRUE(Stream.CodePage() == 1252 && Stream.AsString() == u"Ã©");
  Stream.ChangeCodePage(65001, false);
  EXPECT_TRUE(Stream.AsString() == u"é" && Stream.CharCnt() == 1);
  Stream.ChangeCodePage(1200, true);
  EXPECT_TRUE(Stream.View() == std::string_view("\xE9\0", 2) && Stream.Position() == 2);
  EXPECT_EQ(RaisedBy([&] { Stream.ChangeCodePage(1252, false); }), NoRelabel);
  char Block[] = "ab";
  TZqStringStream Wrapped = TZqStringStream::WrapBuffer(Block, 2, 1252);
  EXPECT_EQ(RaisedBy([&] { Wrapped.ChangeCodePage(1200, true); }),
      u"Exception: Updating the content is not allowed (the stream is probably using a wrapped buffer)!");
  EXPECT_EQ(RaisedBy([&] { Wrapped.SetAsString(u"x"); }), u"Exception: It is not possible to resize the buffer!");
  Wrapped.Rewrap(Block, 0, 1252), Wrapped.ChangeCodePage(1200, true);
  Stream.Rewrap(Block, 2, 65001), Stream.SetPosition(1);  // its own block goes
  TZqStringStream Copy;
  Copy.Assign(Stream), Copy.Assign(Copy);
  EXPECT_TRUE(Copy.AsString() == u"ab" && Copy.CodePage() == 65001 && Copy.Position() == 1 && Stream.Position() == 1);
}

// Notes its end.
struct TOwnedStream : TZqMemoryStream {
  TOwnedStream(std::string_view AText, int& AEnds) : TZqMemoryStream(16), Ends(AEnds) { Fill(*this, AText); }
  ~TOwnedStream() override { ++Ends; }
  int& Ends;
};

TEST(StringStream, LoadsByMarkOrByNumberAndSaves) {
  const UnicodeString Mismatch = u"Exception: The specified encoding does not match the BOM of the stream!";
  const UnicodeString None = u"nothing";
  const std::tuple<Word, std::string, bool, Integer, std::string, UnicodeString> Cases[] = {
      {0, "\xEF\xBB\xBF\xC3\xA9", true, -1, "|\xE9", None}, {0, "\xEF\xBB\xBF", true, 1200, "|", Mismatch},
      {0, "\xEF\xBB\xBF", true, 0, "|", Mismatch}, {0, "\xEF\xBB\xBFx", false, -1, "|\xEF\xBB\xBFx", None},
      {0, "\xC3\xA9", true, 65001, "|\xE9", None}, {1200, "\xFF\xFE\xE9z", true, -1, "|\xE9z", None},
      {1200, "\xFF\xFE", true, -1, "|", None}, {65001, "\xE9", true, -1, "|\xC3\xA9", None}};
  const TAnsiCodePageScope Ansi(1252);
  const TTempFolder Folder;
  int Ends = 0;
  for (const auto& [Page, Bytes, ReadBOM, SourcePage, Result, Raises] : Cases) {
    TZqStringStream Stream(Page);
    Stream.Write("|", 1);
    const auto Load = [&, b = Bytes, r = ReadBOM, p = SourcePage] {
      Stream.LoadFromStream(new TOwnedStream(b, Ends), true, false, r, p);
    };
    EXPECT_TRUE(RaisedBy(Load) == Raises && BytesOf(Stream) == Result) << Page << ' ' << Bytes;
  }
  EXPECT_EQ(Ends, static_cast<int>(std::size(Cases)));
  for (const auto& [Page, Bytes] : std::map<Word, std::string>{{0, "\xE9"}, {1200, std::string("\xFF\xFE\xE9\0", 4)},
           {65001, "\xEF\xBB\xBF\xC3\xA9"}, {1201, std::string("\xFE\xFF\0\xE9", 4)}}) {
    TZqStringStream Stream(Page), Again(1200);
    Stream.SetAsString(u"é"), Stream.SaveToFile(Folder.File("a"));
    EXPECT_EQ(Folder.Read("a"), Bytes);
    Again.LoadFromFile(Folder.File("a")), Again.LoadFromFile(Folder.File("a"));
    EXPECT_EQ(Again.AsString(), u"éé") << "the second is added";
    Again.SaveToFile(Folder.File("a"), Page, false);
    EXPECT_EQ(Folder.Read("a").size(), 2 * Stream.View().size());
  }
  EXPECT_EQ(RaisedBy([] { TZqStringStream().LoadFromFile(u"/no/a"); }), u"EFOpenError: File /no/a not found.");
}

// ---- UTF-8 adapter and whole streams

TEST(Utf8Adapter, ReadsUnitsAndTellsWhatIsNoUtf8) {
  const UnicodeString Invalid = u"Exception: The stream does not contain valid UTF-8 code!";
  const std::tuple<std::string, UnicodeString, UnicodeString, Int64> Cases[] = {
      {"a\xC3\xA9\xE2\x82\xAC", u"aé€", u"nothing", 6}, {"\x80z", u"", Invalid, 1},
      {"a\xC3", u"a", Invalid + u"\r\nThere are 1 or 2 bytes missing!", 2},
      {"\xE2", u"", Invalid + u"\r\nThere are 1 or 2 bytes missing!", 1},
      {"\xE2\x82", u"", Invalid + u"\r\nThere is 1 byte missing!", 2}, {"\xF0\x9F\x98\x80", u"\x07D8", Invalid, 4}};
  for (const auto& [Bytes, Text, Raised, Position] : Cases) {
    TZqMemoryStream Wrapped(16);
    Fill(Wrapped, Bytes);
    TZqUTF8StreamAdapter Adapter(&Wrapped);
    char16_t Units[8] = {};
    EXPECT_TRUE(Adapter.Read(Units, 1) == 0 && Wrapped.Position() == 0);
    Integer Count = -1;
    EXPECT_EQ(RaisedBy([&] { Count = Adapter.Read(Units, sizeof(Units)); }), Raised);
    EXPECT_TRUE(Units == Text.View() && Wrapped.Position() == Position) << Bytes;
    EXPECT_EQ(Count, Raised == u"nothing" ? 2 * Text.Length() : -1);
    EXPECT_EQ(Adapter.Seek(3, soBeginning), 2);
  }
}

TEST(Utf8Adapter, PutsTheMarkOnceAheadOfWhatItWrites) {
  int Ends = 0;
  auto* const Wrapped = new TOwnedStream("", Ends);
  auto Adapter = std::make_unique<TZqUTF8StreamAdapter>(Wrapped, true);
  EXPECT_TRUE(Adapter->Write(u"", 0) == 0 && !Adapter->WriteUTF8Prefix());
  EXPECT_TRUE(Adapter->Write(u"é😀", 7) == 7 && Adapter->Write(u"a", 1) == 1);
  EXPECT_EQ(BytesOf(*Wrapped), "\xEF\xBB\xBF\xC3\xA9😀");
  Adapter.reset();
  EXPECT_EQ(Ends, 1);
}

TEST(WholeStreams, BecomeStringsByMarkOrByNumber) {
  const std::tuple<std::string, bool, Integer, UnicodeString> Cases[] = {
      {std::string("\xFF\xFE\x41\0", 4), true, -1, u"A"}, {"\xEF\xBB\xBF\x41", false, 1200, u"\xBBEF\x41BF"},
      {"\xEF\xBB\xBF\xC3\xA9", true, -1, u"é"}, {"\xE9", true, 1252, u"é"}, {std::string("A\0B", 3), true, -1, u"A"}};
  const TTempFolder Folder;
  for (const auto& [Source, ReadBOM, Page, Text] : Cases) {
    Folder.Write("a", "!" + Source);
    TFileStream File(Folder.File("a"), fmOpenRead);
    TZqMemoryStream Zq(16);
    Fill(Zq, "!" + Source);
    for (TStream* const Stream : std::initializer_list<TStream*>{&File, &Zq}) {
      Stream->SetPosition(1);
      EXPECT_EQ(ZqStreamToWideString(Stream, false, false, ReadBOM, Page), Text);
    }
  }
  int Ends = 0;
  const auto Owned = [&](std::string_view AText) { return new TOwnedStream(AText, Ends); };
  const UnicodeString Mismatch = u"Exception: The specified encoding does not match the BOM of the stream!";
  EXPECT_EQ(RaisedBy([&] { (void)ZqStreamToString(Owned("\xEF\xBB\xBF\x41"), true, true, true, 0); }), Mismatch);
  EXPECT_EQ(ZqStreamToAnsiString(Owned("\xEF\xBB\xBF\x41"), true, true, true, 65001, 65001), RawByteString("A"));
  EXPECT_EQ(ZqStreamToAnsiString(Owned("\xC3\xA9"), true, true, true, 65001, 1252).CodePage(), 1252);
  EXPECT_EQ(Ends, 3);
  const std::unique_ptr<TStream> Kept(Owned("a"));
  EXPECT_EQ(RaisedBy([&] { (void)ZqStreamToAnsiString(Kept.get(), true, true, true, 0, 1201); }),
      u"Exception: The specified encoding is not supported!");
  EXPECT_EQ(Ends, 3);
}

TEST(WholeStreams, GoFromUtf16ToUtf8AndBack) {
  for (const std::size_t Length : {0U, 1U, 511U, 512U, 513U}) {
    const UnicodeString Text = UnicodeString(Length, u'a') + u"é€";
    TZqMemoryStream Wide(16), Utf8(16), Back(16);
    Wide.WriteByte(7);  // what is behind it lies at odd addresses
    Wide.Write(Text.data(), 2 * Text.Length());
    Wide.WriteByte(7);
    Wide.SetPosition(1), ZqUTF8EncodeStream(&Wide, &Utf8, true);
    EXPECT_EQ(BytesOf(Utf8), "\xEF\xBB\xBF" + Text.ToUTF8());
    Utf8.SetPosition(0), ZqUTF8DecodeStream(&Utf8, &Back);
    EXPECT_EQ(Back.View(), std::string_view(reinterpret_cast<const char*>(Text.data()), 2 * Text.size()));
    Utf8.SetPosition(0);
    EXPECT_EQ(ZqUTF8Decode(&Utf8), Text);
    Back.SetPosition(0);
    const UnicodeString NoUnicode = u"EConvertError: The sourcestream does not contain unicode data!";
    EXPECT_EQ(RaisedBy([&] { (void)ZqUTF8Decode(&Back); }), NoUnicode);
  }
}

TEST(TextFiles, AreWrittenInTheirCodePageAndReadByTheirMark) {
  const TTempFolder Folder;
  const UnicodeString File = Folder.File("f");
  const auto Bytes = [&](auto... AArguments) { return ZqSaveString(File, AArguments...), Folder.Read("f"); };
  EXPECT_EQ(
      Bytes(WideString(u"ü€"), Word{1252}, true) + Bytes(AnsiString("\xFC"), Word{1252}, -1, false), "\xFC\x80\xFC");
  EXPECT_EQ(Bytes(AnsiString("\xFC"), Word{1252}, 65001, true) + Bytes(UTF8String("ü")), "\xEF\xBB\xBFü\xEF\xBB\xBFü");
  EXPECT_EQ(ZqLoadStringFromFile(File, fmOpenRead), u"ü");
  EXPECT_EQ(Bytes(WideString(u"ü"), Word{1200}, true), std::string("\xFF\xFE\xFC\0", 4));
  EXPECT_EQ(ZqLoadStringFromFile(File, fmOpenRead) + ZqFindResource(u"NONE", 65001, RT_RCDATA), u"ü");
  EXPECT_THROW((void)ZqGetResource(u"NONE", 65001, RT_RCDATA), Exception);
}

}  // namespace
}  // namespace zq
