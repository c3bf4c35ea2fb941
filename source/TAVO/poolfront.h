#pragma once
// Where entries stand that were asked for again: a table in front of the sorted buckets, which remain the truth. It may
// forget an entry at any time, so it never fails, but it never names one that the buckets do not hold.
//
// Cache lines of twelve entries and a byte of each one's hash. A look compares the twelve bytes in two words, so it has
// no branch that waits for memory and could be guessed wrong: the processor goes on with the next text meanwhile. Four
// bytes tell an entry, as its distance from the first one; those that lie too far from it are not remembered. The
// smaller the table, the more of it the caches hold, while the entries themselves stream past. A text that is met for
// the first time costs nothing here, neither memory nor much time; one that is asked for again takes 8 to 16 bytes.
//
// Threads: the pool's lock is held around every call but Share. That one reads lines while others add to them, first
// the entry and then its byte, or put another entry in the place of one; where more changes than that, readers are kept
// out.

#include "poolentry.h"
#include "poolreaders.h"
#include "simd.h"

#include <bit>

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
        pool::Readers::Mark* mark = m_readers.Enter();
        if (TAVO_UNLIKELY(!mark)) return {nullptr, false};
        Entry* entry = Find(text);
        if (entry) Buffers::Block::Acquire(entry);
        pool::Readers::Leave(*mark);
        return {entry, true};
    }

    // The entry of that text, if it is remembered.
    template <class Text> Entry* Find(const Text& text) const noexcept {
        const Line& line = LineOf(text.key.hash);
        for (std::uint64_t ways = line.WaysOf(TagOf(text.key.hash)); ways; ways &= ways - 1) {
            Entry* entry = EntryAt(line.places[WayOf(ways)].load(std::memory_order_relaxed));
            Simd::Prefetch(reinterpret_cast<const char*>(entry) + 64); // the text, which is asked last
            if (TAVO_LIKELY(IsTextOf(EntryOf(entry), text))) return entry;
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
    using Place = std::uint32_t; // of an entry: its distance from m_base in blocks' alignment

    static constexpr std::size_t kWays = 12, kFirstLines = 32, kAlignment = 16;

    struct alignas(64) Line {
        std::atomic<std::uint64_t> tags{0};     // a byte for each of the first eight ways, lowest first; 0: free
        std::atomic<std::uint64_t> moreTags{0}; // and of the others; the upper four are never looked at
        std::atomic<Place> places[kWays] = {};

        // A bit for each way with that tag, as WayOf knows them. Bits above one may be set in vain.
        std::uint64_t WaysOf(std::uint64_t tag) const {
            return Equal(tags.load(std::memory_order_acquire), tag, kEach) >> 7 |
                   Equal(moreTags.load(std::memory_order_acquire), tag, kEachOfMore) >> 6;
        }
        // What stands at a way and its tag, or with 0 that it is free.
        void Set(std::size_t way, Place place, std::uint64_t tag) {
            places[way].store(place, std::memory_order_release);
            std::atomic<std::uint64_t>& word = way < 8 ? tags : moreTags;
            const std::size_t shift = way % 8 * 8;
            word.store((word.load(std::memory_order_relaxed) & ~(std::uint64_t{0xFF} << shift)) | tag << shift,
                       std::memory_order_release);
        }
        bool Holds(std::size_t way) const {
            return ((way < 8 ? tags : moreTags).load(std::memory_order_relaxed) >> way % 8 * 8 & 0xFF) != 0;
        }

    private:
        static constexpr std::uint64_t kEach = 0x0101010101010101, kEachOfMore = kEach >> 8 * (16 - kWays);

        // The highest bit of each byte that is the tag, and perhaps of bytes above one.
        static std::uint64_t Equal(std::uint64_t word, std::uint64_t tag, std::uint64_t each) {
            const std::uint64_t different = word ^ (tag * each);
            return (different - each) & ~different & each << 7;
        }
    };

    // At least 2: then no free way is told for one that holds something.
    static std::uint64_t TagOf(std::uint64_t hash) { return hash >> 57 ? hash >> 56 : 2 + (hash >> 56); }
    static std::size_t WayOf(std::uint64_t ways) {
        const auto bit = static_cast<std::size_t>(std::countr_zero(ways));
        return bit / 8 + bit % 8 * 8;
    }
    Line& LineOf(std::uint64_t hash) const { return m_lines[(hash >> 8) & m_mask]; }

    Entry* EntryAt(Place place) const {
        return reinterpret_cast<Entry*>(m_base + static_cast<std::uintptr_t>(place) * kAlignment);
    }
    // False when the entry lies too far off.
    bool PlaceOf(const Entry* entry, Place& place) const {
        const std::uintptr_t distance = (reinterpret_cast<std::uintptr_t>(entry) - m_base) / kAlignment;
        place = static_cast<Place>(distance);
        return place == distance;
    }

    template <class Text> static bool IsTextOf(const PoolEntry& entry, const Text& text) {
        return entry.hash == text.key.hash && entry.hashi == text.key.hashi && entry.length == text.key.length &&
               text.Compare(reinterpret_cast<const wchar_t*>(&entry + 1)) == 0;
    }

    void Put(Entry* entry) noexcept;
    // Between Close and Open. Without memory the table stays as it is.
    void Resize(std::size_t lines) noexcept;

    Line* m_lines = m_first;
    void* m_memory = nullptr;  // where they lie; null for the first ones
    std::uintptr_t m_base = 0; // set before the first entry is remembered
    std::size_t m_mask = kFirstLines - 1, m_used = 0;
    pool::Readers m_readers;
    Line m_first[kFirstLines];
};

} // namespace TAVO::String
