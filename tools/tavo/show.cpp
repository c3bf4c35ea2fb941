// tavo xml tree, tavo xml get

#include "commands.h"
#include "document.h"
#include "outline.h"
#include "path.h"
#include "position.h"
#include "streams.h"
#include "value.h"

namespace tool {

using TAVO::String::CPPoolString;

namespace {

// Prints a text as it is, or the value that it has as the wanted type.
int PrintAs(const GetOptions& options, const Document& document, const CPPoolString& text) {
    if (options.type.empty()) {
        Print(Shown(text, document.PairsKept()) + '\n');
        return kFine;
    }
    const ValueReading value = ReadValue(text, document.PairsKept(), options.type);
    if (value.fault.empty()) {
        Print(value.shown + '\n');
        return kFine;
    }
    const std::string place = options.path + (options.attribute.empty() ? "" : " " + options.attribute);
    Complain(document.Name() + ": " + place + ": " + Named(Shown(text, document.PairsKept())) + " does not read as " +
             options.type + ": " + value.fault);
    return kBadInput;
}

} // namespace

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

    if (path.HasAttribute()) {
        const auto value = element->FindAttribute(path.Attribute());
        if (!value.isdef()) {
            Complain(document.Name() + ": " + options.path + " has no attribute " + options.attribute);
            return kBadInput;
        }
        return PrintAs(options, document, value);
    }
    std::size_t children = 0;
    element->GetElements(children);
    if (children != 0) {
        Complain(document.Name() + ": " + options.path + " holds " + Grouped(children) +
                 (children == 1 ? " element" : " elements") + " and no text");
        return kBadInput;
    }
    return PrintAs(options, document, element->GetData());
}

} // namespace tool
