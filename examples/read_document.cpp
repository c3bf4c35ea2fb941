// Reads a document, finds elements in it, and shows what an error looks like.
//
//     example_read_document examples/data/timeline.xml

#include <cstdio>
#include <TAVO/string.h>
#include <TAVO/xml.h>

using namespace TAVO::String;
using namespace TAVO::XML;

// The UTF-8 form of a pooled string is kept with it, for as long as somebody holds it.
static const char* Utf8(const CPPoolString& text) {
    return reinterpret_cast<const char*>(static_cast<const unsigned char*>(text));
}

int main(int argc, char** argv) {
    if (argc != 2) {
        std::puts("give the name of a timeline document");
        return 2;
    }
    CXMLDoc document;
    const CACFWChar path(argv[1]); // the library takes wide text; this converts from the system's code page
    if (!document.OpenDocFile(path, XMLEncodingAutomatic)) {
        CACFWChar message;
        document.GetErrorInfo(nullptr, &message);
        std::puts(reinterpret_cast<const char*>(*CUTF8Char(message)));
        return 1;
    }

    // A path goes down from child to child. The result is null when there is no such element.
    const CPXMLObject root = document.GetRootElement(); // shares the tree, which now outlives the document
    const CPXMLObject* title = root.FindFirstElement(L"project/title");
    const CPXMLObject* bin = root.FindFirstElement(L"bins/bin");
    if (!title || !bin) return 1;
    std::printf("%s: %s\n", Utf8(root.GetName()), Utf8(title->GetData()));

    // Searches for children go on from the last result. Make the names once: then only pointers are compared.
    const CPPoolString clip = L"clip", name = L"name", rate = L"rate";
    std::size_t clips = 0;
    for (const CPXMLObject* at = bin->FindNextElement(clip, nullptr); at; at = bin->FindNextElement(clip, at)) {
        std::printf("  %s at %s\n", Utf8(at->FindAttribute(name)), Utf8(at->FindAttribute(rate)));
        ++clips;
    }
    if (clips == 0 || clips != bin->GetNElements(clip)) return 1;

    // A bad document gives a code, a place and a message, and no tree.
    if (document.OpenDocText(L"<reel>\n<clip></reel>")) return 1;
    unsigned long long offset = 0;
    CACFWChar message;
    const auto code = document.GetErrorInfo(&offset, &message);
    std::printf("error %u at offset %llu: %s\n", static_cast<unsigned>(code), offset,
                reinterpret_cast<const char*>(*CUTF8Char(message)));
    return code == 14 && offset == 13 && !document.GetRootElement() && root ? 0 : 1;
}
