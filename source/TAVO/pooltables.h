#pragma once
// The pool's two tables: entries by their text, and groups of entries that differ only in case.
// Threads: the pool's lock is held around every call.

#include "lazytable.h"
#include "poolfilter.h"
#include "poolfront.h"
#include "pooltext.h"

namespace TAVO::String {

// Entries by case-sensitive hash; one reference each.
class CCaseSensitiveHash final : public Lookup::LazyTable {
public:
    explicit CCaseSensitiveHash(class CCaseInsensitiveHash& groups);

    using CBaseHashTable::Place;

    // The entry of that text, counted for the caller, if it can be told without the pool's lock.
    template <class Text> PoolFront::Shared Share(const Text& text) noexcept { return m_front.Share(text); }

    // The entry of that text; else null, and `place` tells where it would stand. `searched` is what Share told.
    template <class Text> Buffers::tagCPOMEMHEADER* Find(const Text& text, Place& place, bool searched = true) {
        if (!searched) {
            m_front.Join();
            if (Buffers::tagCPOMEMHEADER* known = m_front.Find(text)) return known;
        }
        if (!m_filter.MayHold(text.key.hash)) {
            place = PlaceOfNew(text.key.hash);
            return nullptr;
        }
        FetchForSearch(text.key.hash);
        Buffers::tagCPOMEMHEADER* found = FindInBuckets(text, place);
        if (found) m_front.Remember(found);
        return found;
    }

    // The same, but nothing is remembered.
    template <class Text> Buffers::tagCPOMEMHEADER* FindInBuckets(const Text& text, Place& place) {
        return BlockAt(LocateAsIs(text.key.hash, OrderOf<false>(text), place), place);
    }

    // Starts to fetch what tells that a text is new and adding it will look at, in both tables.
    void Fetch(const pool::Key& key) const noexcept;

    // The entry that is the lower case of the text. For who adds a text, and may not look again, the bucket stays as it
    // is.
    template <class Text> Buffers::tagCPOMEMHEADER* FindLowerCase(const Text& text, bool forAdding) {
        Place place;
        const auto order = OrderOf<true>(text);
        return BlockAt(forAdding ? LocateAsIs(text.key.hashi, order, place) : Locate(text.key.hashi, order, place),
                       place);
    }

    // False: no entry has that hash, and no group.
    bool MayHold(unsigned long long hash) const noexcept { return m_filter.MayHold(hash); }

    // Enters both tables or none, taking over the reference; false without memory. The caller tells what it knows of
    // the entry's text: reading what was written a moment ago would wait until it has reached memory.
    bool Add(const Place& place, Buffers::CPObjectMemory&& entry, const pool::StoredText& text, bool caseless) noexcept;
    // Drops entries that nobody has held for two sweeps. False when the time was too short, or a thread was stopped in
    // the middle of a look-up.
    bool Dispose(std::uint32_t budget) noexcept;
    // Lets everything go, groups too; nothing when a thread was stopped in the middle of a look-up.
    void Clear() noexcept;

    using LazyTable::Visit;

private:
    // Makes the filter anew from what the tables hold.
    void FillFilter() noexcept;

    long32 CompareItems(const Buffers::CPObjectMemory& first, const Buffers::CPObjectMemory& second) override;
    bool IsDisposable(Buffers::CPObjectMemory item) override;
    // How the text compares with an entry of the same case-sensitive hash; folded, its lower case does.
    template <bool folded, class Text> static auto OrderOf(const Text& text) {
        return [&text](const Buffers::CPObjectMemory& item) {
            const PoolEntry& entry = *Buffers::Block::PayloadOf<PoolEntry>(item);
            if (text.key.hashi != entry.hashi) return text.key.hashi < entry.hashi ? -1 : 1;
            if (text.key.length != entry.length) return text.key.length < entry.length ? -1 : 1;
            return folded ? text.CompareFolded(entry.text) : text.Compare(entry.text);
        };
    }
    Buffers::tagCPOMEMHEADER* BlockAt(bool found, const Place& place) const {
        return found ? Buffers::Block::Of(Lookup::TableAccess::Item(*this, place)) : nullptr;
    }
    void OnDispose(const Buffers::CPObjectMemory& item) override;

    CCaseInsensitiveHash& m_groups;
    PoolFront m_front;
    PoolFilter m_filter; // the hashes in both tables
};

// Groups by case-insensitive hash.
//
// A text without capital letters that is alone in its group is found in the other table, by the same hash, and has
// nothing here. A text with capitals that is alone stands here itself. Only two variants and more have a record.
// Nothing here counts an entry: otherwise no first variant could ever be swept. An entry that goes leaves its group
// first.
class CCaseInsensitiveHash final : public Lookup::LazyTable {
public:
    // The variant interned first of the group that the text belongs to; null when there is none.
    template <class Text> Buffers::tagCPOMEMHEADER* Find(const Text& text, CCaseSensitiveHash& entries) noexcept {
        if (!entries.MayHold(text.key.hashi)) return nullptr;
        const Place place = LocateGroup(text);
        if (!place.found) return entries.FindLowerCase(text, false);
        Buffers::tagCPOMEMHEADER* found = RepresentativeOf(Lookup::TableAccess::Item(*this, place));
        if (!found) complaint = "Case-insensitive match of case-sensitive cache MUST exist";
        return found;
    }

    using LazyTable::FetchForAdding;
    using LazyTable::FetchForSearch;

    // Puts an entry, which has that text, into its group. False without memory; nothing has changed then.
    bool Add(Buffers::tagCPOMEMHEADER* entry, const pool::StoredText& text, bool caseless,
             CCaseSensitiveHash& entries) noexcept;
    // Takes an entry out of its group. False when it should have one and has not.
    bool Remove(Buffers::tagCPOMEMHEADER* entry) noexcept;
    // Lets everything go.
    void Clear() noexcept;

    // Notes what is wrong, to be raised when the lock is left.
    const char* complaint = nullptr;

private:
    template <class Text> Place LocateGroup(const Text& text, bool forAdding = false) {
        const auto order = [&text](const Buffers::CPObjectMemory& item) {
            const Buffers::tagCPOMEMHEADER* block = RepresentativeOf(item);
            if (!block) return 0;
            const PoolEntry& entry = EntryOf(const_cast<Buffers::tagCPOMEMHEADER*>(block));
            if (text.key.length != entry.length) return text.key.length < entry.length ? -1 : 1;
            return text.CompareFolded(entry.text);
        };
        Place place;
        forAdding ? LocateAsIs(text.key.hashi, order, place) : Locate(text.key.hashi, order, place);
        return place;
    }
    // Takes over what stands for a group; false without memory.
    bool AddGroup(const Place& place, unsigned long long hashi, Buffers::CPObjectMemory&& item) noexcept;
    static Buffers::tagCPOMEMHEADER* RepresentativeOf(const Buffers::CPObjectMemory& item);
    // Replaces what stands at a place by a record of two variants.
    bool MakeRecord(Buffers::CPObjectMemory& item, Buffers::tagCPOMEMHEADER* first,
                    Buffers::tagCPOMEMHEADER* second) noexcept;

    long32 CompareItems(const Buffers::CPObjectMemory& first, const Buffers::CPObjectMemory& second) override;
};

} // namespace TAVO::String
