// The 3F and 3FFF codecs at the ends of their memory; the fuzz replay compares both ways with the definition.

#include "../fuzz/codecs_reference.h"
#include "support/guardpage.h"
#include "support/heapwatch.h"
#include "support/log.h"

#include <gtest/gtest.h>

using namespace reference;
using namespace TAVO::String;
using TAVO::Buffers::CPPlainMemory;

namespace {

// The text placed so that nothing behind its terminator can be read.
template <class Decoder> Bytes Decoded(Units units) {
    static const support::GuardedMemory guarded;
    const CPPoolString pooled(CStringPool::GetStringRefn(units.data(), units.size()));
    units.push_back(0);
    const Bytes bytes = BytesOf(Decoder(guarded.Place(units.data(), units.size())));
    EXPECT_EQ(BytesOf(Decoder(pooled)), bytes);
    return bytes;
}

// How often since the last call a text was refused.
std::size_t Refusals() {
    const support::Texts lines = support::Log::Take();
    EXPECT_EQ(lines,
              support::Texts(lines.size(), "2 TAVO source/TAVO/cstringpool:0 C3FDecoder: Invalid string passed"));
    return lines.size();
}

struct Codecs : testing::Test {
    support::Log log;
};

} // namespace

// Intended: 3f-wrap, 3f-multiples, codec-announced
TEST_F(Codecs, Intended3FDoesNotBringEveryBlockBack) {
    int changed = 0;
    for (int block = 0; block < 65536; ++block) {
        const Bytes bytes{Byte(block), Byte(block >> 8)};
        changed += BytesOf(C3FDecoder(CPPoolString(C3FEncoder(bytes.data(), 2)))) != bytes;
    }
    EXPECT_EQ(changed, 7680);
    EXPECT_EQ(Decoded<C3FDecoder>({0x0101, 0x21, 0x01, 0x21, 0x21}), (Bytes{0, 0xFE}));
    EXPECT_EQ(UnitsOf(C3FEncoder("\0\x0E", 2)), (Units{0x0101, 0x21, 0x01, 0x21, 0x21}));
    EXPECT_EQ(UnitsOf(C3FFFEncoder("\0\0\0\0\0\0\0", 7)), (Units{0x0307, 0x4000, 0x4000, 0x4000, 0x4000}));
    for (std::size_t size = 0; size < 30; ++size) {
        const Bytes bytes(size, 0x15);
        C3FEncoder encoder3F(bytes.data(), size);
        C3FFFEncoder encoder3FFF(bytes.data(), size);
        EXPECT_EQ(BytesOf(C3FDecoder(CPPoolString(encoder3F))), size % 3 ? bytes : Bytes());
        EXPECT_EQ(Refusals(), size % 3 == 0);
        EXPECT_EQ(static_cast<IStringSubmitter&>(encoder3F).GetStringLen(), size / 3 * 4 + 5);
        EXPECT_EQ(static_cast<IStringSubmitter&>(encoder3FFF).GetStringLen(), size / 7 * 4 + 5);
    }
}

// The fuzz replay compares any text with the definition.
TEST_F(Codecs, RefuseMalformedTexts) {
    for (const Units& text : {Units{}, {0x0100}, {0x0102}, {0x0102, 0x21, 0x21, 0x21, 0x21, 0x21}, {0x0301}})
        EXPECT_TRUE(Decoded<C3FDecoder>(text).empty() && Decoded<C3FFFDecoder>(text).empty());
    EXPECT_EQ(Refusals(), 6u) << "the pool's texts, too; 3FFF is silent";
    for (const std::size_t groups : {1, 2, 3, 5, 6}) // one wrong unit at every place
        for (std::size_t at = 1; at <= groups * 4; ++at)
            for (const wchar_t wrong : {L'\x3FFF', L'\x8000'}) {
                Units text(1 + groups * 4, 0x4000);
                text[0] = 0x0307;
                text[at] = wrong;
                EXPECT_EQ(Decoded<C3FFFDecoder>(text), Bytes()) << at;
            }
    EXPECT_TRUE(BytesOf(C3FFFDecoder(nullptr)).empty() && BytesOf(C3FDecoder(nullptr)).empty());
    EXPECT_TRUE(BytesOf(C3FDecoder(CPPoolString())).empty());
    EXPECT_EQ(Refusals(), 2u);
}

TEST_F(Codecs, ImpossibleBytesAndFailingAllocations) {
    const unsigned char one = 1;
    for (const std::size_t size : {SIZE_MAX, SIZE_MAX / 2, SIZE_MAX / 4 * 3}) {
        EXPECT_TRUE(CPPoolString(C3FEncoder(&one, size)).isnull() && CPPoolString(C3FFFEncoder(&one, size)).isnull());
        EXPECT_TRUE(CPPoolString(C3FEncoder(nullptr, size)).isnull());
    }
    EXPECT_EQ(UnitsOf(C3FFFEncoder(nullptr, 0)), Units{0x0307});
    EXPECT_EQ(UnitsOf(C3FEncoder(CPPlainMemory())), Units{0x0103});
    const auto sweep = [] { return CStringPool::Collect(60000) && CStringPool::Collect(60000); };
    EXPECT_TRUE(sweep());
    const Bytes bytes(100, 0x15);
    support::ForEachFailingAllocation([&] {
        {
            const CPPoolString text = C3FFFEncoder(bytes.data(), bytes.size());
            const Bytes back = BytesOf(C3FFFDecoder(text));
            EXPECT_TRUE(back.empty() || (!text.isnull() && back == bytes));
        }
        EXPECT_TRUE(sweep());
    });
}
