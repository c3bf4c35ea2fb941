#pragma once
// Texts of documents as values, by the library's typed readers.

#include "text.h"

#include <string>
#include <TAVO/string.h>
#include <vector>

namespace tool {

std::vector<std::string> ValueTypeNames();

// The value in its plainest form; or why the text is none, naming the character that is wrong. @p type is one of the
// names.
struct ValueReading {
    std::string shown;
    std::string fault; // empty for a value
};
ValueReading ReadValue(const TAVO::String::CPPoolString& text, Pairs pairs, const std::string& type);

} // namespace tool
