// The transcoders convert alike whatever the processor offers.

#include "simd.h"
#include "support/guardpage.h"
#include "support/texts.h"

#include <gtest/gtest.h>
#include <TAVO/string.h>

namespace {

using namespace support;
using namespace TAVO::String;

// Results and what they leave of a target that is larger than needed.
template <class Source, class Target>
std::vector<std::size_t> Converted(std::size_t (*convert)(const Source*, std::size_t, Target*, std::size_t),
                                   const Source* text) {
    const std::size_t need = convert(text, SIZE_MAX, nullptr, 0);
    std::vector<Target> target(need + 70, Target(0x55));
    std::vector<std::size_t> all = {need, convert(text, SIZE_MAX, target.data(), target.size())};
    all.insert(all.end(), target.begin(), target.end());
    return all;
}

TEST(TranscodingPaths, WithAndWithoutLinesAgree) {
    TextSource source(7);
    GuardedMemory memory;
    const auto compare = [&](auto convert, auto text) {
        text.push_back(0);
        const auto* const placed = memory.Place(text.data(), text.size());
        TAVO::Simd::g_hideLines = false;
        const auto with = Converted(convert, placed);
        TAVO::Simd::g_hideLines = true;
        const auto without = Converted(convert, placed);
        TAVO::Simd::g_hideLines = false;
        ASSERT_EQ(with, without);
    };
    for (std::uint32_t i = 0; i < 4000 && !HasFatalFailure(); ++i) {
        SCOPED_TRACE(i);
        const std::size_t length = source.Below(i % 10 ? 150 : 1500);
        compare(UTF8_To_acfWChar, source.Utf8(length));
        const Units units = source.Utf16(length);
        compare(acfWChar_To_UTF8, std::vector<wchar_t>(units.begin(), units.end()));
    }
}

} // namespace
