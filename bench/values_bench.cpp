// The texts of typed values, before they are interned: ours beside the standard library's functions that do the same,
// on wide text there and narrow text here.

#include "../source/TAVO/xmlvalues.h"

#include <benchmark/benchmark.h>
#include <cmath>
#include <random>
#include <string>
#include <vector>

namespace {

using namespace TAVO;
using namespace TAVO::XML::detail;
using Math::CRational;

constexpr std::size_t kCount = 1024;

// --- values: of all sizes --------------------------------------------------------------------------------------------

template <class Make> auto Values(Make make) {
    std::mt19937_64 random(1);
    std::vector<decltype(make(random))> values;
    for (std::size_t i = 0; i < kCount; ++i) values.push_back(make(random));
    return values;
}

std::uint64_t AnyNumber(std::mt19937_64& random) { return random() >> random() % 64; }
std::uint64_t LongNumber(std::mt19937_64& random) { return random() | 1ull << 63; }
long32 AnyInt(std::mt19937_64& random) { return static_cast<long32>(random()) >> random() % 31; }
CRational AnyRational(std::mt19937_64& random) {
    return {static_cast<long32>(random() >> 34) - (1 << 29), static_cast<long32>(random() >> 36) + 1};
}
CRational FrameRate(std::mt19937_64& random) {
    static const CRational rates[] = {{25, 1}, {30000, 1001}, {24000, 1001}, {60000, 1001}, {50, 1}, {24, 1}};
    return rates[random() % 6];
}
double AnyDouble(std::mt19937_64& random) { // of ordinary size
    return std::ldexp(static_cast<double>(random()), static_cast<int>(random() % 80) - 100);
}
double ShortDouble(std::mt19937_64& random) { return static_cast<double>(random() % 1000000) / 1000; }

// --- the standard library's side -------------------------------------------------------------------------------------

char* StandardHex(char* out, std::uint64_t value) { return std::to_chars(out, out + kValueRoom, value, 16).ptr; }
char* StandardRational(char* out, const CRational& value) {
    out = std::to_chars(out, out + 12, value.num()).ptr;
    *out++ = '/';
    return std::to_chars(out, out + 12, static_cast<long32>(value.den())).ptr;
}
char* StandardDouble(char* out, double value) {
    out = StandardHex(out, std::bit_cast<std::uint64_t>(value));
    *out++ = '(';
    out = std::to_chars(out, out + 24, value, std::chars_format::general, 4).ptr;
    *out++ = ')';
    return out;
}

struct Chars {
    const char* at;
    const char* end;
};
bool StandardScanHex(Chars text, std::uint64_t& value) {
    return std::from_chars(text.at, text.end, value, 16).ec == std::errc();
}
bool StandardScanInt(Chars text, long32& value) { return std::from_chars(text.at, text.end, value).ec == std::errc(); }
bool StandardScanRational(Chars text, CRational& value) {
    long32 numerator, denominator;
    const auto first = std::from_chars(text.at, text.end, numerator);
    if (first.ec != std::errc() || first.ptr == text.end || *first.ptr != '/') return false;
    if (std::from_chars(first.ptr + 1, text.end, denominator).ec != std::errc()) return false;
    value.assign(numerator, denominator);
    return true;
}
bool StandardScanBits(Chars text, double& value) {
    std::uint64_t bits;
    if (!StandardScanHex(text, bits)) return false;
    value = std::bit_cast<double>(bits);
    return true;
}
bool StandardScanDouble(Chars text, double& value) {
    return std::from_chars(text.at, text.end, value).ec == std::errc();
}

// --- ours, where the name differs ------------------------------------------------------------------------------------

bool OurScanHex(Text text, std::uint64_t& value) { return ScanHex(text, value); }
bool OurScanInt(Text text, long32& value) {
    std::uint64_t number;
    if (!ScanDecimal(text, number)) return false;
    value = static_cast<long32>(number);
    return true;
}
bool OurScanDouble(Text text, double& value) { return ScanDecimalDouble(text, nullptr, value); }

// --- both sides ------------------------------------------------------------------------------------------------------

template <class Make, class Put> void Write(benchmark::State& state, Make make, Put put) {
    const auto values = Values(make);
    char out[kValueRoom];
    for (auto _ : state) {
        for (const auto& value : values) {
            benchmark::DoNotOptimize(put(out, value));
            benchmark::ClobberMemory();
        }
    }
    state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations() * kCount));
}

