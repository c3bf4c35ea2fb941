#pragma once
// Texts of documents in the encodings that a document can be opened in.

#include "guardpage.h"
#include "xmlreference.h"

#include <filesystem>
#include <gtest/gtest.h>
#include <stdexcept>

namespace support {

// A good UTF-8 text in UTF-16. A path is what the standard library still converts.
inline std::u16string ToUtf16(const std::string& text) {
    const std::u8string bytes(text.begin(), text.end());
    return std::filesystem::path(bytes).u16string();
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

// Opens the text up to its first zero in every way, and compares with the second reader.
inline void Compare(const std::string& whole) {
    const std::string text = whole.c_str(), marked = WithMark(text);
    ASSERT_EQ(OpenUtf8(text), XmlReference::Read(text)) << text;
    if (!text.empty()) {
        ASSERT_EQ(OpenRaw(marked), XmlReference::Read(marked)) << text;
    }
}
inline void Compare(const std::u16string& whole) {
    const std::u16string text = whole.c_str(), marked = u"\xFEFF" + text;
    ASSERT_EQ(OpenUtf16(text), XmlReference::Read(text)) << Printable(text);
    for (bool swapped : {false, true})
        if (!text.empty()) {
            ASSERT_EQ(OpenRaw(BytesOf(marked, swapped)), XmlReference::Read(marked)) << Printable(text);
        }
}

inline void PrintTo(const Reading& reading, std::ostream* out) {
    *out << "code " << reading.code << " at " << reading.offset << " [" << reading.outline << "] \""
         << Printable(reading.message) << '"';
}

} // namespace support
