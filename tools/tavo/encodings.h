#pragma once
// Encoded text, read twice: as the Unicode standard has it, and by the library, whose rules are its own.

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace tool {

enum class Encoding { Utf8, Utf16, Utf32, Ansi };

// How text lies in a file. A mark (U+FEFF) at its beginning belongs to the text only where `marked` is false.
struct TextFormat {
    const char* name;
    Encoding encoding;
    std::size_t unit; // bytes
    bool bigEndian;   // without a mark
    bool marked;      // a mark may tell the byte order; written for units of two and four bytes
};

std::vector<std::string> TextFormatNames();
// Requires: one of the names.
const TextFormat& FindTextFormat(const std::string& name);
// The format that a mark tells; UTF-8 without one.
const TextFormat& GuessTextFormat(std::string_view bytes);

// One character, or why there is none.
struct Character {
    std::uint32_t value = 0;
    std::size_t units = 1;
    std::string fault; // names the bytes; empty for a character
};

class EncodedText {
public:
    // The bytes must outlive the text, unless they are in the ANSI code page: that is converted by the system first,
    // and looked at as the UTF-16 that comes out.
    EncodedText(std::string_view bytes, const TextFormat& format);
    EncodedText(const EncodedText&) = delete;

    // Where the text begins and ends, in units.
    std::size_t Begin() const { return m_begin; }
    std::size_t End() const { return m_end; }
    // Bytes before the unit; only in the file's own encoding, so not in the ANSI code page.
    std::size_t Offset(std::size_t at) const { return at * m_unit; }
    bool HasOffsets() const { return m_wide.empty(); }
    // Bytes behind the last unit, too few for another.
    std::size_t Rest() const { return m_bytes.size() % m_unit; }
    Encoding Form() const { return m_form; }

    // The character at a place before the end, by the standard; `units` of a fault is 1.
    Character Standard(std::size_t at) const;
    // The same by the library's own step; false where it goes no further.
    bool Library(std::size_t at, Character& character) const;

    std::uint32_t Unit(std::size_t at) const; // 0 behind the end

private:
    Character Standard8(std::size_t at) const;
    Character Standard16(std::size_t at) const;
    Character Standard32(std::size_t at) const;
    std::string Hex(std::size_t at, std::size_t count) const;

    std::string m_wide; // the system's conversion of ANSI text
    std::string_view m_bytes;
    Encoding m_form;
    std::size_t m_unit;
    bool m_bigEndian;
    std::size_t m_begin = 0, m_end = 0;
};

// Adds a code point in the bytes of a format, by the library's own encoders. False for what they refuse.
bool AddEncoded(std::string& bytes, std::uint32_t codePoint, const TextFormat& format);

// A place for people: lines end with a line feed, columns are characters; both count from 1.
struct TextPlace {
    std::size_t line = 1, column = 1;

    void Pass(std::uint32_t character) {
        ++column;
        if (character == '\n') ++line, column = 1;
    }
    std::string Shown() const { return std::to_string(line) + ':' + std::to_string(column); }
};

// "U+00E9"
std::string CodePointName(std::uint32_t value);

} // namespace tool
