// The 3F and 3FFF codecs, against their definition taken byte by byte and bit by bit.

#include "support/guardpage.h"
#include "support/heapwatch.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <gtest/gtest.h>
#include <random>
#include <string>
#include <TAVO/develop.h>
#include <TAVO/string.h>
#include <vector>

using namespace TAVO::String;
using TAVO::Buffers::CPPlainMemory;

namespace {

using Bytes = std::vector<unsigned char>;
using Units = std::vector<wchar_t>;

unsigned char Byte(int value) { return static_cast<unsigned char>(value); }

Units Reference3F(Bytes bytes) {
    Units units{static_cast<wchar_t>(0x0100 + (3 - bytes.size() % 3))};
    while (bytes.size() % 3) bytes.push_back(0);
    for (std::size_t i = 0; i < bytes.size(); i += 3) {
        const int b0 = bytes[i], b1 = bytes[i + 1], b2 = bytes[i + 2];
        units.push_back(Byte((b0 & 0x3F) + 0x21));
        units.push_back(Byte(Byte((b1 << 4) | (b0 >> 6)) + 0x21));
        units.push_back(Byte((((b2 & 3) << 4) | (b1 >> 4)) + 0x21));
        units.push_back(Byte((b2 >> 2) + 0x21));
    }
    return units;
}

// Of a text that is not refused.
Bytes Reference3F(const Units& units) {
    Bytes bytes;
    for (std::size_t i = 1; i + 4 <= units.size(); i += 4) {
        const std::int32_t u0 = units[i], u1 = units[i + 1], u2 = units[i + 2], u3 = units[i + 3];
        bytes.push_back(Byte(((u1 - 1) * 64) | (u0 - 0x21)));
        bytes.push_back(Byte(((u1 - 0x21) >> 4) | ((u2 - 1) * 16)));
        bytes.push_back(Byte(((u2 - 0x21) >> 4) | ((u3 + 0x1F) * 4)));
    }
    const std::size_t padding = units[0] & 0xFF;
    bytes.resize(bytes.size() > padding ? bytes.size() - padding : 0);
    return bytes;
}

Units Reference3FFF(const Bytes& bytes) {
    Units units{static_cast<wchar_t>(0x0300 + (7 - bytes.size() % 7))};
    units.resize(1 + (bytes.size() + 6) / 7 * 4, 0x4000);
    for (std::size_t bit = 0; bit < bytes.size() * 8; ++bit)
        if (bytes[bit / 8] >> bit % 8 & 1)
            units[1 + bit / 14] = static_cast<wchar_t>(units[1 + bit / 14] | 1 << bit % 14);
    return units;
}

Units UnitsOf(const CPPoolString& text) {
    const wchar_t* const units = text;
    EXPECT_EQ(units[text.len()], 0);
    return Units(units, units + text.len());
}

Bytes BytesOf(const CPPlainMemory& memory) {
    const auto* bytes = static_cast<const unsigned char*>(static_cast<void*>(memory));
    return Bytes(bytes, bytes + memory.GetSize());
}

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
    const Units units = UnitsOf(encoder);
    Units written(units.size() + 1, L'x');
    wchar_t* const out = output.Place(written.data(), written.size());
    EXPECT_TRUE(static_cast<IStringSubmitter&>(encoder).GetString(out));
    EXPECT_TRUE(std::equal(units.begin(), units.end(), out) && out[units.size()] == 0);
    return units;
}

Bytes Random(std::mt19937& random, std::size_t size) {
    Bytes bytes(size);
    for (auto& byte : bytes) byte = Byte(static_cast<int>(random() & 0xFF));
    return bytes;
}

int g_refusals;
void CountRefusals(_acfDebugLevel level, const wchar_t* category, const char* source, TAVO::long32 line,
                   const wchar_t* format, std::va_list) {
    EXPECT_TRUE(level == 2 && line == 0 && CPPoolString(category) == L"TAVO");
    EXPECT_STREQ(source, "source/TAVO/cstringpool");
    EXPECT_EQ(CPPoolString(format), CPPoolString(L"C3FDecoder: Invalid string passed"));
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
    for (std::size_t i = 0; i < 400; ++i) {
        const Bytes bytes = Random(random, i <= 40 ? i : random() % 3000);
        const Units text3F = Encoded<C3FEncoder>(bytes), text3FFF = Encoded<C3FFFEncoder>(bytes);
        ASSERT_EQ(text3F, Reference3F(bytes)) << bytes.size();
        ASSERT_EQ(text3FFF, Reference3FFF(bytes)) << bytes.size();
        ASSERT_EQ(Decoded<C3FFFDecoder>(text3FFF), bytes);
        if (bytes.size() % 3 != 0) {
            ASSERT_EQ(Decoded<C3FDecoder>(text3F), Reference3F(text3F)) << bytes.size();
        }
        // Whatever the units are.
        Units any{static_cast<wchar_t>(0x0100 + i % 3)};
        while (any.size() < 1 + i % 60 / 2 * 4) any.push_back(static_cast<wchar_t>(1 + random() % 0xFFFF));
        any.push_back(0);
        const Bytes decoded = BytesOf(C3FDecoder(any.data()));
        any.pop_back();
        ASSERT_EQ(decoded, Reference3F(any));
    }
    EXPECT_EQ(g_refusals, 0);
}

