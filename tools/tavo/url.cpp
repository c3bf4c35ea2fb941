// tavo url

#include "commands.h"
#include "encodings.h"
#include "facts.h"
#include "position.h"
#include "streams.h"
#include "text.h"

#include <TAVO/internetional.h>

namespace tool {

using namespace TAVO::Internetional;
using TAVO::String::CUTF8Char;

namespace {

const unsigned char* Bytes(const std::string& text) { return reinterpret_cast<const unsigned char*>(text.c_str()); }
std::string Text(const unsigned char* text) { return text ? reinterpret_cast<const char*>(text) : ""; }

bool IsDigit(char c) { return (c >= '0' && c <= '9') || (c >= 'A' && c <= 'F') || (c >= 'a' && c <= 'f'); }
bool IsEscape(const std::string& text, std::size_t percent) {
    return text.size() - percent > 2 && IsDigit(text[percent + 1]) && IsDigit(text[percent + 2]);
}

std::string CharacterAt(const std::string& text, std::size_t at) {
    std::size_t count = 1;
    for (std::size_t i = 0; i < at; ++i)
        if ((static_cast<unsigned char>(text[i]) & 0xC0) != 0x80) ++count;
    return "character " + std::to_string(count);
}

// Names the first '%' that begins no escape; empty when there is none.
std::string Unescaped(const std::string& text) {
    for (auto at = text.find('%'); at != text.npos; at = text.find('%', at + 1))
        if (!IsEscape(text, at)) return CharacterAt(text, at) + " begins no escape";
    return std::string();
}

// Names the escape of a zero, which ends the library's texts; empty when there is none.
std::string Zero(const std::string& text) {
    const auto at = text.find("%00");
    return at == text.npos ? std::string() : CharacterAt(text, at) + " begins %00, and a zero ends a text";
}

std::string Encoded(const std::string& text, const std::string& keep) {
    std::string encoded(URL_encoderequired(Bytes(text), Bytes(keep)) + 1, '\0');
    URL_encodebuffer(reinterpret_cast<unsigned char*>(encoded.data()), Bytes(text), Bytes(keep));
    encoded.pop_back(); // the terminator
    return encoded;
}

std::string Decoded(const std::string& text) {
    std::string decoded(text.size() + 1, '\0');
    URL_decodebuffer(reinterpret_cast<unsigned char*>(decoded.data()), Bytes(text));
    return decoded.c_str();
}

bool IsFileUrl(const std::string& url) {
    constexpr std::string_view kScheme = "file://";
    for (std::size_t i = 0; i < kScheme.size(); ++i)
        if (i >= url.size() || (url[i] >= 'A' && url[i] <= 'Z' ? url[i] + ('a' - 'A') : url[i]) != kScheme[i])
            return false;
    return true;
}

// Why the library makes no path of a URL, or another one; empty when it does.
std::string PathFault(const std::string& url) {
    if (!IsFileUrl(url)) return "it does not begin with file://";
    if (std::string zero = Zero(url); !zero.empty()) return zero;
    const std::string decoded = Decoded(url);
    const EncodedText text(decoded, FindTextFormat("utf-8"));
    Character character;
    for (std::size_t at = 0; at < text.End(); at += character.units) {
        const std::string place = "byte " + std::to_string(at + 1) + " of the decoded text: ";
        if (!text.Library(at, character) || character.value > 0x10FFFF) return place + text.Standard(at).fault;
        if (character.value == 0) return place + "a zero ends a text";
        if (character.value > 0xFFFF)
            return place + CodePointName(character.value) + " comes out as another character, as all above U+FFFF do";
    }
    return file_DecodeURL(Bytes(url)) ? "" : "nothing stands behind file://";
}

// Names the first byte of a text that is no UTF-8; empty when all is.
std::string Utf8Fault(const std::string& bytes) {
    const EncodedText text(bytes, FindTextFormat("utf-8"));
    Character character;
    for (std::size_t at = 0; at < text.End(); at += character.units)
        if (character = text.Standard(at); !character.fault.empty())
            return "byte " + std::to_string(at + 1) + " of the decoded text: " + character.fault;
    return std::string();
}

// What one argument becomes, or why it does not.
struct Answer {
    std::string text, fault;
    std::string note; // on standard error, beside the text
};

Answer EncodeOne(const std::string& text, const std::string& keep) {
    Answer answer;
    answer.text = Encoded(text, keep);
    if (text.find('%') != text.npos && keep.find('%') == keep.npos && URL_checkescape(Bytes(text), Bytes(keep)))
        answer.note = "it was escaped already, and now is twice";
    if (Decoded(answer.text) != text) answer.note = "with % kept, it does not decode to itself";
    return answer;
}

Answer DecodeOne(const std::string& text, const std::string&) {
    Answer answer;
    answer.fault = Zero(text);
    answer.text = Decoded(text);
    answer.note = Utf8Fault(answer.text);
    if (const std::string percent = Unescaped(text); !percent.empty()) answer.note = percent + " and stays as it is";
    return answer;
}

Answer FromPathOne(const std::string& path, const std::string&) {
    Answer answer;
    WideText wide;
    const bool unicode = ToWide(path, Pairs::Standard, wide);
    const CUTF8Char url = unicode ? file_EncodeURL(wide) : CUTF8Char();
    const std::string back = ToUtf8(file_DecodeURL(static_cast<const unsigned char*>(url)), Pairs::Standard);
    answer.text = Text(url);
    if (path.empty())
        answer.fault = "an empty path has no URL";
    else if (!unicode)
        answer.fault = "it is no Unicode";
    else if (back == '/' + path)
        answer.note = "it is relative, and comes back as " + Named(back);
    else if (back != path)
        answer.fault = "the library does not keep characters above U+FFFF and single surrogates";
    return answer;
}

Answer ToPathOne(const std::string& url, const std::string&) {
    Answer answer;
    answer.fault = PathFault(url);
    answer.text = ToUtf8(file_DecodeURL(Bytes(url)), Pairs::Standard);
    if (answer.fault.empty())
        if (const std::string percent = Unescaped(url); !percent.empty()) answer.note = percent + " and stays as it is";
    return answer;
}

// Answers all texts, one on each line.
int AnswerAll(const UrlTextOptions& options, const char* given, const char* made,
              Answer (*one)(const std::string& text, const std::string& keep)) {
    int worst = kFine;
    std::vector<std::string> rows;
    for (const std::string& text : options.texts) {
        const Answer answer = one(text, options.keep);
        const bool fine = answer.fault.empty();
        if (!fine) worst = kBadInput;
        if (options.json) {
            Facts facts;
            facts.AddText(given, Cleaned(text));
            facts.AddText(fine ? made : "reason", fine ? Cleaned(answer.text) : answer.fault);
            if (fine && !answer.note.empty()) facts.AddText("note", answer.note);
            rows.push_back(facts.Json());
            continue;
        }
        if (fine) Print(answer.text + '\n');
        if (!fine) Complain(Named(text) + ": " + answer.fault);
        if (fine && !answer.note.empty()) Complain(Named(text) + ": note: " + answer.note);
    }
    if (options.json) Print(JsonArray(rows));
    return worst;
}

} // namespace

int UrlEncode(const UrlTextOptions& options) { return AnswerAll(options, "text", "encoded", EncodeOne); }
int UrlDecode(const UrlTextOptions& options) { return AnswerAll(options, "text", "decoded", DecodeOne); }
int UrlFromPath(const UrlTextOptions& options) { return AnswerAll(options, "path", "url", FromPathOne); }
int UrlToPath(const UrlTextOptions& options) { return AnswerAll(options, "url", "path", ToPathOne); }

} // namespace tool
