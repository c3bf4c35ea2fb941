// tavo codec

#include "commands.h"
#include "position.h"
#include "streams.h"
#include "text.h"

#include <TAVO/string.h>

namespace tool {

namespace {

using namespace TAVO::String;
using TAVO::Buffers::CPPlainMemory;
using Units = std::vector<wchar_t>;

std::string NameOf(const std::string& file) { return file == "-" ? "(standard input)" : file; }

// The first fault of a text, in words.
struct Fault {
    std::size_t offset; // bytes from the start of the file
    std::string what;
};

std::string UnitName(std::uint32_t character) {
    std::string digits;
    for (int shift = character > 0xFFFF ? 20 : 12; shift >= 0; shift -= 4)
        digits += "0123456789ABCDEF"[character >> shift & 15];
    return "U+" + digits;
}

// The file's text in units: UTF-8, or UTF-16 with its mark. Ends of lines behind the text do not belong to it.
class Text {
public:
    explicit Text(std::string_view bytes) : m_bytes(bytes) {
        if (IsUtf16())
            m_start = 2;
        else if (bytes.substr(0, 3) == "\xEF\xBB\xBF")
            m_start = 3;
    }

    const Units& All() const { return m_units; }
    // False with the first place that is no unit.
    bool Read(Fault& fault) {
        std::string_view rest = m_bytes.substr(m_start);
        while (!rest.empty()) {
            const std::size_t offset = m_bytes.size() - rest.size();
            const std::uint32_t character = Take(rest);
            if (character > 0xFFFF || character == 0) {
                fault = {offset, character == kNoCharacter ? "the bytes are no text"
                                                           : UnitName(character) + " belongs to no code"};
                return false;
            }
            m_units.push_back(static_cast<wchar_t>(character));
        }
        while (!m_units.empty() && (m_units.back() == '\n' || m_units.back() == '\r')) m_units.pop_back();
        return true;
    }
    std::size_t OffsetOf(std::size_t unit) const {
        std::string_view rest = m_bytes.substr(m_start);
        while (unit-- > 0 && !rest.empty()) Take(rest);
        return m_bytes.size() - rest.size();
    }

private:
    bool IsUtf16() const { return m_bytes.substr(0, 2) == "\xFF\xFE" || m_bytes.substr(0, 2) == "\xFE\xFF"; }
    std::uint32_t Take(std::string_view& rest) const {
        if (!IsUtf16()) return TakeUtf8(rest);
        if (rest.size() < 2) return kNoCharacter;
        const auto first = static_cast<unsigned char>(rest[0]), second = static_cast<unsigned char>(rest[1]);
        rest.remove_prefix(2);
        return m_bytes[0] == '\xFF' ? first | second << 8 : first << 8 | second;
    }

