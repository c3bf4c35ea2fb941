#pragma once
// The pool's two tables: entries by their text, and groups of entries that differ only in case.
// Threads: the pool's lock is held around every call.

#include "poolentry.h"

#include <TAVO/lookup.h>

namespace TAVO::String {

// Groups by case-insensitive hash. It counts no entry: otherwise no first variant could ever be swept. An entry that
// goes leaves its group first.
class CCaseInsensitiveHash final : public Lookup::CBaseHashTable {
public:
    CCaseInsensitiveHash();

    // The variant interned first of the group that `probe` belongs to; null when there is none.
    Buffers::tagCPOMEMHEADER* Find(Buffers::tagCPOMEMHEADER* probe) noexcept;
    // Puts an entry into its group. False without memory; nothing has changed then.
    bool Add(Buffers::tagCPOMEMHEADER* entry) noexcept;
    // Takes an entry out of its group, and the group out of the table with its last entry. False when it has no group.
    bool Remove(Buffers::tagCPOMEMHEADER* entry) noexcept;

    // Notes what is wrong, to be raised when the lock is left.
    const char* complaint = nullptr;

private:
    long32 CompareItems(const Buffers::CPObjectMemory& first, const Buffers::CPObjectMemory& second) override;
};

// Entries by case-sensitive hash; one reference each. Keeps the groups in step.
class CCaseSensitiveHash final : public Lookup::CBaseHashTable {
public:
    explicit CCaseSensitiveHash(CCaseInsensitiveHash& groups);

    using CBaseHashTable::DisposeTable;
    using CBaseHashTable::EnumTableBy;
    using CBaseHashTable::Place;

    // The entry that equals the probe; else null, and `place` tells where it would stand.
    Buffers::tagCPOMEMHEADER* Find(Buffers::tagCPOMEMHEADER* probe, Place& place) noexcept;
    // Enters both tables or none; false without memory.
    bool Add(const Place& place, const Buffers::CPObjectMemory& entry) noexcept;

private:
    long32 CompareItems(const Buffers::CPObjectMemory& first, const Buffers::CPObjectMemory& second) override;
    bool IsDisposable(Buffers::CPObjectMemory item) override;
    void OnDispose(const Buffers::CPObjectMemory& item) override;

    CCaseInsensitiveHash& m_groups;
};

} // namespace TAVO::String
