#pragma once
// Where entries stand that were asked for again: a table in front of the sorted buckets, which remain the truth. It may
// forget an entry at any time, so it never fails, but it never names one that the buckets do not hold.
//
// Lines of eight entries, one cache line each. A text that is met for the first time costs nothing here, neither memory
// nor much time; one that is asked for again takes 16 to 32 bytes.
//
// Threads: the pool's lock is held around every call but Share. That one reads slots while others write them, each with
// one store; where more changes than that, readers are kept out.

#include "poolentry.h"
#include "poolreaders.h"
#include "simd.h"

namespace TAVO::String {

class PoolFront {
public:
    using Entry = Buffers::tagCPOMEMHEADER;

    PoolFront() noexcept = default;
    PoolFront(const PoolFront&) = delete;
    PoolFront& operator=(const PoolFront&) = delete;

    // What Share came to.
    struct Shared {
        Entry* entry;  // counted for the caller; null when it is not remembered
        bool searched; // false: the calling thread has to take the lock to look
    };

    // The entry of that text, without the pool's lock.
    template <class Text> Shared Share(const Text& text) noexcept {
        if (!m_readers.Enter()) return {nullptr, false};
        Entry* entry = Find(text);
        if (entry) Buffers::Block::Acquire(entry);
        m_readers.Leave();
        return {entry, true};
    }

    // The entry of that text, if it is remembered.
    template <class Text> Entry* Find(const Text& text) const noexcept {
        const Slot* line = LineOf(text.key.hash);
        const std::uintptr_t tag = TagOf(text.key.hash);
        for (std::size_t way = HomeOf(text.key.hash), end = way + kWays; way < end; ++way) {
            const std::uintptr_t slot = line[way % kWays].load(std::memory_order_acquire);
            if (!slot) return nullptr;
            if ((slot & kTags) != tag) continue;
            Entry* entry = EntryIn(slot);
            Simd::Prefetch(reinterpret_cast<const char*>(entry) + 64); // the text, which is asked last
            if (IsTextOf(EntryOf(entry), text)) return entry;
        }
        return nullptr;
    }

    // Lets the calling thread read without the lock from now on, if there is room for it.
    void Join() noexcept { m_readers.Join(); }
    // Keeps readers out until Open, so that entries may go. False when one does not leave.
    bool Close() noexcept { return m_readers.Close(); }
    void Open() noexcept { m_readers.Open(); }

    // Remembers an entry that Find did not find.
    void Remember(Entry* entry) noexcept;
    // For an entry that is about to go; also if it is not remembered. Between Close and Open.
    void Forget(const Entry* entry) noexcept;
    // Forgets all. Between Close and Open.
    void Clear() noexcept;

private:
    // Blocks are aligned to 16, which leaves room for four bits of the hash.
    using Slot = std::atomic<std::uintptr_t>; // an entry's address and a tag; 0: free

    static constexpr std::uintptr_t kTags = 15;
    static constexpr std::size_t kWays = 8, kFirstSlots = 512;

    static std::uintptr_t TagOf(std::uint64_t hash) { return static_cast<std::uintptr_t>(hash >> 60); }
    static std::size_t HomeOf(std::uint64_t hash) { return static_cast<std::size_t>(hash >> 57) % kWays; }
    static Entry* EntryIn(std::uintptr_t slot) { return reinterpret_cast<Entry*>(slot & ~kTags); }
    Slot* LineOf(std::uint64_t hash) const {
        return m_slots + (static_cast<std::size_t>(hash >> 8) & m_mask) / kWays * kWays;
    }

    template <class Text> static bool IsTextOf(const PoolEntry& entry, const Text& text) {
        return entry.hash == text.key.hash && entry.hashi == text.key.hashi && entry.length == text.key.length &&
               text.Compare(reinterpret_cast<const wchar_t*>(&entry + 1)) == 0;
    }

    void Put(Entry* entry) noexcept;
    // Between Close and Open. Without memory the table stays as it is.
    void Resize(std::size_t slots) noexcept;

    Slot* m_slots = m_first;
    std::size_t m_mask = kFirstSlots - 1, m_used = 0;
    pool::Readers m_readers;
    alignas(64) Slot m_first[kFirstSlots] = {};
};

} // namespace TAVO::String
