// Conversion, lengths of strings, utilities. Above U+FFFF the library has rules of its own.

#include "contract.h"

#include <TAVO/string.h>

namespace contract {

using namespace TAVO;
using namespace TAVO::String;

static const unsigned char* Utf8(const char* text) { return reinterpret_cast<const unsigned char*>(text); }

void Text() {
    const CACFWChar smile(Utf8("\xF0\x9F\x98\x80")); // U+1F600
    Is("U+1F600 becomes D87D DE00 and not D83D DE00", (*smile)[0] == 0xD87D && (*smile)[1] == 0xDE00);
    const CUTF8Char back(*smile);
    Is("and comes back as the character 01", back.len() == 1 && (*back)[0] == 1);
    Instead("as wide text nothing is lost", wcscmpi(*CACFWChar(*smile), *smile) == 0);

    wchar_t wide[8];
    Is("invalid text ends silently", UTF8_To_acfWChar(Utf8("A\x80"
                                                           "B"),
                                                      SIZE_MAX, wide, 8) == 2);
    Is("but fails the whole behind a character of two units",
       UTF8_To_acfWChar(Utf8("\xF0\x9F\x98\x80\x80"), SIZE_MAX, wide, 8) == 0);
    const ulong32 numbers[] = {'a', 'b', 0};
    Is("the counters of UTF-32 include index n", UTF32wstrlen(numbers, 1) == 2);
    const unsigned char* at = Utf8("\xA9"
                                   "a");
    UTF8Sync(at);
    Is("UTF8Sync stays at a continuation byte", *at == 0xA9);
    while ((*at & 0xC0) == 0x80) ++at;
    Instead("skip 80 to BF", *at == 'a');

    Is("a string made of wide text counts its terminator", CACFWChar(L"abc").len() == 4);
    Is("one made of null UTF-8 has length SIZE_MAX",
       CUTF8Char(static_cast<const unsigned char*>(nullptr)).len() == SIZE_MAX);
    Instead("ask for the text", !CUTF8Char(static_cast<const unsigned char*>(nullptr)));

    Is("case is folded for A to Z only", wcscmpi(L"ABC", L"abc") == 0 && wcscmpi(L"\x00C9", L"\x00E9") != 0);
    Is("null sorts behind every text", wcscmpi(nullptr, L"z") > 0);
    Is("a count of SIZE_MAX compares nothing", wcsncmpi(L"a", L"b", SIZE_MAX) == 0);
    Instead("wcscmpi compares whole texts", wcscmpi(L"a", L"b") < 0);
    Is("the empty text occurs in no other", !wcscnt(L"a", L""));
    Is("a tab is no blank", !_isblank(L'\t'));
    Instead("it is white space", _iswhitespace(L'\t'));
}

} // namespace contract