    std::string_view m_bytes;
    std::size_t m_start = 0;
    Units m_units;
};

// --- 3F and 3FFF -----------------------------------------------------------------------------------------------------

bool Is3FUnit(std::size_t place, wchar_t unit) {
    return place == 1 ? unit <= 0xFF && (unit & 15) >= 1 && (unit & 15) <= 4 : unit >= 0x21 && unit <= 0x60;
}
bool Is3FFFUnit(std::size_t, wchar_t unit) { return unit >= 0x4000 && unit <= 0x7FFF; }

template <class Encoder> CPPoolString EncodeWith(const std::string& bytes) {
    return Encoder(bytes.data(), bytes.size());
}
template <class Decoder> CPPlainMemory DecodeWith(const wchar_t* text) { return Decoder(text); }

// One of the library's codes. The tool looks at a text before the library does, which tells no place, and more
// strictly.
struct Code {
    const char* name;
    std::size_t group;                               // bytes
    wchar_t mark;                                    // the header without the padding
    unsigned from, to;                               // the paddings that are decoded
    bool (*isUnit)(std::size_t place, wchar_t unit); // place: 0 to 3 in the group
    CPPoolString (*encode)(const std::string& bytes);
    CPPlainMemory (*decode)(const wchar_t* text);
};
constexpr Code kCodes[] = {
    {"3f", 3, 0x0100, 0, 2, Is3FUnit, EncodeWith<C3FEncoder>, DecodeWith<C3FDecoder>},
    {"3fff", 7, 0x0300, 1, 7, Is3FFFUnit, EncodeWith<C3FFFEncoder>, DecodeWith<C3FFFDecoder>},
};

const Code* FindCode(const std::string& name) {
    for (const Code& code : kCodes)
        if (name == code.name) return &code;
    return nullptr;
}

// The unit that is wrong, counted from 0, and why. False when there is none.
bool FindFault(const Code& code, const Units& units, std::size_t& at, std::string& why) {
    const auto wrong = [&](std::size_t unit, std::string reason) {
        at = unit;
        why = std::move(reason);
        return true;
    };
    if (units.empty()) return wrong(0, "the text ends where its header belongs");
    const unsigned padding = static_cast<unsigned>(units[0] - code.mark);
    if (code.group == 3 && padding == 3)
        return wrong(0, "U+0103 stands for a size that is a multiple of 3: such a text is written but never decoded");
    if (padding < code.from || padding > code.to)
        return wrong(0, UnitName(units[0]) + " is no header: that is " + UnitName(code.mark + code.from) + " to " +
                            UnitName(code.mark + code.to));
    for (std::size_t i = 1; i < units.size(); ++i)
        if (!code.isUnit((i - 1) % 4, units[i])) return wrong(i, UnitName(units[i]) + " does not belong there");
    if (units.size() % 4 != 1) return wrong(units.size(), "the text ends within a group of four units");
    if (units.size() == 1 && padding % code.group != 0) return wrong(1, "the text ends where a padded group belongs");
    return false;
}

// What a text of 3F brings back, against what went in; empty when that is the same.
std::string Losses(const Code& code, const std::string& bytes, const wchar_t* text) {
    if (code.group != 3) return {};
    if (bytes.size() % 3 == 0)
        return std::to_string(bytes.size()) + " bytes are a multiple of 3: such a text cannot be decoded; 3fff can";
    const CPPlainMemory back = code.decode(text);
    const auto* got = static_cast<const char*>(static_cast<void*>(back));
    std::size_t changed = 0, first = 0;
    for (std::size_t i = bytes.size(); i-- > 0;)
        if (back.GetSize() <= i || got[i] != bytes[i]) ++changed, first = i;
    if (changed == 0) return {};
    return std::to_string(changed) + " of " + std::to_string(bytes.size()) +
           " bytes would come back changed, the first at offset " + std::to_string(first) + "; 3fff brings all back";
}

// --- hex -------------------------------------------------------------------------------------------------------------

constexpr const char* kLowFirst = "low-first";

std::string ToHex(const std::string& bytes, bool lowFirst) {
    std::string text;
    text.reserve(bytes.size() * 2);
    for (const char c : bytes) {
        const char digits[] = {"0123456789ABCDEF"[c >> 4 & 15], "0123456789ABCDEF"[c & 15]};
        text += digits[lowFirst];
        text += digits[!lowFirst];
    }
    return text;
}

int Digit(wchar_t unit) {
    if (unit >= '0' && unit <= '9') return unit - '0';
    const int letter = unit | 0x20;
    return letter >= 'a' && letter <= 'f' ? letter - 'a' + 10 : -1;
}

bool FromHex(const Units& units, bool lowFirst, std::string& bytes, std::size_t& at, std::string& why) {
    int high = -1;
    for (at = 0; at < units.size(); ++at) {
        const wchar_t unit = units[at];
        if (unit == ' ' || unit == '\t' || unit == '\n' || unit == '\r') continue;
        const int digit = Digit(unit);
        if (digit < 0) {
            why = UnitName(unit) + " is no hexadecimal digit";
            return false;
        }
        if (high >= 0) bytes += static_cast<char>(lowFirst ? digit << 4 | high : high << 4 | digit);
        high = high >= 0 ? -1 : digit;
    }
    if (high < 0) return true;
    why = "the text ends within a byte";
    return false;
}

int Write(const CodecOptions& options, std::string_view bytes) {
    std::string trouble;
    if (WriteAll(options.output, bytes, trouble)) return kFine;
    Complain(options.output + ": " + trouble);
    return kFileTrouble;
}

bool Read(const CodecOptions& options, std::string& bytes) {
    std::string trouble;
    if (ReadAll(options.file, bytes, trouble)) return true;
    Complain(NameOf(options.file) + ": " + trouble);
    return false;
}

} // namespace

std::vector<std::string> CodecNames() {
    std::vector<std::string> names;
    for (const Code& code : kCodes) names.emplace_back(code.name);
    names.emplace_back("hex");
    return names;
}

std::vector<std::string> NibbleOrders() { return {"high-first", kLowFirst}; }

int CodecEncode(const CodecOptions& options) {
    std::string bytes;
    if (!Read(options, bytes)) return kFileTrouble;
    const Code* const code = FindCode(options.code);
    if (!code) return Write(options, ToHex(bytes, options.nibbles == kLowFirst) + '\n');
    const CPPoolString text = code->encode(bytes);
    if (text.isnull()) {
        Complain(NameOf(options.file) + ": there is no memory for its text");
        return kFileTrouble;
    }
    const std::string losses = Losses(*code, bytes, text);
    if (!losses.empty()) Complain(NameOf(options.file) + ": " + losses);
    if (!losses.empty() && options.strict) return kBadInput;
    return Write(options, ToUtf8(text, Pairs::Standard) + '\n');
}

int CodecDecode(const CodecOptions& options) {
    std::string file;
    if (!Read(options, file)) return kFileTrouble;
    Text text(file);
    Fault fault;
    const auto refuse = [&](std::size_t unit) {
        Complain(NameOf(options.file) + ": unit " + std::to_string(unit + 1) + ", at offset " +
                 std::to_string(fault.offset) + ": " + fault.what);
        return kBadInput;
    };
    if (!text.Read(fault)) return refuse(text.All().size());
    std::size_t at = 0;
    std::string bytes;
    const Code* const code = FindCode(options.code);
    const bool good = code ? !FindFault(*code, text.All(), at, fault.what)
                           : FromHex(text.All(), options.nibbles == kLowFirst, bytes, at, fault.what);
    if (!good) {
        fault.offset = text.OffsetOf(at);
        return refuse(at);
    }
    if (!code) return Write(options, bytes);
    Units units = text.All();
    const std::size_t size = units.size() / 4 * code->group - (units[0] - code->mark) % code->group;
    units.push_back(0);
    const CPPlainMemory memory = code->decode(units.data());
    if (memory.GetSize() != size) {
        Complain(NameOf(options.file) + ": there is no memory for its bytes");
        return kFileTrouble;
    }
    return Write(options, {static_cast<const char*>(static_cast<void*>(memory)), size});
}

} // namespace tool
