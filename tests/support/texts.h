#pragma once
// Random texts for the transcoders, some of them damaged, and a slow reading of texts: the reference for the fast ones.
// And what tests of pooled strings share.

#include <cstdint>
#include <random>
#include <string>
#include <TAVO/string.h>
#include <vector>

namespace support {

using Bytes = std::vector<unsigned char>;
using Units16 = std::vector<unsigned short>;

inline const unsigned char* Utf8(const char* text) { return reinterpret_cast<const unsigned char*>(text); }
inline const wchar_t* Entry(const TAVO::String::CPPoolString& text) { return text; }
// Texts that nobody holds go with the second sweep that finds them idle.
inline bool Sweep(int times = 2) {
    bool swept = true;
    for (; times; --times) swept &= TAVO::String::CStringPool::Collect(60000);
    return swept;
}

// The bytes of units, in host order or swapped.
inline std::string BytesOf(const std::u16string& units, bool swapped = false) {
    std::string bytes;
    for (char16_t unit : units) {
        const char low = static_cast<char>(unit & 0xFF), high = static_cast<char>(unit >> 8);
        bytes.append(1, swapped ? high : low).append(1, swapped ? low : high);
    }
    return bytes;
}

enum class Look { Good, Invalid, Ended }; // Ended: terminator, bound, or cut by the bound

struct Character {
    Look look;
    std::size_t units = 0; // of the source
    TAVO::ulong32 value = 0;
};

inline unsigned LeadLength(unsigned b) {
    return b < 0x80 ? 1 : b < 0xC0 ? 0 : b < 0xE0 ? 2 : b < 0xF0 ? 3 : b < 0xF5 ? 4 : 0;
}

// `text` ends in a terminator; n bounds it.
template <class Text> Character LookAtUtf8(const Text& text, std::size_t i, std::size_t n) {
    if (i >= n || text[i] == 0) return {Look::Ended};
    const unsigned length = LeadLength(text[i]);
    if (length == 0) return {Look::Invalid};
    if (length > n - i) return {Look::Ended};
    TAVO::ulong32 value = length == 1 ? text[i] : text[i] & (0x7F >> length);
    for (unsigned k = 1; k < length; ++k) {
        if (text[i + k] / 0x40 != 2) return {Look::Invalid};
        value = value * 0x40 + text[i + k] % 0x40;
    }
    return {Look::Good, length, value};
}

template <class Text> Character LookAtUtf16(const Text& text, std::size_t i, std::size_t n) {
    if (i >= n || text[i] == 0) return {Look::Ended};
    if (text[i] < 0xD800 || text[i] > 0xDFFF) return {Look::Good, 1, text[i]};
    if (text[i] >= 0xDC00) return {Look::Invalid};
    if (n - i < 2) return {Look::Ended};
    if (text[i + 1] < 0xDBFF) return {Look::Invalid};
    return {Look::Good, 2, text[i] % 0x400 == 0 && text[i + 1] % 0x400 == 0 ? 0u : 1u};
}

inline Character LookAt(const Bytes& text, std::size_t i, std::size_t n) { return LookAtUtf8(text, i, n); }
inline Character LookAt(const Units16& text, std::size_t i, std::size_t n) { return LookAtUtf16(text, i, n); }

inline Units16 Encoded16(TAVO::ulong32 value) {
    if (value < 0x10000) return {static_cast<unsigned short>(value)};
    return {static_cast<unsigned short>(0xD800 | value / 0x400), static_cast<unsigned short>(0xDC00 | value % 0x400)};
}

inline Bytes Encoded8(TAVO::ulong32 value) {
    if (value < 0x80) return {static_cast<unsigned char>(value)};
    const unsigned trail = value < 0x800 ? 1 : value < 0x10000 ? 2 : 3;
    Bytes bytes(trail + 1);
    for (unsigned k = trail; k; --k, value /= 0x40) bytes[k] = static_cast<unsigned char>(0x80 + value % 0x40);
    bytes[0] = static_cast<unsigned char>(value + (0xFF80 >> trail) % 0x100);
    return bytes;
}

class TextSource {
public:
    explicit TextSource(std::uint32_t seed) : m_random(seed) {}

    std::uint32_t Below(std::uint32_t limit) { return m_random() % limit; }

    // At most about `length` bytes, no zero byte, not terminated.
    Bytes Utf8(std::size_t length) {
        static constexpr std::uint32_t kLead[] = {1, 0x20, 0xC0, 0xE0, 0xF0, 0xF0};
        static constexpr std::uint32_t kLeads[] = {0x7F, 0x60, 0x20, 0x10, 0x4, 0x5};
        static constexpr std::uint32_t kTrail[] = {0, 0, 1, 2, 3, 3};
        Bytes text;
        while (text.size() < length) {
            const std::uint32_t kind = Below(6);
            for (std::uint32_t run = 1 + Below(Below(4) ? 8 : 80); run && text.size() < length; --run) {
                text.push_back(Byte(kLead[kind] + Below(kLeads[kind])));
                for (std::uint32_t i = 0; i < kTrail[kind]; ++i) text.push_back(Byte(0x80 + Below(0x40)));
            }
        }
        for (std::uint32_t i = Below(2) ? 1 + Below(3) : 0; i && !text.empty(); --i) {
            const auto at = text.begin() + Below(static_cast<std::uint32_t>(text.size()));
            const std::uint32_t how = Below(3);
            *at = how == 1 ? Byte(1 + Below(255)) : Byte(0xC0 + Below(0x40));
            if (how == 0) text.erase(at);
        }
        return text;
    }

    // The same in units.
    Units16 Utf16(std::size_t length) {
        static constexpr std::uint32_t kFirst[] = {1, 0x20, 0x80, 0x800, 0xE000, 0xDC00, 0xD800};
        static constexpr std::uint32_t kCount[] = {0x7F, 0x60, 0x780, 0xD000, 0x2000, 0x400, 0x400};
        const std::uint32_t kinds = Below(3) ? 5 : 7;
        Units16 text;
        while (text.size() < length) {
            const std::uint32_t kind = Below(kinds);
            for (std::uint32_t run = 1 + Below(Below(4) ? 8 : 80); run && text.size() < length; --run) {
                if (kind == 4 || kind == 6) text.push_back(Unit(0xD800 + Below(0x400)));
                text.push_back(Unit(kind == 4 ? 0xDBFF + Below(0x401) : kFirst[kind] + Below(kCount[kind])));
            }
        }
        return text;
    }

private:
    static unsigned char Byte(std::uint32_t value) { return static_cast<unsigned char>(value); }
    static unsigned short Unit(std::uint32_t value) { return static_cast<unsigned short>(value); }

    std::mt19937 m_random;
};

} // namespace support
