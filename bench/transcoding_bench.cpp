// Transcoding whole texts by script and length, into a buffer that is large enough, against ICU, GLib and one step at a
// time. Bytes per second are those of the UTF-8 form in both directions.

#include <benchmark/benchmark.h>
#include <cstring>
#include <random>
#include <string>
#include <TAVO/string.h>
#include <vector>
#if defined(TAVO_PEER_ICU_UC)
#include <unicode/ustring.h>
#endif
#if defined(TAVO_PEER_GLIB_2_0)
#include <glib.h>
#endif

namespace {

using namespace TAVO::String;

struct Script {
    const char* name;
    const char* sample;
};
constexpr Script kScripts[] = {
    {"ascii", "The quick brown fox jumps over the lazy dog, and the five boxing wizards jump quickly. "},
    {"latin",
     "Voix ambiguë d'un cœur qui au zéphyr préfère les jattes de kiwis. Où est le garçon naïf ? À Noël, déjà. "},
    {"cyrillic", "Съешь же ещё этих мягких французских булок, да выпей чаю. "},
    {"cjk", "以呂波耳本部止千利奴流乎和加餘多連曽津祢那良牟有為能於久耶万計不己衣天阿佐伎喩女美之恵比毛勢須。"},
};
constexpr std::int64_t kLengths[] = {100, 1000, 10000, 1000000};

// About `bytes` of the script, whole characters. Words come in random order: branch predictors learn a repeated text.
std::string Text(const Script& script, std::int64_t bytes) {
    std::vector<std::string> words(1);
    for (const char* c = script.sample; *c; ++c) {
        words.back() += *c;
        if (*c == ' ') words.emplace_back();
    }
    if (words.back().empty()) words.pop_back();
    std::mt19937 random(1);
    std::string text;
    while (text.size() <= static_cast<std::size_t>(bytes)) text += words[random() % words.size()];
    std::size_t end = static_cast<std::size_t>(bytes);
    while ((text[end] & 0xC0) == 0x80) --end;
    text.resize(end);
    return text;
}
const unsigned char* Bytes(const std::string& text) { return reinterpret_cast<const unsigned char*>(text.c_str()); }
std::vector<wchar_t> Wide(const std::string& text) {
    std::vector<wchar_t> wide(UTF8_To_acfWChar(Bytes(text), text.size(), nullptr, 0));
    UTF8_To_acfWChar(Bytes(text), text.size(), wide.data(), wide.size());
    return wide;
}

template <class Function> void Measure(benchmark::State& state, std::size_t bytes, Function function) {
    for (auto _ : state) benchmark::DoNotOptimize(function());
    state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(bytes));
}

void FromUtf8(benchmark::State& state, const Script& script, std::int64_t length) {
    const std::string text = Text(script, length);
    std::vector<wchar_t> target(text.size() + 1);
    Measure(state, text.size(),
            [&] { return UTF8_To_acfWChar(Bytes(text), text.size(), target.data(), target.size()); });
}
void ToUtf8(benchmark::State& state, const Script& script, std::int64_t length) {
    const std::string text = Text(script, length);
    const std::vector<wchar_t> source = Wide(text);
    std::vector<unsigned char> target(text.size() + 1);
    Measure(state, text.size(),
            [&] { return acfWChar_To_UTF8(source.data(), source.size() - 1, target.data(), target.size()); });
}
void CountUtf8(benchmark::State& state, const Script& script, std::int64_t length) {
    const std::string text = Text(script, length);
    Measure(state, text.size(), [&] { return UTF8u16strlen(Bytes(text), SIZE_MAX); });
}
void CountWide(benchmark::State& state, const Script& script, std::int64_t length) {
    const std::string text = Text(script, length);
    const std::vector<wchar_t> source = Wide(text);
    Measure(state, text.size(), [&] { return acfWu8strlen(source.data(), SIZE_MAX); });
}
void FromUtf8Steps(benchmark::State& state, const Script& script, std::int64_t length) {
    const std::string text = Text(script, length);
    std::vector<wchar_t> target(text.size() + 1);
    Measure(state, text.size(), [&] {
        const unsigned char* in = Bytes(text);
        wchar_t* out = target.data();
        while (*in && utf8_acfW(out, in)) {
        }
        return out;
    });
}

#if defined(TAVO_PEER_ICU_UC)
void FromUtf8Icu(benchmark::State& state, const Script& script, std::int64_t length) {
    const std::string text = Text(script, length);
    std::vector<UChar> target(text.size() + 1);
    Measure(state, text.size(), [&] {
        std::int32_t written = 0;
        UErrorCode error = U_ZERO_ERROR;
        u_strFromUTF8(target.data(), static_cast<std::int32_t>(target.size()), &written, text.c_str(),
                      static_cast<std::int32_t>(text.size()), &error);
        return written;
    });
}
void ToUtf8Icu(benchmark::State& state, const Script& script, std::int64_t length) {
    const std::string text = Text(script, length);
    const std::vector<wchar_t> wide = Wide(text);
    const std::vector<UChar> source(wide.begin(), wide.end());
    std::vector<char> target(text.size() + 1);
    Measure(state, text.size(), [&] {
        std::int32_t written = 0;
        UErrorCode error = U_ZERO_ERROR;
        u_strToUTF8(target.data(), static_cast<std::int32_t>(target.size()), &written, source.data(),
                    static_cast<std::int32_t>(source.size() - 1), &error);
        return written;
    });
}
#endif

#if defined(TAVO_PEER_GLIB_2_0)
// Allocates its result, as it always does.
void FromUtf8Glib(benchmark::State& state, const Script& script, std::int64_t length) {
    const std::string text = Text(script, length);
    Measure(state, text.size(), [&] {
        gunichar2* const units =
            g_utf8_to_utf16(text.c_str(), static_cast<glong>(text.size()), nullptr, nullptr, nullptr);
        g_free(units);
        return units;
    });
}
#endif

void Register(const char* name, void (*function)(benchmark::State&, const Script&, std::int64_t)) {
    for (const Script& script : kScripts)
        for (const std::int64_t length : kLengths)
            benchmark::RegisterBenchmark(
                ("Transcoding/" + std::string(script.name) + "/" + std::to_string(length) + "/" + name).c_str(),
                [=, &script](benchmark::State& state) { function(state, script, length); });
}

const bool g_registered = [] {
    Register("from_utf8", FromUtf8);
    Register("from_utf8_steps", FromUtf8Steps);
    Register("to_utf8", ToUtf8);
    Register("count_utf8", CountUtf8);
    Register("count_wide", CountWide);
#if defined(TAVO_PEER_ICU_UC)
    Register("from_utf8_icu", FromUtf8Icu);
    Register("to_utf8_icu", ToUtf8Icu);
#endif
#if defined(TAVO_PEER_GLIB_2_0)
    Register("from_utf8_glib", FromUtf8Glib);
#endif
    return true;
}();

} // namespace
