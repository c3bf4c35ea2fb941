// Pooled strings as values: construction, comparison tables, the UTF-8 form; arrays, joining and splitting.

#include "support/heapwatch.h"
#include "support/texts.h"

#include <algorithm>
#include <climits>
#include <set>

using namespace TAVO::String;
using support::Entry, support::Utf8;

namespace {

std::string Utf8Of(const CPPoolString& text) {
    return reinterpret_cast<const char*>(static_cast<const unsigned char*>(text));
}
int Sign(int value) { return value < 0 ? -1 : value > 0; }

TEST(PooledString, NullEmptyAndTextDiffer) {
    for (const auto& null : {CPPoolString(), CPPoolString(nullptr), CPPoolString(static_cast<const char*>(nullptr))})
        EXPECT_TRUE(null.isnull() && !null && !null.isempty() && !null.isdef() && null.len() == 0 && *Entry(null) == 0);
    for (const auto& empty : {CPPoolString(L""), CPPoolString(Utf8("")), CPPoolString("")})
        EXPECT_TRUE(!empty.isnull() && empty && empty.isempty() && !empty.isdef() && Utf8Of(empty) == "");
    EXPECT_TRUE(CPPoolString().iequals(CPPoolString(L""))) << "both hashes are 0";
}

// Intended: number-32-bits
TEST(PooledString, NumbersKeepTheirLow32BitsIntended) {
    using Row = std::pair<CPPoolString, const wchar_t*>;
    for (const auto& [text, expected] :
         {Row{0, L"0"}, Row{INT_MIN, L"-2147483648"}, Row{4294967295u, L"4294967295"}, Row{-1L, L"-1"},
          Row{4294967295UL, L"4294967295"}, Row{4294967297ULL, L"1"}, Row{4294967295LL, L"-1"},
          Row{-4294967295LL, L"1"}, Row{static_cast<short>(-5), L"-5"}, Row{static_cast<unsigned char>(200), L"200"},
          Row{static_cast<signed char>(-128), L"-128"}, Row{true, L"true"}, Row{false, L"false"}})
        EXPECT_STREQ(Entry(text), expected);
}

TEST(PooledString, HandlesMoveAndTransfer) {
    CPPoolString text(L"a text on its way"), moved(std::move(text));
    const wchar_t* const entry = moved;
    EXPECT_TRUE(text.isnull());
    CPPoolString& same = text = std::move(moved);
    text = same;
    text = std::move(same);
    text.TransferFrom(same);
    moved = L"replaced";
    moved.TransferFrom(text);
    EXPECT_TRUE(text.isnull() && Entry(moved) == entry);
    moved = Entry(moved) + 2; // its own text as the source
    EXPECT_STREQ(Entry(moved), L"text on its way");
}

TEST(PooledString, IncRaisesTheTrailingNumber) {
    using Row = std::pair<const wchar_t*, const wchar_t*>;
    for (const auto& [text, expected] : {Row{L"clip009", L"clip010"}, Row{L"", L"1"}, Row{L"a1b99", L"a1b100"},
                                         Row{L"18446744073709551615", L"18446744073709551616"}})
        EXPECT_STREQ(Entry(CPPoolString(text).inc()), expected);
    EXPECT_TRUE(CPPoolString().inc().isnull());
}

// Intended: pool-utf8-size
TEST(PooledString, Utf8FormIsMadeOnceAndOnlyWhereItFits) {
    using Row = std::pair<CPPoolString, const char*>;
    for (const auto& [text, expected] :
         {Row{L"\U0001F600", "\x01"}, Row{L"A\U0001F600B", "A\x01\x42"}, Row{L"\U0001F600\U0001F600", ""},
          Row{Utf8("\xF0\x9F\x98\x80"), ""}, Row{Utf8("\xED\xA0\x80"), ""},
          Row{L"\u4E2D\u6587 abc", "\xE4\xB8\xAD\xE6\x96\x87 abc"}}) {
        EXPECT_EQ(Utf8Of(text), expected);
        const unsigned char* const form = text;
        EXPECT_TRUE(!*expected || form == static_cast<const unsigned char*>(CPPoolString(Entry(text)))) << expected;
    }
    const CPPoolString text(L"no memory");
    EXPECT_EQ((support::FailingHeap(0), Utf8Of(text)), "");
    EXPECT_EQ(Utf8Of(text), "no memory");
}

// A text as an entry and as raw text; raw null is the null string.
const wchar_t* const kTexts[] = {nullptr,        L"",       L"a",      L"A",    L"aB",         L"b",
                                 L"abcdef",      L"ABCDEF", L"def",    L"DEF",  L"bcd",        L"abcd\u00E9f",
                                 L"abcd\u00C9f", L"[",      L"ababac", L"abac", L"zzzzzzzzzzz"};

std::vector<int> FoldedUnits(const wchar_t* text, bool fold) {
    std::vector<int> units;
    for (; text && *text; ++text) units.push_back(fold && *text >= 'A' && *text <= 'Z' ? *text + 32 : *text);
    return units;
}
int Order(const std::vector<int>& a, const std::vector<int>& b) { return a < b ? -1 : b < a; }

// Intended: pool-null-first
TEST(PooledString, ComparesLikeASlowReading) {
    for (const wchar_t* first : kTexts)
        for (const wchar_t* second : kTexts) {
            const CPPoolString text(first), other(second);
            const bool same = Entry(text) == Entry(other);
            SCOPED_TRACE(Utf8Of(text) + (first ? "" : "(null)") + " and " + Utf8Of(other) + (second ? "" : "(null)"));
            for (const bool fold : {false, true}) {
                const auto a = FoldedUnits(first, fold), b = FoldedUnits(second, fold);
                const bool shorter = a.size() < b.size();
                const auto length = static_cast<long>(std::min(a.size(), b.size()));
                const int plain = !fold && !first != !second ? (first ? 1 : -1) : Order(a, b);
                const int starts = same ? 0 : shorter ? -1 : Order(std::vector<int>(a.begin(), a.begin() + length), b);
                const int ends = same ? 0 : shorter ? -1 : Order(std::vector<int>(a.end() - length, a.end()), b);
                const bool occurs = !b.empty() && std::search(a.begin(), a.end(), b.begin(), b.end()) != a.end();
                const auto check = [&](const auto& with, bool rawNull, bool contained) {
                    EXPECT_EQ(Sign(fold ? text.cmpi(with) : text.cmp(with)), rawNull ? -1 : plain);
                    EXPECT_EQ(Sign(fold ? text.cmppi(with) : text.cmpp(with)), rawNull ? -1 : starts);
                    EXPECT_EQ(Sign(fold ? text.cmp_pi(with) : text.cmp_p(with)), rawNull ? -1 : ends);
                    EXPECT_EQ(fold ? text.cnti(with) : text.cnt(with), contained);
                };
                check(other, false, same || occurs);
                check(second, fold && !second, occurs);
            }
            EXPECT_EQ(text.pcmp(other) == 0, same);
            EXPECT_EQ(text.pcmp(other), -other.pcmp(text));
            EXPECT_EQ(text.iequals(other), FoldedUnits(first, true) == FoldedUnits(second, true));
            EXPECT_TRUE((text == second) == (text.cmp(second) == 0) && (text != second) == (text.cmp(second) != 0));
            EXPECT_EQ(text == other, same);
        }
}

// Intended: pool-length, pool-suffix
TEST(PooledString, SuffixesCountPairsAsOneIntended) {
    const CPPoolString text(L"a\U0001F600bc");
    EXPECT_TRUE(text.len() == 4 && text.cmpp(L"a") == 0 && text.cmp_p(L"bc") != 0) << "looks one unit too early";
    EXPECT_TRUE(text.cnt(L"b") && !text.cnt(L"bc")) << "searches len() units";
}

// Its elements, a bar behind each.
std::string Elements(const CPPoolStringArray& array) {
    std::string elements;
    for (std::size_t i = 0; i < array.GetNItems(); ++i)
        elements += (array[i].isnull() ? "null" : Utf8Of(array[i])) + '|';
    return elements;
}

CPPoolStringArray ListOf(std::initializer_list<const wchar_t*> texts) {
    CPPoolStringArray array(false);
    for (const wchar_t* text : texts) EXPECT_TRUE(array.Add(text));
    return array;
}

TEST(StringArray, SortedOneIsASet) {
    std::mt19937 random(1);
    CPPoolStringArray array(true);
    std::set<std::string> model;
    bool held = false; // an element, ever
    for (int step = 0; step < 4000; ++step) {
        const std::string name = std::to_string(random() % 90);
        const CPPoolString text(name.c_str());
        const bool add = random() % 2;
        ASSERT_TRUE(add ? array.Add(text) : array.Delete(text));
        add ? void(model.insert(name)) : void(model.erase(name));
        held |= add;
        const auto place = static_cast<std::size_t>(std::distance(model.begin(), model.lower_bound(name)));
        // Intended: array-locate
        ASSERT_EQ(array.LocateEntry(text), held ? place : TAVO::Buffers::NotFound);
        ASSERT_EQ(array.GetNItems(), model.size());
    }
    std::string expected;
    for (const std::string& name : model) expected += name + '|';
    EXPECT_EQ(Elements(array), expected);
    EXPECT_FALSE(array.Insert(L"x", 0));
    ASSERT_TRUE(array.Add(nullptr) && array.Add(L""));
    EXPECT_TRUE(array[0].isnull() && array[1].isempty()) << "null sorts first";
}

TEST(StringArray, UnsortedOneIsAList) {
    CPPoolStringArray array = ListOf({L"b", L"a", L"b"});
    EXPECT_TRUE(array.Insert(L"c", 1) && array.Insert(array[0], 4));
    EXPECT_FALSE(array.Insert(L"d", 6) || array.Delete(L"a") || array.LocateEntry(L"a") + 1);
    const CPPoolStringArray holder(array);
    CPPoolStringArray longer(array), inserted(array);
    EXPECT_TRUE(longer.Add(L"d") && inserted.Insert(L"d", 0));
    array.Sort();
    EXPECT_EQ(Elements(array), "a|b|b|b|c|");
    EXPECT_EQ(Elements(holder), "b|c|a|b|b|") << "copies never change each other";
}

TEST(StringArray, TakesBlocksOfPooledStrings) {
    TAVO::Buffers::CPObjectVector<CPPoolString> block;
    for (const wchar_t* text : {L"b", L"a", L"b"}) ASSERT_TRUE(block.Insert(text, SIZE_MAX));
    CPPoolStringArray list(false), set(true);
    list = block, set = block;
    EXPECT_EQ(Elements(list), "b|a|b|");
    // Intended: array-duplicates
    EXPECT_EQ(Elements(set), "a|b|b|") << "sorted; duplicates stay";
    list = TAVO::Buffers::CPOMVector(2);
    const support::FailingHeap heap(0);
    set = block;
    EXPECT_TRUE(list.isEmpty() && set.isEmpty()) << "another type; no memory for a sorted copy";
}

TEST(StringArray, JoinsWithTheSeparator) {
    EXPECT_TRUE(CPPoolStringArray(false).Flatten(L',').isnull());
    EXPECT_TRUE(ListOf({nullptr}).Flatten(L',').isempty());
    EXPECT_STREQ(Entry(ListOf({nullptr, L"", L"x"}).Flatten(L',')), L",,x");
    const wchar_t* const pairs = L"p\U0001F600\U0001F601;q";
    EXPECT_EQ(ListOf({L"p\U0001F600\U0001F601", L"q"}).Flatten(L';').cmp(pairs), 0) << "all units, not len()";
}

// Intended: split-trailing
TEST(StringArray, SplitsAtTheSeparator) {
    using Row = std::tuple<const wchar_t*, wchar_t, bool, const char*>;
    for (const auto& [text, separator, sorted, expected] :
         {Row{L"a,b", ',', false, "a|b|"}, Row{L",x", ',', false, "null|x|"}, Row{L"x,", ',', false, "x|"},
          Row{L",", ',', false, "null|"}, Row{L"a,,b", ',', false, "a|null|b|"}, Row{L"", ',', false, ""},
          Row{nullptr, ',', false, ""}, Row{L"a,b", 0, false, "a,b|"}, Row{L"b,a,b,,a", ',', true, "null|a|b|"}}) {
        CPPoolStringArray array(sorted);
        EXPECT_TRUE(array.Add(L"old") && array.Inflate(text, separator));
        EXPECT_EQ(Elements(array), expected);
    }
    const wchar_t* const pairs = L"a\U0001F600,\U0001F601b,c";
    CPPoolStringArray array(false);
    EXPECT_TRUE(array.Inflate(pairs, L',') && array.GetNItems() == 3 && array[2] == L"c");
    EXPECT_TRUE(array.Inflate(pairs, 0xDE00) && array.GetNItems() == 2 && array[0].isnull()) << "half a pair";
    EXPECT_TRUE(array.Inflate(array[1], L',') && array.GetNItems() == 3) << "from one of its own elements";
}

TEST(StringArray, WithoutMemoryStaysAsItWas) {
    const CPPoolString source(L"one,two,,three"), a(L"a"), b(L"b");
    support::ForEachFailingAllocation([&] {
        CPPoolStringArray array(false), set(true);
        const CPPoolString joined = array.Inflate(source, L',') ? array.Flatten(L',') : CPPoolString();
        EXPECT_TRUE(joined.isnull() || joined == source);
        if (set.Add(b) && set.Add(a)) {
            CPPoolStringArray copy(set);
            const bool deleted = copy.Delete(a);
            EXPECT_TRUE(copy.GetNItems() == (deleted ? 1 : 2) && set.GetNItems() == 2);
        }
        array = CPPoolStringArray(false);
        EXPECT_TRUE(support::Sweep());
    });
}

} // namespace
