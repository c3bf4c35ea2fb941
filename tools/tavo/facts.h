#pragma once
// What a command found out, told as lines for people or as a JSON object for programs.

#include <string>
#include <utility>
#include <vector>

namespace tool {

// Labels are words in lower case; their JSON keys are written "likeThis".
class Facts {
public:
    void AddText(const char* label, const std::string& text);
    // A number, true, false, null or JSON text of its own; @p shown instead of it where people read, when not empty.
    void Add(const char* label, const std::string& json, const std::string& shown = std::string());
    void Add(const char* label, bool value) { Add(label, value ? "true" : "false", value ? "yes" : "no"); }

    // One fact on each line, the labels in a column.
    std::string Lines() const;
    std::string Json() const;

private:
    struct Fact {
        const char* label;
        std::string json, shown;
    };
    std::vector<Fact> m_facts;
};

// JSON values as an array, one on each line.
std::string JsonArray(const std::vector<std::string>& values);

// The shortest decimal text that reads back as the same number; null for what JSON cannot say.
std::string Decimal(double number);

} // namespace tool
