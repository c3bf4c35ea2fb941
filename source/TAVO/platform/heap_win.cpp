// The heap of Windows: the process heap, so that blocks may be freed by whoever knows it.

#include "platform.h"

#include <windows.h>

namespace TAVO::Platform {

void* HeapAllocate(std::size_t size) noexcept { return HeapAlloc(GetProcessHeap(), 0, size); }

void* HeapResize(void* block, std::size_t size) noexcept {
    return block ? HeapReAlloc(GetProcessHeap(), 0, block, size) : nullptr;
}

void HeapRelease(void* block) noexcept {
    if (block) HeapFree(GetProcessHeap(), 0, block);
}

void HeapTrim() noexcept {} // left to the process heap

} // namespace TAVO::Platform
