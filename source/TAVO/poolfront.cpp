// The table in front of the pool's buckets.

#include "poolfront.h"

#include "platform/heap.h"

#include <cstring>

namespace TAVO::String {

void PoolFront::Put(Entry* entry) noexcept {
    const std::uint64_t hash = EntryOf(entry).hash;
    std::uintptr_t* line = LineOf(hash);
    const std::size_t home = HomeOf(hash);
    std::size_t way = home;
    while (line[way % kWays] && way < home + kWays) ++way;
    // A full line gives up the one that stands at home.
    if (!line[way % kWays]) ++m_used;
    line[way % kWays] = reinterpret_cast<std::uintptr_t>(entry) | TagOf(hash);
}

void PoolFront::Remember(Entry* entry) noexcept {
    if (m_used > m_mask / 2) Resize((m_mask + 1) * 2);
    Put(entry);
}

void PoolFront::Forget(const Entry* entry) noexcept {
    // The whole line: a gap may have let an entry in twice.
    const std::uint64_t hash = EntryOf(const_cast<Entry*>(entry)).hash;
    std::uintptr_t* line = LineOf(hash);
    const std::uintptr_t slot = reinterpret_cast<std::uintptr_t>(entry) | TagOf(hash);
    for (std::size_t way = 0; way < kWays; ++way) {
        if (line[way] != slot) continue;
        line[way] = 0;
        --m_used;
    }
    if (m_slots != m_first && m_used < m_mask / 16) Resize((m_mask + 1) / 8);
}

void PoolFront::Clear() noexcept {
    m_used = 0;
    if (m_slots != m_first) Platform::Release(m_slots);
    m_slots = m_first;
    m_mask = kFirstSlots - 1;
    std::memset(m_first, 0, sizeof m_first);
}

// Without memory it stays as it is.
void PoolFront::Resize(std::size_t slots) noexcept {
    std::uintptr_t *const old = m_slots, *const oldEnd = old + m_mask + 1;
    if (slots <= kFirstSlots) {
        slots = kFirstSlots;
        m_slots = m_first;
    } else {
        void* made = Platform::Allocate(slots * sizeof(*m_slots));
        if (!made) return;
        m_slots = static_cast<std::uintptr_t*>(made);
    }
    std::memset(m_slots, 0, slots * sizeof(*m_slots));
    m_mask = slots - 1;
    m_used = 0;
    for (const std::uintptr_t* slot = old; slot < oldEnd; ++slot)
        if (*slot) Put(EntryIn(*slot));
    if (old != m_first) Platform::Release(old);
}

} // namespace TAVO::String
