// The two text forms of timecode: tables of good and bad texts, and cuts at every character.

#include <algorithm>
#include <gtest/gtest.h>
#include <memory>
#include <string>
#include <TAVO/timecode.h>

using namespace TAVO;
using namespace TAVO::TimeCode;

namespace {

std::string Narrow(const wchar_t* text) {
    std::string out;
    while (*text) out += static_cast<char>(*text++);
    return out;
}

// Puts text into the characters without canonicalising it.
template <class Text> Text Holding(const char* text) {
    Text t;
    std::fill(std::begin(t.text), std::end(t.text), L'\0');
    std::copy(text, text + std::string(text).size(), t.text);
    return t;
}

std::u16string Wide(const std::string& text) { return std::u16string(text.begin(), text.end()); }
const wchar_t* Units(const std::u16string& text) { return reinterpret_cast<const wchar_t*>(text.c_str()); }

std::string Fixed(const char* freeText) { return Narrow(SZTC(Units(Wide(freeText))).text); }
std::string Exchange(const std::string& freeText) { return Narrow(SZUTC(Units(Wide(freeText))).text); }

const char kNone[] = " --:--:--:--";

} // namespace

TEST(TimecodeFixedText, Writing) {
    const char* tenHours[] = {" 10:00:00:00", " 10:00:00.00", " 10.00:00.00", " 10:00:00,00", " 10:00.00,00",
                              " 10.00.00,00", " 10:00.00:00", " 10:00.00.00", " 10.00.00.00", " 10.00,00:00",
                              " 10:00,00;00", " 10:00,00,00", " 10:00:00;00", " 10:00.00;00"};
    for (ulong32 sys = 0; sys < 14; ++sys) EXPECT_EQ(Narrow(SZTC(long32(10), 0, 0, 0, sys).text), tenHours[sys]);

    const std::pair<SZTC, const char*> rows[] = {{TCINFO(-1LL, 0), "-00:00:00:00"},
                                                 {SZTC(long32(25), 0, 0, 0, 0), ">##:##:##:##"},
                                                 {SZTC(long32(-25), 0, 0, 0, 8), "<##.##.##.##"},
                                                 {SZTC(long32(999), 0, 0, 0, 8), "*##:##:##:##"},
                                                 {SZTC(0LL, 0x20002), kNone},
                                                 {SZTC(), kNone}};
    for (const auto& [text, expected] : rows) EXPECT_EQ(Narrow(text.text), expected);
}

TEST(TimecodeFixedText, Reading) {
    struct Row {
        const char* text;
        ulong32 sys;
        long long count;
    };
    const Row rows[] = {{" 10.00:00.00", 2, 10 * 4315680LL},
                        {"-00:00:01:00", 0, -1200},
                        {" 99:99:99:99", 0, 99 * 4320000LL + 99 * 72000 + 99 * 1200 + 99 * 48},
                        {" -1:--:-2:-3", 0, 4320000LL + 2400 + 3 * 48},
                        {"  1: 2:+3: 4", 0, 4320000LL + 2 * 72000 + 3 * 1200 + 4 * 48},
                        {" 10:00:00:1", 0, 10 * 4320000LL + 48},
                        {" --.--:--.--", kUnassigned | 2, 0}};
    for (const Row& row : rows) {
        const SZTC text = Holding<SZTC>(row.text);
        EXPECT_EQ(TCINFO(text).sys(), row.sys) << row.text;
        EXPECT_EQ(static_cast<long long>(text), row.count) << row.text;
        EXPECT_EQ(static_cast<long32>(text), static_cast<long32>(TCINFO(text))) << row.text;
    }
    for (const char* invalid :
         {" 00.00.00:00", " 1x:00:00:00", " 00:00:00:x0", ">##:##:##:##", "*00:00:00:00", "", " 10:00:00:"})
        EXPECT_EQ(TCINFO(Holding<SZTC>(invalid)).sys(), kInvalid) << invalid;
    for (const char* unassigned : {kNone, " 00.00:00:00", " 00:00:00!00", " ", " 10:00:00"})
        EXPECT_EQ(TCINFO(Holding<SZTC>(unassigned)).sys(), kUnassigned) << unassigned;
    SZTC endless;
    std::fill(std::begin(endless.text), std::end(endless.text), L'1');
    EXPECT_EQ(TCINFO(endless).sys(), kUnassigned);
    SZTC stale = Holding<SZTC>(" 10:00:00:00");
    stale.text[5] = L'\0';
    EXPECT_EQ(TCINFO(stale).sys(), kUnassigned) << "nothing is read behind the terminator";
}

