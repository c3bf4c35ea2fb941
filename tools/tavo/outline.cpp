#include "outline.h"

#include "document.h"
#include "streams.h"

namespace tool {

namespace {

using TAVO::String::CPPoolString;

constexpr std::size_t kDeepestIndent = 40; // levels; below it the level is written as a number instead

} // namespace

void PrintOutline(const CPXMLObject& root, Pairs pairs) {
    const auto enter = [&](const CPXMLObject& element, std::size_t depth) {
        std::string line(2 * std::min(depth, kDeepestIndent), ' ');
        if (depth > kDeepestIndent) line += '(' + std::to_string(depth) + ") ";
        line += Shown(element.GetName(), pairs);
        CPPoolString name, value;
        for (std::size_t i = 0; element.GetAttribute(i, name, value); ++i)
            line += ' ' + Shown(name, pairs) + '=' + Quoted(Shown(value, pairs));
        if (const CPPoolString data = element.GetData(); data.isdef()) line += ": " + Quoted(Shown(data, pairs));
        Print(line += '\n');
    };
    Walk(root, enter, [](const CPXMLObject&, std::size_t) {});
}

} // namespace tool
