// Builds a tree of elements, writes it as text, and reads it back.

#include <cstdio>
#include <cstring>
#include <TAVO/buffers.h>
#include <TAVO/string.h>
#include <TAVO/xml.h>

using namespace TAVO::XML;

int main() {
    // SetName gives a handle a node of its own. Everything that can fail tells: names must follow the rules of XML, and
    // memory may be out.
    CPXMLObject reel;
    if (!reel.SetName(L"reel") || !reel.AddAttribute(L"rate", L"30000/1001")) return 1;
    for (int number = 1; number <= 3; ++number) {
        CPXMLObject clip;
        if (!clip.SetName(L"clip")) return 1;
        if (!clip.printfAttribute(L"id", L"c%03d", number)) return 1;
        if (!clip.AddTag(L"note", L"Très belle lumière")) return 1;
        if (!reel.Add(clip)) return 1;
    }
    if (reel.SetName(L"not a name")) return 1; // refused, and nothing has changed

    // Handles share their node: what is changed through one is seen through the other.
    CPXMLObject second = reel.item(1);
    if (!second.SetAttribute(L"id", L"c020")) return 1;
    if (!reel.item(1).FindAttributeValue(L"id", L"c020")) return 1;

    // An element holds text or children. Set replaces what is there, Add never does.
    CPXMLObject* note = second.FindFirstElement(L"note");
    if (!note || note->Add(L"more") || !note->Set(L"x < y & z")) return 1;

    // To memory, with a zero character at the end; Write(path, ...) makes a file.
    TAVO::Buffers::CPPlainMemory text;
    if (!reel.Write(text, XMLEncodingUTF8, true)) return 1;
    const char* utf8 = static_cast<const char*>(static_cast<void*>(text));
    std::fputs(utf8, stdout);
    if (!std::strstr(utf8, "<note><![CDATA[x < y & z]]></note>")) return 1;

    CXMLDoc document;
    if (!document.OpenDocText(text, text.GetSize())) return 1;
    const CPXMLObject& again = document.GetRootElement();
    return again.GetNElements(L"clip") == 3 && again.item(1).FindElementData(L"note") == L"x < y & z" ? 0 : 1;
}
