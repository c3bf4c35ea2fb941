// The 3F and 3FFF codecs against their definition, taken bit by bit.
// Input: bytes to encode; the same bytes as the units of a text to decode.

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <TAVO/string.h>
#include <vector>

namespace {

using namespace TAVO::String;
using TAVO::Buffers::CPPlainMemory;
using Bytes = std::vector<std::uint8_t>;
using Units = std::vector<wchar_t>;

void Require(bool condition) {
    if (!condition) std::abort();
}

Bytes BytesOf(const CPPlainMemory& memory) {
    const auto* bytes = static_cast<const std::uint8_t*>(static_cast<void*>(memory));
    return Bytes(bytes, bytes + memory.GetSize());
}

void CheckEncoded(const CPPoolString& text, std::size_t size, std::size_t group, unsigned mark) {
    Require(text.len() == 1 + (size + group - 1) / group * 4);
    Require(static_cast<const wchar_t*>(text)[0] == mark + group - size % group);
}

void CheckEncoders(const Bytes& bytes) {
    const CPPoolString text3F = C3FEncoder(bytes.data(), bytes.size());
    CheckEncoded(text3F, bytes.size(), 3, 0x0100);
    const Bytes back = BytesOf(C3FDecoder(text3F));
    Require(back.size() == (bytes.size() % 3 ? bytes.size() : 0));
    // The first byte of a group always comes back.
    for (std::size_t i = 0; i < back.size(); ++i) Require(i % 3 || back[i] == bytes[i]);

    const CPPoolString text3FFF = C3FFFEncoder(bytes.data(), bytes.size());
    CheckEncoded(text3FFF, bytes.size(), 7, 0x0300);
    Require(BytesOf(C3FFFDecoder(text3FFF)) == bytes);
}

Bytes Reference3F(const Units& text) {
    const unsigned padding = text[0] & 0xFF;
    Bytes bytes;
    if (text[0] >> 8 != 1 || padding > 2 || text.size() % 4 != 1) return bytes;
    for (std::size_t i = 1; i < text.size(); i += 4) {
        const int u0 = text[i] - 0x21, u1 = text[i + 1] - 0x21, u2 = text[i + 2] - 0x21, u3 = text[i + 3] - 0x21;
        bytes.push_back(static_cast<std::uint8_t>(u0 | u1 * 64));
        bytes.push_back(static_cast<std::uint8_t>(u1 >> 4 | u2 * 16));
        bytes.push_back(static_cast<std::uint8_t>(u2 >> 4 | u3 * 4));
    }
    bytes.resize(bytes.size() < padding ? 0 : bytes.size() - padding);
    return bytes;
}

Bytes Reference3FFF(const Units& text) {
    const std::size_t padding = text[0] & 0xFF, groups = text.size() / 4;
    if (text[0] >> 8 != 3 || padding < 1 || padding > 7 || text.size() % 4 != 1) return {};
    if (groups == 0) return {};
    Bytes bytes(groups * 7);
    for (std::size_t bit = 0; bit < bytes.size() * 8; ++bit) {
        const unsigned unit = text[1 + bit / 14];
        if (unit < 0x4000 || unit > 0x7FFF) return {};
        bytes[bit / 8] = static_cast<std::uint8_t>(bytes[bit / 8] | (unit >> bit % 14 & 1) << bit % 8);
    }
    bytes.resize(bytes.size() - padding % 7);
    return bytes;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    CheckEncoders(Bytes(data, data + size));
    Units text;
    for (std::size_t i = 0; i + 1 < size && (data[i] || data[i + 1]); i += 2)
        text.push_back(static_cast<wchar_t>(data[i] | data[i + 1] << 8));
    text.push_back(0);
    text.shrink_to_fit();
    const Bytes got3F = BytesOf(C3FDecoder(text.data())), got3FFF = BytesOf(C3FFFDecoder(text.data()));
    if (text.size() > 1) text.pop_back();
    Require(got3F == Reference3F(text) && got3FFF == Reference3FFF(text));
    return 0;
}
