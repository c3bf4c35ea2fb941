// Component identifiers: their text, and new ones.

#include "numberscan.h"
#include "platform/platform.h"

#include <TAVO/acf.h>

namespace TAVO::ACF {

namespace {

// --- reading ---------------------------------------------------------------------------------------------------------

constexpr std::size_t kGroups = 5;
constexpr unsigned kBytesOfGroup[kGroups] = {4, 2, 2, 2, 6};

// The common case: the text form and nothing else. Reads no further than the first unit that does not fit.
template <class Unit> bool ReadCanonical(const Unit* text, _acfUID& uid) noexcept {
    std::uint64_t groups[kGroups];
    for (std::size_t group = 0; group < kGroups; ++group) {
        if (group > 0 && *text++ != '-') return false;
        std::uint64_t number = 0;
        for (unsigned digits = 2 * kBytesOfGroup[group]; digits; --digits) {
            const unsigned digit = numberscan::DigitOf(*text);
            if (digit == numberscan::kNoDigit) return false;
            number = number << 4 | digit;
            ++text;
        }
        groups[group] = number;
    }
    if (*text) return false;
    uid.Data1 = static_cast<std::uint32_t>(groups[0]);
    uid.Data2 = static_cast<std::uint16_t>(groups[1]);
    uid.Data3 = static_cast<std::uint16_t>(groups[2]);
    const std::uint64_t bytes = groups[3] << 48 | groups[4];
    for (unsigned i = 0; i < 8; ++i) uid.Data4[i] = static_cast<std::uint8_t>(bytes >> (56 - 8 * i));
    return true;
}

// Any text by the full rules; `last` is its last dash.
template <class Unit> bool ReadGroups(const Unit* text, const Unit* last, _acfUID& uid) noexcept {
    std::uint64_t groups[4];
    for (std::size_t group = 0; group < 4; ++group) {
        if (group > 0 && *text++ != '-') return false;
        if (!numberscan::ScanNumber<Unit>(text, nullptr, 16, groups[group])) return false;
    }
    uid.Data1 = static_cast<std::uint32_t>(groups[0]);
    uid.Data2 = static_cast<std::uint16_t>(groups[1]);
    uid.Data3 = static_cast<std::uint16_t>(groups[2]);
    uid.Data4[0] = static_cast<std::uint8_t>(groups[3] >> 8);
    uid.Data4[1] = static_cast<std::uint8_t>(groups[3]);
    const Unit* pair = last + 1;
    for (std::size_t i = 2; i < 8; ++i, pair += 2) {
        if (!pair[0] || !pair[1]) return false;
        const Unit* at = pair;
        std::uint64_t byte;
        if (!numberscan::ScanNumber(at, pair + 2, 16, byte)) return false;
        uid.Data4[i] = static_cast<std::uint8_t>(byte);
    }
    return true;
}

template <class Unit> bool Read(const Unit* text, _acfUID& uid) noexcept {
    uid = {};
    if (!text) return true;
    _acfUID read = {};
    if (!ReadCanonical(text, read)) {
        unsigned dashes = 0;
        const Unit* last = nullptr;
        for (const Unit* at = text; *at; ++at)
            if (*at == '-') last = at, ++dashes;
        // Intended (identifier-dashes): text that has not four dashes is the null identifier and no error. A textbook
        // would refuse it; hosts store nothing, or a word of their own, where there is no component.
        if (dashes != 4) return true;
        if (!ReadGroups(text, last, read)) return false;
    }
    uid = read;
    return true;
}

// --- writing ---------------------------------------------------------------------------------------------------------

template <class Unit> Unit* PutBytes(Unit* out, std::uint64_t value, unsigned bytes) noexcept {
    constexpr const char* kHex = "0123456789ABCDEF";
    for (unsigned shift = 8 * bytes; shift; shift -= 4) *out++ = static_cast<Unit>(kHex[value >> (shift - 4) & 15]);
    return out;
}

template <class Unit> void Write(const _acfUID& uid, Unit* out) noexcept {
    out = PutBytes(out, uid.Data1, 4);
    *out++ = '-';
    out = PutBytes(out, uid.Data2, 2);
    *out++ = '-';
    out = PutBytes(out, uid.Data3, 2);
    *out++ = '-';
    for (unsigned i = 0; i < 8; ++i) {
        if (i == 2) *out++ = '-';
        out = PutBytes(out, uid.Data4[i], 1);
    }
    *out = 0;
}

} // namespace

cacfuid cacfuid::New() noexcept {
    cacfuid made;
    _acfUID& uid = made.m_uid;
    if (!Platform::FillRandom(&uid, sizeof uid)) return {};
    uid.Data3 = static_cast<std::uint16_t>((uid.Data3 & 0x0FFF) | 0x4000);  // version 4
    uid.Data4[0] = static_cast<std::uint8_t>((uid.Data4[0] & 0x3F) | 0x80); // the usual variant
    return made;
}

bool cacfuid::Set(const char* text) noexcept { return Read(text, m_uid); }
bool cacfuid::Set(const wchar_t* text) noexcept { return Read(text, m_uid); }

void cacfuid::GetText(char* out) const noexcept { Write(m_uid, out); }
void cacfuid::GetText(wchar_t* out) const noexcept { Write(m_uid, out); }

cacfuid::operator String::CACFWChar() const {
    wchar_t text[TextUnits];
    GetText(text);
    return text;
}

String::CANSIChar cacfuid::ANSI() const {
    char text[TextUnits];
    GetText(text);
    return text;
}

} // namespace TAVO::ACF
