// The table in front of the pool's buckets.

#include "poolfront.h"

#include "platform/heap.h"

#include <new>
#include <utility>

namespace TAVO::String {

// An entry that stands there twice, because two threads asked for it, does no harm.
void PoolFront::Put(Entry* entry) noexcept {
    Place place;
    if (!PlaceOf(entry, place)) return;
    const std::uint64_t hash = EntryOf(entry).hash;
    Line& line = LineOf(hash);
    const std::uint64_t free = line.WaysOf(0);
    if (free) ++m_used;
    // A full line gives up any one.
    line.Set(free ? WayOf(free) : static_cast<std::size_t>(hash >> 32) % kWays, place, TagOf(hash));
}

void PoolFront::Remember(Entry* entry) noexcept {
    if (m_base == 0) m_base = reinterpret_cast<std::uintptr_t>(entry) - kAlignment * (std::uintptr_t{1} << 31);
    if (m_used > m_mask * 8 && Close()) { // eight of twelve
        Resize((m_mask + 1) * 2);
        Open();
    }
    Put(entry);
}

void PoolFront::Forget(const Entry* entry) noexcept {
    Place place;
    if (!PlaceOf(entry, place)) return;
    Line& line = LineOf(EntryOf(const_cast<Entry*>(entry)).hash);
    for (std::size_t way = 0; way < kWays; ++way) {
        if (line.places[way].load(std::memory_order_relaxed) != place || !line.Holds(way)) continue;
        line.Set(way, 0, 0);
        --m_used;
    }
    if (m_memory && m_used < m_mask) Resize((m_mask + 1) / 8);
}

void PoolFront::Clear() noexcept {
    m_used = 0;
    Platform::Release(std::exchange(m_memory, nullptr));
    m_lines = m_first;
    m_mask = kFirstLines - 1;
    for (Line& line : m_first) ::new (static_cast<void*>(&line)) Line;
}

void PoolFront::Resize(std::size_t lines) noexcept {
    if (lines <= kFirstLines) {
        Clear(); // what was in the larger table is remembered anew when it is asked for
        return;
    }
    void* memory = Platform::Allocate((lines + 1) * sizeof(Line)); // one more: blocks begin anywhere in a cache line
    if (!memory) return;
    const auto address = reinterpret_cast<std::uintptr_t>(memory) + sizeof(Line) - 1;
    auto* made = reinterpret_cast<Line*>(address / sizeof(Line) * sizeof(Line));
    for (std::size_t i = 0; i < lines; ++i) ::new (static_cast<void*>(made + i)) Line;
    Line *const old = std::exchange(m_lines, made), *const oldEnd = old + m_mask + 1;
    m_mask = lines - 1;
    m_used = 0;
    for (const Line* line = old; line < oldEnd; ++line)
        for (std::size_t way = 0; way < kWays; ++way)
            if (line->Holds(way)) Put(EntryAt(line->places[way].load(std::memory_order_relaxed)));
    Platform::Release(std::exchange(m_memory, memory));
}

} // namespace TAVO::String
