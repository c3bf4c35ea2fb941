// Wide-character utilities: the fixed case mapping, comparison, search and its bounds, character classes.

#include "support/guardpage.h"

#include <gtest/gtest.h>
#include <random>
#include <TAVO/string.h>
#include <vector>

namespace {

using namespace TAVO::String;

constexpr std::size_t kAll = SIZE_MAX;

unsigned Lower(unsigned c) { return c >= 'A' && c <= 'Z' ? c + 32 : c; }

TEST(WideUtilities, CaseIsAToZAndNothingElse_Intended) {
    for (unsigned unit = 0; unit < 0x10000; ++unit) {
        const auto c = static_cast<wchar_t>(unit);
        ASSERT_EQ(wctolower(c), Lower(unit)) << unit;
        ASSERT_EQ(wctoupper(c), unit >= 'a' && unit <= 'z' ? unit - 32 : unit) << unit;
    }
    wchar_t text[] = L"@AZ[`az{\x00C9\x00E9 end";
    wcslower(text);
    EXPECT_STREQ(text, L"@az[`az{\x00C9\x00E9 end");
    wcsupper(text);
    EXPECT_STREQ(text, L"@AZ[`AZ{\x00C9\x00E9 END");
    wcslower(nullptr);
    wcsupper(nullptr);
}

TEST(WideUtilities, ComparesRegardlessOfCase) {
    EXPECT_EQ(wccmpi(0xFFFF, 0), 0xFFFF);
    EXPECT_EQ(wccmpi(L'Z', L'['), 'z' - '[');
    EXPECT_EQ(wcscmpi(L"ab", L"ABC"), -'c');
    EXPECT_EQ(wcscmpi(L"\x00E9", L"\x00C9"), 0x20);
    EXPECT_EQ(wcsncmpi(L"abc", L"ABD", 2), 0);
    EXPECT_EQ(wcsncmpi(L"abc", L"ABD", 3), -1);
    EXPECT_EQ(wcsncmpi(L"ab", L"ABC", 0x7FFFFFFF), -'c');
}

TEST(WideUtilities, NullSortsLast_Intended) {
    EXPECT_EQ(wcscmpi(nullptr, L""), 1);
    EXPECT_EQ(wcscmpi(L"a", nullptr), -1);
    EXPECT_EQ(wcscmpi(nullptr, nullptr), 0);
    for (std::size_t n : {std::size_t(0), std::size_t(5), kAll}) {
        EXPECT_EQ(wcsncmpi(nullptr, L"a", n), 1);
        EXPECT_EQ(wcsncmpi(L"a", nullptr, n), -1);
        EXPECT_EQ(wcsncmpi(nullptr, nullptr, n), 0);
    }
}

TEST(WideUtilities, CountOfComparisonHas32SignedBits_Intended) {
    for (std::size_t n : {std::size_t(0), kAll, std::size_t(0x80000000), std::size_t(0x100000000)})
        EXPECT_EQ(wcsncmpi(L"a", L"b", n), 0) << n;
    EXPECT_EQ(wcsncmpi(L"ax", L"ay", 0x100000001), 0) << "one unit";
}

TEST(WideUtilities, OnePointerContainsItself_Intended) {
    for (const wchar_t* text : {static_cast<const wchar_t*>(nullptr), L"", L"a"})
        for (const bool found :
             {wcscnt(text, text), wcscnti(text, text), wcsncnt(text, text, 0), wcsncnti(text, text, 0)})
            EXPECT_TRUE(found);
    const wchar_t empty[] = L"", other[] = L"";
    for (const wchar_t* none : {static_cast<const wchar_t*>(nullptr), empty}) {
        EXPECT_FALSE(wcscnt(L"a", none));
        EXPECT_FALSE(wcscnti(L"a", none));
        EXPECT_FALSE(wcsncnti(none, L"a", kAll));
        EXPECT_FALSE(wcsncnt(none, other, kAll)) << "two empty texts";
    }
    EXPECT_FALSE(wcscnti(L"\x00E9", L"\x00C9"));
}

TEST(WideUtilities, SearchAgainstNaive) {
    std::mt19937 random(4);
    support::GuardedMemory textMemory, partMemory;
    for (int round = 0; round < 20000; ++round) {
        std::vector<wchar_t> text(random() % 40), part(1 + random() % 4);
        for (auto& c : text) c = L"abAB"[random() % 4];
        for (auto& c : part) c = L"abAB"[random() % 4];
        const std::size_t n = random() % 45, visible = n < text.size() ? n : text.size();
        bool exact = false, folded = false;
        for (std::size_t start = 0; start + part.size() <= visible; ++start) {
            bool same = true, sameFolded = true;
            for (std::size_t i = 0; i < part.size(); ++i) {
                same = same && text[start + i] == part[i];
                sameFolded = sameFolded && Lower(text[start + i]) == Lower(part[i]);
            }
            exact = exact || same, folded = folded || sameFolded;
        }
        part.push_back(0);
        const bool terminated = n >= text.size();
        text.resize(visible);
        if (terminated) text.push_back(0); // otherwise the text ends at the bound
        const wchar_t* const at = textMemory.Place(text.data(), text.size());
        const wchar_t* const partAt = partMemory.Place(part.data(), part.size());
        ASSERT_EQ(wcsncnt(at, partAt, n), exact) << round;
        ASSERT_EQ(wcsncnti(at, partAt, n), folded) << round;
        if (!terminated) continue;
        ASSERT_EQ(wcscnt(at, partAt), exact) << round;
        ASSERT_EQ(wcscnti(at, partAt), folded) << round;
    }
}

TEST(WideUtilities, CountsAndClasses) {
    EXPECT_EQ(wcscount(L"a,b,,c", L','), 3u);
    EXPECT_EQ(wcscount(nullptr, L','), 0u);
    for (unsigned unit = 0; unit < 0x10000; ++unit) {
        const auto c = static_cast<wchar_t>(unit);
        ASSERT_EQ(_isSlash(c), unit == '/' || unit == '\\');
        ASSERT_EQ(_isblank(c), unit == ' ');
        ASSERT_EQ(_iswhitespace(c), unit == ' ' || unit == 9 || unit == 10 || unit == 13);
        ASSERT_EQ(_isCRLF(c), unit == 10 || unit == 13);
    }
}

} // namespace
