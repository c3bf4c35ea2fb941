// Strings of one character set: what each source gives, which length is kept, ownership, failing allocations.

#include "support/heapwatch.h"

#include <gtest/gtest.h>
#include <string>
#include <TAVO/string.h>
#include <type_traits>
#include <utility>
#include <vector>

namespace {

using namespace TAVO::String;
using TAVO::ulong32;

const unsigned char* Bytes(const char* text) { return reinterpret_cast<const unsigned char*>(text); }
const unsigned short* Units(const char16_t* text) { return reinterpret_cast<const unsigned short*>(text); }

// The text's first `count` units and the terminator behind them, as numbers that compare across kinds.
template <class String> std::vector<unsigned> Read(const String& string, std::size_t count) {
    std::vector<unsigned> units;
    if (!string) return {~0u};
    for (std::size_t i = 0; i < count; ++i)
        units.push_back(
            static_cast<std::make_unsigned_t<std::remove_cv_t<std::remove_reference_t<decltype((*string)[0])>>>>(
                (*string)[i]));
    EXPECT_EQ((*string)[count], 0) << "terminator";
    return units;
}

// Constructor and assignment from `source` behave alike: over nothing and over an older text.
template <class String, class Source>
void Expect(const char* name, Source source, std::vector<unsigned> units, std::size_t length) {
    SCOPED_TRACE(name);
    const String made(source);
    String assigned(L"an older text");
    assigned = source;
    for (const String* string : {&made, const_cast<const String*>(&assigned)}) {
        EXPECT_TRUE(*string);
        EXPECT_EQ(string->len(), length);
        EXPECT_EQ(Read(*string, units.size()), units);
    }
}

template <class String, class Source> void ExpectAbsent(const char* name, Source source, std::size_t length) {
    SCOPED_TRACE(name);
    const String made(source);
    String assigned(L"an older text");
    assigned = source;
    for (const String* string : {&made, const_cast<const String*>(&assigned)}) {
        EXPECT_FALSE(*string);
        EXPECT_EQ(**string, nullptr);
        EXPECT_EQ(string->len(), length);
    }
}

constexpr ulong32 kNumbers[] = {'a', 0xD800, 0x1F600, 0x10FFFF, 0x110000, 'b', 0};
constexpr wchar_t kPair[] = {0xD83D, 0xDE00, 0};
constexpr wchar_t kZeroPair[] = {'x', 0xD800, 0xDC00, 'y', 0};
constexpr wchar_t kBroken[] = {'x', 0xE9, 0xDC00, 'y', 0};

TEST(WideString, ConvertsEverySource) {
    Expect<CACFWChar>("empty", L"", {}, 1);
    Expect<CACFWChar>("UTF-16", Units(u"abc"), {'a', 'b', 'c'}, 3);
    Expect<CACFWChar>("UTF-8", Bytes("\xC3\xA9\xE4\xB8\xAD\xF0\x9F\x98\x80"), {0xE9, 0x4E2D, 0xD87D, 0xDE00}, 4);
    Expect<CACFWChar>("broken UTF-8",
                      Bytes("\xF0\x9F\x98\x80"
                            "a\x80z"),
                      {0xD87D, 0xDE00, 'a'}, 3);
    Expect<CACFWChar>("UTF-8 beyond 10FFFF", Bytes("a\xF4\x90\x80\x80z"), {'a'}, 1);
    Expect<CACFWChar>("UTF-8 with a zero", Bytes("a\xC0\x80z"), {'a', 0, 'z'}, 3);
    Expect<CACFWChar>("UTF-32", kNumbers, {'a', 0xD800, 0xD87D, 0xDE00, 0xDC3F, 0xDFFF}, 6);
    Expect<CACFWChar>("CUTF8Char", CUTF8Char(Bytes("\xC3\xA9")), {0xE9}, 1);
    Expect<CACFWChar>("CUTF16Char", CUTF16Char(Units(u"ab")), {'a', 'b'}, 2);
    ExpectAbsent<CACFWChar>("wide", static_cast<const wchar_t*>(nullptr), 0);
    ExpectAbsent<CACFWChar>("UTF-16", static_cast<const unsigned short*>(nullptr), 0);
    ExpectAbsent<CACFWChar>("UTF-8", static_cast<const unsigned char*>(nullptr), 0);
    ExpectAbsent<CACFWChar>("UTF-32", static_cast<const ulong32*>(nullptr), 0);
    ExpectAbsent<CACFWChar>("ANSI", static_cast<const char*>(nullptr), 0);
    ExpectAbsent<CACFWChar>("absent string", CACFWChar(), 0);
    ExpectAbsent<CACFWChar>("absent UTF-8", CUTF8Char(), 0);
    ExpectAbsent<CACFWChar>("absent UTF-16", CUTF16Char(), 0);
    ExpectAbsent<CACFWChar>("absent ANSI", CANSIChar(), 0);
}

TEST(WideString, LengthCountsTheTerminator_Intended) {
    Expect<CACFWChar>("wide", L"abc", {'a', 'b', 'c'}, 4);
    Expect<CACFWChar>("ANSI", "abc", {'a', 'b', 'c'}, 4);
    Expect<CACFWChar>("CANSIChar", CANSIChar("abc"), {'a', 'b', 'c'}, 4);
    Expect<CACFWChar>("a copy counts anew", CACFWChar(Bytes("abc")), {'a', 'b', 'c'}, 4);
    Expect<CACFWChar>("a copy ends at a zero inside", CACFWChar(Bytes("ab\xC0\x80z")), {'a', 'b'}, 3);
    CACFWChar string(Bytes("abc"));
    const CACFWChar& same = string;
    string = same;
    EXPECT_EQ(string.len(), 4u) << "assigned to itself";
    EXPECT_STREQ(*string, L"abc");
}

TEST(Utf8String, ConvertsEverySource) {
    Expect<CUTF8Char>("wide", L"x\x00E9\x4E2D", {'x', 0xC3, 0xA9, 0xE4, 0xB8, 0xAD}, 6);
    Expect<CUTF8Char>("UTF-16", Units(u"x\x00E9"), {'x', 0xC3, 0xA9}, 3);
    Expect<CUTF8Char>("UTF-8 as it is", Bytes("\x80\xFF"), {0x80, 0xFF}, 2);
    Expect<CUTF8Char>("ANSI", "abc", {'a', 'b', 'c'}, 3);
    Expect<CUTF8Char>("CACFWChar", CACFWChar(L"abc"), {'a', 'b', 'c'}, 3);
    Expect<CUTF8Char>("CUTF16Char", CUTF16Char(Units(u"abc")), {'a', 'b', 'c'}, 3);
    Expect<CUTF8Char>("CANSIChar", CANSIChar("abc"), {'a', 'b', 'c'}, 3);
    Expect<CUTF8Char>("pair", kPair, {1}, 1);
    Expect<CUTF8Char>("zero inside", kZeroPair, {'x', 0, 'y'}, 3);
    Expect<CUTF8Char>("broken", kBroken, {'x', 0xC3, 0xA9}, 3);
    ExpectAbsent<CUTF8Char>("wide", static_cast<const wchar_t*>(nullptr), 0);
    ExpectAbsent<CUTF8Char>("UTF-16", static_cast<const unsigned short*>(nullptr), 0);
    ExpectAbsent<CUTF8Char>("ANSI", static_cast<const char*>(nullptr), 0);
    ExpectAbsent<CUTF8Char>("absent wide", CACFWChar(), 0);
    ExpectAbsent<CUTF8Char>("absent UTF-16", CUTF16Char(), 0);
    ExpectAbsent<CUTF8Char>("absent ANSI", CANSIChar(), 0);
}

TEST(Utf16String, ConvertsEverySource) {
    Expect<CUTF16Char>("wide", L"x\x00E9\x4E2D", {'x', 0xE9, 0x4E2D}, 3);
    Expect<CUTF16Char>("UTF-16 as it is", Units(u"\xDC00x"), {0xDC00, 'x'}, 2);
    Expect<CUTF16Char>("UTF-8", Bytes("\xC3\xA9\xF0\x9F\x98\x80"), {0xE9, 0xD87D, 0xDE00}, 3);
    Expect<CUTF16Char>("ANSI", "abc", {'a', 'b', 'c'}, 3);
    Expect<CUTF16Char>("CACFWChar", CACFWChar(L"abc"), {'a', 'b', 'c'}, 3);
    Expect<CUTF16Char>("CUTF8Char", CUTF8Char(L"abc"), {'a', 'b', 'c'}, 3);
    Expect<CUTF16Char>("CANSIChar", CANSIChar("abc"), {'a', 'b', 'c'}, 3);
    Expect<CUTF16Char>("broken", kBroken, {'x', 0xE9}, 2);
    ExpectAbsent<CUTF16Char>("wide", static_cast<const wchar_t*>(nullptr), 0);
    ExpectAbsent<CUTF16Char>("UTF-8", static_cast<const unsigned char*>(nullptr), 0);
    ExpectAbsent<CUTF16Char>("ANSI", static_cast<const char*>(nullptr), 0);
}

TEST(Utf16String, PairsCollapse_Intended) {
    Expect<CUTF16Char>("pair", kPair, {1}, 1);
    Expect<CUTF16Char>("zero pair", kZeroPair, {'x', 0, 'y'}, 3);
}

TEST(CharsetStrings, NullOfTheOwnKindHasNoLength_Intended) {
    ExpectAbsent<CUTF8Char>("UTF-8", static_cast<const unsigned char*>(nullptr), SIZE_MAX);
    ExpectAbsent<CUTF8Char>("copy of an absent one", CUTF8Char(), SIZE_MAX);
    ExpectAbsent<CUTF16Char>("UTF-16", static_cast<const unsigned short*>(nullptr), SIZE_MAX);
    ExpectAbsent<CUTF16Char>("copy of an absent one", CUTF16Char(), SIZE_MAX);
    ExpectAbsent<CUTF16Char>("absent CUTF8Char is no own kind", CUTF8Char(), 0);
    EXPECT_EQ(CUTF8Char().len(), 0u);
    EXPECT_EQ(CUTF16Char().len(), 0u);
}

TEST(AnsiString, ConvertsEverySource) {
    Expect<CANSIChar>("wide", L"abc", {'a', 'b', 'c'}, 3);
    Expect<CANSIChar>("empty", L"", {}, 0);
    Expect<CANSIChar>("ANSI", "abc", {'a', 'b', 'c'}, 3);
    Expect<CANSIChar>("CACFWChar", CACFWChar(L"abc"), {'a', 'b', 'c'}, 3);
    Expect<CANSIChar>("copy", CANSIChar("abc"), {'a', 'b', 'c'}, 3);
    ExpectAbsent<CANSIChar>("wide", static_cast<const wchar_t*>(nullptr), 0);
    ExpectAbsent<CANSIChar>("ANSI", static_cast<const char*>(nullptr), 0);
    ExpectAbsent<CANSIChar>("copy of an absent one", CANSIChar(), 0);
}

TEST(CharsetStrings, AssignmentToItselfAndFromItsOwnText) {
    CUTF8Char utf8(L"abc");
    CUTF16Char utf16(L"abc");
    CANSIChar ansi(L"abc");
    const auto &same8 = utf8, &none8 = CUTF8Char();
    const auto& same16 = utf16;
    const auto& sameAnsi = ansi;
    utf8 = same8, utf16 = same16, ansi = sameAnsi;
    EXPECT_EQ(Read(utf8, 3), (std::vector<unsigned>{'a', 'b', 'c'}));
    EXPECT_EQ(utf8.len() + utf16.len() + ansi.len(), 9u);
    CUTF8Char absent;
    const auto& sameAbsent = absent;
    absent = sameAbsent;
    EXPECT_EQ(absent.len(), 0u) << "nothing is done";
    EXPECT_FALSE(none8);

    CACFWChar wide(L"abcdef");
    wide = *wide + 2;
    EXPECT_STREQ(*wide, L"cdef");
    utf8 = *utf8 + 1;
    EXPECT_EQ(Read(utf8, 2), (std::vector<unsigned>{'b', 'c'}));
    utf16 = *utf16 + 1;
    EXPECT_EQ(Read(utf16, 2), (std::vector<unsigned>{'b', 'c'}));
    ansi = *ansi + 1;
    EXPECT_STREQ(*ansi, "bc");
}

TEST(CharsetStrings, CopiesOwnTheirText) {
    CACFWChar first(L"abc");
    const CACFWChar second(first);
    EXPECT_NE(*first, *second);
    first = L"x";
    EXPECT_STREQ(*second, L"abc");
    const wchar_t* text = second;
    EXPECT_EQ(text, *second);
}

TEST(WideString, PatchesPercentS_Intended) {
    struct Row {
        const wchar_t *text, *inserted, *result;
        std::size_t length;
    };
    const Row rows[] = {
        {L"a%sb%s", L"XY", L"aXYbXY", 11},
        {L"%s", L"", L"", 3},
        {L"%%s", L"!", L"%!", 5},
        {L"%s%s%s", L"a", L"aaa", 10},
        {L"none", L"XY", L"none", 5},
        {L"", L"XY", L"", 1},
        {L"%", L"XY", L"%", 2},
        {L"100% %S", L"X", L"100% %S", 8},
        {L"x%s", L"%s", L"x%s", 6},
        {L"%s%", L"s", L"s%", 5},
        {L"a%s", nullptr, L"a%s", 4},
    };
    for (const Row& row : rows) {
        CACFWChar string(row.text);
        string.patch_percent_s_with(row.inserted);
        EXPECT_STREQ(*string, row.result);
        EXPECT_EQ(string.len(), row.length) << row.result;
    }
    CACFWChar twice(L"x%s");
    twice.patch_percent_s_with(L"%s");
    twice.patch_percent_s_with(L"Z");
    EXPECT_STREQ(*twice, L"xZ");
    EXPECT_EQ(twice.len(), 7u);
    CACFWChar own(L"<%s>");
    own.patch_percent_s_with(*own);
    EXPECT_STREQ(*own, L"<<%s>>");
    CACFWChar absent;
    absent.patch_percent_s_with(L"x");
    EXPECT_FALSE(absent);
    EXPECT_EQ(absent.len(), 0u);
}

template <class String, class Source>
void ExpectFailing(const char* name, Source source, std::size_t lengthWhenRefused) {
    SCOPED_TRACE(name);
    String full(source);
    support::ForEachFailingAllocation([&] {
        const String string(source);
        EXPECT_EQ(string.len(), string ? full.len() : lengthWhenRefused);
        String other;
        other = source;
        EXPECT_EQ(other.len(), other ? full.len() : lengthWhenRefused);
    });
}

TEST(CharsetStrings, FailedAllocationsGiveNoText) {
    ExpectFailing<CACFWChar>("UTF-16", Units(u"abc"), 0);
    ExpectFailing<CACFWChar>("UTF-8", Bytes("abc"), 0);
    ExpectFailing<CACFWChar>("UTF-32", kNumbers, 0);
    ExpectFailing<CACFWChar>("ANSI", "abc", 0);
    ExpectFailing<CUTF8Char>("wide", L"abc", 0);
    ExpectFailing<CUTF8Char>("UTF-8", Bytes("abc"), 0);
    ExpectFailing<CUTF8Char>("ANSI", "abc", 0);
    ExpectFailing<CUTF16Char>("wide", L"abc", 0);
    ExpectFailing<CUTF16Char>("UTF-16", Units(u"abc"), 0);
    ExpectFailing<CUTF16Char>("UTF-8", Bytes("abc"), 0);
    ExpectFailing<CUTF16Char>("ANSI", "abc", 0);
    ExpectFailing<CANSIChar>("wide", L"abc", 0);
    ExpectFailing<CANSIChar>("ANSI", "abc", 0);
}

TEST(CharsetStrings, FailedWideCopyKeepsItsLength_Intended) {
    ExpectFailing<CACFWChar>("wide", L"abc", 4);
    CACFWChar string(L"old");
    {
        support::FailingHeap heap(0);
        string = L"newer";
    }
    EXPECT_FALSE(string);
    EXPECT_EQ(string.len(), 6u);
    string.patch_percent_s_with(L"x");
    EXPECT_FALSE(string);

    CACFWChar patched(L"a%s");
    {
        support::FailingHeap heap(0);
        patched.patch_percent_s_with(L"x");
    }
    EXPECT_STREQ(*patched, L"a%s");
    EXPECT_EQ(patched.len(), 4u);
}

} // namespace
