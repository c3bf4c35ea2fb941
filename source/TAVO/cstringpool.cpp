// The string pool: interning, sweeping and checking, all under one lock.

#include "diagnostics.h"
#include "platform/platform.h"
#include "poolentry.h"
#include "poollock.h"
#include "pooltables.h"
#include "transcoding.h"

#include <cstring>
#include <new>

namespace TAVO::String {

using Buffers::Block;
using Buffers::CPObjectMemory;
using Buffers::tagCPOMEMHEADER;

namespace {

constexpr char kSource[] = "source/TAVO/cstringpool";

struct Pool {
    pool::Lock lock;
    CCaseInsensitiveHash groups;
    CCaseSensitiveHash entries{groups};

    Pool() {
        // Interning L"true" finds the entry that has always been there.
        for (Static which : {Static::True, Static::False}) {
            tagCPOMEMHEADER* block = StaticEntry(which);
            CCaseSensitiveHash::Place place;
            if (!entries.Find(block, place)) entries.Add(place, Block::Adopt(block));
        }
    }
};

// Built at load or at first use, whichever is earlier, in storage that no destructor touches: static objects of hosts
// and plug-ins may use the pool from their constructors and destructors.
alignas(Pool) unsigned char g_storage[sizeof(Pool)];

Pool& ThePool() noexcept {
    static Pool* const pool = ::new (static_cast<void*>(g_storage)) Pool;
    return *pool;
}

// Raises what a table found wrong, now that the lock is left: an assertion may show a box, which pumps messages.
void RaiseComplaint(const char* complaint) noexcept {
    if (complaint) diagnostics::IllegalCodePoint(complaint);
}

// --- interning -----------------------------------------------------------------------------------------------------

// An entry that stands on the stack to be searched for: count 0, so never counted or freed, and of its text no more
// than comparisons look at.
class Probe {
public:
    static constexpr std::size_t kUnits = 10;

    explicit Probe(const pool::Key& key) noexcept
        : m_header{0, sizeof(PoolEntry), sizeof(PoolEntry), &g_entryTable}, m_entry{0,        key.length, key.utf8Size,
                                                                                    key.hash, key.hashi,  first,
                                                                                    nullptr} {}
    Probe(const Probe&) = delete;
    Probe& operator=(const Probe&) = delete;

    tagCPOMEMHEADER* Block() noexcept { return &m_header; }

private:
    tagCPOMEMHEADER m_header;
    PoolEntry m_entry; // directly behind its header, as in a block

public:
    wchar_t first[kUnits + 1]; // terminated; for the source to fill
};

enum class Missing { Create, Leave };
enum class Match { Exact, AnyCase };

// The one road behind every way to intern. A source knows the text in its own form:
//   void First(wchar_t (&units)[11])   the first ten units, terminated
//   std::size_t Units()                units of the whole text
//   bool Write(wchar_t* out)           the whole text; false when it has no wide form
template <class Source>
CPPoolString Intern(const Source& source, const pool::Key& key, Missing missing, Match match) noexcept {
    Probe probe(key);
    source.First(probe.first);

    Pool& pool = ThePool();
    const char* complaint = nullptr;
    CPPoolString result;
    {
        pool::Guard guard(pool.lock);
        if (match == Match::AnyCase) {
            // Counted before the lock is left: without a handle outside, a sweep may take the entry.
            if (tagCPOMEMHEADER* found = pool.groups.Find(probe.Block())) return PoolAccess::Share(found);
            complaint = std::exchange(pool.groups.complaint, nullptr);
        }
        CCaseSensitiveHash::Place place;
        tagCPOMEMHEADER* found =
            match == Match::Exact || missing == Missing::Create ? pool.entries.Find(probe.Block(), place) : nullptr;
        if (found) {
            result = PoolAccess::Share(found);
        } else if (missing == Missing::Create) {
            wchar_t* text;
            if (tagCPOMEMHEADER* block = NewEntry(source.Units(), key, text)) {
                const CPObjectMemory entry(Block::Adopt(block));
                if (source.Write(text) && pool.entries.Add(place, entry)) result = PoolAccess::Share(block);
            }
        }
    }
    RaiseComplaint(complaint);
    return result;
}

struct WideSource {
    const wchar_t* text;
    std::size_t units;

    void First(wchar_t (&out)[Probe::kUnits + 1]) const noexcept {
        const std::size_t count = units < Probe::kUnits ? units : Probe::kUnits;
        detail::WideCopy(out, text, count);
        out[count] = 0;
    }
    std::size_t Units() const noexcept { return units; }
    bool Write(wchar_t* out) const noexcept {
        detail::WideCopy(out, text, units);
        return true;
    }
};

struct AsciiSource {
    const unsigned char* text;
    std::size_t count;

