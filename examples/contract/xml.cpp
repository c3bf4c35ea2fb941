// Documents that read, change and write otherwise than one expects.

#include "contract.h"

#include <TAVO/xml.h>

namespace contract {

using namespace TAVO::XML;
using TAVO::String::CPPoolString;

static CPPoolString DataOf(const wchar_t* text) {
    CXMLDoc document;
    return document.OpenDocText(text) ? document.GetRootElement().GetData() : CPPoolString(L"(error)");
}
static bool Opens(const wchar_t* text) { return CXMLDoc().OpenDocText(text); }

static CPXMLObject Named(const wchar_t* name) {
    CPXMLObject element;
    element.SetName(name);
    return element;
}

static void TypedValues() {
    CPXMLObject element = Named(L"a");
    constexpr auto kNumber = 0x900000001ULL;
    Is("no integer reader matches the writer", element.Set(kNumber) && element.GetDataLUInt() != kNumber);
    Instead("decimal digits", element.Sprintf(L"%I64u", kNumber) && element.GetDataLUInt() == kNumber);
    Is("Double reads the bits of a double's text", element.Set(1.5) && element.GetDataDouble() == 3);
    Instead("EDouble", element.GetDataEDouble() == 1.5);
    const unsigned char bytes[] = {0x12, 0xAB};
    unsigned char read[2];
    Is("bytes stand with the low half first", element.Set(bytes, 2) && element.IsData(L"21BA"));
    Instead("GetDataBinary", element.GetDataBinary(read, 2) && read[0] == 0x12 && read[1] == 0xAB);
    Is("beside children is no number", element.Set(L"42") && element.AddTag(L"b") && element.GetDataInt() == 0);
    Instead("an attribute", element.AddAttribute(L"n", L"42") && element.FindAttributeInt(L"n") == 42);
}

void Xml() {
    Is("&lt; gives >, and every other name <", DataOf(L"<a>&lt;&gt;</a>") == L"><");
    Instead("CDATA, or decimal references", DataOf(L"<a><![CDATA[<]]>&#62;</a>") == L"<>");
    Is("hexadecimal references are errors", !Opens(L"<a>&#x3C;</a>"));
    Is("an apostrophe in a comment before the root is an error", !Opens(L"<!-- don't --><a/>"));
    Instead("comment within the root", Opens(L"<a><!-- don't, > --></a>"));
    Is("text beside elements is an error", !Opens(L"<a>x<b/></a>"));
    Instead("an element around it", Opens(L"<a><t>x</t><b/></a>"));
    Is("white space collapses", DataOf(L"<a> x  y </a>") == L"x y");
    Instead("CDATA keeps it", DataOf(L"<a><![CDATA[ x  y ]]></a>") == L" x  y ");
    CXMLDoc document;
    Is("an attribute without a value is dropped",
       document.OpenDocText(L"<a b=''/>") && !document.GetRootElement().HasAttribute(L"b"));
    Is("a text without an element opens", document.OpenDocText(L"<!-- -->"));
    Instead("test the root", !document.GetRootElement());

    CPXMLObject element = Named(L"a"), holder = element;
    Is("SetName leaves the node to its other holders", element.SetName(L"b") && holder.IsName(L"a"));
    element = holder;
    Instead("Rename changes it for all", element.Rename(L"c") && holder.IsName(L"c"));

    CPXMLObject parent = Named(L"p");
    const bool added = parent.AddTag(L"x") && parent.AddTag(L"y");
    std::size_t count;
    const CPXMLObject* const first = parent.GetElements(count);
    Is("a search backwards answers its start again", added && parent.FindPrevElement(L"x", first) == first);
    Is("Insert answers the index asked for", parent.Insert(Named(L"z"), 99).sIndex() == 99);
    parent = Named(L"p");
    Is("after its last child went by index, text makes an element that cannot be written",
       parent.AddTag(L"x") && parent.Delete(0) && parent.Add(L"text"));
    TAVO::Buffers::CPPlainMemory out;
    Is("  as children and data", !parent.Write(out, XMLEncodingUTF8, false));
    parent.Reset();
    Instead("Reset before", parent.Add(L"text") && parent.Write(out, XMLEncodingUTF8, false));
    Is("GetContent is empty", parent.GetContent().isempty());
    Instead("GetData", parent.GetData() == L"text");

    parent.Reset();
    const bool pairAdded = parent.Add(L"\xD83D\xDE00") && parent.Write(out, XMLEncodingUTF8, false);
    CXMLDoc again;
    Is("a pair is written as the character 01",
       pairAdded && again.OpenDocText(out, out.GetSize()) && again.GetRootElement().IsData(L"\x01"));
    Instead("the raw encoding", parent.Write(out, XMLEncodingUTF16Raw, false) &&
                                    again.OpenDocText(out, out.GetSize()) &&
                                    again.GetRootElement().IsData(L"\xD83D\xDE00"));

    TypedValues();
}

} // namespace contract
