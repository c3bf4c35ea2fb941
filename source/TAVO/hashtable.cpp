// The hash table: sorted buckets behind an index of 2^n handles.

#include "diagnostics.h"
#include "objectvector.h"

#include <TAVO/lookup.h>

namespace TAVO::Buffers {
template class TAVO_TEMPLATE_DEF CPObjectVector<Lookup::CBaseHashTable::HASHENTRY>;
} // namespace TAVO::Buffers

namespace TAVO::Lookup {

using Buffers::CPObjectMemory;

namespace {

// First entry whose hash is not below `hash`. Hashes are spread over their whole range, so the place is guessed from
// the value and the search widens from there: one or two cache lines instead of a line per halving. Hashes that are not
// spread cost twice a bisection.
std::size_t LowerBoundByHash(const CBaseHashTable::HASHENTRY* entries, std::size_t count, unsigned long long hash) {
    if (count == 0) return 0;
    std::size_t low = 0, high = count; // entries before low are below, entries from high on are not
    std::size_t guess = static_cast<std::size_t>(((hash >> 32) * count) >> 32);
    if (entries[guess].hash < hash) {
        low = guess + 1;
        for (std::size_t step = 1; low < high; step *= 2) {
            const std::size_t probe = low + step - 1;
            if (probe >= high) break;
            if (entries[probe].hash >= hash) {
                high = probe;
                break;
            }
            low = probe + 1;
        }
    } else {
        high = guess;
        for (std::size_t step = 1; low < high; step *= 2) {
            if (step > high) break;
            const std::size_t probe = high - step;
            if (entries[probe].hash < hash) {
                low = probe + 1;
                break;
            }
            high = probe;
        }
    }
    while (low < high) {
        const std::size_t middle = low + (high - low) / 2;
        if (entries[middle].hash < hash)
            low = middle + 1;
        else
            high = middle;
    }
    return low;
}

bool SameBlock(const CPObjectMemory& a, const CPObjectMemory& b) { return a.key() == b.key(); }

} // namespace

CBaseHashTable::CBaseHashTable() noexcept : CBaseHashTable(10) {}

CBaseHashTable::CBaseHashTable(std::uint32_t uDirectIndexLength) noexcept : m_cursor(0) {
    // 64 passes the check and is one bucket: a shift by 64 bits has no result, so the length counts modulo 64.
    if (uDirectIndexLength < 4 || uDirectIndexLength > 64)
        diagnostics::RuntimeAssumptionFailed("(uDirectIndexLength >= 4) && (uDirectIndexLength <= sizeof(size_t)*8)");
    m_buckets = 1ULL << (uDirectIndexLength % 64);
    m_mask = m_buckets - 1;
}

CBaseHashTable::~CBaseHashTable() = default;

bool CBaseHashTable::IsDisposable(CPObjectMemory) { return false; }
void CBaseHashTable::OnDispose(const CPObjectMemory&) {}

void CBaseHashTable::ClearTable() noexcept { m_index.free(); }

CBaseHashTable::Bucket* CBaseHashTable::Buckets() const noexcept {
    // Buckets are handles of object memory like all others; what they hold is checked where they are used.
    static_assert(sizeof(Bucket) == sizeof(CPObjectMemory));
    std::size_t count;
    return static_cast<Bucket*>(m_index.GetArray(count));
}

bool CBaseHashTable::EnsureIndex() noexcept { return !m_index.isEmpty() || m_index.Alloc(m_buckets); }

unsigned long long CBaseHashTable::GetNItems() const noexcept {
    unsigned long long items = 0;
    const Bucket* buckets = Buckets();
    for (std::size_t i = 0; buckets && i < m_buckets; ++i) items += buckets[i].GetNItems();
    return items;
}

// The order of {hash, probe} against an entry: below 0, 0 or above 0.
int CBaseHashTable::CompareEntry(const HASHENTRY& entry, unsigned long long hash, const CPObjectMemory& probe) {
    if (hash != entry.hash) return hash > entry.hash ? 1 : -1;
    if (SameBlock(probe, entry.item) || !probe.key() || !entry.item.key()) return 0;
    const long32 order = CompareItems(probe, entry.item);
    return order < 0 ? -1 : order > 0;
}

CBaseHashTable::Place CBaseHashTable::Locate(unsigned long long hash, const CPObjectMemory& probe) noexcept {
    Place place{static_cast<std::size_t>(hash & m_mask), 0, false};
    const Bucket* buckets = Buckets();
    if (!buckets) return place;
    std::size_t count;
    const HASHENTRY* entries = buckets[place.bucket].GetArray(count);
    place.index = LowerBoundByHash(entries, count, hash);
    // Entries of equal hash stand in the order of their items; nearly always there is one. Bisect the run.
    std::size_t end = place.index;
    for (std::size_t step = 1; end < count && entries[end].hash == hash; step *= 2) end += step;
    if (end > count) end = count;
    while (place.index < end) {
        const std::size_t middle = place.index + (end - place.index) / 2;
        const int order = CompareEntry(entries[middle], hash, probe);
        if (order > 0) {
            place.index = middle + 1;
        } else {
            end = middle;
            place.found = order == 0;
        }
    }
    return place;
}

CBaseHashTable::HASHENTRY& CBaseHashTable::At(const Place& place) noexcept {
    return Buckets()[place.bucket][place.index];
}

bool CBaseHashTable::InsertAt(const Place& place, unsigned long long hash, const CPObjectMemory& item) noexcept {
    return EnsureIndex() && Buckets()[place.bucket].Insert(HASHENTRY{hash, item}, place.index);
}

void CBaseHashTable::Remove(std::size_t bucket, std::size_t index) noexcept {
    // The vector closes its gap before it releases the item, and the bucket goes with its last entry.
    Buckets()[bucket].Delete(index, true);
}

CPObjectMemory CBaseHashTable::AddItem(unsigned long long hash, const CPObjectMemory& item,
                                       eHashCollision collision) noexcept {
    if (!item.key()) return {};
    const bool byHash = collision == eHashKeepByHash || collision == eHashReplaceByHash;
    const Place place = Locate(hash, byHash ? CPObjectMemory() : item);
    if (!place.found) return InsertAt(place, hash, item) ? item : CPObjectMemory();

    switch (collision) {
    case eHashKeep:
    case eHashKeepByHash:
        return At(place).item;
    case eHashReplace: {
        const CPObjectMemory old = std::exchange(At(place).item, item); // released when the table is whole again
        return item;
    }
    case eHashReplaceByHash: {
        // The new item may belong elsewhere among the entries of its hash: out with the old one, in at the right place.
        const CPObjectMemory added(item), old(At(place).item);
        Bucket& bucket = Buckets()[place.bucket];
        bucket.Delete(place.index, false); // keeps the room, so the insertion cannot fail
        InsertAt(Locate(hash, added), hash, added);
        return added;
    }
    default:
        return {};
    }
}

CPObjectMemory CBaseHashTable::FindItem(unsigned long long hash, const CPObjectMemory& probe) noexcept {
    const Place place = Locate(hash, probe);
    return place.found ? At(place).item : CPObjectMemory();
}

bool CBaseHashTable::DeleteItem(unsigned long long hash, const CPObjectMemory& probe) noexcept {
    if (m_index.isEmpty()) return true;
    const Place place = Locate(hash, probe);
    if (place.found) Remove(place.bucket, place.index);
    return place.found;
}

bool CBaseHashTable::DeleteIndex(unsigned long long hash) noexcept {
    if (m_index.isEmpty()) return true;
    const std::size_t selected = static_cast<std::size_t>(hash & m_mask);
    for (std::size_t i = 0; Buckets() && i < Buckets()[selected].GetNItems(); ++i) {
        const CPObjectMemory item(Buckets()[selected][i].item);
        try {
            OnDispose(item);
        } catch (...) {
        }
    }
    if (Buckets()) {
        const Bucket dropped(std::move(Buckets()[selected]));
    }
    return true;
}

bool CBaseHashTable::EnumTableBy(IBaseHashTableEnum* visitor, unsigned long long hash, bool byHash) noexcept {
    if (!visitor || m_index.isEmpty()) return false;
    std::size_t bucket = byHash ? static_cast<std::size_t>(hash & m_mask) : 0;
    const std::size_t end = byHash ? bucket + 1 : static_cast<std::size_t>(m_buckets);
    std::size_t index = byHash ? Locate(hash, {}).index : 0;
    try {
        for (; bucket < end; ++bucket, index = 0)
            // Read anew at every step: the visitor may change the table.
            for (; Buckets() && index < Buckets()[bucket].GetNItems(); ++index) {
                const HASHENTRY entry(Buckets()[bucket][index]);
                if (byHash && entry.hash != hash) return true;
                if (!visitor->OnItem(entry.hash, entry.item)) return false;
            }
        return true;
    } catch (...) {
        return false;
    }
}

bool CBaseHashTable::PurgeTable(IBaseHashTableEnum* visitor) noexcept {
    if (!visitor || m_index.isEmpty()) return true;
    try {
        for (std::size_t bucket = 0; bucket < m_buckets; ++bucket)
            for (std::size_t index = 0; Buckets() && index < Buckets()[bucket].GetNItems();) {
                const HASHENTRY entry(Buckets()[bucket][index]);
                if (visitor->OnItem(entry.hash, entry.item)) {
                    ++index;
                    continue;
                }
                // The visitor may have moved the entry: remove what it rejected, not what stands there now.
                if (Buckets() && index < Buckets()[bucket].GetNItems() &&
                    SameBlock(Buckets()[bucket][index].item, entry.item))
                    Remove(bucket, index);
            }
        return true;
    } catch (...) {
        return false;
    }
}

bool CBaseHashTable::DisposeTable(std::uint32_t budget) noexcept {
    const unsigned long long start = Core::OS::GetTimeNow();
    try {
        for (unsigned long long round = 0; round < m_buckets && Buckets(); ++round) {
            const auto bucket = static_cast<std::size_t>(m_cursor);
            for (std::size_t index = Buckets()[bucket].GetNItems(); index-- > 0;) DisposeEntry(bucket, index);
            m_cursor = (m_cursor + 1) & m_mask;
            if (Core::OS::GetTimeNow() - start > budget) return false;
        }
        return true;
    } catch (...) {
        return false;
    }
}

void CBaseHashTable::DisposeEntry(std::size_t bucket, std::size_t index) {
    // The derived class may change the table, so nothing read before a call holds after it.
    const auto stands = [&](const CPObjectMemory* item) {
        return Buckets() && index < Buckets()[bucket].GetNItems() &&
               (!item || SameBlock(Buckets()[bucket][index].item, *item));
    };
    if (!stands(nullptr)) return;
    const CPObjectMemory item(Buckets()[bucket][index].item);
    if (!IsDisposable(item)) return;
    OnDispose(item);
    if (stands(&item)) Remove(bucket, index);
}

} // namespace TAVO::Lookup
