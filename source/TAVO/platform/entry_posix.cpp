// The load step: a constructor ahead of all others of the library. It cannot refuse the load, so AppInit tells the
// failure.

#include "lifecycle.h"

#include <boost/thread/thread_only.hpp>
#include <dlfcn.h>
#if defined(TAVO_MIMALLOC)
#include <mimalloc.h>
#endif

namespace {

// The library that holds the function stays when this one goes.
void Keep(void* function) {
    Dl_info own, other;
    if (!dladdr(reinterpret_cast<void*>(&Keep), &own) || !dladdr(function, &other)) return;
    if (own.dli_fbase != other.dli_fbase) dlopen(other.dli_fname, RTLD_NOW | RTLD_NOLOAD | RTLD_NODELETE);
}

// Threads that used them end through their code, and what they took of the process comes back with none of them: of
// Boost a key of the threads' own data, of the allocator its thread-local storage.
__attribute__((constructor(101))) void KeepOthers() {
    Keep(reinterpret_cast<void*>(&boost::this_thread::interruption_enabled));
#if defined(TAVO_MIMALLOC)
    Keep(reinterpret_cast<void*>(&mi_malloc));
    // Milliseconds for which freed pages stay mapped: who closes a large document often opens the next one, and would
    // spend a tenth of the time on having them mapped again. The process's environment has the last word.
    mi_option_set_default(mi_option_decommit_delay, 500);
#endif
}

__attribute__((constructor(101))) void Load() { TAVO::OnLoad(); }

} // namespace
