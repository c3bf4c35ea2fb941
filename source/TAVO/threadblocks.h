#pragma once
// What locks, events and threads have in common: their blocks, and taking a lock that must be taken.

#include "diagnostics.h"
#include "platform/platform.h"

#include <new>
#include <TAVO/buffers.h>

namespace TAVO::Threading::detail {

template <class State> void Create(void* payload, std::size_t) { new (payload) State; }

template <class State> void Finalize(void* payload, std::size_t) { static_cast<State*>(payload)->~State(); }

inline void* NoInterface(void*, const _acfUID&) { return nullptr; }

// None of them can be copied: every copy of a handle is the same object.
template <class State> constexpr Buffers::tagCPOVTABL kTable = {Create<State>, nullptr, Finalize<State>, NoInterface};

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
