#pragma once
// The library's own front of the platform heap: every allocation passes here, so that a test can watch and refuse it.

#include "platform.h"

namespace TAVO::Platform {

// Installed by tests: decides about allocations and sees blocks come and go. Called on any thread.
struct HeapObserver {
    bool (*mayAllocate)(std::size_t size); // false makes the allocation (or resizing) fail
    void (*allocated)();                   // a block came into being
    void (*released)();                    // a block went
};

// Null removes the observer. Exported for the library's own tests; no part of the public interface.
TAVO_API void SetHeapObserver(const HeapObserver* observer) noexcept;

void* Allocate(std::size_t size) noexcept;
void* Reallocate(void* block, std::size_t size) noexcept;
void Release(void* block) noexcept;

} // namespace TAVO::Platform
