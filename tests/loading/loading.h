#pragma once
// What the loading tests need of the system: this program does not link the library, so that it comes and goes.

#include <cstddef>

namespace loading {

// Loads the test plug-in, and the library with it, from the program's folder; null when that fails.
void* LoadPlugin();
void Unload(void* plugin);
void* Find(void* plugin, const char* name);

// Whether the library is in the process now.
bool IsLibraryLoaded();

// Memory that only this process uses.
std::size_t PrivateBytes();

// The slot of threads (a number of the system's) that the next one to ask for one gets.
std::size_t FirstFreeSlot();

} // namespace loading
