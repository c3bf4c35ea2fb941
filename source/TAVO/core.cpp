// Allocation and atomic primitives; the life cycle stands in lifecycle.cpp.

#include "platform/heap.h"

#include <atomic>
#include <TAVO/core.h>

namespace TAVO::Core {

std::size_t InterlockedCompareSwapSize_t(std::size_t& target, std::size_t comparand, std::size_t exchange) {
    std::atomic_ref<std::size_t>(target).compare_exchange_strong(comparand, exchange);
    return comparand; // on failure the call stores what it found there
}

void InterlockedSet(std::size_t& target, std::size_t value) { std::atomic_ref<std::size_t>(target).exchange(value); }

namespace OS {

void* _falloc(std::size_t size) { return Platform::Allocate(size); }
void* _frealloc(void* block, std::size_t size) { return Platform::Reallocate(block, size); }
void _ffree(void* block) { Platform::Release(block); }

std::uint32_t InterlockedIncrement32(std::uint32_t& value) { return ++std::atomic_ref<std::uint32_t>(value); }
std::uint32_t InterlockedDecrement32(std::uint32_t& value) { return --std::atomic_ref<std::uint32_t>(value); }

} // namespace OS
} // namespace TAVO::Core
