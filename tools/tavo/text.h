#pragma once
// Text inside the tool is UTF-8; the library takes and gives wide text. Names of files need the standard's pairs, texts
// of documents the pairs that the library made when it read them.

#include <string>
#include <string_view>
#include <vector>

namespace tool {

// How a character above U+FFFF is kept in two units.
enum class Pairs {
    Standard, // file names, and documents read from UTF-16
    Library   // documents read from UTF-8: without the offset of 10000
};

// Zero-terminated wide text.
class WideText {
public:
    WideText() : m_units{0} {}
    void Add(wchar_t unit) {
        m_units.back() = unit;
        m_units.push_back(0);
    }
    operator const wchar_t*() const { return m_units.data(); }

private:
    std::vector<wchar_t> m_units;
};

// False for bytes that are no UTF-8 and for a zero character. Single surrogates pass, so that every file name of
// Windows makes the round trip.
bool ToWide(std::string_view text, Pairs pairs, WideText& wide);

// Up to the terminator; null is empty.
std::string ToUtf8(const wchar_t* text, Pairs pairs);

// What cannot be shown becomes U+FFFD: single surrogates, which are no valid UTF-8.
std::string Shown(const wchar_t* text, Pairs pairs);

// In double quotes, escaped as JSON escapes.
std::string Quoted(std::string_view text);

// "1234567" as "1,234,567".
std::string Grouped(unsigned long long number);

} // namespace tool
