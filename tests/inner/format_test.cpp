// The wide formatter against the C library's narrow one, and where it has rules of its own.

#include "format.h"

#include "platform/platform.h"
#include "support/heapwatch.h"
#include "support/log.h"

#include <algorithm>
#include <cfloat>
#include <climits>
#include <clocale>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <random>

namespace {

using TAVO::FormatWide;

template <class... Arguments> std::string Format(const wchar_t* format, Arguments... arguments) {
    wchar_t out[4096];
    EXPECT_EQ(out[FormatWide(out, 4096, format, arguments...)], 0);
    return support::Ascii(out);
}

template <class... Arguments> std::string Expected(const std::string& format, Arguments... arguments) {
    char out[4096];
    std::snprintf(out, sizeof out, format.c_str(), arguments...);
    return out;
}

// Both formatters on a format that means the same to both.
template <class... Arguments> void Compare(const std::string& format, Arguments... arguments) {
    const std::vector<wchar_t> wide(format.c_str(), format.c_str() + format.size() + 1);
    ASSERT_EQ(Format(wide.data(), arguments...), Expected(format, arguments...)) << format;
}

struct RandomFormats {
    std::string Make(const char* length, const char* types) {
        std::string format = "<%";
        for (char flag : {'-', '+', ' ', '#', '0'})
            if (Below(3) == 0) format += flag;
        if (Below(2)) format += std::to_string(Below(30));
        if (Below(2)) (format += '.') += std::to_string(Below(25));
        format += length;
        format += types[Below(static_cast<unsigned>(std::strlen(types)))];
        return format += '>';
    }

    unsigned Below(unsigned bound) { return static_cast<unsigned>(random() % bound); }
    unsigned long long Integer() { return random() >> Below(64); } // all magnitudes alike
    double Real() {
        const double values[] = {static_cast<double>(Integer()) / (Below(2) ? 1000.0 : -1000.0),
                                 std::ldexp(static_cast<double>(random()), static_cast<int>(Below(2000)) - 1060),
                                 static_cast<double>(Below(2000)) / 8.0, // ties
                                 static_cast<double>(Below(100)) * 0.01};
        return values[Below(4)];
    }

    std::mt19937_64 random;
};

// Flags that a conversion does not have are undefined: each C library makes something else of them. One also forgets
// the zero that %#.0o prints of 0.
bool IsDefined(const std::string& format) {
    const char type = format[format.size() - 2];
    const auto has = [&](const char* flags) { return format.find_first_of(flags) != std::string::npos; };
    const bool isSigned = type == 'd' || type == 'i';
    if (type == 'o' && has("#") && format.find(".0") != std::string::npos) return false;
    return isSigned ? !has("#") : !has("+ ") && !(type == 'u' && has("#"));
}

// One C library pads %g wrongly and is no reference for it.
const char* RealTypes() { return Expected("%-4g", 200.0) == "200 " ? "fFeEgG" : "fFeE"; }

} // namespace

#pragma GCC diagnostic ignored "-Wformat-security"

TEST(Format, IntegersEqualTheCLibrary) {
    RandomFormats formats{std::mt19937_64(1)};
    for (int i = 0; i < 40000; ++i) {
        const long long corners[] = {0, -1, INT_MAX, INT_MIN, LLONG_MAX, LLONG_MIN};
        const auto value = i % 4 ? static_cast<long long>(formats.Integer()) : corners[formats.Below(6)];
        for (const char* length : {"", "h", "hh", "ll"}) {
            const std::string format = formats.Make(length, "diuxXo");
            if (!IsDefined(format)) continue;
            *length == 'l' ? Compare(format, value) : Compare(format, static_cast<int>(value));
        }
    }
    EXPECT_EQ(Format(L"%#.0o %#.3o %#o", 0, 8, 8), "0 010 010");
}

TEST(Format, RealsEqualTheCLibrary) {
    RandomFormats formats{std::mt19937_64(2)};
    for (const char* name : {"de_DE.UTF-8", "German_Germany.1252"}) std::setlocale(LC_ALL, name);
    EXPECT_EQ(Format(L"%8.3f %g", 1234.5, 0.25), "1234.500 0.25") << "in any locale";
    std::setlocale(LC_ALL, "C");
    for (int i = 0; i < 60000; ++i) Compare(formats.Make("", RealTypes()), formats.Real());
    const double corners[] = {0.0,  -0.0, 1.0,         0.5,      1.5,       2.5,     9.9995,  1e-5,  0.0001,
                              1e15, 1e16, 123456789.0, HUGE_VAL, -HUGE_VAL, DBL_MAX, DBL_MIN, 5e-324};
    for (const char* format :
         {"%f", "%e", "%g", "%G", "%#g", "%#.0f", "%#.0e", "%.17g", "%.1100f", "%.1080e", "%.1100g", "%#.1090g"})
        for (double value : corners)
            if (std::strpbrk(format, RealTypes())) Compare(format, value);
    EXPECT_EQ(Format(L"%g %#g", 999999.5, 999999.5),
              "1e+06 1.00000e+06"); // one C library forgets the zeros of the second
}

