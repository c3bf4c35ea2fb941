// What makes two strings one entry, and what counts.

#include "contract.h"

#include <TAVO/string.h>
#include <TAVO/threading.h>

namespace contract {

using namespace TAVO::String;

static const unsigned char* Utf8(const char* text) { return reinterpret_cast<const unsigned char*>(text); }

void PooledStrings() {
    const CPPoolString null, empty(L"");
    Is("null is not empty, and sorts before it", null != empty && null.cmp(empty) < 0);
    Is("regardless of case they are equal", null.cmpi(empty) == 0);
    Instead("ask isnull and isempty", null.isnull() && empty.isempty());

    const CPPoolString grin(L"some comment \xD83D\xDE00"), smile(L"some comment \xD83D\xDE01");
    Is("texts that differ in pairs alone, behind the tenth unit, are one entry", grin == smile);
    Instead("a buffer tells them apart", wcscmpi(*CACFWChar(L"\xD83D\xDE00"), *CACFWChar(L"\xD83D\xDE01")) != 0);

    const CPPoolString pair(L"a\xD83D\xDE00z");
    std::size_t units = 0;
    for (const wchar_t* unit = pair; *unit; ++unit) ++units;
    Is("len() counts a pair once", pair.len() == 3);
    Instead("the terminator tells", units == 4);
    Is("a suffix behind a pair is not found", pair.cmp_p(L"z") != 0);
    Instead("wcscnt on the text finds it", wcscnt(pair, L"z"));
    const unsigned char* const utf8 = CPPoolString(L"\xD83D\xDE00\xD83D\xDE00");
    Is("a text of two pairs has no UTF-8 form", *utf8 == 0);
    Is("the same character from UTF-8 is another entry",
       CPPoolString(Utf8("\xF0\x9F\x98\x80")) != CPPoolString(L"\xD83D\xDE00"));

    Is("a number keeps its low 32 bits", CPPoolString(4294967297ULL) == L"1");

    using namespace TAVO::Threading::CurrentThread::OS;
    SetThreadPriority(TAVO::Threading::ThreadPriorityLow);
    Is("a thread of low priority does not sweep", !CStringPool::Collect(1000));
    SetThreadPriority(TAVO::Threading::ThreadPriorityNormal);

    CPPoolStringArray pieces(false);
    Is("splitting makes empty pieces null and drops a trailing one",
       pieces.Inflate(L",a,", L',') && pieces.GetNItems() == 2 && pieces[0].isnull());
}

} // namespace contract
