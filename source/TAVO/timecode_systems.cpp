// What is known about timecode systems, and the search for the system of a rate.

#include "timecode_systems.h"

#include <algorithm>

namespace TAVO::TimeCode {

using namespace detail;

namespace {

// Slowest first.
constexpr ulong32 kByRate[] = {
    eSystemFilmPX, eSystemPALPX,  eSystemNTSCPX, eSystemHDFilm, eSystemHDFilmDF, eSystemFilm,     eSystemPAL,
    eSystemNTSC,   eSystemNTSCDF, eSystemHD30,   eSystemHD50,   eSystemHDNTSC,   eSystemHDNTSCDF, eSystemHD60,
};
static_assert(std::size(kByRate) == kSystemCount, "every system has its place");

} // namespace

ulong32 timecode::NormalizeSystem(ulong32 sys) noexcept { return Normalize(sys); }

// Intended (timecode-pal-px): "PAL(PX)" is no drop-frame system, but its exchange text has always ended in "/D", and
// readers expect it.
bool timecode::IsDFSystem(ulong32 sys) noexcept {
    return sys < kSystemCount && (kSystems[sys].IsDrop() || sys == eSystemPALPX);
}

ulong32 timecode::GetDFSystem(ulong32 sys) noexcept {
    return sys < kSystemCount ? kSystems[sys].dropSibling : kUnassigned;
}

ulong32 timecode::GetNDFSystem(ulong32 sys) noexcept {
    const auto* row =
        std::find_if(std::begin(kSystems), std::end(kSystems), [sys](const System& s) { return s.dropSibling == sys; });
    return IsFlagged(sys) || row == std::end(kSystems) ? kUnassigned : static_cast<ulong32>(row - kSystems);
}

ulong32 timecode::GetFrameBU(ulong32 sys) noexcept { return RowOf(sys).frame; }
ulong32 timecode::GetFieldBU(ulong32 sys) noexcept { return RowOf(sys).Field(); }
double timecode::BULen(ulong32 sys) noexcept { return RowOf(sys).UnitLength(); }
double timecode::FramerateOf(ulong32 sys) noexcept { return RowOf(sys).Rate(); }

const wchar_t* timecode::GetSystemString(ulong32 sys) noexcept {
    return CodeOf(sys) < kSystemCount ? kSystems[CodeOf(sys)].name : L"";
}

bool timecode::GetFrameRateScaleOf(ulong32 sys, ulong32* numerator, ulong32* denominator) noexcept {
    if (numerator) *numerator = RowOf(sys).numerator;
    if (denominator) *denominator = RowOf(sys).denominator;
    return true;
}

ulong32 timecode::GetFramerateTCList(ulong32* list, ulong32 capacity) noexcept {
    if (!list) return 0;
    const ulong32 count = std::min(capacity, kSystemCount);
    std::copy_n(kByRate, count, list);
    return count;
}

// Intended (timecode-rate): a textbook would answer the nearest rate. Here the nearest candidate must be a drop-frame
// system and its non-drop sibling is the answer; texts with other rates are refused by readers, and would be accepted
// after a change.
ulong32 timecode::GetBestTCSystem(double rate) noexcept {
    if (rate >= kSystems[eSystemHD60].Rate()) return eSystemHD60;
    if (rate <= kSystems[eSystemPALPX].Rate()) return eSystemFilmPX;
    if (!(rate > 0)) return kUnassigned; // not a number
    const auto* upper = std::find_if(std::begin(kByRate), std::end(kByRate),
                                     [rate](ulong32 code) { return kSystems[code].Rate() >= rate; });
    const double midpoint = (kSystems[upper[-1]].Rate() + kSystems[upper[0]].Rate()) / 2;
    return GetNDFSystem(rate >= midpoint ? upper[0] : upper[-1]);
}

ulong32 timecode::GetTCSystemOf(ulong32 num, ulong32 den) noexcept {
    if (den == 0) return kUnassigned;
    // The last system is left to the search by rate, which gives the same answer.
    const auto* last = std::end(kSystems) - 1;
    const auto* row = std::find_if(std::begin(kSystems), last,
                                   [=](const System& s) { return s.numerator == num && s.denominator == den; });
    if (row != last) return static_cast<ulong32>(row - kSystems);

    const ulong32 sys = GetBestTCSystem(static_cast<double>(num) / den);
    if (IsFlagged(sys)) return kUnassigned;
    const System& s = kSystems[sys];
    const bool isMultiple =
        num % s.numerator == 0 && den % s.denominator == 0 && num / s.numerator == den / s.denominator;
    return isMultiple ? sys : static_cast<ulong32>(kUnassigned);
}

} // namespace TAVO::TimeCode