TEST(TimecodeFixedText, FreeText) {
    EXPECT_EQ(Fixed("10:20:30:12"), " 10:20:30:12");
    EXPECT_EQ(Fixed("+10:20:30:12"), " 10:20:30:12");
    EXPECT_EQ(Fixed("99:99:99:99"), " 99:99:99:99");
    for (const char* kept : {" 10.20:30.12", ">##:##:##:##", "*##:##:##:##", kNone}) EXPECT_EQ(Fixed(kept), kept);
    for (const char* refused : {"-10.20.30:12", "10.20:30:12", "x10:20:30:12", "1:20:30:12", "10:20:30:1",
                                " 10:20:30:123", ">10:20:30:12", " ##:##:##:##", " 1 :20:30:12", ""})
        EXPECT_EQ(Fixed(refused), kNone) << refused;
    EXPECT_EQ(Narrow(SZTC(static_cast<const wchar_t*>(nullptr)).text), kNone);
    EXPECT_EQ(timecode(L"00:00:01:00"), timecode(1200LL, 0));
    EXPECT_EQ(timecode(L">##:##:##:##").sys(), kInvalid);
}

TEST(TimecodeFixedText, Utf8DropsTheSystemIntended) {
    const SZTC text(long32(10), 0, 0, 0, 2);
    EXPECT_EQ(Narrow(String::CACFWChar(text)), " 10.00:00.00");
    EXPECT_STREQ(reinterpret_cast<const char*>(*String::CUTF8Char(text)), " 10:00:00:00");
}

TEST(TimecodeExchangeText, Writing) {
    const char* rates[] = {"25/1}Hz",         "30000/1001}Hz", "30000/1001}Hz/D", "24/1}Hz",         "24000/1001}Hz",
                           "24000/1001}Hz/D", "50/1}Hz",       "60000/1001}Hz",   "60000/1001}Hz/D", "25/2}Hz/D",
                           "15/1}Hz",         "12/1}Hz",       "30/1}Hz",         "60/1}Hz"};
    for (ulong32 sys = 0; sys < 14; ++sys) {
        EXPECT_EQ(Narrow(SZUTC(timecode(long32(10), 0, 0, 0, sys)).text), std::string("10:00:00:00 {") + rates[sys]);
        EXPECT_EQ(Narrow(SZUTC(timecode(0LL, kUnassigned | sys)).text), std::string("--:--:--:-- {") + rates[sys]);
    }
    EXPECT_EQ(Narrow(SZUTC(timecode(long32(25), 0, 0, 0, 0)).text), "01:00:00:00+{25/1}Hz");
    EXPECT_EQ(Narrow(SZUTC(timecode(-48LL, 0)).text), "23:59:59:24-{25/1}Hz");
    EXPECT_EQ(Narrow(SZUTC(timecode(5LL, kInvalid | 14)).text), "--:--:--:-- {25/1}Hz");
    EXPECT_EQ(Narrow(SZUTC().text), "");
}

TEST(TimecodeExchangeText, Reading) {
    struct Row {
        const char* text;
        ulong32 sys;
        long long count;
    };
    const long long hour = 4320000;
    const Row rows[] = {{"10:00:00:00 {30000/1001}Hz/D", 2, 10 * 4315680LL},
                        {"10:00:00:00 {25/2}Hz", 9, 10 * hour},
                        {"10:00:00:00 {25/1}", 0, 10 * hour},
                        {" 1: 2: 3: 4x{ 25/ 1}Hz", 0, hour + 2 * 72000 + 3 * 1200 + 4 * 48},
                        {"-1:00:00:00 {25/1}Hz", 0, -hour},
                        {"4294967297:00:00:00 {25/1}Hz", 0, hour}, // numbers wrap at 2^32
                        {"00:00:00:00 {120/2}Hz", 13, 0},
                        {"01:00:00:00+{25/1}Hz", kInvalid, hour},
                        {"01:00:00:00-{30/1}Hz", 12, hour - 2073600000},
                        {"00:00:00:00+{30000/1001}Hz/D", 2, 2071526400},
                        {"00:01:00:00 {30000/1001}Hz/D", kInvalid | 2, 0},
                        {"60:60:00:00 {25/1}Hz", kInvalid, 0}};
    for (const Row& row : rows) {
        const timecode value = Holding<SZUTC>(row.text);
        EXPECT_EQ(value.sys(), row.sys) << row.text;
        EXPECT_EQ(static_cast<long long>(value), row.count) << row.text;
    }
    // The character before the last one alone tells drop frame, which 25/1 does not have.
    for (const char* text : {"10:00:00:00 {25/1}Hz/D", "10:00:00:00 {25/1", "10:00:00:00 {25/1}Hz/?",
                             "00:00:00:00 {1/0}Hz", "--:--:--:-- {25/1}Hz", "1:2:3:4{25/1}Hz", "1:2:3:- {25/1}Hz", ""})
        EXPECT_EQ(timecode(Holding<SZUTC>(text)).sys(), kUnassigned) << text;
}

