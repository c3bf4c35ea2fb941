// Interning against a slow reading of its rules: keys, identity, cut texts, case groups, sweeps, submitters.

#include "plugin/pool.h"
#include "support/guardpage.h"
#include "support/heapwatch.h"
#include "support/log.h"
#include "support/machine.h"
#include "support/texts.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <optional>
#include <random>
#include <thread>

using namespace TAVO::String;
using namespace support;

namespace {

constexpr std::size_t kAll = SIZE_MAX;
using Wide = std::vector<wchar_t>;

unsigned long long Checksum(const std::vector<unsigned>& values, bool folded) {
    Bytes bytes;
    for (unsigned value : values) {
        if (folded && value >= 'A' && value <= 'Z') value += 'a' - 'A';
        for (const unsigned byte : {value, value >> 8}) bytes.push_back(static_cast<unsigned char>(byte));
    }
    return TAVO::Buffers::CMachineCRC(64, 0x42F0E1EBA9EA3693).Eval(bytes.data(), bytes.size(), 0);
}

struct Expected {
    std::size_t length = 0, utf8Size = 0;
    std::vector<unsigned> values;
    Units16 units;
};

// What interning the first n units gives; nothing for the null string.
template <class Text> std::optional<Expected> Read(Text text, std::size_t n) {
    constexpr bool kUtf8 = sizeof(text[0]) == 1;
    Expected e;
    std::size_t i = 0;
    Character c;
    text.push_back(0);
    for (; (c = LookAt(text, i, n)).look == Look::Good; i += c.units) {
        if (c.value > 0x10FFFF) return {};
        const Units16 units = kUtf8 ? Encoded16(c.value) : Units16(&text[i], &text[i] + c.units);
        e.units.insert(e.units.end(), units.begin(), units.end());
        e.values.push_back(c.value);
        e.length += kUtf8 ? units.size() : 1;
        e.utf8Size += kUtf8 ? c.units : Encoded8(c.value).size();
    }
    bool good = c.look == Look::Ended;
    if (kUtf8 && text[i]) // cut: what is there must be right nevertheless
        for (std::size_t k = i + 1; k < n && k < text.size(); ++k) good &= text[k] / 0x40 == 2;
    return good ? std::optional(e) : std::nullopt;
}

// What is wrong with an entry; empty when all is as expected.
std::string Wrong(const CPPoolString& text, const std::optional<Expected>& expected) {
    if (!expected) return text.isnull() ? "" : "not null";
    if (expected->values.empty()) return text.isempty() ? "" : "not empty";
    if (text.len() != expected->length) return "length";
    if (text.UTF8Size() != expected->utf8Size) return "UTF-8 size";
    if (text.sHash() != Checksum(expected->values, false)) return "hash";
    if (text.sHashi() != Checksum(expected->values, true)) return "hash regardless of case";
    const wchar_t* const units = text;
    if (units[expected->units.size()] || !std::equal(expected->units.begin(), expected->units.end(), units))
        return "units";
    return text.Verify() ? "" : "verify";
}

// A text under way in every spelling: whole, at most n units, looked up, with memory that ends where it may be
// read.
template <class Unit, class Text> void CheckText(const GuardedMemory& memory, const Text& text, bool cutAll) {
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
    Sweep();
    for (std::size_t n = cutAll ? 0 : text.size(); n <= text.size(); ++n) {
        const auto* cut = reinterpret_cast<const Unit*>(memory.Place(text.data(), n));
        const auto part = Read(text, n);
        const bool def = part && !part->values.empty();
        ASSERT_EQ(CStringPool::QueryStringRefn(cut, n).isdef(), false);
        ASSERT_EQ(Wrong(CStringPool::GetStringRefn(cut, n), part), "") << n << " of " << text.size();
        ASSERT_EQ(CStringPool::QueryStringRefn(cut, n).isdef(), def);
        ASSERT_EQ(CStringPool::QueryStringRefni(cut, n).isdef(), def);
        Sweep();
    }
}

TEST(PoolKeys, FollowTheRulesForEveryText) {
    const Assertions assertions;
    const GuardedMemory memory;
    TextSource source(1);
    for (int i = 0; i < 96; ++i) {
        const std::size_t length = source.Below(i % 8 ? 40 : 300);
        ASSERT_NO_FATAL_FAILURE(CheckText<unsigned char>(memory, source.Utf8(length), i % 16 == 0));
        ASSERT_NO_FATAL_FAILURE(CheckText<wchar_t>(memory, source.Utf16(length), i % 16 == 0));
    }
    for (const Units16& text : {Units16{'A', 'b', 'C', 'Z', '[', '@', 'z', '{', '`'},
                                Units16{0xD83D, 0xDBFF, 0xD800, 0xDC00}, Units16{0xC1, 0xC0, 0x41C0, 0x410}})
        ASSERT_NO_FATAL_FAILURE(CheckText<wchar_t>(memory, text, true));
    for (const std::string text : {"x\xC0\x80y", "\xEF\xBF\xBF\xF0\x90\x80\x80", "\xF4\x90\x80\x80", "ab\xE4\xB8",
                                   "\xF0\x9F\x61\x80", "\xE4\xFF\x80"})
        ASSERT_NO_FATAL_FAILURE(CheckText<unsigned char>(memory, Bytes(text.begin(), text.end()), true)) << text;
    // ASCII by blocks and lines, with a capital in each of their places.
    for (const std::size_t length : {8, 15, 16, 17, 31, 263, 264, 272, 335, 400, 1000})
        for (const std::size_t capital : {std::size_t{0}, length / 3, length / 2, length - 1, length}) {
            Bytes text(length);
            for (std::size_t i = 0; i < length; ++i)
                text[i] = static_cast<unsigned char>(i == capital ? 'K' : '`' + i % 29);
            ASSERT_NO_FATAL_FAILURE(CheckText<unsigned char>(memory, text, false)) << length << " " << capital;
        }
    EXPECT_EQ(assertions.Take(), Texts());
}

TEST(PoolKeys, OverlongFormMeetsItsShortForm_Intended) {
    for (const std::string earlier : {"A", "\xC1\x81"}) {
        Sweep();
        const CPPoolString first(Utf8(earlier.c_str())), overlong(Utf8("\xC1\x81")), shortForm(L"A");
        EXPECT_EQ(Entry(shortForm), Entry(overlong));
        EXPECT_EQ(shortForm.UTF8Size(), earlier.size()) << "who came first decides";
    }
}

// Intended: ten-units
TEST(PoolTenUnits, DecideBetweenEqualKeys_Intended) {
    // Added to five units, the checksum's generator leaves the checksum as it is.
    const unsigned generator[] = {0x0100, 0xF042, 0xEBE1, 0xEAA9, 0x9336};
    for (std::size_t at = 0; at < 20; ++at) {
        Wide text(31, L'\u4000'), twin(text);
        for (std::size_t i = 0; i < 5; ++i) twin[at + i] = static_cast<wchar_t>(twin[at + i] ^ generator[i]);
        text[30] = twin[30] = 0;
        const CPPoolString first(text.data()), second(twin.data());
        ASSERT_TRUE(first.sHash() == second.sHash() && first.sHashi() == second.sHashi());
        EXPECT_EQ(Entry(first) == Entry(second), at >= 10) << at;
        EXPECT_EQ(Entry(second)[at] == text[at], at >= 10);
        EXPECT_EQ(Entry(CStringPool::GetStringRefi(twin.data())), Entry(second));
        EXPECT_TRUE(CStringPool::Verify());
    }
}

TEST(PoolTenUnits, CapitalsThatCancelOutKeepTheirGroup) {
    // Capitals, one of them among the first ten letters, that leave no trace in the checksum.
    CPPoolString one(L"qqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqqq");
    const CPPoolString two(L"qqqqqqqqqQqQqqqqQqQQQQqqqqQQQqqqqQQQQqQqQQQqQqQqqQQQQqQqQqqqQQqQQqQqqQqqQQ");
    ASSERT_TRUE(one.sHash() == two.sHash() && Entry(one) != Entry(two));
    EXPECT_EQ(Entry(CStringPool::GetStringRefi(Entry(two))), Entry(one));
    one.free();
    Sweep();
    EXPECT_EQ(Entry(CStringPool::GetStringRefi(Entry(two))), Entry(two));
}

TEST(Pool, NullAndEmptyTextsTakeNoMemory) {
    const FailingHeap heap(0);
    for (const std::size_t n : {std::size_t{0}, std::size_t{5}, kAll})
        EXPECT_TRUE(CStringPool::GetStringRefni(Utf8(nullptr), n).isnull() &&
                    CStringPool::GetStringRefn(L"", n).isempty());
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
    for (; !variants.empty(); variants.erase(variants.begin())) {
        Sweep();
        EXPECT_EQ(Entry(CStringPool::QueryStringRefi(L"ABCDEF GROUP")), Entry(variants.front()));
        EXPECT_EQ(Entry(CStringPool::GetStringRefi(Utf8("aBcDeF gRoUp"))), Entry(variants.front()));
    }
    Sweep();
    EXPECT_STREQ(Entry(CStringPool::GetStringRefi(L"ABCdef Group")), L"ABCdef Group") << "the first of a new group";
}

bool IsKept(const wchar_t* text) { return !CStringPool::QueryStringRef(text).isnull(); }

TEST(PoolSweep, TakesEntriesAtTheSecondIdleSweepInARow) {
    Sweep();
    const auto items = CStringPool::GetNItems(), size = CStringPool::GetSize();
    CPPoolString text(L"swept");
    const auto without = LiveBlocks();
    for (int times = 0; times < 2; ++times) {
        text = L"swept"; // the second time: between the sweeps
        EXPECT_EQ(*static_cast<const unsigned char*>(text), 's');
        EXPECT_TRUE(CStringPool::GetNItems() == items + 1 && CStringPool::GetSize() > size);
        EXPECT_TRUE(Sweep(3) && LiveBlocks() == without + 1) << "held";
        text.free();
        EXPECT_TRUE(Sweep(1) && LiveBlocks() == without) << "the UTF-8 form goes first";
        // Intended: pool-idle
        EXPECT_TRUE(IsKept(L"swept")) << "a look-up does not prolong its life";
    }
    EXPECT_TRUE(Sweep(1) && !IsKept(L"swept") && CStringPool::GetNItems() == items && CStringPool::GetSize() == size);
    EXPECT_EQ(Entry(CStringPool::QueryStringRef(L"true")), Entry(CPPoolString::ptrue)) << "never taken";
    EXPECT_EQ(Wrong(CPPoolString::pfalse, Read(Units16{'f', 'a', 'l', 's', 'e'}, kAll)), "");
}

// Thousands of texts that are asked for again and again, half of which go: what the pool remembers of them must go
// too.
TEST(PoolSweep, InInstalmentsForgetsWhatWasAskedForOften) {
    Sweep();
    const auto items = CStringPool::GetNItems();
    std::vector<CPPoolString> texts;
    for (int i = 0; i < 6000; ++i) texts.emplace_back(i + 8000000);
    for (int round = 0; round < 4; ++round) {
        for (std::size_t i = 0; i < texts.size(); ++i) {
            const CPPoolString again(static_cast<int>(i) + 8000000);
            ASSERT_TRUE(Entry(again)[6] == '0' + i % 10 && (texts[i].isnull() || again == texts[i])) << i;
        }
        for (std::size_t i = 0; round == 1 && i < texts.size(); i += 2) texts[i].free();
        for (int call = 0; round == 1 && call < 200000 && CStringPool::GetNItems() > items + 3000; ++call)
            CStringPool::Collect(0);
    }
    texts.clear();
    EXPECT_TRUE(Sweep() && CStringPool::Verify() && CStringPool::GetNItems() == items);
}

// So many that the pool puts off what it can: it must find each, and give back what it took.
TEST(PoolSweep, ManyTextsAndTheirVariantsLeaveNothing) {
    Sweep();
    const auto items = CStringPool::GetNItems();
    const auto blocks = LiveBlocks();
    std::mt19937 random(5);
    struct Variants {
        CPPoolString texts[3]; // null until it is interned
        int first = -1;
    };
    std::vector<Variants> groups(15000);
    const wchar_t* const prefixes[] = {L"take ", L"Take ", L"TAKE "};
    for (int step = 0; step < 100000; ++step) {
        const std::size_t number = random() % groups.size();
        const int which = static_cast<int>(random() % 3);
        wchar_t text[16];
        const std::size_t end = std::copy(prefixes[which], prefixes[which] + 5, text) - text;
        for (std::size_t digit = 0, rest = number; digit < 6; ++digit, rest /= 10) text[end + digit] = L'0' + rest % 10;
        text[end + 6] = 0;
        Variants& group = groups[number];
        CPPoolString& known = group.texts[which];
        if (random() % 8 == 0) {
            const CPPoolString any = CStringPool::QueryStringRefi(text);
            ASSERT_TRUE(group.first < 0 ? any.isnull() : Entry(any) == Entry(group.texts[group.first])) << number;
            continue;
        }
        const CPPoolString found = CStringPool::QueryStringRef(text);
        ASSERT_EQ(Entry(found), Entry(known)) << number;
        const CPPoolString made(text);
        ASSERT_TRUE(made.Verify() && !made.isnull() && (known.isnull() || Entry(made) == Entry(known))) << number;
        known = made;
        if (group.first < 0) group.first = which;
    }
    EXPECT_TRUE(CStringPool::Verify() && CStringPool::GetNItems() > items + 30000);
    groups.clear();
    EXPECT_TRUE(Sweep() && CStringPool::GetNItems() == items);
    EXPECT_EQ(LiveBlocks(), blocks);
}

struct Submitter : IStringSubmitter {
    Submitter(std::size_t length, Wide units, int how = 1) : announced(length), text(std::move(units)), how(how) {}
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
    const Assertions assertions;
    using Row = std::pair<Submitter, const wchar_t*>; // null: the null string; half pairs give it, too
    for (auto [submitter, expected] : {Row{{400, {'a', 'b', 'c'}}, L"abc"}, Row{{5, {'a', 0, 'c', 'd', 'e'}}, L"a"},
                                       Row{{5, {}}, L""}, Row{{3, {'a', 'b', 'c'}, 0}, nullptr},
                                       Row{{3, {'a', 'b', 'c'}, -1}, nullptr}, Row{{3, {'a', 0xD83D, 'c'}}, nullptr},
                                       Row{{9, {'a', 0xD83D}}, nullptr}, Row{{4, {'t', 'r', 'u', 'e'}}, L"true"}}) {
        const CPPoolString text = CStringPool::GetStringRef(&submitter);
        EXPECT_TRUE(text.Verify() && Entry(text) == Entry(CPPoolString(expected)) && text.isnull() == !expected)
            << submitter.announced;
    }
    for (const std::size_t announced : {kAll, kAll / 4, std::size_t{0}}) {
        Submitter submitter(announced, {});
        EXPECT_TRUE(CStringPool::GetStringRef(&submitter).isnull());
    }
    EXPECT_EQ(assertions.Take(), Texts{"_cppoolstring::create [submitter]: String length cannot be 0"});
    Submitter shortText(100000, {'a', 'b', 'c', 'z'});
    const auto before = CStringPool::GetSize();
    const CPPoolString text = CStringPool::GetStringRef(&shortText);
    EXPECT_LT(CStringPool::GetSize(), before + 1000) << "unused room is given back";
}

TEST(Pool, VerifyFindsADamagedEntry) {
    const Assertions assertions;
    const CPPoolString text(L"to be damaged");
    for (const std::size_t at : {0u, 6u, 12u}) {
        const_cast<wchar_t*>(Entry(text))[at] ^= 1;
        EXPECT_FALSE(text.Verify() || CStringPool::Verify());
        const_cast<wchar_t*>(Entry(text))[at] ^= 1;
    }
    EXPECT_EQ(assertions.Take(), Texts(6, "String pool integrity violation"));
    EXPECT_TRUE(text.Verify() && CPPoolString().Verify() && CStringPool::Verify());
}

TEST(Pool, WithoutMemoryGivesNullAndStaysWhole) {
    const CPPoolString variant(L"a text that may not fit"), second(L"a text that MAY not fit");
    ForEachFailingAllocation([&] {
        Sweep();
        const auto items = CStringPool::GetNItems();
        {
            Submitter submitter(40, {'s', 'u', 'b'});
            const CPPoolString texts[] = {L"A text that may not fit", Utf8("a TEXT that may not fit"),
                                          CStringPool::GetStringRefi(L"another text"), 5550555,
                                          CStringPool::GetStringRef(&submitter)};
            const auto made = std::count_if(texts, texts + 5, [](auto& text) { return !text.isnull(); });
            EXPECT_EQ(CStringPool::GetNItems(), items + made + IsKept(L"meanwhile"));
            EXPECT_EQ(Entry(CStringPool::QueryStringRefi(L"A TEXT THAT MAY NOT FIT")), Entry(variant));
        }
        EXPECT_TRUE(CStringPool::Verify() && Sweep() && CStringPool::GetNItems() == items);
    });
}

TEST(Pool, IsUsedByManyThreadsWhileItIsSwept) {
    std::atomic<int> working{4}, wrong{0};
    std::vector<std::thread> threads;
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
            --working;
        });
    // With pauses, or the others get their turns some milliseconds apart.
    for (; working; std::this_thread::sleep_for(std::chrono::milliseconds(1))) CStringPool::Collect(1);
    for (auto& thread : threads) thread.join();
    EXPECT_TRUE(wrong == 0 && CStringPool::Verify());
}

// Made before main and ended after it, both times with the pool at hand.
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
        const Plugin plugin("TAVOTestPlugin");
        const auto held = plugin.Find<plugin::HeldEntry>(plugin::kHeldEntry);
        ASSERT_NE(held, nullptr);
        mine = plugin::kHeldText;
        Sweep();
        EXPECT_EQ(held(&late), Entry(mine));
    }
    EXPECT_EQ(Entry(CStringPool::QueryStringRef(plugin::kLateText)), late) << "its destructor ran, and interned";
}

} // namespace
