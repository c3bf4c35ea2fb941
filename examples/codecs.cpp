// Bytes in a document: 3FFF makes text of them that every encoding carries and that brings all of them back.

#include <cstdio>
#include <cstring>
#include <TAVO/string.h>
#include <TAVO/xml.h>

using namespace TAVO::String;
using namespace TAVO::XML;
using TAVO::Buffers::CPPlainMemory;

int main() {
    // What a plug-in wants to find again, as it is in memory: 4 units of text for 7 bytes.
    const unsigned char settings[] = {0, 1, 2, 250, 0, 0, 128, 63, 255, 254};
    const CPPoolString text = C3FFFEncoder(settings, sizeof settings);
    CPXMLObject clip;
    if (!clip.SetName(L"clip") || !clip.AddTag(L"settings", text)) return 1;

    // Through a file and back.
    CPPlainMemory file;
    CXMLDoc document;
    if (!clip.Write(file, XMLEncodingUTF8, false) || !document.OpenDocText(file, file.GetSize())) return 1;
    const CPPlainMemory bytes = C3FFFDecoder(document.GetRootElement().FindElementData(L"settings"));
    bool fine = bytes.GetSize() == sizeof settings && std::memcmp(bytes, settings, sizeof settings) == 0;

    // What is no such text gives empty memory, and so does a block of bytes without bytes: look at the size you expect.
    fine = fine && CPPlainMemory(C3FFFDecoder(L"settings")).GetSize() == 0;

    // 3F is for texts that exist already: it refuses sizes that are multiples of 3, and changes some bytes.
    const CPPlainMemory lost = C3FDecoder(CPPoolString(C3FEncoder(settings, 9)));
    fine = fine && lost.GetSize() == 0;

    std::printf("%zu bytes in %zu units, %zu of them back\n", sizeof settings, text.len(), bytes.GetSize());
    return fine ? 0 : 1;
}
