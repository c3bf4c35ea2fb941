// The hash table against a model: collisions by every policy, visitors that change or throw, disposal in instalments.

#include "support/assertions.h"
#include "support/heapwatch.h"

#include <chrono>
#include <functional>
#include <gtest/gtest.h>
#include <map>
#include <random>
#include <TAVO/lookup.h>
#include <thread>
#include <vector>

using namespace TAVO::Lookup;
using TAVO::Buffers::CPObjectMemory;
using TAVO::Buffers::CPPlainMemory;

namespace {

using Hash = unsigned long long;

// An item: `value` is compared, `id` tells equal items apart.
struct Content {
    int value, id;
    bool operator==(const Content& other) const { return value == other.value && id == other.id; }
};

class Item : public CPPlainMemory {
public:
    explicit Item(const CPObjectMemory& item) : CPPlainMemory(item) {}
    Item(int value, int id) {
        if (Alloc(sizeof(Content))) *static_cast<Content*>(static_cast<void*>(*this)) = {value, id};
    }
    const Content& operator*() const { return *static_cast<Content*>(static_cast<void*>(*this)); }
};
const Content kNone{-1, -1};
Content ContentOf(const CPObjectMemory& item) { return item.key() ? *Item(item) : kNone; }

class Table : public CBaseHashTable {
public:
    explicit Table(std::uint32_t length = 4) : CBaseHashTable(length) {}
    using CBaseHashTable::AddItem;
    using CBaseHashTable::DeleteIndex;
    using CBaseHashTable::DeleteItem;
    using CBaseHashTable::DisposeTable;
    using CBaseHashTable::EnumTableBy;
    using CBaseHashTable::FindItem;
    using CBaseHashTable::PurgeTable;

    std::function<bool(const CPObjectMemory&, TAVO::ulong32 count)> disposable;
    std::function<void(const CPObjectMemory&)> onDispose;
    bool compareThrows = false;
    int compared = 0;

private:
    TAVO::long32 CompareItems(const CPObjectMemory& first, const CPObjectMemory& second) override {
        ++compared;
        if (compareThrows) throw 1;
        return 1000 * ((*Item(first)).value - (*Item(second)).value);
    }
    bool IsDisposable(CPObjectMemory item) override { return disposable ? disposable(item, item.lockcnt()) : false; }
    void OnDispose(const CPObjectMemory& item) override {
        if (onDispose) onDispose(item);
    }
};

class Visitor : public IBaseHashTableEnum {
public:
    using Function = std::function<bool(Hash, const CPObjectMemory&)>;
    explicit Visitor(Function function) : m_function(std::move(function)) {}
    bool OnItem(Hash hash, const CPObjectMemory& item) override { return m_function(hash, item); }

private:
    Function m_function;
};

struct Entry {
    Hash hash;
    Content content;
    bool operator==(const Entry& other) const { return hash == other.hash && content == other.content; }
};
std::ostream& operator<<(std::ostream& out, const Entry& entry) {
    return out << "{" << std::hex << entry.hash << ", " << entry.content.value << ", " << entry.content.id << "}";
}

std::vector<Entry> EntriesOf(Table& table) {
    std::vector<Entry> entries;
    Visitor visitor([&](Hash hash, const CPObjectMemory& item) {
        entries.push_back({hash, ContentOf(item)});
        return true;
    });
    table.EnumTableBy(&visitor, 0, false);
    return entries;
}

// The rules over a map in the table's order: bucket, hash, value.
class Model {
public:
    static constexpr Hash kMask = 15;

