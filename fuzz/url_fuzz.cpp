// Escaping: round trips, and what is checked is what encoding leaves alone. File URLs: absolute paths come back.
// Input: the first byte says how many bytes the extra set takes, the rest is text (bytes, and once more as UTF-16).

#include "require.h"

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <cstring>
#include <string>
#include <TAVO/internetional.h>
#include <vector>

namespace {

using namespace TAVO::Internetional;
using Bytes = std::vector<unsigned char>; // terminated, so that a sanitizer sees the end

Bytes Terminated(const std::string& text) {
    Bytes bytes(text.begin(), text.end());
    bytes.push_back(0);
    bytes.shrink_to_fit();
    return bytes;
}

std::string Encode(const std::string& text, const std::string& extra) {
    const Bytes source = Terminated(text), set = Terminated(extra);
    Bytes url(URL_encoderequired(source.data(), set.data()) + 1, 0xEE);
    Require(URL_encodebuffer(url.data(), source.data(), set.data()) && url.back() == 0);
    Require(std::count(url.begin(), url.end(), 0) == 1);
    return std::string(url.begin(), url.end() - 1);
}

bool HasOnlyEscapes(const std::string& text) {
    for (auto at = text.find('%'); at != text.npos; at = text.find('%', at + 1))
        if (text.size() - at < 3 || !std::isxdigit(static_cast<unsigned char>(text[at + 1])) ||
            !std::isxdigit(static_cast<unsigned char>(text[at + 2])))
            return false;
    return true;
}

void CheckEscapes(const std::string& text, const std::string& extra) {
    const Bytes source = Terminated(text), set = Terminated(extra);
    const bool keepsPercent = extra.find('%') != extra.npos;
    const std::string url = Encode(text, extra);
    Bytes decoded = Terminated(url);
    Require(URL_checkescape(decoded.data(), set.data()));
    Require(URL_decodebuffer(decoded.data(), decoded.data()));
    if (!keepsPercent) Require(text == reinterpret_cast<const char*>(decoded.data()));

    const bool fixed = Encode(text, extra + '%') == text;
    Require(URL_checkescape(source.data(), set.data()) == (fixed && (keepsPercent || HasOnlyEscapes(text))));
    Bytes apart(source.size(), 0xEE), inPlace = source;
    Require(URL_decodebuffer(apart.data(), source.data()) && URL_decodebuffer(inPlace.data(), inPlace.data()));
    Require(std::strcmp(reinterpret_cast<char*>(apart.data()), reinterpret_cast<char*>(inPlace.data())) == 0);
}

bool IsSeparator(wchar_t c) { return c == '/' || c == '\\'; }

void CheckFileUrl(const std::string& text) {
    const auto path = file_DecodeURL(Terminated("file://" + text).data());
    if (path) Require(IsSeparator((*path)[0]) || ((*path)[0] != 0 && (*path)[1] == ':'));

    std::vector<wchar_t> absolute = {'C', ':', '\\'};
    bool simple = true; // no surrogates
    for (std::size_t i = 0; i + 1 < text.size(); i += 2) {
        wchar_t unit;
        std::memcpy(&unit, text.data() + i, sizeof unit);
        if (unit == 0) break;
        absolute.push_back(unit);
        simple = simple && (unit < 0xD800 || unit > 0xDFFF);
    }
    absolute.push_back(0);
    const auto url = file_EncodeURL(absolute.data());
    const auto back = file_DecodeURL(static_cast<const unsigned char*>(url));
    if (!simple) return;
    Require(url && back && back.len() == absolute.size() - 1);
    Require(std::equal(absolute.begin(), absolute.end(), *back));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    const std::string rest(reinterpret_cast<const char*>(data) + 1, size - 1);
    const std::size_t extras = std::min<std::size_t>(data[0] % 16, rest.size());
    const std::string text = rest.substr(extras);
    CheckEscapes(text.c_str(), rest.substr(0, extras).c_str()); // up to a zero
    CheckFileUrl(text);
    return 0;
}
