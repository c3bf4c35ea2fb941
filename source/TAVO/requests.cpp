// Maintenance requests in their order, and the choice among them.

#include "requests.h"

#include "blocks.h"
#include "platform/heap.h"

#include <cstring>
#include <limits>

namespace TAVO::Maintenance {

using Buffers::Block;
using Buffers::CPObjectMemory;

namespace {

constexpr std::size_t kGrowth = 16;

// Calls the request, retiring an entry whose request throws.
template <class Ask> bool Asked(Entry& entry, Ask ask) noexcept {
    try {
        ask(entry.Request());
        return true;
    } catch (...) {
        entry.flags |= Entry::Retired;
        return false;
    }
}

bool AskDueTime(Entry& entry, unsigned long long& due) noexcept {
    return !entry.IsRetired() && Asked(entry, [&](IMaintenanceRequest& request) { due = request.GetDueTime(); });
}

// What the entry's own priority and its bonus make together: 64 bits, so that no sum overflows.
bool AskUrgency(Entry& entry, std::int64_t& urgency) noexcept {
    return Asked(entry, [&](IMaintenanceRequest& request) {
        urgency = static_cast<std::int64_t>(request.GetPriority()) + entry.bonus;
    });
}

} // namespace

IMaintenanceRequest& Entry::Request() const {
    return *reinterpret_cast<IMaintenanceRequest*>(Block::PayloadOf<char>(block) + position);
}

bool RequestList::Append(const CPObjectMemory& block, std::size_t position) noexcept {
    if (m_count == m_capacity) {
        // Entries move bitwise, as all handles do.
        const std::size_t bytes = (m_capacity + kGrowth) * sizeof(Entry);
        void* grown = m_entries ? Platform::Reallocate(m_entries, bytes) : Platform::Allocate(bytes);
        if (!grown) return false;
        m_entries = static_cast<Entry*>(grown);
        m_capacity += kGrowth;
    }
    ::new (static_cast<void*>(m_entries + m_count)) Entry{block, position};
    ++m_count;
    return true;
}

Entry RequestList::Take(std::size_t index) noexcept {
    Entry taken = std::move(m_entries[index]);
    m_entries[index].~Entry();
    std::memmove(static_cast<void*>(m_entries + index), static_cast<void*>(m_entries + index + 1),
                 (m_count - index - 1) * sizeof(Entry));
    if (--m_count == 0) {
        Platform::Release(std::exchange(m_entries, nullptr));
        m_capacity = 0;
    }
    return taken;
}

std::size_t RequestList::Find(const CPObjectMemory& block, std::size_t position) const noexcept {
    for (std::size_t i = 0; i < m_count; ++i)
        if (m_entries[i].Is(block, position)) return i;
    return Buffers::NotFound;
}

void RequestList::Clear() noexcept {
    while (m_count) Take(m_count - 1);
}

std::size_t RequestList::Choose(unsigned long long now) noexcept {
    constexpr std::int32_t kHighestBonus = std::numeric_limits<std::int32_t>::max();
    std::size_t best = Buffers::NotFound;
    // Intended (lowest-priority): only what is above the lowest priority can be chosen, so a request of exactly that
    // one waits a pass until its bonus lifts it. A textbook would take the first that is due.
    std::int64_t bestUrgency = std::numeric_limits<std::int32_t>::min();
    for (std::size_t i = 0; i < m_count; ++i) {
        Entry& entry = m_entries[i];
        unsigned long long due;
        std::int64_t urgency;
        if (!AskDueTime(entry, due) || due > now || !AskUrgency(entry, urgency)) continue;
        if (entry.bonus < kHighestBonus) ++entry.bonus;
        if (urgency <= bestUrgency) continue; // ties keep the earlier entry
        bestUrgency = urgency;
        best = i;
    }
    if (Entry* chosen = At(best)) chosen->bonus = 0;
    return best;
}

bool RequestList::NextDue(unsigned long long& due) noexcept {
    bool found = false;
    for (std::size_t i = 0; i < m_count; ++i) {
        unsigned long long candidate;
        if (!AskDueTime(m_entries[i], candidate) || (found && candidate >= due)) continue;
        due = candidate;
        found = true;
    }
    return found;
}

} // namespace TAVO::Maintenance
