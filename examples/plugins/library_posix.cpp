#include "library.h"

#include <cstdio>
#include <dlfcn.h>
#include <TAVO/string.h>

bool CLibrary::Load(const wchar_t* path) {
    const TAVO::String::CUTF8Char name(path);
    m_library = name ? dlopen(reinterpret_cast<const char*>(*name), RTLD_NOW | RTLD_LOCAL) : nullptr;
    if (name && !m_library) std::printf("%s\n", dlerror());
    return m_library != nullptr;
}

void* CLibrary::Find(const char* name) const { return dlsym(m_library, name); }

void CLibrary::Unload() {
    dlclose(m_library);
    m_library = nullptr;
}

const wchar_t* CLibrary::Pattern() { return L"*.so"; }
