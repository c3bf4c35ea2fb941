// Documents from bytes: no crash, nothing read behind the end, nothing written, answers that agree with each other,
// with a second reader written from the rules, and between UTF-8 and UTF-16. Input: the bytes, as they are.

#include "../tests/support/xmlreference.h"
#include "require.h"

#include <cstdint>
#include <cstring>

namespace {

using namespace support;
using namespace TAVO;

constexpr std::size_t kLongest = 2048; // what the second reader is asked to read

// Long texts that differ only in pairs, or in 01 in their place, may be one entry of the pool: they are all one here.
std::string WithoutPairs(const std::string& outline) {
    std::string out;
    for (std::size_t i = 0; i < outline.size(); ++i) {
        const bool isPair = outline.compare(i, 2, "\\D") == 0 && i + 10 <= outline.size() && outline[i + 5] == '\\' &&
                            std::strchr("89AB", outline[i + 2]);
        const bool isOne = outline.compare(i, 5, "\\0001") == 0;
        out += isPair || isOne ? '*' : outline[i];
        i += isPair ? 9 : isOne ? 4 : 0;
    }
    return out;
}
bool Compares(const std::string& outline, const std::string& other) {
    return WithoutPairs(outline) == WithoutPairs(other);
}

// What every answer must be, whatever the text was.
void CheckAnswer(XML::CXMLDoc& document, bool opened, std::size_t size) {
    unsigned long long offset = 0;
    String::CACFWChar text;
    const auto code = document.GetErrorInfo(&offset, &text);
    Require(opened == (code == 128) && (code <= 17 || opened) && offset <= size);
    Require(text && (text[0] == 0) == opened);
    Require(opened || !document.GetRootElement().key());
    Require(Units(text).size() <= 139);
}

// Nothing that differs by encoding: sequences that are skipped by units, characters of other forms, names of encodings.
bool IsSameInUtf16(const std::string& text) {
    if (text.find("encoding") != text.npos) return false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const unsigned c = static_cast<unsigned char>(text[i]);
        if (c == 0xC0 || c == 0xC1 || c == 0xED || c >= 0xF0) return false; // overlong, surrogates, pairs
        if (c == 0xE0 && static_cast<unsigned char>(text[i + 1]) < 0xA0) return false;
        for (std::size_t k = i + 1; c == '&' && k < text.size() && k < i + 5; ++k)
            if (static_cast<unsigned char>(text[k]) >= 0x80) return false;
    }
    return true;
}

void CheckText(const std::string& text) {
    XML::CXMLDoc document;
    const bool opened = document.OpenDocText(reinterpret_cast<const unsigned char*>(text.c_str()));
    CheckAnswer(document, opened, text.size());
    if (text.size() > kLongest) return;
    const Reading reading = ReadingOf(document);
    try {
        const Reading expected = XmlReference::Read(text);
        Require(reading.code == expected.code && reading.offset == expected.offset);
        Require(reading.message == expected.message && Compares(reading.outline, expected.outline));
    } catch (const XmlReference::TooDeep&) {
        return;
    }
    if (reading.code == 13 || !IsSameInUtf16(text)) return;

    std::u16string units(text.size() + 1, 0);
    units.resize(String::UTF8_To_acfWChar(reinterpret_cast<const unsigned char*>(text.c_str()), text.size(),
                                          reinterpret_cast<wchar_t*>(units.data()), units.size()) -
                 1);
    Require(document.OpenDocText(reinterpret_cast<const unsigned short*>(units.c_str())) == opened);
    const Reading wide = ReadingOf(document);
    Require(wide.code == reading.code && Compares(wide.outline, reading.outline));
    const std::string before = text.substr(0, reading.offset);
    Require(wide.offset ==
            String::UTF8u16strlen(reinterpret_cast<const unsigned char*>(before.c_str()), before.size()));
}

void CheckUnits(const std::u16string& units) {
    XML::CXMLDoc document;
    CheckAnswer(document, document.OpenDocText(reinterpret_cast<const unsigned short*>(units.c_str())), units.size());
    if (units.size() > kLongest) return;
    const Reading reading = ReadingOf(document);
    try {
        const Reading expected = XmlReference::Read(units);
        Require(reading.code == expected.code && reading.offset == expected.offset);
        Require(reading.message == expected.message && Compares(reading.outline, expected.outline));
    } catch (const XmlReference::TooDeep&) {
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string bytes(reinterpret_cast<const char*>(data), size);
    {
        // The very bytes: a sanitizer sees what lies behind them.
        XML::CXMLDoc document;
        const bool opened = document.OpenDocText(const_cast<std::uint8_t*>(data), size);
        CheckAnswer(document, opened, size);
        Require(size == 0 || std::memcmp(data, bytes.data(), size) == 0);
    }
    CheckText(bytes.substr(0, bytes.find('\0')));
    std::u16string units(size / 2, 0);
    if (size > 1) std::memcpy(units.data(), data, size / 2 * 2);
    CheckUnits(units.substr(0, units.find(u'\0')));
    static unsigned runs = 0;
    if (++runs % 1024 == 0) String::CStringPool::Collect(60000); // or the pool would grow for ever
    return 0;
}
