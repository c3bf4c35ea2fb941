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

} // namespace
