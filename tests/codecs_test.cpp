// The 3F and 3FFF codecs at the ends of their memory; the fuzz target's seeds compare more.

#include "../fuzz/codecs_reference.h"
#include "support/guardpage.h"
#include "support/heapwatch.h"

#include <algorithm>
#include <cstring>
#include <gtest/gtest.h>
#include <random>
#include <TAVO/develop.h>

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

// Encodes bytes that end at a guarded page, into the pool and into units that end at another.
template <class Encoder> Units Encoded(const Bytes& bytes) {
    static const support::GuardedMemory input, output;
    Encoder encoder(input.Place(bytes.data(), bytes.size()), bytes.size());
    Units units = UnitsOf(encoder), written(units.size() + 1, L'x');
    wchar_t* const out = output.Place(written.data(), written.size());
    EXPECT_TRUE(static_cast<IStringSubmitter&>(encoder).GetString(out));
    EXPECT_TRUE(std::equal(units.begin(), units.end(), out) && out[units.size()] == 0);
    return units;
}

int g_refusals;
void CountRefusals(_acfDebugLevel level, const wchar_t* category, const char* source, TAVO::long32 line,
                   const wchar_t* format, std::va_list) {
    EXPECT_TRUE(level == 2 && line == 0 && CPPoolString(category) == L"TAVO");
    EXPECT_STREQ(source, "source/TAVO/cstringpool");
    EXPECT_TRUE(CPPoolString(format) == L"C3FDecoder: Invalid string passed");
    ++g_refusals;
}

struct Codecs : testing::Test {
    Codecs() {
        g_refusals = 0;
        TAVO::Develop::SetExternalLogger(CountRefusals);
    }
    ~Codecs() override { TAVO::Develop::SetExternalLogger(nullptr); }
};

} // namespace

TEST_F(Codecs, FollowTheirDefinition) {
    std::mt19937 random(1);
    for (std::size_t i = 0; i < 300; ++i) {
        Bytes bytes(i <= 40 ? i : random() % 3000);
        for (auto& byte : bytes) byte = Byte(static_cast<int>(random() & 0xFF));
        const Units text3F = Encoded<C3FEncoder>(bytes), text3FFF = Encoded<C3FFFEncoder>(bytes);
        ASSERT_EQ(text3F, Encode3F(bytes)) << bytes.size();
        ASSERT_EQ(text3FFF, Encode3FFF(bytes)) << bytes.size();
        ASSERT_EQ(Decoded<C3FDecoder>(text3F), Decode3F(text3F)) << bytes.size();
        ASSERT_EQ(Decoded<C3FFFDecoder>(text3FFF), bytes);
    }
    EXPECT_EQ(Encoded<C3FEncoder>({0}), (Units{0x0102, 0x21, 0x21, 0x21, 0x21}));
    EXPECT_EQ(Encoded<C3FEncoder>({0, 0x0E}), (Units{0x0101, 0x21, 0x01, 0x21, 0x21}));
    EXPECT_EQ(Encoded<C3FFFEncoder>(Bytes(7, 0)), (Units{0x0307, 0x4000, 0x4000, 0x4000, 0x4000}));
}

// Intended: 3f-wrap, 3f-multiples, codec-announced
TEST_F(Codecs, Intended3FDoesNotBringEveryBlockBack) {
    int changed = 0;
    for (int block = 0; block < 65536; ++block) {
        const Bytes bytes{Byte(block), Byte(block >> 8)};
        changed += BytesOf(C3FDecoder(CPPoolString(C3FEncoder(bytes.data(), 2)))) != bytes;
    }
    EXPECT_EQ(changed, 7680);
    EXPECT_EQ(Decoded<C3FDecoder>({0x0101, 0x21, 0x01, 0x21, 0x21}), (Bytes{0, 0xFE}));
    for (std::size_t size = 0; size < 30; ++size) {
        const Bytes bytes(size, 0x15);
        C3FEncoder encoder3F(bytes.data(), size);
        C3FFFEncoder encoder3FFF(bytes.data(), size);
        g_refusals = 0;
        EXPECT_EQ(BytesOf(C3FDecoder(CPPoolString(encoder3F))), size % 3 ? bytes : Bytes());
        EXPECT_EQ(g_refusals, size % 3 == 0);
        EXPECT_EQ(static_cast<IStringSubmitter&>(encoder3F).GetStringLen(), size / 3 * 4 + 5);
        EXPECT_EQ(static_cast<IStringSubmitter&>(encoder3FFF).GetStringLen(), size / 7 * 4 + 5);
    }
}

TEST_F(Codecs, RefuseMalformedTexts) {
    const struct {
        const char* name;
        Units text;
        bool refused3F;
        Bytes bytes3F, bytes3FFF;
    } rows[] = {
        {"empty", {}, true, {}, {}},
        {"alone 0102: a size below zero", {0x0102}, false, {}, {}},
        {"header 0100 is never written", {0x0100, 0x22, 0x41, 0x51, 0x21}, false, {1, 2, 3}, {}},
        {"a unit more", {0x0102, 0x21, 0x21, 0x21, 0x21, 0x21}, true, {}, {}},
        {"padding 8", {0x0308, 0x4000, 0x4000, 0x4000, 0x4000}, true, {}, {}},
        {"padding alone", {0x0301}, true, {}, {}},
        {"padding bits", {0x0306, 0x4101, 0x5555, 0x7FFF, 0x4001}, true, {}, {1}},
    };
    for (const auto& row : rows) {
        g_refusals = 0;
        EXPECT_EQ(Decoded<C3FDecoder>(row.text), row.bytes3F) << row.name;
        EXPECT_EQ(Decoded<C3FFFDecoder>(row.text), row.bytes3FFF) << row.name;
        EXPECT_EQ(g_refusals, row.refused3F ? 2 : 0) << row.name << ": 3FFF is silent";
    }
    for (const std::size_t groups : {1, 2, 3, 5, 6}) // one wrong unit at every place
        for (std::size_t at = 1; at <= groups * 4; ++at)
            for (const wchar_t wrong : {L'\x3FFF', L'\x8000'}) {
                Units text(1 + groups * 4, 0x4000);
                text[0] = 0x0307;
                text[at] = wrong;
                EXPECT_EQ(Decoded<C3FFFDecoder>(text), Bytes()) << at;
            }
    g_refusals = 0;
    EXPECT_EQ(BytesOf(C3FFFDecoder(nullptr)), Bytes());
    EXPECT_EQ(BytesOf(C3FDecoder(nullptr)), Bytes());
    EXPECT_EQ(BytesOf(C3FDecoder(CPPoolString())), Bytes());
    EXPECT_EQ(g_refusals, 2);
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
    support::ForEachFailingAllocation([&] {
        {
            CPPlainMemory bytes;
            if (!bytes.Alloc(100)) return;
            std::memset(bytes, 0x15, 100);
            const CPPoolString text = C3FFFEncoder(bytes);
            const Bytes back = BytesOf(C3FFFDecoder(text));
            EXPECT_TRUE(back.empty() || (!text.isnull() && back == BytesOf(bytes)));
        }
        EXPECT_TRUE(sweep());
    });
}
