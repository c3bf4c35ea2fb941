// Strings of one character set: what each source gives, which length is kept, ownership, failing allocations.

#include "support/heapwatch.h"

#include <gtest/gtest.h>
#include <optional>
#include <TAVO/string.h>
#include <type_traits>
#include <vector>

namespace {

using namespace TAVO::String;
using TAVO::ulong32;

const unsigned char* Bytes(const char* text) { return reinterpret_cast<const unsigned char*>(text); }
const unsigned short* Units(const char16_t* text) { return reinterpret_cast<const unsigned short*>(text); }

const std::vector<unsigned> kNone{~0u}; // how an absent text is read

// The text's first `count` units and the terminator behind them, as numbers that compare across kinds.
template <class String> std::vector<unsigned> Read(const String& string, std::size_t count) {
    std::vector<unsigned> units;
    if (!string || !*string) return kNone;
    for (std::size_t i = 0; i < count; ++i)
        units.push_back(std::make_unsigned_t<std::decay_t<decltype(**string)>>((*string)[i]));
    EXPECT_EQ((*string)[count], 0) << "terminator";
    return units;
}

// Constructor and assignment from `source` behave alike: over nothing and over an older text. No units: no text.
template <class String, class Source>
void Expect(Source source, std::optional<std::vector<unsigned>> units, std::size_t length) {
    const String made(source);
    String assigned(L"an older text");
    assigned = source;
    for (const String* string : {&made, const_cast<const String*>(&assigned)}) {
        EXPECT_EQ(string->len(), length);
        EXPECT_EQ(Read(*string, units ? units->size() : 0), units.value_or(kNone));
    }
}

// "abc" of one kind, plain and in its class; then neither, and then no memory.
template <class String, class Holder, class Unit>
void ExpectSource(const char* name, const Unit* abc, std::size_t length, std::size_t absent, std::size_t refused = 0) {
    SCOPED_TRACE(name);
    Expect<String>(abc, {{'a', 'b', 'c'}}, length);
    Expect<String>(Holder(abc), {{'a', 'b', 'c'}}, length);
    Expect<String>(static_cast<const Unit*>(nullptr), std::nullopt, absent);
    Expect<String>(Holder(), std::nullopt, absent);
    support::ForEachFailingAllocation([&] {
        const String string(abc);
        EXPECT_EQ(string.len(), string ? length : refused);
        String other;
        other = abc;
        EXPECT_EQ(other.len(), other ? length : refused);
    });
}

// Intended: absent-length, ansi-length, wide-length
TEST(CharsetStrings, LengthsOfEverySource_Intended) {
    // The terminator counts in some, and null of the own kind has no length at all.
    ExpectSource<CACFWChar, CACFWChar>("wide of wide", L"abc", 4, 0, 4);
    ExpectSource<CACFWChar, CANSIChar>("wide of ANSI", "abc", 4, 0);
    ExpectSource<CACFWChar, CUTF8Char>("wide of UTF-8", Bytes("abc"), 3, 0);
    ExpectSource<CACFWChar, CUTF16Char>("wide of UTF-16", Units(u"abc"), 3, 0);
    ExpectSource<CUTF8Char, CACFWChar>("UTF-8 of wide", L"abc", 3, 0);
    ExpectSource<CUTF8Char, CANSIChar>("UTF-8 of ANSI", "abc", 3, 0);
    ExpectSource<CUTF8Char, CUTF8Char>("UTF-8 of UTF-8", Bytes("abc"), 3, SIZE_MAX);
    ExpectSource<CUTF8Char, CUTF16Char>("UTF-8 of UTF-16", Units(u"abc"), 3, 0);
    ExpectSource<CUTF16Char, CACFWChar>("UTF-16 of wide", L"abc", 3, 0);
    ExpectSource<CUTF16Char, CANSIChar>("UTF-16 of ANSI", "abc", 3, 0);
    ExpectSource<CUTF16Char, CUTF8Char>("UTF-16 of UTF-8", Bytes("abc"), 3, 0);
    ExpectSource<CUTF16Char, CUTF16Char>("UTF-16 of UTF-16", Units(u"abc"), 3, SIZE_MAX);
    ExpectSource<CANSIChar, CACFWChar>("ANSI of wide", L"abc", 3, 0);
    ExpectSource<CANSIChar, CANSIChar>("ANSI of ANSI", "abc", 3, 0);
    Expect<CACFWChar>(L"", {{}}, 1);
    Expect<CANSIChar>(L"", {{}}, 0);
    CACFWChar string(Bytes("abc"));
    const CACFWChar& same = string;
    string = same;
    EXPECT_EQ(string.len(), 4u) << "a copy counts anew, even from itself";
    Expect<CACFWChar>(CACFWChar(Bytes("ab\xC0\x80z")), {{'a', 'b'}}, 3); // ends at the zero inside
}

TEST(CharsetStrings, OddTextsAreKeptUpToTheFault_Intended) {
    constexpr wchar_t kOdd[] = {'x', 0xD800, 0xDC00, 0xE9, 0xDC00, 'y', 0};
    constexpr ulong32 kNumbers[] = {'a', 0xD800, 0x1F600, 0x10FFFF, 0x110000, 'b', 0};
    const ulong32* const none = nullptr;
    Expect<CACFWChar>(Bytes("\xF0\x9F\x98\x80"
                            "a\x80z"),
                      {{0xD87D, 0xDE00, 'a'}}, 3);
    Expect<CACFWChar>(kNumbers, {{'a', 0xD800, 0xD87D, 0xDE00, 0xDC3F, 0xDFFF}}, 6);
    Expect<CACFWChar>(none, std::nullopt, 0);
    Expect<CUTF8Char>(Bytes("\x80\xFF"), {{0x80, 0xFF}}, 2); // as it is
    Expect<CUTF8Char>(kOdd, {{'x', 0, 0xC3, 0xA9}}, 4);
    Expect<CUTF16Char>(Units(u"\xDC00x"), {{0xDC00, 'x'}}, 2); // as it is
    Expect<CUTF16Char>(kOdd, {{'x', 0, 0xE9}}, 3);
}

template <class String> void ExpectOwnText() {
    String string(L"abc");
    const String &same = string, copy(string);
    const std::size_t length = string.len();
    string = same;
    EXPECT_EQ(string.len(), length) << "assigned to itself";
    string = *string + 1;
    EXPECT_EQ(Read(string, 2), (std::vector<unsigned>{'b', 'c'})) << "assigned from inside itself";
    EXPECT_EQ(Read(copy, 3), (std::vector<unsigned>{'a', 'b', 'c'})) << "the copy has a text of its own";
}

TEST(CharsetStrings, OwnTheirText) {
    ExpectOwnText<CACFWChar>();
    ExpectOwnText<CUTF8Char>();
    ExpectOwnText<CUTF16Char>();
    ExpectOwnText<CANSIChar>();
}

// Intended: patch-length
TEST(WideString, PatchesPercentS_Intended) {
    const struct {
        const wchar_t *text, *inserted, *result;
        std::size_t length;
    } rows[] = {{L"a%sb%s", L"XY", L"aXYbXY", 11}, {L"%%s", L"!", L"%!", 5},   {L"", L"XY", L"", 1},
                {L"100% %S", L"X", L"100% %S", 8}, {L"x%s", L"%s", L"x%s", 6}, {L"%s%", L"s", L"s%", 5},
                {L"a%s", nullptr, L"a%s", 4}};
    for (const auto& row : rows) {
        CACFWChar string(row.text);
        string.patch_percent_s_with(row.inserted);
        EXPECT_STREQ(*string, row.result);
        EXPECT_EQ(string.len(), row.length) << row.result;
    }
    CACFWChar own(L"<%s>"), absent;
    own.patch_percent_s_with(*own);
    EXPECT_STREQ(*own, L"<<%s>>");
    absent.patch_percent_s_with(L"x");
    EXPECT_FALSE(absent);
    support::FailingHeap heap(0);
    own.patch_percent_s_with(L"Z");
    EXPECT_STREQ(*own, L"<<%s>>") << "no memory, no change";
}

} // namespace
