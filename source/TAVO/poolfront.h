#pragma once
// Where entries stand that were asked for again: a table in front of the sorted buckets, which remain the truth. It may
// forget an entry at any time, so it never fails, but it never names one that the buckets do not hold.
//
// Lines of eight entries, one cache line each. A text that is met for the first time costs nothing here, neither memory
// nor much time; one that is asked for again takes 16 to 32 bytes.
//
// Threads: the pool's lock is held around every call.

#include "poolentry.h"
#include "simd.h"

namespace TAVO::String {

class PoolFront {
public:
    using Entry = Buffers::tagCPOMEMHEADER;

    PoolFront() noexcept = default;
    PoolFront(const PoolFront&) = delete;
    PoolFront& operator=(const PoolFront&) = delete;

    // The entry of that text, if it is remembered.
    template <class Text> Entry* Find(const Text& text) const noexcept {
        const std::uintptr_t* line = LineOf(text.key.hash);
        const std::uintptr_t tag = TagOf(text.key.hash);
        for (std::size_t way = HomeOf(text.key.hash), end = way + kWays; way < end; ++way) {
            const std::uintptr_t slot = line[way % kWays];
            if (!slot) return nullptr;
            if ((slot & kTags) != tag) continue;
            Entry* entry = EntryIn(slot);
            Simd::Prefetch(reinterpret_cast<const char*>(entry) + 64); // the text, which is asked last
            if (IsTextOf(EntryOf(entry), text)) return entry;
        }
        return nullptr;
    }

    // Remembers an entry that Find did not find.
    void Remember(Entry* entry) noexcept;
    // For an entry that is about to go; also if it is not remembered.
    void Forget(const Entry* entry) noexcept;
    // Forgets all.
    void Clear() noexcept;

private:
    // Blocks are aligned to 16, which leaves room for four bits of the hash.
    static constexpr std::uintptr_t kTags = 15;
    static constexpr std::size_t kWays = 8, kFirstSlots = 512;

    static std::uintptr_t TagOf(std::uint64_t hash) { return static_cast<std::uintptr_t>(hash >> 60); }
    static std::size_t HomeOf(std::uint64_t hash) { return static_cast<std::size_t>(hash >> 57) % kWays; }
    static Entry* EntryIn(std::uintptr_t slot) { return reinterpret_cast<Entry*>(slot & ~kTags); }
    std::uintptr_t* LineOf(std::uint64_t hash) const {
        return m_slots + (static_cast<std::size_t>(hash >> 8) & m_mask) / kWays * kWays;
    }

    template <class Text> static bool IsTextOf(const PoolEntry& entry, const Text& text) {
        return entry.hash == text.key.hash && entry.hashi == text.key.hashi && entry.length == text.key.length &&
               text.Compare(reinterpret_cast<const wchar_t*>(&entry + 1)) == 0;
    }

    void Put(Entry* entry) noexcept;
    void Resize(std::size_t slots) noexcept;

    std::uintptr_t* m_slots = m_first; // an entry's address and a tag; 0: free
    std::size_t m_mask = kFirstSlots - 1, m_used = 0;
    alignas(64) std::uintptr_t m_first[kFirstSlots] = {};
};

} // namespace TAVO::String
