// Numbers in text, where identifiers do not reach: base 10, an end before the terminator, what stays unread.

#include "numberscan.h"

#include <gtest/gtest.h>
#include <string>

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
        const char* const begin = row.text.c_str();
        const char* at = begin;
        std::uint64_t value = 77;
        const char* const end = text == row.text ? nullptr : begin + text.size(); // null: up to the terminator
        EXPECT_EQ(TAVO::numberscan::ScanNumber(at, end, row.base, value), row.found) << row.text;
        EXPECT_EQ(value, row.found ? row.value : 77) << row.text;
        EXPECT_EQ(begin + text.size() - at, static_cast<std::ptrdiff_t>(row.left)) << row.text;
    }
}
