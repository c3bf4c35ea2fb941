#include "text.h"

#include <algorithm>
#include <cstdint>

namespace tool {

namespace {

constexpr std::uint32_t kReplacement = 0xFFFD;
constexpr std::uint32_t kNone = 0xFFFFFFFF;

struct SequenceForm {
    std::uint32_t lead, mask; // the bits that mark the lead byte, and those that carry the value
    std::uint32_t least;      // shorter forms exist below
};
constexpr SequenceForm kSequences[] = {{0x00, 0x7F, 0}, {0xC0, 0x1F, 0x80}, {0xE0, 0x0F, 0x800}, {0xF0, 0x07, 0x10000}};

// Takes one character off the front; kNone when there is none.
std::uint32_t TakeUtf8(std::string_view& text) {
    const auto lead = static_cast<unsigned char>(text[0]);
    for (std::size_t more = 0; more < std::size(kSequences); ++more) {
        const auto& form = kSequences[more];
        if ((lead & ~form.mask) != form.lead || text.size() <= more) continue;
        std::uint32_t character = lead & form.mask;
        for (std::size_t i = 1; i <= more; ++i) {
            const auto next = static_cast<unsigned char>(text[i]);
            if ((next & 0xC0) != 0x80) return kNone;
            character = character << 6 | (next & 0x3F);
        }
        text.remove_prefix(more + 1);
        return character >= form.least && character <= 0x10FFFF ? character : kNone;
    }
    return kNone;
}

void AddUtf8(std::string& text, std::uint32_t character) {
    std::size_t more = 0;
    while (more < 3 && character >= kSequences[more + 1].least) ++more;
    text += static_cast<char>(kSequences[more].lead | character >> 6 * more);
    while (more-- > 0) text += static_cast<char>(0x80 | (character >> 6 * more & 0x3F));
}

bool IsHigh(wchar_t unit) { return unit >= 0xD800 && unit < 0xDC00; }
bool IsLow(wchar_t unit) { return unit >= 0xDC00 && unit < 0xE000; }
std::uint32_t Offset(Pairs pairs) { return pairs == Pairs::Standard ? 0x10000 : 0; }

std::string Encode(const wchar_t* text, Pairs pairs, bool replaceSingles) {
    std::string result;
    for (; text && *text; ++text) {
        std::uint32_t character = *text;
        if (IsHigh(text[0]) && IsLow(text[1])) {
            character = ((text[0] - 0xD800u) << 10 | (text[1] - 0xDC00u)) + Offset(pairs);
            ++text;
            if (character < 0x10000) character = kReplacement; // no text read by the library holds it
        } else if (replaceSingles && (IsHigh(*text) || IsLow(*text))) {
            character = kReplacement;
        }
        AddUtf8(result, character);
    }
    return result;
}

} // namespace

bool ToWide(std::string_view text, Pairs pairs, WideText& wide) {
    wide = WideText();
    while (!text.empty()) {
        std::uint32_t character = TakeUtf8(text);
        if (character == 0 || character == kNone) return false;
        if (character >= 0x10000) {
            character -= Offset(pairs);
            wide.Add(static_cast<wchar_t>(0xD800 + (character >> 10)));
            character = 0xDC00 + (character & 0x3FF);
        }
        wide.Add(static_cast<wchar_t>(character));
    }
    return true;
}

std::string ToUtf8(const wchar_t* text, Pairs pairs) { return Encode(text, pairs, false); }
std::string Shown(const wchar_t* text, Pairs pairs) { return Encode(text, pairs, true); }

std::string Quoted(std::string_view text) {
    constexpr const char* kHex = "0123456789abcdef";
    constexpr std::string_view kShort = "\"\\\b\f\n\r\t";
    constexpr std::string_view kLetters = "\"\\bfnrt";
    std::string result = "\"";
    for (const char c : text) {
        const auto place = kShort.find(c);
        if (place != kShort.npos) {
            result += '\\';
            result += kLetters[place];
        } else if (static_cast<unsigned char>(c) < 0x20 || c == 0x7F) {
            result += "\\u00";
            result += kHex[c >> 4];
            result += kHex[c & 15];
        } else {
            result += c;
        }
    }
    return result += '"';
}

std::string Grouped(unsigned long long number) {
    std::string text = std::to_string(number);
    for (auto place = text.size(); place > 3; place -= 3) text.insert(place - 3, 1, ',');
    return text;
}

} // namespace tool
