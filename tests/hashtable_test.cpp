// The hash table against a model: collisions by every policy, visitors that change or throw, disposal in instalments.

#include "support/heapwatch.h"
#include "support/log.h"

#include <algorithm>
#include <chrono>
#include <functional>
#include <random>
#include <TAVO/lookup.h>
#include <thread>

using namespace TAVO::Lookup;
using TAVO::Buffers::CPObjectMemory, TAVO::Buffers::CPPlainMemory;

namespace {

using Hash = unsigned long long;
using Content = std::pair<int, int>; // the value, which is compared, and an id that tells equal items apart
using Entry = std::pair<Hash, Content>;
using Entries = std::vector<Entry>;
constexpr Content kNone{-1, -1};

struct Item : CPPlainMemory {
    Item(int value, int id) {
        if (Alloc(sizeof(Content))) *static_cast<Content*>(static_cast<void*>(*this)) = {value, id};
    }
    static Content Of(const CPObjectMemory& item) {
        return item.key() ? *static_cast<Content*>(static_cast<void*>(static_cast<const Item&>(item))) : kNone;
    }
};

struct Visitor : IBaseHashTableEnum {
    template <class Visit> Visitor(Visit visit) : visit(visit) {}
    bool OnItem(Hash hash, const CPObjectMemory& item) override { return visit(hash, item); }
    std::function<bool(Hash, const CPObjectMemory&)> visit;
};

class Table : public CBaseHashTable {
public:
    explicit Table(std::uint32_t length = 4) : CBaseHashTable(length) {}
    using CBaseHashTable::AddItem, CBaseHashTable::DeleteIndex, CBaseHashTable::DeleteItem,
        CBaseHashTable::DisposeTable, CBaseHashTable::FindItem, CBaseHashTable::PurgeTable;

    void Fill(int items, Hash hashes) {
        for (int i = 0; i < items; ++i) AddItem(static_cast<Hash>(i) % hashes, Item(i, i), eHashKeep);
    }
    bool Enum(Visitor visitor, Hash hash = 0, bool byHash = false) { return EnumTableBy(&visitor, hash, byHash); }
    bool Purge(Visitor visitor) { return PurgeTable(&visitor); }
    Entries List(Hash hash = 0, bool byHash = false) {
        Entries entries;
        Enum([&](Hash h, const CPObjectMemory& i) { return entries.emplace_back(h, Item::Of(i)), true; }, hash, byHash);
        return entries;
    }

    std::function<bool(Content, TAVO::ulong32 count)> disposable = [](Content, TAVO::ulong32) { return false; };
    std::function<void(Content, TAVO::ulong32 count)> onDispose = [](Content, TAVO::ulong32) {};
    bool compareThrows = false;

private:
    TAVO::long32 CompareItems(const CPObjectMemory& first, const CPObjectMemory& second) override {
        if (compareThrows) throw 1;
        return 1000 * (Item::Of(first).first - Item::Of(second).first);
    }
    bool IsDisposable(CPObjectMemory item) override { return disposable(Item::Of(item), item.lockcnt()); }
    void OnDispose(const CPObjectMemory& item) override { onDispose(Item::Of(item), item.lockcnt()); }
};

// The rules over a list in the table's order: bucket, hash, value.
struct Model {
    static constexpr Hash kMask = 15;
    Entries entries;

