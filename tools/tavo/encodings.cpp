#include "encodings.h"

#include <algorithm>
#include <TAVO/string.h>

namespace tool {

using TAVO::ulong32;

namespace {

constexpr TextFormat kFormats[] = {
    {"utf-8", Encoding::Utf8, 1, false, true},      {"utf-16", Encoding::Utf16, 2, false, true},
    {"utf-16le", Encoding::Utf16, 2, false, false}, {"utf-16be", Encoding::Utf16, 2, true, false},
    {"utf-32", Encoding::Utf32, 4, false, true},    {"utf-32le", Encoding::Utf32, 4, false, false},
    {"utf-32be", Encoding::Utf32, 4, true, false},  {"ansi", Encoding::Ansi, 1, false, false},
};

constexpr std::uint32_t kMark = 0xFEFF, kHighest = 0x10FFFF;

bool IsSurrogate(std::uint32_t unit) { return unit >= 0xD800 && unit < 0xE000; }
bool IsLowSurrogate(std::uint32_t unit) { return unit >= 0xDC00 && unit < 0xE000; }

std::string Plural(std::size_t count, const char* noun) {
    return std::to_string(count) + ' ' + noun + (count == 1 ? "" : "s");
}

std::string Digits(std::uint32_t value, unsigned count) {
    std::string text;
    while (count-- > 0) text += "0123456789ABCDEF"[value >> 4 * count & 15];
    return text;
}

Character Fault(std::string reason) { return {0, 1, std::move(reason)}; }

std::uint32_t UnitOf(const char* bytes, std::size_t unit, bool bigEndian) {
    std::uint32_t value = 0;
    for (std::size_t i = 0; i < unit; ++i)
        value = value << 8 | static_cast<unsigned char>(bytes[bigEndian ? i : unit - 1 - i]);
    return value;
}

void AddUnit(std::string& bytes, std::uint32_t value, std::size_t unit, bool bigEndian) {
    for (std::size_t i = 0; i < unit; ++i)
        bytes += static_cast<char>(value >> 8 * (bigEndian ? unit - 1 - i : i) & 0xFF);
}

// The system's conversion, as UTF-16 in little-endian order. A call takes less than 2^31 bytes, so it is made for
// pieces, which end at line feeds where there are any.
std::string WideBytes(std::string_view ansi) {
    constexpr std::size_t kPiece = 1 << 20, kLongest = 1 << 30;
    std::string wide;
    while (!ansi.empty()) {
        std::size_t count = ansi.size();
        if (count > kPiece) {
            const auto line = ansi.find('\n', kPiece);
            count = std::min(line == ansi.npos ? count : line + 1, kLongest);
        }
        std::vector<wchar_t> units(TAVO::String::OS::ANSI_To_acfWChar(ansi.data(), count, nullptr, 0));
        if (!units.empty()) TAVO::String::OS::ANSI_To_acfWChar(ansi.data(), count, units.data(), units.size());
        for (const wchar_t unit : units) AddUnit(wide, unit, sizeof(unit), false);
        ansi.remove_prefix(count);
    }
    return wide;
}

} // namespace

std::vector<std::string> TextFormatNames() {
    std::vector<std::string> names;
    for (const TextFormat& format : kFormats) names.push_back(format.name);
    return names;
}

const TextFormat& FindTextFormat(const std::string& name) {
    for (const TextFormat& format : kFormats)
        if (format.name == name) return format;
    return kFormats[0];
}

const TextFormat& GuessTextFormat(std::string_view bytes) {
    const auto has = [&](std::size_t unit, bool bigEndian) {
        return bytes.size() >= unit && UnitOf(bytes.data(), unit, bigEndian) == kMark;
    };
    const std::size_t size = bytes.size();
    if (size % 4 == 0 && (has(4, false) || (size >= 4 && UnitOf(bytes.data(), 4, true) == kMark)))
        return FindTextFormat("utf-32"); // before UTF-16, whose mark theirs begins with
    return FindTextFormat(has(2, false) || has(2, true) ? "utf-16" : "utf-8");
}

EncodedText::EncodedText(std::string_view bytes, const TextFormat& format)
    : m_wide(format.encoding == Encoding::Ansi ? WideBytes(bytes) : std::string()),
      m_bytes(format.encoding == Encoding::Ansi ? std::string_view(m_wide) : bytes),
      m_form(format.encoding == Encoding::Ansi ? Encoding::Utf16 : format.encoding),
      m_unit(m_form == Encoding::Utf16 ? 2 : format.unit), m_bigEndian(format.bigEndian),
      m_end(m_bytes.size() / m_unit) {
    if (!format.marked) return;
    if (m_unit == 1) {
        if (m_bytes.substr(0, 3) == "\xEF\xBB\xBF") m_begin = 3;
        return;
    }
    for (const bool bigEndian : {false, true}) {
        if (m_end == 0 || UnitOf(m_bytes.data(), m_unit, bigEndian) != kMark) continue;
        m_begin = 1;
        m_bigEndian = bigEndian;
    }
}

std::uint32_t EncodedText::Unit(std::size_t at) const {
    return at < m_end ? UnitOf(m_bytes.data() + at * m_unit, m_unit, m_bigEndian) : 0;
}

std::string EncodedText::Hex(std::size_t at, std::size_t count) const {
    std::string text;
    for (std::size_t i = 0; i < count; ++i) {
        if (i > 0) text += ' ';
        text += Digits(Unit(at + i), static_cast<unsigned>(2 * m_unit));
    }
    return text;
}

Character EncodedText::Standard(std::size_t at) const {
    switch (m_form) {
    case Encoding::Utf8:
        return Standard8(at);
    case Encoding::Utf32:
        return Standard32(at);
    default:
        return Standard16(at);
    }
}

Character EncodedText::Standard8(std::size_t at) const {
    const std::uint32_t lead = Unit(at);
    if (lead < 0x80) return {lead, 1, {}};
    if (lead < 0xC0) return Fault(Hex(at, 1) + " continues a character, and none begins before it");
    if (lead >= 0xF8) return Fault(Hex(at, 1) + " never occurs in UTF-8");
    const std::size_t length = lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : 4;
    std::uint32_t value = lead & (0x7F >> length);
    for (std::size_t i = 1; i < length; ++i) {
        if ((Unit(at + i) & 0xC0) != 0x80)
            return Fault(Hex(at, i) + " is truncated: " + Plural(length - i, "more byte") +
                         (length - i == 1 ? " belongs" : " belong") + " to it");
        value = value << 6 | (Unit(at + i) & 0x3F);
    }
    const std::size_t shortest = value < 0x80 ? 1 : value < 0x800 ? 2 : value < 0x10000 ? 3 : 4;
    const std::string bytes = Hex(at, length) + " is ";
    if (shortest < length)
        return Fault(bytes + "overlong: " + CodePointName(value) + " takes " + Plural(shortest, "byte"));
    if (IsSurrogate(value)) return Fault(bytes + "the surrogate " + CodePointName(value) + ", which is no character");
    if (value > kHighest) return Fault(bytes + CodePointName(value) + ", above U+10FFFF");
    return {value, length, {}};
}

Character EncodedText::Standard16(std::size_t at) const {
    const std::uint32_t first = Unit(at), second = Unit(at + 1);
    if (!IsSurrogate(first)) return {first, 1, {}};
    if (IsLowSurrogate(first)) return Fault(Hex(at, 1) + " is a lone low surrogate: no high one stands before it");
    if (!IsLowSurrogate(second)) return Fault(Hex(at, 1) + " is a lone high surrogate: no low one stands behind it");
    return {0x10000 + ((first & 0x3FF) << 10 | (second & 0x3FF)), 2, {}};
}

Character EncodedText::Standard32(std::size_t at) const {
    const std::uint32_t value = Unit(at);
    if (IsSurrogate(value)) return Fault(Hex(at, 1) + " is a surrogate, which is no character");
    if (value > kHighest) return Fault(Hex(at, 1) + " is above U+10FFFF");
    return {value, 1, {}};
}

bool EncodedText::Library(std::size_t at, Character& character) const {
    ulong32 value = Unit(at);
    std::size_t units = 1;
    bool read = value <= kHighest;
    if (m_form == Encoding::Utf8) {
        unsigned char piece[5] = {}; // the longest sequence and a terminator
        for (std::size_t i = 0; i < 4; ++i) piece[i] = static_cast<unsigned char>(Unit(at + i));
        const unsigned char* in = piece;
        read = TAVO::String::utf8_acfW32(&value, in);
        units = static_cast<std::size_t>(in - piece);
    } else if (m_form == Encoding::Utf16) {
        const wchar_t piece[3] = {static_cast<wchar_t>(Unit(at)), static_cast<wchar_t>(Unit(at + 1))};
        const wchar_t* in = piece;
        read = TAVO::String::acfW_acfW32(&value, in);
        units = static_cast<std::size_t>(in - piece);
    }
    character = {value, units, {}};
    return read;
}

bool AddEncoded(std::string& bytes, std::uint32_t codePoint, const TextFormat& format) {
    wchar_t units[2];
    wchar_t* unit = units;
    if (format.encoding == Encoding::Utf8) {
        unsigned char sequence[4];
        unsigned char* end = sequence;
        if (!TAVO::String::acfW32_utf8(end, codePoint)) return false;
        bytes.append(sequence, end);
    } else if (format.encoding == Encoding::Utf32) {
        if (codePoint > kHighest) return false;
        AddUnit(bytes, codePoint, format.unit, format.bigEndian);
    } else {
        if (!TAVO::String::acfW32_acfW(unit, codePoint)) return false;
        const auto count = static_cast<std::size_t>(unit - units);
        if (format.encoding == Encoding::Ansi) {
            char text[16];
            bytes.append(text, TAVO::String::OS::acfWChar_To_ANSI(units, count, text, sizeof(text)));
            return true;
        }
        for (std::size_t i = 0; i < count; ++i) AddUnit(bytes, units[i], format.unit, format.bigEndian);
    }
    return true;
}

std::string CodePointName(std::uint32_t value) {
    unsigned digits = 4;
    while (digits < 8 && value >> 4 * digits != 0) ++digits;
    return std::string("U+").append(Digits(value, digits));
}

} // namespace tool
