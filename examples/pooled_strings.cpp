// Pooled strings: every text is in memory once, and equal texts are the same entry.

#include <cstdio>
#include <TAVO/core.h>
#include <TAVO/string.h>

using namespace TAVO::String;

int main() {
    // Starts the upkeep that drops strings nobody uses any more. Strings work without it.
    const bool started = TAVO::AppInit();

    // From wide text, UTF-8 and numbers. Equal texts compare equal by their entries; no text is looked at.
    const CPPoolString a = L"Türkçe";
    const CPPoolString b = reinterpret_cast<const unsigned char*>("T\xC3\xBCrk\xC3\xA7"
                                                                  "e");
    const CPPoolString number = 25;
    bool fine = a == b && static_cast<const wchar_t*>(a) == static_cast<const wchar_t*>(b) && number == L"25";

    // A handle is one pointer. The null string is not the empty string.
    const CPPoolString null, empty = L"";
    fine = fine && sizeof(a) == sizeof(void*) && null.isnull() && !empty.isnull() && null != empty && !empty.isdef();

    // Query looks without interning; "i" does not mind case.
    fine = fine && CStringPool::QueryStringRef(L"never seen before").isnull();
    fine = fine && CStringPool::QueryStringRefi(L"TüRKçE") == a;

    // Sorted arrays hold each string once; texts are split and joined.
    CPPoolStringArray words(true);
    CPPoolStringArray pieces(false);
    fine = fine && pieces.Inflate(L"video;audio;video;title", L';') && pieces.GetNItems() == 4;
    for (std::size_t i = 0; i < pieces.GetNItems(); ++i) fine = fine && words.Add(pieces[i]);
    fine = fine && words.Flatten(L' ') == L"audio title video";

    CPPoolString take = L"take009"; // numbers that count on by themselves
    take = take.inc();
    fine = fine && take == L"take010";

    std::printf("%llu strings, %llu bytes; %s\n", CStringPool::GetNItems(), CStringPool::GetSize(),
                reinterpret_cast<const char*>(static_cast<const unsigned char*>(a)));
    TAVO::AppExit(); // once for every AppInit, also for one that failed
    return started && fine ? 0 : 1;
}
