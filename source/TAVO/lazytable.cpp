// The hash table that orders its buckets late.

#include "lazytable.h"

#include <algorithm>
#include <iterator>
#include <limits>

namespace TAVO::Lookup {

using Buffers::Block;
using Buffers::CPObjectMemory;
using Buffers::tagCPOMEMHEADER;

void LazyTable::ClearTable() noexcept {
    CBaseHashTable::ClearTable();
    std::fill(std::begin(m_states), std::end(m_states), State());
}

bool LazyTable::Insert(const Place& place, unsigned long long hash, CPObjectMemory&& item) noexcept {
    if (place.index != Buffers::NotFound) return InsertAt(place, hash, std::move(item));
    const TableAccess::Bucket* buckets = TableAccess::Buckets(*this);
    const std::size_t count = buckets ? buckets[place.bucket].Count() : 0;
    if (!InsertAt({place.bucket, count, false}, hash, std::move(item))) return false;
    State& state = m_states[place.bucket];
    state.entries =
        static_cast<std::uint16_t>(std::min<std::size_t>(count + 1, std::numeric_limits<std::uint16_t>::max()));
    if (++state.unordered == kMostUnordered) PutInOrder(place.bucket);
    return true;
}

void LazyTable::PutInOrder(std::size_t bucket) noexcept {
    using Entry = TableAccess::Entry;
    struct Gathered {
        unsigned long long hash;
        tagCPOMEMHEADER* block;
    };
    // Nearly always the hashes differ.
    const auto isBelow = [this](const Gathered& first, const Gathered& second) {
        if (first.hash != second.hash) return first.hash < second.hash;
        CPObjectMemory a(Block::Adopt(first.block)), b(Block::Adopt(second.block));
        const bool below = CompareItems(a, b) < 0;
        Block::RefOf(a) = Block::RefOf(b) = nullptr; // they were not counted
        return below;
    };
    TableAccess::Bucket& entries = TableAccess::Buckets(*this)[bucket];
    const std::size_t unordered = std::exchange(m_states[bucket].unordered, std::uint16_t{0});
    std::size_t to = entries.Count(), from = to - unordered;

    // Hashes are spread over their whole range: the value tells about where an entry goes, and one that stands about
    // right has few to pass. With hashes that are not spread all of them may be passed, but they are 256 at most.
    std::uint16_t starts[kMostUnordered + 1] = {};
    const auto guess = [&](std::size_t i) { return TableAccess::Guess(entries[from + i].hash, unordered); };
    for (std::size_t i = 0; i < unordered; ++i) ++starts[guess(i) + 1];
    for (std::size_t i = 1; i < unordered; ++i) starts[i] = static_cast<std::uint16_t>(starts[i] + starts[i - 1]);
    Gathered gathered[kMostUnordered];
    for (std::size_t i = 0; i < unordered; ++i)
        gathered[starts[guess(i)]++] = {entries[from + i].hash, Block::Of(entries[from + i].item)};
    for (std::size_t i = 1; i < unordered; ++i) {
        const Gathered moved = gathered[i];
        std::size_t place = i;
        for (; place > 0 && isBelow(moved, gathered[place - 1]); --place) gathered[place] = gathered[place - 1];
        gathered[place] = moved;
    }

    const auto write = [&entries](std::size_t index, const Gathered& what) {
        entries[index].hash = what.hash;
        Block::RefOf(entries[index].item) = what.block;
    };
    // From the end, where there is room.
    for (std::size_t left = unordered; left-- > 0; write(--to, gathered[left]))
        for (; from > 0; --from) {
            const Entry& entry = entries[from - 1];
            const Gathered ordered{entry.hash, Block::Of(entry.item)};
            if (!isBelow(gathered[left], ordered)) break;
            write(--to, ordered);
        }
}

bool LazyTable::Visit(IBaseHashTableEnum& visitor) noexcept {
    for (std::size_t bucket = 0; bucket < kBuckets; ++bucket) Settle(bucket);
    return EnumTableBy(&visitor, 0, false);
}

} // namespace TAVO::Lookup
