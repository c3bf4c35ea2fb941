// The heap of POSIX systems: the C library's, or mimalloc when the build found it.

#include "platform.h"

#include <algorithm>
#include <atomic>
#include <cstdint>
#include <cstring>
#include <stdlib.h>
#include <sys/mman.h>

#if defined(TAVO_MIMALLOC)
#include <mimalloc.h>
#else
#define mi_malloc malloc
#define mi_realloc realloc
#define mi_free free
#endif

namespace TAVO::Platform {

// Sizes above this are refused at once: no heap has them, and some checkers abort instead of answering null.
constexpr std::size_t kLargest = std::size_t{1} << 47;

namespace {

// Small blocks take 16 bytes: mimalloc aligns smaller ones to 8 only, and realloc to 0 would free the block.
std::size_t AtLeast16(std::size_t size) { return size < 16 ? 16 : size; }

#if defined(TAVO_MIMALLOC) && defined(MADV_HUGEPAGE) && MI_MALLOC_VERSION >= 200 && MI_MALLOC_VERSION < 300

// Page by page the system takes long to provide fresh memory: more than a third of the time of opening a document for
// the first time. So large pages are wished for wherever the heap grows: for the segments that mimalloc cuts blocks
// from, without their beginning, which is all that a small process needs, and for large blocks, which may be segments
// of their own. mimalloc's own switch for large pages would never give memory back.
constexpr std::size_t kLargePage = std::size_t{2} << 20, kLargeBlock = std::size_t{4} << 20;
constexpr std::size_t kSegment = std::size_t{32} << 20, kSegments = (std::size_t{1} << 47) / kSegment;

// A bit for each segment of the address space: the wish was made. Half a megabyte, of which hardly a page is touched.
constinit std::atomic<std::uint64_t> g_wished[kSegments / 64];

void Wish(std::uintptr_t first, std::uintptr_t end) {
    if (first < end) madvise(reinterpret_cast<void*>(first), end - first, MADV_HUGEPAGE);
}

// Of what lies between, whole large pages.
void GiveBack(std::uintptr_t from, std::uintptr_t end) {
    const std::uintptr_t first = (from + kLargePage - 1) / kLargePage * kLargePage, last = end / PageSize * PageSize;
    if (first < last) madvise(reinterpret_cast<void*>(first), last - first, MADV_DONTNEED);
}

TAVO_NOINLINE void WishForSegmentOf(void* block) {
    const std::uintptr_t segment = reinterpret_cast<std::uintptr_t>(block) / kSegment;
    if (!block || segment >= kSegments) return;
    g_wished[segment / 64].fetch_or(std::uint64_t{1} << segment % 64, std::memory_order_relaxed);
    Wish(segment * kSegment + kLargePage, (segment + 1) * kSegment);
}

// mimalloc gives each block above 16 MB back to the system at once, and having its pages provided anew takes longer
// than most of what is done with them. So the latest few stay, for the next ones of about their size. What they hold
// has been given up: the system takes their pages when it is short of memory, and HeapTrim lets go of those that nobody
// has taken for half a second, which is how long mimalloc keeps smaller ones here.
class SpareBlocks {
public:
    constexpr SpareBlocks() noexcept = default;
    ~SpareBlocks() {
        m_closed = true;
        LetGo(0);
    }

    // For a size of kLeast and more; null when none will do.
    TAVO_NOINLINE void* Take(std::size_t size) noexcept {
        for (Place& place : m_places) {
            void* const block = place.block.exchange(nullptr, std::memory_order_acquire);
            if (!block) continue;
            const std::size_t usable = mi_usable_size(block);
            if (size <= usable && usable / 2 <= size) return block;
            void* none = nullptr;
            if (!place.block.compare_exchange_strong(none, block, std::memory_order_release)) mi_free(block);
        }
        return nullptr;
    }

    // False: the block is not one to keep.
    bool Keep(void* block) noexcept {
        // Such a block begins where a segment does, behind what mimalloc writes there, as few others do.
        return reinterpret_cast<std::uintptr_t>(block) % kSegment < kSegmentHead && block && KeepLarge(block);
    }