// Texts one behind the other, each with a terminator, as pool entries have.
template <class View, class Unit, class Make, class Put, class Scan>
void Read(benchmark::State& state, Make make, Put put, Scan scan) {
    using Value = decltype(make(std::declval<std::mt19937_64&>()));
    std::vector<std::vector<Unit>> texts;
    for (const auto& value : Values(make)) {
        char out[kValueRoom];
        std::vector<Unit> text(out, put(out, value));
        text.push_back(0);
        texts.push_back(text);
    }
    std::vector<View> views;
    for (const auto& text : texts) views.push_back({text.data(), text.data() + text.size() - 1});
    for (auto _ : state) {
        for (const View& view : views) {
            Value value;
            if (!scan(view, value)) return state.SkipWithError("a text was not read");
            benchmark::DoNotOptimize(value);
        }
    }
    state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations() * kCount));
}

char* PutShortest(char* out, double value) { return std::to_chars(out, out + kValueRoom, value).ptr; }

#define WRITE(name, make, ours, standard)                                                                              \
    void OurPut_##name(benchmark::State& state) {                                                                      \
        Write(state, make, [](auto... a) { return ours(a...); });                                                      \
    }                                                                                                                  \
    BENCHMARK(OurPut_##name)->Name("values/write/" #name "/TAVO");                                                     \
    void StandardPut_##name(benchmark::State& state) {                                                                 \
        Write(state, make, [](auto... a) { return standard(a...); });                                                  \
    }                                                                                                                  \
    BENCHMARK(StandardPut_##name)->Name("values/write/" #name "/to_chars")
#define READ(name, make, put, ours, standard)                                                                          \
    void Ours_##name(benchmark::State& state) {                                                                        \
        Read<Text, wchar_t>(state, make, put, [](auto text, auto& value) { return ours(text, value); });               \
    }                                                                                                                  \
    BENCHMARK(Ours_##name)->Name("values/read/" #name "/TAVO");                                                        \
    void Standard_##name(benchmark::State& state) {                                                                    \
        Read<Chars, char>(state, make, put, [](auto text, auto& value) { return standard(text, value); });             \
    }                                                                                                                  \
    BENCHMARK(Standard_##name)->Name("values/read/" #name "/from_chars")

WRITE(hex, AnyNumber, PutHex, StandardHex);
WRITE(hex16, LongNumber, PutHex, StandardHex);
WRITE(rational, AnyRational, PutRational, StandardRational);
WRITE(framerate, FrameRate, PutRational, StandardRational);
WRITE(double, AnyDouble, PutDouble, StandardDouble);
WRITE(shortdouble, ShortDouble, PutDouble, StandardDouble);

READ(hex, AnyNumber, PutHex, OurScanHex, StandardScanHex);
READ(hex16, LongNumber, PutHex, OurScanHex, StandardScanHex);
READ(int, AnyInt, PutDecimal, OurScanInt, StandardScanInt);
READ(rational, AnyRational, PutRational, ScanRational, StandardScanRational);
READ(framerate, FrameRate, PutRational, ScanRational, StandardScanRational);
READ(edouble, AnyDouble, PutDouble, ScanDoubleBits, StandardScanBits);
READ(decimal, AnyDouble, PutShortest, OurScanDouble, StandardScanDouble);
READ(shortdecimal, ShortDouble, PutShortest, OurScanDouble, StandardScanDouble);

} // namespace
