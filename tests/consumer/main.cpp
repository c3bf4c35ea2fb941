// A first program: reads a document from memory and prints its clips.

#include <cstdio>
#include <TAVO/core.h>
#include <TAVO/xml.h>

// The library's wide characters have 16 bits everywhere; for printf, ask a string for its UTF-8 form.
static const char* Utf8(const TAVO::String::CPPoolString& text) {
    return reinterpret_cast<const char*>(static_cast<const unsigned char*>(text));
}

int main() {
    TAVO::AppInit();
    {
        TAVO::XML::CXMLDoc document;
        if (!document.OpenDocText(L"<bin><clip name='Interview' in='01:00:00:00'/></bin>")) return 1;
        const TAVO::XML::CPXMLObject& bin = document.GetRootElement();
        const TAVO::XML::CPXMLObject* clip = nullptr;
        while ((clip = bin.FindNextElement(L"clip", clip)) != nullptr)
            std::printf("%s starts at %s\n", Utf8(clip->FindAttribute(L"name")), Utf8(clip->FindAttribute(L"in")));
    }
    TAVO::AppExit();
}