    static bool Before(const Entry& a, const Entry& b) {
        const auto key = [](const Entry& e) { return std::tuple(e.first & kMask, e.first, e.second.first); };
        return key(a) < key(b);
    }
    Entries::iterator Find(Hash hash, int value, bool anyValue = false) {
        return std::find_if(entries.begin(), entries.end(), [&](const Entry& entry) {
            return entry.first == hash && (anyValue || entry.second.first == value);
        });
    }
    Content Add(Hash hash, Content item, unsigned policy) {
        const auto old = Find(hash, item.first, policy == eHashKeepByHash || policy == eHashReplaceByHash);
        if (old != entries.end()) {
            if (policy == eHashKeep || policy == eHashKeepByHash) return old->second;
            if (policy >= eHashRefuse) return kNone;
            entries.erase(old);
        }
        const Entry entry(hash, item); // before those that are equal
        return entries.insert(std::lower_bound(entries.begin(), entries.end(), entry, Before), entry)->second;
    }
};

TEST(HashTable, BehavesLikeTheModel) {
    std::mt19937_64 random(1);
    for (int round = 0; round < 6; ++round) {
        Table table;
        Model model;
        std::vector<Hash> used{0};
        for (int step = 0; step < 3000; ++step) {
            // Few hashes and few buckets; many hashes in few buckets, near either end of their range; or hashes all
            // over.
            const Hash end = (random() % 300 << 4 | 7) ^ (round < 3 ? 0 : ~Hash{0} << 4);
            const Hash hashes[] = {random() % 5 << 60 | random() % 3, end, random()};
            const Hash hash = random() % 2 ? used[random() % used.size()] : hashes[round % 3];
            used.push_back(hash);
            const Item item(static_cast<int>(random() % 4), step);
            const Content content = Item::Of(item);
            const auto found = model.Find(hash, content.first);
            const auto kind = random() % 64;
            const bool isThere = found != model.entries.end();
            if (kind == 0) {
                ASSERT_TRUE(table.Purge([](Hash, const CPObjectMemory& i) { return Item::Of(i).second % 3 != 0; }));
                std::erase_if(model.entries, [](const Entry& entry) { return entry.second.second % 3 == 0; });
            } else if (kind == 1) {
                ASSERT_TRUE(table.DeleteIndex(hash));
                std::erase_if(model.entries,
                              [&](const Entry& entry) { return ((entry.first ^ hash) & Model::kMask) == 0; });
            } else if (kind == 2) {
                table.disposable = [](Content disposed, TAVO::ulong32) { return disposed.second % 2 == 0; };
                ASSERT_TRUE(table.DisposeTable(60000));
                std::erase_if(model.entries, [](const Entry& entry) { return entry.second.second % 2 == 0; });
            } else if (kind == 3 && step % 7 == 0) {
                table.ClearTable();
                model = {};
                // Intended: hash-delete
                ASSERT_TRUE(table.DeleteItem(hash, item) && table.DeleteIndex(hash) && table.DisposeTable(0));
            } else if (kind < 40) {
                const auto policy = static_cast<eHashCollision>(random() % 6);
                ASSERT_EQ(Item::Of(table.AddItem(hash, item, policy)), model.Add(hash, content, policy)) << policy;
            } else if (kind < 52 || model.entries.empty()) {
                ASSERT_EQ(Item::Of(table.FindItem(hash, item)), isThere ? found->second : kNone);
            } else {
                ASSERT_EQ(table.DeleteItem(hash, item), isThere);
                if (isThere) model.entries.erase(found);
            }
            if (step % 8) continue;
            ASSERT_EQ(table.List(), model.entries) << "step " << step;
            ASSERT_EQ(table.GetNItems(), model.entries.size());
            Entries same = model.entries;
            std::erase_if(same, [&](const Entry& entry) { return entry.first != hash; });
            ASSERT_EQ(table.List(hash, true), same);
        }
    }
}

TEST(HashTable, IndexLengthIsChecked) {
    const support::Assertions assertions;
    // A length, and a hash in the same bucket as 1; 2 when there is but one bucket.
    const std::pair<std::uint32_t, Hash> rows[] = {{4, 17}, {3, 9}, {0, 2}, {10, 1025}, {65, 3}};
    for (const auto& [length, hash] : rows) {
        Table table(length);
        for (const Hash one : {Hash{1}, hash, hash + 1}) table.AddItem(one, Item(1, 1), eHashKeep);
        EXPECT_TRUE(table.DeleteIndex(1) && table.GetNItems() == (length ? 1 : 0)) << length;
    }
    EXPECT_EQ(assertions.Take().size(), 3u);
    EXPECT_EQ(Table(63).AddItem(1, Item(1, 1), eHashKeep).key(), 0u) << "more buckets than any memory has";
}

TEST(HashTable, VisitorsMayChangeTheTableStopOrThrow) {
    Table table;
    int visits = 0;
    const auto clear = [&](Hash, const CPObjectMemory& item) {
        EXPECT_EQ(item.lockcnt(), 2u) << "the table's and the walk's";
        table.ClearTable();
        return ++visits > 1;
    };
    table.Fill(20, 3);
    EXPECT_FALSE(table.Enum(clear) || table.Enum(clear)) << "stopped; no index";
    table.Fill(20, 3);
    EXPECT_TRUE(table.Purge(clear) && visits == 2);
    table.ClearTable();
    table.Fill(4, 1);
    EXPECT_TRUE(table.Purge([&](Hash hash, const CPObjectMemory& item) { // rejects what is no longer at its place
        for (int i = 1; i < 9 && Item::Of(item).first == 2; ++i) table.AddItem(hash, Item(-i, i), eHashKeep);
        return Item::Of(item).first != 2;
    }));
    EXPECT_EQ(table.GetNItems(), 11u);
    EXPECT_FALSE(table.Purge([&](Hash, const CPObjectMemory&) -> bool { return ++visits < 5 ? false : throw 1; }));
    EXPECT_EQ(table.GetNItems(), 9u) << "two were rejected, the one that threw stays";
}

TEST(HashTable, ComparisonThatThrowsFindsAndInsertsNothing) {
    Table table;
    const Item first(1, 1), second(2, 2);
    table.AddItem(5, first, eHashKeep);
    table.compareThrows = true;
    EXPECT_FALSE(table.FindItem(5, second).key() || table.AddItem(5, second, eHashReplace).key() ||
                 table.DeleteItem(5, second));
    EXPECT_EQ(table.AddItem(5, second, eHashKeepByHash).key(), first.key()) << "compares no items";
}

TEST(HashTable, DisposalGoesOnWhereItEnded) {
    Table table;
    table.Fill(16, 16);
    std::vector<int> asked;
    table.disposable = [&](Content item, TAVO::ulong32) {
        asked.push_back(item.first);
        std::this_thread::sleep_for(std::chrono::milliseconds(3));
        return false;
    };
    for (int call = 0; call < 17; ++call) // one bucket a call
        EXPECT_TRUE(!table.DisposeTable(0) && asked.size() == call + 1u && asked.back() == call % 16) << call;
    EXPECT_TRUE(table.DisposeTable(60000) && asked.size() == 33 && asked[17] == 1)
        << "a whole round, from wherever it begins";
}

TEST(HashTable, DisposalSeesCountsMayThrowAndChangeTheTable) {
    Table table;
    const Item held(5, 5);
    table.AddItem(5, held, eHashKeep);
    table.Fill(16, 16);
    table.disposable = [](Content item, TAVO::ulong32 count) {
        EXPECT_EQ(count, item.first == 5 ? 4u : 3u) << "three: nobody holds it";
        return count == 3 ? true : throw 1;
    };
    EXPECT_TRUE(!table.DisposeTable(60000) && table.GetNItems() == 11) << "up to the one that throws";
    EXPECT_TRUE(!table.DisposeTable(60000) && table.List() == (Entries{{5, {5, 5}}})) << "reaches the others first";
    for (int i = 0; i < 16; ++i) table.AddItem(5, Item(i, i), eHashKeep);
    std::vector<int> disposed;
    table.disposable = [](Content, TAVO::ulong32) { return true; };
    table.onDispose = [&](Content item, TAVO::ulong32 count) {
        EXPECT_EQ(count, 2u);
        disposed.push_back(item.first);
        if (item.first == 13) table.DeleteItem(5, Item(2, 0));
        if (item.first == 11) table.ClearTable();
    };
    EXPECT_TRUE(table.DisposeTable(60000) && table.GetNItems() == 0 && held.lockcnt() == 1);
    EXPECT_EQ(disposed, (std::vector<int>{15, 14, 13, 13, 12, 11})) << "13 again: it was elsewhere after its end";
    table.Fill(3, 1);
    table.onDispose = [](Content, TAVO::ulong32) { throw 1; };
    EXPECT_TRUE(table.DeleteIndex(0) && table.GetNItems() == 0);
}

TEST(HashTable, WithoutMemoryStaysAsItWas) {
    support::ForEachFailingAllocation([] {
        Table table;
        for (int i = 0; i < 40; ++i) {
            const Item item(i, i);
            if (!item.key()) continue;
            const bool added = table.AddItem(i % 2 ? 5 : 21, item, eHashReplace).key();
            EXPECT_TRUE((item.lockcnt() == 2) == added && (table.FindItem(i % 2 ? 5 : 21, item).key() != 0) == added);
        }
    });
}

} // namespace
