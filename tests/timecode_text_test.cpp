// The two text forms of timecode: tables of good and bad texts.

#include <algorithm>
#include <gtest/gtest.h>
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
template <class Text> Text Holding(const std::string& text) {
    Text t;
    std::fill(std::begin(t.text), std::end(t.text), L'\0');
    std::copy(text.begin(), text.end(), t.text);
    return t;
}

// What free text becomes in one of the forms.
template <class Text> std::string Form(const std::string& freeText) {
    const std::u16string wide(freeText.begin(), freeText.end());
    return Narrow(Text(reinterpret_cast<const wchar_t*>(wide.c_str())).text);
}

const char kNone[] = " --:--:--:--";
constexpr long long kHour = 4320000;
struct Row {
    const char* text;
    ulong32 sys;
    long long count;
};

} // namespace

// The separators and rates of all systems are in the tool's documentation, whose commands run.
TEST(TimecodeFixedText, Writing) {
    const std::pair<SZTC, const char*> rows[] = {
        {{long32(10), 0, 0, 0, 10}, " 10:00,00;00"}, {TCINFO(-1LL, 0), "-00:00:00:00"},
        {{long32(25), 0, 0, 0, 0}, ">##:##:##:##"},  {{long32(-25), 0, 0, 0, 8}, "<##.##.##.##"},
        {{long32(999), 0, 0, 0, 8}, "*##:##:##:##"}, {{0LL, 0x20002}, kNone}};
    for (const auto& [text, expected] : rows) EXPECT_EQ(Narrow(text.text), expected);
}

TEST(TimecodeFixedText, Reading) {
    const Row rows[] = {
        {" 10.00:00.00", 2, 10 * 4315680LL},        {" 99:99:99:99", 0, 99 * kHour + 99 * 72000 + 99 * 1200 + 99 * 48},
        {" -1:--:-2:-3", 0, kHour + 2400 + 3 * 48}, {"  1: 2:+3: 4", 0, kHour + 2 * 72000 + 3 * 1200 + 4 * 48},
        {" 10:00:00:1", 0, 10 * kHour + 48},        {" --.--:--.--", kUnassigned | 2, 0}};
    for (const Row& row : rows) {
        const SZTC text = Holding<SZTC>(row.text);
        EXPECT_EQ(TCINFO(text).sys(), row.sys) << row.text;
        EXPECT_EQ(static_cast<long long>(text), row.count) << row.text;
        EXPECT_EQ(static_cast<long32>(text), static_cast<long32>(TCINFO(text))) << row.text;
    }
    // Intended: timecode-bad-separators
    for (const char* invalid :
         {" 00.00.00:00", " 1x:00:00:00", " 00:00:00:x0", ">##:##:##:##", "*00:00:00:00", "", " 10:00:00:"})
        EXPECT_EQ(TCINFO(Holding<SZTC>(invalid)).sys(), kInvalid) << invalid;
    for (const char* unassigned :
         {kNone, " 00.00:00:00", " 00:00:00!00", " ", " 10:00:00", "1111111111111" /* no terminator */})
        EXPECT_EQ(TCINFO(Holding<SZTC>(unassigned)).sys(), kUnassigned) << unassigned;
    SZTC stale = Holding<SZTC>(" 10:00:00:00");
    stale.text[5] = L'\0';
    EXPECT_EQ(TCINFO(stale).sys(), kUnassigned) << "nothing is read behind the terminator";
}

TEST(TimecodeFixedText, FreeText) {
    for (const char* unsignedText : {"10:20:30:12", "+10:20:30:12", " 10:20:30:12"})
        EXPECT_EQ(Form<SZTC>(unsignedText), " 10:20:30:12");
    for (const char* kept : {" 10.20:30.12", ">##:##:##:##", "*##:##:##:##", kNone}) EXPECT_EQ(Form<SZTC>(kept), kept);
    for (const char* refused : {"-10.20.30:12", "10.20:30:12", "x10:20:30:12", "1:20:30:12", "10:20:30:1",
                                " 10:20:30:123", ">10:20:30:12", " ##:##:##:##", " 1 :20:30:12", ""})
        EXPECT_EQ(Form<SZTC>(refused), kNone) << refused;
    EXPECT_EQ(Narrow(SZTC(static_cast<const wchar_t*>(nullptr)).text), kNone);
    EXPECT_TRUE(timecode(L"00:00:01:00") == timecode(1200LL, 0) && timecode(L">##:##:##:##").sys() == kInvalid);
}

