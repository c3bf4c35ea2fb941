#pragma once
// Small functions over 16-bit text, for the library's sources: C libraries count other widths on other systems.
// Unit is wchar_t or unsigned short.

#include "simd.h"

#include <cstring>

namespace TAVO::String::detail {

// The one case mapping of the library.
// Intended (case-fold): A to Z and nothing else, whatever the locale or the script. Stored hashes rest on it.
template <class Unit> constexpr Unit FoldUnit(Unit c) {
    return static_cast<Unit>(c + (static_cast<unsigned>(c) - 'A' < 26u ? 'a' - 'A' : 0));
}
template <class Unit> constexpr Unit UpperUnit(Unit c) {
    return static_cast<Unit>(c - (static_cast<unsigned>(c) - 'a' < 26u ? 'a' - 'A' : 0));
}

// The units before the terminator. Requires: a non-null text.
template <class Unit> std::size_t WideLength(const Unit* text) { return Simd::ZeroUnit(text, SIZE_MAX); }

// The same, at most n; nothing is read at or behind index n.
template <class Unit> std::size_t WideLengthN(const Unit* text, std::size_t n) { return Simd::ZeroUnit(text, n); }

template <class Unit> void WideCopy(Unit* target, const Unit* source, std::size_t count) {
    if (count) std::memcpy(target, source, count * sizeof(Unit));
}

template <class Unit> bool WideEqual(const Unit* a, const Unit* b, std::size_t count) {
    return !count || std::memcmp(a, b, count * sizeof(Unit)) == 0;
}

// -1, 0 or 1 by unit values; both texts terminated.
template <class Unit> int WideCompare(const Unit* a, const Unit* b) {
    while (*a && *a == *b) ++a, ++b;
    return *a < *b ? -1 : *a > *b;
}

// The same over at most n units; a terminator ends both.
template <class Unit> int WideCompareN(const Unit* a, const Unit* b, std::size_t n) {
    std::size_t i = 0;
    while (i < n && a[i] && a[i] == b[i]) ++i;
    if (i == n) return 0;
    return a[i] < b[i] ? -1 : a[i] > b[i];
}

// Whether the first `count` units are the same letters in any case.
template <class Unit> bool WideEqualFolded(const Unit* a, const Unit* b, std::size_t count) {
    for (std::size_t i = 0; i < count; ++i)
        if (FoldUnit(a[i]) != FoldUnit(b[i])) return false;
    return true;
}

} // namespace TAVO::String::detail
