// The heap of POSIX systems: the C library's, or mimalloc when the build found it.

#include "platform.h"

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

#if defined(TAVO_MIMALLOC) && defined(MADV_HUGEPAGE)
// mimalloc gets blocks of whole documents from the system and gives them back. Page by page the system takes longer to
// provide such a block than we take to fill it, so large pages are wished for.
constexpr std::size_t kManyPages = std::size_t{4} << 20;

void* WithLargePages(void* block, std::size_t size) {
    constexpr std::uintptr_t kLargePage = std::uintptr_t{2} << 20;
    const auto address = reinterpret_cast<std::uintptr_t>(block);
    const std::uintptr_t first = (address + kLargePage - 1) / kLargePage * kLargePage;
    const std::uintptr_t end = (address + size) / kLargePage * kLargePage;
    if (block && first < end) madvise(reinterpret_cast<void*>(first), end - first, MADV_HUGEPAGE);
    return block;
}

// Moved here, not by mi_realloc: the wish must come before anything is written.
void* MoveToLargePages(void* block, std::size_t size) {
    void* const larger = WithLargePages(mi_malloc(size), size);
    if (!larger) return nullptr;
    std::memcpy(larger, block, mi_usable_size(block));
    mi_free(block);
    return larger;
}
#else
#define mi_usable_size(block) SIZE_MAX
constexpr std::size_t kManyPages = SIZE_MAX;
void* WithLargePages(void* block, std::size_t) { return block; }
void* MoveToLargePages(void* block, std::size_t) { return block; }
#endif

} // namespace

void* HeapAllocate(std::size_t size) noexcept {
    if (size > kLargest) return nullptr;
    void* const block = mi_malloc(AtLeast16(size));
    return size < kManyPages ? block : WithLargePages(block, size);
}

void* HeapResize(void* block, std::size_t size) noexcept {
    if (!block || size > kLargest) return nullptr;
    if (size >= kManyPages && size > mi_usable_size(block)) return MoveToLargePages(block, size);
    return mi_realloc(block, AtLeast16(size));
}

void HeapRelease(void* block) noexcept { mi_free(block); }

void HeapTrim() noexcept {
#if defined(TAVO_MIMALLOC)
    mi_collect(false);
#endif
}

} // namespace TAVO::Platform
