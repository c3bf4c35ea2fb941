// Transcoders: what is measured is written, nothing more is touched, every step advances or fails.
// Input: the first byte chooses the bound, the rest is text (UTF-8, and once more as UTF-16).

#include "require.h"

#include <cstdint>
#include <cstring>
#include <TAVO/string.h>
#include <vector>

namespace {

using namespace TAVO::String;
using TAVO::ulong32;

// A whole-string converter at exactly the size it asked for, and at one less.
template <class Target, class Source, class Function>
void CheckWhole(Function convert, const Source* text, std::size_t n, std::size_t measured) {
    const std::size_t need = convert(text, n, nullptr, 0);
    Require(need == measured + 1);
    std::vector<Target> target(need);
    const std::size_t result = convert(text, n, target.data(), need);
    Require(result == need || result == 0);
    Require(result == 0 || target[need - 1] == 0);
    const std::vector<Target> untouched(need - 1, Target(0x55));
    std::vector<Target> small(untouched);
    Require(small.empty() || convert(text, n, small.data(), need - 1) == 0);
    Require(small == untouched);
}

void CheckUtf8(const std::vector<unsigned char>& text, std::size_t n) {
    const std::size_t units = UTF8u16strlen(text.data(), n);
    const std::size_t characters = UTF8w32strlen(text.data(), n);
    Require(UTF8wstrlen(text.data(), n) == units);
    Require(characters <= units && units <= 2 * characters);
    CheckWhole<wchar_t>(UTF8_To_acfWChar, text.data(), n, units);

    const unsigned char* in = text.data();
    const unsigned char* const end = in + text.size() - 1;
    std::size_t stepped = 0, steppedUnits = 0;
    while (in < end && *in) {
        const unsigned char* const before = in;
        ulong32 value = 0;
        const bool good = utf8_acfW32(&value, in);
        Require(in >= before && in <= end && (!good || in > before));
        wchar_t buffer[2];
        wchar_t* out = buffer;
        const unsigned char* again = before;
        Require(utf8_acfW(out, again) == (good && value <= 0x10FFFF) && again == in);
        if (!good) break;
        ++stepped;
        steppedUnits += value < 0x10000 ? 1 : 2;
    }
    if (n >= text.size()) Require(stepped == characters && steppedUnits == units);

    const CACFWChar wide(text.data());
    Require(wide && wide.len() <= UTF8u16strlen(text.data(), SIZE_MAX));
}

void CheckUtf16(const std::vector<wchar_t>& text, std::size_t n) {
    const std::size_t bytes = acfWu8strlen(text.data(), n);
    const std::size_t characters = acfWw32strlen(text.data(), n);
    Require(characters <= bytes && bytes <= 3 * characters);
    CheckWhole<unsigned char>(acfWChar_To_UTF8, text.data(), n, bytes);

    const wchar_t* in = text.data();
    const wchar_t* const end = in + text.size() - 1;
    std::size_t stepped = 0, steppedBytes = 0;
    while (in < end && *in) {
        const wchar_t* const before = in;
        unsigned char buffer[4];
        unsigned char* out = buffer;
        const bool good = acfW_utf8(out, in);
        Require(good ? in > before && in <= end && out > buffer : in == before && out == buffer);
        if (!good) break;
        ++stepped;
        steppedBytes += static_cast<std::size_t>(out - buffer);
    }
    if (n >= text.size()) Require(stepped == characters && steppedBytes == bytes);

    const CUTF8Char utf8(text.data());
    Require(utf8 && utf8.len() == acfWu8strlen(text.data(), SIZE_MAX));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    const std::size_t n = data[0] == 0xFF ? SIZE_MAX : data[0];
    ++data, --size;
    std::vector<unsigned char> bytes(data, data + size);
    bytes.push_back(0);
    bytes.shrink_to_fit();
    CheckUtf8(bytes, n);

    std::vector<wchar_t> units(size / 2 + 1);
    if (size > 1) std::memcpy(units.data(), data, size / 2 * 2);
    units.back() = 0;
    CheckUtf16(units, n);
    return 0;
}
