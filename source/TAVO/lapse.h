#pragma once
// The stopwatch's word, apart from the clock so that tests can bring their own.

#include <cstdint>

namespace TAVO::Develop::lapse {

// Bit 0: runs. Above it 63 bits of nanoseconds: the start of a running watch, the time kept of a stopped one. Times
// wrap there, after 292 years.
using Word = std::uint64_t;

constexpr bool Runs(Word word) { return word & 1; }
constexpr Word StartedAt(std::uint64_t now) { return now << 1 | 1; }

// The time since the start, or the time kept.
constexpr std::uint64_t Elapsed(Word word, std::uint64_t now) {
    return Runs(word) ? ((now << 1) - (word - 1)) >> 1 : word >> 1;
}
constexpr Word StoppedAt(Word word, std::uint64_t now) { return Elapsed(word, now) << 1; }

} // namespace TAVO::Develop::lapse
