// tavo xml tree, tavo xml get

#include "commands.h"
#include "document.h"
#include "outline.h"
#include "path.h"
#include "streams.h"

namespace tool {

int Tree(const TreeOptions& options) {
    Document document;
    if (const int code = document.Need(options.file); code != kFine) return code;
    if (options.json)
        PrintJson(document.Root(), document.PairsKept());
    else
        PrintOutline(document.Root(), document.PairsKept());
    return kFine;
}

int Get(const GetOptions& options) {
    Path path;
    Document document;
    if (!path.Parse(options.path, options.attribute)) return kUsage;
    if (const int code = document.Need(options.file); code != kFine) return code;
    const CPXMLObject* element = path.Find(document);
    if (!element) return kBadInput;

    const Pairs pairs = document.PairsKept();
    if (path.HasAttribute()) {
        const auto value = element->FindAttribute(path.Attribute());
        if (!value.isdef()) {
            Complain(document.Name() + ": " + options.path + " has no attribute " + options.attribute);
            return kBadInput;
        }
        Print(Shown(value, pairs) + '\n');
        return kFine;
    }
    std::size_t children = 0;
    element->GetElements(children);
    if (children != 0) {
        Complain(document.Name() + ": " + options.path + " holds " + Grouped(children) +
                 (children == 1 ? " element" : " elements") + " and no text");
        return kBadInput;
    }
    Print(Shown(element->GetData(), pairs) + '\n');
    return kFine;
}

} // namespace tool
