#pragma once
// The library's own checksum (64 bits, the polynomial of ECMA-182, most significant bit first, initial value 0) by
// slices of eight bytes. Constants: usable before any constructor ran.

#include <array>
#include <bit>
#include <cstdint>
#include <cstring>

namespace TAVO::crc64 {

constexpr std::uint64_t kPolynomial = 0x42F0E1EBA9EA3693;

using Table = std::array<std::uint64_t, 256>;

// kSlices[k][b] is the checksum of byte b followed by k zero bytes.
constexpr std::array<Table, 8> MakeSlices() {
    std::array<Table, 8> slices{};
    for (unsigned b = 0; b < 256; ++b) {
        std::uint64_t r = static_cast<std::uint64_t>(b) << 56;
        for (int bit = 0; bit < 8; ++bit) r = r >> 63 ? (r << 1) ^ kPolynomial : r << 1;
        slices[0][b] = r;
    }
    for (unsigned k = 1; k < 8; ++k)
        for (unsigned b = 0; b < 256; ++b) {
            const std::uint64_t before = slices[k - 1][b];
            slices[k][b] = slices[0][before >> 56] ^ (before << 8);
        }
    return slices;
}

alignas(64) inline constexpr std::array<Table, 8> kSlices = MakeSlices();

// Four, two or one units of 16 bits: each byte of `units`, lowest first, is fed in turn. Little-endian order of bytes
// is that of the text in memory, so callers load units and pass them on.
constexpr std::uint64_t SwapBytes(std::uint64_t v) {
    v = (v & 0x00FF00FF00FF00FF) << 8 | (v >> 8 & 0x00FF00FF00FF00FF);
    v = (v & 0x0000FFFF0000FFFF) << 16 | (v >> 16 & 0x0000FFFF0000FFFF);
    return v << 32 | v >> 32;
}

constexpr std::uint64_t Add4(std::uint64_t crc, std::uint64_t units) {
    const std::uint64_t x = crc ^ SwapBytes(units);
    return kSlices[7][x >> 56] ^ kSlices[6][(x >> 48) & 255] ^ kSlices[5][(x >> 40) & 255] ^
           kSlices[4][(x >> 32) & 255] ^ kSlices[3][(x >> 24) & 255] ^ kSlices[2][(x >> 16) & 255] ^
           kSlices[1][(x >> 8) & 255] ^ kSlices[0][x & 255];
}

constexpr std::uint64_t Add2(std::uint64_t crc, std::uint32_t units) {
    const std::uint64_t x = (crc >> 32) ^ (SwapBytes(units) >> 32);
    return kSlices[3][x >> 24] ^ kSlices[2][(x >> 16) & 255] ^ kSlices[1][(x >> 8) & 255] ^ kSlices[0][x & 255] ^
           (crc << 32);
}

constexpr std::uint64_t Add1(std::uint64_t crc, std::uint16_t unit) {
    const std::uint64_t x = (crc >> 48) ^ static_cast<std::uint16_t>(unit << 8 | unit >> 8);
    return kSlices[1][x >> 8] ^ kSlices[0][x & 255] ^ (crc << 16);
}

constexpr std::uint64_t AddByte(std::uint64_t crc, unsigned char byte) {
    return kSlices[0][(crc >> 56) ^ byte] ^ (crc << 8);
}

inline std::uint64_t AddBytes(std::uint64_t crc, const void* data, std::size_t length) {
    const auto* bytes = static_cast<const unsigned char*>(data);
    for (; length >= 8; length -= 8, bytes += 8) {
        std::uint64_t word;
        std::memcpy(&word, bytes, 8);
        crc = Add4(crc, word);
    }
    for (; length; --length) crc = AddByte(crc, *bytes++);
    return crc;
}

} // namespace TAVO::crc64
