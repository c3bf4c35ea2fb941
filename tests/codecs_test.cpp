// What the 3F and 3FFF codecs lose, refuse and need; the fuzz replay compares both ways with the definition.

#include "../fuzz/codecs_reference.h"
#include "support/heapwatch.h"
#include "support/log.h"

using namespace reference;
using namespace TAVO::String;
using TAVO::Buffers::CPPlainMemory;

namespace {

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
    EXPECT_EQ(BytesOf(C3FDecoder(L"\x0101!\x01!!")), (Bytes{0, 0xFE}));
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

TEST_F(Codecs, TellOfMalformedTexts) {
    for (const wchar_t* text :
         {L"", L"\x0100", L"\x0102", L"\x0102!!!!!", L"\x0301", static_cast<const wchar_t*>(nullptr)})
        EXPECT_TRUE(BytesOf(C3FDecoder(text)).empty() && BytesOf(C3FFFDecoder(text)).empty());
    EXPECT_EQ(BytesOf(C3FDecoder(CPPoolString())), Bytes());
    EXPECT_EQ(Refusals(), 5u) << "not of what is left empty; 3FFF is silent";
}

TEST_F(Codecs, ImpossibleBytesAndFailingAllocations) {
    for (const std::size_t size : {SIZE_MAX, SIZE_MAX / 2, SIZE_MAX / 4 * 3}) {
        EXPECT_TRUE(CPPoolString(C3FEncoder("x", size)).isnull() && CPPoolString(C3FFFEncoder("x", size)).isnull());
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
