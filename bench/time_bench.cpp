// Fractions and timecode against other media libraries, against formatted printing and scanning, and against integer
// code written by hand for one system.

#include <array>
#include <benchmark/benchmark.h>
#include <boost/rational.hpp>
#include <cstdio>
#include <random>
#include <TAVO/config.h>
#include <TAVO/math.h>
#include <TAVO/timecode.h>
#include <vector>

#ifdef TAVO_PEER_LIBAVUTIL
extern "C" {
#include <libavutil/rational.h>
#include <libavutil/timecode.h>
}
#endif
#ifdef TAVO_PEER_GSTREAMER_VIDEO_1_0
#include <gst/video/gstvideotimecode.h>
#endif
#ifdef TAVO_PEER_LTC
#include <ltc.h>
#endif

namespace {

using namespace TAVO;
using namespace TAVO::TimeCode;
using TAVO::Math::CRational;

constexpr std::size_t kItems = 512; // a power of two; few enough that records and labels stay in the first cache

// Every iteration takes the next item.
template <class T, class Body> void ForEach(benchmark::State& state, const std::vector<T>& items, Body body) {
    std::size_t i = 0;
    for (auto _ : state) {
        auto result = body(items[i++ % kItems]);
        benchmark::DoNotOptimize(result);
    }
}

// Random frames of a day, in base units.
std::vector<long long> Counts(ulong32 sys) {
    std::mt19937 random(1);
    std::vector<long long> counts;
    const long long frame = timecode::GetFrameBU(sys);
    while (counts.size() < kItems) counts.push_back(random() % (103500000 / frame) * frame);
    return counts;
}
template <class T> std::vector<T> Each(ulong32 sys) {
    std::vector<T> out;
    for (long long count : Counts(sys)) out.emplace_back(count, sys);
    return out;
}
std::vector<int> FrameNumbers(ulong32 sys) {
    std::vector<int> out;
    for (long long count : Counts(sys)) out.push_back(static_cast<int>(count / timecode::GetFrameBU(sys)));
    return out;
}
ulong32 System(const benchmark::State& state) { return static_cast<ulong32>(state.range(0)); }

// --- labels ----------------------------------------------------------------------------------------------------------

struct HandLabel {
    ulong32 ff, ss, mm, hh;
    long long dd;
};

// What a host would write for 25 frames per second, and call as it calls the library. _Inline below has it compiled
// into its loop, which no library call can be.
inline HandLabel HandSplit25(long long count) {
    const bool negative = count < 0;
    unsigned long long frames = static_cast<unsigned long long>(negative ? -count : count) / 48;
    const long long days = static_cast<long long>(frames / 2160000);
    auto rest = static_cast<ulong32>(frames % 2160000);
    HandLabel label;
    label.ff = rest % 25;
    rest /= 25;
    label.ss = rest % 60;
    rest /= 60;
    label.mm = rest % 60;
    label.hh = rest / 60;
    label.dd = negative ? -1 - days : days;
    return label;
}
inline long long HandJoin25(const HandLabel& label) {
    const long long days = label.dd < 0 ? -1 - label.dd : label.dd;
    const long long frames = (((days * 24 + label.hh) * 60 + label.mm) * 60 + label.ss) * 25 + label.ff;
    return label.dd < 0 ? -frames * 48 : frames * 48;
}

// The usual way for 29.97 drop frame: put the skipped numbers back in, then split by 30.
inline HandLabel HandSplitDrop(long long count) {
    const bool negative = count < 0;
    unsigned long long frames = static_cast<unsigned long long>(negative ? -count : count) / 40;
    const long long days = static_cast<long long>(frames / 2589408);
    auto rest = static_cast<ulong32>(frames % 2589408);
    const ulong32 blocks = rest / 17982, inBlock = rest % 17982;
    rest += 18 * blocks + (inBlock > 1 ? 2 * ((inBlock - 2) / 1798) : 0);
    HandLabel label;
    label.ff = rest % 30;
    rest /= 30;
    label.ss = rest % 60;
    rest /= 60;
    label.mm = rest % 60;
    label.hh = rest / 60;
    label.dd = negative ? -1 - days : days;
    return label;
}
inline long long HandJoinDrop(const HandLabel& label) {
    const long long days = label.dd < 0 ? -1 - label.dd : label.dd;
    const long long minutes = label.hh * 60 + label.mm;
    const long long frames = days * 2589408 + minutes * 1800 + label.ss * 30 + label.ff - 2 * (minutes - minutes / 10);
    return label.dd < 0 ? -frames * 40 : frames * 40;
}

void BreakDown_TAVO(benchmark::State& state) {
    const ulong32 sys = System(state);
    ForEach(state, Counts(sys), [sys](long long count) { return TCINFO(count, sys); });
}
TAVO_NOINLINE HandLabel CallSplit25(long long count) { return HandSplit25(count); }
TAVO_NOINLINE HandLabel CallSplitDrop(long long count) { return HandSplitDrop(count); }
TAVO_NOINLINE long long CallJoin25(const HandLabel& label) { return HandJoin25(label); }
TAVO_NOINLINE long long CallJoinDrop(const HandLabel& label) { return HandJoinDrop(label); }

void BreakDown_Hand(benchmark::State& state) {
    if (System(state) == eSystemPAL) return ForEach(state, Counts(eSystemPAL), CallSplit25);
    ForEach(state, Counts(eSystemNTSCDF), CallSplitDrop);
}
void BreakDown_Inline(benchmark::State& state) {
    if (System(state) == eSystemPAL)
        return ForEach(state, Counts(eSystemPAL), [](long long count) { return HandSplit25(count); });
    ForEach(state, Counts(eSystemNTSCDF), [](long long count) { return HandSplitDrop(count); });
}
std::vector<HandLabel> Labels(ulong32 sys) {
    std::vector<HandLabel> labels;
    for (long long count : Counts(sys)) labels.push_back(sys == eSystemPAL ? HandSplit25(count) : HandSplitDrop(count));
    return labels;
}
void Compose_TAVO(benchmark::State& state) {
    ForEach(state, Each<TCINFO>(System(state)), [](const TCINFO& record) { return static_cast<long long>(record); });
}
void Compose_Hand(benchmark::State& state) {
    if (System(state) == eSystemPAL) return ForEach(state, Labels(eSystemPAL), CallJoin25);
    ForEach(state, Labels(eSystemNTSCDF), CallJoinDrop);
}
void Compose_Inline(benchmark::State& state) {
    if (System(state) == eSystemPAL)
        return ForEach(state, Labels(eSystemPAL), [](const HandLabel& label) { return HandJoin25(label); });
    ForEach(state, Labels(eSystemNTSCDF), [](const HandLabel& label) { return HandJoinDrop(label); });
}
BENCHMARK(BreakDown_TAVO)->Arg(eSystemPAL)->Arg(eSystemNTSCDF);
BENCHMARK(BreakDown_Hand)->Arg(eSystemPAL)->Arg(eSystemNTSCDF);
BENCHMARK(BreakDown_Inline)->Arg(eSystemPAL)->Arg(eSystemNTSCDF);
BENCHMARK(Compose_TAVO)->Arg(eSystemPAL)->Arg(eSystemNTSCDF);
BENCHMARK(Compose_Hand)->Arg(eSystemPAL)->Arg(eSystemNTSCDF);
BENCHMARK(Compose_Inline)->Arg(eSystemPAL)->Arg(eSystemNTSCDF);

// --- text ------------------------------------------------------------------------------------------------------------

struct NarrowText {
    char text[24];
};

void FixedOut_TAVO(benchmark::State& state) {
    ForEach(state, Each<TCINFO>(eSystemNTSCDF), [](const TCINFO& record) { return SZTC(record); });
}
void FixedOut_Snprintf(benchmark::State& state) {
    ForEach(state, Each<TCINFO>(eSystemNTSCDF), [](const TCINFO& r) {
        NarrowText out;
        std::snprintf(out.text, sizeof(out.text), "%c%02u.%02u:%02u.%02u", r.dd() < 0 ? '-' : ' ', r.hh(), r.mm(),
                      r.ss(), r.ff());
        return out;
    });
}
void FixedIn_TAVO(benchmark::State& state) {
    ForEach(state, Each<SZTC>(eSystemNTSCDF), [](const SZTC& text) { return TCINFO(text); });
}
void FixedIn_Sscanf(benchmark::State& state) {
    std::vector<NarrowText> texts;
    for (const SZTC& text : Each<SZTC>(eSystemNTSCDF)) {
        texts.emplace_back();
        std::copy_n(text.text, 13, texts.back().text);
    }
    ForEach(state, texts, [](const NarrowText& text) {
        std::array<unsigned, 4> f{};
        std::sscanf(text.text + 1, "%2u.%2u:%2u.%2u", &f[0], &f[1], &f[2], &f[3]);
        return f;
    });
}
BENCHMARK(FixedOut_TAVO);
BENCHMARK(FixedOut_Snprintf);
BENCHMARK(FixedIn_TAVO);
BENCHMARK(FixedIn_Sscanf);

void ExchangeOut_TAVO(benchmark::State& state) {
    ForEach(state, Each<timecode>(eSystemNTSCDF), [](const timecode& value) { return SZUTC(value); });
}
void ExchangeIn_TAVO(benchmark::State& state) {
    std::vector<SZUTC> texts;
    for (const timecode& value : Each<timecode>(eSystemNTSCDF)) texts.emplace_back(value);
    ForEach(state, texts, [](const SZUTC& text) { return timecode(text); });
}
void ExchangeIn_Sscanf(benchmark::State& state) {
    std::vector<std::array<char, 48>> texts;
    for (const timecode& value : Each<timecode>(eSystemNTSCDF)) {
        texts.emplace_back();
        std::copy_n(SZUTC(value).text, 48, texts.back().begin());
    }
    ForEach(state, texts, [](const std::array<char, 48>& text) {
        std::array<unsigned, 6> f{};
        char mark = 0;
        std::sscanf(text.data(), "%u:%u:%u:%u%c{%u/%u}Hz", &f[0], &f[1], &f[2], &f[3], &mark, &f[4], &f[5]);
        return f;
    });
}
BENCHMARK(ExchangeOut_TAVO);
BENCHMARK(ExchangeIn_TAVO);
BENCHMARK(ExchangeIn_Sscanf);

// --- fractions -------------------------------------------------------------------------------------------------------

struct IntegerPair {
    int n, d;
};

// Neighbours are added and multiplied; sums and products of two stay inside 30 bits.
std::vector<IntegerPair> Fractions() {
    std::mt19937 random(3);
    std::vector<IntegerPair> out;
    while (out.size() < kItems) {
        const CRational r(static_cast<long32>(1 + random() % 16000), static_cast<long32>(1 + random() % 16000));
        out.push_back({r.num(), static_cast<int>(r.den())});
    }
    return out;
}
template <class T, class Make, class Operation>
void ForEachPair(benchmark::State& state, Make make, Operation operation) {
    std::vector<T> items;
    for (const IntegerPair& p : Fractions()) items.push_back(make(p));
    std::size_t i = 0;
    for (auto _ : state) {
        auto result = operation(items[i % kItems], items[(i + 1) % kItems]);
        benchmark::DoNotOptimize(result);
        ++i;
    }
}
constexpr auto kPlus = [](const auto& a, const auto& b) { return a + b; };
constexpr auto kTimes = [](const auto& a, const auto& b) { return a * b; };
constexpr auto kOurs = [](const IntegerPair& p) { return CRational(p.n, p.d); };
constexpr auto kBoosts = [](const IntegerPair& p) { return boost::rational<int>(p.n, p.d); };

void Add_TAVO(benchmark::State& state) { ForEachPair<CRational>(state, kOurs, kPlus); }
void Add_Boost(benchmark::State& state) { ForEachPair<boost::rational<int>>(state, kBoosts, kPlus); }
void Multiply_TAVO(benchmark::State& state) { ForEachPair<CRational>(state, kOurs, kTimes); }
void Multiply_Boost(benchmark::State& state) { ForEachPair<boost::rational<int>>(state, kBoosts, kTimes); }
BENCHMARK(Add_TAVO);
BENCHMARK(Add_Boost);
BENCHMARK(Multiply_TAVO);
BENCHMARK(Multiply_Boost);

std::vector<double> Doubles() {
    std::vector<double> out;
    for (const IntegerPair& p : Fractions()) out.push_back(static_cast<double>(p.n) / p.d);
    return out;
}
void FromDouble_TAVO(benchmark::State& state) {
    ForEach(state, Doubles(), [](double x) {
        CRational r;
        r.fassign(x, 30000);
        return r;
    });
}
BENCHMARK(FromDouble_TAVO);

// --- peers -----------------------------------------------------------------------------------------------------------

#ifdef TAVO_PEER_LIBAVUTIL
AVTimecode AvTimecode() {
    AVTimecode tc;
    av_timecode_init(&tc, {30000, 1001}, AV_TIMECODE_FLAG_DROPFRAME, 0, nullptr);
    return tc;
}
void BreakDown_Libavutil(benchmark::State& state) {
    const AVTimecode tc = AvTimecode();
    ForEach(state, FrameNumbers(eSystemNTSCDF), [&](int n) { return av_timecode_get_smpte_from_framenum(&tc, n); });
}
void FixedOut_Libavutil(benchmark::State& state) {
    const AVTimecode tc = AvTimecode();
    ForEach(state, FrameNumbers(eSystemNTSCDF), [&](int n) {
        NarrowText out;
        av_timecode_make_string(&tc, out.text, n);
        return out;
    });
}
constexpr auto kLibavutils = [](const IntegerPair& p) { return AVRational{p.n, p.d}; };
void Add_Libavutil(benchmark::State& state) { ForEachPair<AVRational>(state, kLibavutils, av_add_q); }
void Multiply_Libavutil(benchmark::State& state) { ForEachPair<AVRational>(state, kLibavutils, av_mul_q); }
void FromDouble_Libavutil(benchmark::State& state) {
    ForEach(state, Doubles(), [](double x) { return av_d2q(x, 30000); });
}
BENCHMARK(BreakDown_Libavutil);
BENCHMARK(FixedOut_Libavutil);
BENCHMARK(Add_Libavutil);
BENCHMARK(Multiply_Libavutil);
BENCHMARK(FromDouble_Libavutil);
#endif

#ifdef TAVO_PEER_GSTREAMER_VIDEO_1_0
void Compose_Gstreamer(benchmark::State& state) {
    std::vector<GstVideoTimeCode> items;
    for (const TCINFO& r : Each<TCINFO>(eSystemNTSCDF)) {
        items.emplace_back();
        gst_video_time_code_init(&items.back(), 30000, 1001, nullptr, GST_VIDEO_TIME_CODE_FLAGS_DROP_FRAME, r.hh(),
                                 r.mm(), r.ss(), r.ff(), 0);
    }
    ForEach(state, items, [](const GstVideoTimeCode& tc) { return gst_video_time_code_frames_since_daily_jam(&tc); });
}
BENCHMARK(Compose_Gstreamer);
#endif

#ifdef TAVO_PEER_LTC
// Only the fields of a label into its bits: there is no count behind them.
void Fields_Libltc(benchmark::State& state) {
    ForEach(state, Each<TCINFO>(eSystemNTSCDF), [](const TCINFO& r) {
        SMPTETimecode label{};
        label.hours = static_cast<unsigned char>(r.hh());
        label.mins = static_cast<unsigned char>(r.mm());
        label.secs = static_cast<unsigned char>(r.ss());
        label.frame = static_cast<unsigned char>(r.ff());
        LTCFrame frame;
        ltc_time_to_frame(&frame, &label, LTC_TV_525_60, 0);
        return frame;
    });
}
BENCHMARK(Fields_Libltc);
#endif

} // namespace
