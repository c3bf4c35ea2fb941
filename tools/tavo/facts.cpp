#include "facts.h"

#include "text.h"

#include <charconv>
#include <cmath>

namespace tool {

namespace {

// "fixed text" as "fixedText".
std::string JsonKey(const std::string& label) {
    std::string key;
    for (std::size_t i = 0; i < label.size(); ++i)
        if (label[i] != ' ') key += i > 0 && label[i - 1] == ' ' ? static_cast<char>(label[i] - ('a' - 'A')) : label[i];
    return key;
}

} // namespace

void Facts::AddText(const char* label, const std::string& text) { m_facts.push_back({label, Quoted(text), text}); }

void Facts::Add(const char* label, const std::string& json, const std::string& shown) {
    m_facts.push_back({label, json, shown.empty() ? json : shown});
}

std::string Facts::Lines() const {
    constexpr std::size_t kColumn = 18;
    std::string lines;
    for (const Fact& fact : m_facts) {
        std::string label = fact.label;
        label.resize(kColumn, ' ');
        lines += label + fact.shown + '\n';
    }
    return lines;
}

std::string Facts::Json() const {
    std::string text = "{";
    for (const Fact& fact : m_facts) {
        if (text.size() > 1) text += ',';
        text += Quoted(JsonKey(fact.label)) + ':' + fact.json;
    }
    return text + '}';
}

std::string JsonArray(const std::vector<std::string>& values) {
    std::string text = "[";
    for (const std::string& value : values) text += (text.size() > 1 ? ",\n" : "\n") + value;
    return text + "\n]\n";
}

std::string Decimal(double number) {
    if (!std::isfinite(number)) return "null";
    char text[64];
    return std::string(text, std::to_chars(text, text + sizeof(text), number).ptr);
}

} // namespace tool
