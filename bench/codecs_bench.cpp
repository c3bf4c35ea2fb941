// Bytes as text beside Abseil's base64, by size. Bytes per second are those of the bytes, not of the text.
// encode: the text alone, into a buffer that is there. intern: the whole encoder, with the pool; `new` texts each time.
// decode: the whole decoder, with its memory; Abseil keeps the memory of its strings.

#include <benchmark/benchmark.h>
#include <random>
#include <string>
#include <TAVO/string.h>
#include <vector>
#if defined(TAVO_PEER_ABSL_STRINGS)
#include <absl/strings/escaping.h>
#endif

namespace {

using namespace TAVO::String;
using TAVO::Buffers::CPPlainMemory;

constexpr std::size_t kSizes[] = {64, 1000, 100000, 1000000}; // no multiples of 3, which 3F does not decode

std::string Bytes(std::size_t size) {
    std::mt19937 random(1);
    std::string bytes(size, 0);
    for (char& byte : bytes) byte = static_cast<char>(random());
    return bytes;
}

template <class Function> void Measure(benchmark::State& state, std::size_t bytes, Function function) {
    for (auto _ : state) {
        function();
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(bytes));
}

template <class Encoder> void Encode(benchmark::State& state, std::size_t size) {
    const std::string bytes = Bytes(size);
    Encoder encoder(bytes.data(), size);
    IStringSubmitter& submitter = encoder;
    std::vector<wchar_t> text(submitter.GetStringLen() + 1);
    Measure(state, size, [&] { benchmark::DoNotOptimize(submitter.GetString(text.data())); });
}
template <class Encoder> void InternPresent(benchmark::State& state, std::size_t size) {
    const std::string bytes = Bytes(size);
    const CPPoolString kept = Encoder(bytes.data(), size);
    Measure(state, size, [&] { benchmark::DoNotOptimize(CPPoolString(Encoder(bytes.data(), size)).len()); });
}
template <class Encoder> void InternNew(benchmark::State& state, std::size_t size) {
    std::string bytes = Bytes(size);
    std::size_t held = 0, number = 0;
    Measure(state, size, [&] {
        if ((held += size) > 64000000) { // let them go, untimed
            state.PauseTiming();
            CStringPool::Collect(60000);
            CStringPool::Collect(60000);
            held = 0;
            state.ResumeTiming();
        }
        ++number;
        bytes.replace(0, sizeof number, reinterpret_cast<const char*>(&number), sizeof number);
        benchmark::DoNotOptimize(CPPoolString(Encoder(bytes.data(), size)).len());
    });
}
template <class Encoder, class Decoder> void Decode(benchmark::State& state, std::size_t size) {
    const std::string bytes = Bytes(size);
    const CPPoolString text = Encoder(bytes.data(), size);
    Measure(state, size, [&] { benchmark::DoNotOptimize(CPPlainMemory(Decoder(text)).GetSize()); });
}

#if defined(TAVO_PEER_ABSL_STRINGS)
void EncodeAbseil(benchmark::State& state, std::size_t size) {
    const std::string bytes = Bytes(size);
    std::string text;
    Measure(state, size, [&] { absl::Base64Escape(bytes, &text); });
}
void DecodeAbseil(benchmark::State& state, std::size_t size) {
    const std::string text = absl::Base64Escape(Bytes(size));
    std::string bytes;
    Measure(state, size, [&] { benchmark::DoNotOptimize(absl::Base64Unescape(text, &bytes)); });
}
#endif

void Register(const char* name, void (*function)(benchmark::State&, std::size_t)) {
    for (const std::size_t size : kSizes)
        benchmark::RegisterBenchmark(("Codecs/" + std::to_string(size) + "/" + name).c_str(),
                                     [=](benchmark::State& state) { function(state, size); });
}

const bool g_registered = [] {
    Register("3f_encode", Encode<C3FEncoder>);
    Register("3f_decode", Decode<C3FEncoder, C3FDecoder>);
    Register("3fff_encode", Encode<C3FFFEncoder>);
    Register("3fff_decode", Decode<C3FFFEncoder, C3FFFDecoder>);
    Register("3f_intern_present", InternPresent<C3FEncoder>);
    Register("3fff_intern_present", InternPresent<C3FFFEncoder>);
    Register("3fff_intern_new", InternNew<C3FFFEncoder>);
#if defined(TAVO_PEER_ABSL_STRINGS)
    Register("base64_encode_abseil", EncodeAbseil);
    Register("base64_decode_abseil", DecodeAbseil);
#endif
    return true;
}();

} // namespace
