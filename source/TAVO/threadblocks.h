#pragma once
// What locks, events and threads have in common: their blocks, and taking a lock that must be taken.

#include "diagnostics.h"
#include "platform/platform.h"

#include <new>
#include <TAVO/buffers.h>

namespace TAVO::Threading::detail {

template <class State> void Create(void* payload, std::size_t) {
    static_assert(alignof(State) <= 16, "blocks are aligned to 16");
    new (payload) State;
}

template <class State> void Finalize(void* payload, std::size_t) { static_cast<State*>(payload)->~State(); }

inline void* NoInterface(void*, const _acfUID&) { return nullptr; }

// None of them can be copied: every copy of a handle is the same object.
template <class State> constexpr Buffers::tagCPOVTABL kTable = {Create<State>, nullptr, Finalize<State>, NoInterface};

// Builds the object in a new block (null passes); null when the system has none to give.
inline Buffers::tagCPOMEMHEADER* Built(Buffers::tagCPOMEMHEADER* block) noexcept {
    if (!block) return nullptr;
    try {
        block->pVTbl->create(block + 1, block->sUsed);
        return block;
    } catch (...) {
        Core::OS::_ffree(block);
        return nullptr;
    }
}

template <class State> State* StateOf(void* payload) { return static_cast<State*>(payload); }

// Takes the lock however often the primitive fails (it has no memory, or too many wait already).
template <class Take> void TakeSurely(Take take) noexcept {
    for (;;) {
        try {
            take();
            return;
        } catch (...) {
            diagnostics::IllegalCodePoint("Threading: the system failed to take a lock");
            Platform::SleepMilliseconds(1);
        }
    }
}

} // namespace TAVO::Threading::detail
