#pragma once
// A hash table whose buckets are put in order when somebody looks there.
//
// To give each of many thousands of new entries its place in a long bucket would be to move half the bucket, from
// memory, for each of them. So entries that are known to be new gather unordered behind the others, until there are
// many or somebody looks there who may do so again: then they are put in order together. A walk shows every bucket in
// order; a sweep shows entries one by one and takes them as they stand.

#include "hashtable.h"

namespace TAVO::Lookup {

// 4096 buckets.
class LazyTable : public CBaseHashTable {
public:
    // Lets everything go.
    void ClearTable() noexcept;
    // The hashes of all entries, bucket by bucket.
    template <class Visit> void ForEachHash(Visit visit) const { TableAccess::ForEachHash(*this, visit); }

protected:
    LazyTable() : CBaseHashTable(kIndexLength) {}

    // As TableAccess::Locate. The bucket is put in order first: for who may look there often.
    template <class Order> bool Locate(unsigned long long hash, Order order, Place& place) {
        Settle(BucketOf(hash));
        return TableAccess::Locate(*this, hash, order, place);
    }
    // The same, but the bucket stays as it is, and what is not found goes behind the others: for who looks once.
    // RemoveAt needs a place that Locate told.
    template <class Order> bool LocateAsIs(unsigned long long hash, Order order, Place& place) {
        const std::size_t unordered = m_states[BucketOf(hash)].unordered;
        if (unordered == 0) return TableAccess::Locate(*this, hash, order, place);
        if (LocateLatest(hash, order, place, unordered)) return true;
        if (TableAccess::Locate(*this, hash, order, place, unordered)) return true;
        place = PlaceOfNew(hash);
        return false;
    }
    // Where an entry goes that is known to be new.
    static Place PlaceOfNew(unsigned long long hash) { return {BucketOf(hash), Buffers::NotFound, false}; }
    // Starts to fetch from memory what adding a new entry of that hash looks at, and what a search would.
    void FetchForAdding(unsigned long long hash) const {
        TableAccess::FetchEnd(*this, hash, m_states[BucketOf(hash)].entries);
    }
    void FetchForSearch(unsigned long long hash) const {
        const State& state = m_states[BucketOf(hash)];
        TableAccess::FetchAround(*this, hash, state.entries - state.unordered);
    }
    // At a place that Locate told, nothing having changed since, or at that of a new entry. Takes over the reference;
    // false without memory: item and table are then as they were.
    bool Insert(const Place& place, unsigned long long hash, Buffers::CPObjectMemory&& item) noexcept;

    // As EnumTableBy for all entries.
    bool Visit(IBaseHashTableEnum& visitor) noexcept;
    // As DisposeTable; `next` is told the items of a bucket before they are asked. In any order: a sweep need not pay
    // for putting in order what it throws away.
    template <class Next> bool Dispose(std::uint32_t budget, Next next) noexcept {
        return TableAccess::Dispose(*this, budget, next, [this](std::size_t bucket, std::size_t index) {
            const std::size_t left = TableAccess::Buckets(*this)[bucket].Count();
            if (index + m_states[bucket].unordered > left) --m_states[bucket].unordered;
        });
    }

private:
    static constexpr std::uint32_t kIndexLength = 12;
    static constexpr std::size_t kBuckets = std::size_t{1} << kIndexLength, kMostUnordered = 256;

    struct State {
        std::uint16_t entries = 0;   // all of the bucket, when a new one was added last: a hint what to fetch
        std::uint16_t unordered = 0; // those at its end that are not in order yet
    };

    static std::size_t BucketOf(unsigned long long hash) { return static_cast<std::size_t>(hash % kBuckets); }
    // Among the unordered ones, the latest first.
    template <class Order>
    bool LocateLatest(unsigned long long hash, Order order, Place& place, std::size_t unordered) const {
        const std::size_t bucket = BucketOf(hash);
        const TableAccess::Bucket& entries = TableAccess::Buckets(*this)[bucket];
        std::size_t index = entries.Count();
        for (const std::size_t first = index - unordered; index > first;)
            if (entries[--index].hash == hash && order(entries[index].item) == 0) {
                place = {bucket, index, true};
                return true;
            }
        return false;
    }
    void Settle(std::size_t bucket) noexcept {
        if (TAVO_UNLIKELY(m_states[bucket].unordered != 0)) PutInOrder(bucket);
    }
    void PutInOrder(std::size_t bucket) noexcept;

    State m_states[kBuckets];
};

} // namespace TAVO::Lookup
