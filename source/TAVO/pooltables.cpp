// The pool's tables.

#include "pooltables.h"

#include "platform/heap.h"

#include <cstring>
#include <new>

namespace TAVO::String {

using Buffers::Block;
using Buffers::CPObjectMemory;
using Buffers::tagCPOMEMHEADER;
using Lookup::TableAccess;
using pool::StoredText;

namespace {

// The case variants of one text, at least one of them with a capital letter.
struct Group {
    tagCPOMEMHEADER* representative; // the variant interned first of those present
    std::uint32_t variants;          // entries in the group
    std::uint32_t capacity;          // of `others`
    tagCPOMEMHEADER** others;        // the other variants in the order of interning
};

void CreateNothing(void*, std::size_t) {}
void FinalizeGroup(void* payload, std::size_t) { Platform::Release(static_cast<Group*>(payload)->others); }
void* NoInterface(void*, const _acfUID&) { return nullptr; }

constexpr Buffers::tagCPOVTABL kGroupTable = {CreateNothing, nullptr, FinalizeGroup, NoInterface};

// An item is a record or, uncounted, the only entry of its group.
bool IsRecord(const CPObjectMemory& item) { return Block::Of(item)->pVTbl == &kGroupTable; }
Group& GroupOf(const CPObjectMemory& record) { return *Block::PayloadOf<Group>(record); }

// Lets go of an item that may be an uncounted entry.
void LetGo(CPObjectMemory&& item) {
    if (!IsRecord(item)) Block::RefOf(item) = nullptr;
    item.free();
}

bool AddVariant(Group& group, tagCPOMEMHEADER* entry) {
    const std::uint32_t others = group.variants - 1;
    if (others == group.capacity) {
        const std::uint32_t capacity = group.capacity ? group.capacity * 2 : 2;
        const std::size_t size = capacity * sizeof(tagCPOMEMHEADER*);
        void* grown = group.others ? Platform::Reallocate(group.others, size) : Platform::Allocate(size);
        if (!grown) return false;
        group.others = static_cast<tagCPOMEMHEADER**>(grown);
        group.capacity = capacity;
    }
    group.others[others] = entry;
    ++group.variants;
    return true;
}

// When the representative goes, the earliest interned of the others takes its place. False when the entry is no
// variant.
bool RemoveVariant(Group& group, const tagCPOMEMHEADER* entry) {
    const std::uint32_t others = group.variants - 1;
    std::uint32_t gone = 0; // of `others`
    if (group.representative == entry) {
        group.representative = others ? group.others[0] : nullptr;
    } else {
        while (gone < others && group.others[gone] != entry) ++gone;
        if (gone == others) return false;
    }
    --group.variants;
    if (others) std::memmove(group.others + gone, group.others + gone + 1, (others - 1 - gone) * sizeof(*group.others));
    return true;
}

} // namespace

// --- groups ----------------------------------------------------------------------------------------------------------

tagCPOMEMHEADER* CCaseInsensitiveHash::RepresentativeOf(const CPObjectMemory& item) {
    return IsRecord(item) ? GroupOf(item).representative : Block::Of(item);
}

bool CCaseInsensitiveHash::MakeRecord(CPObjectMemory& item, tagCPOMEMHEADER* first, tagCPOMEMHEADER* second) noexcept {
    tagCPOMEMHEADER* block = Block::NewBlock(sizeof(Group), sizeof(Group), &kGroupTable);
    if (!block) return false;
    CPObjectMemory record(Block::Adopt(block));
    Group& group = *::new (static_cast<void*>(block + 1)) Group{first, 1, 0, nullptr};
    if (!AddVariant(group, second)) return false;
    std::swap(Block::RefOf(item), Block::RefOf(record));
    if (record.key()) LetGo(std::move(record));
    return true;
}

bool CCaseInsensitiveHash::Add(tagCPOMEMHEADER* entry, const StoredText& text, bool caseless,
                               CCaseSensitiveHash& entries) noexcept {
    if (!entries.MayHold(text.key.hashi)) {
        if (caseless) return true;
        return AddGroup(PlaceOfNew(text.key.hashi), text.key.hashi, Block::Adopt(entry));
    }
    const Place place = LocateGroup(text, true);
    if (place.found) {
        CPObjectMemory& item = TableAccess::Item(*this, place);
        return IsRecord(item) ? AddVariant(GroupOf(item), entry) : MakeRecord(item, Block::Of(item), entry);
    }
    if (caseless) return true; // alone, and found by its own hash
    CPObjectMemory item;
    if (tagCPOMEMHEADER* lower = entries.FindLowerCase(text, true)) {
        if (!MakeRecord(item, lower, entry)) return false;
    } else {
        item = Block::Adopt(entry);
    }
    return AddGroup(place, text.key.hashi, std::move(item));
}

bool CCaseInsensitiveHash::AddGroup(const Place& place, unsigned long long hashi, CPObjectMemory&& item) noexcept {
    if (Insert(place, hashi, std::move(item))) return true;
    LetGo(std::move(item));
    return false;
}

bool CCaseInsensitiveHash::Remove(tagCPOMEMHEADER* entry) noexcept {
    const StoredText text(EntryOf(entry));
    const Place place = LocateGroup(text);
    // Equal hashes tell it without a look at the text.
    if (!place.found) return text.key.hash == text.key.hashi || text.IsCaseless();
    CPObjectMemory& item = TableAccess::Item(*this, place);
    if (!IsRecord(item)) {
        if (Block::Of(item) != entry) return false;
    } else if (GroupOf(item).variants > 1) {
        return RemoveVariant(GroupOf(item), entry);
    }
    LetGo(RemoveAt(place));
    return true;
}

void CCaseInsensitiveHash::Clear() noexcept {
    TableAccess::Bucket* buckets = TableAccess::Buckets(*this);
    for (std::size_t i = 0; buckets && i <= 0xFFF; ++i)
        while (!buckets[i].isEmpty()) LetGo(buckets[i].Take(buckets[i].Count() - 1));
    ClearTable();
}

long32 CCaseInsensitiveHash::CompareItems(const CPObjectMemory& first, const CPObjectMemory& second) {
    const PoolEntry &a = EntryOf(RepresentativeOf(first)), &b = EntryOf(RepresentativeOf(second));
    if (a.length != b.length) return a.length < b.length ? -1 : 1;
    return StoredText(a).CompareFolded(b.text);
}

// --- entries ---------------------------------------------------------------------------------------------------------

CCaseSensitiveHash::CCaseSensitiveHash(CCaseInsensitiveHash& groups) : m_groups(groups) {}

void CCaseSensitiveHash::Fetch(const pool::Key& key) const noexcept {
    if (!m_filter.IsOn()) return; // so small a table lies in the caches
    m_filter.Fetch(key.hash);
    FetchForAdding(key.hash);
    if (key.hash == key.hashi) return; // a text without capitals that is new stands in this table only
    m_filter.Fetch(key.hashi);
    m_groups.FetchForAdding(key.hashi);
}

bool CCaseSensitiveHash::Add(const Place& place, CPObjectMemory&& entry, const StoredText& text,
                             bool caseless) noexcept {
    tagCPOMEMHEADER* block = Block::Of(entry);
    // The group first: it looks for a lower-case variant, which must not be the entry itself.
    if (!m_groups.Add(block, text, caseless, *this)) return false;
    if (!Insert(place, text.key.hash, std::move(entry))) {
        m_groups.Remove(block);
        return false;
    }
    m_filter.Add(text.key.hash);
    if (!caseless) m_filter.Add(text.key.hashi);
    if (m_filter.IsFull()) FillFilter();
    return true;
}

long32 CCaseSensitiveHash::CompareItems(const CPObjectMemory& first, const CPObjectMemory& second) {
    const PoolEntry &a = *Block::PayloadOf<PoolEntry>(first), &b = *Block::PayloadOf<PoolEntry>(second);
    if (a.hash != b.hash) return a.hash < b.hash ? -1 : 1;
    if (a.hashi != b.hashi) return a.hashi < b.hashi ? -1 : 1;
    if (a.length != b.length) return a.length < b.length ? -1 : 1;
    return StoredText(a).Compare(b.text);
}

// The argument, the walk and the table hold the entry: with a count of 3 nobody else does. Then no handle is left to
// copy from, and look-ups need the lock or are kept out, so the verdict stays true while the lock is held.
bool CCaseSensitiveHash::IsDisposable(CPObjectMemory item) {
    PoolEntry& entry = *Block::PayloadOf<PoolEntry>(item);
    const auto held = static_cast<std::int32_t>(item.lockcnt());
    if (held <= 0) return false; // a static entry
    // Intended (pool-idle): being looked up does not count as use, as it would in a textbook cache; being held does.
    if (held != 3) {
        entry.idleSweeps = 0;
        return false;
    }
    if (++entry.idleSweeps > 1) return true;
    FreeUtf8(entry);
    return false;
}

bool CCaseSensitiveHash::Dispose(std::uint32_t budget) noexcept {
    if (!m_front.Close()) return false;
    // An entry that may go now leaves its group, which lies elsewhere.
    const bool finished = LazyTable::Dispose(budget, [this](const CPObjectMemory& item) {
        const PoolEntry& entry = *Block::PayloadOf<PoolEntry>(item);
        if (entry.idleSweeps != 0) m_groups.FetchForSearch(entry.hashi);
    });
    if (finished && m_filter.IsTooLargeFor(GetNItems() + m_groups.GetNItems())) FillFilter();
    m_front.Open();
    return finished;
}

void CCaseSensitiveHash::Clear() noexcept {
    if (!m_front.Close()) return;
    m_front.Clear();
    m_groups.Clear(); // first: it holds entries without counting them
    ClearTable();
    m_filter.Reset(0);
    m_front.Open();
}

void CCaseSensitiveHash::FillFilter() noexcept {
    m_filter.Reset(GetNItems() + m_groups.GetNItems());
    const auto add = [this](unsigned long long hash) { m_filter.Add(hash); };
    ForEachHash(add);
    m_groups.ForEachHash(add);
}

void CCaseSensitiveHash::OnDispose(const CPObjectMemory& item) {
    m_front.Forget(Block::Of(item));
    if (!m_groups.Remove(Block::Of(item))) m_groups.complaint = "Case-insensitive hash entry MUST exists";
}

} // namespace TAVO::String