    // Of those that have lain for that long.
    void LetGo(std::uint64_t milliseconds) noexcept {
        const std::uint64_t now = GetProcessMilliseconds();
        for (Place& place : m_places)
            if (now - place.since.load(std::memory_order_relaxed) >= milliseconds)
                mi_free(place.block.exchange(nullptr, std::memory_order_acquire));
    }

    static constexpr std::size_t kLeast = std::size_t{16} << 20, kMost = std::size_t{256} << 20;

private:
    static constexpr std::size_t kPlaces = 4, kSegmentHead = std::size_t{128} << 10;

    struct Place {
        std::atomic<void*> block{nullptr};
        std::atomic<std::uint64_t> since{0};
    };

    TAVO_NOINLINE bool KeepLarge(void* block) noexcept {
        const std::size_t usable = mi_usable_size(block);
        if (usable < kLeast || usable > kMost || m_closed) return false;
        const auto address = reinterpret_cast<std::uintptr_t>(block);
        const std::uintptr_t first = (address + PageSize - 1) / PageSize * PageSize;
        madvise(reinterpret_cast<void*>(first), (address + usable) / PageSize * PageSize - first, MADV_FREE);
        Place& place = m_places[m_next.fetch_add(1, std::memory_order_relaxed) % kPlaces];
        place.since.store(GetProcessMilliseconds(), std::memory_order_relaxed);
        mi_free(place.block.exchange(block, std::memory_order_acq_rel));
        return true;
    }

    Place m_places[kPlaces];
    std::atomic<std::size_t> m_next{0};
    std::atomic<bool> m_closed{false}; // the library is going, so nobody would let go of them any more
};
constinit SpareBlocks g_spares;

void* AllocateLarge(std::size_t size) {
    if (size >= SpareBlocks::kLeast)
        if (void* const spare = g_spares.Take(size)) return spare;
    void* const block = mi_malloc(size);
    const auto address = reinterpret_cast<std::uintptr_t>(block);
    if (block) Wish((address + kLargePage - 1) / kLargePage * kLargePage, (address + size) / kLargePage * kLargePage);
    return block;
}

void* Allocate(std::size_t size) {
    if (TAVO_UNLIKELY(size >= kLargeBlock)) return AllocateLarge(size);
    void* const block = mi_malloc(size);
    const std::uintptr_t segment = reinterpret_cast<std::uintptr_t>(block) / kSegment;
    const std::uint64_t wished = segment < kSegments ? g_wished[segment / 64].load(std::memory_order_relaxed) : 0;
    if (TAVO_UNLIKELY((wished >> segment % 64 & 1) == 0)) WishForSegmentOf(block);
    return block;
}

void Free(void* block) {
    if (!g_spares.Keep(block)) mi_free(block);
}

void* Resize(void* block, std::size_t size) {
    const std::size_t usable = mi_usable_size(block);
    if (size > usable) {
        if (size < kLargeBlock) return mi_realloc(block, size);
    } else {
        if (usable < SpareBlocks::kLeast || size >= usable / 2) return mi_realloc(block, size);
        if (size >= kLargeBlock) {
            // What is no longer needed goes without moving the rest.
            const std::uintptr_t address = reinterpret_cast<std::uintptr_t>(block);
            GiveBack(address + size, address + usable);
            return block;
        }
    }
    // Moved here, not by mi_realloc: the wish must come before anything is written, and the old block may be one to
    // keep.
    void* const other = Allocate(size);
    if (!other) return nullptr;
    std::memcpy(other, block, std::min(size, usable));
    Free(block);
    return other;
}

void Trim() {
    mi_collect(false);
    g_spares.LetGo(500);
}

#else

void* Allocate(std::size_t size) { return mi_malloc(size); }
void* Resize(void* block, std::size_t size) { return mi_realloc(block, size); }
void Free(void* block) { mi_free(block); }
void Trim() {
#if defined(TAVO_MIMALLOC)
    mi_collect(false);
#endif
}

#endif

} // namespace

void* HeapAllocate(std::size_t size) noexcept { return size > kLargest ? nullptr : Allocate(AtLeast16(size)); }

void* HeapResize(void* block, std::size_t size) noexcept {
    return !block || size > kLargest ? nullptr : Resize(block, AtLeast16(size));
}

void HeapRelease(void* block) noexcept { Free(block); }
void HeapTrim() noexcept { Trim(); }

} // namespace TAVO::Platform
