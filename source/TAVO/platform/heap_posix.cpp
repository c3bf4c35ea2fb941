// The heap of POSIX systems: the C library's, or mimalloc when the build found it.

#include "platform.h"

#include <stdlib.h>

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

} // namespace

void* HeapAllocate(std::size_t size) noexcept {
    if (size > kLargest) return nullptr;
    return mi_malloc(AtLeast16(size));
}

void* HeapResize(void* block, std::size_t size) noexcept {
    if (!block || size > kLargest) return nullptr;
    return mi_realloc(block, AtLeast16(size));
}

void HeapRelease(void* block) noexcept { mi_free(block); }

void HeapTrim() noexcept {
#if defined(TAVO_MIMALLOC)
    mi_collect(false);
#endif
}

} // namespace TAVO::Platform
