#include "loading/loading.h"

#include <cstdio>
#include <dlfcn.h>
#include <pthread.h>
#include <string>
#include <unistd.h>

namespace loading {

// By its whole path: under sanitizers the loader does not follow the program's run path.
void* LoadPlugin() {
    char path[4096];
    const auto length = readlink("/proc/self/exe", path, sizeof path);
    const std::string self(path, length > 0 ? static_cast<std::size_t>(length) : 0);
    void* plugin = dlopen((self.substr(0, self.rfind('/') + 1) + "TAVOTestPlugin.so").c_str(), RTLD_NOW | RTLD_LOCAL);
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

std::size_t FirstFreeSlot() {
    pthread_key_t slot = 0;
    if (pthread_key_create(&slot, nullptr) == 0) pthread_key_delete(slot);
    return slot;
}

} // namespace loading
