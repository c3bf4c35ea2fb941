// tavo codec

#include "commands.h"
#include "encodings.h"
#include "streams.h"
#include "text.h"

#include <TAVO/string.h>

namespace tool {

namespace {

using namespace TAVO::String;
using TAVO::Buffers::CPPlainMemory;
using Units = std::vector<wchar_t>;

std::string NameOf(const std::string& file) { return file == "-" ? "(standard input)" : file; }

// The units of a text, without the ends of lines behind it. False with the reason for what stands behind them.
bool ReadUnits(const EncodedText& text, Units& units, std::string& why) {
    for (std::size_t at = text.Begin(); at < text.End();) {
        const Character character = text.Standard(at);
        why = character.fault;
        if (why.empty() && (character.value == 0 || character.value > 0xFFFF))
            why = CodePointName(character.value) + " belongs to no code";
        if (!why.empty()) return false;
        units.push_back(static_cast<wchar_t>(character.value));
        at += character.units;
    }
    if (text.Rest()) why = "the text ends within a unit";
    while (why.empty() && !units.empty() && (units.back() == '\n' || units.back() == '\r')) units.pop_back();
    return why.empty();
}

// The bytes before a unit, when all before it are good.
std::size_t OffsetOf(const EncodedText& text, std::size_t unit) {
    std::size_t at = text.Begin();
    while (unit-- > 0 && at < text.End()) at += text.Standard(at).units;
    return text.Offset(at);
}

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
        return wrong(0, CodePointName(units[0]) + " is no header: that is " + CodePointName(code.mark + code.from) +
                            " to " + CodePointName(code.mark + code.to));
    for (std::size_t i = 1; i < units.size(); ++i)
        if (!code.isUnit((i - 1) % 4, units[i])) return wrong(i, CodePointName(units[i]) + " does not belong there");
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
            why = CodePointName(unit) + " is no hexadecimal digit";
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
    const EncodedText text(file, GuessTextFormat(file));
    const Code* const code = FindCode(options.code);
    Units units;
    std::string bytes, why;
    std::size_t at = 0;
    bool good = ReadUnits(text, units, why);
    if (!good)
        at = units.size();
    else if (code)
        good = !FindFault(*code, units, at, why);
    else
        good = FromHex(units, options.nibbles == kLowFirst, bytes, at, why);
    if (!good) {
        Complain(NameOf(options.file) + ": unit " + std::to_string(at + 1) + ", at offset " +
                 std::to_string(OffsetOf(text, at)) + ": " + why);
        return kBadInput;
    }
    if (!code) return Write(options, bytes);
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
