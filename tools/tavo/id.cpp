// tavo id

#include "commands.h"
#include "facts.h"
#include "faults.h"
#include "position.h"
#include "streams.h"
#include "text.h"

#include <TAVO/acf.h>

namespace tool {

using TAVO::ACF::cacfuid;

namespace {

constexpr std::size_t kDigits = 32;
constexpr std::string_view kDashed = "xxxxxxxx-xxxx-xxxx-xxxx-xxxxxxxxxxxx";

std::string Canonical(const cacfuid& id) {
    char text[cacfuid::TextUnits];
    id.GetText(text);
    return text;
}

std::string LowerCase(std::string text) {
    for (char& c : text)
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c + ('a' - 'A'));
    return text;
}

bool IsDigit(char c) { return (c >= '0' && c <= '9') || (c >= 'A' && c <= 'F') || (c >= 'a' && c <= 'f'); }

// What a text says: an identifier, or the reason why none.
struct Identifier {
    cacfuid value;
    std::string reason; // names the character; empty for an identifier
};

// The text form in any case, also in braces, or its digits alone. Stricter than the library, which takes much else.
Identifier ReadIdentifier(const std::string& text) {
    Identifier result;
    std::size_t digits = 0;
    while (digits < text.size() && IsDigit(text[digits])) ++digits;
    const bool braces = !text.empty() && text[0] == '{';
    std::string form(digits > 8 ? std::string(kDigits, 'x') : std::string(kDashed));
    if (braces) form = '{' + form + '}';
    std::string dashed;
    for (std::size_t i = 0; i < form.size(); ++i) {
        const bool fits = i < text.size() && (form[i] == 'x' ? IsDigit(text[i]) : text[i] == form[i]);
        if (!fits) {
            result.reason = Misplaced(text, i, form[i] == 'x' ? "a hexadecimal digit" : Quoted(form.substr(i, 1)));
            return result;
        }
        if (form[i] != 'x') continue;
        if (kDashed[dashed.size()] == '-') dashed += '-';
        dashed += text[i];
    }
    if (text.size() > form.size()) {
        result.reason = Misplaced(text, form.size(), "the end");
        return result;
    }
    result.value.Set(dashed.c_str());
    return result;
}

// What the library makes of a text that the tool refuses.
std::string LibraryReading(const std::string& text) {
    cacfuid id;
    if (!id.Set(text.c_str())) return "refuses it";
    return id ? "reads " + Canonical(id) : "reads the null identifier";
}

std::string Hex(std::uint32_t value, unsigned digits) {
    std::string text = "0x";
    while (digits-- > 0) text += "0123456789ABCDEF"[value >> 4 * digits & 15];
    return text;
}

std::string Initializer(const cacfuid& id) {
    const _acfUID& uid = id.rec();
    std::string text = '{' + Hex(uid.Data1, 8) + ", " + Hex(uid.Data2, 4) + ", " + Hex(uid.Data3, 4) + ", {";
    for (std::size_t i = 0; i < 8; ++i) {
        text += Hex(uid.Data4[i], 2);
        text += i < 7 ? ", " : "}}";
    }
    return text;
}

Facts Spellings(const cacfuid& id) {
    const std::string text = Canonical(id);
    std::string plain;
    for (const char c : text)
        if (c != '-') plain += c;
    Facts facts;
    facts.AddText("identifier", text);
    facts.AddText("lower case", LowerCase(text));
    facts.AddText("braces", '{' + text + '}');
    facts.AddText("digits", plain);
    facts.AddText("initializer", Initializer(id));
    return facts;
}

} // namespace

std::string Misplaced(const std::string& text, std::size_t at, const std::string& wanted) {
    const std::string place = "character " + std::to_string(at + 1);
    if (at >= text.size()) return "it ends where " + place + ", " + wanted + ", belongs";
    std::size_t end = at + 1;
    while (end < text.size() && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80) ++end;
    return place + " is " + Named(text.substr(at, end - at)) + ", where " + wanted + " belongs";
}

std::string IdentifierFault(const std::string& text) { return ReadIdentifier(text).reason; }

int IdNew(const IdNewOptions& options) {
    std::vector<std::string> rows;
    for (unsigned i = 0; i < options.count; ++i) {
        const cacfuid id = cacfuid::New();
        if (!id) {
            Complain("the system gives no random numbers");
            return kFileTrouble;
        }
        if (options.json)
            rows.push_back(Quoted(Canonical(id)));
        else
            Print(Canonical(id) + '\n');
    }
    if (options.json) Print(JsonArray(rows));
    return kFine;
}

int IdParse(const IdTextOptions& options) {
    int worst = kFine;
    std::vector<std::string> rows;
    for (const std::string& text : options.texts) {
        const Identifier id = ReadIdentifier(text);
        const bool valid = id.reason.empty();
        if (!valid) worst = kBadInput;
        if (options.json) {
            Facts facts;
            facts.AddText("text", Cleaned(text));
            facts.Add("valid", valid);
            facts.AddText(valid ? "identifier" : "reason", valid ? Canonical(id.value) : id.reason);
            if (!valid) facts.AddText("library", LibraryReading(text));
            rows.push_back(facts.Json());
            continue;
        }
        Print(Named(text) + ": " +
              (valid ? Canonical(id.value) : "invalid: " + id.reason + "; the library " + LibraryReading(text)) + '\n');
    }
    if (options.json) Print(JsonArray(rows));
    return worst;
}

int IdFormat(const IdTextOptions& options) {
    std::vector<std::string> rows;
    for (const std::string& text : options.texts) {
        const Identifier id = ReadIdentifier(text);
        if (!id.reason.empty()) {
            Complain(Named(text) + " is no identifier: " + id.reason);
            return kBadInput;
        }
        const Facts facts = Spellings(id.value);
        if (options.json) {
            rows.push_back(facts.Json());
            continue;
        }
        if (&text != options.texts.data()) Print("\n");
        Print(facts.Lines());
    }
    if (options.json) Print(JsonArray(rows));
    return kFine;
}

} // namespace tool
