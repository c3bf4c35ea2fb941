// Numbers in text, where identifiers do not reach: base 10, an end before the terminator, what stays unread.

#include "numberscan.h"

#include <gtest/gtest.h>
#include <string>
#include <vector>

TEST(NumberScan, ReadsAndStops) {
    const struct {
        std::string text; // up to its '|', if it has one
        unsigned base;
        bool found;
        std::uint64_t value;
        std::size_t left; // units behind the number
    } rows[] = {
        {"12", 10, true, 12, 0},
        {" \t\n\v\f\r+12x", 10, true, 12, 1},
        {"-1", 10, true, ~0ull, 0},
        {"0x12", 10, true, 0, 3},
        {"0x12", 16, true, 0x12, 0},
        {"1A", 10, true, 1, 1},
        {"12|3", 10, true, 12, 0},
        {"0x|1", 16, false, 0, 2},
        {"|1", 10, false, 0, 0},
        {"+-1", 10, false, 0, 3},
        {"", 16, false, 0, 0},
        {"\xA0"
         "1",
         10, false, 0, 2},
        {"18446744073709551617", 10, true, 1, 0}, // low 64 bits
    };
    for (const auto& row : rows) {
        const std::string text = row.text.substr(0, row.text.find('|'));
        const std::vector<char> exact(text.begin(), text.end()); // no terminator: the end alone stops
        for (const char* const begin : {row.text.c_str(), static_cast<const char*>(exact.data())}) {
            const bool terminated = begin == row.text.c_str() && text == row.text;
            const char* const end = begin + text.size();
            const char* at = begin;
            std::uint64_t value = 77;
            EXPECT_EQ(TAVO::numberscan::ScanNumber(at, terminated ? nullptr : end, row.base, value), row.found);
            EXPECT_EQ(value, row.found ? row.value : 77) << row.text;
            EXPECT_EQ(end - at, static_cast<std::ptrdiff_t>(row.left)) << row.text;
        }
    }
}
