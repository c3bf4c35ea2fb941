// The string pool: interning, sweeping and checking, all under one lock.

#include "diagnostics.h"
#include "platform/platform.h"
#include "poolentry.h"
#include "poollock.h"
#include "pooltables.h"
#include "transcoding.h"

#include <atomic>
#include <cstring>
#include <mutex>
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
            const pool::StoredText text(EntryOf(block));
            if (!entries.Find(text, place)) entries.Add(place, Block::Adopt(block), text, true);
        }
    }
};

// Built at load or at first use, whichever is earlier, in storage that no destructor touches: static objects of hosts
// and plug-ins may use the pool from their constructors and destructors.
alignas(Pool) unsigned char g_storage[sizeof(Pool)];
constinit std::atomic<Pool*> g_pool{nullptr};

// Not a local static: the compiler's guard for one takes a thread slot of the process that an unload does not return.
TAVO_NOINLINE Pool& BuildPool() noexcept {
    static constinit Platform::Mutex g_building;
    const std::lock_guard lock(g_building);
    if (!g_pool) g_pool = ::new (static_cast<void*>(g_storage)) Pool;
    return *g_pool;
}

Pool& ThePool() noexcept {
    Pool* pool = g_pool.load(std::memory_order_acquire);
    return TAVO_LIKELY(pool != nullptr) ? *pool : BuildPool();
}

// Raises what a table found wrong, now that the lock is left: an assertion may show a box, which pumps messages.
void RaiseComplaint(const char* complaint) noexcept {
    if (complaint) diagnostics::IllegalCodePoint(complaint);
}

// --- interning -----------------------------------------------------------------------------------------------------

enum class Missing { Create, Leave };
enum class Match { Exact, AnyCase };

// What was done for a text without the lock, or with an earlier one.
struct Before {
    bool searched = false; // it is not in the table in front
    bool fetched = false;  // what holds it is on its way from memory
};

// The one road behind every way to intern: a counted entry, null when there is none. Counted before the lock is left:
// without a handle outside, a sweep may take the entry.
template <class Text>
tagCPOMEMHEADER* InternLocked(Pool& pool, const Text& text, Missing missing, Match match,
                              const Before& before) noexcept {
    if (match == Match::AnyCase) {
        if (tagCPOMEMHEADER* found = pool.groups.Find(text, pool.entries)) return Block::Acquire(found);
        if (missing == Missing::Leave) return nullptr;
    }
    if (!before.fetched) pool.entries.Fetch(text.key);
    CCaseSensitiveHash::Place place;
    if (tagCPOMEMHEADER* found = pool.entries.Find(text, place, before.searched)) return Block::Acquire(found);
    if (missing == Missing::Leave) return nullptr;
    wchar_t* out;
    tagCPOMEMHEADER* block = NewEntry(text.Units(), text.key, out);
    if (!block) return nullptr;
    CPObjectMemory entry(Block::Adopt(block));
    if (!text.Write(out)) return nullptr;
    const pool::StoredText stored(text.key, out);
    if (!pool.entries.Add(place, std::move(entry), stored, text.IsCaseless(out))) return nullptr;
    block->lRefCnt = 2; // the table's and the caller's; nobody else knows the block before the lock is left
    return block;
}

template <class Text>
TAVO_NOINLINE CPPoolString InternWithLock(const Text& text, Missing missing, Match match, Before before) noexcept {
    Pool& pool = ThePool();
    pool.lock.Enter();
    tagCPOMEMHEADER* entry = InternLocked(pool, text, missing, match, before);
    const char* complaint = std::exchange(pool.groups.complaint, nullptr);
    pool.lock.Leave();
    if (TAVO_UNLIKELY(complaint != nullptr)) RaiseComplaint(complaint);
    return entry ? PoolAccess::Adopt(entry) : CPPoolString();
}

template <class Text> TAVO_INLINE CPPoolString Intern(const Text& text, Missing missing, Match match) noexcept {
    Before before;
    if (match == Match::Exact) {
        const PoolFront::Shared shared = ThePool().entries.Share(text);
        if (TAVO_LIKELY(shared.entry != nullptr)) return PoolAccess::Adopt(shared.entry);
        before.searched = shared.searched;
    }
    return InternWithLock(text, missing, match, before);
}

CPPoolString InternText(const wchar_t* text, std::size_t limit, Missing missing, Match match) noexcept {
    if (!text) return {};
    if (limit == 0 || !*text) return CPPoolString::pempty;
    pool::Key key;
    std::size_t units;
    if (!pool::KeyOfWide(text, limit, key, units)) return {};
    if (units == 0) return CPPoolString::pempty; // a pair that the limit cuts
    return Intern(pool::WideText{key, text, units}, missing, match);
}

