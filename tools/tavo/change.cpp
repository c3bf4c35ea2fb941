// tavo xml set, tavo xml format

#include "commands.h"
#include "document.h"
#include "path.h"
#include "streams.h"

#include <algorithm>
#include <iterator>

namespace tool {

namespace {

using TAVO::Buffers::CPPlainMemory;
using TAVO::String::CACFWChar;
using TAVO::String::CPPoolString;
using TAVO::XML::CXMLDoc;

struct EncodingRow {
    const char* name;
    TAVO::XML::eXMLEncoding encoding;
    std::size_t unit; // bytes
};
constexpr EncodingRow kEncodings[] = {{"utf-8", TAVO::XML::XMLEncodingUTF8, 1},
                                      {"utf-16", TAVO::XML::XMLEncodingUTF16, 2},
                                      {"utf-16-raw", TAVO::XML::XMLEncodingUTF16Raw, 2}};

const EncodingRow& FindEncoding(const std::string& name) {
    return *std::find_if(std::begin(kEncodings), std::end(kEncodings) - 1,
                         [&](const EncodingRow& row) { return row.name == name; });
}

// The texts of a tree in document order: names, attributes and data with their places.
struct TextAt {
    CPPoolString text;
    const CPXMLObject* element;
    const char* kind;
};

std::vector<TextAt> ListTexts(const CPXMLObject& root) {
    std::vector<TextAt> texts;
    const auto enter = [&](const CPXMLObject& element, std::size_t) {
        texts.push_back({element.GetName(), &element, "the name"});
        CPPoolString name, value;
        for (std::size_t i = 0; element.GetAttribute(i, name, value); ++i) {
            texts.push_back({name, &element, "the attribute name"});
            texts.push_back({value, &element, "the attribute value"});
        }
        texts.push_back({element.GetData(), &element, "the text"});
    };
    const auto leave = [&](const CPXMLObject& element, std::size_t) {
        texts.push_back({CPPoolString(), &element, "the end"}); // tells apart what nests differently
    };
    Walk(root, enter, leave);
    return texts;
}

bool IsSame(const CPPoolString& a, const CPPoolString& b) { return a == b || (!a.isdef() && !b.isdef()); }

// Says how the text that was written differs when the library reads it again; empty when it does not. References and
// blanks are not always kept, and characters above U+FFFF never outside utf-16-raw.
std::string FindLoss(const CPXMLObject& root, Pairs pairs, const CPPlainMemory& text) {
    CXMLDoc again;
    if (!again.OpenDocText(text, text.GetSize())) {
        CACFWChar message;
        again.GetErrorInfo(nullptr, &message);
        return "what was written cannot be read back: " + Shown(message, Pairs::Standard);
    }
    const auto before = ListTexts(root);
    const auto after = ListTexts(again.GetRootElement());
    if (before.size() != after.size()) return "what was written reads back with another number of texts";
    std::size_t changed = 0;
    std::string first;
    for (std::size_t i = 0; i < before.size(); ++i) {
        if (IsSame(before[i].text, after[i].text)) continue;
        if (changed++ == 0)
            first = std::string("; the first is ") + before[i].kind + ' ' + Quoted(Shown(before[i].text, pairs)) +
                    " in " + Shown(before[i].element->GetName(), pairs) + ", which comes back as " +
                    Quoted(Shown(after[i].text, pairs));
    }
    if (changed == 0) return std::string();
    return (changed == 1 ? "1 text reads" : Grouped(changed) + " texts read") + " back differently" + first;
}

int WriteDocument(Document& document, const OutputOptions& options) {
    const EncodingRow& row = FindEncoding(options.encoding);
    CPPlainMemory text;
    if (!document.Root().Write(text, row.encoding, options.pretty)) {
        Complain(document.Name() + ": cannot be written in this encoding: a text holds half a pair or a character from "
                                   "U+100000 up; --encoding utf-16-raw writes any text");
        return kBadInput;
    }
    if (const std::string loss = FindLoss(document.Root(), document.PairsKept(), text); !loss.empty()) {
        Complain(document.Name() + (options.strict ? ": not written: " : ": note: ") + loss);
        if (options.strict) return kBadInput;
    }
    // The text without the zero character that ends it in memory.
    const auto* bytes = static_cast<const char*>(static_cast<void*>(text));
    std::string trouble;
    if (WriteAll(options.file, std::string_view(bytes, text.GetSize() - row.unit), trouble)) return kFine;
    Complain(options.file + ": " + trouble);
    return kFileTrouble;
}

} // namespace

std::vector<std::string> EncodingNames() {
    std::vector<std::string> names;
    for (const EncodingRow& row : kEncodings) names.push_back(row.name);
    return names;
}

int Set(const SetOptions& options) {
    Path path;
    Document document;
    if (!path.Parse(options.path, options.attribute)) return kUsage;
    if (const int code = document.Need(options.file); code != kFine) return code;
    document.NoteNamedReferences();
    CPXMLObject* element = path.Find(document);
    if (!element) return kBadInput;

    std::size_t children = 0;
    element->GetElements(children);
    if (children != 0 && !path.HasAttribute()) {
        Complain(document.Name() + ": " + options.path +
                 " holds elements, which a text would replace; nothing written");
        return kBadInput;
    }
    WideText text;
    bool set = ToWide(options.text, document.PairsKept(), text);
    if (set && path.HasAttribute() && options.text.empty())
        element->DeleteAttribute(path.Attribute()); // there are no empty attributes
    else if (set)
        set = path.HasAttribute() ? element->SetAttribute(path.Attribute(), text) : element->Set(text);
    if (!set) {
        Complain("the text cannot be kept: it is no Unicode, or holds a character from U+100000 up");
        return kBadInput;
    }
    return WriteDocument(document, options.output);
}

int Format(const FormatOptions& options) {
    Document document;
    if (const int code = document.Need(options.file); code != kFine) return code;
    document.NoteNamedReferences();
    return WriteDocument(document, options.output);
}

} // namespace tool
