#pragma once

#include "runtime/core/types.h"

namespace zq {

// Characters that hand-written parsers look for: each as Char, under its name and with W, and as AnsiChar with A.

inline constexpr Char cZqAmp = u'&', cZqAmpW = cZqAmp;
inline constexpr Char cZqApos = u'\'', cZqAposW = cZqApos;
inline constexpr Char cZqEqual = u'=', cZqEqualW = cZqEqual;
inline constexpr Char cZqGt = u'>', cZqGtW = cZqGt;
inline constexpr Char cZqLt = u'<', cZqLtW = cZqLt;
inline constexpr Char cZqQuest = u'?', cZqQuestW = cZqQuest;
inline constexpr Char cZqQuote = u'"', cZqQuoteW = cZqQuote;
inline constexpr Char cZqSlash = u'/', cZqSlashW = cZqSlash;
inline constexpr Char cZqBackSlash = u'\\', cZqBackSlashW = cZqBackSlash;
inline constexpr Char cZqSpace = u' ', cZqSpaceW = cZqSpace;
inline constexpr Char cZqExcl = u'!', cZqExclW = cZqExcl;
inline constexpr Char cZqLine = u'-', cZqLineW = cZqLine;
inline constexpr Char cZqComma = u',', cZqCommaW = cZqComma;
inline constexpr Char cZqColon = u':', cZqColonW = cZqColon;
inline constexpr Char cZqSemiColon = u';', cZqSemiColonW = cZqSemiColon;
inline constexpr Char cZqBracketO = u'[', cZqBracketOW = cZqBracketO;
inline constexpr Char cZqBracketC = u']', cZqBracketCW = cZqBracketC;
inline constexpr Char cZqLF = u'\n', cZqLFW = cZqLF;
inline constexpr Char cZqBraceO = u'{', cZqBraceOW = cZqBraceO;
inline constexpr Char cZqBraceC = u'}', cZqBraceCW = cZqBraceC;
inline constexpr Char cZqRBracketO = u'(', cZqRBracketOW = cZqRBracketO;
inline constexpr Char cZqRBracketC = u')', cZqRBracketCW = cZqRBracketC;
inline constexpr Char cZqPercent = u'%', cZqPercentW = cZqPercent;
inline constexpr Char cZqDollar = u'$', cZqDollarW = cZqDollar;
inline constexpr Char cZqPlus = u'+', cZqPluwW = cZqPlus;  // the spelling is its name
inline constexpr Char cZqEOF = u'\0', cZqEOFW = cZqEOF;
inline constexpr Char cZqCR = u'\r', cZqCRW = cZqCR;

inline constexpr AnsiChar cZqAmpA = '&', cZqAposA = '\'', cZqEqualA = '=', cZqGtA = '>', cZqLtA = '<', cZqQuestA = '?',
                          cZqQuoteA = '"', cZqSlashA = '/', cZqBackSlashA = '\\', cZqSpaceA = ' ', cZqExclA = '!',
                          cZqLineA = '-', cZqCommaA = ',', cZqColonA = ':', cZqSemiColonA = ';', cZqBracketOA = '[',
                          cZqBracketCA = ']', cZqLFA = '\n', cZqBraceOA = '{', cZqBraceCA = '}', cZqRBracketOA = '(',
                          cZqRBracketCA = ')', cZqPercentA = '%', cZqDollarA = '$', cZqPlusA = '+', cZqEOFA = '\0',
                          cZqCRA = '\r';

}  // namespace zq
