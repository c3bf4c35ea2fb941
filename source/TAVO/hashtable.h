#pragma once
// The hash table's search, inline for the tables of the library that know their items.

#include "blocks.h"
#include "simd.h"

#include <cstring>
#include <new>
#include <TAVO/lookup.h>

namespace TAVO::Lookup {

// A bucket's entries. It grows by four entries, by eight, then by half again, instead of by 16: most buckets hold few
// entries or very many.
class CBaseHashTable::Bucket : public Buffers::CPObjectVector<HASHENTRY> {
public:
    // At an index up to the count. False without memory; the item stays where it is.
    bool Put(unsigned long long hash, Buffers::CPObjectMemory&& item, std::size_t index) noexcept {
        const std::size_t count = Count();
        const bool hasRoom = m_pMH && m_pMH->sUsed + sizeof(HASHENTRY) <= m_pMH->sAllocated;
        if (!hasRoom && !GrowTo(count < 4 ? 4 : count + (count < 16 ? 8 : count / 2))) return false;
        HASHENTRY* slot = reinterpret_cast<HASHENTRY*>(m_pMH + 1) + index;
        std::memmove(static_cast<void*>(slot + 1), static_cast<const void*>(slot), (count - index) * sizeof(*slot));
        ::new (static_cast<void*>(slot)) HASHENTRY{hash, std::move(item)};
        m_pMH->sUsed += sizeof(*slot);
        return true;
    }
    std::size_t Count() const noexcept { return m_pMH ? m_pMH->sUsed / sizeof(HASHENTRY) : 0; }
    // Closes the gap before anything is released; the block goes with the last entry.
    Buffers::CPObjectMemory Take(std::size_t index, bool releaseWhenEmpty = true) noexcept {
        return std::move(Extract(index, releaseWhenEmpty).item);
    }
};

// The library's own road to the buckets.
class TableAccess {
public:
    using Entry = CBaseHashTable::HASHENTRY;
    using Place = CBaseHashTable::Place;
    using Bucket = CBaseHashTable::Bucket;

    // One bucket per value of the hash's low bits; null until the first insertion.
    static Bucket* Buckets(const CBaseHashTable& table) {
        Buffers::tagCPOMEMHEADER* index = Buffers::Block::Of(table.m_index);
        return index ? reinterpret_cast<Bucket*>(index + 1) : nullptr;
    }

    // Hashes are spread over their whole range, so the value tells the place.
    static std::size_t Guess(unsigned long long hash, std::size_t count) {
        return static_cast<std::size_t>(((hash >> 32) * count) >> 32);
    }

    // Starts to fetch from memory what adding an entry behind the `count` ones of its bucket will look at, so that the
    // cache misses of a large table run side by side instead of one after the other.
    static void FetchEnd(const CBaseHashTable& table, unsigned long long hash, std::size_t count) {
        const char* bucket = Memory(table, hash);
        if (!bucket) return;
        Simd::Prefetch(bucket);
        Simd::Prefetch(bucket + sizeof(Buffers::tagCPOMEMHEADER) + count * sizeof(Entry));
    }
    // And what a search among the first `count` ones will look at: some lines around the place that the hash suggests.
    static void FetchAround(const CBaseHashTable& table, unsigned long long hash, std::size_t count) {
        constexpr std::size_t kLine = 64, kLines = 5;
        const char* bucket = Memory(table, hash);
        if (!bucket) return;
        Simd::Prefetch(bucket);
        const char* guessed = bucket + sizeof(Buffers::tagCPOMEMHEADER) + Guess(hash, count) * sizeof(Entry);
        for (std::size_t line = 0; line < kLines; ++line) Simd::Prefetch(guessed + line * kLine - kLines / 2 * kLine);
    }

    // The hashes of all entries, bucket by bucket.
    template <class Visit> static void ForEachHash(const CBaseHashTable& table, Visit visit) {
        const Bucket* buckets = Buckets(table);
        for (std::size_t i = 0; buckets && i < table.m_buckets; ++i) {
            const std::size_t count = buckets[i].Count();
            FetchEntries(buckets[(i + 1) & table.m_mask], count);
            for (std::size_t k = 0; k < count; ++k) visit(buckets[i][k].hash);
        }
    }

