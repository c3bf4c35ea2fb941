// Escaping and unescaping URLs by length and density of escapes, against libxml2. Bytes per second are those of the
// plain text. libxml2 allocates what it escapes, and here unescapes into a given buffer.

#include <benchmark/benchmark.h>
#include <random>
#include <string>
#include <TAVO/internetional.h>
#include <vector>
#if defined(TAVO_PEER_LIBXML_2_0)
#include <libxml/uri.h>
#endif

namespace {

using namespace TAVO::Internetional;

struct Density {
    const char* name;
    unsigned percent; // of the bytes are escaped
};
constexpr Density kDensities[] = {{"none", 0}, {"few", 5}, {"half", 50}, {"all", 100}};
constexpr std::int64_t kLengths[] = {60, 10000};

std::string Plain(const Density& density, std::int64_t length) {
    std::mt19937 random(1);
    std::string text;
    for (std::int64_t i = 0; i < length; ++i)
        text += static_cast<char>(random() % 100 < density.percent ? 0x80 + random() % 128 : 'a' + random() % 26);
    return text;
}
const unsigned char* Bytes(const std::string& text) { return reinterpret_cast<const unsigned char*>(text.c_str()); }
std::string Escaped(const std::string& text) {
    std::string url(URL_encoderequired(Bytes(text), Bytes("/")), 0);
    URL_encodebuffer(reinterpret_cast<unsigned char*>(url.data()), Bytes(text), Bytes("/"));
    return url;
}

template <class Function>
void Measure(benchmark::State& state, const std::string& plain, std::size_t room, Function function) {
    std::vector<unsigned char> target(room + 1);
    for (auto _ : state) {
        benchmark::DoNotOptimize(function(target.data()));
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(plain.size()));
}

void Escape(benchmark::State& state, const std::string& plain) {
    Measure(state, plain, plain.size() * 3,
            [&](unsigned char* target) { return URL_encodebuffer(target, Bytes(plain), Bytes("/")); });
}
// As a caller does who does not know the size: measured, allocated, written, freed.
void EscapeNew(benchmark::State& state, const std::string& plain) {
    Measure(state, plain, 0, [&](unsigned char*) {
        std::vector<unsigned char> url(URL_encoderequired(Bytes(plain), Bytes("/")) + 1);
        return URL_encodebuffer(url.data(), Bytes(plain), Bytes("/"));
    });
}
void Unescape(benchmark::State& state, const std::string& plain) {
    const std::string url = Escaped(plain);
    Measure(state, plain, plain.size(), [&](unsigned char* target) { return URL_decodebuffer(target, Bytes(url)); });
}
void Check(benchmark::State& state, const std::string& plain) {
    const std::string url = Escaped(plain);
    Measure(state, plain, 0, [&](unsigned char*) { return URL_checkescape(Bytes(url), Bytes("/")); });
}

#if defined(TAVO_PEER_LIBXML_2_0)
void EscapeLibxml2(benchmark::State& state, const std::string& plain) {
    Measure(state, plain, 0, [&](unsigned char*) {
        xmlChar* const url = xmlURIEscapeStr(Bytes(plain), Bytes("/"));
        xmlFree(url);
        return url;
    });
}
void UnescapeLibxml2(benchmark::State& state, const std::string& plain) {
    const std::string url = Escaped(plain);
    Measure(state, plain, plain.size(), [&](unsigned char* target) {
        return xmlURIUnescapeString(url.c_str(), 0, reinterpret_cast<char*>(target));
    });
}
#endif

void Register(const char* name, void (*function)(benchmark::State&, const std::string&)) {
    for (const Density& density : kDensities)
        for (const std::int64_t length : kLengths)
            benchmark::RegisterBenchmark(
                ("Url/" + std::string(density.name) + "/" + std::to_string(length) + "/" + name).c_str(),
                [=, &density](benchmark::State& state) { function(state, Plain(density, length)); });
}

const bool g_registered = [] {
    Register("escape", Escape);
    Register("escape_new", EscapeNew);
    Register("unescape", Unescape);
    Register("check", Check);
#if defined(TAVO_PEER_LIBXML_2_0)
    Register("escape_libxml2", EscapeLibxml2);
    Register("unescape_libxml2", UnescapeLibxml2);
#endif
    return true;
}();

} // namespace
