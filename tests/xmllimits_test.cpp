// Documents at their limits: depth, breadth, many attributes, no memory.

#include "support/heapwatch.h"
#include "support/machine.h"
#include "support/scratch.h"
#include "support/xmltexts.h"

#include <algorithm>
#include <gtest/gtest.h>
#include <TAVO/develop.h>

using namespace support;
using namespace TAVO;
using namespace TAVO::XML;

namespace {

constexpr std::size_t kMillion = 1000000;

std::string Repeated(const std::string& text, std::size_t count) {
    std::string all;
    all.reserve(text.size() * count);
    for (; count; --count) all += text;
    return all;
}

bool Open(CXMLDoc& document, const std::string& text) {
    return document.OpenDocText(reinterpret_cast<const unsigned char*>(text.c_str()));
}

} // namespace

TEST(XmlLimits, AMillionNestedElementsOnASmallStack) {
    const std::string opening = Repeated("<a>", kMillion), nested = opening + Repeated("</a>", kMillion);
    RunOnStack(256 * 1024, [&] {
        CXMLDoc document;
        ASSERT_TRUE(Open(document, nested));
        Buffers::CPPlainMemory written;
        ASSERT_TRUE(document.GetRootElement().Write(written, XMLEncodingUTF8, false));
        EXPECT_EQ(written.GetSize(), 38 + kMillion * 7 - 3 + 1) << "the innermost is <a/>";
        unsigned long long offset = 0;
        EXPECT_FALSE(Open(document, opening));
        EXPECT_EQ(document.GetErrorInfo(&offset, nullptr), 1u);
        EXPECT_EQ(offset, opening.size());
    });
}

TEST(XmlLimits, AMillionSiblings) {
    CXMLDoc document;
    ASSERT_TRUE(Open(document, "<r>" + Repeated("<a b='1'>x</a>", kMillion) + "</r>"));
    CPXMLObject& root = document.GetRootElement();
    EXPECT_EQ(Outline(Plain(root.item(kMillion - 1))), "a b='1':x");
    EXPECT_EQ(root.AddTag(L"z").sIndex(), kMillion) << "an array built at once still grows";
}

// Nothing that a text holds may cost more than its length.
TEST(XmlLimits, LongRunsTakeLinearTime) {
    std::string attributes = "<a";
    for (int i = 0; i < 100000; ++i) attributes += " a" + std::to_string(i) + "='x'";
    const struct {
        std::string before, run, after;
        bool opens;
    } rows[] = {
        {"<a>", "<![CDATA[]]>", "</a>", true}, {"<a>x", "<!-- -->x", "</a>", true},
        {"<a>", "<?b c='d'?>", "</a>", true},  {"<a>", "]", "</a>", true},
        {"<a><![CDATA[", "]", "", false},      {"<a><!--", "-", "", false},
        {"<!x ", "'\"'", "><a/>", true},       {"<a>", " ", "</a>", true},
        {"<a>", "\n", "]]>", false},           {"<a>", "</", "", false},
        {"<a", " b=''", "/>", true},           {"<a>", "&#65536;", "</a>", true},
        {attributes, " ", "/>", true},         {attributes + " a77777='x'", " ", "/>", false},
    };
    for (const auto& row : rows) {
        const std::string text = row.before + Repeated(row.run, kMillion / 2) + row.after;
        CXMLDoc document;
        const auto start = Develop::_now_milli();
        EXPECT_EQ(Open(document, text), row.opens) << row.run;
        EXPECT_LT(Develop::_now_milli() - start, 20000u) << row.run;
    }
}

namespace {

// Opens the text with every allocation failing in turn, always with the same document; each with strings of its own.
template <class Function> void OpenWithoutMemory(const std::string& text, Function open) {
    const Reading expected = XmlReference::Read(text);
    CXMLDoc document;
    const auto sweep = [] { String::CStringPool::Collect(60000), String::CStringPool::Collect(60000); };
    sweep();
    ForEachFailingAllocation([&] {
        const bool opened = open(document);
        const auto code = document.GetErrorInfo(nullptr, nullptr);
        ASSERT_TRUE(opened == (code == 128) && (code == expected.code || code == 18 || code == 0)) << text << code;
        ASSERT_EQ(Outline(Plain(document.GetRootElement())), opened ? expected.outline : "");
        document.Close();
        sweep();
    });
    EXPECT_EQ(open(document), expected.code == 128) << "usable afterwards";
    EXPECT_EQ(ReadingOf(document), expected);
}

} // namespace

TEST(XmlLimits, FailingAllocations) {
    std::string many = "<m";
    for (char c = 'a'; c <= 'z'; ++c) many.append(" ").append(1, c).append("='").append(1, c).append("'");
    ScratchFolder folder;
    const WideText path = folder / L"document.xml";
    for (const std::string& text :
         {std::string("<root a='1' b=' x &#65; ' c='1'><child>data</child><child d='1'>a &lt; b \xC3\xA9</child>"
                      "<\xC3\xA9 \xC3\xA9='\xC3\xA9'></\xC3\xA9><e><f><g/></f></e></root>"),
          many + "/>", std::string("<a b='value'><c/><d>data</d></b>"), std::string("<ab></\xC1\xA1\x62>"),
          std::string("<ab></\xC1\xA1\xC1\xA1>")}) {
        Put(path, text);
        OpenWithoutMemory(text, [&](CXMLDoc& document) { return Open(document, text); });
        OpenWithoutMemory(text, [&](CXMLDoc& document) { return document.OpenDocFile(path, XMLEncodingAutomatic); });
        if (XmlReference::Read(text).code != 128 || text.find('\xC1') != text.npos) continue;
        std::string swapped = BytesOf(u"\xFEFF" + ToUtf16(text), true);
        OpenWithoutMemory(text,
                          [&](CXMLDoc& document) { return document.OpenDocText(swapped.data(), swapped.size()); });
    }
}