    // Starts to fetch a bucket that will soon be walked through. How long it is would have to be waited for: about as
    // long as one before it, which has `count` entries.
    static void FetchEntries(const Bucket& bucket, std::size_t count) {
        constexpr std::size_t kLine = 64;
        const auto* memory = reinterpret_cast<const char*>(Buffers::Block::Of(bucket));
        const std::size_t size = sizeof(Buffers::tagCPOMEMHEADER) + count * sizeof(Entry);
        for (std::size_t at = 0; memory && at < size; at += kLine) Simd::Prefetch(memory + at);
    }
    // Starts to fetch the first 96 bytes of all items of a bucket.
    static void FetchItems(const Bucket& bucket) {
        for (std::size_t i = 0; i < bucket.Count(); ++i) {
            const auto* item = reinterpret_cast<const char*>(Buffers::Block::Of(bucket[i].item));
            for (const std::size_t byte : {0, 64, 95}) Simd::Prefetch(item + byte);
        }
    }

    // Sets `place` to where the item stands for which `order(item)` is 0 among the entries of `hash`, or where it would
    // be inserted, and tells whether it is there. `order` tells how what is sought compares with an item: below 0, 0,
    // above 0. The last `unordered` entries of the bucket are left out.
    template <class Order>
    static bool Locate(const CBaseHashTable& table, unsigned long long hash, Order order, Place& place,
                       std::size_t unordered = 0) {
        place.bucket = static_cast<std::size_t>(hash & table.m_mask);
        place.index = 0;
        place.found = false;
        const Bucket* buckets = Buckets(table);
        if (!buckets) return false;
        const Buffers::tagCPOMEMHEADER* bucket = Buffers::Block::Of(buckets[place.bucket]);
        if (!bucket) return false;
        const auto* entries = reinterpret_cast<const Entry*>(bucket + 1);
        const std::size_t count = bucket->sUsed / sizeof(Entry) - unordered;
        std::size_t index = LowerBound(entries, count, hash), end = index;
        if (index < count && entries[index].hash == hash) {
            const auto* block = reinterpret_cast<const char*>(Buffers::Block::Of(entries[index].item));
            Simd::Prefetch(block);
            Simd::Prefetch(block + 64);
        }
        // Entries of equal hash stand in the order of their items; nearly always there is one. Bisect the run.
        for (std::size_t step = 1; end < count && entries[end].hash == hash; step *= 2) end += step;
        if (end > count) end = count;
        while (index < end) {
            const std::size_t middle = index + (end - index) / 2;
            const int compared = entries[middle].hash == hash ? order(entries[middle].item) : -1;
            if (compared > 0) {
                index = middle + 1;
            } else {
                end = middle;
                place.found = compared == 0;
            }
        }
        place.index = index;
        return place.found;
    }

    // DisposeTable; `next` is told the items of a bucket before they are asked, and `dropped` the bucket and the place
    // of each entry that was dropped.
    template <class Next, class Dropped>
    static bool Dispose(CBaseHashTable& table, std::uint32_t budget, Next next, Dropped dropped) noexcept {
        const unsigned long long start = Core::OS::GetTimeNow();
        try {
            for (unsigned long long round = 0; round < table.m_buckets && Buckets(table); ++round) {
                const auto bucket = static_cast<std::size_t>(table.m_cursor);
                table.m_cursor = (table.m_cursor + 1) & table.m_mask;
                // What the buckets to come hold is fetched while this one is walked through: the entries of the one
                // after the next, the items of the next one.
                const std::size_t count = Buckets(table)[bucket].Count();
                FetchEntries(Buckets(table)[(table.m_cursor + 1) & table.m_mask], count);
                FetchItems(Buckets(table)[table.m_cursor]);
                for (std::size_t i = 0; i < count; ++i) next(Buckets(table)[bucket][i].item);
                if (Buckets(table)[bucket].isEmpty()) continue; // takes no time
                for (std::size_t index = Buckets(table)[bucket].GetNItems(); index-- > 0;)
                    if (table.DisposeEntry(bucket, index)) dropped(bucket, index);
                if (Core::OS::GetTimeNow() - start > budget) return false;
            }
            return true;
        } catch (...) {
            // The cursor has moved on: one item that always throws must not keep the sweep from all others.
            return false;
        }
    }