TEST(Format, RulesOfItsOwn) {
    EXPECT_EQ(Format(L"%s|%ls|%ws|%S|%hs|%lS|%hS", L"wide", L"wide", L"wide", "narrow", "narrow", L"wide", "narrow"),
              "wide|wide|wide|narrow|narrow|wide|narrow");
    EXPECT_EQ(Format(L"%c%lc%C%hc%hhc", 'a', 'b', 'c', 'd', 'e'), "abcde");
    EXPECT_EQ(Format(L"%ld %lu %lx", -5, 4294967295u, 255), "-5 4294967295 ff") << "long is 32 bits";
    EXPECT_EQ(Format(L"%I64x %I64d %I32d %Iu %zu %jd %td", ~0ULL, -7LL, -8, 9ULL, 10ULL, -11LL, -12LL),
              "ffffffffffffffff -7 -8 9 10 -11 -12");
    EXPECT_EQ(Format(L"%p", static_cast<void*>(nullptr)), "0000000000000000");
    EXPECT_EQ(Format(L"%18p|", reinterpret_cast<void*>(0xABCDEF)), "  0000000000ABCDEF|");
    const void* none = nullptr;
    EXPECT_EQ(Format(L"%s %hs %ls %.3hs %8hs|", none, none, none, none, none), "(null) (null) (null) (nu   (null)|");
    EXPECT_EQ(Format(L"%5.2s|%-5hs|%.1hs|%5c|%-3c|", L"abc", "xyz", "xyz", 'c', 'd'), "   ab|xyz  |x|    c|d  |");
    EXPECT_EQ(Format(L"%*d|%-*d|%*d|%.*f|%.*f", 5, 1, 5, 2, -5, 3, 1, 2.25, -1, 0.5), "    1|2    |3    |2.2|0.500000");
    EXPECT_EQ(Format(L"%2$ls %1$d %1$x %2$.2ls", 10, L"text"), "text 10 a te");
    EXPECT_EQ(Format(L"%3$*1$.*2$f|%%|%4$hs", 8, 3, 1.5, "end"), "   1.500|%|end");
    EXPECT_EQ(Format(L"%3$d %1$lld", 1LL, 2, 3), "3 1") << "a position that nobody names passes for an int";
}

TEST(Format, BrokenConversionsEndTheFormatting) {
    using Row = std::pair<const wchar_t*, const char*>;
    for (const auto& [format, expected] : // positions and order do not mix, a number never is a pointer
         {Row{L"%d %n %d", "1 %n %d"}, Row{L"%d%", "1%"}, Row{L"%1$d %d", "1 %d"}, Row{L"%d %1$d", "1 %1$d"},
          Row{L"%1$d %1$s", "1 %1$s"}, Row{L"%33$d", "%33$d"}, Row{L"%1$*d", "%1$*d"},
          Row{L"%99999999999999999999$d", "%99999999999999999999$d"}})
        EXPECT_EQ(Format(format, 1, 2), expected);
}

TEST(Format, BoundedAndTerminatedAtEveryCapacity) {
    char narrow[8] = {}; // "é" in the code page of the machine, whichever that is
    TAVO::Platform::WideToAnsi(L"\u00e9x", -1, narrow, 8);
    wchar_t whole[20];
    for (std::size_t capacity = 21; capacity--;) {
        std::vector<wchar_t> cut(capacity + 1, L'#');
        ASSERT_EQ(FormatWide(cut.data(), capacity, L"ab%5d%-4ls|%hs%.3f", 7, L"w", narrow, 1.0), 19u);
        if (capacity == 20) std::copy_n(cut.data(), 20, whole);
        EXPECT_TRUE(std::equal(cut.begin(), cut.end() - (capacity ? 2 : 1), whole)) << capacity;
        EXPECT_TRUE(cut[capacity] == L'#' && (!capacity || cut[capacity - 1] == 0)) << "nothing behind";
    }
    wchar_t out[4];
    EXPECT_EQ(FormatWide(out, 4, L"%2000000000d%-2000000000ls", 1, L""), 4000000000u) << "costs no more than what fits";
    support::ForEachFailingAllocation([&] { EXPECT_EQ(FormatWide(out, 4, L"%hs", "longer than that"), 16u); });
    const wchar_t wide[2] = {L'a', L'b'};
    EXPECT_EQ(Format(L"%.1hs%.2ls", narrow, wide).substr(1), "ab") << "nothing is read behind a precision";
    EXPECT_EQ(FormatWide(out, 4, nullptr), 0u);
}
