// Interning against a slow reading of its rules: keys, identity, cut texts, case groups, sweeps, submitters.

#include "plugin/pool.h"
#include "support/assertions.h"
#include "support/guardpage.h"
#include "support/heapwatch.h"
#include "support/machine.h"
#include "support/texts.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <gtest/gtest.h>
#include <optional>
#include <string>
#include <TAVO/string.h>
#include <thread>
#include <vector>

using namespace TAVO::String;
using support::Bytes;
using support::Texts;
using support::Units;

namespace {

constexpr std::size_t kAll = SIZE_MAX;
using Wide = std::vector<wchar_t>;

const wchar_t* Terminated(Wide& text) {
    text.push_back(0);
    return text.data();
}
const unsigned char* Utf8(const char* text) { return reinterpret_cast<const unsigned char*>(text); }
void Sweep(int times = 1) {
    for (int i = 0; i < times; ++i) EXPECT_TRUE(CStringPool::Collect(60000));
}

const wchar_t* Entry(const CPPoolString& text) { return text; }

// --- keys, computed slowly -------------------------------------------------------------------------------------------

unsigned long long Checksum(const std::vector<unsigned>& values, bool folded) {
    unsigned long long crc = 0;
    for (unsigned value : values) {
        if (folded && value >= 'A' && value <= 'Z') value += 'a' - 'A';
        for (const unsigned byte : {value & 0xFF, value >> 8 & 0xFF})
            for (int bit = 7; bit >= 0; --bit)
                crc = crc << 1 ^ ((crc >> 63 ^ (byte >> bit & 1)) ? 0x42F0E1EBA9EA3693 : 0);
    }
    return crc;
}

struct Expected {
    std::size_t length = 0, utf8Size = 0;
    std::vector<unsigned> values;
    Wide units;
};

// What interning the first n units gives; nothing for the null string.
std::optional<Expected> Read(const Units& text, std::size_t n) {
    Expected e;
    for (std::size_t i = 0; i < text.size() && i < n;) {
        unsigned value = text[i];
        std::size_t taken = 1;
        if (value >= 0xD800 && value < 0xE000) {
            if (value < 0xDC00 && i + 1 == n) break; // cut
            if (value >= 0xDC00 || i + 1 == text.size() || text[i + 1] < 0xDBFF) return {};
            value = value % 0x400 || text[i + 1] % 0x400;
            taken = 2;
        }
        for (std::size_t k = 0; k < taken; ++k) e.units.push_back(static_cast<wchar_t>(text[i + k]));
        e.values.push_back(value);
        e.utf8Size += value < 0x80 ? 1 : value < 0x800 ? 2 : 3;
        ++e.length;
        i += taken;
    }
    return e;
}

std::optional<Expected> Read(const Bytes& text, std::size_t n) {
    Expected e;
    bool beyond = false;
    std::size_t i = 0;
    while (i < text.size() && i < n) {
        const unsigned lead = text[i];
        const std::size_t size = lead < 0x80 ? 1 : lead < 0xC0 || lead > 0xF4 ? 0 : 2 + (lead >= 0xE0) + (lead >= 0xF0);
        if (size == 0) return {};
        unsigned value = size == 1 ? lead : lead & (0x7Fu >> size);
        for (std::size_t k = 1; k < size; ++k) {
            if (i + k == n && n <= text.size()) goto end; // cut, and nothing wrong with what is there
            if (i + k >= text.size() || text[i + k] / 0x40 != 2) return {};
            value = value << 6 | (text[i + k] & 0x3F);
        }
        beyond |= value > 0x10FFFF;
        if (value > 0xFFFF) e.units.push_back(static_cast<wchar_t>(0xD800 | value >> 10));
        e.units.push_back(static_cast<wchar_t>(value > 0xFFFF ? 0xDC00 | (value & 0x3FF) : value));
        e.values.push_back(value);
        e.length += value > 0xFFFF ? 2 : 1;
        i += size;
    }
end:
    e.utf8Size = i;
    if (beyond) return {};
    return e;
}

// What is wrong with an entry; empty when all is as expected.
std::string Wrong(const CPPoolString& text, const std::optional<Expected>& expected) {
    if (!expected) return text.isnull() ? "" : "not null";
    if (expected->values.empty()) return text.isempty() ? "" : "not empty";
    if (text.len() != expected->length) return "length";
    if (text.UTF8Size() != expected->utf8Size) return "UTF-8 size";
    if (text.sHash() != Checksum(expected->values, false)) return "hash";
    if (text.sHashi() != Checksum(expected->values, true)) return "hash regardless of case";
    const wchar_t* units = text;
    if (units[expected->units.size()] || !std::equal(expected->units.begin(), expected->units.end(), units))
        return "units";
    return text.Verify() ? "" : "verify";
}

// A text under way in every spelling: whole, at most n units, looked up, with memory that ends where it may be read.
template <class Unit, class Text> void CheckText(const support::GuardedMemory& memory, const Text& text, bool cutAll) {
    Text terminated(text);
    terminated.push_back(0);
    const auto* whole = reinterpret_cast<const Unit*>(memory.Place(terminated.data(), terminated.size()));
    {
        const CPPoolString first = CStringPool::GetStringRef(whole);
        ASSERT_EQ(Wrong(first, Read(text, kAll)), "");
        for (const auto& same : {CStringPool::GetStringRef(whole), CStringPool::QueryStringRef(whole),
                                 CStringPool::GetStringRefn(whole, kAll), CStringPool::GetStringRefi(whole),
                                 CStringPool::QueryStringRefni(whole, text.size() + 1)})
            ASSERT_EQ(Entry(same), Entry(first));
    }
    Sweep(2);
    for (std::size_t n = cutAll ? 0 : text.size(); n <= text.size(); ++n) {
        const auto* cut = reinterpret_cast<const Unit*>(memory.Place(text.data(), n));
        const auto part = Read(text, n);
        const bool def = part && !part->values.empty();
        ASSERT_EQ(CStringPool::QueryStringRefn(cut, n).isdef(), false);
        ASSERT_EQ(Wrong(CStringPool::GetStringRefn(cut, n), part), "") << n << " of " << text.size();
        ASSERT_EQ(CStringPool::QueryStringRefn(cut, n).isdef(), def);
        ASSERT_EQ(CStringPool::QueryStringRefni(cut, n).isdef(), def);
        Sweep(2);
    }
}

TEST(PoolKeys, FollowTheRulesForEveryText) {
    const support::Assertions assertions;
    const support::GuardedMemory memory;
    support::TextSource source(1);
    for (int i = 0; i < 150; ++i) {
        const std::size_t length = source.Below(i % 8 ? 40 : 300);
        ASSERT_NO_FATAL_FAILURE(CheckText<unsigned char>(memory, source.Utf8(length), i % 16 == 0));
        ASSERT_NO_FATAL_FAILURE(CheckText<wchar_t>(memory, source.Utf16(length), i % 16 == 0));
    }
    for (const Units& text : {Units{'A', 'b', 'C', 'Z', '[', '@', 'z', '{', '`'}, Units{0xD800, 0xDC00},
                              Units{0xD83D, 0xDBFF}, Units{0xD83D, 0xE000, 0xD83D, 0xFFFF}, Units{'a', 0xDC00, 'b'},
                              Units{'a', 0xD83D}, Units{0xC1, 0xC0, 0x41C0, 0x410}})
        ASSERT_NO_FATAL_FAILURE(CheckText<wchar_t>(memory, text, true));
    for (const std::string text : {"\xC1\x81", "x\xC0\x80y", "\xED\xA0\x80\xED\xB0\x80", "\xF4\x8F\xBF\xBF",
                                   "\xF4\x90\x80\x80", "\xF0\x80\x81\x81", "\x80", "ab\xE4\xB8", "abcd\xFF"})
        ASSERT_NO_FATAL_FAILURE(CheckText<unsigned char>(memory, Bytes(text.begin(), text.end()), true)) << text;
    EXPECT_EQ(assertions.Take(), Texts());
}

TEST(PoolKeys, OverlongFormMeetsItsShortForm_Intended) {
    for (const auto& first : {CPPoolString(L"A")}) {
        EXPECT_EQ(Entry(CPPoolString(Utf8("\xC1\x81"))), Entry(first));
        EXPECT_EQ(first.UTF8Size(), 1u);
    }
    Sweep(2);
    const CPPoolString overlong(Utf8("\xC1\x81")), shortForm(L"A");
    EXPECT_EQ(Entry(shortForm), Entry(overlong));
    EXPECT_EQ(shortForm.UTF8Size(), 2u) << "who came first decides";
}

// --- ten units -------------------------------------------------------------------------------------------------------

// Adds the checksum's generator to five units from `at` on: the checksum stays.
Wide WithGenerator(Wide text, std::size_t at) {
    const unsigned generator[] = {0x0100, 0xF042, 0xEBE1, 0xEAA9, 0x9336};
    for (std::size_t i = 0; i < 5; ++i) text[at + i] = static_cast<wchar_t>(text[at + i] ^ generator[i]);
    return text;
}

TEST(PoolTenUnits, DecideBetweenEqualKeys_Intended) {
    for (std::size_t at = 0; at < 20; ++at) {
        Wide text(30, L'\u4000'), twin = WithGenerator(text, at);
        const CPPoolString first(Terminated(text)), second(Terminated(twin));
        ASSERT_TRUE(first.sHash() == second.sHash() && first.sHashi() == second.sHashi());
        EXPECT_EQ(Entry(first) == Entry(second), at >= 10) << at;
        EXPECT_EQ(Entry(second)[at] == text[at], at >= 10);
        EXPECT_EQ(Entry(CStringPool::GetStringRefi(twin.data())), Entry(second));
        EXPECT_TRUE(CStringPool::Verify());
    }
}

TEST(PoolTenUnits, CapitalsThatCancelOutKeepTheirGroup) {
    // Capitals, one of them among the first ten letters, that leave no trace in the checksum.
    const wchar_t* const variants[] = {L"qqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqq",
                                       L"qqqqqqqqqQqQqqqqQqQQQQqqqqQQQqqqqQQQQqQqQQQqQqQqqQQQQqQqQqqqQQqQQqQqqQqqQQ"};
    for (const int first : {0, 1}) {
        CPPoolString one(variants[first]);
        CPPoolString two(variants[!first]);
        ASSERT_TRUE(one.sHash() == two.sHash() && Entry(one) != Entry(two));
        for (const wchar_t* text : variants) EXPECT_EQ(Entry(CStringPool::GetStringRefi(text)), Entry(one));
        one.free();
        Sweep(2);
        for (const wchar_t* text : variants) EXPECT_EQ(Entry(CStringPool::GetStringRefi(text)), Entry(two));
        two.free();
        Sweep(2);
    }
}

// --- the public names ------------------------------------------------------------------------------------------------

TEST(Pool, NullAndEmptyTextsHaveTheirOwnEntries) {
    const wchar_t* const noWide = nullptr;
    const unsigned char* const noUtf8 = nullptr;
    const support::FailingHeap heap(0);
    for (const std::size_t n : {std::size_t{0}, std::size_t{5}, kAll}) {
        EXPECT_TRUE(CStringPool::GetStringRefn(noWide, n).isnull() && CStringPool::GetStringRefni(noUtf8, n).isnull());
        EXPECT_TRUE(CStringPool::GetStringRefn(L"", n).isempty() && CStringPool::GetStringRefni(Utf8(""), n).isempty());
    }
    EXPECT_TRUE(CStringPool::GetStringRef(noWide).isnull() && CStringPool::QueryStringRefi(noUtf8).isnull());
    EXPECT_TRUE(CStringPool::GetStringRef(static_cast<IStringSubmitter*>(nullptr)).isnull());
}

TEST(Pool, CaseGroupsAnswerTheEarliestVariant) {
    std::vector<CPPoolString> variants;
    for (unsigned mask = 0; mask < 64; ++mask) {
        wchar_t text[] = L"abcdef group";
        for (unsigned bit = 0; bit < 6; ++bit)
            if (mask * 29 % 64 >> bit & 1) text[bit] = static_cast<wchar_t>(text[bit] - 32);
        variants.emplace_back(text);
    }
    for (const std::size_t gone : {5, 0, 60, 30, 1}) variants.erase(variants.begin() + static_cast<long>(gone));
    while (!variants.empty()) {
        Sweep(2);
        EXPECT_EQ(Entry(CStringPool::QueryStringRefi(L"ABCDEF GROUP")), Entry(variants.front()));
        EXPECT_EQ(Entry(CStringPool::GetStringRefi(Utf8("aBcDeF gRoUp"))), Entry(variants.front()));
        variants.erase(variants.begin(), variants.begin() + std::min<long>(7, static_cast<long>(variants.size())));
    }
    Sweep(2);
    EXPECT_STREQ(Entry(CStringPool::GetStringRefi(L"ABCdef Group")), L"ABCdef Group") << "the first of a new group";
}

// --- sweeps ----------------------------------------------------------------------------------------------------------

bool IsKept(const wchar_t* text) { return !CStringPool::QueryStringRef(text).isnull(); }

TEST(PoolSweep, TakesEntriesAtTheSecondIdleSweepInARow) {
    Sweep(2);
    const auto items = CStringPool::GetNItems(), size = CStringPool::GetSize();
    CPPoolString text(L"swept");
    const auto without = support::LiveBlocks();
    for (int times = 0; times < 2; ++times) {
        text = L"swept"; // the second time: between the sweeps
        EXPECT_EQ(*static_cast<const unsigned char*>(text), 's');
        EXPECT_TRUE(CStringPool::GetNItems() == items + 1 && CStringPool::GetSize() > size);
        Sweep(3);
        EXPECT_EQ(support::LiveBlocks(), without + 1) << "held";
        text.free();
        Sweep();
        EXPECT_EQ(support::LiveBlocks(), without) << "the UTF-8 form goes first";
        EXPECT_TRUE(IsKept(L"swept")) << "a look-up does not prolong its life";
    }
    Sweep();
    EXPECT_FALSE(IsKept(L"swept"));
    EXPECT_TRUE(CStringPool::GetNItems() == items && CStringPool::GetSize() == size);
    EXPECT_EQ(Entry(CStringPool::QueryStringRef(L"true")), Entry(CPPoolString::ptrue)) << "never taken";
    EXPECT_EQ(Wrong(CPPoolString::pfalse, Read(Units{'f', 'a', 'l', 's', 'e'}, kAll)), "");
}

TEST(PoolSweep, InInstalmentsReachesEveryBucket) {
    std::vector<CPPoolString> texts;
    for (int i = 0; i < 5000; ++i) texts.emplace_back(i + 7000000);
    Sweep();
    const auto items = CStringPool::GetNItems();
    texts.clear();
    for (int call = 0; call < 200000 && CStringPool::GetNItems() > items - 5000; ++call) CStringPool::Collect(0);
    EXPECT_LE(CStringPool::GetNItems(), items - 5000);
}

// Thousands of texts that are asked for again and again, half of which go: what the pool remembers of them must go too.
TEST(PoolSweep, ForgetsWhatWasAskedForOften) {
    constexpr int kTexts = 6000;
    Sweep(2);
    const auto items = CStringPool::GetNItems();
    const auto without = support::LiveBlocks();
    {
        std::vector<CPPoolString> texts;
        for (int i = 0; i < kTexts; ++i) texts.emplace_back(i + 8000000);
        for (int round = 0; round < 2; ++round)
            for (int i = 0; i < kTexts; ++i) ASSERT_EQ(CPPoolString(i + 8000000), texts[static_cast<std::size_t>(i)]);
        for (std::size_t i = 0; i < kTexts; i += 2) texts[i].free();
        Sweep(2);
        EXPECT_EQ(CStringPool::GetNItems(), items + kTexts / 2);
        for (int i = 0; i < kTexts; ++i) {
            const CPPoolString again(i + 8000000);
            ASSERT_EQ(std::to_string(i + 8000000),
                      reinterpret_cast<const char*>(static_cast<const unsigned char*>(again)));
            ASSERT_TRUE(i % 2 == 0 || again == texts[static_cast<std::size_t>(i)]) << i;
        }
        EXPECT_TRUE(CStringPool::Verify());
    }
    Sweep(2);
    EXPECT_TRUE(CStringPool::GetNItems() == items && support::LiveBlocks() == without);
}

// --- submitters ------------------------------------------------------------------------------------------------------

struct Submitter : IStringSubmitter {
    Submitter(std::size_t announced, Wide text, int how = 1) : announced(announced), text(std::move(text)), how(how) {}
    std::size_t GetStringLen() override { return announced; }
    bool GetString(wchar_t* out) override {
        for (std::size_t i = 0; i <= announced; ++i) EXPECT_EQ(out[i], 0) << "room that is zeroed";
        std::copy(text.begin(), text.end(), out);
        // Called without the lock: another thread gets in meanwhile.
        std::thread([] { EXPECT_NE(CPPoolString(L"meanwhile").len(), 1u); }).join();
        return how < 0 ? throw 1 : how > 0;
    }
    std::size_t announced;
    Wide text;
    int how; // below 0: throws; 0: refuses
};

TEST(PoolSubmitters, WriteTheirTextIntoTheEntry) {
    const support::Assertions assertions;
    struct Row {
        const char* name;
        Submitter submitter;
        const wchar_t* expected; // null: the null string
    };
    Row rows[] = {
        {"whole", {4, {'a', 'b', 'c', 'd'}}, L"abcd"},
        {"short", {400, {'a', 'b', 'c'}}, L"abc"},
        {"ends within", {5, {'a', 0, 'c', 'd', 'e'}}, L"a"},
        {"nothing written", {5, {}}, L""},
        {"refused", {3, {'a', 'b', 'c'}, 0}, nullptr},
        {"throwing", {3, {'a', 'b', 'c'}, -1}, nullptr},
        {"half a pair inside", {3, {'a', 0xD83D, 'c'}}, nullptr},
        {"half a pair before the end", {9, {'a', 0xD83D}}, nullptr},
        {"already there", {4, {'t', 'r', 'u', 'e'}}, L"true"},
    };
    for (Row& row : rows) {
        const CPPoolString text = CStringPool::GetStringRef(&row.submitter);
        EXPECT_TRUE(text.Verify() && Entry(text) == Entry(CPPoolString(row.expected))) << row.name;
        EXPECT_EQ(text.isnull(), row.expected == nullptr) << row.name;
    }
    for (const std::size_t announced : {kAll, kAll / 4, std::size_t{0}}) {
        Submitter submitter(announced, {});
        EXPECT_TRUE(CStringPool::GetStringRef(&submitter).isnull());
    }
    EXPECT_EQ(assertions.Take(), Texts{"_cppoolstring::create [submitter]: String length cannot be 0"});
    const CPPoolString meanwhile(L"meanwhile");
    const auto before = CStringPool::GetSize();
    const CPPoolString normal(L"abcy");
    const auto each = CStringPool::GetSize() - before;
    Submitter shortText(100000, {'a', 'b', 'c', 'z'});
    const CPPoolString text = CStringPool::GetStringRef(&shortText);
    EXPECT_EQ(CStringPool::GetSize(), before + 2 * each) << "unused room is given back";
}

// --- integrity and memory --------------------------------------------------------------------------------------------

TEST(Pool, VerifyFindsADamagedEntry) {
    const support::Assertions assertions;
    const CPPoolString text(L"to be damaged");
    auto* units = const_cast<wchar_t*>(Entry(text));
    for (const std::size_t at : {0u, 6u, 12u}) {
        const wchar_t old = std::exchange(units[at], L'#');
        EXPECT_FALSE(text.Verify() || CStringPool::Verify());
        EXPECT_EQ(assertions.Take(), (Texts{"String pool integrity violation", "String pool integrity violation"}));
        units[at] = old;
    }
    EXPECT_TRUE(text.Verify() && CPPoolString().Verify() && CStringPool::Verify());
}

TEST(Pool, WithoutMemoryGivesNullAndStaysWhole) {
    const support::Assertions assertions;
    const CPPoolString variant(L"a text that may not fit"), second(L"a text that MAY not fit");
    int number = 0;
    support::ForEachFailingAllocation([&] {
        Sweep(2);
        const auto items = CStringPool::GetNItems();
        ++number;
        {
            const CPPoolString texts[] = {CStringPool::GetStringRef(L"A text that may not fit"),
                                          CStringPool::GetStringRef(Utf8("a TEXT that may not fit")),
                                          CStringPool::GetStringRefi(L"another text"), CPPoolString(number)};
            Submitter submitter(40, {'s', 'u', 'b'});
            const CPPoolString submitted = CStringPool::GetStringRef(&submitter);
            std::size_t made = !submitted.isnull();
            for (const auto& text : texts) made += !text.isnull();
            EXPECT_EQ(CStringPool::GetNItems(), items + made + IsKept(L"meanwhile"));
            EXPECT_STREQ(Entry(CStringPool::QueryStringRefi(L"A TEXT THAT MAY NOT FIT")), Entry(variant));
        }
        EXPECT_TRUE(CStringPool::Verify());
        Sweep(2);
        EXPECT_EQ(CStringPool::GetNItems(), items);
    });
    EXPECT_EQ(assertions.Take(), Texts());
}

TEST(Pool, IsUsedByManyThreadsWhileItIsSwept) {
    std::atomic<bool> stop{false};
    std::thread sweeper([&] {
        // With pauses: beside a loop without any, the others get their turns some milliseconds apart.
        for (; !stop; std::this_thread::sleep_for(std::chrono::milliseconds(1)))
            CStringPool::Collect(1), CStringPool::GetSize();
    });
    std::vector<std::thread> threads;
    std::atomic<int> wrong{0};
    for (int t = 0; t < 4; ++t)
        threads.emplace_back([&, t] {
            std::vector<CPPoolString> held(8);
            for (int i = 0; i < 3000; ++i) {
                const std::string name = (i % 3 ? "Thread " : "thread ") + std::to_string((i * 7 + t * 13) % 64);
                const CPPoolString text(Utf8(name.c_str())), again(name.c_str());
                wrong += Entry(text) != Entry(again);
                wrong += !CStringPool::GetStringRefi(Utf8(name.c_str())).iequals(text);
                wrong += *static_cast<const unsigned char*>(text) != static_cast<unsigned char>(name[0]);
                held[static_cast<std::size_t>(i % 8)] = text;
            }
        });
    for (auto& thread : threads) thread.join();
    stop = true;
    sweeper.join();
    EXPECT_EQ(wrong, 0);
    EXPECT_TRUE(CStringPool::Verify());
}

// A host's static objects: made before main and ended after it, both times with the pool at hand.
struct HostStatic {
    CPPoolString text{L"made by a static constructor"};
    const wchar_t* entry = text;
    ~HostStatic() {
        const CPPoolString late(L"made by a static destructor");
        if (!late.isdef() || Entry(text) != entry || Entry(CPPoolString(entry)) != entry) std::abort();
    }
} g_static;

TEST(Pool, ServesStaticObjects) {
    EXPECT_EQ(Entry(CPPoolString(L"made by a static constructor")), g_static.entry);
    CPPoolString mine;
    const wchar_t* late = nullptr;
    {
        const support::Plugin plugin("TAVOTestPlugin");
        const auto held = plugin.Find<plugin::HeldEntry>(plugin::kHeldEntry);
        ASSERT_NE(held, nullptr);
        mine = plugin::kHeldText;
        Sweep(2);
        EXPECT_EQ(held(&late), Entry(mine));
    }
    EXPECT_EQ(Entry(CStringPool::QueryStringRef(plugin::kLateText)), late) << "its destructor ran, and interned";
}

} // namespace
