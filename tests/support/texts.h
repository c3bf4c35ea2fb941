#pragma once
// Random texts for the transcoders: runs of every kind of character, some of them then damaged.

#include <cstdint>
#include <random>
#include <vector>

namespace support {

using Bytes = std::vector<unsigned char>;
using Units = std::vector<unsigned short>;

class TextSource {
public:
    explicit TextSource(std::uint32_t seed) : m_random(seed) {}

    std::uint32_t Below(std::uint32_t limit) { return m_random() % limit; }

    // At most about `length` bytes, no zero byte, not terminated.
    Bytes Utf8(std::size_t length) {
        Bytes text;
        while (text.size() < length) {
            const std::uint32_t kind = Below(6), run = 1 + Below(Below(4) ? 8 : 80);
            for (std::uint32_t i = 0; i < run && text.size() < length; ++i) Append(text, kind);
        }
        if (Below(2))
            for (std::uint32_t i = 1 + Below(3); i && !text.empty(); --i) Damage(text);
        for (auto& byte : text)
            if (!byte) byte = 0x80;
        return text;
    }

    // The same in units.
    Units Utf16(std::size_t length) {
        static constexpr std::uint32_t kFirst[] = {1, 0x20, 0x80, 0x800, 0xE000, 0xDC00, 0xD800};
        static constexpr std::uint32_t kCount[] = {0x7F, 0x60, 0x780, 0xD000, 0x2000, 0x400, 0x400};
        const std::uint32_t kinds = Below(3) ? 5 : 7;
        Units text;
        while (text.size() < length) {
            const std::uint32_t kind = Below(kinds), run = 1 + Below(Below(4) ? 8 : 80);
            for (std::uint32_t i = 0; i < run && text.size() < length; ++i) {
                if (kind == 4 || kind == 6) text.push_back(Unit(0xD800 + Below(0x400)));
                text.push_back(Unit(kind == 4 ? 0xDBFF + Below(0x401) : kFirst[kind] + Below(kCount[kind])));
            }
        }
        return text;
    }

private:
    static unsigned short Unit(std::uint32_t value) { return static_cast<unsigned short>(value); }

    void Append(Bytes& text, std::uint32_t kind) {
        static constexpr std::uint32_t kLead[] = {1, 0x20, 0xC0, 0xE0, 0xF0, 0xF0};
        static constexpr std::uint32_t kLeads[] = {0x7F, 0x60, 0x20, 0x10, 0x4, 0x5};
        static constexpr std::uint32_t kTrail[] = {0, 0, 1, 2, 3, 3};
        text.push_back(static_cast<unsigned char>(kLead[kind] + Below(kLeads[kind])));
        for (std::uint32_t i = 0; i < kTrail[kind]; ++i) text.push_back(static_cast<unsigned char>(0x80 + Below(0x40)));
    }

    void Damage(Bytes& text) {
        const std::size_t at = Below(static_cast<std::uint32_t>(text.size()));
        const std::uint32_t how = Below(3);
        if (how == 0) text.erase(text.begin() + static_cast<std::ptrdiff_t>(at));
        if (how == 1) text[at] = static_cast<unsigned char>(Below(256));
        if (how == 2) text[at] = static_cast<unsigned char>(0xC0 + Below(0x40));
    }

    std::mt19937 m_random;
};

} // namespace support
