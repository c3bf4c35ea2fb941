// Escaping against a naive reading, and the URLs of local paths.

#include "support/guardpage.h"
#include "support/heapwatch.h"
#include "support/scratch.h"
#include "support/texts.h"

#include <TAVO/internetional.h>

using namespace TAVO::Internetional;
using support::WideText;
using TAVO::String::CACFWChar;
using TAVO::String::CUTF8Char;

namespace {

const unsigned char* Bytes(const std::string& text) { return reinterpret_cast<const unsigned char*>(text.c_str()); }
std::string Text(const unsigned char* text) { return text ? reinterpret_cast<const char*>(text) : "(none)"; }

bool IsHex(char c) { return std::string("0123456789abcdefABCDEF").find(c) < 22; }
bool IsKept(char c, const std::string& extra) {
    return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') ||
           (std::string("-_.~") + extra).find(c) != extra.npos;
}
bool IsEscape(const std::string& text, std::size_t at) {
    return text[at] == '%' && at + 2 < text.size() && IsHex(text[at + 1]) && IsHex(text[at + 2]);
}

std::string Encoded(const std::string& text, const std::string& extra) {
    std::string url;
    char escape[4];
    for (const char c : text) {
        std::snprintf(escape, sizeof escape, "%%%02X", static_cast<unsigned char>(c));
        url += IsKept(c, extra) ? std::string(1, c) : escape;
    }
    return url;
}
std::string Decoded(const std::string& url) {
    std::string text;
    for (std::size_t i = 0; i < url.size(); ++i) {
        if (IsEscape(url, i))
            text += static_cast<char>(std::stoi(url.substr(i + 1, 2), nullptr, 16)), i += 2;
        else
            text += url[i];
    }
    return text;
}
bool Checked(const std::string& text, const std::string& extra) {
    for (std::size_t i = 0; i < text.size(); ++i)
        if (!IsKept(text[i], extra) && !IsEscape(text, i)) return false;
    return true;
}

// Every function on a text that ends at a guard page, with outputs that end there too.
void ExpectAsNaive(const std::string& text, const std::string& extra) {
    static const support::GuardedMemory source, target;
    const std::string encoded = Encoded(text, extra), decoded = Decoded(text);
    unsigned char* const src = source.Place(Bytes(text), text.size() + 1);
    ASSERT_EQ(URL_encoderequired(src, Bytes(extra)), encoded.size()) << text;
    ASSERT_EQ(URL_checkescape(src, Bytes(extra)), Checked(text, extra)) << text;
    unsigned char* const url = target.End() - encoded.size() - 1;
    ASSERT_TRUE(URL_encodebuffer(url, src, Bytes(extra)) && encoded == Text(url)) << text;
    unsigned char* const plain = target.End() - decoded.size() - 1;
    ASSERT_TRUE(URL_decodebuffer(plain, src) && decoded == std::string(plain, target.End() - 1)) << text;
    ASSERT_TRUE(URL_decodebuffer(src, src) && decoded == std::string(src, src + decoded.size())) << text;
    ASSERT_EQ(src[decoded.size()], 0);
}

} // namespace

// Alone and between others, and with an extra set that has it.
// Intended: url-percent
TEST(Urls, EveryByteAtEveryPlace_Intended) {
    for (unsigned byte = 1; byte < 256; ++byte)
        for (std::size_t length : {1, 30})
            for (std::size_t at = 0; at < length; ++at)
                for (const char* fill : {"a", "%4", "%4a"}) {
                    std::string text;
                    for (std::size_t i = 0; i < length; ++i) text += i == at ? std::string(1, char(byte)) : fill;
                    ExpectAsNaive(text, "");
                    ExpectAsNaive(text, std::string(1, static_cast<char>(byte)));
                }
}

// Intended: url-zero
TEST(Urls, RandomTextsAgainstNaive_Intended) {
    support::TextSource random(7);
    const char* const kPieces[] = {"%", "%4", "%4a", "%C3%a9", "%zz", "%4%", "%00", "abc", " ", "\xC3\xA9", "/"};
    for (int round = 0; round < 6000; ++round) {
        std::string text;
        for (std::uint32_t pieces = random.Below(30); pieces; --pieces)
            text += random.Below(3) ? kPieces[random.Below(std::size(kPieces))]
                                    : std::string(random.Below(40), static_cast<char>('a' + random.Below(26)));
        ExpectAsNaive(text, round % 3 == 0 ? "" : round % 3 == 1 ? "/" : "/% \xC3");
        std::string url = Encoded(text, "/");
        ASSERT_TRUE(URL_checkescape(Bytes(url), Bytes("/")) && Decoded(url) == text) << url;
    }
}

