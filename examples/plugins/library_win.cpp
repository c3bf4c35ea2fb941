#include "library.h"

#include <windows.h>

bool CLibrary::Load(const wchar_t* path) { return (m_library = LoadLibraryW(path)) != nullptr; }

void* CLibrary::Find(const char* name) const {
    return reinterpret_cast<void*>(GetProcAddress(static_cast<HMODULE>(m_library), name));
}

void CLibrary::Unload() {
    FreeLibrary(static_cast<HMODULE>(m_library));
    m_library = nullptr;
}

const wchar_t* CLibrary::Pattern() { return L"*.dll"; }
