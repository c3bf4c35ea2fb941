#include "value.h"

#include "faults.h"
#include "position.h"

#include <charconv>
#include <optional>
#include <TAVO/acf.h>
#include <TAVO/xml.h>

namespace tool {

using TAVO::Math::CRational;
using TAVO::XML::CPXMLObject;

namespace {

// --- the library's reading -----------------------------------------------------------------------------------------

template <class Number> std::string Shown(Number value, int base = 10) {
    char text[24];
    return {text, std::to_chars(text, text + sizeof text, value, base).ptr};
}
std::string Shown(double value) {
    char text[32];
    return {text, std::to_chars(text, text + sizeof text, value).ptr};
}
std::string Shown(bool value) { return value ? "true" : "false"; }
std::string Shown(const CRational& value) { return Shown(value.num()) + '/' + Shown(value.den()); }
std::string Shown(const _acfUID& value) {
    char text[TAVO::ACF::cacfuid::TextUnits];
    TAVO::ACF::cacfuid(value).GetText(text);
    return text;
}
std::string Shown(const timecode& value) { return ToUtf8(TAVO::TimeCode::SZUTC(value).text, Pairs::Standard); }

using Read = std::optional<std::string> (*)(const CPXMLObject& element);

// What a reader finds; nothing when it answers each of two defaults. (A reader that finds one of them does not answer
// the other.)
template <auto reader, class Value>
std::optional<std::string> Find(const CPXMLObject& element, Value one, Value other) {
    const Value first = (element.*reader)(one), second = (element.*reader)(other);
    return first == one && second == other ? std::nullopt : std::optional(Shown(first));
}
template <auto reader, class Number> std::optional<std::string> FindNumber(const CPXMLObject& element) {
    return Find<reader, Number>(element, 0, 1);
}
std::optional<std::string> FindHex(const CPXMLObject& element) {
    if (!FindNumber<&CPXMLObject::GetDataHex, TAVO::ulong32>(element)) return std::nullopt;
    return "0x" + Shown(element.GetDataHex(), 16);
}
std::optional<std::string> FindRational(const CPXMLObject& element) {
    return Find<&CPXMLObject::GetDataRational>(element, CRational(0), CRational(1));
}
// Stricter than the reader, for which any other text may be the null identifier.
std::optional<std::string> FindIdentifier(const CPXMLObject& element) {
    const TAVO::ACF::cacfuid found = element.GetDataGUID();
    const bool isNull = element.IsData(L"00000000-0000-0000-0000-000000000000");
    return found || isNull ? std::optional(Shown(found.rec())) : std::nullopt;
}
std::optional<std::string> FindTimecode(const CPXMLObject& element) {
    const timecode found = element.GetDataTimecode();
    return found.IsAssigned() && found.IsDefined() ? std::optional(Shown(found)) : std::nullopt;
}
std::optional<std::string> FindBytes(const CPXMLObject& element) {
    std::vector<unsigned char> bytes(element.GetDataBinarySize());
    if (!element.GetDataBinary(bytes.data(), bytes.size())) return std::nullopt;
    std::string shown;
    for (const unsigned char byte : bytes) {
        shown += "0123456789abcdef"[byte >> 4];
        shown += "0123456789abcdef"[byte & 15];
    }
    return shown;
}

// --- where a text goes wrong ---------------------------------------------------------------------------------------

using Fault = std::string (*)(const std::string& text);

bool IsDigit(char c) { return c >= '0' && c <= '9'; }
bool IsHexDigit(char c) { return IsDigit(c) || (c >= 'A' && c <= 'F') || (c >= 'a' && c <= 'f'); }

std::size_t Skip(const std::string& text, std::size_t at, bool (*fits)(char)) {
    while (at < text.size() && fits(text[at])) ++at;
    return at;
}
std::size_t SkipBlanks(const std::string& text, std::size_t at) {
    return Skip(text, at, [](char c) { return c == ' ' || (c >= '\t' && c <= '\r'); });
}
// Behind blanks and a sign.
std::size_t SkipSign(const std::string& text, std::size_t at) {
    at = SkipBlanks(text, at);
    return at + (at < text.size() && (text[at] == '-' || text[at] == '+'));
}

std::string NoDigit(const std::string& text) { return Misplaced(text, SkipSign(text, 0), "a digit"); }

std::string NoHexDigit(const std::string& text) {
    std::size_t at = SkipSign(text, 0);
    if (text.compare(at, 2, "0x") == 0 || text.compare(at, 2, "0X") == 0) at += 2;
    return Misplaced(text, at, "a hexadecimal digit");
}

std::string NoRational(const std::string& text) {
    const std::size_t numerator = SkipSign(text, 0), behind = Skip(text, numerator, IsDigit);
    if (behind == numerator) return NoDigit(text);
    const std::size_t slash = SkipBlanks(text, behind);
    if (text.compare(slash, 1, "/") != 0) return Misplaced(text, slash, "\"/\"");
    return Misplaced(text, SkipSign(text, slash + 1), "a digit");
}

std::string NoDecimal(const std::string& text) {
    const std::size_t at = SkipSign(text, 0);
    return Misplaced(text, at + (text.compare(at, 1, ".") == 0), "a digit");
}

std::string NoBool(const std::string& text) {
    std::size_t most = 0;
    for (const std::string word : {"true", "false"}) {
        std::size_t same = 0;
        while (same < word.size() && same < text.size() && (text[same] | 0x20) == word[same]) ++same;
        if (same == word.size()) return Misplaced(text, same, "the end");
        most = std::max(most, same);
    }
    return Misplaced(text, most, "\"true\" or \"false\"");
}

std::string NoTimecode(const std::string& text) {
    const std::string fault = ReadPosition(text).reason;
    return fault.empty() ? "it does not tell the rate as the universal form does" : fault;
}

std::string NoIdentifier(const std::string& text) {
    const std::string fault = IdentifierFault(text);
    return fault.empty() ? "documents have identifiers with dashes and without braces" : fault;
}

std::string NoBytes(const std::string& text) {
    const std::size_t digits = Skip(text, 0, IsHexDigit);
    if (digits == 0 || digits < text.size()) return Misplaced(text, digits, "a hexadecimal digit");
    return Misplaced(text, digits, "the second digit of a byte");
}

struct ValueType {
    const char* name;
    Read read;
    Fault fault;
};
constexpr ValueType kTypes[] = {
    {"int", FindNumber<&CPXMLObject::GetDataInt, TAVO::long32>, NoDigit},
    {"uint", FindNumber<&CPXMLObject::GetDataUInt, TAVO::ulong32>, NoDigit},
    {"hex", FindHex, NoHexDigit},
    {"int64", FindNumber<&CPXMLObject::GetDataLInt, long long>, NoDigit},
    {"uint64", FindNumber<&CPXMLObject::GetDataLUInt, unsigned long long>, NoDigit},
    {"filetime", FindNumber<&CPXMLObject::GetDataFileTime, unsigned long long>, NoDigit},
    {"double", FindNumber<&CPXMLObject::GetDataDouble, double>, NoDecimal},
    {"edouble", FindNumber<&CPXMLObject::GetDataEDouble, double>, NoHexDigit},
    {"rational", FindRational, NoRational},
    {"bool", FindNumber<&CPXMLObject::GetDataBool, bool>, NoBool},
    {"timecode", FindTimecode, NoTimecode},
    {"id", FindIdentifier, NoIdentifier},
    {"binary", FindBytes, NoBytes},
};

} // namespace

std::vector<std::string> ValueTypeNames() {
    std::vector<std::string> names;
    for (const ValueType& type : kTypes) names.emplace_back(type.name);
    return names;
}

ValueReading ReadValue(const TAVO::String::CPPoolString& text, Pairs pairs, const std::string& type) {
    CPXMLObject element;
    if (!element.SetName(L"value") || !element.Add(text)) return {{}, "memory is out"};
    for (const ValueType& known : kTypes) {
        if (known.name != type) continue;
        if (const auto found = known.read(element)) return {*found, {}};
        return {{}, known.fault(tool::Shown(text, pairs))};
    }
    return {{}, "there is no such type"};
}

} // namespace tool