TEST(Urls, NullAndOneBuffer) {
    unsigned char buffer[8] = "a b";
    EXPECT_FALSE(URL_encodebuffer(buffer, buffer, nullptr) || URL_encodebuffer(nullptr, buffer, nullptr) ||
                 URL_encodebuffer(buffer, nullptr, nullptr) || URL_decodebuffer(nullptr, buffer) ||
                 URL_decodebuffer(buffer, nullptr) || URL_checkescape(nullptr, nullptr));
    EXPECT_EQ(Text(buffer), "a b");
    EXPECT_TRUE(URL_checkescape(Bytes(""), nullptr) && URL_encoderequired(nullptr, nullptr) == 0 &&
                URL_encoderequired(buffer, nullptr) == 5);
}

// Intended: file-url-letter
TEST(FileUrls, OfPathsAndBack_Intended) {
    const struct {
        const wchar_t* path;
        const char* url; // behind "file:///"
    } rows[] = {{L"C:\\a b\\c.mov", "C%3A%5Ca%20b%5Cc.mov"},
                {L"/home/x", "/home/x"},
                {L"\\\\srv\\s\\100%", "%5C%5Csrv%5Cs%5C100%25"},
                {L"\\\\?\\C:\\\u00E9\u65E5~", "%5C%5C%3F%5CC%3A%5C%C3%A9%E6%97%A5~"},
                {L"/", "/"}};
    for (const auto& row : rows) {
        const CUTF8Char url = file_EncodeURL(row.path);
        EXPECT_EQ(Text(url), std::string("file:///") + row.url);
        EXPECT_STREQ(*file_DecodeURL(url), row.path);
        EXPECT_STREQ(*file_DecodeURL(*CACFWChar(url)), row.path);
    }
    for (unsigned unit = 1; unit < 0x10000; ++unit) { // at both ends of a component
        const wchar_t c = static_cast<wchar_t>(unit), path[] = {L'C', L':', L'\\', c, L'/', L'a', c, 0};
        if (unit >> 11 == 0xD800 >> 11) continue;
        ASSERT_STREQ(*file_DecodeURL(file_EncodeURL(path)), path) << unit;
    }
}

TEST(FileUrls, ForeignForms) {
    const struct {
        const char* url;
        const wchar_t* path; // null: none
    } rows[] = {{"file:///C:/a", L"C:/a"},
                {"FILE://LocalHost/c%3a%5CX", L"c:\\X"},
                {"file:///", L"/"},
                {"file:///C:a", L"/C:a"},
                {"file:///%5Ca", L"\\a"},
                {"file://server/share/a%20b", L"//server/share/a b"},
                {"file://localhost", L"//localhost"},
                {"file:///%C3%A9%zz%", L"/\u00E9%zz%"},
                {"file:///%F0%90%80%80", L"/\xD840\xDC00"}, // the library's own pair
                {"file://", nullptr},
                {"file:/a", nullptr},
                {" file:///a", nullptr},
                // Intended: file-url-whole
                {"file:///a%00b", nullptr},
                {"file:///a%FFb", nullptr},
                {"file:///a%C3", nullptr},
                {"file:///a%F4%90%80%80", nullptr}};
    for (const auto& row : rows) {
        const CACFWChar path = file_DecodeURL(Bytes(row.url));
        EXPECT_TRUE(row.path ? path && WideText(path) == WideText(row.path) : !path) << row.url;
    }
}

// Intended: file-url-pairs, file-url-whole, file-url-relative
TEST(FileUrls, PathsWithoutAUrlOfTheirOwn_Intended) {
    EXPECT_EQ(Text(file_EncodeURL(L"/\xD83D\xDE00x")), "file:////%01x") << "a pair is one byte";
    for (const wchar_t* path : {L"/a\xD83Dx", L"/a\xDE00x", L"/a\xD83D", L"/a\xD800\xDC00x", L""})
        EXPECT_FALSE(file_EncodeURL(path) || file_DecodeURL(WideText(L"file://") + path)) << Text(CUTF8Char(path));
    EXPECT_FALSE(file_EncodeURL(nullptr) || file_DecodeURL(static_cast<const wchar_t*>(nullptr)) ||
                 file_DecodeURL(static_cast<const unsigned char*>(nullptr)));
    EXPECT_STREQ(*file_DecodeURL(file_EncodeURL(L"a/b")), L"/a/b");
}

TEST(FileUrls, FailingAllocations) {
    const WideText path = support::Widen("C:\\" + std::string(700, ' '));
    support::ForEachFailingAllocation([&] {
        const CUTF8Char url = file_EncodeURL(path);
        if (!url) return;
        const CACFWChar back = file_DecodeURL(*CACFWChar(url));
        EXPECT_TRUE(!back || WideText(back) == path);
    });
}
