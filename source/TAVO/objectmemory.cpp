// The reference-counted block: sharing, releasing, copying on write.

#include "diagnostics.h"
#include "platform/heap.h"

#include <atomic>
#include <limits>
#include <new>
#include <TAVO/buffers.h>

namespace TAVO::Buffers {

namespace {

using Count = std::atomic_ref<std::int32_t>;

std::int32_t LoadCount(tagCPOMEMHEADER* header) { return Count(header->lRefCnt).load(std::memory_order_acquire); }

void Finalize(tagCPOMEMHEADER* header) noexcept {
    try {
        header->pVTbl->finalize(header + 1, header->sUsed);
    } catch (...) {
        diagnostics::IllegalCodePoint("CPObjectMemory::Free exception");
    }
    Platform::Release(header);
}

// A deep tree must not exhaust the stack: releases that nest deeper than this on one thread wait in a queue, which the
// outermost release drains. The queue is linked through the dead headers, whose allocated size nobody reads any more.
constexpr unsigned kDeepestRelease = 64;

struct ReleaseScope {
    unsigned depth = 1;
    tagCPOMEMHEADER* queue = nullptr;
};

void Enqueue(ReleaseScope& scope, tagCPOMEMHEADER* dead) {
    dead->sAllocated = reinterpret_cast<std::size_t>(scope.queue);
    scope.queue = dead;
}

tagCPOMEMHEADER* Dequeue(ReleaseScope& scope) {
    tagCPOMEMHEADER* dead = scope.queue;
    if (dead) scope.queue = reinterpret_cast<tagCPOMEMHEADER*>(dead->sAllocated);
    return dead;
}

TAVO_NOINLINE void Destroy(tagCPOMEMHEADER* header) noexcept {
    auto* scope = static_cast<ReleaseScope*>(Platform::GetReleaseScope());
    if (scope) {
        if (scope->depth >= kDeepestRelease) {
            Enqueue(*scope, header);
            return;
        }
        ++scope->depth;
        Finalize(header);
        --scope->depth;
        return;
    }
    ReleaseScope outermost;
    Platform::SetReleaseScope(&outermost);
    Finalize(header);
    while (tagCPOMEMHEADER* next = Dequeue(outermost)) Finalize(next);
    Platform::SetReleaseScope(nullptr);
}

// The increment found a block that nobody holds (or that another thread just let go).
TAVO_NOINLINE tagCPOMEMHEADER* AcquireFailed(tagCPOMEMHEADER* header, std::int32_t count) noexcept {
    if (count == 0) {
        diagnostics::IllegalCodePoint(
            "InterlockedIncrement32 returned 0, possible multi-threading access problem on shared object!");
        return nullptr;
    }
    diagnostics::RuntimeAssumptionFailed("pMHO->lRefCnt > 1");
    return LoadCount(header) > 1 ? header : nullptr;
}

} // namespace

tagCPOMEMHEADER* CPObjectMemory::Acquire(tagCPOMEMHEADER* header) noexcept {
    if (TAVO_UNLIKELY(!header->pVTbl)) diagnostics::RuntimeAssumptionFailed("pMHO->pVTbl");
    Count count(header->lRefCnt);
    if (count.load(std::memory_order_relaxed) <= 0) return header; // static
    const std::int32_t now = count.fetch_add(1) + 1;
    if (TAVO_LIKELY(now > 1)) return header;
    return AcquireFailed(header, now);
}

void CPObjectMemory::CopyCPMemory(const CPObjectMemory& source) noexcept {
    if (m_pMH == source.m_pMH) return;
    tagCPOMEMHEADER* old = m_pMH;
    m_pMH = nullptr;
    if (source.m_pMH) m_pMH = Acquire(source.m_pMH);
    if (old) Free(old); // last: the source may live in the old block
}

void CPObjectMemory::Free(tagCPOMEMHEADER* header) noexcept {
    if (!header) return;
    Count count(header->lRefCnt);
    if (count.load(std::memory_order_relaxed) <= 0) return; // static
    if (count.fetch_sub(1) == 1) Destroy(header);
}

tagCPOMEMHEADER* CPObjectMemory::NewBlock(std::size_t capacity, std::size_t used, const tagCPOVTABL* table) noexcept {
    if (!table || capacity > std::numeric_limits<std::size_t>::max() - sizeof(tagCPOMEMHEADER)) return nullptr;
    void* memory = Platform::Allocate(sizeof(tagCPOMEMHEADER) + capacity);
    return memory ? ::new (memory) tagCPOMEMHEADER{1, capacity, used, table} : nullptr;
}

bool CPObjectMemory::Alloc(std::size_t size, const tagCPOVTABL* table) noexcept {
    free();
    m_pMH = NewBlock(size, size, table);
    return m_pMH != nullptr;
}

bool CPObjectMemory::Reserve(std::size_t capacity, const tagCPOVTABL* table) noexcept {
    free();
    m_pMH = NewBlock(capacity, 0, table);
    return m_pMH != nullptr;
}

bool CPObjectMemory::IsPrivate() const noexcept { return m_pMH && LoadCount(m_pMH) == 1; }
bool CPObjectMemory::IsStatic() const noexcept { return m_pMH && LoadCount(m_pMH) <= 0; }

bool CPObjectMemory::Incalloc(std::size_t extra) noexcept {
    if (!extra || !IsPrivate()) return false;
    const std::size_t held = sizeof(tagCPOMEMHEADER) + m_pMH->sAllocated;
    if (extra > std::numeric_limits<std::size_t>::max() - held) return false;
    auto* grown = static_cast<tagCPOMEMHEADER*>(Platform::Reallocate(m_pMH, held + extra));
    if (!grown) return false;
    m_pMH = grown;
    m_pMH->sAllocated += extra;
    return true;
}

bool CPObjectMemory::SetSize(std::size_t size) noexcept {
    if (!m_pMH || IsStatic() || size > m_pMH->sAllocated) return false;
    m_pMH->sUsed = size;
    return true;
}

bool CPObjectMemory::clone() noexcept {
    if (!m_pMH) return true;
    const std::int32_t count = LoadCount(m_pMH);
    if (count <= 0) diagnostics::RuntimeAssumptionFailed("m_pMH->lRefCnt>0");
    if (!m_pMH->pVTbl) {
        diagnostics::RuntimeAssumptionFailed("m_pMH->pVTbl");
        return false;
    }
    if (!m_pMH->pVTbl->clone) {
        diagnostics::IllegalCodePoint("CPObjectMemory::clone: Class does not allow cloning");
        return false;
    }
    if (count == 1) return true;
    tagCPOMEMHEADER* copy = NewBlock(m_pMH->sUsed, m_pMH->sUsed, m_pMH->pVTbl);
    if (!copy) return false;
    try {
        m_pMH->pVTbl->clone(copy + 1, m_pMH + 1, m_pMH->sUsed);
    } catch (...) {
        Platform::Release(copy);
        diagnostics::IllegalCodePoint("CPObjectMemory::Clone exception");
        return false;
    }
    Free(std::exchange(m_pMH, copy));
    return true;
}

std::uint32_t CPObjectMemory::hash() const noexcept {
    if (!m_pMH) return 0;
    const auto address = reinterpret_cast<std::uintptr_t>(m_pMH);
    const auto mixed = static_cast<std::uint32_t>(address >> 32) ^ static_cast<std::uint32_t>(address);
    return mixed ? mixed : 1;
}

std::uint32_t CPObjectMemory::lockcnt() const noexcept {
    return m_pMH ? static_cast<std::uint32_t>(LoadCount(m_pMH)) : 0;
}

bool CPObjectMemory::IsAssignable(std::size_t size, const tagCPOVTABL* table) const noexcept {
    if (!size || !table) return false;
    return !m_pMH || (m_pMH->pVTbl == table && m_pMH->sUsed >= size);
}

bool CPObjectMemory::IsNAssignable(std::size_t size, const tagCPOVTABL* table) const noexcept {
    if (!size || !table) return false;
    return !m_pMH || (m_pMH->pVTbl == table && m_pMH->sUsed % size == 0);
}

std::uint32_t CPObjectMemory::GetType(const std::size_t* ids, std::uint32_t count) const noexcept {
    if (m_pMH && ids)
        for (std::uint32_t i = 0; i < count; ++i)
            if (ids[i] == GetTypeID()) return i;
    return 0xFFFFFFFF;
}

std::size_t CPObjectMemory::queryinterface(const CPObjectMemory& other, const _acfUID& type) noexcept {
    if (!other.m_pMH || !other.m_pMH->pVTbl || !other.m_pMH->pVTbl->queryinterface) return NotFound;
    try {
        void* found = other.m_pMH->pVTbl->queryinterface(other.m_pMH + 1, type);
        return found ? static_cast<std::size_t>(static_cast<char*>(found) - static_cast<char*>(other.Payload()))
                     : NotFound;
    } catch (...) {
        return NotFound;
    }
}

} // namespace TAVO::Buffers