TEST_F(Codecs, Vectors) {
    const struct {
        Bytes bytes;
        Units text3F, text3FFF;
    } rows[] = {
        {{}, {0x0103}, {0x0307}},
        {{0}, {0x0102, 0x21, 0x21, 0x21, 0x21}, {0x0306, 0x4000, 0x4000, 0x4000, 0x4000}},
        {{0, 0x0E}, {0x0101, 0x21, 0x01, 0x21, 0x21}, {0x0305, 0x4E00, 0x4000, 0x4000, 0x4000}},
        {{1, 2, 3}, {0x0103, 0x22, 0x41, 0x51, 0x21}, {0x0304, 0x4201, 0x400C, 0x4000, 0x4000}},
        {Bytes(7, 0),
         {0x0102, 0x21, 0x21, 0x21, 0x21, 0x21, 0x21, 0x21, 0x21, 0x21, 0x21, 0x21, 0x21},
         {0x0307, 0x4000, 0x4000, 0x4000, 0x4000}},
        {Bytes(1, 255), {0x0102, 0x60, 0x24, 0x21, 0x21}, {0x0306, 0x40FF, 0x4000, 0x4000, 0x4000}},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(Encoded<C3FEncoder>(row.bytes), row.text3F);
        EXPECT_EQ(Encoded<C3FFFEncoder>(row.bytes), row.text3FFF);
    }
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
    EXPECT_EQ(g_refusals, 0);
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
        int refusals;
        Bytes bytes3F, bytes3FFF;
    } rows[] = {
        {"empty", {}, 2, {}, {}},
        {"alone 0100", {0x0100}, 0, {}, {}},
        {"alone 0102: a size below zero", {0x0102}, 0, {}, {}},
        {"alone 0103", {0x0103}, 2, {}, {}},
        {"header 0100 is never written", {0x0100, 0x22, 0x41, 0x51, 0x21}, 0, {1, 2, 3}, {}},
        {"no header", {0x21, 0x21, 0x21, 0x21, 0x21}, 2, {}, {}},
        {"a unit less", {0x0102, 0x21, 0x21, 0x21}, 2, {}, {}},
        {"a unit more", {0x0102, 0x21, 0x21, 0x21, 0x21, 0x21}, 2, {}, {}},
        {"padding 0", {0x0300, 0x4000, 0x4000, 0x4000, 0x4000}, 2, {}, {}},
        {"padding 8", {0x0308, 0x4000, 0x4000, 0x4000, 0x4000}, 2, {}, {}},
        {"padding alone", {0x0301}, 2, {}, {}},
        {"padding bits", {0x0306, 0x4101, 0x5555, 0x7FFF, 0x4001}, 2, {}, {1}},
        {"two units less", {0x0306, 0x4000, 0x4000}, 2, {}, {}},
    };
    for (const auto& row : rows) {
        g_refusals = 0;
        EXPECT_EQ(Decoded<C3FDecoder>(row.text), row.bytes3F) << row.name;
        EXPECT_EQ(g_refusals, row.refusals) << row.name;
        EXPECT_EQ(Decoded<C3FFFDecoder>(row.text), row.bytes3FFF) << row.name;
        EXPECT_EQ(g_refusals, row.refusals) << row.name << ": 3FFF is silent";
    }
    // One wrong unit at every place of texts that end in a block, and behind one.
    for (const std::size_t groups : {1, 2, 3, 5, 6})
        for (std::size_t at = 1; at <= groups * 4; ++at)
            for (const wchar_t wrong : {L'\x3FFF', L'\x8000'}) {
                Units text(1 + groups * 4, 0x4000);
                text[0] = 0x0307;
                EXPECT_EQ(Decoded<C3FFFDecoder>(text), Bytes(groups * 7));
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
    EXPECT_TRUE(CPPoolString(C3FFFEncoder(nullptr, 1)).isnull());
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
