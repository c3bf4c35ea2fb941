// Escaping against a naive reading, and the URLs of local paths.

#include "support/guardpage.h"
#include "support/heapwatch.h"
#include "support/scratch.h"
#include "support/texts.h"

#include <TAVO/internetional.h>

using namespace TAVO::Internetional;
using support::WideText;
using namespace TAVO::String;

namespace {

const unsigned char* Bytes(const std::string& text) { return reinterpret_cast<const unsigned char*>(text.c_str()); }
std::string Text(const unsigned char* text) { return text ? reinterpret_cast<const char*>(text) : "(none)"; }

// What a naive reading makes of a text, of which the bytes of an extra set are kept, too.
struct Naive {
    std::string encoded, decoded;
    bool isEscaped = true;

    Naive(const std::string& text, const std::string& extra) {
        const std::string kept = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-_.~" + extra;
        std::size_t read = 0; // of what is decoded
        for (std::size_t i = 0; i < text.size(); ++i) {
            const bool isKept = kept.find(text[i]) != kept.npos, isEscape = IsEscapeAt(text, i);
            char escape[4];
            std::snprintf(escape, sizeof escape, "%%%02X", static_cast<unsigned char>(text[i]));
            encoded += isKept ? std::string(1, text[i]) : escape;
            isEscaped = isEscaped && (isKept || isEscape);
            if (i < read) continue;
            decoded += isEscape ? static_cast<char>(std::stoi(text.substr(i + 1, 2), nullptr, 16)) : text[i];
            read = i + (isEscape ? 3 : 1);
        }
    }
    static bool IsEscapeAt(const std::string& text, std::size_t at) {
        return text[at] == '%' && text.substr(at + 1, 2).find_first_not_of("0123456789abcdefABCDEF") == text.npos &&
               text.size() - at > 2;
    }
};

// Every function on a text that ends at a guard page, with outputs that end there too.
void ExpectAsNaive(const std::string& text, const std::string& extra) {
    static const support::GuardedMemory source, target;
    const Naive naive(text, extra);
    unsigned char* const src = source.Place(Bytes(text), text.size() + 1);
    ASSERT_EQ(URL_encoderequired(src, Bytes(extra)), naive.encoded.size()) << text;
    ASSERT_EQ(URL_checkescape(src, Bytes(extra)), naive.isEscaped) << text;
    unsigned char* const url = target.End() - naive.encoded.size() - 1;
    ASSERT_TRUE(URL_encodebuffer(url, src, Bytes(extra)) && naive.encoded == Text(url)) << text;
    const auto equals = [&](const unsigned char* out) {
        return std::string(out, out + naive.decoded.size() + 1) == naive.decoded + '\0';
    };
    unsigned char* const plain = target.End() - naive.decoded.size() - 1;
    ASSERT_TRUE(URL_decodebuffer(plain, src) && equals(plain)) << text;
    ASSERT_TRUE(URL_decodebuffer(src, src) && equals(src)) << text;
}

} // namespace