    Content Add(Hash hash, Content item, unsigned policy) {
        const bool byHash = policy == eHashKeepByHash || policy == eHashReplaceByHash;
        const auto old = byHash ? FirstOf(hash) : EqualTo(hash, item.value);
        if (old == m_entries.end()) return Insert(hash, item);
        if (policy == eHashKeep || policy == eHashKeepByHash) return old->second;
        if (policy >= eHashRefuse) return kNone;
        if (policy == eHashReplace) return old->second = item;
        m_entries.erase(old);
        return Insert(hash, item);
    }
    Content Find(Hash hash, int value) {
        const auto found = EqualTo(hash, value);
        return found == m_entries.end() ? kNone : found->second;
    }
    bool Delete(Hash hash, int value) {
        const auto found = EqualTo(hash, value);
        return found != m_entries.end() && (m_entries.erase(found), true);
    }
    template <class Test> void EraseIf(Test test) {
        for (auto it = m_entries.begin(); it != m_entries.end();)
            it = test(Entry{std::get<1>(it->first), it->second}) ? m_entries.erase(it) : std::next(it);
    }
    std::vector<Entry> Entries() const {
        std::vector<Entry> entries;
        for (const auto& [key, content] : m_entries) entries.push_back({std::get<1>(key), content});
        return entries;
    }
    std::vector<Entry> EntriesOf(Hash hash) const {
        std::vector<Entry> entries;
        for (const auto& entry : Entries())
            if (entry.hash == hash) entries.push_back(entry);
        return entries;
    }

private:
    using Key = std::tuple<Hash, Hash, int>;
    static Key KeyOf(Hash hash, int value) { return {hash & kMask, hash, value}; }
    using Map = std::multimap<Key, Content>; // replacing by hash alone can leave equal items side by side