// A text that fills the array has no terminator: reading stops at its end.
TEST(TimecodeExchangeText, WithoutTerminator) {
    const std::string head = "10:00:00:00 {25/", tail(48 - head.size(), '1');
    const auto boxed = std::make_unique<SZUTC>(Holding<SZUTC>((head + tail).c_str()));
    EXPECT_EQ(timecode(*boxed).sys(), kUnassigned);
    const auto zeros =
        std::make_unique<SZUTC>(Holding<SZUTC>((head + std::string(tail.size() - 1, '0') + "1").c_str()));
    EXPECT_EQ(timecode(*zeros), timecode(10 * 4320000LL, 0));
}

TEST(TimecodeExchangeText, Canonicalising) {
    EXPECT_EQ(Exchange("1:2:3:4 {120/2}Hz"), "01:02:03:04 {60/1}Hz");
    EXPECT_EQ(Exchange("1:2:3:4*{30000/1001}Hz/D"), "01:02:03:04*{30000/1001}Hz/D");
    EXPECT_EQ(Exchange("1:2:3:4 {30000/1001}Hz/D "), "01:02:03:04 {30000/1001}Hz") << "not exactly /D";
    EXPECT_EQ(Exchange("25:2:3:4 {25/1}Hz"), "01:02:03:04 {25/1}Hz");
    EXPECT_EQ(Exchange("1:2:3:4 {25/2}Hz"), "01:02:03:04 {25/2}Hz/D");
    EXPECT_EQ(Exchange("1:2:3:4 {" + std::string(100000, '0') + "25/1}Hz"), "01:02:03:04 {25/1}Hz");
    for (const std::string& refused : {std::string("0:1:0:0 {30000/1001}Hz/D"), std::string("1:2:3:4 {25/1}Hz/D"),
                                       std::string("nothing"), std::string(100000, '9')})
        EXPECT_EQ(Exchange(refused), "") << refused.substr(0, 30);
    EXPECT_EQ(Narrow(SZUTC(static_cast<const wchar_t*>(nullptr)).text), "");
}

TEST(TimecodeExchangeText, RatesWithoutFieldsIntended) {
    for (const char* rate : {"? 25/1}Hz", "? 25/1}Hz/D"}) EXPECT_EQ(Exchange(rate), "--:--:--:-- {25/1}Hz");
    EXPECT_EQ(Exchange("120/2}Hz"), "--:--:--:-- {60/1}Hz");
    EXPECT_EQ(Exchange(" 25/2}Hz"), "--:--:--:-- {25/2}Hz");
    for (const char* refused : {"--:--:--:-- {25/1}Hz", "25/1}Hz", "--:--:--:-- {30000/1001}Hz", "? 26/1}Hz"})
        EXPECT_EQ(Exchange(refused), "") << refused;
}

// Every piece of a text gives one of the forms, and a form is read as the one it is.
TEST(TimecodeText, CutAtEveryCharacter) {
    for (const std::string whole : {"-10.20:30.12", "10:20:30:12+{30000/1001}Hz/D", "--:--:--:--  25/1}Hz/D"})
        for (std::size_t begin = 0; begin <= whole.size(); ++begin)
            for (std::size_t length = 0; length <= whole.size() - begin; ++length) {
                const std::string piece = whole.substr(begin, length);
                const SZTC fixed(Units(Wide(piece)));
                EXPECT_EQ(Narrow(fixed.text).size(), 12u) << piece;
                EXPECT_EQ(Narrow(SZTC(fixed.text).text), Narrow(fixed.text)) << piece;
                const std::string exchange = Exchange(piece);
                EXPECT_TRUE(exchange.empty() || exchange.size() >= 19) << piece;
                EXPECT_NE(timecode(Holding<SZUTC>(piece.c_str())).sys() & 15, 15u) << piece;
            }
}
