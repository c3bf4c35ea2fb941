// Fraction arithmetic against 128-bit integers.
// Input: records of four 32-bit integers, two fractions each; their bits are taken as a double as well.

#include "rational_reference.h"
#include "require.h"

#include <cmath>
#include <cstdint>
#include <cstring>

using TAVO::long32;
using TAVO::Math::CRational;

namespace {

void CheckPair(const CRational& a, const CRational& b) { Require(reference::AgreesOn(a, b)); }

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    CRational last;
    for (; size >= 16; data += 16, size -= 16) {
        long32 n[4];
        double x;
        std::memcpy(n, data, sizeof(n));
        std::memcpy(&x, data + 8, sizeof(x));
        const CRational a(n[0], n[1]), b(n[2], n[3]);
        Require(reference::Observe([&] { return CRational(n[0], n[1]); }) == reference::Normalized(n[0], n[1]));
        CheckPair(a, b);
        CheckPair(last, b);
        last = a * b;

        CRational near;
        const bool inRange = near.fassign(x, n[0]);
        Require(inRange == (std::fabs(x) <= 1073741823.0));
        if (inRange && n[0] >= 1) Require(near.den() >= 1 && near.den() <= static_cast<TAVO::ulong32>(n[0]));
        CheckPair(near, a);
        CheckPair(last, near);
    }
    return 0;
}
