// Identifier text, narrow and wide, against a plain reading of its rules.
// Input: bytes as narrow text; the same bytes as the units of wide text.

#include "require.h"

#include <cstdint>
#include <TAVO/acf.h>
#include <vector>

namespace {

using TAVO::ACF::cacfuid;

int Digit(unsigned c) {
    if (c >= '0' && c <= '9') return static_cast<int>(c - '0');
    if (c >= 'A' && c <= 'F') return static_cast<int>(c - 'A') + 10;
    if (c >= 'a' && c <= 'f') return static_cast<int>(c - 'a') + 10;
    return -1;
}

// One number at `at`, before `end`; its low 32 bits.
template <class Text> bool Number(const Text& text, std::size_t& at, std::size_t end, std::uint32_t& number) {
    const auto blank = [](unsigned c) { return c == ' ' || (c >= 9 && c <= 13); };
    while (at < end && blank(text[at])) ++at;
    const bool minus = at < end && text[at] == '-';
    if (at < end && (minus || text[at] == '+')) ++at;
    if (at + 1 < end && text[at] == '0' && (text[at + 1] == 'x' || text[at + 1] == 'X')) at += 2;
    if (at >= end || Digit(text[at]) < 0) return false;
    number = 0;
    for (; at < end && Digit(text[at]) >= 0; ++at) number = number * 16 + static_cast<std::uint32_t>(Digit(text[at]));
    if (minus) number = 0 - number;
    return true;
}

// The text ends with its 0, which no number takes.
template <class Text> bool Reference(const Text& text, cacfuid& id) {
    id.reset();
    const std::size_t end = text.size() - 1;
    std::size_t dashes = 0, last = 0;
    for (std::size_t i = 0; i < end; ++i)
        if (text[i] == '-') ++dashes, last = i;
    if (dashes != 4) return true;
    std::uint32_t groups[4];
    std::size_t at = 0;
    for (int group = 0; group < 4; ++group) {
        if (group > 0 && text[at++] != '-') return false;
        if (!Number(text, at, end, groups[group])) return false;
    }
    _acfUID read = {groups[0], static_cast<std::uint16_t>(groups[1]), static_cast<std::uint16_t>(groups[2]), {}};
    read.Data4[0] = static_cast<std::uint8_t>(groups[3] >> 8);
    read.Data4[1] = static_cast<std::uint8_t>(groups[3]);
    for (std::size_t i = 0; i < 6; ++i) {
        std::size_t pair = last + 1 + 2 * i;
        std::uint32_t byte;
        if (pair + 2 > end || !Number(text, pair, pair + 2, byte)) return false;
        read.Data4[2 + i] = static_cast<std::uint8_t>(byte);
    }
    id = read;
    return true;
}

template <class Unit, class Plain> void Check(const std::vector<Plain>& text) {
    const std::vector<Unit> units(text.begin(), text.end()); // a copy of its own, so that a sanitizer sees its end
    cacfuid read("15603CD4-AB81-4D6F-B05F-C6BEA760A789"), expected;
    const bool good = read.Set(units.data());
    Require(good == Reference(text, expected) && read == expected);
    Unit out[cacfuid::TextUnits];
    read.GetText(out);
    cacfuid again;
    Require(again.Set(out) && again == read);
}

// Up to the first 0, which is added.
template <class Plain> std::vector<Plain> Terminated(const std::uint8_t* data, std::size_t size) {
    std::vector<Plain> text;
    for (; size >= sizeof(Plain); data += sizeof(Plain), size -= sizeof(Plain)) {
        unsigned unit = data[0];
        if (sizeof(Plain) == 2) unit |= static_cast<unsigned>(data[1]) << 8;
        if (unit == 0) break;
        text.push_back(static_cast<Plain>(unit));
    }
    text.push_back(0);
    return text;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto bytes = Terminated<std::uint8_t>(data, size);
    Check<char>(bytes);
    Check<wchar_t>(bytes);
    Check<wchar_t>(Terminated<std::uint16_t>(data, size));
    return 0;
}
