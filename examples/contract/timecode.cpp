// Fractions and timecode: orders, signs, and what a position shows.

#include "contract.h"

#include <TAVO/math.h>
#include <TAVO/timecode.h>

namespace contract {

using namespace TAVO;
using namespace TAVO::TimeCode;

void Fractions() {
    using Math::CRational;
    const CRational half(1, 2), threeQuarters(3, 4), product = CRational(-2, 3) * threeQuarters;
    Is("3/4 is less than 1/2", threeQuarters < half);
    Instead("compare their values", half.fract() < threeQuarters.fract());
    Is("(-2/3) * (3/4) is 1/-2, which is not -1/2", product != CRational(-1, 2));
    Instead("make a new fraction of it",
            CRational(product.num(), static_cast<long32>(product.den())) == CRational(-1, 2));
    Is("+x is the magnitude of x", +CRational(-1, 2) == half);
}

void Timecode() {
    using T = timecode;
    const T frame(48LL, eSystemPAL), invalid(1LL, kInvalid), other(2LL, kInvalid), unassigned;
    Is("a negative record divides without its sign", static_cast<long32>(TCINFO(-48LL, eSystemPAL)) != -2);
    Instead("a timecode knows its fields", T(-48LL, eSystemPAL).Fields(eSystemPAL, 0) == -2);
    Is("slipping by a day is not possible in PAL", !T(frame).Slip(1).IsDefined());
    Instead("add a day's count",
            static_cast<long long>(frame + static_cast<long long>(TCINFO(24, 0, 0, 0, eSystemPAL))) == 48 + 103680000);
    Is("PAL(PX) does not come back from its exchange text", !static_cast<T>(SZUTC(T(0LL, eSystemPALPX))).IsAssigned());
    Is("no system has the rate 29.97", T::GetBestTCSystem(29.97) == kUnassigned);
    Instead("give the fraction", T::GetTCSystemOf(30000, 1001) == eSystemNTSC);
    Is("Trunc goes below the frame of a negative position", T(-49LL, eSystemPAL).Trunc() == -96LL);
    Instead("Align is symmetric", T(-49LL, eSystemPAL).Align() == -48LL);
    Is("-48 * 1.0 is -47", -frame * 1.0 == -47LL);
    Instead("Scale by a fraction", (-frame).Scale(1, 1, true) == -48LL);
    Is("a division by less than 0.000001 is invalid", !(frame / -2.0).IsDefined());
    Is("two invalid values are equal, and each is less", invalid == other && invalid < other && other < invalid);
    Is("an unassigned value is defined", unassigned.IsDefined());
    Instead("ask IsAssigned too", !unassigned.IsAssigned());
    Is("one second is 1199 units of NTSC", T(1.0, eSystemNTSC) == 1199LL);
    Is("a position before a skipped label shows the next frame", TCINFO(71939LL, 2).ff() == 29);
    Instead("align it first", TCINFO(T(71939LL, 2).Trunc()).ff() == 28);
    Is("UTF-8 of a fixed text drops the system", (*String::CUTF8Char(SZTC(0LL, eSystemFilm)))[9] == ':');
    Instead("wide text keeps it", SZTC(0LL, eSystemFilm).text[9] == L',');
}

} // namespace contract
