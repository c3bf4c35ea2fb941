// Strings of one character set: what each source gives, which length is kept, ownership, failing allocations; and the
// utilities for wide text: case, comparison, search and its bounds, character classes.

#include "support/guardpage.h"
#include "support/heapwatch.h"
#include "support/texts.h"

#include <algorithm>
#include <optional>
#include <type_traits>

namespace {

using namespace TAVO::String;
using support::Utf8, TAVO::ulong32;

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
    String string(abc);
    const String &same = string, copy(string);
    string = same;
    EXPECT_EQ(string.len(), copy.len()) << "assigned to itself";
    string = *string + 1;
    EXPECT_EQ(Read(string, 2), (std::vector<unsigned>{'b', 'c'})) << "assigned from inside itself";
    EXPECT_EQ(Read(copy, 3), (std::vector<unsigned>{'a', 'b', 'c'})) << "the copy has a text of its own";
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
    ExpectSource<CACFWChar, CUTF8Char>("wide of UTF-8", Utf8("abc"), 3, 0);
    ExpectSource<CACFWChar, CUTF16Char>("wide of UTF-16", Units(u"abc"), 3, 0);
    ExpectSource<CUTF8Char, CACFWChar>("UTF-8 of wide", L"abc", 3, 0);
    ExpectSource<CUTF8Char, CANSIChar>("UTF-8 of ANSI", "abc", 3, 0);
    ExpectSource<CUTF8Char, CUTF8Char>("UTF-8 of UTF-8", Utf8("abc"), 3, SIZE_MAX);
    ExpectSource<CUTF8Char, CUTF16Char>("UTF-8 of UTF-16", Units(u"abc"), 3, 0);
    ExpectSource<CUTF16Char, CACFWChar>("UTF-16 of wide", L"abc", 3, 0);
    ExpectSource<CUTF16Char, CANSIChar>("UTF-16 of ANSI", "abc", 3, 0);
    ExpectSource<CUTF16Char, CUTF8Char>("UTF-16 of UTF-8", Utf8("abc"), 3, 0);
    ExpectSource<CUTF16Char, CUTF16Char>("UTF-16 of UTF-16", Units(u"abc"), 3, SIZE_MAX);
    ExpectSource<CANSIChar, CACFWChar>("ANSI of wide", L"abc", 3, 0);
    ExpectSource<CANSIChar, CANSIChar>("ANSI of ANSI", "abc", 3, 0);
    Expect<CACFWChar>(L"", {{}}, 1);
    Expect<CANSIChar>(L"", {{}}, 0);
    CACFWChar string(Utf8("abc"));
    const CACFWChar& same = string;
    string = same;
    EXPECT_EQ(string.len(), 4u) << "a copy counts anew, even from itself";
    Expect<CACFWChar>(CACFWChar(Utf8("ab\xC0\x80z")), {{'a', 'b'}}, 3); // ends at the zero inside
}

TEST(CharsetStrings, OddTextsAreKeptUpToTheFault_Intended) {
    constexpr wchar_t kOdd[] = {'x', 0xD800, 0xDC00, 0xE9, 0xDC00, 'y', 0};
    constexpr ulong32 kNumbers[] = {'a', 0xD800, 0x1F600, 0x10FFFF, 0x110000, 'b', 0};
    const ulong32* const none = nullptr;
    Expect<CACFWChar>(Utf8("\xF0\x9F\x98\x80"
                           "a\x80z"),
                      {{0xD87D, 0xDE00, 'a'}}, 3);
    Expect<CACFWChar>(kNumbers, {{'a', 0xD800, 0xD87D, 0xDE00, 0xDC3F, 0xDFFF}}, 6);
    Expect<CACFWChar>(none, std::nullopt, 0);
    Expect<CUTF8Char>(Utf8("\x80\xFF"), {{0x80, 0xFF}}, 2); // as it is
    Expect<CUTF8Char>(kOdd, {{'x', 0, 0xC3, 0xA9}}, 4);
    Expect<CUTF16Char>(Units(u"\xDC00x"), {{0xDC00, 'x'}}, 2); // as it is
    Expect<CUTF16Char>(kOdd, {{'x', 0, 0xE9}}, 3);
}