// Intended: timecode-utf8
TEST(TimecodeFixedText, Utf8DropsTheSystemIntended) {
    const SZTC text(long32(10), 0, 0, 0, 2);
    EXPECT_EQ(Narrow(String::CACFWChar(text)), " 10.00:00.00");
    EXPECT_STREQ(reinterpret_cast<const char*>(*String::CUTF8Char(text)), " 10:00:00:00");
}

TEST(TimecodeExchangeText, Writing) {
    EXPECT_EQ(Narrow(SZUTC(timecode(long32(10), 0, 0, 0, 9)).text), "10:00:00:00 {25/2}Hz/D");
    EXPECT_EQ(Narrow(SZUTC(timecode(0LL, kUnassigned | 8)).text), "--:--:--:-- {60000/1001}Hz/D");
    EXPECT_EQ(Narrow(SZUTC(timecode(long32(25), 0, 0, 0, 0)).text), "01:00:00:00+{25/1}Hz");
    EXPECT_EQ(Narrow(SZUTC(timecode(-48LL, 0)).text), "23:59:59:24-{25/1}Hz");
    EXPECT_EQ(Narrow(SZUTC(timecode(5LL, kInvalid | 14)).text), "--:--:--:-- {25/1}Hz");
    EXPECT_EQ(Narrow(SZUTC().text), "");
}

TEST(TimecodeExchangeText, Reading) {
    const Row rows[] = {{"10:00:00:00 {25/2}Hz", 9, 10 * kHour},
                        {"10:00:00:00 {25/1}", 0, 10 * kHour},
                        {" 1: 2: 3: 4x{ 25/ 1}Hz", 0, kHour + 2 * 72000 + 3 * 1200 + 4 * 48},
                        {"-1:00:00:00 {25/1}Hz", 0, -kHour},
                        {"4294967297:00:00:00 {25/1}Hz", 0, kHour}, // numbers wrap at 2^32
                        {"00:00:00:00 {120/2}Hz", 13, 0},
                        {"01:00:00:00+{25/1}Hz", kInvalid, kHour},
                        {"01:00:00:00-{30/1}Hz", 12, kHour - 2073600000},
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
    // Texts that fill the array have no terminator: reading stops at its end.
    const SZUTC ones = Holding<SZUTC>("10:00:00:00 {25/" + std::string(32, '1'));
    const SZUTC one = Holding<SZUTC>("10:00:00:00 {25/" + std::string(31, '0') + "1");
    EXPECT_TRUE(timecode(ones).sys() == kUnassigned && timecode(one) == timecode(10 * kHour, 0));
}

// Intended: timecode-rate-alone
TEST(TimecodeExchangeText, CanonicalisingAndRatesWithoutFieldsIntended) {
    const std::pair<std::string, const char*> rows[] = {
        {"1:2:3:4 {120/2}Hz", "01:02:03:04 {60/1}Hz"},
        {"1:2:3:4*{30000/1001}Hz/D", "01:02:03:04*{30000/1001}Hz/D"},
        {"1:2:3:4 {30000/1001}Hz/D ", "01:02:03:04 {30000/1001}Hz"}, // not exactly /D
        {"1:2:3:4 {" + std::string(100000, '0') + "25/1}Hz", "01:02:03:04 {25/1}Hz"},
        {"? 25/1}Hz", "--:--:--:-- {25/1}Hz"},
        {" 25/2}Hz", "--:--:--:-- {25/2}Hz"}};
    for (const auto& [text, expected] : rows) EXPECT_EQ(Form<SZUTC>(text), expected) << text.substr(0, 30);
    for (const char* refused : {"0:1:0:0 {30000/1001}Hz/D", "1:2:3:4 {25/1}Hz/D", "--:--:--:-- {25/1}Hz", "25/1}Hz",
                                "--:--:--:-- {30000/1001}Hz", "? 26/1}Hz"})
        EXPECT_EQ(Form<SZUTC>(refused), "") << refused;
    EXPECT_EQ(Form<SZUTC>(std::string(100000, '9')), "");
    EXPECT_EQ(Narrow(SZUTC(static_cast<const wchar_t*>(nullptr)).text), "");
}
