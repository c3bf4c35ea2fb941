#pragma once
// The 3F and 3FFF codecs byte by byte and bit by bit, to compare the library's with.

#include <cstdint>
#include <TAVO/string.h>
#include <vector>

namespace reference {

using Bytes = std::vector<std::uint8_t>;
using Units = std::vector<wchar_t>;

inline std::uint8_t Byte(int value) { return static_cast<std::uint8_t>(value); }

inline Units Encode3F(Bytes bytes) {
    Units units{static_cast<wchar_t>(0x0100 + (3 - bytes.size() % 3))};
    while (bytes.size() % 3) bytes.push_back(0);
    for (std::size_t i = 0; i < bytes.size(); i += 3) {
        const int b0 = bytes[i], b1 = bytes[i + 1], b2 = bytes[i + 2];
        units.push_back(Byte((b0 & 0x3F) + 0x21));
        units.push_back(Byte(Byte((b1 << 4) | (b0 >> 6)) + 0x21));
        units.push_back(Byte((((b2 & 3) << 4) | (b1 >> 4)) + 0x21));
        units.push_back(Byte((b2 >> 2) + 0x21));
    }
    return units;
}

inline Units Encode3FFF(const Bytes& bytes) {
    Units units{static_cast<wchar_t>(0x0300 + (7 - bytes.size() % 7))};
    units.resize(1 + (bytes.size() + 6) / 7 * 4, 0x4000);
    for (std::size_t bit = 0; bit < bytes.size() * 8; ++bit) {
        wchar_t& unit = units[1 + bit / 14];
        unit = static_cast<wchar_t>(unit | (bytes[bit / 8] >> bit % 8 & 1) << bit % 14);
    }
    return units;
}

// A refused text gives no bytes. Requires: at least one unit, be it the terminator.
inline Bytes Decode3F(const Units& text) {
    const unsigned padding = text[0] & 0xFF;
    if (text[0] >> 8 != 1 || padding > 2 || text.size() % 4 != 1) return {};
    Bytes bytes;
    for (std::size_t i = 1; i < text.size(); i += 4) {
        const std::int32_t u0 = text[i], u1 = text[i + 1], u2 = text[i + 2], u3 = text[i + 3];
        bytes.push_back(Byte(((u1 - 1) * 64) | (u0 - 0x21)));
        bytes.push_back(Byte(((u1 - 0x21) >> 4) | ((u2 - 1) * 16)));
        bytes.push_back(Byte(((u2 - 0x21) >> 4) | ((u3 + 0x1F) * 4)));
    }
    bytes.resize(bytes.size() < padding ? 0 : bytes.size() - padding);
    return bytes;
}

inline Bytes Decode3FFF(const Units& text) {
    const unsigned padding = text[0] & 0xFF;
    if (text[0] >> 8 != 3 || padding < 1 || padding > 7 || text.size() % 4 != 1 || text.size() == 1) return {};
    Bytes bytes(text.size() / 4 * 7);
    for (std::size_t bit = 0; bit < bytes.size() * 8; ++bit) {
        const unsigned unit = text[1 + bit / 14];
        if (unit < 0x4000 || unit > 0x7FFF) return {};
        bytes[bit / 8] = Byte(bytes[bit / 8] | (unit >> bit % 14 & 1) << bit % 8);
    }
    bytes.resize(bytes.size() - padding % 7);
    return bytes;
}

inline Units UnitsOf(const TAVO::String::CPPoolString& text) {
    const wchar_t* const units = text;
    return Units(units, units + text.len());
}
inline Bytes BytesOf(const TAVO::Buffers::CPPlainMemory& memory) {
    const auto* bytes = static_cast<const std::uint8_t*>(static_cast<void*>(memory));
    return Bytes(bytes, bytes + memory.GetSize());
}

} // namespace reference