CPPoolString InternText(const unsigned char* text, std::size_t limit, Missing missing, Match match) noexcept {
    if (!text) return {};
    if (limit == 0 || !*text) return CPPoolString::pempty;
    pool::Key key;
    std::size_t bytes;
    if (!pool::KeyOfUtf8(text, limit, key, bytes)) return {};
    if (bytes == 0) return CPPoolString::pempty;
    if (key.length == bytes) return Intern(pool::AsciiText{key, text, bytes}, missing, match);
    return Intern(pool::Utf8Text{key, text, bytes}, missing, match);
}

// What a submitter wrote, already in the block that becomes the entry.
CPPoolString InternBlock(tagCPOMEMHEADER* block) noexcept {
    CPObjectMemory entry(Block::Adopt(block));
    Pool& pool = ThePool();
    pool::Guard guard(pool.lock);
    CCaseSensitiveHash::Place place;
    const pool::StoredText text(EntryOf(block));
    if (tagCPOMEMHEADER* found = pool.entries.Find(text, place, false)) return PoolAccess::Share(found);
    return pool.entries.Add(place, std::move(entry), text, text.IsCaseless()) ? PoolAccess::Share(block)
                                                                              : CPPoolString();
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
    pool.entries.Visit(diagnosis);
    Develop::_logWrite(acfDebugTrace, L"TAVO", kSource, 0,
                       L"SPool ClearTable: diagnosis done, %u items still referenced", diagnosis.referenced);
    pool.entries.Clear();
}

} // namespace

namespace pool {

CPPoolString InternAscii(const unsigned char* text, std::size_t count) noexcept {
    if (count == 0) return CPPoolString::pempty;
    Key key;
    KeyOfAscii(text, count, key);
    return Intern(AsciiText{key, text, count}, Missing::Create, Match::Exact);
}

CPPoolString InternWide(const wchar_t* text, std::size_t count) noexcept {
    if (count == 0) return CPPoolString::pempty;
    Key key;
    if (!KeyOfUnits(text, count, key)) return {};
    return Intern(WideText{key, text, count}, Missing::Create, Match::Exact);
}

template <class Unit> CPPoolString Announced<Unit>::Begin(const Unit* text, std::size_t count) noexcept {
    if constexpr (sizeof(Unit) == 1)
        KeyOfAscii(text, count, m_key);
    else
        KeyOfUnits(text, count, m_key);
    m_text = text;
    m_count = count;
    Pool& pool = ThePool();
    const PoolFront::Shared shared = pool.entries.Share(PlainText<Unit>{m_key, text, count});
    if (shared.entry) return PoolAccess::Adopt(shared.entry);
    m_searched = shared.searched;
    m_fetched = pool.lock.TryEnter();
    if (m_fetched) {
        pool.entries.Fetch(m_key);
        pool.lock.Leave();
    }
    return {};
}

template <class Unit> CPPoolString Announced<Unit>::Finish() const noexcept {
    return InternWithLock(PlainText<Unit>{m_key, m_text, m_count}, Missing::Create, Match::Exact,
                          {m_searched, m_fetched});
}

template class Announced<unsigned char>;
template class Announced<wchar_t>;

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
        // Up to the terminator: the text is whole, so a pair without its second half is a fault, not cut.
        if (!pool::KeyOfWide(text, SIZE_MAX, key, units)) return {};
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
    // Intended (collect-priority): a thread above or below normal priority does not sweep at all. Under a low one it
    // could be kept from the processor while it holds the lock that everybody needs.
    if (Platform::GetThreadPriority() != 0) return false;
    Pool& pool = ThePool();
    bool finished;
    const char* complaint;
    {
        pool::Guard guard(pool.lock);
        finished = pool.entries.Dispose(budget);
        complaint = std::exchange(pool.groups.complaint, nullptr);
    }
    RaiseComplaint(complaint);
    Platform::HeapTrim();
    return finished;
}

bool CStringPool::Verify() noexcept {
    Pool& pool = ThePool();
    bool sound;
    {
        pool::Guard guard(pool.lock);
        CEnumVerify check;
        pool.entries.Visit(check);
        sound = check.sound;
    }
    if (!sound) diagnostics::IllegalCodePoint("String pool integrity violation");
    return sound;
}

unsigned long long CStringPool::GetSize() noexcept {
    Pool& pool = ThePool();
    pool::Guard guard(pool.lock);
    CEnumForSize size;
    pool.entries.Visit(size);
    return size.bytes;
}

unsigned long long CStringPool::GetNItems() noexcept {
    Pool& pool = ThePool();
    pool::Guard guard(pool.lock);
    return pool.entries.GetNItems();
}

} // namespace TAVO::String
