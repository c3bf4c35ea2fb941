// tavo crc

#include "commands.h"
#include "facts.h"
#include "position.h"
#include "streams.h"
#include "text.h"

#include <charconv>
#include <TAVO/buffers.h>

namespace tool {

namespace {

// A checksum in the usual parameters; `check` is that of the nine digits "123456789".
struct Model {
    const char* name;
    unsigned width;
    std::uint64_t polynomial, initial;
    bool reflectIn, reflectOut;
    std::uint64_t xorOut, check;
};
constexpr std::uint64_t kOnes64 = ~std::uint64_t{0};
constexpr Model kModels[] = {
    {"crc-5/usb", 5, 0x05, 0x1F, true, true, 0x1F, 0x19},
    {"crc-7/mmc", 7, 0x09, 0, false, false, 0, 0x75},
    {"crc-8/smbus", 8, 0x07, 0, false, false, 0, 0xF4},
    {"crc-8/maxim-dow", 8, 0x31, 0, true, true, 0, 0xA1},
    {"crc-8/tech-3250", 8, 0x1D, 0xFF, true, true, 0, 0x97},
    {"crc-12/umts", 12, 0x80F, 0, false, true, 0, 0xDAF},
    {"crc-15/can", 15, 0x4599, 0, false, false, 0, 0x059E},
    {"crc-16/arc", 16, 0x8005, 0, true, true, 0, 0xBB3D},
    {"crc-16/genibus", 16, 0x1021, 0xFFFF, false, false, 0xFFFF, 0xD64E},
    {"crc-16/ibm-3740", 16, 0x1021, 0xFFFF, false, false, 0, 0x29B1},
    {"crc-16/ibm-sdlc", 16, 0x1021, 0xFFFF, true, true, 0xFFFF, 0x906E},
    {"crc-16/kermit", 16, 0x1021, 0, true, true, 0, 0x2189},
    {"crc-16/modbus", 16, 0x8005, 0xFFFF, true, true, 0, 0x4B37},
    {"crc-16/umts", 16, 0x8005, 0, false, false, 0, 0xFEE8},
    {"crc-16/usb", 16, 0x8005, 0xFFFF, true, true, 0xFFFF, 0xB4C8},
    {"crc-16/xmodem", 16, 0x1021, 0, false, false, 0, 0x31C3},
    {"crc-24/openpgp", 24, 0x864CFB, 0xB704CE, false, false, 0, 0x21CF02},
    {"crc-32/bzip2", 32, 0x04C11DB7, 0xFFFFFFFF, false, false, 0xFFFFFFFF, 0xFC891918},
    {"crc-32/cksum", 32, 0x04C11DB7, 0, false, false, 0xFFFFFFFF, 0x765E7680},
    {"crc-32/iscsi", 32, 0x1EDC6F41, 0xFFFFFFFF, true, true, 0xFFFFFFFF, 0xE3069283},
    {"crc-32/iso-hdlc", 32, 0x04C11DB7, 0xFFFFFFFF, true, true, 0xFFFFFFFF, 0xCBF43926},
    {"crc-32/jamcrc", 32, 0x04C11DB7, 0xFFFFFFFF, true, true, 0, 0x340BC6D9},
    {"crc-32/mpeg-2", 32, 0x04C11DB7, 0xFFFFFFFF, false, false, 0, 0x0376E6E7},
    {"crc-40/gsm", 40, 0x0004820009, 0, false, false, 0xFFFFFFFFFF, 0xD4164FC646},
    {"crc-64/ecma-182", 64, 0x42F0E1EBA9EA3693, 0, false, false, 0, 0x6C40DF5F0B497347},
    {"crc-64/go-iso", 64, 0x1B, kOnes64, true, true, kOnes64, 0xB90956C775A41001},
    {"crc-64/we", 64, 0x42F0E1EBA9EA3693, kOnes64, false, false, kOnes64, 0x62EC59E3F1A4F00A},
    {"crc-64/xz", 64, 0x42F0E1EBA9EA3693, kOnes64, true, true, kOnes64, 0x995DC9BBDF1939FA},
};

constexpr struct {
    const char *alias, *name;
} kAliases[] = {{"crc-16", "crc-16/arc"},
                {"crc-32", "crc-32/iso-hdlc"},
                {"crc-32c", "crc-32/iscsi"},
                {"crc-64", "crc-64/ecma-182"}};

const Model* FindModel(std::string name) {
    for (const auto& row : kAliases)
        if (name == row.alias) name = row.name;
    for (const Model& model : kModels)
        if (name == model.name) return &model;
    return nullptr;
}

std::uint64_t Reversed(std::uint64_t value, unsigned bits) {
    std::uint64_t reversed = 0;
    for (; bits > 0; --bits, value >>= 1) reversed = reversed << 1 | (value & 1);
    return reversed;
}

// The library's machine takes the highest bit first and reflects nothing, and computes nothing at a width of 8 or
// less. So every register lies in the upper bits of one of 64, and what is reflected is reflected here.
class Checksum {
public:
    explicit Checksum(const Model& model)
        : m_model(model), m_machine(64, model.polynomial << Unused()), m_register(model.initial << Unused()) {
        for (unsigned byte = 0; byte < 256; ++byte) m_reversed[byte] = static_cast<char>(Reversed(byte, 8));
    }
    void Add(std::string_view bytes) {
        if (!m_model.reflectIn) {
            m_register = m_machine.Eval(bytes.data(), bytes.size(), m_register);
            return;
        }
        m_reflected.assign(bytes);
        for (char& byte : m_reflected) byte = m_reversed[static_cast<unsigned char>(byte)];
        m_register = m_machine.Eval(m_reflected.data(), m_reflected.size(), m_register);
    }
    std::uint64_t Value() const {
        const std::uint64_t value = m_register >> Unused();
        return (m_model.reflectOut ? Reversed(value, m_model.width) : value) ^ m_model.xorOut;
    }

private:
    unsigned Unused() const { return 64 - m_model.width; }

