#pragma once
// A framework object as small as can be. Whoever holds one sees its interface only, as that of a component in a
// plug-in: otherwise the compiler may call its operations directly for one pointer and not for the other.

#include <TAVO/acf.h>

struct IBenchmarked : IACFUnknown {};
template <> struct acfTypeOf<IBenchmarked> {
    static constexpr _acfUID uid = {0x5A1F11C5, 0x5CC5, 0x4A27, {0x8B, 0xFB, 0x2A, 0xB5, 0x0D, 0xAB, 0x27, 0x7C}};
};

TAVO::ACF::CPACI<IBenchmarked> MakeBenchmarked();
