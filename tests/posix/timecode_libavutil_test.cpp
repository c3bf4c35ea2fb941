// Drop-frame labels of the 30000/1001 and 60000/1001 systems against an unrelated library, where it is installed.

#ifdef TAVO_TEST_LIBAVUTIL

#include <gtest/gtest.h>
#include <TAVO/timecode.h>

extern "C" {
#include <libavutil/timecode.h>
}

using namespace TAVO::TimeCode;

TEST(TimecodePeer, LibavutilShowsTheSameDropFrameLabels) {
    for (int framesPerSecond : {30, 60}) {
        const TAVO::ulong32 sys = framesPerSecond == 30 ? eSystemNTSCDF : eSystemHDNTSCDF;
        const long long frame = timecode::GetFrameBU(sys);
        for (int n = 0; n < 2589408 * (framesPerSecond / 30); ++n) {
            const int shown = av_timecode_adjust_ntsc_framenum2(n, framesPerSecond);
            const TCINFO label(n * frame, sys);
            const auto seconds = (label.hh() * 60 + label.mm()) * 60 + label.ss();
            ASSERT_EQ(static_cast<int>(seconds) * framesPerSecond + static_cast<int>(label.ff()), shown) << n;
        }
    }
}

#endif