// Intended: patch-length
TEST(WideString, PatchesPercentS_Intended) {
    using Row = std::tuple<const wchar_t*, const wchar_t*, const wchar_t*, std::size_t>;
    for (const auto& [text, inserted, result, length] :
         {Row{L"a%sb%s", L"XY", L"aXYbXY", 11}, Row{L"%%s", L"!", L"%!", 5}, Row{L"", L"XY", L"", 1},
          Row{L"100% %S", L"X", L"100% %S", 8}, Row{L"x%s", L"%s", L"x%s", 6}, Row{L"%s%", L"s", L"s%", 5},
          Row{L"a%s", nullptr, L"a%s", 4}}) {
        CACFWChar string(text);
        string.patch_percent_s_with(inserted);
        EXPECT_STREQ(*string, result);
        EXPECT_EQ(string.len(), length) << result;
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

using Wide = std::vector<wchar_t>;
constexpr std::size_t kAll = SIZE_MAX;

unsigned Lower(unsigned c) { return c >= 'A' && c <= 'Z' ? c + 32 : c; }

// Intended: blank-is-space, case-fold
TEST(WideUtilities, CaseIsAToZAndNothingElse_Intended) {
    for (unsigned unit = 0; unit < 0x10000; ++unit) {
        const auto c = static_cast<wchar_t>(unit);
        wchar_t lower[] = {c, 0}, upper[] = {c, 0};
        wcslower(lower), wcsupper(upper);
        ASSERT_TRUE(wctolower(c) == Lower(unit) && lower[0] == Lower(unit)) << unit;
        const unsigned expected = unit >= 'a' && unit <= 'z' ? unit - 32 : unit;
        ASSERT_TRUE(wctoupper(c) == expected && upper[0] == expected) << unit;
        ASSERT_EQ(_isSlash(c), unit == '/' || unit == '\\');
        ASSERT_EQ(_isblank(c), unit == ' ');
        ASSERT_EQ(_iswhitespace(c), unit == ' ' || unit == 9 || unit == 10 || unit == 13);
        ASSERT_EQ(_isCRLF(c), unit == 10 || unit == 13);
        ASSERT_EQ(wccmpi(c, 0), static_cast<int>(Lower(unit)));
    }
    wcslower(nullptr), wcsupper(nullptr);
    EXPECT_TRUE(wcscount(L"a,b,,c", L',') == 3 && wcscount(nullptr, L',') == 0);
}

// Intended: null-sorts-last, signed-count
TEST(WideUtilities, NullSortsLastAndCountsHave32SignedBits_Intended) {
    for (std::size_t n : {std::size_t(0), std::size_t(5), kAll})
        EXPECT_TRUE(wcsncmpi(nullptr, L"a", n) == 1 && wcsncmpi(L"a", nullptr, n) == -1 &&
                    !wcsncmpi(nullptr, nullptr, n));
    EXPECT_TRUE(wcscmpi(nullptr, L"") == 1 && wcscmpi(L"a", nullptr) == -1 && wcscmpi(nullptr, nullptr) == 0);
    for (std::size_t n : {std::size_t(0), kAll, std::size_t(0x80000000), std::size_t(0x100000000)})
        EXPECT_EQ(wcsncmpi(L"a", L"b", n), 0) << n;
    EXPECT_EQ(wcsncmpi(L"ax", L"ay", 0x100000001), 0) << "one unit";
    EXPECT_EQ(wcsncmpi(L"ab", L"ABC", 0x7FFFFFFF), -'c');
    EXPECT_EQ(wcscmpi(L"\x00E9", L"\x00C9"), 0x20);
}

// Intended: empty-part
TEST(WideUtilities, OnePointerContainsItself_Intended) {
    for (const wchar_t* text : {static_cast<const wchar_t*>(nullptr), L"", L"a"})
        EXPECT_TRUE(wcscnt(text, text) && wcscnti(text, text) && wcsncnt(text, text, 0) && wcsncnti(text, text, 0));
    const wchar_t empty[] = L"", other[] = L"";
    for (const wchar_t* none : {static_cast<const wchar_t*>(nullptr), empty})
        EXPECT_FALSE(wcscnt(L"a", none) || wcscnti(L"a", none) || wcsncnti(none, L"a", kAll) ||
                     wcsncnt(none, other, kAll));
}

TEST(WideUtilities, SearchAndCompareAgainstNaive) {
    std::mt19937 random(4);
    const support::GuardedMemory textMemory, partMemory;
    for (int round = 0; round < 20000; ++round) {
        Wide text(random() % 40), part(1 + random() % 4);
        for (Wide* units : {&text, &part})
            for (auto& c : *units) c = L"abAB\x00E9\x00C9"[random() % 6 % (round % 2 ? 6 : 4)];
        const std::size_t n = random() % 45;
        const bool terminated = n >= text.size();
        text.resize(terminated ? text.size() : n); // without a terminator the text ends at the bound
        const auto same = [](wchar_t a, wchar_t b) { return Lower(a) == Lower(b); };
        const bool exact = std::search(text.begin(), text.end(), part.begin(), part.end()) != text.end();
        const bool folded = std::search(text.begin(), text.end(), part.begin(), part.end(), same) != text.end();
        part.push_back(0);
        if (terminated) text.push_back(0);
        const wchar_t* const at = textMemory.Place(text.data(), text.size());
        const wchar_t* const partAt = partMemory.Place(part.data(), part.size());
        ASSERT_EQ(wcsncnt(at, partAt, n), exact) << round;
        ASSERT_EQ(wcsncnti(at, partAt, n), folded) << round;
        if (!terminated) continue;
        ASSERT_EQ(wcscnt(at, partAt), exact) << round;
        ASSERT_EQ(wcscnti(at, partAt), folded) << round;
        const auto differs = std::mismatch(part.begin(), part.end() - 1, text.begin(), text.end() - 1, same);
        ASSERT_EQ(wcscmpi(partAt, at), static_cast<int>(Lower(*differs.first) - Lower(*differs.second))) << round;
    }
}

} // namespace