    void First(wchar_t (&out)[Probe::kUnits + 1]) const noexcept {
        const std::size_t units = count < Probe::kUnits ? count : Probe::kUnits;
        for (std::size_t i = 0; i < units; ++i) out[i] = text[i];
        out[units] = 0;
    }
    std::size_t Units() const noexcept { return count; }
    bool Write(wchar_t* out) const noexcept {
        for (std::size_t i = 0; i < count; ++i) out[i] = text[i];
        return true;
    }
};

// UTF-8 whose sequences are all good.
struct Utf8Source {
    const unsigned char* text;
    std::size_t bytes;
    std::size_t units; // the key's length, where a character above FFFF counts 2: all of the text

    void First(wchar_t (&out)[Probe::kUnits + 1]) const noexcept {
        const unsigned char* in = text;
        wchar_t* to = out;
        while (in < text + bytes && to < out + Probe::kUnits) {
            ulong32 value;
            wchar_t units[2], *next = units;
            detail::StepUtf8(value, in);
            if (!detail::EncodeUtf16(next, value)) break;
            for (const wchar_t* unit = units; unit < next && to < out + Probe::kUnits;) *to++ = *unit++;
        }
        *to = 0;
    }
    std::size_t Units() const noexcept { return units; }
    bool Write(wchar_t* out) const noexcept {
        return detail::ConvertUtf8(text, {.source = bytes, .target = units}, out);
    }
};

CPPoolString InternText(const wchar_t* text, std::size_t limit, Missing missing, Match match) noexcept {
    if (!text) return {};
    pool::Key key;
    std::size_t units;
    if (limit == 0 || !*text) return CPPoolString::pempty;
    if (!pool::KeyOfWide(text, limit, key, units)) return {};
    if (units == 0) return CPPoolString::pempty; // a pair that the limit cuts
    return Intern(WideSource{text, units}, key, missing, match);
}

CPPoolString InternText(const unsigned char* text, std::size_t limit, Missing missing, Match match) noexcept {
    if (!text) return {};
    pool::Key key;
    std::size_t bytes;
    if (limit == 0 || !*text) return CPPoolString::pempty;
    if (!pool::KeyOfUtf8(text, limit, key, bytes)) return {};
    if (bytes == 0) return CPPoolString::pempty;
    return Intern(Utf8Source{text, bytes, key.length}, key, missing, match);
}

// What a submitter wrote, already in the block that becomes the entry.
CPPoolString InternBlock(tagCPOMEMHEADER* block) noexcept {
    const CPObjectMemory entry(Block::Adopt(block));
    const PoolEntry& text = EntryOf(block);
    Probe probe({text.length, text.utf8Size, text.hash, text.hashi});
    WideSource{text.text, UnitsOf(block)}.First(probe.first);

    Pool& pool = ThePool();
    pool::Guard guard(pool.lock);
    CCaseSensitiveHash::Place place;
    if (tagCPOMEMHEADER* found = pool.entries.Find(probe.Block(), place)) return PoolAccess::Share(found);
    return pool.entries.Add(place, entry) ? PoolAccess::Share(block) : CPPoolString();
}

// --- visitors ------------------------------------------------------------------------------------------------------

// Counts the entries that are still held from outside: the table and the walk hold two references.
class CEnumDisposal final : public Lookup::IBaseHashTableEnum {
public:
    std::uint32_t referenced = 0;

private:
    bool OnItem(unsigned long long, const CPObjectMemory& item) override {
        if (static_cast<std::int32_t>(item.lockcnt()) >= 3) ++referenced;
        return true;
    }
};

// Stops at the first entry whose text does not give its key.
class CEnumVerify final : public Lookup::IBaseHashTableEnum {
public:
    bool sound = true;

private:
    bool OnItem(unsigned long long, const CPObjectMemory& item) override { return sound = IsSound(Block::Of(item)); }
};

// Sums the entries' allocated sizes.
class CEnumForSize final : public Lookup::IBaseHashTableEnum {
public:
    unsigned long long bytes = 0;

private:
    bool OnItem(unsigned long long, const CPObjectMemory& item) override {
        bytes += Block::Of(item)->sAllocated;
        return true;
    }
};

// Tells how many strings are still held, then lets the tables go; entries that are held outlive them.
void ClearTables(Pool& pool) noexcept {
    CEnumDisposal diagnosis;
    Develop::_logWrite(acfDebugTrace, L"TAVO", kSource, 0, L"SPool ClearTable: Diagnosis started");
    pool.entries.EnumTableBy(&diagnosis, 0, false);
    Develop::_logWrite(acfDebugTrace, L"TAVO", kSource, 0,
                       L"SPool ClearTable: diagnosis done, %u items still referenced", diagnosis.referenced);
    pool.entries.ClearTable();
    pool.groups.ClearTable();
}

} // namespace

namespace pool {

CPPoolString InternAscii(const unsigned char* text, std::size_t count) noexcept {
    if (count == 0) return CPPoolString::pempty;
    Key key;
    KeyOfAscii(text, count, key);
    return Intern(AsciiSource{text, count}, key, Missing::Create, Match::Exact);
}

CPPoolString InternWide(const wchar_t* text, std::size_t count) noexcept {
    if (count == 0) return CPPoolString::pempty;
    Key key;
    if (!KeyOfUnits(text, count, key)) return {};
    return Intern(WideSource{text, count}, key, Missing::Create, Match::Exact);
}

void Unload() noexcept {
    // Never waits: a thread that was killed may hold the lock for ever.
    Pool& pool = ThePool();
    if (!pool.lock.TryEnter()) return;
    ClearTables(pool);
    pool.lock.Leave();
}

} // namespace pool

// --- the public names ----------------------------------------------------------------------------------------------

#define TAVO_POOL_NAMES(Unit)                                                                                          \
    CPPoolString CStringPool::GetStringRef(const Unit* text) noexcept {                                                \
        return InternText(text, SIZE_MAX, Missing::Create, Match::Exact);                                              \
    }                                                                                                                  \
    CPPoolString CStringPool::GetStringRefn(const Unit* text, std::size_t n) noexcept {                                \
        return InternText(text, n, Missing::Create, Match::Exact);                                                     \
    }                                                                                                                  \
    CPPoolString CStringPool::QueryStringRef(const Unit* text) noexcept {                                              \
        return InternText(text, SIZE_MAX, Missing::Leave, Match::Exact);                                               \
    }                                                                                                                  \
    CPPoolString CStringPool::QueryStringRefn(const Unit* text, std::size_t n) noexcept {                              \
        return InternText(text, n, Missing::Leave, Match::Exact);                                                      \
    }                                                                                                                  \
    CPPoolString CStringPool::GetStringRefi(const Unit* text) noexcept {                                               \
        return InternText(text, SIZE_MAX, Missing::Create, Match::AnyCase);                                            \
    }                                                                                                                  \
    CPPoolString CStringPool::GetStringRefni(const Unit* text, std::size_t n) noexcept {                               \
        return InternText(text, n, Missing::Create, Match::AnyCase);                                                   \
    }                                                                                                                  \
    CPPoolString CStringPool::QueryStringRefi(const Unit* text) noexcept {                                             \
        return InternText(text, SIZE_MAX, Missing::Leave, Match::AnyCase);                                             \
    }                                                                                                                  \
    CPPoolString CStringPool::QueryStringRefni(const Unit* text, std::size_t n) noexcept {                             \
        return InternText(text, n, Missing::Leave, Match::AnyCase);                                                    \
    }
TAVO_POOL_NAMES(wchar_t)
TAVO_POOL_NAMES(unsigned char)
#undef TAVO_POOL_NAMES

CPPoolString CStringPool::GetStringRefn(const unsigned short* text, std::size_t n) noexcept {
    return GetStringRefn(reinterpret_cast<const wchar_t*>(text), n);
}

CPPoolString CStringPool::GetStringRef(IStringSubmitter* submitter) noexcept {
    if (!submitter) return {};
    // Written outside the lock, into the block that may become the entry: what the submitter does is its own affair.
    try {
        const std::size_t announced = submitter->GetStringLen();
        if (announced == 0) {
            diagnostics::IllegalCodePoint("_cppoolstring::create [submitter]: String length cannot be 0");
            return {};
        }
        wchar_t* text;
        tagCPOMEMHEADER* block = NewEntry(announced, {}, text);
        if (!block) return {};
        CPObjectMemory holder(Block::Adopt(block));
        std::memset(static_cast<void*>(text), 0, announced * sizeof(wchar_t));
        if (!submitter->GetString(text)) return {};
        text[announced] = 0;
        pool::Key key;
        std::size_t units;
        if (!pool::KeyOfWide(text, announced, key, units)) return {};
        if (units == 0) return CPPoolString::pempty;
        block = Block::Acquire(block);
        holder.free();
        if (units < announced) block = ShortenEntry(block, units);
        SetKey(EntryOf(block), key);
        return InternBlock(block);
    } catch (...) {
        return {};
    }
}

bool CStringPool::Collect(ulong32 budget) noexcept {
    // Intended: a thread above or below normal priority does not sweep at all. Under a low one it could be kept from
    // the processor while it holds the lock that everybody needs.
    if (Platform::GetThreadPriority() != 0) return false;
    Pool& pool = ThePool();
    bool finished;
    const char* complaint;
    {
        pool::Guard guard(pool.lock);
        finished = pool.entries.DisposeTable(budget);
        complaint = std::exchange(pool.groups.complaint, nullptr);
    }
    RaiseComplaint(complaint);
    return finished;
}

bool CStringPool::Verify() noexcept {
    Pool& pool = ThePool();
    bool sound;
    {
        pool::Guard guard(pool.lock);
        CEnumVerify check;
        pool.entries.EnumTableBy(&check, 0, false);
        sound = check.sound;
    }
    if (!sound) diagnostics::IllegalCodePoint("String pool integrity violation");
    return sound;
}

unsigned long long CStringPool::GetSize() noexcept {
    Pool& pool = ThePool();
    pool::Guard guard(pool.lock);
    CEnumForSize size;
    pool.entries.EnumTableBy(&size, 0, false);
    return size.bytes;
}

unsigned long long CStringPool::GetNItems() noexcept {
    Pool& pool = ThePool();
    pool::Guard guard(pool.lock);
    return pool.entries.GetNItems();
}

} // namespace TAVO::String
