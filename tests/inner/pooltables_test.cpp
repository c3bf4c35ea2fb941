// The pool's tables from inside: buckets that are put in order late, against a model, and the filter in front of them.

#include "blocks.h"
#include "lazytable.h"
#include "poolfilter.h"
#include "support/heapwatch.h"

#include <map>
#include <random>
#include <vector>

using namespace TAVO;
using Buffers::CPObjectMemory, Buffers::CPPlainMemory;
using Hash = unsigned long long;

namespace {

struct Item : CPPlainMemory {
    explicit Item(int value) {
        if (Alloc(sizeof(value))) *static_cast<int*>(static_cast<void*>(*this)) = value;
    }
    static int Of(const CPObjectMemory& item) { return *Buffers::Block::PayloadOf<int>(item); }
};

class Table final : public Lookup::LazyTable {
public:
    bool Find(Hash hash, int value, Place& place) {
        const auto order = [&](const CPObjectMemory& item) { return value - Item::Of(item); };
        return LocateAsIs(hash, order, place);
    }
    bool AddNew(Hash hash, int value) { return Insert(PlaceOfNew(hash), hash, Item(value)); }
    bool AddAt(const Place& place, Hash hash, int value) { return Insert(place, hash, Item(value)); }
    // Locate puts the bucket in order, without which an index would not tell what to take.
    int Take(Hash hash, int value) {
        Place place;
        Locate(
            hash, [&](const CPObjectMemory& item) { return value - Item::Of(item); }, place);
        return Item::Of(RemoveAt(place));
    }
    bool Sweep() {
        return Dispose(60000, [](const CPObjectMemory&) {});
    }
    std::vector<std::pair<Hash, int>> List() {
        struct : Lookup::IBaseHashTableEnum {
            bool OnItem(Hash hash, const CPObjectMemory& item) override {
                return entries.emplace_back(hash, Item::Of(item)), true;
            }
            std::vector<std::pair<Hash, int>> entries;
        } list;
        Visit(list);
        return list.entries;
    }
    using LazyTable::Place;

private:
    long32 CompareItems(const CPObjectMemory& first, const CPObjectMemory& second) override {
        return Item::Of(first) - Item::Of(second);
    }
    bool IsDisposable(CPObjectMemory item) override { return Item::Of(item) % 3 == 0; }
};

TEST(LazyTable, BehavesLikeOneThatIsAlwaysInOrder) {
    std::mt19937_64 random(7);
    for (int round = 0; round < 4; ++round) {
        Table table;
        std::map<std::tuple<Hash, Hash, int>, int> model; // bucket, hash, value
        const auto key = [](Hash hash, int value) { return std::tuple(hash % 4096, hash, value); };
        for (int step = 0; step < 6000; ++step) {
            // Hashes of two buckets: many that differ, or few with several items each.
            const Hash hash = (round % 2 ? random() % 40 << 50 : random() / 4096 * 4096) | random() % 2;
            const int value = static_cast<int>(random() % 50);
            const bool isThere = model.contains(key(hash, value));
            const auto kind = random() % (round < 2 ? 64 : 1000); // new entries come one by one, or by the hundred
            Table::Place place;
            if (kind == 0) {
                ASSERT_TRUE(table.Sweep());
                std::erase_if(model, [](const auto& entry) { return entry.second % 3 == 0; });
            } else if (kind < 4) {
                ASSERT_EQ(table.Find(hash, value, place), isThere);
                if (isThere) continue;
                ASSERT_TRUE(table.AddAt(place, hash, value));
                model[key(hash, value)] = value;
            } else if (kind < 8) {
                const auto any = model.lower_bound(key(hash, value));
                if (any == model.end()) continue;
                ASSERT_TRUE(table.Find(std::get<1>(any->first), any->second, place));
                ASSERT_EQ(table.Take(std::get<1>(any->first), any->second), any->second);
                model.erase(any);
            } else if (!isThere) {
                ASSERT_TRUE(table.AddNew(hash, value));
                model[key(hash, value)] = value;
            }
            if (step % 100 && kind) continue;
            std::vector<std::pair<Hash, int>> expected;
            for (const auto& entry : model) expected.emplace_back(std::get<1>(entry.first), entry.second);
            if (step % 1000 == 0) {
                ASSERT_EQ(table.List(), expected) << "step " << step;
            }
            Hash sum = 0, expectedSum = 0;
            table.ForEachHash([&](Hash each) { sum += each; });
            for (const auto& entry : expected) expectedSum += entry.first;
            ASSERT_EQ(sum, expectedSum);
            ASSERT_EQ(table.GetNItems(), model.size());
        }
        table.ClearTable();
        EXPECT_TRUE(table.AddNew(1, 1));
        EXPECT_EQ(table.List().size(), 1u);
    }
}

TEST(PoolFilter, ForgetsNothingAndTellsMostOfWhatIsAbsent) {
    std::mt19937_64 random(3);
    for (const std::size_t count : {std::size_t{500}, std::size_t{10000}, std::size_t{50000}, std::size_t{300000}}) {
        String::PoolFilter filter;
        filter.Reset(count);
        std::vector<Hash> hashes;
        while (!filter.IsFull()) filter.Add(hashes.emplace_back(random()));
        EXPECT_GE(hashes.size(), 2 * count); // room for as many again
        for (const Hash hash : hashes) ASSERT_TRUE(filter.MayHold(hash));
        int wrong = 0;
        for (int i = 0; i < 100000; ++i) wrong += filter.MayHold(random());
        if (count < 1024)
            EXPECT_EQ(wrong, 100000); // few: nothing is known
        else
            EXPECT_LT(wrong, 100000 / 25);
        EXPECT_EQ(filter.IsTooLargeFor(count / 8), count >= 1024);
        EXPECT_FALSE(filter.IsTooLargeFor(count));
        filter.Reset(0);
        EXPECT_TRUE(filter.MayHold(1) && !filter.IsTooLargeFor(0));
    }
    String::PoolFilter filter;
    const support::FailingHeap heap(0);
    filter.Reset(100000);
    EXPECT_TRUE(filter.MayHold(1));
}

} // namespace
