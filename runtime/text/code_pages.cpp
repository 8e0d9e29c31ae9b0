#include "runtime/text/code_pages.h"

#include <algorithm>
#include <limits>

#include "runtime/core/strings.h"

namespace zq {

// --------------------------------------------------------------------------------------------- table

namespace {

using enum TPageKind;
using enum TAsciiUse;
using enum TMapping::TWay;

constexpr TCharacterData ICU(const char* AConverter) noexcept { return {TCharacterData::ICU, AConverter}; }

constexpr TCharacterData CLibrary(const char* ACharset) noexcept { return {TCharacterData::CLibrary, ACharset}; }

// Of several tables for a page the rows name the nearest one; what is left is told here.
constexpr TMapping cMicro[] = {{0xE6, 0x00B5}};
constexpr TMapping c720[] = {
    {0x80, 0x80}, {0x81, 0x81}, {0x84, 0x84}, {0x86, 0x86}, {0x8D, 0x8D}, {0x8E, 0x8E}, {0x8F, 0x8F}, {0x90, 0x90}};
constexpr TMapping c852[] = {{0xAA, 0x00AC}};
constexpr TMapping c864[] = {{0xD7, 0xFEC1}, {0xD8, 0xFEC5}, {0xF1, 0x0651}};
constexpr TMapping c869[] = {{0x88, 0x00B7}, {0xEF, 0x0384}};
constexpr TMapping c875[] = {{0xDC, 0x1A, OnlyDecodes}, {0xE1, 0x1A, OnlyDecodes}, {0xEC, 0x1A, OnlyDecodes},
    {0xED, 0x1A, OnlyDecodes}, {0xFC, 0x1A, OnlyDecodes}, {0xFD, 0x1A, OnlyDecodes}};
constexpr TMapping c932[] = {{0x80, 0x0080}, {0xA0, 0xF8F0}, {0xFD, 0xF8F1}, {0xFE, 0xF8F2}, {0xFF, 0xF8F3},
    {0x8191, 0x00A2, OnlyEncodes}, {0x8192, 0x00A3, OnlyEncodes}, {0x81CA, 0x00AC, OnlyEncodes}};
constexpr TMapping c1026[] = {{0x9A, 0x00AA}};
constexpr TMapping c1361[] = {{0xD9E8, 0xFFFD, OnlyDecodes}};
constexpr TMapping cMacCyrillic[] = {{0xA2, 0x00A2}, {0xB6, 0x2202}, {0xFF, 0x00A4}};
constexpr TMapping cMacRomanian[] = {
    {0xAE, 0x0102}, {0xAF, 0x015E}, {0xBE, 0x0103}, {0xBF, 0x015F}, {0xDE, 0x0162}, {0xDF, 0x0163}};
constexpr TMapping cMacUkrainian[] = {{0xFF, 0x00A4}};
constexpr TMapping cMacIcelandic[] = {
    {0xA0, 0x00DD}, {0xDC, 0x00D0}, {0xDD, 0x00F0}, {0xDE, 0x00DE}, {0xDF, 0x00FE}, {0xE0, 0x00FD}};
constexpr TMapping cMacCroatian[] = {{0xA9, 0x0160}, {0xAE, 0x017D}, {0xB4, 0x2206}, {0xB9, 0x0161}, {0xBE, 0x017E},
    {0xC6, 0x0106}, {0xC8, 0x010C}, {0xD0, 0x0110}, {0xD8, 0xF8FF}, {0xD9, 0x00A9}, {0xDE, 0x00C6}, {0xDF, 0x00BB},
    {0xE0, 0x2013}, {0xE6, 0x0107}, {0xE8, 0x010D}, {0xF0, 0x0111}, {0xF9, 0x03C0}, {0xFA, 0x00CB}, {0xFD, 0x00CA},
    {0xFE, 0x00E6}};
constexpr TMapping c20833[] = {{0x0E, 0x0E}, {0x0F, 0x0F}};  // its data is the half of a page that shifts by these
constexpr TMapping cApostrophe[] = {{0xA3A7, 0xFF07}};

// By number. Of several tables for a page these are the ones with its mappings of the platform's own, user-defined
// ranges and C1 controls included. 708 is served by the table of the standard that it follows, 57006 by that of the
// script that it shares. The blanks at the end of two names belong there. 42 and 50229 have no name at all.
constexpr TCodePage cPages[] = {
    {37, SingleByte, Foreign, 1, ICU("ibm-37_P100-1995"), u"IBM037"},
    {42, Symbol, Foreign, 1, {}},
    {437, SingleByte, Plain, 1, ICU("ibm-437_P100-1995"), u"IBM437", {}, cMicro},
    {500, SingleByte, Foreign, 1, ICU("ibm-500_P100-1995"), u"IBM500"},
    {708, SingleByte, Plain, 1, ICU("ibm-1089_P100-1995"), u"ASMO-708"},
    {709, SingleByte, Plain, 1, {}, u"ASMO-709"},
    {710, SingleByte, Plain, 1, {}, u"DOS-710"},
    {720, SingleByte, Plain, 1, ICU("ibm-720_P100-1997"), u"DOS-720", {}, c720},
    {737, SingleByte, Plain, 1, ICU("ibm-737_P100-1997"), u"ibm737"},
    {775, SingleByte, Plain, 1, ICU("ibm-775_P100-1996"), u"ibm775"},
    {850, SingleByte, Plain, 1, ICU("ibm-850_P100-1995"), u"ibm850"},
    {852, SingleByte, Plain, 1, ICU("ibm-852_P100-1995"), u"ibm852", {}, c852},
    {855, SingleByte, Plain, 1, ICU("ibm-855_P100-1995"), u"IBM855"},
    {857, SingleByte, Plain, 1, ICU("ibm-857_P100-1995"), u"ibm857"},
    {858, SingleByte, Plain, 1, ICU("ibm-858_P100-1997"), u"IBM00858"},
    {860, SingleByte, Plain, 1, ICU("ibm-860_P100-1995"), u"IBM860", {}, cMicro},
    {861, SingleByte, Plain, 1, ICU("ibm-861_P100-1995"), u"ibm861", {}, cMicro},
    {862, SingleByte, Plain, 1, ICU("ibm-862_P100-1995"), u"DOS-862", {}, cMicro},
    {863, SingleByte, Plain, 1, ICU("ibm-863_P100-1995"), u"IBM863", {}, cMicro},
    {864, SingleByte, Plain, 1, ICU("ibm-864_X110-1999"), u"IBM864", {}, c864},
    {865, SingleByte, Plain, 1, ICU("ibm-865_P100-1995"), u"IBM865", {}, cMicro},
    {866, SingleByte, Plain, 1, ICU("ibm-866_P100-1995"), u"cp866|ibm866"},
    {869, SingleByte, Plain, 1, ICU("ibm-869_P100-1995"), u"ibm869", {}, c869},
    {870, SingleByte, Foreign, 1, ICU("ibm-870_P100-1995"), u"IBM870"},
    {874, SingleByte, Plain, 1, ICU("windows-874-2000"), u"windows-874"},
    {875, SingleByte, Foreign, 1, ICU("ibm-875_P100-1995"), u"cp875", {}, c875},
    {932, MultiByte, Plain, 2, ICU("ibm-943_P15A-2003"),
        u"shift_jis|cseucpkdfmtjapanese|csshiftjis|extended_unix_code_packed_format_for_japanese|ms_kanji |"
        u"shift-jis|x-euc|x-euc-jp|x-sjis",
        {}, c932},
    {936, MultiByte, Plain, 2, ICU("windows-936-2000"),
        u"gb2312|chinese|csgb2312 |csiso58gb231280|gb_2312-80|iso-ir-58"},
    {949, MultiByte, Plain, 2, ICU("windows-949-2000"),
        u"ks_c_5601-1987|cseuckr|csksc56011987|iso-ir-149|korean|ks-c-5601|ks-c-5601-1987|ks_c_5601|ks_c_5601-1989|"
        u"ksc-5601|ksc5601|ksc_5601"},
    {950, MultiByte, Plain, 2, ICU("windows-950-2000"), u"big5|csbig5|x-x-big5"},
    {1026, SingleByte, Foreign, 1, ICU("ibm-1026_P100-1995"), u"IBM1026", {}, c1026},
    {1047, SingleByte, Foreign, 1, ICU("ibm-1047_P100-1995"), u"IBM01047"},
    {1140, SingleByte, Foreign, 1, ICU("ibm-1140_P100-1997"), u"IBM01140"},
    {1141, SingleByte, Foreign, 1, ICU("ibm-1141_P100-1997"), u"IBM01141"},
    {1142, SingleByte, Foreign, 1, ICU("ibm-1142_P100-1997"), u"IBM01142"},
    {1143, SingleByte, Foreign, 1, ICU("ibm-1143_P100-1997"), u"IBM01143"},
    {1144, SingleByte, Foreign, 1, ICU("ibm-1144_P100-1997"), u"IBM01144"},
    {1145, SingleByte, Foreign, 1, ICU("ibm-1145_P100-1997"), u"IBM01145"},
    {1146, SingleByte, Foreign, 1, ICU("ibm-1146_P100-1997"), u"IBM01146"},
    {1147, SingleByte, Foreign, 1, ICU("ibm-1147_P100-1997"), u"IBM01147"},
    {1148, SingleByte, Foreign, 1, ICU("ibm-1148_P100-1997"), u"IBM01148"},
    {1149, SingleByte, Foreign, 1, ICU("ibm-1149_P100-1997"), u"IBM01149"},
    {1200, Utf16, Foreign, 2, ICU("UTF-16LE"), u"utf-16|ucs-2|iso-10646-ucs-2", cUTF16LEMark},
    {1201, Utf16, Foreign, 2, ICU("UTF-16BE"), u"unicodeFFFE", cUTF16BEMark},
    {1250, SingleByte, Plain, 1, ICU("ibm-5346_P100-1998"), u"windows-1250|x-cp1250"},
    {1251, SingleByte, Plain, 1, ICU("ibm-5347_P100-1998"), u"windows-1251|x-cp1251"},
    {1252, SingleByte, Plain, 1, ICU("ibm-5348_P100-1997"),
        u"windows-1252|ansi_x3.4-1968|ansi_x3.4-1986|ascii|cp367|cp819|csascii|ibm367|ibm819|iso-ir-100|iso-ir-6|"
        u"iso646-us|iso8859-1|iso_646.irv:1991|iso_8859-1|iso_8859-1:1987|latin1|us"},
    {1253, SingleByte, Plain, 1, ICU("ibm-5349_P100-1998"), u"windows-1253"},
    {1254, SingleByte, Plain, 1, ICU("ibm-5350_P100-1998"), u"windows-1254"},
    {1255, SingleByte, Plain, 1, ICU("ibm-9447_P100-2002"),
        u"windows-1255|csisolatinhebrew|hebrew|iso-ir-138|iso_8859-8|iso_8859-8:1988"},
    {1256, SingleByte, Plain, 1, ICU("ibm-9448_X100-2005"), u"windows-1256"},
    {1257, SingleByte, Plain, 1, ICU("ibm-9449_P100-2002"), u"windows-1257"},
    {1258, SingleByte, Plain, 1, ICU("ibm-5354_P100-1998"), u"windows-1258"},
    {1361, MultiByte, Plain, 2, CLibrary("JOHAB"), u"Johab", {}, c1361},
    {10000, SingleByte, Plain, 1, ICU("macos-0_2-10.2"), u"macintosh"},
    {10001, MultiByte, Plain, 2, {}, u"x-mac-japanese"},
    {10002, MultiByte, Plain, 2, {}, u"x-mac-chinesetrad"},
    {10003, MultiByte, Plain, 2, {}, u"x-mac-korean"},
    {10004, SingleByte, Plain, 1, {}, u"x-mac-arabic"},
    {10005, SingleByte, Plain, 1, {}, u"x-mac-hebrew"},
    {10006, SingleByte, Plain, 1, ICU("macos-6_2-10.4"), u"x-mac-greek"},
    {10007, SingleByte, Plain, 1, ICU("macos-7_3-10.2"), u"x-mac-cyrillic", {}, cMacCyrillic},
    {10008, MultiByte, Plain, 2, {}, u"x-mac-chinesesimp"},
    {10010, SingleByte, Plain, 1, ICU("macos-0_2-10.2"), u"x-mac-romanian", {}, cMacRomanian},
    {10017, SingleByte, Plain, 1, ICU("macos-7_3-10.2"), u"x-mac-ukrainian", {}, cMacUkrainian},
    {10021, SingleByte, Plain, 1, {}, u"x-mac-thai"},
    {10029, SingleByte, Plain, 1, ICU("macos-29-10.2"), u"x-mac-ce"},
    {10079, SingleByte, Plain, 1, ICU("macos-0_2-10.2"), u"x-mac-icelandic", {}, cMacIcelandic},
    {10081, SingleByte, Plain, 1, ICU("macos-35-10.2"), u"x-mac-turkish"},
    {10082, SingleByte, Plain, 1, ICU("macos-0_2-10.2"), u"x-mac-croatian", {}, cMacCroatian},
    {12000, Utf32, Foreign, 4, ICU("UTF-32LE"), u"utf-32", cUTF32LEMark},
    {12001, Utf32, Foreign, 4, ICU("UTF-32BE"), u"utf-32BE", cUTF32BEMark},
    {20000, MultiByte, Plain, 2, {}, u"x-Chinese_CNS"},
    {20001, MultiByte, Plain, 2, {}, u"x-cp20001"},
    {20002, MultiByte, Plain, 2, {}, u"x_Chinese-Eten"},
    {20003, MultiByte, Plain, 2, {}, u"x-cp20003"},
    {20004, MultiByte, Plain, 2, {}, u"x-cp20004"},
    {20005, MultiByte, Plain, 2, {}, u"x-cp20005"},
    {20105, SingleByte, Plain, 1, CLibrary("ISO_646.IRV:1991"), u"x-IA5"},
    {20106, SingleByte, Foreign, 1, CLibrary("ISO646-DE"), u"x-IA5-German"},
    {20107, SingleByte, Foreign, 1, CLibrary("ISO646-SE2"), u"x-IA5-Swedish"},
    {20108, SingleByte, Foreign, 1, CLibrary("ISO646-NO"), u"x-IA5-Norwegian"},
    {20127, SingleByte, Plain, 1, ICU("US-ASCII"), u"us-ascii"},
    {20261, MultiByte, Foreign, 2, CLibrary("T.61-8BIT"), u"x-cp20261"},
    {20269, MultiByte, Plain, 2, CLibrary("ISO_6937"), u"x-cp20269"},
    {20273, SingleByte, Foreign, 1, ICU("ibm-273_P100-1995"), u"IBM273"},
    {20277, SingleByte, Foreign, 1, ICU("ibm-277_P100-1995"), u"IBM277"},
    {20278, SingleByte, Foreign, 1, ICU("ibm-278_P100-1995"), u"IBM278"},
    {20280, SingleByte, Foreign, 1, ICU("ibm-280_P100-1995"), u"IBM280"},
    {20284, SingleByte, Foreign, 1, ICU("ibm-284_P100-1995"), u"IBM284"},
    {20285, SingleByte, Foreign, 1, ICU("ibm-285_P100-1995"), u"IBM285"},
    {20290, SingleByte, Foreign, 1, ICU("ibm-290_P100-1995"), u"IBM290"},
    {20297, SingleByte, Foreign, 1, ICU("ibm-297_P100-1995"), u"IBM297"},
    {20420, SingleByte, Foreign, 1, ICU("ibm-420_X120-1999"), u"IBM420"},
    {20423, SingleByte, Foreign, 1, CLibrary("IBM423"), u"IBM423"},
    {20424, SingleByte, Foreign, 1, ICU("ibm-424_P100-1995"), u"IBM424"},
    {20833, SingleByte, Foreign, 1, ICU("ibm-933_P110-1995"), u"x-EBCDIC-KoreanExtended", {}, c20833},
    {20838, SingleByte, Foreign, 1, ICU("ibm-838_P100-1995"), u"IBM-Thai"},
    {20866, SingleByte, Plain, 1, ICU("ibm-878_P100-1996"), u"koi8-r|cskoi8r"},
    {20871, SingleByte, Foreign, 1, ICU("ibm-871_P100-1995"), u"IBM871"},
    {20880, SingleByte, Foreign, 1, CLibrary("IBM880"), u"IBM880"},
    {20905, SingleByte, Foreign, 1, CLibrary("IBM905"), u"IBM905"},
    {20924, SingleByte, Foreign, 1, {}, u"IBM00924"},
    {20932, MultiByte, Plain, 3, ICU("euc-jp-2007"), u"EUC-JP"},
    {20936, MultiByte, Plain, 2, ICU("ibm-1383_P110-1999"), u"x-cp20936", {}, cApostrophe},
    {20949, MultiByte, Plain, 2, ICU("ibm-970_P110_P110-2006_U2"), u"x-cp20949"},
    {21025, SingleByte, Foreign, 1, ICU("ibm-1025_P100-1995"), u"cp1025"},
    {21866, SingleByte, Plain, 1, ICU("ibm-1168_P100-2002"), u"koi8-u"},
    {28591, SingleByte, Plain, 1, ICU("ISO-8859-1"), u"iso-8859-1"},
    {28592, SingleByte, Plain, 1, ICU("ibm-912_P100-1995"),
        u"iso-8859-2|csisolatin2|iso-ir-101|iso8859-2|iso_8859-2|iso_8859-2:1987|l2|latin2"},
    {28593, SingleByte, Plain, 1, ICU("ibm-913_P100-2000"), u"iso-8859-3"},
    {28594, SingleByte, Plain, 1, ICU("ibm-914_P100-1995"), u"iso-8859-4"},
    {28595, SingleByte, Plain, 1, ICU("ibm-915_P100-1995"), u"iso-8859-5"},
    {28596, SingleByte, Plain, 1, ICU("ibm-1089_P100-1995"), u"iso-8859-6"},
    {28597, SingleByte, Plain, 1, ICU("ibm-9005_X110-2007"), u"iso-8859-7"},
    {28598, SingleByte, Plain, 1, ICU("ibm-5012_P100-1999"), u"iso-8859-8"},
    {28599, SingleByte, Plain, 1, ICU("ibm-920_P100-1995"), u"iso-8859-9"},
    {28603, SingleByte, Plain, 1, ICU("ibm-921_P100-1995"), u"iso-8859-13"},
    {28605, SingleByte, Plain, 1, ICU("ibm-923_P100-1998"), u"iso-8859-15"},
    {29001, SingleByte, Foreign, 1, {}, u"x-Europa"},
    {38598, SingleByte, Plain, 1, ICU("ibm-5012_P100-1999"), u"iso-8859-8-i"},
    {50220, Iso2022, Guarded, 8, ICU("ISO_2022,locale=ja,version=0"), u"iso-2022-jp"},
    {50221, Iso2022, Guarded, 9, ICU("ISO_2022,locale=ja,version=3"), u"csISO2022JP"},
    {50222, Iso2022, Guarded, 9, ICU("ISO_2022,locale=ja,version=3"), u"iso-2022-jp"},
    {50225, Iso2022, Foreign, 8, ICU("ISO_2022,locale=ko,version=1"), u"iso-2022-kr|csiso2022kr"},
    {50227, Iso2022, Guarded, 8, ICU("ISO_2022,locale=zh,version=0"), u"x-cp50227"},
    {50229, Iso2022, Guarded, 8, {}},
    {51932, MultiByte, Plain, 3, ICU("euc-jp-2007"), u"euc-jp"},
    {51936, MultiByte, Plain, 2, ICU("ibm-1383_P110-1999"), u"EUC-CN", {}, cApostrophe},
    {51949, MultiByte, Plain, 2, ICU("ibm-970_P110_P110-2006_U2"), u"euc-kr"},
    {52936, Hz, Guarded, 6, ICU("HZ"), u"hz-gb-2312"},
    {54936, Gb18030, Plain, 4, ICU("gb18030"), u"GB18030"},
    {57002, Iscii, Plain, 4, ICU("ISCII,version=0"), u"x-iscii-de"},
    {57003, Iscii, Plain, 4, ICU("ISCII,version=1"), u"x-iscii-be"},
    {57004, Iscii, Plain, 4, ICU("ISCII,version=5"), u"x-iscii-ta"},
    {57005, Iscii, Plain, 4, ICU("ISCII,version=6"), u"x-iscii-te"},
    {57006, Iscii, Plain, 4, ICU("ISCII,version=1"), u"x-iscii-as"},
    {57007, Iscii, Plain, 4, ICU("ISCII,version=4"), u"x-iscii-or"},
    {57008, Iscii, Plain, 4, ICU("ISCII,version=7"), u"x-iscii-ka"},
    {57009, Iscii, Plain, 4, ICU("ISCII,version=8"), u"x-iscii-ma"},
    {57010, Iscii, Plain, 4, ICU("ISCII,version=3"), u"x-iscii-gu"},
    {57011, Iscii, Plain, 4, ICU("ISCII,version=2"), u"x-iscii-pa"},
    {65000, Utf7, Foreign, 5, ICU("UTF-7"), u"utf-7"},
    {65001, Utf8, Plain, 3, ICU("UTF-8"), u"utf-8", cUTF8Mark},
};
static_assert(std::ranges::adjacent_find(cPages, std::ranges::greater_equal{}, &TCodePage::Number) == std::end(cPages));

// --------------------------------------------------------------------------------------------- lookups

// Numbers lead to their rows by an open hash: each conversion asks, some twice.
constexpr std::size_t cSlots = 1024;
constexpr Byte cFree = std::numeric_limits<Byte>::max();
static_assert(std::size(cPages) < cFree);

constexpr auto cSlotOf = [] {
  std::array<Byte, cSlots> Result{};
  Result.fill(cFree);
  for (std::size_t Row = 0; Row < std::size(cPages); ++Row) {
    std::size_t Slot = cPages[Row].Number % cSlots;
    while (Result[Slot] != cFree) Slot = (Slot + 1) % cSlots;
    Result[Slot] = static_cast<Byte>(Row);
  }
  return Result;
}();

struct TName {
  std::u16string_view Text;
  const TCodePage* Page = nullptr;
};

constexpr std::size_t cNameCount = [] {
  std::ptrdiff_t Result = 0;
  for (const TCodePage& Page : cPages) Result += std::ranges::count(Page.Names, u'|') + (Page.Names.empty() ? 0 : 1);
  return static_cast<std::size_t>(Result);
}();

// Each name, in the order of the rows.
constexpr auto cNames = [] {
  std::array<TName, cNameCount> Result;
  std::size_t Count = 0;
  for (const TCodePage& Page : cPages)
    for (std::u16string_view Rest = Page.Names; !Rest.empty();) {
      const std::u16string_view Text = Rest.substr(0, Rest.find(u'|'));
      Result[Count++] = {Text, &Page};
      Rest.remove_prefix(std::min(Text.size() + 1, Rest.size()));
    }
  return Result;
}();

constexpr bool HasMark(const TCodePage& APage) noexcept { return !APage.Mark.empty(); }

// The rows with a mark, the longest first: that of UTF-32 little-endian begins with that of UTF-16.
constexpr auto cMarked = [] {
  std::array<const TCodePage*, static_cast<std::size_t>(std::ranges::count_if(cPages, HasMark))> Result{};
  std::size_t Count = 0;
  for (const TCodePage& Page : cPages)
    if (HasMark(Page)) Result[Count++] = &Page;
  std::ranges::sort(Result, std::ranges::greater{}, [](const TCodePage* APage) { return APage->Mark.size(); });
  return Result;
}();

}  // namespace

std::span<const TCodePage> CodePages() noexcept { return cPages; }

const TCodePage* FindCodePage(Word ANumber) noexcept {
  for (std::size_t Slot = ANumber % cSlots; cSlotOf[Slot] != cFree; Slot = (Slot + 1) % cSlots)
    if (const TCodePage& Page = cPages[cSlotOf[Slot]]; Page.Number == ANumber) return &Page;
  return nullptr;
}

const TCodePage* FindCodePage(std::u16string_view AName) noexcept {
  for (const TName& Name : cNames)
    if (SameText(Name.Text, AName)) return Name.Page;
  return nullptr;
}

const TCodePage* FindCodePageByMark(std::span<const Byte> ABytes) noexcept {
  for (const TCodePage* const Page : cMarked)
    if (ABytes.size() >= Page->Mark.size() && std::ranges::equal(Page->Mark, ABytes.first(Page->Mark.size())))
      return Page;
  return nullptr;
}

}  // namespace zq