// Every byte, alone and between others, and with an extra set that has it; and random texts.
// Intended: url-percent, url-zero
TEST(Urls, AgreeWithANaiveReading_Intended) {
    for (unsigned byte = 1; byte < 256; ++byte)
        for (std::size_t length : {1, 30})
            for (std::size_t at = 0; at < length; ++at)
                for (const char* fill : {"a", "%4", "%4a"}) {
                    std::string text;
                    for (std::size_t i = 0; i < length; ++i) text += i == at ? std::string(1, char(byte)) : fill;
                    ExpectAsNaive(text, "");
                    ExpectAsNaive(text, std::string(1, static_cast<char>(byte)));
                }
    support::TextSource random(7);
    const char* const kPieces[] = {"%", "%4", "%4a", "%C3%a9", "%zz", "%4%", "%00", "abc", " ", "\xC3\xA9", "/"};
    for (int round = 0; round < 6000; ++round) {
        std::string text;
        for (std::uint32_t pieces = random.Below(30); pieces; --pieces)
            text += random.Below(3) ? kPieces[random.Below(std::size(kPieces))]
                                    : std::string(random.Below(40), static_cast<char>('a' + random.Below(26)));
        ExpectAsNaive(text, round % 3 == 0 ? "" : round % 3 == 1 ? "/" : "/% \xC3");
    }
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
    // Behind "file:///".
    const std::pair<const wchar_t*, const char*> rows[] = {
        {L"C:\\a b\\c.mov", "C%3A%5Ca%20b%5Cc.mov"},
        {L"/home/x", "/home/x"},
        {L"/", "/"},
        {L"\\\\srv\\s\\100%", "%5C%5Csrv%5Cs%5C100%25"},
        {L"\\\\?\\C:\\\u00E9\u65E5~", "%5C%5C%3F%5CC%3A%5C%C3%A9%E6%97%A5~"}};
    for (const auto& [path, expected] : rows) {
        const CUTF8Char url = file_EncodeURL(path);
        EXPECT_EQ(Text(url), std::string("file:///") + expected);
        EXPECT_STREQ(*file_DecodeURL(url), path);
        EXPECT_STREQ(*file_DecodeURL(*CACFWChar(url)), path);
    }
    for (unsigned unit = 1; unit < 0x10000; ++unit) { // at both ends of a component
        const wchar_t c = static_cast<wchar_t>(unit), path[] = {L'C', L':', L'\\', c, L'/', L'a', c, 0};
        if (unit >> 11 == 0xD800 >> 11) continue;
        ASSERT_STREQ(*file_DecodeURL(file_EncodeURL(path)), path) << unit;
    }
    const WideText path = support::Widen("C:\\" + std::string(700, ' '));
    support::ForEachFailingAllocation([&] {
        const CUTF8Char url = file_EncodeURL(path);
        if (!url) return;
        const CACFWChar back = file_DecodeURL(*CACFWChar(url));
        EXPECT_TRUE(!back || WideText(back) == path);
    });
}

// Intended: file-url-whole, file-url-pairs, file-url-relative
TEST(FileUrls, ForeignFormsAndPathsWithoutAUrlOfTheirOwn_Intended) {
    // The last is the library's own pair.
    const std::pair<const char*, const wchar_t*> rows[] = {
        {"FILE://LocalHost/c%3a%5CX", L"c:\\X"},   {"file:///", L"/"},
        {"file://server/a%20b", L"//server/a b"},  {"file:///C:/a", L"C:/a"},
        {"file://localhost", L"//localhost"},      {"file:///C:a", L"/C:a"},
        {"file:///%C3%A9%zz%", L"/\u00E9%zz%"},    {"file:///%5Ca", L"\\a"},
        {"file:///%F0%90%80%80", L"/\xD840\xDC00"}};
    for (const auto& [url, path] : rows) EXPECT_STREQ(*file_DecodeURL(Bytes(url)), path) << url;
    for (const char* url : {"file://", "file:/a", " file:///a", "file:///a%00b", "file:///a%FFb", "file:///a%C3",
                            "file:///a%F4%90%80%80"})
        EXPECT_FALSE(file_DecodeURL(Bytes(url))) << url;

    EXPECT_EQ(Text(file_EncodeURL(L"/\xD83D\xDE00x")), "file:////%01x") << "a pair is one byte";
    for (const wchar_t* path : {L"/a\xD83Dx", L"/a\xDE00x", L"/a\xD83D", L"/a\xD800\xDC00x", L""})
        EXPECT_FALSE(file_EncodeURL(path) || file_DecodeURL(WideText(L"file://") + path)) << Text(CUTF8Char(path));
    EXPECT_FALSE(file_EncodeURL(nullptr) || file_DecodeURL(static_cast<const wchar_t*>(nullptr)) ||
                 file_DecodeURL(static_cast<const unsigned char*>(nullptr)));
    EXPECT_STREQ(*file_DecodeURL(file_EncodeURL(L"a/b")), L"/a/b");
}
