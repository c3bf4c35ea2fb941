// The counted front of the platform heap.

#include "heap.h"

#include <atomic>

namespace TAVO::Platform {

namespace {

std::atomic<const HeapObserver*> g_observer{nullptr};

TAVO_NOINLINE void* AllocateWatched(const HeapObserver& observer, std::size_t size) noexcept {
    if (!observer.mayAllocate(size)) return nullptr;
    void* block = HeapAllocate(size);
    if (block) observer.allocated();
    return block;
}

} // namespace

void SetHeapObserver(const HeapObserver* observer) noexcept { g_observer.store(observer, std::memory_order_release); }

void* Allocate(std::size_t size) noexcept {
    const HeapObserver* observer = g_observer.load(std::memory_order_acquire);
    if (TAVO_UNLIKELY(observer != nullptr)) return AllocateWatched(*observer, size);
    return HeapAllocate(size);
}

void* Reallocate(void* block, std::size_t size) noexcept {
    const HeapObserver* observer = g_observer.load(std::memory_order_acquire);
    if (TAVO_UNLIKELY(observer != nullptr) && block && !observer->mayAllocate(size)) return nullptr;
    return HeapResize(block, size);
}

void Release(void* block) noexcept {
    if (!block) return;
    const HeapObserver* observer = g_observer.load(std::memory_order_acquire);
    if (TAVO_UNLIKELY(observer != nullptr)) observer->released();
    HeapRelease(block);
}

} // namespace TAVO::Platform
