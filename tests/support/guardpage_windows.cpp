#include "guardpage.h"

#include <cstdlib>
#include <windows.h>

namespace support {

constexpr std::size_t kGuard = 65536;

GuardedMemory::GuardedMemory() {
    auto* const area =
        static_cast<unsigned char*>(VirtualAlloc(nullptr, kSize + 2 * kGuard, MEM_RESERVE, PAGE_NOACCESS));
    if (!area) std::abort();
    m_begin = area + kGuard;
    if (!VirtualAlloc(m_begin, kSize, MEM_COMMIT, PAGE_READWRITE)) std::abort();
}

GuardedMemory::~GuardedMemory() { VirtualFree(m_begin - kGuard, 0, MEM_RELEASE); }

} // namespace support
