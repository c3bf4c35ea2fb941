#pragma once
// Texts of documents in the encodings that a document can be opened in.

#include "guardpage.h"
#include "xmlreference.h"

#include <gtest/gtest.h>
#include <stdexcept>

namespace support {

// A good UTF-8 text in UTF-16.
inline std::u16string ToUtf16(const std::string& text) {
    std::u16string units;
    for (std::size_t i = 0; i < text.size();) {
        const unsigned lead = static_cast<unsigned char>(text[i]);
        const std::size_t length = lead < 0x80 ? 1 : lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : 4;
        char32_t value = length == 1 ? lead : lead & (0xFFu >> (length + 1));
        for (std::size_t k = 1; k < length; ++k) value = value << 6 | (static_cast<unsigned char>(text[i + k]) & 0x3F);
        i += length;
        if (value >= 0x10000) {
            units += static_cast<char16_t>(0xD7C0 + (value >> 10));
            value = 0xDC00 | (value & 0x3FF);
        }
        units += static_cast<char16_t>(value);
    }
    return units;
}

// The bytes of units, in host order or swapped.
inline std::string BytesOf(const std::u16string& units, bool swapped = false) {
    std::string bytes;
    for (char16_t unit : units) {
        const char low = static_cast<char>(unit & 0xFF), high = static_cast<char>(unit >> 8);
        bytes += swapped ? high : low;
        bytes += swapped ? low : high;
    }
    return bytes;
}

template <class... Arguments> Reading OpenText(Arguments... arguments) {
    TAVO::XML::CXMLDoc document;
    const bool opened = document.OpenDocText(arguments...);
    const Reading reading = ReadingOf(document);
    EXPECT_EQ(opened, reading.code == 128);
    return reading;
}
inline Reading OpenUtf8(const std::string& text) {
    return OpenText(reinterpret_cast<const unsigned char*>(text.c_str()));
}
inline Reading OpenUtf16(const std::u16string& text) {
    return OpenText(reinterpret_cast<const unsigned short*>(text.c_str()));
}

// Raw bytes, right before an inaccessible page; they must not change.
inline Reading OpenRaw(const std::string& bytes) {
    static const GuardedMemory memory;
    if (bytes.size() > GuardedMemory::kSize) throw std::length_error("too long for guarded memory");
    char* const place = memory.Place(bytes.data(), bytes.size());
    const Reading reading = OpenText(static_cast<void*>(place), static_cast<unsigned long long>(bytes.size()));
    EXPECT_EQ(std::string(place, bytes.size()), bytes) << "the caller's bytes were written";
    return reading;
}

inline std::string WithMark(const std::string& text) { return std::string("\xEF\xBB\xBF").append(text); }

inline void PrintTo(const Reading& reading, std::ostream* out) {
    *out << "code " << reading.code << " at " << reading.offset << " [" << reading.outline << "] \""
         << Printable(reading.message) << '"';
}

} // namespace support
