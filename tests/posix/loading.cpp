#include "loading/loading.h"

#include <cstdio>
#include <dlfcn.h>
#include <unistd.h>

namespace loading {

void* LoadPlugin() {
    void* plugin = dlopen("TAVOTestPlugin.so", RTLD_NOW | RTLD_LOCAL); // along the program's run path
    if (!plugin) std::fprintf(stderr, "%s\n", dlerror());
    return plugin;
}
void Unload(void* plugin) { dlclose(plugin); }
void* Find(void* plugin, const char* name) { return dlsym(plugin, name); }

bool IsLibraryLoaded() {
    void* library = dlopen("libTAVO.so.1", RTLD_NOW | RTLD_NOLOAD);
    if (library) dlclose(library);
    return library != nullptr;
}

std::size_t PrivateBytes() {
    std::size_t size = 0, resident = 0, shared = 0;
    std::FILE* file = std::fopen("/proc/self/statm", "r");
    if (!file || std::fscanf(file, "%zu %zu %zu", &size, &resident, &shared) != 3) resident = shared = 0;
    if (file) std::fclose(file);
    return (resident - shared) * static_cast<std::size_t>(sysconf(_SC_PAGESIZE));
}

// Not watched here: Boost's shared library leaves one behind whenever it is unloaded.
std::size_t FirstFreeSlot() { return 0; }

} // namespace loading
