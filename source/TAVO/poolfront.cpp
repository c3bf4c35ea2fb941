// The table in front of the pool's buckets.

#include "poolfront.h"

#include "platform/heap.h"

#include <new>

namespace TAVO::String {

// An entry that stands there twice, because of a gap before it, does no harm.
void PoolFront::Put(Entry* entry) noexcept {
    const std::uint64_t hash = EntryOf(entry).hash;
    Slot* line = LineOf(hash);
    const std::size_t home = HomeOf(hash);
    std::size_t way = home;
    while (line[way % kWays].load(std::memory_order_relaxed) && way < home + kWays) ++way;
    // A full line gives up the one that stands at home.
    Slot& slot = line[way % kWays];
    if (!slot.load(std::memory_order_relaxed)) ++m_used;
    slot.store(reinterpret_cast<std::uintptr_t>(entry) | TagOf(hash), std::memory_order_release);
}

void PoolFront::Remember(Entry* entry) noexcept {
    if (m_used > m_mask / 2 && Close()) {
        Resize((m_mask + 1) * 2);
        Open();
    }
    Put(entry);
}

void PoolFront::Forget(const Entry* entry) noexcept {
    // The whole line: a gap may have let an entry in twice.
    const std::uint64_t hash = EntryOf(const_cast<Entry*>(entry)).hash;
    Slot* line = LineOf(hash);
    const std::uintptr_t slot = reinterpret_cast<std::uintptr_t>(entry) | TagOf(hash);
    for (std::size_t way = 0; way < kWays; ++way) {
        if (line[way].load(std::memory_order_relaxed) != slot) continue;
        line[way].store(0, std::memory_order_relaxed);
        --m_used;
    }
    if (m_slots != m_first && m_used < m_mask / 16) Resize((m_mask + 1) / 8);
}

void PoolFront::Clear() noexcept {
    m_used = 0;
    if (m_slots != m_first) Platform::Release(m_slots);
    m_slots = m_first;
    m_mask = kFirstSlots - 1;
    for (Slot& slot : m_first) slot.store(0, std::memory_order_relaxed);
}

void PoolFront::Resize(std::size_t slots) noexcept {
    Slot *const old = m_slots, *const oldEnd = old + m_mask + 1;
    if (slots <= kFirstSlots) {
        Clear(); // what was in the larger table is remembered anew when it is asked for
        return;
    }
    void* made = Platform::Allocate(slots * sizeof(Slot));
    if (!made) return;
    m_slots = static_cast<Slot*>(made);
    for (std::size_t i = 0; i < slots; ++i) ::new (static_cast<void*>(m_slots + i)) Slot(0);
    m_mask = slots - 1;
    m_used = 0;
    for (const Slot* slot = old; slot < oldEnd; ++slot)
        if (const std::uintptr_t kept = slot->load(std::memory_order_relaxed)) Put(EntryIn(kept));
    if (old != m_first) Platform::Release(old);
}

} // namespace TAVO::String
