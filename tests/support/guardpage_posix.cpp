#include "guardpage.h"

#include <cstdlib>
#include <sys/mman.h>

namespace support {

constexpr std::size_t kGuard = 65536;

GuardedMemory::GuardedMemory() {
    void* const area = mmap(nullptr, kSize + 2 * kGuard, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (area == MAP_FAILED) std::abort();
    m_begin = static_cast<unsigned char*>(area) + kGuard;
    if (mprotect(m_begin, kSize, PROT_READ | PROT_WRITE) != 0) std::abort();
}

GuardedMemory::~GuardedMemory() { munmap(m_begin - kGuard, kSize + 2 * kGuard); }

} // namespace support
