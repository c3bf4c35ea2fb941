// Wide-character utilities: the fixed case mapping, comparison, search and its bounds, character classes.

#include "support/guardpage.h"

#include <algorithm>
#include <gtest/gtest.h>
#include <random>
#include <TAVO/string.h>
#include <vector>

namespace {

using namespace TAVO::String;
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
