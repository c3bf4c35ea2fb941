#pragma once
// The arithmetic of the clocks, apart from the system's counter so that tests can stand in for it.

#include "platform/platform.h"

namespace TAVO::Develop {

struct Counter {
    bool (*getFrequency)(std::int64_t& ticksPerSecond) noexcept;
    bool (*read)(std::int64_t& ticks) noexcept;
};

// The counter in nanoseconds; 0 without a positive frequency, or when reading fails four times in a row.
std::uint64_t ReadNanoseconds(const Counter& counter) noexcept;

// The number of whole units; a remainder of at least half a unit counts as one. Requires: an even unit.
constexpr std::uint64_t RoundHalfUp(std::uint64_t value, std::uint64_t unit) {
    return value / unit + (value % unit >= unit / 2 ? 1 : 0);
}

} // namespace TAVO::Develop
