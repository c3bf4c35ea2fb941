#pragma once
// The fourteen timecode systems: one row of facts each, and what follows from them.

#include <TAVO/timecode.h>

#include <iterator>

namespace TAVO::TimeCode::detail {

constexpr ulong32 kSecond = 1200; // base units, in every system

// Which labels a system skips: twice `unit` base units at the start of every minute, except of the first in a block of
// `block` minutes. Labels are counted in frames of `unit` base units, also where frames are shorter.
struct DropRule {
    ulong32 unit;
    ulong32 block;
};
constexpr DropRule kKeepsAll{0, 1};
constexpr DropRule kDropVideo{40, 10};
constexpr DropRule kDropFilm{50, 4};

struct System {
    const wchar_t* name;
    ulong32 numerator, denominator; // frames per second of real time
    ulong32 frame;                  // base units
    DropRule drop;
    wchar_t separators[4]; // after hours, minutes and seconds in the fixed text form
    ulong32 dropSibling;   // codes, or kUnassigned where there is none
    ulong32 doubleRate;

    constexpr bool IsDrop() const { return drop.unit != 0; }
    constexpr ulong32 Field() const { return frame / 2; }
    constexpr ulong32 MaxFields() const { return 2147483647 / Field(); }
    // Frame numbers of a second; of an even second where frames straddle the seconds.
    constexpr ulong32 FrameNumbers() const { return (kSecond + frame - 1) / frame; }
    // Base units of the last frame of an even second that lie in the odd one.
    constexpr ulong32 Straddle() const { return FrameNumbers() * frame - kSecond; }

    constexpr ulong32 Dropped() const { return 2 * drop.unit; } // base units of the labels skipped at once
    constexpr ulong32 Minute() const { return 60 * kSecond - Dropped(); }
    constexpr ulong32 Hour() const { return 60 * Minute() + 60 / drop.block * Dropped(); }
    constexpr ulong32 Day() const { return 24 * Hour(); }

    // Intended (timecode-seconds): a double, and this one, is the unit of all conversions to and from seconds; an exact
    // 1001/1000 would differ from stored results in halves of a base unit.
    constexpr double UnitLength() const { return denominator == 1001 ? 1.001 / 1200.0 : 1.0 / 1200.0; }
    constexpr double Rate() const { return static_cast<double>(numerator) / denominator; }
};

constexpr System kSystems[] = {
    {L"PAL", 25, 1, 48, kKeepsAll, L":::", kUnassigned, eSystemHD50},
    {L"NTSC", 30000, 1001, 40, kKeepsAll, L"::.", eSystemNTSCDF, eSystemHDNTSC},
    {L"NTSC(DF)", 30000, 1001, 40, kDropVideo, L".:.", kUnassigned, eSystemHDNTSCDF},
    {L"FILM", 24, 1, 50, kKeepsAll, L"::,", kUnassigned, kUnassigned},
    {L"HDFILM", 24000, 1001, 50, kKeepsAll, L":.,", eSystemHDFilmDF, kUnassigned},
    {L"HDFILM(DF)", 24000, 1001, 50, kDropFilm, L"..,", kUnassigned, kUnassigned},
    {L"HD50", 50, 1, 24, kKeepsAll, L":.:", kUnassigned, kUnassigned},
    {L"HDNTSC", 60000, 1001, 20, kKeepsAll, L":..", eSystemHDNTSCDF, kUnassigned},
    {L"HDNTSC(DF)", 60000, 1001, 20, kDropVideo, L"...", kUnassigned, kUnassigned},
    {L"PAL(PX)", 25, 2, 96, kKeepsAll, L".,:", kUnassigned, kUnassigned},
    {L"NTSC(PX)", 15, 1, 80, kKeepsAll, L":,;", kUnassigned, kUnassigned},
    {L"FILM(PX)", 12, 1, 100, kKeepsAll, L":,,", kUnassigned, kUnassigned},
    {L"HD30", 30, 1, 40, kKeepsAll, L"::;", kUnassigned, kUnassigned},
    {L"HD60", 60, 1, 20, kKeepsAll, L":.;", kUnassigned, kUnassigned},
};
constexpr ulong32 kSystemCount = std::size(kSystems);
static_assert(kSystemCount == 14, "codes 0 to 13");
static_assert(kSystems[eSystemPAL].Day() == 103680000 && kSystems[eSystemNTSCDF].Day() == 103576320 &&
                  kSystems[eSystemHDNTSCDF].Day() == 103576320 && kSystems[eSystemHDFilmDF].Day() == 103572000,
              "days of the contract");

constexpr ulong32 CodeOf(ulong32 sys) noexcept { return sys & 15; }
constexpr bool IsFlagged(ulong32 sys) noexcept { return sys >= 16; }

constexpr ulong32 Normalize(ulong32 sys) noexcept {
    return CodeOf(sys) < kSystemCount ? sys : (sys & ~15u) | kUnassigned;
}

// The row of a system word, flagged or not; code 0's for a code that is none.
constexpr const System& RowOf(ulong32 sys) noexcept { return kSystems[CodeOf(Normalize(sys))]; }

} // namespace TAVO::TimeCode::detail