    const Model& m_model;
    TAVO::Buffers::CMachineCRC m_machine;
    std::uint64_t m_register;
    char m_reversed[256];
    std::string m_reflected;
};

std::string Hex(const Model& model, std::uint64_t value) {
    std::string digits;
    for (unsigned shift = (model.width + 3) / 4 * 4; shift > 0;)
        digits += "0123456789abcdef"[value >> (shift -= 4) & 15];
    return digits;
}

// The options that a name stands for.
std::string Options(const Model& model) {
    std::string line = "--width " + std::to_string(model.width) + " --poly " + Hex(model, model.polynomial);
    if (model.initial) line += " --init " + Hex(model, model.initial);
    if (model.reflectIn) line += " --refin";
    if (model.reflectOut) line += " --refout";
    if (model.xorOut) line += " --xorout " + Hex(model, model.xorOut);
    return line;
}

std::string Json(const Model& model) {
    Facts facts;
    facts.AddText("name", model.name);
    facts.Add("width", std::to_string(model.width));
    facts.AddText("poly", Hex(model, model.polynomial));
    facts.AddText("init", Hex(model, model.initial));
    facts.Add("refin", model.reflectIn);
    facts.Add("refout", model.reflectOut);
    facts.AddText("xorout", Hex(model, model.xorOut));
    facts.AddText("check", Hex(model, model.check));
    return facts.Json();
}

int List(bool json) {
    const auto line = [](std::string name, const std::string& meaning) {
        name.resize(17, ' ');
        Print(name + meaning + '\n');
    };
    std::vector<std::string> rows;
    for (const Model& model : kModels) {
        if (json)
            rows.push_back(Json(model));
        else
            line(model.name, Options(model));
    }
    if (json) return Print(JsonArray(rows)), kFine;
    for (const auto& row : kAliases) line(row.alias, row.name);
    return kFine;
}

// A hexadecimal number of at most `width` bits; empty text leaves the value. False after complaining.
bool ReadNumber(const char* option, std::string text, unsigned width, std::uint64_t& value) {
    if (text.empty()) return true;
    const std::string given = text;
    if (text.compare(0, 2, "0x") == 0 || text.compare(0, 2, "0X") == 0) text.erase(0, 2);
    const char* const end = text.data() + text.size();
    const auto result = std::from_chars(text.data(), end, value, 16);
    if (result.ec == std::errc() && result.ptr == end && value >> (width - 1) <= 1) return true;
    Complain(std::string(option) + ": " + Named(given) + " is no hexadecimal number of " + std::to_string(width) +
             " bits");
    return false;
}

bool FindModel(const CrcOptions& options, Model& model) {
    const bool byNumbers = options.width || options.reflectIn || options.reflectOut ||
                           !(options.polynomial + options.initial + options.xorOut).empty();
    if (!options.name.empty() && !byNumbers) {
        const Model* const found = FindModel(options.name);
        if (!found) {
            Complain(Named(options.name) + " is no name that tavo crc --list knows");
            return false;
        }
        model = *found;
        return true;
    }
    if (!options.name.empty() || options.width == 0 || options.polynomial.empty()) {
        Complain("give --name NAME alone, or --width BITS and --poly HEX");
        return false;
    }
    model = {"", options.width, 0, 0, options.reflectIn, options.reflectOut, 0, 0};
    return ReadNumber("--poly", options.polynomial, model.width, model.polynomial) &&
           ReadNumber("--init", options.initial, model.width, model.initial) &&
           ReadNumber("--xorout", options.xorOut, model.width, model.xorOut);
}

} // namespace

int Crc(const CrcOptions& options) {
    if (options.list) return List(options.json);
    Model model;
    if (!FindModel(options, model)) return kUsage;
    int worst = kFine;
    std::vector<std::string> rows;
    for (const std::string& file : options.files.empty() ? std::vector<std::string>{"-"} : options.files) {
        Checksum checksum(model);
        std::uint64_t size = 0;
        std::string trouble;
        const bool read = ReadPieces(file, trouble, [&](std::string_view piece) {
            checksum.Add(piece);
            size += piece.size();
        });
        if (!read) {
            Complain(file + ": " + trouble);
            worst = kFileTrouble;
            continue;
        }
        const std::string digits = Hex(model, checksum.Value());
        if (!options.json) {
            Print(digits + "  " + file + '\n');
            continue;
        }
        Facts facts;
        facts.AddText("file", Cleaned(file));
        facts.AddText("crc", digits);
        facts.Add("bytes", std::to_string(size));
        rows.push_back(facts.Json());
    }
    if (options.json) Print(JsonArray(rows));
    return worst;
}

} // namespace tool
