// The pool's tables.

#include "pooltables.h"

#include "platform/heap.h"
#include "transcoding.h"

#include <cstring>
#include <new>

namespace TAVO::String {

using Buffers::Block;
using Buffers::CPObjectMemory;
using Buffers::tagCPOMEMHEADER;

namespace {

constexpr std::uint32_t kIndexLength = 12; // 4096 buckets

// Intended: once length and both hashes agree, ten units of the actual texts decide, so two texts that agree so far are
// one entry. A textbook pool would compare them whole; look-ups here never touch more than the first cache lines.
constexpr std::size_t kComparedUnits = 10;

// The case variants of one text.
struct Group {
    tagCPOMEMHEADER* representative; // the variant interned first of those present
    std::uint32_t variants;          // entries in the group
    std::uint32_t capacity;          // of `others`
    tagCPOMEMHEADER** others;        // the other variants in the order of interning; null while there is one
};

void CreateNothing(void*, std::size_t) {}
void FinalizeGroup(void* payload, std::size_t) { Platform::Release(static_cast<Group*>(payload)->others); }
void* NoInterface(void*, const _acfUID&) { return nullptr; }

constexpr Buffers::tagCPOVTABL kGroupTable = {CreateNothing, nullptr, FinalizeGroup, NoInterface};

Group& GroupOf(const CPObjectMemory& record) { return *Block::PayloadOf<Group>(record); }

bool AddVariant(Group& group, tagCPOMEMHEADER* entry) {
    const std::uint32_t others = group.variants - 1;
    if (others == group.capacity) {
        const std::uint32_t capacity = group.capacity ? group.capacity * 2 : 4;
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

// When the representative goes, the earliest interned of the others takes its place.
void RemoveVariant(Group& group, const tagCPOMEMHEADER* entry) {
    std::uint32_t others = group.variants - 1, gone = 0;
    if (group.representative == entry) {
        group.representative = others ? group.others[0] : nullptr;
    } else {
        while (gone < others && group.others[gone] != entry) ++gone;
        if (gone == others) return;
    }
    --group.variants;
    if (others) std::memmove(group.others + gone, group.others + gone + 1, (others - 1 - gone) * sizeof(*group.others));
}

// A group of one entry that stands on the stack to be searched for. A count of 0 makes it static: never freed.
class Wanted {
public:
    explicit Wanted(tagCPOMEMHEADER* entry)
        : m_header{0, sizeof(Group), sizeof(Group), &kGroupTable}, m_group{entry, 1, 0, nullptr},
          m_handle(Block::Adopt(&m_header)) {}
    Wanted(const Wanted&) = delete;
    Wanted& operator=(const Wanted&) = delete;
    operator const CPObjectMemory&() const { return m_handle; }

private:
    tagCPOMEMHEADER m_header;
    Group m_group; // directly behind its header, as in a block
    CPObjectMemory m_handle;
};

} // namespace

CCaseInsensitiveHash::CCaseInsensitiveHash() : CBaseHashTable(kIndexLength) {}

tagCPOMEMHEADER* CCaseInsensitiveHash::Find(tagCPOMEMHEADER* probe) noexcept {
    const Place place = Locate(EntryOf(probe).hashi, Wanted(probe));
    if (!place.found) return nullptr;
    tagCPOMEMHEADER* found = GroupOf(At(place).item).representative;
    if (!found) complaint = "Case-insensitive match of case-sensitive cache MUST exist";
    return found;
}

bool CCaseInsensitiveHash::Add(tagCPOMEMHEADER* entry) noexcept {
    const unsigned long long hash = EntryOf(entry).hashi;
    const Place place = Locate(hash, Wanted(entry));
    if (place.found) return AddVariant(GroupOf(At(place).item), entry);
    tagCPOMEMHEADER* block = Block::NewBlock(sizeof(Group), sizeof(Group), &kGroupTable);
    if (!block) return false;
    ::new (static_cast<void*>(block + 1)) Group{entry, 1, 0, nullptr};
    return InsertAt(place, hash, Block::Adopt(block));
}

bool CCaseInsensitiveHash::Remove(tagCPOMEMHEADER* entry) noexcept {
    const unsigned long long hash = EntryOf(entry).hashi;
    const Place place = Locate(hash, Wanted(entry));
    if (!place.found) return false;
    const CPObjectMemory record(At(place).item);
    if (GroupOf(record).variants == 1) return DeleteItem(hash, record);
    RemoveVariant(GroupOf(record), entry);
    return true;
}

long32 CCaseInsensitiveHash::CompareItems(const CPObjectMemory& first, const CPObjectMemory& second) {
    tagCPOMEMHEADER *a = GroupOf(first).representative, *b = GroupOf(second).representative;
    if (a == b || !a || !b) return 0;
    const PoolEntry &x = EntryOf(a), &y = EntryOf(b);
    if (x.length != y.length) return x.length < y.length ? -1 : 1;
    return wcsncmpi(x.text, y.text, kComparedUnits);
}

CCaseSensitiveHash::CCaseSensitiveHash(CCaseInsensitiveHash& groups) : CBaseHashTable(kIndexLength), m_groups(groups) {}

tagCPOMEMHEADER* CCaseSensitiveHash::Find(tagCPOMEMHEADER* probe, Place& place) noexcept {
    place = Locate(EntryOf(probe).hash, Block::Adopt(probe)); // a static block: adopting and letting go count nothing
    return place.found ? Block::Of(At(place).item) : nullptr;
}

bool CCaseSensitiveHash::Add(const Place& place, const CPObjectMemory& entry) noexcept {
    tagCPOMEMHEADER* block = Block::Of(entry);
    if (!InsertAt(place, EntryOf(block).hash, entry)) return false;
    if (m_groups.Add(block)) return true;
    DeleteItem(EntryOf(block).hash, entry);
    return false;
}

long32 CCaseSensitiveHash::CompareItems(const CPObjectMemory& first, const CPObjectMemory& second) {
    const PoolEntry &a = *Block::PayloadOf<PoolEntry>(first), &b = *Block::PayloadOf<PoolEntry>(second);
    if (a.hash != b.hash) return a.hash < b.hash ? -1 : 1;
    if (a.hashi != b.hashi) return a.hashi < b.hashi ? -1 : 1;
    if (a.length != b.length) return a.length < b.length ? -1 : 1;
    return detail::WideCompareN(a.text, b.text, kComparedUnits);
}

// The argument, the walk and the table hold the entry: with a count of 3 nobody else does. Then no handle is left to
// copy from, and look-ups need the lock, so the verdict stays true while the lock is held.
bool CCaseSensitiveHash::IsDisposable(CPObjectMemory item) {
    PoolEntry& entry = *Block::PayloadOf<PoolEntry>(item);
    const auto held = static_cast<std::int32_t>(item.lockcnt());
    if (held <= 0) return false; // a static entry
    if (held != 3) {
        entry.idleSweeps = 0;
        return false;
    }
    if (++entry.idleSweeps > 1) return true;
    FreeUtf8(entry);
    return false;
}

void CCaseSensitiveHash::OnDispose(const CPObjectMemory& item) {
    if (!m_groups.Remove(Block::Of(item))) m_groups.complaint = "Case-insensitive hash entry MUST exists";
}

} // namespace TAVO::String
