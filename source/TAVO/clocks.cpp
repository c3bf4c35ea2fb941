// Clocks and facts about the machine.

#include "clocks.h"

#include <bit>
#include <TAVO/develop.h>

namespace TAVO::Develop {

namespace {

constexpr std::uint64_t kNanosecondsPerSecond = 1000000000;
constexpr int kReadAttempts = 4;

constexpr Counter kSystemCounter{Platform::GetCounterFrequency, Platform::ReadCounter};

} // namespace

std::uint64_t ReadNanoseconds(const Counter& counter) noexcept {
    std::int64_t frequency = 0;
    if (!counter.getFrequency(frequency) || frequency <= 0) return 0; // asked anew next time
    std::int64_t ticks = 0;
    for (int attempt = 1; !counter.read(ticks); ++attempt)
        if (attempt == kReadAttempts) return 0;
    // Whole seconds and the rest apart, in integers: a double loses nanoseconds after 104 days. Exact up to 18 GHz.
    const auto whole = static_cast<std::uint64_t>(ticks) / static_cast<std::uint64_t>(frequency);
    const auto rest = static_cast<std::uint64_t>(ticks) % static_cast<std::uint64_t>(frequency);
    return whole * kNanosecondsPerSecond + rest * kNanosecondsPerSecond / static_cast<std::uint64_t>(frequency);
}

unsigned long long _now_nano() { return ReadNanoseconds(kSystemCounter); }
unsigned long long _now_micro() { return RoundHalfUp(_now_nano(), 1000); }
unsigned long long _now_milli() { return RoundHalfUp(_now_nano(), 1000000); }
double _getTicks() { return static_cast<double>(Platform::GetProcessMilliseconds()) / 1000.0; }

bool _isBigEndian() { return std::endian::native == std::endian::big; }
bool _isWChar32() { return false; }
unsigned long long bitcount64(unsigned long long value) {
    return static_cast<unsigned long long>(std::popcount(value));
}

} // namespace TAVO::Develop