    // Before those that are equal.
    Content Insert(Hash hash, Content item) {
        const Key key = KeyOf(hash, item.value);
        return m_entries.emplace_hint(m_entries.lower_bound(key), key, item)->second;
    }
    Map::iterator EqualTo(Hash hash, int value) {
        const auto found = m_entries.lower_bound(KeyOf(hash, value));
        return found != m_entries.end() && found->first == KeyOf(hash, value) ? found : m_entries.end();
    }
    Map::iterator FirstOf(Hash hash) {
        const auto first = m_entries.lower_bound(KeyOf(hash, -1000));
        return first != m_entries.end() && std::get<1>(first->first) == hash ? first : m_entries.end();
    }
    Map m_entries;
};

TEST(HashTable, BehavesLikeTheModel) {
    std::mt19937_64 random(1);
    for (int round = 0; round < 6; ++round) {
        Table table;
        Model model;
        // Few hashes and few buckets, many hashes in few buckets, or hashes all over.
        const auto someHash = [&]() -> Hash {
            switch (round % 3) {
            case 0:
                return random() % 5 << 60 | random() % 3;
            case 1:
                return random() % 300 << 4 | 7;
            default:
                return random();
            }
        };
        std::vector<Hash> used{0};
        int id = 0;
        for (int step = 0; step < 3000; ++step) {
            Hash hash = random() % 2 ? used[random() % used.size()] : someHash();
            used.push_back(hash);
            const int value = static_cast<int>(random() % 4);
            switch (const auto kind = random() % 64; kind) {
            case 0: {
                Visitor visitor([](Hash, const CPObjectMemory& item) { return ContentOf(item).id % 3 != 0; });
                ASSERT_TRUE(table.PurgeTable(&visitor));
                model.EraseIf([](const Entry& entry) { return entry.content.id % 3 == 0; });
                break;
            }
            case 1:
                ASSERT_TRUE(table.DeleteIndex(hash));
                model.EraseIf([&](const Entry& entry) { return (entry.hash & Model::kMask) == (hash & Model::kMask); });
                break;
            case 2: {
                table.disposable = [](const CPObjectMemory& item, TAVO::ulong32) {
                    return ContentOf(item).id % 2 == 0;
                };
                ASSERT_TRUE(table.DisposeTable(60000));
                model.EraseIf([](const Entry& entry) { return entry.content.id % 2 == 0; });
                break;
            }
            case 3:
                if (step % 7) break;
                table.ClearTable();
                model = {};
                ASSERT_TRUE(table.DeleteItem(hash, Item(value, 0))) << "no index";
                break;
            default:
                if (kind < 40) {
                    const unsigned policy = static_cast<unsigned>(random() % 6);
                    const Item item(value, ++id);
                    const auto added = table.AddItem(hash, item, static_cast<eHashCollision>(policy));
                    ASSERT_EQ(ContentOf(added), model.Add(hash, *item, policy)) << "policy " << policy;
                } else if (kind < 52) {
                    ASSERT_EQ(ContentOf(table.FindItem(hash, Item(value, 0))), model.Find(hash, value));
                } else if (!model.Entries().empty()) {
                    ASSERT_EQ(table.DeleteItem(hash, Item(value, 0)), model.Delete(hash, value));
                }
            }
            if (step % 8 == 0) {
                ASSERT_EQ(EntriesOf(table), model.Entries()) << "step " << step;
                ASSERT_EQ(table.GetNItems(), model.Entries().size());
                std::vector<Entry> same;
                Visitor visitor([&](Hash found, const CPObjectMemory& item) {
                    same.push_back({found, ContentOf(item)});
                    return true;
                });
                table.EnumTableBy(&visitor, hash, true);
                ASSERT_EQ(same, model.EntriesOf(hash));
            }
        }
    }
}

TEST(HashTable, WithoutItemsAnswersAtOnce) {
    Table table(10);
    const Item item(1, 1);
    Visitor visitor([](Hash, const CPObjectMemory&) { return true; });
    EXPECT_EQ(table.FindItem(1, item).key(), 0u);
    EXPECT_TRUE(table.DeleteItem(1, item));
    EXPECT_TRUE(table.DeleteIndex(1));
    EXPECT_FALSE(table.EnumTableBy(&visitor, 1, true));
    EXPECT_FALSE(table.EnumTableBy(&visitor, 0, false));
    EXPECT_TRUE(table.PurgeTable(&visitor));
    EXPECT_TRUE(table.PurgeTable(nullptr));
    EXPECT_TRUE(table.DisposeTable(0));
    EXPECT_EQ(table.GetNItems(), 0u);
    EXPECT_EQ(table.AddItem(1, CPObjectMemory(), eHashKeep).key(), 0u);
    EXPECT_EQ(table.AddItem(1, item, eHashKeep).key(), item.key());
    EXPECT_FALSE(table.EnumTableBy(nullptr, 0, false));
    EXPECT_FALSE(table.DeleteItem(2, item));
}

TEST(HashTable, IndexLengthIsChecked) {
    struct Row {
        std::uint32_t length;
        bool asserts;
        Hash inSameBucket; // as 1; 0 when none is
    };
    for (const Row& row : {Row{4, false, 17}, Row{3, true, 9}, Row{0, true, 2}, Row{10, false, 1025}, Row{64, false, 2},
                           Row{65, true, 3}, Row{68, true, 17}}) {
        const support::Assertions assertions;
        Table table(row.length);
        EXPECT_EQ(assertions.Take(),
                  row.asserts ? support::Texts{"(uDirectIndexLength >= 4) && (uDirectIndexLength <= sizeof(size_t)*8)"}
                              : support::Texts())
            << row.length;
        const Item item(1, 1);
        table.AddItem(1, item, eHashKeep);
        table.AddItem(row.inSameBucket, item, eHashKeep);
        table.AddItem(row.inSameBucket + 1, item, eHashKeep);
        EXPECT_EQ(table.GetNItems(), 3u);
        table.DeleteIndex(1);
        EXPECT_EQ(table.GetNItems(), row.length % 64 ? 1u : 0u) << row.length;
    }
    Table vast(63);
    EXPECT_EQ(vast.AddItem(1, Item(1, 1), eHashKeep).key(), 0u) << "more buckets than any memory has";
    EXPECT_EQ(vast.GetNItems(), 0u);
}

TEST(HashTable, PoliciesByHashCompareNoItems) {
    Table table;
    const Item low(1, 1), high(2, 2), other(3, 3);
    table.AddItem(5, high, eHashKeep);
    table.AddItem(5, low, eHashKeep);
    table.compared = 0;
    EXPECT_EQ(table.AddItem(5, other, eHashKeepByHash).key(), low.key()) << "the first of that hash";
    EXPECT_EQ(table.compared, 0);
    EXPECT_EQ(table.AddItem(5, other, eHashReplaceByHash).key(), other.key());
    EXPECT_EQ(EntriesOf(table), (std::vector<Entry>{{5, {2, 2}}, {5, {3, 3}}})) << "in order again";
    EXPECT_EQ(low.lockcnt(), 1u);
}

TEST(HashTable, VisitorsMayChangeTheTable) {
    const auto fill = [](Table& table) {
        for (int i = 0; i < 20; ++i) table.AddItem(static_cast<Hash>(i % 3), Item(i, i), eHashKeep);
    };
    Table table;
    fill(table);
    int visits = 0;
    Visitor clearing([&](Hash, const CPObjectMemory& item) {
        table.ClearTable();
        EXPECT_EQ(item.lockcnt(), 1u) << "the walk's own";
        return ++visits, true;
    });
    EXPECT_TRUE(table.EnumTableBy(&clearing, 0, false));
    EXPECT_EQ(visits, 1);
    fill(table);
    Visitor purging([&](Hash, const CPObjectMemory&) { return table.ClearTable(), ++visits, false; });
    EXPECT_TRUE(table.PurgeTable(&purging));
    EXPECT_EQ(visits, 2);

    fill(table);
    Visitor deleting([&](Hash hash, const CPObjectMemory& item) { return table.DeleteItem(hash, item); });
    EXPECT_TRUE(table.EnumTableBy(&deleting, 1, true));
    fill(table);
    Visitor counting([](Hash, const CPObjectMemory& item) {
        EXPECT_EQ(item.lockcnt(), 2u) << "the table's and the walk's";
        return true;
    });
    EXPECT_TRUE(table.EnumTableBy(&counting, 0, false));
    int added = 100;
    Visitor adding([&](Hash hash, const CPObjectMemory&) {
        if (added < 130) table.AddItem(hash, Item(added, added), eHashKeep), ++added;
        return true;
    });
    EXPECT_TRUE(table.EnumTableBy(&adding, 0, false));
    EXPECT_EQ(added, 130);

    // Rejects an entry after another one took its place.
    Table moving;
    for (int i = 10; i < 13; ++i) moving.AddItem(1, Item(i, i), eHashKeep);
    Visitor rejecting([&](Hash hash, const CPObjectMemory& item) {
        if (ContentOf(item).value == 11) moving.AddItem(hash, Item(1, 1), eHashKeep);
        return ContentOf(item).value != 11;
    });
    EXPECT_TRUE(moving.PurgeTable(&rejecting));
    EXPECT_EQ(EntriesOf(moving), (std::vector<Entry>{{1, {1, 1}}, {1, {10, 10}}, {1, {12, 12}}}));
}

TEST(HashTable, VisitorsThatStopOrThrow) {
    Table table;
    for (int i = 0; i < 10; ++i) table.AddItem(static_cast<Hash>(i), Item(i, i), eHashKeep);
    int visits = 0;
    Visitor stopping([&](Hash, const CPObjectMemory&) { return ++visits < 4; });
    EXPECT_FALSE(table.EnumTableBy(&stopping, 0, false));
    EXPECT_EQ(visits, 4);
    Visitor throwing([&](Hash, const CPObjectMemory&) -> bool { return ++visits < 8 ? false : throw 1; });
    EXPECT_FALSE(table.PurgeTable(&throwing));
    EXPECT_EQ(table.GetNItems(), 7u) << "three were rejected, the one that threw stays";
    EXPECT_FALSE(table.EnumTableBy(&throwing, 0, false));
}

TEST(HashTable, ComparisonThatThrowsFindsAndInsertsNothing) {
    Table table;
    const Item first(1, 1), second(2, 2);
    table.AddItem(5, first, eHashKeep);
    table.compareThrows = true;
    EXPECT_EQ(table.FindItem(5, second).key(), 0u);
    EXPECT_EQ(table.AddItem(5, second, eHashKeep).key(), 0u);
    EXPECT_EQ(table.AddItem(5, second, eHashReplace).key(), 0u);
    EXPECT_FALSE(table.DeleteItem(5, second));
    EXPECT_EQ(table.AddItem(6, second, eHashKeep).key(), second.key()) << "nothing to compare with";
    EXPECT_EQ(table.GetNItems(), 2u);
    EXPECT_EQ(table.AddItem(5, second, eHashReplaceByHash).key(), second.key());
    EXPECT_EQ(table.GetNItems(), 2u);
}

TEST(HashTable, DisposalSeesAnItemThatNobodyHoldsWithThree) {
    Table table;
    const Item held(1, 1);
    table.AddItem(3, held, eHashKeep);
    for (int i = 2; i < 6; ++i) table.AddItem(3, Item(i, i), eHashKeep);
    std::vector<int> asked, disposed;
    table.disposable = [&](const CPObjectMemory& item, TAVO::ulong32 count) {
        asked.push_back(ContentOf(item).value);
        EXPECT_EQ(count, ContentOf(item).value == 1 ? 4u : 3u);
        return count == 3;
    };
    table.onDispose = [&](const CPObjectMemory& item) {
        disposed.push_back(ContentOf(item).value);
        EXPECT_EQ(item.lockcnt(), 2u);
    };
    EXPECT_TRUE(table.DisposeTable(60000));
    EXPECT_EQ(asked, (std::vector<int>{5, 4, 3, 2, 1})) << "from the last to the first";
    EXPECT_EQ(disposed, (std::vector<int>{5, 4, 3, 2}));
    EXPECT_EQ(held.lockcnt(), 2u);
    disposed.clear();
    table.onDispose = [&](const CPObjectMemory& item) {
        disposed.push_back(ContentOf(item).value);
        if (disposed.size() == 1) throw 1;
    };
    table.AddItem(19, Item(8, 8), eHashKeep); // the same bucket, another hash
    EXPECT_TRUE(table.DeleteIndex(3));
    EXPECT_EQ(disposed, (std::vector<int>{1, 8}));
    EXPECT_EQ(table.GetNItems(), 0u);
    EXPECT_EQ(held.lockcnt(), 1u);
}

TEST(HashTable, DisposalGoesOnWhereItEnded) {
    Table table;
    for (int i = 0; i < 16; ++i) table.AddItem(static_cast<Hash>(i), Item(i, i), eHashKeep);
    std::vector<int> asked;
    bool slow = true;
    table.disposable = [&](const CPObjectMemory& item, TAVO::ulong32) {
        asked.push_back(ContentOf(item).value);
        if (slow) std::this_thread::sleep_for(std::chrono::milliseconds(3));
        return false;
    };
    for (int call = 0; call < 17; ++call) EXPECT_FALSE(table.DisposeTable(0));
    std::vector<int> expected;
    for (int i = 0; i < 17; ++i) expected.push_back(i % 16);
    EXPECT_EQ(asked, expected) << "one bucket a call";
    asked.clear();
    slow = false;
    EXPECT_TRUE(table.DisposeTable(60000));
    ASSERT_EQ(asked.size(), 16u) << "a whole round, from wherever it begins";
    EXPECT_EQ(asked.front(), 1);
    EXPECT_EQ(asked.back(), 0);
}

TEST(HashTable, DisposalThatThrowsOrChangesTheTable) {
    Table table;
    for (int i = 0; i < 16; ++i) table.AddItem(static_cast<Hash>(i), Item(i, i), eHashKeep);
    table.disposable = [&](const CPObjectMemory& item, TAVO::ulong32) {
        if (ContentOf(item).value == 5) throw 1;
        return true;
    };
    EXPECT_FALSE(table.DisposeTable(60000));
    EXPECT_EQ(table.GetNItems(), 11u);
    EXPECT_FALSE(table.DisposeTable(60000)) << "reaches the others first";
    EXPECT_EQ(EntriesOf(table), (std::vector<Entry>{{5, {5, 5}}}));
    for (int i = 0; i < 16; ++i) table.AddItem(5, Item(i, i), eHashKeep);
    table.disposable = [](const CPObjectMemory&, TAVO::ulong32) { return true; };
    table.onDispose = [&](const CPObjectMemory& item) {
        if (ContentOf(item).value == 9) table.DeleteItem(5, Item(2, 0));
        if (ContentOf(item).value == 7) table.ClearTable();
    };
    EXPECT_TRUE(table.DisposeTable(60000));
    EXPECT_EQ(table.GetNItems(), 0u);
}

TEST(HashTable, WithoutMemoryStaysAsItWas) {
    support::ForEachFailingAllocation([] {
        Table table;
        Model model;
        for (int i = 0; i < 40; ++i) {
            const Item item(i, i);
            if (!item.key()) continue;
            const auto hash = static_cast<Hash>(i % 2);
            if (table.AddItem(hash, item, eHashReplace).key()) model.Add(hash, *item, eHashReplace);
            EXPECT_EQ(item.lockcnt() == 2, model.Find(hash, i) == Content({i, i}));
        }
        EXPECT_EQ(EntriesOf(table), model.Entries());
    });
}

} // namespace
