#pragma once
// Memory that ends at an inaccessible page: reading one byte too far crashes.

#include <cstddef>
#include <cstring>

namespace support {

class GuardedMemory {
public:
    static constexpr std::size_t kSize = 3 * 65536; // bytes that can be used

    GuardedMemory();
    ~GuardedMemory();
    GuardedMemory(const GuardedMemory&) = delete;
    GuardedMemory& operator=(const GuardedMemory&) = delete;

    // The first inaccessible byte behind the memory.
    unsigned char* End() const { return m_begin + kSize; }

    // Copies `count` units to the very end.
    template <class Unit> Unit* Place(const Unit* units, std::size_t count) const {
        auto* const place = End() - count * sizeof(Unit);
        if (count) std::memcpy(place, units, count * sizeof(Unit));
        return reinterpret_cast<Unit*>(place);
    }

private:
    unsigned char* m_begin;
};

} // namespace support
