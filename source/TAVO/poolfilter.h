#pragma once
// Tells of most texts that are met for the first time that no bucket holds them, so that nobody has to look there: a
// word that lies in the caches in the place of lines of a bucket that lie in memory. What it says to be absent is
// absent; of what is absent it calls one in twenty-five present at worst.
//
// 32 KB, then one byte for each hash, two to three when it has just grown. Hashes that go are not taken out; from time
// to time the filter is made anew from what the tables hold.
//
// Threads: the pool's lock is held around every call.

#include "platform/heap.h"
#include "simd.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace TAVO::String {

class PoolFilter {
public:
    PoolFilter() noexcept = default;
    PoolFilter(const PoolFilter&) = delete;
    PoolFilter& operator=(const PoolFilter&) = delete;

    // Off while there are few hashes: then looking costs no more than asking.
    bool IsOn() const noexcept { return m_words != nullptr; }
    // False: that hash was not added. Always true while the filter is off.
    bool MayHold(unsigned long long hash) const noexcept {
        return !m_words || (~m_words[WordOf(hash)] & BitsOf(hash)) == 0;
    }
    void Add(unsigned long long hash) noexcept {
        ++m_count;
        if (m_words) m_words[WordOf(hash)] |= BitsOf(hash);
    }
    // Starts to fetch from memory what MayHold looks at. The filter must be on.
    void Fetch(unsigned long long hash) const noexcept {
        Simd::Prefetch(reinterpret_cast<const char*>(m_words + WordOf(hash)));
    }

    // Whether it has to be made anew, because too many were added or there is too much room for those that are left.
    bool IsFull() const noexcept { return m_count >= m_room; }
    bool IsTooLargeFor(unsigned long long count) const noexcept { return m_words && count < m_room / 8; }

    // Forgets all, to be filled with `count` hashes and later with as many again. Without memory it knows nothing.
    void Reset(unsigned long long count) noexcept {
        Platform::Release(m_words);
        m_words = nullptr;
        m_count = 0;
        m_room = kFew;
        if (count < kFew / 2) return;
        m_wordsPerBucket = static_cast<std::size_t>(count) * 2 / (kBuckets * kHashesPerWord) + 1;
        m_room = m_wordsPerBucket * kBuckets * kHashesPerWord;
        const std::size_t bytes = m_wordsPerBucket * kBuckets * sizeof(*m_words);
        m_words = static_cast<std::uint64_t*>(Platform::Allocate(bytes));
        if (m_words) std::memset(m_words, 0, bytes);
    }

private:
    static constexpr std::size_t kFew = 1 << 11, kBuckets = 1 << 12, kHashesPerWord = 8;

    // The words for the hashes of one bucket lie together, so that filling the filter bucket by bucket stays in the
    // caches.
    std::size_t WordOf(unsigned long long hash) const {
        return static_cast<std::size_t>(hash % kBuckets) * m_wordsPerBucket + ((hash >> 32) * m_wordsPerBucket >> 32);
    }
    // Four bits of a word, told by bits of the hash that do not tell the bucket and hardly the word.
    static std::uint64_t BitsOf(unsigned long long hash) {
        const auto bit = [hash](int shift) { return std::uint64_t{1} << (hash >> shift & 63); };
        return bit(12) | bit(18) | bit(24) | bit(30);
    }

    std::uint64_t* m_words = nullptr; // null while there are few hashes, or no memory
    std::size_t m_wordsPerBucket = 0, m_count = 0, m_room = kFew;
};

} // namespace TAVO::String
