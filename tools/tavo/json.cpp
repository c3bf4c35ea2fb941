// Written piece by piece and not as a document in memory: trees may be deep and large.

#include "document.h"
#include "outline.h"
#include "streams.h"

namespace tool {

using TAVO::String::CPPoolString;

void PrintJson(const CPXMLObject& root, Pairs pairs) {
    bool follows = false; // an element stands before this one in the same array
    const auto enter = [&](const CPXMLObject& element, std::size_t) {
        std::string text = follows ? ",\n" : "";
        text += "{\"name\":" + Quoted(Shown(element.GetName(), pairs));
        CPPoolString name, value;
        for (std::size_t i = 0; element.GetAttribute(i, name, value); ++i)
            text +=
                (i == 0 ? ",\"attributes\":{" : ",") + Quoted(Shown(name, pairs)) + ':' + Quoted(Shown(value, pairs));
        if (element.GetNAttributes() != 0) text += '}';
        if (const CPPoolString data = element.GetData(); data.isdef())
            text += ",\"text\":" + Quoted(Shown(data, pairs));
        std::size_t children = 0;
        element.GetElements(children);
        if (children != 0) text += ",\"children\":[\n";
        Print(text);
        follows = false;
    };
    const auto leave = [&](const CPXMLObject& element, std::size_t) {
        std::size_t children = 0;
        element.GetElements(children);
        Print(children != 0 ? "]}" : "}");
        follows = true;
    };
    Walk(root, enter, leave);
    Print("\n");
}

} // namespace tool
