// The hash table: sorted buckets behind an index of 2^n handles.

#include "hashtable.h"

#include "diagnostics.h"
#include "objectvector.h"

#include <TAVO/lookup.h>

namespace TAVO::Buffers {
template class TAVO_TEMPLATE_DEF CPObjectVector<Lookup::CBaseHashTable::HASHENTRY>;
} // namespace TAVO::Buffers

namespace TAVO::Lookup {

using Buffers::CPObjectMemory;

namespace {

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

bool CBaseHashTable::IsDisposable(CPObjectMemory) { return false; } // NOLINT(performance-unnecessary-value-param)
void CBaseHashTable::OnDispose(const CPObjectMemory&) {}

void CBaseHashTable::ClearTable() noexcept { m_index.free(); }

CBaseHashTable::Bucket* CBaseHashTable::Buckets() const noexcept { return TableAccess::Buckets(*this); }

unsigned long long CBaseHashTable::GetNItems() const noexcept {
    unsigned long long items = 0;
    const Bucket* buckets = Buckets();
    for (std::size_t i = 0; buckets && i < m_buckets; ++i) items += buckets[i].GetNItems();
    return items;
}

CBaseHashTable::Place CBaseHashTable::Locate(unsigned long long hash, const CPObjectMemory& probe) noexcept {
    const auto order = [&](const CPObjectMemory& item) {
        if (SameBlock(probe, item) || !probe.key() || !item.key()) return 0;
        const long32 compared = CompareItems(probe, item);
        return compared < 0 ? -1 : compared > 0 ? 1 : 0;
    };
    try {
        Place place;
        TableAccess::Locate(*this, hash, order, place);
        return place;
    } catch (...) {
        // Nothing is found there, and nothing can be inserted.
        return {static_cast<std::size_t>(hash & m_mask), Buffers::NotFound, false};
    }
}

CBaseHashTable::HASHENTRY& CBaseHashTable::At(const Place& place) noexcept {
    return Buckets()[place.bucket][place.index];
}

bool CBaseHashTable::InsertAt(const Place& place, unsigned long long hash, CPObjectMemory&& item) noexcept {
    if (place.index == Buffers::NotFound) return false; // the comparison threw
    if (!Buckets() && !m_index.Alloc(m_buckets)) return false;
    return Buckets()[place.bucket].Put(hash, std::move(item), place.index);
}

CPObjectMemory CBaseHashTable::RemoveAt(const Place& place) noexcept {
    return Buckets()[place.bucket].Take(place.index);
}

CPObjectMemory CBaseHashTable::AddItem(unsigned long long hash, const CPObjectMemory& item,
                                       eHashCollision collision) noexcept {
    if (!item.key()) return {};
    const bool byHash = collision == eHashKeepByHash || collision == eHashReplaceByHash;
    const Place place = Locate(hash, byHash ? CPObjectMemory() : item);
    if (!place.found) return InsertAt(place, hash, CPObjectMemory(item)) ? item : CPObjectMemory();

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
        // Taking out keeps the room, so the insertion cannot fail.
        CPObjectMemory added(item);
        const CPObjectMemory old(Buckets()[place.bucket].Take(place.index, false));
        const Place ordered = Locate(hash, added);
        InsertAt(ordered.index == Buffers::NotFound ? place : ordered, hash, CPObjectMemory(added));
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
    // Intended (hash-delete): true where nothing was ever stored, where a textbook says what it says later: not found.
    if (m_index.isEmpty()) return true;
    const Place place = Locate(hash, probe);
    if (place.found) RemoveAt(place);
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
                    Buckets()[bucket].Take(index);
            }
        return true;
    } catch (...) {
        return false;
    }
}

bool CBaseHashTable::DisposeTable(std::uint32_t budget) noexcept {
    return TableAccess::Dispose(
        *this, budget, [](const CPObjectMemory&) {}, [](std::size_t, std::size_t) {});
}

bool CBaseHashTable::DisposeEntry(std::size_t bucket, std::size_t index) {
    // The derived class may change the table, so nothing read before a call holds after it.
    const auto stands = [&](const CPObjectMemory* item) {
        return Buckets() && index < Buckets()[bucket].GetNItems() &&
               (!item || SameBlock(Buckets()[bucket][index].item, *item));
    };
    if (!stands(nullptr)) return false;
    const CPObjectMemory item(Buckets()[bucket][index].item);
    if (!IsDisposable(item)) return false;
    OnDispose(item);
    if (!stands(&item)) return false;
    Buckets()[bucket].Take(index);
    return true;
}

} // namespace TAVO::Lookup