    static Buffers::CPObjectMemory& Item(const CBaseHashTable& table, const Place& place) {
        return reinterpret_cast<Entry*>(Buffers::Block::Of(Buckets(table)[place.bucket]) + 1)[place.index].item;
    }

private:
    // The bucket that the hash selects; null when it is empty.
    static const char* Memory(const CBaseHashTable& table, unsigned long long hash) {
        const Bucket* buckets = Buckets(table);
        return buckets ? reinterpret_cast<const char*>(Buffers::Block::Of(buckets[hash & table.m_mask])) : nullptr;
    }

    // How many of the `count` entries, 1 at least, have a hash below `hash`. Without a branch on what it reads: where
    // the hash belongs among its neighbours is chance, and a wrong guess of the processor's costs more than a step.
    static std::size_t CountBelow(const Entry* entries, std::size_t count, unsigned long long hash) {
        std::size_t below = 0;
        for (std::size_t left = count; left > 1;) {
            const std::size_t half = left / 2;
            below += half & (0 - static_cast<std::size_t>(entries[below + half - 1].hash < hash));
            left -= half;
        }
        return below + (entries[below].hash < hash);
    }

    // First entry whose hash is not below `hash`. Hashes are spread over their whole range, so the place is guessed
    // from the value and sought among the entries around it, which are nearer by far than those that a bisection of all
    // would look at. Hashes that are not spread cost twice a bisection.
    static std::size_t LowerBound(const Entry* entries, std::size_t count, unsigned long long hash) {
        if (count <= kNear) return count ? CountBelow(entries, count, hash) : 0;
        // The guess is wrong by the square root of the count.
        return count <= 64 ? SearchAround<kNear>(entries, count, hash) : SearchAround<2 * kNear>(entries, count, hash);
    }

    static constexpr std::size_t kNear = 16;

    template <std::size_t width>
    static std::size_t SearchAround(const Entry* entries, std::size_t count, unsigned long long hash) {
        const std::size_t guess = Guess(hash, count);
        std::size_t first = guess < width / 2 ? 0 : guess - width / 2;
        if (first > count - width) first = count - width;
        const std::size_t index = first + CountBelow(entries + first, width, hash);
        if (index == first && first > 0 && entries[first - 1].hash >= hash) return SearchDown(entries, first - 1, hash);
        if (index == first + width && index < count && entries[index].hash < hash)
            return SearchUp(entries, index, count, hash);
        return index;
    }

    // The entry at `from` is not below `hash`; so are those behind it.
    TAVO_NOINLINE static std::size_t SearchDown(const Entry* entries, std::size_t from, unsigned long long hash) {
        std::size_t high = from, step = 1;
        while (step <= high && entries[high - step].hash >= hash) high -= step, step *= 2;
        const std::size_t low = step <= high ? high - step : 0;
        return low + (high > low ? CountBelow(entries + low, high - low, hash) : 0);
    }

    // The entry at `from` is below `hash`, as those before it are.
    TAVO_NOINLINE static std::size_t SearchUp(const Entry* entries, std::size_t from, std::size_t count,
                                              unsigned long long hash) {
        std::size_t low = from + 1, step = 1;
        while (step <= count - low && entries[low + step - 1].hash < hash) low += step, step *= 2;
        const std::size_t left = step <= count - low ? step - 1 : count - low;
        return low + (left ? CountBelow(entries + low, left, hash) : 0);
    }
};

} // namespace TAVO::Lookup
