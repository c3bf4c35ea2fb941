// The 16-bit text helpers that the library's sources share.

#include "support/guardpage.h"
#include "transcoding.h"

#include <gtest/gtest.h>
#include <vector>

namespace {

using namespace TAVO::String::detail;

TEST(WideHelpers, LengthAtEveryAlignmentAndBound) {
    support::GuardedMemory memory;
    for (std::size_t length = 0; length < 40; ++length) {
        std::vector<wchar_t> text(length, 0x100); // a zero byte in every unit
        text.push_back(0);
        for (std::size_t behind = 0; behind < 8; ++behind) { // units behind the terminator: they are no text
            const wchar_t* const at = memory.Place(text.data(), text.size());
            ASSERT_EQ(WideLength(at), length);
            for (std::size_t n = 0; n <= length + 2; ++n) ASSERT_EQ(WideLengthN(at, n), n < length ? n : length);
            ASSERT_EQ(WideLengthN(at, SIZE_MAX), length);
            text.push_back(0);
        }
        const wchar_t* const open = memory.Place(text.data(), length);
        ASSERT_EQ(WideLengthN(open, length), length) << "no terminator before the inaccessible page";

        std::vector<unsigned char> bytes(length, 0x80);
        const unsigned char* const openBytes = memory.Place(bytes.data(), length);
        ASSERT_EQ(TAVO::Simd::ZeroUnit(openBytes, length), length);
        bytes.push_back(0);
        ASSERT_EQ(TAVO::Simd::ZeroUnit(memory.Place(bytes.data(), length + 1), SIZE_MAX), length);
    }
}

TEST(WideHelpers, CompareStopsAtTerminatorsAndBounds) {
    const wchar_t high[] = {0xFFFF, 0};
    EXPECT_EQ(WideCompare(L"ab", L"abc"), -1);
    EXPECT_EQ(WideCompare<wchar_t>(high, L"a"), 1) << "units are unsigned";
    EXPECT_EQ(WideCompareN(L"abc", L"abd", 2), 0);
    EXPECT_EQ(WideCompareN(L"abc", L"abd", 3), -1);
    EXPECT_EQ(WideCompareN(L"ab", L"ab", 100), 0);
    EXPECT_TRUE(WideEqual(L"abc", L"abd", 2));
    EXPECT_FALSE(WideEqual(L"abc", L"abd", 3));
    EXPECT_TRUE(WideEqualFolded(L"aBc[", L"AbC[", 4));
    EXPECT_FALSE(WideEqualFolded(L"a[", L"a{", 2));
}

TEST(Measuring, TellsWhatEndedTheText) {
    const auto* bytes = reinterpret_cast<const unsigned char*>("a\xE4\xB8\xAD\xC3");
    EXPECT_EQ(MeasureUtf8(bytes, 4).ending, Ending::Length);
    EXPECT_EQ(MeasureUtf8(bytes, 5).ending, Ending::Cut);
    EXPECT_EQ(MeasureUtf8(bytes, 5).source, 4u);
    EXPECT_EQ(MeasureUtf8(bytes + 2, 3).ending, Ending::Invalid);
    const wchar_t units[] = {'a', 0xD800, 0xDC00, 0xD800, 'b'};
    EXPECT_EQ(MeasureUtf16(units, 3).ending, Ending::Length);
    EXPECT_EQ(MeasureUtf16(units, 4).ending, Ending::Cut);
    EXPECT_EQ(MeasureUtf16(units, 5).ending, Ending::Invalid);
    EXPECT_EQ(MeasureUtf16(units, 5).source, 3u);
}

} // namespace
